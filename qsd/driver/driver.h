// The command-line driver: the entry point's logic, the usage text, the
// installation directory and the relaunch under logging.
#pragma once

#include <string>

namespace zr7 {

constexpr const char* kVrmf = "06100400";
constexpr const char* kOptionString = "c:efh:m:o:sv:V";

// What main does; returns the process status.
int run_main(int argc, char** argv);

// The fourteen lines of the usage text on standard error, then exit(-2).
[[noreturn]] void usage();

// MARLIN_HOME, else MARLINHOME, else "."; always ending in "/".
std::string get_home_path();

// The log directory of a home directory: the home itself when it is "./",
// else home + "logs/".
std::string log_dir_for(const std::string& home);

// The command line that the relaunch shows in "Invoking cmd <...>".
std::string relaunch_command_text(int argc, char** argv, const std::string& home);

// Runs the tool again with "-o <logdir>" and the same arguments, standard
// output appended to the log file, and returns the second run's exit status
// (128+N when signal N ended it).
int jump_start(int argc, char** argv, const char* home);

}  // namespace zr7
