#include <limits.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>

#include "qsd/envfile/durable_file.h"
#include "qsd/fileops/install_util.h"
#include "qsd/platform/process.h"
#include "qsd/platform/trace.h"

namespace {

// The file a copy replaces: the destination itself, or the file its symbolic
// link names, so that the link stays a link. "" when a link leads nowhere.
std::string final_path(const char* dst) {
    struct stat st {};
    if (::lstat(dst, &st) != 0 || !S_ISLNK(st.st_mode))
        return dst;
    char resolved[PATH_MAX];
    return ::realpath(dst, resolved) == nullptr ? std::string() : std::string(resolved);
}

// The permissions a copy gets: those of the file it replaces, with its owner
// and group when we may set them (root), as `cp -f` keeps them when it writes
// into an existing file; else those a new file of `cp` or of an output
// redirection gets.
bool give_attributes(const std::string& scratch, const std::string& target, const char* src,
                     bool fix_cr) {
    struct stat old {};
    if (::stat(target.c_str(), &old) == 0) {
        if (::geteuid() == 0 && ::chown(scratch.c_str(), old.st_uid, old.st_gid) != 0)
            return false;
        return ::chmod(scratch.c_str(), old.st_mode & 07777) == 0;
    }
    const mode_t mask = ::umask(0);
    ::umask(mask);
    struct stat source {};
    const mode_t wanted = fix_cr || ::stat(src, &source) != 0 ? 0666 : source.st_mode & 0777;
    return ::chmod(scratch.c_str(), wanted & ~mask) == 0;
}

// Copies into a scratch file beside the destination, then renames it over
// the destination. So the destination is at every moment the old file or the
// whole new one: a full disk or a kill leaves the old file, and runs that
// copy the same file at once do not trip over each other (`cp` itself fails
// when another process creates its destination first).
int copy_into_place(const char* src, const char* dst, bool fix_cr) {
    const std::string target = final_path(dst);
    if (target.empty())
        return -5;
    std::string scratch;
    const int fd = zr7::create_unique_file(zr7::dir_part(target) + "/.zr7copy", scratch);
    if (fd < 0)
        return -5;
    ::close(fd);

    zr7::ProcessSpec job;
    if (fix_cr) {
        job.program = "tr";
        job.args = {"-d", "\r"};
        job.stdin_path = src;
        job.stdout_path = scratch;
        job.stdout_mode = zr7::OutputMode::kTruncate;
    } else {
        job.program = "cp";
        job.args = {"-f", "--", src, scratch};
    }
    const bool done = zr7::run_process(job) == 0 && give_attributes(scratch, target, src, fix_cr) &&
                      ::rename(scratch.c_str(), target.c_str()) == 0;
    if (!done)
        ::unlink(scratch.c_str());
    return done ? 0 : -5;
}

}  // namespace

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

    if (zr7_trace.detail()) {
        const std::string shown = fix_cr != 0
                                      ? "tr -d '\r' <" + quote_str(src) + " >" + quote_str(dst)
                                      : "cp -f " + quote_str(src) + " " + quote_str(dst);
        ZR7_DETAIL("...issuing cmd <%s>", shown.c_str());
    }
    // Only a regular file is copied: a pipe in the image would hold the copy
    // forever, a device could fill the disk.
    struct stat src_st {};
    const bool src_is_file = ::stat(src, &src_st) == 0 && S_ISREG(src_st.st_mode);
    const int status = src_is_file && !dst_is_dir ? copy_into_place(src, dst, fix_cr != 0) : -5;
    if (status == 0)
        removeReadOnly(dst);
    ZR7_DETAIL("...rc = <%d>", status);
    ZR7_DETAIL("Copy end ----------------");
    return status;
}
