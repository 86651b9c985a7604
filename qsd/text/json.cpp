#include "qsd/text/json.h"

#include <cstdio>

namespace zr7 {

namespace {

void append_escape(std::string& out, unsigned value) {
    char text[8];
    std::snprintf(text, sizeof text, "\\u%04x", value);
    out += text;
}

}  // namespace

std::string json_string(const std::string& bytes) {
    std::string out = "\"";
    std::size_t at = 0;
    while (at < bytes.size()) {
        const char c = bytes[at];
        const auto u = static_cast<unsigned char>(c);
        std::size_t length = 0;
        if (utf8_code_at(bytes, at, length) < 0) {
            append_escape(out, 0xDC00u | u);
            ++at;
            continue;
        }
        if (length > 1) {
            out.append(bytes, at, length);
        } else if (c == '"' || c == '\\') {
            out += '\\';
            out += c;
        } else if (c == '\n') {
            out += "\\n";
        } else if (c == '\t') {
            out += "\\t";
        } else if (c == '\r') {
            out += "\\r";
        } else if (u < 0x20 || u == 0x7f) {
            append_escape(out, u);
        } else {
            out += c;
        }
        at += length;
    }
    return out + "\"";
}

JsonObject& JsonObject::member(const std::string& key, const std::string& json) {
    if (!members_.empty())
        members_ += ',';
    members_ += json_string(key) + ":" + json;
    return *this;
}

JsonObject& JsonObject::add(const std::string& key, const std::string& value) {
    return member(key, json_string(value));
}

JsonObject& JsonObject::add(const std::string& key, const char* value) {
    return member(key, json_string(value));
}

JsonObject& JsonObject::add(const std::string& key, long value) {
    return member(key, std::to_string(value));
}

JsonObject& JsonObject::add(const std::string& key, bool value) {
    return member(key, value ? "true" : "false");
}

JsonObject& JsonObject::add_null(const std::string& key) {
    return member(key, "null");
}

JsonObject& JsonObject::add(const std::string& key, const StringList& values) {
    std::string list = "[";
    for (std::size_t i = 0; i < values.size(); ++i) {
        if (i > 0)
            list += ',';
        list += json_string(values[i]);
    }
    return member(key, list + "]");
}

JsonObject& JsonObject::add(const std::string& key, const JsonObject& value) {
    return member(key, value.text());
}

}  // namespace zr7
