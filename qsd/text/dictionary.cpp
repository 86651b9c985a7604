#include "qsd/text/dictionary.h"

namespace zr7 {

bool Dictionary::insert(const std::string& key, const std::string& value) {
    if (!index_.emplace(key, entries_.size()).second)
        return false;
    entries_.emplace_back(key, value);
    return true;
}

const std::string* Dictionary::find(const std::string& key) const {
    auto it = index_.find(key);
    return it == index_.end() ? nullptr : &entries_[it->second].second;
}

bool Dictionary::erase(const std::string& key) {
    auto it = index_.find(key);
    if (it == index_.end())
        return false;
    std::size_t pos = it->second;
    index_.erase(it);
    entries_.erase(entries_.begin() + static_cast<std::ptrdiff_t>(pos));
    for (auto& slot : index_) {
        if (slot.second > pos)
            --slot.second;
    }
    return true;
}

}  // namespace zr7
