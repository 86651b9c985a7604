#include "qsd/fileops/copy_outcome.h"

#include <unistd.h>

#include <cerrno>

#include "qsd/platform/fs.h"

namespace zr7 {

namespace {

// FNV-1a with two different offset bases and primes: one hash would do for
// a report, two make a false "same" practically impossible.
constexpr std::uint64_t kFirstBasis = 14695981039346656037ull;
constexpr std::uint64_t kFirstPrime = 1099511628211ull;
constexpr std::uint64_t kSecondBasis = 0x9e3779b97f4a7c15ull;
constexpr std::uint64_t kSecondPrime = 0x100000001b3ull * 31 + 2;

}  // namespace

int digest_file(int fd, bool strip_cr, ContentDigest& out) {
    out = ContentDigest{0, kFirstBasis, kSecondBasis};
    char buffer[65536];
    off_t at = 0;
    for (;;) {
        const ssize_t got = ::pread(fd, buffer, sizeof buffer, at);
        if (got < 0) {
            if (errno == EINTR)
                continue;
            return errno;
        }
        if (got == 0)
            return 0;
        at += got;
        for (ssize_t i = 0; i < got; ++i) {
            const auto byte = static_cast<unsigned char>(buffer[i]);
            if (strip_cr && byte == '\r')
                continue;
            ++out.size;
            out.first = (out.first ^ byte) * kFirstPrime;
            out.second = (out.second ^ byte) * kSecondPrime;
        }
    }
}

const PlannedFile* PlannedTree::file(const std::string& path) const {
    const auto found = files_.find(path);
    return found == files_.end() ? nullptr : &found->second;
}

Action copy_outcome(int src_fd, bool strip_cr, bool overwrite, int dst_dir, const std::string& name,
                    const std::string& dst_shown, const PlannedTree* planned,
                    ContentDigest& digest) {
    const PlannedFile* earlier = planned != nullptr ? planned->file(dst_shown) : nullptr;
    fs::Target target;
    struct stat st {};
    const bool on_disk = earlier == nullptr && dst_dir >= 0 &&
                         fs::resolve_name(dst_dir, name, target) == 0 &&
                         fs::stat_at(target.dir.get(), target.name, st) == 0;
    if (earlier == nullptr && !on_disk)
        return Action::kCreate;
    if (!overwrite)
        return Action::kKeep;
    if (digest_file(src_fd, strip_cr, digest) != 0)
        return Action::kReplace;
    if (earlier != nullptr)
        return earlier->digest == digest ? Action::kSame : Action::kReplace;
    // Only a regular file can hold the same bytes; a link of another account
    // or anything else in the way is replaced.
    fs::UniqueFd old;
    ContentDigest old_digest;
    if (!S_ISREG(st.st_mode) || fs::open_read(target.dir.get(), target.name, old, st) != 0 ||
        digest_file(old.get(), false, old_digest) != 0) {
        return Action::kReplace;
    }
    return old_digest == digest ? Action::kSame : Action::kReplace;
}

void plan_copy(PlannedTree& planned, Action action, int src_fd, bool strip_cr,
               const std::string& src_shown, const std::string& dst_shown, ContentDigest digest) {
    if (action == Action::kKeep)
        return;
    if (action == Action::kCreate)
        (void)digest_file(src_fd, strip_cr, digest);
    planned.add_file(dst_shown, PlannedFile{digest, src_shown, strip_cr});
}

}  // namespace zr7
