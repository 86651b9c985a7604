#include <cstdio>
#include <cstdlib>

#include "qsd/driver/driver.h"

namespace zr7 {

void usage() {
    std::fflush(stdout);
    std::fputs(
        "Usage: zr7inst [-c key=val] [-e] [-f] [-h home] [-m mod] [-s] [-v ver] [-V] src_dir\n"
        "  -c key=val Add key=val in VXAENV if not already there.\n"
        "             or updates it to new value\n"
        "  -e       Copy files only.  Skip seeding.\n"
        "  -f       Force file copy.  (Deprecated)\n"
        "  -h home  Installation directory.  If not specified here,\n"
        "           then it must be defined thru env var MARLIN_HOME.\n"
        "  -m mod   Use 'mod' as module name.  This will cause VXAENV\n"
        "           to be updated, and 'mod' appended to KDS_RUN.\n"
        "  -s       Seeding only.  Skip copying\n"
        "  -v ver   Version of the source image.  Currently only\n"
        "           610 is supported.  Default is 610.\n"
        "  -V       Print out version as vvrrmmff.  If this is the\n"
        "           only option, exit right away.\n",
        stderr);
    std::exit(-2);
}

}  // namespace zr7
