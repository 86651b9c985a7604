#include <cstdio>

#include "qsd/driver/driver.h"
#include "qsd/platform/trace.h"
#include "qsd/text/escape.h"
#include "qsd/text/text.h"

namespace zr7 {

std::string get_home_path(std::FILE* out) {
    std::string home;
    const char* value = PLT1_GetEnv("MARLIN_HOME", nullptr);
    if (value != nullptr && *value != '\0') {
        std::fprintf(out, "MARLIN_HOME is <%s>\n", escape_controls(value).c_str());
        home = value;
    } else if ((value = PLT1_GetEnv("MARLINHOME", nullptr)) != nullptr && *value != '\0') {
        std::fprintf(out, "MARLINHOME is <%s>\n", escape_controls(value).c_str());
        home = value;
    } else {
        std::fputs("No MARLIN_HOME or MARLINHOME found.  Defaulting to .", out);
        home = ".";
    }
    home = strip(home, ' ', StripEnd::kTrailing);
    if (home.empty() || home.back() != '/')
        home += '/';
    return home;
}

std::string log_dir_for(const std::string& home) {
    return home == "./" ? home : home + "logs/";
}

}  // namespace zr7
