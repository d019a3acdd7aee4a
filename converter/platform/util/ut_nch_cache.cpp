#include "ut_nch_cache.h"

#include "ut_str.h"

UT_NCH_CACHE::UT_NCH_CACHE(int flag) : fold_case_(flag != 0) {}

std::string UT_NCH_CACHE::key_of(const char* name) const {
    return fold_case_ ? UT_STR::FoldCase(name) : std::string(name ? name : "");
}

bool UT_NCH_CACHE::add(const char* name, std::intptr_t value) {
    return names_.emplace(key_of(name), value).second;
}

const std::intptr_t* UT_NCH_CACHE::find(const char* name) const {
    const auto it =
        fold_case_ ? names_.find(key_of(name)) : names_.find(std::string_view(name ? name : ""));
    return it == names_.end() ? nullptr : &it->second;
}
