// Installer610: the state and the steps of one installation run.
#pragma once

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "qsd/fileops/copy_outcome.h"
#include "qsd/fileops/image_tree.h"
#include "qsd/fileops/tree_walk.h"
#include "qsd/installer/journal.h"
#include "qsd/installer/run_observer.h"
#include "qsd/installer/simple_command.h"
#include "qsd/platform/directory_lock.h"
#include "qsd/platform/fs.h"
#include "qsd/text/dictionary.h"
#include "qsd/text/plan.h"

// Every action of the run reaches the installer's on_action: it keeps the
// plan (what the run did, or in a preview would do) and tells the observer.
class Installer610 : public zr7::ActionSink {
  public:
    Installer610();
    virtual ~Installer610();
    Installer610(const Installer610&) = delete;
    Installer610& operator=(const Installer610&) = delete;

    // Settings and symbols.
    int addVar(const char* text);
    int add_symbol(const char* name, const char* value);
    int add_path_symbol(const char* name, const char* value);
    int resolve(const std::string& path_template, std::string& out) const;
    // Expands the source and destination templates of a copy or seed
    // command, writing the bad-path error or the two "expanded" detail lines.
    // 0, or -1 when a template is empty or cannot be expanded.
    int expand_src_dst(const std::string& src_template, const std::string& dst_template,
                       std::string& src, std::string& dst) const;

    // The install run.
    int init(const std::string& src_dir, const std::string& home_dir);
    // The part of init an undo needs: the installation directory, open, and
    // the working directory.
    void init_home(const std::string& home_dir);
    int go();
    int process_commands(CommandList& commands);
    // Every command's checks, changing nothing (preflight.cpp): 0, or the
    // line and status of the command that would fail. In a preview the
    // checks also tell every action the command would take.
    int check_commands(const CommandList& commands);
    int check_architecture();
    int check_env_file(const SimpleCommand& command);
    int check_seed(const SimpleCommand& command);
    // Takes an action of the run: into the plan, and to the observer. Paths
    // are made absolute.
    void on_action(zr7::Action action, const std::string& path, const std::string& diff) override;
    // A path the run names, made absolute against the working directory.
    std::string absolute(std::string path) const;
    // Ends the plan of a run that ends with `status`: a failure adds its
    // "error" action, the first "Error:" line since the failing step began.
    void finish_plan(int status);
    // The stop at a recorded signal N: "Error: Interrupted by signal <N>" in
    // the log and on standard error; returns 128+N, the run's status.
    int interrupted();

    // Server configuration.
    int read_config(const std::string& home);

    // Environment file.
    int update_vxaenv(const std::string& dir_template);
    int update_kds_run(const std::string& line, std::string& out) const;

    // Where the commands read and write: the directories below the
    // installation directory and below the image's MSRV that a command path
    // names, opened by the link rules of the file-system layer. A path
    // outside both is opened as given. 0 or an error number.
    int open_home();
    int open_in_home(const std::string& path, zr7::fs::UniqueFd& out) const;
    int open_in_image(const std::string& path, zr7::ImageEntry& out);
    // Remembers the file system of a directory the run writes into, and
    // flushes every such file system to the disk: before VXAENV names what
    // was installed, and before the run reports success.
    void note_written(int dir);
    void sync_written();
    // The server's table directory, for the tree copies.
    zr7::ServerDirGuard server_dir_guard();
    // The backup of `dir_shown`/VXAENV that a preview plans, kept in the plan
    // of the tree so that a second one takes the next name.
    std::string planned_env_backup(int dir, const std::string& dir_shown);

    // Flat and tree copies; with `check_only`, the same steps changing nothing.
    int copy(const std::string& src_template, const std::string& dst_template);
    int recursive_copy(const std::string& src_template, const std::string& dst_template,
                       const std::string& options);
    int flat_copy(const std::string& src_template, const std::string& dst_template,
                  bool check_only);
    int tree_copy(const std::string& src_template, const std::string& dst_template,
                  const std::string& options, bool check_only);
    // Takes the run lock of the installation (none in a preview): 0, or the
    // status of a run that could not take it.
    int take_run_lock(std::unique_ptr<zr7::DirectoryLock>& lock);
    // Opens the installation's run store and this run's directory in it
    // (run_dir, run_id), with a journal for an installing run; removes the
    // run directories past the newest kKeptJournals journals first. 0, or a
    // status after an error line.
    int begin_run_dir(bool with_journal);
    zr7::ChangeJournal* journal_or_null() {
        return journal && journal->active() ? journal.get() : nullptr;
    }
    // Takes the newest installation not yet undone back (undo.cpp). 0, or the
    // status of the undo.
    int undo();
    // The bytes a preview's planned file would have (read from the image).
    int read_planned(const zr7::PlannedFile& file, std::string& content);

    // Catalog seeding.
    int seed(const std::string& src_template, const std::string& dst_template);
    int seed_single_file(const std::string& dst_dir, const std::string& file_name);
    // Opens (creating it and the log directory when missing) the seeding log
    // of an SQL file for appending. 0 or an error number.
    int open_seeding_log(const std::string& file_name, zr7::fs::UniqueFd& out);

    std::string home_path;       // installation directory, ending in "/"
    std::string family_setting;  // "KDC_FAMILIES=PORT:<port> <protocol> USE:Y"
    std::string source_path;     // src_dir + "MSRV/"
    std::string tmp_path;        // scratch directory, "/tmp/" or "./"
    std::string protocol;        // network protocol
    std::string port;            // port number
    std::string host_name;       // the local host's name after init
    std::string server_name;     // names the server's table directory
    std::string arch;            // binary architecture
    std::string module_name;     // -m
    std::string log_dir;         // -o
    int seeding = 1;             // cleared by -e
    int copying = 1;             // cleared by -s
    zr7::Dictionary settings;    // -c key=val, keys upper-cased
    zr7::Dictionary symbols;     // HOMEPATH, SRCPATH, BINARCH, QMSNAME
    zr7::fs::UniqueFd home_fd;   // the installation directory, open
    zr7::ImageRoot image;        // the image's MSRV, open once a command reads it
    int image_error = -1;        // -1 before the first open, then 0 or its error
    std::vector<std::pair<dev_t, zr7::fs::UniqueFd>> written;  // one directory per file system
    bool preview = false;                                      // -n: tell the plan, change nothing
    zr7::RunObserver* observer = nullptr;                      // the driver's, may be null
    zr7::Plan plan;                                            // the actions so far
    zr7::PlannedTree planned;               // checking: what the commands would have made
    zr7::StringList error_lines;            // every "Error:" line of the run
    std::size_t error_mark = 0;             // the first error line of the current step
    std::string working_dir;                // makes the plan's paths absolute
    zr7::fs::UniqueFd run_dir;              // this run's directory in the run store
    std::string run_id;                     // its name
    std::unique_ptr<zr7::Journal> journal;  // an installing run's
    std::string undone_run;                 // the run an undo took back
};
