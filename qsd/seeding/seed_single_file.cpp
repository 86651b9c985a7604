// One loader run: the response file, the loader's environment, the run itself
// with its seeding log.
#include <sys/stat.h>

#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/process.h"
#include "qsd/platform/progress.h"
#include "qsd/platform/trace.h"
#include "qsd/seeding/private_file.h"
#include "qsd/seeding/seed_texts.h"
#include "qsd/seeding/sql_selection.h"

namespace {

// Runs the loader on the response file, its output appended to the seeding
// log when there is one. Returns 0 when the loader succeeded, else -6.
int run_loader(const std::string& response_path, const std::string& log_dir,
               const std::string& log_path) {
    ZR7_TRACED("Installer610::seed_single_file");
    zr7::ProcessSpec job;
    job.program = "qdsload";
    job.stdin_path = response_path;
    if (!log_path.empty()) {
        struct stat st {};
        if (::stat(log_dir.c_str(), &st) != 0)
            (void)InstallUtil::mkdir(log_dir.c_str());
        job.stdout_path = log_path;
        job.stdout_mode = zr7::OutputMode::kAppend;
    }
    const int result = zr7::run_process(job);
    // Without a shell in between nobody else says why the loader did not
    // run, so these two say it.
    if (result == zr7::kRunStdoutFailed)
        ZR7_DETAIL("Error: Can't open <%s>", log_path.c_str());
    else if (result == zr7::kRunNotStarted)
        ZR7_DETAIL("Error: Can't start <%s>", job.program.c_str());
    return result == 0 ? 0 : -6;
}

}  // namespace

int Installer610::seed_single_file(const std::string& dst_dir, const std::string& file_name) {
    ZR7_OPERATION("Installer610::seed_single_file");
    switch (zr7::select_sql_name(file_name)) {
        case zr7::SqlSelection::kDeletion:
            ZR7_DETAIL("rejecting all _del.sql for now <%s> ", file_name.c_str());
            ZR7_RETURN(0);
        case zr7::SqlSelection::kNotSql:
            ZR7_DETAIL("rejecting non-sql file <%s> ", file_name.c_str());
            ZR7_RETURN(0);
        case zr7::SqlSelection::kSeed:
            break;
    }

    // The response file gives the loader one value a line: a name holding a
    // line break would hand it lines of the image's choosing.
    if (file_name.find('\n') != std::string::npos) {
        ZR7_ERROR("Error: Can't seed <%s>: the name holds a line break", file_name.c_str());
        ZR7_RETURN(-6);
    }

    ZR7_DETAIL("Using SQLLIB <%s> ", dst_dir.c_str());
    const std::string sqllib = zr7::sqllib_entry(dst_dir);
    ZR7_DETAIL("seeding <%s> ", file_name.c_str());
    const std::string response_path = zr7::response_file_path(tmp_path, InstallUtil::get_pid());
    const std::string log_path =
        log_dir.empty() ? std::string() : zr7::seeding_log_path(log_dir, file_name);
    const std::string command = zr7::loader_command_text(response_path, log_path);

    int status = -6;
    const std::string content = zr7::response_file_content(protocol, host_name, port, file_name);
    if (zr7::create_private_file(response_path, content) != 0) {
        ZR7_DETAIL("Error: Unable to create <%s> ", response_path.c_str());
        status = -8;
    } else {
        ZR7_DETAIL("protocol <%s> hostname <%s> port <%s>", protocol.c_str(), host_name.c_str(),
                   port.c_str());
        ZR7_DETAIL("setting <%s> ", family_setting.c_str());
        ZR7_DETAIL("setting <%s> ", sqllib.c_str());
        // These stay in the environment of every program started later.
        PLT1_PutEnv(family_setting.c_str());
        PLT1_PutEnv(sqllib.c_str());
        PLT1_PutEnv("VXA_TRC1=ERROR");
        ZR7_DETAIL("issuing cmd <%s> ", command.c_str());
        zr7::progress_seeding(file_name);
        status = run_loader(response_path, log_dir, log_path);
        if (status == 0)
            zr7::progress_seeded(file_name);
    }
    // Whatever happened, the response file does not outlive the run.
    InstallUtil::delete_file(response_path.c_str());
    ZR7_RETURN(status);
}
