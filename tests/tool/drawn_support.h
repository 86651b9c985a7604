// Server homes and images drawn from a seed, and snapshots of a tree, for the
// properties of the preview and of undo.
#pragma once

#include <map>
#include <random>
#include <string>

#include "support/test_support.h"

namespace zr7test {

struct Entry {
    std::string kind;   // "dir", "file", "link"
    std::string bytes;  // a file's bytes, a link's target
    unsigned mode = 0;
    unsigned uid = 0, gid = 0;
    long long mtime_ns = 0;
    bool operator==(const Entry& o) const {
        return kind == o.kind && bytes == o.bytes && mode == o.mode && uid == o.uid &&
               gid == o.gid && mtime_ns == o.mtime_ns;
    }
};
using Tree = std::map<std::string, Entry>;

// Every entry below `root` but the run's records and logs, the backups, and
// the stand-in loader's catalog.
Tree snapshot(const std::string& root);

// A home and an image drawn from `random`: the sample with files taken away
// and added, destination files already there with the same bytes, other
// bytes or read-only, directories missing, text with CRLF line ends, SQL
// files of every kind; with `failing`, one home in ten fails a check.
void draw(SampleInstall& s, std::mt19937& random, bool failing);

}  // namespace zr7test
