#include "qsd/driver/progress.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <cstdio>

#include "qsd/installer/simple_command.h"

namespace zr7 {

namespace {

// A command's source without its leading symbol directories:
// "${SRCPATH}/${BINARCH}/TABLE/TECLIB" shows as "TABLE/TECLIB".
std::string short_source(const std::string& source_template) {
    std::string text = source_template;
    while (text.compare(0, 2, "${") == 0) {
        const std::size_t slash = text.find('/');
        if (slash == std::string::npos)
            break;
        text.erase(0, slash + 1);
    }
    return text;
}

std::string command_text(const ProgressState& state) {
    const std::string what = short_source(state.source_template);
    switch (state.kind) {
        case kFlatCopy:
            return "copy " + what;
        case kTreeCopy:
            return "copy tree " + what;
        case kUpdateEnv:
            return "update VXAENV";
        case kSeed:
            return "seed " + what;
        default:
            return what;
    }
}

std::string position(const ProgressState& state) {
    return "[" + std::to_string(state.command) + "/" + std::to_string(state.commands) + "]";
}

// The first `columns` characters of a terminal-safe text.
std::string first_columns(const std::string& text, std::size_t columns) {
    std::size_t seen = 0;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if ((static_cast<unsigned char>(text[i]) & 0xC0) != 0x80) {
            if (seen == columns)
                return text.substr(0, i);
            ++seen;
        }
    }
    return text;
}

std::size_t terminal_width() {
    struct winsize size {};
    if (::ioctl(STDERR_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 1)
        return size.ws_col;
    return 80;
}

}  // namespace

std::string terminal_safe(const std::string& text) {
    std::string out;
    out.reserve(text.size());
    std::size_t i = 0;
    while (i < text.size()) {
        std::size_t length = 0;
        const long code = utf8_code_at(text, i, length);
        const bool printable = code >= 0x20 && code != 0x7F && !(code >= 0x80 && code < 0xA0);
        if (printable) {
            out.append(text, i, length);
            i += length;
        } else {
            out += '?';
            ++i;
        }
    }
    return out;
}

std::size_t display_width(const std::string& text) {
    std::size_t columns = 0;
    for (char byte : text) {
        if ((static_cast<unsigned char>(byte) & 0xC0) != 0x80)
            ++columns;
    }
    return columns;
}

std::string progress_line(const ProgressState& state, std::size_t width) {
    std::string line = position(state) + " " + command_text(state) +
                       " | files: " + std::to_string(state.files_copied) + " copied, " +
                       std::to_string(state.files_seeded) + " seeded";
    if (!state.seeding.empty())
        line += " | seeding " + state.seeding;
    line = terminal_safe(line);
    const std::size_t room = width > 1 ? width - 1 : 0;
    if (display_width(line) > room)
        line = room > 3 ? first_columns(line, room - 3) + "..." : first_columns(line, room);
    return line;
}

std::string elapsed_text(double seconds) {
    char text[32];
    std::snprintf(text, sizeof text, "%.3f", seconds < 0 ? 0.0 : seconds);
    return text;
}

std::string progress_summary(const ProgressState& state, int status, const std::string& log_file,
                             double elapsed_seconds) {
    std::string text;
    if (status == 0) {
        text = "zr7inst: installation done\n";
    } else {
        text = "zr7inst: installation failed with rc <" + std::to_string(status) + ">";
        if (state.command > 0)
            text += " at " + position(state) + " " + terminal_safe(command_text(state));
        text += "\n";
    }
    text += "  files copied: " + std::to_string(state.files_copied) + "\n";
    text += "  files seeded: " + std::to_string(state.files_seeded) + "\n";
    if (!state.env_reported) {
        text += "  VXAENV: not updated\n";
    } else if (!state.env_changed) {
        text += "  VXAENV: unchanged\n";
    } else if (state.backup.empty()) {
        text += "  VXAENV: changed\n";
    } else {
        text += "  VXAENV: changed, backup " + terminal_safe(state.backup) + "\n";
    }
    if (!state.counts.empty())
        text += "  actions: " + state.counts + "\n";
    text += "  log: " + terminal_safe(log_file) + "\n";
    text += "  elapsed: " + elapsed_text(elapsed_seconds) + " s\n";
    return text;
}

bool progress_wanted(bool stderr_is_terminal, bool stdout_is_terminal) {
    return stderr_is_terminal && !stdout_is_terminal;
}

void ProgressDisplay::redraw() {
    if (!shown_)
        return;
    const std::string line = progress_line(run_, terminal_width());
    if (line == drawn_)
        return;
    const std::size_t width = display_width(line);
    std::string text = "\r" + line;
    if (width < drawn_width_)
        text.append(drawn_width_ - width, ' ');
    std::fputs(text.c_str(), stderr);
    std::fflush(stderr);
    drawn_ = line;
    drawn_width_ = width;
}

void ProgressDisplay::on_command(int index, int count, CommandKind kind,
                                 const std::string& source_template) {
    run_.command = index;
    run_.commands = count;
    run_.kind = kind;
    run_.source_template = source_template;
    run_.seeding.clear();
    redraw();
}

// A copy spawns a program; writing one short line to the terminal costs far
// less, so the count is shown for every file.
void ProgressDisplay::on_action(Action action, const std::string& path,
                                const std::string& /*diff*/) {
    switch (action) {
        case Action::kCreate:
        case Action::kReplace:
        case Action::kSame:
            ++run_.files_copied;
            break;
        case Action::kSeed:
            ++run_.files_seeded;
            break;
        case Action::kBackup:
            run_.backup = path;
            break;
        default:
            break;
    }
    run_.seeding.clear();
    redraw();
}

void ProgressDisplay::on_seeding(const std::string& file_name) {
    run_.seeding = file_name;
    redraw();
}

void ProgressDisplay::on_env_result(bool changed) {
    run_.env_reported = true;
    run_.env_changed = changed;
}

void ProgressDisplay::finish(int status, const std::string& counts, const std::string& log_file,
                             double elapsed_seconds) {
    run_.counts = counts;
    if (!shown_)
        return;
    std::string text;
    if (drawn_width_ > 0)
        text = "\r" + std::string(drawn_width_, ' ') + "\r";
    text += progress_summary(run_, status, log_file, elapsed_seconds);
    std::fputs(text.c_str(), stderr);
    std::fflush(stderr);
    drawn_.clear();
    drawn_width_ = 0;
}

}  // namespace zr7
