// The flat and tree copies of the install commands.
#include <sys/stat.h>

#include "qsd/fileops/copy_options.h"
#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/progress.h"
#include "qsd/platform/trace.h"

int Installer610::copy(const std::string& src_template, const std::string& dst_template) {
    ZR7_OPERATION("Installer610::copy");
    std::string src;
    std::string dst;
    if (expand_src_dst(src_template, dst_template, src, dst) != 0)
        ZR7_RETURN(-1);

    // A source directory the image does not have is nothing to do; one that
    // is there and cannot be read is a failure, or its files would be left
    // out of a run that reports success.
    zr7::StringList names;
    if (InstallUtil::get_file_list(src.c_str(), names) == -7) {
        struct stat st {};
        if (::stat(src.c_str(), &st) == 0 && S_ISDIR(st.st_mode)) {
            ZR7_ERROR("Error: Can't open <%s>", src.c_str());
            ZR7_RETURN(-7);
        }
        ZR7_DETAIL("No file to process in <%s>", src.c_str());
        ZR7_RETURN(0);
    }

    // Only the files directly in the source; the destination must exist.
    int status = 0;
    for (const std::string& name : names) {
        ZR7_DETAIL("processing <%s>", name.c_str());
        const std::string from = src + "/" + name;
        const std::string to = dst + "/" + name;
        status = InstallUtil::copy_file(from.c_str(), to.c_str(), kCopyOverwrite | kCopyFixCr);
        if (status != 0) {
            ZR7_ERROR("Error: Copy src <%s> to dst <%s> failed", from.c_str(), to.c_str());
            break;
        }
        zr7::progress_file_copied(to);
    }
    ZR7_RETURN(status);
}

int Installer610::recursive_copy(const std::string& src_template, const std::string& dst_template,
                                 const std::string& options) {
    ZR7_OPERATION("Installer610::recursive_copy");
    std::string src;
    std::string dst;
    if (expand_src_dst(src_template, dst_template, src, dst) != 0)
        ZR7_RETURN(-1);

    struct stat st {};
    if (::stat(src.c_str(), &st) != 0) {
        ZR7_DETAIL("src <%s> does not exist.  no work to do.", src.c_str());
        ZR7_RETURN(0);
    }

    // The top destination is not created here: it must exist. The walk
    // creates the sub-directories below it.
    const unsigned flags = zr7::copy_flags_from_options(options);
    dst += "/";
    ZR7_RETURN(InstallUtil::xcopy(src.c_str(), dst.c_str(), flags));
}
