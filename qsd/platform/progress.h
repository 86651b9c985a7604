// Progress for an administrator watching a terminal: one line on standard
// error, rewritten in place, and a closing summary. Off unless enabled, and
// enabled only by the installing invocation when standard error is a
// terminal, so standard output and the log never change because of it.
#pragma once

#include <string>

namespace zr7 {

void progress_enable(bool on);
bool progress_enabled();

void progress_command(int index, int count, int kind, const std::string& source_template);
void progress_file_copied(const std::string& destination);
void progress_seeding(const std::string& file_name);
void progress_seeded(const std::string& file_name);
void progress_env_result(bool changed, const std::string& backup_path);
// Clears the progress line and writes the summary of the run.
void progress_finish(int status);

}  // namespace zr7
