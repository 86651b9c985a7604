// What a copy of one file does to its destination, told before the copy:
// creates it, replaces it by other bytes or by the same bytes, or keeps it.
// A preview changes nothing, so it keeps what the commands before would have
// written in a plan of the tree (PlannedTree), and the commands after it see
// that plan in place of the disk.
#pragma once

#include <sys/stat.h>

#include <cstdint>
#include <map>
#include <set>
#include <string>

#include "qsd/text/plan.h"

namespace zr7 {

// A file's bytes in short: their count and two independent 64-bit hashes.
struct ContentDigest {
    std::uint64_t size = 0;
    std::uint64_t first = 0;
    std::uint64_t second = 0;
    bool operator==(const ContentDigest& other) const {
        return size == other.size && first == other.first && second == other.second;
    }
};

// The digest of an open file's bytes from its start, carriage returns left
// out under `strip_cr` (the copies that remove them). 0 or errno.
int digest_file(int fd, bool strip_cr, ContentDigest& out);

// A file that an earlier command of a preview would have written.
struct PlannedFile {
    ContentDigest digest;
    std::string source;  // the image file it comes from, as the run names it
    bool strip_cr = false;
};

// The directories and files that a previewed run would have made so far, by
// the paths the run shows.
class PlannedTree {
  public:
    void add_dir(const std::string& path) { dirs_.insert(path); }
    bool has_dir(const std::string& path) const { return dirs_.count(path) != 0; }
    void add_file(const std::string& path, const PlannedFile& file) { files_[path] = file; }
    const PlannedFile* file(const std::string& path) const;

  private:
    std::set<std::string> dirs_;
    std::map<std::string, PlannedFile> files_;
};

// What copying the open image file `src_fd` to `name` in `dst_dir` (-1 for a
// directory that is still to be made) would do: kCreate, kReplace, kSame, or
// kKeep when the name is taken and `overwrite` is off. `planned` (may be
// null) stands for what earlier commands would have written, by
// `dst_shown`; `digest` receives the source's digest for kSame and kReplace.
Action copy_outcome(int src_fd, bool strip_cr, bool overwrite, int dst_dir, const std::string& name,
                    const std::string& dst_shown, const PlannedTree* planned,
                    ContentDigest& digest);

// Adds what a previewed copy would write to the plan of the tree: the
// digest of the source file as the copy writes it (taken here for kCreate).
void plan_copy(PlannedTree& planned, Action action, int src_fd, bool strip_cr,
               const std::string& src_shown, const std::string& dst_shown, ContentDigest digest);

}  // namespace zr7
