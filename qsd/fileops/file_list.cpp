#include <fcntl.h>
#include <sys/stat.h>

#include "qsd/fileops/install_util.h"
#include "qsd/fileops/tree_walk.h"
#include "qsd/platform/fs.h"
#include "qsd/platform/status.h"
#include "qsd/platform/trace.h"

// The names of the non-directory entries of one directory, in the order the
// directory yields them. The status query follows symbolic links, so a link to
// a file is listed and a link to a directory or a dangling link is not. An
// entry that is no link and still cannot be looked at (no search permission
// on the directory) fails the list: its file would go missing unnoticed.
int InstallUtil::get_file_list(const char* dir, zr7::StringList& list) {
    ZR7_TRACED("InstallUtil::get_file_list");
    zr7::fs::UniqueFd fd;
    zr7::StringList names;
    if (dir == nullptr || zr7::fs::open_trusted_dir(dir, fd) != 0 ||
        zr7::list_names(fd.get(), names) != 0) {
        return zr7::kStatusCannotOpen;
    }
    for (const std::string& name : names) {
        struct stat st {};
        if (::fstatat(fd.get(), name.c_str(), &st, 0) != 0) {
            struct stat link {};
            if (::fstatat(fd.get(), name.c_str(), &link, AT_SYMLINK_NOFOLLOW) == 0 &&
                S_ISLNK(link.st_mode)) {
                continue;
            }
            ZR7_ERROR("Error: Can't access <%s/%s>", dir, name.c_str());
            return zr7::kStatusCannotOpen;
        }
        if (S_ISDIR(st.st_mode))
            continue;
        ZR7_DETAIL("adding <%s>", name.c_str());
        list.push_back(name);
    }
    return 0;
}
