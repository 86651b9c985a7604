// Listing the plain files of one directory.
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>

#include "qsd/fileops/install_util.h"
#include "qsd/platform/trace.h"
#include "support/dir_order.h"
#include "support/stdout_capture.h"
#include "support/test_support.h"

namespace {

using zr7test::TempDir;

TEST(GetFileList, ListsNonDirectoriesInDirectoryOrderAfterWhatTheListHeld) {
    TempDir tmp;
    zr7test::write_file(tmp / "a.sql", "a");
    zr7test::write_file(tmp / ".hidden", "h");
    zr7test::make_dirs(tmp / "sub.sql");
    ASSERT_EQ(::symlink("a.sql", (tmp / "to_file").c_str()), 0);
    ASSERT_EQ(::symlink("sub.sql", (tmp / "to_dir").c_str()), 0);
    ASSERT_EQ(::symlink("missing", (tmp / "dangling").c_str()), 0);

    // Expected: what was there, then the listable names in directory order.
    zr7::StringList expected{"already"};
    for (const std::string& name : zr7test::readdir_order(tmp.path())) {
        if (name == "a.sql" || name == ".hidden" || name == "to_file")
            expected.push_back(name);
    }
    zr7::StringList list{"already"};
    EXPECT_EQ(InstallUtil::get_file_list(tmp.path().c_str(), list), 0);
    EXPECT_EQ(list, expected);
}

TEST(GetFileList, WritesOneAddingLinePerListedName) {
    TempDir tmp;
    zr7test::write_file(tmp / "a.sql", "a");
    zr7test::make_dirs(tmp / "sub");
    zr7::trace_reconfigure("DETAIL");
    zr7::StringList list;
    const std::string out = zr7test::capture_stdout(
        [&] { EXPECT_EQ(InstallUtil::get_file_list(tmp.path().c_str(), list), 0); });
    zr7::trace_reconfigure("ERROR");
    EXPECT_TRUE(zr7test::has_trace_line(out, "adding <a.sql>")) << out;
    EXPECT_EQ(out.find("adding <sub>"), std::string::npos) << out;
}

TEST(GetFileList, DirectoryThatCannotBeOpenedGivesMinus7AndLeavesTheList) {
    TempDir tmp;
    zr7test::write_file(tmp / "plain", "x");
    for (const std::string& dir : {tmp / "missing", tmp / "plain"}) {
        zr7::StringList list{"keep"};
        EXPECT_EQ(InstallUtil::get_file_list(dir.c_str(), list), -7) << dir;
        EXPECT_EQ(list, zr7::StringList{"keep"});
    }
}

TEST(GetFileList, EmptyDirectoryAddsNothing) {
    TempDir tmp;
    zr7::StringList list;
    EXPECT_EQ(InstallUtil::get_file_list(tmp.path().c_str(), list), 0);
    EXPECT_TRUE(list.empty());
}

}  // namespace
