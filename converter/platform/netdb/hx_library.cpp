#include "hx_library.h"

#include <algorithm>

#include "ut_str.h"

HX_ENVIRONMENT hx_env;

// --- HX_LIBRARY --------------------------------------------------------------

HX_LIBRARY::HX_LIBRARY(const char* name, uint8_t casesense) : casesense_(casesense ? 1 : 0) {
    set_name(name);
}

HX_LIBRARY::~HX_LIBRARY() {
    for (HX_LIBLINK* link : links_) {
        delete link->get_design();
        delete link;
    }
}

void HX_LIBRARY::set_name(const char* name) {
    name_ = name ? std::make_unique<std::string>(name) : nullptr;
}

std::string HX_LIBRARY::key_of(const char* name) const {
    return casesense_ ? std::string(name) : UT_STR::FoldCase(name);
}

HX_DESIGN* HX_LIBRARY::create_design(const char* name) {
    if (name == nullptr) return nullptr;
    auto [it, made] = by_key_.try_emplace(key_of(name), nullptr);
    if (!made) return nullptr;
    auto* design = new HX_DESIGN(this, name);
    it->second = design;
    links_.push_back(new HX_LIBLINK(design));
    return design;
}

HX_DESIGN* HX_LIBRARY::find_design(const char* name) const {
    if (name == nullptr) return nullptr;
    auto it = by_key_.find(key_of(name));
    return it == by_key_.end() ? nullptr : it->second;
}

bool HX_LIBRARY::alias_design(const char* name, const char* alias) {
    HX_DESIGN* design = find_design(name);
    if (design == nullptr || alias == nullptr) return false;
    if (!by_key_.try_emplace(key_of(alias), design).second) return false;
    aliases_.emplace_back(alias, design);
    return true;
}

bool HX_LIBRARY::set_casesense(uint8_t value) {
    value = value ? 1 : 0;
    if (value == casesense_) return true;
    return rekey(value);
}

bool HX_LIBRARY::rekey(uint8_t casesense) {
    uint8_t old = casesense_;
    casesense_ = casesense;
    std::unordered_map<std::string, HX_DESIGN*> keys;
    auto enter = [&](const char* name, HX_DESIGN* design) {
        return name == nullptr || keys.try_emplace(key_of(name), design).second;
    };
    bool ok = true;
    for (const HX_LIBLINK* link : links_)
        ok = ok && enter(link->get_design()->get_name(), link->get_design());
    for (const auto& [alias, design] : aliases_)
        ok = ok && enter(alias.c_str(), design);
    if (!ok) {
        casesense_ = old;
        return false;
    }
    by_key_.swap(keys);
    return true;
}

UT_BLIST_ITER<HX_LIBLINK>* HX_LIBRARY::create_liblink_iter() const {
    return new UT_BLIST_ITER<HX_LIBLINK>(links_);
}

// --- HX_ENVIRONMENT ----------------------------------------------------------

HX_ENVIRONMENT::~HX_ENVIRONMENT() {
    for (HX_LIBRARY* library : libraries_)
        delete library;
}

HX_LIBRARY* HX_ENVIRONMENT::create_library(const char* name, uint8_t casesense) {
    return adopt(std::make_unique<HX_LIBRARY>(name, casesense));
}

HX_LIBRARY* HX_ENVIRONMENT::adopt(std::unique_ptr<HX_LIBRARY> library) {
    libraries_.push_back(library.release());
    return libraries_.back();
}

void HX_ENVIRONMENT::delete_library(HX_LIBRARY* library) {
    auto it = std::find(libraries_.begin(), libraries_.end(), library);
    if (it == libraries_.end()) return;
    libraries_.erase(it);
    delete library;
}
