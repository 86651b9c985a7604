// The process runner's child set-up: signals, descriptors, how the child ended,
// and signals passed on while waiting; the interruption flag.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <chrono>
#include <thread>
#include <tuple>

#include "qsd/platform/interruption.h"
#include "qsd/platform/process.h"
#include "support/test_support.h"

namespace {

using zr7::OutputMode;
using zr7::ProcessSpec;

ProcessSpec job_of(const std::string& program, const std::vector<std::string>& args) {
    ProcessSpec job;
    job.program = program;
    job.args = args;
    return job;
}

// The value of a "Name:\t..." line of /proc/<pid>/status.
std::string status_field(const std::string& status, const std::string& name) {
    const std::size_t at = status.find("\n" + name + ":\t");
    if (at == std::string::npos)
        return "missing";
    const std::size_t begin = at + name.size() + 3;
    return status.substr(begin, status.find('\n', begin) - begin);
}

// Whatever this process ignores or blocks, a started program begins with
// every signal at its default action and none blocked.
TEST(ProcessChild, DefaultSignalActionsAndAnEmptyMask) {
    zr7test::TempDir dir;
    struct sigaction ignore {};
    ignore.sa_handler = SIG_IGN;
    struct sigaction old_int {
    }, old_pipe{};
    ASSERT_EQ(::sigaction(SIGINT, &ignore, &old_int), 0);
    ASSERT_EQ(::sigaction(SIGPIPE, &ignore, &old_pipe), 0);
    sigset_t block, old_mask;
    sigemptyset(&block);
    sigaddset(&block, SIGTERM);
    sigaddset(&block, SIGHUP);
    ASSERT_EQ(::sigprocmask(SIG_BLOCK, &block, &old_mask), 0);
    const int result =
        zr7::run_process({"cat", {"/proc/self/status"}, "", dir / "status", OutputMode::kTruncate});
    ::sigprocmask(SIG_SETMASK, &old_mask, nullptr);
    ::sigaction(SIGINT, &old_int, nullptr);
    ::sigaction(SIGPIPE, &old_pipe, nullptr);
    ASSERT_EQ(result, 0);
    const std::string status = zr7test::read_file(dir / "status");
    // Signals 32 and 33 belong to the C library, which keeps them from every
    // program it starts; a program cannot use them.
    const unsigned long long library_own = 3ULL << 31;
    EXPECT_EQ(std::stoull(status_field(status, "SigBlk"), nullptr, 16) & ~library_own, 0u)
        << status;
    EXPECT_EQ(std::stoull(status_field(status, "SigIgn"), nullptr, 16) & ~library_own, 0u)
        << status;
}

// An exit status of 143 and an end by SIGTERM give the same status; the
// signal field tells them apart.
TEST(ProcessChild, EndBySignalToldApartFromAnExitStatus) {
    const std::tuple<std::vector<std::string>, int, int> cases[] = {
        {{"-c", "exit 143"}, 143, 0},
        {{"-c", "kill -TERM $$"}, 143, SIGTERM},
        {{"-c", "kill -KILL $$"}, 137, SIGKILL},
        {{"-c", "exit 0"}, 0, 0}};
    for (const auto& [args, status, signal_number] : cases) {
        const zr7::ProcessResult result = zr7::run_process_ex(job_of("sh", args));
        EXPECT_EQ(result.status, status) << args[1];
        EXPECT_EQ(result.signal, signal_number) << args[1];
        EXPECT_EQ(zr7::run_process(job_of("sh", args)), status) << args[1];
    }
}

// Descriptors the caller opened become standard input and output; the path
// fields beside them are not looked at.
TEST(ProcessChild, CallersDescriptorsWinOverPaths) {
    zr7test::TempDir dir;
    zr7test::write_file(dir / "in", "from the descriptor\n");
    const int in = ::open((dir / "in").c_str(), O_RDONLY | O_CLOEXEC);
    const int out = ::open((dir / "out").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
    ASSERT_GE(in, 0);
    ASSERT_GE(out, 0);
    ProcessSpec job{"cat", {}, dir / "missing", dir / "unused", OutputMode::kTruncate};
    job.stdin_fd = in;
    job.stdout_fd = out;
    EXPECT_EQ(zr7::run_process(job), 0);
    ::close(in);
    ::close(out);
    EXPECT_EQ(zr7test::read_file(dir / "out"), "from the descriptor\n");
    EXPECT_FALSE(zr7test::exists(dir / "unused"));
}

}  // namespace
