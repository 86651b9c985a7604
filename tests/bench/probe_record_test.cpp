// The probe's lines, as the preloaded library writes them.
#include "bench/run/probe_record.h"

#include <gtest/gtest.h>

namespace zr7bench {
namespace {

const char* const kInstaller =
    "zr7bench-rusage pid=42 role=installer self_us=81234 children_us=912345 maxrss_kb=3920 "
    "children_maxrss_kb=1812";
const char* const kLauncher =
    "zr7bench-rusage pid=41 role=launcher self_us=1500 children_us=999999 maxrss_kb=4100 "
    "children_maxrss_kb=3920";

TEST(ParseProbeLine, ReadsEveryField) {
    ProbeRecord r;
    ASSERT_TRUE(parse_probe_line(kInstaller, r));
    EXPECT_EQ(r.pid, 42);
    EXPECT_EQ(r.role, "installer");
    EXPECT_EQ(r.self_us, 81234);
    EXPECT_EQ(r.children_us, 912345);
    EXPECT_EQ(r.maxrss_kb, 3920);
    EXPECT_EQ(r.children_maxrss_kb, 1812);
}

TEST(ParseProbeLine, RefusesWhatIsNotAWholeProbeLine) {
    const char* const bad[] = {
        "",
        "rusage pid=1 role=x self_us=1 children_us=1 maxrss_kb=1 children_maxrss_kb=1",
        "zr7bench-rusage pid=1 role=x self_us=1 children_us=1 maxrss_kb=1",
        "zr7bench-rusage pid=1 role=x self_us=-5 children_us=1 maxrss_kb=1 children_maxrss_kb=1",
        "zr7bench-rusage pid=1 role=x self_us=12ms children_us=1 maxrss_kb=1 children_maxrss_kb=1",
        "zr7bench-rusage pid=1 role=x self_us= children_us=1 maxrss_kb=1 children_maxrss_kb=1",
        "zr7bench-rusage pid=1 role=x self_us=1 children_us=1 maxrss_kb=1 children_maxrss_kb=1 odd",
    };
    for (const char* line : bad) {
        ProbeRecord r;
        EXPECT_FALSE(parse_probe_line(line, r)) << line;
    }
}

TEST(CombineProbeLines, AddsCpuTakesLargestPeakCountsInstallers) {
    const std::string content =
        std::string(kInstaller) + "\n" + "garbage line\n" + kLauncher + "\n";
    const ToolUsage usage = combine_probe_lines(content);
    EXPECT_EQ(usage.self_us, 81234 + 1500);
    EXPECT_EQ(usage.peak_rss_kb, 4100);
    EXPECT_EQ(usage.processes, 2);
    EXPECT_EQ(usage.installers, 1);
}

TEST(CombineProbeLines, NothingWhenTheToolNeverReported) {
    const ToolUsage usage = combine_probe_lines("");
    EXPECT_EQ(usage.processes, 0);
    EXPECT_EQ(usage.installers, 0);
}

}  // namespace
}  // namespace zr7bench
