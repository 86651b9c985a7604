// The targets of the design's floor, the preview, the journal and the undo,
// checked against made-up runs, and the files a copy wrote between two walks
// of a home.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "bench/run/report.h"
#include "bench/run/tree_digest.h"

namespace {

using namespace zr7bench;

Sample sample(double wall_s, int exit_code = 0) {
    Sample s;
    s.wall_s = wall_s;
    s.exit_code = exit_code;
    return s;
}

ReplaceRun replace_run(double install_s, double journal_s, long undo_differences) {
    ReplaceRun r;
    r.install = sample(install_s);
    r.journal_s = journal_s;
    r.undo = sample(1.1);
    r.undo_differences = undo_differences;
    return r;
}

TargetCheck find_target(const Report& report, const std::string& start) {
    for (const TargetCheck& check : check_targets(report)) {
        if (check.target.compare(0, start.size(), start) == 0)
            return check;
    }
    ADD_FAILURE() << "no target " << start;
    return {};
}

Report large_run(double a_s, double preview_s, int preview_exit,
                 const std::vector<ReplaceRun>& replace) {
    Report report;
    SizeRun large;
    large.name = "large";
    large.a.samples = {sample(a_s)};
    large.preview.samples = {sample(preview_s, preview_exit)};
    large.replace = replace;
    report.sizes.push_back(large);
    return report;
}

TEST(PreviewTarget, ShareOfAsWallTime) {
    struct Case {
        double preview_s;
        int exit_code;
        const char* measured;
        bool holds;
    };
    const Case cases[] = {
        {0.54, 0, "1.3% (0.54 s of 42.20 s)", true},
        {2.2, 0, "5.2% (2.20 s of 42.20 s)", false},
        {0.54, 254, "not measured", false},
    };
    for (const Case& c : cases) {
        const TargetCheck check =
            find_target(large_run(42.2, c.preview_s, c.exit_code, {}), "A's preview");
        EXPECT_EQ(check.measured, c.measured) << c.preview_s;
        EXPECT_EQ(check.holds, c.holds) << c.preview_s;
    }
}

TEST(DesignFloorTarget, AOverDOnTheDefaultSize) {
    struct Case {
        std::vector<Sample> a;
        std::vector<Sample> d;
        const char* measured;
        bool holds;
    };
    const Case cases[] = {
        {{sample(11.5)}, {sample(10)}, "1.15 (A 11.50 s, D 10.00 s)", true},
        {{sample(11.6)}, {sample(10)}, "1.16 (A 11.60 s, D 10.00 s)", false},
        // Medians of each, taken in the same rounds.
        {{sample(9), sample(12), sample(30)},
         {sample(10), sample(11), sample(25)},
         "1.09 (A 12.00 s, D 11.00 s)",
         true},
        {{sample(11)}, {sample(10, 1)}, "not measured", false},
        {{sample(11)}, {}, "not measured", false},
    };
    for (const Case& c : cases) {
        Report report;
        SizeRun size;
        size.name = "default";
        size.a.samples = c.a;
        size.d.samples = c.d;
        report.sizes.push_back(size);
        const TargetCheck check = find_target(report, "A at most 1.15 x D");
        EXPECT_EQ(check.measured, c.measured);
        EXPECT_EQ(check.holds, c.holds) << c.measured;
    }
}

TEST(JournalTarget, MedianJournalTimeOverMedianWallTime) {
    struct Case {
        std::vector<ReplaceRun> rounds;
        const char* measured;
        bool holds;
    };
    const Case cases[] = {
        {{replace_run(38.75, 0.861, 0)}, "2.22% (0.861 s of 38.75 s)", true},
        {{replace_run(10, 0.5, 0), replace_run(20, 0.1, 0), replace_run(30, 0.9, 0)},
         "2.50% (0.500 s of 20.00 s)",
         true},
        {{replace_run(10, 0.35, 0)}, "3.50% (0.350 s of 10.00 s)", false},
        // A round whose closing line was not read leaves the target unmeasured.
        {{replace_run(10, 0.1, 0), replace_run(10, -1, 0)}, "not measured", false},
        {{}, "not measured", false},
    };
    for (const Case& c : cases) {
        const TargetCheck check = find_target(large_run(42.2, 0.5, 0, c.rounds), "journal time");
        EXPECT_EQ(check.measured, c.measured);
        EXPECT_EQ(check.holds, c.holds) << c.measured;
    }
}

TEST(UndoTarget, EveryUndoOfEverySize) {
    Report report = large_run(42.2, 0.5, 0, {replace_run(10, 0.1, 0)});
    SizeRun small;
    small.name = "small";
    small.replace = {replace_run(1, 0.01, 0)};
    report.sizes.push_back(small);
    TargetCheck check = find_target(report, "undo gives the home back");
    EXPECT_TRUE(check.holds);
    EXPECT_EQ(check.measured.compare(0, 13, "2 of 2 undos:"), 0) << check.measured;

    report.sizes.back().replace.back().undo_differences = 3;  // files left as A wrote them
    check = find_target(report, "undo gives the home back");
    EXPECT_FALSE(check.holds);
    EXPECT_EQ(check.measured.compare(0, 13, "1 of 2 undos:"), 0) << check.measured;

    report.sizes.back().replace.back().undo_differences = 0;
    report.sizes.back().replace.back().undo.exit_code = 243;  // an undo that reports conflicts
    EXPECT_FALSE(find_target(report, "undo gives the home back").holds);

    report.sizes.clear();
    EXPECT_EQ(find_target(report, "undo gives the home back").measured, "not measured");
}

TEST(WrittenFiles, NewOrChangedFilesOnly) {
    const TreeDigest before = {{"a/", 0}, {"a/same", 1}, {"a/changed", 2}, {"gone", 3}};
    const TreeDigest after = {{"a/", 0},     {"a/same", 1},  {"a/changed", 9},
                              {"a/new/", 0}, {"a/new/f", 4}, {"z", 5}};
    EXPECT_EQ(written_files(before, after),
              (std::vector<std::string>{"a/changed", "a/new/f", "z"}));
    EXPECT_TRUE(written_files(after, after).empty());
}

}  // namespace
