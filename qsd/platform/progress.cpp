#include "qsd/platform/progress.h"

#include <cstdio>

namespace zr7 {

namespace {

struct ProgressState {
    bool on = false;
    int command = 0;
    int commands = 0;
    long files_copied = 0;
    long files_seeded = 0;
    bool env_reported = false;
    bool env_changed = false;
    std::string backup;
    std::string current;
};

ProgressState& state() {
    static ProgressState instance;
    return instance;
}

void redraw() {
    ProgressState& s = state();
    std::string line = "[" + std::to_string(s.command) + "/" + std::to_string(s.commands) + "] " +
                       std::to_string(s.files_copied) + " files copied";
    if (s.files_seeded > 0)
        line += ", " + std::to_string(s.files_seeded) + " seeded";
    if (!s.current.empty())
        line += "  " + s.current;
    if (line.size() > 78)
        line = line.substr(0, 75) + "...";
    std::fprintf(stderr, "\r\033[K%s", line.c_str());
    std::fflush(stderr);
}

}  // namespace

void progress_enable(bool on) {
    state().on = on;
}
bool progress_enabled() {
    return state().on;
}

void progress_command(int index, int count, int /*kind*/, const std::string& source_template) {
    ProgressState& s = state();
    s.command = index;
    s.commands = count;
    s.current = source_template;
    if (s.on)
        redraw();
}

void progress_file_copied(const std::string& destination) {
    ProgressState& s = state();
    ++s.files_copied;
    if (!s.on)
        return;
    // Redrawing for every file would cost more than the copy of a small one.
    if (s.files_copied % 16 == 1) {
        s.current = destination;
        redraw();
    }
}

void progress_seeding(const std::string& file_name) {
    ProgressState& s = state();
    s.current = "seeding " + file_name;
    if (s.on)
        redraw();
}

void progress_seeded(const std::string& /*file_name*/) {
    ++state().files_seeded;
}

void progress_env_result(bool changed, const std::string& backup_path) {
    ProgressState& s = state();
    s.env_reported = true;
    s.env_changed = changed;
    s.backup = backup_path;
}

void progress_finish(int status) {
    ProgressState& s = state();
    if (!s.on)
        return;
    std::fprintf(stderr, "\r\033[K");
    std::fprintf(stderr, "zr7inst: %s: %ld files copied, %ld files seeded",
                 status == 0 ? "done" : "failed", s.files_copied, s.files_seeded);
    if (s.env_reported) {
        if (s.env_changed) {
            std::fprintf(stderr, ", VXAENV changed (backup %s)", s.backup.c_str());
        } else {
            std::fprintf(stderr, ", VXAENV unchanged");
        }
    }
    if (status != 0)
        std::fprintf(stderr, ", status %d", status);
    std::fprintf(stderr, "\n");
    std::fflush(stderr);
}

}  // namespace zr7
