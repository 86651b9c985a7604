// The command-line driver: the entry point's logic, the usage text, the
// installation directory and the relaunch under logging.
#pragma once

#include <string>

#include "qsd/text/text.h"

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

// The log file of a home directory: its log directory + "qsdinst.log".
std::string log_file_for(const std::string& home);

// The command line that the relaunch shows in "Invoking cmd <...>": the
// tool's path bare, every other piece wrapped in double quotes when it holds
// white space, and ">>" with the log file at the end. Shown only; nothing
// parses it.
std::string relaunch_command_text(int argc, char** argv, const std::string& home);

// The arguments of the second run: "-o", the log directory, then argv[1] to
// argv[argc-1] exactly as given (blanks and empty arguments included).
StringList relaunch_arguments(int argc, char** argv, const std::string& home);

// Exit status when the second run cannot be started at all, the status a
// shell gives a command it cannot find.
constexpr int kRelaunchNotStarted = 127;

// Runs the tool again with "-o <logdir>" and the same arguments, standard
// output appended to the log file, and returns the second run's exit status
// (128+N when signal N ended it). When the log file cannot be opened it
// writes "Error: Can't open <log file>" on standard error and returns -8
// without a second run.
int jump_start(int argc, char** argv, const char* home);

}  // namespace zr7
