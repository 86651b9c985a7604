#include "qsd/envfile/kds_run_list.h"

#include <algorithm>

namespace zr7 {

KdsRunUpdate update_kds_run_line(const std::string& line, const std::string& module_name) {
    KdsRunUpdate update;
    update.line = line;

    // Trailing white space goes, a carriage return included: the new line
    // ends with a newline only.
    const std::string work = rstrip_space(line);
    update.details.push_back("old KDS_RUN <" + work + ">");
    const std::size_t eq = work.find('=');
    if (eq == std::string::npos)
        return update;
    const std::string list_value = work.substr(eq + 1);

    // Runs of ";" give no empty piece, but a piece of blanks gives an empty
    // name, which is added like any other.
    StringList pending;
    Tokenizer modules(module_name);
    for (std::string piece = modules.next(";"); !piece.empty(); piece = modules.next(";"))
        pending.push_back(strip(piece));

    // Each listed entry cancels at most one pending name; empty positions in
    // the list are not entries and do not call for a ";".
    unsigned entries = 0;
    Tokenizer listed(list_value);
    for (std::string piece = listed.next(";"); !piece.empty(); piece = listed.next(";")) {
        const std::string entry = strip(piece);
        if (entry.empty())
            continue;
        ++entries;
        auto found = std::find(pending.begin(), pending.end(), entry);
        if (found != pending.end()) {
            pending.erase(found);
            update.details.push_back("<" + entry + "> is already part of KDS_RUN");
        }
    }

    if (pending.empty()) {
        update.details.push_back("KDS_RUN unchanged");
        return update;
    }

    std::string new_line = "KDS_RUN=" + list_value;
    for (const std::string& name : pending) {
        if (entries > 0)
            new_line += ';';
        new_line += name;
        ++entries;
    }
    update.details.push_back("new KDS_RUN <" + new_line + ">");
    update.line = new_line + "\n";
    update.result = 1;
    return update;
}

}  // namespace zr7
