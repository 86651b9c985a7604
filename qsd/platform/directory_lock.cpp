#include "qsd/platform/directory_lock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <thread>
#include <utility>

#include "qsd/platform/fs.h"
#include "qsd/platform/interruption.h"
#include "qsd/platform/status.h"
#include "qsd/platform/trace.h"

namespace zr7 {

namespace {

// Directories this process holds, by device and inode, with a use count. A
// forked child is another process: it starts with none, and takes the lock
// on a descriptor of its own like any other process.
std::map<std::pair<unsigned long long, unsigned long long>, int>& held() {
    static std::map<std::pair<unsigned long long, unsigned long long>, int> locks;
    static pid_t owner = ::getpid();
    if (owner != ::getpid()) {
        locks.clear();
        owner = ::getpid();
    }
    return locks;
}

// True when the lock was taken; false with errno EWOULDBLOCK when another
// holds it, or another errno when flock cannot be used at all.
bool try_lock(int fd) {
    while (::flock(fd, LOCK_EX | LOCK_NB) != 0) {
        if (errno != EINTR)
            return false;
    }
    return true;
}

// The pid a holder wrote into root's lock file; 0 when none can be read.
int holder_pid(int lock_fd) {
    if (lock_fd < 0)
        return 0;
    char text[32];
    const ssize_t n = ::pread(lock_fd, text, sizeof text - 1, 0);
    long pid = 0;
    for (ssize_t i = 0; i < n && text[i] >= '0' && text[i] <= '9' && pid < 1000000000L; ++i)
        pid = pid * 10 + (text[i] - '0');
    return static_cast<int>(pid);
}

void record_holder(int lock_fd) {
    char text[32];
    const int length = std::snprintf(text, sizeof text, "%d\n", static_cast<int>(::getpid()));
    // Only shown to a waiting run: a pid that cannot be written costs nothing
    // but the pid in its message.
    if (length > 0)
        (void)fs::rewrite_file(lock_fd, std::string(text, static_cast<std::size_t>(length)));
}

std::string with_pid(const std::string& text, int pid) {
    return pid > 0 ? text + " (pid <" + std::to_string(pid) + ">)" : text;
}

}  // namespace

int lock_wait_seconds(const char* setting) {
    if (setting == nullptr || *setting == '\0')
        return kDefaultLockWaitSeconds;
    long value = 0;
    for (const char* c = setting; *c != '\0'; ++c) {
        if (*c < '0' || *c > '9')
            return kDefaultLockWaitSeconds;
        value = value * 10 + (*c - '0');
        if (value > kMaxLockWaitSeconds)
            return kDefaultLockWaitSeconds;
    }
    return static_cast<int>(value);
}

std::string lock_file_name(unsigned long long dev, unsigned long long ino) {
    return std::to_string(dev) + "-" + std::to_string(ino) + ".lock";
}

std::string root_lock_directory() {
    struct stat st {};
    if (::stat("/run", &st) != 0 && errno == ENOENT)
        return "/var/lock/zr7inst";
    return "/run/zr7inst";
}

int open_lock_directory(const std::string& path) {
    // Made private when missing; one that another account owns or may write
    // to, or a link, is refused.
    const std::size_t slash = path.find_last_of('/');
    fs::UniqueFd parent;
    fs::UniqueFd dir;
    int error = fs::open_trusted_dir(slash == 0 ? "/" : path.substr(0, slash), parent);
    if (error == 0)
        error = fs::make_private_dir(parent.get(), path.substr(slash + 1), dir);
    if (error != 0) {
        errno = error == fs::kNotPrivate ? EPERM : error == fs::kUntrustedLink ? ELOOP : error;
        return -1;
    }
    return dir.release();
}

DirectoryLock::DirectoryLock(const std::string& dir) {
    ZR7_TRACED("DirectoryLock");
    // The path is the administrator's (a home given as a link is fine); it
    // gives the identity that every run derives the same lock from.
    fs::UniqueFd opened;
    struct stat st {};
    error_ = fs::open_trusted_dir(dir, opened);
    fd_ = opened.release();
    if (error_ != 0 || ::fstat(fd_, &st) != 0) {
        error_ = error_ != 0 ? error_ : errno;
        return;
    }
    dev_ = static_cast<unsigned long long>(st.st_dev);
    ino_ = static_cast<unsigned long long>(st.st_ino);
    if (held().count({dev_, ino_}) != 0) {
        ++held()[{dev_, ino_}];
        locked_ = true;
        return;
    }
    if (::geteuid() != 0) {
        take(dir, fd_);
        return;
    }
    const std::string base_path = root_lock_directory();
    const int base = open_lock_directory(base_path);
    if (base < 0) {
        error_ = errno;
        failure_ = zr7::kStatusCannotOpen;
        ZR7_ERROR("Error: Can't open <%s>", base_path.c_str());
        return;
    }
    const std::string name = lock_file_name(dev_, ino_);
    fs::UniqueFd lock_file;
    error_ = fs::open_private_file(base, name, lock_file);
    lock_fd_ = lock_file.release();
    ::close(base);
    if (error_ != 0) {
        failure_ = zr7::kStatusCannotOpen;
        ZR7_ERROR("Error: Can't open <%s/%s>", base_path.c_str(), name.c_str());
        return;
    }
    error_ = 0;
    take(dir, lock_fd_);
    if (locked_)
        record_holder(lock_fd_);
}

void DirectoryLock::take(const std::string& dir, int lock_fd) {
    ZR7_TRACED("DirectoryLock");
    if (!try_lock(lock_fd)) {
        if (errno != EWOULDBLOCK) {
            error_ = errno;
            return;
        }
        const int seconds = lock_wait_seconds(std::getenv("ZR7_LOCK_WAIT"));
        const std::string waiting =
            with_pid("Waiting for another installation in <" + dir + ">", holder_pid(lock_fd_));
        std::fflush(stdout);
        std::fprintf(stderr, "%s\n", waiting.c_str());
        ZR7_DETAIL("%s", waiting.c_str());
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(seconds);
        for (;;) {
            if (interruption() != 0) {
                error_ = EINTR;
                failure_ = kStatusInterrupted;
                return;
            }
            const auto now = std::chrono::steady_clock::now();
            if (now >= deadline) {
                error_ = EWOULDBLOCK;
                failure_ = kStatusLockTimeout;
                const std::string gave_up =
                    "Error: " +
                    with_pid("Another installation holds <" + dir + ">", holder_pid(lock_fd_)) +
                    "; gave up after <" + std::to_string(seconds) + "> s";
                std::fflush(stdout);
                std::fprintf(stderr, "%s\n", gave_up.c_str());
                ZR7_ERROR("%s", gave_up.c_str());
                return;
            }
            std::this_thread::sleep_for(std::min<std::chrono::steady_clock::duration>(
                std::chrono::milliseconds(100), deadline - now));
            if (try_lock(lock_fd))
                break;
            if (errno != EWOULDBLOCK) {
                error_ = errno;
                return;
            }
        }
    }
    held()[{dev_, ino_}] = 1;
    locked_ = true;
}

DirectoryLock::~DirectoryLock() {
    if (locked_) {
        auto it = held().find({dev_, ino_});
        if (it != held().end() && --it->second == 0)
            held().erase(it);
    }
    // Closing the descriptor that took the flock releases it. A nested
    // holder's descriptors hold no lock of their own, and closing them
    // releases nothing.
    if (lock_fd_ >= 0)
        ::close(lock_fd_);
    if (fd_ >= 0)
        ::close(fd_);
}

}  // namespace zr7
