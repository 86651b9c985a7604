// The targets judged from the measurements, and what the page shows.
#include "bench/run/report.h"

#include <gtest/gtest.h>

namespace zr7bench {
namespace {

ContestantRun runs(char id, std::vector<double> walls, double tool_cpu = -1, double rss = -1,
                   int exit_code = 0) {
    ContestantRun run;
    run.id = id;
    for (double w : walls) {
        Sample s;
        s.wall_s = w;
        s.cpu_s = w / 2;
        s.tool_cpu_s = tool_cpu;
        s.tool_rss_mib = rss;
        s.exit_code = exit_code;
        run.samples.push_back(s);
    }
    return run;
}

SizeRun size(const std::string& name, double a, double b, std::size_t copies, double tool_cpu,
             double rss) {
    SizeRun s;
    s.name = name;
    s.work.file_copies = copies;
    s.a = runs('A', {a, a * 1.1, a * 0.9}, tool_cpu, rss);
    s.b = runs('B', {b, b, b});
    s.c = runs('C', {0.5, 0.5, 0.5});
    s.differences = 0;
    return s;
}

Report sample_report(double a_default, double a_large, double tool_cpu, double rss) {
    Report r;
    r.rounds = 3;
    r.sizes = {size("default", a_default, 20.0, 6000, tool_cpu, 3.0),
               size("large", a_large, 80.0, 24000, tool_cpu * 4, rss)};
    RobustRun deep;
    deep.name = "deep";
    deep.exit_code = 0;
    deep.expected = deep.found = 200;
    RobustRun wide;
    wide.name = "wide";
    wide.exit_code = 0;
    wide.expected = 40000;
    wide.found = 39999;
    r.robust = {deep, wide};
    return r;
}

TEST(CheckTargets, JudgesEachTargetAtItsLimit) {
    struct Case {
        double a_default, a_large, tool_cpu, rss;
        std::vector<bool> holds;  // ratio, cpu, memory, linear, deep, wide
    };
    const Case cases[] = {
        {12.0, 48.0, 0.59, 15.9, {true, true, true, true, true, false}},
        {12.1, 48.0, 0.6, 15.9, {false, true, true, true, true, false}},
        {12.0, 52.9, 0.61, 16.0, {true, false, false, false, true, false}},
    };
    for (const Case& c : cases) {
        const std::vector<TargetCheck> checks =
            check_targets(sample_report(c.a_default, c.a_large, c.tool_cpu, c.rss));
        ASSERT_EQ(checks.size(), c.holds.size());
        for (std::size_t i = 0; i < checks.size(); ++i)
            EXPECT_EQ(checks[i].holds, c.holds[i])
                << checks[i].target << ": " << checks[i].measured;
    }
}

TEST(CheckTargets, MissingOrFailedMeasurementsHoldNothing) {
    Report r = sample_report(10.0, 40.0, 0.1, 4.0);
    r.sizes[0].a = runs('A', {10.0, 10.0}, 0.1, 4.0, 251);
    r.sizes.pop_back();
    r.robust.clear();
    for (const TargetCheck& check : check_targets(r)) {
        EXPECT_FALSE(check.holds) << check.target;
        EXPECT_EQ(check.measured, "not measured") << check.target;
    }
}

TEST(RenderMarkdown, ShowsFiguresFailuresAndTargets) {
    Report r = sample_report(10.0, 40.0, 0.1, 4.0);
    r.machine.cores = 2;
    r.sizes[1].b = runs('B', {80.0}, -1, -1, 1);
    const std::string page = render_markdown(r);
    EXPECT_NE(page.find("| default | A tool | 10.00 | 9.00–11.00 (20%) | 600 |"), std::string::npos)
        << page;
    EXPECT_NE(page.find("| large | B shell way | FAILED (exit 1) 80.00"), std::string::npos);
    EXPECT_NE(page.find("| a directory of 20,000 files installs without error | exit 0, 39999 "
                        "of 40000 files installed | NO |"),
              std::string::npos);
    EXPECT_NE(page.find("2 cores"), std::string::npos);
    // The linear-cost line sets the wall ratio beside the CPU and shell-way
    // ratios; the shell way failed on large, so its ratio is 0.
    EXPECT_NE(page.find("| 4.00 (CPU 4.00, shell way 0.00; the copies grow 4.00 times) | yes |"),
              std::string::npos)
        << page;
}

}  // namespace
}  // namespace zr7bench
