#include "qsd/text/text.h"

namespace zr7 {

std::string strip(const std::string& text, char ch, StripEnd where) {
    std::size_t begin = 0;
    std::size_t end = text.size();
    if (where != StripEnd::kTrailing) {
        while (begin < end && text[begin] == ch)
            ++begin;
    }
    if (where != StripEnd::kLeading) {
        while (end > begin && text[end - 1] == ch)
            --end;
    }
    return text.substr(begin, end - begin);
}

std::string to_upper_c(std::string text) {
    for (char& c : text) {
        if (c >= 'a' && c <= 'z')
            c = static_cast<char>(c - 'a' + 'A');
    }
    return text;
}

std::string to_lower_c(std::string text) {
    for (char& c : text) {
        if (c >= 'A' && c <= 'Z')
            c = static_cast<char>(c - 'A' + 'a');
    }
    return text;
}

std::string rstrip_space(const std::string& text) {
    std::size_t end = text.size();
    while (end > 0 && is_c_space(text[end - 1]))
        --end;
    return text.substr(0, end);
}

bool ends_with(const std::string& text, const std::string& suffix) {
    return text.size() >= suffix.size() &&
           text.compare(text.size() - suffix.size(), suffix.size(), suffix) == 0;
}

StringList split_lines(const std::string& content) {
    StringList lines;
    std::size_t start = 0;
    while (start < content.size()) {
        std::size_t nl = content.find('\n', start);
        std::size_t end = nl == std::string::npos ? content.size() : nl + 1;
        lines.push_back(content.substr(start, end - start));
        start = end;
    }
    return lines;
}

std::string Tokenizer::next(const std::string& delimiters) {
    pos_ = text_.find_first_not_of(delimiters, pos_);
    if (pos_ == std::string::npos) {
        pos_ = text_.size();
        return std::string();
    }
    std::size_t end = text_.find_first_of(delimiters, pos_);
    if (end == std::string::npos)
        end = text_.size();
    std::string piece = text_.substr(pos_, end - pos_);
    pos_ = end;
    return piece;
}

std::string dir_name(const std::string& path) {
    const std::size_t slash = path.find_last_of('/');
    if (slash == std::string::npos)
        return ".";
    return slash == 0 ? "/" : path.substr(0, slash);
}

std::string base_name(const std::string& path) {
    const std::size_t slash = path.find_last_of('/');
    return slash == std::string::npos ? path : path.substr(slash + 1);
}

long utf8_code_at(const std::string& text, std::size_t at, std::size_t& length) {
    const auto lead = static_cast<unsigned char>(text[at]);
    length = lead < 0x80                    ? 1
             : lead >= 0xC2 && lead <= 0xDF ? 2
             : lead >= 0xE0 && lead <= 0xEF ? 3
             : lead >= 0xF0 && lead <= 0xF4 ? 4
                                            : 0;
    if (length == 0 || at + length > text.size())
        return -1;
    if (length == 1)
        return lead;
    long code = lead & (0x7F >> length);
    for (std::size_t i = 1; i < length; ++i) {
        const auto next = static_cast<unsigned char>(text[at + i]);
        if ((next & 0xC0) != 0x80)
            return -1;
        code = (code << 6) | (next & 0x3F);
    }
    static const long kSmallest[] = {0, 0, 0x80, 0x800, 0x10000};
    if (code < kSmallest[length] || (code >= 0xD800 && code <= 0xDFFF) || code > 0x10FFFF)
        return -1;
    return code;
}

}  // namespace zr7
