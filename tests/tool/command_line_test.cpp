// The command line of the built tool (usage, version, refusals, the home
// directory), what an install from the build puts in place, and the
// stand-in loader's own checks.
#include <algorithm>
#include <filesystem>
#include <map>

#include "tool/tool.h"

namespace zr7test {
namespace {

const char* const kUsage =
    "Usage: zr7inst [-c key=val] [-e] [-f] [-h home] [-m mod] [-s] [-v ver] [-V] src_dir\n"
    "  -c key=val Add key=val in VXAENV if not already there.\n"
    "             or updates it to new value\n"
    "  -e       Copy files only.  Skip seeding.\n"
    "  -f       Force file copy.  (Deprecated)\n"
    "  -h home  Installation directory.  If not specified here,\n"
    "           then it must be defined thru env var MARLIN_HOME.\n"
    "  -m mod   Use 'mod' as module name.  This will cause VXAENV\n"
    "           to be updated, and 'mod' appended to KDS_RUN.\n"
    "  -s       Seeding only.  Skip copying\n"
    "  -v ver   Version of the source image.  Currently only\n"
    "           610 is supported.  Default is 610.\n"
    "  -V       Print out version as vvrrmmff.  If this is the\n"
    "           only option, exit right away.\n"
    "  -n       Preview: print each change the installation would make,\n"
    "           and change nothing.\n"
    "  -u       Undo the newest installation not yet undone (no src_dir).\n"
    "  --help   Print this text on standard output and exit.\n"
    "  --version Print the version line on standard output and exit.\n";

// One line says what was wrong, then the usage text; nothing on standard output.
TEST(CommandLine, BadOnesGiveTheReasonTheUsageAndStatus254) {
    const std::pair<std::vector<std::string>, std::string> cases[] = {
        {{}, "one src_dir expected, 0 given"},
        {{"--dry-run", "/img"}, "unknown option --dry-run"},
        {{"-V", "--he\033lp", "/img"}, "unknown option --he\\x1blp"},
        {{"-c", "A=1", "-x", "/img"}, "unknown option -x"}};
    for (const auto& [args, fault] : cases) {
        const RunResult r = tool(args);
        EXPECT_EQ(std::to_string(r.exit_code) + r.out + r.err,
                  "254zr7inst: " + fault + "\n" + std::string(kUsage))
            << testing::PrintToString(args);
    }
}

// --help and --version answer on standard output, do nothing else and end with 0.
TEST(CommandLine, HelpAndVersionOnStandardOutput) {
    const std::pair<std::vector<std::string>, std::string> cases[] = {
        {{"--help"}, kUsage},
        {{"-e", "--help", "/a", "/b"}, kUsage},
        {{"--version"}, tool_path() + " version 06100400\n"},
        {{"-c", "bad", "--version", "/img"}, tool_path() + " version 06100400\n"}};
    for (const auto& [args, out] : cases) {
        const RunResult r = tool(args);
        EXPECT_EQ(std::to_string(r.exit_code) + r.out + r.err, "0" + out)
            << testing::PrintToString(args);
    }
}

// Each run, in the sample's home, ends with options that copy and seed
// nothing. Past the options the tool relaunches itself (the second run's
// status comes back), which succeeds only where the home it settled on is ".".
TEST(CommandLine, VersionRefusalsHomeAndTheRelaunchLine) {
    const auto cmd = [](const std::string& args = "./", const std::string& log = "./qsdinst.log") {
        return "Invoking cmd <" + tool_path() + " -o " + args + " -e -s ../image >>" + log + ">\n";
    };
    const std::string v = tool_path() + " version 06100400\n", no = "Exiting with rc <-2>\n";
    // clang-format off
    const struct { std::vector<std::string> args; std::map<std::string, std::string> env;
                   int status; std::string out, err; } cases[] = {
        {{"-V", "-h", ".", "-V"}, {}, 0, v + v + cmd("./ -V -h . -V"), ""},
        {{"-v", "6.1.0"}, {}, 254, no, "Error: Version 6.1.0 not supported\n"},
        {{"-v", "610", "-v", ""}, {}, 254, no, "Error: Version  not supported\n"},
        {{"-c", "a=1", "-c", "A=2"}, {}, 254,
         "Error: Duplicate key <A> specified in options\n" + no, "Error: Bad env var A=2\n"},
        {{"-c", "kds_run=x"}, {}, 254, "Error: Use -m to modify KDS_RUN\n" + no,
         "Error: Bad env var kds_run=x\n"},
        {{"-c", "novalue"}, {}, 254, no, "Error: Bad env var novalue\n"},
        {{"-h", "."}, {{"MARLIN_HOME", "/x"}}, 0, cmd("./ -h ."), ""},
        {{}, {{"MARLIN_HOME", ".  "}}, 0, "MARLIN_HOME is <.  >\n" + cmd(), ""},
        {{}, {{"MARLIN_HOME", "."}, {"MARLINHOME", "/x"}}, 0, "MARLIN_HOME is <.>\n" + cmd(), ""},
        {{}, {{"MARLINHOME", "."}}, 0, "MARLINHOME is <.>\n" + cmd(), ""},
        {{}, {}, 0, "No MARLIN_HOME or MARLINHOME found.  Defaulting to ." + cmd(), ""},
        {{"-h", "my home", "-c", "K=a b"}, {}, 0,  // "my home" is a link to "."
         cmd("\"my home/logs/\" -h \"my home\" -c \"K=a b\"", "\"my home/logs/qsdinst.log\""),
         "Warning: -s skips the VXAENV update; -c and -m are not applied\n"},
        // A wrong -h is named before anything starts.
        {{"-h", "none"}, {}, 249, "", "Error: Installation directory <none/> does not exist\n"},
        // -s leaves the VXAENV update out, so -c and -m would do nothing.
        {{"-h", ".", "-m", "kzr"}, {}, 0, cmd("./ -h . -m kzr"),
         "Warning: -s skips the VXAENV update; -c and -m are not applied\n"},
        // A line break or another control byte in a setting or a module name.
        {{"-c", "K=a\nB=b"}, {}, 254, no, "Error: Bad env var K=a\\nB=b\n"},
        {{"-c", "K\033=b"}, {}, 254, no, "Error: Bad env var K\\x1b=b\n"},
        {{"-m", "kzr\nKDS_START=9"}, {}, 254, no, "Error: Bad module name kzr\\nKDS_START=9\n"},
        {{"-v", "6\r"}, {}, 254, no, "Error: Version 6\\r not supported\n"},
        {{"-m", "a;b\t"}, {}, 254, no, "Error: Bad module name a;b\\t\n"}};
    // clang-format on
    for (const auto& c : cases) {
        SampleInstall s;
        ::symlink(".", (s.home + "/my home").c_str());
        RunOptions options;
        options.cwd = s.home;
        options.set_env = c.env;
        std::vector<std::string> args = c.args;
        args.insert(args.end(), {"-e", "-s", "../image"});
        const std::string before = tree_text(s.home);
        const RunResult r = tool(args, options);
        EXPECT_EQ(std::to_string(r.exit_code) + r.err, std::to_string(c.status) + c.err) << r.out;
        // A refused command line leaves the home as it was.
        EXPECT_TRUE(c.status != 254 || tree_text(s.home) == before) << r.out;
        // All of the output, or its end after a trace line.
        EXPECT_TRUE(r.out == c.out || (r.out[0] == '(' && ends_with(r.out, c.out))) << r.out;
        EXPECT_EQ(exists(s.home + "/qsdinst.log"), c.out.find(">>./") != std::string::npos);
    }
}

TEST(InstallRules, TheToolAndItsManualPageOnlyWhoseDashVAloneGivesTheVersion) {
    TempDir to;
    const std::string script =
        "cmake --install \"$0\" --prefix \"$1\" >/dev/null && cd \"$1\" && "
        "find . ! -type d | sort && bin/zr7inst -V";
    const RunResult r = run("/bin/sh", {"-c", script, bin_dir() + "/..", to.path()});
    EXPECT_EQ(std::to_string(r.exit_code) + r.out + r.err,
              "0./bin/zr7inst\n./share/man/man1/zr7inst.1\n06100400\n");
}

}  // namespace
}  // namespace zr7test
