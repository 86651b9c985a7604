// The command paths turned into directories opened by the file-system
// layer's rules: below the installation directory a link is followed only
// when root owns it, below the image's MSRV only when it stays inside it or
// root owns it.
#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <ctime>

#include "qsd/envfile/backup.h"
#include "qsd/installer/installer610.h"

namespace {

// The part of `path` below `base` ("." for the base itself), or false when
// the path does not lie below it.
bool below(const std::string& path, const std::string& base, std::string& relative) {
    if (path == base) {
        relative = ".";
        return true;
    }
    const std::string prefix = base.empty() || base.back() != '/' ? base + "/" : base;
    if (path.compare(0, prefix.size(), prefix) != 0)
        return false;
    relative = path.substr(prefix.size());
    return true;
}

// A command path never climbs: the names that build it (the server name,
// the architecture) hold no "/" and are not "..".
bool climbs(const std::string& relative) {
    std::size_t start = 0;
    while (start <= relative.size()) {
        std::size_t slash = relative.find('/', start);
        if (slash == std::string::npos)
            slash = relative.size();
        if (relative.compare(start, slash - start, "..") == 0 && slash - start == 2)
            return true;
        start = slash + 1;
    }
    return false;
}

}  // namespace

int Installer610::open_home() {
    return zr7::fs::open_trusted_dir(home_path, home_fd);
}

int Installer610::open_in_home(const std::string& path, zr7::fs::UniqueFd& out) const {
    const std::string* home = symbols.find("HOMEPATH");
    std::string relative;
    if (home != nullptr && home_fd.valid() && below(path, *home, relative)) {
        if (climbs(relative))
            return EINVAL;
        return zr7::fs::open_dir_below(home_fd.get(), relative, out);
    }
    return zr7::fs::open_trusted_dir(path, out);
}

int Installer610::open_in_image(const std::string& path, zr7::ImageEntry& out) {
    const std::string* source = symbols.find("SRCPATH");
    std::string relative;
    if (source != nullptr && below(path, *source, relative)) {
        if (image_error == -1)
            image_error = zr7::open_image_root(*source, image);
        if (image_error != 0)
            return image_error;
        if (climbs(relative))
            return EINVAL;
        return zr7::open_image_dir(image, relative, out);
    }
    zr7::ImageRoot other;
    if (const int failed = zr7::open_image_root(path, other))
        return failed;
    return zr7::open_image_dir(other, ".", out);
}

zr7::ServerDirGuard Installer610::server_dir_guard() {
    zr7::ServerDirGuard guard;
    zr7::fs::UniqueFd tables;
    struct stat st {};
    std::string path;
    if (resolve("${HOMEPATH}/tables/${QMSNAME}", path) != 0 || open_in_home(path, tables) != 0 ||
        ::fstat(tables.get(), &st) != 0) {
        return guard;
    }
    guard.active = true;
    guard.device = st.st_dev;
    guard.inode = st.st_ino;
    guard.back_up_env_file = [this, path]() {
        struct stat env {};
        zr7::fs::UniqueFd dir;
        if (open_in_home(path, dir) != 0)
            return 0;
        const bool exists = zr7::fs::stat_at(dir.get(), "VXAENV", env) == 0;
        if (preview) {
            if (exists || planned.file(path + "/VXAENV") != nullptr)
                on_action(zr7::Action::kBackup, planned_env_backup(dir.get(), path), "");
            return 0;
        }
        if (!exists)
            return 0;
        std::string made;
        const int status = zr7::backup_file(path.c_str(), "VXAENV", path.c_str(),
                                            zr7::backup_stamp(std::time(nullptr)), made);
        if (status == 0) {
            if (journal_or_null() != nullptr)
                (void)journal->note("backup", made);
            on_action(zr7::Action::kBackup, made, "");
        }
        return status;
    };
    return guard;
}

std::string Installer610::planned_env_backup(int dir, const std::string& dir_shown) {
    const std::string path = zr7::planned_backup_path(
        dir, dir_shown, "VXAENV", zr7::backup_stamp(std::time(nullptr)),
        [this](const std::string& backup) { return planned.file(backup) != nullptr; });
    planned.add_file(path, zr7::PlannedFile{});
    return path;
}

int Installer610::read_planned(const zr7::PlannedFile& file, std::string& content) {
    const std::size_t slash = file.source.find_last_of('/');
    zr7::ImageEntry dir;
    zr7::ImageEntry entry;
    int error =
        slash == std::string::npos ? ENOENT : open_in_image(file.source.substr(0, slash), dir);
    if (error == 0) {
        error = zr7::open_image_entry(image, dir.fd.get(), dir.where, dir.outside,
                                      file.source.substr(slash + 1), entry);
    }
    if (error == 0 && entry.kind != zr7::EntryKind::kFile)
        error = zr7::fs::kNotRegular;
    if (error == 0)
        error = zr7::fs::read_all(entry.fd.get(), content);
    if (error == 0 && file.strip_cr)
        content.erase(std::remove(content.begin(), content.end(), '\r'), content.end());
    return error;
}

void Installer610::note_written(int dir) {
    struct stat st {};
    if (::fstat(dir, &st) != 0)
        return;
    for (const auto& known : written) {
        if (known.first == st.st_dev)
            return;
    }
    zr7::fs::UniqueFd copy(::fcntl(dir, F_DUPFD_CLOEXEC, 0));
    if (copy.valid())
        written.emplace_back(st.st_dev, std::move(copy));
}

void Installer610::sync_written() {
    for (const auto& known : written)
        (void)zr7::fs::sync_filesystem(known.second.get());
}

int Installer610::open_seeding_log(const std::string& file_name, zr7::fs::UniqueFd& out) {
    std::string dir = log_dir;
    while (dir.size() > 1 && dir.back() == '/')
        dir.pop_back();
    zr7::fs::UniqueFd logs;
    int error = open_in_home(dir, logs);
    if (error == ENOENT) {
        // The log directory of a home that has none yet.
        const std::size_t slash = dir.find_last_of('/');
        zr7::fs::UniqueFd parent;
        error = slash == std::string::npos ? ENOENT : open_in_home(dir.substr(0, slash), parent);
        if (error == 0)
            error = zr7::fs::make_dir(parent.get(), dir.substr(slash + 1), logs);
    }
    if (error != 0)
        return error;
    return zr7::fs::open_append(logs.get(), file_name + ".log", out);
}
