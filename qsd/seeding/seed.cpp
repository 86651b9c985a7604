// Placeholder until catalog seeding is built.
#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"

int Installer610::seed(const std::string&, const std::string&) {
    ZR7_OPERATION("Installer610::seed");
    ZR7_ERROR("Error: seeding is not available in this build");
    ZR7_RETURN(-6);
}

int Installer610::seed_single_file(const std::string&, const std::string&) {
    return -6;
}
