#include <unistd.h>

#include <climits>
#include <cstdio>
#include <memory>

#include "qsd/config/kmsenv_reader.h"
#include "qsd/platform/status.h"

#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/installer/run_store.h"
#include "qsd/platform/directory_lock.h"
#include "qsd/platform/interruption.h"
#include "qsd/platform/trace.h"

int Installer610::init(const std::string& src_dir, const std::string& home_dir) {
    ZR7_OPERATION("Installer610::init");
    source_path = src_dir;
    init_home(home_dir);
    int status = read_config(home_path);
    // The server name and the architecture name directories under the home:
    // "..", a "/" or a control byte would reach another directory or break
    // a line of the log. An empty architecture is left to the copies.
    if (status == 0 && !zr7::is_safe_directory_name(server_name)) {
        ZR7_ERROR_TEXT("Error: Bad server name <" + server_name + ">");
        status = -1;
    } else if (status == 0 && !zr7::is_safe_directory_name(arch)) {
        ZR7_ERROR_TEXT("Error: Bad architecture <" + arch + ">");
        status = -1;
    }
    if (status == 0) {
        tmp_path = InstallUtil::get_tmp_path();
        host_name = InstallUtil::get_hostname();
    }
    add_path_symbol("HOMEPATH", home_path.c_str());
    add_path_symbol("SRCPATH", source_path.c_str());
    add_symbol("BINARCH", arch.c_str());
    add_symbol("QMSNAME", server_name.c_str());
    ZR7_DETAIL("src path....<%s>", source_path.c_str());
    ZR7_DETAIL("home path...<%s>", home_path.c_str());
    ZR7_DETAIL("tmp path....<%s>", tmp_path.c_str());
    ZR7_DETAIL("protocol....<%s>", protocol.c_str());
    ZR7_DETAIL("hostname....<%s>", host_name.c_str());
    ZR7_DETAIL("port........<%s>", port.c_str());
    ZR7_DETAIL("qms name....<%s>", server_name.c_str());
    ZR7_DETAIL("binarch.....<%s>", arch.c_str());
    ZR7_DETAIL("rc..........<%d>", status);
    ZR7_RETURN(status);
}

void Installer610::init_home(const std::string& home_dir) {
    home_path = home_dir.empty() ? "./" : home_dir;
    char cwd[PATH_MAX];
    working_dir = ::getcwd(cwd, sizeof cwd) != nullptr ? cwd : "";
    (void)open_home();
    add_path_symbol("HOMEPATH", home_path.c_str());
}

int Installer610::go() {
    ZR7_OPERATION("Installer610::go");
    // Two installations into one server take turns: their copies would race
    // for the same files, and each must see the other's VXAENV. A preview
    // writes nothing and takes no lock.
    std::unique_ptr<zr7::DirectoryLock> run_lock;
    if (const int status = take_run_lock(run_lock))
        ZR7_RETURN(status);
    if (copying == 0)
        ZR7_DETAIL("Copying disabled");
    if (seeding == 0)
        ZR7_DETAIL("Seeding disabled");
    CommandList commands = build_command_list(copying != 0, seeding != 0);
    error_mark = error_lines.size();
    int status = check_commands(commands);
    // A failure the checks find comes before every change: the plan of such
    // a run is its error alone.
    if (status != 0 && preview)
        plan = zr7::Plan();
    if (status == 0 && !preview)
        status = begin_run_dir(true);
    if (status == 0 && !preview)
        status = process_commands(commands);
    // What was installed is on the disk before the run reports it.
    sync_written();
    ZR7_RETURN(status);
}

int Installer610::process_commands(CommandList& commands) {
    ZR7_OPERATION("Installer610::process_commands");
    int status = 0;
    for (std::size_t i = 0; i < commands.size(); ++i) {
        // Between commands is a safe point: every file so far is whole.
        if (zr7::interruption() != 0)
            ZR7_RETURN(interrupted());
        const SimpleCommand& command = commands[i];
        error_mark = error_lines.size();
        if (observer != nullptr) {
            observer->on_command(static_cast<int>(i + 1), static_cast<int>(commands.size()),
                                 command.kind, command.source);
        }
        switch (command.kind) {
            case kFlatCopy:
                status = copy(command.source, command.destination);
                break;
            case kTreeCopy:
                status = recursive_copy(command.source, command.destination, command.options);
                break;
            case kUpdateEnv:
                status = update_vxaenv(command.source);
                break;
            case kSeed:
                status = seed(command.source, command.destination);
                break;
        }
        // A signal that came during the command wins over the failure it
        // may have caused (the copy program it killed).
        if (zr7::interruption() != 0 || status == zr7::kStatusInterrupted)
            ZR7_RETURN(interrupted());
        if (status < 0)
            ZR7_RETURN(status);
    }
    ZR7_RETURN(0);
}

int Installer610::take_run_lock(std::unique_ptr<zr7::DirectoryLock>& lock) {
    if (preview)
        return 0;
    // The lock reports its own wait and why it gave up.
    lock = std::make_unique<zr7::DirectoryLock>(home_path);
    if (lock->failure() == zr7::kStatusInterrupted)
        return interrupted();
    return lock->failure();
}

int Installer610::begin_run_dir(bool with_journal) {
    ZR7_TRACED("Installer610::go");
    const std::string store_path = home_path + zr7::kRunStoreName;
    zr7::fs::UniqueFd store;
    int error = home_fd.valid() ? zr7::open_run_store(home_fd.get(), store) : EBADF;
    if (error == 0) {
        // An installing run makes room for its journal; an undo removes
        // nothing (the journal it takes back may be the oldest one kept).
        if (with_journal)
            zr7::prune_runs(store.get(), zr7::kKeptJournals - 1);
        error = zr7::create_run_dir(store.get(), run_id, run_dir);
    }
    if (error == 0 && with_journal) {
        journal = std::make_unique<zr7::Journal>(
            symbols.find("HOMEPATH") != nullptr ? *symbols.find("HOMEPATH") : home_path);
        error = journal->open(run_dir.get());
    }
    if (error != 0) {
        ZR7_ERROR("Error: Can't keep the record of the run in <%s>", store_path.c_str());
        ZR7_ERROR("Error: <%s>: %s", store_path.c_str(), zr7::fs::error_text(error).c_str());
        return zr7::kStatusCannotWrite;
    }
    return 0;
}

std::string Installer610::absolute(std::string path) const {
    if (!path.empty() && path[0] == '/')
        return path;
    while (path.compare(0, 2, "./") == 0)
        path.erase(0, 2);
    return working_dir + (working_dir.empty() || working_dir.back() != '/' ? "/" : "") + path;
}

void Installer610::on_action(zr7::Action action, const std::string& path, const std::string& diff) {
    const std::string shown = action == zr7::Action::kError ? path : absolute(path);
    plan.on_action(action, shown, diff);
    if (observer != nullptr)
        observer->on_action(action, shown, diff);
}

void Installer610::finish_plan(int status) {
    if (status == 0 || plan.count(zr7::Action::kError) != 0)
        return;
    static const std::string kMark = "Error: ";
    std::string text = "status " + std::to_string(status);
    if (error_mark < error_lines.size()) {
        text = error_lines[error_mark];
        if (text.compare(0, kMark.size(), kMark) == 0)
            text.erase(0, kMark.size());
    }
    on_action(zr7::Action::kError, text, "");
}

int Installer610::interrupted() {
    ZR7_TRACED("Installer610::interrupted");
    const int signal_number = zr7::interruption();
    ZR7_ERROR("Error: Interrupted by signal <%d>", signal_number);
    std::fflush(stdout);
    std::fprintf(stderr, "Error: Interrupted by signal <%d>\n", signal_number);
    return zr7::interrupted_status(signal_number);
}
