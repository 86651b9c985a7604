// What the robustness tests share: starting the tool under the limits a test
// imposes (a file size limit, another user, a process group of its own),
// snapshots of directory trees, and the figures each part reports.
#pragma once

#include <sys/types.h>

#include <map>
#include <string>
#include <vector>

#include "support/test_support.h"

namespace zr7rb {

// ZR7_SOAK=1 (set by `make soak`) selects the long variants.
bool soak();
int scaled(int quick, int long_run);

// Prints a figure and records it as a property of the running test.
void report(const std::string& what, long long count);

// One start of a program by fork and exec. The environment is the test's,
// with build/bin first on PATH, the variables that steer the tool removed,
// then `env` applied.
struct Launch {
    std::vector<std::string> argv;  // argv[0]: the program's path
    std::map<std::string, std::string> env;
    std::string cwd;
    long long file_size_limit = -1;  // RLIMIT_FSIZE in bytes, SIGXFSZ ignored
    bool as_nobody = false;          // setgid and setuid 65534 before exec
    std::string output_path;         // standard output and error (start only)
};

// The installing invocation of the tool on a sample installation, every
// trace class on: "-o <home>/logs/ -h <home> <extra...> <image>".
Launch install_launch(const zr7test::SampleInstall& s, const std::vector<std::string>& extra = {});
// The same without "-o": the tool relaunches itself with its log.
Launch relaunch_launch(const zr7test::SampleInstall& s, const std::vector<std::string>& extra = {});

// Starts the program in a process group of its own (so that kill(-pid, ...)
// reaches its children too) with output to `output_path` or /dev/null.
pid_t start(const Launch& launch);
// Waits for it: 0..255, or 128+N for signal N.
int wait_for(pid_t pid);
// Starts it with its output read through pipes, which no file size limit
// reaches, and waits for it.
zr7test::RunResult run_captured(const Launch& launch);

// Whether dropping to the unprivileged user works here (root, and a kernel
// that lets it); the tests that need it skip otherwise.
bool can_drop_privileges();
// Hands a whole tree to that user, so that it can work in it.
void give_tree_to_nobody(const std::string& path);

// Every entry under a directory, without following links: "d" for a
// directory, "l" + target for a link, "f" + content for anything else.
using Snapshot = std::map<std::string, std::string>;
Snapshot snapshot(const std::string& dir);

// Run `n` of a series changes VXAENV with its own module and setting:
// "-m MOD<n> -c KEY<n>=value<n>".
std::vector<std::string> change_options(int n);
// What the environment file update makes of `content` for run `n`.
std::string changed_by(const std::string& content, int n);
// The backups (VXAENV_<stamp>) of a sample installation's VXAENV, as paths.
std::vector<std::string> backups(const zr7test::SampleInstall& s);

// Whether a captured output holds a line containing `text`.
bool has_line(const std::string& output, const std::string& text);

// The content of a regular file (through links), "" for anything else: a
// test must not block on a pipe that a case put in place of a file.
std::string content_of(const std::string& path);

// Reshapes a sample installation by steps separated by " ; ". A path is K
// (kmsenv), V (VXAENV), or begins with I/ (image/MSRV), A/ (its architecture
// directory), T/ (the TABLE tree), H/ (the server's table directory), O/ (the
// installation directory) or R/ (the scratch root); anything else is taken
// as it is. Whatever stands at a path is replaced.
//   file P TEXT    a file holding TEXT (the rest of the step)
//   append P TEXT  TEXT added at the end
//   repeat P N L   L and a newline added N times
//   fill P N [X]   X, N bytes "x" and a newline
//   garbage P N    N random bytes (fixed seed)
//   dir P / fifo P / rm P / chmod MODE P / ln TARGET P
void shape(const zr7test::SampleInstall& s, const std::string& steps);
// Whether checks separated by " ; " hold: "is P TEXT" (a regular file
// holding TEXT), "no P" (nothing there), "link P" (a symbolic link).
bool holds(const zr7test::SampleInstall& s, const std::string& checks);

}  // namespace zr7rb
