// A set of names with a value each, matched exactly (flag 0) or ignoring the
// case of ASCII letters (flag 1).
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <unordered_map>

class UT_NCH_CACHE {
  public:
    explicit UT_NCH_CACHE(int flag);

    /// Adds name with value; false (nothing changed) when the name is already held.
    bool add(const char* name, std::intptr_t value);
    /// The value held for name, or null.
    const std::intptr_t* find(const char* name) const;
    std::size_t count() const { return names_.size(); }

  private:
    struct Hash {
        using is_transparent = void;
        std::size_t operator()(std::string_view s) const {
            return std::hash<std::string_view>{}(s);
        }
    };
    std::string key_of(const char* name) const;

    bool fold_case_;
    std::unordered_map<std::string, std::intptr_t, Hash, std::equal_to<>> names_;
};
