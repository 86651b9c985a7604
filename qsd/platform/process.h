// The one way the tool starts another program: an argument vector, never a
// shell, with the redirections done here rather than by a command line.
#pragma once

#include <string>
#include <vector>

namespace zr7 {

enum class OutputMode { kInherit, kTruncate, kAppend };

struct ProcessSpec {
    // A name without "/" is looked up on PATH; a name with one is used as is.
    std::string program;
    // argv[1..]; argv[0] is `program` as given.
    std::vector<std::string> args;
    // Standard input from this file when not empty.
    std::string stdin_path;
    // Standard output to this file when the mode is not kInherit; a created
    // file gets mode 0666 less the umask.
    std::string stdout_path;
    OutputMode stdout_mode = OutputMode::kInherit;
    // Descriptors the caller opened and checked. When one is set it becomes
    // the program's standard input or output and the path field beside it
    // is not looked at; the caller keeps and closes it.
    int stdin_fd = -1;
    int stdout_fd = -1;
    // SIGINT, SIGTERM and SIGHUP that reach this process while it waits are
    // passed on to the program (the first invocation waiting for the
    // installing run).
    bool forward_signals = false;
};

struct ProcessResult {
    int status = -1;  // as run_process returns it
    int signal = 0;   // the signal that ended the program, else 0
};

// Statuses of run_process besides the program's own 0..255 and 128+signal.
constexpr int kRunNotStarted = -1;    // not found on PATH, or spawn failed
constexpr int kRunStdinFailed = -2;   // input file missing, unreadable or a directory
constexpr int kRunStdoutFailed = -3;  // output file could not be opened, or is the input

// Starts the program and waits for it. The program starts with the default
// action for every signal and no signal blocked, whatever this process
// ignores or blocks. Returns its exit status, 128+N when
// signal N ended it, or one of the kRun* failures. The standard input file is
// opened before the output file, so a missing input leaves an existing output
// untouched, and an output that is the input file itself is refused before it
// is truncated. Standard output is flushed first so that the tool's own lines
// and the child's stay in order.
int run_process(const ProcessSpec& job);

// As run_process, and tells whether a signal ended the program: 128+N alone
// cannot tell a signal from a program that exited with that status.
ProcessResult run_process_ex(const ProcessSpec& job);

// Full path of `program` on PATH ("" when not found). The answer is cached
// per program name and PATH value: a run starts the same few programs
// thousands of times.
std::string find_on_path(const std::string& program);

}  // namespace zr7
