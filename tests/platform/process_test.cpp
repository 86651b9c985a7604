// The process runner: statuses, redirections, and arguments passed as they are.
#include "qsd/platform/process.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdio>
#include <string>

#include "support/test_support.h"

namespace {

using zr7::OutputMode;
using zr7::ProcessSpec;
using zr7::run_process;
using zr7test::read_file;
using zr7test::TempDir;
using zr7test::write_file;

struct StatusCase {
    ProcessSpec spec;
    int status;
};

TEST(RunProcessTest, ReportsExitStatusSignalAndNotStarted) {
    const StatusCase cases[] = {
        {{"true", {}, "", "", OutputMode::kInherit}, 0},
        {{"false", {}, "", "", OutputMode::kInherit}, 1},
        {{"ls", {"/zr7-no-such-directory"}, "", "", OutputMode::kInherit}, 2},
        {{"perl", {"-e", "kill 'TERM', $$"}, "", "", OutputMode::kInherit}, 128 + 15},
        {{"perl", {"-e", "kill 'KILL', $$"}, "", "", OutputMode::kInherit}, 128 + 9},
        {{"zr7-no-such-program", {}, "", "", OutputMode::kInherit}, zr7::kRunNotStarted},
        {{"/zr7/no/such/program", {}, "", "", OutputMode::kInherit}, zr7::kRunNotStarted},
        {{"", {}, "", "", OutputMode::kInherit}, zr7::kRunNotStarted},
    };
    for (const StatusCase& c : cases) {
        testing::internal::CaptureStderr();
        EXPECT_EQ(run_process(c.spec), c.status) << c.spec.program;
        testing::internal::GetCapturedStderr();
    }
}

TEST(RunProcessTest, ArgumentsArriveUnchanged) {
    TempDir dir;
    const std::string out = dir / "out";
    ProcessSpec spec{"printf",
                     {"<%s>", "a b", "\t", "$(touch PWNED)", "x;y", "`z`", "'q'", "\"", "", "-n"},
                     "",
                     out,
                     OutputMode::kTruncate};
    EXPECT_EQ(run_process(spec), 0);
    EXPECT_EQ(read_file(out), "<a b><\t><$(touch PWNED)><x;y><`z`><'q'><\"><><-n>");
    EXPECT_FALSE(zr7test::exists("PWNED"));
}

TEST(RunProcessTest, RedirectsInputAndTruncatesOrAppendsOutput) {
    TempDir dir;
    write_file(dir / "in", "data\n");
    write_file(dir / "out", "old content that is longer\n");
    ProcessSpec spec{"cat", {}, dir / "in", dir / "out", OutputMode::kTruncate};
    EXPECT_EQ(run_process(spec), 0);
    EXPECT_EQ(read_file(dir / "out"), "data\n");
    spec.stdout_mode = OutputMode::kAppend;
    EXPECT_EQ(run_process(spec), 0);
    EXPECT_EQ(read_file(dir / "out"), "data\ndata\n");
}

TEST(RunProcessTest, CreatedOutputHasMode0666LessTheUmask) {
    TempDir dir;
    write_file(dir / "in", "x");
    const mode_t old_mask = ::umask(027);
    const int rc = run_process({"cat", {}, dir / "in", dir / "new", OutputMode::kAppend});
    ::umask(old_mask);
    EXPECT_EQ(rc, 0);
    struct stat st {};
    ASSERT_EQ(::stat((dir / "new").c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 07777, 0640u);
}

TEST(RunProcessTest, BadInputLeavesAnExistingOutputUntouched) {
    TempDir dir;
    zr7test::make_dirs(dir / "a-directory");
    write_file(dir / "out", "keep me\n");
    for (const std::string& input : {dir / "missing", dir / "a-directory"}) {
        for (OutputMode mode : {OutputMode::kTruncate, OutputMode::kAppend}) {
            EXPECT_EQ(run_process({"cat", {}, input, dir / "out", mode}), zr7::kRunStdinFailed)
                << input;
            EXPECT_EQ(read_file(dir / "out"), "keep me\n") << input;
        }
    }
    EXPECT_FALSE(zr7test::exists(dir / "never"));
    EXPECT_EQ(run_process({"cat", {}, dir / "missing", dir / "never", OutputMode::kTruncate}),
              zr7::kRunStdinFailed);
    EXPECT_FALSE(zr7test::exists(dir / "never"));
}

TEST(RunProcessTest, OutputThatIsTheInputIsRefusedBeforeTruncation) {
    TempDir dir;
    write_file(dir / "same", "a\r\nb\r\n");
    EXPECT_EQ(run_process({"tr", {"-d", "\r"}, dir / "same", dir / "same", OutputMode::kTruncate}),
              zr7::kRunStdoutFailed);
    EXPECT_EQ(read_file(dir / "same"), "a\r\nb\r\n");
}

TEST(RunProcessTest, OutputThatCannotBeOpenedIsReported) {
    TempDir dir;
    write_file(dir / "in", "x");
    EXPECT_EQ(run_process({"cat", {}, dir / "in", dir / "no/such/dir/out", OutputMode::kTruncate}),
              zr7::kRunStdoutFailed);
}

TEST(RunProcessTest, ToolOutputBeforeTheChildStaysBeforeIt) {
    testing::internal::CaptureStdout();
    std::printf("tool line, ");
    EXPECT_EQ(run_process({"printf", {"child line\n"}, "", "", OutputMode::kInherit}), 0);
    std::printf("tool again\n");
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "tool line, child line\ntool again\n");
}

TEST(FindOnPathTest, NamesWithASlashAreTakenAsTheyAre) {
    EXPECT_EQ(zr7::find_on_path("./x/y"), "./x/y");
    EXPECT_EQ(zr7::find_on_path("zr7-no-such-program"), "");
    const std::string cat = zr7::find_on_path("cat");
    ASSERT_FALSE(cat.empty());
    EXPECT_EQ(cat.substr(cat.size() - 4), "/cat");
}

}  // namespace
