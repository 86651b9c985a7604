// Progress for an administrator watching a terminal: one line on standard
// error, rewritten in place, and a closing summary. Off unless enabled, and
// enabled only by the installing invocation when standard error is a
// terminal, so standard output and the log never change because of it.
#pragma once

#include <cstddef>
#include <string>

namespace zr7 {

void progress_enable(bool on);
bool progress_enabled();
// Whether a run with these standard streams shows progress: only when
// standard error is a terminal and standard output is not one, since lines on
// standard output would land in the middle of the rewritten line.
bool progress_wanted(bool stderr_is_terminal, bool stdout_is_terminal);

void progress_command(int index, int count, int kind, const std::string& source_template);
void progress_file_copied(const std::string& destination);
void progress_seeding(const std::string& file_name);
void progress_seeded(const std::string& file_name);
void progress_env_result(bool changed, const std::string& backup_path);
// Clears the progress line and writes the summary of the run, which names
// the log file and the time the run took.
void progress_finish(int status, const std::string& log_file, double elapsed_seconds);

// What the display knows about the run so far.
struct ProgressState {
    int command = 0;   // 1-based index of the current command, 0 before the first
    int commands = 0;  // commands in the run
    int kind = 0;      // kind of the current command
    std::string source_template;
    long files_copied = 0;
    long files_seeded = 0;
    std::string seeding;  // the file being seeded, "" between loader runs
    bool env_reported = false;
    bool env_changed = false;
    std::string backup;
};

// The run so far, whether or not it is shown: the counts also go into the
// log's closing line.
const ProgressState& progress_state();

// Seconds with three decimals, "12.345".
std::string elapsed_text(double seconds);

// The progress line for a terminal `width` columns wide, at most width - 1
// columns so that it never wraps. Every byte of a name that a terminal could
// take for a control is shown as "?".
std::string progress_line(const ProgressState& state, std::size_t width);
// The closing summary, lines ending in "\n".
std::string progress_summary(const ProgressState& state, int status, const std::string& log_file,
                             double elapsed_seconds);
// The text with control bytes, C1 controls and bytes that are not UTF-8
// replaced by "?", so a file name cannot move the cursor or retitle a window.
std::string terminal_safe(const std::string& text);
// Columns that a terminal-safe text occupies (one per character).
std::size_t display_width(const std::string& text);

}  // namespace zr7
