#include "qsd/installer/installer610.h"

#include "qsd/fileops/install_util.h"
#include "qsd/platform/trace.h"

Installer610::Installer610() = default;
Installer610::~Installer610() = default;

int Installer610::addVar(const char* text) {
    ZR7_OPERATION("Installer610::addVar");
    if (text == nullptr)
        ZR7_RETURN(-1);
    std::string key;
    std::string value;
    if (InstallUtil::get_key_val(text, key, value) != 0)
        ZR7_RETURN(-1);
    key = zr7::to_upper_c(key);
    if (key == "KDS_RUN") {
        ZR7_ERROR("Error: Use -m to modify KDS_RUN");
        ZR7_RETURN(-1);
    }
    if (!settings.insert(key, value)) {
        ZR7_ERROR("Error: Duplicate key <%s> specified in options", key.c_str());
        ZR7_RETURN(-1);
    }
    ZR7_DETAIL("Will be adding <%s> <%s> to VXAENV", key.c_str(), value.c_str());
    ZR7_RETURN(0);
}

int Installer610::add_symbol(const char* name, const char* value) {
    if (name == nullptr || value == nullptr)
        return -1;
    symbols.insert(name, value);
    return 0;
}

int Installer610::add_path_symbol(const char* name, const char* value) {
    if (name == nullptr || value == nullptr)
        return -1;
    std::string stored(value);
    if (!stored.empty() && stored.back() == '/')
        stored.pop_back();
    symbols.insert(name, stored);
    return 0;
}

int Installer610::resolve(const std::string& path_template, std::string& out) const {
    ZR7_TRACED("Installer610::resolve");
    enum class State { kText, kDollar, kName } state = State::kText;
    std::string name;
    for (char c : path_template) {
        switch (state) {
            case State::kText:
                if (c == '$') {
                    state = State::kDollar;
                } else {
                    out += c;
                }
                break;
            case State::kDollar:
                if (c == '{') {
                    name.clear();
                    state = State::kName;
                } else {
                    // "$" and the character after it become one "$".
                    out += '$';
                    state = State::kText;
                }
                break;
            case State::kName:
                if (c == '}') {
                    const std::string* value = name.empty() ? nullptr : symbols.find(name);
                    if (value == nullptr) {
                        ZR7_ERROR("Error: Symbol <%s> not found", name.c_str());
                        return -1;
                    }
                    out += *value;
                    name.clear();
                    state = State::kText;
                } else {
                    name += c;
                }
                break;
        }
    }
    if (state == State::kName)
        return -1;
    if (state == State::kDollar)
        out += '$';
    return 0;
}

int Installer610::expand_src_dst(const std::string& src_template, const std::string& dst_template,
                                 std::string& src, std::string& dst) const {
    ZR7_TRACED("Installer610::expand_src_dst");
    if (src_template.empty() || resolve(src_template, src) < 0) {
        ZR7_ERROR("Error: Bad src path <%s>", src_template.c_str());
        return -1;
    }
    if (dst_template.empty() || resolve(dst_template, dst) < 0) {
        ZR7_ERROR("Error: Bad dst path <%s>", dst_template.c_str());
        return -1;
    }
    ZR7_DETAIL("expanded src path <%s>", src.c_str());
    ZR7_DETAIL("expanded dst path <%s>", dst.c_str());
    return 0;
}
