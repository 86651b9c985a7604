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

#include "tool/drawn_support.h"
#include "tool/tool.h"

namespace zr7test {
namespace {

namespace fs = std::filesystem;

std::string last_line(const std::string& text) {
    const std::size_t end = text.size() - 1;
    return text.substr(text.rfind('\n', end - 1) + 1);
}

TEST(Plan, PreviewChangesNothingAndTheRunDoesWhatItSaid) {
    std::mt19937 random(20261207);
    const std::regex stamp("VXAENV_[0-9]+");
    for (int round = 0; round < 200; ++round) {
        SampleInstall s;
        draw(s, random, true);
        const auto before = snapshot(s.root.path());
        const std::vector<std::string> flags = {"-m", "kzr", "-c",
                                                "K" + std::to_string(round % 3) + "=v"};
        std::vector<std::string> args = {"-n", "-h", s.home};
        args.insert(args.end(), flags.begin(), flags.end());
        args.push_back(s.image);
        const RunResult preview = tool(args);
        ASSERT_TRUE(snapshot(s.root.path()) == before) << round;  // times too
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
