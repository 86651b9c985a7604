// The file primitives against real files in a scratch directory.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <string>
#include <vector>

#include "qsd/fileops/install_util.h"
#include "qsd/platform/trace.h"
#include "support/test_support.h"
#include "support/trace_lines.h"

namespace {

using zr7test::exists;
using zr7test::read_file;
using zr7test::TempDir;
using zr7test::write_file;

unsigned mode_of(const std::string& path) {
    struct stat st {};
    return ::stat(path.c_str(), &st) == 0 ? st.st_mode & 07777 : 0;
}

const std::string kCrData = "one\r\ntwo\rthree\r\r\n";

struct CopyCase {
    const char* name;
    bool dst_exists;
    unsigned flags;
    std::string expected;  // the destination afterwards
};

TEST(CopyFileTest, OverwriteAndFixCr) {
    const CopyCase cases[] = {
        {"new, plain", false, 0, kCrData},
        {"new, fix cr", false, kCopyFixCr, "one\ntwothree\n"},
        {"existing kept", true, 0, "old\n"},
        {"existing kept under fix cr", true, kCopyFixCr, "old\n"},
        {"existing replaced", true, kCopyOverwrite, kCrData},
        {"existing replaced, fix cr", true, kCopyOverwrite | kCopyFixCr, "one\ntwothree\n"},
        {"other bits ignored", true, 0xF0u | kCopyOverwrite, kCrData},
    };
    for (const CopyCase& c : cases) {
        TempDir dir;
        write_file(dir / "src", kCrData);
        if (c.dst_exists)
            write_file(dir / "dst", "old\n");
        EXPECT_EQ(InstallUtil::copy_file((dir / "src").c_str(), (dir / "dst").c_str(), c.flags), 0)
            << c.name;
        EXPECT_EQ(read_file(dir / "dst"), c.expected) << c.name;
        EXPECT_EQ(read_file(dir / "src"), kCrData) << c.name;
    }
}

TEST(CopyFileTest, ReadOnlySourceOrDestinationGivesAnOwnerWritableCopy) {
    for (unsigned flags : {kCopyOverwrite, kCopyOverwrite | kCopyFixCr}) {
        TempDir dir;
        write_file(dir / "src", "data\n", 0444);
        write_file(dir / "dst", "old\n", 0444);
        // cp -f replaces a destination its owner cannot write; the output
        // redirection of a fix-cr copy cannot open it (unless run as root).
        const int rc = InstallUtil::copy_file((dir / "src").c_str(), (dir / "dst").c_str(), flags);
        if (::geteuid() != 0) {
            EXPECT_EQ(rc, flags == kCopyOverwrite ? 0 : -5);
        }
        if (rc == 0) {
            EXPECT_EQ(read_file(dir / "dst"), "data\n");
            EXPECT_NE(mode_of(dir / "dst") & 0200, 0u);
        }
        EXPECT_EQ(InstallUtil::copy_file((dir / "src").c_str(), (dir / "new").c_str(), flags), 0);
        EXPECT_EQ(read_file(dir / "new"), "data\n");
        EXPECT_NE(mode_of(dir / "new") & 0200, 0u) << flags;
        EXPECT_EQ(mode_of(dir / "src"), 0444u);
    }
}

TEST(CopyFileTest, FailedCopyGivesMinus5AndLeavesTheDestination) {
    for (unsigned flags : {kCopyOverwrite, kCopyOverwrite | kCopyFixCr}) {
        TempDir dir;
        write_file(dir / "dst", "keep\n", 0444);
        zr7test::make_dirs(dir / "a-directory");
        for (const std::string& src : {dir / "missing", dir / "a-directory"}) {
            EXPECT_EQ(InstallUtil::copy_file(src.c_str(), (dir / "dst").c_str(), flags), -5)
                << src << " " << flags;
            EXPECT_EQ(read_file(dir / "dst"), "keep\n");
            EXPECT_EQ(mode_of(dir / "dst"), 0444u) << "no owner-write after a failure";
        }
        write_file(dir / "src", "x");
        EXPECT_EQ(
            InstallUtil::copy_file((dir / "src").c_str(), (dir / "no/dir/dst").c_str(), flags), -5);
        EXPECT_EQ(InstallUtil::copy_file(nullptr, (dir / "dst").c_str(), flags), -5);
    }
}

TEST(CopyFileTest, ExistingDirectoryWithoutOverwriteCountsAsDone) {
    TempDir dir;
    write_file(dir / "src", "x");
    zr7test::make_dirs(dir / "dst");
    EXPECT_EQ(InstallUtil::copy_file((dir / "src").c_str(), (dir / "dst").c_str(), 0), 0);
    EXPECT_EQ(InstallUtil::copy_file((dir / "src").c_str(), (dir / "dst").c_str(), kCopyFixCr), 0);
    EXPECT_TRUE(zr7test::list_dir(dir / "dst").empty());
}

// Names that a shell would split, expand or run are copied as plain names.
TEST(CopyFileTest, FileNamesAreNeverInterpreted) {
    const std::vector<std::string> names = {
        "with blank",
        "tab\there",
        "quo\"te",
        "$(touch PWNED2)",
        "x;touch PWNED",
        "`touch PWNED3`",
        "-leading",
        "--",
        "-f",
        "a'b c'",
        "*",
        "new\nline",
        "$HOME",
        "back\\slash",
        "> redirect",
        "| pipe",
        "& background",
        "${IFS}",
        "semi; rm -rf x",
        "trail ",
    };
    // Relative names in the working directory, so that a leading "-" reaches
    // the copy programs as it is, and anything a shell ran would land here.
    TempDir dir;
    zr7test::make_dirs(dir / "x");
    char* saved = ::getcwd(nullptr, 0);
    ASSERT_NE(saved, nullptr);
    ASSERT_EQ(::chdir(dir.path().c_str()), 0);
    std::vector<std::string> expected_entries{"x"};
    for (const std::string& name : names) {
        write_file(name, "content of " + name + "\r\n");
        expected_entries.push_back(name);
        for (unsigned flags : {kCopyOverwrite, kCopyOverwrite | kCopyFixCr}) {
            const std::string dst = name + (flags == kCopyOverwrite ? ".1" : ".3");
            expected_entries.push_back(dst);
            EXPECT_EQ(InstallUtil::copy_file(name.c_str(), dst.c_str(), flags), 0) << name;
            EXPECT_EQ(read_file(dst),
                      "content of " + name + (flags == kCopyOverwrite ? "\r\n" : "\n"))
                << name;
        }
    }
    ASSERT_EQ(::chdir(saved), 0);
    ::free(saved);

    std::sort(expected_entries.begin(), expected_entries.end());
    EXPECT_EQ(zr7test::list_dir(dir.path()), expected_entries);
    EXPECT_TRUE(zr7test::list_dir(dir / "x").empty());
    for (const char* trace : {"PWNED", "PWNED2", "PWNED3"})
        EXPECT_FALSE(exists(trace)) << trace;
}

TEST(CopyFileTest, DetailLinesTellWhatIsDone) {
    TempDir dir;
    const std::string src = dir / "a b";
    const std::string dst = dir / "c";
    write_file(src, "x\r\n");
    zr7::trace_reconfigure("ERROR (UNIT:zr7 ALL)");
    testing::internal::CaptureStderr();  // what cp says about the missing file
    testing::internal::CaptureStdout();
    EXPECT_EQ(InstallUtil::copy_file(src.c_str(), dst.c_str(), 3), 0);
    EXPECT_EQ(InstallUtil::copy_file(src.c_str(), dst.c_str(), 0), 0);
    EXPECT_EQ(InstallUtil::copy_file(dst.c_str(), (dir / "d").c_str(), 1), 0);
    EXPECT_EQ(InstallUtil::copy_file((dir / "none").c_str(), (dir / "d").c_str(), 1), -5);
    EXPECT_TRUE(
        zr7test::lines_end_with(testing::internal::GetCapturedStdout(),
                                {
                                    "Copy begin --------------",
                                    "...src <" + src + ">",
                                    "...dst <" + dst + ">",
                                    "...overwrite <1> fix cr <1>",
                                    "...issuing cmd <tr -d '\r' <\"" + src + "\" >" + dst + ">",
                                    "...rc = <0>",
                                    "Copy end ----------------",
                                    "Copy begin --------------",
                                    "...src <" + src + ">",
                                    "...dst <" + dst + ">",
                                    "...overwrite <0> fix cr <0>",
                                    "...file already exists",
                                    "Copy end ----------------",
                                    "Copy begin --------------",
                                    "...src <" + dst + ">",
                                    "...dst <" + dir / "d" + ">",
                                    "...overwrite <1> fix cr <0>",
                                    "...issuing cmd <cp -f " + dst + " " + dir / "d" + ">",
                                    "...rc = <0>",
                                    "Copy end ----------------",
                                    "Copy begin --------------",
                                    "...src <" + dir / "none" + ">",
                                    "...dst <" + dir / "d" + ">",
                                    "...overwrite <1> fix cr <0>",
                                    "...issuing cmd <cp -f " + dir / "none" + " " + dir / "d" + ">",
                                    "...rc = <-5>",
                                    "Copy end ----------------",
                                }));
    testing::internal::GetCapturedStderr();
}

TEST(QuoteStrTest, QuotesOnlyTextsWithWhiteSpace) {
    const std::pair<const char*, const char*> cases[] = {
        {nullptr, ""},
        {"", ""},
        {"/opt/srv", "/opt/srv"},
        {"a b", "\"a b\""},
        {"a\tb", "\"a\tb\""},
        {"a\nb", "\"a\nb\""},
        {"\v", "\"\v\""},
        {"\f", "\"\f\""},
        {"x\r", "\"x\r\""},
        {"a\"b", "a\"b"},
        {"a\"b c", "\"a\"b c\""},
        {"$(x);`y`\\", "$(x);`y`\\"},
        {"\xa0\x85", "\xa0\x85"},
    };
    for (const auto& c : cases)
        EXPECT_EQ(InstallUtil::quote_str(c.first), c.second) << (c.first ? c.first : "(null)");
}

TEST(FilePrimitivesTest, MkdirCreatesExactlyOneDirectory) {
    TempDir dir;
    const mode_t old_mask = ::umask(022);
    EXPECT_EQ(InstallUtil::mkdir((dir / "new").c_str()), 0);
    ::umask(old_mask);
    EXPECT_EQ(mode_of(dir / "new"), 0744u);
    EXPECT_EQ(InstallUtil::mkdir((dir / "new").c_str()), -1);
    EXPECT_EQ(InstallUtil::mkdir((dir / "missing/child").c_str()), -1);
    EXPECT_FALSE(exists(dir / "missing"));
}

TEST(FilePrimitivesTest, DeleteFileRemovesOneEntry) {
    TempDir dir;
    write_file(dir / "f", "x");
    zr7::trace_reconfigure("ERROR (UNIT:zr7 ALL)");
    testing::internal::CaptureStdout();
    EXPECT_EQ(InstallUtil::delete_file((dir / "f").c_str()), 0);
    EXPECT_EQ(InstallUtil::delete_file((dir / "f").c_str()), -1);
    EXPECT_TRUE(
        zr7test::lines_end_with(testing::internal::GetCapturedStdout(),
                                {"deleting <" + dir / "f" + ">", "deleting <" + dir / "f" + ">"}));
    EXPECT_FALSE(exists(dir / "f"));
}

TEST(FilePrimitivesTest, RemoveReadOnlyAddsOwnerWriteOnly) {
    TempDir dir;
    const std::pair<unsigned, unsigned> modes[] = {
        {0444, 0644}, {0500, 0700}, {0404, 0604}, {0640, 0640}, {01555, 01755}};
    for (const auto& m : modes) {
        write_file(dir / "f", "x", m.first);
        EXPECT_EQ(InstallUtil::removeReadOnly((dir / "f").c_str()), 0);
        EXPECT_EQ(mode_of(dir / "f"), m.second) << std::oct << m.first;
    }
    EXPECT_EQ(InstallUtil::removeReadOnly((dir / "missing").c_str()), 0);
    EXPECT_FALSE(exists(dir / "missing"));
}

TEST(FilePrimitivesTest, ScratchDirectoryAndProcessId) {
    EXPECT_EQ(InstallUtil::get_tmp_path(), "/tmp/");
    EXPECT_EQ(InstallUtil::get_pid(), std::to_string(::getpid()));
}

}  // namespace
