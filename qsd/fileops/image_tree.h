// The source image as the copies read it. Whoever unpacked the image owns
// its names, links and file kinds, so an entry is opened once, checked on
// its descriptor, and copied from that descriptor. A symbolic link is
// followed when it stays inside the image's MSRV directory; one that leads
// out of it only when root owns it.
#pragma once

#include <sys/stat.h>

#include <string>
#include <vector>

#include "qsd/platform/fs.h"

namespace zr7 {

// The error number of an entry whose link leads out of the image and
// belongs to another account than root.
constexpr int kLeadsOutside = 100101;

struct ImageRoot {
    fs::UniqueFd fd;
    std::string path;  // the MSRV directory as the run names it
    std::string real;  // its real path, to know an absolute link into it
};
// Opens the MSRV directory the administrator named. 0 or errno.
int open_image_root(const std::string& path, ImageRoot& out);

enum class EntryKind {
    kFile,       // a regular file, open for reading
    kDirectory,  // open as a directory
    kPassOver,   // a link that leads nowhere (dangling, or a ring of links)
    kOther,      // a pipe, a device, a socket: never copied
};

struct ImageEntry {
    EntryKind kind = EntryKind::kPassOver;
    fs::UniqueFd fd;  // not valid for a file or directory we may not read
    struct stat st {};
    // Where a directory lies below MSRV, by its real names; `outside` when it
    // was reached through root's link out of the image.
    std::vector<std::string> where;
    bool outside = false;
};

// Opens the entry `name` of the image directory `dir`, which lies at
// `where` below MSRV (`outside` as for ImageEntry). 0, kLeadsOutside, or
// errno (ENOENT when the entry went away).
int open_image_entry(const ImageRoot& root, int dir, const std::vector<std::string>& where,
                     bool outside, const std::string& name, ImageEntry& out);

// Opens the directory `relative` below MSRV ("lx8266/TABLE"), each step by
// the rules above. 0, ENOENT when the image lacks it, ENOTDIR, kLeadsOutside
// or errno.
int open_image_dir(const ImageRoot& root, const std::string& relative, ImageEntry& out);

}  // namespace zr7
