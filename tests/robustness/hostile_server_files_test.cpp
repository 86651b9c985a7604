// The server's own files in bad shape: kmsenv and VXAENV with NUL bytes,
// carriage returns, mebibyte lines, binary garbage, no final newline, a
// hundred thousand lines, or not a readable file at all. No crash, no hang,
// the documented result.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <functional>
#include <random>
#include <string>
#include <vector>

#include "robustness/robustness_support.h"

namespace {

using zr7test::read_file;
using zr7test::SampleInstall;
using zr7test::write_file;

using namespace std::string_literals;

std::string garbage(std::size_t size) {
    std::mt19937 random(1901);
    std::string text(size, '\0');
    for (char& c : text)
        c = static_cast<char>(random() & 0xFF);
    return text;
}

std::string many_lines(int count, const std::string& line) {
    std::string text;
    text.reserve(static_cast<std::size_t>(count) * line.size());
    for (int i = 0; i < count; ++i)
        text += line;
    return text;
}

const std::string kMebibyte(1 << 20, 'm');

// The sample's configuration, line by line, in the shape a case gives it.
std::string kmsenv(const std::string& eol = "\n", bool final_eol = true) {
    const std::vector<std::string> lines = {"HEADING=sample server configuration",
                                            "FIELDSEP=|",
                                            "default|PORTNUMBER|1234|",
                                            "SRV1|NETWORKPROTOCOL|ip.pipe|",
                                            "SRV1|IPPIPEPORTNUMBER|1918|",
                                            "SRV1|BINARCH|lx8266|"};
    std::string text;
    for (std::size_t i = 0; i < lines.size(); ++i)
        text += lines[i] + (i + 1 < lines.size() || final_eol ? eol : "");
    return text;
}

// One way the file can be, and how the run ends. `line` is a text that the
// output must hold ("" for none); a failure always needs an error line.
struct FileCase {
    const char* name;
    std::function<void(const std::string& path)> make;
    int exit_code;
    const char* line;
    bool as_nobody = false;
};

void write(const std::string& path, const std::string& content) {
    write_file(path, content);
}
void link_to(const std::string& path, const std::string& target) {
    ::unlink(path.c_str());
    ASSERT_EQ(::symlink(target.c_str(), path.c_str()), 0);
}
void replace_by(const std::string& path, mode_t kind) {
    ::unlink(path.c_str());
    if (kind == S_IFDIR)
        zr7test::make_dirs(path);
    else
        ASSERT_EQ(::mkfifo(path.c_str(), 0644), 0);
}

const FileCase kKmsenvCases[] = {
    {"crlf", [](const std::string& p) { write(p, kmsenv("\r\n")); }, 0, ""},
    {"no_final_newline", [](const std::string& p) { write(p, kmsenv("\n", false)); }, 0, ""},
    {"nul_in_a_heading", [](const std::string& p) { write(p, "HEAD\0ING=x\n"s + kmsenv()); }, 0,
     ""},
    {"nul_in_the_server_name",
     [](const std::string& p) { write(p, "FIELDSEP=|\nSRV1\0other|BINARCH|lx8266|\n"s); }, 255,
     "Error: Server name or architecture in kmsenv holds a NUL byte"},
    {"nul_in_the_protocol",
     [](const std::string& p) { write(p, kmsenv() + "SRV1|NETWORKPROTOCOL|ip\0pipe|\n"s); }, 250,
     "Error: Seeding <"},
    {"mebibyte_heading", [](const std::string& p) { write(p, kMebibyte + "\n" + kmsenv()); }, 0,
     ""},
    {"mebibyte_record",
     [](const std::string& p) { write(p, kmsenv() + "SRV1|OTHER|" + kMebibyte + "|\n"); }, 0, ""},
    {"mebibyte_server_name",
     [](const std::string& p) { write(p, "FIELDSEP=|\n" + kMebibyte + "|BINARCH|lx8266|\n"); }, 251,
     "Error: Copy src <"},
    {"hundred_thousand_lines",
     [](const std::string& p) {
         const std::string records = kmsenv().substr(kmsenv().find("default|"));
         write(p, many_lines(50000, "HEADING=x\n") + "FIELDSEP=|\n" +
                      many_lines(50000, "default|PORTNUMBER|1|\n") + records);
     },
     0, ""},
    {"binary_garbage", [](const std::string& p) { write(p, garbage(1 << 16)); }, 251,
     "Error: Copy src <"},
    {"empty", [](const std::string& p) { write(p, ""); }, 251, "Error: Copy src <"},
    {"link_to_the_file",
     [](const std::string& p) {
         write(p + ".real", kmsenv());
         link_to(p, p + ".real");
     },
     0, ""},
    {"dangling_link", [](const std::string& p) { link_to(p, p + ".gone"); }, 2,
     "Error: Can't open kmsenv"},
    {"directory", [](const std::string& p) { replace_by(p, S_IFDIR); }, 21,
     "Error: Can't open kmsenv"},
    {"pipe", [](const std::string& p) { replace_by(p, S_IFIFO); }, 22, "Error: Can't open kmsenv"},
    {"link_to_a_device", [](const std::string& p) { link_to(p, "/dev/zero"); }, 22,
     "Error: Can't open kmsenv"},
    {"unreadable", [](const std::string& p) { ::chmod(p.c_str(), 0); }, 13,
     "Error: Can't open kmsenv", true},
};

const FileCase kVxaenvCases[] = {
    {"nul_bytes",
     [](const std::string& p) { write(p, "A=1\0x\nKDS_RUN=KDSMAIN\0;B\n\0\nKEY1=v\0\n"s); }, 0, ""},
    {"crlf", [](const std::string& p) { write(p, "A=1\r\nKDS_RUN=KDSMAIN;X\r\nKEY1=v\r\n"); }, 0,
     ""},
    {"mebibyte_lines",
     [](const std::string& p) {
         write(p, "LONG=" + kMebibyte + "\nKDS_RUN=" + kMebibyte + "\n" + kMebibyte + "\n");
     },
     0, ""},
    {"binary_garbage", [](const std::string& p) { write(p, garbage(1 << 16)); }, 0, ""},
    {"no_final_newline", [](const std::string& p) { write(p, "A=1\nKDS_RUN=KDSMAIN"); }, 0, ""},
    {"hundred_thousand_lines",
     [](const std::string& p) {
         write(p, many_lines(50000, "A=1\n") + "KDS_RUN=KDSMAIN\n" + many_lines(50000, "B=2\n"));
     },
     0, ""},
    {"empty", [](const std::string& p) { write(p, ""); }, 0, ""},
    {"link_to_the_file",
     [](const std::string& p) {
         write(p + ".real", zr7test::kSampleVxaenv);
         link_to(p, p + ".real");
     },
     0, ""},
    {"dangling_link", [](const std::string& p) { link_to(p, p + ".gone"); }, 249,
     "Error: Can't open <"},
    {"directory", [](const std::string& p) { replace_by(p, S_IFDIR); }, 249, "Error: Can't open <"},
    {"pipe", [](const std::string& p) { replace_by(p, S_IFIFO); }, 249, "Error: Can't open <"},
    {"link_to_a_device", [](const std::string& p) { link_to(p, "/dev/zero"); }, 249,
     "Error: Can't open <"},
    {"unreadable", [](const std::string& p) { ::chmod(p.c_str(), 0); }, 249, "Error: Can't open <",
     true},
};

std::string case_name(const ::testing::TestParamInfo<FileCase>& c) {
    return c.param.name;
}

// Runs the sample installation with one of its files made by the case.
zr7test::RunResult run_with(const FileCase& c, SampleInstall& s, const std::string& path,
                            const std::vector<std::string>& options) {
    zr7rb::Launch launch = zr7rb::install_launch(s, options);
    if (c.as_nobody) {
        zr7rb::give_tree_to_nobody(s.root.path());
        launch.as_nobody = true;
    }
    c.make(path);
    const zr7test::RunResult r = zr7rb::run_captured(launch);
    EXPECT_EQ(r.exit_code, c.exit_code) << r.err << r.out.substr(0, 3000);
    EXPECT_TRUE(zr7rb::has_line(r.out, "Exiting with rc <"));
    if (*c.line != '\0') {
        EXPECT_TRUE(zr7rb::has_line(r.out, c.line)) << c.line;
    }
    if (c.exit_code != 0) {
        EXPECT_TRUE(zr7rb::has_line(r.out, "Error: ")) << "a failure needs a line";
    }
    return r;
}

class HostileKmsenv : public ::testing::TestWithParam<FileCase> {};

TEST_P(HostileKmsenv, EndsWithTheDocumentedResult) {
    if (GetParam().as_nobody && !zr7rb::can_drop_privileges())
        GTEST_SKIP() << "cannot run as an unprivileged user here";
    SampleInstall s;
    run_with(GetParam(), s, s.home + "/config/.ConfigData/kmsenv", {});
    EXPECT_EQ(read_file(s.vxaenv), zr7test::kSampleVxaenv);
}

INSTANTIATE_TEST_SUITE_P(Shapes, HostileKmsenv, ::testing::ValuesIn(kKmsenvCases), case_name);

class HostileVxaenv : public ::testing::TestWithParam<FileCase> {};

// With a module and a setting to apply, so that the file is read and
// rewritten: on success every byte the change does not touch stays, the old
// file is the backup; on failure nothing is written.
TEST_P(HostileVxaenv, EndsWithTheDocumentedResult) {
    if (GetParam().as_nobody && !zr7rb::can_drop_privileges())
        GTEST_SKIP() << "cannot run as an unprivileged user here";
    SampleInstall s;
    run_with(GetParam(), s, s.vxaenv, zr7rb::change_options(1));
    const std::vector<std::string> backups = zr7rb::backups(s);
    if (GetParam().exit_code != 0) {
        EXPECT_TRUE(backups.empty());
        return;
    }
    ASSERT_EQ(backups.size(), 1u);
    const std::string old_content = read_file(backups[0]);
    EXPECT_EQ(read_file(s.vxaenv), zr7rb::changed_by(old_content, 1));
    struct stat st {};
    EXPECT_EQ(::lstat(s.vxaenv.c_str(), &st) == 0 && S_ISLNK(st.st_mode),
              std::string(GetParam().name) == "link_to_the_file");
}

INSTANTIATE_TEST_SUITE_P(Shapes, HostileVxaenv, ::testing::ValuesIn(kVxaenvCases), case_name);

}  // namespace
