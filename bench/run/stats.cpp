#include "bench/run/stats.h"

#include <algorithm>

namespace zr7bench {

Summary summarize(std::vector<double> values) {
    Summary s;
    s.count = values.size();
    if (values.empty())
        return s;
    std::sort(values.begin(), values.end());
    const std::size_t mid = values.size() / 2;
    s.median = values.size() % 2 == 1 ? values[mid] : (values[mid - 1] + values[mid]) / 2;
    s.min = values.front();
    s.max = values.back();
    return s;
}

double spread_percent(const Summary& summary) {
    return summary.median == 0 ? 0 : (summary.max - summary.min) / summary.median * 100.0;
}

}  // namespace zr7bench
