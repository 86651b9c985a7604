#include "bench/gen/image_plan.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <set>

namespace zr7bench {

std::uint64_t Rng::next() {
    std::uint64_t z = (state_ += 0x9E3779B97F4A7C15ULL);
    z = (z ^ (z >> 30)) * 0xBF58476D1CE4E5B9ULL;
    z = (z ^ (z >> 27)) * 0x94D049BB133111EBULL;
    return z ^ (z >> 31);
}

std::size_t files_for_size(const std::string& name) {
    if (name == "small")
        return 500;
    if (name == "default")
        return 5000;
    if (name == "large")
        return 20000;
    return 0;
}

namespace {

std::uint64_t log_uniform(Rng& rng, double low, double high) {
    const double value = low * std::exp(rng.unit() * std::log(high / low));
    return static_cast<std::uint64_t>(value);
}

std::string numbered(const char* format, std::size_t n) {
    char buffer[64];
    std::snprintf(buffer, sizeof buffer, format, n);
    return buffer;
}

// How the files of an image are spread: the share of each directory.
struct Area {
    const char* dir;  // under MSRV/, "@" standing for the architecture
    double share;
};
const Area kAreas[] = {
    {"ATTRLIB", 0.08},
    {"RKDSCATL", 0.08},
    {"TECLIB", 0.04},
    {"SQLLIB", 0.05},
    {"@/TABLE_PRESERVE", 0.05},
    {"@/TABLE_TXT", 0.12},
    {"@/TABLE_PRESERVE_TXT", 0.03},
    {"@/lib", 0.12},
    {"@/bin", 0.08},
};
// TABLE takes what the areas above leave, about 35 in 100.

class Planner {
  public:
    explicit Planner(const GenOptions& options)
        : options_(options), rng_(options.seed), msrv_("MSRV/"), arch_dir_(msrv_ + options.arch) {}

    ImagePlan run();

  private:
    void add_dir(const std::string& dir);
    // A size of 0 draws one from the benchmark's distribution.
    void add_file(const std::string& path, Content content, unsigned mode = 0644,
                  std::uint64_t size = 0);
    std::size_t share(double fraction) const {
        return static_cast<std::size_t>(static_cast<double>(options_.files) * fraction);
    }
    Content text_content(double crlf_fraction) {
        return rng_.unit() < crlf_fraction ? Content::kTextCrlf : Content::kText;
    }
    void plan_flat(const std::string& dir, const char* name_format, std::size_t count);
    void plan_sql(std::size_t count);
    void plan_table_pool(std::size_t tree_files);
    std::string pool_dir() { return pool_[rng_.below(pool_.size())]; }
    void plan_table(std::size_t count);
    void plan_tree_from_pool(const std::string& tree, const char* name_format, std::size_t count,
                             const std::vector<std::string>& reusable, double crlf_fraction,
                             std::vector<std::string>* made);
    void plan_binary_tree(const std::string& tree, const std::vector<std::string>& subdirs,
                          const char* name_format, std::size_t count, unsigned mode);
    void plan_deep();

    const GenOptions& options_;
    Rng rng_;
    const std::string msrv_;
    const std::string arch_dir_;
    std::set<std::string> dirs_;
    std::vector<PlannedFile> files_;
    // Relative directories shared by the four table trees ("" is the top), so
    // that their files meet in the same server directories.
    std::vector<std::string> pool_;
    std::vector<std::string> table_files_;  // relative to TABLE
    std::vector<std::string> txt_files_;    // relative to TABLE_TXT
};

void Planner::add_dir(const std::string& dir) {
    // Parents first: every prefix that ends before a "/" is a directory too.
    for (std::size_t slash = dir.find('/'); slash != std::string::npos;
         slash = dir.find('/', slash + 1)) {
        dirs_.insert(dir.substr(0, slash));
    }
    dirs_.insert(dir);
}

void Planner::add_file(const std::string& path, Content content, unsigned mode,
                       std::uint64_t size) {
    PlannedFile file;
    file.path = path;
    file.size = size != 0 ? size : draw_file_size(rng_);
    file.content = content;
    file.mode = mode;
    file.content_seed = rng_.next();
    files_.push_back(file);
}

void Planner::plan_flat(const std::string& dir, const char* name_format, std::size_t count) {
    add_dir(msrv_ + dir);
    for (std::size_t i = 0; i < count; ++i)
        add_file(msrv_ + dir + "/" + numbered(name_format, i), text_content(0.5));
}

void Planner::plan_sql(std::size_t count) {
    add_dir(msrv_ + "SQLLIB");
    for (std::size_t i = 0; i < count; ++i) {
        // A few names that seeding passes over: withdrawn statements and notes.
        const char* format = i % 20 == 19   ? "k%04zu_del.sql"
                             : i % 23 == 22 ? "k%04zu.txt"
                                            : "k%04zu.sql";
        add_file(msrv_ + "SQLLIB/" + numbered(format, i), Content::kSql, 0644,
                 log_uniform(rng_, 100, 4096));
    }
}

void Planner::plan_table_pool(std::size_t tree_files) {
    pool_.push_back("");
    const std::size_t count = std::max<std::size_t>(1, tree_files / 30);
    for (std::size_t i = 0; i < count; ++i) {
        // Each new directory hangs under the top or under an earlier one, at
        // most four levels down.
        std::string parent = pool_[rng_.below(pool_.size())];
        if (std::count(parent.begin(), parent.end(), '/') >= 3)
            parent.clear();
        const std::string name = numbered("grp%03zu", i);
        pool_.push_back(parent.empty() ? name : parent + "/" + name);
    }
}

void Planner::plan_table(std::size_t count) {
    const std::string tree = arch_dir_ + "/TABLE";
    add_dir(tree);
    // TABLE/TECLIB is copied as a tree and then twice more as a flat directory.
    const std::size_t teclib = std::max<std::size_t>(1, count * 3 / 100);
    add_dir(tree + "/TECLIB");
    for (std::size_t i = 0; i < teclib && i < count; ++i) {
        const std::string rel = "TECLIB/" + numbered("t%04zu.baroc", i);
        add_file(tree + "/" + rel, text_content(0.5));
        table_files_.push_back(rel);
    }
    for (std::size_t i = teclib; i < count; ++i) {
        const std::string dir = pool_dir();
        // One name in a hundred is hidden: only "." and ".." are special.
        const std::string name = numbered(i % 100 == 99 ? ".t%05zu.dat" : "t%05zu.dat", i);
        const std::string rel = dir.empty() ? name : dir + "/" + name;
        if (!dir.empty())
            add_dir(tree + "/" + dir);
        const double pick = rng_.unit();
        add_file(tree + "/" + rel, pick < 0.4   ? Content::kTextCrlf
                                   : pick < 0.7 ? Content::kText
                                                : Content::kBinary);
        table_files_.push_back(rel);
    }
}

void Planner::plan_tree_from_pool(const std::string& tree, const char* name_format,
                                  std::size_t count, const std::vector<std::string>& reusable,
                                  double crlf_fraction, std::vector<std::string>* made) {
    add_dir(tree);
    std::set<std::string> taken;
    for (std::size_t i = 0; i < count; ++i) {
        std::string rel;
        // One file in three has the path of a file an earlier tree brings.
        if (!reusable.empty() && rng_.below(3) == 0)
            rel = reusable[rng_.below(reusable.size())];
        if (rel.empty() || !taken.insert(rel).second) {
            const std::string dir = pool_dir();
            const std::string name = numbered(name_format, i);
            rel = dir.empty() ? name : dir + "/" + name;
        }
        const std::size_t slash = rel.rfind('/');
        if (slash != std::string::npos)
            add_dir(tree + "/" + rel.substr(0, slash));
        if (made != nullptr)
            made->push_back(rel);
        add_file(tree + "/" + rel, text_content(crlf_fraction));
    }
}

void Planner::plan_binary_tree(const std::string& tree, const std::vector<std::string>& subdirs,
                               const char* name_format, std::size_t count, unsigned mode) {
    add_dir(tree);
    for (const std::string& sub : subdirs)
        add_dir(tree + "/" + sub);
    for (std::size_t i = 0; i < count; ++i) {
        const std::size_t where = rng_.below(subdirs.size() + 2);  // the top twice as often
        const std::string dir = where < subdirs.size() ? tree + "/" + subdirs[where] : tree;
        add_file(dir + "/" + numbered(name_format, i), Content::kBinary, mode);
    }
}

void Planner::plan_deep() {
    std::string dir = arch_dir_ + "/TABLE/deep";
    for (std::size_t level = 1; level <= options_.deep; ++level) {
        dir += numbered("/l%03zu", level);
        add_dir(dir);
        PlannedFile file;
        file.path = dir + "/level.dat";
        file.size = 100 + level;
        file.content = Content::kTextCrlf;
        file.content_seed = level;
        files_.push_back(file);
    }
}

ImagePlan Planner::run() {
    std::size_t planned = 0;
    std::vector<std::size_t> counts;
    for (const Area& area : kAreas) {
        counts.push_back(share(area.share));
        planned += counts.back();
    }
    const std::size_t table_count = options_.files > planned ? options_.files - planned : 0;

    plan_flat("ATTRLIB", "k%04zu.atr", counts[0]);
    plan_flat("RKDSCATL", "k%04zu.cat", counts[1]);
    plan_flat("TECLIB", "k%04zu.baroc", counts[2]);
    plan_sql(counts[3]);
    plan_table_pool(table_count + counts[4] + counts[5] + counts[6]);
    plan_table(table_count);
    plan_tree_from_pool(arch_dir_ + "/TABLE_PRESERVE", "p%05zu.cfg", counts[4], table_files_, 0.3,
                        nullptr);
    plan_tree_from_pool(arch_dir_ + "/TABLE_TXT", "x%05zu.txt", counts[5], {}, 0.7, &txt_files_);
    plan_tree_from_pool(arch_dir_ + "/TABLE_PRESERVE_TXT", "q%05zu.txt", counts[6], txt_files_, 0.7,
                        nullptr);
    plan_binary_tree(arch_dir_ + "/lib", {"plugins", "ext", "ext/codecs"}, "libk%04zu.so",
                     counts[7], 0644);
    plan_binary_tree(arch_dir_ + "/bin", {"helpers"}, "k%04zuagent", counts[8], 0755);
    if (options_.deep > 0)
        plan_deep();
    if (options_.wide > 0) {
        const std::string dir = arch_dir_ + "/TABLE/wide";
        add_dir(dir);
        for (std::size_t i = 0; i < options_.wide; ++i) {
            PlannedFile file;
            file.path = dir + numbered("/w%05zu.dat", i);
            file.size = 100 + i % 200;
            file.content = i % 2 == 0 ? Content::kTextCrlf : Content::kText;
            file.content_seed = i;
            files_.push_back(file);
        }
    }

    ImagePlan plan;
    plan.dirs.assign(dirs_.begin(), dirs_.end());  // sorted: a parent sorts before its children
    plan.files = std::move(files_);
    return plan;
}

}  // namespace

std::uint64_t draw_file_size(Rng& rng) {
    const double band = rng.unit();
    if (band < 0.92)
        return log_uniform(rng, 100, 8192);
    if (band < 0.995)
        return log_uniform(rng, 8192, 131072);
    return log_uniform(rng, 131072, 1048576);
}

ImagePlan plan_image(const GenOptions& options) {
    return Planner(options).run();
}

namespace {

bool is_seeded_name(std::string name) {
    std::transform(name.begin(), name.end(), name.begin(),
                   [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c; });
    return name.find("_del") == std::string::npos && name.size() >= 4 &&
           name.compare(name.size() - 4, 4, ".sql") == 0;
}

// Replays the command list over a fresh server home, keeping the set of
// destination paths that exist, to count copies, skips and new directories.
class WorkCounter {
  public:
    WorkCounter(const ImagePlan& plan, const std::string& arch)
        : plan_(plan), arch_dir_("MSRV/" + arch + "/") {
        // What a fresh server home already has.
        for (const char* dir : {"S/ATTRLIB", "S/RKDSCATL", "S/TECLIB", "S/VXAENV"})
            present_.insert(dir);
    }

    WorkCount run() {
        flat("MSRV/ATTRLIB/");
        flat("MSRV/RKDSCATL/");
        flat("MSRV/TECLIB/");
        flat("MSRV/ATTRLIB/");
        flat("MSRV/RKDSCATL/");
        flat("MSRV/TECLIB/");
        flat("MSRV/SQLLIB/");
        tree(arch_dir_ + "TABLE/", "S/", true);
        tree(arch_dir_ + "TABLE_PRESERVE/", "S/", false);
        tree(arch_dir_ + "lib/", "L/", true);
        tree(arch_dir_ + "bin/", "B/", true);
        tree(arch_dir_ + "TABLE_TXT/", "S/", true);
        tree(arch_dir_ + "TABLE_PRESERVE_TXT/", "S/", false);
        flat(arch_dir_ + "TABLE/TECLIB/");
        flat(arch_dir_ + "TABLE/TECLIB/");
        for (const PlannedFile& file : plan_.files) {
            if (in_dir(file.path, "MSRV/SQLLIB/") && is_seeded_name(base(file.path)))
                ++count_.loader_runs;
        }
        return count_;
    }

  private:
    static bool in_dir(const std::string& path, const std::string& dir) {
        return path.compare(0, dir.size(), dir) == 0 &&
               path.find('/', dir.size()) == std::string::npos;
    }
    static std::string base(const std::string& path) { return path.substr(path.rfind('/') + 1); }

    void flat(const std::string& dir) {
        for (const PlannedFile& file : plan_.files) {
            if (in_dir(file.path, dir)) {
                ++count_.file_copies;
                count_.bytes += file.size;
            }
        }
    }

    void tree(const std::string& top, const std::string& dest, bool overwrite) {
        for (const std::string& dir : plan_.dirs) {
            if (dir.size() > top.size() && dir.compare(0, top.size(), top) == 0 &&
                present_.insert(dest + dir.substr(top.size())).second) {
                ++count_.directories;
            }
        }
        for (const PlannedFile& file : plan_.files) {
            if (file.path.compare(0, top.size(), top) != 0)
                continue;
            const bool fresh = present_.insert(dest + file.path.substr(top.size())).second;
            if (fresh || overwrite) {
                ++count_.file_copies;
                count_.bytes += file.size;
            }
        }
    }

    const ImagePlan& plan_;
    const std::string arch_dir_;
    std::set<std::string> present_;
    WorkCount count_;
};

}  // namespace

WorkCount count_work(const ImagePlan& plan, const std::string& arch) {
    return WorkCounter(plan, arch).run();
}

}  // namespace zr7bench
