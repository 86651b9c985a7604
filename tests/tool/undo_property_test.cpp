// Undo gives the installation back: on homes and images drawn from a fixed
// seed, install then undo leaves the names, bytes, modes, owners, groups and
// links as they were (the records, logs, backups and the loader's catalog
// aside); two installations then two undos give back the first state; a file
// changed after the installation survives the undo, which says so.
#include <unistd.h>

#include <random>

#include "tool/drawn_support.h"
#include "tool/tool.h"

namespace zr7test {
namespace {

RunResult undo(const SampleInstall& s) {
    return tool({"-o", s.home + "/logs/", "-u", "-h", s.home});
}

TEST(Undo, GivesEachDrawnInstallationBack) {
    std::mt19937 random(1207);
    for (int round = 0; round < 100; ++round) {
        SampleInstall s;
        draw(s, random, false);
        // Files of other owners and modes that the run replaces.
        const std::string owned = s.tables() + "/ATTRLIB/kzr.atr";
        write_file(owned, "the server's own\n", 0640);
        ASSERT_EQ(::chown(owned.c_str(), 65534, 65534), 0);
        const std::string before = tree_text(s.home, true);
        const RunResult first = install(s, {"-m", "kzr", "-c", "K=v"});
        ASSERT_EQ(first.exit_code, 0) << first.out;
        const bool twice = round % 5 == 0;
        std::string between;
        if (twice) {
            // A second installation of a changed image, over the first.
            between = tree_text(s.home, true);
            write_file(s.image + "/MSRV/ATTRLIB/kzr.atr", "second image\n");
            write_file(s.image + "/MSRV/lx8266/TABLE/second.dat", "second\n");
            ASSERT_EQ(install(s, {"-m", "kzr2"}).exit_code, 0);
            const RunResult u = undo(s);
            ASSERT_EQ(u.exit_code, 0) << u.out;
            EXPECT_EQ(tree_text(s.home, true), between) << round;
        }
        const RunResult u = undo(s);
        ASSERT_EQ(u.exit_code, 0) << u.out;
        EXPECT_EQ(tree_text(s.home, true), before) << round;
        // Nothing is left to undo.
        EXPECT_EQ(undo(s).exit_code, 256 - 12);
    }
}

TEST(Undo, LeavesAFileChangedSinceAndSaysSo) {
    SampleInstall s;
    write_file(s.tables() + "/table.dat", "before\n");
    ASSERT_EQ(install(s, {"-m", "kzr"}).exit_code, 0);
    write_file(s.tables() + "/table.dat", "edited by hand\n");         // replaced by the run
    write_file(s.tables() + "/TECLIB/kzr.baroc", "edited by hand\n");  // created by the run
    // The journal names the backup of VXAENV the run made.
    const std::vector<std::string> runs = list_dir(s.home + "/.zr7inst");
    ASSERT_EQ(runs.size(), 1u);
    EXPECT_NE(read_file(s.home + "/.zr7inst/" + runs[0] + "/journal")
                  .find("\nbackup tables/SRV1/.archive/VXAENV_"),
              std::string::npos);
    const RunResult u = undo(s);
    EXPECT_EQ(u.exit_code, 256 - 13) << u.out;
    EXPECT_EQ(read_file(s.tables() + "/table.dat"), "edited by hand\n");
    EXPECT_EQ(read_file(s.tables() + "/TECLIB/kzr.baroc"), "edited by hand\n");
    EXPECT_FALSE(exists(s.tables() + "/ATTRLIB/kzr.atr"));  // the rest is undone
    EXPECT_EQ(read_file(s.vxaenv), kSampleVxaenv);
    EXPECT_NE(u.err.find("Error: 2 files changed since the installation were left as they are"),
              std::string::npos)
        << u.err;
    const std::string record = read_file(s.home + "/logs/qsdinst.json");
    EXPECT_NE(record.find("\"operation\":\"undo\""), std::string::npos);
    EXPECT_NE(record.find("\"conflict\":2"), std::string::npos) << record;
}

}  // namespace
}  // namespace zr7test
