// The module run list: which names are appended to a KDS_RUN line, where the
// ";" go, and the detail lines that tell an administrator what happened.
#include <gtest/gtest.h>

#include "qsd/envfile/kds_run_list.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"

namespace {

struct KdsRunCase {
    const char* name;
    std::string line;
    std::string module;
    int result;
    std::string expected_line;
    zr7::StringList details;
};

class KdsRunListTest : public ::testing::TestWithParam<KdsRunCase> {};

TEST_P(KdsRunListTest, AppendsMissingModules) {
    const KdsRunCase& c = GetParam();
    zr7::KdsRunUpdate update = zr7::update_kds_run_line(c.line, c.module);
    EXPECT_EQ(update.result, c.result);
    EXPECT_EQ(update.line, c.expected_line);
    EXPECT_EQ(update.details, c.details);
}

const KdsRunCase kKdsRunCases[] = {
    {"AppendsAfterEntries",
     "KDS_RUN=A;B\n",
     "C",
     1,
     "KDS_RUN=A;B;C\n",
     {"old KDS_RUN <KDS_RUN=A;B>", "new KDS_RUN <KDS_RUN=A;B;C>"}},
    {"KeyFormNormalisedValueBlanksKept",
     "kds_run = A\n",
     "C",
     1,
     "KDS_RUN= A;C\n",
     {"old KDS_RUN <kds_run = A>", "new KDS_RUN <KDS_RUN= A;C>"}},
    {"EmptyListNoLeadingSemicolon",
     "KDS_RUN=\n",
     "C",
     1,
     "KDS_RUN=C\n",
     {"old KDS_RUN <KDS_RUN=>", "new KDS_RUN <KDS_RUN=C>"}},
    {"BlankListIsEmpty",
     "KDS_RUN=   \n",
     "C",
     1,
     "KDS_RUN=C\n",
     {"old KDS_RUN <KDS_RUN=>", "new KDS_RUN <KDS_RUN=C>"}},
    {"TrailingSemicolonKept",
     "KDS_RUN=A;\n",
     "C",
     1,
     "KDS_RUN=A;;C\n",
     {"old KDS_RUN <KDS_RUN=A;>", "new KDS_RUN <KDS_RUN=A;;C>"}},
    {"OnlySemicolonHasNoEntries",
     "KDS_RUN=;\n",
     "C",
     1,
     "KDS_RUN=;C\n",
     {"old KDS_RUN <KDS_RUN=;>", "new KDS_RUN <KDS_RUN=;C>"}},
    {"EmptyPositionsNotCounted",
     "KDS_RUN=A;;B\n",
     "C",
     1,
     "KDS_RUN=A;;B;C\n",
     {"old KDS_RUN <KDS_RUN=A;;B>", "new KDS_RUN <KDS_RUN=A;;B;C>"}},
    {"ListedWithBlanksUnchanged",
     "KDS_RUN=A; B ;C\n",
     "B",
     0,
     "KDS_RUN=A; B ;C\n",
     {"old KDS_RUN <KDS_RUN=A; B ;C>", "<B> is already part of KDS_RUN", "KDS_RUN unchanged"}},
    {"UnchangedLineKeepsItsForm",
     " kds_run=A;B \r\n",
     "A",
     0,
     " kds_run=A;B \r\n",
     {"old KDS_RUN < kds_run=A;B>", "<A> is already part of KDS_RUN", "KDS_RUN unchanged"}},
    {"CaseMatters",
     "KDS_RUN=abc\n",
     "ABC",
     1,
     "KDS_RUN=abc;ABC\n",
     {"old KDS_RUN <KDS_RUN=abc>", "new KDS_RUN <KDS_RUN=abc;ABC>"}},
    {"OnlyMissingOnesInGivenOrder",
     "KDS_RUN=A;B\n",
     "C;A;D",
     1,
     "KDS_RUN=A;B;C;D\n",
     {"old KDS_RUN <KDS_RUN=A;B>", "<A> is already part of KDS_RUN",
      "new KDS_RUN <KDS_RUN=A;B;C;D>"}},
    {"NamedTwiceAppendedTwice",
     "KDS_RUN=A\n",
     "C;C",
     1,
     "KDS_RUN=A;C;C\n",
     {"old KDS_RUN <KDS_RUN=A>", "new KDS_RUN <KDS_RUN=A;C;C>"}},
    {"NamedTwiceListedOnce",
     "KDS_RUN=C\n",
     "C;C",
     1,
     "KDS_RUN=C;C\n",
     {"old KDS_RUN <KDS_RUN=C>", "<C> is already part of KDS_RUN", "new KDS_RUN <KDS_RUN=C;C>"}},
    {"AllListed",
     "KDS_RUN=A;B",
     "B;A",
     0,
     "KDS_RUN=A;B",
     {"old KDS_RUN <KDS_RUN=A;B>", "<A> is already part of KDS_RUN",
      "<B> is already part of KDS_RUN", "KDS_RUN unchanged"}},
    {"CarriageReturnDropped",
     "KDS_RUN=A\r\n",
     "B",
     1,
     "KDS_RUN=A;B\n",
     {"old KDS_RUN <KDS_RUN=A>", "new KDS_RUN <KDS_RUN=A;B>"}},
    {"NoNewlineGainsOne",
     "KDS_RUN=A",
     "B",
     1,
     "KDS_RUN=A;B\n",
     {"old KDS_RUN <KDS_RUN=A>", "new KDS_RUN <KDS_RUN=A;B>"}},
    {"BlankModuleIsEmptyName",
     "KDS_RUN=A\n",
     "  ",
     1,
     "KDS_RUN=A;\n",
     {"old KDS_RUN <KDS_RUN=A>", "new KDS_RUN <KDS_RUN=A;>"}},
    {"BlankPieceBetweenSemicolons",
     "KDS_RUN=A\n",
     "B; ;C",
     1,
     "KDS_RUN=A;B;;C\n",
     {"old KDS_RUN <KDS_RUN=A>", "new KDS_RUN <KDS_RUN=A;B;;C>"}},
    {"RunsOfSemicolonsInModuleName",
     "KDS_RUN=A\n",
     ";;B;;",
     1,
     "KDS_RUN=A;B\n",
     {"old KDS_RUN <KDS_RUN=A>", "new KDS_RUN <KDS_RUN=A;B>"}},
    {"ModuleBlanksStripped",
     "KDS_RUN=A\n",
     " B ",
     1,
     "KDS_RUN=A;B\n",
     {"old KDS_RUN <KDS_RUN=A>", "new KDS_RUN <KDS_RUN=A;B>"}},
    {"FurtherEqualsPartOfList",
     "KDS_RUN=A=1\n",
     "A",
     1,
     "KDS_RUN=A=1;A\n",
     {"old KDS_RUN <KDS_RUN=A=1>", "new KDS_RUN <KDS_RUN=A=1;A>"}},
    {"NoEqualsLeftAlone", "KDS_RUN\n", "A", 0, "KDS_RUN\n", {"old KDS_RUN <KDS_RUN>"}},
};

INSTANTIATE_TEST_SUITE_P(Lines, KdsRunListTest, ::testing::ValuesIn(kKdsRunCases),
                         [](const ::testing::TestParamInfo<KdsRunCase>& param_info) {
                             return std::string(param_info.param.name);
                         });

TEST(UpdateKdsRunMember, TracesOldAndNewLines) {
    zr7::trace_reconfigure("ALL");
    Installer610 installer;
    installer.module_name = "KZR";
    std::string out;
    ::testing::internal::CaptureStdout();
    const int result = installer.update_kds_run("KDS_RUN=KDSMAIN\n", out);
    const std::string trace = ::testing::internal::GetCapturedStdout();
    zr7::trace_reconfigure("ERROR");
    EXPECT_EQ(result, 1);
    EXPECT_EQ(out, "KDS_RUN=KDSMAIN;KZR\n");
    EXPECT_NE(trace.find("old KDS_RUN <KDS_RUN=KDSMAIN>"), std::string::npos) << trace;
    EXPECT_NE(trace.find("new KDS_RUN <KDS_RUN=KDSMAIN;KZR>"), std::string::npos) << trace;
}

}  // namespace
