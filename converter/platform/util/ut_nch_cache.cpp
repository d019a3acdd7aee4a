#include "ut_nch_cache.h"

UT_NCH_CACHE::UT_NCH_CACHE(int flag) : fold_case_(flag != 0) {}

std::string UT_NCH_CACHE::key_of(const char* name) const {
    std::string key = name ? name : "";
    if (fold_case_) {
        for (char& c : key) {
            if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
        }
    }
    return key;
}

bool UT_NCH_CACHE::add(const char* name, std::intptr_t value) {
    return names_.emplace(key_of(name), value).second;
}

const std::intptr_t* UT_NCH_CACHE::find(const char* name) const {
    const auto it =
        fold_case_ ? names_.find(key_of(name)) : names_.find(std::string_view(name ? name : ""));
    return it == names_.end() ? nullptr : &it->second;
}
