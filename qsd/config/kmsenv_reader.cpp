#include "qsd/config/kmsenv_reader.h"

#include "qsd/text/escape.h"

namespace zr7 {

namespace {

std::string without_terminator(std::string line) {
    if (!line.empty() && line.back() == '\n')
        line.pop_back();
    if (!line.empty() && line.back() == '\r')
        line.pop_back();
    return line;
}

// The separator set of a FIELDSEP line, or "" when the line is not one. The
// key runs from the first byte that is not "=" to the next "="; the set
// starts at that "=" and runs to the first blank or tab.
std::string separator_set_of(const std::string& line) {
    Tokenizer fields(line);
    if (fields.next("=") != "FIELDSEP")
        return std::string();
    if (fields.position() >= line.size())
        return std::string();  // no "=" after the key
    return fields.next(" \t\n");
}

}  // namespace

std::string family_setting_for(const std::string& port, const std::string& protocol) {
    return "KDC_FAMILIES=PORT:" + port + " " + protocol + " USE:Y";
}

KmsenvResult read_kmsenv(const std::string& content, const ServerConfig& start) {
    KmsenvResult result;
    ServerConfig& c = result.config;
    c = start;
    std::string separators;
    std::string pipe_port;
    std::string spipe_port;

    for (const std::string& raw : split_lines(content)) {
        const std::string line = without_terminator(raw);
        if (line.empty())
            continue;
        if (separators.empty()) {
            separators = separator_set_of(line);
            continue;
        }
        Tokenizer fields(line);
        const std::string owner = fields.next(separators);
        // A line of separators alone holds no field at all: like an empty
        // line it neither names the server nor ends the reading.
        if (owner.empty() || owner == "default")
            continue;
        if (c.server_name.empty()) {
            c.server_name = owner;
            result.detail_lines.push_back("MSRV name <" + owner + ">");
        } else if (owner != c.server_name) {
            break;
        }
        const std::string key = fields.next(separators);
        if (key == "BINARCH") {
            c.arch = fields.next(separators);
        } else if (key == "NETWORKPROTOCOL") {
            c.protocol = fields.next(separators);
        } else if (key == "PORTNUMBER") {
            c.port = fields.next(separators);
        } else if (key == "HOSTNAME") {
            c.host_name = fields.next(separators);
        } else if (key == "IPPIPEPORTNUMBER") {
            pipe_port = fields.next(separators);
        } else if (key == "IPSPIPEPORTNUMBER") {
            spipe_port = fields.next(separators);
        }
    }

    if (c.protocol == "ip.pipe") {
        c.port = pipe_port;
    } else if (c.protocol == "sna") {
        c.port = "135";
    } else if (c.protocol == "ip.spipe") {
        c.port = spipe_port;
    }
    c.family_setting = family_setting_for(c.port, c.protocol);
    return result;
}

bool is_safe_directory_name(const std::string& name) {
    if (name == "." || name == "..")
        return false;
    for (char c : name) {
        if (c == '/' || is_control_byte(c))
            return false;
    }
    return true;
}

}  // namespace zr7
