#include <dirent.h>
#include <sys/stat.h>

#include <cstring>

#include "qsd/fileops/install_util.h"
#include "qsd/platform/trace.h"

// The names of the non-directory entries of one directory, in the order the
// directory yields them. The status query follows symbolic links, so a link to
// a file is listed and a link to a directory or a dangling link is not. An
// entry that is no link and still cannot be looked at (no search permission
// on the directory) fails the list: its file would go missing unnoticed.
int InstallUtil::get_file_list(const char* dir, zr7::StringList& list) {
    ZR7_TRACED("InstallUtil::get_file_list");
    DIR* stream = ::opendir(dir);
    if (stream == nullptr)
        return -7;
    std::string path = dir;
    path += '/';
    const std::size_t prefix = path.size();
    while (const struct dirent* entry = ::readdir(stream)) {
        const char* name = entry->d_name;
        if (std::strcmp(name, ".") == 0 || std::strcmp(name, "..") == 0)
            continue;
        path.resize(prefix);
        path += name;
        struct stat st {};
        if (::stat(path.c_str(), &st) != 0) {
            struct stat link {};
            if (::lstat(path.c_str(), &link) == 0 && S_ISLNK(link.st_mode))
                continue;
            ZR7_ERROR("Error: Can't access <%s>", path.c_str());
            ::closedir(stream);
            return -7;
        }
        if (S_ISDIR(st.st_mode))
            continue;
        ZR7_DETAIL("adding <%s>", name);
        list.emplace_back(name);
    }
    ::closedir(stream);
    return 0;
}
