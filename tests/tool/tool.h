// For the end-to-end tests: the tool run free of the caller's settings, on the sample.
#pragma once

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/test_support.h"

namespace zr7test {

// With a `shell` script the tool runs through /bin/sh, as "$0".
inline RunResult tool(const std::vector<std::string>& args, RunOptions options = {},
                      const std::string& shell = "") {
    for (const char* name : {"MARLIN_HOME", "MARLINHOME", "VXA_TRC1", "QDSLOAD_FAIL"})
        options.unset_env.push_back(name);
    std::vector<std::string> sh = {"-c", shell, tool_path()};
    sh.insert(sh.end(), args.begin(), args.end());
    return shell.empty() ? run(tool_path(), args, options) : run("/bin/sh", sh, options);
}

// An installing run on the sample, without the relaunch: options, then the image.
inline RunResult install(const SampleInstall& s, std::vector<std::string> args = {},
                         const RunOptions& options = {}, const std::string& shell = "") {
    args.insert(args.begin(), {"-o", s.home + "/logs/", "-h", s.home});
    args.push_back(s.image);
    return tool(args, options, shell);
}

inline bool ends_with(const std::string& text, const std::string& end) {
    return text.size() >= end.size() && text.substr(text.size() - end.size()) == end;
}

}  // namespace zr7test
