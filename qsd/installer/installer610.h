// Installer610: the state and the steps of one installation run.
#pragma once

#include <string>

#include "qsd/installer/simple_command.h"
#include "qsd/text/dictionary.h"

class Installer610 {
  public:
    Installer610();
    virtual ~Installer610();
    Installer610(const Installer610&) = delete;
    Installer610& operator=(const Installer610&) = delete;

    // Settings and symbols.
    int addVar(const char* text);
    int find_symbol(const char* name, std::string& value) const;
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
    int go();
    int process_commands(CommandList& commands);
    // The stop at a recorded signal N: "Error: Interrupted by signal <N>" in
    // the log and on standard error; returns 128+N, the run's status.
    int interrupted();

    // Server configuration.
    int read_config(const std::string& home);

    // Environment file.
    int update_vxaenv(const std::string& dir_template);
    int update_kds_run(const std::string& line, std::string& out) const;
    int make_backup(const char* dir, const char* file, const char* base);

    // Flat and tree copies.
    int copy(const std::string& src_template, const std::string& dst_template);
    int recursive_copy(const std::string& src_template, const std::string& dst_template,
                       const std::string& options);

    // Catalog seeding.
    int seed(const std::string& src_template, const std::string& dst_template);
    int seed_single_file(const std::string& dst_dir, const std::string& file_name);

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
};
