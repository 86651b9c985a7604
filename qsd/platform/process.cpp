#include "qsd/platform/process.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <pthread.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <utility>

extern char** environ;

namespace zr7 {

namespace {

bool is_executable_file(const std::string& path) {
    struct stat st {};
    return ::stat(path.c_str(), &st) == 0 && S_ISREG(st.st_mode) &&
           ::access(path.c_str(), X_OK) == 0;
}

class FdGuard {
  public:
    explicit FdGuard(int fd = -1) : fd_(fd) {}
    ~FdGuard() {
        if (fd_ >= 0)
            ::close(fd_);
    }
    FdGuard(const FdGuard&) = delete;
    FdGuard& operator=(const FdGuard&) = delete;
    int get() const { return fd_; }

  private:
    int fd_;
};

// What the child needs to become the program, all prepared by the parent:
// until it calls exec the child shares the parent's memory, so it makes
// system calls only and allocates nothing.
struct ChildStart {
    int in_fd;
    int out_fd;
    const char* path;
    char* const* argv;
    const sigset_t* mask;  // the parent's mask, given back just before exec
    volatile int error;    // set by the child when a dup2 or the exec failed
};

// Puts fd on target; an fd already there only loses its close-on-exec flag.
bool redirect(int fd, int target) {
    if (fd < 0)
        return true;
    if (fd == target)
        return ::fcntl(fd, F_SETFD, 0) == 0;
    return ::dup2(fd, target) == target;
}

[[noreturn]] void become_program(ChildStart* start) {
    // A handler of the tool must not run in the child while it shares the
    // tool's memory: caught signals go back to their default action (exec
    // would do so anyway), ignored ones stay ignored as exec keeps them.
    for (int sig = 1; sig < NSIG; ++sig) {
        struct sigaction action {};
        if (::sigaction(sig, nullptr, &action) == 0 && action.sa_handler != SIG_DFL &&
            action.sa_handler != SIG_IGN) {
            action.sa_handler = SIG_DFL;
            action.sa_flags = 0;
            ::sigaction(sig, &action, nullptr);
        }
    }
    if (!redirect(start->in_fd, STDIN_FILENO) || !redirect(start->out_fd, STDOUT_FILENO)) {
        start->error = errno != 0 ? errno : EBADF;
        ::_exit(127);
    }
    ::sigprocmask(SIG_SETMASK, start->mask, nullptr);
    ::execve(start->path, start->argv, environ);
    start->error = errno != 0 ? errno : ENOEXEC;
    ::_exit(127);
}

// The child is started with vfork: it borrows the tool's memory and the tool
// waits until it has called exec, so nothing is copied or mapped for it. The
// tool starts one program for every file it copies, and posix_spawn, which
// maps and unmaps a stack for every child, cost the tool some 40% more system
// time per program started. Every signal is blocked around the call, so none
// is handled in the child before it is ready.
__attribute__((noinline)) pid_t start_child(ChildStart* start) {
    const pid_t pid = ::vfork();
    if (pid == 0)
        become_program(start);
    return pid;
}

// Starts the program at `path` with the redirections; returns its pid, or -1
// when no child could be made. `error` is the errno of a child that could not
// become the program (and has ended with 127).
pid_t launch(const std::string& path, int in_fd, int out_fd, char* const* argv, int& error) {
    ChildStart start{in_fd, out_fd, path.c_str(), argv, nullptr, 0};
    sigset_t all;
    sigset_t old;
    sigfillset(&all);
    pthread_sigmask(SIG_SETMASK, &all, &old);
    start.mask = &old;
    const pid_t pid = start_child(&start);
    pthread_sigmask(SIG_SETMASK, &old, nullptr);
    error = start.error;
    return pid;
}

int wait_for(pid_t pid) {
    int status = 0;
    while (::waitpid(pid, &status, 0) < 0) {
        if (errno != EINTR)
            return kRunNotStarted;
    }
    if (WIFEXITED(status))
        return WEXITSTATUS(status);
    if (WIFSIGNALED(status))
        return 128 + WTERMSIG(status);
    return kRunNotStarted;
}

using PathCache = std::map<std::pair<std::string, std::string>, std::string>;

PathCache& path_cache() {
    static PathCache cache;
    return cache;
}

std::string path_value() {
    const char* env = std::getenv("PATH");
    return env == nullptr ? "/usr/bin:/bin" : env;
}

// Drops the cached answer for a program, so that the next lookup searches
// PATH again.
void forget_program(const std::string& program) {
    path_cache().erase(std::make_pair(program, path_value()));
}

}  // namespace

std::string find_on_path(const std::string& program) {
    if (program.empty())
        return std::string();
    if (program.find('/') != std::string::npos)
        return program;
    const std::string search = path_value();

    // A cached answer is used without looking at the disk again: were the
    // program gone or changed since, its exec fails, and run_process then
    // forgets the answer and searches once more.
    auto key = std::make_pair(program, search);
    auto hit = path_cache().find(key);
    if (hit != path_cache().end() && !hit->second.empty())
        return hit->second;

    std::string found;
    std::size_t start = 0;
    while (start <= search.size()) {
        std::size_t colon = search.find(':', start);
        if (colon == std::string::npos)
            colon = search.size();
        std::string dir = search.substr(start, colon - start);
        if (dir.empty())
            dir = ".";
        std::string candidate = dir + "/" + program;
        if (is_executable_file(candidate)) {
            found = candidate;
            break;
        }
        start = colon + 1;
    }
    path_cache()[key] = found;
    return found;
}

int run_process(const ProcessSpec& spec) {
    const std::string path = find_on_path(spec.program);
    if (path.empty())
        return kRunNotStarted;

    // The input is opened, and checked to be readable data, before the output
    // is touched: a directory opens for reading but yields nothing, and would
    // otherwise cost an existing output its content.
    FdGuard in_fd(spec.stdin_path.empty() ? -1
                                          : ::open(spec.stdin_path.c_str(), O_RDONLY | O_CLOEXEC));
    struct stat in_st {};
    if (!spec.stdin_path.empty() &&
        (in_fd.get() < 0 || ::fstat(in_fd.get(), &in_st) != 0 || S_ISDIR(in_st.st_mode))) {
        return kRunStdinFailed;
    }

    // The output is truncated only once it is known not to be the input file
    // itself, which truncation would destroy before the program read it.
    int out_flags = O_WRONLY | O_CREAT | O_CLOEXEC;
    if (spec.stdout_mode == OutputMode::kAppend)
        out_flags |= O_APPEND;
    FdGuard out_fd(spec.stdout_mode == OutputMode::kInherit
                       ? -1
                       : ::open(spec.stdout_path.c_str(), out_flags, 0666));
    if (spec.stdout_mode != OutputMode::kInherit) {
        struct stat out_st {};
        if (out_fd.get() < 0 || ::fstat(out_fd.get(), &out_st) != 0)
            return kRunStdoutFailed;
        if (in_fd.get() >= 0 && in_st.st_dev == out_st.st_dev && in_st.st_ino == out_st.st_ino)
            return kRunStdoutFailed;
        if (spec.stdout_mode == OutputMode::kTruncate && S_ISREG(out_st.st_mode) &&
            ::ftruncate(out_fd.get(), 0) != 0) {
            return kRunStdoutFailed;
        }
    }

    std::vector<char*> argv;
    argv.reserve(spec.args.size() + 2);
    argv.push_back(const_cast<char*>(spec.program.c_str()));
    for (const std::string& arg : spec.args)
        argv.push_back(const_cast<char*>(arg.c_str()));
    argv.push_back(nullptr);

    std::fflush(stdout);
    int error = 0;
    pid_t pid = launch(path, in_fd.get(), out_fd.get(), argv.data(), error);
    if (pid > 0 && error != 0 && path != spec.program) {
        // The cached path failed to run: search PATH afresh, and start the
        // program found there if it is another one.
        wait_for(pid);
        forget_program(spec.program);
        const std::string again = find_on_path(spec.program);
        if (again.empty() || again == path)
            return kRunNotStarted;
        pid = launch(again, in_fd.get(), out_fd.get(), argv.data(), error);
    }
    if (pid < 0)
        return kRunNotStarted;
    if (error != 0) {
        // The child has ended with 127 without running anything; reap it.
        wait_for(pid);
        return kRunNotStarted;
    }
    return wait_for(pid);
}

}  // namespace zr7
