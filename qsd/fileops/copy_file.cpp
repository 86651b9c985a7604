#include <fcntl.h>
#include <unistd.h>

#include "qsd/fileops/copy_at.h"
#include "qsd/fileops/install_util.h"
#include "qsd/platform/fs.h"
#include "qsd/platform/process.h"
#include "qsd/platform/status.h"
#include "qsd/platform/trace.h"

namespace zr7 {

unsigned copy_flags_from_options(const std::string& options) {
    unsigned flags = 0;
    for (char letter : options) {
        if (letter == 'O')
            flags |= kCopyOverwrite;
        else if (letter == 'T')
            flags |= kCopyFixCr;
    }
    return flags;
}

namespace {

// `cp` and `tr` read and write the descriptors that were opened and checked
// here, so nothing put in a file's place after the check is followed.
int run_copy(int src_fd, int scratch_fd, bool fix_cr) {
    if (::lseek(src_fd, 0, SEEK_SET) != 0)
        return -1;
    ProcessSpec job;
    job.stdin_fd = src_fd;
    job.stdout_fd = scratch_fd;
    if (fix_cr) {
        job.program = "tr";
        job.args = {"-d", "\r"};
    } else {
        job.program = "cp";
        job.args = {"-f", "--", "/dev/fd/0", "/dev/fd/1"};
    }
    return run_process(job);
}

}  // namespace

int copy_file_at(int src_fd, const struct stat& src_st, const std::string& src_shown, int dst_dir,
                 const std::string& name, const std::string& dst_shown, unsigned flags) {
    ZR7_TRACED("InstallUtil::copy_file");
    const int overwrite = (flags & kCopyOverwrite) != 0 ? 1 : 0;
    const int fix_cr = (flags & kCopyFixCr) != 0 ? 1 : 0;
    ZR7_DETAIL("Copy begin --------------");
    ZR7_DETAIL("...src <%s>", src_shown.c_str());
    ZR7_DETAIL("...dst <%s>", dst_shown.c_str());
    ZR7_DETAIL("...overwrite <%d> fix cr <%d>", overwrite, fix_cr);

    fs::Target target;
    int status = fs::resolve_name(dst_dir, name, target) == 0 ? 0 : -5;
    struct stat dst_st {};
    const bool dst_exists = status == 0 && fs::stat_at(target.dir.get(), target.name, dst_st) == 0;
    if (status == 0 && overwrite == 0 && dst_exists) {
        ZR7_DETAIL("...file already exists");
        ZR7_DETAIL("Copy end ----------------");
        return 0;
    }
    if (zr7_trace.detail()) {
        const std::string shown = fix_cr != 0
                                      ? "tr -d '\r' <" + InstallUtil::quote_str(src_shown.c_str()) +
                                            " >" + InstallUtil::quote_str(dst_shown.c_str())
                                      : "cp -f " + InstallUtil::quote_str(src_shown.c_str()) + " " +
                                            InstallUtil::quote_str(dst_shown.c_str());
        ZR7_DETAIL("...issuing cmd <%s>", shown.c_str());
    }
    // Only a regular file is copied (a pipe would hold the copy forever, a
    // device could fill the disk), and never over a directory.
    int error = 0;
    if (status == 0 && (!S_ISREG(src_st.st_mode) || (dst_exists && S_ISDIR(dst_st.st_mode)))) {
        error = S_ISREG(src_st.st_mode) ? EISDIR : fs::kNotRegular;
        status = zr7::kStatusCopyFailed;
    } else if (status == 0 && src_fd < 0) {
        error = EACCES;
        status = zr7::kStatusCopyFailed;
    }
    if (status == 0) {
        fs::AtomicReplace replace(target.dir.get(), target.name, false);
        error = replace.open();
        if (error == 0 && run_copy(src_fd, replace.fd(), fix_cr != 0) != 0)
            error = EIO;
        const mode_t new_mode = fix_cr != 0 ? 0666 : (src_st.st_mode & 0777);
        if (error == 0)
            error = replace.commit(new_mode, S_IWUSR);
        status = error == 0 ? 0 : -5;
    }
    if (status != 0 && error != 0 && error != EIO)
        ZR7_ERROR("Error: <%s>: %s", dst_shown.c_str(), fs::error_text(error).c_str());
    ZR7_DETAIL("...rc = <%d>", status);
    ZR7_DETAIL("Copy end ----------------");
    return status;
}

}  // namespace zr7

// The copy between two paths that the caller names: their directories are
// taken as given, the names below them by the link rule.
int InstallUtil::copy_file(const char* src, const char* dst, unsigned flags) {
    if (src == nullptr || dst == nullptr)
        return zr7::kStatusCopyFailed;  // nothing names the file: no copy, and no line to trace
    zr7::fs::UniqueFd src_dir;
    zr7::fs::UniqueFd dst_dir;
    zr7::fs::UniqueFd file;
    struct stat st {};
    if (zr7::fs::open_trusted_dir(zr7::dir_name(src), src_dir) != 0 ||
        zr7::fs::open_read(src_dir.get(), zr7::base_name(src), file, st) != 0) {
        st = {};
    }
    if (zr7::fs::open_trusted_dir(zr7::dir_name(dst), dst_dir) != 0)
        return zr7::kStatusCopyFailed;
    return zr7::copy_file_at(file.get(), st, src, dst_dir.get(), zr7::base_name(dst), dst, flags);
}
