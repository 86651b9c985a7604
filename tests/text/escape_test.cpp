// The escaping of log lines, over every byte value.
#include <gtest/gtest.h>

#include <cstdio>
#include <string>

#include "qsd/text/escape.h"

namespace {

// What each byte becomes on its own, and the same byte between two letters.
TEST(EscapeControls, EveryByteValue) {
    for (int b = 0; b < 256; ++b) {
        const std::string byte(1, static_cast<char>(b));
        std::string expected;
        if (b == '\r') {
            expected = "\\r";
        } else if (b == '\n') {
            expected = "\\n";
        } else if (b == '\t') {
            expected = "\\t";
        } else if (b == '\\') {
            expected = "\\\\";
        } else if (b < 0x20 || b == 0x7f) {
            char hex[8];
            std::snprintf(hex, sizeof hex, "\\x%02x", b);
            expected = hex;
        } else {
            expected = byte;  // printable ASCII and every byte from 0x80 up
        }
        EXPECT_EQ(zr7::escape_controls(byte), expected) << "byte " << b;
        EXPECT_EQ(zr7::escape_controls("a" + byte + "z"), "a" + expected + "z") << "byte " << b;
        EXPECT_EQ(zr7::is_control_byte(static_cast<char>(b)), b < 0x20 || b == 0x7f) << b;
        // The result never holds a byte that ends a line or starts a terminal command.
        EXPECT_FALSE(zr7::has_control_byte(zr7::escape_controls(byte))) << "byte " << b;
        // And the escapes read back: "\x41" stays four bytes, "\\" one.
        std::string back;
        const std::string text = "C:\\x41" + byte + "\\";
        EXPECT_TRUE(zr7::unescape_controls(zr7::escape_controls(text), back) && back == text) << b;
    }
}

}  // namespace
