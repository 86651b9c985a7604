// The environment file rewrite over any file text, settings and module name
// (fields cut at NUL bytes: settings as key=value lines, the module name, the
// file). Nothing the request does not name changes, no line is lost, and
// every setting ends up in the file.
#include "fuzz_support.h"
#include "qsd/envfile/env_rewrite.h"
#include "qsd/fileops/install_util.h"

namespace {

bool is_setting(const std::string& line, std::string& key, std::string& value) {
    if (InstallUtil::get_key_val(line, key, value) != 0)
        return false;
    key = zr7::to_upper_c(key);
    if (!value.empty() && value.back() == '\n')
        value.pop_back();
    return true;
}

// The settings as the command line would give them: what -c accepts, and
// what the update takes (no line break in a value).
zr7::Dictionary settings_from(const std::string& block) {
    zr7::Dictionary settings;
    for (const std::string& line : zr7::split_lines(block)) {
        std::string key;
        std::string value;
        if (InstallUtil::get_key_val(zr7::strip(line, '\n', zr7::StripEnd::kTrailing), key,
                                     value) != 0)
            continue;
        key = zr7::to_upper_c(key);
        if (key != "KDS_RUN" && value.find_first_of("\r\n") == std::string::npos)
            settings.insert(key, value);
    }
    return settings;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::vector<std::string> f = zr7fuzz::fields(data, size, 3);
    const std::string& module = f[1];
    const std::string& content = f[2];
    if (module.find_first_of("\r\n") != std::string::npos)
        return 0;  // the update refuses such a module name before any rewrite
    const zr7::Dictionary requested = settings_from(f[0]);
    zr7::Dictionary settings = requested;
    const zr7::EnvRewrite r = zr7::rewrite_env_content(content, settings, module);

    if (!r.changed)
        ZR7_FUZZ_CHECK(r.content == content);
    if (requested.empty() && module.empty())
        ZR7_FUZZ_CHECK(!r.changed);

    // Line by line: each old line stays, or was a setting and was replaced;
    // a last line without newline may gain one; the rest is appended.
    const zr7::StringList in = zr7::split_lines(content);
    const zr7::StringList out = zr7::split_lines(r.content);
    ZR7_FUZZ_CHECK(out.size() >= in.size());
    for (std::size_t i = 0; i < in.size(); ++i) {
        std::string key;
        std::string value;
        const bool same = out[i] == in[i] || (i + 1 == in.size() && out[i] == in[i] + "\n");
        ZR7_FUZZ_CHECK(same || is_setting(in[i], key, value));
        if (!same && key == "KDS_RUN" && !module.empty()) {
            // The module list keeps its old text in front of what is added.
            const std::string work = zr7::rstrip_space(in[i]);
            const std::string old_list = work.substr(work.find('=') + 1);
            ZR7_FUZZ_CHECK(out[i].compare(0, 8 + old_list.size(), "KDS_RUN=" + old_list) == 0);
        }
    }
    // An empty line stands first when the file was empty or its last line,
    // without newline, was a module list that gained one.
    const bool open_end = in.empty() || in.back().back() != '\n';
    for (std::size_t i = in.size(); i < out.size(); ++i) {
        std::string key;
        std::string value;
        ZR7_FUZZ_CHECK((open_end && i == in.size() && out[i] == "\n") ||
                       (is_setting(out[i], key, value) && requested.find(key) != nullptr));
    }

    // Every setting holds its value on the first line with its key. (Blanks
    // after the value count only before a newline: a last line without one
    // that was found identical may gain a newline when settings follow.)
    for (const zr7::Dictionary::Entry& setting : requested.entries()) {
        bool found = false;
        for (const std::string& line : out) {
            std::string key;
            std::string value;
            if (is_setting(line, key, value) && key == setting.first) {
                ZR7_FUZZ_CHECK(zr7::strip(value, ' ', zr7::StripEnd::kTrailing) == setting.second);
                found = true;
                break;
            }
        }
        ZR7_FUZZ_CHECK(found);
    }
    return 0;
}
