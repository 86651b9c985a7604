// The option letters of a tree-copy command, turned into copy flags.
#pragma once

#include <string>

namespace zr7 {

// Each "O" asks for overwrite, each "T" for carriage-return removal; letters
// may repeat and stand in any order, every other byte (lower case included)
// is ignored, and an empty text means neither.
unsigned copy_flags_from_options(const std::string& options);

}  // namespace zr7
