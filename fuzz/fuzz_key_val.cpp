// The key=value splitter over any text: a key only when there is one, never
// with blanks at its ends or an "=" in it, and the same answer from the
// byte-string and the C-string forms up to a NUL byte.
#include <cstring>

#include "fuzz_support.h"
#include "qsd/fileops/install_util.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    std::string key;
    std::string value;
    const int rc = InstallUtil::get_key_val(text, key, value);
    ZR7_FUZZ_CHECK(rc == 0 || rc == -1);
    if (rc == 0) {
        ZR7_FUZZ_CHECK(!key.empty() && key.find('=') == std::string::npos);
        ZR7_FUZZ_CHECK(key.front() != ' ' && key.back() != ' ');
        ZR7_FUZZ_CHECK(value.empty() || (value.front() != ' ' && value.back() != ' '));
        ZR7_FUZZ_CHECK(text.find('=') != std::string::npos && text.find('=') > 0);
        ZR7_FUZZ_CHECK(key.size() + value.size() < text.size());
    } else {
        ZR7_FUZZ_CHECK(key.empty());
    }

    const std::string c_text = text.substr(0, std::strlen(text.c_str()));
    std::string c_key;
    std::string c_value;
    const int c_rc = InstallUtil::get_key_val(c_text.c_str(), c_key, c_value);
    std::string s_key;
    std::string s_value;
    ZR7_FUZZ_CHECK(c_rc == InstallUtil::get_key_val(c_text, s_key, s_value));
    ZR7_FUZZ_CHECK(c_key == s_key && c_value == s_value);
    return 0;
}
