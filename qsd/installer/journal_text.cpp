#include "qsd/installer/journal_text.h"

#include <cinttypes>
#include <cstdio>

#include "qsd/platform/fs.h"
#include "qsd/text/escape.h"

namespace zr7 {

namespace {

std::string digest_text(const ContentDigest& digest) {
    char text[64];
    std::snprintf(text, sizeof text, "%" PRIx64 ":%" PRIx64 ":%" PRIx64, digest.size, digest.first,
                  digest.second);
    return text;
}

bool parse_digest(const std::string& text, ContentDigest& out) {
    std::uint64_t parts[3] = {0, 0, 0};
    std::size_t part = 0;
    std::size_t digits = 0;
    for (char c : text) {
        if (c == ':') {
            if (digits == 0 || ++part == 3)
                return false;
            digits = 0;
            continue;
        }
        const int value = c >= '0' && c <= '9' ? c - '0' : c >= 'a' && c <= 'f' ? c - 'a' + 10 : -1;
        if (value < 0 || ++digits > 16)
            return false;
        parts[part] = parts[part] * 16 + static_cast<std::uint64_t>(value);
    }
    if (part != 2 || digits == 0)
        return false;
    out = ContentDigest{parts[0], parts[1], parts[2]};
    return true;
}

bool safe_relative(const std::string& path) {
    if (path.empty() || path[0] == '/')
        return false;
    for (const std::string& part : fs::split_path(path)) {
        if (part == "..")
            return false;
    }
    return true;
}

}  // namespace

std::string journal_line(const JournalEntry& entry) {
    std::string line = entry.kind + " ";
    if (entry.kind == "replace")
        line += (entry.kept.empty() ? "-" : entry.kept) + " ";
    else if (entry.kind == "installed")
        line += digest_text(entry.digest) + " ";
    return line + escape_controls(entry.path) + "\n";
}

std::vector<JournalEntry> parse_journal(const std::string& text) {
    std::vector<JournalEntry> entries;
    std::size_t start = 0;
    for (std::size_t end; (end = text.find('\n', start)) != std::string::npos; start = end + 1) {
        const std::string line = text.substr(start, end - start);
        JournalEntry entry;
        std::size_t blank = line.find(' ');
        if (blank == std::string::npos)
            continue;
        entry.kind = line.substr(0, blank);
        std::string rest = line.substr(blank + 1);
        if (entry.kind == "replace" || entry.kind == "installed") {
            blank = rest.find(' ');
            if (blank == std::string::npos)
                continue;
            const std::string field = rest.substr(0, blank);
            rest = rest.substr(blank + 1);
            if (entry.kind == "installed" && !parse_digest(field, entry.digest))
                continue;
            if (entry.kind == "replace")
                entry.kept = field == "-" ? "" : field;
        } else if (entry.kind != "mkdir" && entry.kind != "create" && entry.kind != "backup" &&
                   entry.kind != "seed") {
            continue;
        }
        if (!unescape_controls(rest, entry.path) || !safe_relative(entry.path))
            continue;
        entries.push_back(entry);
    }
    return entries;
}

}  // namespace zr7
