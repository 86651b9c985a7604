// The form of the command line, judged before any option takes effect, so
// that a mistyped line is refused with one reason and nothing done.
#include <cstring>

#include "qsd/driver/driver.h"
#include "qsd/driver/getopt.h"

namespace zr7 {

CommandLineCheck check_command_line(int argc, char* const* argv) {
    CommandLineCheck check;
    GetOpt options(argc, argv, kOptionString);
    bool undo = false;
    for (char letter = options.next(); letter != 0; letter = options.next()) {
        if (letter == 'u')
            undo = true;
        if (letter == '?') {
            check.action = CommandLineAction::kRefuse;
            check.fault = options.fault;
            return check;
        }
        if (letter != '-')
            continue;
        if (std::strcmp(options.argument, "help") == 0) {
            check.action = CommandLineAction::kHelp;
        } else if (std::strcmp(options.argument, "version") == 0) {
            check.action = CommandLineAction::kVersion;
        } else {
            check.action = CommandLineAction::kRefuse;
            check.fault = std::string("unknown option --") + options.argument;
        }
        return check;
    }
    const int operands = argc - options.index;
    if (undo) {
        if (operands != 0) {
            check.action = CommandLineAction::kRefuse;
            check.fault = "-u takes no src_dir, " + std::to_string(operands) + " given";
        }
        return check;
    }
    if (operands != 1) {
        check.action = CommandLineAction::kRefuse;
        check.fault = "one src_dir expected, " + std::to_string(operands) + " given";
    } else if (argv[options.index][0] == '\0') {
        // "" would install from a directory nobody named.
        check.action = CommandLineAction::kRefuse;
        check.fault = "src_dir is empty";
    }
    return check;
}

}  // namespace zr7
