// A stand-in for the server's catalog loader, built for the tests and the
// demonstration. It reads a response file on standard input, checks it and
// the environment strictly, counts the SQL statements of the named file in
// $SQLLIB, records the load in qdsload.catalog beside $SQLLIB, and prints a
// one-line summary on standard output.
//
// Exit status: 0 loaded; 1 bad input or output that cannot be written
// (message on standard error); 3 the file is the one that QDSLOAD_FAIL names
// (a failure on demand, for tests).
//
// QDSLOAD_RECORD=<dir>, when set, makes it write what it saw into that
// directory, before any check that concerns the file: <file name>.rsp holds
// standard input byte for byte, <file name>.env the loader's variables and the
// permission bits of its standard input.
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <fstream>
#include <iostream>
#include <sstream>
#include <string>
#include <vector>

namespace {

int fail(const std::string& message) {
    std::cerr << "qdsload: " << message << "\n";
    return 1;
}

std::string read_all(std::istream& in) {
    std::ostringstream content;
    content << in.rdbuf();
    return content.str();
}

std::vector<std::string> split(const std::string& text, char separator) {
    std::vector<std::string> pieces;
    std::size_t start = 0;
    for (;;) {
        const std::size_t end = text.find(separator, start);
        if (end == std::string::npos) {
            pieces.push_back(text.substr(start));
            return pieces;
        }
        pieces.push_back(text.substr(start, end - start));
        start = end + 1;
    }
}

// Statements end in ";". A ";" inside a quoted literal or after "--" on its
// line does not count.
long count_statements(const std::string& sql) {
    long count = 0;
    bool in_literal = false;
    bool in_comment = false;
    for (std::size_t i = 0; i < sql.size(); ++i) {
        const char c = sql[i];
        if (in_comment) {
            in_comment = c != '\n';
        } else if (in_literal) {
            in_literal = c != '\'';
        } else if (c == '\'') {
            in_literal = true;
        } else if (c == '-' && i + 1 < sql.size() && sql[i + 1] == '-') {
            in_comment = true;
        } else if (c == ';') {
            ++count;
        }
    }
    return count;
}

void record(const std::string& dir, const std::string& file_name, const std::string& input) {
    std::ofstream rsp(dir + "/" + file_name + ".rsp", std::ios::binary | std::ios::trunc);
    rsp << input;
    std::ofstream env(dir + "/" + file_name + ".env", std::ios::binary | std::ios::trunc);
    for (const char* name : {"KDC_FAMILIES", "SQLLIB", "VXA_TRC1"}) {
        const char* value = std::getenv(name);
        env << name << (value == nullptr ? " unset" : std::string("=") + value) << "\n";
    }
    struct stat st {};
    if (::fstat(STDIN_FILENO, &st) == 0) {
        char mode[16];
        std::snprintf(mode, sizeof mode, "%04o", static_cast<unsigned>(st.st_mode & 07777));
        env << "stdin mode " << mode << "\n";
    }
}

std::string utc_now() {
    const std::time_t now = std::time(nullptr);
    std::tm parts{};
    char text[32] = "unknown-time";
    if (::gmtime_r(&now, &parts) != nullptr)
        std::strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%SZ", &parts);
    return text;
}

}  // namespace

int main() {
    const std::string input = read_all(std::cin);
    // protocol, host name, port, file name, then "end" with nothing after it.
    const std::vector<std::string> lines = split(input, '\n');
    if (lines.size() != 5)
        return fail("response file must have 5 lines, has " + std::to_string(lines.size()));
    const std::string& protocol = lines[0];
    const std::string& host = lines[1];
    const std::string& port = lines[2];
    const std::string& file_name = lines[3];
    if (lines[4] != "end")
        return fail("response file must end with the line \"end\" and nothing after it");
    if (file_name.empty() || file_name.find('/') != std::string::npos || file_name == "." ||
        file_name == "..")
        return fail("line 4 must name a file in SQLLIB");

    if (const char* dir = std::getenv("QDSLOAD_RECORD"))
        record(dir, file_name, input);

    if (protocol.empty())
        return fail("line 1 (protocol) is empty");
    if (host.empty())
        return fail("line 2 (host name) is empty");
    if (port.empty())
        return fail("line 3 (port) is empty");

    const char* families = std::getenv("KDC_FAMILIES");
    if (families == nullptr || *families == '\0')
        return fail("KDC_FAMILIES is not set");
    const char* sqllib_value = std::getenv("SQLLIB");
    if (sqllib_value == nullptr || *sqllib_value == '\0')
        return fail("SQLLIB is not set");
    // A directory holding blanks arrives wrapped in double quotes.
    std::string sqllib = sqllib_value;
    if (sqllib.size() >= 2 && sqllib.front() == '"' && sqllib.back() == '"')
        sqllib = sqllib.substr(1, sqllib.size() - 2);
    while (sqllib.size() > 1 && sqllib.back() == '/')
        sqllib.pop_back();

    const char* fail_on = std::getenv("QDSLOAD_FAIL");
    if (fail_on != nullptr && file_name == fail_on) {
        std::cerr << "qdsload: failing on " << file_name << " as QDSLOAD_FAIL asks\n";
        return 3;
    }

    const std::string sql_path = sqllib + "/" + file_name;
    std::ifstream sql(sql_path, std::ios::binary);
    struct stat st {};
    if (!sql || ::stat(sql_path.c_str(), &st) != 0 || !S_ISREG(st.st_mode))
        return fail("cannot read " + sql_path);
    const long statements = count_statements(read_all(sql));

    // The catalog record sits in the parent directory of SQLLIB.
    const std::size_t slash = sqllib.rfind('/');
    const std::string parent =
        slash == std::string::npos ? "." : (slash == 0 ? "/" : sqllib.substr(0, slash));
    const std::string catalog_path = parent + "/qdsload.catalog";
    std::ofstream catalog(catalog_path, std::ios::binary | std::ios::app);
    catalog << utc_now() << " loaded <" << file_name << "> statements " << statements << "\n";
    catalog.close();
    if (!catalog)
        return fail("cannot write " + catalog_path);

    std::cout << "qdsload: loaded <" << file_name << "> from <" << sqllib << ">: " << statements
              << " statements over " << protocol << " " << host << ":" << port << "\n";
    // A summary that cannot be written (a full disk under the seeding log)
    // is a failed run: nobody would learn what was loaded.
    std::cout.flush();
    if (!std::cout)
        return fail("cannot write standard output");
    return 0;
}
