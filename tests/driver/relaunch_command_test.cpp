// The relaunch's command text (shown byte for byte in "Invoking cmd <...>")
// and the argument vector that the second run really receives.
#include <gtest/gtest.h>

#include <ostream>
#include <string>
#include <vector>

#include "qsd/driver/driver.h"

namespace {

// An argument vector that owns its texts.
class Argv {
  public:
    explicit Argv(std::vector<std::string> args) : texts_(std::move(args)) {
        for (std::string& text : texts_)
            pointers_.push_back(text.data());
        pointers_.push_back(nullptr);
    }
    int argc() const { return static_cast<int>(texts_.size()); }
    char** argv() { return pointers_.data(); }

  private:
    std::vector<std::string> texts_;
    std::vector<char*> pointers_;
};

struct TextCase {
    const char* name;
    std::string home;
    std::vector<std::string> args;  // argv[0] first
    std::string text;
};

void PrintTo(const TextCase& c, std::ostream* os) {
    *os << c.name;
}

class RelaunchTextTest : public ::testing::TestWithParam<TextCase> {};

TEST_P(RelaunchTextTest, BuildsTheShownCommandLine) {
    const TextCase& c = GetParam();
    Argv argv(c.args);
    EXPECT_EQ(zr7::relaunch_command_text(argv.argc(), argv.argv(), c.home), c.text);
}

INSTANTIATE_TEST_SUITE_P(
    Cases, RelaunchTextTest,
    ::testing::Values(
        TextCase{"HomeAndSetting",
                 "/opt/srv/",
                 {"zr7inst", "-c", "KEY=val", "/img"},
                 "zr7inst -o /opt/srv/logs/ -c KEY=val /img >>/opt/srv/logs/qsdinst.log"},
        TextCase{"NoFurtherArguments",
                 "/h/",
                 {"./zr7inst"},
                 "./zr7inst -o /h/logs/ >>/h/logs/qsdinst.log"},
        TextCase{"WorkingDirectoryHome",
                 "./",
                 {"zr7inst", "/img"},
                 "zr7inst -o ./ /img >>./qsdinst.log"},
        TextCase{"HomeWithABlank",
                 "/opt/my srv/",
                 {"zr7inst", "/img"},
                 "zr7inst -o \"/opt/my srv/logs/\" /img >>\"/opt/my srv/logs/qsdinst.log\""},
        TextCase{"ArgumentWithBlankOrTab",
                 "/h/",
                 {"zr7inst", "-c", "KEY=a b", "-m", "x\ty", "/img"},
                 "zr7inst -o /h/logs/ -c \"KEY=a b\" -m \"x\ty\" /img >>/h/logs/qsdinst.log"},
        TextCase{"EmptyArgumentIsNothingBetweenBlanks",
                 "/h/",
                 {"zr7inst", "-m", "", "/img"},
                 "zr7inst -o /h/logs/ -m  /img >>/h/logs/qsdinst.log"},
        TextCase{"ToolPathShownBare",
                 "/h/",
                 {"/opt/my tools/zr7inst", "/img"},
                 "/opt/my tools/zr7inst -o /h/logs/ /img >>/h/logs/qsdinst.log"},
        TextCase{"QuotesAndDollarsPassBare",
                 "/h/",
                 {"zr7inst", "-c", "K=\"$x\"", "/img"},
                 "zr7inst -o /h/logs/ -c K=\"$x\" /img >>/h/logs/qsdinst.log"}),
    [](const ::testing::TestParamInfo<TextCase>& param_info) {
        return std::string(param_info.param.name);
    });

TEST(RelaunchArguments, PutsTheLogDirectoryFirstAndKeepsEveryArgumentWhole) {
    Argv argv({"zr7inst", "-c", "KEY=a b", "-m", "", "/my img"});
    EXPECT_EQ(zr7::relaunch_arguments(argv.argc(), argv.argv(), "/opt/my srv/"),
              (zr7::StringList{"-o", "/opt/my srv/logs/", "-c", "KEY=a b", "-m", "", "/my img"}));
}

TEST(RelaunchArguments, WorkingDirectoryHomeLogsIntoItself) {
    Argv argv({"zr7inst", "/img"});
    EXPECT_EQ(zr7::relaunch_arguments(argv.argc(), argv.argv(), "./"),
              (zr7::StringList{"-o", "./", "/img"}));
}

TEST(LogFile, LiesInLogsUnlessTheHomeIsTheWorkingDirectory) {
    EXPECT_EQ(zr7::log_file_for("./"), "./qsdinst.log");
    EXPECT_EQ(zr7::log_file_for("/opt/srv/"), "/opt/srv/logs/qsdinst.log");
    // Only the exact text "./" logs into the home itself.
    EXPECT_EQ(zr7::log_file_for(".//"), ".//logs/qsdinst.log");
    EXPECT_EQ(zr7::log_file_for("../"), "../logs/qsdinst.log");
}

}  // namespace
