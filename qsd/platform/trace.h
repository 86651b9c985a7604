// Trace and environment services.
//
// Every traced operation owns one static unit record. The record caches the
// flags word that the trace setting gives its unit, and refreshes it only when
// the program-wide sync counter has moved, so a disabled class costs one
// comparison and no formatting.
//
// The setting comes from VXA_TRC1, read once when the first unit asks:
//   class words, then groups "(UNIT:prefix words)".
// Words, in any case: ERROR, DETAIL, FLOW, ALL, NONE; others are ignored.
// The words before the groups apply to every unit, a group to the units whose
// name begins with its prefix (case-insensitive). Unset or empty: ERROR.
//
// Trace lines go to standard output, one flushed line each:
//   (2026-12-06 18:30:32 pid 4242 zr7.main:120) message
// In the message every byte below 0x20, 0x7f and the backslash are written
// as escapes (qsd/text/escape.h), so that a name cannot break a line of the
// log or send a terminal a command.
#pragma once

#include <string>
#include <vector>

constexpr unsigned TRC1_FLOW = 0x40;
constexpr unsigned TRC1_DETAIL = 0x10;
constexpr unsigned TRC1_ERROR = 0x80;
constexpr unsigned TRC1_ALL = TRC1_FLOW | TRC1_DETAIL | TRC1_ERROR;

// Event kinds of TRC1_Event.
constexpr int TRC1_ENTRY = 0;
constexpr int TRC1_EXIT_STATUS = 1;
constexpr int TRC1_EXIT = 2;

struct TRC1_Unit {
    const char* name;  // begins with "zr7"
    int line;          // where the operation begins
    unsigned flags;    // cached flags word
    unsigned sync;     // sync counter the cache was taken at; 0 = never
};

unsigned TRC1_Sync(TRC1_Unit* unit);
void TRC1_Event(TRC1_Unit* unit, int line, int kind, int status = 0);
void TRC1_Printf(TRC1_Unit* unit, int line, const char* format, ...)
    __attribute__((format(printf, 3, 4)));
// An error-class line: as TRC1_Printf, and when errors are echoed (see
// zr7::trace_echo_errors) a message beginning with "Error:" also goes to
// standard error, escaped the same way.
void TRC1_Error(TRC1_Unit* unit, int line, const char* format, ...)
    __attribute__((format(printf, 3, 4)));

// Returns the variable's value or null. The second argument is unused.
const char* PLT1_GetEnv(const char* name, const char* unused);
// Takes one whole "NAME=value" entry and copies it into the environment, so
// it outlives the caller's text. Returns 0, or -1 for an entry without a name.
int PLT1_PutEnv(const char* entry);

namespace zr7 {

// Flags word that a setting gives a unit name; the parser behind VXA_TRC1.
unsigned trace_flags_for(const std::string& setting, const std::string& unit_name);

// Replaces the setting read from VXA_TRC1 (tests, and nothing else). Moves
// the sync counter so every unit refreshes its cache.
void trace_reconfigure(const std::string& setting);

// Writes a message that is already a whole text (it may hold NUL bytes,
// which a format would cut short); `error` as for TRC1_Error.
void trace_text(TRC1_Unit* unit, int line, bool error, const std::string& message);

// The installing run turns this on: its standard error is the first
// invocation's, where the administrator or a script looks for failures.
void trace_echo_errors(bool on);

// A preview prints its plan on standard output: no trace line goes there
// (errors are still echoed and collected).
void trace_quiet(bool on);

// Every error line that begins with "Error:" is also appended, unescaped, to
// `lines` until this is called with null: the run's record lists them.
void trace_collect_errors(std::vector<std::string>* lines);

// The program-wide sync counter; starts at 1, so a fresh record (0) syncs.
extern unsigned g_trace_sync;

// Flags word of a unit, through its cache.
inline unsigned trace_flags(TRC1_Unit& unit) {
    return unit.sync == g_trace_sync ? unit.flags : TRC1_Sync(&unit);
}

// Entry and exit events of one operation call.
class TraceScope {
  public:
    TraceScope(TRC1_Unit& unit, int line, bool flow_events);
    ~TraceScope();
    TraceScope(const TraceScope&) = delete;
    TraceScope& operator=(const TraceScope&) = delete;

    bool detail() const { return (flags_ & TRC1_DETAIL) != 0; }
    bool error() const { return (flags_ & TRC1_ERROR) != 0; }
    // Writes the exit event with the status and hands the status back.
    int exit(int line, int status);

  private:
    TRC1_Unit& unit_;
    unsigned flags_;
    bool flow_;
    bool exited_ = false;
};

}  // namespace zr7

// An operation that writes entry and exit events.
#define ZR7_OPERATION(name)                                   \
    static TRC1_Unit zr7_unit{"zr7." name, __LINE__, 0u, 0u}; \
    zr7::TraceScope zr7_trace(zr7_unit, __LINE__, true)
// An operation that writes trace lines but no entry or exit events.
#define ZR7_TRACED(name)                                      \
    static TRC1_Unit zr7_unit{"zr7." name, __LINE__, 0u, 0u}; \
    zr7::TraceScope zr7_trace(zr7_unit, __LINE__, false)
#define ZR7_DETAIL(...)                                    \
    do {                                                   \
        if (zr7_trace.detail()) {                          \
            TRC1_Printf(&zr7_unit, __LINE__, __VA_ARGS__); \
        }                                                  \
    } while (0)
#define ZR7_ERROR(...)                                    \
    do {                                                  \
        if (zr7_trace.error()) {                          \
            TRC1_Error(&zr7_unit, __LINE__, __VA_ARGS__); \
        }                                                 \
    } while (0)
// An error line from a whole text.
#define ZR7_ERROR_TEXT(message)                                    \
    do {                                                           \
        if (zr7_trace.error()) {                                   \
            zr7::trace_text(&zr7_unit, __LINE__, true, (message)); \
        }                                                          \
    } while (0)
#define ZR7_RETURN(status) return zr7_trace.exit(__LINE__, (status))
