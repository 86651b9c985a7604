// The progress line and the closing summary as texts: what they say, how
// they fit a terminal, and that no file name can steer the terminal.
#include <gtest/gtest.h>

#include <ostream>
#include <string>

#include "qsd/platform/progress.h"

namespace {

zr7::ProgressState at_command(int index, int kind, const std::string& source) {
    zr7::ProgressState state;
    state.command = index;
    state.commands = 17;
    state.kind = kind;
    state.source_template = source;
    return state;
}

struct LineCase {
    const char* name;
    zr7::ProgressState state;
    std::string line;
};

zr7::ProgressState with_counts(zr7::ProgressState state, long copied, long seeded,
                               const std::string& seeding = "") {
    state.files_copied = copied;
    state.files_seeded = seeded;
    state.seeding = seeding;
    return state;
}

void PrintTo(const LineCase& c, std::ostream* os) {
    *os << c.name;
}

class ProgressLineTest : public ::testing::TestWithParam<LineCase> {};

TEST_P(ProgressLineTest, NamesTheCommandAndTheCounts) {
    EXPECT_EQ(zr7::progress_line(GetParam().state, 200), GetParam().line);
}

INSTANTIATE_TEST_SUITE_P(
    Commands, ProgressLineTest,
    ::testing::Values(
        LineCase{"FlatCopy", with_counts(at_command(1, 1, "${SRCPATH}/ATTRLIB"), 0, 0),
                 "[1/17] copy ATTRLIB | files: 0 copied, 0 seeded"},
        LineCase{"TreeCopy", with_counts(at_command(8, 2, "${SRCPATH}/${BINARCH}/TABLE"), 23, 0),
                 "[8/17] copy tree TABLE | files: 23 copied, 0 seeded"},
        LineCase{"FlatCopyOutOfATree",
                 with_counts(at_command(15, 1, "${SRCPATH}/${BINARCH}/TABLE/TECLIB"), 31, 0),
                 "[15/17] copy TABLE/TECLIB | files: 31 copied, 0 seeded"},
        LineCase{"EnvironmentFile",
                 with_counts(at_command(14, 3, "${HOMEPATH}/tables/${QMSNAME}"), 30, 0),
                 "[14/17] update VXAENV | files: 30 copied, 0 seeded"},
        LineCase{"Seeding", with_counts(at_command(17, 4, "${SRCPATH}/SQLLIB"), 40, 1, "kzr_b.sql"),
                 "[17/17] seed SQLLIB | files: 40 copied, 1 seeded | seeding kzr_b.sql"},
        LineCase{"ControlBytesInAName",
                 with_counts(at_command(17, 4, "${SRCPATH}/SQLLIB"), 0, 0, "a\033]0;pwn\007.sql"),
                 "[17/17] seed SQLLIB | files: 0 copied, 0 seeded | seeding a?]0;pwn?.sql"}),
    [](const ::testing::TestParamInfo<LineCase>& param_info) {
        return std::string(param_info.param.name);
    });

TEST(ProgressLine, NeverReachesTheLastColumn) {
    const zr7::ProgressState state =
        with_counts(at_command(17, 4, "${SRCPATH}/SQLLIB"), 40, 1, "a_rather_long_file_name.sql");
    const std::string line = zr7::progress_line(state, 30);
    EXPECT_EQ(line, "[17/17] seed SQLLIB | file...");
    EXPECT_EQ(zr7::display_width(line), 29u);
    EXPECT_EQ(zr7::progress_line(state, 3), "[1");
    EXPECT_EQ(zr7::progress_line(state, 0), "");
}

TEST(ProgressLine, CutsBetweenCharactersNotInsideOne) {
    // Each "é" is two bytes and one column.
    const zr7::ProgressState state = with_counts(at_command(17, 4, "${SRCPATH}/SQLLIB"), 0, 0,
                                                 "\xc3\xa9\xc3\xa9\xc3\xa9\xc3\xa9.sql");
    const std::string full = zr7::progress_line(state, 200);
    ASSERT_EQ(full, "[17/17] seed SQLLIB | files: 0 copied, 0 seeded | seeding éééé.sql");
    const std::string cut = zr7::progress_line(state, zr7::display_width(full) - 2);
    EXPECT_EQ(cut, "[17/17] seed SQLLIB | files: 0 copied, 0 seeded | seeding éé...");
}

struct SafeCase {
    const char* name;
    std::string in;
    std::string out;
};

void PrintTo(const SafeCase& c, std::ostream* os) {
    *os << c.name;
}

class TerminalSafeTest : public ::testing::TestWithParam<SafeCase> {};

TEST_P(TerminalSafeTest, ReplacesWhatATerminalWouldObey) {
    EXPECT_EQ(zr7::terminal_safe(GetParam().in), GetParam().out);
}

INSTANTIATE_TEST_SUITE_P(
    Bytes, TerminalSafeTest,
    ::testing::Values(SafeCase{"Plain", "/srv/tables/SRV1/x.dat", "/srv/tables/SRV1/x.dat"},
                      SafeCase{"Escape", "\033[2J", "?[2J"},
                      SafeCase{"LineEndsAndTabs", "a\r\n\tb", "a???b"},
                      SafeCase{"Delete", "a\x7f", "a?"},
                      SafeCase{"Utf8Kept", "caf\xc3\xa9 \xe2\x82\xac \xf0\x9f\x93\xa6",
                               "caf\xc3\xa9 \xe2\x82\xac \xf0\x9f\x93\xa6"},
                      SafeCase{"C1ControlEncoded",
                               "\xc2\x9b"
                               "2J",
                               "??2J"},
                      SafeCase{"C1ControlRaw",
                               "\x9b"
                               "2J",
                               "?2J"},
                      SafeCase{"NotUtf8", "\xff\xfe", "??"}, SafeCase{"Overlong", "\xc0\xaf", "??"},
                      SafeCase{"Surrogate", "\xed\xa0\x80", "???"},
                      SafeCase{"CutShort", "ab\xe2\x82", "ab??"}),
    [](const ::testing::TestParamInfo<SafeCase>& param_info) {
        return std::string(param_info.param.name);
    });

TEST(ProgressSummary, DoneWithAChangedEnvironmentFile) {
    zr7::ProgressState state = with_counts(at_command(17, 4, "${SRCPATH}/SQLLIB"), 42, 2);
    state.env_reported = true;
    state.env_changed = true;
    state.backup = "/srv/tables/SRV1/.archive/VXAENV_3976118400";
    EXPECT_EQ(zr7::progress_summary(state, 0),
              "zr7inst: installation done\n"
              "  files copied: 42\n"
              "  files seeded: 2\n"
              "  VXAENV: changed, backup /srv/tables/SRV1/.archive/VXAENV_3976118400\n");
}

TEST(ProgressSummary, FailureNamesTheCommandThatStoppedTheRun) {
    zr7::ProgressState state = with_counts(at_command(1, 1, "${SRCPATH}/ATTRLIB"), 0, 0);
    EXPECT_EQ(zr7::progress_summary(state, -5),
              "zr7inst: installation failed with rc <-5> at [1/17] copy ATTRLIB\n"
              "  files copied: 0\n"
              "  files seeded: 0\n"
              "  VXAENV: not updated\n");
}

TEST(ProgressSummary, FailureBeforeTheFirstCommand) {
    EXPECT_EQ(zr7::progress_summary(zr7::ProgressState{}, 2),
              "zr7inst: installation failed with rc <2>\n"
              "  files copied: 0\n"
              "  files seeded: 0\n"
              "  VXAENV: not updated\n");
}

TEST(ProgressSummary, UnchangedFileAndUnsafeBackupName) {
    zr7::ProgressState state;
    state.env_reported = true;
    EXPECT_NE(zr7::progress_summary(state, 0).find("  VXAENV: unchanged\n"), std::string::npos);
    state.env_changed = true;
    state.backup = "/srv/\033[31m/VXAENV_1";
    EXPECT_NE(
        zr7::progress_summary(state, 0).find("  VXAENV: changed, backup /srv/?[31m/VXAENV_1\n"),
        std::string::npos);
}

TEST(ProgressWanted, OnlyForATerminalOnStandardErrorAlone) {
    EXPECT_TRUE(zr7::progress_wanted(true, false));
    EXPECT_FALSE(zr7::progress_wanted(true, true));
    EXPECT_FALSE(zr7::progress_wanted(false, false));
    EXPECT_FALSE(zr7::progress_wanted(false, true));
}

}  // namespace
