#include "bench/run/contestants.h"

#include <unistd.h>

#include <fstream>
#include <sstream>

#include "bench/run/probe_record.h"
#include "bench/run/spawn.h"

namespace zr7bench {

namespace {

Sample from_spawn(const SpawnResult& r) {
    Sample s;
    s.wall_s = r.wall_s;
    s.cpu_s = r.cpu_s;
    s.exit_code = r.exit_code;
    return s;
}

std::string slurp(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    std::ostringstream content;
    content << in.rdbuf();
    return content.str();
}

}  // namespace

Sample run_tool(const Bench& bench, const Case& c) {
    const std::string probe_file = bench.work + "/" + c.label + ".rusage";
    ::unlink(probe_file.c_str());
    SpawnSpec job;
    job.argv = {
        bench.bin_dir + "/zr7inst", "-h", c.home, "-c", kBenchSetting, "-m", kBenchModule, c.image};
    job.env = bench.env;
    job.env.push_back("LD_PRELOAD=" + bench.bin_dir + "/zr7bench_probe.so");
    job.env.push_back("ZR7BENCH_RUSAGE=" + probe_file);
    job.stdout_path = bench.work + "/" + c.label + ".A.out";
    job.stderr_path = bench.work + "/" + c.label + ".A.err";
    Sample s = from_spawn(spawn_and_wait(job));
    const ToolUsage usage = combine_probe_lines(slurp(probe_file));
    if (usage.installers > 0) {
        s.tool_cpu_s = static_cast<double>(usage.self_us) / 1e6;
        s.tool_rss_mib = static_cast<double>(usage.peak_rss_kb) / 1024.0;
    }
    ::unlink(probe_file.c_str());
    return s;
}

// The plan goes to a file, as a user would keep it to read.
Sample run_preview(const Bench& bench, const Case& c) {
    SpawnSpec job;
    job.argv = {bench.bin_dir + "/zr7inst",
                "-n",
                "-h",
                c.home,
                "-c",
                kBenchSetting,
                "-m",
                kBenchModule,
                c.image};
    job.env = bench.env;
    job.stdout_path = bench.work + "/" + c.label + ".preview.out";
    job.stderr_path = bench.work + "/" + c.label + ".preview.err";
    return from_spawn(spawn_and_wait(job));
}

Sample run_undo(const Bench& bench, const Case& c) {
    SpawnSpec job;
    job.argv = {bench.bin_dir + "/zr7inst", "-u", "-h", c.home};
    job.env = bench.env;
    job.stdout_path = bench.work + "/" + c.label + ".undo.out";
    job.stderr_path = bench.work + "/" + c.label + ".undo.err";
    return from_spawn(spawn_and_wait(job));
}

Sample run_shell_way(const Bench& bench, const Case& c) {
    SpawnSpec job;
    job.argv = {bench.bash, bench.script, c.image,       c.home,
                c.server,   c.arch,       kBenchSetting, kBenchModule};
    job.env = bench.env;
    job.stdout_path = bench.work + "/" + c.label + ".B.out";
    job.stderr_path = bench.work + "/" + c.label + ".B.err";
    return from_spawn(spawn_and_wait(job));
}

Sample run_floor(const Bench& bench, const Case& c) {
    const std::string msrv = c.image + "/MSRV/";
    const std::string arch = msrv + c.arch + "/";
    const std::string tables = c.home + "/tables/" + c.server + "/";
    const std::string cicat = c.home + "/tables/cicatrsq/";
    const std::string ms = c.home + "/" + c.arch + "/ms/";
    struct Step {
        std::string from;
        std::string to;
        bool keep_existing;  // the trees that add only missing files
    };
    const Step steps[] = {
        {msrv + "ATTRLIB", tables + "ATTRLIB", false},
        {msrv + "RKDSCATL", tables + "RKDSCATL", false},
        {msrv + "TECLIB", tables + "TECLIB", false},
        {msrv + "ATTRLIB", cicat + "ATTRLIB", false},
        {msrv + "RKDSCATL", cicat + "RKDSCATL", false},
        {msrv + "TECLIB", cicat + "TECLIB", false},
        {msrv + "SQLLIB", cicat + "SQLLIB", false},
        {arch + "TABLE", tables, false},
        {arch + "TABLE_PRESERVE", tables, true},
        {arch + "lib", ms + "lib", false},
        {arch + "bin", ms + "bin", false},
        {arch + "TABLE_TXT", tables, false},
        {arch + "TABLE_PRESERVE_TXT", tables, true},
        {arch + "TABLE/TECLIB", tables + "TECLIB", false},
        {arch + "TABLE/TECLIB", cicat + "TECLIB", false},
    };
    Sample total;
    for (const Step& step : steps) {
        SpawnSpec job;
        job.argv = {bench.cp, step.keep_existing ? "-an" : "-a", step.from + "/.", step.to};
        job.env = bench.env;
        job.stderr_path = bench.work + "/" + c.label + ".C.err";
        const Sample s = from_spawn(spawn_and_wait(job));
        total.wall_s += s.wall_s;
        total.cpu_s += s.cpu_s;
        if (total.exit_code == 0)
            total.exit_code = s.exit_code;
    }
    return total;
}

std::vector<std::string> describe_contestants() {
    return {
        std::string("A, the tool as a user runs it, through the relaunch: `zr7inst -h HOME -c ") +
            kBenchSetting + " -m " + kBenchModule +
            " IMAGE`, the build's bin directory first on PATH (the stand-in `qdsload`). Its own "
            "CPU and memory come from `zr7bench_probe.so`, preloaded into the tool's two "
            "processes only.",
        std::string("B, the shell way: `bash bench/shell_install.sh IMAGE HOME SRV1 lx8266 ") +
            kBenchSetting + " " + kBenchModule +
            "`, the same copies, directories, environment-file update and seeding, with one "
            "`sh -c \"cp -f ...\"` or `sh -c \"tr -d '\\r' <... >...\"` per file and one "
            "`sh -c \"qdsload <... >>...\"` per SQL file.",
        "C, the floor: one `cp -a SRC/. DST` per command of the list (`cp -an` for the trees "
        "that keep existing files); no carriage returns removed, no environment file, no "
        "seeding.",
        std::string("A's preview: `zr7inst -n -h HOME -c ") + kBenchSetting + " -m " +
            kBenchModule +
            " IMAGE`, its plan written to a file, on the fresh home just before A installs there.",
        "The undo: `zr7inst -u -h HOME` after A's installation over a home that held every file "
        "of the image with other bytes.",
    };
}

}  // namespace zr7bench
