#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>

#include "qsd/fileops/install_util.h"
#include "qsd/platform/trace.h"

int InstallUtil::delete_file(const char* path) {
    ZR7_TRACED("InstallUtil::delete_file");
    if (path == nullptr)
        return -1;
    ZR7_DETAIL("deleting <%s>", path);
    return ::unlink(path) == 0 ? 0 : -1;
}

int InstallUtil::mkdir(const char* path) {
    return ::mkdir(path, 0766) == 0 ? 0 : -1;
}

int InstallUtil::removeReadOnly(const char* path) {
    struct stat st {};
    if (::stat(path, &st) != 0)
        return 0;
    // Most copies arrive writable already: their mode would not change, so
    // the call that would set it again is left out.
    if ((st.st_mode & S_IWUSR) == 0)
        (void)::chmod(path, (st.st_mode & 07777) | S_IWUSR);
    return 0;
}

std::string InstallUtil::quote_str(const char* text) {
    if (text == nullptr)
        return std::string();
    for (const char* p = text; *p != '\0'; ++p) {
        if (zr7::is_c_space(*p))
            return std::string("\"") + text + "\"";
    }
    return text;
}

std::string InstallUtil::get_tmp_path() {
    struct stat st {};
    if (::stat("/tmp/", &st) == 0 && S_ISDIR(st.st_mode))
        return "/tmp/";
    return "./";
}

std::string InstallUtil::get_pid() {
    char buffer[128];
    std::memset(buffer, 0, sizeof buffer);
    std::snprintf(buffer, 127, "%d", static_cast<int>(::getpid()));
    return buffer;
}
