#include "support/test_support.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
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

RunResult run(const std::string& program, const std::vector<std::string>& args,
              const RunOptions& options) {
    const char* wrapper = std::getenv("ZR7_TOOL_WRAPPER");
    std::istringstream words(program == tool_path() && wrapper != nullptr ? wrapper : "");
    std::vector<std::string> texts{std::istream_iterator<std::string>(words), {}};
    texts.push_back(program);
    texts.insert(texts.end(), args.begin(), args.end());
    std::vector<char*> argv(texts.size() + 1, nullptr);
    std::transform(texts.begin(), texts.end(), argv.begin(), [](auto& t) { return t.data(); });
    TempDir capture;
    const std::string in = options.stdin_path.empty() ? "/dev/null" : options.stdin_path;
    const std::string err = options.stderr_path.empty() ? capture / "err" : options.stderr_path;
    std::fflush(nullptr);
    const pid_t pid = ::fork();
    if (pid == 0) {
        if (!std::freopen(in.c_str(), "r", stdin) || !std::freopen(err.c_str(), "w", stderr) ||
            !std::freopen((capture / "out").c_str(), "w", stdout) ||
            (!options.cwd.empty() && ::chdir(options.cwd.c_str()) != 0))
            ::_exit(127);
        ::setenv("PATH", (bin_dir() + ":" + std::getenv("PATH")).c_str(), 1);
        for (const std::string& name : options.unset_env)
            ::unsetenv(name.c_str());
        for (const auto& [name, value] : options.set_env)
            ::setenv(name.c_str(), value.c_str(), 1);
        ::execvp(argv[0], argv.data());
        ::_exit(127);
    }
    int status = 0;
    if (pid < 0 || ::waitpid(pid, &status, 0) != pid)
        throw std::runtime_error("cannot run " + program);
    return {WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status),
            read_file(capture / "out"), options.stderr_path.empty() ? read_file(err) : ""};
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
