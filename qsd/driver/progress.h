// Progress for an administrator watching a terminal: one line on standard
// error, rewritten in place, and a closing summary. The installing
// invocation hands the installer a ProgressDisplay, shown only when standard
// error is a terminal, so standard output and the log never change because
// of it. It also keeps the counts for the log's closing line.
#pragma once

#include <cstddef>
#include <string>

#include "qsd/installer/run_observer.h"

namespace zr7 {

// What the display knows about the run so far.
struct ProgressState {
    int command = 0;   // 1-based index of the current command, 0 before the first
    int commands = 0;  // commands in the run
    int kind = 0;      // CommandKind of the current command
    std::string source_template;
    long files_copied = 0;
    long files_seeded = 0;
    std::string seeding;  // the file being seeded, "" between loader runs
    bool env_reported = false;
    bool env_changed = false;
    std::string backup;
    std::string counts;  // the plan's summary after "summary: "
};

// Whether a run with these standard streams shows progress: only when
// standard error is a terminal and standard output is not one, since lines on
// standard output would land in the middle of the rewritten line.
bool progress_wanted(bool stderr_is_terminal, bool stdout_is_terminal);

class ProgressDisplay : public RunObserver {
  public:
    explicit ProgressDisplay(bool shown) : shown_(shown) {}
    void on_action(Action action, const std::string& path, const std::string& diff) override;
    void on_command(int index, int count, CommandKind kind,
                    const std::string& source_template) override;
    void on_seeding(const std::string& file_name) override;
    void on_env_result(bool changed) override;
    // Clears the progress line and writes the summary of the run (with the
    // plan's counts), which names the log file and the time the run took.
    void finish(int status, const std::string& counts, const std::string& log_file,
                double elapsed_seconds);
    // The run so far, whether or not it is shown: the counts also go into the
    // log's closing line.
    const ProgressState& state() const { return run_; }

  private:
    void redraw();
    bool shown_;
    ProgressState run_;
    std::string drawn_;  // the line on the terminal now
    std::size_t drawn_width_ = 0;
};

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
