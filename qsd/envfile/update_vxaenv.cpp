// Placeholder until the environment file update is built.
#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"

int Installer610::update_vxaenv(const std::string&) {
    ZR7_OPERATION("Installer610::update_vxaenv");
    if (module_name.empty() && settings.empty())
        ZR7_RETURN(0);
    ZR7_ERROR("Error: -c and -m are not available in this build");
    ZR7_RETURN(-7);
}

int Installer610::update_kds_run(const std::string& line, std::string& out) const {
    out = line;
    return 0;
}

int Installer610::make_backup(const char*, const char*, const char*) {
    return -9;
}
