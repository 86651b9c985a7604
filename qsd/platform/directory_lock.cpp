#include "qsd/platform/directory_lock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <map>
#include <utility>

namespace zr7 {

namespace {

// Directories this process holds, by device and inode, with a use count.
std::map<std::pair<unsigned long long, unsigned long long>, int>& held() {
    static std::map<std::pair<unsigned long long, unsigned long long>, int> locks;
    return locks;
}

bool flock_retrying(int fd, int operation) {
    while (::flock(fd, operation) != 0) {
        if (errno != EINTR)
            return false;
    }
    return true;
}

}  // namespace

DirectoryLock::DirectoryLock(const std::string& dir, void (*on_wait)(const std::string&)) {
    fd_ = ::open(dir.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    struct stat st {};
    if (fd_ < 0 || ::fstat(fd_, &st) != 0) {
        error_ = errno;
        return;
    }
    dev_ = static_cast<unsigned long long>(st.st_dev);
    ino_ = static_cast<unsigned long long>(st.st_ino);
    int& uses = held()[{dev_, ino_}];
    if (uses == 0) {
        if (!flock_retrying(fd_, LOCK_EX | LOCK_NB)) {
            const bool busy = errno == EWOULDBLOCK;
            if (busy && on_wait != nullptr)
                on_wait(dir);
            if (!busy || !flock_retrying(fd_, LOCK_EX)) {
                error_ = errno;
                held().erase({dev_, ino_});
                return;
            }
        }
        owner_ = true;
    }
    ++uses;
    locked_ = true;
}

DirectoryLock::~DirectoryLock() {
    if (locked_) {
        auto it = held().find({dev_, ino_});
        if (it != held().end() && --it->second == 0)
            held().erase(it);
    }
    // Closing the descriptor that took the flock releases it. A nested
    // holder's descriptor holds no lock of its own, and closing it releases
    // nothing.
    if (fd_ >= 0)
        ::close(fd_);
}

}  // namespace zr7
