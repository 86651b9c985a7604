#include "qsd/envfile/env_rewrite.h"

#include "qsd/envfile/kds_run_list.h"
#include "qsd/fileops/install_util.h"

namespace zr7 {

namespace {

std::string without_newline(const std::string& value) {
    if (!value.empty() && value.back() == '\n')
        return value.substr(0, value.size() - 1);
    return value;
}

}  // namespace

bool rewrite_env_content(const std::string& content, Dictionary& settings, bool module_requested,
                         const KdsRunStep& kds_run, const DetailSink& detail, std::string& out) {
    out.clear();
    out.reserve(content.size());
    bool changed = false;
    // Whether the last line ended with a newline: the line as read, or the
    // replacement of a setting, which always has one. An empty file counts as
    // a file without it, so an appended setting starts a line of its own.
    bool ends_with_newline = false;

    for (const std::string& line : split_lines(content)) {
        std::string written = line;
        bool setting_replaced = false;
        std::string key;
        std::string value;
        if (InstallUtil::get_key_val(line, key, value) == 0) {
            key = to_upper_c(key);
            if (key == "KDS_RUN" && module_requested) {
                std::string replacement;
                if (kds_run(line, replacement) == 1) {
                    written = replacement;
                    changed = true;
                }
            } else if (const std::string* wanted =
                           settings.empty() ? nullptr : settings.find(key)) {
                // The file's value keeps blanks before its newline, so such a
                // blank makes the values differ and the line is rewritten.
                const std::string current = without_newline(value);
                if (current == *wanted) {
                    detail("Identical <" + key + "> <" + current + "> found.  No update.");
                } else {
                    detail("Replacing <" + key + "> <" + current + "> with <" + *wanted + ">");
                    written = key + "=" + *wanted + "\n";
                    setting_replaced = true;
                    changed = true;
                }
                settings.erase(key);
            }
        }
        out += written;
        // A module-list line is judged as read: when it lacked its newline
        // and settings follow, an empty line stands between them.
        ends_with_newline = setting_replaced || (!line.empty() && line.back() == '\n');
    }

    if (!settings.empty()) {
        if (!ends_with_newline)
            out += '\n';
        for (const Dictionary::Entry& entry : settings.entries()) {
            out += entry.first + "=" + entry.second + "\n";
            changed = true;
            detail("Added <" + entry.first + "> <" + entry.second + ">");
        }
    }
    return changed;
}

EnvRewrite rewrite_env_content(const std::string& content, Dictionary& settings,
                               const std::string& module_name) {
    EnvRewrite rewrite;
    StringList& details = rewrite.details;
    auto kds_run = [&](const std::string& line, std::string& replacement) {
        KdsRunUpdate update = update_kds_run_line(line, module_name);
        details.insert(details.end(), update.details.begin(), update.details.end());
        replacement = update.line;
        return update.result;
    };
    auto sink = [&](const std::string& line) { details.push_back(line); };
    rewrite.changed = rewrite_env_content(content, settings, !module_name.empty(), kds_run, sink,
                                          rewrite.content);
    return rewrite;
}

}  // namespace zr7
