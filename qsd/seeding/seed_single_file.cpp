// One loader run: the response file, the loader's environment, the run itself
// with its seeding log.
#include <unistd.h>

#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/fs.h"
#include "qsd/platform/process.h"
#include "qsd/platform/status.h"
#include "qsd/platform/trace.h"
#include "qsd/seeding/seed_texts.h"

namespace {

// Runs the loader on the response file, its output appended to the seeding
// log when there is one. Returns 0 when the loader succeeded, else -6.
int run_loader(int response_fd, int log_fd) {
    ZR7_TRACED("Installer610::seed_single_file");
    zr7::ProcessSpec job;
    job.program = "qdsload";
    job.stdin_fd = response_fd;
    job.stdout_fd = log_fd;
    const int result = zr7::run_process(job);
    // Without a shell in between nobody else says why the loader did not
    // run, so this says it.
    if (result == zr7::kRunNotStarted)
        ZR7_DETAIL("Error: Can't start <%s>", job.program.c_str());
    return result == 0 ? 0 : -6;
}

}  // namespace

int Installer610::seed_single_file(const std::string& dst_dir, const std::string& file_name) {
    ZR7_OPERATION("Installer610::seed_single_file");
    switch (zr7::select_sql_name(file_name)) {
        case zr7::SqlSelection::kDeletion:
            ZR7_DETAIL("rejecting all _del.sql for now <%s> ", file_name.c_str());
            on_action(zr7::Action::kPass, dst_dir + "/" + file_name, "");
            ZR7_RETURN(0);
        case zr7::SqlSelection::kNotSql:
            ZR7_DETAIL("rejecting non-sql file <%s> ", file_name.c_str());
            on_action(zr7::Action::kPass, dst_dir + "/" + file_name, "");
            ZR7_RETURN(0);
        case zr7::SqlSelection::kSeed:
            break;
    }

    // The response file gives the loader one value a line: a name holding a
    // line break would hand it lines of the image's choosing.
    if (file_name.find('\n') != std::string::npos) {
        ZR7_ERROR("Error: Can't seed <%s>: the name holds a line break", file_name.c_str());
        ZR7_RETURN(zr7::kStatusSeedFailed);
    }

    ZR7_DETAIL("Using SQLLIB <%s> ", dst_dir.c_str());
    const std::string sqllib = zr7::sqllib_entry(dst_dir);
    ZR7_DETAIL("seeding <%s> ", file_name.c_str());
    const std::string response_path = zr7::response_file_path(tmp_path, InstallUtil::get_pid());
    const std::string log_path =
        log_dir.empty() ? std::string() : zr7::seeding_log_path(log_dir, file_name);
    const std::string command = zr7::loader_command_text(response_path, log_path);

    // The response file lives in a directory that everybody may write: it is
    // made under a scratch name nobody can have prepared and renamed into
    // place, and the loader reads it from the descriptor written here.
    int status = zr7::kStatusSeedFailed;
    const std::string content = zr7::response_file_content(protocol, host_name, port, file_name);
    zr7::fs::UniqueFd tmp_dir;
    int error = zr7::fs::open_trusted_dir(tmp_path, tmp_dir);
    const std::string response_name = zr7::base_name(response_path);
    zr7::fs::AtomicReplace response(tmp_dir.get(), response_name, false);
    response.make_private();
    bool placed = false;
    if (error == 0)
        error = response.open("qsdseed");
    if (error == 0)
        error = zr7::fs::write_all(response.fd(), content);
    if (error == 0 && (error = response.commit(0600)) == 0)
        placed = true;
    zr7::fs::UniqueFd log_fd;
    if (error != 0) {
        ZR7_DETAIL("Error: Unable to create <%s> ", response_path.c_str());
        ZR7_ERROR("Error: <%s>: %s", response_path.c_str(), zr7::fs::error_text(error).c_str());
        status = zr7::kStatusCannotWrite;
    } else if (!log_path.empty() && (error = open_seeding_log(file_name, log_fd)) != 0) {
        ZR7_DETAIL("Error: Can't open <%s>", log_path.c_str());
        ZR7_ERROR("Error: <%s>: %s", log_path.c_str(), zr7::fs::error_text(error).c_str());
        status = zr7::kStatusSeedFailed;
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
        if (observer != nullptr)
            observer->on_seeding(file_name);
        // Journaled before the loader runs: the catalog may change even when
        // the loader fails.
        if (journal_or_null() != nullptr)
            (void)journal->note("seed", dst_dir + "/" + file_name);
        (void)::lseek(response.fd(), 0, SEEK_SET);
        status = run_loader(response.fd(), log_fd.get());
        // Given to the loader, whatever it made of it: the catalog may hold
        // part of it.
        on_action(zr7::Action::kSeed, dst_dir + "/" + file_name, "");
    }
    // Whatever happened, the response file does not outlive the run.
    if (placed)
        (void)zr7::fs::remove_file(tmp_dir.get(), response_name);
    ZR7_RETURN(status);
}
