// The server and architecture names that may name a directory.
#include <gtest/gtest.h>

#include <string>

#include "qsd/config/kmsenv_reader.h"

namespace {

using namespace std::string_literals;

TEST(SafeDirectoryName, RefusesWhatLeavesItsDirectoryOrBreaksALine) {
    const std::pair<std::string, bool> cases[] = {
        {"SRV1", true},  {"", true},      {"lx8266", true}, {"a.b", true},       {"...", true},
        {".x", true},    {"x..", true},   {"a b", true},    {"é\xff\x80", true}, {"a\\b", true},
        {"~", true},     {"-x", true},    {".", false},     {"..", false},       {"../x", false},
        {"a/b", false},  {"/", false},    {"x/", false},    {"SRV1\0x"s, false}, {"\0"s, false},
        {"a\nb", false}, {"a\rb", false}, {"a\tb", false},  {"\x1b[31m", false}, {"x\x7f", false},
        {"\x1f", false}, {"\x01", false}, {"x\x20y", true}};
    for (const auto& [name, safe] : cases)
        EXPECT_EQ(zr7::is_safe_directory_name(name), safe) << testing::PrintToString(name);
}

// Every byte alone and inside a name: only "/" and the control bytes are refused.
TEST(SafeDirectoryName, EveryByte) {
    for (int b = 0; b < 256; ++b) {
        const char c = static_cast<char>(b);
        const bool safe = b != '/' && b >= 0x20 && b != 0x7f;
        EXPECT_EQ(zr7::is_safe_directory_name("a" + std::string(1, c) + "b"), safe) << b;
        EXPECT_EQ(zr7::is_safe_directory_name(std::string(1, c)), safe && b != '.') << b;
    }
}

}  // namespace
