// Small byte-string helpers shared by every subsystem. Case folding is the C
// locale's: only the letters a to z and A to Z change, whatever the process
// locale says.
#pragma once

#include <string>
#include <vector>

namespace zr7 {

using StringList = std::vector<std::string>;

enum class StripEnd { kLeading, kTrailing, kBoth };

// Removes every `ch` from the chosen end(s). Only that one byte is removed:
// stripping blanks leaves tabs, carriage returns and newlines alone.
std::string strip(const std::string& text, char ch = ' ', StripEnd where = StripEnd::kBoth);

std::string to_upper_c(std::string text);
std::string to_lower_c(std::string text);

// True for the C locale's white-space class: blank, \t, \n, \v, \f, \r.
inline bool is_c_space(char c) {
    return c == ' ' || c == '\t' || c == '\n' || c == '\v' || c == '\f' || c == '\r';
}

// Removes trailing C-locale white space.
std::string rstrip_space(const std::string& text);

bool ends_with(const std::string& text, const std::string& suffix);

// The code point of the well-formed UTF-8 sequence at `at`, its length in
// `length`; -1 where none starts there (a stray byte, a sequence cut short,
// an overlong form, a surrogate, a code point past the last plane).
long utf8_code_at(const std::string& text, std::size_t at, std::size_t& length);

// The directory part of a path ("." when it has none, "/" for a name right
// below the root) and its last name.
std::string dir_name(const std::string& path);
std::string base_name(const std::string& path);

// Splits a byte stream into lines, each with its "\n" kept; a last line without
// one is returned as it is. Lines are whole whatever their length.
StringList split_lines(const std::string& content);

// Walks a string; each call skips a run of delimiters and returns the next
// maximal run of other bytes, or "" at the end. After a piece the position
// stands on the delimiter that ended it, so the next call may use another set.
class Tokenizer {
  public:
    explicit Tokenizer(const std::string& text) : text_(text) {}
    std::string next(const std::string& delimiters = " \t\n");
    std::size_t position() const { return pos_; }

  private:
    const std::string& text_;
    std::size_t pos_ = 0;
};

}  // namespace zr7
