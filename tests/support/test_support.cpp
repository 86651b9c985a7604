#include "support/test_support.h"

#include <dirent.h>
#include <fcntl.h>
#include <grp.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>

namespace zr7test {
namespace fs = std::filesystem;

void make_dirs(const std::string& path) {
    std::error_code ignored;
    fs::create_directories(path, ignored);
}
void write_file(const std::string& path, const std::string& content, unsigned mode) {
    ::unlink(path.c_str());  // a link there is replaced, not followed
    if (!(std::ofstream(path, std::ios::binary) << content))
        throw std::runtime_error("cannot write " + path);
    ::chmod(path.c_str(), mode);
}
std::string read_file(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}
bool exists(const std::string& path) {
    struct stat st {};
    return ::lstat(path.c_str(), &st) == 0;
}

namespace {

// Each level is reached from the one above, so that trees deeper than a
// path can name are removed too.
void remove_at(int parent, const std::string& name) {
    struct stat st {};
    if (::fstatat(parent, name.c_str(), &st, AT_SYMLINK_NOFOLLOW) != 0)
        return;
    if (!S_ISDIR(st.st_mode)) {
        ::unlinkat(parent, name.c_str(), 0);
        return;
    }
    ::fchmodat(parent, name.c_str(), 0700, 0);
    const int fd = ::openat(parent, name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW);
    if (DIR* dir = fd < 0 ? nullptr : ::fdopendir(fd)) {
        std::vector<std::string> names;
        while (struct dirent* entry = ::readdir(dir)) {
            const std::string inner = entry->d_name;
            if (inner != "." && inner != "..")
                names.push_back(inner);
        }
        for (const std::string& inner : names)
            remove_at(::dirfd(dir), inner);
        ::closedir(dir);
    }
    ::unlinkat(parent, name.c_str(), AT_REMOVEDIR);
}

}  // namespace

void remove_tree(const std::string& path) {
    remove_at(AT_FDCWD, path);
}

std::string tree_text(const std::string& dir, bool server_only) {
    std::vector<std::string> lines;
    for (const auto& e : fs::recursive_directory_iterator(dir)) {
        const std::string path = e.path().string();
        if (is_run_record(path) ||
            (server_only && (path.find("/logs/") != std::string::npos ||
                             path.find("/.archive") != std::string::npos ||
                             path.find("qdsload.catalog") != std::string::npos))) {
            continue;
        }
        struct stat st {};
        ::lstat(path.c_str(), &st);
        lines.push_back(path + " " + std::to_string(st.st_mode) + " " + std::to_string(st.st_uid) +
                        ":" + std::to_string(st.st_gid) + " " +
                        (S_ISREG(st.st_mode)   ? read_file(path)
                         : S_ISLNK(st.st_mode) ? fs::read_symlink(path).string()
                                               : ""));
    }
    std::sort(lines.begin(), lines.end());
    std::string text;
    for (const std::string& line : lines)
        text += line + "\n";
    return text;
}

std::vector<std::string> list_dir(const std::string& path) {
    std::vector<std::string> names;
    std::error_code none;
    for (const fs::directory_entry& entry : fs::directory_iterator(path, none))
        names.push_back(entry.path().filename());
    std::sort(names.begin(), names.end());
    return names;
}

TempDir::TempDir(const std::string& parent)
    : path_((parent.empty() ? fs::temp_directory_path() : fs::path(parent)) / "zr7test.XXXXXX") {
    if (::mkdtemp(path_.data()) == nullptr)
        throw std::runtime_error("mkdtemp failed");
}

namespace {

// The reachable directory of this test program; removed at its end by the
// process that made it (not by a forked child that happens to exit).
class Reachable {
  public:
    Reachable() : maker_(::getpid()), path_("/tmp/zr7reach.XXXXXX") {
        if (::mkdtemp(path_.data()) == nullptr || ::chmod(path_.c_str(), 0755) != 0)
            throw std::runtime_error("cannot make " + path_);
        make_dirs(path_ + "/bin");
        ::chmod((path_ + "/bin").c_str(), 0755);
        for (const char* name : {"zr7inst", "qdsload"}) {
            const std::string from = bin_dir() + "/" + name, to = path_ + "/bin/" + name;
            std::error_code error;
            if (exists(from) && !fs::copy_file(from, to, error))
                throw std::runtime_error("cannot copy " + from + ": " + error.message());
            ::chmod(to.c_str(), 0755);
        }
    }
    ~Reachable() {
        if (::getpid() == maker_)
            remove_tree(path_);
    }
    const std::string& path() const { return path_; }

  private:
    pid_t maker_;
    std::string path_;
};

}  // namespace

const std::string& reachable_dir() {
    static const Reachable reachable;
    return reachable.path();
}

pid_t start(const std::string& program, const std::vector<std::string>& args,
            const RunOptions& options, int out_fd, int err_fd) {
    const char* wrapper = std::getenv("ZR7_TOOL_WRAPPER");
    std::istringstream words(program == tool_path() && wrapper != nullptr ? wrapper : "");
    std::vector<std::string> texts{std::istream_iterator<std::string>(words), {}};
    texts.push_back(program);
    texts.insert(texts.end(), args.begin(), args.end());
    std::vector<char*> argv(texts.size() + 1, nullptr);
    std::transform(texts.begin(), texts.end(), argv.begin(), [](auto& t) { return t.data(); });
    // The environment and every path are made before the fork.
    std::map<std::string, std::string> env;
    for (char** entry = environ; *entry != nullptr; ++entry) {
        const std::string text = *entry;
        env[text.substr(0, text.find('='))] =
            text.substr(std::min(text.find('='), text.size()) + 1);
    }
    const std::string bin = options.as_nobody ? reachable_bin_dir() : bin_dir();
    env["PATH"] = bin + ":" + env["PATH"];
    for (const std::string& name : options.unset_env)
        env.erase(name);
    for (const auto& [name, value] : options.set_env)
        env[name] = value;
    std::vector<std::string> entries;
    for (const auto& [name, value] : env)
        entries.push_back(name + "=" + value);
    std::vector<char*> envp(entries.size() + 1, nullptr);
    std::transform(entries.begin(), entries.end(), envp.begin(), [](auto& e) { return e.data(); });
    const std::string in = options.stdin_path.empty() ? "/dev/null" : options.stdin_path;
    struct rlimit limit {};
    limit.rlim_cur = limit.rlim_max = static_cast<rlim_t>(options.file_limit);
    std::fflush(nullptr);
    const pid_t pid = ::fork();
    if (pid == 0) {
        ::setpgid(0, 0);
        ::signal(SIGXFSZ, SIG_IGN);
        ::umask(022);  // the modes the tests expect, whoever runs them
        const int in_fd = ::open(in.c_str(), O_RDONLY);
        const int err = options.stderr_path.empty() ? err_fd
                                                    : ::open(options.stderr_path.c_str(),
                                                             O_WRONLY | O_CREAT | O_TRUNC, 0644);
        if ((options.cwd.empty() || ::chdir(options.cwd.c_str()) == 0) && in_fd >= 0 &&
            ::dup2(in_fd, 0) == 0 && ::dup2(out_fd, 1) == 1 && ::dup2(err, 2) == 2 &&
            (options.file_limit < 0 || ::setrlimit(RLIMIT_FSIZE, &limit) == 0) &&
            (!options.as_nobody ||
             (::setgroups(0, nullptr) == 0 && ::setgid(65534) == 0 && ::setuid(65534) == 0))) {
            environ = envp.data();
            ::execvp(argv[0], argv.data());
        }
        ::_exit(127);
    }
    if (pid < 0)
        throw std::runtime_error("cannot run " + program);
    ::setpgid(pid, pid);  // here too, so that a kill right after the start finds the group
    return pid;
}

int wait_for(pid_t pid) {
    int status = -1;
    while (::waitpid(pid, &status, 0) < 0 && errno == EINTR) {
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

RunResult run(const std::string& program, const std::vector<std::string>& args,
              const RunOptions& options) {
    TempDir capture;
    const int out = ::open((capture / "out").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0644);
    const int err = ::open((capture / "err").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0644);
    const pid_t pid = start(program, args, options, out, err);
    ::close(out);
    ::close(err);
    const int code = wait_for(pid);
    return {code, read_file(capture / "out"),
            options.stderr_path.empty() ? read_file(capture / "err") : ""};
}

SampleInstall::SampleInstall(const std::string& parent)
    : root(parent) {  // paths ending in "/" are directories
    const std::string t = tables() + "/", c = cicatrsq() + "/", ms = home + "/lx8266/ms/";
    const std::string m = image + "/MSRV/", a = m + "lx8266/";
    // clang-format off
    const std::pair<std::string, std::string> entries[] = {
        {t + "ATTRLIB/", ""}, {t + "RKDSCATL/", ""}, {t + "TECLIB/", ""}, {c + "ATTRLIB/", ""},
        {c + "RKDSCATL/", ""}, {c + "TECLIB/", ""}, {c + "SQLLIB/", ""}, {ms + "lib/", ""},
        {ms + "bin/", ""}, {home + "/logs/", ""}, {vxaenv, kSampleVxaenv},
        {home + "/config/.ConfigData/kmsenv", "HEADING=sample server configuration\nFIELDSEP=|\n"
         "default|PORTNUMBER|1234|\nSRV1|NETWORKPROTOCOL|ip.pipe|\nSRV1|IPPIPEPORTNUMBER|1918|\n"
         "SRV1|BINARCH|lx8266|\nSRV1|HOSTNAME|confighost|\n"},
        {m + "ATTRLIB/kzr.atr", "name kzr\r\nattr one\r\n"}, {m + "TECLIB/kzr.baroc", "event\r\n"},
        {m + "RKDSCATL/kzr.cat", "catalog\r\n"}, {a + "TABLE_PRESERVE_TXT/keep.txt", "image\r\n"},
        {m + "SQLLIB/kzr_b.sql", "INSERT INTO T VALUES (3);\n"},
        {m + "SQLLIB/kzr_a.sql", "INSERT INTO T VALUES (1);\nINSERT INTO T VALUES (2);\n"},
        {a + "TABLE/table.dat", "table\r\n"}, {a + "TABLE/sub/deeper/nested.dat", "nested\r\n"},
        {a + "TABLE/TECLIB/kzr_table.baroc", "table event\r\n"},
        {a + "TABLE_PRESERVE/keep.cfg", "from image\n"}, {a + "lib/libkzr.so", "ELF\r\nbinary\r\n"},
        {a + "TABLE_TXT/text.txt", "line one\r\nline two\r\n"},
        {a + "bin/kzragent", "#!/bin/sh\r\nexit 0\r\n"}};  // "#!": made executable
    // clang-format on
    for (const auto& [path, content] : entries) {
        make_dirs(path.substr(0, path.rfind('/')));
        if (path.back() != '/')
            write_file(path, content, content.rfind("#!", 0) == 0 ? 0755 : 0644);
    }
}

}  // namespace zr7test
