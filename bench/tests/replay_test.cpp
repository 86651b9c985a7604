// Contestant D's list read from a plan: each copy traced back to its source
// through the tool's own command list, the program it becomes, and the plans
// it refuses to replay.
#include <gtest/gtest.h>

#include <set>
#include <string>
#include <vector>

#include "bench/run/replay.h"

namespace {

using namespace zr7bench;

std::vector<CopyRoute> routes() {
    return copy_routes(build_command_list(true, true), {"/i/MSRV", "/h/", "S", "ax"});
}

// The image's files as the plans below need them; t.cat is in three
// directories that all end up in the server's TECLIB.
const std::set<std::string> kSources = {
    "/i/MSRV/ATTRLIB/a.atr",       "/i/MSRV/TECLIB/t.cat", "/i/MSRV/ax/TABLE/TECLIB/t.cat",
    "/i/MSRV/ax/TABLE/sit/x.sit",  "/i/MSRV/ax/bin/run",   "/i/MSRV/ax/TABLE_PRESERVE/site.cfg",
    "/i/MSRV/ax/TABLE_TXT/doc.txt"};

std::vector<std::string> shown(const ReplayList& list) {
    std::vector<std::string> lines;
    for (const ReplayStep& step : list.steps) {
        switch (step.kind) {
            case StepKind::kMkdir:
                lines.push_back("mkdir " + step.to);
                break;
            case StepKind::kCopy:
                lines.push_back("cp " + step.from + " " + step.to);
                break;
            case StepKind::kStripCr:
                lines.push_back("tr " + step.from + " " + step.to);
                break;
            case StepKind::kLoad:
                lines.push_back("load " + step.to);
                break;
        }
    }
    return lines;
}

TEST(CopyRoutes, TheCommandListsCopiesInOrder) {
    const std::vector<CopyRoute> r = routes();
    ASSERT_EQ(r.size(), 15u);  // the environment file and the seeding are no copies
    EXPECT_EQ(r[0].from, "/i/MSRV/ATTRLIB");
    EXPECT_EQ(r[0].to, "/h/tables/S/ATTRLIB");
    EXPECT_TRUE(r[0].flat && r[0].strip_cr);
    EXPECT_EQ(r[7].from, "/i/MSRV/ax/TABLE");
    EXPECT_EQ(r[7].to, "/h/tables/S");
    EXPECT_FALSE(r[7].flat || r[7].strip_cr);          // "O"
    EXPECT_TRUE(!r[11].flat && r[11].strip_cr);        // TABLE_TXT, "OT"
    EXPECT_TRUE(!r[12].flat && r[12].strip_cr);        // TABLE_PRESERVE_TXT, "T"
    EXPECT_EQ(r[14].from, "/i/MSRV/ax/TABLE/TECLIB");  // the last copy
    EXPECT_EQ(r[14].to, "/h/tables/cicatrsq/TECLIB");
}

TEST(BuildReplay, PlansAndTheirPrograms) {
    struct Case {
        const char* name;
        std::string plan;
        std::vector<std::string> steps;
        const char* error;  // the start of the error, "" for none
    };
    const Case cases[] = {
        {"a flat copy removes carriage returns",
         "create /h/tables/S/ATTRLIB/a.atr\n",
         {"tr /i/MSRV/ATTRLIB/a.atr /h/tables/S/ATTRLIB/a.atr"},
         ""},
        {"a tree's directory, then its file copied as it is",
         "mkdir /h/tables/S/sit\ncreate /h/tables/S/sit/x.sit\n",
         {"mkdir /h/tables/S/sit", "cp /i/MSRV/ax/TABLE/sit/x.sit /h/tables/S/sit/x.sit"},
         ""},
        {"one destination written by three copies, each from its own source",
         "create /h/tables/S/TECLIB/t.cat\nreplace /h/tables/S/TECLIB/t.cat\n"
         "same /h/tables/S/TECLIB/t.cat\n",
         {"tr /i/MSRV/TECLIB/t.cat /h/tables/S/TECLIB/t.cat",
          "cp /i/MSRV/ax/TABLE/TECLIB/t.cat /h/tables/S/TECLIB/t.cat",
          "tr /i/MSRV/ax/TABLE/TECLIB/t.cat /h/tables/S/TECLIB/t.cat"},
         ""},
        {"a kept file starts nothing; a T tree strips",
         "keep /h/tables/S/site.cfg\ncreate /h/ax/ms/bin/run\ncreate /h/tables/S/doc.txt\n",
         {"cp /i/MSRV/ax/bin/run /h/ax/ms/bin/run",
          "tr /i/MSRV/ax/TABLE_TXT/doc.txt "
          "/h/tables/S/doc.txt"},
         ""},
        {"the environment file, pass and summary start nothing; seed loads",
         "backup /h/tables/S/.archive/VXAENV_1\nvxaenv /h/tables/S/VXAENV\n  --- a/VXAENV\n"
         "  +KDS_RUN=A;B\nseed /h/tables/cicatrsq/SQLLIB/k.sql\npass /h/tables/cicatrsq/SQLLIB/r\n"
         "summary: mkdir 0 create 0\n",
         {"load /h/tables/cicatrsq/SQLLIB/k.sql"},
         ""},
        // The walk does not go back: a copy of an earlier command after a
        // later one has nothing to come from.
        {"a copy out of the command list's order",
         "create /h/tables/S/doc.txt\ncreate /h/tables/S/ATTRLIB/a.atr\n",
         {},
         "no copy of the command list writes /h/tables/S/ATTRLIB/a.atr"},
        {"a destination no source explains",
         "create /h/tables/S/ATTRLIB/b.atr\n",
         {},
         "no copy of the command list writes /h/tables/S/ATTRLIB/b.atr"},
        {"a plan that fails",
         "error Error: Can't open </i/MSRV>\n",
         {},
         "the plan ends in an error"},
        {"an escaped name", "create /h/tables/S/sit/a\\nb\n", {}, "an escaped name"},
    };
    for (const Case& c : cases) {
        const ReplayList list = build_replay(c.plan, routes(), kSources);
        EXPECT_EQ(shown(list), c.steps) << c.name;
        EXPECT_EQ(list.error.compare(0, std::string(c.error).size(), c.error), 0)
            << c.name << ": " << list.error;
        EXPECT_EQ(list.error.empty(), std::string(c.error).empty()) << c.name;
    }
}

}  // namespace
