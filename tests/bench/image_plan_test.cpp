// The synthetic image: reproducible, the sizes asked for, a sound directory
// list, and the kinds of file an installation has to handle.
#include "bench/gen/image_plan.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <set>

namespace zr7bench {
namespace {

std::string parent_of(const std::string& path) {
    const std::size_t slash = path.rfind('/');
    return slash == std::string::npos ? "" : path.substr(0, slash);
}

bool starts_with(const std::string& text, const std::string& prefix) {
    return text.compare(0, prefix.size(), prefix) == 0;
}

TEST(FilesForSize, NamedSizes) {
    const std::pair<const char*, std::size_t> cases[] = {
        {"small", 500}, {"default", 5000}, {"large", 20000}, {"huge", 0}, {"", 0}, {"Small", 0}};
    for (const auto& c : cases)
        EXPECT_EQ(files_for_size(c.first), c.second) << c.first;
}

TEST(PlanImage, SameSeedSamePlanOtherSeedOtherPlan) {
    GenOptions options;
    options.files = 800;
    const ImagePlan a = plan_image(options);
    const ImagePlan b = plan_image(options);
    ASSERT_EQ(a.files.size(), b.files.size());
    for (std::size_t i = 0; i < a.files.size(); ++i) {
        EXPECT_EQ(a.files[i].path, b.files[i].path);
        EXPECT_EQ(a.files[i].size, b.files[i].size);
        EXPECT_EQ(a.files[i].content_seed, b.files[i].content_seed);
    }
    options.seed += 1;
    const ImagePlan c = plan_image(options);
    std::size_t same_size = 0;
    for (std::size_t i = 0; i < std::min(a.files.size(), c.files.size()); ++i)
        same_size += a.files[i].size == c.files[i].size ? 1 : 0;
    EXPECT_LT(same_size, a.files.size() / 10);
}

class PlanSizes : public ::testing::TestWithParam<const char*> {};

TEST_P(PlanSizes, ExactCountSoundDirectoriesModerateBytes) {
    GenOptions options;
    options.files = files_for_size(GetParam());
    const ImagePlan plan = plan_image(options);
    EXPECT_EQ(plan.files.size(), options.files);

    std::map<std::string, std::size_t> dir_index;
    for (std::size_t i = 0; i < plan.dirs.size(); ++i) {
        ASSERT_TRUE(dir_index.emplace(plan.dirs[i], i).second) << "twice: " << plan.dirs[i];
        const std::string parent = parent_of(plan.dirs[i]);
        if (!parent.empty()) {
            ASSERT_EQ(dir_index.count(parent), 1u) << plan.dirs[i] << " before its parent";
        }
    }
    std::set<std::string> paths;
    std::uint64_t bytes = 0;
    for (const PlannedFile& f : plan.files) {
        EXPECT_TRUE(paths.insert(f.path).second) << "twice: " << f.path;
        EXPECT_EQ(dir_index.count(parent_of(f.path)), 1u) << f.path;
        EXPECT_GE(f.size, 100u) << f.path;
        EXPECT_LE(f.size, 1048576u) << f.path;
        bytes += f.size;
    }
    // Mostly small files: about 7 KiB on average keeps a large run to minutes.
    EXPECT_LT(bytes / plan.files.size(), 12u * 1024u);
}

INSTANTIATE_TEST_SUITE_P(NamedSizes, PlanSizes, ::testing::Values("small", "default", "large"));

TEST(PlanImage, HoldsEveryKindAnInstallationHandles) {
    GenOptions options;
    options.files = 5000;
    const ImagePlan plan = plan_image(options);
    std::map<std::string, std::size_t> per_top;
    std::size_t crlf_txt = 0, binary_lib = 0, exec_bin = 0, del_sql = 0, non_sql = 0, hidden = 0;
    std::size_t big = 0, nested = 0;
    for (const PlannedFile& f : plan.files) {
        const std::string rest = f.path.substr(5);  // after "MSRV/"
        const std::string top = starts_with(rest, "lx8266/") ? rest.substr(0, rest.find('/', 7))
                                                             : rest.substr(0, rest.find('/'));
        ++per_top[top];
        crlf_txt += top == "lx8266/TABLE_TXT" && f.content == Content::kTextCrlf ? 1 : 0;
        binary_lib += top == "lx8266/lib" && f.content == Content::kBinary ? 1 : 0;
        exec_bin += top == "lx8266/bin" && f.mode == 0755 ? 1 : 0;
        del_sql += top == "SQLLIB" && f.path.find("_del.sql") != std::string::npos ? 1 : 0;
        non_sql += top == "SQLLIB" && f.path.find(".txt") != std::string::npos ? 1 : 0;
        hidden += f.path.find("/.") != std::string::npos ? 1 : 0;
        big += f.size > 131072 ? 1 : 0;
        nested += std::count(f.path.begin(), f.path.end(), '/') >= 5 ? 1 : 0;
    }
    for (const char* top :
         {"ATTRLIB", "RKDSCATL", "TECLIB", "SQLLIB", "lx8266/TABLE", "lx8266/TABLE_PRESERVE",
          "lx8266/TABLE_TXT", "lx8266/TABLE_PRESERVE_TXT", "lx8266/lib", "lx8266/bin"}) {
        EXPECT_GT(per_top[top], 0u) << top;
    }
    EXPECT_EQ(binary_lib, per_top["lx8266/lib"]);
    EXPECT_EQ(exec_bin, per_top["lx8266/bin"]);
    EXPECT_GT(crlf_txt, per_top["lx8266/TABLE_TXT"] / 2);
    EXPECT_GT(del_sql, 0u);
    EXPECT_GT(non_sql, 0u);
    EXPECT_GT(hidden, 0u);
    EXPECT_GT(big, 0u);
    EXPECT_GT(nested, 0u);
}

TEST(PlanImage, DeepTreeHasTheRequestedDepth) {
    GenOptions options;
    options.files = 0;
    options.deep = 200;
    const ImagePlan plan = plan_image(options);
    std::size_t deepest = 0;
    std::size_t level_files = 0;
    for (const std::string& dir : plan.dirs) {
        if (starts_with(dir, "MSRV/lx8266/TABLE/deep/"))
            deepest = std::max<std::size_t>(deepest, std::count(dir.begin(), dir.end(), '/') - 3);
    }
    for (const PlannedFile& f : plan.files)
        level_files += f.path.find("/level.dat") != std::string::npos ? 1 : 0;
    EXPECT_EQ(deepest, 200u);
    EXPECT_EQ(level_files, 200u);
    EXPECT_EQ(plan.files.size(), 200u);
}

TEST(PlanImage, WideDirectoryHoldsItsFilesAlone) {
    GenOptions options;
    options.files = 0;
    options.wide = 20000;
    const ImagePlan plan = plan_image(options);
    std::size_t in_wide = 0;
    for (const PlannedFile& f : plan.files)
        in_wide += parent_of(f.path) == "MSRV/lx8266/TABLE/wide" ? 1 : 0;
    EXPECT_EQ(in_wide, 20000u);
    EXPECT_EQ(plan.files.size(), 20000u);
    // Every directory the command list reads is there, empty or not.
    for (const char* dir : {"MSRV/SQLLIB", "MSRV/lx8266/TABLE", "MSRV/lx8266/lib"})
        EXPECT_NE(std::find(plan.dirs.begin(), plan.dirs.end(), dir), plan.dirs.end()) << dir;
}

TEST(DrawFileSize, StaysInRangeAndMostlySmall) {
    Rng rng(7);
    std::size_t small = 0;
    for (int i = 0; i < 20000; ++i) {
        const std::uint64_t size = draw_file_size(rng);
        ASSERT_GE(size, 100u);
        ASSERT_LE(size, 1048576u);
        small += size < 8192 ? 1 : 0;
    }
    EXPECT_GT(small, 17500u);  // about 92 in 100
    EXPECT_LT(small, 19000u);
}

}  // namespace
}  // namespace zr7bench
