// Starting one contestant process and measuring it from outside.
#pragma once

#include <string>
#include <vector>

namespace zr7bench {

struct SpawnSpec {
    std::vector<std::string> argv;  // argv[0] is an absolute path
    std::vector<std::string> env;   // NAME=value entries, the whole environment
    std::string stdin_path;         // "" = /dev/null
    std::string stdout_path;        // "" = /dev/null
    bool stdout_append = false;     // added to the end of stdout_path rather than replacing it
    std::string stderr_path;        // "" = /dev/null
};

struct SpawnResult {
    int exit_code = -1;  // 0..255, 128+N for signal N, -1 when it could not start
    double wall_s = 0;
    double cpu_s = 0;  // user and system time of the process and every descendant it waited for
};

SpawnResult spawn_and_wait(const SpawnSpec& job);

// The full path of a program on PATH, "" when not found.
std::string find_program(const std::string& name, const std::string& path_value);

}  // namespace zr7bench
