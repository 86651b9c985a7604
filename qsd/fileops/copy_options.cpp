#include "qsd/fileops/copy_options.h"

#include "qsd/fileops/install_util.h"

namespace zr7 {

unsigned copy_flags_from_options(const std::string& options) {
    unsigned flags = 0;
    for (char letter : options) {
        if (letter == 'O')
            flags |= kCopyOverwrite;
        else if (letter == 'T')
            flags |= kCopyFixCr;
    }
    return flags;
}

}  // namespace zr7
