// Placeholder until the flat and tree copies are built: every operation fails
// loudly rather than pretending to have copied anything.
#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"

int InstallUtil::get_file_list(const char*, zr7::StringList&) {
    return -7;
}
int InstallUtil::recursive_process(const char*, const char*, EntryOperation, unsigned) {
    return -7;
}
int InstallUtil::copy(const char*, const char*, unsigned) {
    return -5;
}
int InstallUtil::xcopy(const char*, const char*, unsigned) {
    return -5;
}

int Installer610::copy(const std::string&, const std::string&) {
    ZR7_OPERATION("Installer610::copy");
    ZR7_ERROR("Error: copying is not available in this build");
    ZR7_RETURN(-5);
}

int Installer610::recursive_copy(const std::string&, const std::string&, const std::string&) {
    ZR7_OPERATION("Installer610::recursive_copy");
    ZR7_ERROR("Error: copying is not available in this build");
    ZR7_RETURN(-5);
}
