// Whole installing runs on the sample with the stand-in loader: what lands
// where with which content, how each failure ends the run, what becomes of
// the environment file, and the progress display on a terminal.
#include <fcntl.h>
#include <unistd.h>

#include <filesystem>
#include <map>
#include <regex>

#include "tool/tool.h"

namespace zr7test {
namespace {

namespace fs = std::filesystem;
using S = const SampleInstall&;

TEST(Install, EveryFileLandsInPlaceWithItsContent) {
    SampleInstall s;
    const std::string t = s.tables() + "/", c = s.cicatrsq() + "/", a = s.image + "/MSRV/lx8266/";
    // clang-format off
    const std::pair<std::string, std::string> before[] = {  // in place, and more in the image
        {t + "table.dat", "old\n"}, {t + "text.txt", "old\n"}, {t + "keep.cfg", "local\n"},
        {t + "keep.txt", "local\r\n"}, {a + "TABLE_PRESERVE/new.cfg", "new\r\n"},
        {a + "TABLE_PRESERVE_TXT/new.txt", "a\r\nb\r\n"}};
    const std::pair<std::string, std::string> after[] = {
        // Flat copies lose their CRs, in both table directories.
        {t + "ATTRLIB/kzr.atr", "name kzr\nattr one\n"}, {t + "TECLIB/kzr.baroc", "event\n"},
        {c + "ATTRLIB/kzr.atr", "name kzr\nattr one\n"}, {c + "TECLIB/kzr.baroc", "event\n"},
        {t + "RKDSCATL/kzr.cat", "catalog\n"}, {c + "RKDSCATL/kzr.cat", "catalog\n"},
        {c + "SQLLIB/kzr_b.sql", "INSERT INTO T VALUES (3);\n"},
        // TABLE replaces, TABLE_PRESERVE only adds; both keep the bytes.
        {t + "table.dat", "table\r\n"}, {t + "sub/deeper/nested.dat", "nested\r\n"},
        {t + "keep.cfg", "local\n"}, {t + "new.cfg", "new\r\n"},
        // TABLE_TXT replaces, TABLE_PRESERVE_TXT only adds; both remove CRs.
        {t + "text.txt", "line one\nline two\n"}, {t + "keep.txt", "local\r\n"},
        {t + "new.txt", "a\nb\n"}, {s.vxaenv, kSampleVxaenv},  // VXAENV: no -c, no -m
        // The TECLIB of the TABLE tree is flat-copied after the trees.
        {t + "TECLIB/kzr_table.baroc", "table event\n"},
        {c + "TECLIB/kzr_table.baroc", "table event\n"},
        // lib and bin replace and keep the bytes.
        {s.home + "/lx8266/ms/lib/libkzr.so", "ELF\r\nbinary\r\n"},
        {s.home + "/lx8266/ms/bin/kzragent", "#!/bin/sh\r\nexit 0\r\n"}};
    // clang-format on
    for (const auto& [path, content] : before)
        write_file(path, content);
    const RunResult r = install(s);
    ASSERT_EQ(std::to_string(r.exit_code) + r.out + r.err, "0Calling go\nExiting with rc <0>\n");
    for (const auto& [path, content] : after)
        EXPECT_EQ(read_file(path), content) << path;
    EXPECT_EQ(::access((s.home + "/lx8266/ms/bin/kzragent").c_str(), X_OK), 0);
    EXPECT_FALSE(exists(t + "SQLLIB") || exists(c + "table.dat"));
}

void kmsenv(S s, const std::string& record) {
    write_file(s.home + "/config/.ConfigData/kmsenv",
               "FIELDSEP=|\n" + record + "\nSRV1|NETWORKPROTOCOL|ip.pipe|\n");
}

// Failures that the checks foresee, through the relaunch as an administrator
// runs it: the status, the reason on standard error, and a server untouched.
TEST(Install, ForeseenFailuresChangeNothing) {
    // clang-format off
    const struct { const char* name; void (*prepare)(S); std::vector<std::string> args; int rc;
                   std::string err; std::map<std::string, std::string> env; } cases[] = {
        {"mistyped image", [](S) {}, {"-e", "-c", "K=v", "-m", "kzr", "/nonexistent/typo"}, 249,
         "Error: Can't open </nonexistent/typo/MSRV>\n", {}},
        {"image for other architectures", [](S s) {
             fs::rename(s.image + "/MSRV/lx8266", s.image + "/MSRV/aix536"); },
         {"-m", "kzr"}, 249, "Error: The image has no tree for the architecture <lx8266>\n", {}},
        {"loader not on PATH", [](S) {}, {"-m", "kzr"}, 250, "Error: Can't start <qdsload>",
         {{"PATH", "/usr/bin:/bin"}}},
        {"missing destination", [](S s) { remove_tree(s.tables() + "/TECLIB"); }, {"-m", "kzr"},
         251, "Error: Can't open <", {}},
        {"loop in the image", [](S s) {
             fs::create_directory_symlink("..", s.image + "/MSRV/lx8266/TABLE/sub/deeper/up"); },
         {"-m", "kzr"}, 251, "Error: Directory loop at <", {}},
        {"no log directory", [](S s) { remove_tree(s.home + "/logs"); }, {}, 248,
         "Error: Log directory <", {}},
        // The reason of the system follows a line that names none.
        {"no configuration", [](S s) { remove_tree(s.home + "/config"); }, {}, 2,
         "Error: Can't open kmsenv\nError: <", {}},
        // Names from kmsenv that would lead out of their directory or break a line.
        {"server ../x", [](S s) { kmsenv(s, "../x|BINARCH|lx8266|"); }, {}, 255, "Error: Bad server name <../x>\n", {}},
        {"server ..", [](S s) { kmsenv(s, "..|BINARCH|lx8266|"); }, {}, 255, "Error: Bad server name <..>\n", {}},
        {"server a/b", [](S s) { kmsenv(s, "a/b|BINARCH|lx8266|"); }, {}, 255, "Error: Bad server name <a/b>\n", {}},
        {"server ESC", [](S s) { kmsenv(s, "SRV\033]0;x|BINARCH|lx8266|"); }, {}, 255, "Error: Bad server name <SRV\\x1b]0;x>\n", {}},
        {"arch ../../x", [](S s) { kmsenv(s, "SRV1|BINARCH|../../x|"); }, {}, 255, "Error: Bad architecture <../../x>\n", {}},
        {"arch .", [](S s) { kmsenv(s, "SRV1|BINARCH|.|"); }, {}, 255, "Error: Bad architecture <.>\n", {}},
        {"arch DEL", [](S s) { kmsenv(s, "SRV1|BINARCH|lx\x7f|"); }, {}, 255, "Error: Bad architecture <lx\\x7f>\n", {}},
    };
    // clang-format on
    for (const auto& c : cases) {
        SampleInstall s;
        c.prepare(s);
        const std::string before = tree_text(s.home);
        std::vector<std::string> args = {"-h", s.home};
        args.insert(args.end(), c.args.begin(), c.args.end());
        if (c.args.empty() || c.args.back()[0] != '/')
            args.push_back(s.image);
        RunOptions options;
        options.set_env = c.env;
        const RunResult r = tool(args, options);
        EXPECT_EQ(r.exit_code, c.rc) << c.name << "\n" << r.err;
        EXPECT_NE(r.err.find(c.err), std::string::npos) << c.name << "\n" << r.err;
        // The records alone may grow.
        EXPECT_EQ(tree_text(s.home), before) << c.name;
    }
}

TEST(Install, EachOutcomeEndsTheRunWithItsStatus) {
    const std::string srv = "tables/SRV1/", cic = "tables/cicatrsq/", cat = cic + "qdsload.catalog";
    const std::string atr = srv + "ATTRLIB/kzr.atr";
    const auto none = [](S) {};
    const auto no_config = [](S s) { remove_tree(s.home + "/config"); };
    // clang-format off
    const struct { void (*prepare)(S); std::vector<std::string> flags; const char* fail; int rc;
                   std::string done, not_done; } cases[] = {
        {none, {}, "", 0, cat, ""},
        {none, {"-e"}, "", 0, atr, cat},
        // The SQL files as a copy-only run leaves them.
        {[](S s) { fs::copy(s.image + "/MSRV/SQLLIB", s.cicatrsq() + "/SQLLIB"); }, {"-s"}, "", 0,
         cat, atr},
        {none, {"-e", "-s"}, "", 0, "", atr},  // seeding would fail: no copies
        {no_config, {}, "", 2, "", atr},
        {[](S s) { remove_tree(s.tables() + "/ATTRLIB"); }, {}, "", -5, "",
         srv + "RKDSCATL/kzr.cat"},
        {none, {}, "kzr_a.sql", -6, cic + "TECLIB/kzr_table.baroc", ""},
        // Failures that the checks before the first command foresee change nothing.
        {[](S s) { remove_tree(s.image + "/MSRV/SQLLIB"); }, {}, "", -7, "",
         cic + "TECLIB/kzr_table.baroc"},
        // A link back up the walked tree is refused, not followed without end.
        {[](S s) { ::symlink("..", (s.image + "/MSRV/lx8266/TABLE/sub/loop").c_str()); }, {}, "",
         -5, "", atr}};
    // clang-format on
    for (const auto& c : cases) {
        const std::string line = "\nExiting with rc <" + std::to_string(c.rc) + ">\n";
        SampleInstall s, relaunched;
        c.prepare(s);
        c.prepare(relaunched);
        RunOptions options;
        options.set_env["QDSLOAD_FAIL"] = c.fail;
        const RunResult r = install(s, c.flags, options);
        EXPECT_EQ(r.exit_code, c.rc & 0xFF) << r.out;
        EXPECT_TRUE(ends_with("\n" + r.out, line)) << r.out;
        EXPECT_TRUE(exists(s.home + "/" + c.done)) << c.done;
        EXPECT_FALSE(!c.not_done.empty() && exists(s.home + "/" + c.not_done)) << c.not_done;
        std::vector<std::string> args = c.flags;
        args.insert(args.end(), {"-h", relaunched.home, relaunched.image});
        const std::string log_file = relaunched.home + "/logs/qsdinst.log";
        for (int run = 0; run < 2; ++run) {
            const RunResult first = tool(args, options);
            EXPECT_EQ(first.exit_code, c.rc & 0xFF);
            // A failure shows its "Error:" lines, then where the whole story is.
            const std::string closing = "zr7inst: installation failed with exit status <" +
                                        std::to_string(c.rc & 0xFF) + ">; see <" + log_file + ">\n";
            EXPECT_TRUE(c.rc == 0 ? first.err.empty()
                                  : ("\n" + first.err).find("\nError: ") != std::string::npos &&
                                        ends_with(first.err, closing))
                << first.err;
        }
        const std::string log = read_file(relaunched.home + "/logs/qsdinst.log");
        EXPECT_NE(log.find(line, log.find(line) + 1), std::string::npos) << log;
    }
}

// Names in the image with a line break or a terminal command: the log keeps
// one line per trace line, so the run's own closing lines cannot be forged.
TEST(Install, NamesInTheImageCannotForgeALineOfTheLog) {
    SampleInstall s;
    write_file(s.image + "/MSRV/ATTRLIB/x\nExiting with rc <0>\n.atr", "a\n");
    write_file(s.image + "/MSRV/ATTRLIB/\033]0;title\007.atr", "b\n");
    RunOptions fail;  // the run then fails, after the copies
    fail.set_env["QDSLOAD_FAIL"] = "kzr_a.sql";
    const RunResult r = tool({"-h", s.home, s.image}, fail);
    EXPECT_EQ(r.exit_code, 250) << r.err;
    const std::string log = read_file(s.home + "/logs/qsdinst.log");
    std::vector<std::string> exiting, begins, ends;
    std::size_t at = 0;
    for (std::size_t end; (end = log.find('\n', at)) != std::string::npos; at = end + 1) {
        const std::string line = log.substr(at, end - at);
        if (line.rfind("Exiting with rc", 0) == 0)
            exiting.push_back(line);
        if (line.find(") zr7inst 06100400 run begins: time ") != std::string::npos)
            begins.push_back(line);
        if (line.find(") zr7inst run ends: rc ") != std::string::npos)
            ends.push_back(line);
    }
    EXPECT_EQ(exiting, std::vector<std::string>{"Exiting with rc <-6>"}) << log;
    EXPECT_EQ(log.find('\033'), std::string::npos);
    EXPECT_NE(log.find("<x\\nExiting with rc <0>\\n.atr>"), std::string::npos) << log;
    EXPECT_NE(log.find("<\\x1b]0;title\\x07.atr>"), std::string::npos) << log;
    // The run's first and last lines: who ran what, and how it ended.
    ASSERT_EQ(begins.size(), 1u) << log;
    EXPECT_NE(begins[0].find(", command " + tool_path() + " -o " + s.home + "/logs/ -h "),
              std::string::npos)
        << begins[0];
    ASSERT_EQ(ends.size(), 1u) << log;
    EXPECT_TRUE(
        std::regex_search(ends[0], std::regex(", files copied [1-9][0-9]*, files seeded [0-9]+, "
                                              "VXAENV not updated, elapsed [0-9]+\\.[0-9]{3} s, "
                                              "journal [0-9]+\\.[0-9]{3} s$")))
        << ends[0];
    EXPECT_NE(ends[0].find("rc -6,"), std::string::npos) << ends[0];
}

TEST(Vxaenv, SettingsAndModuleRewriteItWithABackup) {
    SampleInstall s;
    ::chmod(s.vxaenv.c_str(), 0640);
    ASSERT_EQ(install(s, {"-e", "-c", "kds_start=2", "-c", "NEW=v", "-m", "KZR"}).exit_code, 0);
    EXPECT_EQ(read_file(s.vxaenv),
              "# server environment\nKDS_START=2\nKDS_RUN=KDSMAIN;KDSTRACE;KZR\n"
              "CT_CMSLIST=IP.PIPE:#127.0.0.1\nNEW=v\n");
    const std::vector<std::string> backups = list_dir(s.tables() + "/.archive");
    ASSERT_EQ(backups.size(), 1u);
    EXPECT_TRUE(std::regex_match(backups[0], std::regex("VXAENV_[0-9]+"))) << backups[0];
    EXPECT_EQ(read_file(s.tables() + "/.archive/" + backups[0]), kSampleVxaenv);
    struct stat backup {};  // the backup keeps the file's mode
    ASSERT_EQ(::stat((s.tables() + "/.archive/" + backups[0]).c_str(), &backup), 0);
    EXPECT_EQ(backup.st_mode & 07777, 0640u);
    for (const std::string& name : list_dir(s.tables()))
        EXPECT_EQ(name.find("VXAENV."), std::string::npos) << "scratch file left: " << name;
}

// On a terminal standard error carries the progress line and the summary;
// elsewhere none of it, and standard output and the log are the same.
TEST(Progress, OnlyOnATerminal) {
    SampleInstall on_tty, plain;
    const int master = ::posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC);
    ASSERT_TRUE(master >= 0 && ::grantpt(master) == 0 && ::unlockpt(master) == 0);
    RunOptions on, off;  // in each sample's root: the same command lines
    on.cwd = on_tty.root.path();
    on.stderr_path = ::ptsname(master);
    const int slave = ::open(on.stderr_path.c_str(), O_RDWR | O_NOCTTY | O_CLOEXEC);
    off.cwd = plain.root.path();
    const std::vector<std::string> args = {"-h", "home", "-c", "zr7demo=1", "-m", "kzr", "image"};
    const RunResult t = tool(args, on), r = tool(args, off);
    // Read to the end, when no one holds the terminal (the test too, lest a run that
    // never opened it keep the read waiting). The terminal made each line end CR LF.
    ::close(slave);
    std::string tty;
    char buffer[4096];
    for (ssize_t got; (got = ::read(master, buffer, sizeof buffer)) > 0;)
        tty.append(buffer, static_cast<std::size_t>(got));
    ::close(master);
    EXPECT_EQ(t.exit_code, 0);
    EXPECT_EQ(tty.find("\r[1/17] copy ATTRLIB | files: 0 copied, 0 seeded"), 0u) << tty;
    // The progress line is rewritten in place, then blanked for the summary.
    EXPECT_TRUE(std::regex_match(
        tty,
        std::regex("[^\n]*\r *\rzr7inst: installation done\r\n"
                   "  files copied: [1-9][0-9]*\r\n  files seeded: 2\r\n"
                   "  VXAENV: changed, backup [^\n]*/\\.archive/VXAENV_[0-9]+\r\n"
                   "  actions: mkdir [0-9]+ create [0-9]+ replace [0-9]+ same [0-9]+ keep [0-9]+ "
                   "vxaenv 1 backup 1 seed 2 pass 0 error 0\r\n"
                   "  log: home/logs/qsdinst\\.log\r\n  elapsed: [0-9]+\\.[0-9]{3} s\r\n")))
        << tty;
    EXPECT_EQ(r.err, "");
    const auto same = [](const std::string& text) {
        // The header names the working directory, which differs.
        return std::regex_replace(text, std::regex("[0-9]+|backup\\.\\w+|cwd [^,]*"), "#");
    };
    EXPECT_EQ(same(t.out), same(r.out));
    EXPECT_EQ(same(read_file(on_tty.home + "/logs/qsdinst.log")),
              same(read_file(plain.home + "/logs/qsdinst.log")));
}

}  // namespace
}  // namespace zr7test
