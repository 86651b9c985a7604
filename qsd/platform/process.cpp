#include "qsd/platform/process.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
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

int run_process(const ProcessSpec& job) {
    const std::string path = find_on_path(job.program);
    if (path.empty())
        return kRunNotStarted;

    // The input is opened, and checked to be readable data, before the output
    // is touched: a directory opens for reading but yields nothing, and would
    // otherwise cost an existing output its content.
    const bool in_by_path = job.stdin_fd < 0 && !job.stdin_path.empty();
    FdGuard in_fd(!in_by_path ? -1 : ::open(job.stdin_path.c_str(), O_RDONLY | O_CLOEXEC));
    struct stat in_st {};
    if (in_by_path &&
        (in_fd.get() < 0 || ::fstat(in_fd.get(), &in_st) != 0 || S_ISDIR(in_st.st_mode))) {
        return kRunStdinFailed;
    }

    // The output is truncated only once it is known not to be the input file
    // itself, which truncation would destroy before the program read it.
    int out_flags = O_WRONLY | O_CREAT | O_CLOEXEC;
    if (job.stdout_mode == OutputMode::kAppend)
        out_flags |= O_APPEND;
    const bool out_by_path = job.stdout_fd < 0 && job.stdout_mode != OutputMode::kInherit;
    FdGuard out_fd(!out_by_path ? -1 : ::open(job.stdout_path.c_str(), out_flags, 0666));
    if (out_by_path) {
        struct stat out_st {};
        if (out_fd.get() < 0 || ::fstat(out_fd.get(), &out_st) != 0)
            return kRunStdoutFailed;
        if (in_fd.get() >= 0 && in_st.st_dev == out_st.st_dev && in_st.st_ino == out_st.st_ino)
            return kRunStdoutFailed;
        if (job.stdout_mode == OutputMode::kTruncate && S_ISREG(out_st.st_mode) &&
            ::ftruncate(out_fd.get(), 0) != 0) {
            return kRunStdoutFailed;
        }
    }

    std::vector<char*> argv;
    argv.reserve(job.args.size() + 2);
    argv.push_back(const_cast<char*>(job.program.c_str()));
    for (const std::string& arg : job.args)
        argv.push_back(const_cast<char*>(arg.c_str()));
    argv.push_back(nullptr);

    posix_spawn_file_actions_t actions;
    if (posix_spawn_file_actions_init(&actions) != 0)
        return kRunNotStarted;
    const int child_in = job.stdin_fd >= 0 ? job.stdin_fd : in_fd.get();
    const int child_out = job.stdout_fd >= 0 ? job.stdout_fd : out_fd.get();
    if (child_in >= 0)
        posix_spawn_file_actions_adddup2(&actions, child_in, STDIN_FILENO);
    if (child_out >= 0)
        posix_spawn_file_actions_adddup2(&actions, child_out, STDOUT_FILENO);

    std::fflush(stdout);
    pid_t pid = 0;
    int rc = posix_spawn(&pid, path.c_str(), &actions, nullptr, argv.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    if (rc != 0)
        return kRunNotStarted;

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

}  // namespace zr7
