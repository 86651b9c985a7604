// What `cmake --install` gives an administrator: the tool and its manual
// page, nothing else (the stand-in loader stays in the build).
#include <sys/stat.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/test_support.h"

namespace {

// Files under a directory, relative to it, sorted.
void collect(const std::string& root, const std::string& relative,
             std::vector<std::string>& files) {
    const std::string dir = relative.empty() ? root : root + "/" + relative;
    for (const std::string& name : zr7test::list_dir(dir)) {
        const std::string path = relative.empty() ? name : relative + "/" + name;
        struct stat st {};
        if (::lstat((root + "/" + path).c_str(), &st) == 0 && S_ISDIR(st.st_mode)) {
            collect(root, path, files);
        } else {
            files.push_back(path);
        }
    }
}

TEST(InstallRules, InstallTheToolAndItsManualPageOnly) {
    zr7test::TempDir prefix;
    const std::string build = zr7test::bin_dir() + "/..";
    const zr7test::RunResult r =
        zr7test::run("/usr/bin/env", {"cmake", "--install", build, "--prefix", prefix.path()});
    ASSERT_EQ(r.exit_code, 0) << r.out << r.err;

    std::vector<std::string> files;
    collect(prefix.path(), "", files);
    EXPECT_EQ(files, (std::vector<std::string>{"bin/zr7inst", "share/man/man1/zr7inst.1"}));

    const zr7test::RunResult version = zr7test::run(prefix / "bin/zr7inst", {"-V"});
    EXPECT_EQ(version.out, "06100400\n");

    const std::string page = zr7test::read_file(prefix / "share/man/man1/zr7inst.1");
    for (const char* section : {".SH NAME", ".SH SYNOPSIS", ".SH OPTIONS", ".SH ENVIRONMENT",
                                ".SH FILES", ".SH EXIT STATUS", ".SH EXAMPLES"}) {
        EXPECT_NE(page.find(std::string("\n") + section + "\n"), std::string::npos) << section;
    }
}

TEST(InstallRules, ManualPageFormatsWithoutWarnings) {
    if (!zr7test::exists("/usr/bin/groff"))
        GTEST_SKIP() << "groff is not installed";
    const zr7test::RunResult r = zr7test::run(
        "/usr/bin/groff",
        {"-man", "-Tutf8", "-ww", "-z", std::string(ZR7_SOURCE_DIR) + "/doc/zr7inst.1"});
    EXPECT_EQ(r.exit_code, 0);
    EXPECT_EQ(r.err, "");
}

}  // namespace
