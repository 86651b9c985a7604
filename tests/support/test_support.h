// Helpers shared by the test programs: scratch files, running a program (the
// tool above all), a sample server installation, trace lines on standard output.
#pragma once

#include <gtest/gtest.h>

#include <map>
#include <string>
#include <vector>

namespace zr7test {

void make_dirs(const std::string& path);
void write_file(const std::string& path, const std::string& content, unsigned mode = 0644);
std::string read_file(const std::string& path);
bool exists(const std::string& path);  // a link counts, wherever it points
void remove_tree(const std::string& path);
std::vector<std::string> list_dir(const std::string& path);  // sorted, no "." or ".."
// A path of the records every run leaves: the log, qsdinst.json, the run store.
inline bool is_run_record(const std::string& path) {
    return path.find("/.zr7inst") != std::string::npos ||
           path.find("/logs/qsdinst.") != std::string::npos;
}

// Every entry below `dir`, sorted, one line each: path, mode, owner, and a
// file's bytes or a link's target; the run records left out, and with
// `server_only` also the logs, the backups and the stand-in loader's catalog
// (what undo does not give back). For "nothing changed" and "all given back".
std::string tree_text(const std::string& dir, bool server_only = false);

// A fresh scratch directory, removed with its contents when the object goes away;
// under `parent` when one is given, else under the system's scratch directory.
class TempDir {
  public:
    explicit TempDir(const std::string& parent = "");
    ~TempDir() { remove_tree(path_); }
    TempDir(const TempDir&) = delete;
    TempDir& operator=(const TempDir&) = delete;
    const std::string& path() const { return path_; }
    std::string operator/(const std::string& relative) const { return path_ + "/" + relative; }

  private:
    std::string path_;
};

struct RunResult {
    int exit_code = -1;    // 0..255, or 128+N for signal N
    std::string out, err;  // standard output and standard error
};
struct RunOptions {
    std::map<std::string, std::string> set_env;  // added or replaced
    std::vector<std::string> unset_env;
    // When "": the test's own directory, /dev/null, captured into RunResult::err.
    std::string cwd, stdin_path, stderr_path;
    long long file_limit = -1;  // RLIMIT_FSIZE in bytes, SIGXFSZ ignored
    bool as_nobody = false;     // setgid and setuid 65534 before exec
};
// The one launcher: starts a program (a path) in a process group of its own
// (kill(-pid) reaches its children), with build/bin first on PATH, umask 022,
// standard output on `out_fd` and standard error on `err_fd` (or the
// options' stderr_path). The words of ZR7_TOOL_WRAPPER (a memory checker,
// say) go before the tool. The child allocates nothing after the fork.
pid_t start(const std::string& program, const std::vector<std::string>& args,
            const RunOptions& options, int out_fd, int err_fd);
// Waits for a started program: 0..255, or 128+N for signal N.
int wait_for(pid_t pid);
// Starts a program and waits, its output captured.
RunResult run(const std::string& program, const std::vector<std::string>& args,
              const RunOptions& options = {});
inline std::string bin_dir() {
    return ZR7_BIN_DIR;
}
inline std::string tool_path() {
    return bin_dir() + "/zr7inst";
}

// A directory that any account can reach, for tests that run the tool as an
// unprivileged user: the build tree may lie where only its owner can enter.
// Made once per test program under /tmp with mode 0755, it holds copies of the
// tool and the stand-in loader (under bin/) and the scratch directories of
// those tests; it is removed when the test program ends.
const std::string& reachable_dir();
inline std::string reachable_bin_dir() {
    return reachable_dir() + "/bin";
}

// A server home (kmsenv: server SRV1, arch lx8266, ip.pipe port 1918; VXAENV; table
// directories; ms/lib, ms/bin, logs) and an image with a file wherever the tool reads.
struct SampleInstall {
    TempDir root;
    std::string home = root / "home", image = root / "image";  // without trailing "/"
    std::string server = "SRV1", arch = "lx8266", vxaenv = tables() + "/VXAENV";
    // The home and the image under `parent` when one is given (reachable_dir()
    // for a test that runs the tool as another user).
    explicit SampleInstall(const std::string& parent = "");
    std::string tables() const { return home + "/tables/" + server; }
    std::string cicatrsq() const { return home + "/tables/cicatrsq"; }
};
inline const char* const kSampleVxaenv =  // what SampleInstall puts in VXAENV
    "# server environment\nKDS_START=1\nKDS_RUN=KDSMAIN;KDSTRACE\nCT_CMSLIST=IP.PIPE:#127.0.0.1\n";

// A trace line is "(<stamp> pid <n> <unit>:<line>) <message>\n".
inline bool has_trace_line(const std::string& output, const std::string& message) {
    return output.find(") " + message + "\n") != std::string::npos;
}

}  // namespace zr7test
