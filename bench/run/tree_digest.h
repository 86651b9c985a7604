// A fingerprint of an installed tree, to check that two contestants left the
// same bytes behind.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <vector>

namespace zr7bench {

// Relative path -> FNV-1a hash of the file's bytes; a directory is recorded
// as its path with a trailing "/" and the hash 0.
using TreeDigest = std::map<std::string, std::uint64_t>;

std::uint64_t fnv1a(const std::string& bytes, std::uint64_t hash = 14695981039346656037ULL);

// Walks `root` without following symbolic links, leaving out every entry
// (and the tree below it) whose name is in `skip`.
TreeDigest digest_tree(const std::string& root, const std::vector<std::string>& skip);

struct TreeDifference {
    long count = 0;     // paths present in one only, or with other bytes
    std::string first;  // the first such path in sorted order, "" when none
};
TreeDifference compare_digests(const TreeDigest& a, const TreeDigest& b);

// The files of `after` that `before` lacks or holds with other bytes: what a
// copy between the two walks wrote (directories left out), in sorted order.
std::vector<std::string> written_files(const TreeDigest& before, const TreeDigest& after);

}  // namespace zr7bench
