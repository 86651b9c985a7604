#include "qsd/fileops/image_tree.h"

#include <fcntl.h>
#include <limits.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

namespace zr7 {

namespace {

constexpr int kMaxLinks = 40;
constexpr int kStrictDir = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
constexpr int kReadFile = O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC;

// Opens the directory at `where` below the root, every step a real
// directory: the names were checked when they were found, and a link put in
// their place since is refused here, not followed.
int open_strict(const ImageRoot& root, const std::vector<std::string>& where, fs::UniqueFd& out) {
    fs::UniqueFd current(::fcntl(root.fd.get(), F_DUPFD_CLOEXEC, 0));
    if (!current.valid())
        return errno;
    for (const std::string& part : where) {
        fs::UniqueFd next(::openat(current.get(), part.c_str(), kStrictDir));
        if (!next.valid())
            return errno;
        current = std::move(next);
    }
    out = std::move(current);
    return 0;
}

int read_link(int dir, const std::string& name, std::string& target) {
    char buffer[PATH_MAX];
    const ssize_t got = ::readlinkat(dir, name.c_str(), buffer, sizeof buffer);
    if (got < 0)
        return errno;
    if (static_cast<std::size_t>(got) >= sizeof buffer)
        return ENAMETOOLONG;
    target.assign(buffer, static_cast<std::size_t>(got));
    return 0;
}

// Where a link's target lies below MSRV, by real names, following the links
// on the way. kLeadsOutside when it leaves MSRV; ENOENT when a step is
// missing; ELOOP past the bound.
int resolve_inside(const ImageRoot& root, std::vector<std::string> base, const std::string& target,
                   int& links_left, std::vector<std::string>& out) {
    std::string rest = target;
    if (!rest.empty() && rest[0] == '/') {
        const std::string& real = root.real;
        if (real.empty() || rest.compare(0, real.size(), real) != 0 ||
            (rest.size() > real.size() && rest[real.size()] != '/')) {
            return kLeadsOutside;
        }
        rest.erase(0, real.size());
        base.clear();
    }
    for (const std::string& part : fs::split_path(rest)) {
        if (part == ".")
            continue;
        if (part == "..") {
            if (base.empty())
                return kLeadsOutside;
            base.pop_back();
            continue;
        }
        fs::UniqueFd dir;
        if (const int failed = open_strict(root, base, dir))
            return failed;
        struct stat st {};
        if (::fstatat(dir.get(), part.c_str(), &st, AT_SYMLINK_NOFOLLOW) != 0)
            return errno;
        if (!S_ISLNK(st.st_mode)) {
            base.push_back(part);
            continue;
        }
        if (--links_left < 0)
            return ELOOP;
        std::string next;
        if (const int failed = read_link(dir.get(), part, next))
            return failed;
        std::vector<std::string> resolved;
        if (const int failed = resolve_inside(root, base, next, links_left, resolved))
            return failed;
        base = std::move(resolved);
    }
    out = std::move(base);
    return 0;
}

// Fills `out` from an object opened (or to be opened) as `name` in `dir`.
int open_object(int dir, const std::string& name, int nofollow, ImageEntry& out) {
    struct stat st {};
    const int flags = nofollow != 0 ? AT_SYMLINK_NOFOLLOW : 0;
    if (::fstatat(dir, name.c_str(), &st, flags) != 0)
        return errno;
    if (S_ISDIR(st.st_mode)) {
        out.fd.reset(::openat(dir, name.c_str(), (kStrictDir & ~O_NOFOLLOW) | nofollow));
    } else if (S_ISREG(st.st_mode)) {
        out.fd.reset(::openat(dir, name.c_str(), (kReadFile & ~O_NOFOLLOW) | nofollow));
    } else {
        out.kind = EntryKind::kOther;
        out.st = st;
        return 0;
    }
    if (!out.fd.valid()) {
        if (errno != EACCES && errno != EPERM)
            return errno;
        // Found but not readable: the copy of the file, or the listing of the
        // directory, fails on it and says so.
        out.kind = S_ISDIR(st.st_mode) ? EntryKind::kDirectory : EntryKind::kFile;
        out.st = st;
        return 0;
    }
    // What was opened is what counts: a file swapped for a pipe between the
    // look and the open is a pipe.
    if (::fstat(out.fd.get(), &out.st) != 0)
        return errno;
    if (S_ISDIR(out.st.st_mode)) {
        out.kind = EntryKind::kDirectory;
    } else if (S_ISREG(out.st.st_mode)) {
        out.kind = EntryKind::kFile;
        const int now = ::fcntl(out.fd.get(), F_GETFL);
        if (now >= 0)
            (void)::fcntl(out.fd.get(), F_SETFL, now & ~O_NONBLOCK);
    } else {
        out.kind = EntryKind::kOther;
        out.fd.reset();
    }
    return 0;
}

}  // namespace

int open_image_root(const std::string& path, ImageRoot& out) {
    if (const int failed = fs::open_trusted_dir(path, out.fd))
        return failed;
    out.path = path;
    char real[PATH_MAX];
    out.real = ::realpath(path.c_str(), real) != nullptr ? std::string(real) : std::string();
    return 0;
}

int open_image_entry(const ImageRoot& root, int dir, const std::vector<std::string>& where,
                     bool outside, const std::string& name, ImageEntry& out) {
    out = ImageEntry{};
    struct stat st {};
    if (::fstatat(dir, name.c_str(), &st, AT_SYMLINK_NOFOLLOW) != 0)
        return errno;
    if (!S_ISLNK(st.st_mode)) {
        if (const int failed = open_object(dir, name, O_NOFOLLOW, out))
            return failed;
        out.outside = outside;
        if (!outside) {
            out.where = where;
            out.where.push_back(name);
        }
        return 0;
    }

    std::string target;
    if (const int failed = read_link(dir, name, target))
        return failed;
    int links_left = kMaxLinks;
    std::vector<std::string> resolved;
    const int inside =
        outside ? kLeadsOutside : resolve_inside(root, where, target, links_left, resolved);
    if (inside == ENOENT || inside == ELOOP) {
        out.kind = EntryKind::kPassOver;
        return 0;
    }
    if (inside == 0) {
        fs::UniqueFd holder;
        std::string last = resolved.empty() ? "." : resolved.back();
        std::vector<std::string> parent = resolved;
        if (!parent.empty())
            parent.pop_back();
        if (const int failed = open_strict(root, parent, holder))
            return failed;
        if (const int failed = open_object(holder.get(), last, O_NOFOLLOW, out))
            return failed == ENOENT ? (out.kind = EntryKind::kPassOver, 0) : failed;
        out.where = resolved;
        return 0;
    }
    if (inside != kLeadsOutside)
        return inside;
    // Out of the image: only root's own link is followed, and the kernel
    // follows it.
    if (st.st_uid != 0 && !fs::trusted_owner(st.st_uid))
        return kLeadsOutside;
    const int failed = open_object(dir, name, 0, out);
    if (failed == ENOENT || failed == ELOOP) {
        out.kind = EntryKind::kPassOver;
        return 0;
    }
    out.outside = true;
    return failed;
}

int open_image_dir(const ImageRoot& root, const std::string& relative, ImageEntry& out) {
    ImageEntry current;
    current.kind = EntryKind::kDirectory;
    current.fd.reset(::fcntl(root.fd.get(), F_DUPFD_CLOEXEC, 0));
    if (!current.fd.valid())
        return errno;
    if (::fstat(current.fd.get(), &current.st) != 0)
        return errno;
    for (const std::string& part : fs::split_path(relative)) {
        ImageEntry next;
        if (const int failed = open_image_entry(root, current.fd.get(), current.where,
                                                current.outside, part, next))
            return failed;
        if (next.kind == EntryKind::kPassOver)
            return ENOENT;
        if (next.kind != EntryKind::kDirectory)
            return ENOTDIR;
        current = std::move(next);
    }
    out = std::move(current);
    return 0;
}

}  // namespace zr7
