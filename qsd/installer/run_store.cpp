#include "qsd/installer/run_store.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>

#include "qsd/fileops/tree_walk.h"
#include "qsd/installer/journal.h"

namespace zr7 {

namespace {

constexpr std::size_t kSequenceDigits = 6;

// The sequence number of a run directory's name, or -1 for another name.
long sequence_of(const std::string& name) {
    if (name.size() <= kSequenceDigits || name[kSequenceDigits] != '-')
        return -1;
    long value = 0;
    for (std::size_t i = 0; i < kSequenceDigits; ++i) {
        if (name[i] < '0' || name[i] > '9')
            return -1;
        value = value * 10 + (name[i] - '0');
    }
    return value;
}

}  // namespace

int open_run_store(int home_fd, fs::UniqueFd& out) {
    return fs::make_private_dir(home_fd, kRunStoreName, out);
}

std::string next_run_id(const StringList& existing, std::time_t now, long pid) {
    long highest = 0;
    for (const std::string& name : existing)
        highest = std::max(highest, sequence_of(name));
    std::string sequence = std::to_string(highest + 1);
    if (sequence.size() < kSequenceDigits)
        sequence.insert(0, kSequenceDigits - sequence.size(), '0');
    struct tm parts {};
    char stamp[32] = "";
    if (gmtime_r(&now, &parts) != nullptr)
        std::strftime(stamp, sizeof stamp, "%Y%m%dT%H%M%SZ", &parts);
    return sequence + "-" + stamp + "-" + std::to_string(pid);
}

StringList run_ids(int store_fd) {
    StringList names;
    StringList runs;
    if (list_names(store_fd, names) != 0)
        return runs;
    for (const std::string& name : names) {
        if (sequence_of(name) >= 0)
            runs.push_back(name);
    }
    std::sort(runs.begin(), runs.end());
    return runs;
}

int create_run_dir(int store_fd, std::string& id, fs::UniqueFd& out) {
    // The run lock keeps other runs out, and the name is one no run had.
    id = next_run_id(run_ids(store_fd), std::time(nullptr), static_cast<long>(::getpid()));
    return fs::make_private_dir(store_fd, id, out);
}

namespace {

// Removes what `dir` holds: files, and directories with what they hold.
int empty_dir(int dir) {
    StringList names;
    if (const int error = list_names(dir, names))
        return error;
    for (const std::string& name : names) {
        struct stat st {};
        if (fs::stat_at(dir, name, st) != 0)
            continue;
        if (S_ISDIR(st.st_mode)) {
            fs::UniqueFd sub;
            if (fs::open_dir_below(dir, name, sub) == 0)
                (void)empty_dir(sub.get());
            if (const int error = fs::remove_dir(dir, name))
                return error;
        } else if (const int error = fs::remove_file(dir, name)) {
            return error;
        }
    }
    return 0;
}

}  // namespace

int remove_run_dir(int store_fd, const std::string& id) {
    fs::UniqueFd run;
    if (const int error = fs::open_dir_below(store_fd, id, run))
        return error;
    if (const int error = empty_dir(run.get()))
        return error;
    return fs::remove_dir(store_fd, id);
}

void prune_runs(int store_fd, std::size_t keep) {
    const StringList ids = run_ids(store_fd);
    std::size_t journals = 0;
    for (std::size_t i = ids.size(); i-- > 0;) {
        struct stat st {};
        fs::UniqueFd run;
        if (journals >= keep) {
            (void)remove_run_dir(store_fd, ids[i]);
        } else if (fs::open_dir_below(store_fd, ids[i], run) == 0 &&
                   fs::stat_at(run.get(), kJournalFile, st) == 0) {
            ++journals;
        }
    }
}

int write_run_file(int run_fd, const std::string& name, const std::string& content) {
    fs::AtomicReplace file(run_fd, name, true);
    file.make_private();
    int error = file.open("run");
    if (error == 0)
        error = fs::write_all(file.fd(), content);
    if (error == 0)
        error = file.commit(0600);
    return error;
}

}  // namespace zr7
