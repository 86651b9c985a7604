#include <fcntl.h>
#include <unistd.h>

#include <cstdio>

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
    text += InstallUtil::quote_str((log_dir + "qsdinst.log").c_str());
    return text;
}

int jump_start(int argc, char** argv, const char* home) {
    const std::string log_dir = log_dir_for(home);
    const std::string log_file = log_dir + "qsdinst.log";

    PLT1_PutEnv("VXA_TRC1=ERROR (UNIT:zr7 ALL)");
    std::printf("Invoking cmd <%s>\n", relaunch_command_text(argc, argv, home).c_str());
    std::fflush(stdout);

    ProcessSpec spec;
    spec.program = argv[0];
    spec.args.push_back("-o");
    spec.args.push_back(log_dir);
    for (int i = 1; i < argc; ++i)
        spec.args.push_back(argv[i]);
    spec.stdout_path = log_file;
    spec.stdout_mode = OutputMode::kAppend;

    const int status = run_process(spec);
    if (status == kRunStdoutFailed) {
        std::fprintf(stderr, "Error: Can't open <%s>\n", log_file.c_str());
        return -8;
    }
    if (status == kRunNotStarted) {
        std::fprintf(stderr, "Error: Can't start <%s>\n", argv[0]);
        return -5;
    }
    return status;
}

}  // namespace zr7
