#include <unistd.h>

#include <cstdio>
#include <cstring>

#include "qsd/driver/driver.h"
#include "qsd/driver/getopt.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/interruption.h"
#include "qsd/platform/progress.h"
#include "qsd/platform/trace.h"

namespace zr7 {

namespace {

// The closing line on standard output, and its copy in the detail trace.
int finish(const TraceScope& zr7_trace, TRC1_Unit& zr7_unit, int status) {
    std::printf("Exiting with rc <%d>\n", status);
    std::fflush(stdout);
    ZR7_DETAIL("Exiting with rc <%d>", status);
    return status;
}

}  // namespace

int run_main(int argc, char** argv) {
    ZR7_OPERATION("main");
    Installer610 installer;
    std::string home;
    std::string source;
    int relaunched = 0;
    GetOpt options(argc, argv, kOptionString);

    if (argc == 2 && std::strcmp(argv[1], "-V") == 0) {
        std::printf("%s\n", kVrmf);
        ZR7_RETURN(0);
    }

    for (char letter = options.next(); letter != 0; letter = options.next()) {
        switch (letter) {
            case 'c':
                if (installer.addVar(options.argument) != 0) {
                    std::fflush(stdout);
                    std::fprintf(stderr, "Error: Bad env var %s\n", options.argument);
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
                installer.module_name = options.argument;
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
                    std::fprintf(stderr, "Error: Version %s not supported\n", options.argument);
                    ZR7_RETURN(finish(zr7_trace, zr7_unit, -2));
                }
                break;
            case 'V':
                std::printf("%s version %s\n", argv[0], kVrmf);
                break;
            default:
                usage();
        }
    }

    // Exactly one operand, and not an empty one: "" would install from a
    // directory nobody named.
    if (argc - options.index != 1 || argv[options.index][0] == '\0')
        usage();

    if (home.empty())
        home = get_home_path();
    if (home.back() != '/')
        home += '/';

    if (relaunched == 0) {
        const int status = jump_start(argc, argv, home.c_str());
        ZR7_RETURN(status);
    }

    // The installing invocation: SIGINT, SIGTERM and SIGHUP stop it between
    // files, not inside one.
    catch_interruptions();
    ignore_file_size_signal();

    // A progress line for a watching terminal.
    progress_enable(progress_wanted(::isatty(STDERR_FILENO) == 1, ::isatty(STDOUT_FILENO) == 1));

    if (zr7_trace.detail()) {
        ZR7_DETAIL("Parameters begin-----------------");
        for (int i = 1; i < argc; ++i)
            ZR7_DETAIL("....<%s>", argv[i]);
        ZR7_DETAIL("Parameters end ------------------");
    }

    source = argv[options.index];
    if (source.back() != '/')
        source += '/';
    source += "MSRV/";

    int status = installer.init(source, home);
    if (status == 0) {
        std::printf("Calling go\n");
        std::fflush(stdout);
        status = installer.go();
    }
    progress_finish(status);
    status = finish(zr7_trace, zr7_unit, status);
    // Standard output is the log, the run's record. When some of it could
    // not be written (a full disk), the run says so where it still can and
    // does not end as a success.
    if (std::ferror(stdout) != 0) {
        std::fprintf(stderr, "Error: Can't write <%s>\n",
                     (installer.log_dir + "qsdinst.log").c_str());
        if (status == 0)
            status = -8;
    }
    ZR7_RETURN(status);
}

}  // namespace zr7
