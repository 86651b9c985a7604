#include "support/trace_lines.h"

namespace zr7test {

namespace {

bool ends_with(const std::string& text, const std::string& suffix) {
    return text.size() >= suffix.size() &&
           text.compare(text.size() - suffix.size(), suffix.size(), suffix) == 0;
}

}  // namespace

std::vector<std::string> lines_of(const std::string& text) {
    std::vector<std::string> lines;
    std::size_t start = 0;
    while (start < text.size()) {
        std::size_t nl = text.find('\n', start);
        if (nl == std::string::npos)
            nl = text.size();
        lines.push_back(text.substr(start, nl - start));
        start = nl + 1;
    }
    return lines;
}

int count_lines_ending(const std::string& text, const std::string& message) {
    int count = 0;
    for (const std::string& line : lines_of(text))
        count += ends_with(line, message) ? 1 : 0;
    return count;
}

::testing::AssertionResult lines_end_with(const std::string& text,
                                          const std::vector<std::string>& messages) {
    const std::vector<std::string> lines = lines_of(text);
    if (lines.size() != messages.size()) {
        return ::testing::AssertionFailure()
               << lines.size() << " lines, expected " << messages.size() << ":\n"
               << text;
    }
    for (std::size_t i = 0; i < lines.size(); ++i) {
        if (!ends_with(lines[i], messages[i])) {
            return ::testing::AssertionFailure() << "line " << i << " <" << lines[i]
                                                 << "> does not end with <" << messages[i] << ">";
        }
    }
    return ::testing::AssertionSuccess();
}

}  // namespace zr7test
