// The tree walk under the tree copy, and the per-entry copy it plugs in.
#include <dirent.h>
#include <sys/stat.h>

#include <cstring>
#include <memory>
#include <vector>

#include "qsd/fileops/install_util.h"
#include "qsd/platform/progress.h"
#include "qsd/platform/trace.h"

namespace {

// Device and inode of one directory on the path from the top of the walk to
// the level being read.
struct DirectoryId {
    dev_t device;
    ino_t inode;
};

using OpenPath = std::vector<DirectoryId>;

bool on_open_path(const OpenPath& path, const struct stat& st) {
    for (const DirectoryId& id : path) {
        if (id.device == st.st_dev && id.inode == st.st_ino)
            return true;
    }
    return false;
}

struct DirCloser {
    void operator()(DIR* stream) const { ::closedir(stream); }
};
using DirStream = std::unique_ptr<DIR, DirCloser>;

// InstallUtil::copy once the source's status is known, so that the walk
// queries each entry only once. A failure names its paths: the walk stops
// there and the run with it.
int copy_entry(const char* src, const struct stat& src_st, const char* dst, unsigned flags) {
    ZR7_TRACED("InstallUtil::copy");
    if (S_ISDIR(src_st.st_mode)) {
        struct stat dst_st {};
        if (::stat(dst, &dst_st) == 0)
            return 0;
        // Another run may have created it since the look.
        if (InstallUtil::mkdir(dst) != 0 &&
            !(::stat(dst, &dst_st) == 0 && S_ISDIR(dst_st.st_mode))) {
            ZR7_ERROR("Error: Unable to create directory <%s>", dst);
            return -1;
        }
        return 0;
    }
    const int status = InstallUtil::copy_file(src, dst, flags);
    if (status == 0)
        zr7::progress_file_copied(dst);
    else
        ZR7_ERROR("Error: Copy src <%s> to dst <%s> failed", src, dst);
    return status;
}

// A link whose target cannot be reached (dangling, or a loop of links) is
// passed over; any other entry that cannot be looked at (a path too long, no
// permission) would be left out without a word, so it fails the walk.
bool is_link(const std::string& path) {
    struct stat st {};
    return ::lstat(path.c_str(), &st) == 0 && S_ISLNK(st.st_mode);
}

int apply(InstallUtil::EntryOperation operation, const std::string& src, const struct stat& src_st,
          const std::string& dst, unsigned flags) {
    if (operation == &InstallUtil::copy)
        return copy_entry(src.c_str(), src_st, dst.c_str(), flags);
    return operation(src.c_str(), dst.c_str(), flags);
}

// One level of the walk. `open_path` holds the directories of the levels
// above; a sub-directory found among them (a symbolic link back to an
// ancestor, say) would make the walk recurse without end, so it is refused.
int walk(const std::string& src, const std::string& dst, InstallUtil::EntryOperation operation,
         unsigned flags, OpenPath& open_path) {
    ZR7_OPERATION("InstallUtil::recursive_process");
    ZR7_DETAIL("src <%s> dst <%s>", src.c_str(), dst.c_str());
    DirStream stream(::opendir(src.c_str()));
    if (!stream) {
        ZR7_ERROR("Error: Can't open <%s>", src.c_str());
        ZR7_RETURN(-7);
    }

    // The top of the walk: the deeper levels are pushed by their parents from
    // the status they already queried.
    bool pushed_self = false;
    if (open_path.empty()) {
        struct stat self {};
        if (::fstat(::dirfd(stream.get()), &self) == 0) {
            open_path.push_back({self.st_dev, self.st_ino});
            pushed_self = true;
        }
    }

    std::string src_path = src + "/";
    const std::size_t src_prefix = src_path.size();
    std::string dst_path = dst;
    const std::size_t dst_prefix = dst_path.size();
    int status = 0;
    while (const struct dirent* entry = ::readdir(stream.get())) {
        const char* name = entry->d_name;
        if (std::strcmp(name, ".") == 0 || std::strcmp(name, "..") == 0)
            continue;
        src_path.resize(src_prefix);
        src_path += name;
        dst_path.resize(dst_prefix);
        dst_path += name;
        struct stat st {};
        if (::stat(src_path.c_str(), &st) != 0) {
            if (is_link(src_path))
                continue;
            ZR7_ERROR("Error: Can't access <%s>", src_path.c_str());
            status = -7;
            break;
        }

        if (S_ISDIR(st.st_mode)) {
            if (on_open_path(open_path, st)) {
                ZR7_ERROR("Error: Directory loop at <%s>", src_path.c_str());
                status = -5;
                break;
            }
            status = apply(operation, src_path, st, dst_path, flags);
            if (status != 0)
                break;
            open_path.push_back({st.st_dev, st.st_ino});
            status = walk(src_path, dst_path + "/", operation, flags, open_path);
            open_path.pop_back();
            if (status != 0)
                break;
        } else {
            ZR7_DETAIL("processing<%s>", dst_path.c_str());
            status = apply(operation, src_path, st, dst_path, flags);
            if (status != 0)
                break;
        }
    }
    if (pushed_self)
        open_path.pop_back();
    ZR7_RETURN(status);
}

}  // namespace

int InstallUtil::recursive_process(const char* src, const char* dst, EntryOperation operation,
                                   unsigned flags) {
    OpenPath open_path;
    return walk(src, dst, operation, flags, open_path);
}

int InstallUtil::copy(const char* src, const char* dst, unsigned flags) {
    struct stat st {};
    if (::stat(src, &st) != 0)
        return 0;
    return copy_entry(src, st, dst, flags);
}

int InstallUtil::xcopy(const char* src, const char* dst, unsigned flags) {
    return recursive_process(src, dst, &InstallUtil::copy, flags) == 0 ? 0 : -5;
}
