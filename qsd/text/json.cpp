#include "qsd/text/json.h"

#include <cstdio>

namespace zr7 {

namespace {

// Length of the well-formed UTF-8 sequence at `at`, 0 when none starts there.
std::size_t utf8_length(const std::string& text, std::size_t at) {
    const auto lead = static_cast<unsigned char>(text[at]);
    std::size_t length = 0;
    unsigned long code = 0;
    if (lead < 0x80)
        return 1;
    if (lead >= 0xC2 && lead <= 0xDF) {
        length = 2;
        code = lead & 0x1Fu;
    } else if (lead >= 0xE0 && lead <= 0xEF) {
        length = 3;
        code = lead & 0x0Fu;
    } else if (lead >= 0xF0 && lead <= 0xF4) {
        length = 4;
        code = lead & 0x07u;
    } else {
        return 0;
    }
    if (at + length > text.size())
        return 0;
    for (std::size_t i = 1; i < length; ++i) {
        const auto next = static_cast<unsigned char>(text[at + i]);
        if ((next & 0xC0) != 0x80)
            return 0;
        code = (code << 6) | (next & 0x3Fu);
    }
    // Overlong forms, surrogates, and code points past the last plane.
    static const unsigned long kSmallest[] = {0, 0, 0x80, 0x800, 0x10000};
    if (code < kSmallest[length] || (code >= 0xD800 && code <= 0xDFFF) || code > 0x10FFFF)
        return 0;
    return length;
}

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
        const std::size_t length = utf8_length(bytes, at);
        if (length == 0) {
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
