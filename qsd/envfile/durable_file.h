// File-system steps that keep a server file whole whatever happens to the
// process: exclusive scratch files, complete writes and syncs.
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

// Creates `path` exclusively, without following a link, mode 0600. What
// already stands there (left by a run that was killed) is removed first, once.
// Returns the open descriptor, or -1 with errno set.
int create_exclusive_file(const std::string& path);

// Writes every byte, going on after short writes. False on any failure
// (a full disk, a file size limit, an I/O error), with errno set.
bool write_all(int fd, const std::string& data);

// Flushes a file or a directory to the disk. 0, or the error number.
int sync_path(const std::string& path);

}  // namespace zr7
