#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "qsd/config/kmsenv_reader.h"
#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/file_io.h"
#include "qsd/platform/trace.h"

int Installer610::read_config(const std::string& home) {
    ZR7_OPERATION("Installer610::read_config");
    const std::string path =
        home + (home.empty() || home.back() != '/' ? "/" : "") + "config/.ConfigData/kmsenv";
    std::string content;
    const int error = zr7::read_whole_file(path, content);
    if (error != 0) {
        ZR7_ERROR("Error: Can't open kmsenv");
        // The line above names neither the file nor the reason.
        ZR7_ERROR("Error: %s: %s", path.c_str(), std::strerror(error));
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
