// The two-step run that users take: a first invocation without -o that
// shows the command it starts, and a second one that installs with its
// standard output appended to the log file, whose exit status the first one
// ends with.
#include <unistd.h>

#include <cstdio>
#include <functional>
#include <ostream>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "support/test_support.h"

namespace {

using zr7test::RunOptions;
using zr7test::RunResult;
using zr7test::SampleInstall;
using zr7test::TempDir;

// No home from the environment, no trace setting of the caller's.
RunOptions clean_options() {
    RunOptions options;
    options.unset_env = {"MARLIN_HOME", "MARLINHOME", "VXA_TRC1"};
    return options;
}

RunResult run_tool(const std::vector<std::string>& args, RunOptions options = clean_options()) {
    return zr7test::run(zr7test::tool_path(), args, options);
}

std::string invoking(const std::string& command) {
    return "Invoking cmd <" + command + ">\n";
}

std::string log_of(const SampleInstall& sample) {
    return zr7test::read_file(sample.home + "/logs/qsdinst.log");
}

// Gives the sample's home another name (one with a blank, say).
void rename_home(SampleInstall& sample, const std::string& name) {
    const std::string moved = sample.root / name;
    ASSERT_EQ(std::rename(sample.home.c_str(), moved.c_str()), 0);
    sample.home = moved;
    sample.vxaenv = sample.tables() + "/VXAENV";
}

// The messages of the trace lines, without their "(time pid unit:line) "
// prefix; lines that are not trace lines are kept whole.
std::vector<std::string> messages(const std::string& log) {
    std::vector<std::string> out;
    std::size_t start = 0;
    while (start < log.size()) {
        std::size_t end = log.find('\n', start);
        if (end == std::string::npos)
            end = log.size();
        std::string line = log.substr(start, end - start);
        const std::size_t close = line.find(") ");
        if (!line.empty() && line[0] == '(' && close != std::string::npos)
            line.erase(0, close + 2);
        out.push_back(line);
        start = end + 1;
    }
    return out;
}

// The argument lines the second invocation traces, between the banners.
std::vector<std::string> traced_parameters(const std::string& log) {
    std::vector<std::string> all = messages(log);
    std::vector<std::string> params;
    bool inside = false;
    for (const std::string& m : all) {
        if (m == "Parameters begin-----------------") {
            inside = true;
        } else if (m == "Parameters end ------------------") {
            break;
        } else if (inside) {
            params.push_back(m);
        }
    }
    return params;
}

std::size_t count_of(const std::string& text, const std::string& piece) {
    std::size_t count = 0;
    for (std::size_t at = text.find(piece); at != std::string::npos; at = text.find(piece, at + 1))
        ++count;
    return count;
}

TEST(RelaunchLine, HomeAndArgumentWithBlanksAreQuotedAndArriveWhole) {
    SampleInstall sample;
    rename_home(sample, "my home");
    const RunResult r = run_tool({"-h", sample.home, "-c", "KEY=a b", sample.image});
    const std::string logs = sample.home + "/logs/";
    EXPECT_EQ(r.out,
              invoking(zr7test::tool_path() + " -o \"" + logs + "\" -h \"" + sample.home +
                       "\" -c \"KEY=a b\" " + sample.image + " >>\"" + logs + "qsdinst.log\""));
    EXPECT_EQ(traced_parameters(log_of(sample)),
              (std::vector<std::string>{"....<-o>", "....<" + logs + ">", "....<-h>",
                                        "....<" + sample.home + ">", "....<-c>", "....<KEY=a b>",
                                        "....<" + sample.image + ">"}));
}

TEST(RelaunchLine, EmptyArgumentIsShownAsNothingAndStillPassedOn) {
    SampleInstall sample;
    const RunResult r = run_tool({"-h", sample.home, "-m", "", sample.image});
    const std::string logs = sample.home + "/logs/";
    EXPECT_EQ(r.out, invoking(zr7test::tool_path() + " -o " + logs + " -h " + sample.home +
                              " -m  " + sample.image + " >>" + logs + "qsdinst.log"));
    EXPECT_EQ(traced_parameters(log_of(sample)),
              (std::vector<std::string>{"....<-o>", "....<" + logs + ">", "....<-h>",
                                        "....<" + sample.home + ">", "....<-m>", "....<>",
                                        "....<" + sample.image + ">"}));
}

TEST(RelaunchLine, HomeFromTheEnvironmentWithASetting) {
    if (zr7test::exists("/opt/srv"))
        GTEST_SKIP() << "/opt/srv exists on this machine";
    RunOptions options = clean_options();
    options.set_env["MARLIN_HOME"] = "/opt/srv";
    const RunResult r = run_tool({"-c", "KEY=val", "/img"}, options);
    EXPECT_EQ(r.out,
              "MARLIN_HOME is </opt/srv>\n" +
                  invoking(zr7test::tool_path() +
                           " -o /opt/srv/logs/ -c KEY=val /img >>/opt/srv/logs/qsdinst.log"));
    EXPECT_EQ(r.err, "Error: Can't open </opt/srv/logs/qsdinst.log>\n");
    EXPECT_EQ(r.exit_code, 248);
}

TEST(RelaunchLog, EachRunIsAppended) {
    SampleInstall sample;
    run_tool({"-h", sample.home, sample.image});
    const std::string first = log_of(sample);
    ASSERT_EQ(count_of(first, "\nExiting with rc <"), 1u);
    run_tool({"-h", sample.home, sample.image});
    const std::string both = log_of(sample);
    EXPECT_EQ(both.compare(0, first.size(), first), 0);
    EXPECT_EQ(count_of(both, "\nExiting with rc <"), 2u);
    EXPECT_EQ(count_of(both, ") Parameters begin-"), 2u);
}

TEST(RelaunchLog, MissingLogsDirectoryStopsBeforeTheSecondRun) {
    SampleInstall sample;
    zr7test::remove_tree(sample.home + "/logs");
    const RunResult r = run_tool({"-h", sample.home, sample.image});
    EXPECT_EQ(r.exit_code, 248);
    EXPECT_EQ(r.err, "Error: Can't open <" + sample.home + "/logs/qsdinst.log>\n");
    EXPECT_EQ(r.out,
              invoking(zr7test::tool_path() + " -o " + sample.home + "/logs/ -h " + sample.home +
                       " " + sample.image + " >>" + sample.home + "/logs/qsdinst.log"));
    // Nothing was installed and the directory was not made.
    EXPECT_FALSE(zr7test::exists(sample.home + "/logs"));
    EXPECT_TRUE(zr7test::list_dir(sample.tables() + "/ATTRLIB").empty());
    EXPECT_EQ(zr7test::read_file(sample.vxaenv), zr7test::kSampleVxaenv);
}

TEST(RelaunchLog, WorkingDirectoryHomeLogsIntoTheWorkingDirectory) {
    SampleInstall sample;
    RunOptions options = clean_options();
    options.cwd = sample.home;
    const RunResult r = run_tool({sample.image}, options);
    EXPECT_EQ(r.out,
              "No MARLIN_HOME or MARLINHOME found.  Defaulting to ." +
                  invoking(zr7test::tool_path() + " -o ./ " + sample.image + " >>./qsdinst.log"));
    const std::string log = zr7test::read_file(sample.home + "/qsdinst.log");
    EXPECT_NE(log.find(") ....<./>\n"), std::string::npos);
    EXPECT_NE(log.find("\nExiting with rc <"), std::string::npos);
    EXPECT_FALSE(zr7test::exists(sample.home + "/logs/qsdinst.log"));
}

TEST(RelaunchLog, UserGivenLogDirectoryMeansNoRelaunch) {
    SampleInstall sample;
    const RunResult r = run_tool({"-o", sample.home + "/logs/", "-h", sample.home, sample.image});
    EXPECT_EQ(r.out.find("Invoking cmd"), std::string::npos);
    EXPECT_EQ(count_of(r.out, "Exiting with rc <"), 1u);
    EXPECT_FALSE(zr7test::exists(sample.home + "/logs/qsdinst.log"));
    // The process status is the low byte of the status the run reported.
    int rc = 0;
    const std::size_t at = r.out.find("Exiting with rc <");
    ASSERT_EQ(std::sscanf(r.out.c_str() + at, "Exiting with rc <%d>", &rc), 1);
    EXPECT_EQ(r.exit_code, rc & 0xFF);
}

// The second run is the tool itself however the first one was named.
struct ToolNameCase {
    const char* name;
    bool bare;          // started as "zr7inst", no directory
    bool bin_on_path;   // the tool's directory on PATH
    bool blank_in_dir;  // the tool copied under a directory holding a blank
};

void PrintTo(const ToolNameCase& c, std::ostream* os) {
    *os << c.name;
}

class RelaunchToolName : public ::testing::TestWithParam<ToolNameCase> {};

TEST_P(RelaunchToolName, SecondRunIsTheSameTool) {
    const ToolNameCase& c = GetParam();
    SampleInstall sample;
    TempDir tools;
    std::string tool = zr7test::tool_path();
    if (c.blank_in_dir) {
        zr7test::make_dirs(tools / "my tools");
        tool = tools / "my tools/zr7inst";
        zr7test::write_file(tool, zr7test::read_file(zr7test::tool_path()), 0755);
    }
    RunOptions options = clean_options();
    options.prepend_bin_to_path = c.bin_on_path;
    if (!c.bin_on_path)
        options.set_env["PATH"] = "/usr/bin:/bin";
    if (c.bare)
        options.argv0 = "zr7inst";
    const RunResult r = zr7test::run(tool, {"-h", sample.home, "-e", "-s", sample.image}, options);
    EXPECT_EQ(r.exit_code, 0) << r.err;
    EXPECT_EQ(r.out.rfind("Invoking cmd <" + (c.bare ? std::string("zr7inst") : tool) + " -o ", 0),
              0u);
    const std::string log = log_of(sample);
    EXPECT_NE(log.find("\nExiting with rc <0>\n"), std::string::npos) << log;
}

INSTANTIATE_TEST_SUITE_P(Names, RelaunchToolName,
                         ::testing::Values(ToolNameCase{"FullPath", false, false, false},
                                           ToolNameCase{"PathWithABlank", false, false, true},
                                           ToolNameCase{"BareNameOnPath", true, true, false},
                                           ToolNameCase{"BareNameNotOnPath", true, false, false}),
                         [](const ::testing::TestParamInfo<ToolNameCase>& param_info) {
                             return std::string(param_info.param.name);
                         });

// Programs that stand in for the loader, first on PATH.
std::string false_program() {
    return zr7test::exists("/bin/false") ? "/bin/false" : "/usr/bin/false";
}

struct StatusCase {
    const char* name;
    // Prepares the sample, may put programs into the directory given, and
    // returns extra options for the command line.
    std::function<std::vector<std::string>(SampleInstall&, const std::string&)> prepare;
    int exit_code;
    const char* last_rc_line;  // "" when the second run cannot write one
};

void PrintTo(const StatusCase& c, std::ostream* os) {
    *os << c.name;
}

class RelaunchStatus : public ::testing::TestWithParam<StatusCase> {};

TEST_P(RelaunchStatus, FirstRunEndsWithTheSecondRunsStatus) {
    const StatusCase& c = GetParam();
    SampleInstall sample;
    TempDir fake_bin;
    std::vector<std::string> args = c.prepare(sample, fake_bin.path());
    args.insert(args.begin(), {"-h", sample.home});
    args.push_back(sample.image);
    RunOptions options = clean_options();
    options.set_env["PATH"] =
        fake_bin.path() + ":" + zr7test::bin_dir() + ":" + std::string(std::getenv("PATH"));
    const RunResult r = run_tool(args, options);
    EXPECT_EQ(r.exit_code, c.exit_code) << r.err;
    const std::string log = log_of(sample);
    if (*c.last_rc_line != '\0') {
        EXPECT_NE(log.find(std::string("\n") + c.last_rc_line + "\n"), std::string::npos) << log;
    } else {
        EXPECT_EQ(log.find("\nExiting with rc <"), std::string::npos) << log;
    }
}

INSTANTIATE_TEST_SUITE_P(
    Outcomes, RelaunchStatus,
    ::testing::Values(
        StatusCase{"Success",
                   [](SampleInstall&, const std::string&) {
                       return std::vector<std::string>{"-c", "zr7demo=1", "-m", "kzr"};
                   },
                   0, "Exiting with rc <0>"},
        StatusCase{"CopyFailure",
                   [](SampleInstall& s, const std::string&) {
                       // The first flat copy has no destination directory.
                       zr7test::remove_tree(s.tables() + "/ATTRLIB");
                       return std::vector<std::string>{};
                   },
                   251, "Exiting with rc <-5>"},
        StatusCase{"LoaderFailure",
                   [](SampleInstall&, const std::string& bin) {
                       EXPECT_EQ(::symlink(false_program().c_str(), (bin + "/qdsload").c_str()), 0);
                       return std::vector<std::string>{};
                   },
                   250, "Exiting with rc <-6>"},
        StatusCase{"MissingServerConfiguration",
                   [](SampleInstall& s, const std::string&) {
                       ::unlink((s.home + "/config/.ConfigData/kmsenv").c_str());
                       return std::vector<std::string>{};
                   },
                   2, "Exiting with rc <2>"},
        StatusCase{"SecondRunKilledBySignal",
                   [](SampleInstall&, const std::string& bin) {
                       // The loader's parent is the installing invocation.
                       zr7test::write_file(bin + "/qdsload", "#!/bin/sh\nkill -TERM $PPID\n", 0755);
                       return std::vector<std::string>{"-s"};
                   },
                   128 + 15, ""}),
    [](const ::testing::TestParamInfo<StatusCase>& param_info) {
        return std::string(param_info.param.name);
    });

}  // namespace
