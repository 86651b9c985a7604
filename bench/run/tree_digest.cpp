#include "bench/run/tree_digest.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>

namespace zr7bench {

std::uint64_t fnv1a(const std::string& bytes, std::uint64_t hash) {
    for (unsigned char c : bytes) {
        hash ^= c;
        hash *= 1099511628211ULL;
    }
    return hash;
}

namespace {

std::uint64_t hash_file(const std::string& path) {
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0)
        return 1;  // unreadable: differs from any readable file in practice
    std::uint64_t hash = 14695981039346656037ULL;
    char buffer[65536];
    for (;;) {
        const ssize_t n = ::read(fd, buffer, sizeof buffer);
        if (n <= 0)
            break;
        hash = fnv1a(std::string(buffer, static_cast<std::size_t>(n)), hash);
    }
    ::close(fd);
    return hash;
}

void walk(const std::string& root, const std::string& rel, const std::vector<std::string>& skip,
          TreeDigest& digest) {
    DIR* dir = ::opendir((root + "/" + rel).c_str());
    if (dir == nullptr)
        return;
    std::vector<std::string> names;
    while (struct dirent* entry = ::readdir(dir)) {
        const std::string name = entry->d_name;
        if (name != "." && name != ".." &&
            std::find(skip.begin(), skip.end(), name) == skip.end()) {
            names.push_back(name);
        }
    }
    ::closedir(dir);
    for (const std::string& name : names) {
        const std::string child = rel.empty() ? name : rel + "/" + name;
        struct stat st {};
        if (::lstat((root + "/" + child).c_str(), &st) != 0)
            continue;
        if (S_ISDIR(st.st_mode)) {
            digest[child + "/"] = 0;
            walk(root, child, skip, digest);
        } else {
            digest[child] = hash_file(root + "/" + child);
        }
    }
}

}  // namespace

TreeDigest digest_tree(const std::string& root, const std::vector<std::string>& skip) {
    TreeDigest digest;
    walk(root, "", skip, digest);
    return digest;
}

TreeDifference compare_digests(const TreeDigest& a, const TreeDigest& b) {
    TreeDifference diff;
    auto note = [&diff](const std::string& path) {
        if (diff.count++ == 0 || path < diff.first)
            diff.first = path;
    };
    for (const auto& entry : a) {
        auto other = b.find(entry.first);
        if (other == b.end() || other->second != entry.second)
            note(entry.first);
    }
    for (const auto& entry : b) {
        if (a.count(entry.first) == 0)
            note(entry.first);
    }
    return diff;
}

std::vector<std::string> written_files(const TreeDigest& before, const TreeDigest& after) {
    std::vector<std::string> paths;
    for (const auto& entry : after) {
        if (!entry.first.empty() && entry.first.back() == '/')
            continue;
        auto old = before.find(entry.first);
        if (old == before.end() || old->second != entry.second)
            paths.push_back(entry.first);
    }
    return paths;
}

}  // namespace zr7bench
