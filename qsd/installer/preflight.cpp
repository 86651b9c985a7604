// The checks of an installing run before its first command changes
// anything: every command meets, without changing anything, what it would
// meet, and a failure found here ends the run with the line and the status
// that the command would have ended it with. What cannot be foreseen (a full
// disk, a race) still stops the run where it happens.
#include <algorithm>

#include "qsd/fileops/copy_options.h"
#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/fs.h"
#include "qsd/platform/process.h"
#include "qsd/platform/trace.h"
#include "qsd/seeding/sql_selection.h"

namespace {

// The directories of MSRV that are no architecture's tree.
bool is_catalog_directory(const std::string& name) {
    return name == "ATTRLIB" || name == "RKDSCATL" || name == "TECLIB" || name == "SQLLIB";
}

}  // namespace

int Installer610::check_architecture() {
    ZR7_TRACED("Installer610::check_commands");
    zr7::ImageEntry msrv;
    zr7::StringList names;
    if (arch.empty() || open_in_image(source_path, msrv) != 0 ||
        zr7::list_names(msrv.fd.get(), names) != 0) {
        return 0;
    }
    bool has_trees = false;
    for (const std::string& name : names) {
        zr7::ImageEntry entry;
        if (is_catalog_directory(name) ||
            zr7::open_image_entry(image, msrv.fd.get(), msrv.where, msrv.outside, name, entry) !=
                0 ||
            entry.kind != zr7::EntryKind::kDirectory) {
            continue;
        }
        if (name == arch)
            return 0;
        has_trees = true;
    }
    if (!has_trees)
        return 0;
    ZR7_ERROR("Error: The image has no tree for the architecture <%s>", arch.c_str());
    return -7;
}

int Installer610::check_flat_copy(const SimpleCommand& command, const zr7::StringList& made) {
    ZR7_TRACED("Installer610::copy");
    std::string src;
    std::string dst;
    if (expand_src_dst(command.source, command.destination, src, dst) != 0)
        return -1;
    zr7::ImageEntry dir;
    zr7::StringList names;
    const int opened = open_in_image(src, dir);
    if (opened == ENOENT || opened == ENOTDIR)
        return 0;
    if (opened == zr7::kLeadsOutside) {
        ZR7_ERROR("Error: Link <%s> leads outside the image", src.c_str());
        return -5;
    }
    if (opened != 0 || zr7::list_names(dir.fd.get(), names) != 0) {
        ZR7_ERROR("Error: Can't open <%s>", src.c_str());
        return -7;
    }
    zr7::fs::UniqueFd dst_dir;
    int dst_error = -1;
    for (const std::string& name : names) {
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
            return -5;
        }
        if (found != 0) {
            ZR7_ERROR("Error: Can't access <%s>", from.c_str());
            return -7;
        }
        if (dst_error == -1) {
            dst_error = open_in_home(dst, dst_dir);
            // A directory that an earlier tree copy of this run will make.
            if (dst_error == ENOENT && std::find(made.begin(), made.end(), dst) != made.end())
                dst_error = 0;
            if (dst_error != 0) {
                ZR7_ERROR("Error: Can't open <%s>", dst.c_str());
                ZR7_ERROR("Error: <%s>: %s", dst.c_str(), zr7::fs::error_text(dst_error).c_str());
                return -5;
            }
        }
        if (zr7::check_copy_at(entry.fd.get(), entry.st, from, dst_dir.get(), name, to) != 0) {
            ZR7_ERROR("Error: Copy src <%s> to dst <%s> failed", from.c_str(), to.c_str());
            return -5;
        }
    }
    return 0;
}

int Installer610::check_tree_copy(const SimpleCommand& command, zr7::StringList& made) {
    ZR7_TRACED("Installer610::recursive_copy");
    std::string src;
    std::string dst;
    if (expand_src_dst(command.source, command.destination, src, dst) != 0)
        return -1;
    zr7::ImageEntry top;
    const int opened = open_in_image(src, top);
    if (opened == ENOENT)
        return 0;
    if (opened != 0) {
        ZR7_ERROR(opened == zr7::kLeadsOutside ? "Error: Link <%s> leads outside the image"
                                               : "Error: Can't open <%s>",
                  src.c_str());
        return -5;
    }
    zr7::StringList names;
    if (zr7::list_names(top.fd.get(), names) == 0 && names.empty())
        return 0;
    zr7::fs::UniqueFd dst_dir;
    if (const int error = open_in_home(dst, dst_dir)) {
        ZR7_ERROR("Error: Can't open <%s>", dst.c_str());
        ZR7_ERROR("Error: <%s>: %s", dst.c_str(), zr7::fs::error_text(error).c_str());
        return -5;
    }
    const int status =
        zr7::check_tree(image, top, src, dst_dir.get(), dst + "/",
                        zr7::copy_flags_from_options(command.options), server_dir_guard(), made);
    return status == 0 || status == -9 ? status : -5;
}

int Installer610::check_env_file(const SimpleCommand& command) {
    ZR7_TRACED("Installer610::update_vxaenv");
    std::string dir;
    if (module_name.empty() && settings.empty())
        return 0;
    if (resolve(command.source, dir) < 0)
        return 0;  // the command itself reports the bad path
    const std::string env_path = dir + "/VXAENV";
    zr7::fs::UniqueFd dir_fd;
    zr7::fs::UniqueFd file;
    struct stat st {};
    struct stat link {};
    zr7::fs::Target target;
    int error = open_in_home(dir, dir_fd);
    if (error == 0)
        error = zr7::fs::resolve_name(dir_fd.get(), "VXAENV", target);
    if (error == 0 && !target.followed && zr7::fs::stat_at(dir_fd.get(), "VXAENV", link) == 0 &&
        S_ISLNK(link.st_mode)) {
        error = zr7::fs::kUntrustedLink;
    }
    if (error == 0)
        error = zr7::fs::open_read(target.dir.get(), target.name, file, st);
    if (error == 0)
        return 0;
    ZR7_ERROR("Error: Can't open <%s>", env_path.c_str());
    ZR7_ERROR("Error: <%s>: %s", env_path.c_str(), zr7::fs::error_text(error).c_str());
    return -7;
}

int Installer610::check_seed(const SimpleCommand& command) {
    ZR7_TRACED("Installer610::seed");
    std::string src;
    std::string dst;
    if (expand_src_dst(command.source, command.destination, src, dst) != 0)
        return -1;
    zr7::StringList names;
    if (InstallUtil::get_file_list(src.c_str(), names) != 0) {
        ZR7_ERROR("Error: Can't open <%s>", src.c_str());
        return -7;
    }
    for (const std::string& name : names) {
        if (zr7::select_sql_name(name) != zr7::SqlSelection::kSeed)
            continue;
        if (!zr7::find_on_path("qdsload").empty())
            return 0;
        ZR7_ERROR("Error: Can't start <qdsload>: not found on PATH");
        ZR7_ERROR("Error: Seeding <%s> failed", name.c_str());
        return -6;
    }
    return 0;
}

int Installer610::check_commands(const CommandList& commands) {
    ZR7_OPERATION("Installer610::check_commands");
    int status = copying != 0 ? check_architecture() : 0;
    zr7::StringList made;
    for (const SimpleCommand& command : commands) {
        if (status < 0)
            break;
        switch (command.kind) {
            case kFlatCopy:
                status = check_flat_copy(command, made);
                break;
            case kTreeCopy:
                status = check_tree_copy(command, made);
                break;
            case kUpdateEnv:
                status = check_env_file(command);
                break;
            case kSeed:
                status = check_seed(command);
                break;
            default:
                break;
        }
    }
    ZR7_RETURN(status < 0 ? status : 0);
}
