// The module run list: the KDS_RUN line of the environment file names the
// modules the server starts, separated by ";". Adding modules never reorders
// or cleans what is already listed.
#pragma once

#include <string>

#include "qsd/text/text.h"

namespace zr7 {

struct KdsRunUpdate {
    int result = 0;      // 1 when the line changes, 0 when it stays
    std::string line;    // the replacement line (newline-ended) on 1, the line as given on 0
    StringList details;  // detail lines, in the order they arise
};

// Appends to a KDS_RUN line (as read, newline included) each module of
// `module_name` (";"-separated) that the line does not list yet. Names
// match byte for byte. Pure: no trace, no file.
KdsRunUpdate update_kds_run_line(const std::string& line, const std::string& module_name);

}  // namespace zr7
