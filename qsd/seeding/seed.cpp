// The seed command: every SQL file of the source directory, in the order the
// directory lists them, through the loader.
#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/interruption.h"
#include "qsd/platform/trace.h"

int Installer610::seed(const std::string& src_template, const std::string& dst_template) {
    ZR7_OPERATION("Installer610::seed");
    std::string src;
    std::string dst;
    if (expand_src_dst(src_template, dst_template, src, dst) != 0)
        ZR7_RETURN(-1);

    // The source directory only supplies the names; the loader reads the
    // files from the destination, where the copy group put them. Unlike the
    // copies, a missing source directory is a failure here (-7).
    zr7::StringList names;
    int status = InstallUtil::get_file_list(src.c_str(), names);
    if (status != 0)
        ZR7_ERROR("Error: Can't open <%s>", src.c_str());
    if (status == 0) {
        for (const std::string& name : names) {
            if (zr7::interruption() != 0) {
                status = zr7::kStatusInterrupted;
                break;
            }
            status = seed_single_file(dst, name);
            if (status < 0) {
                ZR7_ERROR("Error: Seeding <%s> failed", name.c_str());
                break;
            }
        }
    }
    ZR7_RETURN(status);
}
