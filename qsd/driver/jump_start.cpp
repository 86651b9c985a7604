// The relaunch: the first invocation starts the tool again with "-o <log
// directory>" in front of the user's arguments and its standard output
// appended to the log file, waits, and ends with the second run's exit status.
// The second run is started with an argument vector, so every argument
// arrives exactly as the user gave it; the command text is only shown.
#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstring>

#include "qsd/driver/driver.h"
#include "qsd/fileops/install_util.h"
#include "qsd/platform/fs.h"
#include "qsd/platform/process.h"
#include "qsd/platform/status.h"
#include "qsd/platform/trace.h"
#include "qsd/text/escape.h"

namespace zr7 {

std::string relaunch_command_text(int argc, char** argv, const std::string& home) {
    const std::string log_dir = log_dir_for(home);
    std::string text = argv[0];
    text += " -o ";
    text += InstallUtil::quote_str(log_dir.c_str());
    text += ' ';
    for (int i = 1; i < argc; ++i) {
        text += InstallUtil::quote_str(argv[i]);
        text += ' ';
    }
    text += ">>";
    text += InstallUtil::quote_str(log_file_for(home).c_str());
    return text;
}

StringList relaunch_arguments(int argc, char** argv, const std::string& home) {
    StringList args{"-o", log_dir_for(home)};
    for (int i = 1; i < argc; ++i)
        args.push_back(argv[i]);
    return args;
}

std::string log_file_for(const std::string& home) {
    return log_dir_for(home) + "qsdinst.log";
}

namespace {

// The program of the second run: the tool's path as invoked, which the
// process runner looks up on PATH when it holds no "/". A bare name that is
// not on PATH means the tool was started under a name or a search path that
// its environment does not reproduce; the executable that is running now
// stands in then, so the second run is this same program rather than none.
std::string own_program(const char* invoked) {
    if (std::strchr(invoked, '/') != nullptr || !find_on_path(invoked).empty())
        return invoked;
    char buffer[PATH_MAX];
    const ssize_t length = ::readlink("/proc/self/exe", buffer, sizeof buffer - 1);
    if (length <= 0)
        return invoked;
    return std::string(buffer, static_cast<std::size_t>(length));
}

int open_log(const std::string& home, fs::UniqueFd& out) {
    fs::UniqueFd home_fd;
    fs::UniqueFd dir;
    int error = fs::open_trusted_dir(home, home_fd);
    if (error == 0)
        error = fs::open_dir_below(home_fd.get(), home == "./" ? "." : "logs", dir);
    if (error == 0)
        error = fs::open_append(dir.get(), "qsdinst.log", out);
    return error;
}

}  // namespace

int jump_start(int argc, char** argv, const char* home) {
    const std::string log_file = log_file_for(home);

    PLT1_PutEnv("VXA_TRC1=ERROR (UNIT:zr7 ALL)");
    std::printf("Invoking cmd <%s>\n",
                escape_controls(relaunch_command_text(argc, argv, home)).c_str());
    std::fflush(stdout);

    // The log lies in the server's directory: opened by the link rule,
    // refused when it is not a regular file, never waited on.
    const std::string shown_log = escape_controls(log_file);
    fs::UniqueFd log_fd;
    if (const int error = open_log(home, log_fd)) {
        std::fprintf(stderr, "Error: Can't open <%s>\n", shown_log.c_str());
        std::fprintf(stderr, "Error: <%s>: %s\n", shown_log.c_str(), fs::error_text(error).c_str());
        return zr7::kStatusCannotWrite;
    }
    ProcessSpec job;
    job.program = own_program(argv[0]);
    job.args = relaunch_arguments(argc, argv, home);
    job.stdout_path = log_file;
    job.stdout_fd = log_fd.get();
    // An interruption meant for the installation goes to the run that can
    // stop it cleanly; this one goes on waiting for its status.
    job.forward_signals = true;

    const ProcessResult result = run_process_ex(job);
    const int status = result.status;
    if (status < 0) {
        std::fprintf(stderr, "Error: Can't start <%s>\n", escape_controls(argv[0]).c_str());
        return kRelaunchNotStarted;
    }
    if (result.signal != 0)
        std::fprintf(stderr, "Error: The installing run was ended by signal <%d>\n", result.signal);
    // The installing run's own lines are in the log; a script that sees only
    // the status learns where to look.
    if (status != 0)
        std::fprintf(stderr, "zr7inst: installation failed with exit status <%d>; see <%s>\n",
                     status & 0xFF, shown_log.c_str());
    return status;
}

}  // namespace zr7
