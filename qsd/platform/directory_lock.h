// An exclusive advisory lock (flock) on a directory, held for the object's
// life. Processes that lock the same directory take turns; the lock outlives
// any rename of a file inside it, which a lock on the file itself would not.
// Within one process a directory already held is not locked again (a second
// flock on another descriptor would wait for ourselves forever).
#pragma once

#include <string>

namespace zr7 {

class DirectoryLock {
  public:
    // `on_wait` is called once, before blocking, when another process holds
    // the lock.
    explicit DirectoryLock(const std::string& dir, void (*on_wait)(const std::string&) = nullptr);
    ~DirectoryLock();
    DirectoryLock(const DirectoryLock&) = delete;
    DirectoryLock& operator=(const DirectoryLock&) = delete;

    bool locked() const { return locked_; }
    int error() const { return error_; }
    // The directory's descriptor (-1 when it could not be opened), also
    // good for syncing the directory.
    int fd() const { return fd_; }

  private:
    int fd_ = -1;
    bool locked_ = false;
    bool owner_ = false;  // this object took the flock
    int error_ = 0;
    unsigned long long dev_ = 0;
    unsigned long long ino_ = 0;
};

}  // namespace zr7
