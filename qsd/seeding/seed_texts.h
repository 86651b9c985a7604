// The texts one loader run is made of: the response file, the paths, the
// environment entry naming the SQL directory, and the command line the trace
// shows.
#pragma once

#include <string>

namespace zr7 {

// The response file the loader reads on standard input: protocol, host name,
// port and file name, one a line, then "end" with no newline after it. The
// values go in as they are held; an empty one gives an empty line.
std::string response_file_content(const std::string& protocol, const std::string& host_name,
                                  const std::string& port, const std::string& file_name);

// <scratch dir>qsdseed_<pid>.rsp; the scratch directory ends in "/".
std::string response_file_path(const std::string& tmp_path, const std::string& pid);

// <log dir><file name>.log; the log directory is taken as given, ending in "/".
std::string seeding_log_path(const std::string& log_dir, const std::string& file_name);

// "SQLLIB=" and the directory, wrapped in double quotes when it holds white
// space.
std::string sqllib_entry(const std::string& dst_dir);

// The loader run as a shell would read it, for the trace only:
// "qdsload <rsp" and, with a seeding log, " >>log"; paths holding white space
// are wrapped in double quotes. An empty log path means no seeding log.
std::string loader_command_text(const std::string& response_path, const std::string& log_path);

// Which listed file names seeding hands to the loader.
enum class SqlSelection {
    kSeed,      // an SQL file to seed
    kDeletion,  // holds "_del" in any case: deletion scripts are never seeded
    kNotSql,    // does not end in ".sql" in any case
};

// Decides on the name as listed (no directory part). The "_del" test comes
// first, so "x_del.txt" is a deletion script, not a non-SQL file. Case is
// folded the C locale's way, whatever the process locale.
SqlSelection select_sql_name(const std::string& name);

}  // namespace zr7
