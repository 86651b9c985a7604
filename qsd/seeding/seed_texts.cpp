#include "qsd/seeding/seed_texts.h"

#include "qsd/text/text.h"

#include "qsd/fileops/install_util.h"

namespace zr7 {

std::string response_file_content(const std::string& protocol, const std::string& host_name,
                                  const std::string& port, const std::string& file_name) {
    return protocol + "\n" + host_name + "\n" + port + "\n" + file_name + "\nend";
}

std::string response_file_path(const std::string& tmp_path, const std::string& pid) {
    return tmp_path + "qsdseed_" + pid + ".rsp";
}

std::string seeding_log_path(const std::string& log_dir, const std::string& file_name) {
    return log_dir + file_name + ".log";
}

std::string sqllib_entry(const std::string& dst_dir) {
    return "SQLLIB=" + InstallUtil::quote_str(dst_dir.c_str());
}

std::string loader_command_text(const std::string& response_path, const std::string& log_path) {
    std::string text = "qdsload <" + InstallUtil::quote_str(response_path.c_str());
    if (!log_path.empty())
        text += " >>" + InstallUtil::quote_str(log_path.c_str());
    return text;
}

SqlSelection select_sql_name(const std::string& name) {
    const std::string lower = to_lower_c(name);
    if (lower.find("_del") != std::string::npos)
        return SqlSelection::kDeletion;
    // Of the names of four bytes or fewer only ".sql" itself passes.
    if (!ends_with(lower, ".sql"))
        return SqlSelection::kNotSql;
    return SqlSelection::kSeed;
}

}  // namespace zr7
