// File-system steps that keep a server file whole whatever happens to the
// process: exclusive scratch files, complete writes, syncs, and an advisory
// lock on a directory.
#pragma once

#include <string>

namespace zr7 {

// `dir`, then "/" unless it already ends with one, then `name`.
std::string join_dir(const std::string& dir, const std::string& name);
// The directory part of a path ("." when it has none) and the last part.
std::string dir_part(const std::string& path);
std::string base_part(const std::string& path);

// Creates a new file named `prefix`, "." and six random letters or digits,
// exclusively and without following a link planted at that name, mode 0600.
// Returns the open descriptor and sets `path`, or -1 with errno set.
int create_unique_file(const std::string& prefix, std::string& path);

// Writes every byte, going on after short writes. False on any failure
// (a full disk, a file size limit, an I/O error), with errno set.
bool write_all(int fd, const std::string& data);

// Flushes a file or a directory to the disk. 0, or the error number.
int sync_path(const std::string& path);

// An exclusive advisory lock (flock) on a directory, held for the object's
// life. Runs that lock the same directory take turns; the lock outlives any
// rename of a file inside it, which a lock on the file itself would not.
class DirectoryLock {
  public:
    explicit DirectoryLock(const std::string& dir);
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
    int error_ = 0;
};

}  // namespace zr7
