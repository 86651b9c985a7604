// What the first invocation checks before it starts the installing run: a
// wrong -h, a mistyped src_dir or a home without its log directory end the
// run here, with a line that names what is wrong, before anything starts.
#include <sys/stat.h>

#include <cstdio>

#include "qsd/driver/driver.h"
#include "qsd/text/escape.h"

namespace zr7 {

namespace {

bool is_directory(const std::string& path) {
    struct stat st {};
    return ::stat(path.c_str(), &st) == 0 && S_ISDIR(st.st_mode);
}

}  // namespace

std::string image_msrv_path(const std::string& src_dir) {
    std::string path = src_dir;
    if (path.empty() || path.back() != '/')
        path += '/';
    return path + "MSRV";
}

int check_before_relaunch(const std::string& home, const std::string& src_dir) {
    std::fflush(stdout);
    if (!is_directory(home)) {
        std::fprintf(stderr, "Error: Installation directory <%s> does not exist\n",
                     escape_controls(home).c_str());
        return -7;
    }
    const std::string msrv = image_msrv_path(src_dir);
    if (!is_directory(msrv)) {
        std::fprintf(stderr, "Error: Can't open <%s>\n", escape_controls(msrv).c_str());
        return -7;
    }
    const std::string logs = log_dir_for(home);
    if (!is_directory(logs)) {
        std::fprintf(stderr, "Error: Log directory <%s> does not exist\n",
                     escape_controls(logs).c_str());
        return -8;
    }
    return 0;
}

}  // namespace zr7
