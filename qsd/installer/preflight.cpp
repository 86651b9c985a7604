// The checks of an installing run before its first command changes
// anything: every command meets, without changing anything, what it would
// meet, and a failure found here ends the run with the line and the status
// that the command would have ended it with. What cannot be foreseen (a full
// disk, a race) still stops the run where it happens.
#include "qsd/envfile/env_rewrite.h"
#include "qsd/fileops/install_util.h"
#include "qsd/installer/installer610.h"
#include "qsd/platform/fs.h"
#include "qsd/platform/process.h"
#include "qsd/platform/status.h"
#include "qsd/platform/trace.h"
#include "qsd/seeding/seed_texts.h"

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
    return zr7::kStatusCannotOpen;
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
    if (error != 0) {
        ZR7_ERROR("Error: Can't open <%s>", env_path.c_str());
        ZR7_ERROR("Error: <%s>: %s", env_path.c_str(), zr7::fs::error_text(error).c_str());
        return zr7::kStatusCannotOpen;
    }
    if (!preview)
        return 0;
    // The file as the copies before would leave it.
    std::string content;
    const zr7::PlannedFile* earlier = planned.file(env_path);
    error = earlier != nullptr ? read_planned(*earlier, content)
                               : zr7::fs::read_all(file.get(), content);
    if (error != 0) {
        ZR7_ERROR("Error: Can't open <%s>", env_path.c_str());
        ZR7_ERROR("Error: <%s>: %s", env_path.c_str(), zr7::fs::error_text(error).c_str());
        return zr7::kStatusCannotOpen;
    }
    zr7::Dictionary requested = settings;
    const zr7::EnvRewrite rewrite = zr7::rewrite_env_content(content, requested, module_name);
    if (!rewrite.changed)
        return 0;
    on_action(zr7::Action::kBackup, planned_env_backup(dir_fd.get(), dir), "");
    on_action(zr7::Action::kVxaenv, env_path,
              zr7::unified_diff(content, rewrite.content, "VXAENV"));
    return 0;
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
        return zr7::kStatusCannotOpen;
    }
    bool loader_found = false;
    for (const std::string& name : names) {
        const bool seeded = zr7::select_sql_name(name) == zr7::SqlSelection::kSeed;
        if (seeded && !loader_found) {
            if (zr7::find_on_path("qdsload").empty()) {
                ZR7_ERROR("Error: Can't start <qdsload>: not found on PATH");
                ZR7_ERROR("Error: Seeding <%s> failed", name.c_str());
                return zr7::kStatusSeedFailed;
            }
            loader_found = true;
        }
        if (seeded && name.find('\n') != std::string::npos) {
            ZR7_ERROR("Error: Can't seed <%s>: the name holds a line break", name.c_str());
            ZR7_ERROR("Error: Seeding <%s> failed", name.c_str());
            return zr7::kStatusSeedFailed;
        }
        if (preview)
            on_action(seeded ? zr7::Action::kSeed : zr7::Action::kPass, dst + "/" + name, "");
    }
    return 0;
}

int Installer610::check_commands(const CommandList& commands) {
    ZR7_OPERATION("Installer610::check_commands");
    int status = copying != 0 ? check_architecture() : 0;
    for (const SimpleCommand& command : commands) {
        if (status < 0)
            break;
        switch (command.kind) {
            case kFlatCopy:
                status = flat_copy(command.source, command.destination, true);
                break;
            case kTreeCopy:
                status = tree_copy(command.source, command.destination, command.options, true);
                break;
            case kUpdateEnv:
                status = check_env_file(command);
                break;
            case kSeed:
                status = check_seed(command);
                break;
        }
    }
    ZR7_RETURN(status < 0 ? status : 0);
}
