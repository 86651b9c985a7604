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

}  // namespace zr7
