// The built tool's command line: the version forms, the refusals, and the
// home-directory lines. Every run that gets past the options carries "-o" so
// no relaunch happens, and names a home without a server configuration, so
// the run ends with status 2 right after the home directory is settled.
#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <string>
#include <vector>

#include "support/test_support.h"
#include "support/trace_lines.h"

namespace {

using zr7test::RunOptions;
using zr7test::RunResult;

const char* const kNoHome = "No MARLIN_HOME or MARLINHOME found.  Defaulting to .";

RunOptions clean_env(const std::string& trace = "") {
    RunOptions options;
    options.unset_env = {"MARLIN_HOME", "MARLINHOME", "VXA_TRC1"};
    if (!trace.empty())
        options.set_env["VXA_TRC1"] = trace;
    return options;
}

RunResult run_tool(const std::vector<std::string>& args, const RunOptions& options) {
    return zr7test::run(zr7test::tool_path(), args, options);
}

TEST(VersionTest, AloneItPrintsTheVersionAndEnds) {
    const RunResult r = run_tool({"-V"}, clean_env());
    EXPECT_EQ(r.exit_code, 0);
    EXPECT_EQ(r.out, "06100400\n");
    EXPECT_EQ(r.err, "");
}

TEST(VersionTest, WithOtherArgumentsItNamesTheProgramAndGoesOn) {
    zr7test::TempDir home;
    const RunResult r =
        run_tool({"-V", "-o", home.path(), "-h", home.path(), "-V", "/img"}, clean_env());
    const std::string line = zr7test::tool_path() + " version 06100400\n";
    EXPECT_EQ(r.out.substr(0, 2 * line.size()), line + line);
    EXPECT_EQ(r.exit_code, 2) << r.out;  // the home holds no server configuration
    EXPECT_EQ(zr7test::count_lines_ending(r.out, "Error: Can't open kmsenv"), 1);
    EXPECT_EQ(zr7test::lines_of(r.out).back(), "Exiting with rc <2>");
    EXPECT_EQ(r.out.back(), '\n');
}

struct Refusal {
    std::vector<std::string> args;
    std::string err;
    std::string trace;  // the error line that goes with it, or ""
};

TEST(RefusalTest, MessageOnStderrAndStatusMinus2) {
    const std::vector<Refusal> cases = {
        {{"-v", "6.1.0", "/img"}, "Error: Version 6.1.0 not supported\n", ""},
        {{"-v", "0610", "/img"}, "Error: Version 0610 not supported\n", ""},
        {{"-v", "610", "-v", "", "/img"}, "Error: Version  not supported\n", ""},
        {{"-c", "a=1", "-c", "A=2", "/img"},
         "Error: Bad env var A=2\n",
         "Error: Duplicate key <A> specified in options"},
        {{"-c", "Key=1", "-c", " kEY = 2", "/img"},
         "Error: Bad env var  kEY = 2\n",
         "Error: Duplicate key <KEY> specified in options"},
        {{"-c", "kds_run=x", "/img"},
         "Error: Bad env var kds_run=x\n",
         "Error: Use -m to modify KDS_RUN"},
        {{"-c", "=x", "/img"}, "Error: Bad env var =x\n", ""},
        {{"-c", "novalue", "/img"}, "Error: Bad env var novalue\n", ""},
        // The refusal comes before any check of the operands.
        {{"-c", "x", "/img", "/other"}, "Error: Bad env var x\n", ""},
    };
    for (const Refusal& c : cases) {
        const RunResult r = run_tool(c.args, clean_env());
        EXPECT_EQ(r.exit_code, 254) << c.err;
        EXPECT_EQ(r.err, c.err);
        std::vector<std::string> lines;
        if (!c.trace.empty())
            lines.push_back(c.trace);
        lines.push_back("Exiting with rc <-2>");
        ASSERT_TRUE(zr7test::lines_end_with(r.out, lines)) << c.err;
        // The closing line is a plain line, not a trace line.
        EXPECT_EQ(zr7test::lines_of(r.out).back(), "Exiting with rc <-2>");
        EXPECT_EQ(r.out.back(), '\n');
    }
}

struct HomeCase {
    const char* name;
    std::vector<std::string> args;  // before "-o <dir> /img"; "@" stands for the home
    std::map<std::string, std::string> env;
    std::string first_line;  // "@" stands for the home
    bool home_from_cwd;      // the home is the working directory "./"
};

std::string with_home(std::string text, const std::string& home) {
    for (std::size_t at = text.find('@'); at != std::string::npos; at = text.find('@', at))
        text.replace(at, 1, home);
    return text;
}

TEST(HomeDirectoryTest, OptionThenEachVariableThenTheWorkingDirectory) {
    const std::vector<HomeCase> cases = {
        {"-h", {"-h", "@"}, {}, "", false},
        {"-h glued", {"-h@"}, {{"MARLIN_HOME", "/elsewhere"}}, "", false},
        {"-h with slash", {"-h", "@/"}, {}, "", false},
        {"MARLIN_HOME", {}, {{"MARLIN_HOME", "@"}}, "MARLIN_HOME is <@>\n", false},
        {"MARLIN_HOME blanks", {}, {{"MARLIN_HOME", "@  "}}, "MARLIN_HOME is <@  >\n", false},
        {"MARLIN_HOME first",
         {},
         {{"MARLIN_HOME", "@"}, {"MARLINHOME", "/elsewhere"}},
         "MARLIN_HOME is <@>\n",
         false},
        {"MARLINHOME", {}, {{"MARLINHOME", "@"}}, "MARLINHOME is <@>\n", false},
        {"empty MARLIN_HOME",
         {},
         {{"MARLIN_HOME", ""}, {"MARLINHOME", "@/"}},
         "MARLINHOME is <@/>\n",
         false},
        {"empty -h", {"-h", ""}, {{"MARLINHOME", "@"}}, "MARLINHOME is <@>\n", false},
        {"neither", {}, {}, kNoHome, true},
        {"both empty", {}, {{"MARLIN_HOME", ""}, {"MARLINHOME", ""}}, kNoHome, true},
    };
    for (const HomeCase& c : cases) {
        zr7test::TempDir home;
        // Only the installer's start shows its detail lines, so the home line
        // comes first.
        RunOptions options = clean_env("ERROR (UNIT:zr7.Installer610::init DETAIL)");
        for (const auto& kv : c.env)
            options.set_env[kv.first] = with_home(kv.second, home.path());
        options.cwd = home.path();
        std::vector<std::string> args;
        for (const std::string& a : c.args)
            args.push_back(with_home(a, home.path()));
        args.insert(args.end(), {"-o", home.path(), "/img"});

        const RunResult r = run_tool(args, options);
        EXPECT_EQ(r.exit_code, 2) << c.name << "\n" << r.out;
        EXPECT_EQ(r.err, "") << c.name;
        const std::string first = with_home(c.first_line, home.path());
        EXPECT_EQ(r.out.substr(0, first.size()), first) << c.name;
        if (c.home_from_cwd) {
            // No line end: the next output follows directly.
            EXPECT_NE(r.out.at(first.size()), '\n') << c.name;
        } else {
            EXPECT_EQ(r.out.find("MARLIN"), first.empty() ? std::string::npos : 0u) << c.name;
        }
        const std::string used = c.home_from_cwd ? "./" : home.path() + "/";
        EXPECT_EQ(zr7test::count_lines_ending(r.out, "home path...<" + used + ">"), 1)
            << c.name << "\n"
            << r.out;
    }
}

TEST(SourceDirectoryTest, MsrvFollowsOneSeparator) {
    const std::pair<const char*, const char*> cases[] = {
        {"/img", "/img/MSRV/"}, {"/img/", "/img/MSRV/"}, {"/img//", "/img//MSRV/"}};
    for (const auto& c : cases) {
        zr7test::TempDir home;
        const RunResult r = run_tool({"-e", "-s", "-o", home.path(), "-h", home.path(), c.first},
                                     clean_env("ERROR (UNIT:zr7 ALL)"));
        EXPECT_EQ(r.exit_code, 2);
        EXPECT_EQ(zr7test::count_lines_ending(r.out, std::string("src path....<") + c.second + ">"),
                  1)
            << r.out;
    }
}

TEST(ParameterTraceTest, EveryArgumentAfterTheProgramInOrder) {
    zr7test::TempDir home;
    const RunResult r =
        run_tool({"-f", "-o", home.path(), "-h", home.path(), "-c", "a = b", "/img"},
                 clean_env("ERROR (UNIT:zr7 ALL)"));
    EXPECT_EQ(r.exit_code, 2);
    const std::vector<std::string> expected = {"Parameters begin-----------------",
                                               "....<-f>",
                                               "....<-o>",
                                               "....<" + home.path() + ">",
                                               "....<-h>",
                                               "....<" + home.path() + ">",
                                               "....<-c>",
                                               "....<a = b>",
                                               "....</img>",
                                               "Parameters end ------------------"};
    const std::vector<std::string> lines = zr7test::lines_of(r.out);
    std::size_t at = 0;
    while (at < lines.size() && lines[at].find(expected[0]) == std::string::npos)
        ++at;
    ASSERT_LE(at + expected.size(), lines.size()) << r.out;
    for (std::size_t i = 0; i < expected.size(); ++i) {
        const std::string& line = lines[at + i];
        EXPECT_EQ(line.substr(line.size() - std::min(line.size(), expected[i].size())),
                  expected[i]);
    }
    EXPECT_EQ(zr7test::count_lines_ending(r.out, "Exiting with rc <2>"), 2) << r.out;
}

}  // namespace
