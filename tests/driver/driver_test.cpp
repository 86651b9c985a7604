// The option parser, and the command text the relaunch shows.
#include <gtest/gtest.h>

#include <regex>
#include <string>
#include <tuple>
#include <vector>

#include "qsd/driver/driver.h"
#include "qsd/driver/getopt.h"
#include "qsd/driver/progress.h"

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

// Each option as "e", "h=/x" (with its argument), "-=name" (a long option)
// or "?(fault)" (refused, which ends the parse), then the index of the first
// operand.
TEST(GetOpt, LettersArgumentsAndFirstOperand) {
    const std::pair<std::vector<std::string>, std::string> cases[] = {
        {{}, "1"},
        {{"-e", "-s", "/img"}, "e s 3"},
        {{"-h/opt/srv", "/img"}, "h=/opt/srv 2"},
        {{"-h", "", "-h", "-e"}, "h= h=-e 5"},
        {{"-h"}, "?(option -h needs an argument) 2"},
        {{"-e", "-v"}, "e ?(option -v needs an argument) 3"},
        {{"-x", "/img"}, "?(unknown option -x) 1"},
        {{"-xyz", "/img"}, "?(unknown option -x) 1"},
        {{"-:", "/img"}, "?(unknown option -:) 1"},
        {{"-es", "/img"}, "e 2"},
        {{"--", "-e"}, "2"},
        {{"--", "--help"}, "2"},
        {{"--anything", "/img"}, "-=anything 2"},
        {{"-e", "--help", "/img"}, "e -=help 3"},
        {{"--version"}, "-=version 2"},
        {{"-h", "--help", "/img"}, "h=--help 3"},
        {{"---", "/img"}, "-=- 2"},
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
                   (options.argument ? options.argument : "") +
                   (letter == '?' ? "(" + options.fault + ")" : "") + " ";
            if (letter == '?')
                break;
        }
        EXPECT_EQ(got + std::to_string(options.index), expected);
    }
}

// The form of a command line decides, before anything is done, whether the
// run goes on, prints the usage or the version, or is refused and why.
TEST(CheckCommandLine, RunHelpVersionOrRefusalWithItsReason) {
    using A = zr7::CommandLineAction;
    const std::tuple<std::vector<std::string>, A, std::string> cases[] = {
        {{"/img"}, A::kRun, ""},
        {{"-c", "K=v", "-m", "mod", "-e", "-s", "-f", "-h", "/h", "-v", "610", "-V", "/img"},
         A::kRun,
         ""},
        {{"--", "/img"}, A::kRun, ""},
        {{"-", "/img"}, A::kRun, ""},
        {{"-o", "/l/", "/img"}, A::kRun, ""},
        {{"--help"}, A::kHelp, ""},
        {{"-e", "--help", "/a", "/b"}, A::kHelp, ""},
        {{"--version"}, A::kVersion, ""},
        {{"-V", "--version", "/img"}, A::kVersion, ""},
        {{"--help", "--version"}, A::kHelp, ""},
        {{}, A::kRefuse, "one src_dir expected, 0 given"},
        {{"-e"}, A::kRefuse, "one src_dir expected, 0 given"},
        {{"/img", "/other"}, A::kRefuse, "one src_dir expected, 2 given"},
        {{"/img", "-e"}, A::kRefuse, "one src_dir expected, 2 given"},
        {{"--", "/img", "--help"}, A::kRefuse, "one src_dir expected, 2 given"},
        {{""}, A::kRefuse, "src_dir is empty"},
        {{"-x", "/img"}, A::kRefuse, "unknown option -x"},
        {{"-h"}, A::kRefuse, "option -h needs an argument"},
        {{"-:", "/img"}, A::kRefuse, "unknown option -:"},
        {{"--dry-run", "/img"}, A::kRefuse, "unknown option --dry-run"},
        {{"--help=x", "/img"}, A::kRefuse, "unknown option --help=x"},
        {{"--HELP"}, A::kRefuse, "unknown option --HELP"},
        {{"-x", "--help"}, A::kRefuse, "unknown option -x"},
        {{"--he\nlp", "/img"}, A::kRefuse, "unknown option --he\nlp"},
        {{"-u", "-h", "/h"}, A::kRun, ""},
        {{"-n", "-u"}, A::kRun, ""},
        {{"-u", "/img"}, A::kRefuse, "-u takes no src_dir, 1 given"}};
    for (const auto& [args, action, fault] : cases) {
        std::vector<std::string> texts{"zr7inst"};
        texts.insert(texts.end(), args.begin(), args.end());
        Argv argv(texts);
        const zr7::CommandLineCheck check =
            zr7::check_command_line(argv.argc(), argv.pointers.data());
        EXPECT_EQ(static_cast<int>(check.action), static_cast<int>(action))
            << testing::PrintToString(args);
        EXPECT_EQ(check.fault, fault) << testing::PrintToString(args);
    }
}

// The log's first and last lines of a run.
TEST(RunRecord, HeaderAndClosingLines) {
    Argv argv({"/bin/zr7inst", "-o", "/s/logs/", "-m", "a b", "/img"});
    EXPECT_EQ(zr7::run_header_line("2026-12-07T01:02:03+0100", "root", 0, "/srv", argv.argc(),
                                   argv.pointers.data()),
              "zr7inst 06100400 run begins: time 2026-12-07T01:02:03+0100, user root(0), cwd /srv, "
              "command /bin/zr7inst -o /s/logs/ -m a b /img");
    zr7::ProgressState state;
    state.files_copied = 12;
    state.files_seeded = 2;
    const std::tuple<bool, bool, int, double, std::string> cases[] = {
        {false, false, 0, 1.2344,
         "rc 0, files copied 12, files seeded 2, VXAENV not updated, "
         "elapsed 1.234 s, journal 0.000 s"},
        {true, false, -5, 0.0,
         "rc -5, files copied 12, files seeded 2, VXAENV unchanged, "
         "elapsed 0.000 s, journal 0.000 s"},
        {true, true, -6, 61.5,
         "rc -6, files copied 12, files seeded 2, VXAENV changed, "
         "elapsed 61.500 s, journal 0.000 s"}};
    for (const auto& [reported, changed, status, seconds, text] : cases) {
        state.env_reported = reported;
        state.env_changed = changed;
        EXPECT_EQ(zr7::run_closing_line(status, state, seconds, 0.0), "zr7inst run ends: " + text);
    }
    EXPECT_TRUE(std::regex_match(zr7::iso_local_time(0),
                                 std::regex(R"(19(69|70)-\d\d-\d\dT\d\d:\d\d:\d\d[+-]\d{4})")))
        << zr7::iso_local_time(0);
}

zr7::ProgressState at(const char* name) {
    return {17,   17,   4,    "${SRCPATH}/SQLLIB",    40,       1,
            name, true, true, "/t/\033[31m/VXAENV_1", "mkdir 1"};
}

// Bytes a terminal obeys show as "?"; the line ends before the last column
// ("é" is two bytes, one column).
TEST(Progress, LineAndSummaryTexts) {
    const std::string line = "[17/17] seed SQLLIB | files: 40 copied, 1 seeded | seeding ";
    EXPECT_EQ(zr7::progress_line(at("a\033]0;\x9b\xc2\x9b\xff.sql"), 99), line + "a?]0;????.sql");
    EXPECT_EQ(zr7::progress_line(at("éééé.sql"), 65), line + "éé...");
    EXPECT_EQ(zr7::progress_summary(at(""), -5, "/s/logs\033/qsdinst.log", 2.5),
              "zr7inst: installation failed with rc <-5> at [17/17] seed SQLLIB\n"
              "  files copied: 40\n  files seeded: 1\n  VXAENV: changed, backup "
              "/t/?[31m/VXAENV_1\n  actions: mkdir 1\n"
              "  log: /s/logs?/qsdinst.log\n  elapsed: 2.500 s\n");
    EXPECT_EQ(zr7::progress_summary({}, 0, "./qsdinst.log", 0.0004),
              "zr7inst: installation done\n  files copied: 0\n  files seeded: 0\n"
              "  VXAENV: not updated\n  log: ./qsdinst.log\n  elapsed: 0.000 s\n");
}

}  // namespace
