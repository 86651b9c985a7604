// The traced face of the module run list; the rules live in kds_run_list.cpp.
#include "qsd/envfile/kds_run_list.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"

int Installer610::update_kds_run(const std::string& line, std::string& out) const {
    ZR7_OPERATION("Installer610::update_kds_run");
    zr7::KdsRunUpdate update = zr7::update_kds_run_line(line, module_name);
    for (const std::string& detail : update.details)
        ZR7_DETAIL("%s", detail.c_str());
    out = update.line;
    ZR7_RETURN(update.result);
}
