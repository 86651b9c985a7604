// Summaries of repeated measurements.
#pragma once

#include <cstddef>
#include <vector>

namespace zr7bench {

struct Summary {
    std::size_t count = 0;
    double median = 0;  // the middle value; the mean of the two middle ones for an even count
    double min = 0;
    double max = 0;
};

Summary summarize(std::vector<double> values);

// (max - min) / median, in percent; 0 when the median is 0.
double spread_percent(const Summary& summary);

}  // namespace zr7bench
