// The progress display: on a terminal (a pseudo-terminal here) standard
// error carries the rewritten line and the closing summary; elsewhere it
// carries none of it, and standard output and the log are the same either way.
#include <fcntl.h>
#include <spawn.h>
#include <sys/ioctl.h>
#include <sys/wait.h>
#include <termios.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <map>
#include <regex>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "support/test_support.h"

extern char** environ;

namespace {

using zr7test::RunOptions;
using zr7test::SampleInstall;

struct TerminalRun {
    int exit_code = -1;
    std::string out;       // standard output, a file
    std::string terminal;  // everything written to the terminal
};

std::vector<std::string> child_environment() {
    std::map<std::string, std::string> env;
    for (char** e = environ; *e != nullptr; ++e) {
        const std::string entry = *e;
        const std::size_t eq = entry.find('=');
        if (eq != std::string::npos)
            env[entry.substr(0, eq)] = entry.substr(eq + 1);
    }
    env.erase("MARLIN_HOME");
    env.erase("MARLINHOME");
    env.erase("VXA_TRC1");
    env["PATH"] = zr7test::bin_dir() + ":" + env["PATH"];
    std::vector<std::string> out;
    for (const auto& kv : env)
        out.push_back(kv.first + "=" + kv.second);
    return out;
}

// Runs the tool with standard error on a fresh pseudo-terminal 100 columns
// wide in raw mode (bytes arrive as written), reading the terminal until
// every process holding it has ended.
TerminalRun run_on_terminal(const std::vector<std::string>& args) {
    TerminalRun result;
    zr7test::TempDir capture;
    const std::string out_path = capture / "out";

    const int master = ::posix_openpt(O_RDWR | O_NOCTTY);
    EXPECT_GE(master, 0);
    EXPECT_EQ(::grantpt(master), 0);
    EXPECT_EQ(::unlockpt(master), 0);
    const int slave = ::open(::ptsname(master), O_RDWR | O_NOCTTY);
    EXPECT_GE(slave, 0);
    struct termios mode {};
    ::tcgetattr(slave, &mode);
    ::cfmakeraw(&mode);
    ::tcsetattr(slave, TCSANOW, &mode);
    struct winsize size {};
    size.ws_col = 100;
    size.ws_row = 24;
    ::ioctl(slave, TIOCSWINSZ, &size);

    std::vector<std::string> argv_text{zr7test::tool_path()};
    argv_text.insert(argv_text.end(), args.begin(), args.end());
    std::vector<char*> argv;
    for (std::string& a : argv_text)
        argv.push_back(a.data());
    argv.push_back(nullptr);
    std::vector<std::string> env_text = child_environment();
    std::vector<char*> envp;
    for (std::string& e : env_text)
        envp.push_back(e.data());
    envp.push_back(nullptr);

    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 0, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&actions, 1, out_path.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0644);
    posix_spawn_file_actions_adddup2(&actions, slave, 2);
    posix_spawn_file_actions_addclose(&actions, master);
    pid_t pid = 0;
    const int rc =
        posix_spawn(&pid, argv_text[0].c_str(), &actions, nullptr, argv.data(), envp.data());
    posix_spawn_file_actions_destroy(&actions);
    ::close(slave);
    EXPECT_EQ(rc, 0);
    if (rc == 0) {
        // Once the last holder of the terminal has gone, read fails (EIO).
        char buffer[4096];
        for (;;) {
            const ssize_t got = ::read(master, buffer, sizeof buffer);
            if (got > 0) {
                result.terminal.append(buffer, static_cast<std::size_t>(got));
            } else if (got < 0 && errno == EINTR) {
                continue;
            } else {
                break;
            }
        }
        int status = 0;
        while (::waitpid(pid, &status, 0) < 0 && errno == EINTR) {
        }
        result.exit_code = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    }
    ::close(master);
    result.out = zr7test::read_file(out_path);
    return result;
}

// Two runs in different scratch directories at different times, made
// comparable: the scratch root becomes "<root>", the random suffix of the
// backup's scratch file "*", and every number "#".
std::string comparable(const std::string& raw, const std::string& root) {
    const std::string text =
        std::regex_replace(raw, std::regex("\\.backup\\.[A-Za-z0-9]+"), ".backup.*");
    std::string out;
    for (std::size_t at = 0; at < text.size();) {
        if (text.compare(at, root.size(), root) == 0) {
            out += "<root>";
            at += root.size();
        } else if (text[at] >= '0' && text[at] <= '9') {
            out += '#';
            while (at < text.size() && text[at] >= '0' && text[at] <= '9')
                ++at;
        } else {
            out += text[at++];
        }
    }
    return out;
}

std::vector<std::string> install_args(const SampleInstall& sample) {
    return {"-h", sample.home, "-c", "zr7demo=1", "-m", "kzr", sample.image};
}

TEST(ProgressOnATerminal, ShowsTheLineAndTheSummary) {
    SampleInstall sample;
    const TerminalRun r = run_on_terminal(install_args(sample));
    EXPECT_EQ(r.exit_code, 0) << r.terminal;
    const std::string& t = r.terminal;
    EXPECT_EQ(t.find("\r[1/17] copy ATTRLIB | files: 0 copied, 0 seeded"), 0u) << t;
    EXPECT_NE(t.find("\r[8/17] copy tree TABLE | "), std::string::npos) << t;
    EXPECT_NE(t.find("\r[14/17] update VXAENV | "), std::string::npos) << t;
    EXPECT_NE(t.find("\r[17/17] seed SQLLIB | "), std::string::npos) << t;
    EXPECT_NE(t.find(" | seeding kzr_a.sql"), std::string::npos) << t;
    EXPECT_NE(t.find(" | seeding kzr_b.sql"), std::string::npos) << t;
    // The only line end is the summary's: the progress line is rewritten
    // in place and then blanked.
    const std::regex summary(
        "\r *\rzr7inst: installation done\n"
        "  files copied: [1-9][0-9]*\n"
        "  files seeded: 2\n"
        "  VXAENV: changed, backup [^\n]*/\\.archive/VXAENV_[0-9]+\n$");
    EXPECT_TRUE(std::regex_search(t, summary)) << t;
    EXPECT_EQ(t.find('\n'), t.find("zr7inst: installation done") + 26) << t;
}

TEST(ProgressOnATerminal, SummaryOfARunThatStopsBeforeItsFirstCommand) {
    SampleInstall sample;
    ::unlink((sample.home + "/config/.ConfigData/kmsenv").c_str());
    const TerminalRun r = run_on_terminal({"-h", sample.home, sample.image});
    EXPECT_EQ(r.exit_code, 2);
    EXPECT_EQ(r.terminal,
              "zr7inst: installation failed with rc <2>\n"
              "  files copied: 0\n"
              "  files seeded: 0\n"
              "  VXAENV: not updated\n");
}

TEST(ProgressOnATerminal, AbsentElsewhereAndOutputIsTheSame) {
    SampleInstall on_terminal;
    SampleInstall elsewhere;
    const TerminalRun t = run_on_terminal(install_args(on_terminal));
    RunOptions options;
    options.unset_env = {"MARLIN_HOME", "MARLINHOME", "VXA_TRC1"};
    const zr7test::RunResult r =
        zr7test::run(zr7test::tool_path(), install_args(elsewhere), options);
    EXPECT_EQ(r.err, "");
    EXPECT_EQ(t.exit_code, r.exit_code);
    EXPECT_FALSE(t.terminal.empty());
    EXPECT_EQ(comparable(t.out, on_terminal.root.path()), comparable(r.out, elsewhere.root.path()));
    const std::string log = "/logs/qsdinst.log";
    EXPECT_EQ(comparable(zr7test::read_file(on_terminal.home + log), on_terminal.root.path()),
              comparable(zr7test::read_file(elsewhere.home + log), elsewhere.root.path()));
}

}  // namespace
