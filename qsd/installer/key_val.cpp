#include "qsd/fileops/install_util.h"

int InstallUtil::get_key_val(const std::string& text, std::string& key, std::string& value) {
    key.clear();
    value.clear();
    const std::size_t eq = text.find('=');
    if (eq == std::string::npos || eq == 0)
        return -1;
    key = zr7::strip(text.substr(0, eq));
    value = zr7::strip(text.substr(eq + 1));
    return key.empty() ? -1 : 0;
}

int InstallUtil::get_key_val(const char* text, std::string& key, std::string& value) {
    if (text == nullptr) {
        key.clear();
        value.clear();
        return -1;
    }
    return get_key_val(std::string(text), key, value);
}
