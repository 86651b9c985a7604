#include "qsd/seeding/private_file.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

namespace zr7 {

int create_private_file(const std::string& path, const std::string& content) {
    (void)::unlink(path.c_str());
    const int fd = ::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600);
    if (fd < 0)
        return errno;
    std::size_t written = 0;
    while (written < content.size()) {
        const ssize_t n = ::write(fd, content.data() + written, content.size() - written);
        if (n < 0) {
            if (errno == EINTR)
                continue;
            const int error = errno;
            ::close(fd);
            return error;
        }
        written += static_cast<std::size_t>(n);
    }
    if (::close(fd) != 0)
        return errno;
    return 0;
}

}  // namespace zr7
