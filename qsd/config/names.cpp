#include "qsd/config/names.h"

#include "qsd/text/escape.h"

namespace zr7 {

bool is_safe_directory_name(const std::string& name) {
    if (name == "." || name == "..")
        return false;
    for (char c : name) {
        if (c == '/' || is_control_byte(c))
            return false;
    }
    return true;
}

}  // namespace zr7
