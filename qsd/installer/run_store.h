// The records an installation keeps of its runs: a directory of its own,
// ".zr7inst" in the installation directory, with one directory per run
// that holds the run's manifest (and an installing run's journal). It is
// private to the running account: what root reads back from it decides
// what root writes, so another account may neither write it nor put one
// in its place.
#pragma once

#include <ctime>
#include <string>

#include "qsd/platform/fs.h"
#include "qsd/text/text.h"

namespace zr7 {

constexpr const char* kRunStoreName = ".zr7inst";

// Opens the store of the installation `home_fd`, creating it when missing.
// 0 or an error number (fs::kNotPrivate for a store that is not the
// running account's alone).
int open_run_store(int home_fd, fs::UniqueFd& out);

// The name of a new run's directory: a sequence number one past the highest
// among `existing`, the time (UTC) and the process: "000012-20261207T021443Z-4242".
// Names sort in the order the runs began.
std::string next_run_id(const StringList& existing, std::time_t now, long pid);

// The run directories of a store, oldest first (names of any other form
// left out).
StringList run_ids(int store_fd);

// Creates the directory of a new run in the store. 0 or an error number.
int create_run_dir(int store_fd, std::string& id, fs::UniqueFd& out);

// How many installing runs keep their journal; the run directories older
// than the oldest of them are removed when a run starts.
constexpr std::size_t kKeptJournals = 10;

// Removes the run directories older than the newest `keep` that hold a
// journal. Backups under .archive are never touched.
void prune_runs(int store_fd, std::size_t keep);

// Removes a run directory and everything in it, no link followed.
int remove_run_dir(int store_fd, const std::string& id);

// Writes (or replaces) a file of a run directory, whole, on the disk.
int write_run_file(int run_fd, const std::string& name, const std::string& content);

}  // namespace zr7
