// The lines that the preloaded probe writes, one per process of the tool:
//   zr7bench-rusage pid=4242 role=installer self_us=81234 children_us=912345
//     maxrss_kb=3920 children_maxrss_kb=1812
#pragma once

#include <string>

namespace zr7bench {

struct ProbeRecord {
    int pid = 0;
    std::string role;  // "launcher" or "installer"
    long long self_us = 0;
    long long children_us = 0;
    long maxrss_kb = 0;
    long children_maxrss_kb = 0;
};

// False for a line that is not a complete probe line.
bool parse_probe_line(const std::string& line, ProbeRecord& record);

// The tool's own use over all its processes: CPU times added up, the largest
// peak resident size. `installers` counts the installing invocations seen.
struct ToolUsage {
    long long self_us = 0;
    long peak_rss_kb = 0;
    int processes = 0;
    int installers = 0;
};
ToolUsage combine_probe_lines(const std::string& content);

}  // namespace zr7bench
