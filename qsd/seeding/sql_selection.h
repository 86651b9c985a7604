// Which listed file names seeding hands to the loader.
#pragma once

#include <string>

namespace zr7 {

enum class SqlSelection {
    kSeed,      // an SQL file to seed
    kDeletion,  // holds "_del" in any case: deletion scripts are never seeded
    kNotSql,    // does not end in ".sql" in any case
};

// Decides on the name as listed (no directory part). The "_del" test comes
// first, so "x_del.txt" is a deletion script, not a non-SQL file. Case is
// folded the C locale's way, whatever the process locale.
SqlSelection select_sql_name(const std::string& name);

}  // namespace zr7
