// The first and the last line of an installing run in the log: who ran what,
// when and where, and how it ended. Both are put together here from values
// the caller gathers; the trace escapes them when it writes them.
#include <ctime>

#include "qsd/driver/driver.h"
#include "qsd/text/json.h"

namespace zr7 {

namespace {

const char* env_outcome(const ProgressState& state) {
    if (!state.env_reported)
        return "not updated";
    return state.env_changed ? "changed" : "unchanged";
}

}  // namespace

std::string run_header_line(const std::string& time_text, const std::string& user_name, long uid,
                            const std::string& cwd, int argc, char* const* argv) {
    std::string command;
    for (int i = 0; i < argc; ++i) {
        if (i > 0)
            command += ' ';
        command += argv[i];
    }
    return std::string("zr7inst ") + kVrmf + " run begins: time " + time_text + ", user " +
           user_name + "(" + std::to_string(uid) + "), cwd " + cwd + ", command " + command;
}

std::string run_closing_line(int status, const ProgressState& state, double elapsed_seconds,
                             double journal_seconds) {
    return "zr7inst run ends: rc " + std::to_string(status) + ", files copied " +
           std::to_string(state.files_copied) + ", files seeded " +
           std::to_string(state.files_seeded) + ", VXAENV " + env_outcome(state) + ", elapsed " +
           elapsed_text(elapsed_seconds) + " s, journal " + elapsed_text(journal_seconds) + " s";
}

std::string run_record_json(const RunRecord& record) {
    JsonObject counts;
    bool changed = false;
    if (record.plan != nullptr) {
        std::size_t n = 0;
        const Action* actions = record.plan->actions(n);
        for (std::size_t i = 0; i < n; ++i)
            counts.add(action_name(actions[i]), static_cast<long>(record.plan->count(actions[i])));
        changed = record.plan->changed();
    }
    JsonObject json;
    json.add("operation", record.operation).add("run", record.run);
    json.add("start", record.start).add("end", record.end).add("version", kVrmf);
    json.add("arguments", record.arguments).add("home", record.home);
    if (record.image.empty())
        json.add_null("image");
    else
        json.add("image", record.image);
    json.add("status", record.rc == 0 ? "success" : "failure");
    json.add("rc", static_cast<long>(record.rc))
        .add("exit_status", static_cast<long>(record.rc & 0xFF));
    json.add("changed", changed).add("counts", counts);
    if (record.backup.empty())
        json.add_null("backup");
    else
        json.add("backup", record.backup);
    json.add("errors", record.errors);
    if (record.operation == "undo") {
        if (record.undoes.empty())
            json.add_null("undoes");
        else
            json.add("undoes", record.undoes);
    }
    if (record.manifest.empty())
        json.add_null("manifest");
    else
        json.add("manifest", record.manifest);
    return json.text();
}

std::string iso_local_time(long seconds_since_epoch) {
    const std::time_t when = static_cast<std::time_t>(seconds_since_epoch);
    struct tm parts {};
    char text[40] = "";
    if (localtime_r(&when, &parts) != nullptr)
        std::strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%S%z", &parts);
    return text;
}

}  // namespace zr7
