// Trace lines put together from a kept head and a reused buffer: each line
// still whole and exact, a long one included, and a forked child naming its
// own process.
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <regex>
#include <sstream>
#include <string>
#include <vector>

#include "qsd/platform/trace.h"
#include "support/test_support.h"

namespace {

std::vector<std::string> lines_of(const std::string& text) {
    std::vector<std::string> lines;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);)
        lines.push_back(line);
    return lines;
}

void detail_line(const char* text) {
    ZR7_TRACED("TraceCache::op");
    ZR7_DETAIL("%s", text);
}

TEST(TraceLineCacheTest, EveryLineWholeWithItsOwnMessage) {
    zr7::trace_reconfigure("ERROR (UNIT:zr7 ALL)");
    const std::string long_text(3000, 'x');
    testing::internal::CaptureStdout();
    detail_line("first");
    detail_line(long_text.c_str());
    detail_line("");
    detail_line("last");
    const std::vector<std::string> lines = lines_of(testing::internal::GetCapturedStdout());
    ASSERT_EQ(lines.size(), 4u);
    const std::regex shape(
        R"(\(\d{4}-\d\d-\d\d \d\d:\d\d:\d\d pid (\d+) zr7\.TraceCache::op:\d+\) (.*))");
    const std::string expected[] = {"first", long_text, "", "last"};
    for (std::size_t i = 0; i < lines.size(); ++i) {
        std::smatch m;
        ASSERT_TRUE(std::regex_match(lines[i], m, shape)) << lines[i].substr(0, 80);
        EXPECT_EQ(m[1].str(), std::to_string(::getpid()));
        EXPECT_EQ(m[2].str(), expected[i]);
    }
}

TEST(TraceLineCacheTest, ForkedChildNamesItsOwnProcess) {
    zr7::trace_reconfigure("ERROR (UNIT:zr7 ALL)");
    testing::internal::CaptureStdout();
    detail_line("parent");  // the parent's id is now kept
    std::fflush(stdout);
    const pid_t child = ::fork();
    if (child == 0) {
        detail_line("child");
        std::fflush(stdout);
        ::_exit(0);
    }
    int status = 0;
    ::waitpid(child, &status, 0);
    const std::vector<std::string> lines = lines_of(testing::internal::GetCapturedStdout());
    ASSERT_EQ(lines.size(), 2u);
    EXPECT_NE(lines[0].find(" pid " + std::to_string(::getpid()) + " "), std::string::npos);
    EXPECT_NE(lines[1].find(" pid " + std::to_string(child) + " "), std::string::npos) << lines[1];
}

}  // namespace
