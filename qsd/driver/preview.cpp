// The preview: what an installing run would do, told and not done. It runs
// in the first invocation (no relaunch, no log), with the trace silent on
// standard output, which carries the plan.
#include <cstdio>

#include "qsd/driver/driver.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"

namespace zr7 {

std::string image_source_path(const std::string& src_dir) {
    std::string source = src_dir;
    if (source.empty() || source.back() != '/')
        source += '/';
    return source + "MSRV/";
}

int run_preview(Installer610& installer, const std::string& home, const std::string& src_dir,
                bool undo) {
    trace_quiet(true);
    trace_echo_errors(true);
    trace_collect_errors(&installer.error_lines);
    installer.preview = true;
    std::string reason;
    int status = check_before_relaunch(home, undo ? "" : src_dir, &reason);
    if (status != 0) {
        installer.error_lines.push_back(reason);
    } else if (undo) {
        installer.init_home(home);
        status = installer.undo();
    } else {
        status = installer.init(image_source_path(src_dir), home);
        if (status == 0)
            status = installer.go();
    }
    installer.finish_plan(status);
    trace_collect_errors(nullptr);
    const std::string text = installer.plan.text() + installer.plan.summary() + "\n";
    std::fwrite(text.data(), 1, text.size(), stdout);
    std::fflush(stdout);
    return status;
}

}  // namespace zr7
