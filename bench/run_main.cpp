// zr7bench_run: times the tool against the shell way and the two floors on
// synthetic installations of three sizes, checks that a very deep tree and a
// very large directory install, and writes the results page.
//
//   zr7bench_run [--sizes small,default,large] [--rounds 5] [--seed N]
//                [--contestants A,B,C,D] [--bin DIR] [--script FILE] [--work DIR]
//                [--out FILE] [--plot FILE|none] [--no-limits] [--keep]
//
// With A, each round also times A's preview, and A and its undo on a home
// where A replaces every file (the journal's cost). --contestants A,C leaves
// the slowest, the shell way, out of a run.
//
// Exit status: 0 when every run succeeded (the targets are reported, not
// enforced: a shared machine can miss a timing target for reasons of its
// own), 1 when a contestant or the preview failed, the tool and the shell way
// installed other bytes, or an undo did not give the home back, 2 for a bad
// command line or a broken setup.
#include <fcntl.h>
#include <linux/magic.h>
#include <sys/stat.h>
#include <sys/statfs.h>
#include <sys/utsname.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <fstream>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "bench/gen/content.h"
#include "bench/gen/image_plan.h"
#include "bench/gen/write_tree.h"
#include "bench/run/contestants.h"
#include "bench/run/report.h"
#include "bench/run/run_log.h"
#include "bench/run/spawn.h"
#include "bench/run/tree_digest.h"

extern char** environ;

namespace zr7bench {
namespace {

struct Options {
    std::vector<std::string> sizes{"small", "default", "large"};
    int rounds = 5;
    std::uint64_t seed = 20261206;
    std::string contestants = "ABCD";  // the letters of those that run
    std::string bin_dir;
    std::string script = std::string(ZR7_SOURCE_DIR) + "/bench/shell_install.sh";
    std::string work;
    std::string out = std::string(ZR7_SOURCE_DIR) + "/bench/RESULTS.md";
    std::string plot = std::string(ZR7_SOURCE_DIR) + "/bench/results.png";
    bool limits = true;
    bool keep = false;
};

[[noreturn]] void usage() {
    std::fprintf(stderr,
                 "usage: zr7bench_run [--sizes small,default,large] [--rounds N] [--seed N]\n"
                 "                    [--contestants A,B,C,D] [--bin DIR] [--script FILE]\n"
                 "                    [--work DIR] [--out FILE] [--plot FILE|none]\n"
                 "                    [--no-limits] [--keep]\n");
    std::exit(2);
}

std::vector<std::string> split(const std::string& text, char sep) {
    std::vector<std::string> parts;
    std::stringstream in(text);
    std::string part;
    while (std::getline(in, part, sep)) {
        if (!part.empty())
            parts.push_back(part);
    }
    return parts;
}

std::string dir_of_self() {
    char buffer[4096];
    const ssize_t n = ::readlink("/proc/self/exe", buffer, sizeof buffer - 1);
    if (n <= 0)
        return ".";
    std::string path(buffer, static_cast<std::size_t>(n));
    return path.substr(0, path.rfind('/'));
}

// A memory file system when the machine has one with room to spare: the
// figures then show the programs the contestants start, not the disk, nor
// what other users of the disk are doing (a disk file system that has just
// freed thousands of inodes, as each fresh server home does, can make every
// new file cost more than the program that writes it).
std::string default_work_root() {
    struct statfs fs {};
    if (::statfs("/dev/shm", &fs) == 0 && fs.f_type == TMPFS_MAGIC &&
        static_cast<double>(fs.f_bavail) * static_cast<double>(fs.f_bsize) > 4.0 * (1 << 30) &&
        ::access("/dev/shm", W_OK) == 0) {
        return "/dev/shm";
    }
    const char* tmp = std::getenv("TMPDIR");
    return tmp != nullptr && *tmp != '\0' ? tmp : "/tmp";
}

// How the work directory's file system shows in the results.
std::string describe_file_system(const std::string& path) {
    struct statfs fs {};
    if (::statfs(path.c_str(), &fs) != 0)
        return "unknown";
    switch (fs.f_type) {
        case TMPFS_MAGIC:
            return "tmpfs";
        case EXT4_SUPER_MAGIC:
            return "ext4";
        case XFS_SUPER_MAGIC:
            return "xfs";
        case BTRFS_SUPER_MAGIC:
            return "btrfs";
        default:
            return "type 0x" + [&fs] {
                char hex[32];
                std::snprintf(hex, sizeof hex, "%lx", static_cast<unsigned long>(fs.f_type));
                return std::string(hex);
            }();
    }
}

Options parse(int argc, char** argv) {
    Options o;
    for (int i = 1; i < argc; ++i) {
        const std::string arg = argv[i];
        const bool has_value = i + 1 < argc;
        if (arg == "--sizes" && has_value) {
            o.sizes = split(argv[++i], ',');
        } else if (arg == "--rounds" && has_value) {
            o.rounds = std::atoi(argv[++i]);
        } else if (arg == "--seed" && has_value) {
            o.seed = std::strtoull(argv[++i], nullptr, 10);
        } else if (arg == "--contestants" && has_value) {
            o.contestants.clear();
            for (const std::string& id : split(argv[++i], ',')) {
                if (id != "A" && id != "B" && id != "C" && id != "D")
                    usage();
                if (o.contestants.find(id) == std::string::npos)
                    o.contestants += id;
            }
        } else if (arg == "--bin" && has_value) {
            o.bin_dir = argv[++i];
        } else if (arg == "--script" && has_value) {
            o.script = argv[++i];
        } else if (arg == "--work" && has_value) {
            o.work = argv[++i];
        } else if (arg == "--out" && has_value) {
            o.out = argv[++i];
        } else if (arg == "--plot" && has_value) {
            o.plot = argv[++i];
        } else if (arg == "--no-limits") {
            o.limits = false;
        } else if (arg == "--keep") {
            o.keep = true;
        } else {
            usage();
        }
    }
    for (const std::string& size : o.sizes) {
        if (files_for_size(size) == 0)
            usage();
    }
    if (o.rounds < 1 || o.contestants.empty())
        usage();
    if (o.bin_dir.empty())
        o.bin_dir = dir_of_self();
    if (o.work.empty())
        o.work = default_work_root() + "/zr7bench." + std::to_string(::getpid());
    // Absolute, as the tool's plan shows the home: D's list is read from it.
    char cwd[4096];
    if (o.work[0] != '/' && ::getcwd(cwd, sizeof cwd) != nullptr)
        o.work = std::string(cwd) + "/" + o.work;
    return o;
}

std::string read_text(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    std::ostringstream content;
    content << in.rdbuf();
    return content.str();
}

Machine describe_machine() {
    Machine m;
    m.cores = static_cast<unsigned>(::sysconf(_SC_NPROCESSORS_ONLN));
    std::istringstream cpuinfo(read_text("/proc/cpuinfo"));
    for (std::string line; std::getline(cpuinfo, line);) {
        if (line.compare(0, 10, "model name") == 0) {
            m.cpu = line.substr(line.find(':') + 2);
            break;
        }
    }
    std::istringstream meminfo(read_text("/proc/meminfo"));
    for (std::string line; std::getline(meminfo, line);) {
        if (line.compare(0, 9, "MemTotal:") == 0)
            m.memory_gib = std::strtod(line.c_str() + 9, nullptr) / 1048576.0;
    }
    struct utsname u {};
    if (::uname(&u) == 0)
        m.kernel = u.release;
    char date[64];
    const std::time_t now = std::time(nullptr);
    std::strftime(date, sizeof date, "%Y-%m-%d %H:%M UTC", std::gmtime(&now));
    m.date = date;
    ::getloadavg(m.load_start, 3);
    return m;
}

// The runner's environment without what would steer the tool or the probe,
// with the build's bin directory first on PATH.
Bench make_bench(const Options& o) {
    Bench b;
    b.bin_dir = o.bin_dir;
    b.script = o.script;
    b.work = o.work;
    const char* path = std::getenv("PATH");
    b.path_value = o.bin_dir + ":" + (path != nullptr ? path : "/usr/bin:/bin");
    const char* const dropped[] = {
        "PATH=",       "MARLIN_HOME=",     "MARLINHOME=", "VXA_TRC1=",
        "LD_PRELOAD=", "ZR7BENCH_RUSAGE=", "SQLLIB=",     "KDC_FAMILIES="};
    for (char** e = environ; *e != nullptr; ++e) {
        bool keep = true;
        for (const char* prefix : dropped) {
            if (std::strncmp(*e, prefix, std::strlen(prefix)) == 0)
                keep = false;
        }
        if (keep)
            b.env.push_back(*e);
    }
    b.env.push_back("PATH=" + b.path_value);
    b.bash = find_program("bash", b.path_value);
    b.cp = find_program("cp", b.path_value);
    b.tr = find_program("tr", b.path_value);
    b.qdsload = o.bin_dir + "/qdsload";
    return b;
}

void fail_setup(const std::string& what) {
    std::fprintf(stderr, "zr7bench_run: %s\n", what.c_str());
    std::exit(2);
}

void check_setup(const Bench& b) {
    for (const char* name : {"zr7inst", "zr7bench_probe.so", "qdsload"}) {
        if (::access((b.bin_dir + "/" + name).c_str(), R_OK) != 0)
            fail_setup(b.bin_dir + "/" + name + " is missing: build the release build first");
    }
    if (::access(b.script.c_str(), R_OK) != 0)
        fail_setup(b.script + " is missing");
    if (b.bash.empty() || b.cp.empty() || b.tr.empty())
        fail_setup("bash, cp or tr is not on PATH");
}

// A fresh server home for one run: the old one removed, the new one written.
void fresh_home(const Case& c, const HomeOptions& home) {
    if (remove_tree(c.home) != 0 || write_home(home, c.home) != 0)
        fail_setup("cannot make a fresh server home at " + c.home);
    ::sync();  // the previous run's writes leave the disk before the clock starts
}

// The installed trees, without what differs by design: the environment file
// and its backups (rewritten by each contestant its own way), the logs, and
// the stand-in loader's catalog record (it holds the time of each load).
TreeDigest installed(const Case& c) {
    TreeDigest all;
    for (const std::string& top : {std::string("tables"), c.arch}) {
        for (const auto& entry :
             digest_tree(c.home + "/" + top, {"VXAENV", ".archive", "qdsload.catalog"}))
            all[top + "/" + entry.first] = entry.second;
    }
    return all;
}

// One size of the run: its image, its server home, and what was measured.
struct SizeCase {
    SizeRun run;
    Case c;
    HomeOptions home;
    TreeDigest tool_digest;
    TreeDigest shell_digest;
    TreeDigest replay_digest;
    std::set<std::string> sources;  // the image's files, absolute: D's list is traced to them
    ReplayList replay;              // D's list, made before D first runs
    bool replay_made = false;
};

SizeCase prepare_size(const Options& o, const std::string& name) {
    SizeCase sc;
    SizeRun& run = sc.run;
    run.name = name;
    GenOptions gen;
    gen.files = files_for_size(name);
    gen.seed = o.seed;
    const ImagePlan plan = plan_image(gen);
    run.image_files = plan.files.size();
    for (const PlannedFile& f : plan.files) {
        run.image_bytes += f.size;
        sc.sources.insert(o.work + "/" + name + "/image/" + f.path);
    }
    run.work = count_work(plan, gen.arch);

    sc.c.label = name;
    sc.c.image = o.work + "/" + name + "/image";
    sc.c.home = o.work + "/" + name + "/home";
    sc.home.seed = o.seed;
    std::fprintf(stderr, "[%s] writing the image\n", name.c_str());
    if (remove_tree(sc.c.image) != 0 || write_image(plan, sc.c.image) != 0)
        fail_setup("cannot write the image at " + sc.c.image);
    return sc;
}

// What a home holds apart from what differs by design between two moments of
// it: the logs, the tool's run records and journals, the environment file's
// backups and the stand-in loader's catalog record.
TreeDigest home_digest(const Case& c) {
    return digest_tree(c.home, {"logs", ".zr7inst", ".archive", "qdsload.catalog"});
}

// One byte more at the end of each file: other bytes at the same paths.
void append_byte(const Case& c, const std::vector<std::string>& files) {
    for (const std::string& rel : files) {
        const std::string path = c.home + "/" + rel;
        const int fd = ::open(path.c_str(), O_WRONLY | O_APPEND | O_CLOEXEC);
        if (fd < 0 || ::write(fd, "x", 1) != 1 || ::close(fd) != 0)
            fail_setup("cannot append to " + path);
    }
}

// The journal's round: C's copies into a fresh home, each file they wrote
// then given one byte more, so that A replaces every file it installs and
// keeps each old version in its journal; then the undo of that installation,
// which must leave the home as it was before A.
void run_replace_round(const Options& o, const Bench& b, int round, SizeCase& sc) {
    ReplaceRun r;
    fresh_home(sc.c, sc.home);
    const TreeDigest fresh = home_digest(sc.c);
    if (run_floor(b, sc.c).exit_code != 0)
        fail_setup("the floor's copies into " + sc.c.home + " failed");
    const std::vector<std::string> written = written_files(fresh, home_digest(sc.c));
    append_byte(sc.c, written);
    r.files_prepared = written.size();
    const TreeDigest before = home_digest(sc.c);
    ::sync();

    r.install = run_tool(b, sc.c);
    const RunEnd end = last_run_end(read_text(sc.c.home + "/logs/qsdinst.log"));
    if (end.found) {
        r.files_copied = end.files_copied;
        r.journal_s = end.journal_s;
    }
    r.undo = run_undo(b, sc.c);
    const TreeDifference diff = compare_digests(before, home_digest(sc.c));
    r.undo_differences = diff.count;
    r.first_undo_difference = diff.first;
    std::fprintf(stderr,
                 "[%s] round %d/%d: A over %zu files %.2f s (exit %d, journal %.3f s), "
                 "undo %.2f s (exit %d, %ld files differ)\n",
                 sc.run.name.c_str(), round + 1, o.rounds, r.files_prepared, r.install.wall_s,
                 r.install.exit_code, r.journal_s, r.undo.wall_s, r.undo.exit_code,
                 r.undo_differences);
    sc.run.replace.push_back(r);
}

// D's list, from A's preview on the fresh home D is about to replay into.
void make_replay(SizeCase& sc, const Bench& b) {
    if (sc.replay_made)
        return;
    sc.replay = plan_replay(b, sc.c, sc.sources);
    sc.replay_made = true;
    if (!sc.replay.error.empty())
        std::fprintf(stderr, "[%s] D cannot replay the plan: %s\n", sc.run.name.c_str(),
                     sc.replay.error.c_str());
}

// One round of one size: the contestants, each on a fresh home, in an order
// that turns with the round; A's preview on A's fresh home just before A.
void run_round(const Options& o, const Bench& b, int round, SizeCase& sc) {
    SizeRun& run = sc.run;
    ContestantRun* order[] = {&run.a, &run.b, &run.c, &run.d};
    for (int k = 0; k < 4; ++k) {
        ContestantRun* who = order[(round + k) % 4];
        if (o.contestants.find(who->id) == std::string::npos)
            continue;
        fresh_home(sc.c, sc.home);
        if (who->id == 'A') {
            const Sample p = run_preview(b, sc.c);
            run.preview.samples.push_back(p);
            std::fprintf(stderr, "[%s] round %d/%d: A's preview %.2f s (exit %d)\n",
                         run.name.c_str(), round + 1, o.rounds, p.wall_s, p.exit_code);
        }
        if (who->id == 'D')
            make_replay(sc, b);
        const Sample s = who->id == 'A'   ? run_tool(b, sc.c)
                         : who->id == 'B' ? run_shell_way(b, sc.c)
                         : who->id == 'C' ? run_floor(b, sc.c)
                                          : run_replay(b, sc.c, sc.replay);
        who->samples.push_back(s);
        std::fprintf(stderr, "[%s] round %d/%d: %c %.2f s (exit %d)\n", run.name.c_str(), round + 1,
                     o.rounds, who->id, s.wall_s, s.exit_code);
        if (round == 0 && who->id == 'A')
            sc.tool_digest = installed(sc.c);
        if (round == 0 && who->id == 'B')
            sc.shell_digest = installed(sc.c);
        if (round == 0 && who->id == 'D')
            sc.replay_digest = installed(sc.c);
    }
    if (round == 0 && run.a.all_succeeded() && run.b.all_succeeded()) {
        const TreeDifference diff = compare_digests(sc.tool_digest, sc.shell_digest);
        run.differences = diff.count;
        run.first_difference = diff.first;
    }
    if (round == 0 && run.a.all_succeeded() && run.d.all_succeeded()) {
        const TreeDifference diff = compare_digests(sc.tool_digest, sc.replay_digest);
        run.d_differences = diff.count;
        run.first_d_difference = diff.first;
    }
    if (round == 0) {
        sc.tool_digest.clear();
        sc.shell_digest.clear();
        sc.replay_digest.clear();
    }
    if (o.contestants.find('A') != std::string::npos)
        run_replace_round(o, b, round, sc);
}

// Every round runs every size, so that a change in the machine's load in the
// course of the run touches all sizes alike and the ratio between sizes stays
// meaningful.
std::vector<SizeRun> run_sizes(const Options& o, const Bench& b) {
    std::vector<SizeCase> cases;
    for (const std::string& size : o.sizes)
        cases.push_back(prepare_size(o, size));
    for (int round = 0; round < o.rounds; ++round) {
        for (std::size_t k = 0; k < cases.size(); ++k)
            run_round(o, b, round, cases[(static_cast<std::size_t>(round) + k) % cases.size()]);
    }
    std::vector<SizeRun> runs;
    for (SizeCase& sc : cases) {
        runs.push_back(sc.run);
        if (!o.keep)
            remove_tree(o.work + "/" + sc.run.name);
    }
    return runs;
}

// Runs the tool once on an image with nothing but a very deep tree or a very
// large directory, and checks every file arrived with the expected bytes.
RobustRun run_limit(const Options& o, const Bench& b, const std::string& name) {
    RobustRun run;
    run.name = name;
    GenOptions gen;
    gen.files = 0;
    gen.seed = o.seed;
    if (name == "deep") {
        gen.deep = 200;
        run.what = "a TABLE tree 200 directories deep, one file on each level";
    } else {
        gen.wide = 20000;
        run.what = "a TABLE directory of 20,000 files";
    }
    const ImagePlan plan = plan_image(gen);
    Case c;
    c.label = name;
    c.image = o.work + "/" + name + "/image";
    c.home = o.work + "/" + name + "/home";
    HomeOptions home;
    home.seed = o.seed;
    if (remove_tree(c.image) != 0 || write_image(plan, c.image) != 0)
        fail_setup("cannot write the image at " + c.image);
    fresh_home(c, home);
    std::fprintf(stderr, "[%s] installing\n", name.c_str());
    run.sample = run_tool(b, c);
    run.exit_code = run.sample.exit_code;

    // Both images hold files under TABLE only, copied as they are.
    const std::string table = "MSRV/" + gen.arch + "/TABLE/";
    for (const PlannedFile& f : plan.files) {
        if (f.path.compare(0, table.size(), table) != 0)
            continue;
        ++run.expected;
        if (read_text(c.home + "/tables/SRV1/" + f.path.substr(table.size())) == file_content(f))
            ++run.found;
    }
    std::fprintf(stderr, "[%s] exit %d, %zu of %zu files, %.2f s\n", name.c_str(), run.exit_code,
                 run.found, run.expected, run.sample.wall_s);
    if (!o.keep)
        remove_tree(o.work + "/" + name);
    return run;
}

// A PNG of wall time against file copies, when gnuplot is installed.
std::string plot(const Options& o, const Bench& b, const Report& report) {
    if (o.plot == "none")
        return "";
    const std::string gnuplot = find_program("gnuplot", b.path_value);
    if (gnuplot.empty()) {
        std::fprintf(stderr, "no gnuplot on PATH: no plot\n");
        return "";
    }
    const std::string data = o.work + "/plot.dat";
    const std::string script = o.work + "/plot.gp";
    std::ofstream d(data);
    for (const SizeRun& size : report.sizes) {
        d << size.work.file_copies << ' ' << size.a.wall().median << ' ' << size.b.wall().median
          << ' ' << size.c.wall().median << ' ' << size.d.wall().median << '\n';
    }
    d.close();
    std::ofstream g(script);
    g << "set terminal png size 800,500\n"
      << "set output '" << o.plot << "'\n"
      << "set title 'Installation wall time (median of " << report.rounds << " rounds)'\n"
      << "set xlabel 'file copies'\nset ylabel 'seconds'\nset key left top\nset grid\n";
    // Only the contestants that ran: one left out has no times to draw.
    const char* const lines[] = {
        "1:3 with linespoints title 'B shell way'", "1:2 with linespoints title 'A tool'",
        "1:5 with linespoints title 'D design floor'", "1:4 with linespoints title 'C floor'"};
    const char ids[] = {'B', 'A', 'D', 'C'};
    std::string plots;
    for (int k = 0; k < 4; ++k) {
        if (o.contestants.find(ids[k]) != std::string::npos)
            plots +=
                std::string(plots.empty() ? "plot " : ", ") + "'" + data + "' using " + lines[k];
    }
    g << plots << "\n";
    g.close();
    SpawnSpec job;
    job.argv = {gnuplot, script};
    job.env = b.env;
    job.stderr_path = o.work + "/plot.err";
    if (spawn_and_wait(job).exit_code != 0) {
        std::fprintf(stderr, "gnuplot failed: no plot (see %s/plot.err)\n", o.work.c_str());
        return "";
    }
    const std::size_t slash = o.plot.rfind('/');
    return slash == std::string::npos ? o.plot : o.plot.substr(slash + 1);
}

int run(int argc, char** argv) {
    const Options o = parse(argc, argv);
    Report report;
    report.machine = describe_machine();
    report.rounds = o.rounds;
    report.command = "zr7bench_run";
    for (int i = 1; i < argc; ++i)
        report.command += std::string(" ") + argv[i];
    report.contestant_commands = describe_contestants();

    if (make_dirs(o.work) != 0)
        fail_setup("cannot create " + o.work);
    const Bench b = make_bench(o);
    check_setup(b);
    report.work_dir = o.work + " (" + describe_file_system(o.work) + ")";

    report.sizes = run_sizes(o, b);
    if (o.limits) {
        report.robust.push_back(run_limit(o, b, "deep"));
        report.robust.push_back(run_limit(o, b, "wide"));
    }
    ::getloadavg(report.machine.load_end, 3);
    report.plot_file = plot(o, b, report);

    std::ofstream out(o.out);
    out << render_markdown(report);
    out.close();
    if (!o.keep)
        remove_tree(o.work);

    bool ok = static_cast<bool>(out);
    for (const SizeRun& size : report.sizes) {
        for (const ContestantRun* who : {&size.a, &size.b, &size.c, &size.d, &size.preview}) {
            const char id = who->id == 'P' ? 'A' : who->id;
            if (o.contestants.find(id) != std::string::npos)
                ok = ok && who->all_succeeded();
        }
        // Compared only when both ran.
        if (o.contestants.find('A') != std::string::npos &&
            o.contestants.find('B') != std::string::npos)
            ok = ok && size.differences == 0;
        if (o.contestants.find('A') != std::string::npos &&
            o.contestants.find('D') != std::string::npos)
            ok = ok && size.d_differences == 0;
        for (const ReplaceRun& r : size.replace)
            ok = ok && r.install.exit_code == 0 && r.home_given_back();
    }
    for (const RobustRun& r : report.robust)
        ok = ok && r.exit_code == 0 && r.found == r.expected;
    std::printf("results: %s\n", o.out.c_str());
    for (const TargetCheck& check : check_targets(report))
        std::printf("  %-70s %-45s %s\n", check.target.c_str(), check.measured.c_str(),
                    check.holds ? "yes" : "NO");
    return ok ? 0 : 1;
}

}  // namespace
}  // namespace zr7bench

int main(int argc, char** argv) {
    return zr7bench::run(argc, argv);
}
