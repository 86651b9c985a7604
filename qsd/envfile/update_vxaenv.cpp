// The environment file update: reads VXAENV, applies the requested settings
// and module names (env_rewrite.cpp), and when anything differs, backs the
// old file up and replaces it atomically. The server does not start without
// this file, so at every moment it is either the old file or the new one,
// whole, and concurrent runs take turns instead of losing each other's change.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <ctime>

#include "qsd/envfile/backup.h"
#include "qsd/envfile/durable_file.h"
#include "qsd/envfile/env_rewrite.h"
#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/directory_lock.h"
#include "qsd/platform/file_io.h"
#include "qsd/platform/progress.h"
#include "qsd/platform/trace.h"

namespace {

// The file to read and replace: VXAENV itself, or the file its symbolic link
// names, so that the link stays a link. "" when neither can be had.
std::string real_target(const std::string& env_path) {
    struct stat st {};
    if (::lstat(env_path.c_str(), &st) != 0)
        return std::string();
    if (!S_ISLNK(st.st_mode))
        return env_path;
    char resolved[PATH_MAX];
    if (::realpath(env_path.c_str(), resolved) == nullptr)
        return std::string();
    return resolved;
}

// A line break inside a requested value would become a line of its own in
// the file, a setting nobody asked for (a second KDS_RUN among them).
const std::string* first_with_line_break(const zr7::Dictionary& settings) {
    for (const zr7::Dictionary::Entry& entry : settings.entries()) {
        if (entry.second.find_first_of("\r\n") != std::string::npos)
            return &entry.first;
    }
    return nullptr;
}

// Gives the new file the old one's permission bits, and its owner and group
// when we may (root): the server must be able to read what it read before.
bool take_over_attributes(int fd, const struct stat& old) {
    if (::geteuid() == 0 && ::fchown(fd, old.st_uid, old.st_gid) != 0)
        return false;
    // After the owner: a change of owner may clear the set-id bits.
    return ::fchmod(fd, old.st_mode & 07777) == 0;
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

    const std::string env_path = zr7::join_dir(dir, "VXAENV");
    const std::string target = real_target(env_path);
    if (target.empty()) {
        ZR7_ERROR("Error: Can't open <%s>", env_path.c_str());
        ZR7_RETURN(-7);
    }

    // The scratch file's name is settled (and shown) before anything is read;
    // the file itself is made only when something changes. The process id
    // keeps it apart from any other run's.
    const std::string planned_new_path = target + ".new." + InstallUtil::get_pid();
    ZR7_DETAIL("writing to <%s>", planned_new_path.c_str());

    // Held until the new file is in place: a run that waits here reads the
    // file that the run before it wrote.
    zr7::DirectoryLock lock(zr7::dir_part(target));
    if (lock.failure() != 0)  // a wait given up or a refused lock: reported already
        ZR7_RETURN(lock.failure());
    if (!lock.locked()) {
        ZR7_ERROR("Error: Can't open <%s>", env_path.c_str());
        ZR7_RETURN(-7);
    }

    struct stat old {};
    std::string content;
    if (::stat(target.c_str(), &old) != 0 || !S_ISREG(old.st_mode) ||
        zr7::read_whole_file(target, content) != 0) {
        ZR7_ERROR("Error: Can't open <%s>", env_path.c_str());
        zr7::progress_env_result(false, "");
        ZR7_RETURN(-7);
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
        zr7::progress_env_result(false, "");
        ZR7_RETURN(0);
    }

    std::string new_path = planned_new_path;
    const int fd = zr7::create_exclusive_file(new_path);
    if (fd < 0) {
        ZR7_ERROR("Error: Can't open <%s>", new_path.c_str());
        zr7::progress_env_result(false, "");
        ZR7_RETURN(-8);
    }

    // Everything up to the rename leaves VXAENV as it was; the scratch file
    // goes on every way out that did not rename it.
    int status = 0;
    bool written =
        zr7::write_all(fd, new_content) && take_over_attributes(fd, old) && ::fsync(fd) == 0;
    if (::close(fd) != 0)
        written = false;
    std::string backup;
    if (!written) {
        ZR7_ERROR("Error: Can't write <%s>", new_path.c_str());
        status = -8;
    } else if (zr7::backup_file(dir.c_str(), "VXAENV", dir.c_str(),
                                zr7::backup_stamp(std::time(nullptr)), backup) != 0) {
        ZR7_ERROR("Error: Can't backup VXAENV");
        status = -9;
    } else if (::rename(new_path.c_str(), target.c_str()) != 0) {
        ZR7_ERROR("Error: Can't copy <%s> to <%s>", new_path.c_str(), env_path.c_str());
        status = -5;
    } else {
        new_path.clear();
        // The rename is done; a failed sync only leaves its durability open.
        if (::fsync(lock.fd()) != 0)
            ZR7_ERROR("Error: Can't sync <%s>", zr7::dir_part(target).c_str());
    }
    if (!new_path.empty())
        InstallUtil::delete_file(new_path.c_str());
    zr7::progress_env_result(status == 0, status == 0 ? backup : std::string());
    ZR7_RETURN(status);
}
