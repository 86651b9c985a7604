// The symbol table and the expansion of path templates.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"
#include "support/trace_lines.h"

namespace {

struct ResolveCase {
    const char* path_template;
    int rc;
    const char* out;    // what was appended before the end or the failure
    const char* error;  // the error line, or "" for none
};

const ResolveCase kResolves[] = {
    {"${HOMEPATH}/tables/${QMSNAME}/ATTRLIB", 0, "/opt/srv/tables/SRV1/ATTRLIB", ""},
    {"${SRCPATH}/${BINARCH}/TABLE", 0, "/img/MSRV//TABLE", ""},
    {"${QMSNAME}${QMSNAME}", 0, "SRV1SRV1", ""},
    {"", 0, "", ""},
    {"plain/{HOMEPATH}", 0, "plain/{HOMEPATH}", ""},
    {"cost$", 0, "cost$", ""},
    {"$$", 0, "$", ""},
    {"a$xb", 0, "a$b", ""},
    {"$${QMSNAME}", 0, "${QMSNAME}", ""},
    {"${NESTED}", 0, "${HOMEPATH}", ""},
    {"${homepath}", -1, "", "Error: Symbol <homepath> not found"},
    {"${}", -1, "", "Error: Symbol <> not found"},
    {"${A${B}}", -1, "", "Error: Symbol <A${B> not found"},
    {"/a/${HOMEPATH}/${nope}/b", -1, "/a//opt/srv/", "Error: Symbol <nope> not found"},
    {"/x/${HOMEPATH", -1, "/x/", ""},
    {"${", -1, "", ""},
};

class SymbolsTest : public ::testing::Test {
  protected:
    void SetUp() override {
        installer.add_path_symbol("HOMEPATH", "/opt/srv/");
        installer.add_path_symbol("SRCPATH", "/img/MSRV/");
        installer.add_symbol("BINARCH", "");
        installer.add_symbol("QMSNAME", "SRV1");
        installer.add_symbol("NESTED", "${HOMEPATH}");
    }
    Installer610 installer;
};

TEST_F(SymbolsTest, ResolveFollowsTheStateTable) {
    zr7::trace_reconfigure("ERROR");
    for (const ResolveCase& c : kResolves) {
        std::string out;
        testing::internal::CaptureStdout();
        const int rc = installer.resolve(c.path_template, out);
        const std::string lines = testing::internal::GetCapturedStdout();
        EXPECT_EQ(rc, c.rc) << c.path_template;
        EXPECT_EQ(out, c.out) << c.path_template;
        std::vector<std::string> expected;
        if (*c.error != '\0')
            expected.push_back(c.error);
        EXPECT_TRUE(zr7test::lines_end_with(lines, expected)) << c.path_template;
    }
}

TEST_F(SymbolsTest, ResolveAppendsAndIsSilentWithoutTheErrorClass) {
    zr7::trace_reconfigure("NONE");
    std::string out = "pre:";
    testing::internal::CaptureStdout();
    EXPECT_EQ(installer.resolve("${HOMEPATH}", out), 0);
    EXPECT_EQ(installer.resolve("${missing}", out), -1);
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "");
    EXPECT_EQ(out, "pre:/opt/srv");
}

TEST(PathSymbolTest, OneTrailingSlashIsLeftOff) {
    const std::pair<const char*, const char*> cases[] = {
        {"/opt/srv/", "/opt/srv"},
        {"/img//", "/img/"},
        {"./", "."},
        {"/", ""},
        {"/opt/srv", "/opt/srv"},
        {"", ""},
    };
    for (const auto& c : cases) {
        Installer610 installer;
        std::string value = "untouched";
        EXPECT_EQ(installer.add_path_symbol("P", c.first), 0);
        EXPECT_EQ(installer.find_symbol("P", value), 0) << c.first;
        EXPECT_EQ(value, c.second) << c.first;
    }
}

TEST(PathSymbolTest, FirstValueStaysAndAbsentArgumentsAreRefused) {
    Installer610 installer;
    EXPECT_EQ(installer.add_path_symbol("HOMEPATH", "/first/"), 0);
    EXPECT_EQ(installer.add_path_symbol("HOMEPATH", "/second/"), 0);
    EXPECT_EQ(installer.add_symbol("HOMEPATH", "/third"), 0);
    EXPECT_EQ(installer.add_path_symbol(nullptr, "/x/"), -1);
    EXPECT_EQ(installer.add_path_symbol("X", nullptr), -1);
    EXPECT_EQ(installer.add_symbol(nullptr, "v"), -1);
    EXPECT_EQ(installer.add_symbol("X", nullptr), -1);

    std::string value = "untouched";
    EXPECT_EQ(installer.find_symbol("homepath", value), -1);
    EXPECT_EQ(installer.find_symbol(nullptr, value), -1);
    EXPECT_EQ(installer.find_symbol("X", value), -1);
    EXPECT_EQ(value, "untouched");
    EXPECT_EQ(installer.find_symbol("HOMEPATH", value), 0);
    EXPECT_EQ(value, "/first");
    EXPECT_EQ(installer.symbols.size(), 1u);
}

}  // namespace
