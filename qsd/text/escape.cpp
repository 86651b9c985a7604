#include "qsd/text/escape.h"

namespace zr7 {

std::string escape_controls(const std::string& text) {
    static const char kHex[] = "0123456789abcdef";
    std::string out;
    out.reserve(text.size());
    for (char c : text) {
        if (c == '\\') {
            out += "\\\\";
        } else if (c == '\r') {
            out += "\\r";
        } else if (c == '\n') {
            out += "\\n";
        } else if (c == '\t') {
            out += "\\t";
        } else if (is_control_byte(c)) {
            const unsigned char u = static_cast<unsigned char>(c);
            out += "\\x";
            out += kHex[u >> 4];
            out += kHex[u & 0x0f];
        } else {
            out += c;
        }
    }
    return out;
}

bool has_control_byte(const std::string& text) {
    for (char c : text) {
        if (is_control_byte(c))
            return true;
    }
    return false;
}

}  // namespace zr7
