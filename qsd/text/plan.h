// The plan of a run: one line for each thing an installation or an undo does
// (or, previewed, would do), in the order it does them, then a summary. The
// preview prints these lines; the run keeps the same lines in its manifest, so
// the two can be compared line for line.
#pragma once

#include <array>
#include <cstddef>
#include <string>

#include "qsd/text/text.h"

namespace zr7 {

enum class Action {
    // An installation's.
    kMkdir,    // a directory created
    kCreate,   // a file created
    kReplace,  // a file replaced by different bytes
    kSame,     // a file replaced by the same bytes
    kKeep,     // a file left as it was (the preserving trees)
    kVxaenv,   // the environment file rewritten; its diff follows the line
    kBackup,   // the backup of the environment file made first
    kSeed,     // an SQL file given to the loader
    kPass,     // a file that seeding passes over
    // An undo's.
    kRestore,   // a replaced file given its old bytes, mode, owner and group back
    kRemove,    // a created file removed
    kRmdir,     // a created directory removed
    kSeeded,    // an SQL file once given to the loader: the catalog keeps it
    kConflict,  // a file changed since the run installed it: left alone
    kError,     // the failure the run stops with; its text in place of a path
};
constexpr std::size_t kActionCount = static_cast<std::size_t>(Action::kError) + 1;

// The word that names an action in the plan ("mkdir", "create", ...).
const char* action_name(Action action);
// The action a word names; false for a word that names none.
bool action_from_name(const std::string& word, Action& out);

enum class PlanKind { kInstall, kUndo };

// Receives each action as a run takes it: the plan, the manifest, the
// progress on a terminal.
class ActionSink {
  public:
    virtual ~ActionSink() = default;
    // `path` is the file or directory, or for kError the error's text after
    // "Error: "; `diff` is the unified diff of a kVxaenv, else empty.
    virtual void on_action(Action action, const std::string& path, const std::string& diff) = 0;
};

// "ACTION PATH": the path with the log's escapes, so that every line of the
// plan is one line.
std::string plan_line(Action action, const std::string& path);

// The lines of a unified diff of two texts, "--- a/<label>", "+++ b/<label>",
// then hunks with three lines of context; "" when the texts are equal. A last
// line without a line break is marked the usual way ("\ No newline at end of
// file"). Control bytes other than tab are escaped in every line.
std::string unified_diff(const std::string& before, const std::string& after,
                         const std::string& label);

// The plan as it grows: its text and the count of each action.
class Plan : public ActionSink {
  public:
    explicit Plan(PlanKind kind = PlanKind::kInstall) : kind_(kind) {}
    void on_action(Action action, const std::string& path, const std::string& diff) override;

    // Every line so far, each ending in "\n" (the diff of a kVxaenv line
    // follows it, each of its lines indented by two blanks).
    const std::string& text() const { return text_; }
    std::size_t count(Action action) const { return counts_[static_cast<std::size_t>(action)]; }
    PlanKind kind() const { return kind_; }
    // Whether the run changed (or would change) anything: made, created,
    // replaced by other bytes, rewrote the environment file, gave a file to
    // the loader; for an undo, restored or removed anything.
    bool changed() const;
    // "summary: mkdir 0 create 3 ..." with every action of the plan's kind,
    // without the line break.
    std::string summary() const;
    // The actions of the plan's kind, in the summary's order.
    const Action* actions(std::size_t& n) const;

  private:
    PlanKind kind_;
    std::string text_;
    std::array<std::size_t, kActionCount> counts_{};
};

}  // namespace zr7
