#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "qsd/config/kmsenv_reader.h"
#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/fs.h"
#include "qsd/platform/trace.h"

namespace {

// kmsenv below the installation directory, each step by the link rule, and
// only a regular file (a pipe or a device could yield nothing or never end).
int read_kmsenv_file(const std::string& home, std::string& content) {
    zr7::fs::UniqueFd home_fd;
    zr7::fs::UniqueFd dir;
    zr7::fs::UniqueFd file;
    struct stat st {};
    int error = zr7::fs::open_trusted_dir(home, home_fd);
    if (error == 0)
        error = zr7::fs::open_dir_below(home_fd.get(), "config/.ConfigData", dir);
    if (error == 0)
        error = zr7::fs::open_read(dir.get(), "kmsenv", file, st);
    if (error == 0)
        error = zr7::fs::read_all(file.get(), content);
    // The status of the run is the system's error number.
    return error == zr7::fs::kUntrustedLink ? ELOOP : error;
}

}  // namespace

int Installer610::read_config(const std::string& home) {
    ZR7_OPERATION("Installer610::read_config");
    const std::string path =
        home + (home.empty() || home.back() != '/' ? "/" : "") + "config/.ConfigData/kmsenv";
    std::string content;
    const int error = read_kmsenv_file(home, content);
    if (error != 0) {
        ZR7_ERROR("Error: Can't open kmsenv");
        // The line above names neither the file nor the reason.
        ZR7_ERROR("Error: <%s>: %s", path.c_str(), std::strerror(error));
        ZR7_RETURN(error);
    }
    zr7::ServerConfig start{server_name, arch, protocol, port, host_name, family_setting};
    zr7::KmsenvResult result = zr7::read_kmsenv(content, start);
    for (const std::string& line : result.detail_lines)
        ZR7_DETAIL("%s", line.c_str());
    server_name = result.config.server_name;
    arch = result.config.arch;
    protocol = result.config.protocol;
    port = result.config.port;
    host_name = result.config.host_name;
    family_setting = result.config.family_setting;
    ZR7_RETURN(0);
}

std::string InstallUtil::get_hostname() {
    ZR7_TRACED("InstallUtil::get_hostname");
    char buffer[512] = {};
    if (::gethostname(buffer, 511) != 0) {
        ZR7_ERROR("Error: gethostname failed.  Error <%d>", errno);
        return std::string();
    }
    return buffer;
}
