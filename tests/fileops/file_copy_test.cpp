// The single-file copy, the listing and the tree copy over real files.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <string>
#include <tuple>
#include <vector>

#include "qsd/fileops/install_util.h"
#include "qsd/platform/trace.h"
#include "support/test_support.h"

namespace {

using zr7test::make_dirs;
using zr7test::read_file;
using zr7test::TempDir;
using zr7test::write_file;

constexpr unsigned O = kCopyOverwrite, T = kCopyFixCr;
const std::string kCr = "one\r\ntwo\rthree\r\r\n", kNoCr = "one\ntwothree\n";

int copy(const std::string& src, const std::string& dst, unsigned flags) {
    return InstallUtil::copy_file(src.c_str(), dst.c_str(), flags);
}

unsigned mode_of(const std::string& path) {
    struct stat st {};
    return ::stat(path.c_str(), &st) == 0 ? st.st_mode & 07777 : 0;
}

// The source is read-only: a copy the next install cannot replace is a fault.
TEST(CopyFile, ReplacesOnlyUnderOverwriteAndFixCrRemovesEveryCr) {
    const std::tuple<bool, unsigned, std::string> cases[] = {
        {false, 0, kCr},  {false, T, kNoCr}, {true, 0, "old"},
        {true, T, "old"}, {true, O, kCr},    {true, O | T, kNoCr}};
    for (const auto& [dst_exists, flags, after] : cases) {
        TempDir dir;
        write_file(dir / "src", kCr, 0444);
        if (dst_exists)
            write_file(dir / "dst", "old");
        EXPECT_EQ(copy(dir / "src", dir / "dst", flags), 0) << flags;
        EXPECT_EQ(read_file(dir / "dst"), after) << dst_exists << " " << flags;
        EXPECT_NE(mode_of(dir / "dst") & 0200, 0u) << dst_exists << " " << flags;
    }
}

TEST(QuoteStr, QuotesOnlyTextsWithWhiteSpace) {
    EXPECT_EQ(InstallUtil::quote_str(nullptr), "");
    for (const char* bare : {"", "/opt/srv", "a\"b", "$(x);`y`\\", "\xa0\x85"})
        EXPECT_EQ(InstallUtil::quote_str(bare), bare);
    for (const char* spaced : {"a b", "a\tb", "x\r", "\v", "a\"b c"})
        EXPECT_EQ(InstallUtil::quote_str(spaced), "\"" + std::string(spaced) + "\"");
}

TEST(CopyOptions, LettersGiveFlags) {
    const std::pair<const char*, unsigned> cases[] = {
        {"", 0},   {"O", O},         {"T", T},         {"TO", O | T}, {"OOO", O},
        {"ot", 0}, {" O,T ", O | T}, {"overwrite", 0}, {"Text", T}};
    for (const auto& c : cases)
        EXPECT_EQ(zr7::copy_flags_from_options(c.first), c.second) << "<" << c.first << ">";
}

// Links count as what they lead to; a dangling one is nothing.
TEST(GetFileList, AppendsWhatIsNotADirectory) {
    TempDir tmp;
    write_file(tmp / "a.sql", "a");
    write_file(tmp / ".hidden", "h");
    make_dirs(tmp / "sub.sql");
    for (const char* target : {"a.sql", "sub.sql", "missing"})
        ASSERT_EQ(::symlink(target, (tmp / "to_" + target).c_str()), 0);
    zr7::StringList list{"already"};
    EXPECT_EQ(InstallUtil::get_file_list((tmp / "missing").c_str(), list), -7);
    EXPECT_EQ(InstallUtil::get_file_list((tmp / "a.sql").c_str(), list), -7);
    EXPECT_EQ(InstallUtil::get_file_list(tmp.path().c_str(), list), 0);
    std::sort(list.begin() + 1, list.end());
    EXPECT_EQ(list, (zr7::StringList{"already", ".hidden", "a.sql", "to_a.sql"}));
}

int xcopy(const TempDir& tmp, const char* dst, unsigned flags) {
    return InstallUtil::xcopy((tmp / "src").c_str(), (tmp / dst).c_str(), flags);
}

// d/old.txt is at the destination already, d/e/new.txt and d/e are not.
TEST(TreeCopy, CreatesDirectoriesAndFollowsOverwriteAndFixCr) {
    const char* const cases[][3] = {{"", "L\r\n", "a\rb\r\n"},
                                    {"O", "I\r\n", "a\rb\r\n"},
                                    {"T", "L\r\n", "ab\n"},
                                    {"OT", "I\n", "ab\n"}};
    for (const auto& c : cases) {
        TempDir tmp;
        make_dirs(tmp / "src/d/e");
        make_dirs(tmp / "dst/d");
        write_file(tmp / "src/d/old.txt", "I\r\n");
        write_file(tmp / "dst/d/old.txt", "L\r\n");
        write_file(tmp / "src/d/e/new.txt", "a\rb\r\n");
        const unsigned flags = zr7::copy_flags_from_options(c[0]);
        EXPECT_EQ(xcopy(tmp, "dst/", flags), 0) << c[0];
        EXPECT_EQ(read_file(tmp / "dst/d/old.txt"), c[1]) << c[0];
        EXPECT_EQ(read_file(tmp / "dst/d/e/new.txt"), c[2]) << c[0];
        EXPECT_EQ(xcopy(tmp, "nowhere/", flags), -5);
        EXPECT_FALSE(zr7test::exists(tmp / "nowhere"));
    }
}

}  // namespace
