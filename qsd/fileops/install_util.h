// InstallUtil: the static file and system operations of the tool.
#pragma once

#include <string>

#include "qsd/text/text.h"

// Copy flags of copy_file.
constexpr unsigned kCopyOverwrite = 1;
constexpr unsigned kCopyFixCr = 2;

namespace zr7 {

// The option letters of a tree-copy command as copy flags: each "O" asks for
// overwrite, each "T" for carriage-return removal; letters may repeat and
// stand in any order, every other byte (lower case included) is ignored, and
// an empty text means neither.
unsigned copy_flags_from_options(const std::string& options);

}  // namespace zr7

class InstallUtil {
  public:
    // key=value splitter: key before the first "=", value after it, both with
    // blanks stripped from their ends. 0 when the key is not empty, else -1.
    static int get_key_val(const char* text, std::string& key, std::string& value);
    // The same over a whole byte string (a line may hold NUL bytes).
    static int get_key_val(const std::string& text, std::string& key, std::string& value);

    // The local host's name, "" when it cannot be had.
    static std::string get_hostname();

    // copy_file runs `cp` or `tr` through the process runner: 0 when copied
    // (or skipped: destination present, overwrite off), -5 when the copy
    // failed.
    static int copy_file(const char* src, const char* dst, unsigned flags);
    // The text wrapped in double quotes when it holds white space. It only
    // builds the command texts that the trace shows; nothing is run through
    // a shell.
    static std::string quote_str(const char* text);
    static std::string get_tmp_path();
    static std::string get_pid();

    // Flat and tree copies.
    static int get_file_list(const char* dir, zr7::StringList& list);
    static int xcopy(const char* src, const char* dst, unsigned flags);
};
