// The key=value splitter and the "-c" settings that go through it.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"
#include "support/trace_lines.h"

namespace {

struct SplitCase {
    const char* text;  // null: absent
    int rc;
    const char* key;
    const char* value;
};

const SplitCase kSplits[] = {
    {"a=b", 0, "a", "b"},
    {" a = b c ", 0, "a", "b c"},
    {"a=b=c", 0, "a", "b=c"},
    {"a=", 0, "a", ""},
    {"=b", -1, "", ""},
    {"abc", -1, "", ""},
    {"", -1, "", ""},
    {"  =b", -1, "", "b"},
    {"\ta\t=\tb\t", 0, "\ta\t", "\tb\t"},
    {"Key = val \n", 0, "Key", "val \n"},
    {"k= =", 0, "k", "="},
    {nullptr, -1, "", ""},
};

TEST(GetKeyValTest, SplitsAtTheFirstEqualsSign) {
    for (const SplitCase& c : kSplits) {
        const std::string shown = c.text == nullptr ? "(null)" : c.text;
        std::string key = "stale";
        std::string value = "stale";
        EXPECT_EQ(InstallUtil::get_key_val(c.text, key, value), c.rc) << shown;
        EXPECT_EQ(key, c.key) << shown;
        EXPECT_EQ(value, c.value) << shown;
    }
}

struct AddVarCase {
    std::vector<const char*> texts;  // given in order to one installer
    std::vector<int> results;
    std::vector<std::pair<std::string, std::string>> table;  // settings afterwards
    std::vector<std::string> lines;                          // trace lines with ALL
};

const AddVarCase kAddVars[] = {
    {{"a = b "}, {0}, {{"A", "b"}}, {"Entry", "Will be adding <A> <b> to VXAENV", "Exit: 0"}},
    {{"x="}, {0}, {{"X", ""}}, {"Entry", "Will be adding <X> <> to VXAENV", "Exit: 0"}},
    {{"=x"}, {-1}, {}, {"Entry", "Exit: -1"}},
    {{"x"}, {-1}, {}, {"Entry", "Exit: -1"}},
    {{" =x"}, {-1}, {}, {"Entry", "Exit: -1"}},
    {{nullptr}, {-1}, {}, {"Entry", "Exit: -1"}},
    {{"kds_run=on"}, {-1}, {}, {"Entry", "Error: Use -m to modify KDS_RUN", "Exit: -1"}},
    {{"a=1", "A=2"},
     {0, -1},
     {{"A", "1"}},
     {"Entry", "Will be adding <A> <1> to VXAENV", "Exit: 0", "Entry",
      "Error: Duplicate key <A> specified in options", "Exit: -1"}},
    {{"b=2", "a=1", "Mixed_Case=v"},
     {0, 0, 0},
     {{"B", "2"}, {"A", "1"}, {"MIXED_CASE", "v"}},
     {"Entry", "Will be adding <B> <2> to VXAENV", "Exit: 0", "Entry",
      "Will be adding <A> <1> to VXAENV", "Exit: 0", "Entry",
      "Will be adding <MIXED_CASE> <v> to VXAENV", "Exit: 0"}},
};

TEST(AddVarTest, RecordsOrRefusesEachSetting) {
    zr7::trace_reconfigure("ALL");
    for (const AddVarCase& c : kAddVars) {
        const std::string shown = c.texts[0] == nullptr ? "(null)" : c.texts[0];
        Installer610 installer;
        std::vector<int> results;
        testing::internal::CaptureStdout();
        for (const char* text : c.texts)
            results.push_back(installer.addVar(text));
        const std::string out = testing::internal::GetCapturedStdout();
        EXPECT_EQ(results, c.results) << shown;
        EXPECT_EQ(installer.settings.entries(), c.table) << shown;
        EXPECT_TRUE(zr7test::lines_end_with(out, c.lines)) << shown;
    }
}

TEST(AddVarTest, ErrorClassAloneShowsOnlyTheRefusals) {
    zr7::trace_reconfigure("ERROR");
    Installer610 installer;
    testing::internal::CaptureStdout();
    EXPECT_EQ(installer.addVar("a=1"), 0);
    EXPECT_EQ(installer.addVar("a=2"), -1);
    EXPECT_EQ(installer.addVar("KDS_RUN=x"), -1);
    const std::string out = testing::internal::GetCapturedStdout();
    EXPECT_TRUE(zr7test::lines_end_with(
        out, {"Error: Duplicate key <A> specified in options", "Error: Use -m to modify KDS_RUN"}));
}

}  // namespace
