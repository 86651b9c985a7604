// The three contestants of a round, each run once on a fresh server home:
//   A  the tool as a user runs it (through the relaunch), with -c and -m,
//      seeding with the stand-in loader;
//   B  the same installation the shell way: one `sh -c` per file copied and
//      per SQL file seeded (bench/shell_install.sh);
//   C  the floor: `cp -a` of the same trees, nothing else.
// Beside them, A's preview of the same installation (`-n`) and the undo of
// A's newest installation into a home (`-u`).
#pragma once

#include <string>
#include <vector>

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

Sample run_tool(const Bench& bench, const Case& c);
Sample run_shell_way(const Bench& bench, const Case& c);
Sample run_floor(const Bench& bench, const Case& c);
Sample run_preview(const Bench& bench, const Case& c);
Sample run_undo(const Bench& bench, const Case& c);

// One line per contestant for the results page.
std::vector<std::string> describe_contestants();

}  // namespace zr7bench
