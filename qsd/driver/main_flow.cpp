#include <pwd.h>
#include <unistd.h>

#include <chrono>
#include <climits>
#include <cstdio>
#include <cstring>
#include <ctime>

#include "qsd/driver/driver.h"
#include "qsd/driver/getopt.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/interruption.h"
#include "qsd/platform/status.h"
#include "qsd/platform/trace.h"
#include "qsd/text/escape.h"

namespace zr7 {

namespace {

// The closing line on standard output, and its copy in the detail trace.
int finish(const TraceScope& zr7_trace, TRC1_Unit& zr7_unit, int status) {
    std::printf("Exiting with rc <%d>\n", status);
    std::fflush(stdout);
    ZR7_DETAIL("Exiting with rc <%d>", status);
    return status;
}

// A refusal of an option's value, on standard error, the value escaped: it
// may hold the very bytes it is refused for.
void refuse_value(const char* what, const char* value) {
    std::fflush(stdout);
    std::fprintf(stderr, "Error: %s %s\n", what, escape_controls(value).c_str());
}

std::string user_name(uid_t uid) {
    struct passwd entry {};
    struct passwd* found = nullptr;
    char buffer[4096];
    if (::getpwuid_r(uid, &entry, buffer, sizeof buffer, &found) == 0 && found != nullptr)
        return found->pw_name;
    return "?";
}

std::string working_directory() {
    char buffer[PATH_MAX];
    return ::getcwd(buffer, sizeof buffer) != nullptr ? buffer : "?";
}

double seconds_since(std::chrono::steady_clock::time_point start) {
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

// Where the administrator's arguments begin in the installing run's
// vector: after the "-o <logdir>" that the relaunch put first.
int relaunched_arguments_start(int argc, char** argv) {
    return argc > 2 && std::strcmp(argv[1], "-o") == 0 ? 3 : 1;
}

}  // namespace

int run_main(int argc, char** argv) {
    ZR7_OPERATION("main");
    const auto started = std::chrono::steady_clock::now();
    Installer610 installer;
    std::string home;
    int relaunched = 0;
    bool preview = false;      // -n
    bool undo = false;         // -u
    bool env_options = false;  // -c or -m given
    GetOpt options(argc, argv, kOptionString);

    if (argc == 2 && std::strcmp(argv[1], "-V") == 0) {
        std::printf("%s\n", kVrmf);
        ZR7_RETURN(0);
    }

    // The form of the whole line first: a mistyped line does nothing at all.
    const CommandLineCheck check = check_command_line(argc, argv);
    switch (check.action) {
        case CommandLineAction::kHelp:
            std::fputs(usage_text().c_str(), stdout);
            std::fflush(stdout);
            ZR7_RETURN(0);
        case CommandLineAction::kVersion:
            std::printf("%s version %s\n", escape_controls(argv[0]).c_str(), kVrmf);
            std::fflush(stdout);
            ZR7_RETURN(0);
        case CommandLineAction::kRefuse:
            std::fflush(stdout);
            std::fprintf(stderr, "zr7inst: %s\n", escape_controls(check.fault).c_str());
            usage();
        case CommandLineAction::kRun:
            break;
    }

    for (char letter = options.next(); letter != 0; letter = options.next()) {
        switch (letter) {
            case 'c':
                // A line break or another control byte would end up in VXAENV
                // as a line of its own, or in the log as one.
                env_options = true;
                if (has_control_byte(options.argument) || installer.addVar(options.argument) != 0) {
                    refuse_value("Bad env var", options.argument);
                    ZR7_RETURN(finish(zr7_trace, zr7_unit, -2));
                }
                break;
            case 'e':
                installer.seeding = 0;
                break;
            case 'f':
                break;
            case 'h':
                home = options.argument;
                break;
            case 'm':
                env_options = true;
                if (has_control_byte(options.argument)) {
                    refuse_value("Bad module name", options.argument);
                    ZR7_RETURN(finish(zr7_trace, zr7_unit, -2));
                }
                installer.module_name = options.argument;
                break;
            case 'n':
                preview = true;
                break;
            case 'u':
                undo = true;
                break;
            case 'o':
                installer.log_dir = options.argument;
                relaunched = 1;
                break;
            case 's':
                installer.copying = 0;
                break;
            case 'v':
                if (std::strcmp(options.argument, "610") != 0) {
                    std::fflush(stdout);
                    std::fprintf(stderr, "Error: Version %s not supported\n",
                                 escape_controls(options.argument).c_str());
                    ZR7_RETURN(finish(zr7_trace, zr7_unit, -2));
                }
                break;
            case 'V':
                std::printf("%s version %s\n", escape_controls(argv[0]).c_str(), kVrmf);
                break;
            default:
                usage();  // check_command_line has refused every other form
        }
    }

    if (home.empty())
        home = get_home_path(preview ? stderr : stdout);
    if (home.back() != '/')
        home += '/';

    // An undo has no src_dir.
    const std::string src_dir = undo ? "" : argv[options.index];
    if (preview)
        ZR7_RETURN(run_preview(installer, home, src_dir, undo));

    if (relaunched == 0) {
        int status = check_before_relaunch(home, src_dir);
        if (status == 0)
            status = jump_start(argc, argv, home.c_str());
        ZR7_RETURN(status);
    }

    // The installing invocation: its errors also reach the first
    // invocation's standard error; SIGINT, SIGTERM and SIGHUP stop it between
    // files, not inside one; a watching terminal gets progress.
    trace_echo_errors(true);
    catch_interruptions();
    ignore_file_size_signal();
    ProgressDisplay progress(
        progress_wanted(::isatty(STDERR_FILENO) == 1, ::isatty(STDOUT_FILENO) == 1));
    installer.observer = &progress;
    trace_collect_errors(&installer.error_lines);
    RunRecord record;
    record.start = iso_local_time(static_cast<long>(std::time(nullptr)));
    for (int i = relaunched_arguments_start(argc, argv); i < argc; ++i)
        record.arguments.emplace_back(argv[i]);
    const std::string log_file = installer.log_dir + "qsdinst.log";

    if (zr7_trace.detail()) {
        ZR7_DETAIL("%s", run_header_line(iso_local_time(static_cast<long>(std::time(nullptr))),
                                         user_name(::geteuid()), static_cast<long>(::geteuid()),
                                         working_directory(), argc, argv)
                             .c_str());
        ZR7_DETAIL("Parameters begin-----------------");
        for (int i = 1; i < argc; ++i)
            ZR7_DETAIL("....<%s>", argv[i]);
        ZR7_DETAIL("Parameters end ------------------");
    }
    if (installer.copying == 0 && env_options) {
        static const char kSkipped[] =
            "Warning: -s skips the VXAENV update; -c and -m are not applied";
        std::fflush(stdout);
        std::fprintf(stderr, "%s\n", kSkipped);
        ZR7_DETAIL("%s", kSkipped);
    }

    int status = 0;
    if (undo) {
        record.operation = "undo";
        installer.init_home(home);
        status = installer.undo();
    } else {
        status = installer.init(image_source_path(src_dir), home);
        if (status == 0) {
            std::printf("Calling go\n");
            std::fflush(stdout);
            status = installer.go();
        }
    }
    installer.finish_plan(status);
    record.end = iso_local_time(static_cast<long>(std::time(nullptr)));
    record.home = installer.absolute(home);
    record.image = undo ? "" : installer.absolute(src_dir);
    record.backup = progress.state().backup;
    record.undoes = installer.undone_run;
    status = keep_run_record(installer, record, status);
    trace_collect_errors(nullptr);
    progress.finish(status, installer.plan.summary().substr(9), log_file, seconds_since(started));
    status = finish(zr7_trace, zr7_unit, status);
    // Standard output is the log, the run's record. When some of it could
    // not be written (a full disk), the run says so where it still can and
    // does not end as a success.
    if (std::ferror(stdout) != 0) {
        std::fprintf(stderr, "Error: Can't write <%s>\n", escape_controls(log_file).c_str());
        if (status == 0)
            status = zr7::kStatusCannotWrite;
    }
    ZR7_DETAIL("%s", run_closing_line(status, progress.state(), seconds_since(started),
                                      installer.journal ? installer.journal->seconds() : 0.0)
                         .c_str());
    ZR7_RETURN(status);
}

}  // namespace zr7
