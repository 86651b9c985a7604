// The seed command: every SQL file of a directory, in directory order.
#include <ostream>

#include "qsd/installer/installer610.h"
#include "seeding/seeding_fixture.h"
#include "support/printable.h"
#include "support/stdout_capture.h"

namespace {

using zr7test::make_dirs;
using zr7test::write_file;

class SeedDriverTest : public SeedingTest {
  protected:
    void SetUp() override {
        SeedingTest::SetUp();
        make_dirs(source);
        installer.add_path_symbol("SRC", (source + "/").c_str());
        installer.add_path_symbol("DST", (sqllib + "/").c_str());
    }
    // The file in the image's directory and, as the copy put it, in SQLLIB.
    void add_sql(const std::string& name) {
        write_file(source + "/" + name, "SELECT 1;\n");
        write_file(sqllib + "/" + name, "SELECT 1;\n");
    }
    std::string source = tmp / "image/SQLLIB";
};

TEST_F(SeedDriverTest, SeedsTheSqlFilesAndPassesOverTheRest) {
    add_sql("a.sql");
    add_sql("b_del.sql");
    add_sql("notes.txt");
    make_dirs(source + "/x.sql");
    EXPECT_EQ(installer.seed("${SRC}", "${DST}"), 0);
    EXPECT_EQ(catalog_count("a.sql"), 1);
    EXPECT_EQ(catalog_count("b_del.sql"), 0);
    EXPECT_EQ(catalog_count("notes.txt"), 0);
    EXPECT_EQ(catalog_count("x.sql"), 0);
}

TEST_F(SeedDriverTest, EmptySourceIsNoFailure) {
    EXPECT_EQ(installer.seed("${SRC}", "${DST}"), 0);
    EXPECT_EQ(catalog(), "");
}

TEST_F(SeedDriverTest, MissingSourceDirectoryGivesMinus7AndSaysSo) {
    EXPECT_EQ(run_traced([&] { return installer.seed("${SRC}/NONE", "${DST}"); }), -7);
    EXPECT_TRUE(zr7test::has_exit_event(out, "Installer610::seed", -7)) << out;
    EXPECT_TRUE(zr7test::has_trace_line(out, "Error: Can't open <" + source + "/NONE>")) << out;
}

TEST_F(SeedDriverTest, ResponseFileFailureStopsTheSeedingWithMinus8) {
    add_sql("a.sql");
    installer.tmp_path = scratch + "/missing/";
    EXPECT_EQ(run_traced([&] { return installer.seed("${SRC}", "${DST}"); }), -8);
    EXPECT_TRUE(zr7test::has_trace_line(out, "Error: Seeding <a.sql> failed")) << out;
}

struct TemplateCase {
    const char* src;
    const char* dst;
    const char* line;
};

void PrintTo(const TemplateCase& c, std::ostream* os) {
    *os << zr7test::printable(c.line);
}

class SeedTemplateTest : public SeedDriverTest,
                         public ::testing::WithParamInterface<TemplateCase> {};

TEST_P(SeedTemplateTest, BadTemplateGivesMinus1AndSeedsNothing) {
    add_sql("a.sql");
    EXPECT_EQ(run_traced([&] { return installer.seed(GetParam().src, GetParam().dst); }), -1);
    EXPECT_TRUE(zr7test::has_trace_line(out, GetParam().line)) << out;
    EXPECT_EQ(catalog(), "");
}

INSTANTIATE_TEST_SUITE_P(Templates, SeedTemplateTest,
                         ::testing::Values(TemplateCase{"", "${DST}", "Error: Bad src path <>"},
                                           TemplateCase{"${NOPE}", "${DST}",
                                                        "Error: Bad src path <${NOPE}>"},
                                           TemplateCase{"${SRC}", "", "Error: Bad dst path <>"},
                                           TemplateCase{"${SRC}", "${DST}/${NOPE}",
                                                        "Error: Bad dst path <${DST}/${NOPE}>"}));

}  // namespace
