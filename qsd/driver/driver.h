// The command-line driver: the entry point's logic, the usage text, the
// installation directory and the relaunch under logging.
#pragma once

#include <cstdio>
#include <string>

#include "qsd/driver/progress.h"
#include "qsd/text/plan.h"
#include "qsd/text/text.h"

namespace zr7 {

constexpr const char* kVrmf = "06100400";
constexpr const char* kOptionString = "c:efh:m:no:suv:V";

// What main does; returns the process status.
int run_main(int argc, char** argv);

// The usage text: its fourteen lines, then one line for each option added
// after them.
std::string usage_text();

// The usage text on standard error, then exit(-2).
[[noreturn]] void usage();

// What the command line asks for, judged on its form alone (option letters,
// arguments present, long options, the operand count) before any option
// takes effect.
enum class CommandLineAction { kRun, kHelp, kVersion, kRefuse };
struct CommandLineCheck {
    CommandLineAction action = CommandLineAction::kRun;
    // For kRefuse, what was wrong: "unknown option -x", "option -h needs an
    // argument", "one src_dir expected, 2 given", ...
    std::string fault;
};
CommandLineCheck check_command_line(int argc, char* const* argv);

// The first trace line of an installing run: version, time, user, working
// directory and the command line (its pieces joined by blanks).
std::string run_header_line(const std::string& time_text, const std::string& user_name, long uid,
                            const std::string& cwd, int argc, char* const* argv);

// The last trace line of an installing run, from its status and progress.
// `journal_seconds` is the time the run spent keeping its journal.
std::string run_closing_line(int status, const ProgressState& state, double elapsed_seconds,
                             double journal_seconds);

// What the record of a run in qsdinst.json says.
struct RunRecord {
    std::string operation = "install";  // or "undo"
    std::string run;                    // the run's directory in the store
    std::string start;                  // iso_local_time
    std::string end;
    StringList arguments;  // the administrator's, without the relaunch's "-o <logdir>"
    std::string home;
    std::string image;  // "" for none
    int rc = 0;         // the run's status; the exit status is its low byte
    const Plan* plan = nullptr;
    std::string backup;    // the environment file's backup, "" for none
    StringList errors;     // the "Error:" lines
    std::string manifest;  // "" for none
    std::string undoes;    // an undo's: the run it took back, "" for none
};
// The record as one JSON object on one line, without the line break.
std::string run_record_json(const RunRecord& record);

// The local time as "2026-12-07T01:45:09+0000".
std::string iso_local_time(long seconds_since_epoch);

// MARLIN_HOME, else MARLINHOME, else "."; always ending in "/". The line
// that says which goes to `out`: standard output, or standard error in a
// preview, whose standard output is the plan alone.
std::string get_home_path(std::FILE* out = stdout);

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

// src_dir + "MSRV", with a "/" between where src_dir lacks one.
std::string image_msrv_path(const std::string& src_dir);

// The first invocation's checks before the relaunch: the installation
// directory, the image's MSRV directory and the log directory exist. 0, or
// -7 / -8 after a line on standard error.
// An empty `src_dir` (an undo) is not checked. `reason` (when given)
// receives the line, unescaped.
int check_before_relaunch(const std::string& home, const std::string& src_dir,
                          std::string* reason = nullptr);

}  // namespace zr7

class Installer610;

namespace zr7 {

// The preview (-n): the installing run's checks and plan in this process,
// nothing changed, no log; the plan on standard output. Returns the status
// the run would end with.
// With `undo`, the undo's plan; `src_dir` is unused then.
int run_preview(Installer610& installer, const std::string& home, const std::string& src_dir,
                bool undo);

// Keeps the record of an installing run that ended with `status`: its
// manifest in the installation's run store, and one line in
// <logdir>/qsdinst.json. Returns `status`, or -8 when a successful run
// could not keep its record.
int keep_run_record(Installer610& installer, RunRecord& record, int status);

// The image's MSRV path as the installing run names it: src_dir, "/", "MSRV/".
std::string image_source_path(const std::string& src_dir);

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
