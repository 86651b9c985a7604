#include "qsd/installer/journal.h"

#include <cerrno>
#include <chrono>

namespace zr7 {

namespace {

// Adds the time from its making to its end to a total.
class Stopwatch {
  public:
    explicit Stopwatch(double& total) : total_(total), began_(std::chrono::steady_clock::now()) {}
    ~Stopwatch() {
        total_ += std::chrono::duration<double>(std::chrono::steady_clock::now() - began_).count();
    }
    Stopwatch(const Stopwatch&) = delete;
    Stopwatch& operator=(const Stopwatch&) = delete;

  private:
    double& total_;
    std::chrono::steady_clock::time_point began_;
};

}  // namespace

int Journal::open(int run_dir) {
    if (const int error = fs::make_private_dir(run_dir, kKeptDir, kept_dir_))
        return error;
    return fs::open_append(run_dir, kJournalFile, file_);
}

std::string Journal::relative(const std::string& shown) const {
    std::string base = home_;
    if (base.empty() || base.back() != '/')
        base += '/';
    if (shown.compare(0, base.size(), base) != 0 || shown.size() == base.size())
        return "";
    return shown.substr(base.size());
}

int Journal::append(const JournalEntry& entry) {
    if (!file_.valid())
        return 0;
    return fs::write_all(file_.get(), journal_line(entry));
}

int Journal::keep(int dir, const std::string& name, std::string& kept) {
    kept = std::to_string(++kept_count_);
    fs::Target target;
    if (const int error = fs::resolve_name(dir, name, target))
        return error;
    // The old file itself, by a second name: no byte is copied.
    int error = fs::link_at(target.dir.get(), target.name, kept_dir_.get(), kept);
    // Across file systems, or where links are refused: the same bytes, mode,
    // owner and group under the kept name.
    if (error == EXDEV || error == EPERM)
        error = fs::copy_like(target.dir.get(), target.name, kept_dir_.get(), kept, false);
    return error;
}

int Journal::before_mkdir(const std::string& shown) {
    const Stopwatch watch(seconds_);
    const std::string path = relative(shown);
    if (path.empty() || !listed_.insert(path).second)
        return 0;
    return append({"mkdir", "", {}, path});
}

int Journal::before_write(int dir, const std::string& name, const std::string& shown,
                          Action action) {
    const Stopwatch watch(seconds_);
    const std::string path = relative(shown);
    // A file the run wrote already keeps the first version it had.
    if (!file_.valid() || path.empty() || !listed_.insert(path).second)
        return 0;
    if (action == Action::kCreate)
        return append({"create", "", {}, path});
    // Without its old version the change could not be taken back: the copy
    // is not made.
    std::string kept;
    if (const int error = keep(dir, name, kept))
        return error;
    return append({"replace", kept, {}, path});
}

int Journal::after_write(int dir, const std::string& name, const std::string& shown) {
    const Stopwatch watch(seconds_);
    const std::string path = relative(shown);
    if (!file_.valid() || path.empty())
        return 0;
    fs::UniqueFd file;
    struct stat st {};
    ContentDigest digest;
    int error = fs::open_read(dir, name, file, st);
    if (error == 0)
        error = digest_file(file.get(), false, digest);
    if (error != 0)
        return error;
    return append({"installed", "", digest, path});
}

int Journal::note(const std::string& kind, const std::string& shown) {
    const Stopwatch watch(seconds_);
    const std::string path = relative(shown);
    if (path.empty())
        return 0;
    return append({kind, "", {}, path});
}

}  // namespace zr7
