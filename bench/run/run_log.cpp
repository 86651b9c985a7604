#include "bench/run/run_log.h"

#include <cstdlib>

namespace zr7bench {

namespace {

constexpr const char* kClosing = "zr7inst run ends: ";

// The number after "<key> " in a field of the line: the field starts the
// text or follows ", " or the line's ": ", so that a key inside another
// word is passed over. False when the key is missing or no number follows.
bool field(const std::string& line, const std::string& key, double& value) {
    std::size_t at = 0;
    for (;;) {
        at = line.find(key + " ", at);
        if (at == std::string::npos)
            return false;
        const bool starts_field =
            at == 0 ||
            (at >= 2 && (line.compare(at - 2, 2, ", ") == 0 || line.compare(at - 2, 2, ": ") == 0));
        if (starts_field)
            break;
        at += key.size();
    }
    const char* start = line.c_str() + at + key.size() + 1;
    char* end = nullptr;
    value = std::strtod(start, &end);
    return end != start && (*end == '\0' || *end == ',' || *end == ' ');
}

}  // namespace

RunEnd last_run_end(const std::string& log_text) {
    RunEnd end;
    const std::size_t at = log_text.rfind(kClosing);
    if (at == std::string::npos)
        return end;
    const std::size_t stop = log_text.find('\n', at);
    const std::string line =
        log_text.substr(at, stop == std::string::npos ? std::string::npos : stop - at);
    double rc = 0, copied = 0;
    if (!field(line, "rc", rc) || !field(line, "files copied", copied) ||
        !field(line, "elapsed", end.elapsed_s) || !field(line, "journal", end.journal_s)) {
        return end;
    }
    end.rc = static_cast<int>(rc);
    end.files_copied = static_cast<long>(copied);
    end.found = true;
    return end;
}

}  // namespace zr7bench
