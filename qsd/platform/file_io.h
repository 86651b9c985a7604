// Whole-file reading for the server's small text files.
#pragma once

#include <string>

namespace zr7 {

// Reads the file into `content`. Returns 0, or the system's error number of
// the open or read that failed (EISDIR for a directory, EINVAL for anything
// else that is not a regular file: a pipe, a device).
int read_whole_file(const std::string& path, std::string& content);

}  // namespace zr7
