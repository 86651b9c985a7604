// The three contestants of a round, each run once on a fresh server home:
//   A  the tool as a user runs it (through the relaunch), with -c and -m,
//      seeding with the stand-in loader;
//   B  the same installation the shell way: one `sh -c` per file copied and
//      per SQL file seeded (bench/shell_install.sh);
//   C  the floor: `cp -a` of the same trees, nothing else;
//   D  the design's floor: the programs A starts, one after the other, and
//      nothing else (bench/run/replay.h).
// Beside them, A's preview of the same installation (`-n`) and the undo of
// A's newest installation into a home (`-u`).
#pragma once

#include <set>
#include <string>
#include <vector>

#include "bench/run/replay.h"
#include "bench/run/report.h"

namespace zr7bench {

struct Bench {
    std::string bin_dir;           // the tool, the stand-in loader, the probe
    std::string script;            // the shell way
    std::string work;              // scratch files of the runner
    std::string path_value;        // PATH for every contestant: bin_dir first
    std::vector<std::string> env;  // the environment every contestant starts with
    std::string bash;
    std::string cp;
    std::string tr;
    std::string qdsload;
};

struct Case {
    std::string label;  // names the output files
    std::string image;  // the source image (holds MSRV)
    std::string home;   // a fresh server home
    std::string server = "SRV1";
    std::string arch = "lx8266";
};

// The setting and module name that contestants A and B put into VXAENV.
constexpr const char* kBenchSetting = "KBENCH_SETTING=on";
constexpr const char* kBenchModule = "KBENCHMOD";
// The protocol and port of the benchmark's server configuration, which the
// tool hands the loader.
constexpr const char* kBenchProtocol = "ip.pipe";
constexpr const char* kBenchPort = "1918";

Sample run_tool(const Bench& bench, const Case& c);
Sample run_shell_way(const Bench& bench, const Case& c);
Sample run_floor(const Bench& bench, const Case& c);
Sample run_preview(const Bench& bench, const Case& c);
Sample run_undo(const Bench& bench, const Case& c);

// D's list for the case: A's preview on the fresh home `c.home` holds, read
// back through the command list. `sources` are the image's files, absolute.
// Not timed: the list is the same for every fresh home of the case.
ReplayList plan_replay(const Bench& bench, const Case& c, const std::set<std::string>& sources);
Sample run_replay(const Bench& bench, const Case& c, const ReplayList& list);

// One line per contestant for the results page.
std::vector<std::string> describe_contestants();

}  // namespace zr7bench
