#include <sys/stat.h>

#include "qsd/fileops/install_util.h"
#include "qsd/platform/process.h"
#include "qsd/platform/trace.h"

// The command texts below are what the trace shows an administrator; the copy
// itself runs `cp` or `tr` with an argument vector, so no byte of a file name
// ever reaches a shell.
int InstallUtil::copy_file(const char* src, const char* dst, unsigned flags) {
    ZR7_TRACED("InstallUtil::copy_file");
    if (src == nullptr || dst == nullptr)
        return -5;  // nothing names the file: no copy, and no line to trace
    const int overwrite = (flags & kCopyOverwrite) != 0 ? 1 : 0;
    const int fix_cr = (flags & kCopyFixCr) != 0 ? 1 : 0;
    ZR7_DETAIL("Copy begin --------------");
    ZR7_DETAIL("...src <%s>", src);
    ZR7_DETAIL("...dst <%s>", dst);
    ZR7_DETAIL("...overwrite <%d> fix cr <%d>", overwrite, fix_cr);

    struct stat st {};
    const bool dst_exists = ::stat(dst, &st) == 0;
    if (overwrite == 0 && dst_exists) {
        ZR7_DETAIL("...file already exists");
        ZR7_DETAIL("Copy end ----------------");
        return 0;
    }
    // A directory standing where the file goes is a failure: `cp` would put
    // the file inside it and report success.
    const bool dst_is_dir = dst_exists && S_ISDIR(st.st_mode);

    zr7::ProcessSpec spec;
    if (fix_cr != 0) {
        if (zr7_trace.detail()) {
            std::string shown = "tr -d '\r' <" + quote_str(src) + " >" + quote_str(dst);
            ZR7_DETAIL("...issuing cmd <%s>", shown.c_str());
        }
        spec.program = "tr";
        spec.args = {"-d", "\r"};
        spec.stdin_path = src;
        spec.stdout_path = dst;
        spec.stdout_mode = zr7::OutputMode::kTruncate;
    } else {
        if (zr7_trace.detail()) {
            std::string shown = "cp -f " + quote_str(src) + " " + quote_str(dst);
            ZR7_DETAIL("...issuing cmd <%s>", shown.c_str());
        }
        spec.program = "cp";
        spec.args = {"-f", "--", src, dst};
    }

    const int status = !dst_is_dir && zr7::run_process(spec) == 0 ? 0 : -5;
    if (status == 0)
        removeReadOnly(dst);
    ZR7_DETAIL("...rc = <%d>", status);
    ZR7_DETAIL("Copy end ----------------");
    return status;
}
