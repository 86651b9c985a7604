// The trace setting, the shape of a trace line, and the environment entry.
#include "qsd/platform/trace.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "support/trace_lines.h"

namespace {

struct FlagsCase {
    const char* setting;
    const char* unit;
    unsigned flags;
};

constexpr unsigned E = TRC1_ERROR;
constexpr unsigned D = TRC1_DETAIL;
constexpr unsigned F = TRC1_FLOW;

const FlagsCase kFlags[] = {
    {"", "zr7.main", E},
    {" \t ", "zr7.main", E},
    {"ERROR", "zr7.main", E},
    {"ERROR (UNIT:zr7 ALL)", "zr7.main", E | D | F},
    {"ERROR (UNIT:zr7 ALL)", "zr7.Installer610::copy", E | D | F},
    {"ERROR (UNIT:zr7 ALL)", "kds.other", E},
    {"error(unit:ZR7 detail)", "zr7.main", E | D},
    {"Detail flow", "zr7.main", D | F},
    {"ALL", "zr7.main", E | D | F},
    {"NONE", "zr7.main", 0},
    {"BOGUS", "zr7.main", 0},
    {"ERROR BOGUS (UNIT:zr7 WHATEVER FLOW)", "zr7.main", E | F},
    {"ALL (UNIT:zr7 NONE)", "zr7.main", 0},
    {"NONE (UNIT:zr7.ma ERROR) (UNIT:zr7.x DETAIL)", "zr7.main", E},
    {"(UNIT:kds ALL)", "zr7.main", 0},
    {"(GROUP:zr7 ALL) ERROR", "zr7.main", E},
    {"ERROR (UNIT:zr7 FLOW", "zr7.main", E | F},
};

TEST(TraceSettingTest, ClassWordsAndUnitGroups) {
    for (const FlagsCase& c : kFlags) {
        EXPECT_EQ(zr7::trace_flags_for(c.setting, c.unit), c.flags)
            << "<" << c.setting << "> for " << c.unit;
    }
}

int traced_operation(int status) {
    ZR7_OPERATION("TraceTest::op");
    ZR7_DETAIL("detail %d <%s>", 42, "x y");
    ZR7_ERROR("Error: Can't open <%s>", "f");
    ZR7_RETURN(status);
}

TEST(TraceLineTest, PrefixThenTheMessageAtTheEndOfTheLine) {
    zr7::trace_reconfigure("ERROR (UNIT:zr7 ALL)");
    testing::internal::CaptureStdout();
    traced_operation(-7);
    const std::string out = testing::internal::GetCapturedStdout();
    ASSERT_TRUE(zr7test::lines_end_with(
        out, {"Entry", "detail 42 <x y>", "Error: Can't open <f>", "Exit: -7"}));
    ASSERT_EQ(out.back(), '\n');
    const std::string pid = std::to_string(getpid());
    for (const std::string& line : zr7test::lines_of(out)) {
        EXPECT_NE(line.find("TraceTest::op"), std::string::npos) << line;
        EXPECT_NE(line.find(pid), std::string::npos) << line;
    }
    // The message stands after the prefix, never at the start of the line.
    EXPECT_GT(zr7test::lines_of(out)[1].size(), std::strlen("detail 42 <x y>"));
}

TEST(TraceLineTest, ClassesFollowTheSettingWhenItChanges) {
    zr7::trace_reconfigure("ERROR");
    testing::internal::CaptureStdout();
    traced_operation(0);
    EXPECT_TRUE(
        zr7test::lines_end_with(testing::internal::GetCapturedStdout(), {"Error: Can't open <f>"}));

    zr7::trace_reconfigure("NONE");
    testing::internal::CaptureStdout();
    traced_operation(0);
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "");

    zr7::trace_reconfigure("DETAIL");
    testing::internal::CaptureStdout();
    traced_operation(0);
    EXPECT_TRUE(
        zr7test::lines_end_with(testing::internal::GetCapturedStdout(), {"detail 42 <x y>"}));
}

TEST(PutEnvTest, KeepsItsOwnCopyOfTheEntry) {
    char entry[] = "ZR7_PUTENV_TEST=first value";
    ASSERT_EQ(PLT1_PutEnv(entry), 0);
    std::memcpy(entry, "XXXXXXXXXXXXXXXXXXXXXXXXXXX", sizeof entry - 1);
    ASSERT_NE(PLT1_GetEnv("ZR7_PUTENV_TEST", nullptr), nullptr);
    EXPECT_STREQ(PLT1_GetEnv("ZR7_PUTENV_TEST", nullptr), "first value");

    EXPECT_EQ(PLT1_PutEnv("ZR7_PUTENV_TEST="), 0);
    EXPECT_STREQ(PLT1_GetEnv("ZR7_PUTENV_TEST", nullptr), "");
    EXPECT_EQ(PLT1_PutEnv("VXA_TRC1=ERROR (UNIT:zr7 ALL)"), 0);
    EXPECT_STREQ(std::getenv("VXA_TRC1"), "ERROR (UNIT:zr7 ALL)");
    EXPECT_EQ(PLT1_GetEnv("ZR7_NEVER_SET_ANYWHERE", nullptr), nullptr);
}

}  // namespace
