#include "bench/run/spawn.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>

namespace zr7bench {

SpawnResult spawn_and_wait(const SpawnSpec& job) {
    SpawnResult result;
    std::vector<char*> argv;
    for (const std::string& a : job.argv)
        argv.push_back(const_cast<char*>(a.c_str()));
    argv.push_back(nullptr);
    std::vector<char*> envp;
    for (const std::string& e : job.env)
        envp.push_back(const_cast<char*>(e.c_str()));
    envp.push_back(nullptr);

    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    const std::string in = job.stdin_path.empty() ? "/dev/null" : job.stdin_path;
    const std::string out = job.stdout_path.empty() ? "/dev/null" : job.stdout_path;
    const std::string err = job.stderr_path.empty() ? "/dev/null" : job.stderr_path;
    posix_spawn_file_actions_addopen(&actions, 0, in.c_str(), O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&actions, 1, out.c_str(),
                                     O_WRONLY | O_CREAT | (job.stdout_append ? O_APPEND : O_TRUNC),
                                     0644);
    posix_spawn_file_actions_addopen(&actions, 2, err.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);

    const auto start = std::chrono::steady_clock::now();
    pid_t pid = 0;
    const int rc =
        posix_spawn(&pid, job.argv.at(0).c_str(), &actions, nullptr, argv.data(), envp.data());
    posix_spawn_file_actions_destroy(&actions);
    if (rc != 0)
        return result;
    int status = 0;
    struct rusage usage {};
    while (::wait4(pid, &status, 0, &usage) < 0) {
        if (errno != EINTR)
            return result;
    }
    const auto end = std::chrono::steady_clock::now();
    result.wall_s = std::chrono::duration<double>(end - start).count();
    result.cpu_s = static_cast<double>(usage.ru_utime.tv_sec + usage.ru_stime.tv_sec) +
                   static_cast<double>(usage.ru_utime.tv_usec + usage.ru_stime.tv_usec) / 1e6;
    result.exit_code = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    return result;
}

std::string find_program(const std::string& name, const std::string& path_value) {
    std::size_t start = 0;
    while (start <= path_value.size()) {
        std::size_t colon = path_value.find(':', start);
        if (colon == std::string::npos)
            colon = path_value.size();
        const std::string dir = path_value.substr(start, colon - start);
        const std::string candidate = (dir.empty() ? "." : dir) + "/" + name;
        if (::access(candidate.c_str(), X_OK) == 0)
            return candidate;
        start = colon + 1;
    }
    return "";
}

}  // namespace zr7bench
