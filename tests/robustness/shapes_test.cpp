// Odd shapes of the source image, of the server's own files (kmsenv,
// VXAENV) and of the disk, as one table: the steps that make the shape (see
// `shape` in the support), the options of the run, and how it must end. A
// full disk is a file size limit (SIGXFSZ ignored, so a write fails with
// EFBIG), set above every other file the run writes and below the one under
// test. Whatever happens, a failure has its status and an error line, and
// VXAENV is the file it was, or, on success, the old file with exactly the
// requested change and the old file as its backup.
#include <gtest/gtest.h>

#include <sstream>
#include <string>
#include <vector>

#include "robustness/robustness_support.h"

namespace {

using namespace std::string_literals;
using zr7test::SampleInstall;

struct ShapeCase {
    const char* name;
    std::string steps;
    std::string options;  // separated by blanks
    int exit_code;
    std::string line;         // the output must hold it ("" for none)
    std::string checks = "";  // see `holds` in the support
    long long limit = -1;     // file size limit of the run
    bool as_nobody = false;   // run as an unprivileged user
    bool relaunch = false;    // a whole run with its log; the line is on standard error
};

// A module and a setting: VXAENV is read and, on success, rewritten.
const char* const kChange = "-m MOD1 -c KEY1=value1";
const std::string kRecords =
    "default|PORTNUMBER|1234|\nSRV1|NETWORKPROTOCOL|ip.pipe|\nSRV1|IPPIPEPORTNUMBER|1918|\n"
    "SRV1|BINARCH|lx8266|\n";
const std::string kConfig = "FIELDSEP=|\n" + kRecords;
const std::string kCrlfConfig =
    "FIELDSEP=|\r\nSRV1|NETWORKPROTOCOL|ip.pipe|\r\nSRV1|IPPIPEPORTNUMBER|1918|\r\n"
    "SRV1|BINARCH|lx8266|\r\n";
const std::string kMebibyte(1 << 20, 'm');
const std::string kLongSql = std::string(200, 'q') + ".sql";

const ShapeCase kCases[] = {
    // Links, wrong kinds of file, unreadable entries in the image or the
    // installation.
    {"link_to_file", "ln T/table.dat T/ln", "", 0, "", "is H/ln table\r\n"},
    {"link_to_directory", "ln T/sub T/lnd", "", 0, "", "is H/lnd/deeper/nested.dat nested\r\n"},
    {"dangling_link", "ln R/gone T/dangling", "", 0, "", "no H/dangling"},
    {"looping_links", "ln T/loop_b T/loop_a ; ln T/loop_a T/loop_b", "", 0, "", "no H/loop_a"},
    {"link_to_an_ancestor", "ln .. T/sub/up", "", 251, "Error: Directory loop at <"},
    {"flat_link_to_file", "ln I/ATTRLIB/kzr.atr I/ATTRLIB/ln.atr", "", 0, "",
     "is H/ATTRLIB/ln.atr name kzr\nattr one\n"},
    {"flat_dangling_link", "ln R/gone I/ATTRLIB/gone", "", 0, "", "no H/ATTRLIB/gone"},
    {"flat_source_is_a_file", "file I/ATTRLIB x", "", 0, "No file to process in <"},
    {"tree_source_is_a_file", "file A/TABLE x", "", 251, "Error: Can't open <"},
    {"seed_source_is_a_file", "file I/SQLLIB x", "", 249, "Error: Can't open <"},
    {"file_where_the_tree_has_a_directory", "file H/sub a file\n", "", 251,
     "Error: Unable to create directory <", "is H/sub a file\n"},
    {"directory_where_a_file_goes", "dir H/ATTRLIB/kzr.atr", "", 251, "Error: Copy src <"},
    {"destination_directory_missing", "rm H/RKDSCATL", "", 251, "Error: Copy src <"},
    {"pipe_in_the_image", "fifo I/ATTRLIB/pipe", "", 251, "Error: Copy src <"},
    {"device_in_the_image", "ln /dev/zero T/zero", "", 251, "Error: Copy src <"},
    {"sql_name_with_a_line_break", "file I/SQLLIB/a.sql\nend\nb.sql SELECT 1;\n", "", 250,
     "the name holds a line break"},
    {"unreadable_flat_file", "chmod 0 I/ATTRLIB/kzr.atr", "", 251, "Error: Copy src <", "", -1,
     true},
    {"unreadable_flat_directory", "chmod 0 I/ATTRLIB", "", 249, "Error: Can't open <", "", -1,
     true},
    {"unsearchable_flat_directory", "chmod 444 I/ATTRLIB", "", 249, "Error: Can't access <", "", -1,
     true},
    {"unreadable_tree_file", "chmod 0 T/table.dat", "", 251, "Error: Copy src <", "", -1, true},
    {"unreadable_tree_directory", "chmod 0 T/sub", "", 251, "Error: Can't open <", "", -1, true},
    {"unreadable_sql_file", "chmod 0 I/SQLLIB/kzr_a.sql", "", 251, "Error: Copy src <", "", -1,
     true},

    // The server configuration: read as bytes, checked where it names
    // directories, never a reason to hang.
    {"kmsenv_crlf", "file K " + kCrlfConfig, "", 0, ""},
    {"kmsenv_no_final_newline", "file K " + kConfig.substr(0, kConfig.size() - 1), "", 0, ""},
    {"kmsenv_nul_in_a_heading", "file K HEAD\0ING=x\n"s + kConfig, "", 0, ""},
    {"kmsenv_nul_in_the_server_name", "file K FIELDSEP=|\nSRV1\0x|BINARCH|lx8266|\n"s, "", 255,
     "Error: Server name or architecture in kmsenv holds a NUL byte"},
    {"kmsenv_nul_in_the_protocol", "file K " + kConfig + "SRV1|NETWORKPROTOCOL|ip\0pipe|\n"s, "",
     250, "Error: Seeding <"},
    {"kmsenv_mebibyte_heading", "file K " + kMebibyte + "\n" + kConfig, "", 0, ""},
    {"kmsenv_mebibyte_record", "file K " + kConfig + "SRV1|X|" + kMebibyte + "|\n", "", 0, ""},
    {"kmsenv_mebibyte_server_name", "file K FIELDSEP=|\n" + kMebibyte + "|BINARCH|lx8266|\n", "",
     251, "Error: Copy src <"},
    {"kmsenv_hundred_thousand_lines",
     "file K  ; repeat K 50000 HEADING=x ; append K FIELDSEP=|\n ; repeat K 50000 "
     "default|PORTNUMBER|1| ; append K " +
         kRecords,
     "", 0, ""},
    {"kmsenv_binary_garbage", "garbage K 65536", "", 251, "Error: Copy src <"},
    {"kmsenv_empty", "file K ", "", 251, "Error: Copy src <"},
    {"kmsenv_link_to_the_file", "file R/kmsenv " + kConfig + " ; ln R/kmsenv K", "", 0, ""},
    {"kmsenv_dangling_link", "ln R/gone K", "", 2, "Error: Can't open kmsenv"},
    {"kmsenv_directory", "dir K", "", 21, "Error: Can't open kmsenv"},
    {"kmsenv_pipe", "fifo K", "", 22, "Error: Can't open kmsenv"},
    {"kmsenv_device", "ln /dev/zero K", "", 22, "Error: Can't open kmsenv"},
    {"kmsenv_unreadable", "chmod 0 K", "", 13, "Error: Can't open kmsenv", "", -1, true},

    // The environment file, with a module and a setting to apply.
    {"vxaenv_nul_bytes", "file V A=1\0x\nKDS_RUN=KDSMAIN\0;B\n\0\nKEY1=v\0\n"s, kChange, 0, ""},
    {"vxaenv_crlf", "file V A=1\r\nKDS_RUN=KDSMAIN;X\r\nKEY1=v\r\n", kChange, 0, ""},
    {"vxaenv_mebibyte_lines",
     "file V LONG=" + kMebibyte + "\nKDS_RUN=" + kMebibyte + "\n" + kMebibyte + "\n", kChange, 0,
     ""},
    {"vxaenv_binary_garbage", "garbage V 65536", kChange, 0, ""},
    {"vxaenv_no_final_newline", "file V A=1\nKDS_RUN=KDSMAIN", kChange, 0, ""},
    {"vxaenv_hundred_thousand_lines",
     "file V  ; repeat V 50000 A=1 ; append V KDS_RUN=KDSMAIN\n ; repeat V 50000 B=2", kChange, 0,
     ""},
    {"vxaenv_empty", "file V ", kChange, 0, ""},
    {"vxaenv_link_to_the_file", "file R/vxaenv KDS_RUN=A\n ; ln R/vxaenv V", kChange, 0, "",
     "link V"},
    {"vxaenv_dangling_link", "ln R/gone V", kChange, 249, "Error: Can't open <"},
    {"vxaenv_directory", "dir V", kChange, 249, "Error: Can't open <"},
    {"vxaenv_pipe", "fifo V", kChange, 249, "Error: Can't open <"},
    {"vxaenv_device", "ln /dev/zero V", kChange, 249, "Error: Can't open <"},
    {"vxaenv_unreadable", "chmod 0 V", kChange, 249, "Error: Can't open <", "", -1, true},

    // A full disk at each place the tool writes.
    {"full_disk_flat_copy", "fill I/ATTRLIB/big.atr 8192 ; file H/ATTRLIB/big.atr old\n", "", 251,
     "Error: Copy src <", "is H/ATTRLIB/big.atr old\n", 4096},
    {"full_disk_tree_copy", "fill T/big.dat 8192 ; file H/big.dat old\n", "", 251,
     "Error: Copy src <", "is H/big.dat old\n", 4096},
    {"full_disk_new_environment_file", "fill V 4000 #", "-c ADDED=" + std::string(200, 'v'), 248,
     "Error: Can't write <", "", 4096},
    {"full_disk_backup", "fill V 8192 BIG=", "-c BIG=small", 247, "Error: Can't backup VXAENV", "",
     4096},
    {"full_disk_response_file", "rm I/SQLLIB ; file I/SQLLIB/" + kLongSql + " SELECT 1;\n", "-s",
     248, "Error: Seeding <" + kLongSql + "> failed", "", 128},
    {"full_disk_seeding_log", "fill O/logs/kzr_a.sql.log 4096 ; fill O/logs/kzr_b.sql.log 4096", "",
     250, "Error: Seeding <kzr_", "", 4096},
    {"full_disk_log", "", "", 248, "Error: Can't write <", "", 4096, false, true},
};

// Test lists show the case by its name.
void PrintTo(const ShapeCase& c, std::ostream* out) {
    *out << c.name;
}

class Shapes : public ::testing::TestWithParam<ShapeCase> {};

TEST_P(Shapes, EndWithTheirStatusAndLineAndVxaenvWholeAndRight) {
    const ShapeCase& c = GetParam();
    if (c.as_nobody && !zr7rb::can_drop_privileges())
        GTEST_SKIP() << "cannot run as an unprivileged user here";
    SampleInstall s;
    std::vector<std::string> options;
    std::istringstream words(c.options);
    for (std::string word; words >> word;)
        options.push_back(word);
    zr7rb::Launch launch =
        c.relaunch ? zr7rb::relaunch_launch(s, options) : zr7rb::install_launch(s, options);
    launch.file_size_limit = c.limit;
    if (c.as_nobody) {
        zr7rb::give_tree_to_nobody(s.root.path());
        launch.as_nobody = true;
    }
    zr7rb::shape(s, c.steps);
    const std::string before = zr7rb::content_of(s.vxaenv);

    const zr7test::RunResult r = zr7rb::run_captured(launch);
    const std::string& output = c.relaunch ? r.err : r.out;
    EXPECT_EQ(r.exit_code, c.exit_code) << r.err << r.out.substr(0, 3000);
    EXPECT_TRUE(c.relaunch || zr7rb::has_line(r.out, "Exiting with rc <"));
    EXPECT_TRUE(zr7rb::has_line(output, c.line)) << c.line;
    EXPECT_TRUE(c.exit_code == 0 || zr7rb::has_line(output, "Error: ")) << "a failure needs a line";
    EXPECT_TRUE(zr7rb::holds(s, c.checks));

    // VXAENV: changed only by a successful run that asked for a change, then
    // exactly as asked, with the old file as its one backup; no scratch file
    // is left either way.
    const std::vector<std::string> backups = zr7rb::backups(s);
    if (c.options == kChange && c.exit_code == 0) {
        ASSERT_EQ(backups.size(), 1u);
        EXPECT_TRUE(zr7test::read_file(backups[0]) == before);
        EXPECT_TRUE(zr7rb::content_of(s.vxaenv) == zr7rb::changed_by(before, 1));
    } else {
        EXPECT_TRUE(zr7rb::content_of(s.vxaenv) == before);
        for (const std::string& backup : backups)
            EXPECT_TRUE(zr7test::read_file(backup) == before) << backup;
    }
    for (const std::string& name : zr7test::list_dir(s.tables())) {
        EXPECT_EQ(name.find("VXAENV."), std::string::npos) << name;
        EXPECT_EQ(name.find(".zr7copy"), std::string::npos) << name;
    }
    if (c.limit >= 0)
        zr7rb::report(std::string("disk-full point ") + c.name + ", limit in bytes", c.limit);
}

std::string case_name(const ::testing::TestParamInfo<ShapeCase>& c) {
    return c.param.name;
}

INSTANTIATE_TEST_SUITE_P(All, Shapes, ::testing::ValuesIn(kCases), case_name);

}  // namespace
