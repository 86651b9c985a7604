// The option parser over argument vectors: which letters and arguments come
// out, and where the operands begin.
#include "qsd/driver/getopt.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "qsd/driver/driver.h"

namespace {

struct Case {
    std::vector<std::string> args;      // after the program name
    std::vector<std::string> expected;  // "e" no argument, "h=/x" with one, "?" refused
    int final_index;
};

// Calls next() until the options end or one is refused; each result as text.
std::vector<std::string> parse(const std::vector<std::string>& args, int& index) {
    std::vector<std::string> storage{"zr7inst"};
    storage.insert(storage.end(), args.begin(), args.end());
    std::vector<char*> argv;
    for (std::string& s : storage)
        argv.push_back(s.data());
    argv.push_back(nullptr);

    GetOpt options(static_cast<int>(storage.size()), argv.data(), zr7::kOptionString);
    std::vector<std::string> got;
    for (char letter = options.next(); letter != 0; letter = options.next()) {
        std::string item(1, letter);
        if (options.argument != nullptr)
            item += std::string("=") + options.argument;
        got.push_back(item);
        if (letter == '?')
            break;
    }
    EXPECT_EQ(options.argument, nullptr) << "the final call leaves no argument";
    index = options.index;
    return got;
}

const Case kCases[] = {
    {{}, {}, 1},
    {{"/img"}, {}, 1},
    {{"-e", "-s", "/img"}, {"e", "s"}, 3},
    {{"-h/opt/srv", "/img"}, {"h=/opt/srv"}, 2},
    {{"-h", "/opt/srv", "/img"}, {"h=/opt/srv"}, 3},
    {{"-h", ""}, {"h="}, 3},
    {{"-h", "-e", "/img"}, {"h=-e"}, 3},
    {{"-h"}, {"?"}, 2},
    {{"-e", "-m"}, {"e", "?"}, 3},
    {{"-x", "/img"}, {"?"}, 1},
    {{"-:", "/img"}, {"?"}, 1},
    {{"-es", "/img"}, {"e"}, 2},
    {{"--", "/img"}, {}, 2},
    {{"--anything", "/img"}, {}, 2},
    {{"-", "/img"}, {}, 2},
    {{"-e", "--", "-s"}, {"e"}, 3},
    {{"/img", "-e"}, {}, 1},
    {{"-c", "a=b", "-cC=d", "/img"}, {"c=a=b", "c=C=d"}, 4},
    {{"-V", "-o", "/l/", "-v", "610", "-f", "/img"}, {"V", "o=/l/", "v=610", "f"}, 7},
    {{"-m", "mod", "-m", "other", "x", "y"}, {"m=mod", "m=other"}, 5},
};

TEST(GetOptTest, LettersArgumentsAndFinalIndex) {
    for (const Case& c : kCases) {
        std::string shown;
        for (const std::string& a : c.args)
            shown += "[" + a + "]";
        int index = 0;
        EXPECT_EQ(parse(c.args, index), c.expected) << shown;
        EXPECT_EQ(index, c.final_index) << shown;
    }
}

}  // namespace
