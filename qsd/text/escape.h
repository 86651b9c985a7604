// Escaping of bytes that would break a line of the log or reach a terminal
// as a command.
#pragma once

#include <string>

namespace zr7 {

// The text with every byte below 0x20, the byte 0x7f and the backslash
// written as an escape: "\r", "\n", "\t", "\\", and "\xNN" (two lower-case
// hex digits) for the others. Every other byte stays as it is, so a text
// without such bytes comes back unchanged and the result is one line.
std::string escape_controls(const std::string& text);

// The bytes an escaped text stands for: the inverse of escape_controls.
// False for a text that escape_controls cannot have written.
bool unescape_controls(const std::string& text, std::string& out);

// True for a byte below 0x20 or 0x7f.
inline bool is_control_byte(char c) {
    const unsigned char u = static_cast<unsigned char>(c);
    return u < 0x20 || u == 0x7f;
}

// True when the text holds a control byte.
bool has_control_byte(const std::string& text);

}  // namespace zr7
