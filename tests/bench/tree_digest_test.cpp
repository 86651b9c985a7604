#include "bench/run/tree_digest.h"

#include <gtest/gtest.h>

#include "support/test_support.h"

namespace zr7bench {
namespace {

TEST(CompareDigests, CountsChangedMissingAndExtraPaths) {
    const TreeDigest base = {{"a", 1}, {"d/", 0}, {"d/b", 2}, {"d/c", 3}};
    struct Case {
        TreeDigest other;
        long count;
        std::string first;
    };
    const Case cases[] = {
        {base, 0, ""},
        {{{"a", 1}, {"d/", 0}, {"d/b", 9}, {"d/c", 3}}, 1, "d/b"},
        {{{"a", 1}, {"d/", 0}, {"d/c", 3}}, 1, "d/b"},
        {{{"a", 1}, {"d/", 0}, {"d/b", 2}, {"d/c", 3}, {"0new", 5}}, 1, "0new"},
        {{{"d/", 0}, {"d/b", 2}, {"d/c", 4}}, 2, "a"},
    };
    for (const Case& c : cases) {
        const TreeDifference diff = compare_digests(base, c.other);
        EXPECT_EQ(diff.count, c.count);
        EXPECT_EQ(diff.first, c.first);
    }
}

TEST(DigestTree, HashesBytesAndLeavesOutSkippedNames) {
    zr7test::TempDir dir;
    zr7test::make_dirs(dir / "t/sub");
    zr7test::make_dirs(dir / "t/.archive");
    zr7test::write_file(dir / "t/sub/f", "one\r\n");
    zr7test::write_file(dir / "t/VXAENV", "x");
    zr7test::write_file(dir / "t/.archive/VXAENV_1", "x");
    const TreeDigest digest = digest_tree(dir / "t", {"VXAENV", ".archive"});
    ASSERT_EQ(digest.size(), 2u);
    EXPECT_EQ(digest.at("sub/"), 0u);
    EXPECT_EQ(digest.at("sub/f"), fnv1a("one\r\n"));
    EXPECT_NE(fnv1a("one\r\n"), fnv1a("one\n"));
}

}  // namespace
}  // namespace zr7bench
