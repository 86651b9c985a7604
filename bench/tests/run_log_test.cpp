// Reading the journal time from the tool's log: the closing line as the tool
// writes it, the last of several runs, and lines that must not be read.
#include <gtest/gtest.h>

#include <string>

#include "bench/run/run_log.h"
#include "qsd/driver/driver.h"
#include "qsd/driver/progress.h"

namespace {

using zr7bench::last_run_end;
using zr7bench::RunEnd;

// The line the tool writes, so that a change of its wording shows here.
std::string tool_line(int status, long copied, double elapsed, double journal) {
    zr7::ProgressState state;
    state.files_copied = copied;
    state.files_seeded = 3;
    state.env_reported = true;
    state.env_changed = true;
    return "(2026-12-07 02:42:16 pid 4464 zr7.main:238) " +
           zr7::run_closing_line(status, state, elapsed, journal) + "\n";
}

TEST(LastRunEnd, ReadsTheToolsClosingLine) {
    const RunEnd end =
        last_run_end("(trace) zr7inst run begins: ...\n" + tool_line(-5, 23708, 38.75, 0.861));
    ASSERT_TRUE(end.found);
    EXPECT_EQ(end.rc, -5);
    EXPECT_EQ(end.files_copied, 23708);
    EXPECT_DOUBLE_EQ(end.elapsed_s, 38.75);
    EXPECT_DOUBLE_EQ(end.journal_s, 0.861);
}

// The log is appended to by each run into the home: the last run counts.
TEST(LastRunEnd, TheLastRunOfTheLog) {
    const RunEnd end = last_run_end(tool_line(0, 570, 1.343, 0.019) + "(trace) later line\n" +
                                    tool_line(0, 0, 0.036, 0.0) + "(trace) after it\n");
    ASSERT_TRUE(end.found);
    EXPECT_EQ(end.files_copied, 0);
    EXPECT_DOUBLE_EQ(end.elapsed_s, 0.036);
    EXPECT_DOUBLE_EQ(end.journal_s, 0.0);
}

TEST(LastRunEnd, LinesThatAreNotRead) {
    const char* const logs[] = {
        "",
        "(trace) zr7inst run begins: time x\n",
        // Before the journal's field was added to the line.
        "zr7inst run ends: rc 0, files copied 5, files seeded 0, VXAENV changed, elapsed 1.000 s\n",
        "zr7inst run ends: rc 0, files copied 5, files seeded 0, elapsed 1.000 s, journal  s\n",
        "zr7inst run ends: rc 0, files copied x, files seeded 0, elapsed 1.000 s, journal 0.1 s\n",
        // A run cut short: the line ends within a field.
        "zr7inst run ends: rc 0, files copied 5, files seeded 0, elapsed 1.000 s, journ",
    };
    for (const char* log : logs)
        EXPECT_FALSE(last_run_end(log).found) << log;
}

// A key inside another word or value is no field ("src 1", "xjournal 9").
TEST(LastRunEnd, FieldsStartAfterACommaOrTheColon) {
    const RunEnd end = last_run_end(
        "zr7inst run ends: rc 2, files copied 7, files seeded 0, note src 1 xjournal 9 s, "
        "elapsed 4.500 s, journal 0.250 s");
    ASSERT_TRUE(end.found);
    EXPECT_EQ(end.rc, 2);
    EXPECT_DOUBLE_EQ(end.journal_s, 0.25);
}

}  // namespace
