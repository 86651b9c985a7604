// Which listed names seeding hands to the loader.
#include <gtest/gtest.h>
#include <ostream>

#include "qsd/seeding/sql_selection.h"
#include "support/printable.h"

namespace {

using zr7::SqlSelection;

struct NameCase {
    const char* name;
    SqlSelection expected;
};

void PrintTo(const NameCase& c, std::ostream* os) {
    *os << "name <" << zr7test::printable(c.name) << ">";
}

class SqlSelectionTest : public ::testing::TestWithParam<NameCase> {};

TEST_P(SqlSelectionTest, DecidesOnTheName) {
    EXPECT_EQ(zr7::select_sql_name(GetParam().name), GetParam().expected)
        << "name <" << GetParam().name << ">";
}

INSTANTIATE_TEST_SUITE_P(
    Names, SqlSelectionTest,
    ::testing::Values(
        NameCase{"a.sql", SqlSelection::kSeed}, NameCase{"A.SQL", SqlSelection::kSeed},
        NameCase{"Mixed.Sql", SqlSelection::kSeed}, NameCase{".SQL", SqlSelection::kSeed},
        NameCase{".sql", SqlSelection::kSeed}, NameCase{"two.dots.sql", SqlSelection::kSeed},
        // "_del" anywhere, in any case, and tested before the suffix.
        NameCase{"x_DEL.sql", SqlSelection::kDeletion},
        NameCase{"my_delta.sql", SqlSelection::kDeletion},
        NameCase{"x_del.txt", SqlSelection::kDeletion}, NameCase{"_del", SqlSelection::kDeletion},
        NameCase{"del.sql", SqlSelection::kSeed}, NameCase{"x-del.sql", SqlSelection::kSeed},
        // Not ending in ".sql".
        NameCase{"notes.txt", SqlSelection::kNotSql}, NameCase{"sql", SqlSelection::kNotSql},
        NameCase{"", SqlSelection::kNotSql}, NameCase{"a.sql.bak", SqlSelection::kNotSql},
        NameCase{"a.sql ", SqlSelection::kNotSql}, NameCase{"asql", SqlSelection::kNotSql},
        NameCase{"a.sq", SqlSelection::kNotSql},
        // Only A to Z fold: a non-ASCII byte is not a letter.
        NameCase{"a.sq\xcc", SqlSelection::kNotSql}));

}  // namespace
