#include "support/test_support.h"

#include <dirent.h>
#include <fcntl.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <sstream>
#include <stdexcept>

extern char** environ;

namespace zr7test {

TempDir::TempDir() {
    const char* base = std::getenv("TMPDIR");
    std::string pattern =
        std::string(base != nullptr && *base != '\0' ? base : "/tmp") + "/zr7test.XXXXXX";
    std::vector<char> buffer(pattern.begin(), pattern.end());
    buffer.push_back('\0');
    if (::mkdtemp(buffer.data()) == nullptr)
        throw std::runtime_error("mkdtemp failed");
    path_ = buffer.data();
}

TempDir::~TempDir() {
    remove_tree(path_);
}

void make_dirs(const std::string& path) {
    std::string partial;
    std::stringstream parts(path);
    std::string piece;
    if (!path.empty() && path[0] == '/')
        partial = "/";
    while (std::getline(parts, piece, '/')) {
        if (piece.empty())
            continue;
        partial += piece;
        ::mkdir(partial.c_str(), 0755);
        partial += "/";
    }
}

void write_file(const std::string& path, const std::string& content, unsigned mode) {
    ::unlink(path.c_str());
    std::ofstream out(path, std::ios::binary);
    if (!out)
        throw std::runtime_error("cannot write " + path);
    out << content;
    out.close();
    ::chmod(path.c_str(), mode);
}

std::string read_file(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    std::ostringstream content;
    content << in.rdbuf();
    return content.str();
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
    DIR* dir = ::opendir(path.c_str());
    if (dir == nullptr)
        return names;
    while (struct dirent* entry = ::readdir(dir)) {
        std::string name = entry->d_name;
        if (name != "." && name != "..")
            names.push_back(name);
    }
    ::closedir(dir);
    std::sort(names.begin(), names.end());
    return names;
}

std::string bin_dir() {
    return ZR7_BIN_DIR;
}
std::string tool_path() {
    return bin_dir() + "/zr7inst";
}

RunResult run(const std::string& program, const std::vector<std::string>& args,
              const RunOptions& options) {
    TempDir capture;
    const std::string out_path = capture / "out";
    const std::string err_path = capture / "err";

    std::map<std::string, std::string> env;
    for (char** e = environ; *e != nullptr; ++e) {
        std::string entry = *e;
        std::size_t eq = entry.find('=');
        if (eq != std::string::npos)
            env[entry.substr(0, eq)] = entry.substr(eq + 1);
    }
    if (options.prepend_bin_to_path)
        env["PATH"] = bin_dir() + ":" + env["PATH"];
    for (const auto& name : options.unset_env)
        env.erase(name);
    for (const auto& kv : options.set_env)
        env[kv.first] = kv.second;
    std::vector<std::string> env_text;
    for (const auto& kv : env)
        env_text.push_back(kv.first + "=" + kv.second);
    std::vector<char*> envp;
    for (auto& e : env_text)
        envp.push_back(e.data());
    envp.push_back(nullptr);

    // ZR7_TOOL_WRAPPER (words, the first a path) runs the tool under a
    // checker such as valgrind; other programs, and the tool started under
    // another argv[0] (which a checker would not pass on), run as they are.
    std::vector<std::string> argv_text;
    const char* wrapper = std::getenv("ZR7_TOOL_WRAPPER");
    if (program == tool_path() && wrapper != nullptr && options.argv0.empty()) {
        std::istringstream words(wrapper);
        for (std::string word; words >> word;)
            argv_text.push_back(word);
    }
    const std::string path = argv_text.empty() ? program : argv_text[0];
    argv_text.push_back(options.argv0.empty() ? program : options.argv0);
    argv_text.insert(argv_text.end(), args.begin(), args.end());
    std::vector<char*> argv;
    for (auto& a : argv_text)
        argv.push_back(a.data());
    argv.push_back(nullptr);

    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    const std::string in_path = options.stdin_path.empty() ? "/dev/null" : options.stdin_path;
    posix_spawn_file_actions_addopen(&actions, 0, in_path.c_str(), O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&actions, 1, out_path.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0644);
    posix_spawn_file_actions_addopen(&actions, 2, err_path.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0644);
    if (!options.cwd.empty())
        posix_spawn_file_actions_addchdir_np(&actions, options.cwd.c_str());

    RunResult result;
    pid_t pid = 0;
    const int rc = posix_spawn(&pid, path.c_str(), &actions, nullptr, argv.data(), envp.data());
    posix_spawn_file_actions_destroy(&actions);
    if (rc != 0) {
        result.err = std::string("spawn failed: ") + std::strerror(rc);
        return result;
    }
    int status = 0;
    while (::waitpid(pid, &status, 0) < 0 && errno == EINTR) {
    }
    result.exit_code = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    result.out = read_file(out_path);
    result.err = read_file(err_path);
    return result;
}

const char* const kSampleVxaenv =
    "# server environment\n"
    "KDS_START=1\n"
    "KDS_RUN=KDSMAIN;KDSTRACE\n"
    "CT_CMSLIST=IP.PIPE:#127.0.0.1\n";

SampleInstall::SampleInstall() {
    home = root / "home";
    image = root / "image";
    make_dirs(home + "/config/.ConfigData");
    write_file(home + "/config/.ConfigData/kmsenv",
               "HEADING=sample server configuration\n"
               "FIELDSEP=|\n"
               "default|PORTNUMBER|1234|\n"
               "SRV1|NETWORKPROTOCOL|ip.pipe|\n"
               "SRV1|IPPIPEPORTNUMBER|1918|\n"
               "SRV1|BINARCH|lx8266|\n"
               "SRV1|HOSTNAME|confighost|\n");
    for (const char* dir : {"ATTRLIB", "RKDSCATL", "TECLIB"}) {
        make_dirs(tables() + "/" + dir);
        make_dirs(cicatrsq() + "/" + dir);
    }
    make_dirs(cicatrsq() + "/SQLLIB");
    make_dirs(home + "/" + arch + "/ms/lib");
    make_dirs(home + "/" + arch + "/ms/bin");
    make_dirs(home + "/logs");
    vxaenv = tables() + "/VXAENV";
    write_file(vxaenv, kSampleVxaenv);

    const std::string msrv = image + "/MSRV";
    make_dirs(msrv + "/ATTRLIB");
    make_dirs(msrv + "/RKDSCATL");
    make_dirs(msrv + "/TECLIB");
    make_dirs(msrv + "/SQLLIB");
    write_file(msrv + "/ATTRLIB/kzr.atr", "name kzr\r\nattr one\r\n");
    write_file(msrv + "/RKDSCATL/kzr.cat", "catalog\r\n");
    write_file(msrv + "/TECLIB/kzr.baroc", "event\r\n");
    write_file(msrv + "/SQLLIB/kzr_a.sql",
               "INSERT INTO T VALUES (1);\nINSERT INTO T VALUES (2);\n");
    write_file(msrv + "/SQLLIB/kzr_b.sql", "INSERT INTO T VALUES (3);\n");
    const std::string archdir = msrv + "/" + arch;
    make_dirs(archdir + "/TABLE/TECLIB");
    make_dirs(archdir + "/TABLE/sub/deeper");
    write_file(archdir + "/TABLE/table.dat", "table\r\n");
    write_file(archdir + "/TABLE/sub/deeper/nested.dat", "nested\r\n");
    write_file(archdir + "/TABLE/TECLIB/kzr_table.baroc", "table event\r\n");
    make_dirs(archdir + "/TABLE_PRESERVE");
    write_file(archdir + "/TABLE_PRESERVE/keep.cfg", "from image\n");
    make_dirs(archdir + "/TABLE_TXT");
    write_file(archdir + "/TABLE_TXT/text.txt", "line one\r\nline two\r\n");
    make_dirs(archdir + "/TABLE_PRESERVE_TXT");
    write_file(archdir + "/TABLE_PRESERVE_TXT/keep.txt", "preserved\r\n");
    make_dirs(archdir + "/lib");
    write_file(archdir + "/lib/libkzr.so", "ELF\r\nbinary\r\n");
    make_dirs(archdir + "/bin");
    write_file(archdir + "/bin/kzragent", "#!/bin/sh\r\nexit 0\r\n", 0755);
}

}  // namespace zr7test
