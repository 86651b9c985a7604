// The option letters of a tree-copy command.
#include <gtest/gtest.h>
#include <ostream>

#include "qsd/fileops/copy_options.h"
#include "qsd/fileops/install_util.h"
#include "support/printable.h"

namespace {

struct OptionCase {
    const char* options;
    unsigned flags;
};

void PrintTo(const OptionCase& c, std::ostream* os) {
    *os << "options <" << zr7test::printable(c.options) << ">";
}

class CopyOptionsTest : public ::testing::TestWithParam<OptionCase> {};

TEST_P(CopyOptionsTest, LettersGiveFlags) {
    EXPECT_EQ(zr7::copy_flags_from_options(GetParam().options), GetParam().flags)
        << "options <" << GetParam().options << ">";
}

INSTANTIATE_TEST_SUITE_P(
    Letters, CopyOptionsTest,
    ::testing::Values(OptionCase{"", 0}, OptionCase{"O", kCopyOverwrite},
                      OptionCase{"T", kCopyFixCr}, OptionCase{"OT", kCopyOverwrite | kCopyFixCr},
                      OptionCase{"TO", kCopyOverwrite | kCopyFixCr},
                      OptionCase{"OOO", kCopyOverwrite}, OptionCase{"TT", kCopyFixCr},
                      // Case-sensitive: lower-case letters ask for nothing.
                      OptionCase{"o", 0}, OptionCase{"t", 0}, OptionCase{"ot", 0},
                      // Other bytes are ignored wherever they stand.
                      OptionCase{" O,T ", kCopyOverwrite | kCopyFixCr},
                      OptionCase{"xOy", kCopyOverwrite}, OptionCase{"overwrite", 0},
                      OptionCase{"Text", kCopyFixCr}));

}  // namespace
