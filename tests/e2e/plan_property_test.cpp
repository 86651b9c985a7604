// The preview tells the truth: on homes and images drawn from a fixed seed,
// the preview changes nothing, the run's manifest holds the preview's lines,
// and the tree before and after the run differs exactly where the plan says.
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <map>
#include <random>
#include <regex>
#include <set>
#include <sstream>

#include "e2e/e2e.h"

namespace zr7test {
namespace {

namespace fs = std::filesystem;

struct Entry {
    std::string kind;  // "dir", "file", "link"
    std::string bytes;
    unsigned mode = 0;
    long long mtime_ns = 0;
    bool operator==(const Entry& o) const {
        return kind == o.kind && bytes == o.bytes && mode == o.mode && mtime_ns == o.mtime_ns;
    }
};

// Every entry below `root` but the run's records and logs, the backups, and
// the stand-in loader's catalog.
std::map<std::string, Entry> snapshot(const std::string& root) {
    std::map<std::string, Entry> tree;
    for (const auto& e : fs::recursive_directory_iterator(root)) {
        const std::string path = e.path().string();
        if (is_run_record(path) || path.find("/.archive") != std::string::npos ||
            path.find("/logs/") != std::string::npos || ends_with(path, "/qdsload.catalog"))
            continue;
        struct stat st {};
        ::lstat(path.c_str(), &st);
        Entry entry;
        entry.kind = S_ISDIR(st.st_mode) ? "dir" : S_ISLNK(st.st_mode) ? "link" : "file";
        if (S_ISREG(st.st_mode))
            entry.bytes = read_file(path);
        entry.mode = st.st_mode;
        entry.mtime_ns =
            static_cast<long long>(st.st_mtim.tv_sec) * 1000000000 + st.st_mtim.tv_nsec;
        tree[path] = entry;
    }
    return tree;
}

// A home and an image drawn from `random`: the sample with files taken away
// and added, destination files already there with the same bytes, other
// bytes or read-only, directories missing, text with CRLF line ends, SQL
// files of every kind; one home in ten fails a check.
void draw(SampleInstall& s, std::mt19937& random) {
    const auto pick = [&](int n) { return static_cast<int>(random() % static_cast<unsigned>(n)); };
    const std::string m = s.image + "/MSRV/", a = m + "lx8266/";
    const char* const dirs[] = {"ATTRLIB", "RKDSCATL", "TECLIB"};
    const char* const trees[] = {
        "TABLE", "TABLE_PRESERVE", "TABLE_TXT", "TABLE_PRESERVE_TXT", "lib", "bin"};
    const auto put = [](const std::string& path, const std::string& bytes, unsigned mode = 0644) {
        make_dirs(path.substr(0, path.rfind('/')));
        write_file(path, bytes, mode);
    };
    const auto content = [&] {
        std::string text;
        for (int i = pick(4); i >= 0; --i)
            text += "line " + std::to_string(pick(3)) + (pick(2) == 0 ? "\r\n" : "\n");
        return text;
    };
    for (int i = pick(4); i > 0; --i)
        put(m + dirs[pick(3)] + "/f" + std::to_string(i) + ".txt", content());
    for (int i = pick(5); i > 0; --i) {
        const char* const names[] = {"x.sql", "y_del.sql", "notes.txt", "Z.SQL", "w_DEL.Sql"};
        put(m + "SQLLIB/" + std::to_string(i) + names[pick(5)], "SELECT 1;\n");
    }
    for (int i = pick(6); i > 0; --i) {
        const std::string sub = pick(3) == 0 ? "/new" + std::to_string(pick(2)) + "/" : "/";
        put(a + trees[pick(6)] + sub + "t" + std::to_string(i), content());
    }
    if (pick(4) == 0)
        remove_tree(a + "TABLE/sub");
    // What the home holds already, for each image file: nothing, the same
    // bytes, other bytes, other bytes read-only.
    const std::string t = s.tables() + "/";
    for (const auto& e : fs::recursive_directory_iterator(m)) {
        if (!e.is_regular_file())
            continue;
        std::string relative = e.path().string().substr(m.size());
        std::string target;
        for (const char* dir : dirs) {
            if (relative.rfind(std::string(dir) + "/", 0) == 0)
                target = t + relative;
        }
        for (const char* tree : trees) {
            const std::string prefix = std::string("lx8266/") + tree + "/";
            if (relative.rfind(prefix, 0) == 0) {
                const std::string rest = relative.substr(prefix.size());
                target = (std::string(tree) == "lib" || std::string(tree) == "bin")
                             ? s.home + "/lx8266/ms/" + tree + "/" + rest
                             : t + rest;
            }
        }
        if (target.empty() || !fs::is_directory(target.substr(0, target.rfind('/'))))
            continue;
        switch (pick(4)) {
            case 1:
                write_file(target, read_file(e.path().string()));
                break;
            case 2:
                write_file(target, "older bytes\n");
                break;
            case 3:
                write_file(target, "older bytes\n", 0444);
                break;
            default:
                break;
        }
    }
    switch (pick(10)) {
        case 0:  // a destination directory missing
            remove_tree(t + "RKDSCATL");
            break;
        case 1:  // an image entry that cannot be copied
            ::mkfifo((a + "TABLE/pipe").c_str(), 0644);
            break;
        default:
            break;
    }
}

std::string last_line(const std::string& text) {
    const std::size_t end = text.size() - 1;
    return text.substr(text.rfind('\n', end - 1) + 1);
}

TEST(Plan, PreviewChangesNothingAndTheRunDoesWhatItSaid) {
    std::mt19937 random(20261207);
    const std::regex stamp("VXAENV_[0-9]+");
    for (int round = 0; round < 200; ++round) {
        SampleInstall s;
        draw(s, random);
        const auto before = snapshot(s.root.path());
        const std::vector<std::string> flags = {"-m", "kzr", "-c",
                                                "K" + std::to_string(round % 3) + "=v"};
        std::vector<std::string> args = {"-n", "-h", s.home};
        args.insert(args.end(), flags.begin(), flags.end());
        args.push_back(s.image);
        const RunResult preview = tool(args);
        ASSERT_TRUE(snapshot(s.root.path()) == before) << round;
        ASSERT_EQ(last_line(preview.out).rfind("summary: ", 0), 0u) << preview.out;

        const RunResult run = install(s, flags);
        EXPECT_EQ(run.exit_code, preview.exit_code) << round << "\n" << preview.out << run.err;
        const std::string record = read_file(s.home + "/logs/qsdinst.json");
        std::smatch found;
        ASSERT_TRUE(std::regex_search(record, found, std::regex("\"manifest\":\"([^\"]*)\"")));
        const std::string manifest = read_file(found[1]);
        EXPECT_EQ(std::regex_replace(manifest, stamp, "VXAENV_#"),
                  std::regex_replace(preview.out, stamp, "VXAENV_#"))
            << round;

        // Where the tree changed, and how, against the plan's lines.
        std::map<std::string, std::set<std::string>> said;  // path -> actions
        std::istringstream lines(manifest);
        for (std::string line; std::getline(lines, line);) {
            const std::size_t blank = line.find(' ');
            if (line.rfind("  ", 0) != 0 && blank != std::string::npos)
                said[line.substr(blank + 1)].insert(line.substr(0, blank));
        }
        const auto after = snapshot(s.root.path());
        const auto has = [&](const std::string& path, const char* action) {
            return said.count(path) != 0 && said[path].count(action) != 0;
        };
        for (const auto& [path, entry] : after) {
            const auto old = before.find(path);
            if (old == before.end()) {
                EXPECT_TRUE(has(path, entry.kind == "dir" ? "mkdir" : "create")) << path;
            } else if (entry.kind == "file" && entry.bytes != old->second.bytes) {
                EXPECT_TRUE(has(path, "replace") || has(path, "vxaenv")) << path;
            }
        }
        for (const auto& [path, actions] : said) {
            const auto old = before.find(path);
            const auto now = after.find(path);
            if (actions.count("mkdir") || actions.count("create")) {
                EXPECT_TRUE(old == before.end() && now != after.end()) << path;
            } else if (actions.count("replace")) {
                EXPECT_TRUE(old != before.end() && now != after.end()) << path;
            } else if (actions.count("same") || actions.count("keep")) {
                EXPECT_TRUE(old != before.end() && now != after.end() &&
                            now->second.bytes == old->second.bytes)
                    << path;
            }
        }
    }
}

}  // namespace
}  // namespace zr7test
