// How the process runner starts a program: a cached path that has gone
// stale, a redirection onto the descriptor it already has, signal
// dispositions, and a file that cannot be run.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <string>

#include "qsd/platform/process.h"
#include "support/test_support.h"

namespace {

using zr7::OutputMode;
using zr7::run_process;
using zr7test::read_file;
using zr7test::TempDir;
using zr7test::write_file;

// Sets PATH for one test and puts the old value back.
class PathScope {
  public:
    explicit PathScope(const std::string& value) {
        const char* old = std::getenv("PATH");
        had_ = old != nullptr;
        old_ = had_ ? old : "";
        ::setenv("PATH", value.c_str(), 1);
    }
    ~PathScope() {
        if (had_)
            ::setenv("PATH", old_.c_str(), 1);
        else
            ::unsetenv("PATH");
    }

  private:
    bool had_ = false;
    std::string old_;
};

TEST(ProcessStartTest, ProgramGoneFromItsCachedPlaceIsSearchedAgain) {
    TempDir dir;
    zr7test::make_dirs(dir / "first");
    zr7test::make_dirs(dir / "second");
    write_file(dir / "first/zr7-stale-probe", "#!/bin/sh\nexit 3\n", 0755);
    write_file(dir / "second/zr7-stale-probe", "#!/bin/sh\nexit 4\n", 0755);
    PathScope path(dir / "first" + ":" + dir / "second" + ":/usr/bin:/bin");
    EXPECT_EQ(run_process({"zr7-stale-probe", {}, "", "", OutputMode::kInherit}), 3);
    ::unlink((dir / "first/zr7-stale-probe").c_str());
    EXPECT_EQ(run_process({"zr7-stale-probe", {}, "", "", OutputMode::kInherit}), 4);
    ::unlink((dir / "second/zr7-stale-probe").c_str());
    EXPECT_EQ(run_process({"zr7-stale-probe", {}, "", "", OutputMode::kInherit}),
              zr7::kRunNotStarted);
}

TEST(ProcessStartTest, FileThatCannotRunIsNotStarted) {
    TempDir dir;
    write_file(dir / "plain", "not a program\n", 0644);
    write_file(dir / "garbled",
               "\x7f"
               "ELF garbage",
               0755);
    EXPECT_EQ(run_process({dir / "plain", {}, "", "", OutputMode::kInherit}), zr7::kRunNotStarted);
    EXPECT_EQ(run_process({dir / "garbled", {}, "", "", OutputMode::kInherit}),
              zr7::kRunNotStarted);
}

// With standard input closed, the input file opens as descriptor 0: the
// program must still find it there, open across exec.
TEST(ProcessStartTest, InputThatOpensOnDescriptorZeroReachesTheProgram) {
    TempDir dir;
    write_file(dir / "in", "a\r\nb\r\n");
    const int saved = ::dup(STDIN_FILENO);
    ASSERT_GE(saved, 0);
    ::close(STDIN_FILENO);
    const int rc =
        run_process({"tr", {"-d", "\r"}, dir / "in", dir / "out", OutputMode::kTruncate});
    ::dup2(saved, STDIN_FILENO);
    ::close(saved);
    EXPECT_EQ(rc, 0);
    EXPECT_EQ(read_file(dir / "out"), "a\nb\n");
}

void count_signal(int) {}

// A signal the tool catches reaches the program with its default action; one
// the tool ignores stays ignored, as exec leaves it.
TEST(ProcessStartTest, CaughtSignalsAreDefaultAndIgnoredOnesStayIgnored) {
    const zr7::ProcessSpec self_signal{
        "perl", {"-e", "kill 'USR1', $$; exit 0"}, "", "", OutputMode::kInherit};
    struct sigaction old {};
    struct sigaction caught {};
    caught.sa_handler = count_signal;
    ::sigaction(SIGUSR1, &caught, &old);
    EXPECT_EQ(run_process(self_signal), 128 + SIGUSR1);
    struct sigaction ignored {};
    ignored.sa_handler = SIG_IGN;
    ::sigaction(SIGUSR1, &ignored, nullptr);
    EXPECT_EQ(run_process(self_signal), 0);
    ::sigaction(SIGUSR1, &old, nullptr);
}

}  // namespace
