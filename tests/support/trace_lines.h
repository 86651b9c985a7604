// Checks on captured standard output that hold whatever the trace prefix
// looks like: a trace line ends with its message, so the tests look at line
// ends only.
#pragma once

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace zr7test {

// The lines of a text, each without its "\n".
std::vector<std::string> lines_of(const std::string& text);

// How many lines end with the message.
int count_lines_ending(const std::string& text, const std::string& message);

// Success when the text has exactly as many lines as `messages`, and line i
// ends with messages[i].
::testing::AssertionResult lines_end_with(const std::string& text,
                                          const std::vector<std::string>& messages);

}  // namespace zr7test
