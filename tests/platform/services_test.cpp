// The process runner, the trace and its environment entry, the progress texts.
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstring>
#include <regex>
#include <tuple>

#include "qsd/platform/process.h"
#include "qsd/platform/trace.h"
#include "support/test_support.h"

namespace {

using zr7::OutputMode;
using zr7::run_process;

TEST(RunProcess, StatusesAndRedirections) {
    const std::tuple<const char*, std::vector<std::string>, int> cases[] = {
        {"false", {}, 1},
        {"perl", {"-e", "kill 'TERM', $$"}, 128 + 15},
        {"zr7-no-such-program", {}, zr7::kRunNotStarted},
        {"/zr7/no/such/program", {}, zr7::kRunNotStarted}};
    for (const auto& [program, args, status] : cases)
        EXPECT_EQ(run_process({program, args, "", "", OutputMode::kInherit}), status) << program;
    // A bad input, or an output that is the input, is refused before the output is emptied.
    zr7test::TempDir dir;
    const std::string in = dir / "in", out = dir / "out";
    zr7test::write_file(in, "data\n");
    zr7test::write_file(out, "old content that is longer\n");
    EXPECT_EQ(run_process({"cat", {}, in, out, OutputMode::kTruncate}), 0);
    EXPECT_EQ(run_process({"cat", {}, in, out, OutputMode::kAppend}), 0);
    EXPECT_EQ(zr7test::read_file(out), "data\ndata\n");
    for (const std::string& bad : {dir / "missing", dir.path()})
        for (OutputMode mode : {OutputMode::kTruncate, OutputMode::kAppend})
            EXPECT_EQ(run_process({"cat", {}, bad, out, mode}), zr7::kRunStdinFailed) << bad;
    EXPECT_EQ(run_process({"cat", {}, in, in, OutputMode::kTruncate}), zr7::kRunStdoutFailed);
    EXPECT_EQ(zr7test::read_file(out) + zr7test::read_file(in), "data\ndata\ndata\n");
}

// Class words for every unit, then "(UNIT:prefix words)" for the units it names.
TEST(TraceSetting, ClassWordsThenUnitGroups) {
    constexpr unsigned E = TRC1_ERROR, D = TRC1_DETAIL, F = TRC1_FLOW;
    const std::tuple<const char*, const char*, unsigned> cases[] = {
        {"Bogus error(unit:ZR7 detail)", "zr7.main", E | D},
        {"ALL (UNIT:zr7 NONE)", "zr7.main", 0},
        {"NONE (UNIT:zr7.ma ERROR) (UNIT:zr7.x DETAIL)", "zr7.main", E},
        {"(GROUP:zr7 ALL) FLOW (UNIT:zr7 DETAIL", "zr7.main", D | F}};
    for (const auto& [setting, unit, flags] : cases)
        EXPECT_EQ(zr7::trace_flags_for(setting, unit), flags) << "<" << setting << "> " << unit;
}

std::string traced_run(const char* setting) {
    zr7::trace_reconfigure(setting);
    testing::internal::CaptureStdout();
    [] {
        ZR7_OPERATION("TraceTest::op");
        ZR7_DETAIL("detail %d <%s>", 42, "x y");
    }();
    return testing::internal::GetCapturedStdout();
}

// A changed setting reaches units that cached the old one.
TEST(TraceLine, StampPidUnitAndLineThenTheMessage) {
    EXPECT_TRUE(std::regex_match(
        traced_run("DETAIL"),
        std::regex(R"(\(\d{4}-\d\d-\d\d \d\d:\d\d:\d\d pid )" + std::to_string(::getpid()) +
                   R"( zr7\.TraceTest::op:\d+\) detail 42 <x y>\n)")));
    EXPECT_EQ(traced_run("NONE"), "");
}

TEST(PutEnv, KeepsItsOwnCopyOfTheEntry) {
    char entry[] = "ZR7_PUTENV_TEST=first";
    ASSERT_EQ(PLT1_PutEnv(entry), 0);
    std::strcpy(entry, "ZR7_PUTENV_TEST=XXXXX");
    EXPECT_STREQ(PLT1_GetEnv("ZR7_PUTENV_TEST", nullptr), "first");
}

}  // namespace
