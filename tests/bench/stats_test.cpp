#include "bench/run/stats.h"

#include <gtest/gtest.h>

namespace zr7bench {
namespace {

TEST(Summarize, MedianMinMax) {
    struct Case {
        std::vector<double> values;
        double median, min, max;
    };
    const Case cases[] = {
        {{3.0}, 3.0, 3.0, 3.0},
        {{5.0, 1.0, 3.0}, 3.0, 1.0, 5.0},
        {{4.0, 1.0, 3.0, 2.0}, 2.5, 1.0, 4.0},
        {{9.0, 1.0, 1.0, 1.0, 8.0}, 1.0, 1.0, 9.0},
    };
    for (const Case& c : cases) {
        const Summary s = summarize(c.values);
        EXPECT_EQ(s.count, c.values.size());
        EXPECT_DOUBLE_EQ(s.median, c.median);
        EXPECT_DOUBLE_EQ(s.min, c.min);
        EXPECT_DOUBLE_EQ(s.max, c.max);
    }
}

TEST(Summarize, NothingGivesZeros) {
    const Summary s = summarize({});
    EXPECT_EQ(s.count, 0u);
    EXPECT_EQ(s.median, 0.0);
    EXPECT_EQ(spread_percent(s), 0.0);
}

TEST(SpreadPercent, RangeOverMedian) {
    EXPECT_DOUBLE_EQ(spread_percent(summarize({9.0, 10.0, 11.0})), 20.0);
    EXPECT_DOUBLE_EQ(spread_percent(summarize({2.0, 2.0})), 0.0);
}

}  // namespace
}  // namespace zr7bench
