#include "robustness/robustness_support.h"

#include <fcntl.h>
#include <grp.h>
#include <poll.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cctype>
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <random>
#include <stdexcept>

#include <gtest/gtest.h>

#include "qsd/envfile/env_rewrite.h"

extern char** environ;

namespace zr7rb {

namespace {

constexpr uid_t kNobody = 65534;

// Argument and environment vectors, built before fork: the child only calls
// what is safe between fork and exec.
struct Prepared {
    std::vector<std::string> argv_text;
    std::vector<std::string> env_text;
    std::vector<char*> argv;
    std::vector<char*> envp;
};

void prepare(const Launch& launch, Prepared& p) {
    std::map<std::string, std::string> env;
    for (char** e = environ; *e != nullptr; ++e) {
        const std::string entry = *e;
        const std::size_t eq = entry.find('=');
        if (eq != std::string::npos)
            env[entry.substr(0, eq)] = entry.substr(eq + 1);
    }
    for (const char* name :
         {"MARLIN_HOME", "MARLINHOME", "VXA_TRC1", "QDSLOAD_FAIL", "QDSLOAD_RECORD"})
        env.erase(name);
    env["PATH"] = zr7test::bin_dir() + ":" + env["PATH"];
    for (const auto& kv : launch.env)
        env[kv.first] = kv.second;
    for (const auto& kv : env)
        p.env_text.push_back(kv.first + "=" + kv.second);
    p.argv_text = launch.argv;
    for (std::string& a : p.argv_text)
        p.argv.push_back(a.data());
    p.argv.push_back(nullptr);
    for (std::string& e : p.env_text)
        p.envp.push_back(e.data());
    p.envp.push_back(nullptr);
}

// In the child: the limits, the user, the descriptors, then the program.
[[noreturn]] void become(const Launch& launch, Prepared& p, int out_fd, int err_fd) {
    ::setpgid(0, 0);
    if (!launch.cwd.empty() && ::chdir(launch.cwd.c_str()) != 0)
        ::_exit(126);
    if (launch.file_size_limit >= 0) {
        ::signal(SIGXFSZ, SIG_IGN);
        struct rlimit limit {};
        limit.rlim_cur = limit.rlim_max = static_cast<rlim_t>(launch.file_size_limit);
        if (::setrlimit(RLIMIT_FSIZE, &limit) != 0)
            ::_exit(126);
    }
    if (launch.as_nobody &&
        (::setgroups(0, nullptr) != 0 || ::setgid(kNobody) != 0 || ::setuid(kNobody) != 0))
        ::_exit(126);
    const int in_fd = ::open("/dev/null", O_RDONLY);
    ::dup2(in_fd, 0);
    ::dup2(out_fd, 1);
    ::dup2(err_fd, 2);
    ::execve(p.argv[0], p.argv.data(), p.envp.data());
    ::_exit(127);
}

int decode(int status) {
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

std::vector<std::string> install_args(const zr7test::SampleInstall& s, bool relaunch,
                                      const std::vector<std::string>& extra) {
    std::vector<std::string> args{zr7test::tool_path()};
    if (!relaunch) {
        args.push_back("-o");
        args.push_back(s.home + "/logs/");
    }
    args.push_back("-h");
    args.push_back(s.home);
    args.insert(args.end(), extra.begin(), extra.end());
    args.push_back(s.image);
    return args;
}

void snapshot_into(const std::string& dir, const std::string& prefix, Snapshot& out) {
    for (const std::string& name : zr7test::list_dir(dir)) {
        const std::string path = dir + "/" + name;
        struct stat st {};
        if (::lstat(path.c_str(), &st) != 0)
            continue;
        if (S_ISDIR(st.st_mode)) {
            out[prefix + name] = "d";
            snapshot_into(path, prefix + name + "/", out);
        } else if (S_ISLNK(st.st_mode)) {
            std::vector<char> target(4096);
            const ssize_t n = ::readlink(path.c_str(), target.data(), target.size());
            out[prefix + name] = "l" + std::string(target.data(), n > 0 ? std::size_t(n) : 0);
        } else {
            out[prefix + name] = "f" + zr7test::read_file(path);
        }
    }
}

}  // namespace

bool soak() {
    const char* value = std::getenv("ZR7_SOAK");
    return value != nullptr && std::string(value) == "1";
}

int scaled(int quick, int long_run) {
    return soak() ? long_run : quick;
}

void report(const std::string& what, long long count) {
    std::printf("[ figures  ] %s: %lld\n", what.c_str(), count);
    std::fflush(stdout);
    std::string key;
    for (char c : what)
        key += std::isalnum(static_cast<unsigned char>(c)) != 0 ? c : '_';
    ::testing::Test::RecordProperty(key, std::to_string(count));
}

Launch install_launch(const zr7test::SampleInstall& s, const std::vector<std::string>& extra) {
    Launch launch;
    launch.argv = install_args(s, false, extra);
    launch.env["VXA_TRC1"] = "ERROR (UNIT:zr7 ALL)";
    return launch;
}

Launch relaunch_launch(const zr7test::SampleInstall& s, const std::vector<std::string>& extra) {
    Launch launch;
    launch.argv = install_args(s, true, extra);
    return launch;
}

pid_t start(const Launch& launch) {
    Prepared p;
    prepare(launch, p);
    const std::string out = launch.output_path.empty() ? "/dev/null" : launch.output_path;
    const int fd = ::open(out.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    if (fd < 0)
        throw std::runtime_error("cannot open " + out);
    const pid_t pid = ::fork();
    if (pid == 0)
        become(launch, p, fd, fd);
    ::close(fd);
    if (pid < 0)
        throw std::runtime_error("fork failed");
    // Also from here, so that a kill right after start finds the group.
    ::setpgid(pid, pid);
    return pid;
}

int wait_for(pid_t pid) {
    int status = 0;
    while (::waitpid(pid, &status, 0) < 0) {
        if (errno != EINTR)
            return -1;
    }
    return decode(status);
}

zr7test::RunResult run_captured(const Launch& launch) {
    Prepared p;
    prepare(launch, p);
    int out_pipe[2];
    int err_pipe[2];
    if (::pipe2(out_pipe, O_CLOEXEC) != 0 || ::pipe2(err_pipe, O_CLOEXEC) != 0)
        throw std::runtime_error("pipe failed");
    const pid_t pid = ::fork();
    if (pid == 0)
        become(launch, p, out_pipe[1], err_pipe[1]);
    ::close(out_pipe[1]);
    ::close(err_pipe[1]);

    zr7test::RunResult result;
    struct pollfd fds[2] = {{out_pipe[0], POLLIN, 0}, {err_pipe[0], POLLIN, 0}};
    std::string* sinks[2] = {&result.out, &result.err};
    int open_count = 2;
    while (open_count > 0) {
        if (::poll(fds, 2, -1) < 0 && errno != EINTR)
            break;
        for (int i = 0; i < 2; ++i) {
            if (fds[i].fd < 0 || fds[i].revents == 0)
                continue;
            char buffer[65536];
            const ssize_t n = ::read(fds[i].fd, buffer, sizeof buffer);
            if (n > 0) {
                sinks[i]->append(buffer, static_cast<std::size_t>(n));
            } else if (n == 0 || errno != EINTR) {
                ::close(fds[i].fd);
                fds[i].fd = -1;
                --open_count;
            }
        }
    }
    result.exit_code = pid > 0 ? wait_for(pid) : -1;
    return result;
}

bool can_drop_privileges() {
    if (::geteuid() != 0)
        return false;
    Launch probe;
    probe.argv = {"/bin/true"};
    probe.as_nobody = true;
    return run_captured(probe).exit_code == 0;
}

void give_tree_to_nobody(const std::string& path) {
    (void)::lchown(path.c_str(), kNobody, kNobody);
    struct stat st {};
    if (::lstat(path.c_str(), &st) == 0 && S_ISDIR(st.st_mode)) {
        for (const std::string& name : zr7test::list_dir(path))
            give_tree_to_nobody(path + "/" + name);
    }
}

Snapshot snapshot(const std::string& dir) {
    Snapshot out;
    snapshot_into(dir, "", out);
    return out;
}

std::vector<std::string> change_options(int n) {
    const std::string id = std::to_string(n);
    return {"-m", "MOD" + id, "-c", "KEY" + id + "=value" + id};
}

std::string changed_by(const std::string& content, int n) {
    const std::string id = std::to_string(n);
    zr7::Dictionary settings;
    settings.insert("KEY" + id, "value" + id);
    return zr7::rewrite_env_content(content, settings, "MOD" + id).content;
}

std::vector<std::string> backups(const zr7test::SampleInstall& s) {
    std::vector<std::string> found;
    const std::string archive = s.tables() + "/.archive";
    for (const std::string& name : zr7test::list_dir(archive)) {
        if (name.compare(0, 7, "VXAENV_") == 0)
            found.push_back(archive + "/" + name);
    }
    return found;
}

bool has_line(const std::string& output, const std::string& text) {
    return output.find(text) != std::string::npos;
}

std::string content_of(const std::string& path) {
    struct stat st {};
    return ::stat(path.c_str(), &st) == 0 && S_ISREG(st.st_mode) ? zr7test::read_file(path) : "";
}

namespace {

std::vector<std::string> split(const std::string& text, const std::string& separator) {
    std::vector<std::string> pieces;
    std::size_t start = 0;
    for (std::size_t at; (at = text.find(separator, start)) != std::string::npos;) {
        pieces.push_back(text.substr(start, at - start));
        start = at + separator.size();
    }
    pieces.push_back(text.substr(start));
    return pieces;
}

std::string path_of(const zr7test::SampleInstall& s, const std::string& token) {
    const std::string msrv = s.image + "/MSRV/";
    const std::map<std::string, std::string> roots = {{"I/", msrv},
                                                      {"A/", msrv + s.arch + "/"},
                                                      {"T/", msrv + s.arch + "/TABLE/"},
                                                      {"H/", s.tables() + "/"},
                                                      {"O/", s.home + "/"},
                                                      {"R/", s.root.path() + "/"}};
    if (token == "K")
        return s.home + "/config/.ConfigData/kmsenv";
    if (token == "V")
        return s.vxaenv;
    const auto root = roots.find(token.substr(0, 2));
    return root == roots.end() ? token : root->second + token.substr(2);
}

// A step as its word, its first argument and the rest.
struct Step {
    std::string word, first, rest;
};

Step parse(const std::string& text) {
    Step step;
    const std::size_t one = text.find(' ');
    step.word = text.substr(0, one);
    if (one == std::string::npos)
        return step;
    const std::size_t two = text.find(' ', one + 1);
    step.first = text.substr(one + 1, two == std::string::npos ? std::string::npos : two - one - 1);
    if (two != std::string::npos)
        step.rest = text.substr(two + 1);
    return step;
}

void append(const std::string& path, const std::string& text) {
    std::ofstream(path, std::ios::binary | std::ios::app) << text;
}

}  // namespace

void shape(const zr7test::SampleInstall& s, const std::string& steps) {
    for (const std::string& text : split(steps, " ; ")) {
        if (text.empty())
            continue;
        const Step step = parse(text);
        // Most steps name their path first; "chmod" and "ln" name it last.
        const bool path_last = step.word == "chmod" || step.word == "ln";
        const std::string path = path_of(s, path_last ? step.rest : step.first);
        const std::size_t slash = path.rfind('/');
        if (!path_last && step.word != "append" && step.word != "repeat") {
            zr7test::remove_tree(path);
            zr7test::make_dirs(path.substr(0, slash == std::string::npos ? 0 : slash));
        }
        if (step.word == "file" || step.word == "append") {
            append(path, step.rest);
        } else if (step.word == "repeat") {
            const std::size_t space = step.rest.find(' ');
            const std::string line = step.rest.substr(space + 1) + "\n";
            std::string text_block;
            for (long i = std::stol(step.rest.substr(0, space)); i > 0; --i)
                text_block += line;
            append(path, text_block);
        } else if (step.word == "fill") {
            const std::size_t space = step.rest.find(' ');
            const std::string prefix =
                space == std::string::npos ? "" : step.rest.substr(space + 1);
            append(path, prefix + std::string(std::stoul(step.rest.substr(0, space)), 'x') + "\n");
        } else if (step.word == "garbage") {
            std::mt19937 random(1901);
            std::string bytes(std::stoul(step.rest.empty() ? "0" : step.rest), '\0');
            for (char& c : bytes)
                c = static_cast<char>(random() & 0xFF);
            append(path, bytes);
        } else if (step.word == "dir") {
            zr7test::make_dirs(path);
        } else if (step.word == "fifo") {
            ::mkfifo(path.c_str(), 0644);
        } else if (step.word == "chmod") {
            ::chmod(path.c_str(), static_cast<mode_t>(std::stoul(step.first, nullptr, 8)));
        } else if (step.word == "ln") {
            zr7test::remove_tree(path);
            EXPECT_EQ(::symlink(path_of(s, step.first).c_str(), path.c_str()), 0) << text;
        } else if (step.word != "rm") {
            ADD_FAILURE() << "unknown step: " << text;
        }
    }
}

bool holds(const zr7test::SampleInstall& s, const std::string& checks) {
    for (const std::string& text : split(checks, " ; ")) {
        const Step check = parse(text);
        const std::string path = path_of(s, check.first);
        struct stat st {};
        const bool there = ::lstat(path.c_str(), &st) == 0;
        const bool ok = check.word.empty() || (check.word == "no" && !there) ||
                        (check.word == "link" && there && S_ISLNK(st.st_mode)) ||
                        (check.word == "is" && there && S_ISREG(st.st_mode) &&
                         zr7test::read_file(path) == check.rest);
        if (!ok) {
            ADD_FAILURE() << "does not hold: " << text;
            return false;
        }
    }
    return true;
}

}  // namespace zr7rb
