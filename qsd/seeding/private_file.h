// A scratch file that nobody else can have prepared: the response file lives
// in a world-writable directory under a predictable name, and the tool runs
// as root.
#pragma once

#include <string>

namespace zr7 {

// Removes whatever stands at `path` (a planted link, a stale file), then
// creates the file exclusively, without following a link, with mode 0600, and
// writes `content` to it. Returns 0, or the system's error number of the step
// that failed; a file that was created but not completely written is left for
// the caller to delete.
int create_private_file(const std::string& path, const std::string& content);

}  // namespace zr7
