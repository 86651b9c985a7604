// Whole install runs of the built tool against a sample server installation
// and the stand-in loader: what lands where, with which content, and how a
// run stops.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <map>
#include <string>
#include <vector>

#include "support/dir_order.h"
#include "support/stdout_capture.h"
#include "support/test_support.h"

namespace {

using zr7test::exists;
using zr7test::list_dir;
using zr7test::read_file;
using zr7test::write_file;

const char* const kTraceAll = "ERROR (UNIT:zr7 ALL)";

// Every file under a directory with its content, and every directory.
void snapshot(const std::string& dir, const std::string& prefix,
              std::map<std::string, std::string>& out) {
    for (const std::string& name : list_dir(dir)) {
        const std::string path = dir + "/" + name;
        struct stat st {};
        ::lstat(path.c_str(), &st);
        if (S_ISDIR(st.st_mode)) {
            out[prefix + name + "/"] = "";
            snapshot(path, prefix + name + "/", out);
        } else {
            out[prefix + name] = read_file(path);
        }
    }
}

std::map<std::string, std::string> snapshot(const std::string& dir) {
    std::map<std::string, std::string> out;
    snapshot(dir, "", out);
    return out;
}

std::string local_host_name() {
    char buffer[512] = {};
    ::gethostname(buffer, sizeof buffer - 1);
    return buffer;
}

class InstallRunTest : public ::testing::Test {
  protected:
    void SetUp() override { zr7test::make_dirs(record); }

    zr7test::RunResult install(const std::vector<std::string>& extra = {},
                               const std::map<std::string, std::string>& env = {},
                               const char* trace = kTraceAll) {
        std::vector<std::string> args{"-o", s.home + "/logs/", "-h", s.home};
        args.insert(args.end(), extra.begin(), extra.end());
        args.push_back(s.image);
        zr7test::RunOptions options;
        options.unset_env = {"QDSLOAD_FAIL", "MARLIN_HOME", "MARLINHOME", "VXA_TRC1"};
        options.set_env = env;
        options.set_env["QDSLOAD_RECORD"] = record;
        if (trace != nullptr)
            options.set_env["VXA_TRC1"] = trace;
        return zr7test::run(zr7test::tool_path(), args, options);
    }

    int catalog_count(const std::string& file_name) const {
        const std::string text = read_file(s.cicatrsq() + "/qdsload.catalog");
        const std::string key = " loaded <" + file_name + "> ";
        int count = 0;
        for (std::size_t at = text.find(key); at != std::string::npos; at = text.find(key, at + 1))
            ++count;
        return count;
    }

    bool seeded_anything() const { return exists(s.cicatrsq() + "/qdsload.catalog"); }

    std::string msrv() const { return s.image + "/MSRV"; }
    std::string archdir() const { return msrv() + "/" + s.arch; }

    zr7test::SampleInstall s;
    std::string record = s.root / "record";
};

TEST_F(InstallRunTest, WholeRunPutsEveryFileInPlaceWithTheRightContent) {
    // Files already at the destination, and more files in the image.
    write_file(s.tables() + "/table.dat", "old table\n");
    write_file(s.tables() + "/text.txt", "old text\n");
    write_file(s.tables() + "/keep.cfg", "local edit\n");
    write_file(s.tables() + "/keep.txt", "local text\r\n");
    write_file(archdir() + "/TABLE_PRESERVE/new.cfg", "new\r\n");
    write_file(archdir() + "/TABLE_PRESERVE_TXT/fresh.txt", "a\r\nb\r\n");

    const zr7test::RunResult r = install();
    ASSERT_EQ(r.exit_code, 0) << r.out << r.err;
    EXPECT_NE(r.out.find("Calling go\n"), std::string::npos);
    EXPECT_NE(r.out.find("Exiting with rc <0>\n"), std::string::npos);

    const struct {
        std::string path;
        std::string content;
    } expected[] = {
        // Flat copies: carriage returns removed, to both table directories.
        {s.tables() + "/ATTRLIB/kzr.atr", "name kzr\nattr one\n"},
        {s.tables() + "/RKDSCATL/kzr.cat", "catalog\n"},
        {s.tables() + "/TECLIB/kzr.baroc", "event\n"},
        {s.cicatrsq() + "/ATTRLIB/kzr.atr", "name kzr\nattr one\n"},
        {s.cicatrsq() + "/RKDSCATL/kzr.cat", "catalog\n"},
        {s.cicatrsq() + "/TECLIB/kzr.baroc", "event\n"},
        {s.cicatrsq() + "/SQLLIB/kzr_b.sql", "INSERT INTO T VALUES (3);\n"},
        // TABLE replaces and keeps the bytes as they are.
        {s.tables() + "/table.dat", "table\r\n"},
        {s.tables() + "/sub/deeper/nested.dat", "nested\r\n"},
        // TABLE_PRESERVE adds without replacing, bytes as they are.
        {s.tables() + "/keep.cfg", "local edit\n"},
        {s.tables() + "/new.cfg", "new\r\n"},
        // TABLE_TXT replaces, TABLE_PRESERVE_TXT adds; both remove CRs.
        {s.tables() + "/text.txt", "line one\nline two\n"},
        {s.tables() + "/keep.txt", "local text\r\n"},
        {s.tables() + "/fresh.txt", "a\nb\n"},
        // The TECLIB of the TABLE tree, flat-copied again after the trees.
        {s.tables() + "/TECLIB/kzr_table.baroc", "table event\n"},
        {s.cicatrsq() + "/TECLIB/kzr_table.baroc", "table event\n"},
        // lib and bin: replaced, bytes as they are.
        {s.home + "/lx8266/ms/lib/libkzr.so", "ELF\r\nbinary\r\n"},
        {s.home + "/lx8266/ms/bin/kzragent", "#!/bin/sh\r\nexit 0\r\n"},
        // Without -c and -m the environment file stays as it was.
        {s.vxaenv, zr7test::kSampleVxaenv},
    };
    for (const auto& file : expected)
        EXPECT_EQ(read_file(file.path), file.content) << file.path;

    struct stat st {};
    ASSERT_EQ(::stat((s.home + "/lx8266/ms/bin/kzragent").c_str(), &st), 0);
    EXPECT_NE(st.st_mode & S_IXUSR, 0u);
    EXPECT_FALSE(exists(s.tables() + "/SQLLIB"));
    EXPECT_FALSE(exists(s.cicatrsq() + "/table.dat"));
}

TEST_F(InstallRunTest, SeedingGivesTheLoaderItsResponseFileAndEnvironment) {
    const zr7test::RunResult r = install();
    ASSERT_EQ(r.exit_code, 0) << r.out << r.err;

    EXPECT_EQ(catalog_count("kzr_a.sql"), 1);
    EXPECT_EQ(catalog_count("kzr_b.sql"), 1);
    EXPECT_NE(read_file(s.cicatrsq() + "/qdsload.catalog").find("loaded <kzr_a.sql> statements 2"),
              std::string::npos);
    const std::string host = local_host_name();
    EXPECT_EQ(read_file(record + "/kzr_a.sql.rsp"), "ip.pipe\n" + host + "\n1918\nkzr_a.sql\nend");
    EXPECT_EQ(read_file(record + "/kzr_a.sql.env"),
              "KDC_FAMILIES=PORT:1918 ip.pipe USE:Y\n"
              "SQLLIB=" +
                  s.cicatrsq() +
                  "/SQLLIB\n"
                  "VXA_TRC1=ERROR\n"
                  "stdin mode 0600\n");
    EXPECT_NE(read_file(s.home + "/logs/kzr_a.sql.log").find("qdsload: loaded <kzr_a.sql>"),
              std::string::npos);
    EXPECT_NE(r.out.find(" >>" + s.home + "/logs/kzr_b.sql.log> \n"), std::string::npos) << r.out;
}

TEST_F(InstallRunTest, CopyOnlySkipsSeeding) {
    const zr7test::RunResult r = install({"-e"});
    ASSERT_EQ(r.exit_code, 0) << r.out << r.err;
    EXPECT_TRUE(zr7test::has_trace_line(r.out, "Seeding disabled")) << r.out;
    EXPECT_EQ(read_file(s.tables() + "/ATTRLIB/kzr.atr"), "name kzr\nattr one\n");
    EXPECT_EQ(read_file(s.cicatrsq() + "/SQLLIB/kzr_a.sql"),
              "INSERT INTO T VALUES (1);\nINSERT INTO T VALUES (2);\n");
    EXPECT_FALSE(seeded_anything());
    EXPECT_EQ(list_dir(s.home + "/logs"), std::vector<std::string>{});
}

TEST_F(InstallRunTest, SeedOnlyCopiesNothing) {
    // The SQL files as an earlier copy-only run left them.
    for (const char* name : {"kzr_a.sql", "kzr_b.sql"})
        write_file(s.cicatrsq() + "/SQLLIB/" + name, read_file(msrv() + "/SQLLIB/" + name));
    const zr7test::RunResult r = install({"-s"});
    ASSERT_EQ(r.exit_code, 0) << r.out << r.err;
    EXPECT_TRUE(zr7test::has_trace_line(r.out, "Copying disabled")) << r.out;
    EXPECT_EQ(catalog_count("kzr_a.sql"), 1);
    EXPECT_EQ(catalog_count("kzr_b.sql"), 1);
    EXPECT_EQ(list_dir(s.tables() + "/ATTRLIB"), std::vector<std::string>{});
    EXPECT_FALSE(exists(s.tables() + "/table.dat"));
}

TEST_F(InstallRunTest, CopyOnlyAndSeedOnlyTogetherChangeNothing) {
    const auto before = snapshot(s.home);
    const zr7test::RunResult r = install({"-e", "-s"});
    ASSERT_EQ(r.exit_code, 0) << r.out << r.err;
    EXPECT_TRUE(zr7test::has_trace_line(r.out, "Copying disabled")) << r.out;
    EXPECT_TRUE(zr7test::has_trace_line(r.out, "Seeding disabled")) << r.out;
    EXPECT_EQ(snapshot(s.home), before);
}

TEST_F(InstallRunTest, MissingServerConfigurationExitsWithItsErrorNumber) {
    ::unlink((s.home + "/config/.ConfigData/kmsenv").c_str());
    const auto before = snapshot(s.home);
    const zr7test::RunResult r = install({}, {}, nullptr);
    EXPECT_EQ(r.exit_code, 2) << r.out << r.err;
    EXPECT_NE(r.out.find("Exiting with rc <2>\n"), std::string::npos) << r.out;
    EXPECT_EQ(r.out.find("Calling go"), std::string::npos) << r.out;
    EXPECT_EQ(snapshot(s.home), before);
}

TEST_F(InstallRunTest, MissingFlatCopyDestinationStopsTheRun) {
    zr7test::remove_tree(s.tables() + "/ATTRLIB");
    const zr7test::RunResult r = install({}, {}, nullptr);
    EXPECT_EQ(r.exit_code, 251) << r.out << r.err;
    EXPECT_TRUE(zr7test::has_trace_line(r.out, "Error: Copy src <" + msrv() +
                                                   "/ATTRLIB/kzr.atr> to dst <" + s.tables() +
                                                   "/ATTRLIB/kzr.atr> failed"))
        << r.out;
    EXPECT_NE(r.out.find("Exiting with rc <-5>\n"), std::string::npos) << r.out;
    // The commands after the first were not run.
    EXPECT_EQ(list_dir(s.tables() + "/RKDSCATL"), std::vector<std::string>{});
    EXPECT_EQ(list_dir(s.cicatrsq() + "/ATTRLIB"), std::vector<std::string>{});
    EXPECT_FALSE(seeded_anything());
}

TEST_F(InstallRunTest, MissingTreeCopyDestinationStopsTheRun) {
    zr7test::remove_tree(s.home + "/lx8266/ms/lib");
    const zr7test::RunResult r = install();
    EXPECT_EQ(r.exit_code, 251) << r.out << r.err;
    // The commands before it ran; the bin tree, the text trees and seeding did not.
    EXPECT_EQ(read_file(s.tables() + "/table.dat"), "table\r\n");
    EXPECT_EQ(list_dir(s.home + "/lx8266/ms/bin"), std::vector<std::string>{});
    EXPECT_FALSE(exists(s.tables() + "/text.txt"));
    EXPECT_FALSE(seeded_anything());
}

TEST_F(InstallRunTest, LoaderFailureOnTheSecondOfThreeFilesStopsTheSeeding) {
    write_file(msrv() + "/SQLLIB/kzr_c.sql", "INSERT INTO T VALUES (4);\n");
    // The tool seeds in the order the directory lists its entries.
    std::vector<std::string> order;
    for (const std::string& name : zr7test::readdir_order(msrv() + "/SQLLIB"))
        order.push_back(name);
    ASSERT_EQ(order.size(), 3u);

    const zr7test::RunResult r = install({}, {{"QDSLOAD_FAIL", order[1]}});
    EXPECT_EQ(r.exit_code, 250) << r.out << r.err;
    EXPECT_TRUE(zr7test::has_trace_line(r.out, "Error: Seeding <" + order[1] + "> failed"))
        << r.out;
    EXPECT_NE(r.out.find("Exiting with rc <-6>\n"), std::string::npos) << r.out;
    EXPECT_EQ(catalog_count(order[0]), 1);
    EXPECT_EQ(catalog_count(order[1]), 0);
    EXPECT_EQ(catalog_count(order[2]), 0);
    EXPECT_FALSE(exists(record + "/" + order[2] + ".rsp"));
}

TEST_F(InstallRunTest, MissingSqlSourceDirectoryFailsTheSeedCommand) {
    zr7test::remove_tree(msrv() + "/SQLLIB");
    const zr7test::RunResult r = install();
    EXPECT_EQ(r.exit_code, 249) << r.out << r.err;
    // For the flat copy the same directory is only nothing to do.
    EXPECT_TRUE(zr7test::has_trace_line(r.out, "No file to process in <" + msrv() + "/SQLLIB>"))
        << r.out;
    EXPECT_EQ(read_file(s.cicatrsq() + "/TECLIB/kzr_table.baroc"), "table event\n");
    EXPECT_NE(r.out.find("Exiting with rc <-7>\n"), std::string::npos) << r.out;
}

TEST_F(InstallRunTest, LinkBackToAnAncestorFailsTheTreeCopy) {
    const std::string link = archdir() + "/TABLE/sub/loop";
    ASSERT_EQ(::symlink("..", link.c_str()), 0);
    const zr7test::RunResult r = install({}, {}, nullptr);
    EXPECT_EQ(r.exit_code, 251) << r.out << r.err;
    EXPECT_TRUE(zr7test::has_trace_line(r.out, "Error: Directory loop at <" + link + ">")) << r.out;
    EXPECT_FALSE(exists(s.tables() + "/sub/loop"));
    EXPECT_EQ(list_dir(s.home + "/lx8266/ms/lib"), std::vector<std::string>{});
    EXPECT_FALSE(seeded_anything());
}

}  // namespace
