// The server and architecture names that may name a directory.
#include <gtest/gtest.h>

#include <string>

#include "qsd/config/kmsenv_reader.h"

namespace {

using namespace std::string_literals;

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
