#include "bench/run/contestants.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <fstream>
#include <sstream>

#include "bench/gen/write_tree.h"
#include "bench/run/probe_record.h"
#include "bench/run/spawn.h"
#include "qsd/seeding/seed_texts.h"

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

ReplayList plan_replay(const Bench& bench, const Case& c, const std::set<std::string>& sources) {
    const Sample preview = run_preview(bench, c);
    const std::string plan = slurp(bench.work + "/" + c.label + ".preview.out");
    if (preview.exit_code != 0) {
        ReplayList failed;
        failed.error = "the preview ended with " + std::to_string(preview.exit_code);
        return failed;
    }
    RouteSetting setting;
    setting.msrv = c.image + "/MSRV";
    setting.home = c.home;
    setting.server = c.server;
    setting.arch = c.arch;
    return build_replay(plan, copy_routes(build_command_list(true, true), setting), sources);
}

namespace {

std::string host_name() {
    char buffer[512] = {};
    return ::gethostname(buffer, sizeof buffer - 1) == 0 ? buffer : "";
}

std::string dir_of(const std::string& path) {
    return path.substr(0, path.rfind('/'));
}

std::string name_of(const std::string& path) {
    return path.substr(path.rfind('/') + 1);
}

}  // namespace

// The clock runs over the whole list, the runner's own work between the
// programs included (a directory made, a response file written), as the
// tool's own work between its programs counts in A.
Sample run_replay(const Bench& bench, const Case& c, const ReplayList& list) {
    Sample total;
    if (!list.error.empty()) {
        total.exit_code = 1;
        return total;
    }
    const std::string host = host_name();
    const std::string response = bench.work + "/" + c.label + ".D.rsp";
    const std::string err = bench.work + "/" + c.label + ".D.err";
    const std::string logs = c.home + "/logs/";
    const auto start = std::chrono::steady_clock::now();
    for (const ReplayStep& step : list.steps) {
        SpawnSpec job;
        job.env = bench.env;
        job.stderr_path = err;
        switch (step.kind) {
            case StepKind::kMkdir:
                if (::mkdir(step.to.c_str(), 0777) != 0 && errno != EEXIST)
                    total.exit_code = 1;
                continue;
            case StepKind::kCopy:
                job.argv = {bench.cp, "-f", "--", step.from, step.to};
                break;
            case StepKind::kStripCr:
                job.argv = {bench.tr, "-d", "\r"};
                job.stdin_path = step.from;
                job.stdout_path = step.to;
                break;
            case StepKind::kLoad: {
                const std::string name = name_of(step.to);
                if (write_file(response,
                               zr7::response_file_content(kBenchProtocol, host, kBenchPort, name),
                               0600) != 0)
                    total.exit_code = 1;
                job.argv = {bench.qdsload};
                job.env.push_back(std::string("KDC_FAMILIES=PORT:") + kBenchPort + " " +
                                  kBenchProtocol + " USE:Y");
                job.env.push_back("SQLLIB=" + dir_of(step.to));
                job.env.push_back("VXA_TRC1=ERROR");
                job.stdin_path = response;
                job.stdout_path = zr7::seeding_log_path(logs, name);
                job.stdout_append = true;
                break;
            }
        }
        const SpawnResult r = spawn_and_wait(job);
        total.cpu_s += r.cpu_s;
        if (total.exit_code == 0)
            total.exit_code = r.exit_code;
    }
    total.wall_s = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    ::unlink(response.c_str());
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
        "D, the design's floor: the programs A starts, replayed one after the other with "
        "nothing else: for each file A copies (each `create`, `replace` and `same` line of A's "
        "preview on the fresh home, traced back to its source through the tool's command list) "
        "one `cp -f -- SRC DST`, or `tr -d '\\r'` with standard input from SRC and standard "
        "output to DST where A removes carriage returns; for each SQL file A seeds one "
        "`qdsload` with the response file on its standard input and the seeding log on its "
        "output; the directories A creates made in between by the runner (mkdir(2)). No "
        "shell, no checks, no scratch files, no journal, no environment file. The preview and "
        "the list are made before the clock starts.",
        std::string("A's preview: `zr7inst -n -h HOME -c ") + kBenchSetting + " -m " +
            kBenchModule +
            " IMAGE`, its plan written to a file, on the fresh home just before A installs there.",
        "The undo: `zr7inst -u -h HOME` after A's installation over a home that held every file "
        "of the image with other bytes.",
    };
}

}  // namespace zr7bench
