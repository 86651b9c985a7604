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

namespace {

int hex_digit(char c) {
    if (c >= '0' && c <= '9')
        return c - '0';
    if (c >= 'a' && c <= 'f')
        return c - 'a' + 10;
    return -1;
}

}  // namespace

bool unescape_controls(const std::string& text, std::string& out) {
    out.clear();
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (is_control_byte(text[i]))
            return false;
        if (text[i] != '\\') {
            out += text[i];
            continue;
        }
        if (++i == text.size())
            return false;
        switch (text[i]) {
            case '\\':
                out += '\\';
                break;
            case 'r':
                out += '\r';
                break;
            case 'n':
                out += '\n';
                break;
            case 't':
                out += '\t';
                break;
            case 'x': {
                const int high = i + 2 < text.size() ? hex_digit(text[i + 1]) : -1;
                const int low = high >= 0 ? hex_digit(text[i + 2]) : -1;
                if (low < 0)
                    return false;
                out += static_cast<char>(high * 16 + low);
                i += 2;
                break;
            }
            default:
                return false;
        }
    }
    return true;
}

bool has_control_byte(const std::string& text) {
    for (char c : text) {
        if (is_control_byte(c))
            return true;
    }
    return false;
}

}  // namespace zr7
