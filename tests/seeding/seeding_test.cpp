// Seeding: which names go to the loader, the texts of a loader run, and one
// run through the stand-in loader, which records what it was given.
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <utility>

#include "qsd/installer/installer610.h"
#include "qsd/seeding/seed_texts.h"
#include "support/test_support.h"

namespace {

using zr7test::list_dir;
using zr7test::read_file;
using Names = std::vector<std::string>;

TEST(SqlSelection, DecidesOnTheNameAlone) {
    constexpr auto kSeed = zr7::SqlSelection::kSeed;
    constexpr auto kDel = zr7::SqlSelection::kDeletion;
    constexpr auto kNot = zr7::SqlSelection::kNotSql;
    const std::pair<const char*, zr7::SqlSelection> cases[] = {
        {"a.sql", kSeed},        {"Mixed.SqL", kSeed},   {".sql", kSeed},
        {"two.dots.sql", kSeed}, {"del.sql", kSeed},     {"x-del.sql", kSeed},
        {"x_DEL.sql", kDel},     {"my_delta.sql", kDel}, {"x_del.txt", kDel},
        {"notes.txt", kNot},     {"sql", kNot},          {"", kNot},
        {"a.sql.bak", kNot},     {"a.sql ", kNot},       {"asql", kNot},
        {"a.sq\xcc", kNot},  // only A to Z fold
    };
    for (const auto& c : cases)
        EXPECT_EQ(zr7::select_sql_name(c.first), c.second) << c.first;
}

TEST(SeedTexts, ResponseFileAndSqlDirectoryEntry) {
    EXPECT_EQ(zr7::response_file_content("ip.pipe", "host1", "7000", "a.sql"),
              "ip.pipe\nhost1\n7000\na.sql\nend");
    EXPECT_EQ(zr7::response_file_content("", "", "", "a.sql"), "\n\n\na.sql\nend");
    EXPECT_EQ(zr7::sqllib_entry("/opt/srv/SQLLIB"), "SQLLIB=/opt/srv/SQLLIB");
    EXPECT_EQ(zr7::sqllib_entry("/opt/my srv"), "SQLLIB=\"/opt/my srv\"");
    EXPECT_EQ(zr7::sqllib_entry("/opt/tab\tsrv"), "SQLLIB=\"/opt/tab\tsrv\"");
}

class LoaderRunTest : public ::testing::Test {
  protected:
    void SetUp() override {
        const char* path = std::getenv("PATH");
        ::setenv("PATH", (zr7test::bin_dir() + ":" + (path ? path : "/usr/bin:/bin")).c_str(), 1);
        ::setenv("QDSLOAD_RECORD", record.c_str(), 1);
        ::unsetenv("QDSLOAD_FAIL");
        for (const std::string& dir : {sqllib, scratch, logs, record})
            zr7test::make_dirs(dir);
        zr7test::write_file(sqllib + "/a.sql",
                            "INSERT INTO T VALUES (1);\nINSERT INTO T VALUES ('x;y');\n");
        installer.protocol = "ip.pipe";
        installer.host_name = "host1";
        installer.port = "7000";
        installer.family_setting = "KDC_FAMILIES=PORT:7000 ip.pipe USE:Y";
        installer.tmp_path = scratch + "/";
        installer.log_dir = logs + "/";
    }
    zr7test::TempDir tmp;
    const std::string sqllib = tmp / "tables/SQLLIB", scratch = tmp / "scratch";
    const std::string logs = tmp / "logs", record = tmp / "record";
    Installer610 installer;
};

TEST_F(LoaderRunTest, LoaderGetsAPrivateResponseFileAndItsEntriesAndAppendsToTheLog) {
    // A link planted at the response file's predictable name is not followed.
    const std::string response = scratch + "/qsdseed_" + std::to_string(::getpid()) + ".rsp";
    zr7test::write_file(tmp / "victim", "precious");
    ASSERT_EQ(::symlink((tmp / "victim").c_str(), response.c_str()), 0);
    zr7test::write_file(logs + "/a.sql.log", "earlier run\n");
    ASSERT_EQ(installer.seed_single_file(sqllib, "a.sql"), 0);
    EXPECT_EQ(read_file(record + "/a.sql.rsp"), "ip.pipe\nhost1\n7000\na.sql\nend");
    EXPECT_EQ(read_file(record + "/a.sql.env"), "KDC_FAMILIES=PORT:7000 ip.pipe USE:Y\nSQLLIB=" +
                                                    sqllib + "\nVXA_TRC1=ERROR\nstdin mode 0600\n");
    EXPECT_EQ(read_file(tmp / "victim"), "precious");
    EXPECT_TRUE(list_dir(scratch).empty());
    EXPECT_EQ(read_file(logs + "/a.sql.log").rfind("earlier run\nqdsload: loaded <a.sql>", 0), 0u);
    EXPECT_NE(read_file(tmp / "tables/qdsload.catalog").find("loaded <a.sql> statements 2\n"),
              std::string::npos);
}

TEST_F(LoaderRunTest, ResponseFileThatCannotBeWrittenGivesMinus8AndRunsNothing) {
    std::fflush(stdout);
    const pid_t pid = ::fork();
    if (pid == 0) {  // files of more than four bytes fail in this child only
        const struct rlimit tiny = {4, 4};
        ::setrlimit(RLIMIT_FSIZE, &tiny);
        std::signal(SIGXFSZ, SIG_IGN);
        ::_exit(installer.seed_single_file(sqllib, "a.sql") & 0xFF);
    }
    int status = 0;
    ASSERT_EQ(::waitpid(pid, &status, 0), pid);
    EXPECT_EQ(WEXITSTATUS(status), 248);  // -8
    EXPECT_TRUE(list_dir(scratch).empty());
    EXPECT_TRUE(list_dir(record).empty());
}

}  // namespace
