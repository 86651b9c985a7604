// The environment file update: settings and module names applied to VXAENV's
// text, then against real files the backup, the atomic replacement, what it
// keeps, and what a refusal, a full disk or several runs at once leave.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <ctime>
#include <functional>
#include <set>
#include <utility>
#include <vector>

#include "qsd/envfile/backup.h"
#include "qsd/envfile/env_rewrite.h"
#include "qsd/installer/installer610.h"
#include "support/test_support.h"

namespace {

using namespace std::string_literals;
using zr7test::kSampleVxaenv;
using zr7test::list_dir;
using zr7test::read_file;
using Names = std::vector<std::string>;

struct RewriteCase {
    std::string content;
    std::vector<std::pair<std::string, std::string>> settings;
    std::string module, expected, details;  // details joined by "|"
};

// Lines without a key, NUL bytes and a long line pass untouched.
const std::string kOdd = "no equals\n=x\n\n\t#A=1\nN=a\0b\n"s + std::string(1500, 'x') + "A=1;" +
                         std::string(700, 'y') + "\n";
const std::string kAlready = "is already part of KDS_RUN";

// clang-format off
const RewriteCase kCases[] = {
    {"A=1\nB=2\n", {{"A", "1"}, {"B", "3"}, {"D", "4"}, {"C", ""}}, "", "A=1\nB=3\nD=4\nC=\n",
     "Identical <A> <1> found.  No update.|Replacing <B> <2> with <3>|Added <D> <4>|Added <C> <>"},
    {"  a  =  1\n", {{"A", "1"}}, "", "  a  =  1\n", "Identical <A> <1> found.  No update."},
    {"kdc_families=old\nKDC_FAMILIES=old\n", {{"KDC_FAMILIES", "new"}}, "",
     "KDC_FAMILIES=new\nKDC_FAMILIES=old\n", "Replacing <KDC_FAMILIES> <old> with <new>"},
    {"A=1\r\n", {{"A", "1"}}, "", "A=1\n", "Replacing <A> <1\r> with <1>"},
    {"A=x=y\n", {{"A", "x"}}, "", "A=x\n", "Replacing <A> <x=y> with <x>"},
    {kOdd, {{"A", "2"}}, "", kOdd + "A=2\n", "Added <A> <2>"},
    {"A\t=1", {{"A", "2"}}, "", "A\t=1\nA=2\n", "Added <A> <2>"},
    {"", {{"A", "2"}}, "", "\nA=2\n", "Added <A> <2>"},
    {"A=1", {{"A", "2"}, {"B", "3"}}, "", "A=2\nB=3\n", "Replacing <A> <1> with <2>|Added <B> <3>"},
    {"KDS_RUN=A\n", {{"B", "1"}}, "", "KDS_RUN=A\nB=1\n", "Added <B> <1>"},
    // The module run list: only missing names are appended, in the given order.
    {"X=1\nKDS_RUN=A;B\n", {}, "C;A;D", "X=1\nKDS_RUN=A;B;C;D\n",
     "old KDS_RUN <KDS_RUN=A;B>|<A> " + kAlready + "|new KDS_RUN <KDS_RUN=A;B;C;D>"},
    // Key form normalised, carriage return dropped, blanks of the value kept.
    {"kds_run = A\r\n", {}, "C", "KDS_RUN= A;C\n",
     "old KDS_RUN <kds_run = A>|new KDS_RUN <KDS_RUN= A;C>"},
    {"KDS_RUN=   \n", {}, "C", "KDS_RUN=C\n", "old KDS_RUN <KDS_RUN=>|new KDS_RUN <KDS_RUN=C>"},
    {"KDS_RUN=abc;;B;", {}, "ABC", "KDS_RUN=abc;;B;;ABC\n",
     "old KDS_RUN <KDS_RUN=abc;;B;>|new KDS_RUN <KDS_RUN=abc;;B;;ABC>"},
    // Every KDS_RUN line; one listing the names keeps its form.
    {"KDS_RUN=A\n kds_run=A; M ;B \r\n", {}, "M", "KDS_RUN=A;M\n kds_run=A; M ;B \r\n",
     "old KDS_RUN <KDS_RUN=A>|new KDS_RUN <KDS_RUN=A;M>|old KDS_RUN < kds_run=A; M ;B>|<M> " +
     kAlready + "|KDS_RUN unchanged"},
    // Each listed entry cancels one name only.
    {"KDS_RUN=C\n", {}, "C;C", "KDS_RUN=C;C\n",
     "old KDS_RUN <KDS_RUN=C>|<C> " + kAlready + "|new KDS_RUN <KDS_RUN=C;C>"},
    // Runs of ";" give nothing, a blank piece gives an empty name.
    {"KDS_RUN=A=1\n", {}, ";;B; ; C ;;", "KDS_RUN=A=1;B;;C\n",
     "old KDS_RUN <KDS_RUN=A=1>|new KDS_RUN <KDS_RUN=A=1;B;;C>"},
    {"KDS_RUN\nA=1\n", {}, "M", "KDS_RUN\nA=1\n", ""},
    // Judged as read: a module line without its newline is followed by an empty line.
    {"KDS_RUN=X", {{"A", "1"}}, "M", "KDS_RUN=X;M\n\nA=1\n",
     "old KDS_RUN <KDS_RUN=X>|new KDS_RUN <KDS_RUN=X;M>|Added <A> <1>"},
};
// clang-format on

TEST(EnvRewrite, AppliesSettingsToTheirFirstLineAndAddsMissingModules) {
    for (const RewriteCase& c : kCases) {
        zr7::Dictionary settings;
        for (const auto& entry : c.settings)
            settings.insert(entry.first, entry.second);
        const zr7::EnvRewrite r = zr7::rewrite_env_content(c.content, settings, c.module);
        EXPECT_EQ(r.content, c.expected) << c.content;
        EXPECT_EQ(r.changed, c.expected != c.content) << c.content;
        std::string details;
        for (const std::string& line : r.details)
            details += (details.empty() ? "" : "|") + line;
        EXPECT_EQ(details, c.details) << c.content;
        // Applied settings are consumed; appended ones stay.
        for (const auto& entry : c.settings) {
            const bool added = c.details.find("Added <" + entry.first + ">") != std::string::npos;
            EXPECT_EQ(settings.find(entry.first) != nullptr, added) << entry.first;
        }
    }
}

TEST(BackupStamp, CountsSecondsSince1901AndWrapsIn2037) {
    EXPECT_EQ(zr7::backup_stamp(1700000000), 3877452800u);
    EXPECT_EQ(zr7::backup_stamp(2117514500), 4u);
}

class UpdateVxaenvTest : public ::testing::Test {
  protected:
    void SetUp() override { zr7test::write_file(vxaenv, kSampleVxaenv, 0640); }
    int update(const std::string& module, const Names& settings = {}) const {
        Installer610 installer;
        installer.module_name = module;
        for (const std::string& setting : settings)
            EXPECT_EQ(installer.addVar(setting.c_str()), 0);
        return installer.update_vxaenv(dir.path());
    }
    zr7test::TempDir dir;
    const std::string vxaenv = dir / "VXAENV";
    const std::string archive = dir / ".archive";
};

TEST_F(UpdateVxaenvTest, BackupTakesTheNextFreeNameAndKeepsTheEarlierOne) {
    zr7test::make_dirs(archive);
    zr7test::write_file(archive + "/VXAENV_7", "first\n");
    std::string made;
    ASSERT_EQ(zr7::backup_file(dir.path().c_str(), "VXAENV", dir.path().c_str(), 7, made), 0);
    EXPECT_EQ(made, archive + "/VXAENV_8");
    EXPECT_EQ(read_file(made), kSampleVxaenv);
    EXPECT_EQ(read_file(archive + "/VXAENV_7"), "first\n");
}

TEST_F(UpdateVxaenvTest, UnchangedRefusedOrFailedUpdatesLeaveTheFileAlone) {
    const struct timespec old_times[2] = {{978307200, 0}, {978307200, 0}};
    ASSERT_EQ(::utimensat(AT_FDCWD, vxaenv.c_str(), old_times, 0), 0);
    EXPECT_EQ(update("KDSTRACE", {"KDS_START=1"}), 0);
    // A line break would smuggle in a line of its own.
    EXPECT_EQ(update("A\nKDS_START=0"), -1);
    EXPECT_EQ(update("", {"X=a\nKDS_RUN=evil"}), -1);
    struct stat st {};
    ASSERT_EQ(::stat(vxaenv.c_str(), &st), 0);
    EXPECT_EQ(st.st_mtim.tv_sec, 978307200);
    EXPECT_EQ(list_dir(dir.path()), Names{"VXAENV"});
    zr7test::write_file(archive, "in the way\n");
    EXPECT_EQ(update("KZR"), -9);
    EXPECT_EQ(read_file(vxaenv), kSampleVxaenv);
    EXPECT_EQ(list_dir(dir.path()), (Names{".archive", "VXAENV"}));
}

}  // namespace
