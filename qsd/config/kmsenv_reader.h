// The reading rules of the server configuration file kmsenv, over its text.
#pragma once

#include <string>

#include "qsd/text/text.h"

namespace zr7 {

// What the reader fills in. Start it from the installer's members: a server
// name that is already set decides which records are read.
struct ServerConfig {
    std::string server_name;
    std::string arch;
    std::string protocol;
    std::string port;
    std::string host_name;
    std::string family_setting;
};

struct KmsenvResult {
    ServerConfig config;
    // Detail lines for the trace ("MSRV name <...>").
    StringList detail_lines;
};

// Reads the whole file content. Lines are taken whole and without their
// "\n" or "\r\n"; empty lines, and lines of separators alone, are skipped.
// Until a "FIELDSEP=..." line the lines are headings; after it every line is
// a record "owner|key|value" split at any byte of the separator set.
// "default" records are skipped, the first other owner names the server
// (unless one is named already), and the first record of another server ends
// the reading.
KmsenvResult read_kmsenv(const std::string& content, const ServerConfig& start);

// "KDC_FAMILIES=PORT:" port " " protocol " USE:Y".
std::string family_setting_for(const std::string& port, const std::string& protocol);

// Whether a name from kmsenv can name one directory under the home: not
// "." or "..", no "/" and no control byte (below 0x20, or 0x7f; a NUL is
// one). Such a name would reach outside its directory, name another one, or
// break a line of the log. The empty name is judged by the caller.
bool is_safe_directory_name(const std::string& name);

}  // namespace zr7
