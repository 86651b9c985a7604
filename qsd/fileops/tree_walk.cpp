#include "qsd/fileops/tree_walk.h"
#include "qsd/platform/status.h"

#include <dirent.h>
#include <fcntl.h>
#include <unistd.h>

#include <cstring>
#include <set>
#include <utility>

#include "qsd/fileops/copy_at.h"
#include "qsd/fileops/install_util.h"
#include "qsd/platform/fs.h"
#include "qsd/platform/interruption.h"
#include "qsd/platform/trace.h"

namespace zr7 {

int list_names(int dir, StringList& names) {
    const int copy = ::fcntl(dir, F_DUPFD_CLOEXEC, 0);
    if (copy < 0)
        return errno;
    DIR* stream = ::fdopendir(copy);
    if (stream == nullptr) {
        const int error = errno;
        ::close(copy);
        return error;
    }
    ::rewinddir(stream);
    while (const struct dirent* entry = ::readdir(stream)) {
        const char* name = entry->d_name;
        if (std::strcmp(name, ".") != 0 && std::strcmp(name, "..") != 0)
            names.emplace_back(name);
    }
    ::closedir(stream);
    return 0;
}

int journaled_copy(ChangeJournal* journal, Action action, const ImageEntry& entry,
                   const std::string& src_shown, int dst_dir, const std::string& name,
                   const std::string& dst_shown, unsigned flags) {
    ZR7_TRACED("InstallUtil::copy_file");
    const bool changes =
        journal != nullptr && (action == Action::kCreate || action == Action::kReplace);
    if (changes) {
        if (const int error = journal->before_write(dst_dir, name, dst_shown, action)) {
            ZR7_ERROR("Error: Can't keep the old version of <%s>", dst_shown.c_str());
            ZR7_ERROR("Error: <%s>: %s", dst_shown.c_str(), fs::error_text(error).c_str());
            return zr7::kStatusCopyFailed;
        }
    }
    const int status =
        copy_file_at(entry.fd.get(), entry.st, src_shown, dst_dir, name, dst_shown, flags);
    if (status == 0 && changes)
        (void)journal->after_write(dst_dir, name, dst_shown);
    return status;
}

namespace {

struct Walk {
    const ImageRoot& root;
    unsigned flags;
    const ServerDirGuard& guard;
    const TreePass& pass;
    std::set<std::pair<dev_t, ino_t>> walked;
};

void tell(const Walk& w, Action action, const std::string& path) {
    if (w.pass.sink != nullptr)
        w.pass.sink->on_action(action, path, "");
}

bool is_server_dir(const ServerDirGuard& guard, int dir) {
    struct stat st {};
    return guard.active && ::fstat(dir, &st) == 0 && st.st_dev == guard.device &&
           st.st_ino == guard.inode;
}

int walk(Walk& w, const ImageEntry& src, const std::string& src_shown, int dst_dir,
         const std::string& dst_shown) {
    ZR7_OPERATION("InstallUtil::recursive_process");
    ZR7_DETAIL("src <%s> dst <%s>", src_shown.c_str(), dst_shown.c_str());
    StringList names;
    if (const int error = list_names(src.fd.get(), names)) {
        ZR7_ERROR("Error: Can't open <%s>", src_shown.c_str());
        ZR7_ERROR("Error: <%s>: %s", src_shown.c_str(), fs::error_text(error).c_str());
        ZR7_RETURN(zr7::kStatusCannotOpen);
    }
    const bool server_dir = dst_dir >= 0 && is_server_dir(w.guard, dst_dir);
    // Scratch files of a run that was killed; the run lock keeps live runs out.
    const bool check_only = w.pass.check_only;
    if (!check_only)
        fs::remove_stale_scratch(dst_dir, "zr7copy");
    for (const std::string& name : names) {
        // A signal to stop is taken between files, never inside a copy.
        if (!check_only && interruption() != 0)
            ZR7_RETURN(kStatusInterrupted);
        const std::string src_path = src_shown + "/" + name;
        const std::string dst_path = dst_shown + name;
        ImageEntry entry;
        const int opened =
            open_image_entry(w.root, src.fd.get(), src.where, src.outside, name, entry);
        if (opened == ENOENT || (opened == 0 && entry.kind == EntryKind::kPassOver))
            continue;
        if (opened == kLeadsOutside) {
            ZR7_ERROR("Error: Link <%s> leads outside the image", src_path.c_str());
            ZR7_RETURN(zr7::kStatusCopyFailed);
        }
        if (opened != 0) {
            ZR7_ERROR("Error: Can't access <%s>", src_path.c_str());
            ZR7_ERROR("Error: <%s>: %s", src_path.c_str(), fs::error_text(opened).c_str());
            ZR7_RETURN(zr7::kStatusCannotOpen);
        }
        if (server_dir && name == ".archive") {
            ZR7_ERROR("Error: The image may not write into <%s>", dst_path.c_str());
            ZR7_RETURN(zr7::kStatusCopyFailed);
        }
        if (entry.kind == EntryKind::kDirectory) {
            if (!w.walked.insert({entry.st.st_dev, entry.st.st_ino}).second) {
                ZR7_ERROR("Error: Directory loop at <%s>", src_path.c_str());
                ZR7_RETURN(zr7::kStatusCopyFailed);
            }
            fs::UniqueFd sub;
            int error = 0;
            if (check_only) {
                struct stat there {};
                if (dst_dir >= 0 && fs::stat_at(dst_dir, name, there) == 0) {
                    error = fs::open_dir_below(dst_dir, name, sub);
                } else if (!w.pass.planned->has_dir(dst_path)) {
                    w.pass.planned->add_dir(dst_path);
                    tell(w, Action::kMkdir, dst_path);
                }
            } else {
                struct stat there {};
                bool created = false;
                if (w.pass.journal != nullptr && fs::stat_at(dst_dir, name, there) != 0)
                    error = w.pass.journal->before_mkdir(dst_path);
                if (error == 0)
                    error = fs::make_dir(dst_dir, name, sub, &created);
                if (error == 0 && created)
                    tell(w, Action::kMkdir, dst_path);
            }
            if (error != 0) {
                ZR7_ERROR("Error: Unable to create directory <%s>", dst_path.c_str());
                ZR7_ERROR("Error: <%s>: %s", dst_path.c_str(), fs::error_text(error).c_str());
                ZR7_RETURN(-1);
            }
            if (const int status = walk(w, entry, src_path, sub.get(), dst_path + "/"))
                ZR7_RETURN(status);
            continue;
        }
        const bool overwrite = (w.flags & kCopyOverwrite) != 0;
        const bool strip_cr = (w.flags & kCopyFixCr) != 0;
        if (server_dir && name == "VXAENV" && overwrite && w.guard.back_up_env_file &&
            (!check_only || w.pass.sink != nullptr)) {
            if (const int status = w.guard.back_up_env_file())
                ZR7_RETURN(status);
        }
        ZR7_DETAIL("processing<%s>", dst_path.c_str());
        // What the copy does is told before it copies: afterwards the old
        // bytes are gone.
        ContentDigest digest;
        const Action action = w.pass.sink == nullptr
                                  ? Action::kCreate
                                  : copy_outcome(entry.fd.get(), strip_cr, overwrite, dst_dir, name,
                                                 dst_path, w.pass.planned, digest);
        const int status =
            check_only ? check_copy_at(entry.fd.get(), entry.st, src_path, dst_dir, name, dst_path)
                       : journaled_copy(w.pass.journal, action, entry, src_path, dst_dir, name,
                                        dst_path, w.flags);
        if (status != 0) {
            ZR7_ERROR("Error: Copy src <%s> to dst <%s> failed", src_path.c_str(),
                      dst_path.c_str());
            ZR7_RETURN(status);
        }
        tell(w, action, dst_path);
        if (check_only && w.pass.sink != nullptr)
            plan_copy(*w.pass.planned, action, entry.fd.get(), strip_cr, src_path, dst_path,
                      digest);
    }
    ZR7_RETURN(0);
}

}  // namespace

int check_copy_at(int src_fd, const struct stat& src_st, const std::string& src_shown, int dst_dir,
                  const std::string& name, const std::string& dst_shown) {
    ZR7_TRACED("InstallUtil::copy_file");
    struct stat there {};
    int error = 0;
    if (!S_ISREG(src_st.st_mode))
        error = fs::kNotRegular;
    else if (src_fd < 0)
        error = EACCES;
    else if (dst_dir >= 0 && fs::stat_at(dst_dir, name, there) == 0 && S_ISDIR(there.st_mode))
        error = EISDIR;
    if (error == 0)
        return 0;
    ZR7_ERROR("Error: <%s>: %s", (error == EISDIR ? dst_shown : src_shown).c_str(),
              fs::error_text(error).c_str());
    return zr7::kStatusCopyFailed;
}

int copy_tree(const ImageRoot& root, const ImageEntry& src, const std::string& src_shown,
              int dst_dir, const std::string& dst_shown, unsigned flags,
              const ServerDirGuard& guard, const TreePass& pass) {
    Walk w{root, flags, guard, pass, {}};
    w.walked.insert({src.st.st_dev, src.st.st_ino});
    return walk(w, src, src_shown, dst_dir, dst_shown);
}

}  // namespace zr7

// The tree copy between two paths that the caller names, taken as given.
int InstallUtil::xcopy(const char* src, const char* dst, unsigned flags) {
    if (src == nullptr || dst == nullptr)
        return zr7::kStatusCopyFailed;
    zr7::ImageRoot root;
    zr7::ImageEntry top;
    zr7::fs::UniqueFd dst_dir;
    if (zr7::open_image_root(src, root) != 0 || zr7::open_image_dir(root, "", top) != 0 ||
        zr7::fs::open_trusted_dir(dst, dst_dir) != 0) {
        return zr7::kStatusCopyFailed;
    }
    std::string shown = dst;
    if (shown.empty() || shown.back() != '/')
        shown += '/';
    return zr7::copy_tree(root, top, src, dst_dir.get(), shown, flags, {}) == 0 ? 0 : -5;
}
