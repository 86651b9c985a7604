#include "qsd/installer/run_store.h"

#include <unistd.h>

#include <algorithm>

#include "qsd/fileops/tree_walk.h"

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
