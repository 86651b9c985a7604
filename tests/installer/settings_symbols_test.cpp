// The key=value splitter behind "-c", the settings it records, and the
// expansion of path templates.
#include <gtest/gtest.h>

#include <regex>
#include <string>
#include <tuple>
#include <vector>

#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"

namespace {

// The messages of the trace lines written while `body` ran, each ending in "\n".
template <typename Body>
std::string messages_of(Body body) {
    testing::internal::CaptureStdout();
    body();
    return std::regex_replace(testing::internal::GetCapturedStdout(),
                              std::regex(R"(\(\d{4}-[^)]*\) )"), "");
}

TEST(GetKeyVal, SplitsAtTheFirstEqualsSignAndStripsBlanks) {
    const std::tuple<const char*, int, const char*, const char*> cases[] = {
        {" a = b c ", 0, "a", "b c"},
        {"a=b=c", 0, "a", "b=c"},
        {"a=", 0, "a", ""},
        {"=b", -1, "", ""},
        {"abc", -1, "", ""},
        {"  =b", -1, "", "b"},
        {"\ta\t=\tb\t", 0, "\ta\t", "\tb\t"},
        {"k= =\n", 0, "k", "=\n"},
        {nullptr, -1, "", ""}};
    for (const auto& [text, rc, key, value] : cases) {
        std::string got_key = "stale", got_value = "stale";
        EXPECT_EQ(InstallUtil::get_key_val(text, got_key, got_value), rc) << (text ? text : "null");
        EXPECT_EQ(got_key + "|" + got_value, std::string(key) + "|" + value) << (text ? text : "");
    }
}

// One installer takes the settings in this order.
TEST(AddVar, RecordsEachKeyOnceInUpperCase) {
    const std::tuple<const char*, int, const char*> calls[] = {
        {"b=2", 0, "Will be adding <B> <2> to VXAENV\n"},
        {" Mixed_Case = v w ", 0, "Will be adding <MIXED_CASE> <v w> to VXAENV\n"},
        {"x=", 0, "Will be adding <X> <> to VXAENV\n"},
        {"=x", -1, ""},
        {nullptr, -1, ""},
        {"kds_run=on", -1, "Error: Use -m to modify KDS_RUN\n"},
        {"B=3", -1, "Error: Duplicate key <B> specified in options\n"}};
    zr7::trace_reconfigure("ERROR DETAIL");
    Installer610 installer;
    for (const auto& [text, rc, line] : calls)
        EXPECT_EQ(messages_of([&] { EXPECT_EQ(installer.addVar(text), rc); }), line);
    const std::vector<std::pair<std::string, std::string>> settings{
        {"B", "2"}, {"MIXED_CASE", "v w"}, {"X", ""}};
    EXPECT_EQ(installer.settings.entries(), settings);
}

// A symbol's value is taken as it is, never expanded again.
TEST(Resolve, ExpandsKnownSymbolsAndNamesAnUnknownOne) {
    const std::tuple<const char*, int, const char*, const char*> cases[] = {
        {"${HOMEPATH}/tables/${QMSNAME}/ATTRLIB", 0, "/opt/srv/tables/SRV1/ATTRLIB", ""},
        {"${SRCPATH}/${BINARCH}/TABLE", 0, "/img/MSRV//TABLE", ""},
        {"cost$", 0, "cost$", ""},
        {"$$", 0, "$", ""},
        {"a$xb", 0, "a$b", ""},
        {"$${QMSNAME}", 0, "${QMSNAME}", ""},
        {"${NESTED}", 0, "${HOMEPATH}", ""},
        {"${homepath}", -1, "", "Error: Symbol <homepath> not found\n"},
        {"${A${B}}", -1, "", "Error: Symbol <A${B> not found\n"},
        {"/a/${HOMEPATH}/${nope}/b", -1, "/a//opt/srv/", "Error: Symbol <nope> not found\n"},
        {"/x/${HOMEPATH", -1, "/x/", ""}};
    Installer610 installer;
    installer.add_path_symbol("HOMEPATH", "/opt/srv/");
    installer.add_path_symbol("SRCPATH", "/img/MSRV/");
    installer.add_symbol("BINARCH", "");
    installer.add_symbol("QMSNAME", "SRV1");
    installer.add_symbol("NESTED", "${HOMEPATH}");
    zr7::trace_reconfigure("ERROR");
    for (const auto& [path_template, rc, out, line] : cases) {
        std::string got = "pre:";
        EXPECT_EQ(messages_of([&] { EXPECT_EQ(installer.resolve(path_template, got), rc); }), line);
        EXPECT_EQ(got, std::string("pre:") + out) << path_template;
    }
}

}  // namespace
