#include "qsd/driver/getopt.h"

#include <cstring>

char GetOpt::next() {
    argument = nullptr;
    fault.clear();
    if (index >= argc)
        return 0;
    const char* a = argv[index];
    if (a[0] != '-')
        return 0;
    if (a[1] == '\0' || (a[1] == '-' && a[2] == '\0')) {
        ++index;
        return 0;
    }
    if (a[1] == '-') {
        argument = a + 2;
        ++index;
        return '-';
    }
    const char letter = a[1];
    const char* letter_entry = letter == ':' ? nullptr : std::strchr(option_string, letter);
    if (letter_entry == nullptr) {
        fault = std::string("unknown option -") + letter;
        return '?';
    }
    if (letter_entry[1] == ':') {
        if (a[2] != '\0') {
            argument = a + 2;
        } else {
            ++index;
            if (index >= argc) {
                fault = std::string("option -") + letter + " needs an argument";
                return '?';
            }
            argument = argv[index];
        }
    }
    ++index;
    return letter;
}
