// Undo: the newest installation not yet undone, taken back from its journal.
// Replaced files get their old version back (the kept file renamed into
// place: bytes, mode, owner and group as they were), created files are
// removed and created directories removed when empty, VXAENV is backed up
// before it gets its old content back. A file whose bytes changed since the
// installation wrote it is left as it is and reported. Each step can be
// taken again after a kill: a repeated undo finds what is done already.
#include <sys/stat.h>

#include <algorithm>
#include <ctime>
#include <map>
#include <set>

#include "qsd/envfile/backup.h"
#include "qsd/installer/installer610.h"
#include "qsd/installer/run_store.h"
#include "qsd/platform/interruption.h"
#include "qsd/platform/status.h"
#include "qsd/platform/trace.h"

namespace {

constexpr const char* kUndoneMark = "undone";

// What the journal says of one path.
struct PathHistory {
    std::string first;  // "mkdir", "create" or "replace"
    std::string kept;
    bool installed = false;
    zr7::ContentDigest digest;  // the bytes the run left, when installed
};

// A journal read back: the paths in the order the run first touched them,
// and the SQL files it gave the loader.
struct History {
    std::map<std::string, PathHistory> paths;
    zr7::StringList order;
    zr7::StringList seeded;
};

History read_history(const std::string& text) {
    History history;
    for (const zr7::JournalEntry& entry : zr7::parse_journal(text)) {
        if (entry.kind == "seed") {
            history.seeded.push_back(entry.path);
            continue;
        }
        if (entry.kind == "backup")
            continue;
        PathHistory& path = history.paths[entry.path];
        if (entry.kind == "installed") {
            path.installed = true;
            path.digest = entry.digest;
        } else if (path.first.empty()) {
            path.first = entry.kind;
            path.kept = entry.kept;
            history.order.push_back(entry.path);
        }
    }
    return history;
}

bool is_kept_name(const std::string& name) {
    return !name.empty() && name.size() < 12 &&
           std::all_of(name.begin(), name.end(), [](char c) { return c >= '0' && c <= '9'; });
}

// The digest of a regular file, false when there is none to read.
bool digest_of(int dir, const std::string& name, zr7::ContentDigest& out, struct stat& st) {
    zr7::fs::UniqueFd file;
    return zr7::fs::stat_at(dir, name, st) == 0 && S_ISREG(st.st_mode) &&
           zr7::fs::open_read(dir, name, file, st) == 0 &&
           zr7::digest_file(file.get(), false, out) == 0;
}

std::string read_text(int dir, const std::string& name) {
    zr7::fs::UniqueFd file;
    struct stat ignored {};
    std::string text;
    (void)(zr7::fs::open_read(dir, name, file, ignored) == 0 &&
           zr7::fs::read_all(file.get(), text) == 0);
    return text;
}

// Puts the kept version of a file back: renamed into place, or, kept by a
// copy on another file system, copied back whole with its attributes.
int put_back(int kept_dir, const std::string& kept, int dir, const std::string& name, bool sync) {
    int error = zr7::fs::rename_at(kept_dir, kept, dir, name);
    if (error == EXDEV) {
        error = zr7::fs::copy_like(kept_dir, kept, dir, name, sync);
        if (error == 0)
            (void)zr7::fs::remove_file(kept_dir, kept);
    }
    if (error == 0 && sync)
        error = zr7::fs::sync_fd(dir);
    return error;
}

}  // namespace

int Installer610::undo() {
    ZR7_OPERATION("Installer610::undo");
    plan = zr7::Plan(zr7::PlanKind::kUndo);
    std::unique_ptr<zr7::DirectoryLock> run_lock;
    if (const int status = take_run_lock(run_lock))
        ZR7_RETURN(status);
    error_mark = error_lines.size();
    const std::string home = symbols.find("HOMEPATH") != nullptr ? *symbols.find("HOMEPATH") : "";
    const std::string store_path = home + "/" + zr7::kRunStoreName;

    // The newest run with a journal and no mark of its undo.
    zr7::fs::UniqueFd store;
    zr7::fs::UniqueFd run;
    std::string id;
    struct stat st {};
    int error = zr7::fs::open_dir_below(home_fd.get(), zr7::kRunStoreName, store);
    if (error == 0) {
        // Opened by the link rule; the store must still be ours alone.
        zr7::fs::UniqueFd checked;
        error = zr7::fs::make_private_dir(home_fd.get(), zr7::kRunStoreName, checked);
    }
    if (error != 0 && error != ENOENT) {
        ZR7_ERROR("Error: Can't open <%s>", store_path.c_str());
        ZR7_ERROR("Error: <%s>: %s", store_path.c_str(), zr7::fs::error_text(error).c_str());
        ZR7_RETURN(zr7::kStatusCannotWrite);
    }
    const zr7::StringList ids = error == 0 ? zr7::run_ids(store.get()) : zr7::StringList();
    for (std::size_t i = ids.size(); i-- > 0 && id.empty();) {
        zr7::fs::UniqueFd candidate;
        if (zr7::fs::open_dir_below(store.get(), ids[i], candidate) == 0 &&
            zr7::fs::stat_at(candidate.get(), zr7::kJournalFile, st) == 0 &&
            zr7::fs::stat_at(candidate.get(), kUndoneMark, st) != 0) {
            id = ids[i];
            run = std::move(candidate);
        }
    }
    if (id.empty()) {
        ZR7_ERROR("Error: Nothing to undo in <%s>", home.c_str());
        ZR7_RETURN(zr7::kStatusNothingToUndo);
    }
    ZR7_DETAIL("Undoing the run <%s>", id.c_str());
    undone_run = id;
    if (!preview) {
        if (const int status = begin_run_dir(false))
            ZR7_RETURN(status);
    }

    zr7::fs::UniqueFd kept_dir;
    zr7::fs::UniqueFd journal_file;
    std::string text;
    error = zr7::fs::open_read(run.get(), zr7::kJournalFile, journal_file, st);
    if (error == 0)
        error = zr7::fs::read_all(journal_file.get(), text);
    if (error == 0)
        error = zr7::fs::open_dir_below(run.get(), zr7::kKeptDir, kept_dir);
    if (error != 0) {
        const std::string shown = store_path + "/" + id;
        ZR7_ERROR("Error: Can't open <%s>", shown.c_str());
        ZR7_ERROR("Error: <%s>: %s", shown.c_str(), zr7::fs::error_text(error).c_str());
        ZR7_RETURN(zr7::kStatusCannotWrite);
    }

    History history = read_history(text);
    int conflicts = 0;
    int status = 0;
    std::set<std::string> removed;  // what this undo removed, or would
    // Undone in the opposite order: a directory after what the run put in it.
    for (std::size_t i = history.order.size(); i-- > 0 && status == 0;) {
        if (!preview && zr7::interruption() != 0)
            ZR7_RETURN(interrupted());
        const std::string& relative = history.order[i];
        const PathHistory& path = history.paths[relative];
        const std::string shown = home + "/" + relative;
        const std::string name = zr7::base_name(relative);
        zr7::fs::UniqueFd dir;
        if (zr7::fs::open_dir_below(home_fd.get(), zr7::dir_name(relative), dir) != 0)
            continue;  // gone with its directory: nothing left to take back
        zr7::ContentDigest now;
        struct stat now_st {};
        const bool present = digest_of(dir.get(), name, now, now_st);
        const bool as_installed = !path.installed || (present && now == path.digest);
        zr7::ContentDigest old;
        struct stat old_st {};
        const bool kept = path.first == "replace" && is_kept_name(path.kept) &&
                          digest_of(kept_dir.get(), path.kept, old, old_st);
        zr7::Action action = zr7::Action::kRestore;
        if (path.first == "mkdir") {
            zr7::StringList inside;
            zr7::fs::UniqueFd made;
            // Gone, or holding what others put there: left.
            if (zr7::fs::stat_at(dir.get(), name, st) != 0 || !S_ISDIR(st.st_mode) ||
                zr7::fs::open_dir_below(dir.get(), name, made) != 0 ||
                zr7::list_names(made.get(), inside) != 0 ||
                std::any_of(inside.begin(), inside.end(), [&](const std::string& entry) {
                    return removed.count(relative + "/" + entry) == 0;  // a preview's
                })) {
                continue;
            }
            action = zr7::Action::kRmdir;
        } else if (path.first == "create") {
            if (!present && zr7::fs::stat_at(dir.get(), name, st) != 0)
                continue;  // removed already
            action = zr7::Action::kRemove;
        } else if (!kept) {
            continue;  // put back already
        } else if (present && now == old) {
            // Put back by a copy that was killed before it removed the kept file.
            if (!preview)
                (void)zr7::fs::remove_file(kept_dir.get(), path.kept);
            continue;
        }
        if (action != zr7::Action::kRmdir && (!present || !as_installed)) {
            ZR7_DETAIL("Changed since the installation: <%s>", shown.c_str());
            on_action(zr7::Action::kConflict, shown, "");
            ++conflicts;
            continue;
        }
        const bool env_file = action == zr7::Action::kRestore && name == "VXAENV";
        const std::string before_text = env_file ? read_text(dir.get(), name) : "";
        if (env_file) {
            // The environment file as it is now is backed up first, under a
            // name no backup has.
            std::string backup;
            const std::string dir_shown = home + "/" + zr7::dir_name(relative);
            if (preview) {
                backup = planned_env_backup(dir.get(), dir_shown);
            } else if (zr7::backup_content_at(dir.get(), dir_shown, name, before_text,
                                              now_st.st_mode, zr7::backup_stamp(std::time(nullptr)),
                                              backup) != 0) {
                ZR7_ERROR("Error: Can't backup VXAENV");
                status = zr7::kStatusBackupFailed;
                break;
            }
            on_action(zr7::Action::kBackup, backup, "");
        }
        const std::string old_text = env_file ? read_text(kept_dir.get(), path.kept) : "";
        if (!preview) {
            error = action == zr7::Action::kRmdir ? zr7::fs::remove_dir(dir.get(), name)
                    : action == zr7::Action::kRemove
                        ? zr7::fs::remove_file(dir.get(), name)
                        : put_back(kept_dir.get(), path.kept, dir.get(), name, env_file);
            if (error != 0) {
                ZR7_ERROR(action == zr7::Action::kRestore ? "Error: Can't restore <%s>"
                                                          : "Error: Can't remove <%s>",
                          shown.c_str());
                ZR7_ERROR("Error: <%s>: %s", shown.c_str(), zr7::fs::error_text(error).c_str());
                status = zr7::kStatusCopyFailed;
                break;
            }
        }
        if (action != zr7::Action::kRestore)
            removed.insert(relative);
        if (env_file)
            on_action(zr7::Action::kVxaenv, shown,
                      zr7::unified_diff(before_text, old_text, "VXAENV"));
        else
            on_action(action, shown, "");
    }
    if (status == 0) {
        for (const std::string& relative : history.seeded)
            on_action(zr7::Action::kSeeded, home + "/" + relative, "");
        // The run is undone, as far as it can be: the next undo goes on with
        // the installation before it.
        if (!preview && (error = zr7::write_run_file(run.get(), kUndoneMark, run_id + "\n")) != 0) {
            ZR7_ERROR("Error: Can't mark <%s> undone", (store_path + "/" + id).c_str());
            status = zr7::kStatusCannotWrite;
        }
    }
    if (status == 0 && conflicts > 0) {
        ZR7_ERROR("Error: %d files changed since the installation were left as they are",
                  conflicts);
        status = zr7::kStatusUndoConflicts;
    }
    ZR7_RETURN(status);
}
