// What the tool's log says about a run: its closing trace line,
//   ... zr7inst run ends: rc 0, files copied 600, files seeded 23,
//       VXAENV changed, elapsed 2.345 s, journal 0.012 s
// (one line), which gives the time the run spent keeping its journal.
#pragma once

#include <string>

namespace zr7bench {

struct RunEnd {
    bool found = false;     // a complete closing line was read
    int rc = 0;             // the run's status as the line gives it
    long files_copied = 0;  // files created or replaced
    double elapsed_s = 0;   // the run's own time, relaunch aside
    double journal_s = 0;   // the share of it spent keeping the journal
};

// The last closing line in `log_text` (the log is appended to by every run
// into the home); `found` is false when there is none or it lacks a field.
RunEnd last_run_end(const std::string& log_text);

}  // namespace zr7bench
