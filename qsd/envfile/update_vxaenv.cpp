// The environment file update: reads VXAENV, applies the requested settings
// and module names (env_rewrite.cpp), and when anything differs, backs the
// old file up and replaces it atomically. The server does not start without
// this file, so at every moment it is either the old file or the new one,
// whole, and concurrent runs take turns instead of losing each other's change.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <ctime>

#include "qsd/envfile/backup.h"
#include "qsd/envfile/env_rewrite.h"
#include "qsd/envfile/kds_run_list.h"
#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/directory_lock.h"
#include "qsd/platform/fs.h"
#include "qsd/platform/status.h"
#include "qsd/platform/trace.h"

namespace {

// A line break inside a requested value would become a line of its own in
// the file, a setting nobody asked for (a second KDS_RUN among them).
const std::string* first_with_line_break(const zr7::Dictionary& settings) {
    for (const zr7::Dictionary::Entry& entry : settings.entries()) {
        if (entry.second.find_first_of("\r\n") != std::string::npos)
            return &entry.first;
    }
    return nullptr;
}

std::string join_dir(const std::string& dir, const std::string& name) {
    return !dir.empty() && dir.back() == '/' ? dir + name : dir + "/" + name;
}

}  // namespace

int Installer610::update_vxaenv(const std::string& dir_template) {
    ZR7_OPERATION("Installer610::update_vxaenv");
    std::string dir;
    if (dir_template.empty() || resolve(dir_template, dir) < 0) {
        ZR7_ERROR("Error: Bad dst path <%s>", dir_template.c_str());
        ZR7_RETURN(-1);
    }
    ZR7_DETAIL("expanded dst path <%s>", dir.c_str());
    if (module_name.empty() && settings.empty())
        ZR7_RETURN(0);

    if (module_name.find_first_of("\r\n") != std::string::npos) {
        ZR7_ERROR("Error: Module name holds a line break");
        ZR7_RETURN(-1);
    }
    if (const std::string* key = first_with_line_break(settings)) {
        ZR7_ERROR("Error: Value of <%s> holds a line break", key->c_str());
        ZR7_RETURN(-1);
    }

    const std::string env_path = join_dir(dir, "VXAENV");
    // Root's link at VXAENV is followed, so that the link stays a link and
    // its target is replaced; another account's link is refused.
    zr7::fs::UniqueFd dir_fd;
    zr7::fs::Target target;
    int error = open_in_home(dir, dir_fd);
    if (error == 0)
        error = zr7::fs::resolve_name(dir_fd.get(), "VXAENV", target);
    struct stat link {};
    if (error == 0 && !target.followed && zr7::fs::stat_at(dir_fd.get(), "VXAENV", link) == 0 &&
        S_ISLNK(link.st_mode)) {
        error = zr7::fs::kUntrustedLink;
    }
    if (error != 0) {
        ZR7_ERROR("Error: Can't open <%s>", env_path.c_str());
        ZR7_ERROR("Error: <%s>: %s", env_path.c_str(), zr7::fs::error_text(error).c_str());
        ZR7_RETURN(zr7::kStatusCannotOpen);
    }
    ZR7_DETAIL("writing to <%s>", (join_dir(dir, ".VXAENV.new.") + "XXXXXX").c_str());

    // Held until the new file is in place: a run that waits here reads the
    // file that the run before it wrote.
    zr7::DirectoryLock lock(dir);
    if (lock.failure() != 0)  // a wait given up or a refused lock: reported already
        ZR7_RETURN(lock.failure());
    if (!lock.locked()) {
        ZR7_ERROR("Error: Can't open <%s>", env_path.c_str());
        ZR7_RETURN(zr7::kStatusCannotOpen);
    }

    // Scratch files of a run that was killed here; the locks keep live runs out.
    zr7::fs::remove_stale_scratch(target.dir.get(), "VXAENV.new");

    zr7::fs::UniqueFd file;
    struct stat old {};
    std::string content;
    error = zr7::fs::open_read(target.dir.get(), target.name, file, old);
    if (error == 0)
        error = zr7::fs::read_all(file.get(), content);
    if (error != 0) {
        ZR7_ERROR("Error: Can't open <%s>", env_path.c_str());
        ZR7_ERROR("Error: <%s>: %s", env_path.c_str(), zr7::fs::error_text(error).c_str());
        ZR7_RETURN(zr7::kStatusCannotOpen);
    }

    std::string new_content;
    auto kds_run = [this](const std::string& line, std::string& out) {
        return update_kds_run(line, out);
    };
    auto detail = [&](const std::string& line) { ZR7_DETAIL("%s", line.c_str()); };
    const bool changed = zr7::rewrite_env_content(content, settings, !module_name.empty(), kds_run,
                                                  detail, new_content);
    if (!changed) {
        // Nothing is written, not even a scratch file: the file and its
        // directory keep their times, and a read-only directory is no error.
        ZR7_DETAIL("VXAENV is unmodified");
        if (observer != nullptr)
            observer->on_env_result(false);
        ZR7_RETURN(0);
    }

    // The files installed so far reach the disk before VXAENV names them.
    sync_written();

    // Everything up to the rename leaves VXAENV as it was; the scratch file
    // goes on every way out that did not rename it.
    zr7::fs::AtomicReplace replace(target.dir.get(), target.name, true);
    int status = 0;
    std::string backup;
    error = replace.open("VXAENV.new");
    const std::string new_path = join_dir(dir, replace.scratch_name());
    if (error != 0) {
        ZR7_ERROR("Error: Can't open <%s>", new_path.c_str());
        ZR7_ERROR("Error: <%s>: %s", new_path.c_str(), zr7::fs::error_text(error).c_str());
        status = zr7::kStatusCannotWrite;
    } else if ((error = zr7::fs::write_all(replace.fd(), new_content)) != 0 ||
               (error = replace.adopt_attributes()) != 0 || (error = replace.sync_scratch()) != 0) {
        ZR7_ERROR("Error: Can't write <%s>", new_path.c_str());
        ZR7_ERROR("Error: <%s>: %s", new_path.c_str(), zr7::fs::error_text(error).c_str());
        status = zr7::kStatusCannotWrite;
    } else if (zr7::backup_content_at(dir_fd.get(), dir, "VXAENV", content, old.st_mode,
                                      zr7::backup_stamp(std::time(nullptr)), backup) != 0) {
        ZR7_ERROR("Error: Can't backup VXAENV");
        status = zr7::kStatusBackupFailed;
    } else if (journal_or_null() != nullptr &&
               ((error = journal->note("backup", backup)) != 0 ||
                (error = journal->before_write(target.dir.get(), target.name, env_path,
                                               zr7::Action::kReplace)) != 0)) {
        ZR7_ERROR("Error: Can't keep the old version of <%s>", env_path.c_str());
        ZR7_ERROR("Error: <%s>: %s", env_path.c_str(), zr7::fs::error_text(error).c_str());
        status = zr7::kStatusBackupFailed;
    } else {
        on_action(zr7::Action::kBackup, backup, "");
        if ((error = replace.commit()) != 0) {
            ZR7_ERROR("Error: Can't copy <%s> to <%s>", new_path.c_str(), env_path.c_str());
            ZR7_ERROR("Error: <%s>: %s", env_path.c_str(), zr7::fs::error_text(error).c_str());
            status = zr7::kStatusCopyFailed;
        } else {
            if (journal_or_null() != nullptr)
                (void)journal->after_write(target.dir.get(), target.name, env_path);
            on_action(zr7::Action::kVxaenv, env_path,
                      zr7::unified_diff(content, new_content, "VXAENV"));
        }
    }
    if (observer != nullptr && status == 0)
        observer->on_env_result(true);
    ZR7_RETURN(status);
}

// The traced face of the module run list; the rules live in kds_run_list.cpp.
int Installer610::update_kds_run(const std::string& line, std::string& out) const {
    ZR7_OPERATION("Installer610::update_kds_run");
    zr7::KdsRunUpdate update = zr7::update_kds_run_line(line, module_name);
    for (const std::string& detail : update.details)
        ZR7_DETAIL("%s", detail.c_str());
    out = update.line;
    ZR7_RETURN(update.result);
}
