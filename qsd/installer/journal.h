// The journal an installing run keeps in its run directory, so that undo can
// take the installation back exactly: before a file is replaced its old
// version is kept by a hard link (a copy only where a link cannot be made:
// another file system), the files and directories it creates are listed, and
// so are the bytes it left, the backup it made and the files it seeded.
// Each line is written before the change it announces, so a kill at any
// moment leaves a journal that names everything the run may have changed.
#pragma once

#include <set>
#include <string>

#include "qsd/fileops/change_journal.h"
#include "qsd/installer/journal_text.h"
#include "qsd/platform/fs.h"

namespace zr7 {

// The run directory's entries.
constexpr const char* kJournalFile = "journal";
constexpr const char* kKeptDir = "kept";

class Journal : public ChangeJournal {
  public:
    // `home` is the installation directory as the run shows it (its paths
    // begin with it).
    explicit Journal(std::string home) : home_(std::move(home)) {}
    // Starts the journal in the run directory. 0 or an error number.
    int open(int run_dir);
    bool active() const { return file_.valid(); }

    int before_mkdir(const std::string& shown) override;
    int before_write(int dir, const std::string& name, const std::string& shown,
                     Action action) override;
    int after_write(int dir, const std::string& name, const std::string& shown) override;
    // A line of another kind ("backup", "seed") for a path the run shows.
    int note(const std::string& kind, const std::string& shown);

  private:
    // The path below the installation directory, "" for one outside it.
    std::string relative(const std::string& shown) const;
    int append(const JournalEntry& entry);
    // Keeps the file `name` of `dir` as kept/<n>, `kept` its name there. 0
    // or an error number.
    int keep(int dir, const std::string& name, std::string& kept);

    std::string home_;
    fs::UniqueFd kept_dir_;
    fs::UniqueFd file_;
    std::set<std::string> listed_;  // paths whose first version is accounted for
    unsigned kept_count_ = 0;
};

}  // namespace zr7
