#include "bench/run/report.h"

#include <cstdio>

namespace zr7bench {

bool ContestantRun::all_succeeded() const {
    if (samples.empty())
        return false;
    for (const Sample& s : samples) {
        if (s.exit_code != 0)
            return false;
    }
    return true;
}

Summary ContestantRun::wall() const {
    std::vector<double> v;
    for (const Sample& s : samples)
        v.push_back(s.wall_s);
    return summarize(v);
}

Summary ContestantRun::cpu() const {
    std::vector<double> v;
    for (const Sample& s : samples)
        v.push_back(s.cpu_s);
    return summarize(v);
}

Summary ContestantRun::tool_cpu() const {
    std::vector<double> v;
    for (const Sample& s : samples) {
        if (s.tool_cpu_s >= 0)
            v.push_back(s.tool_cpu_s);
    }
    return summarize(v);
}

double ContestantRun::peak_rss_mib() const {
    double peak = -1;
    for (const Sample& s : samples) {
        if (s.tool_rss_mib > peak)
            peak = s.tool_rss_mib;
    }
    return peak;
}

namespace {

std::string format(const char* fmt, double a, double b = 0, double c = 0) {
    char buffer[160];
    std::snprintf(buffer, sizeof buffer, fmt, a, b, c);
    return buffer;
}

const SizeRun* find_size(const Report& report, const std::string& name) {
    for (const SizeRun& size : report.sizes) {
        if (size.name == name)
            return &size;
    }
    return nullptr;
}

const char* const kNotMeasured = "not measured";

TargetCheck ratio_to_shell(const Report& report) {
    TargetCheck check{"A at most 0.6 x B on the default size", kNotMeasured, false};
    const SizeRun* size = find_size(report, "default");
    if (size == nullptr || !size->a.all_succeeded() || !size->b.all_succeeded())
        return check;
    const double ratio = size->a.wall().median / size->b.wall().median;
    check.measured =
        format("%.2f (A %.2f s, B %.2f s)", ratio, size->a.wall().median, size->b.wall().median);
    check.holds = ratio <= 0.6;
    return check;
}

// What the tool spends beyond the programs it has to start: A against the
// same programs replayed bare, measured in the same rounds.
TargetCheck ratio_to_design_floor(const Report& report) {
    TargetCheck check{"A at most 1.15 x D on the default size", kNotMeasured, false};
    const SizeRun* size = find_size(report, "default");
    if (size == nullptr || !size->a.all_succeeded() || !size->d.all_succeeded())
        return check;
    const double ratio = size->a.wall().median / size->d.wall().median;
    check.measured =
        format("%.2f (A %.2f s, D %.2f s)", ratio, size->a.wall().median, size->d.wall().median);
    check.holds = ratio <= 1.15;
    return check;
}

TargetCheck own_cpu(const Report& report) {
    TargetCheck check{"tool's own CPU at most 5% of A's wall time (default size)", kNotMeasured,
                      false};
    const SizeRun* size = find_size(report, "default");
    if (size == nullptr || !size->a.all_succeeded() || size->a.tool_cpu().count == 0)
        return check;
    const double share = size->a.tool_cpu().median / size->a.wall().median * 100.0;
    check.measured = format("%.1f%% (%.3f s of %.2f s)", share, size->a.tool_cpu().median,
                            size->a.wall().median);
    check.holds = share <= 5.0;
    return check;
}

TargetCheck peak_memory(const Report& report) {
    TargetCheck check{"tool's peak resident memory under 16 MiB on the large size", kNotMeasured,
                      false};
    const SizeRun* size = find_size(report, "large");
    if (size == nullptr || !size->a.all_succeeded() || size->a.peak_rss_mib() < 0)
        return check;
    check.measured = format("%.1f MiB", size->a.peak_rss_mib());
    check.holds = size->a.peak_rss_mib() < 16.0;
    return check;
}

TargetCheck linear_cost(const Report& report) {
    TargetCheck check{"A on large at most 4.4 x A on default", kNotMeasured, false};
    const SizeRun* def = find_size(report, "default");
    const SizeRun* large = find_size(report, "large");
    if (def == nullptr || large == nullptr || !def->a.all_succeeded() ||
        !large->a.all_succeeded()) {
        return check;
    }
    const double ratio = large->a.wall().median / def->a.wall().median;
    const double copies =
        static_cast<double>(large->work.file_copies) / static_cast<double>(def->work.file_copies);
    // CPU time, less swayed by the other users of a shared machine, and the
    // shell way's own ratio show what the machine did to the wall times.
    const double cpu = large->a.cpu().median / def->a.cpu().median;
    const double shell = large->b.all_succeeded() && def->b.all_succeeded()
                             ? large->b.wall().median / def->b.wall().median
                             : 0;
    check.measured = format("%.2f (CPU %.2f, shell way %.2f; ", ratio, cpu, shell) +
                     format("the copies grow %.2f times)", copies);
    check.holds = ratio <= 4.4;
    return check;
}

TargetCheck robust(const Report& report, const std::string& name, const char* target) {
    TargetCheck check{target, kNotMeasured, false};
    for (const RobustRun& run : report.robust) {
        if (run.name != name)
            continue;
        char buffer[160];
        std::snprintf(buffer, sizeof buffer, "exit %d, %zu of %zu files installed", run.exit_code,
                      run.found, run.expected);
        check.measured = buffer;
        check.holds = run.exit_code == 0 && run.found == run.expected;
    }
    return check;
}

TargetCheck preview_share(const Report& report) {
    TargetCheck check{"A's preview (-n) under 5% of A's wall time on the large size", kNotMeasured,
                      false};
    const SizeRun* size = find_size(report, "large");
    if (size == nullptr || !size->a.all_succeeded() || !size->preview.all_succeeded())
        return check;
    const double share = size->preview.wall().median / size->a.wall().median * 100.0;
    check.measured = format("%.1f%% (%.2f s of %.2f s)", share, size->preview.wall().median,
                            size->a.wall().median);
    check.holds = share < 5.0;
    return check;
}

// The medians of the rounds whose journal time was read.
struct JournalFigures {
    std::size_t rounds = 0;
    double journal_s = 0;
    double install_s = 0;
};

JournalFigures journal_figures(const SizeRun& size) {
    std::vector<double> journal, install;
    for (const ReplaceRun& r : size.replace) {
        if (r.journal_read()) {
            journal.push_back(r.journal_s);
            install.push_back(r.install.wall_s);
        }
    }
    JournalFigures f;
    f.rounds = journal.size();
    f.journal_s = summarize(journal).median;
    f.install_s = summarize(install).median;
    return f;
}

TargetCheck journal_share(const Report& report) {
    TargetCheck check{
        "journal time under 3% of A's wall time on the large size, every file replaced",
        kNotMeasured, false};
    const SizeRun* size = find_size(report, "large");
    if (size == nullptr)
        return check;
    const JournalFigures f = journal_figures(*size);
    if (f.rounds == 0 || f.rounds != size->replace.size())
        return check;
    const double share = f.journal_s / f.install_s * 100.0;
    check.measured = format("%.2f%% (%.3f s of %.2f s)", share, f.journal_s, f.install_s);
    check.holds = share < 3.0;
    return check;
}

TargetCheck undo_gives_back(const Report& report) {
    TargetCheck check{"undo gives the home back", kNotMeasured, false};
    std::size_t runs = 0, given_back = 0;
    for (const SizeRun& size : report.sizes) {
        for (const ReplaceRun& r : size.replace) {
            ++runs;
            if (r.home_given_back())
                ++given_back;
        }
    }
    if (runs == 0)
        return check;
    check.measured = std::to_string(given_back) + " of " + std::to_string(runs) +
                     " undos: exit 0 and the same files and bytes as before the installation";
    check.holds = given_back == runs;
    return check;
}

std::string journal_row(const SizeRun& size) {
    std::string row = "| " + size.name + " | " + std::to_string(size.replace.size()) + " | ";
    std::vector<double> install, undo;
    long copied = -1;
    int install_code = 0, undo_code = 0;
    std::size_t given_back = 0;
    std::string difference;
    for (const ReplaceRun& r : size.replace) {
        install.push_back(r.install.wall_s);
        undo.push_back(r.undo.wall_s);
        copied = r.files_copied;
        if (r.install.exit_code != 0)
            install_code = r.install.exit_code;
        if (r.undo.exit_code != 0)
            undo_code = r.undo.exit_code;
        if (r.home_given_back())
            ++given_back;
        else if (difference.empty() && r.undo_differences > 0)
            difference = std::to_string(r.undo_differences) + " files differ, e.g. " +
                         r.first_undo_difference;
    }
    const std::size_t prepared = size.replace.empty() ? 0 : size.replace.back().files_prepared;
    row += std::to_string(prepared) + " | " + (copied < 0 ? "" : std::to_string(copied)) + " | ";
    if (install_code != 0)
        row += "FAILED (exit " + std::to_string(install_code) + ") ";
    row += format("%.2f", summarize(install).median) + " | ";
    const JournalFigures f = journal_figures(size);
    row += f.rounds == 0 ? "not read"
                         : format("%.3f (%.2f%%)", f.journal_s, f.journal_s / f.install_s * 100.0);
    row += " | " + format("%.2f", summarize(undo).median) + " | " + std::to_string(undo_code) +
           " | " + (given_back == size.replace.size() ? "yes" : "NO") +
           (difference.empty() ? "" : " (" + difference + ")") + " |\n";
    return row;
}

// The Sizes table's comparison of two contestants' installed bytes.
std::string compared(long differences, const std::string& first) {
    if (differences < 0)
        return "not compared";
    if (differences == 0)
        return "same bytes installed";
    return std::to_string(differences) + " files differ, e.g. " + first;
}

std::string seconds_cell(const Summary& s) {
    return format("%.2f", s.median);
}

std::string contestant_row(const SizeRun& size, const ContestantRun& run) {
    static const char* const kNames[] = {"A tool", "B shell way", "C floor", "D design floor",
                                         "A's preview (-n)"};
    const char* label = kNames[run.id == 'A'   ? 0
                               : run.id == 'B' ? 1
                               : run.id == 'C' ? 2
                               : run.id == 'D' ? 3
                                               : 4];
    std::string row = "| " + size.name + " | " + label + " | ";
    if (run.samples.empty())
        return row + "not run | | | | | | |\n";
    const Summary wall = run.wall();
    if (!run.all_succeeded()) {
        int code = 0;
        for (const Sample& s : run.samples) {
            if (s.exit_code != 0)
                code = s.exit_code;
        }
        row += "FAILED (exit " + std::to_string(code) + ") ";
    }
    row += seconds_cell(wall) + " | " +
           format("%.2f–%.2f (%.0f%%)", wall.min, wall.max, spread_percent(wall));
    // A preview copies nothing: no rate of copies for it.
    row += " | " + (run.id == 'P'
                        ? std::string()
                        : format("%.0f", static_cast<double>(size.work.file_copies) / wall.median));
    row += " | " + format("%.2f", run.cpu().median);
    if (run.id == 'A' && run.tool_cpu().count > 0) {
        const Summary tool = run.tool_cpu();
        row += " | " + format("%.3f (%.1f%%)", tool.median, tool.median / wall.median * 100.0);
        row += " | " + format("%.1f", run.peak_rss_mib());
    } else {
        row += " | | ";
    }
    return row + " |\n";
}

}  // namespace

std::vector<TargetCheck> check_targets(const Report& report) {
    return {ratio_to_shell(report),
            ratio_to_design_floor(report),
            own_cpu(report),
            peak_memory(report),
            linear_cost(report),
            robust(report, "deep", "a tree 200 directories deep installs without error"),
            robust(report, "wide", "a directory of 20,000 files installs without error"),
            preview_share(report),
            journal_share(report),
            undo_gives_back(report)};
}

std::string render_markdown(const Report& report) {
    const Machine& m = report.machine;
    std::string out = "# Benchmark results\n\n";
    out += "Written by `make bench` (`bench/run_main.cpp`); do not edit by hand.\n\n";
    out += "- Date: " + m.date + "\n";
    out += "- Machine: " + std::to_string(m.cores) + " cores (" + m.cpu + "), " +
           format("%.1f GiB", m.memory_gib) + " memory, Linux " + m.kernel + "\n";
    out += "- Load average at the start " +
           format("%.2f %.2f %.2f", m.load_start[0], m.load_start[1], m.load_start[2]) +
           ", at the end " + format("%.2f %.2f %.2f", m.load_end[0], m.load_end[1], m.load_end[2]) +
           " (the machine may be shared)\n";
    out += "- Rounds: " + std::to_string(report.rounds) +
           " per contestant and size; each round runs every size, the contestants in turns, each "
           "on a fresh server home\n";
    out += "- Work directory: " + report.work_dir + "\n";
    out += "- Command: `" + report.command + "`\n\n";

    out += "## Sizes\n\n";
    out +=
        "| size | image files | image MiB | file copies | new directories | loader runs | "
        "tool vs shell way | tool vs D |\n|---|---|---|---|---|---|---|---|\n";
    for (const SizeRun& size : report.sizes) {
        const std::string same = compared(size.differences, size.first_difference) + " | " +
                                 compared(size.d_differences, size.first_d_difference);
        out += "| " + size.name + " | " + std::to_string(size.image_files) + " | " +
               format("%.1f", static_cast<double>(size.image_bytes) / 1048576.0) + " | " +
               std::to_string(size.work.file_copies) + " | " +
               std::to_string(size.work.directories) + " | " +
               std::to_string(size.work.loader_runs) + " | " + same + " |\n";
    }

    out += "\n## Times\n\n";
    out +=
        "Wall times in seconds: the median, then the smallest and largest and their spread "
        "relative to the median. Copies/s is file copies over the median. CPU counts every "
        "process of the contestant; the tool's own CPU counts only its two processes (the "
        "launcher and the installing invocation), apart from the programs they start, and "
        "its peak memory is the larger of the two processes' peaks.\n\n";
    out +=
        "| size | contestant | wall median s | min–max s (spread) | copies/s | CPU s | tool's own "
        "CPU s (% of wall) | tool peak RSS MiB |\n|---|---|---|---|---|---|---|---|\n";
    for (const SizeRun& size : report.sizes) {
        out += contestant_row(size, size.a);
        out += contestant_row(size, size.b);
        out += contestant_row(size, size.c);
        out += contestant_row(size, size.d);
        out += contestant_row(size, size.preview);
    }

    out += "\n## Journal and undo\n\n";
    out +=
        "Each round, a fresh home first gets every file of the image with other bytes (C's "
        "copies, then one byte appended to each file they wrote); A installs there and replaces "
        "them, keeping each old version in its journal by a hard link, and `zr7inst -u -h HOME` "
        "then undoes that installation. The journal time is the one the log's closing line "
        "gives; the home is given back when the undo ends with 0 and every file outside "
        "`logs`, `.zr7inst`, `.archive` and `qdsload.catalog` has the bytes it had before A "
        "(the same files and directories, no more). Times are medians over the rounds.\n\n";
    out +=
        "| size | rounds | files prepared | files copied by A | A there, wall s | journal s (% of "
        "that wall) | undo wall s | undo exit | home given back |\n"
        "|---|---|---|---|---|---|---|---|---|\n";
    for (const SizeRun& size : report.sizes) {
        if (!size.replace.empty())
            out += journal_row(size);
    }

    out += "\n## Targets\n\n| target | measured | holds |\n|---|---|---|\n";
    for (const TargetCheck& check : check_targets(report))
        out += "| " + check.target + " | " + check.measured + " | " + (check.holds ? "yes" : "NO") +
               " |\n";

    if (!report.robust.empty()) {
        out +=
            "\n## Limits\n\n| image | tool exit | files installed | wall s | tool's own CPU s | "
            "tool peak RSS MiB |\n|---|---|---|---|---|---|\n";
        for (const RobustRun& run : report.robust) {
            out += "| " + run.what + " | " + std::to_string(run.exit_code) + " | " +
                   std::to_string(run.found) + " of " + std::to_string(run.expected) + " | " +
                   format("%.2f", run.sample.wall_s) + " | " +
                   format("%.3f", run.sample.tool_cpu_s) + " | " +
                   format("%.1f", run.sample.tool_rss_mib) + " |\n";
        }
    }

    out += "\n## Contestants\n\n";
    for (const std::string& line : report.contestant_commands)
        out += "- " + line + "\n";
    if (!report.plot_file.empty())
        out += "\n![wall time against file copies](" + report.plot_file + ")\n";
    return out;
}

}  // namespace zr7bench
