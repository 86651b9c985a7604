// The option parser: single-letter options, "x:" for one that takes an
// argument, options before the one operand.
#pragma once

class GetOpt {
  public:
    GetOpt(int count, char* const* vector, const char* options)
        : argc(count), argv(vector), option_string(options) {}

    // The option letter found, '?' for an unknown letter or a missing
    // argument, 0 when the options have ended ("--", "--anything" and a lone
    // "-" end them and are skipped; the first operand ends them and stays).
    char next();

    const char* argument = nullptr;
    int index = 1;
    int argc;
    char* const* argv;
    const char* option_string;
};
