// A hash map that costs one pointer until its first entry. The database keeps
// tables per design that most designs never fill (global signals by name,
// map signals, physical parents), and an empty std::unordered_map is 56
// bytes: in a library of many small designs that is most of a design.
#pragma once

#include <memory>
#include <unordered_map>
#include <utility>

template <class Key, class Value>
class UT_LAZY_MAP {
    using Map = std::unordered_map<Key, Value>;

  public:
    using const_iterator = typename Map::const_iterator;

    bool empty() const { return map_ == nullptr || map_->empty(); }
    bool contains(const Key& key) const { return map_ != nullptr && map_->contains(key); }
    const_iterator find(const Key& key) const { return map().find(key); }
    const_iterator end() const { return map().end(); }

    template <class... Args>
    std::pair<typename Map::iterator, bool> try_emplace(const Key& key, Args&&... args) {
        return made().try_emplace(key, std::forward<Args>(args)...);
    }
    template <class... Args>
    std::pair<typename Map::iterator, bool> emplace(Args&&... args) {
        return made().emplace(std::forward<Args>(args)...);
    }
    Value& operator[](const Key& key) { return made()[key]; }
    /// `at` from find() on this map, not end().
    void erase(const_iterator at) { map_->erase(at); }
    void erase(const Key& key) {
        if (map_ != nullptr) map_->erase(key);
    }

  private:
    // Lookups in a map not made yet search one empty map shared by all.
    const Map& map() const {
        static const Map kEmpty;
        return map_ != nullptr ? *map_ : kEmpty;
    }
    Map& made() {
        if (map_ == nullptr) map_ = std::make_unique<Map>();
        return *map_;
    }

    std::unique_ptr<Map> map_;
};
