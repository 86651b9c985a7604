// The environment file rewrite: which lines change, what is appended, which
// settings are consumed, and the detail lines, over the file's text alone.
#include <gtest/gtest.h>

#include <utility>
#include <vector>

#include "qsd/envfile/env_rewrite.h"

namespace {

using Settings = std::vector<std::pair<std::string, std::string>>;

struct RewriteCase {
    const char* name;
    std::string content;
    Settings settings;
    std::string module;
    std::string expected;
    bool changed;
    zr7::StringList remaining;  // keys left in the table afterwards
    zr7::StringList details;
};

class EnvRewriteTest : public ::testing::TestWithParam<RewriteCase> {};

TEST_P(EnvRewriteTest, RewritesContent) {
    const RewriteCase& c = GetParam();
    zr7::Dictionary settings;
    for (const auto& entry : c.settings)
        ASSERT_TRUE(settings.insert(entry.first, entry.second));
    zr7::EnvRewrite rewrite = zr7::rewrite_env_content(c.content, settings, c.module);
    EXPECT_EQ(rewrite.content, c.expected);
    EXPECT_EQ(rewrite.changed, c.changed);
    zr7::StringList remaining;
    for (const auto& entry : settings.entries())
        remaining.push_back(entry.first);
    EXPECT_EQ(remaining, c.remaining);
    EXPECT_EQ(rewrite.details, c.details);
}

std::string with_nul(const std::string& before, const std::string& after) {
    return before + std::string(1, '\0') + after;
}

const std::string kLongLine = std::string(1500, 'x') + "A=1;" + std::string(700, 'y') + "\n";

const RewriteCase kRewriteCases[] = {
    {"Identical",
     "A=1\nB=2\n",
     {{"A", "1"}},
     "",
     "A=1\nB=2\n",
     false,
     {},
     {"Identical <A> <1> found.  No update."}},
    {"Replaced",
     "A=1\nB=2\n",
     {{"B", "3"}},
     "",
     "A=1\nB=3\n",
     true,
     {},
     {"Replacing <B> <2> with <3>"}},
    {"Appended", "A=1\n", {{"C", "x"}}, "", "A=1\nC=x\n", true, {"C"}, {"Added <C> <x>"}},
    {"AppendedInGivenOrder",
     "A=1\n",
     {{"C", "3"}, {"B", "2"}},
     "",
     "A=1\nC=3\nB=2\n",
     true,
     {"C", "B"},
     {"Added <C> <3>", "Added <B> <2>"}},
    {"IdenticalReplacedAndAppended",
     "A=1\nB=2\n",
     {{"A", "1"}, {"B", "3"}, {"C", "4"}},
     "",
     "A=1\nB=3\nC=4\n",
     true,
     {"C"},
     {"Identical <A> <1> found.  No update.", "Replacing <B> <2> with <3>", "Added <C> <4>"}},
    {"LowerCaseKeyReplacedUpperCase",
     "kdc_families=old\n",
     {{"KDC_FAMILIES", "new"}},
     "",
     "KDC_FAMILIES=new\n",
     true,
     {},
     {"Replacing <KDC_FAMILIES> <old> with <new>"}},
    {"BlanksAroundKeyIdenticalKeepsForm",
     "  a  =  1\n",
     {{"A", "1"}},
     "",
     "  a  =  1\n",
     false,
     {},
     {"Identical <A> <1> found.  No update."}},
    {"BlankBeforeNewlineDiffers",
     "A=1 \n",
     {{"A", "1"}},
     "",
     "A=1\n",
     true,
     {},
     {"Replacing <A> <1 > with <1>"}},
    {"TabBeforeEqualsDoesNotMatch",
     "A\t=1\n",
     {{"A", "2"}},
     "",
     "A\t=1\nA=2\n",
     true,
     {"A"},
     {"Added <A> <2>"}},
    {"OnlyFirstOccurrence",
     "A=1\nA=1\n",
     {{"A", "2"}},
     "",
     "A=2\nA=1\n",
     true,
     {},
     {"Replacing <A> <1> with <2>"}},
    {"HashKeyIsAnotherKey",
     "#A=1\n",
     {{"A", "1"}},
     "",
     "#A=1\nA=1\n",
     true,
     {"A"},
     {"Added <A> <1>"}},
    {"OtherLinesByteForByte",
     "no equals\n=starts\n\n  \n\tA=1\r\n",
     {{"B", "2"}},
     "",
     "no equals\n=starts\n\n  \n\tA=1\r\nB=2\n",
     true,
     {"B"},
     {"Added <B> <2>"}},
    {"FurtherEqualsInValueIdentical",
     "A=x=y\n",
     {{"A", "x=y"}},
     "",
     "A=x=y\n",
     false,
     {},
     {"Identical <A> <x=y> found.  No update."}},
    {"FurtherEqualsInValueReplaced",
     "A=x=y\n",
     {{"A", "x"}},
     "",
     "A=x\n",
     true,
     {},
     {"Replacing <A> <x=y> with <x>"}},
    {"EmptyValueIdentical",
     "A=\n",
     {{"A", ""}},
     "",
     "A=\n",
     false,
     {},
     {"Identical <A> <> found.  No update."}},
    {"EmptyValueAppended", "B=1\n", {{"A", ""}}, "", "B=1\nA=\n", true, {"A"}, {"Added <A> <>"}},
    {"NoFinalNewlineBeforeAppend",
     "B=1",
     {{"A", "2"}},
     "",
     "B=1\nA=2\n",
     true,
     {"A"},
     {"Added <A> <2>"}},
    {"EmptyFileGetsEmptyLineFirst",
     "",
     {{"A", "2"}},
     "",
     "\nA=2\n",
     true,
     {"A"},
     {"Added <A> <2>"}},
    {"NoFinalNewlineIdentical",
     "A=1",
     {{"A", "1"}},
     "",
     "A=1",
     false,
     {},
     {"Identical <A> <1> found.  No update."}},
    {"ReplacedLastLineCountsByReplacement",
     "A=1",
     {{"A", "2"}, {"B", "3"}},
     "",
     "A=2\nB=3\n",
     true,
     {"B"},
     {"Replacing <A> <1> with <2>", "Added <B> <3>"}},
    {"CrLfValueDiffers",
     "A=1\r\n",
     {{"A", "1"}},
     "",
     "A=1\n",
     true,
     {},
     {"Replacing <A> <1\r> with <1>"}},
    {"ModuleAppended",
     "X=1\nKDS_RUN=A\n",
     {},
     "M",
     "X=1\nKDS_RUN=A;M\n",
     true,
     {},
     {"old KDS_RUN <KDS_RUN=A>", "new KDS_RUN <KDS_RUN=A;M>"}},
    {"ModuleWithoutKdsRunLine", "A=1\n", {}, "M", "A=1\n", false, {}, {}},
    {"SeveralKdsRunLines",
     "KDS_RUN=A\nX=1\nkds_run=B;M\n",
     {},
     "M",
     "KDS_RUN=A;M\nX=1\nkds_run=B;M\n",
     true,
     {},
     {"old KDS_RUN <KDS_RUN=A>", "new KDS_RUN <KDS_RUN=A;M>", "old KDS_RUN <kds_run=B;M>",
      "<M> is already part of KDS_RUN", "KDS_RUN unchanged"}},
    {"KdsRunWithoutNewlineThenSettings",
     "KDS_RUN=X",
     {{"A", "1"}},
     "M",
     "KDS_RUN=X;M\n\nA=1\n",
     true,
     {"A"},
     {"old KDS_RUN <KDS_RUN=X>", "new KDS_RUN <KDS_RUN=X;M>", "Added <A> <1>"}},
    {"KdsRunWithoutModuleLeftAlone",
     "KDS_RUN=A\n",
     {{"B", "1"}},
     "",
     "KDS_RUN=A\nB=1\n",
     true,
     {"B"},
     {"Added <B> <1>"}},
    {"NulBytesSurvive",
     with_nul("A=x", "y\n") + "B=1\n" + with_nul("C", "=z\n"),
     {{"B", "2"}},
     "",
     with_nul("A=x", "y\n") + "B=2\n" + with_nul("C", "=z\n"),
     true,
     {},
     {"Replacing <B> <1> with <2>"}},
    {"LongLineWhole",
     kLongLine,
     {{"A", "2"}},
     "",
     kLongLine + "A=2\n",
     true,
     {"A"},
     {"Added <A> <2>"}},
};

INSTANTIATE_TEST_SUITE_P(Files, EnvRewriteTest, ::testing::ValuesIn(kRewriteCases),
                         [](const ::testing::TestParamInfo<RewriteCase>& param_info) {
                             return std::string(param_info.param.name);
                         });

TEST(EnvRewriteHooks, KdsRunLinesGoOnlyToTheHookWhenAModuleIsRequested) {
    zr7::Dictionary settings;
    settings.insert("KDS_RUN", "never");
    zr7::StringList seen;
    auto hook = [&](const std::string& line, std::string& out) {
        seen.push_back(line);
        out = "KDS_RUN=hooked\n";
        return 1;
    };
    zr7::StringList details;
    auto sink = [&](const std::string& line) { details.push_back(line); };
    std::string out;
    EXPECT_TRUE(zr7::rewrite_env_content("kds_run=a\nB=1\n", settings, true, hook, sink, out));
    EXPECT_EQ(out, "KDS_RUN=hooked\nB=1\nKDS_RUN=never\n");
    EXPECT_EQ(seen, zr7::StringList{"kds_run=a\n"});
    // The line went to the hook, so the setting found no line and is appended.
    EXPECT_EQ(details, zr7::StringList{"Added <KDS_RUN> <never>"});
}

}  // namespace
