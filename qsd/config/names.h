// Which names read from kmsenv may become directory names.
#pragma once

#include <string>

namespace zr7 {

// Whether a name from kmsenv can name one directory under the home: not
// "." or "..", no "/" and no control byte (below 0x20, or 0x7f; a NUL is
// one). Such a name would reach outside its directory, name another one, or
// break a line of the log. The empty name is judged by the caller.
bool is_safe_directory_name(const std::string& name);

}  // namespace zr7
