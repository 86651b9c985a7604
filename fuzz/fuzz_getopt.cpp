// The option parser over any argument vector (arguments cut at NUL bytes):
// it always ends, never reads past the vector, returns only known letters
// (or '-' for a long option, '?' with its reason), and gives an argument
// exactly to the letters that take one. The whole-line check names a reason
// exactly when it refuses the line.
#include <cstring>

#include "fuzz_support.h"
#include "qsd/driver/driver.h"
#include "qsd/driver/getopt.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    std::vector<std::string> args = zr7fuzz::fields(data, size, 12);
    while (!args.empty() && args.back().empty())
        args.pop_back();
    args.insert(args.begin(), "zr7inst");
    std::vector<char*> argv;
    for (std::string& a : args)
        argv.push_back(a.data());
    argv.push_back(nullptr);
    const int argc = static_cast<int>(args.size());

    GetOpt options(argc, argv.data(), zr7::kOptionString);
    int calls = 0;
    for (char letter = options.next(); letter != 0; letter = options.next()) {
        ZR7_FUZZ_CHECK(++calls <= argc);  // every letter moves the index on
        ZR7_FUZZ_CHECK(options.index <= argc);
        if (letter == '?') {
            ZR7_FUZZ_CHECK(!options.fault.empty());
            break;  // the usage text ends the real run here
        }
        ZR7_FUZZ_CHECK(options.fault.empty());
        if (letter == '-') {
            // The name after "--" of the element just passed.
            const char* element = argv[options.index - 1];
            ZR7_FUZZ_CHECK(element[0] == '-' && element[1] == '-' && element[2] != '\0');
            ZR7_FUZZ_CHECK(options.argument == element + 2);
            continue;
        }
        const char* letter_entry = std::strchr(zr7::kOptionString, letter);
        ZR7_FUZZ_CHECK(letter != ':' && letter_entry != nullptr);
        ZR7_FUZZ_CHECK((letter_entry[1] == ':') == (options.argument != nullptr));
        if (options.argument != nullptr) {
            bool inside = false;
            for (int i = 1; i < options.index; ++i) {
                const char* a = argv[i];
                inside =
                    inside || (options.argument >= a && options.argument <= a + std::strlen(a));
            }
            ZR7_FUZZ_CHECK(inside);
        }
    }
    ZR7_FUZZ_CHECK(options.index <= argc);

    const zr7::CommandLineCheck check = zr7::check_command_line(argc, argv.data());
    ZR7_FUZZ_CHECK((check.action == zr7::CommandLineAction::kRefuse) == !check.fault.empty());
    return 0;
}
