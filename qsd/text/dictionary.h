// The tool's key/value table: keys match byte for byte, inserting a key that
// is already present fails and keeps the earlier value, and iteration follows
// insertion order, so settings appended to a file come out in the order the
// administrator gave them.
#pragma once

#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

namespace zr7 {

class Dictionary {
  public:
    using Entry = std::pair<std::string, std::string>;

    // False, with the table unchanged, when the key is already present.
    bool insert(const std::string& key, const std::string& value);
    const std::string* find(const std::string& key) const;
    bool erase(const std::string& key);
    bool empty() const { return entries_.empty(); }
    std::size_t size() const { return entries_.size(); }
    const std::vector<Entry>& entries() const { return entries_; }

  private:
    std::vector<Entry> entries_;
    std::unordered_map<std::string, std::size_t> index_;
};

}  // namespace zr7
