// The bytes of synthetic files and of the server home's own files.
#include "bench/gen/content.h"

#include <gtest/gtest.h>

#include <algorithm>

namespace zr7bench {
namespace {

std::size_t count_of(const std::string& text, const std::string& piece) {
    std::size_t n = 0;
    for (std::size_t at = text.find(piece); at != std::string::npos;
         at = text.find(piece, at + piece.size())) {
        ++n;
    }
    return n;
}

TEST(FileContent, ExactSizeAndLineEndsOfItsKind) {
    const Content kinds[] = {Content::kText, Content::kTextCrlf, Content::kBinary, Content::kSql};
    for (Content kind : kinds) {
        for (std::uint64_t size : {100u, 4097u, 200000u}) {
            PlannedFile f;
            f.size = size;
            f.content = kind;
            f.content_seed = size * 31;
            const std::string bytes = file_content(f);
            ASSERT_EQ(bytes.size(), size);
            EXPECT_EQ(bytes, file_content(f)) << "not reproducible";
            const std::size_t lf = count_of(bytes, "\n");
            const std::size_t crlf = count_of(bytes, "\r\n");
            const std::size_t cr = count_of(bytes, "\r");
            switch (kind) {
                case Content::kText:
                case Content::kSql:
                    EXPECT_GT(lf, 0u);
                    EXPECT_EQ(cr, 0u);
                    break;
                case Content::kTextCrlf:
                    EXPECT_GT(crlf, 0u);
                    // Only the cut at the end may leave a "\r" without its "\n".
                    EXPECT_LE(cr - crlf, 1u);
                    EXPECT_EQ(lf, crlf);
                    break;
                case Content::kBinary:
                    EXPECT_TRUE(std::any_of(bytes.begin(), bytes.end(),
                                            [](char c) { return (c & 0x80) != 0; }));
                    break;
            }
        }
    }
}

TEST(HomeFiles, EnvironmentFileHasItsLinesAndOneKdsRun) {
    HomeOptions options;
    for (std::size_t lines : {50u, 300u, 400u}) {
        options.env_lines = lines;
        const std::string text = vxaenv_text(options);
        EXPECT_EQ(static_cast<std::size_t>(std::count(text.begin(), text.end(), '\n')), lines);
        EXPECT_EQ(count_of(text, "\nKDS_RUN="), 1u);
        EXPECT_EQ(count_of(text, "\r"), 0u);
    }
}

TEST(HomeFiles, ConfigurationNamesServerAndArchitecture) {
    HomeOptions options;
    options.server = "S9";
    options.arch = "ax1";
    const std::string text = kmsenv_text(options);
    EXPECT_NE(text.find("S9|BINARCH|ax1|\n"), std::string::npos);
    EXPECT_NE(text.find("S9|NETWORKPROTOCOL|ip.pipe|\n"), std::string::npos);
    EXPECT_NE(text.find("S9|IPPIPEPORTNUMBER|1918|\n"), std::string::npos);
}

TEST(HomeFiles, DirectoriesParentsFirstWithEveryDestination) {
    HomeOptions options;
    const std::vector<std::string> dirs = home_dirs(options);
    for (std::size_t i = 0; i < dirs.size(); ++i) {
        const std::size_t slash = dirs[i].rfind('/');
        if (slash != std::string::npos) {
            const auto parent = std::find(dirs.begin(), dirs.begin() + static_cast<long>(i),
                                          dirs[i].substr(0, slash));
            EXPECT_NE(parent, dirs.begin() + static_cast<long>(i)) << dirs[i];
        }
    }
    for (const char* dir : {"tables/SRV1/ATTRLIB", "tables/SRV1/TECLIB", "tables/cicatrsq/SQLLIB",
                            "lx8266/ms/lib", "lx8266/ms/bin", "logs"}) {
        EXPECT_NE(std::find(dirs.begin(), dirs.end(), dir), dirs.end()) << dir;
    }
}

}  // namespace
}  // namespace zr7bench
