// For the end-to-end tests: the tool run free of the caller's settings, on the sample.
#pragma once

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "qsd/text/text.h"
#include "support/test_support.h"

namespace zr7test {

inline RunResult tool(const std::vector<std::string>& args, RunOptions options = {}) {
    for (const char* name : {"MARLIN_HOME", "MARLINHOME", "VXA_TRC1", "QDSLOAD_FAIL"})
        options.unset_env.push_back(name);
    return run(tool_path(), args, options);
}

// An installing run on the sample, without the relaunch: options, then the image.
inline RunResult install(const SampleInstall& s, std::vector<std::string> args = {},
                         const RunOptions& options = {}) {
    args.insert(args.begin(), {"-o", s.home + "/logs/", "-h", s.home});
    args.push_back(s.image);
    return tool(args, options);
}

using zr7::ends_with;

}  // namespace zr7test
