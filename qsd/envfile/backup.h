// Backups of a server file: a copy under ".archive" beside it, named after
// the file and the time, made before the file changes. Backups are only ever
// added; an existing one is never replaced.
#pragma once

#include <ctime>
#include <functional>
#include <string>

namespace zr7 {

// Seconds since 1 January 1901 00:00:00 UTC as an unsigned 32-bit count
// (wrapping in February 2037), from the system clock's seconds since 1970.
unsigned backup_stamp(std::time_t now);

// Copies `content` (the file `file` of the directory `dir_fd`, whose mode it
// takes) to .archive/`file`_<stamp> in `base_fd`, taking the next free stamp
// when that name is taken. The backup appears under its name only once it is
// complete and on the disk. Another account's link at .archive is refused.
// `base_shown` names the directory in messages. 0 with the backup's path in
// `made`, or -9.
int backup_content_at(int base_fd, const std::string& base_shown, const std::string& file,
                      const std::string& content, unsigned mode, unsigned stamp, std::string& made);

// The path backup_content_at would give the backup now, changing nothing:
// the first stamp from `stamp` on whose name is free in `base_fd`'s
// .archive and not `taken` (the backups a preview has already planned).
std::string planned_backup_path(int base_fd, const std::string& base_shown, const std::string& file,
                                unsigned stamp,
                                const std::function<bool(const std::string&)>& taken);

// The same for a file read from `dir`/`file`, into `base`/.archive, by path.
int backup_file(const char* dir, const char* file, const char* base, unsigned stamp,
                std::string& made);

}  // namespace zr7
