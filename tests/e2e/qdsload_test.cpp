// The stand-in catalog loader: strict checks of its input, the catalog
// record, and the failure on demand.
#include <gtest/gtest.h>

#include <map>
#include <ostream>
#include <string>

#include "support/printable.h"
#include "support/test_support.h"

namespace {

using zr7test::read_file;
using zr7test::write_file;

class QdsloadTest : public ::testing::Test {
  protected:
    void SetUp() override {
        zr7test::make_dirs(sqllib);
        write_file(sqllib + "/a.sql",
                   "-- a comment; not a statement\n"
                   "INSERT INTO T VALUES ('semi;colon');\n"
                   "INSERT INTO T VALUES (2);\n");
    }
    zr7test::RunResult load(const std::string& response,
                            const std::map<std::string, std::string>& env) {
        write_file(tmp / "rsp", response);
        zr7test::RunOptions options;
        options.stdin_path = tmp / "rsp";
        options.unset_env = {"KDC_FAMILIES", "SQLLIB", "QDSLOAD_FAIL", "QDSLOAD_RECORD"};
        options.set_env = env;
        return zr7test::run(zr7test::bin_dir() + "/qdsload", {}, options);
    }
    std::map<std::string, std::string> good_env() const {
        return {{"KDC_FAMILIES", "PORT:1918 ip.pipe USE:Y"}, {"SQLLIB", sqllib}};
    }
    zr7test::TempDir tmp;
    std::string sqllib = tmp / "cicatrsq/SQLLIB";
    const std::string good = "ip.pipe\nhost1\n1918\na.sql\nend";
};

TEST_F(QdsloadTest, LoadsCountsStatementsAndRecordsTheLoad) {
    const zr7test::RunResult r = load(good, good_env());
    ASSERT_EQ(r.exit_code, 0) << r.err;
    EXPECT_EQ(r.out, "qdsload: loaded <a.sql> from <" + sqllib +
                         ">: 2 statements over ip.pipe host1:1918\n");
    const std::string catalog = read_file(tmp / "cicatrsq/qdsload.catalog");
    EXPECT_NE(catalog.find(" loaded <a.sql> statements 2\n"), std::string::npos) << catalog;
}

TEST_F(QdsloadTest, QuotedSqllibNamesThePathInside) {
    const std::string spaced = tmp / "my dir/SQLLIB";
    zr7test::make_dirs(spaced);
    write_file(spaced + "/a.sql", "SELECT 1;\n");
    auto env = good_env();
    env["SQLLIB"] = "\"" + spaced + "\"";
    const zr7test::RunResult r = load(good, env);
    EXPECT_EQ(r.exit_code, 0) << r.err;
    EXPECT_NE(read_file(tmp / "my dir/qdsload.catalog").find("loaded <a.sql>"), std::string::npos);
}

TEST_F(QdsloadTest, FailsOnDemandWithStatus3) {
    auto env = good_env();
    env["QDSLOAD_FAIL"] = "a.sql";
    const zr7test::RunResult r = load(good, env);
    EXPECT_EQ(r.exit_code, 3);
    EXPECT_FALSE(zr7test::exists(tmp / "cicatrsq/qdsload.catalog"));
    env["QDSLOAD_FAIL"] = "other.sql";
    EXPECT_EQ(load(good, env).exit_code, 0);
}

struct BadCase {
    const char* what;
    std::string response;
    const char* unset;  // a variable to leave out, or ""
};

void PrintTo(const BadCase& c, std::ostream* os) {
    *os << zr7test::printable(c.what);
}

class QdsloadBadInputTest : public QdsloadTest, public ::testing::WithParamInterface<BadCase> {};

TEST_P(QdsloadBadInputTest, RefusesWithStatus1AndAMessage) {
    auto env = good_env();
    env.erase(GetParam().unset);
    const zr7test::RunResult r = load(GetParam().response, env);
    EXPECT_EQ(r.exit_code, 1) << GetParam().what;
    EXPECT_EQ(r.err.rfind("qdsload: ", 0), 0u) << GetParam().what << ": " << r.err;
    EXPECT_EQ(r.out, "") << GetParam().what;
    EXPECT_FALSE(zr7test::exists(tmp / "cicatrsq/qdsload.catalog")) << GetParam().what;
}

INSTANTIATE_TEST_SUITE_P(
    Inputs, QdsloadBadInputTest,
    ::testing::Values(BadCase{"newline after end", "ip.pipe\nhost1\n1918\na.sql\nend\n", ""},
                      BadCase{"four lines", "ip.pipe\nhost1\n1918\na.sql", ""},
                      BadCase{"not end", "ip.pipe\nhost1\n1918\na.sql\nEND", ""},
                      BadCase{"empty protocol", "\nhost1\n1918\na.sql\nend", ""},
                      BadCase{"empty host", "ip.pipe\n\n1918\na.sql\nend", ""},
                      BadCase{"empty port", "ip.pipe\nhost1\n\na.sql\nend", ""},
                      BadCase{"empty file name", "ip.pipe\nhost1\n1918\n\nend", ""},
                      BadCase{"path as file name", "ip.pipe\nhost1\n1918\n../a.sql\nend", ""},
                      BadCase{"missing file", "ip.pipe\nhost1\n1918\nb.sql\nend", ""},
                      BadCase{"no KDC_FAMILIES", "ip.pipe\nhost1\n1918\na.sql\nend",
                              "KDC_FAMILIES"},
                      BadCase{"no SQLLIB", "ip.pipe\nhost1\n1918\na.sql\nend", "SQLLIB"}));

}  // namespace
