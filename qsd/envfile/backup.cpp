#include "qsd/envfile/backup.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>

#include "qsd/envfile/durable_file.h"
#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"

namespace zr7 {

namespace {

constexpr std::uint64_t kSeconds1901To1970 = 2177452800ULL;
// Far more backups than one file gets in a lifetime; the bound only keeps a
// file system that refuses every name from spinning forever.
constexpr unsigned kMaxStampTries = 100000;

std::string backup_name(const std::string& archive, const std::string& file, unsigned stamp) {
    return archive + "/" + file + "_" + std::to_string(stamp);
}

// The permission bits a fresh copy of the source would get, owner-writable.
void give_source_mode(const std::string& source, const std::string& copy) {
    struct stat st {};
    if (::stat(source.c_str(), &st) != 0)
        return;
    const mode_t mask = ::umask(0);
    ::umask(mask);
    (void)::chmod(copy.c_str(), ((st.st_mode & 0777) & ~mask) | S_IWUSR);
}

}  // namespace

unsigned backup_stamp(std::time_t now) {
    const std::uint64_t since_1901 = static_cast<std::uint64_t>(now) + kSeconds1901To1970;
    return static_cast<unsigned>(since_1901 & 0xFFFFFFFFULL);
}

int backup_file(const char* dir, const char* file, const char* base, unsigned stamp,
                std::string& made) {
    ZR7_OPERATION("Installer610::make_backup");
    made.clear();
    if (dir == nullptr || file == nullptr || base == nullptr)
        ZR7_RETURN(-9);

    const std::string archive = join_dir(base, ".archive");
    struct stat st {};
    if (::stat(archive.c_str(), &st) != 0) {
        // Another run may create it between the look and the creation.
        if (InstallUtil::mkdir(archive.c_str()) != 0 &&
            !(::stat(archive.c_str(), &st) == 0 && S_ISDIR(st.st_mode))) {
            ZR7_ERROR("Error: Unable to create backup directory <%s>", archive.c_str());
            ZR7_RETURN(-9);
        }
    } else if (!S_ISDIR(st.st_mode)) {
        ZR7_ERROR("Error: <%s> is not a directory", archive.c_str());
        ZR7_RETURN(-9);
    }

    std::string backup = backup_name(archive, file, stamp);
    const std::string source = join_dir(dir, file);

    // The copy is made under a scratch name of our own and given the backup
    // name with link(), which never replaces an existing file: a kill leaves
    // at most a stray scratch file, never a partial backup or a lost one.
    std::string scratch;
    const int fd = create_unique_file(archive + "/." + file + ".backup", scratch);
    if (fd < 0) {
        ZR7_ERROR("Error: Can't back up <%s> to <%s>", source.c_str(), backup.c_str());
        ZR7_RETURN(-9);
    }
    ::close(fd);

    bool done = InstallUtil::copy_file(source.c_str(), scratch.c_str(), kCopyOverwrite) == 0;
    if (done) {
        give_source_mode(source, scratch);
        done = sync_path(scratch) == 0;
    }
    unsigned tries = 0;
    while (done && ::link(scratch.c_str(), backup.c_str()) != 0) {
        if (errno != EEXIST || ++tries >= kMaxStampTries) {
            done = false;
            break;
        }
        ++stamp;
        backup = backup_name(archive, file, stamp);
    }
    InstallUtil::delete_file(scratch.c_str());
    if (done)
        done = sync_path(archive) == 0;
    if (!done) {
        ZR7_ERROR("Error: Can't back up <%s> to <%s>", source.c_str(), backup.c_str());
        ZR7_RETURN(-9);
    }

    ZR7_DETAIL("File <%s> is backed up as <%s> successfully", source.c_str(), backup.c_str());
    made = backup;
    ZR7_RETURN(0);
}

}  // namespace zr7

int Installer610::make_backup(const char* dir, const char* file, const char* base) {
    std::string made;
    return zr7::backup_file(dir, file, base, zr7::backup_stamp(std::time(nullptr)), made);
}
