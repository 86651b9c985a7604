// What a benchmark run measured, the targets checked against it, and the
// markdown page that records both.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "bench/gen/image_plan.h"
#include "bench/run/stats.h"

namespace zr7bench {

struct Sample {
    double wall_s = 0;
    double cpu_s = 0;          // every process of the contestant, children included
    double tool_cpu_s = -1;    // the tool's own processes only; -1 when not measured
    double tool_rss_mib = -1;  // the larger peak of the tool's processes; -1 when not measured
    int exit_code = 0;
};

struct ContestantRun {
    char id = '?';  // 'A' the tool, 'B' the shell way, 'C' the floor, 'D' the design's floor
    std::vector<Sample> samples;

    bool all_succeeded() const;
    Summary wall() const;
    Summary cpu() const;
    Summary tool_cpu() const;     // over the samples that have it
    double peak_rss_mib() const;  // the largest of all samples, -1 when none has it
};

// One round of the journal's test: A on a home that already holds every
// file of the image with other bytes, so that it replaces them all (and
// keeps each old version in its journal), then the undo of that run.
struct ReplaceRun {
    std::size_t files_prepared = 0;  // files written into the home beforehand
    Sample install;                  // A there
    long files_copied = -1;          // from the log's closing line; -1 when it was not read
    double journal_s = -1;           // the same; -1 when it was not read
    Sample undo;                     // `zr7inst -u -h HOME`
    // Files whose bytes after the undo differ from those before A, or that
    // one of the two walks lacks; -1 when not compared.
    long undo_differences = -1;
    std::string first_undo_difference;

    bool journal_read() const { return install.exit_code == 0 && journal_s >= 0; }
    bool home_given_back() const { return undo.exit_code == 0 && undo_differences == 0; }
};

struct SizeRun {
    std::string name;
    std::size_t image_files = 0;
    std::uint64_t image_bytes = 0;
    WorkCount work;
    ContestantRun a{'A', {}}, b{'B', {}}, c{'C', {}}, d{'D', {}};
    ContestantRun preview{'P', {}};  // `zr7inst -n` on the fresh home A then installs into
    std::vector<ReplaceRun> replace;
    // Files whose installed bytes differ between the tool and the shell way
    // after their first round; -1 when they could not be compared.
    long differences = -1;
    std::string first_difference;
    // The same between the tool and D's replay of its programs.
    long d_differences = -1;
    std::string first_d_difference;
};

struct RobustRun {
    std::string name;  // "deep", "wide"
    std::string what;  // what the image holds
    int exit_code = -1;
    std::size_t expected = 0;  // files that must arrive
    std::size_t found = 0;     // files that arrived with the right bytes
    Sample sample;
};

struct Machine {
    unsigned cores = 0;
    std::string cpu;
    double memory_gib = 0;
    std::string kernel;
    std::string date;  // UTC
    double load_start[3] = {0, 0, 0};
    double load_end[3] = {0, 0, 0};
};

struct Report {
    Machine machine;
    int rounds = 0;
    std::string command;   // the runner's command line
    std::string work_dir;  // where images and homes were written, with its file system
    std::vector<std::string> contestant_commands;
    std::vector<SizeRun> sizes;
    std::vector<RobustRun> robust;
    std::string plot_file;  // "" when no plot was made
};

struct TargetCheck {
    std::string target;
    std::string measured;  // "not measured" when the run lacks the data
    bool holds = false;
};

std::vector<TargetCheck> check_targets(const Report& report);
std::string render_markdown(const Report& report);

}  // namespace zr7bench
