// Counting what an installation does, replayed over a small hand-made image:
// flat directories copied twice, trees that keep existing files skipping
// what an earlier tree wrote, directories created once.
#include <gtest/gtest.h>

#include "bench/gen/image_plan.h"

namespace zr7bench {
namespace {

PlannedFile file(const std::string& path, std::uint64_t size = 100) {
    PlannedFile f;
    f.path = path;
    f.size = size;
    return f;
}

TEST(CountWork, ReplaysTheCommandList) {
    ImagePlan plan;
    plan.dirs = {"MSRV",
                 "MSRV/ATTRLIB",
                 "MSRV/SQLLIB",
                 "MSRV/a1",
                 "MSRV/a1/TABLE",
                 "MSRV/a1/TABLE/TECLIB",
                 "MSRV/a1/TABLE/g1",
                 "MSRV/a1/TABLE_PRESERVE",
                 "MSRV/a1/TABLE_PRESERVE/g1",
                 "MSRV/a1/TABLE_PRESERVE/g2",
                 "MSRV/a1/TABLE_PRESERVE_TXT",
                 "MSRV/a1/lib"};
    plan.files = {
        file("MSRV/ATTRLIB/k.atr", 10),               // 2 copies
        file("MSRV/SQLLIB/a.sql", 1),                 // 1 copy, seeded
        file("MSRV/SQLLIB/A_DEL.SQL", 1),             // 1 copy, passed over
        file("MSRV/SQLLIB/notes.txt", 1),             // 1 copy, passed over
        file("MSRV/SQLLIB/B.SQL", 1),                 // 1 copy, seeded
        file("MSRV/a1/TABLE/TECLIB/t.baroc", 5),      // 1 tree copy + 2 flat copies
        file("MSRV/a1/TABLE/g1/x.dat", 7),            // 1 copy
        file("MSRV/a1/TABLE_PRESERVE/g1/x.dat"),      // skipped: TABLE wrote it
        file("MSRV/a1/TABLE_PRESERVE/g2/y.cfg", 3),   // 1 copy
        file("MSRV/a1/TABLE_PRESERVE_TXT/g2/y.cfg"),  // skipped: TABLE_PRESERVE wrote it
        file("MSRV/a1/lib/libk.so", 11),              // 1 copy
    };
    const WorkCount work = count_work(plan, "a1");
    EXPECT_EQ(work.file_copies, 2u + 4u + 3u + 1u + 1u + 1u);
    EXPECT_EQ(work.loader_runs, 2u);
    // g1 and g2 once each; TECLIB is already in a fresh home.
    EXPECT_EQ(work.directories, 2u);
    EXPECT_EQ(work.bytes, 20u + 4u + 15u + 7u + 3u + 11u);
}

TEST(CountWork, AGeneratedImageCopiesMoreThanItHolds) {
    GenOptions options;
    options.files = 2000;
    const ImagePlan plan = plan_image(options);
    const WorkCount work = count_work(plan, options.arch);
    // The flat catalogs go to two places and TABLE/TECLIB twice more, while
    // a few tree files are skipped: more copies than files, by a fifth or so.
    EXPECT_GT(work.file_copies, plan.files.size());
    EXPECT_LT(work.file_copies, plan.files.size() * 3 / 2);
    EXPECT_GT(work.loader_runs, 0u);
    EXPECT_GT(work.directories, 0u);
}

}  // namespace
}  // namespace zr7bench
