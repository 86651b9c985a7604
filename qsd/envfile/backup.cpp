#include "qsd/envfile/backup.h"
#include "qsd/platform/status.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstdint>

#include "qsd/platform/fs.h"
#include "qsd/platform/trace.h"

namespace zr7 {

namespace {

constexpr std::uint64_t kSeconds1901To1970 = 2177452800ULL;
// Far more backups than one file gets in a lifetime; the bound only keeps a
// file system that refuses every name from spinning forever.
constexpr unsigned kMaxStampTries = 100000;

std::string backup_name(const std::string& file, unsigned stamp) {
    return file + "_" + std::to_string(stamp);
}

std::string join(const std::string& dir, const std::string& name) {
    return !dir.empty() && dir.back() == '/' ? dir + name : dir + "/" + name;
}

}  // namespace

unsigned backup_stamp(std::time_t now) {
    const std::uint64_t since_1901 = static_cast<std::uint64_t>(now) + kSeconds1901To1970;
    return static_cast<unsigned>(since_1901 & 0xFFFFFFFFULL);
}

int backup_content_at(int base_fd, const std::string& base_shown, const std::string& file,
                      const std::string& content, unsigned mode, unsigned stamp,
                      std::string& made) {
    ZR7_OPERATION("Installer610::make_backup");
    made.clear();
    const std::string archive = join(base_shown, ".archive");
    fs::UniqueFd archive_fd;
    if (const int error = fs::make_dir(base_fd, ".archive", archive_fd)) {
        ZR7_ERROR("Error: Unable to create backup directory <%s>", archive.c_str());
        ZR7_ERROR("Error: <%s>: %s", archive.c_str(), fs::error_text(error).c_str());
        ZR7_RETURN(zr7::kStatusBackupFailed);
    }

    fs::remove_stale_scratch(archive_fd.get(), file + ".backup");

    // The copy is made under a scratch name of our own and given the backup
    // name with link(), which never replaces an existing file: a kill leaves
    // at most a stray scratch file, never a partial backup or a lost one.
    std::string name = backup_name(file, stamp);
    fs::AtomicReplace scratch(archive_fd.get(), "", true);
    int error = scratch.open(file + ".backup");
    if (error == 0)
        error = fs::write_all(scratch.fd(), content);
    if (error == 0)
        error = scratch.adopt_attributes(static_cast<mode_t>(mode & 0777), S_IWUSR);
    if (error == 0)
        error = scratch.sync_scratch();
    unsigned tries = 0;
    while (error == 0 && (error = scratch.link_as(name)) == EEXIST) {
        if (++tries >= kMaxStampTries)
            break;
        ++stamp;
        name = backup_name(file, stamp);
        error = 0;
    }
    if (error == 0)
        error = fs::sync_fd(archive_fd.get());
    const std::string backup = join(archive, name);
    if (error != 0) {
        ZR7_ERROR("Error: Can't back up <%s> to <%s>", join(base_shown, file).c_str(),
                  backup.c_str());
        ZR7_ERROR("Error: <%s>: %s", backup.c_str(), fs::error_text(error).c_str());
        ZR7_RETURN(zr7::kStatusBackupFailed);
    }
    ZR7_DETAIL("File <%s> is backed up as <%s> successfully", join(base_shown, file).c_str(),
               backup.c_str());
    made = backup;
    ZR7_RETURN(0);
}

std::string planned_backup_path(int base_fd, const std::string& base_shown, const std::string& file,
                                unsigned stamp,
                                const std::function<bool(const std::string&)>& taken) {
    const std::string archive = join(base_shown, ".archive");
    fs::UniqueFd archive_fd;
    const bool has_archive = fs::open_dir_below(base_fd, ".archive", archive_fd) == 0;
    for (unsigned tries = 0; tries < kMaxStampTries; ++tries, ++stamp) {
        const std::string name = backup_name(file, stamp);
        struct stat st {};
        if ((!has_archive || fs::stat_at(archive_fd.get(), name, st) != 0) &&
            !taken(join(archive, name))) {
            return join(archive, name);
        }
    }
    return join(archive, backup_name(file, stamp));
}

int backup_file(const char* dir, const char* file, const char* base, unsigned stamp,
                std::string& made) {
    made.clear();
    if (dir == nullptr || file == nullptr || base == nullptr)
        return zr7::kStatusBackupFailed;
    fs::UniqueFd dir_fd;
    fs::UniqueFd base_fd;
    fs::UniqueFd source;
    struct stat st {};
    std::string content;
    if (fs::open_trusted_dir(dir, dir_fd) != 0 || fs::open_trusted_dir(base, base_fd) != 0 ||
        fs::open_read(dir_fd.get(), file, source, st) != 0 ||
        fs::read_all(source.get(), content) != 0) {
        return zr7::kStatusBackupFailed;
    }
    return backup_content_at(base_fd.get(), base, file, content, st.st_mode, stamp, made);
}

}  // namespace zr7
