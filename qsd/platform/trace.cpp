#include "qsd/platform/trace.h"

#include <pthread.h>
#include <unistd.h>

#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <string>
#include <vector>

#include "qsd/text/escape.h"
#include "qsd/text/text.h"

namespace zr7 {

unsigned g_trace_sync = 1;

namespace {

struct TraceSetting {
    bool loaded = false;
    std::string text;
};

TraceSetting& setting() {
    static TraceSetting instance;
    return instance;
}

// Applies one word to a flags word; unknown words change nothing.
unsigned apply_word(unsigned flags, const std::string& word) {
    const std::string w = to_upper_c(word);
    if (w == "ERROR")
        return flags | TRC1_ERROR;
    if (w == "DETAIL")
        return flags | TRC1_DETAIL;
    if (w == "FLOW")
        return flags | TRC1_FLOW;
    if (w == "ALL")
        return flags | TRC1_ALL;
    if (w == "NONE")
        return 0;
    return flags;
}

bool has_prefix_nocase(const std::string& name, const std::string& prefix) {
    return name.size() >= prefix.size() &&
           to_lower_c(name.substr(0, prefix.size())) == to_lower_c(prefix);
}

}  // namespace

unsigned trace_flags_for(const std::string& text, const std::string& unit_name) {
    const std::string blanks = " \t\r\n";
    // A setting of white space alone counts as an empty one.
    if (text.find_first_not_of(blanks) == std::string::npos)
        return TRC1_ERROR;
    unsigned flags = 0;
    std::size_t pos = 0;
    while (pos < text.size()) {
        pos = text.find_first_not_of(blanks, pos);
        if (pos == std::string::npos)
            break;
        if (text[pos] == '(') {
            // A group: "(UNIT:prefix words)", or up to the end of the text.
            std::size_t close = text.find(')', pos);
            std::string group = text.substr(
                pos + 1, close == std::string::npos ? std::string::npos : close - pos - 1);
            pos = close == std::string::npos ? text.size() : close + 1;
            Tokenizer words(group);
            std::string head = words.next(" \t\r\n");
            if (to_upper_c(head.substr(0, 5)) != "UNIT:")
                continue;
            if (!has_prefix_nocase(unit_name, head.substr(5)))
                continue;
            for (std::string w = words.next(" \t\r\n"); !w.empty(); w = words.next(" \t\r\n")) {
                flags = apply_word(flags, w);
            }
            continue;
        }
        std::size_t end = text.find_first_of(blanks + "(", pos);
        if (end == std::string::npos)
            end = text.size();
        flags = apply_word(flags, text.substr(pos, end - pos));
        pos = end;
    }
    return flags;
}

void trace_reconfigure(const std::string& text) {
    setting().loaded = true;
    setting().text = text;
    ++g_trace_sync;
    if (g_trace_sync == 0)
        g_trace_sync = 1;
}

TraceScope::TraceScope(TRC1_Unit& unit, int line, bool flow_events)
    : unit_(unit), flags_(trace_flags(unit)), flow_(flow_events && (flags_ & TRC1_FLOW) != 0) {
    if (flow_)
        TRC1_Event(&unit_, line, TRC1_ENTRY);
}

TraceScope::~TraceScope() {
    if (flow_ && !exited_)
        TRC1_Event(&unit_, unit_.line, TRC1_EXIT);
}

int TraceScope::exit(int line, int status) {
    if (flow_ && !exited_)
        TRC1_Event(&unit_, line, TRC1_EXIT_STATUS, status);
    exited_ = true;
    return status;
}

namespace {

// The process id, asked once; a forked child asks again.
long g_pid = 0;

void forget_pid() {
    g_pid = 0;
}

long current_pid() {
    if (g_pid == 0) {
        static const bool registered = ::pthread_atfork(nullptr, nullptr, forget_pid) == 0;
        (void)registered;
        g_pid = static_cast<long>(::getpid());
    }
    return g_pid;
}

bool g_echo_errors = false;
bool g_quiet = false;
std::vector<std::string>* g_error_lines = nullptr;

// Whether a byte must be escaped in a line of the log.
bool needs_escape(char c) {
    return c == '\\' || is_control_byte(c);
}

// The message as one line: a name with a line break cannot forge another
// line of the log, and no byte reaches a terminal as a command. Most
// messages hold no such byte and are appended as they are.
void append_escaped(std::string& out, const char* message, std::size_t length) {
    for (std::size_t i = 0; i < length; ++i) {
        if (needs_escape(message[i])) {
            out += escape_controls(std::string(message, length));
            return;
        }
    }
    out.append(message, length);
}

// With every class on, the installing run writes some ten lines for each
// file it copies. The head of a line, "(2026-12-06 18:30:32 pid 4242 ",
// changes at most once a second, so it is kept and made again only when the
// second (or the process) has changed, and the line is put together in one
// reused buffer and handed to the stream whole: one write per line, flushed
// at once, so that it stays in order with what the programs the tool starts
// write to the same file.
void write_line(const TRC1_Unit* unit, int line, const char* message, std::size_t length) {
    static std::time_t head_second = -1;
    static long head_pid = -1;
    static std::string head;
    static std::string out;
    const std::time_t now = std::time(nullptr);
    const long pid = current_pid();
    if (now != head_second || pid != head_pid) {
        char stamp[32] = "";
        struct tm parts {};
        if (localtime_r(&now, &parts) != nullptr)
            std::strftime(stamp, sizeof stamp, "%Y-%m-%d %H:%M:%S", &parts);
        head = std::string("(") + stamp + " pid " + std::to_string(pid) + " ";
        head_second = now;
        head_pid = pid;
    }
    char number[16];
    const int digits = std::snprintf(number, sizeof number, ":%d) ", line);
    out.assign(head);
    out += unit->name;
    out.append(number, digits > 0 ? static_cast<std::size_t>(digits) : 0);
    append_escaped(out, message, length);
    out += '\n';
    if (g_quiet)
        return;
    std::fwrite(out.data(), 1, out.size(), stdout);
    std::fflush(stdout);
}

void write_line(const TRC1_Unit* unit, int line, const std::string& message) {
    write_line(unit, line, message.data(), message.size());
}

// An error line of the installing run also goes to standard error, which is
// the first invocation's, so whoever started the tool sees why it failed.
void echo_error(const char* message, std::size_t length) {
    static const char kMark[] = "Error:";
    if (length < sizeof kMark - 1 || std::string(message, sizeof kMark - 1) != kMark)
        return;
    if (g_error_lines != nullptr)
        g_error_lines->emplace_back(message, length);
    if (!g_echo_errors)
        return;
    std::string out;
    append_escaped(out, message, length);
    out += '\n';
    std::fflush(stdout);
    std::fwrite(out.data(), 1, out.size(), stderr);
    std::fflush(stderr);
}

// Formats a trace message and writes it, and echoes it when it is an error.
void write_formatted(TRC1_Unit* unit, int line, bool error, const char* format, va_list args) {
    // Formatted once into a buffer on the stack; only a longer line is
    // formatted a second time, into one of its size.
    char buffer[1024];
    va_list again;
    va_copy(again, args);
    const int size = std::vsnprintf(buffer, sizeof buffer, format, args);
    if (size <= 0) {
        write_line(unit, line, "", 0);
    } else if (static_cast<std::size_t>(size) < sizeof buffer) {
        write_line(unit, line, buffer, static_cast<std::size_t>(size));
        if (error)
            echo_error(buffer, static_cast<std::size_t>(size));
    } else {
        std::vector<char> larger(static_cast<std::size_t>(size) + 1);
        std::vsnprintf(larger.data(), larger.size(), format, again);
        write_line(unit, line, larger.data(), static_cast<std::size_t>(size));
        if (error)
            echo_error(larger.data(), static_cast<std::size_t>(size));
    }
    va_end(again);
}

}  // namespace

}  // namespace zr7

unsigned TRC1_Sync(TRC1_Unit* unit) {
    auto& s = zr7::setting();
    if (!s.loaded) {
        const char* value = std::getenv("VXA_TRC1");
        s.text = value == nullptr ? "" : value;
        s.loaded = true;
    }
    unit->flags = zr7::trace_flags_for(s.text, unit->name);
    unit->sync = zr7::g_trace_sync;
    return unit->flags;
}

void TRC1_Event(TRC1_Unit* unit, int line, int kind, int status) {
    if ((zr7::trace_flags(*unit) & TRC1_FLOW) == 0)
        return;
    switch (kind) {
        case TRC1_ENTRY:
            zr7::write_line(unit, line, "Entry");
            break;
        case TRC1_EXIT_STATUS:
            zr7::write_line(unit, line, "Exit: " + std::to_string(status));
            break;
        default:
            zr7::write_line(unit, line, "Exit");
            break;
    }
}

void TRC1_Printf(TRC1_Unit* unit, int line, const char* format, ...) {
    va_list args;
    va_start(args, format);
    zr7::write_formatted(unit, line, false, format, args);
    va_end(args);
}

void TRC1_Error(TRC1_Unit* unit, int line, const char* format, ...) {
    va_list args;
    va_start(args, format);
    zr7::write_formatted(unit, line, true, format, args);
    va_end(args);
}

namespace zr7 {

void trace_text(TRC1_Unit* unit, int line, bool error, const std::string& message) {
    write_line(unit, line, message);
    if (error)
        echo_error(message.data(), message.size());
}

void trace_echo_errors(bool on) {
    g_echo_errors = on;
}

void trace_quiet(bool on) {
    g_quiet = on;
}

void trace_collect_errors(std::vector<std::string>* lines) {
    g_error_lines = lines;
}

}  // namespace zr7

const char* PLT1_GetEnv(const char* name, const char* /*unused*/) {
    return name == nullptr ? nullptr : std::getenv(name);
}

int PLT1_PutEnv(const char* entry) {
    if (entry == nullptr)
        return -1;
    std::string text(entry);
    std::size_t eq = text.find('=');
    if (eq == std::string::npos || eq == 0)
        return -1;
    return setenv(text.substr(0, eq).c_str(), text.c_str() + eq + 1, 1) == 0 ? 0 : -1;
}
