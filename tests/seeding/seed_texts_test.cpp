// The texts of one loader run.
#include <gtest/gtest.h>
#include <ostream>

#include "qsd/seeding/seed_texts.h"
#include "support/printable.h"

namespace {

TEST(ResponseFile, FourLinesThenEndWithoutNewline) {
    EXPECT_EQ(zr7::response_file_content("ip.pipe", "host1", "7000", "a.sql"),
              "ip.pipe\nhost1\n7000\na.sql\nend");
}

TEST(ResponseFile, EmptyValuesGiveEmptyLines) {
    EXPECT_EQ(zr7::response_file_content("", "", "", "a.sql"), "\n\n\na.sql\nend");
}

TEST(ResponseFile, PathIsScratchDirectoryPrefixAndPid) {
    EXPECT_EQ(zr7::response_file_path("/tmp/", "4242"), "/tmp/qsdseed_4242.rsp");
    EXPECT_EQ(zr7::response_file_path("./", "7"), "./qsdseed_7.rsp");
}

TEST(SeedingLog, FileNameFollowsTheLogDirectoryDirectly) {
    EXPECT_EQ(zr7::seeding_log_path("/srv/logs/", "a.sql"), "/srv/logs/a.sql.log");
}

struct CommandCase {
    const char* response;
    const char* log;
    const char* command;
};

void PrintTo(const CommandCase& c, std::ostream* os) {
    *os << zr7test::printable(c.command);
}

class LoaderCommandTest : public ::testing::TestWithParam<CommandCase> {};

TEST_P(LoaderCommandTest, ReadsAsTheShellWould) {
    EXPECT_EQ(zr7::loader_command_text(GetParam().response, GetParam().log), GetParam().command);
}

INSTANTIATE_TEST_SUITE_P(
    Commands, LoaderCommandTest,
    ::testing::Values(CommandCase{"/tmp/qsdseed_4242.rsp", "/srv/logs/a.sql.log",
                                  "qdsload </tmp/qsdseed_4242.rsp >>/srv/logs/a.sql.log"},
                      CommandCase{"/tmp/qsdseed_4242.rsp", "", "qdsload </tmp/qsdseed_4242.rsp"},
                      CommandCase{"/tmp/qsdseed_1.rsp", "/srv/my logs/a.sql.log",
                                  "qdsload </tmp/qsdseed_1.rsp >>\"/srv/my logs/a.sql.log\""},
                      CommandCase{"./scratch dir/qsdseed_1.rsp", "",
                                  "qdsload <\"./scratch dir/qsdseed_1.rsp\""}));

struct SqllibCase {
    const char* dir;
    const char* entry;
};

void PrintTo(const SqllibCase& c, std::ostream* os) {
    *os << zr7test::printable(c.entry);
}

class SqllibEntryTest : public ::testing::TestWithParam<SqllibCase> {};

TEST_P(SqllibEntryTest, QuotedOnlyWhenHoldingWhiteSpace) {
    EXPECT_EQ(zr7::sqllib_entry(GetParam().dir), GetParam().entry);
}

INSTANTIATE_TEST_SUITE_P(
    Dirs, SqllibEntryTest,
    ::testing::Values(SqllibCase{"/opt/srv/tables/cicatrsq/SQLLIB",
                                 "SQLLIB=/opt/srv/tables/cicatrsq/SQLLIB"},
                      SqllibCase{"/opt/my srv/SQLLIB", "SQLLIB=\"/opt/my srv/SQLLIB\""},
                      SqllibCase{"/opt/tab\tsrv", "SQLLIB=\"/opt/tab\tsrv\""},
                      SqllibCase{"/opt/\"q\"", "SQLLIB=/opt/\"q\""}, SqllibCase{"", "SQLLIB="}));

}  // namespace
