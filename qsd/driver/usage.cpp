#include <cstdio>
#include <cstdlib>

#include "qsd/driver/driver.h"
#include "qsd/platform/status.h"

namespace zr7 {

namespace {

// The text every earlier release printed, kept byte for byte: scripts and
// people compare against it.
const char* const kUsageLines =
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
    "           only option, exit right away.\n";

// Options added since: one line each, after the fourteen.
const char* const kAddedOptionLines[] = {
    "  -n       Preview: print each change the installation would make,\n",
    "           and change nothing.\n",
    "  -u       Undo the newest installation not yet undone (no src_dir).\n",
    "  --help   Print this text on standard output and exit.\n",
    "  --version Print the version line on standard output and exit.\n",
};

}  // namespace

std::string usage_text() {
    std::string text = kUsageLines;
    for (const char* line : kAddedOptionLines)
        text += line;
    return text;
}

void usage() {
    std::fflush(stdout);
    std::fputs(usage_text().c_str(), stderr);
    std::exit(zr7::kStatusUsage);
}

}  // namespace zr7
