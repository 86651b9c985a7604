// The relaunch: the first invocation starts the tool again with "-o <log
// directory>" in front of the user's arguments and its standard output
// appended to the log file, waits, and ends with the second run's exit status.
// The second run is started with an argument vector, so every argument
// arrives exactly as the user gave it; the command text is only shown.
#include <unistd.h>

#include <climits>
#include <cstdio>
#include <cstring>

#include "qsd/driver/driver.h"
#include "qsd/fileops/install_util.h"
#include "qsd/platform/process.h"
#include "qsd/platform/trace.h"

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

}  // namespace

int jump_start(int argc, char** argv, const char* home) {
    const std::string log_file = log_file_for(home);

    PLT1_PutEnv("VXA_TRC1=ERROR (UNIT:zr7 ALL)");
    std::printf("Invoking cmd <%s>\n", relaunch_command_text(argc, argv, home).c_str());
    std::fflush(stdout);

    ProcessSpec job;
    job.program = own_program(argv[0]);
    job.args = relaunch_arguments(argc, argv, home);
    job.stdout_path = log_file;
    job.stdout_mode = OutputMode::kAppend;
    // An interruption meant for the installation goes to the run that can
    // stop it cleanly; this one goes on waiting for its status.
    job.forward_signals = true;

    const ProcessResult result = run_process_ex(job);
    const int status = result.status;
    if (status == kRunStdoutFailed) {
        std::fprintf(stderr, "Error: Can't open <%s>\n", log_file.c_str());
        return -8;
    }
    if (status < 0) {
        std::fprintf(stderr, "Error: Can't start <%s>\n", argv[0]);
        return kRelaunchNotStarted;
    }
    if (result.signal != 0)
        std::fprintf(stderr, "Error: The installing run was ended by signal <%d>\n", result.signal);
    return status;
}

}  // namespace zr7
