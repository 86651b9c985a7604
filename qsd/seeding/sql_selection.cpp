#include "qsd/seeding/sql_selection.h"

#include "qsd/text/text.h"

namespace zr7 {

SqlSelection select_sql_name(const std::string& name) {
    const std::string lower = to_lower_c(name);
    if (lower.find("_del") != std::string::npos)
        return SqlSelection::kDeletion;
    // Of the names of four bytes or fewer only ".sql" itself passes.
    if (!ends_with(lower, ".sql"))
        return SqlSelection::kNotSql;
    return SqlSelection::kSeed;
}

}  // namespace zr7
