// What the first invocation checks before it starts the installing run: a
// wrong -h, a mistyped src_dir or a home without its log directory end the
// run here, with a line that names what is wrong, before anything starts.
#include <sys/stat.h>

#include <cstdio>

#include "qsd/driver/driver.h"
#include "qsd/platform/status.h"
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

int check_before_relaunch(const std::string& home, const std::string& src_dir,
                          std::string* reason) {
    std::string line;
    int status = 0;
    const std::string msrv = image_msrv_path(src_dir);
    const std::string logs = log_dir_for(home);
    if (!is_directory(home)) {
        line = "Error: Installation directory <" + home + "> does not exist";
        status = zr7::kStatusCannotOpen;
    } else if (!src_dir.empty() && !is_directory(msrv)) {
        line = "Error: Can't open <" + msrv + ">";
        status = zr7::kStatusCannotOpen;
    } else if (!is_directory(logs)) {
        line = "Error: Log directory <" + logs + "> does not exist";
        status = zr7::kStatusCannotWrite;
    }
    if (status != 0) {
        std::fflush(stdout);
        std::fprintf(stderr, "%s\n", escape_controls(line).c_str());
        if (reason != nullptr)
            *reason = line;
    }
    return status;
}

}  // namespace zr7
