// Source images from elsewhere: names made of any byte, names a shell would
// act on, deep and wide trees, links of every kind, the wrong kind of file in
// the wrong place, unreadable entries. Every name lands as it is, nothing
// runs, and every failure ends the run with its status and a line.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <string>
#include <vector>

#include "robustness/robustness_support.h"

namespace {

using zr7test::make_dirs;
using zr7test::read_file;
using zr7test::SampleInstall;
using zr7test::write_file;

// Would exist after a run if any name had reached a shell.
const char* const kCanary = "zr7canary";

// Every byte but "/" and NUL alone and between letters, names a shell would
// act on, option look-alikes, line breaks, blanks, and the longest name.
std::vector<std::string> hostile_names() {
    std::vector<std::string> names;
    for (int b = 1; b < 256; ++b) {
        if (b == '/')
            continue;
        const std::string byte(1, static_cast<char>(b));
        if (byte != ".")
            names.push_back(byte);
        names.push_back("a" + byte + "z");
    }
    const std::string c = kCanary;
    const std::vector<std::string> shell_bait = {"$(touch " + c + ")",
                                                 "`touch " + c + "`",
                                                 ";touch " + c,
                                                 "|touch " + c,
                                                 "&touch " + c,
                                                 "&&touch " + c + "&&",
                                                 ">" + c,
                                                 "<" + c,
                                                 "'\";touch " + c + ";'",
                                                 "\ntouch " + c + "\n",
                                                 "${IFS}touch${IFS}" + c,
                                                 "*",
                                                 "?",
                                                 "[a-z]",
                                                 "~",
                                                 "!!",
                                                 "-",
                                                 "--",
                                                 "-rf",
                                                 "--help",
                                                 "-o x",
                                                 " ",
                                                 "  lead",
                                                 "trail  ",
                                                 "\t",
                                                 "\r\n",
                                                 "..."};
    names.insert(names.end(), shell_bait.begin(), shell_bait.end());
    names.push_back(std::string(255, 'n'));
    return names;
}

std::string without_cr(std::string text) {
    text.erase(std::remove(text.begin(), text.end(), '\r'), text.end());
    return text;
}

bool canary_anywhere(const std::string& dir) {
    for (const auto& entry : zr7rb::snapshot(dir)) {
        const std::string& path = entry.first;
        const std::size_t slash = path.rfind('/');
        if (path.substr(slash == std::string::npos ? 0 : slash + 1) == kCanary)
            return true;
    }
    return false;
}

// The entries of `dir` whose names the image put there, as a snapshot keyed
// by name.
zr7rb::Snapshot only(const zr7rb::Snapshot& all, const std::string& prefix) {
    zr7rb::Snapshot out;
    for (const auto& entry : all) {
        if (entry.first.compare(0, prefix.size(), prefix) == 0)
            out[entry.first.substr(prefix.size())] = entry.second;
    }
    return out;
}

TEST(HostileImage, EveryNameLandsExactlyAndNothingRuns) {
    SampleInstall s;
    const std::string msrv = s.image + "/MSRV";
    const std::string table = msrv + "/" + s.arch + "/TABLE";
    const std::vector<std::string> names = hostile_names();
    zr7rb::Snapshot flat;
    zr7rb::Snapshot tree;
    zr7rb::Snapshot sql;
    make_dirs(table + "/dirs");
    make_dirs(table + "/files");
    for (const std::string& name : names) {
        const std::string content = "line\r\n" + name + "\r\n";
        write_file(msrv + "/ATTRLIB/" + name, content);
        flat[name] = "f" + without_cr(content);
        write_file(table + "/files/" + name, content);
        tree["files/" + name] = "f" + content;
        make_dirs(table + "/dirs/" + name);
        write_file(table + "/dirs/" + name + "/inside", content);
        tree["dirs/" + name] = "d";
        tree["dirs/" + name + "/inside"] = "f" + content;
        const std::string sql_name = name.substr(0, 250) + ".txt";
        write_file(msrv + "/SQLLIB/" + sql_name, content);
        sql[sql_name] = "f" + without_cr(content);
    }
    // Seeded names: the loader is handed each one as it is.
    const std::vector<std::string> seeded = {"$(touch " + std::string(kCanary) + ").sql", "-rf.sql",
                                             "a b.sql", "`x`;y.sql", "\xff\x01.sql"};
    for (const std::string& name : seeded)
        write_file(msrv + "/SQLLIB/" + name, "INSERT INTO T VALUES (1);\n");
    const zr7rb::Snapshot image_before = zr7rb::snapshot(s.image);

    const std::string sandbox = s.root / "sandbox";
    make_dirs(sandbox);
    zr7rb::Launch launch = zr7rb::relaunch_launch(s);
    launch.cwd = sandbox;
    const zr7test::RunResult r = zr7rb::run_captured(launch);
    const std::string log = read_file(s.home + "/logs/qsdinst.log");
    ASSERT_EQ(r.exit_code, 0) << r.err << log.substr(log.size() > 4000 ? log.size() - 4000 : 0);

    const zr7rb::Snapshot home = zr7rb::snapshot(s.home);
    for (const char* table_dir : {"tables/SRV1/ATTRLIB/", "tables/cicatrsq/ATTRLIB/"}) {
        zr7rb::Snapshot got = only(home, table_dir);
        got.erase("kzr.atr");
        EXPECT_TRUE(got == flat) << table_dir;
    }
    for (const char* part : {"dirs/", "files/"})
        EXPECT_TRUE(only(home, std::string("tables/SRV1/") + part) == only(tree, part)) << part;
    const std::string catalog = read_file(s.cicatrsq() + "/qdsload.catalog");
    zr7rb::Snapshot landed_sql = only(home, "tables/cicatrsq/SQLLIB/");
    for (const auto& entry : sql)
        EXPECT_EQ(landed_sql[entry.first], entry.second);
    for (const std::string& name : seeded)
        EXPECT_NE(catalog.find(" loaded <" + name + "> "), std::string::npos) << name;
    EXPECT_EQ(read_file(s.vxaenv), zr7test::kSampleVxaenv);
    EXPECT_TRUE(zr7rb::snapshot(s.image) == image_before);
    EXPECT_FALSE(canary_anywhere(s.root.path()));
    zr7rb::report("hostile names tried", static_cast<long long>(names.size() + seeded.size()));
    zr7rb::report("files and directories landed",
                  static_cast<long long>(2 * flat.size() + tree.size() + sql.size()));
}

// A chain of directories `depth` deep, each named `name`, a file at every
// level. Built one level at a time from the level above, so that paths longer
// than the system takes can be made.
void deep_tree(const std::string& top, int depth, const std::string& name) {
    int fd = ::open(top.c_str(), O_RDONLY | O_DIRECTORY);
    for (int level = 0; level < depth && fd >= 0; ++level) {
        ::mkdirat(fd, name.c_str(), 0755);
        const int next = ::openat(fd, name.c_str(), O_RDONLY | O_DIRECTORY);
        ::close(fd);
        fd = next;
        const int file = ::openat(fd, "level", O_WRONLY | O_CREAT | O_TRUNC, 0644);
        const std::string text = std::to_string(level);
        EXPECT_EQ(::write(file, text.data(), text.size()), static_cast<ssize_t>(text.size()));
        ::close(file);
    }
    ::close(fd);
}

TEST(HostileImage, TwoHundredLevelsDeepLandWhole) {
    SampleInstall s;
    deep_tree(s.image + "/MSRV/" + s.arch + "/TABLE", 200, "d");
    const zr7test::RunResult r = zr7rb::run_captured(zr7rb::install_launch(s));
    ASSERT_EQ(r.exit_code, 0) << r.err;
    std::string dir = s.tables();
    for (int level = 0; level < 200; ++level) {
        dir += "/d";
        ASSERT_EQ(read_file(dir + "/level"), std::to_string(level)) << "level " << level;
    }
    zr7rb::report("tree depth", 200);
}

TEST(HostileImage, PathsBeyondTheSystemLimitFailTheRunInsteadOfVanishing) {
    SampleInstall s;
    // 200 levels of 30-byte names: the source paths outgrow PATH_MAX.
    deep_tree(s.image + "/MSRV/" + s.arch + "/TABLE", 200, std::string(30, 'p'));
    const zr7test::RunResult r = zr7rb::run_captured(zr7rb::install_launch(s));
    EXPECT_EQ(r.exit_code, 251) << r.err;
    EXPECT_TRUE(zr7rb::has_line(r.out, "Error: Can't access <")) << r.out.substr(0, 2000);
    EXPECT_EQ(read_file(s.vxaenv), zr7test::kSampleVxaenv);
}

TEST(HostileImage, AWideDirectoryLandsWhole) {
    SampleInstall s;
    const int count = zr7rb::scaled(500, 20000);
    const std::string lib = s.image + "/MSRV/" + s.arch + "/lib";
    for (int i = 0; i < count; ++i)
        write_file(lib + "/f" + std::to_string(i), std::to_string(i));
    const zr7test::RunResult r = zr7rb::run_captured(zr7rb::install_launch(s));
    ASSERT_EQ(r.exit_code, 0) << r.err;
    const std::string dst = s.home + "/" + s.arch + "/ms/lib";
    EXPECT_EQ(zr7test::list_dir(dst).size(), static_cast<std::size_t>(count) + 1);
    for (int i = 0; i < count; ++i)
        ASSERT_EQ(read_file(dst + "/f" + std::to_string(i)), std::to_string(i));
    zr7rb::report("files in one directory", count);
}

}  // namespace
