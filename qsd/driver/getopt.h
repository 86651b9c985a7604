// The option parser: single-letter options, "x:" for one that takes an
// argument, options before the one operand, and long options "--name".
#pragma once

#include <string>

class GetOpt {
  public:
    GetOpt(int count, char* const* vector, const char* options)
        : argc(count), argv(vector), option_string(options) {}

    // The option letter found; '?' for an unknown letter or a missing
    // argument (`fault` then says which); '-' for a long option "--name"
    // (`argument` is the name after "--"; which names exist is the caller's
    // business); 0 when the options have ended ("--" and a lone "-" end them
    // and are skipped; the first operand ends them and stays).
    char next();

    const char* argument = nullptr;
    int index = 1;
    int argc;
    char* const* argv;
    const char* option_string;
    // After a '?': "unknown option -x" or "option -h needs an argument".
    std::string fault;
};
