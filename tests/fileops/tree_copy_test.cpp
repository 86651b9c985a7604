// The flat and tree copy commands: templates, the copies, their lines and
// statuses.
#include <gtest/gtest.h>

#include <functional>
#include <ostream>

#include "qsd/installer/installer610.h"
#include "qsd/platform/trace.h"
#include "support/printable.h"
#include "support/stdout_capture.h"
#include "support/test_support.h"

namespace {

using zr7test::exists;
using zr7test::has_trace_line;
using zr7test::make_dirs;
using zr7test::read_file;
using zr7test::TempDir;
using zr7test::write_file;

class CopyCommandTest : public ::testing::Test {
  protected:
    void SetUp() override {
        make_dirs(src);
        make_dirs(dst);
        installer.add_path_symbol("SRC", (src + "/").c_str());
        installer.add_path_symbol("DST", (dst + "/").c_str());
    }
    // Runs one command with every trace class on and keeps its lines.
    int run_traced(const std::function<int()>& command) {
        zr7::trace_reconfigure("ALL");
        int status = 0;
        out = zr7test::capture_stdout([&] { status = command(); });
        zr7::trace_reconfigure("ERROR");
        return status;
    }
    TempDir tmp;
    std::string src = tmp / "src";
    std::string dst = tmp / "dst";
    Installer610 installer;
    std::string out;
};

TEST_F(CopyCommandTest, FlatCopyTakesOnlyFilesReplacingAndRemovingCarriageReturns) {
    write_file(src + "/a.atr", "one\r\ntwo\r\n");
    write_file(src + "/.b", "mid\rline\r\n");
    make_dirs(src + "/sub");
    write_file(src + "/sub/deep.atr", "deep");
    write_file(dst + "/a.atr", "old content");
    EXPECT_EQ(installer.copy("${SRC}", "${DST}"), 0);
    EXPECT_EQ(read_file(dst + "/a.atr"), "one\ntwo\n");
    EXPECT_EQ(read_file(dst + "/.b"), "midline\n");
    EXPECT_FALSE(exists(dst + "/sub"));
}

TEST_F(CopyCommandTest, FlatCopyOfAMissingSourceIsNothingToDo) {
    EXPECT_EQ(run_traced([&] { return installer.copy("${SRC}/NONE", "${DST}"); }), 0);
    EXPECT_TRUE(has_trace_line(out, "No file to process in <" + src + "/NONE>")) << out;
}

TEST_F(CopyCommandTest, FlatCopyOfAnEmptySourceSaysNothingOfIt) {
    EXPECT_EQ(run_traced([&] { return installer.copy("${SRC}", "${DST}"); }), 0);
    EXPECT_TRUE(has_trace_line(out, "expanded src path <" + src + ">")) << out;
    EXPECT_TRUE(has_trace_line(out, "expanded dst path <" + dst + ">")) << out;
    EXPECT_EQ(out.find("No file to process"), std::string::npos) << out;
}

TEST_F(CopyCommandTest, FlatCopyIntoAMissingDirectoryFailsAndNamesTheFiles) {
    write_file(src + "/a.atr", "a");
    EXPECT_EQ(run_traced([&] { return installer.copy("${SRC}", "${DST}/NONE"); }), -5);
    EXPECT_TRUE(has_trace_line(out, "processing <a.atr>")) << out;
    EXPECT_TRUE(has_trace_line(
        out, "Error: Copy src <" + src + "/a.atr> to dst <" + dst + "/NONE/a.atr> failed"))
        << out;
    EXPECT_TRUE(zr7test::has_exit_event(out, "Installer610::copy", -5)) << out;
    EXPECT_FALSE(exists(dst + "/NONE"));
}

TEST_F(CopyCommandTest, TreeCopyOfAMissingSourceIsNothingToDo) {
    EXPECT_EQ(run_traced([&] { return installer.recursive_copy("${SRC}/NONE", "${DST}", "O"); }),
              0);
    EXPECT_TRUE(has_trace_line(out, "src <" + src + "/NONE> does not exist.  no work to do."))
        << out;
}

TEST_F(CopyCommandTest, TreeCopyFailuresBecomeMinus5) {
    write_file(src + "/plain", "not a directory");
    EXPECT_EQ(installer.recursive_copy("${SRC}/plain", "${DST}", "O"), -5);
    write_file(src + "/a.txt", "a");
    EXPECT_EQ(installer.recursive_copy("${SRC}", "${DST}/NONE", "O"), -5);
}

// Bad templates give -1 in both copy commands, naming the template unexpanded.
struct TemplateCase {
    const char* src;
    const char* dst;
    const char* line;
};

void PrintTo(const TemplateCase& c, std::ostream* os) {
    *os << zr7test::printable(c.line);
}

class BadTemplateTest : public CopyCommandTest,
                        public ::testing::WithParamInterface<TemplateCase> {};

TEST_P(BadTemplateTest, BothCopyCommandsRefuseIt) {
    const TemplateCase& c = GetParam();
    EXPECT_EQ(run_traced([&] { return installer.copy(c.src, c.dst); }), -1);
    EXPECT_TRUE(has_trace_line(out, c.line)) << out;
    EXPECT_EQ(run_traced([&] { return installer.recursive_copy(c.src, c.dst, "O"); }), -1);
    EXPECT_TRUE(has_trace_line(out, c.line)) << out;
}

INSTANTIATE_TEST_SUITE_P(Templates, BadTemplateTest,
                         ::testing::Values(TemplateCase{"", "${DST}", "Error: Bad src path <>"},
                                           TemplateCase{"${NOPE}/x", "${DST}",
                                                        "Error: Bad src path <${NOPE}/x>"},
                                           TemplateCase{"${SRC}", "", "Error: Bad dst path <>"},
                                           TemplateCase{"${SRC}", "${DST}/${NOPE}",
                                                        "Error: Bad dst path <${DST}/${NOPE}>"}));

}  // namespace
