#include "hx_property.h"

#include <algorithm>
#include <cstring>
#include <string_view>

#include "ut_str.h"

namespace {

struct PredefinedName {
    std::string_view name;
    HX_PROP_TYPE kind;
};

// The names the database knows, with the kind of value each takes.
constexpr PredefinedName kPredefined[] = {
    {"TRANSPARENT", HX_PROP_FLAG},
    {"UNUSED", HX_PROP_FLAG},
    {"CREATE_TIMESTAMP", HX_PROP_INT},
    {"MERGEDTO", HX_PROP_INT},
    {"MERGEDFROM", HX_PROP_INT},
    {"JOINED", HX_PROP_INT},
    {"DRIVE", HX_PROP_INT},
    {"FANOUT", HX_PROP_INT},
    {"LOAD", HX_PROP_FLOAT},
    {"CAP", HX_PROP_FLOAT},
    {"MAXDELAY", HX_PROP_TIMING},
    {"MINDELAY", HX_PROP_TIMING},
    {"SETUP", HX_PROP_TIMING},
    {"HOLD", HX_PROP_TIMING},
    {"CLK2OUT", HX_PROP_TIMING},
    {"CLKREF", HX_PROP_PINREF},
    {"SETUPREF", HX_PROP_PINREF},
    {"HOLDREF", HX_PROP_PINREF},
    {"TIMESPEC", HX_PROP_TIMINGSTR},
    {"PERIOD", HX_PROP_TIMINGSTR},
};

bool holds_text(HX_PROP_TYPE kind) {
    return kind == HX_PROP_STRING || kind == HX_PROP_PARAM || kind == HX_PROP_TIMINGSTR;
}

}  // namespace

// --- HX_PROPERTY -------------------------------------------------------------

HX_PROPERTY::HX_PROPERTY(const char* name, HX_PROP_TYPE kind)
    : name_(name ? name : ""), kind_(kind) {}

std::unique_ptr<HX_PROPERTY> HX_PROPERTY::make_flag(const char* name) {
    return std::make_unique<HX_PROPERTY>(name, HX_PROP_FLAG);
}

std::unique_ptr<HX_PROPERTY> HX_PROPERTY::make_int(const char* name, int32_t value) {
    auto prop = std::make_unique<HX_PROPERTY>(name, HX_PROP_INT);
    prop->int_ = value;
    return prop;
}

std::unique_ptr<HX_PROPERTY> HX_PROPERTY::make_float(const char* name, double value) {
    auto prop = std::make_unique<HX_PROPERTY>(name, HX_PROP_FLOAT);
    prop->float_ = value;
    return prop;
}

std::unique_ptr<HX_PROPERTY> HX_PROPERTY::make_text(const char* name, HX_PROP_TYPE kind,
                                                    const char* text) {
    auto prop = std::make_unique<HX_PROPERTY>(name, holds_text(kind) ? kind : HX_PROP_STRING);
    prop->text_ = text ? text : "";
    return prop;
}

std::unique_ptr<HX_PROPERTY> HX_PROPERTY::make_object(const char* name, HX_OBJECT* target) {
    auto prop = std::make_unique<HX_PROPERTY>(name, HX_PROP_OBJECT);
    prop->object_ = target;
    return prop;
}

std::unique_ptr<HX_PROPERTY> HX_PROPERTY::make_timing(const char* name,
                                                      const HX_PROP_TIMING_DATA& record) {
    auto prop = std::make_unique<HX_PROPERTY>(name, HX_PROP_TIMING);
    prop->record_.min = record.min;
    prop->record_.max = record.max;
    prop->record_.unit = record.unit;
    return prop;
}

std::unique_ptr<HX_PROPERTY> HX_PROPERTY::make_pinref(const char* name,
                                                      const HX_PROP_PINREF_DATA& record) {
    auto prop = std::make_unique<HX_PROPERTY>(name, HX_PROP_PINREF);
    prop->record_ = record;
    return prop;
}

bool HX_PROPERTY::get_pinref(HX_PROP_PINREF_DATA& record) const {
    if (kind_ != HX_PROP_PINREF) return false;
    record = record_;
    return true;
}

bool HX_PROPERTY::get_timing(HX_PROP_TIMING_DATA& record) const {
    if (kind_ != HX_PROP_TIMING) return false;
    record.min = record_.min;
    record.max = record_.max;
    record.unit = record_.unit;
    return true;
}

const char* HX_PROPERTY::get_text() const {
    return holds_text(kind_) ? text_.c_str() : nullptr;
}

void HX_PROPERTY::set_int(int32_t value) {
    if (kind_ == HX_PROP_INT) int_ = value;
}

void HX_PROPERTY::set_text(const char* text) {
    if (holds_text(kind_)) text_ = text ? text : "";
}

bool HX_PROPERTY::get_type(const char* name, HX_PROP_TYPE& kind) {
    if (name == nullptr) return false;
    for (const PredefinedName& entry : kPredefined) {
        if (entry.name == name) {
            kind = entry.kind;
            return true;
        }
    }
    return false;
}

std::unique_ptr<HX_PROPERTY> HX_PROPERTY::clone(const char* name) const {
    auto copy = std::make_unique<HX_PROPERTY>(*this);
    if (name != nullptr) copy->name_ = name;
    return copy;
}

bool HX_PROPERTY::same_value(const HX_PROPERTY& other) const {
    if (kind_ != other.kind_) return false;
    switch (kind_) {
        case HX_PROP_FLAG:
            return true;
        case HX_PROP_INT:
            return int_ == other.int_;
        case HX_PROP_FLOAT:
            // Bitwise, so that NaN equals itself after a round trip.
            return std::memcmp(&float_, &other.float_, sizeof float_) == 0;
        case HX_PROP_OBJECT:
            return object_ == other.object_;
        case HX_PROP_TIMING:
            return record_.min == other.record_.min && record_.max == other.record_.max &&
                   record_.unit == other.record_.unit;
        case HX_PROP_PINREF:
            return record_ == other.record_;
        default:
            return text_ == other.text_;
    }
}

// --- HX_PROPLIST -------------------------------------------------------------

HX_PROPLIST::~HX_PROPLIST() {
    for (HX_PROPERTY* prop : items_)
        delete prop;
}

namespace {
// Lists longer than this are indexed by name.
constexpr std::size_t kIndexedLength = 16;
}  // namespace

std::size_t HX_PROPLIST::slot_of(const char* name) const {
    if (name == nullptr) return kNoSlot;
    if (index_ != nullptr) {
        auto it = index_->find(name);
        return it == index_->end() ? kNoSlot : it->second;
    }
    for (std::size_t i = 0; i < items_.size(); ++i) {
        if (items_[i] != nullptr && std::strcmp(items_[i]->get_name(), name) == 0) return i;
    }
    return kNoSlot;
}

HX_PROPERTY* HX_PROPLIST::find(const char* name) const {
    const std::size_t slot = slot_of(name);
    return slot == kNoSlot ? nullptr : items_[slot];
}

HX_PROPERTY* HX_PROPLIST::put(std::unique_ptr<HX_PROPERTY> prop) {
    const std::size_t slot = slot_of(prop->get_name());
    if (slot != kNoSlot) {
        if (index_ != nullptr) index_->erase(items_[slot]->get_name());
        delete items_[slot];
        items_[slot] = prop.release();
        if (index_ != nullptr) index_->emplace(items_[slot]->get_name(), slot);
        return items_[slot];
    }
    if (iterators_ == 0 && holes_ * 2 > items_.size()) compact();
    items_.push_back(prop.release());
    ++live_;
    if (index_ != nullptr) {
        index_->emplace(items_.back()->get_name(), items_.size() - 1);
    } else if (items_.size() > kIndexedLength) {
        build_index();
    }
    return items_.back();
}

bool HX_PROPLIST::remove(const HX_PROPERTY* prop) {
    if (prop == nullptr) return false;
    const std::size_t slot = slot_of(prop->get_name());
    if (slot == kNoSlot || items_[slot] != prop) return false;
    if (index_ != nullptr) index_->erase(prop->get_name());
    delete items_[slot];
    items_[slot] = nullptr;
    --live_;
    ++holes_;
    // Compacting at most when half the list is holes keeps removal cheap.
    if (iterators_ == 0 && holes_ * 2 > items_.size()) compact();
    return true;
}

void HX_PROPLIST::compact() {
    std::erase(items_, nullptr);
    holes_ = 0;
    if (index_ != nullptr) build_index();
}

void HX_PROPLIST::build_index() {
    index_ = std::make_unique<std::unordered_map<std::string_view, std::size_t>>();
    index_->reserve(items_.size());
    for (std::size_t i = 0; i < items_.size(); ++i) {
        if (items_[i] != nullptr) index_->emplace(items_[i]->get_name(), i);
    }
}

UT_BLISTS_ITER<HX_PROPERTY>* HX_PROPLIST::create_iter() const {
    ++iterators_;
    return new UT_BLISTS_ITER<HX_PROPERTY>(items_);
}

void HX_PROPLIST::delete_iter(UT_BLISTS_ITER<HX_PROPERTY>* iter) const {
    if (iter == nullptr) return;
    delete iter;
    if (--iterators_ == 0 && holes_ * 2 > items_.size()) const_cast<HX_PROPLIST*>(this)->compact();
}

// --- HX_OBJECT ---------------------------------------------------------------

HX_PROPLIST& HX_OBJECT::props() {
    if (props_ == nullptr) props_ = new HX_PROPLIST;
    return *props_;
}

HX_PROPERTY* HX_OBJECT::create_prop(const char* name, HX_PROP_TYPE kind) {
    if (name == nullptr) return nullptr;
    switch (kind) {
        case HX_PROP_INT:
            return props().put(HX_PROPERTY::make_int(name, 0));
        case HX_PROP_STRING:
        case HX_PROP_PARAM:
        case HX_PROP_TIMINGSTR:
            return props().put(HX_PROPERTY::make_text(name, kind, ""));
        case HX_PROP_TIMING:
            return props().put(HX_PROPERTY::make_timing(name, {}));
        case HX_PROP_PINREF:
            return props().put(HX_PROPERTY::make_pinref(name, {}));
        case HX_PROP_FLOAT:
        case HX_PROP_OBJECT:
        case HX_PROP_FLAG:
            return props().put(std::make_unique<HX_PROPERTY>(name, kind));
    }
    return nullptr;
}

HX_PROPERTY* HX_OBJECT::create_prop(const char* name, int32_t value) {
    if (name == nullptr) return nullptr;
    return props().put(HX_PROPERTY::make_int(name, value));
}

HX_PROPERTY* HX_OBJECT::create_prop(const char* name, const char* text, uint8_t /*copy*/) {
    if (name == nullptr) return nullptr;
    return props().put(HX_PROPERTY::make_text(name, HX_PROP_STRING, text));
}

HX_PROPERTY* HX_OBJECT::create_prop(const HX_PROPERTY* prop, const char* name) {
    if (prop == nullptr) return nullptr;
    return props().put(prop->clone(name));
}

HX_PROPERTY* HX_OBJECT::create_prop(std::unique_ptr<HX_PROPERTY> prop, const char* name) {
    if (prop == nullptr) return nullptr;
    if (name != nullptr) prop = prop->clone(name);
    return props().put(std::move(prop));
}

HX_PROPERTY* HX_OBJECT::find_prop(const char* name) const {
    return props_ ? props_->find(name) : nullptr;
}

bool HX_OBJECT::delete_prop(HX_PROPERTY* prop) {
    return props_ && props_->remove(prop);
}

bool HX_OBJECT::delete_prop(const char* name, uint8_t ignore_case) {
    if (props_ == nullptr || name == nullptr) return false;
    if (!ignore_case) return props_->remove(props_->find(name));
    for (HX_PROPERTY* prop : props_->items()) {
        if (prop != nullptr && UT_STR::EqualNoCase(prop->get_name(), name))
            return props_->remove(prop);
    }
    return false;
}

void HX_OBJECT::copy_properties(const HX_PROPLIST* list, uint8_t replace) {
    if (list == nullptr || list == props_) return;
    for (const HX_PROPERTY* prop : list->items()) {
        if (prop == nullptr) continue;
        if (!replace && find_prop(prop->get_name()) != nullptr) continue;
        props().put(prop->clone());
    }
}

UT_BLISTS_ITER<HX_PROPERTY>* HX_OBJECT::create_prop_iter() const {
    return props_ && props_->count() > 0 ? props_->create_iter() : nullptr;
}

void HX_OBJECT::delete_prop_iter(UT_BLISTS_ITER<HX_PROPERTY>* iter) const {
    if (iter != nullptr && props_ != nullptr) props_->delete_iter(iter);
}

bool HX_PROPERTY::names_network_tag() const {
    const char* name = get_name();
    return kind_ == HX_PROP_INT &&
           (std::strcmp(name, "MERGEDTO") == 0 || std::strcmp(name, "MERGEDFROM") == 0 ||
            std::strcmp(name, "JOINED") == 0);
}
