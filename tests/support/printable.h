// Test-case names for parameterised tests: bytes that a test runner's name
// would mangle (control bytes, quotes, bytes above 126) written as \xNN.
#pragma once

#include <cstdio>
#include <string>

namespace zr7test {

inline std::string printable(const std::string& text) {
    std::string out;
    for (unsigned char c : text) {
        if (c < 0x20 || c > 0x7e || c == '"' || c == '\\') {
            char escaped[8];
            std::snprintf(escaped, sizeof escaped, "\\x%02X", c);
            out += escaped;
        } else {
            out += static_cast<char>(c);
        }
    }
    return out;
}

}  // namespace zr7test
