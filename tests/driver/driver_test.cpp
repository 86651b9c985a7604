// The option parser, and the command text the relaunch shows.
#include <gtest/gtest.h>

#include <string>
#include <tuple>
#include <vector>

#include "qsd/driver/driver.h"
#include "qsd/driver/getopt.h"

namespace {

// An argument vector that owns its texts, the program name first.
struct Argv {
    Argv(const Argv&) = delete;
    explicit Argv(std::vector<std::string> args) : texts(std::move(args)) {
        for (std::string& text : texts)
            pointers.push_back(text.data());
        pointers.push_back(nullptr);
    }
    int argc() const { return static_cast<int>(texts.size()); }
    std::vector<std::string> texts;
    std::vector<char*> pointers;
};

// Each option as "e", "h=/x" (with its argument) or "?" (refused, which ends
// the parse), then the index of the first operand.
TEST(GetOpt, LettersArgumentsAndFirstOperand) {
    const std::pair<std::vector<std::string>, std::string> cases[] = {
        {{}, "1"},
        {{"-e", "-s", "/img"}, "e s 3"},
        {{"-h/opt/srv", "/img"}, "h=/opt/srv 2"},
        {{"-h", "", "-h", "-e"}, "h= h=-e 5"},
        {{"-h"}, "? 2"},
        {{"-x", "/img"}, "? 1"},
        {{"-es", "/img"}, "e 2"},
        {{"--", "-e"}, "2"},
        {{"--anything", "/img"}, "2"},
        {{"-", "/img"}, "2"},
        {{"/img", "-e"}, "1"},
        {{"-c", "a=b", "-V", "-o", "/l/", "-v", "610", "-f", "-m", "x"},
         "c=a=b V o=/l/ v=610 f m=x 11"}};
    for (const auto& [args, expected] : cases) {
        std::vector<std::string> texts{"zr7inst"};
        texts.insert(texts.end(), args.begin(), args.end());
        Argv argv(texts);
        GetOpt options(argv.argc(), argv.pointers.data(), zr7::kOptionString);
        std::string got;
        for (char letter = options.next(); letter != 0; letter = options.next()) {
            got += letter + std::string(options.argument ? "=" : "") +
                   (options.argument ? options.argument : "") + " ";
            if (letter == '?')
                break;
        }
        EXPECT_EQ(got + std::to_string(options.index), expected);
    }
}

// Shown only: the tool's path bare, a piece with white space in double quotes.
TEST(RelaunchCommandText, LogOptionFirstAndAppendToTheLogLast) {
    const std::tuple<const char*, std::vector<std::string>, const char*> cases[] = {
        {"/opt/srv/",
         {"zr7inst", "-c", "KEY=val", "/img"},
         "zr7inst -o /opt/srv/logs/ -c KEY=val /img >>/opt/srv/logs/qsdinst.log"},
        {"/opt/my srv/",
         {"/my tools/zr7inst", "-c", "K=a b", "/img"},
         "/my tools/zr7inst -o \"/opt/my srv/logs/\" -c \"K=a b\" /img "
         ">>\"/opt/my srv/logs/qsdinst.log\""},
        {"./", {"zr7inst", "-m", "", "/img"}, "zr7inst -o ./ -m  /img >>./qsdinst.log"}};
    for (const auto& [home, args, text] : cases) {
        Argv argv(args);
        EXPECT_EQ(zr7::relaunch_command_text(argv.argc(), argv.pointers.data(), home), text);
    }
}

}  // namespace
