#include "qsd/text/plan.h"

#include <algorithm>
#include <vector>

#include "qsd/text/escape.h"

namespace zr7 {

namespace {

const char* const kNames[kActionCount] = {
    "mkdir", "create",  "replace", "same",  "keep",   "vxaenv",   "backup", "seed",
    "pass",  "restore", "remove",  "rmdir", "seeded", "conflict", "error",
};

const Action kInstallActions[] = {Action::kMkdir, Action::kCreate, Action::kReplace, Action::kSame,
                                  Action::kKeep,  Action::kVxaenv, Action::kBackup,  Action::kSeed,
                                  Action::kPass,  Action::kError};
const Action kUndoActions[] = {Action::kRestore,  Action::kRemove, Action::kRmdir,
                               Action::kVxaenv,   Action::kBackup, Action::kSeeded,
                               Action::kConflict, Action::kError};

// A diff line's text: control bytes but the tab escaped, so that a carriage
// return or an escape sequence in the file stays visible and harmless.
std::string diff_text(const std::string& line) {
    std::string out;
    for (char c : line) {
        if (c == '\t')
            out += c;
        else
            out += escape_controls(std::string(1, c));
    }
    return out;
}

struct Edit {
    char mark;         // ' ', '-' or '+'
    std::size_t line;  // index into the old lines for ' ' and '-', the new ones for '+'
};

// Beyond this many differing lines the diff stops looking for the shortest
// script and shows the differing middle as removed and added whole: the
// search costs time and memory that grow with the square of the differences.
constexpr long kMaxEdits = 1000;

// The shortest edit script between the middle parts that differ (Myers'
// greedy search, which costs little when few lines differ, as in the files a
// run rewrites). The common head and tail are cut off first.
std::vector<Edit> edit_script(const StringList& a, const StringList& b) {
    std::size_t head = 0;
    while (head < a.size() && head < b.size() && a[head] == b[head])
        ++head;
    std::size_t tail = 0;
    while (tail < a.size() - head && tail < b.size() - head &&
           a[a.size() - 1 - tail] == b[b.size() - 1 - tail]) {
        ++tail;
    }
    const long n = static_cast<long>(a.size() - head - tail);
    const long m = static_cast<long>(b.size() - head - tail);
    const auto same = [&](long x, long y) {
        return a[head + static_cast<std::size_t>(x)] == b[head + static_cast<std::size_t>(y)];
    };
    std::vector<Edit> middle;  // built backwards
    const long offset = std::min(n + m, kMaxEdits) + 1;
    std::vector<long> v(static_cast<std::size_t>(2 * offset + 1), 0);
    std::vector<std::vector<long>> trace;
    bool found = false;
    for (long d = 0; d <= std::min(n + m, kMaxEdits) && !found; ++d) {
        trace.push_back(v);
        for (long k = -d; k <= d; k += 2) {
            const auto at = [&](long diagonal) {
                return static_cast<std::size_t>(diagonal + offset);
            };
            long x = (k == -d || (k != d && v[at(k - 1)] < v[at(k + 1)])) ? v[at(k + 1)]
                                                                          : v[at(k - 1)] + 1;
            long y = x - k;
            while (x < n && y < m && same(x, y)) {
                ++x;
                ++y;
            }
            v[at(k)] = x;
            if (x >= n && y >= m) {
                found = true;
                break;
            }
        }
    }
    if (found) {
        long x = n;
        long y = m;
        for (long d = static_cast<long>(trace.size()) - 1; d >= 0; --d) {
            const std::vector<long>& before = trace[static_cast<std::size_t>(d)];
            const auto at = [&](long diagonal) {
                return static_cast<std::size_t>(diagonal + offset);
            };
            const long k = x - y;
            const long prev_k =
                (k == -d || (k != d && before[at(k - 1)] < before[at(k + 1)])) ? k + 1 : k - 1;
            const long prev_x = d == 0 ? 0 : before[at(prev_k)];
            const long prev_y = prev_x - prev_k;
            while (x > prev_x && y > prev_y) {
                --x;
                --y;
                middle.push_back({' ', head + static_cast<std::size_t>(x)});
            }
            if (d == 0)
                break;
            if (x == prev_x)
                middle.push_back({'+', head + static_cast<std::size_t>(--y)});
            else
                middle.push_back({'-', head + static_cast<std::size_t>(--x)});
        }
    } else {
        for (long y = m; y-- > 0;)
            middle.push_back({'+', head + static_cast<std::size_t>(y)});
        for (long x = n; x-- > 0;)
            middle.push_back({'-', head + static_cast<std::size_t>(x)});
    }
    std::vector<Edit> edits;
    for (std::size_t i = 0; i < head; ++i)
        edits.push_back({' ', i});
    edits.insert(edits.end(), middle.rbegin(), middle.rend());
    for (std::size_t k = a.size() - tail; k < a.size(); ++k)
        edits.push_back({' ', k});
    return edits;
}

// "-l,s" or "+l,s" of a hunk header: one line shows its number alone, an
// empty range the number of the line before it.
std::string range(char sign, std::size_t first, std::size_t count) {
    std::string text(1, sign);
    text += std::to_string(count == 0 ? first : first + 1);
    if (count != 1)
        text += "," + std::to_string(count);
    return text;
}

void add_line(std::string& out, char mark, const std::string& line) {
    out += mark;
    const bool has_break = !line.empty() && line.back() == '\n';
    out += diff_text(has_break ? line.substr(0, line.size() - 1) : line);
    out += '\n';
    if (!has_break)
        out += "\\ No newline at end of file\n";
}

}  // namespace

const char* action_name(Action action) {
    return kNames[static_cast<std::size_t>(action)];
}

bool action_from_name(const std::string& word, Action& out) {
    for (std::size_t i = 0; i < kActionCount; ++i) {
        if (word == kNames[i]) {
            out = static_cast<Action>(i);
            return true;
        }
    }
    return false;
}

std::string plan_line(Action action, const std::string& path) {
    return std::string(action_name(action)) + " " + escape_controls(path);
}

std::string unified_diff(const std::string& before, const std::string& after,
                         const std::string& label) {
    if (before == after)
        return "";
    const StringList a = split_lines(before);
    const StringList b = split_lines(after);
    const std::vector<Edit> edits = edit_script(a, b);
    constexpr std::size_t kContext = 3;
    std::string out = "--- a/" + label + "\n+++ b/" + label + "\n";
    std::size_t k = 0;
    while (k < edits.size()) {
        // The next change, and the hunk around it: changes closer than twice
        // the context share one hunk.
        std::size_t change = k;
        while (change < edits.size() && edits[change].mark == ' ')
            ++change;
        if (change == edits.size())
            break;
        const std::size_t start = std::max(k, change >= kContext ? change - kContext : 0);
        std::size_t end = change;
        while (end < edits.size()) {
            std::size_t same = end;
            while (same < edits.size() && edits[same].mark == ' ')
                ++same;
            if (same == edits.size() || same - end > 2 * kContext) {
                end = std::min(edits.size(), end + kContext);
                break;
            }
            end = same + 1;
        }
        std::size_t old_first = 0;
        std::size_t new_first = 0;
        // Line numbers of the hunk's first line in either file.
        for (std::size_t e = 0; e < start; ++e) {
            if (edits[e].mark != '+')
                ++old_first;
            if (edits[e].mark != '-')
                ++new_first;
        }
        std::size_t old_count = 0;
        std::size_t new_count = 0;
        std::string body;
        for (std::size_t e = start; e < end; ++e) {
            const Edit& edit = edits[e];
            if (edit.mark != '+')
                ++old_count;
            if (edit.mark != '-')
                ++new_count;
            add_line(body, edit.mark, edit.mark == '+' ? b[edit.line] : a[edit.line]);
        }
        out += "@@ " + range('-', old_first, old_count) + " " + range('+', new_first, new_count) +
               " @@\n" + body;
        k = end;
    }
    return out;
}

void Plan::on_action(Action action, const std::string& path, const std::string& diff) {
    ++counts_[static_cast<std::size_t>(action)];
    text_ += plan_line(action, path);
    text_ += '\n';
    for (const std::string& line : split_lines(diff)) {
        text_ += "  ";
        text_ += line;
        if (line.back() != '\n')
            text_ += '\n';
    }
}

const Action* Plan::actions(std::size_t& n) const {
    if (kind_ == PlanKind::kUndo) {
        n = sizeof kUndoActions / sizeof kUndoActions[0];
        return kUndoActions;
    }
    n = sizeof kInstallActions / sizeof kInstallActions[0];
    return kInstallActions;
}

bool Plan::changed() const {
    const Action kChanging[] = {Action::kMkdir, Action::kCreate,  Action::kReplace, Action::kVxaenv,
                                Action::kSeed,  Action::kRestore, Action::kRemove,  Action::kRmdir};
    return std::any_of(std::begin(kChanging), std::end(kChanging),
                       [this](Action action) { return count(action) != 0; });
}

std::string Plan::summary() const {
    std::string text = "summary:";
    std::size_t n = 0;
    const Action* list = actions(n);
    for (std::size_t i = 0; i < n; ++i)
        text += " " + std::string(action_name(list[i])) + " " + std::to_string(count(list[i]));
    return text;
}

}  // namespace zr7
