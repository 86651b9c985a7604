// A full disk at each place the tool writes, made with a file size limit
// (SIGXFSZ ignored, so a write fails with EFBIG as on a full disk). The limit
// is chosen per place: above every other file the run writes, below the one
// file under test. Every case ends with its status and its line, and VXAENV
// is the file it was.
#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

#include "robustness/robustness_support.h"

namespace {

using zr7test::read_file;
using zr7test::SampleInstall;
using zr7test::write_file;

struct FullDiskCase {
    const char* place;
    long long limit;
    std::function<void(const SampleInstall&)> shape;
    std::vector<std::string> options;
    int exit_code;
    std::string line;  // on standard output, or on standard error for the log
    // A file the run must leave as it was, and its content.
    std::string kept = "";
    std::string kept_content = "";
};

const std::string kLongSqlName = std::string(200, 'q') + ".sql";

const FullDiskCase kCases[] = {
    {"flat_copy",
     4096,
     [](const SampleInstall& s) {
         write_file(s.image + "/MSRV/ATTRLIB/big.atr", std::string(8192, 'a'));
         write_file(s.tables() + "/ATTRLIB/big.atr", "installed before\n");
     },
     {},
     251,
     "Error: Copy src <",
     "tables/SRV1/ATTRLIB/big.atr",
     "installed before\n"},
    {"tree_copy",
     4096,
     [](const SampleInstall& s) {
         write_file(s.image + "/MSRV/" + s.arch + "/TABLE/big.dat", std::string(8192, 't'));
         write_file(s.tables() + "/big.dat", "installed before\n");
     },
     {},
     251,
     "Error: Copy src <",
     "tables/SRV1/big.dat",
     "installed before\n"},
    {"new_environment_file",
     4096,
     [](const SampleInstall& s) { write_file(s.vxaenv, std::string(4000, '#') + "\n"); },
     {"-c", "ADDED=" + std::string(200, 'v')},
     248,
     "Error: Can't write <"},
    {"backup",
     4096,
     [](const SampleInstall& s) {
         write_file(s.vxaenv, "BIG=" + std::string(8192, 'b') + "\nKDS_RUN=KDSMAIN\n");
     },
     {"-c", "BIG=small"},
     247,
     "Error: Can't backup VXAENV"},
    {"response_file",
     128,
     [](const SampleInstall& s) {
         zr7test::remove_tree(s.image + "/MSRV/SQLLIB");
         zr7test::make_dirs(s.image + "/MSRV/SQLLIB");
         write_file(s.image + "/MSRV/SQLLIB/" + kLongSqlName, "SELECT 1;\n");
     },
     {"-s"},
     248,
     "Error: Seeding <" + kLongSqlName + "> failed"},
    {"seeding_log",
     4096,
     [](const SampleInstall& s) {
         for (const char* name : {"kzr_a.sql", "kzr_b.sql"})
             write_file(s.home + "/logs/" + name + ".log", std::string(4096, 'l'));
     },
     {},
     250,
     "Error: Seeding <kzr_"},
    {"log", 4096, [](const SampleInstall&) {}, {}, 248, "Error: Can't write <"},
};

class FullDisk : public ::testing::TestWithParam<FullDiskCase> {};

TEST_P(FullDisk, GivesItsStatusAndLineAndLeavesVxaenvAlone) {
    const FullDiskCase& c = GetParam();
    SampleInstall s;
    c.shape(s);
    const std::string vxaenv_before = read_file(s.vxaenv);
    const bool log_case = std::string(c.place) == "log";
    // The log case is a whole run with its relaunch; the others are the
    // installing run alone, its output read through a pipe.
    zr7rb::Launch launch =
        log_case ? zr7rb::relaunch_launch(s, c.options) : zr7rb::install_launch(s, c.options);
    launch.file_size_limit = c.limit;
    const zr7test::RunResult r = zr7rb::run_captured(launch);
    zr7rb::report(std::string("disk-full point ") + c.place + ", limit in bytes", c.limit);

    EXPECT_EQ(r.exit_code, c.exit_code) << r.err << r.out.substr(0, 4000);
    EXPECT_TRUE(zr7rb::has_line(log_case ? r.err : r.out, c.line))
        << c.line << "\n"
        << r.err << r.out.substr(r.out.size() > 4000 ? r.out.size() - 4000 : 0);
    EXPECT_EQ(read_file(s.vxaenv), vxaenv_before);
    if (!c.kept.empty()) {
        EXPECT_EQ(read_file(s.home + "/" + c.kept), c.kept_content) << "a half-written file";
    }
    // No scratch copy of VXAENV is left, and no backup unless it is whole.
    for (const std::string& name : zr7test::list_dir(s.tables())) {
        EXPECT_EQ(name.find("VXAENV."), std::string::npos) << name;
        EXPECT_EQ(name.find(".zr7copy"), std::string::npos) << name;
    }
    for (const std::string& name : zr7test::list_dir(s.tables() + "/.archive"))
        EXPECT_EQ(read_file(s.tables() + "/.archive/" + name), vxaenv_before) << name;
}

std::string place_name(const ::testing::TestParamInfo<FullDiskCase>& c) {
    return c.param.place;
}

INSTANTIATE_TEST_SUITE_P(WritePlaces, FullDisk, ::testing::ValuesIn(kCases), place_name);

}  // namespace
