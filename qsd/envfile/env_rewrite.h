// The rewrite of the environment file's text: the requested settings and
// module names applied to it, nothing else touched. Pure: the caller reads
// and writes the file.
#pragma once

#include <functional>
#include <string>

#include "qsd/text/dictionary.h"
#include "qsd/text/text.h"

namespace zr7 {

// How one KDS_RUN line is updated: 1 with the replacement line in `out`, or 0.
using KdsRunStep = std::function<int(const std::string& line, std::string& out)>;
// Receives each detail line as it arises.
using DetailSink = std::function<void(const std::string& detail)>;

// Rewrites `content` into `out` and tells whether anything changed.
// Lines are whole and may hold any byte. Each setting applies to the first
// line whose upper-cased key matches it and is then removed from `settings`;
// settings that match no line are appended at the end and stay in the table.
// KDS_RUN lines go to `kds_run` (and never to the settings) when a module
// was requested.
bool rewrite_env_content(const std::string& content, Dictionary& settings, bool module_requested,
                         const KdsRunStep& kds_run, const DetailSink& detail, std::string& out);

struct EnvRewrite {
    std::string content;
    bool changed = false;
    StringList details;  // every detail line, those of the module list included
};

// The same with the module-list core for KDS_RUN lines.
EnvRewrite rewrite_env_content(const std::string& content, Dictionary& settings,
                               const std::string& module_name);

}  // namespace zr7
