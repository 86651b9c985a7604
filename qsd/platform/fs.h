// The one file-system layer: the only code of the tool that creates,
// replaces, renames or removes files or directories or changes their
// attributes. The tool runs as root over directories that other accounts own,
// so every step here is taken relative to a directory descriptor that was
// opened without following a link that another account could have planted,
// and on open descriptors, never by a path resolved a second time.
//
// The link rule: a path the administrator gave (the -h home, the src_dir, the
// scratch directory) is trusted as it stands. Below it, a symbolic link is
// followed only when root owns it (or, in a run that is not root, the running
// account), the rule the kernel applies in sticky directories. In the image a
// link that stays inside the image's MSRV directory is followed whoever owns
// it (images hold such links); see image_walk.h.
#pragma once

#include <sys/stat.h>
#include <sys/types.h>

#include <string>
#include <vector>

namespace zr7::fs {

// An owned descriptor, closed when the object goes.
class UniqueFd {
  public:
    UniqueFd() = default;
    explicit UniqueFd(int fd) : fd_(fd) {}
    ~UniqueFd() { reset(); }
    UniqueFd(UniqueFd&& other) noexcept : fd_(other.release()) {}
    UniqueFd& operator=(UniqueFd&& other) noexcept;
    UniqueFd(const UniqueFd&) = delete;
    UniqueFd& operator=(const UniqueFd&) = delete;

    int get() const { return fd_; }
    bool valid() const { return fd_ >= 0; }
    int release();
    void reset(int fd = -1);

  private:
    int fd_ = -1;
};

// Error numbers of this layer besides the system's: the step met a symbolic
// link that the link rule does not let it follow, or an object of the wrong
// kind (a pipe, a device, a directory where a file belongs).
constexpr int kUntrustedLink = 100001;
constexpr int kNotRegular = 100002;
// A directory that must be the running account's alone is not.
constexpr int kNotPrivate = 100003;
// The system's text for an error number, or ours for the two above.
std::string error_text(int error);

// The names of a path between its "/" separators, empty ones left out.
std::vector<std::string> split_path(const std::string& path);

// Whether a link owned by `uid` may be followed inside the installation.
bool trusted_owner(uid_t uid);

// Opens a directory the administrator named (links followed). 0 or errno.
int open_trusted_dir(const std::string& path, UniqueFd& out);

// Opens the directory `relative` ("a/b", "." or "") below `base`, component
// by component, following a link only by the link rule. 0 or an error
// number (kUntrustedLink for a refused link).
int open_dir_below(int base, const std::string& relative, UniqueFd& out);

// Where a name in a directory leads once the link rule has followed every
// link that it may follow: the directory that holds the final object and
// the object's name in it. A name that is no link, or a link the rule does
// not follow, stays as it is (`followed` false).
struct Target {
    UniqueFd dir;
    std::string name;
    bool followed = false;
};
// 0, or an error number of a step on the way (ENOENT for a dangling link).
int resolve_name(int dir, const std::string& name, Target& out);

// Status of a name without following a link. 0 or errno.
int stat_at(int dir, const std::string& name, struct stat& st);

// Opens a regular file below `dir` for reading, without blocking on a pipe,
// following a final link by the link rule. kNotRegular for anything that is
// not a regular file. 0 or an error number.
int open_read(int dir, const std::string& name, UniqueFd& out, struct stat& st);
// Reads the whole of an open file. 0 or errno.
int read_all(int fd, std::string& content);

// Opens a log for appending: created when missing (mode 0644 less the umask,
// as root the directory's owner and group), a link followed by the link
// rule, anything but a regular file refused without blocking. 0 or an error
// number.
int open_append(int dir, const std::string& name, UniqueFd& out);

// Creates the directory `name` in `dir` (0777 less the umask; as root the
// owner and group of `dir`) unless it is there, and opens it by the link
// rule; `created` (when given) tells whether it was made here. 0 or an
// error number.
int make_dir(int dir, const std::string& name, UniqueFd& out, bool* created = nullptr);

// Creates the directory `name` in `dir` (mode 0700, the running account's)
// unless it is there, and opens it without following a link. An existing one
// must belong to the running account and be writable by nobody else
// (kNotPrivate): what root reads back from it decides what root writes.
int make_private_dir(int dir, const std::string& name, UniqueFd& out);

// Opens a file by a path the caller chose, for a program's standard input,
// or for its output (created when missing, 0666 less the umask; appended to
// or written from the start). 0 or errno.
int open_input(const std::string& path, UniqueFd& out);
int open_output(const std::string& path, bool append, UniqueFd& out);
// Empties an open file. 0 or errno.
int truncate_file(int fd);
// Replaces the whole content of an open file. 0 or errno.
int rewrite_file(int fd, const std::string& content);

// Opens `name` in `dir` for reading and writing, creating it (mode 0600)
// when missing; never through a link, and only a regular file. 0 or an
// error number.
int open_private_file(int dir, const std::string& name, UniqueFd& out);

// A second name for a file (the name itself, never a link's target), and a
// rename, between two open directories. 0 or errno (EXDEV across file
// systems, EEXIST for a link name that is taken).
int link_at(int from_dir, const std::string& from, int to_dir, const std::string& to);
int rename_at(int from_dir, const std::string& from, int to_dir, const std::string& to);

// Removes an empty directory. 0 or errno (ENOTEMPTY when it holds anything).
int remove_dir(int dir, const std::string& name);

// Removes a file (never a directory). 0 or errno.
int remove_file(int dir, const std::string& name);

// Writes every byte. 0 or errno.
int write_all(int fd, const std::string& data);

// A file that replaces `name` in `dir` whole or not at all: written to an
// exclusive scratch file beside it (".<prefix>.XXXXXX", mode 0600), given the
// replaced file's mode, owner and group (or, for a new file, `new_mode` less
// the umask and as root the directory's owner and group), then renamed over
// the name. The scratch file goes on every way out that did not commit.
class AtomicReplace {
  public:
    // `sync` makes commit flush the file and the directory to the disk before
    // it returns (the environment file and its backups); the bulk copies
    // leave that to one sync_filesystem at the end of the run.
    AtomicReplace(int dir, std::string name, bool sync);
    ~AtomicReplace();
    AtomicReplace(const AtomicReplace&) = delete;
    AtomicReplace& operator=(const AtomicReplace&) = delete;

    // The new file stays the running account's, mode 0600, whatever it
    // replaces: for a file in a directory that others may write.
    void make_private() { private_ = true; }
    // Creates the scratch file. 0 or errno.
    int open(const std::string& prefix = "zr7copy");
    int fd() const { return scratch_fd_.get(); }
    const std::string& scratch_name() const { return scratch_; }
    // Takes over the attributes and renames the scratch file over the name;
    // `add_bits` are added to the mode either way. 0 or errno.
    int commit(mode_t new_mode = 0666, mode_t add_bits = 0);
    // Gives the scratch file the attributes commit gives it (those of the
    // file it replaces, or of a new file). 0 or errno.
    int adopt_attributes(mode_t new_mode = 0666, mode_t add_bits = 0);
    // As commit, with the owner, group and mode of `like` (a file put back as
    // it was).
    int commit_like(const struct stat& like);
    // Gives the scratch file a second name that never replaces a file: for
    // backups. EEXIST when the name is taken. The scratch file still goes
    // when the object does.
    int link_as(const std::string& name);
    // Flushes the scratch file (when sync was asked) without renaming it.
    int sync_scratch();

  private:
    // Flushes (when asked) and renames the scratch file over the name.
    int put_in_place();

    int dir_;
    std::string name_;
    bool sync_;
    bool private_ = false;
    UniqueFd scratch_fd_;
    std::string scratch_;
};

// Copies the regular file `from` of `from_dir` to `to` in `to_dir` by an
// atomic replace, with the same bytes, mode, owner and group: a file kept or
// put back where a rename or a link cannot reach. 0 or an error number.
int copy_like(int from_dir, const std::string& from, int to_dir, const std::string& to, bool sync);

// Flushes the whole file system that holds `fd`. 0 or errno.
int sync_filesystem(int fd);
// Flushes one file or directory. 0 or errno.
int sync_fd(int fd);

// Removes the scratch files ("." prefix "." six characters, regular files)
// that a killed run left in `dir`. The caller holds the run lock, so no
// live run owns them.
void remove_stale_scratch(int dir, const std::string& prefix);

}  // namespace zr7::fs
