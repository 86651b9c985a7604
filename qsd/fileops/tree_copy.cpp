// The flat and tree copies of the install commands. Each runs in one of two
// passes: copying, or changing nothing (the checks before the first change,
// and the preview), so that the checks meet exactly what the copy meets.
#include "qsd/fileops/copy_at.h"
#include "qsd/fileops/copy_outcome.h"
#include "qsd/fileops/install_util.h"
#include "qsd/fileops/tree_walk.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/fs.h"
#include "qsd/platform/interruption.h"
#include "qsd/platform/status.h"
#include "qsd/platform/trace.h"

int Installer610::copy(const std::string& src_template, const std::string& dst_template) {
    ZR7_OPERATION("Installer610::copy");
    ZR7_RETURN(flat_copy(src_template, dst_template, false));
}

int Installer610::flat_copy(const std::string& src_template, const std::string& dst_template,
                            bool check_only) {
    ZR7_TRACED("Installer610::copy");
    std::string src;
    std::string dst;
    if (expand_src_dst(src_template, dst_template, src, dst) != 0)
        return -1;

    // A source directory the image does not have is nothing to do; one that
    // is there and cannot be read is a failure, or its files would be left
    // out of a run that reports success.
    zr7::ImageEntry dir;
    zr7::StringList names;
    const int opened = open_in_image(src, dir);
    if (opened == ENOENT || opened == ENOTDIR) {
        ZR7_DETAIL("No file to process in <%s>", src.c_str());
        return 0;
    }
    if (opened == zr7::kLeadsOutside) {
        ZR7_ERROR("Error: Link <%s> leads outside the image", src.c_str());
        return zr7::kStatusCopyFailed;
    }
    if (opened != 0 || zr7::list_names(dir.fd.get(), names) != 0) {
        ZR7_ERROR("Error: Can't open <%s>", src.c_str());
        return zr7::kStatusCannotOpen;
    }

    // Only the files directly in the source; the destination must exist (or,
    // checking, be made by an earlier tree copy of the run).
    zr7::fs::UniqueFd dst_dir;
    bool dst_opened = false;
    zr7::ActionSink* sink = check_only && !preview ? nullptr : this;
    for (const std::string& name : names) {
        // A signal to stop is taken between files, never inside a copy.
        if (!check_only && zr7::interruption() != 0)
            return zr7::kStatusInterrupted;
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
            return zr7::kStatusCopyFailed;
        }
        if (found != 0) {
            ZR7_ERROR("Error: Can't access <%s>", from.c_str());
            ZR7_ERROR("Error: <%s>: %s", from.c_str(), zr7::fs::error_text(found).c_str());
            return zr7::kStatusCannotOpen;
        }
        if (!dst_opened) {
            int error = open_in_home(dst, dst_dir);
            if (error == ENOENT && check_only && planned.has_dir(dst))
                error = 0;
            if (error != 0) {
                ZR7_ERROR("Error: Can't open <%s>", dst.c_str());
                ZR7_ERROR("Error: <%s>: %s", dst.c_str(), zr7::fs::error_text(error).c_str());
                return zr7::kStatusCopyFailed;
            }
            dst_opened = true;
            if (!check_only) {
                note_written(dst_dir.get());
                zr7::fs::remove_stale_scratch(dst_dir.get(), "zr7copy");
            }
        }
        ZR7_DETAIL("processing <%s>", name.c_str());
        zr7::ContentDigest digest;
        const zr7::Action action =
            sink == nullptr ? zr7::Action::kCreate
                            : zr7::copy_outcome(entry.fd.get(), true, true, dst_dir.get(), name, to,
                                                &planned, digest);
        const int status =
            check_only ? zr7::check_copy_at(entry.fd.get(), entry.st, from, dst_dir.get(), name, to)
                       : zr7::journaled_copy(journal_or_null(), action, entry, from, dst_dir.get(),
                                             name, to, kCopyOverwrite | kCopyFixCr);
        if (status != 0) {
            ZR7_ERROR("Error: Copy src <%s> to dst <%s> failed", from.c_str(), to.c_str());
            return status;
        }
        if (sink != nullptr)
            sink->on_action(action, to, "");
        if (check_only && sink != nullptr)
            zr7::plan_copy(planned, action, entry.fd.get(), true, from, to, digest);
    }
    return 0;
}

int Installer610::recursive_copy(const std::string& src_template, const std::string& dst_template,
                                 const std::string& options) {
    ZR7_OPERATION("Installer610::recursive_copy");
    ZR7_RETURN(tree_copy(src_template, dst_template, options, false));
}

int Installer610::tree_copy(const std::string& src_template, const std::string& dst_template,
                            const std::string& options, bool check_only) {
    ZR7_TRACED("Installer610::recursive_copy");
    std::string src;
    std::string dst;
    if (expand_src_dst(src_template, dst_template, src, dst) != 0)
        return -1;

    zr7::ImageEntry top;
    const int opened = open_in_image(src, top);
    if (opened == ENOENT) {
        ZR7_DETAIL("src <%s> does not exist.  no work to do.", src.c_str());
        return 0;
    }
    if (opened != 0) {
        ZR7_ERROR(opened == zr7::kLeadsOutside ? "Error: Link <%s> leads outside the image"
                                               : "Error: Can't open <%s>",
                  src.c_str());
        return zr7::kStatusCopyFailed;
    }

    // The top destination is not created here: it must exist when there is
    // anything to copy into it. The walk creates the sub-directories below it.
    zr7::StringList names;
    if (zr7::list_names(top.fd.get(), names) == 0 && names.empty())
        return 0;
    zr7::fs::UniqueFd dst_dir;
    if (const int error = open_in_home(dst, dst_dir)) {
        ZR7_ERROR("Error: Can't open <%s>", dst.c_str());
        ZR7_ERROR("Error: <%s>: %s", dst.c_str(), zr7::fs::error_text(error).c_str());
        return zr7::kStatusCopyFailed;
    }
    if (!check_only)
        note_written(dst_dir.get());
    zr7::TreePass pass;
    pass.check_only = check_only;
    pass.planned = &planned;
    pass.sink = check_only && !preview ? nullptr : this;
    pass.journal = check_only ? nullptr : journal_or_null();
    const int status =
        zr7::copy_tree(image, top, src, dst_dir.get(), dst + "/",
                       zr7::copy_flags_from_options(options), server_dir_guard(), pass);
    return status == 0 || status == zr7::kStatusBackupFailed || status == zr7::kStatusInterrupted
               ? status
               : -5;
}
