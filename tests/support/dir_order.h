// The order in which a directory yields its entries, which is the order the
// tool copies and seeds them in.
#pragma once

#include <string>
#include <vector>

namespace zr7test {

// Names in readdir order, "." and ".." left out, not sorted.
std::vector<std::string> readdir_order(const std::string& path);

}  // namespace zr7test
