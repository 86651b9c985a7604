// Contestant D's list: the programs an installation starts, in the order it
// starts them, read from the tool's own plan of that installation. Every
// copy the plan lists becomes one `cp -f -- SRC DST`, or one `tr -d '\r'`
// from SRC to DST for the copies that remove carriage returns, and every SQL
// file it seeds one loader run; the directories the plan creates are made
// in between, where the plan makes them. Nothing here touches the disk.
#pragma once

#include <set>
#include <string>
#include <vector>

#include "qsd/installer/simple_command.h"

namespace zr7bench {

// One copy command of the tool's list with its paths filled in: the files
// under `from` go to the same names under `to`.
struct CopyRoute {
    std::string from;
    std::string to;
    bool flat = false;      // only the files directly in `from`
    bool strip_cr = false;  // carriage returns removed on the way
};

// Where a run of the tool puts things: the image's MSRV directory and the
// server home, both as the tool's plan shows them (absolute, no "/" at the
// end).
struct RouteSetting {
    std::string msrv;
    std::string home;
    std::string server;
    std::string arch;
};

// The copy commands of `commands`, in their order, their ${...} names
// replaced. Flat copies always remove carriage returns; tree copies when
// their options hold "T".
std::vector<CopyRoute> copy_routes(const CommandList& commands, const RouteSetting& setting);

enum class StepKind {
    kMkdir,    // a directory the installation creates
    kCopy,     // cp -f -- from to
    kStripCr,  // tr -d '\r' <from >to
    kLoad,     // the loader on `to`, an SQL file in the catalog's SQL directory
};

struct ReplayStep {
    StepKind kind = StepKind::kCopy;
    std::string from;  // the image file of a copy; "" otherwise
    std::string to;    // the directory, destination or SQL file
};

struct ReplayList {
    std::vector<ReplayStep> steps;
    std::string error;  // "" when every line of the plan was placed
};

// Reads the plan the tool prints for `zr7inst -n` (or its run's manifest):
// `mkdir`, `create`, `replace`, `same`, `keep` and `seed` lines count, the
// rest (the environment file's backup and diff, `pass`, the summary) starts
// no program. A copied file's source is found by walking the routes in
// order: the route the previous copy came from, or a later one, whose
// destination holds the file and whose source directory has it in
// `sources` (the image's files, absolute). A route never writes one
// destination twice, so a name the current route has already written
// belongs to a later one. `keep` lines start nothing but place the walk. A
// line no route explains, an `error` line or an escaped name (the plan
// escapes control bytes and the backslash) leaves the list unusable:
// `error` says which.
ReplayList build_replay(const std::string& plan_text, const std::vector<CopyRoute>& routes,
                        const std::set<std::string>& sources);

}  // namespace zr7bench
