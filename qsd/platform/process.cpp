#include "qsd/platform/process.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <optional>
#include <utility>

#include "qsd/platform/fs.h"
#include "qsd/platform/interruption.h"

extern char** environ;

namespace zr7 {

namespace {

bool is_executable_file(const std::string& path) {
    struct stat st {};
    return ::stat(path.c_str(), &st) == 0 && S_ISREG(st.st_mode) &&
           ::access(path.c_str(), X_OK) == 0;
}

}  // namespace

std::string find_on_path(const std::string& program) {
    if (program.empty())
        return std::string();
    if (program.find('/') != std::string::npos)
        return program;
    const char* env = std::getenv("PATH");
    std::string path_value = env == nullptr ? "/usr/bin:/bin" : env;

    static std::map<std::pair<std::string, std::string>, std::string> cache;
    auto key = std::make_pair(program, path_value);
    auto hit = cache.find(key);
    if (hit != cache.end() && !hit->second.empty() && is_executable_file(hit->second)) {
        return hit->second;
    }

    std::string found;
    std::size_t start = 0;
    while (start <= path_value.size()) {
        std::size_t colon = path_value.find(':', start);
        if (colon == std::string::npos)
            colon = path_value.size();
        std::string dir = path_value.substr(start, colon - start);
        if (dir.empty())
            dir = ".";
        std::string candidate = dir + "/" + program;
        if (is_executable_file(candidate)) {
            found = candidate;
            break;
        }
        start = colon + 1;
    }
    cache[key] = found;
    return found;
}

namespace {

// The file actions and attributes of one spawn, released on every way out.
// Every call that fills them is checked: a program started without its
// redirection, or with this process's signal set-up, would act on the wrong
// file or not stop when asked.
class SpawnSetup {
  public:
    SpawnSetup() {
        actions_ok_ = posix_spawn_file_actions_init(&actions_) == 0;
        attr_ok_ = posix_spawnattr_init(&attr_) == 0;
    }
    ~SpawnSetup() {
        if (actions_ok_)
            posix_spawn_file_actions_destroy(&actions_);
        if (attr_ok_)
            posix_spawnattr_destroy(&attr_);
    }
    SpawnSetup(const SpawnSetup&) = delete;
    SpawnSetup& operator=(const SpawnSetup&) = delete;

    // Default actions for every signal that can be caught or ignored, and
    // an empty mask: an ignored SIGINT or a blocked SIGTERM of ours must
    // not make the program deaf to them.
    bool default_signals() {
        sigset_t all;
        sigset_t none;
        return attr_ok_ && sigfillset(&all) == 0 && sigdelset(&all, SIGKILL) == 0 &&
               sigdelset(&all, SIGSTOP) == 0 && sigemptyset(&none) == 0 &&
               posix_spawnattr_setsigdefault(&attr_, &all) == 0 &&
               posix_spawnattr_setsigmask(&attr_, &none) == 0 &&
               posix_spawnattr_setflags(
                   &attr_, static_cast<short>(POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETSIGMASK)) == 0;
    }
    bool redirect(int fd, int target) {
        return actions_ok_ && posix_spawn_file_actions_adddup2(&actions_, fd, target) == 0;
    }
    int spawn(pid_t& pid, const std::string& path, char* const* argv) {
        return posix_spawn(&pid, path.c_str(), &actions_, &attr_, argv, environ);
    }

  private:
    posix_spawn_file_actions_t actions_;
    posix_spawnattr_t attr_;
    bool actions_ok_ = false;
    bool attr_ok_ = false;
};

ProcessResult failed(int status) {
    ProcessResult result;
    result.status = status;
    return result;
}

}  // namespace

int run_process(const ProcessSpec& job) {
    return run_process_ex(job).status;
}

ProcessResult run_process_ex(const ProcessSpec& job) {
    const std::string path = find_on_path(job.program);
    if (path.empty())
        return failed(kRunNotStarted);

    // The input is opened, and checked to be readable data, before the output
    // is touched: a directory opens for reading but yields nothing, and would
    // otherwise cost an existing output its content. A descriptor the caller
    // gives was checked by the caller.
    const bool in_by_path = job.stdin_fd < 0 && !job.stdin_path.empty();
    fs::UniqueFd in_guard;
    if (in_by_path)
        (void)fs::open_input(job.stdin_path, in_guard);
    const int in_fd = job.stdin_fd >= 0 ? job.stdin_fd : in_guard.get();
    struct stat in_st {};
    if (in_by_path && (in_fd < 0 || ::fstat(in_fd, &in_st) != 0 || S_ISDIR(in_st.st_mode))) {
        return failed(kRunStdinFailed);
    }
    if (job.stdin_fd >= 0 && ::fstat(in_fd, &in_st) != 0)
        return failed(kRunStdinFailed);

    // The output is truncated only once it is known not to be the input file
    // itself, which truncation would destroy before the program read it.
    const bool out_by_path = job.stdout_fd < 0 && job.stdout_mode != OutputMode::kInherit;
    fs::UniqueFd out_guard;
    if (out_by_path)
        (void)fs::open_output(job.stdout_path, job.stdout_mode == OutputMode::kAppend, out_guard);
    const int out_fd = job.stdout_fd >= 0 ? job.stdout_fd : out_guard.get();
    if (out_by_path) {
        struct stat out_st {};
        if (out_fd < 0 || ::fstat(out_fd, &out_st) != 0)
            return failed(kRunStdoutFailed);
        if (in_fd >= 0 && in_st.st_dev == out_st.st_dev && in_st.st_ino == out_st.st_ino)
            return failed(kRunStdoutFailed);
        if (job.stdout_mode == OutputMode::kTruncate && S_ISREG(out_st.st_mode) &&
            fs::truncate_file(out_fd) != 0) {
            return failed(kRunStdoutFailed);
        }
    }

    std::vector<char*> argv;
    argv.reserve(job.args.size() + 2);
    argv.push_back(const_cast<char*>(job.program.c_str()));
    for (const std::string& arg : job.args)
        argv.push_back(const_cast<char*>(arg.c_str()));
    argv.push_back(nullptr);

    SpawnSetup setup;
    if (!setup.default_signals() || (in_fd >= 0 && !setup.redirect(in_fd, STDIN_FILENO)) ||
        (out_fd >= 0 && !setup.redirect(out_fd, STDOUT_FILENO))) {
        return failed(kRunNotStarted);
    }

    std::fflush(stdout);
    std::optional<SignalForwarding> forwarding;
    if (job.forward_signals)
        forwarding.emplace();
    pid_t pid = 0;
    if (setup.spawn(pid, path, argv.data()) != 0)
        return failed(kRunNotStarted);
    if (forwarding)
        forwarding->forward_to(pid);

    // Waited for to the end, whatever signal reaches us meanwhile: the
    // program got it too, or will finish its file; either way its status is
    // what the caller needs.
    int status = 0;
    while (::waitpid(pid, &status, 0) < 0) {
        if (errno != EINTR)
            return failed(kRunNotStarted);
    }
    ProcessResult result;
    if (WIFEXITED(status)) {
        result.status = WEXITSTATUS(status);
    } else if (WIFSIGNALED(status)) {
        result.signal = WTERMSIG(status);
        result.status = 128 + result.signal;
    } else {
        result.status = kRunNotStarted;
    }
    return result;
}

}  // namespace zr7
