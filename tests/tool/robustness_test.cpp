// Robustness of the whole tool: hostile names in the source image; odd shapes
// of the image, of kmsenv and VXAENV and of the disk; runs killed at random
// moments; runs at once. The tool is started by fork and exec so that a test
// can set a file size limit, drop to another user, or kill its process group.
#include <fcntl.h>
#include <grp.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <filesystem>
#include <random>
#include <set>
#include <thread>

#include "qsd/envfile/env_rewrite.h"
#include "qsd/platform/directory_lock.h"
#include "support/test_support.h"

extern char** environ;

namespace {
using namespace std::string_literals;
using zr7test::make_dirs;
using zr7test::read_file;
using zr7test::SampleInstall;
using zr7test::write_file;
using Snapshot = std::map<std::string, std::string>;
namespace fs = std::filesystem;

// ZR7_SOAK=1 (set by `make soak`) selects the long variants.
int scaled(int quick, int long_run) {
    return std::getenv("ZR7_SOAK") != nullptr && std::getenv("ZR7_SOAK") == "1"s ? long_run : quick;
}

struct Launch {
    std::vector<std::string> options;  // before the image
    bool relaunch = false;             // no "-o": the tool relaunches itself with its log
    long long limit = -1;              // RLIMIT_FSIZE in bytes, SIGXFSZ ignored
    bool as_nobody = false;            // setgid and setuid 65534 before exec
    std::string cwd = "";
    bool image = true;  // the image last (an undo has none)
};

// Starts the tool on the sample through the one launcher, standard output and
// error on `fd`.
pid_t start(const SampleInstall& s, const Launch& l, int fd) {
    const std::string bin = l.as_nobody ? zr7test::reachable_bin_dir() : zr7test::bin_dir();
    std::vector<std::string> args{"-o", s.home + "/logs/", "-h", s.home};
    args.erase(args.begin(), args.begin() + (l.relaunch ? 2 : 0));
    args.insert(args.end(), l.options.begin(), l.options.end());
    if (l.image)
        args.push_back(s.image);
    zr7test::RunOptions options;
    options.unset_env = {"MARLIN_HOME", "MARLINHOME", "QDSLOAD_FAIL", "QDSLOAD_RECORD", "VXA_TRC1"};
    if (!l.relaunch)
        options.set_env["VXA_TRC1"] = "ERROR (UNIT:zr7 ALL)";
    options.cwd = l.cwd;
    options.file_limit = l.limit;
    options.as_nobody = l.as_nobody;
    return zr7test::start(bin + "/zr7inst", args, options, fd, fd);
}
using zr7test::wait_for;
// Output and errors in RunResult::out, through a pipe: no file size limit reaches it.
zr7test::RunResult run_tool(const SampleInstall& s, const Launch& l) {
    int fds[2];
    zr7test::RunResult r;
    if (::pipe2(fds, O_CLOEXEC) != 0)
        return r;
    const pid_t pid = start(s, l, fds[1]);
    ::close(fds[1]);
    char buffer[65536];
    for (ssize_t n; (n = ::read(fds[0], buffer, sizeof buffer)) != 0 && (n > 0 || errno == EINTR);)
        r.out.append(buffer, n > 0 ? static_cast<std::size_t>(n) : 0);
    ::close(fds[0]);
    r.exit_code = wait_for(pid);
    return r;
}
// Every entry under `dir`, links not followed: "d", "l" + target, "f" + content.
Snapshot snapshot(const std::string& dir) {
    Snapshot out;
    for (const fs::directory_entry& e : fs::recursive_directory_iterator(dir)) {
        out[e.path().string().substr(dir.size() + 1)] =
            e.is_symlink()     ? "l" + fs::read_symlink(e.path()).string()
            : e.is_directory() ? "d"
                               : "f" + read_file(e.path());
    }
    return out;
}
// Run `n` of a series adds module MOD<n> and setting KEY<n>=value<n>.
std::vector<std::string> change_options(int n) {
    return {"-m", "MOD" + std::to_string(n), "-c",
            "KEY" + std::to_string(n) + "=value" + std::to_string(n)};
}
std::string changed_by(const std::string& content, int n) {
    zr7::Dictionary settings;
    settings.insert("KEY" + std::to_string(n), "value" + std::to_string(n));
    return zr7::rewrite_env_content(content, settings, "MOD" + std::to_string(n)).content;
}
std::vector<std::string> backups(const SampleInstall& s) {
    std::vector<std::string> found;
    for (const std::string& name : zr7test::list_dir(s.tables() + "/.archive")) {
        if (name.rfind("VXAENV_", 0) == 0)
            found.push_back(s.tables() + "/.archive/" + name);
    }
    return found;
}

TEST(HostileImage, EveryNameLandsExactlyAndNothingRuns) {
    // Every byte but "/" and NUL, shell bait ("@": a canary file that appears only
    // if a name reaches a shell), option look-alikes, blanks, the longest name.
    std::vector<std::string> names{std::string(255, 'n')};
    for (int b = 1; b < 256; ++b) {
        const std::string byte(1, static_cast<char>(b));
        if (b != '/')
            names.insert(names.end(), {"a" + byte + "z", b == '.' ? ".x" : byte});
    }
    // clang-format off
    for (std::string bait : {"$(touch @)", "`touch @`", ";touch @", "|touch @", "&touch @",
             "&&touch @&&", ">@", "<@", "'\";touch @;'", "\ntouch @\n", "${IFS}touch${IFS}@", "*",
             "?", "[a-z]", "~", "!!", "-", "--", "-rf", "--help", "-o x", " ", "  lead", "trail  ",
             "\t", "\r\n", "..."})
        names.push_back(bait.find('@') == bait.npos ? bait : bait.replace(bait.find('@'), 1, "zr7canary"));
    // clang-format on
    SampleInstall s;
    const std::string msrv = s.image + "/MSRV/", table = msrv + s.arch + "/TABLE/";
    Snapshot want;  // keyed by the path below the server's tables
    for (const std::string& name : names) {
        const std::string content = "line\r\n" + name + "\r\n", sql = name.substr(0, 250) + ".txt";
        make_dirs(table + "dirs/" + name);
        make_dirs(table + "files");
        for (const std::string& path : {msrv + "ATTRLIB/" + name, table + "files/" + name,
                                        table + "dirs/" + name + "/inside", msrv + "SQLLIB/" + sql})
            write_file(path, content);
        std::string no_cr = "fline\n" + name + "\n";
        no_cr.erase(std::remove(no_cr.begin(), no_cr.end(), '\r'), no_cr.end());
        want["SRV1/ATTRLIB/" + name] = want["cicatrsq/ATTRLIB/" + name] = no_cr;
        want["cicatrsq/SQLLIB/" + sql] = no_cr;
        want["SRV1/files/" + name] = want["SRV1/dirs/" + name + "/inside"] = "f" + content;
        want["SRV1/dirs/" + name] = "d";
    }
    // The loader is handed each seeded name as it is.
    const std::vector<std::string> seeded = {"$(touch zr7canary).sql", "-rf.sql", "a b.sql",
                                             "`x`;y.sql", "\xff\x01.sql"};
    for (const std::string& name : seeded)
        write_file(msrv + "SQLLIB/" + name, "INSERT INTO T VALUES (1);\n");
    const Snapshot image_before = snapshot(s.image);
    const zr7test::RunResult r = run_tool(s, {{}, true, -1, false, s.root.path()});
    ASSERT_EQ(r.exit_code, 0) << r.out << read_file(s.home + "/logs/qsdinst.log").substr(0, 4000);
    const Snapshot landed = snapshot(s.home + "/tables");
    for (const auto& [path, what] : want)
        EXPECT_TRUE(landed.count(path) == 1 && landed.at(path) == what) << path;
    for (const auto& [p, what] : landed) {  // and nothing else lands beside them
        const bool from_image = p.find("/dirs/") != p.npos || p.find("/files/") != p.npos ||
                                (p.find("ATTRLIB/") != p.npos && p.find("kzr.atr") == p.npos);
        EXPECT_TRUE(!from_image || want.count(p) == 1) << p;
    }
    const std::string catalog = read_file(s.cicatrsq() + "/qdsload.catalog");
    for (const std::string& name : seeded)
        EXPECT_NE(catalog.find(" loaded <" + name + "> "), std::string::npos) << name;
    EXPECT_EQ(read_file(s.vxaenv), zr7test::kSampleVxaenv);
    EXPECT_TRUE(snapshot(s.image) == image_before);
    for (const auto& entry : snapshot(s.root.path()))
        EXPECT_NE(fs::path(entry.first).filename(), "zr7canary");
}

// Odd shapes as one table: steps making the shape, options, how the run ends. A
// full disk is a file size limit above every other file the run writes. Paths:
// K kmsenv, V VXAENV, or with a prefix: I/ the image's MSRV, A/ its architecture
// directory, T/ its TABLE tree, H/ the server's tables, O/ the home, R/ scratch.
std::string path_of(const SampleInstall& s, const std::string& p) {
    const std::string a = s.image + "/MSRV/" + s.arch + "/";
    // clang-format off
    const std::map<std::string, std::string> roots = {{"K", s.home + "/config/.ConfigData/kmsenv"},
        {"V", s.vxaenv}, {"I/", s.image + "/MSRV/"}, {"A/", a}, {"T/", a + "TABLE/"},
        {"H/", s.tables() + "/"}, {"O/", s.home + "/"}, {"R/", s.root.path() + "/"}};
    // clang-format on
    const auto root = roots.find(p.substr(0, p.size() == 1 ? 1 : 2));
    return root == roots.end() ? p : root->second + p.substr(root->first.size());
}
// A step or a check, "word first rest".
std::vector<std::string> parse(const std::string& text) {
    const std::size_t one = std::min(text.find(' '), text.size()), two = text.find(' ', one + 1);
    return {text.substr(0, one), text.substr(std::min(one + 1, text.size()), two - one - 1),
            two == std::string::npos ? "" : text.substr(two + 1)};
}
// file P TEXT, dir P, fifo P, rm P, ln TARGET P, chmod MODE P (the path kept),
// many P N (files f<i> holding <i>), deep P N (a chain of N directories named
// like P, made level by level, beyond PATH_MAX too, a file "level" at the end).
void shape(const SampleInstall& s, const std::vector<std::string>& steps) {
    for (const std::string& text : steps) {
        const std::vector<std::string> w = parse(text);
        const std::string path = path_of(s, w[0] == "chmod" || w[0] == "ln" ? w[2] : w[1]);
        const std::string parent = path.substr(0, path.rfind('/')),
                          name = fs::path(path).filename();
        if (w[0] == "own") {  // another account's: 65534 owns it, a link itself
            if (::lchown(path.c_str(), 65534, 65534) != 0)
                ADD_FAILURE() << text;
            continue;
        }
        if (w[0] == "chmod")  // with "own", the steps that keep what stands there
            ::chmod(path.c_str(), static_cast<mode_t>(std::stoul(w[1], nullptr, 8)));
        else
            zr7test::remove_tree(path);
        make_dirs(w[0] == "dir" || w[0] == "many" ? path : parent);
        if (w[0] == "file")
            write_file(path, w[2]);
        if (w[0] == "fifo")
            ::mkfifo(path.c_str(), 0644);
        if (w[0] == "ln" && ::symlink(path_of(s, w[1]).c_str(), path.c_str()) != 0)
            ADD_FAILURE() << text;
        for (int i = w[0] == "many" ? std::stoi(w[2]) - 1 : -1; i >= 0; --i)
            write_file(path + "/f" + std::to_string(i), std::to_string(i));
        int fd = w[0] == "deep" ? ::open(parent.c_str(), O_RDONLY | O_DIRECTORY) : -1;
        for (int level = 0, up = -1; fd >= 0 && level < std::stoi(w[2]); ++level, ::close(up)) {
            ::mkdirat(fd, name.c_str(), 0755);
            fd = ::openat(up = fd, name.c_str(), O_RDONLY | O_DIRECTORY);
        }
        ::close(fd >= 0 ? ::openat(fd, "level", O_WRONLY | O_CREAT, 0644) : -1);
        ::close(fd);
    }
}
// "is P TEXT" (a regular file holding TEXT), "no P", "link P", "many P N",
// "mode P OCTAL", "owner P UID:GID"; several joined by " && ".
void check(const SampleInstall& s, const std::string& all) {
    const std::size_t join = all.find(" && ");
    if (join != std::string::npos) {
        check(s, all.substr(0, join));
        return check(s, all.substr(join + 4));
    }
    const std::string& text = all;
    const std::vector<std::string> w = parse(text);
    struct stat attributes {};
    const bool present = ::lstat(path_of(s, w[1]).c_str(), &attributes) == 0;
    EXPECT_TRUE(w[0] != "mode" ||
                (present && (attributes.st_mode & 07777) == std::stoul(w[2], nullptr, 8)))
        << text << " " << std::oct << attributes.st_mode;
    EXPECT_TRUE(w[0] != "owner" || (present && std::to_string(attributes.st_uid) + ":" +
                                                       std::to_string(attributes.st_gid) ==
                                                   w[2]))
        << text << " " << attributes.st_uid;
    const std::string path = path_of(s, w[1]);
    const fs::file_status st = fs::symlink_status(path);
    EXPECT_TRUE(w[0] != "no" || !fs::exists(st)) << text;
    EXPECT_TRUE(w[0] != "link" || fs::is_symlink(st)) << text;
    EXPECT_TRUE(w[0] != "is" || (fs::is_regular_file(st) && read_file(path) == w[2])) << text;
    for (int i = w[0] == "many" ? std::stoi(w[2]) - 1 : -1; i >= 0; --i)
        ASSERT_EQ(read_file(path + "/f" + std::to_string(i)), std::to_string(i));
}
std::string times(int n, const std::string& text) {
    std::string out;
    while (n-- > 0)
        out += text;
    return out;
}
std::string garbage(std::size_t n) {
    std::string bytes(n, '\0');
    std::generate(bytes.begin(), bytes.end(), std::mt19937(1901));
    return bytes;
}

struct ShapeCase {
    const char* name;
    std::vector<std::string> steps, options;
    int exit_code;
    std::string line, check = "";  // a line the output holds; see `check`
    long long limit = -1;          // file size limit
    bool as_nobody = false, relaunch = false;
};
void PrintTo(const ShapeCase& c, std::ostream* out) {
    *out << c.name;
}

const std::vector<std::string> kChange = change_options(1);
// clang-format off
const std::string kRecords = "default|PORTNUMBER|1234|\nSRV1|NETWORKPROTOCOL|ip.pipe|\nSRV1|IPPIPEPORTNUMBER|1918|\nSRV1|BINARCH|lx8266|\n";
const std::string kConfig = "FIELDSEP=|\n" + kRecords, kMebibyte(1 << 20, 'm');
const std::string kLongSql = std::string(200, 'q') + ".sql", kWide = std::to_string(scaled(500, 20000));
const std::string kCopy = "Error: Copy src <", kOpen = "Error: Can't open <", kKms = "Error: Can't open kmsenv";
const ShapeCase kCases[] = {
    // The image: depth, width, links, wrong kinds of file, unreadable entries.
    {"two_hundred_levels_deep", {"deep T/d 200"}, {}, 0, "", "is H/" + times(200, "d/") + "level "},
    {"paths_beyond_the_system_limit", {"deep T/" + std::string(30, 'p') + " 200"}, {}, 0, ""},
    {"wide_directory", {"many A/lib " + kWide}, {}, 0, "", "many O/lx8266/ms/lib " + kWide},
    {"link_to_file", {"ln T/table.dat T/ln"}, {}, 0, "", "is H/ln table\r\n"},
    {"link_to_directory", {"ln T/sub T/lnd"}, {}, 251, "Error: Directory loop at <"},
    {"dangling_link", {"ln R/gone T/dangling"}, {}, 0, "", "no H/dangling"},
    {"looping_links", {"ln T/loop_b T/loop_a", "ln T/loop_a T/loop_b"}, {}, 0, "", "no H/loop_a"},
    {"flat_link_to_file", {"ln I/ATTRLIB/kzr.atr I/ATTRLIB/ln.atr"}, {}, 0, "", "is H/ATTRLIB/ln.atr name kzr\nattr one\n"},
    {"flat_dangling_link", {"ln R/gone I/ATTRLIB/gone"}, {}, 0, "", "no H/ATTRLIB/gone"},
    {"flat_source_is_a_file", {"file I/ATTRLIB x"}, {}, 0, "No file to process in <"},
    {"tree_source_is_a_file", {"file A/TABLE x"}, {}, 251, kOpen},
    {"seed_source_is_a_file", {"file I/SQLLIB x"}, {}, 249, kOpen},
    {"file_where_the_tree_has_a_directory", {"file H/sub a file\n"}, {}, 251, "Error: Unable to create directory <", "is H/sub a file\n"},
    {"directory_where_a_file_goes", {"dir H/ATTRLIB/kzr.atr"}, {}, 251, kCopy},
    {"destination_directory_missing", {"rm H/RKDSCATL"}, {}, 251, kOpen},
    {"pipe_in_the_image", {"fifo I/ATTRLIB/pipe"}, {}, 251, kCopy},
    {"device_in_the_image", {"ln /dev/zero T/zero"}, {}, 251, kCopy},
    {"sql_name_with_a_line_break", {"file I/SQLLIB/a.sql\nend\nb.sql SELECT 1;\n"}, {}, 250, "the name holds a line break"},
    {"unreadable_flat_file", {"chmod 0 I/ATTRLIB/kzr.atr"}, {}, 251, kCopy, "", -1, true},
    {"unreadable_flat_directory", {"chmod 0 I/ATTRLIB"}, {}, 249, kOpen, "", -1, true},
    {"unsearchable_flat_directory", {"chmod 444 I/ATTRLIB"}, {}, 249, "Error: Can't access <", "", -1, true},
    {"unreadable_tree_file", {"chmod 0 T/table.dat"}, {}, 251, kCopy, "", -1, true},
    {"unreadable_tree_directory", {"chmod 0 T/sub"}, {}, 251, kOpen, "", -1, true},
    {"unreadable_sql_file", {"chmod 0 I/SQLLIB/kzr_a.sql"}, {}, 251, kCopy, "", -1, true},
    // kmsenv: read as bytes, checked where it names directories.
    {"kmsenv_crlf", {"file K FIELDSEP=|\r\nSRV1|NETWORKPROTOCOL|ip.pipe|\r\nSRV1|IPPIPEPORTNUMBER|1918|\r\nSRV1|BINARCH|lx8266|\r\n"}, {}, 0, ""},
    {"kmsenv_no_final_newline", {"file K " + kConfig.substr(0, kConfig.size() - 1)}, {}, 0, ""},
    {"kmsenv_nul_in_a_heading", {"file K HEAD\0ING=x\n"s + kConfig}, {}, 0, ""},
    {"kmsenv_nul_in_the_server_name", {"file K FIELDSEP=|\nSRV1\0x|BINARCH|lx8266|\n"s}, {}, 255, "Error: Bad server name <SRV1\\x00x>"},
    {"kmsenv_nul_in_the_protocol", {"file K " + kConfig + "SRV1|NETWORKPROTOCOL|ip\0pipe|\n"s}, {}, 250, "Error: Seeding <"},
    {"kmsenv_mebibyte_heading", {"file K " + kMebibyte + "\n" + kConfig}, {}, 0, ""},
    {"kmsenv_mebibyte_record", {"file K " + kConfig + "SRV1|X|" + kMebibyte + "|\n"}, {}, 0, ""},
    {"kmsenv_mebibyte_server_name", {"file K FIELDSEP=|\n" + kMebibyte + "|BINARCH|lx8266|\n"}, {}, 251, kOpen},
    {"kmsenv_hundred_thousand_lines", {"file K " + times(50000, "HEADING=x\n") + "FIELDSEP=|\n" + times(50000, "default|PORTNUMBER|1|\n") + kRecords}, {}, 0, ""},
    {"kmsenv_binary_garbage", {"file K " + garbage(65536)}, {}, 251, kOpen},
    {"kmsenv_empty", {"file K "}, {}, 251, kOpen},
    {"kmsenv_link_to_the_file", {"file R/kmsenv " + kConfig, "ln R/kmsenv K"}, {}, 0, ""},
    {"kmsenv_another_accounts_link", {"file R/kmsenv " + kConfig, "ln R/kmsenv K", "own K"}, {}, 40, kKms},
    {"kmsenv_another_server_ends_the_reading", {"file K " + kConfig + "SRV2|BINARCH|x|\nSRV1|BINARCH|aix536|\n"}, {}, 0, ""},
    {"kmsenv_dangling_link", {"ln R/gone K"}, {}, 2, kKms},
    {"kmsenv_directory", {"dir K"}, {}, 21, kKms},
    {"kmsenv_pipe", {"fifo K"}, {}, 22, kKms},
    {"kmsenv_device", {"ln /dev/zero K"}, {}, 22, kKms},
    {"kmsenv_unreadable", {"chmod 0 K"}, {}, 13, kKms, "", -1, true},
    // VXAENV, with a module and a setting to apply.
    {"vxaenv_nul_bytes", {"file V A=1\0x\nKDS_RUN=KDSMAIN\0;B\n\0\nKEY1=v\0\n"s}, kChange, 0, ""},
    {"vxaenv_crlf", {"file V A=1\r\nKDS_RUN=KDSMAIN;X\r\nKEY1=v\r\n"}, kChange, 0, ""},
    {"vxaenv_mebibyte_lines", {"file V LONG=" + kMebibyte + "\nKDS_RUN=" + kMebibyte + "\n" + kMebibyte + "\n"}, kChange, 0, ""},
    {"vxaenv_binary_garbage", {"file V " + garbage(65536)}, kChange, 0, ""},
    {"vxaenv_no_final_newline", {"file V A=1\nKDS_RUN=KDSMAIN"}, kChange, 0, ""},
    {"vxaenv_hundred_thousand_lines", {"file V " + times(50000, "A=1\n") + "KDS_RUN=KDSMAIN\n" + times(50000, "B=2\n")}, kChange, 0, ""},
    {"vxaenv_empty", {"file V "}, kChange, 0, ""},
    {"vxaenv_link_to_the_file", {"file R/vxaenv KDS_RUN=A\n", "ln R/vxaenv V"}, kChange, 0, "", "link V"},
    {"vxaenv_dangling_link", {"ln R/gone V"}, kChange, 249, kOpen},
    {"vxaenv_directory", {"dir V"}, kChange, 249, kOpen},
    {"vxaenv_pipe", {"fifo V"}, kChange, 249, kOpen},
    {"vxaenv_device", {"ln /dev/zero V"}, kChange, 249, kOpen},
    {"vxaenv_unreadable", {"chmod 0 V"}, kChange, 249, kOpen, "", -1, true},
    // A full disk at each place the tool writes.
    {"full_disk_flat_copy", {"file I/ATTRLIB/big.atr " + std::string(8192, 'x') + "\n", "file H/ATTRLIB/big.atr old\n"}, {}, 251, kCopy, "is H/ATTRLIB/big.atr old\n", 4096},
    {"full_disk_tree_copy", {"file T/big.dat " + std::string(8192, 'x') + "\n", "file H/big.dat old\n"}, {}, 251, kCopy, "is H/big.dat old\n", 4096},
    {"full_disk_new_environment_file", {"file V #" + std::string(4000, 'x') + "\n"}, {"-c", "ADDED=" + std::string(200, 'v')}, 248, "Error: Can't write <", "", 4096},
    {"full_disk_backup", {"file V BIG=" + std::string(8192, 'x') + "\n"}, {"-c", "BIG=small"}, 247, "Error: Can't backup VXAENV", "", 4096},
    {"full_disk_response_file", {"rm I/SQLLIB", "file I/SQLLIB/" + kLongSql + " SELECT 1;\n"}, {"-s"}, 248, "Error: Seeding <" + kLongSql + "> failed", "", 128},
    {"full_disk_seeding_log", {"file O/logs/kzr_a.sql.log " + std::string(4096, 'x') + "\n", "file O/logs/kzr_b.sql.log " + std::string(4096, 'x') + "\n"}, {}, 250, "Error: Seeding <kzr_", "", 4096},
    {"full_disk_log", {}, {}, 248, "Error: Can't write <", "", 4096, false, true},
    // Another account (65534) owns the server's directories and the image and
    // plants links and odd files; root installs. What lies outside stays as it is.
    {"attack_destination_file_link", {"file R/victim secret\n", "ln R/victim H/table.dat", "own H/table.dat"}, {}, 0, "", "is R/victim secret\n && is H/table.dat table\r\n"},
    {"attack_destination_root_link_followed", {"file R/target old\n", "ln R/target H/table.dat"}, {}, 0, "", "link H/table.dat && is R/target table\r\n"},
    {"attack_destination_directory_link", {"dir R/victim", "ln R/victim H/sub", "own H/sub"}, {}, 251, "Error: Unable to create directory <", "no R/victim/deeper"},
    {"attack_flat_destination_directory_link", {"dir R/victim", "rm H/ATTRLIB", "ln R/victim H/ATTRLIB", "own H/ATTRLIB"}, {}, 251, kOpen, "no R/victim/kzr.atr"},
    {"attack_vxaenv_link", {"file R/victim KDS_RUN=A\n", "ln R/victim V", "own V"}, kChange, 249, kOpen, "is R/victim KDS_RUN=A\n"},
    {"attack_archive_link", {"dir R/victim", "ln R/victim H/.archive", "own H/.archive"}, {"-c", "K=v"}, 247, "Error: Unable to create backup directory <", "no R/victim/VXAENV_1"},
    {"attack_seeding_log_link", {"file R/victim secret\n", "ln R/victim O/logs/kzr_a.sql.log", "own O/logs/kzr_a.sql.log"}, {}, 250, "Error: Seeding <kzr_a.sql> failed", "is R/victim secret\n"},
    {"attack_log_link", {"file R/victim secret\n", "ln R/victim O/logs/qsdinst.log", "own O/logs/qsdinst.log"}, {}, 248, "Error: Can't open <", "is R/victim secret\n", -1, false, true},
    {"attack_log_fifo", {"fifo O/logs/qsdinst.log"}, {}, 248, "Error: Can't open <", "", -1, false, true},
    {"attack_seeding_log_fifo", {"fifo O/logs/kzr_a.sql.log"}, {}, 250, "Error: Seeding <kzr_a.sql> failed"},
    {"attack_image_link_out", {"file R/secret root only\n", "chmod 0600 R/secret", "ln R/secret T/stolen", "own T/stolen"}, {}, 251, "Error: Link <", "no H/stolen"},
    {"attack_image_link_climbs_out", {"file R/secret root only\n", "ln ../../../../secret T/climb", "own T/climb"}, {}, 251, "Error: Link <", "no H/climb"},
    {"attack_image_root_link_out_followed", {"file R/shared shared\n", "ln R/shared T/shared"}, {}, 0, "", "is H/shared shared\n"},
    {"attack_image_inside_link_followed", {"ln I/ATTRLIB/kzr.atr T/inside", "own T/inside"}, {}, 0, "", "is H/inside name kzr\r\nattr one\r\n"},
    {"attack_image_writes_archive", {"file T/.archive/VXAENV_1 forged\n"}, {}, 251, "Error: The image may not write into <", "no H/.archive/VXAENV_1"},
    {"attack_sibling_link_chain", {"dir T/c0", "ln T/c0 T/c1/l", "ln T/c1 T/c2/l", "ln T/c2 T/c3/l"}, {}, 251, "Error: Directory loop at <"},
    {"new_directory_mode_and_owner", {"file T/fresh/x new\n", "own H/."}, {}, 0, "", "mode H/fresh 0755 && owner H/fresh 65534:65534 && owner H/fresh/x 65534:65534"},
    {"replaced_file_keeps_mode_and_owner", {"file H/table.dat old\n", "chmod 0640 H/table.dat", "own H/table.dat"}, {}, 0, "", "mode H/table.dat 0640 && owner H/table.dat 65534:65534 && is H/table.dat table\r\n"},
    {"vxaenv_keeps_its_owner", {"own V", "chmod 0640 V"}, kChange, 0, "", "owner V 65534:65534 && mode V 0640"},
    {"old_lib_and_bin_files_replaced", {"file A/lib/libkzr.so new lib\n", "file O/lx8266/ms/lib/libkzr.so old lib\n", "file A/bin/kzrtool new bin\n", "file O/lx8266/ms/bin/kzrtool old bin\n"}, {}, 0, "", "is O/lx8266/ms/lib/libkzr.so new lib\n && is O/lx8266/ms/bin/kzrtool new bin\n"},
};
// clang-format on

class Shapes : public ::testing::TestWithParam<ShapeCase> {};

TEST_P(Shapes, EndWithTheirStatusAndLineAndVxaenvWholeAndRight) {
    const ShapeCase& c = GetParam();
    if (c.as_nobody && ::geteuid() != 0)
        GTEST_SKIP() << "only root can run as an unprivileged user";
    SampleInstall s(c.as_nobody ? zr7test::reachable_dir() : "");
    shape(s, c.steps);
    if (c.as_nobody)  // the whole tree, so that the unprivileged run can work in it
        zr7test::run("/bin/chown", {"-R", "65534:65534", s.root.path()});
    // Only a regular file is read: a test must not block on a pipe put in its place.
    auto content_of = [](auto& p) { return fs::is_regular_file(p) ? read_file(p) : ""s; };
    const std::string before = content_of(s.vxaenv);
    const zr7test::RunResult r = run_tool(s, {c.options, c.relaunch, c.limit, c.as_nobody});
    const auto has = [&](const std::string& t) { return r.out.find(t) != r.out.npos; };
    EXPECT_EQ(r.exit_code, c.exit_code) << r.out.substr(0, 3000);
    EXPECT_TRUE(c.relaunch || has("Exiting with rc <"));
    EXPECT_TRUE(has(c.line)) << c.line;
    EXPECT_TRUE(c.exit_code == 0 || has("Error: ")) << "a failure needs a line";
    check(s, c.check);
    // VXAENV changes only when asked and the run succeeds, then exactly as asked
    // with the old file as its one backup; no scratch file is left.
    const bool changed = c.options == kChange && c.exit_code == 0;
    EXPECT_TRUE(content_of(s.vxaenv) == (changed ? changed_by(before, 1) : before));
    EXPECT_TRUE(!changed || backups(s).size() == 1u);
    for (const std::string& backup : backups(s))
        EXPECT_TRUE(read_file(backup) == before) << backup;
    for (const std::string& name : zr7test::list_dir(s.tables()))
        EXPECT_TRUE(name.find("VXAENV.") == name.find(".zr7copy")) << name;  // both npos
}

INSTANTIATE_TEST_SUITE_P(All, Shapes, ::testing::ValuesIn(kCases),
                         [](const ::testing::TestParamInfo<ShapeCase>& c) { return c.param.name; });

// Starts a run that adds change `n`, its output appended to `output`.
pid_t start_logged(const SampleInstall& s, int n, const std::string& output) {
    const int fd = ::open(output.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    const pid_t pid = start(s, {change_options(n)}, fd);
    ::close(fd);
    return pid;
}

// VXAENV stays old or new, backups are whole earlier states, the next run completes.
// Another account races root's copies for a bounded time: it swaps every
// scratch file it sees for a link to a root-only file outside, and turns
// files of the image into pipes. The victim keeps its bytes, owner and mode,
// and no run hangs.
TEST(Races, SwappedScratchFilesAndPipesNeverReachTheVictim) {
    if (::geteuid() != 0)
        GTEST_SKIP() << "the race needs root and an unprivileged account";
    SampleInstall s;
    shape(s, {"many T/wide 300", "file R/victim root only\n", "chmod 0600 R/victim"});
    zr7test::run("/bin/chown", {"-R", "65534:65534", s.home, s.image});
    ::chmod(s.root.path().c_str(), 0755);
    const std::string victim = path_of(s, "R/victim"), wide = path_of(s, "T/wide");
    for (int round = 0; round < scaled(3, 20); ++round) {
        const pid_t racer = ::fork();
        if (racer == 0) {
            if (::setgid(65534) != 0 || ::setuid(65534) != 0)
                ::_exit(1);
            const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(3);
            for (int i = 0; std::chrono::steady_clock::now() < end; ++i) {
                for (const std::string& dir : {s.tables() + "/wide", s.tables()}) {
                    for (const std::string& name : zr7test::list_dir(dir)) {
                        const std::string path = dir + "/" + name;
                        if (name.rfind(".zr7copy.", 0) == 0 && ::unlink(path.c_str()) == 0)
                            (void)::symlink(victim.c_str(), path.c_str());
                    }
                }
                const std::string file = wide + "/f" + std::to_string(i % 300);
                if (i % 7 == 0 && ::unlink(file.c_str()) == 0)
                    (void)::mkfifo(file.c_str(), 0644);
            }
            ::_exit(0);
        }
        const zr7test::RunResult r = run_tool(s, {{}, false, -1, false});
        EXPECT_TRUE(r.exit_code == 0 || r.exit_code == 251) << r.out.substr(0, 2000);
        wait_for(racer);
        struct stat st {};
        ASSERT_EQ(::lstat(victim.c_str(), &st), 0);
        EXPECT_EQ(read_file(victim), "root only\n");
        EXPECT_EQ(st.st_uid, 0u);
        EXPECT_EQ(st.st_mode & 07777, 0600u);
    }
}

TEST(Kills, VxaenvIsAlwaysOldOrNewAndEveryBackupWhole) {
    SampleInstall s;
    // A mebibyte, the module list in the middle: each stage of the update can be hit.
    const std::string line = "SETTING=a value of one of the settings of the server, as most are\n";
    const std::string big = times(10000, line) + "KDS_RUN=KDSMAIN;KDSTRACE\n" + times(10000, line);
    write_file(s.vxaenv, big);
    const unsigned seed =
        unsigned(std::atoi(std::getenv("ZR7_SEED") ? std::getenv("ZR7_SEED") : "8"));
    std::mt19937 random(seed);
    std::set<std::string> states{big}, seen;
    const auto began = std::chrono::steady_clock::now();
    ASSERT_EQ(run_tool(s, {change_options(0)}).exit_code, 0);
    const auto length = std::chrono::steady_clock::now() - began;
    std::uniform_int_distribution<long long> moment(
        0, std::chrono::duration_cast<std::chrono::microseconds>(length).count() * 6 / 5);
    const int kills = scaled(12, 200);
    int after_change = 0;
    for (int k = 1; k <= kills; ++k) {
        const std::string old_content = read_file(s.vxaenv);
        const std::string new_content = changed_by(old_content, k);
        states.insert(old_content);
        const pid_t pid = start_logged(s, k, s.root / "run.out");
        std::this_thread::sleep_for(std::chrono::microseconds(moment(random)));
        ::kill(-pid, SIGKILL);
        wait_for(pid);
        const std::string now = read_file(s.vxaenv);
        ASSERT_TRUE(now == old_content || now == new_content) << "kill " << k;
        after_change += now == new_content ? 1 : 0;
        ASSERT_EQ(run_tool(s, {change_options(k)}).exit_code, 0)
            << "after kill " << k << ": " << read_file(s.root / "run.out");
        ASSERT_TRUE(read_file(s.vxaenv) == new_content) << "after kill " << k;
        // Backups of the killed run and of the one after it: each a whole earlier state.
        for (const std::string& backup : backups(s))
            ASSERT_TRUE(!seen.insert(backup).second || states.count(read_file(backup))) << backup;
    }
    std::printf("[ figures  ] ZR7_SEED=%u: %d kills, %d after the change, %zu backups\n", seed,
                kills, after_change, seen.size());
}

// An undo killed at any moment, then run again, gives the installation back
// whole: every step of it can be taken a second time.
TEST(Kills, AnUndoKilledAtAnyMomentCompletesWhenRunAgain) {
    const unsigned seed =
        unsigned(std::atoi(std::getenv("ZR7_SEED") ? std::getenv("ZR7_SEED") : "14"));
    std::mt19937 random(seed);
    const Launch undo{{"-u"}, false, -1, false, "", false};
    long long length_us = 0;
    const int kills = scaled(8, 100);
    for (int k = 0; k <= kills; ++k) {
        SampleInstall s;
        write_file(s.tables() + "/table.dat", "the server's\n", 0600);
        const std::string before = zr7test::tree_text(s.home, true);
        ASSERT_EQ(run_tool(s, {{"-m", "kzr", "-c", "K=v"}}).exit_code, 0);
        if (k == 0) {  // the first undo runs whole and gives the time an undo takes
            const auto began = std::chrono::steady_clock::now();
            ASSERT_EQ(run_tool(s, undo).exit_code, 0);
            length_us = std::chrono::duration_cast<std::chrono::microseconds>(
                            std::chrono::steady_clock::now() - began)
                            .count();
        } else {
            const int out =
                ::open((s.root / "undo.out").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0644);
            const pid_t pid = start(s, undo, out);
            ::close(out);
            std::this_thread::sleep_for(std::chrono::microseconds(
                std::uniform_int_distribution<long long>(0, length_us)(random)));
            ::kill(-pid, SIGKILL);
            wait_for(pid);
            const zr7test::RunResult again = run_tool(s, undo);
            // The killed undo may have finished, or never begun.
            ASSERT_TRUE(again.exit_code == 0 || again.exit_code == 256 - 12) << again.out;
        }
        EXPECT_EQ(zr7test::tree_text(s.home, true), before) << "kill " << k;
    }
}

// Eight runs at once take turns at VXAENV: one whole backup each, no change lost.
TEST(Concurrency, EightRunsAtOnceAllKeepTheirChange) {
    SampleInstall s;
    for (int d = 0; d < 100; ++d)  // directories every run creates: the runs meet there too
        shape(s, {"many T/dir" + std::to_string(d) + "/in 1"});
    std::vector<pid_t> pids;
    for (int n = 0; n < 8; ++n)
        pids.push_back(start_logged(s, n, s.root / std::to_string(n)));
    for (int n = 0; n < 8; ++n)
        EXPECT_EQ(wait_for(pids[n]), 0) << read_file(s.root / std::to_string(n));
    const std::string final_content = read_file(s.vxaenv);
    std::set<std::string> backed_up;
    for (const std::string& backup : backups(s))
        backed_up.insert(read_file(backup));
    EXPECT_EQ(backed_up.size(), 8u);
    EXPECT_EQ(backed_up.count(zr7test::kSampleVxaenv), 1u);
    for (int n = 0; n < 8; ++n)
        EXPECT_EQ(changed_by(final_content, n), final_content) << "run " << n << " lost";
}

// The pid of the installing run: the first trace line in its log names it.
pid_t installing_pid(const SampleInstall& s) {
    const std::string log = read_file(s.home + "/logs/qsdinst.log");
    const std::size_t at = log.find(" pid ");
    return at == std::string::npos ? 0 : static_cast<pid_t>(std::atol(log.c_str() + at + 5));
}
// Waits up to ten seconds for `ready`.
template <typename Ready>
bool poll_until(Ready ready) {
    const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    while (!ready() && std::chrono::steady_clock::now() < end)
        std::this_thread::sleep_for(std::chrono::milliseconds(2));
    return ready();
}
// Every scratch file of a copy under `dir`.
std::vector<std::string> copy_scratch(const std::string& dir) {
    std::vector<std::string> found;
    for (const fs::directory_entry& e : fs::recursive_directory_iterator(dir)) {
        if (e.path().filename().string().find(".zr7copy") != std::string::npos)
            found.push_back(e.path());
    }
    return found;
}

// A signal in the middle of a run, through the first invocation (which passes
// it on) or straight to the installing run: the run stops between files, says
// why in the log and on standard error, and ends with 128+N; a killed
// installing run is named by the first invocation.
struct SignalCase {
    const char* name;
    int signal_number;
    bool to_first;  // else to the installing run
    int exit_code;
    std::string err_line;
};
void PrintTo(const SignalCase& c, std::ostream* out) {
    *out << c.name;
}
const SignalCase kSignalCases[] = {
    {"term_to_the_installing_run", SIGTERM, false, 143, "Error: Interrupted by signal <15>\n"},
    {"term_to_the_first_invocation", SIGTERM, true, 143, "Error: Interrupted by signal <15>\n"},
    {"int_to_the_first_invocation", SIGINT, true, 130, "Error: Interrupted by signal <2>\n"},
    {"hup_to_the_installing_run", SIGHUP, false, 129, "Error: Interrupted by signal <1>\n"},
    {"kill_to_the_installing_run", SIGKILL, false, 137,
     "Error: The installing run was ended by signal <9>\n"},
};

class Signals : public ::testing::TestWithParam<SignalCase> {};

TEST_P(Signals, StopBetweenFilesWithTheirStatusAndLine) {
    const SignalCase& c = GetParam();
    SampleInstall s;
    // Hundreds of files, so that the run is still copying when the signal comes.
    shape(s, {"many T/wide 300", "many A/lib/wide 100", "many A/bin/wide 100"});
    const std::string out = s.root / "out";
    const int fd = ::open(out.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    const pid_t first = start(s, {change_options(1), true}, fd);
    ::close(fd);
    // Copies have begun once the first file of the image has landed.
    ASSERT_TRUE(poll_until([&] {
        return installing_pid(s) != 0 && zr7test::exists(s.tables() + "/ATTRLIB/kzr.atr");
    }));
    ::kill(c.to_first ? first : installing_pid(s), c.signal_number);
    EXPECT_EQ(wait_for(first), c.exit_code) << read_file(out);
    const std::string err = read_file(out), log = read_file(s.home + "/logs/qsdinst.log");
    EXPECT_NE(err.find(c.err_line), std::string::npos) << err;
    if (c.signal_number != SIGKILL) {
        EXPECT_TRUE(zr7test::has_trace_line(log, c.err_line.substr(0, c.err_line.size() - 1)))
            << log.substr(log.size() > 3000 ? log.size() - 3000 : 0);
        EXPECT_NE(log.find("Exiting with rc <" + std::to_string(c.exit_code) + ">"), log.npos);
        EXPECT_EQ(err.find("installing run was ended"), std::string::npos) << err;
        // Stopped early: the later trees are not (all) there.
        EXPECT_LT(zr7test::list_dir(s.home + "/lx8266/ms/bin/wide").size(), 100u);
        // Nothing half-copied is left; a SIGKILL may leave a scratch file
        // (never taken for the file).
        EXPECT_EQ(copy_scratch(s.home), std::vector<std::string>{});
    }
    const std::string vxaenv = read_file(s.vxaenv);
    EXPECT_TRUE(vxaenv == zr7test::kSampleVxaenv || vxaenv == changed_by(zr7test::kSampleVxaenv, 1))
        << vxaenv;
    ::kill(-first, SIGKILL);  // nothing of the run may outlive the test
}

// A signal while the loader runs: seeding stops before the next file.
TEST(Signals, StopBetweenSeededFiles) {
    SampleInstall s;  // only the files of this test: each one is there to be loaded
    shape(s, {"rm I/SQLLIB", "dir I/SQLLIB"});
    for (int i = 0; i < 300; ++i) {
        for (const std::string& dir : {s.image + "/MSRV/SQLLIB/", s.cicatrsq() + "/SQLLIB/"})
            write_file(dir + "s" + std::to_string(i) + ".sql", "SELECT 1;\n");
    }
    const std::string out = s.root / "out", catalog = s.cicatrsq() + "/qdsload.catalog";
    const int fd = ::open(out.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    const pid_t first = start(s, {{"-s"}, true}, fd);
    ::close(fd);
    ASSERT_TRUE(poll_until([&] { return installing_pid(s) != 0 && zr7test::exists(catalog); }));
    ::kill(installing_pid(s), SIGTERM);
    EXPECT_EQ(wait_for(first), 143) << read_file(out);
    const std::string loaded = read_file(catalog);
    std::size_t files = 0;
    for (std::size_t at = loaded.find(" loaded <"); at != loaded.npos;
         at = loaded.find(" loaded <", at + 1))
        ++files;
    EXPECT_LT(files, 200u) << loaded;
}

INSTANTIATE_TEST_SUITE_P(All, Signals, ::testing::ValuesIn(kSignalCases),
                         [](const ::testing::TestParamInfo<SignalCase>& c) {
                             return c.param.name;
                         });

// The environment of the runs a test starts, for the test's length.
class ScopedEnv {
  public:
    ScopedEnv(const char* name, const char* value) : name_(name) { ::setenv(name, value, 1); }
    ~ScopedEnv() { ::unsetenv(name_); }
    ScopedEnv(const ScopedEnv&) = delete;
    ScopedEnv& operator=(const ScopedEnv&) = delete;

  private:
    const char* name_;
};

// Forks a process that holds a lock on `dir` until it is killed: with the
// installer's own lock, or as uid 65534 with a flock on the directory itself.
pid_t hold_lock(const std::string& dir, bool as_nobody) {
    int ready[2];
    if (::pipe(ready) != 0)
        return -1;
    std::fflush(nullptr);
    const pid_t pid = ::fork();
    if (pid == 0) {
        bool held = false;
        if (as_nobody) {
            const int fd = ::setgid(65534) == 0 && ::setuid(65534) == 0
                               ? ::open(dir.c_str(), O_RDONLY | O_DIRECTORY)
                               : -1;
            held = fd >= 0 && ::flock(fd, LOCK_EX | LOCK_NB) == 0;
        } else {
            held = (new zr7::DirectoryLock(dir))->locked();  // held until the kill
        }
        (void)!::write(ready[1], held ? "y" : "n", 1);
        for (;;)
            ::pause();
    }
    ::close(ready[1]);
    char held = 'n';
    const bool told = ::read(ready[0], &held, 1) == 1;
    ::close(ready[0]);
    return told && held == 'y' ? pid : -1;
}

// Another installation holds the server: the run says that it waits, for whom,
// and gives up with -10 after ZR7_LOCK_WAIT seconds.
TEST(Locks, AHeldServerIsWaitedForThenGivenUp) {
    SampleInstall s;
    const pid_t holder = hold_lock(s.home + "/", false);
    ASSERT_GT(holder, 0);
    ScopedEnv wait("ZR7_LOCK_WAIT", "1");
    const auto began = std::chrono::steady_clock::now();
    const zr7test::RunResult r = run_tool(s, {change_options(1)});
    const auto took = std::chrono::steady_clock::now() - began;
    ::kill(holder, SIGKILL);
    wait_for(holder);
    const std::string who = ::geteuid() == 0 ? " (pid <" + std::to_string(holder) + ">)" : "";
    EXPECT_EQ(r.exit_code, 246) << r.out;
    EXPECT_NE(r.out.find("Waiting for another installation in <" + s.home + "/>" + who + "\n"),
              r.out.npos)
        << r.out;
    EXPECT_NE(r.out.find("Error: Another installation holds <" + s.home + "/>" + who +
                         "; gave up after <1> s\n"),
              r.out.npos)
        << r.out;
    EXPECT_NE(r.out.find("Exiting with rc <-10>"), r.out.npos);
    EXPECT_GE(took, std::chrono::seconds(1));
    EXPECT_EQ(read_file(s.vxaenv), zr7test::kSampleVxaenv);
    EXPECT_FALSE(zr7test::exists(s.tables() + "/ATTRLIB/kzr.atr"));  // nothing copied
}

// A signal ends the wait at once, as it would end the run.
TEST(Locks, ASignalEndsTheWait) {
    SampleInstall s;
    const pid_t holder = hold_lock(s.home + "/", false);
    ASSERT_GT(holder, 0);
    ScopedEnv wait("ZR7_LOCK_WAIT", "60");
    const std::string out = s.root / "out";
    const int fd = ::open(out.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    const pid_t run = start(s, {change_options(1)}, fd);
    ::close(fd);
    EXPECT_TRUE(
        poll_until([&] { return read_file(out).find("Waiting for") != std::string::npos; }));
    const auto signalled = std::chrono::steady_clock::now();
    ::kill(run, SIGTERM);
    EXPECT_EQ(wait_for(run), 143) << read_file(out);
    EXPECT_LT(std::chrono::steady_clock::now() - signalled, std::chrono::seconds(10));
    ::kill(holder, SIGKILL);
    wait_for(holder);
    EXPECT_NE(read_file(out).find("Error: Interrupted by signal <15>\n"), std::string::npos);
    EXPECT_EQ(read_file(s.vxaenv), zr7test::kSampleVxaenv);
}

// As root, an account that can merely open the installation directory cannot
// stall an installation by locking it.
TEST(Locks, AsRootAnUnprivilegedFlockStallsNothing) {
    if (::geteuid() != 0)
        GTEST_SKIP() << "the root rule";
    SampleInstall s(zr7test::reachable_dir());
    ::chmod(s.root.path().c_str(), 0755);
    const pid_t squatter = hold_lock(s.home, true);
    ASSERT_GT(squatter, 0);
    ScopedEnv wait("ZR7_LOCK_WAIT", "1");
    const zr7test::RunResult r = run_tool(s, {change_options(1)});
    ::kill(squatter, SIGKILL);
    wait_for(squatter);
    EXPECT_EQ(r.exit_code, 0) << r.out;
    EXPECT_EQ(r.out.find("Waiting for another installation"), r.out.npos) << r.out;
    EXPECT_EQ(read_file(s.vxaenv), changed_by(zr7test::kSampleVxaenv, 1));
}

}  // namespace
