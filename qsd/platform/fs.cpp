#include "qsd/platform/fs.h"

#include <dirent.h>
#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/random.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <ctime>
#include <vector>

namespace zr7::fs {

UniqueFd& UniqueFd::operator=(UniqueFd&& other) noexcept {
    if (this != &other)
        reset(other.release());
    return *this;
}

int UniqueFd::release() {
    const int fd = fd_;
    fd_ = -1;
    return fd;
}

void UniqueFd::reset(int fd) {
    if (fd_ >= 0)
        ::close(fd_);
    fd_ = fd;
}

std::string error_text(int error) {
    if (error == kUntrustedLink)
        return "A symbolic link owned by another account";
    if (error == kNotPrivate)
        return "Not a private directory of the running account";
    if (error == kNotRegular)
        return "Not a regular file";
    return std::strerror(error);
}

std::vector<std::string> split_path(const std::string& path) {
    std::vector<std::string> parts;
    std::size_t start = 0;
    while (start <= path.size()) {
        std::size_t slash = path.find('/', start);
        if (slash == std::string::npos)
            slash = path.size();
        if (slash > start)
            parts.push_back(path.substr(start, slash - start));
        start = slash + 1;
    }
    return parts;
}

bool trusted_owner(uid_t uid) {
    return uid == 0 || uid == ::geteuid();
}

namespace {

// More links than any honest path holds; the bound also ends a ring of links.
constexpr int kMaxLinks = 40;

constexpr int kDirFlags = O_RDONLY | O_DIRECTORY | O_CLOEXEC;

mode_t current_umask() {
    const mode_t mask = ::umask(0);
    ::umask(mask);
    return mask;
}

int dup_fd(int fd, UniqueFd& out) {
    const int copy = ::fcntl(fd, F_DUPFD_CLOEXEC, 0);
    if (copy < 0)
        return errno;
    out.reset(copy);
    return 0;
}

int read_link(int dir, const std::string& name, std::string& target) {
    std::vector<char> buffer(256);
    for (;;) {
        const ssize_t got = ::readlinkat(dir, name.c_str(), buffer.data(), buffer.size());
        if (got < 0)
            return errno;
        if (static_cast<std::size_t>(got) < buffer.size()) {
            target.assign(buffer.data(), static_cast<std::size_t>(got));
            return 0;
        }
        buffer.resize(buffer.size() * 2);
    }
}

int walk_components(int start, const std::string& path, UniqueFd& out, int& links_left);

// One step down: `name` in `dir`, a directory, a link followed only by the
// link rule.
int step_dir(int dir, const std::string& name, UniqueFd& out, int& links_left) {
    if (name == ".")
        return dup_fd(dir, out);
    const int fd = ::openat(dir, name.c_str(), kDirFlags | O_NOFOLLOW);
    if (fd >= 0) {
        out.reset(fd);
        return 0;
    }
    const int error = errno;
    if (error != ELOOP && error != ENOTDIR)
        return error;
    struct stat st {};
    if (::fstatat(dir, name.c_str(), &st, AT_SYMLINK_NOFOLLOW) != 0 || !S_ISLNK(st.st_mode))
        return error;
    if (!trusted_owner(st.st_uid))
        return kUntrustedLink;
    if (--links_left < 0)
        return ELOOP;
    std::string target;
    if (const int failed = read_link(dir, name, target))
        return failed;
    if (!target.empty() && target[0] == '/') {
        UniqueFd root(::open("/", kDirFlags));
        if (!root.valid())
            return errno;
        return walk_components(root.get(), target, out, links_left);
    }
    return walk_components(dir, target, out, links_left);
}

int walk_components(int start, const std::string& path, UniqueFd& out, int& links_left) {
    UniqueFd current;
    if (const int failed = dup_fd(start, current))
        return failed;
    for (const std::string& part : split_path(path)) {
        UniqueFd next;
        if (const int failed = step_dir(current.get(), part, next, links_left))
            return failed;
        current = std::move(next);
    }
    out = std::move(current);
    return 0;
}

int resolve_with(int dir, const std::string& name, Target& out, int& links_left) {
    struct stat st {};
    if (::fstatat(dir, name.c_str(), &st, AT_SYMLINK_NOFOLLOW) != 0 || !S_ISLNK(st.st_mode) ||
        !trusted_owner(st.st_uid)) {
        // Absent, not a link, or another account's link: the name itself.
        out.followed = false;
        out.name = name;
        return dup_fd(dir, out.dir);
    }
    if (--links_left < 0)
        return ELOOP;
    std::string target;
    if (const int failed = read_link(dir, name, target))
        return failed;
    const std::size_t slash = target.find_last_of('/');
    const std::string dir_part = slash == std::string::npos ? "" : target.substr(0, slash + 1);
    const std::string last = slash == std::string::npos ? target : target.substr(slash + 1);
    UniqueFd start;
    if (!target.empty() && target[0] == '/') {
        start.reset(::open("/", kDirFlags));
        if (!start.valid())
            return errno;
    } else if (const int failed = dup_fd(dir, start)) {
        return failed;
    }
    UniqueFd holder;
    if (const int failed = walk_components(start.get(), dir_part, holder, links_left))
        return failed;
    if (last.empty() || last == "." || last == "..") {
        // A link to a directory: name the directory itself.
        UniqueFd whole;
        if (const int failed = walk_components(holder.get(), last, whole, links_left))
            return failed;
        out.dir = std::move(whole);
        out.name = ".";
        out.followed = true;
        return 0;
    }
    const int status = resolve_with(holder.get(), last, out, links_left);
    out.followed = true;
    return status;
}

// Attributes of a file created in `dir`: as root, the directory's owner and
// group, so that the server's account owns what lands in its directories.
int give_owner_of_dir(int fd, int dir) {
    if (::geteuid() != 0)
        return 0;
    struct stat parent {};
    if (::fstat(dir, &parent) != 0)
        return errno;
    return ::fchown(fd, parent.st_uid, parent.st_gid) == 0 ? 0 : errno;
}

std::string random_suffix() {
    static const char kAlphabet[] =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789";
    unsigned char bytes[6] = {};
    if (::getrandom(bytes, sizeof bytes, GRND_NONBLOCK) != static_cast<ssize_t>(sizeof bytes)) {
        // No kernel randomness yet: O_EXCL keeps the name safe anyway, the
        // mix only keeps others from occupying it ahead.
        static unsigned long counter = 0;
        struct timespec now {};
        ::clock_gettime(CLOCK_REALTIME, &now);
        unsigned long long mix = static_cast<unsigned long long>(now.tv_nsec) ^
                                 (static_cast<unsigned long long>(::getpid()) << 20) ^
                                 (++counter * 0x9E3779B97F4A7C15ULL);
        for (unsigned char& byte : bytes) {
            byte = static_cast<unsigned char>(mix & 0xFF);
            mix = (mix >> 8) | (mix << 56);
        }
    }
    std::string suffix;
    for (unsigned char byte : bytes)
        suffix += kAlphabet[byte % (sizeof kAlphabet - 1)];
    return suffix;
}

}  // namespace

int open_trusted_dir(const std::string& path, UniqueFd& out) {
    const int fd = ::open(path.empty() ? "." : path.c_str(), kDirFlags);
    if (fd < 0)
        return errno;
    out.reset(fd);
    return 0;
}

int open_dir_below(int base, const std::string& relative, UniqueFd& out) {
    // The kernel walks a path with no link on it in one call; a link, or a
    // kernel without the call, takes the walk below, which applies the rule.
    struct open_how how {};
    how.flags = kDirFlags;
    how.resolve = RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS | RESOLVE_BENEATH;
    const std::string path = relative.empty() ? "." : relative;
    const long fd = ::syscall(SYS_openat2, base, path.c_str(), &how, sizeof how);
    if (fd >= 0) {
        out.reset(static_cast<int>(fd));
        return 0;
    }
    if (errno == ENOENT || errno == ENOTDIR || errno == EACCES)
        return errno;
    int links_left = kMaxLinks;
    return walk_components(base, relative, out, links_left);
}

int resolve_name(int dir, const std::string& name, Target& out) {
    int links_left = kMaxLinks;
    return resolve_with(dir, name, out, links_left);
}

int stat_at(int dir, const std::string& name, struct stat& st) {
    return ::fstatat(dir, name.c_str(), &st, AT_SYMLINK_NOFOLLOW) == 0 ? 0 : errno;
}

namespace {

// A file opened without blocking (a pipe in its place would have held the
// open forever) reads and writes as usual once it is known to be regular.
void blocking_again(int fd) {
    const int flags = ::fcntl(fd, F_GETFL);
    if (flags >= 0)
        (void)::fcntl(fd, F_SETFL, flags & ~O_NONBLOCK);
}

}  // namespace

int open_read(int dir, const std::string& name, UniqueFd& out, struct stat& st) {
    Target target;
    if (const int failed = resolve_name(dir, name, target))
        return failed;
    // Without blocking: a pipe with no writer would hold the open forever.
    const int fd = ::openat(target.dir.get(), target.name.c_str(),
                            O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
    if (fd < 0)
        return errno == ELOOP ? kUntrustedLink : errno;
    UniqueFd file(fd);
    if (::fstat(fd, &st) != 0)
        return errno;
    if (S_ISDIR(st.st_mode))
        return EISDIR;
    if (!S_ISREG(st.st_mode))
        return EINVAL;
    blocking_again(fd);
    out = std::move(file);
    return 0;
}

int read_all(int fd, std::string& content) {
    content.clear();
    char buffer[65536];
    for (;;) {
        const ssize_t got = ::read(fd, buffer, sizeof buffer);
        if (got > 0) {
            content.append(buffer, static_cast<std::size_t>(got));
        } else if (got == 0) {
            return 0;
        } else if (errno != EINTR) {
            const int error = errno;
            content.clear();
            return error;
        }
    }
}

int open_append(int dir, const std::string& name, UniqueFd& out) {
    Target target;
    if (const int failed = resolve_name(dir, name, target))
        return failed;
    const int flags = O_WRONLY | O_APPEND | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC;
    bool created = true;
    int fd = ::openat(target.dir.get(), target.name.c_str(), flags | O_CREAT | O_EXCL, 0666);
    if (fd < 0 && errno == EEXIST) {
        created = false;
        fd = ::openat(target.dir.get(), target.name.c_str(), flags);
    }
    if (fd < 0)
        return errno == ELOOP ? kUntrustedLink : errno;
    UniqueFd file(fd);
    struct stat st {};
    if (::fstat(fd, &st) != 0)
        return errno;
    if (!S_ISREG(st.st_mode))
        return kNotRegular;
    if (created) {
        if (const int failed = give_owner_of_dir(fd, target.dir.get()))
            return failed;
    }
    blocking_again(fd);
    out = std::move(file);
    return 0;
}

int make_dir(int dir, const std::string& name, UniqueFd& out, bool* created) {
    const bool made = ::mkdirat(dir, name.c_str(), 0777) == 0;
    if (created != nullptr)
        *created = made;
    if (!made && errno != EEXIST)
        return errno;
    int links_left = kMaxLinks;
    if (const int failed = step_dir(dir, name, out, links_left))
        return failed;
    if (made) {
        if (const int failed = give_owner_of_dir(out.get(), dir))
            return failed;
    }
    return 0;
}

int make_private_dir(int dir, const std::string& name, UniqueFd& out) {
    if (::mkdirat(dir, name.c_str(), 0700) != 0 && errno != EEXIST)
        return errno;
    const int fd = ::openat(dir, name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
    if (fd < 0)
        return errno == ELOOP ? kUntrustedLink : errno;
    out.reset(fd);
    struct stat st {};
    if (::fstat(fd, &st) != 0)
        return errno;
    if (st.st_uid != ::geteuid() || (st.st_mode & 022) != 0) {
        out.reset();
        return kNotPrivate;
    }
    return 0;
}

int open_input(const std::string& path, UniqueFd& out) {
    out.reset(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    return out.valid() ? 0 : errno;
}

int open_output(const std::string& path, bool append, UniqueFd& out) {
    out.reset(::open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC | (append ? O_APPEND : 0), 0666));
    return out.valid() ? 0 : errno;
}

int truncate_file(int fd) {
    return ::ftruncate(fd, 0) == 0 ? 0 : errno;
}

int rewrite_file(int fd, const std::string& content) {
    if (::ftruncate(fd, 0) != 0)
        return errno;
    const ssize_t wrote = ::pwrite(fd, content.data(), content.size(), 0);
    return wrote == static_cast<ssize_t>(content.size()) ? 0 : (wrote < 0 ? errno : EIO);
}

int open_private_file(int dir, const std::string& name, UniqueFd& out) {
    out.reset(::openat(dir, name.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0600));
    if (!out.valid())
        return errno == ELOOP ? kUntrustedLink : errno;
    struct stat st {};
    if (::fstat(out.get(), &st) != 0)
        return errno;
    return S_ISREG(st.st_mode) ? 0 : kNotRegular;
}

int link_at(int from_dir, const std::string& from, int to_dir, const std::string& to) {
    return ::linkat(from_dir, from.c_str(), to_dir, to.c_str(), 0) == 0 ? 0 : errno;
}

int rename_at(int from_dir, const std::string& from, int to_dir, const std::string& to) {
    return ::renameat(from_dir, from.c_str(), to_dir, to.c_str()) == 0 ? 0 : errno;
}

int remove_dir(int dir, const std::string& name) {
    return ::unlinkat(dir, name.c_str(), AT_REMOVEDIR) == 0 ? 0 : errno;
}

int remove_file(int dir, const std::string& name) {
    return ::unlinkat(dir, name.c_str(), 0) == 0 ? 0 : errno;
}

int write_all(int fd, const std::string& data) {
    std::size_t done = 0;
    while (done < data.size()) {
        const ssize_t wrote = ::write(fd, data.data() + done, data.size() - done);
        if (wrote < 0) {
            if (errno == EINTR)
                continue;
            return errno;
        }
        if (wrote == 0)
            return EIO;
        done += static_cast<std::size_t>(wrote);
    }
    return 0;
}

AtomicReplace::AtomicReplace(int dir, std::string name, bool sync)
    : dir_(dir), name_(std::move(name)), sync_(sync) {}

AtomicReplace::~AtomicReplace() {
    scratch_fd_.reset();
    if (!scratch_.empty())
        (void)::unlinkat(dir_, scratch_.c_str(), 0);
}

int AtomicReplace::open(const std::string& prefix) {
    for (int attempt = 0; attempt < 100; ++attempt) {
        const std::string candidate = "." + prefix + "." + random_suffix();
        const int fd = ::openat(dir_, candidate.c_str(),
                                O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600);
        if (fd >= 0) {
            scratch_fd_.reset(fd);
            scratch_ = candidate;
            return 0;
        }
        if (errno != EEXIST)
            return errno;
    }
    return EEXIST;
}

int AtomicReplace::sync_scratch() {
    if (sync_ && ::fsync(scratch_fd_.get()) != 0)
        return errno;
    return 0;
}

int AtomicReplace::adopt_attributes(mode_t new_mode, mode_t add_bits) {
    const int fd = scratch_fd_.get();
    if (private_)
        return ::fchmod(fd, 0600) == 0 ? 0 : errno;
    struct stat old {};
    const bool present = ::fstatat(dir_, name_.c_str(), &old, AT_SYMLINK_NOFOLLOW) == 0;
    if (present && S_ISREG(old.st_mode)) {
        // The replaced file's owner, group and mode, so that the server reads
        // what it read before; the owner first, since a change of owner may
        // clear the set-id bits.
        if (::geteuid() == 0 && ::fchown(fd, old.st_uid, old.st_gid) != 0)
            return errno;
        if (::fchmod(fd, (old.st_mode & 07777) | add_bits) != 0)
            return errno;
    } else if (present && S_ISDIR(old.st_mode)) {
        // A directory standing where the file goes.
        return EISDIR;
    } else {
        if (const int failed = give_owner_of_dir(fd, dir_))
            return failed;
        if (::fchmod(fd, ((new_mode & ~current_umask()) & 07777) | add_bits) != 0)
            return errno;
    }
    return 0;
}

int AtomicReplace::commit(mode_t new_mode, mode_t add_bits) {
    if (const int failed = adopt_attributes(new_mode, add_bits))
        return failed;
    return put_in_place();
}

int AtomicReplace::commit_like(const struct stat& like) {
    const int fd = scratch_fd_.get();
    if (::geteuid() == 0 && ::fchown(fd, like.st_uid, like.st_gid) != 0)
        return errno;
    if (::fchmod(fd, like.st_mode & 07777) != 0)
        return errno;
    return put_in_place();
}

int AtomicReplace::put_in_place() {
    if (const int failed = sync_scratch())
        return failed;
    if (::renameat(dir_, scratch_.c_str(), dir_, name_.c_str()) != 0)
        return errno;
    scratch_.clear();
    if (sync_ && ::fsync(dir_) != 0)
        return errno;
    return 0;
}

int copy_like(int from_dir, const std::string& from, int to_dir, const std::string& to, bool sync) {
    UniqueFd file;
    struct stat st {};
    std::string content;
    AtomicReplace copy(to_dir, to, sync);
    int error = open_read(from_dir, from, file, st);
    if (error == 0)
        error = read_all(file.get(), content);
    if (error == 0)
        error = copy.open();
    if (error == 0)
        error = write_all(copy.fd(), content);
    if (error == 0)
        error = copy.commit_like(st);
    return error;
}

int AtomicReplace::link_as(const std::string& name) {
    return ::linkat(dir_, scratch_.c_str(), dir_, name.c_str(), 0) == 0 ? 0 : errno;
}

int sync_filesystem(int fd) {
    return ::syncfs(fd) == 0 ? 0 : errno;
}

int sync_fd(int fd) {
    return ::fsync(fd) == 0 ? 0 : errno;
}

void remove_stale_scratch(int dir, const std::string& prefix) {
    UniqueFd copy;
    if (dup_fd(dir, copy) != 0)
        return;
    DIR* stream = ::fdopendir(copy.get());
    if (stream == nullptr)
        return;
    copy.release();
    const std::string head = "." + prefix + ".";
    std::vector<std::string> stale;
    while (const struct dirent* entry = ::readdir(stream)) {
        const std::string name = entry->d_name;
        if (name.size() == head.size() + 6 && name.compare(0, head.size(), head) == 0)
            stale.push_back(name);
    }
    ::closedir(stream);
    for (const std::string& name : stale) {
        struct stat st {};
        if (::fstatat(dir, name.c_str(), &st, AT_SYMLINK_NOFOLLOW) == 0 && S_ISREG(st.st_mode))
            (void)::unlinkat(dir, name.c_str(), 0);
    }
}

}  // namespace zr7::fs
