// The usage text: exact bytes on standard error and status 254, whichever
// way the command line goes wrong.
#include <gtest/gtest.h>

#include "support/test_support.h"

namespace {

const char* const kUsage =
    "Usage: zr7inst [-c key=val] [-e] [-f] [-h home] [-m mod] [-s] [-v ver] [-V] src_dir\n"
    "  -c key=val Add key=val in VXAENV if not already there.\n"
    "             or updates it to new value\n"
    "  -e       Copy files only.  Skip seeding.\n"
    "  -f       Force file copy.  (Deprecated)\n"
    "  -h home  Installation directory.  If not specified here,\n"
    "           then it must be defined thru env var MARLIN_HOME.\n"
    "  -m mod   Use 'mod' as module name.  This will cause VXAENV\n"
    "           to be updated, and 'mod' appended to KDS_RUN.\n"
    "  -s       Seeding only.  Skip copying\n"
    "  -v ver   Version of the source image.  Currently only\n"
    "           610 is supported.  Default is 610.\n"
    "  -V       Print out version as vvrrmmff.  If this is the\n"
    "           only option, exit right away.\n";

class UsageTest : public ::testing::TestWithParam<std::vector<std::string>> {};

TEST_P(UsageTest, PrintsUsageAndExits254) {
    zr7test::RunResult r = zr7test::run(zr7test::tool_path(), GetParam());
    EXPECT_EQ(r.exit_code, 254);
    EXPECT_EQ(r.err, kUsage);
}

INSTANTIATE_TEST_SUITE_P(
    BadCommandLines, UsageTest,
    ::testing::Values(std::vector<std::string>{}, std::vector<std::string>{"-x", "/img"},
                      std::vector<std::string>{"-h"}, std::vector<std::string>{"/img", "/other"},
                      std::vector<std::string>{"/img", "-e"},
                      std::vector<std::string>{"-:", "/img"}, std::vector<std::string>{""},
                      std::vector<std::string>{"-h", "/x", ""}));

}  // namespace
