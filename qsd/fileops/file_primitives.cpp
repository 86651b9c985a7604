// The small system helpers of InstallUtil: names and texts the runs use.
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>

#include "qsd/fileops/install_util.h"

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
