// Seeding one file through the stand-in loader.
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <ostream>

#include "qsd/fileops/install_util.h"
#include "seeding/seeding_fixture.h"
#include "support/printable.h"
#include "support/stdout_capture.h"

namespace {

using zr7test::exists;
using zr7test::make_dirs;
using zr7test::read_file;
using zr7test::write_file;

class SeedSingleFileTest : public SeedingTest {
  protected:
    void SetUp() override {
        SeedingTest::SetUp();
        write_file(sqllib + "/a.sql", "INSERT INTO T VALUES (1);\nINSERT INTO T VALUES ('x;y');\n");
    }
};

TEST_F(SeedSingleFileTest, LoaderGetsTheResponseFileAndTheThreeEntries) {
    EXPECT_EQ(installer.seed_single_file(sqllib, "a.sql"), 0);
    EXPECT_EQ(recorded_response("a.sql"), "ip.pipe\nhost1\n7000\na.sql\nend");
    EXPECT_EQ(recorded_environment("a.sql"),
              "KDC_FAMILIES=PORT:7000 ip.pipe USE:Y\n"
              "SQLLIB=" +
                  sqllib +
                  "\n"
                  "VXA_TRC1=ERROR\n"
                  "stdin mode 0600\n");
    EXPECT_EQ(catalog_count("a.sql"), 1) << catalog();
    EXPECT_NE(catalog().find("loaded <a.sql> statements 2\n"), std::string::npos) << catalog();
    EXPECT_FALSE(exists(response_path()));
    // The entries stay in the tool's own environment.
    EXPECT_STREQ(std::getenv("SQLLIB"), sqllib.c_str());
    EXPECT_STREQ(std::getenv("VXA_TRC1"), "ERROR");
}

TEST_F(SeedSingleFileTest, LoaderOutputIsAppendedToTheSeedingLog) {
    write_file(logs + "/a.sql.log", "earlier run\n");
    ASSERT_EQ(installer.seed_single_file(sqllib, "a.sql"), 0);
    const std::string log = read_file(logs + "/a.sql.log");
    EXPECT_EQ(log.rfind("earlier run\nqdsload: loaded <a.sql>", 0), 0u) << log;
}

TEST_F(SeedSingleFileTest, WritesItsDetailLinesInOrder) {
    ASSERT_EQ(run_traced([&] { return installer.seed_single_file(sqllib, "a.sql"); }), 0);
    const std::string rsp = response_path();
    EXPECT_TRUE(trace_lines_in_order(
        out,
        {"Using SQLLIB <" + sqllib + "> ", "seeding <a.sql> ",
         "protocol <ip.pipe> hostname <host1> port <7000>",
         "setting <KDC_FAMILIES=PORT:7000 ip.pipe USE:Y> ", "setting <SQLLIB=" + sqllib + "> ",
         "issuing cmd <qdsload <" + rsp + " >>" + logs + "/a.sql.log> ", "deleting <" + rsp + ">"}))
        << out;
    EXPECT_TRUE(zr7test::has_exit_event(out, "Installer610::seed_single_file", 0)) << out;
}

TEST_F(SeedSingleFileTest, PlantedLinkIsRemovedNotWrittenThrough) {
    write_file(tmp / "victim", "precious");
    ASSERT_EQ(::symlink((tmp / "victim").c_str(), response_path().c_str()), 0);
    EXPECT_EQ(installer.seed_single_file(sqllib, "a.sql"), 0);
    EXPECT_EQ(read_file(tmp / "victim"), "precious");
    EXPECT_EQ(recorded_response("a.sql"), "ip.pipe\nhost1\n7000\na.sql\nend");
    EXPECT_FALSE(exists(response_path()));
}

TEST_F(SeedSingleFileTest, StaleFileAtTheResponsePathIsReplaced) {
    write_file(response_path(), "stale\nlonger than the new content\n", 0666);
    EXPECT_EQ(installer.seed_single_file(sqllib, "a.sql"), 0);
    EXPECT_EQ(recorded_response("a.sql"), "ip.pipe\nhost1\n7000\na.sql\nend");
    EXPECT_NE(recorded_environment("a.sql").find("stdin mode 0600\n"), std::string::npos);
}

TEST_F(SeedSingleFileTest, UncreatableResponseFileGivesMinus8AndRunsNothing) {
    ::setenv("SQLLIB", "before", 1);
    for (const std::string& scratch_dir : {scratch + "/missing/", scratch + "/"}) {
        installer.tmp_path = scratch_dir;
        if (scratch_dir == scratch + "/")
            make_dirs(response_path());  // a directory where the file goes
        const std::string rsp =
            installer.tmp_path + "qsdseed_" + std::to_string(::getpid()) + ".rsp";
        EXPECT_EQ(run_traced([&] { return installer.seed_single_file(sqllib, "a.sql"); }), -8);
        EXPECT_TRUE(zr7test::has_trace_line(out, "Error: Unable to create <" + rsp + "> ")) << out;
        EXPECT_TRUE(zr7test::has_trace_line(out, "deleting <" + rsp + ">")) << out;
        EXPECT_EQ(out.find("issuing cmd"), std::string::npos) << out;
    }
    EXPECT_STREQ(std::getenv("SQLLIB"), "before");
    EXPECT_FALSE(exists(record + "/a.sql.rsp"));
    EXPECT_EQ(catalog_count("a.sql"), 0);
}

TEST_F(SeedSingleFileTest, LoaderFailureGivesMinus6AndRemovesTheResponseFile) {
    ::setenv("QDSLOAD_FAIL", "a.sql", 1);
    EXPECT_EQ(installer.seed_single_file(sqllib, "a.sql"), -6);
    EXPECT_FALSE(exists(response_path()));
    EXPECT_EQ(catalog_count("a.sql"), 0);
}

TEST_F(SeedSingleFileTest, LoaderNotOnPathGivesMinus6) {
    ::setenv("PATH", (tmp / "record").c_str(), 1);
    EXPECT_EQ(run_traced([&] { return installer.seed_single_file(sqllib, "a.sql"); }), -6);
    EXPECT_TRUE(zr7test::has_trace_line(out, "Error: Can't start <qdsload>")) << out;
    EXPECT_FALSE(exists(response_path()));
}

TEST_F(SeedSingleFileTest, AbsentLogDirectoryIsCreated) {
    installer.log_dir = tmp / "newlogs/";
    ASSERT_EQ(installer.seed_single_file(sqllib, "a.sql"), 0);
    EXPECT_NE(read_file(tmp / "newlogs/a.sql.log").find("loaded <a.sql>"), std::string::npos);
}

TEST_F(SeedSingleFileTest, SeedingLogThatCannotBeOpenedGivesMinus6) {
    make_dirs(logs + "/a.sql.log");
    EXPECT_EQ(run_traced([&] { return installer.seed_single_file(sqllib, "a.sql"); }), -6);
    EXPECT_TRUE(zr7test::has_trace_line(out, "Error: Can't open <" + logs + "/a.sql.log>")) << out;
    EXPECT_EQ(catalog_count("a.sql"), 0);
    EXPECT_FALSE(exists(response_path()));
}

TEST_F(SeedSingleFileTest, WithoutLogDirectoryTheLoaderWritesToTheToolsOutput) {
    installer.log_dir.clear();
    ASSERT_EQ(run_traced([&] { return installer.seed_single_file(sqllib, "a.sql"); }), 0);
    EXPECT_TRUE(zr7test::has_trace_line(out, "issuing cmd <qdsload <" + response_path() + "> "))
        << out;
    EXPECT_NE(out.find("\nqdsload: loaded <a.sql>"), std::string::npos) << out;
    EXPECT_TRUE(zr7test::list_dir(logs).empty());
}

TEST_F(SeedSingleFileTest, DestinationWithABlankReachesTheLoaderQuoted) {
    const std::string spaced = tmp / "my tables/SQLLIB";
    make_dirs(spaced);
    write_file(spaced + "/a.sql", "SELECT 1;\n");
    ASSERT_EQ(installer.seed_single_file(spaced, "a.sql"), 0);
    EXPECT_NE(recorded_environment("a.sql").find("SQLLIB=\"" + spaced + "\"\n"), std::string::npos);
    EXPECT_NE(read_file(tmp / "my tables/qdsload.catalog").find("loaded <a.sql> statements 1"),
              std::string::npos);
}

struct PassedOverCase {
    const char* name;
    const char* line;
};

void PrintTo(const PassedOverCase& c, std::ostream* os) {
    *os << "name <" << zr7test::printable(c.name) << ">";
}

class PassedOverTest : public SeedingTest, public ::testing::WithParamInterface<PassedOverCase> {};

TEST_P(PassedOverTest, NameIsPassedOverWithoutALoaderRun) {
    write_file(sqllib + "/" + GetParam().name, "SELECT 1;\n");
    EXPECT_EQ(run_traced([&] { return installer.seed_single_file(sqllib, GetParam().name); }), 0);
    EXPECT_TRUE(zr7test::has_trace_line(out, GetParam().line)) << out;
    EXPECT_EQ(out.find("issuing cmd"), std::string::npos) << out;
    EXPECT_TRUE(zr7test::list_dir(record).empty());
    EXPECT_TRUE(zr7test::list_dir(scratch).empty());
}

INSTANTIATE_TEST_SUITE_P(
    Names, PassedOverTest,
    ::testing::Values(PassedOverCase{"x_DEL.sql", "rejecting all _del.sql for now <x_DEL.sql> "},
                      PassedOverCase{"my_delta.sql",
                                     "rejecting all _del.sql for now <my_delta.sql> "},
                      PassedOverCase{"x_del.txt", "rejecting all _del.sql for now <x_del.txt> "},
                      PassedOverCase{"notes.txt", "rejecting non-sql file <notes.txt> "},
                      PassedOverCase{"sql", "rejecting non-sql file <sql> "}));

}  // namespace
