// The flat and tree copies of the install commands.
#include "qsd/fileops/copy_at.h"
#include "qsd/fileops/copy_options.h"
#include "qsd/fileops/install_util.h"
#include "qsd/fileops/tree_walk.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/fs.h"
#include "qsd/platform/interruption.h"
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
    zr7::ImageEntry dir;
    zr7::StringList names;
    const int opened = open_in_image(src, dir);
    if (opened == ENOENT || opened == ENOTDIR) {
        ZR7_DETAIL("No file to process in <%s>", src.c_str());
        ZR7_RETURN(0);
    }
    if (opened == zr7::kLeadsOutside) {
        ZR7_ERROR("Error: Link <%s> leads outside the image", src.c_str());
        ZR7_RETURN(-5);
    }
    if (opened != 0 || zr7::list_names(dir.fd.get(), names) != 0) {
        ZR7_ERROR("Error: Can't open <%s>", src.c_str());
        ZR7_RETURN(-7);
    }

    // Only the files directly in the source; the destination must exist.
    zr7::fs::UniqueFd dst_dir;
    for (const std::string& name : names) {
        // A signal to stop is taken between files, never inside a copy.
        if (zr7::interruption() != 0)
            ZR7_RETURN(zr7::kStatusInterrupted);
        const std::string from = src + "/" + name;
        const std::string to = dst + "/" + name;
        zr7::ImageEntry entry;
        const int found =
            zr7::open_image_entry(image, dir.fd.get(), dir.where, dir.outside, name, entry);
        if (found == ENOENT || (found == 0 && (entry.kind == zr7::EntryKind::kPassOver ||
                                               entry.kind == zr7::EntryKind::kDirectory))) {
            continue;
        }
        if (found == zr7::kLeadsOutside) {
            ZR7_ERROR("Error: Link <%s> leads outside the image", from.c_str());
            ZR7_RETURN(-5);
        }
        if (found != 0) {
            ZR7_ERROR("Error: Can't access <%s>", from.c_str());
            ZR7_ERROR("Error: <%s>: %s", from.c_str(), zr7::fs::error_text(found).c_str());
            ZR7_RETURN(-7);
        }
        if (!dst_dir.valid()) {
            if (const int error = open_in_home(dst, dst_dir)) {
                ZR7_ERROR("Error: Can't open <%s>", dst.c_str());
                ZR7_ERROR("Error: <%s>: %s", dst.c_str(), zr7::fs::error_text(error).c_str());
                ZR7_RETURN(-5);
            }
            note_written(dst_dir.get());
            zr7::fs::remove_stale_scratch(dst_dir.get(), "zr7copy");
        }
        ZR7_DETAIL("processing <%s>", name.c_str());
        const int status = zr7::copy_file_at(entry.fd.get(), entry.st, from, dst_dir.get(), name,
                                             to, kCopyOverwrite | kCopyFixCr);
        if (status != 0) {
            ZR7_ERROR("Error: Copy src <%s> to dst <%s> failed", from.c_str(), to.c_str());
            ZR7_RETURN(status);
        }
        zr7::progress_file_copied(to);
    }
    ZR7_RETURN(0);
}

int Installer610::recursive_copy(const std::string& src_template, const std::string& dst_template,
                                 const std::string& options) {
    ZR7_OPERATION("Installer610::recursive_copy");
    std::string src;
    std::string dst;
    if (expand_src_dst(src_template, dst_template, src, dst) != 0)
        ZR7_RETURN(-1);

    zr7::ImageEntry top;
    const int opened = open_in_image(src, top);
    if (opened == ENOENT) {
        ZR7_DETAIL("src <%s> does not exist.  no work to do.", src.c_str());
        ZR7_RETURN(0);
    }
    if (opened != 0) {
        ZR7_ERROR(opened == zr7::kLeadsOutside ? "Error: Link <%s> leads outside the image"
                                               : "Error: Can't open <%s>",
                  src.c_str());
        ZR7_RETURN(-5);
    }

    // The top destination is not created here: it must exist when there is
    // anything to copy into it. The walk creates the sub-directories below it.
    zr7::StringList names;
    if (zr7::list_names(top.fd.get(), names) == 0 && names.empty())
        ZR7_RETURN(0);
    zr7::fs::UniqueFd dst_dir;
    if (const int error = open_in_home(dst, dst_dir)) {
        ZR7_ERROR("Error: Can't open <%s>", dst.c_str());
        ZR7_ERROR("Error: <%s>: %s", dst.c_str(), zr7::fs::error_text(error).c_str());
        ZR7_RETURN(-5);
    }
    note_written(dst_dir.get());
    const zr7::ServerDirGuard guard = server_dir_guard();
    const int status = zr7::copy_tree(image, top, src, dst_dir.get(), dst + "/",
                                      zr7::copy_flags_from_options(options), guard);
    ZR7_RETURN(status == 0 || status == -9 || status == zr7::kStatusInterrupted ? status : -5);
}
