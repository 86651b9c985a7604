// Backups under ".archive": the time stamp, the names, the content, and that
// no backup ever replaces an earlier one.
#include <gtest/gtest.h>

#include <algorithm>
#include <ctime>

#include "qsd/envfile/backup.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"
#include "support/test_support.h"

namespace {

using zr7test::list_dir;
using zr7test::read_file;
using zr7test::write_file;

struct StampCase {
    std::time_t now;
    unsigned stamp;
};

class BackupStampTest : public ::testing::TestWithParam<StampCase> {};

TEST_P(BackupStampTest, CountsSecondsSince1901) {
    EXPECT_EQ(zr7::backup_stamp(GetParam().now), GetParam().stamp);
}

INSTANTIATE_TEST_SUITE_P(Clock, BackupStampTest,
                         ::testing::Values(StampCase{1700000000, 3877452800u},
                                           StampCase{0, 2177452800u},
                                           StampCase{2117514495, 4294967295u},
                                           StampCase{2117514496, 0u},  // 2037-02-06 06:28:16
                                           StampCase{2117514500, 4u}));

class BackupFileTest : public ::testing::Test {
  protected:
    zr7test::TempDir dir;
    const std::string content = "A=1\r\nKDS_RUN=X\n";
    void SetUp() override { write_file(dir / "VXAENV", content); }
    std::string archive() const { return dir / ".archive"; }
};

TEST_F(BackupFileTest, FirstBackupCreatesArchiveAndKeepsBytes) {
    std::string made;
    ASSERT_EQ(zr7::backup_file(dir.path().c_str(), "VXAENV", dir.path().c_str(), 3877452800u, made),
              0);
    EXPECT_EQ(made, archive() + "/VXAENV_3877452800");
    EXPECT_EQ(read_file(made), content);
    // Nothing but the backup: the scratch copy is gone.
    EXPECT_EQ(list_dir(archive()), std::vector<std::string>{"VXAENV_3877452800"});
}

TEST_F(BackupFileTest, TrailingSlashesGiveSinglePathSeparators) {
    const std::string with_slash = dir.path() + "/";
    std::string made;
    ASSERT_EQ(zr7::backup_file(with_slash.c_str(), "VXAENV", with_slash.c_str(), 7u, made), 0);
    EXPECT_EQ(made, dir.path() + "/.archive/VXAENV_7");
}

TEST_F(BackupFileTest, TakenNamesAreSkippedAndKept) {
    zr7test::make_dirs(archive());
    write_file(archive() + "/VXAENV_100", "first state\n");
    write_file(archive() + "/VXAENV_101", "second state\n");
    std::string made;
    ASSERT_EQ(zr7::backup_file(dir.path().c_str(), "VXAENV", dir.path().c_str(), 100u, made), 0);
    EXPECT_EQ(made, archive() + "/VXAENV_102");
    EXPECT_EQ(read_file(archive() + "/VXAENV_100"), "first state\n");
    EXPECT_EQ(read_file(archive() + "/VXAENV_101"), "second state\n");
    EXPECT_EQ(read_file(made), content);
}

TEST_F(BackupFileTest, StampWrapsAtTheTopOfItsRange) {
    zr7test::make_dirs(archive());
    write_file(archive() + "/VXAENV_4294967295", "taken\n");
    std::string made;
    ASSERT_EQ(zr7::backup_file(dir.path().c_str(), "VXAENV", dir.path().c_str(), 4294967295u, made),
              0);
    EXPECT_EQ(made, archive() + "/VXAENV_0");
}

TEST_F(BackupFileTest, ArchiveThatIsAFileFails) {
    write_file(archive(), "not a directory\n");
    std::string made;
    EXPECT_EQ(zr7::backup_file(dir.path().c_str(), "VXAENV", dir.path().c_str(), 1u, made), -9);
    EXPECT_EQ(read_file(archive()), "not a directory\n");
    EXPECT_TRUE(made.empty());
}

TEST_F(BackupFileTest, ArchiveThatCannotBeCreatedFails) {
    const std::string missing_base = dir / "no/such/base";
    std::string made;
    EXPECT_EQ(zr7::backup_file(dir.path().c_str(), "VXAENV", missing_base.c_str(), 1u, made), -9);
}

TEST_F(BackupFileTest, MissingSourceFailsAndLeavesNoScratchFile) {
    std::string made;
    EXPECT_EQ(zr7::backup_file(dir.path().c_str(), "NOFILE", dir.path().c_str(), 1u, made), -9);
    EXPECT_TRUE(list_dir(archive()).empty());
}

TEST_F(BackupFileTest, ErrorAndDetailLines) {
    zr7::trace_reconfigure("ALL");
    std::string made;
    ::testing::internal::CaptureStdout();
    zr7::backup_file(dir.path().c_str(), "VXAENV", dir.path().c_str(), 5u, made);
    zr7::backup_file(dir.path().c_str(), "NOFILE", dir.path().c_str(), 9u, made);
    const std::string trace = ::testing::internal::GetCapturedStdout();
    zr7::trace_reconfigure("ERROR");
    const std::string source = dir / "VXAENV";
    EXPECT_NE(trace.find("File <" + source + "> is backed up as <" + archive() +
                         "/VXAENV_5> successfully"),
              std::string::npos)
        << trace;
    EXPECT_NE(trace.find("Error: Can't back up <" + dir.path() + "/NOFILE> to <" + archive() +
                         "/NOFILE_9>"),
              std::string::npos)
        << trace;
}

TEST_F(BackupFileTest, MemberStampsWithTheClock) {
    Installer610 installer;
    const unsigned before = zr7::backup_stamp(std::time(nullptr));
    ASSERT_EQ(installer.make_backup(dir.path().c_str(), "VXAENV", dir.path().c_str()), 0);
    const unsigned after = zr7::backup_stamp(std::time(nullptr));
    const std::vector<std::string> names = list_dir(archive());
    ASSERT_EQ(names.size(), 1u);
    ASSERT_EQ(names[0].rfind("VXAENV_", 0), 0u);
    const unsigned long stamp = std::stoul(names[0].substr(7));
    EXPECT_GE(stamp, before);
    EXPECT_LE(stamp, after);
}

TEST_F(BackupFileTest, TwoBackupsInOneSecondBothKept) {
    Installer610 installer;
    ASSERT_EQ(installer.make_backup(dir.path().c_str(), "VXAENV", dir.path().c_str()), 0);
    write_file(dir / "VXAENV", "changed\n");
    ASSERT_EQ(installer.make_backup(dir.path().c_str(), "VXAENV", dir.path().c_str()), 0);
    const std::vector<std::string> names = list_dir(archive());
    ASSERT_EQ(names.size(), 2u);
    std::vector<std::string> contents{read_file(archive() + "/" + names[0]),
                                      read_file(archive() + "/" + names[1])};
    std::sort(contents.begin(), contents.end());
    EXPECT_EQ(contents, (std::vector<std::string>{content, "changed\n"}));
}

}  // namespace
