// An exclusive advisory lock (flock) per directory, held for the object's
// life. Processes that lock the same directory take turns; the lock outlives
// any rename of a file inside it, which a lock on the file itself would not.
// Within one process a directory already held is not locked again (a second
// flock on another descriptor would wait for ourselves forever).
//
// Where the lock lives. A run as root must not be stalled by an account that
// can merely open the installation directory: root's locks are lock files
// in a directory that only root can open ("/run/zr7inst", or
// "/var/lock/zr7inst" where there is no /run), one per locked directory,
// named after its device and inode, holding the holder's pid. Any other
// account locks the directory itself, as only its peers can reach it.
//
// A run never waits forever: it says that it waits, and gives up after
// ZR7_LOCK_WAIT seconds (default 600), or at once when a signal asks it to
// stop.
#pragma once

#include <string>

#include "qsd/platform/status.h"

namespace zr7 {

constexpr int kDefaultLockWaitSeconds = 600;
constexpr int kMaxLockWaitSeconds = 86400;

// The wait that a ZR7_LOCK_WAIT value asks for: whole seconds 0..86400, the
// default when the value is missing or anything else.
int lock_wait_seconds(const char* setting);

// "<dev>-<ino>.lock": root's lock file for the directory with that identity.
std::string lock_file_name(unsigned long long dev, unsigned long long ino);

// The directory for root's lock files: "/run/zr7inst", or
// "/var/lock/zr7inst" when /run does not exist.
std::string root_lock_directory();

// Opens `path` as root's lock directory, creating it with mode 0700 when it
// is missing. Refused (-1, errno set) unless it is a real directory (not a
// link), owned by root, and writable by nobody but its owner.
int open_lock_directory(const std::string& path);

class DirectoryLock {
  public:
    explicit DirectoryLock(const std::string& dir);
    ~DirectoryLock();
    DirectoryLock(const DirectoryLock&) = delete;
    DirectoryLock& operator=(const DirectoryLock&) = delete;

    bool locked() const { return locked_; }
    int error() const { return error_; }
    // Why the lock is not held, when this class already reported it:
    // kStatusLockTimeout, kStatusInterrupted, or -7 (root's lock directory
    // or lock file refused). 0 otherwise: held, or the directory itself
    // could not be opened, which the caller reports in its own words.
    int failure() const { return failure_; }

  private:
    void take(const std::string& dir, int lock_fd);

    int fd_ = -1;
    int lock_fd_ = -1;  // root's lock file, when this object opened it
    bool locked_ = false;
    int error_ = 0;
    int failure_ = 0;
    unsigned long long dev_ = 0;
    unsigned long long ino_ = 0;
};

}  // namespace zr7
