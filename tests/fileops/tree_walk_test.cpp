// The tree walk and the per-entry copy behind the tree-copy command, against
// real directories.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <ostream>
#include <utility>
#include <vector>

#include "qsd/fileops/install_util.h"
#include "qsd/platform/trace.h"
#include "support/dir_order.h"
#include "support/stdout_capture.h"
#include "support/test_support.h"

namespace {

using zr7test::exists;
using zr7test::make_dirs;
using zr7test::read_file;
using zr7test::TempDir;
using zr7test::write_file;

// What a recording entry operation was called with.
std::vector<std::pair<std::string, std::string>> g_calls;
std::string g_stop_at;

int record_entry(const char* src, const char* dst, unsigned) {
    g_calls.emplace_back(src, dst);
    return std::string(src) == g_stop_at ? 7 : 0;
}

std::size_t call_index(const std::string& src) {
    for (std::size_t i = 0; i < g_calls.size(); ++i) {
        if (g_calls[i].first == src)
            return i;
    }
    return g_calls.size();
}

class TreeWalkTest : public ::testing::Test {
  protected:
    void SetUp() override {
        g_calls.clear();
        g_stop_at.clear();
        make_dirs(src);
        make_dirs(dst);
    }
    TempDir tmp;
    std::string src = tmp / "src";
    std::string dst = tmp / "dst";
};

TEST_F(TreeWalkTest, VisitsEveryEntryDirectoryFirstWithDestinationsJoinedDirectly) {
    make_dirs(src + "/d/e");
    write_file(src + "/d/e/f.txt", "f");
    write_file(src + "/top.txt", "t");
    ASSERT_EQ(InstallUtil::recursive_process(src.c_str(), (dst + "/").c_str(), &record_entry, 0),
              0);

    std::vector<std::pair<std::string, std::string>> sorted = g_calls;
    std::sort(sorted.begin(), sorted.end());
    const std::vector<std::pair<std::string, std::string>> expected{
        {src + "/d", dst + "/d"},
        {src + "/d/e", dst + "/d/e"},
        {src + "/d/e/f.txt", dst + "/d/e/f.txt"},
        {src + "/top.txt", dst + "/top.txt"}};
    EXPECT_EQ(sorted, expected);
    EXPECT_LT(call_index(src + "/d"), call_index(src + "/d/e"));
    EXPECT_LT(call_index(src + "/d/e"), call_index(src + "/d/e/f.txt"));
}

TEST_F(TreeWalkTest, StopsAtTheFirstNonZeroResultAndReturnsIt) {
    for (const char* name : {"a", "b", "c", "d"})
        write_file(src + "/" + name, name);
    const std::vector<std::string> order = zr7test::readdir_order(src);
    g_stop_at = src + "/" + order[1];
    EXPECT_EQ(InstallUtil::recursive_process(src.c_str(), (dst + "/").c_str(), &record_entry, 0),
              7);
    EXPECT_EQ(g_calls.size(), 2u);
}

TEST_F(TreeWalkTest, SourceThatCannotBeOpenedGivesMinus7) {
    EXPECT_EQ(InstallUtil::recursive_process((tmp / "missing").c_str(), (dst + "/").c_str(),
                                             &record_entry, 0),
              -7);
    EXPECT_TRUE(g_calls.empty());
}

TEST_F(TreeWalkTest, XcopyCopiesTheTreeAndCreatesDirectoriesWith0766LessUmask) {
    make_dirs(src + "/d/e");
    write_file(src + "/d/e/f.txt", "deep\r\n");
    write_file(src + "/.hidden", "hidden");
    write_file(src + "/top.txt", "top");
    ASSERT_EQ(InstallUtil::xcopy(src.c_str(), (dst + "/").c_str(), 0), 0);

    EXPECT_EQ(read_file(dst + "/d/e/f.txt"), "deep\r\n");
    EXPECT_EQ(read_file(dst + "/.hidden"), "hidden");
    EXPECT_EQ(read_file(dst + "/top.txt"), "top");
    const mode_t mask = ::umask(0);
    ::umask(mask);
    struct stat st {};
    ASSERT_EQ(::stat((dst + "/d").c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 07777, 0766u & ~mask);
}

// Existing destination files against the overwrite and fix-cr flags.
struct FlagCase {
    unsigned flags;
    const char* existing_after;  // a file already at the destination
    const char* added;           // a file the destination lacked
};

void PrintTo(const FlagCase& c, std::ostream* os) {
    *os << "flags " << c.flags;
}

class XcopyFlagsTest : public TreeWalkTest, public ::testing::WithParamInterface<FlagCase> {};

TEST_P(XcopyFlagsTest, OverwriteAndCarriageReturnsFollowTheFlags) {
    make_dirs(src + "/sub");
    make_dirs(dst + "/sub");
    write_file(src + "/sub/existing.txt", "image\r\n");
    write_file(dst + "/sub/existing.txt", "local\r\n");
    write_file(src + "/sub/added.txt", "a\r\nb\rc\r\n");
    ASSERT_EQ(InstallUtil::xcopy(src.c_str(), (dst + "/").c_str(), GetParam().flags), 0);
    EXPECT_EQ(read_file(dst + "/sub/existing.txt"), GetParam().existing_after);
    EXPECT_EQ(read_file(dst + "/sub/added.txt"), GetParam().added);
}

INSTANTIATE_TEST_SUITE_P(Flags, XcopyFlagsTest,
                         ::testing::Values(FlagCase{0, "local\r\n", "a\r\nb\rc\r\n"},
                                           FlagCase{kCopyOverwrite, "image\r\n", "a\r\nb\rc\r\n"},
                                           FlagCase{kCopyFixCr, "local\r\n", "a\nbc\n"},
                                           FlagCase{kCopyOverwrite | kCopyFixCr, "image\n",
                                                    "a\nbc\n"}));

TEST_F(TreeWalkTest, MissingDestinationFailsAtTheFirstEntry) {
    write_file(src + "/a.txt", "a");
    const std::string missing = tmp / "nowhere/";
    EXPECT_EQ(InstallUtil::xcopy(src.c_str(), missing.c_str(), kCopyOverwrite), -5);
    make_dirs(src + "/d");
    ::unlink((src + "/a.txt").c_str());
    EXPECT_EQ(InstallUtil::xcopy(src.c_str(), missing.c_str(), kCopyOverwrite), -5);
    EXPECT_FALSE(exists(tmp / "nowhere"));
}

TEST_F(TreeWalkTest, EmptySourceIntoMissingDestinationIsNothingToDo) {
    EXPECT_EQ(InstallUtil::xcopy(src.c_str(), (tmp / "nowhere/").c_str(), 0), 0);
}

TEST_F(TreeWalkTest, PlainFileWhereASubDirectoryGoesFails) {
    make_dirs(src + "/sub");
    write_file(src + "/sub/x.txt", "x");
    write_file(dst + "/sub", "in the way");
    EXPECT_EQ(InstallUtil::xcopy(src.c_str(), (dst + "/").c_str(), 0), -5);
    EXPECT_EQ(read_file(dst + "/sub"), "in the way");
}

TEST_F(TreeWalkTest, DirectoryWhereAFileGoesFailsInsteadOfTakingTheFile) {
    write_file(src + "/x.dat", "x");
    make_dirs(dst + "/x.dat");
    for (unsigned flags : {kCopyOverwrite, kCopyOverwrite | kCopyFixCr}) {
        EXPECT_EQ(InstallUtil::xcopy(src.c_str(), (dst + "/").c_str(), flags), -5) << flags;
        EXPECT_EQ(zr7test::list_dir(dst + "/x.dat"), std::vector<std::string>{}) << flags;
    }
}

TEST_F(TreeWalkTest, LinksAreFollowedAndDanglingOnesSkipped) {
    make_dirs(src + "/real");
    write_file(src + "/real/in.txt", "inside");
    write_file(src + "/file.txt", "content");
    ASSERT_EQ(::symlink("real", (src + "/alias").c_str()), 0);
    ASSERT_EQ(::symlink("file.txt", (src + "/file_link").c_str()), 0);
    ASSERT_EQ(::symlink("missing", (src + "/dangling").c_str()), 0);
    ASSERT_EQ(InstallUtil::xcopy(src.c_str(), (dst + "/").c_str(), 0), 0);

    // A link to a sibling directory is no loop: copied as a directory.
    struct stat st {};
    ASSERT_EQ(::lstat((dst + "/alias").c_str(), &st), 0);
    EXPECT_TRUE(S_ISDIR(st.st_mode));
    EXPECT_EQ(read_file(dst + "/alias/in.txt"), "inside");
    ASSERT_EQ(::lstat((dst + "/file_link").c_str(), &st), 0);
    EXPECT_TRUE(S_ISREG(st.st_mode));
    EXPECT_EQ(read_file(dst + "/file_link"), "content");
    EXPECT_FALSE(exists(dst + "/dangling"));
}

TEST_F(TreeWalkTest, CopyOfAMissingSourceIsNothingToDo) {
    EXPECT_EQ(InstallUtil::copy((tmp / "missing").c_str(), (dst + "/x").c_str(), 3), 0);
    EXPECT_FALSE(exists(dst + "/x"));
}

TEST_F(TreeWalkTest, CopyOfADirectoryCreatesItOnlyWhenAbsent) {
    make_dirs(src + "/d");
    EXPECT_EQ(InstallUtil::copy((src + "/d").c_str(), (dst + "/d").c_str(), 0), 0);
    EXPECT_TRUE(exists(dst + "/d"));
    // Present, even as a plain file: nothing to do.
    write_file(dst + "/f", "x");
    EXPECT_EQ(InstallUtil::copy((src + "/d").c_str(), (dst + "/f").c_str(), 0), 0);
    // Parent missing: mkdir's own failure.
    EXPECT_EQ(InstallUtil::copy((src + "/d").c_str(), (dst + "/no/d").c_str(), 0), -1);
}

// Links that lead back to a directory on the path being walked.
struct LoopCase {
    const char* link_dir;  // where the link stands, below src ("" for src itself)
    const char* target;    // what it points to; "@" stands for src itself
};

void PrintTo(const LoopCase& c, std::ostream* os) {
    *os << "<" << c.link_dir << "/loop> -> <" << c.target << ">";
}

class DirectoryLoopTest : public TreeWalkTest, public ::testing::WithParamInterface<LoopCase> {};

TEST_P(DirectoryLoopTest, LoopIsNotEnteredAndTheWalkFails) {
    make_dirs(src + "/d/e");
    write_file(src + "/d/e/file.txt", "f");
    const std::string target = std::string(GetParam().target) == "@" ? src : GetParam().target;
    const std::string below =
        *GetParam().link_dir == '\0' ? "" : "/" + std::string(GetParam().link_dir);
    const std::string link = src + below + "/loop";
    ASSERT_EQ(::symlink(target.c_str(), link.c_str()), 0);

    zr7::trace_reconfigure("ERROR");
    int status = 0;
    const std::string out = zr7test::capture_stdout(
        [&] { status = InstallUtil::xcopy(src.c_str(), (dst + "/").c_str(), 0); });
    EXPECT_EQ(status, -5);
    EXPECT_TRUE(zr7test::has_trace_line(out, "Error: Directory loop at <" + link + ">")) << out;
    EXPECT_FALSE(exists(dst + below + "/loop"));
}

INSTANTIATE_TEST_SUITE_P(Links, DirectoryLoopTest,
                         ::testing::Values(LoopCase{"", "."}, LoopCase{"d", ".."},
                                           LoopCase{"d/e", "../.."}, LoopCase{"d/e", ".."},
                                           LoopCase{"d/e", "@"}));

TEST_F(TreeWalkTest, WalkWritesItsDetailLines) {
    write_file(src + "/a.txt", "a");
    zr7::trace_reconfigure("DETAIL");
    const std::string out = zr7test::capture_stdout(
        [&] { EXPECT_EQ(InstallUtil::xcopy(src.c_str(), (dst + "/").c_str(), 0), 0); });
    zr7::trace_reconfigure("ERROR");
    EXPECT_TRUE(zr7test::has_trace_line(out, "src <" + src + "> dst <" + dst + "/>")) << out;
    EXPECT_TRUE(zr7test::has_trace_line(out, "processing<" + dst + "/a.txt>")) << out;
}

}  // namespace
