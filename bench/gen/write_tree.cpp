#include "bench/gen/write_tree.h"

#include <fcntl.h>
#include <ftw.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

namespace zr7bench {

int make_dirs(const std::string& path) {
    for (std::size_t slash = path.find('/', 1);; slash = path.find('/', slash + 1)) {
        const std::string part = path.substr(0, slash);
        if (!part.empty() && ::mkdir(part.c_str(), 0755) != 0 && errno != EEXIST)
            return errno;
        if (slash == std::string::npos)
            return 0;
    }
}

int write_file(const std::string& path, const std::string& content, unsigned mode) {
    const int fd = ::open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
    if (fd < 0)
        return errno;
    std::size_t done = 0;
    while (done < content.size()) {
        const ssize_t n = ::write(fd, content.data() + done, content.size() - done);
        if (n < 0) {
            if (errno == EINTR)
                continue;
            const int error = errno;
            ::close(fd);
            return error;
        }
        done += static_cast<std::size_t>(n);
    }
    // The mode exactly as planned, whatever the umask.
    if (::fchmod(fd, static_cast<mode_t>(mode)) != 0) {
        const int error = errno;
        ::close(fd);
        return error;
    }
    return ::close(fd) == 0 ? 0 : errno;
}

int write_image(const ImagePlan& plan, const std::string& root) {
    if (int rc = make_dirs(root))
        return rc;
    for (const std::string& dir : plan.dirs) {
        if (::mkdir((root + "/" + dir).c_str(), 0755) != 0 && errno != EEXIST)
            return errno;
    }
    for (const PlannedFile& file : plan.files) {
        if (int rc = write_file(root + "/" + file.path, file_content(file), file.mode))
            return rc;
    }
    return 0;
}

int write_home(const HomeOptions& options, const std::string& root) {
    if (int rc = make_dirs(root))
        return rc;
    for (const std::string& dir : home_dirs(options)) {
        if (::mkdir((root + "/" + dir).c_str(), 0755) != 0 && errno != EEXIST)
            return errno;
    }
    if (int rc = write_file(root + "/config/.ConfigData/kmsenv", kmsenv_text(options), 0644))
        return rc;
    return write_file(root + "/tables/" + options.server + "/VXAENV", vxaenv_text(options), 0644);
}

namespace {

int remove_entry(const char* path, const struct stat*, int type, struct FTW*) {
    const int rc = type == FTW_DP ? ::rmdir(path) : ::unlink(path);
    return rc == 0 ? 0 : errno;
}

}  // namespace

int remove_tree(const std::string& path) {
    struct stat st {};
    if (::lstat(path.c_str(), &st) != 0)
        return errno == ENOENT ? 0 : errno;
    // Directories the installation made with mode 0766 are searchable by
    // root only; the benchmark runs as root or on trees it made itself.
    return ::nftw(path.c_str(), remove_entry, 64, FTW_DEPTH | FTW_PHYS);
}

}  // namespace zr7bench
