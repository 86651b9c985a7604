#include "bench/run/probe_record.h"

#include <cstdlib>
#include <map>
#include <sstream>

namespace zr7bench {

bool parse_probe_line(const std::string& line, ProbeRecord& record) {
    std::istringstream in(line);
    std::string word;
    if (!(in >> word) || word != "zr7bench-rusage")
        return false;
    std::map<std::string, std::string> fields;
    while (in >> word) {
        const std::size_t eq = word.find('=');
        if (eq == std::string::npos || eq == 0)
            return false;
        fields[word.substr(0, eq)] = word.substr(eq + 1);
    }
    const char* const names[] = {"pid",         "role",      "self_us",
                                 "children_us", "maxrss_kb", "children_maxrss_kb"};
    for (const char* name : names) {
        if (fields.count(name) == 0)
            return false;
    }
    auto number = [&fields](const char* name, long long& out) {
        const std::string& text = fields[name];
        char* end = nullptr;
        out = std::strtoll(text.c_str(), &end, 10);
        return !text.empty() && *end == '\0' && out >= 0;
    };
    long long pid = 0, rss = 0, child_rss = 0;
    if (!number("pid", pid) || !number("self_us", record.self_us) ||
        !number("children_us", record.children_us) || !number("maxrss_kb", rss) ||
        !number("children_maxrss_kb", child_rss)) {
        return false;
    }
    record.pid = static_cast<int>(pid);
    record.maxrss_kb = static_cast<long>(rss);
    record.children_maxrss_kb = static_cast<long>(child_rss);
    record.role = fields["role"];
    return true;
}

ToolUsage combine_probe_lines(const std::string& content) {
    ToolUsage usage;
    std::istringstream in(content);
    std::string line;
    while (std::getline(in, line)) {
        ProbeRecord record;
        if (!parse_probe_line(line, record))
            continue;
        usage.self_us += record.self_us;
        if (record.maxrss_kb > usage.peak_rss_kb)
            usage.peak_rss_kb = record.maxrss_kb;
        ++usage.processes;
        if (record.role == "installer")
            ++usage.installers;
    }
    return usage;
}

}  // namespace zr7bench
