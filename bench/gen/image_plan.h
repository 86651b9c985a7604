// The plan of a synthetic source image: which directories and files it holds,
// how large each file is and what kind of bytes it carries. Planning is pure
// (no disk access) and depends only on the options, so a seed gives the same
// image on every machine and the tests can look at a plan without writing it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace zr7bench {

// A small deterministic generator (splitmix64): the same seed gives the same
// sequence whatever the standard library.
class Rng {
  public:
    explicit Rng(std::uint64_t seed) : state_(seed) {}
    std::uint64_t next();
    // A value in [0, n); n must not be 0.
    std::uint64_t below(std::uint64_t n) { return next() % n; }
    // A value in [0, 1).
    double unit() { return static_cast<double>(next() >> 11) * 0x1.0p-53; }

  private:
    std::uint64_t state_;
};

enum class Content {
    kText,      // lines ending in "\n"
    kTextCrlf,  // lines ending in "\r\n"
    kBinary,    // arbitrary bytes, carriage returns included
    kSql,       // SQL statements, "\n" line ends
};

struct PlannedFile {
    std::string path;  // relative to the image root, e.g. "MSRV/ATTRLIB/k0001.atr"
    std::uint64_t size = 0;
    Content content = Content::kText;
    unsigned mode = 0644;
    std::uint64_t content_seed = 0;
};

struct ImagePlan {
    // Relative directories, every parent before its children.
    std::vector<std::string> dirs;
    std::vector<PlannedFile> files;
};

struct GenOptions {
    std::size_t files = 5000;  // files spread over the whole image
    std::uint64_t seed = 20261206;
    std::string arch = "lx8266";
    std::size_t deep = 0;  // > 0: a chain of this many directories under TABLE
    std::size_t wide = 0;  // > 0: this many more files in one directory under TABLE
};

// The named sizes of the benchmark: "small", "default", "large". Returns 0
// for any other name.
std::size_t files_for_size(const std::string& name);

// A file size between 100 bytes and 1 MiB, mostly small: nine files in ten
// are under 8 KiB, one in two hundred is over 128 KiB.
std::uint64_t draw_file_size(Rng& rng);

ImagePlan plan_image(const GenOptions& options);

// What an installation of the image does, counted from the plan the way the
// command list runs: every flat catalog file is copied twice (SQLLIB once),
// a tree file whose destination an earlier tree already wrote is skipped by
// the trees that do not overwrite, and the TECLIB directory of TABLE is
// copied twice more at the end.
struct WorkCount {
    std::size_t file_copies = 0;  // cp or tr runs
    std::size_t directories = 0;  // directories the trees create
    std::size_t loader_runs = 0;  // SQL files seeded
    std::uint64_t bytes = 0;      // bytes read by the copies
};
WorkCount count_work(const ImagePlan& plan, const std::string& arch);

}  // namespace zr7bench
