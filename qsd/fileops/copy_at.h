// The copy of one file from a descriptor of the image into a directory of
// the installation: the core of the flat and the tree copies.
#pragma once

#include <sys/stat.h>

#include <string>

namespace zr7 {

// Copies the open regular file `src_fd` to `name` in `dst_dir` with `cp` (or
// `tr` removing carriage returns under kCopyFixCr) working on descriptors,
// through a scratch file renamed over the name: the destination is the old
// file or the whole new one. A replaced file keeps its mode, owner and group;
// a new one gets the source's permission bits (0666 for a `tr` copy) less the
// umask, and as root the directory's owner and group; either way the owner
// may write it. Root's link at the name is followed, another account's link
// is replaced. The shown paths only name the files in the trace. 0 when
// copied or skipped (present, overwrite off), -5 when the copy failed.
int copy_file_at(int src_fd, const struct stat& src_st, const std::string& src_shown, int dst_dir,
                 const std::string& name, const std::string& dst_shown, unsigned flags);

}  // namespace zr7
