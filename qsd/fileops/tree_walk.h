// The walk under the tree copies: the image directory's tree, copied into a
// directory of the installation.
#pragma once

#include <sys/stat.h>
#include <sys/types.h>

#include <functional>
#include <string>

#include "qsd/fileops/change_journal.h"
#include "qsd/fileops/copy_outcome.h"
#include "qsd/fileops/image_tree.h"
#include "qsd/text/plan.h"
#include "qsd/text/text.h"

namespace zr7 {

// What the image may not do to the server's own directory (the one that
// holds VXAENV and .archive): replace VXAENV without a backup first, or
// write anything into .archive.
struct ServerDirGuard {
    bool active = false;
    dev_t device = 0;
    ino_t inode = 0;
    // Backs VXAENV up before a copy replaces it (a preview tells the backup it
    // would make); 0 or the failure's status.
    std::function<int()> back_up_env_file;
};

// The names in an open directory, "." and ".." left out, in the order the
// directory yields them. 0 or errno.
int list_names(int dir, StringList& names);

// How a walk goes: copying, or changing nothing (the checks before a run,
// and the preview).
struct TreePass {
    // Meets what the copy would meet and fails with the same line and status
    // where it would, but creates no directory and copies no file.
    bool check_only = false;
    // For check_only: what the commands before would have made (a directory
    // still to be made is walked with -1 for its descriptor); the walk adds
    // what it would make.
    PlannedTree* planned = nullptr;
    // Told each action (mkdir, create, replace, same, keep) as it is taken,
    // or, checking, as it would be.
    ActionSink* sink = nullptr;
    // Copying: told before and after each change, so it can be taken back.
    ChangeJournal* journal = nullptr;
};

// Copies the tree below `src` into `dst_dir` (shown as `dst_shown`, ending
// in "/"), creating sub-directories as it reaches them. Each image directory
// is walked at most once: reaching one again (a link back up, or links
// between siblings) fails with "Directory loop". 0, or the status of the
// first failure (-5 copy or loop, -7 an entry that cannot be read, -1 a
// directory that cannot be made, -9 a backup).
int copy_tree(const ImageRoot& root, const ImageEntry& src, const std::string& src_shown,
              int dst_dir, const std::string& dst_shown, unsigned flags,
              const ServerDirGuard& guard, const TreePass& pass = {});

// Copies one image file as copy_file_at does, telling `journal` (may be
// null) before and after when the copy creates or replaces the file.
int journaled_copy(ChangeJournal* journal, Action action, const ImageEntry& entry,
                   const std::string& src_shown, int dst_dir, const std::string& name,
                   const std::string& dst_shown, unsigned flags);

// Whether a copy of the open image file into `name` of `dst_dir` (-1: a
// directory still to be made) would fail, without copying: a source that is
// not a readable regular file, a directory in the file's place. 0 or -5,
// with the copy's lines.
int check_copy_at(int src_fd, const struct stat& src_st, const std::string& src_shown, int dst_dir,
                  const std::string& name, const std::string& dst_shown);

}  // namespace zr7
