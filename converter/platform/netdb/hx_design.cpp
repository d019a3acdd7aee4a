#include "hx_design.h"

#include <algorithm>
#include <cstring>
#include <new>
#include <string>
#include <type_traits>
#include <unordered_set>

#include "hx_prim_layout.h"
#include "hx_storage.h"
#include "ut_str.h"

namespace {

const std::vector<HX_BLOCK*> kNoBlocks;
const std::vector<HX_SIGNAL*> kNoSignals;

// Pin arrays are preceded by a pointer to their block (see HX_PIN).
constexpr std::size_t kPinHeader = sizeof(HX_BLOCK*);
// Blocks with more pins than this get a name index for find_pin.
constexpr uint16_t kIndexedPinCount = 16;

// Rank of a signal for the highest-signal rule: lower is nearer the root.
int64_t signal_rank(const HX_SIGNAL* signal) {
    return signal->is_global() ? int64_t{-1} : int64_t{signal->get_block()->get_depth()};
}

}  // namespace

// --- pins --------------------------------------------------------------------

HX_BLOCK* HX_PIN::get_block() const {
    HX_BLOCK* block;
    const HX_PIN* first = this - index_;
    std::memcpy(&block, reinterpret_cast<const std::byte*>(first) - kPinHeader, sizeof block);
    return block;
}

void HX_PIN::set_name(const char* name) {
    // Files often restate a name the pin has (primitive pins are made with
    // theirs): keeping it spares the copy and the index drop.
    if (name == name_ || (name != nullptr && name_ != nullptr && std::strcmp(name, name_) == 0))
        return;
    HX_BLOCK* block = get_block();
    HX_DESIGN* design = block->get_design();
    name_ = design->intern(name);
    auto& indexes = design->store_->pin_names;
    if (!indexes.empty()) indexes.erase(block);
}

HX_MAPSIGNAL* HX_PIN::get_map_signal() const {
    const auto& map = get_block()->get_design()->mapsignal_of_pin_;
    if (map.empty()) return nullptr;
    auto it = map.find(this);
    return it == map.end() ? nullptr : it->second;
}

// --- blocks ------------------------------------------------------------------

HX_BLOCK::~HX_BLOCK() {
    delete lists_;
}

HX_BLOCK_LISTS& HX_BLOCK::lists() {
    if (lists_ == nullptr) {
        const uint32_t depth = get_depth();
        lists_ = new HX_BLOCK_LISTS;
        lists_->depth = depth;
    }
    return *lists_;
}

HX_PRIMITIVE* HX_BLOCK::get_primitive() {
    if (!is_primitive()) return nullptr;
    if (is_physical()) return static_cast<HX_PHYSPRIM*>(this);
    return static_cast<HX_LOGPRIM*>(this);
}

const HX_PRIMITIVE* HX_BLOCK::get_primitive() const {
    return const_cast<HX_BLOCK*>(this)->get_primitive();
}

void HX_BLOCK::set_name(const char* name) {
    name_ = design_->intern(name);
}

HX_BASEPHYSBLOCK* HX_BLOCK::get_phys_parent() const {
    const auto& map = design_->phys_parent_;
    if (map.empty()) return nullptr;
    auto it = map.find(this);
    return it == map.end() ? nullptr : it->second;
}

const char* HX_BLOCK::get_hiername() const {
    std::string& out = design_->name_buffer_;
    out.clear();
    if (name_ == nullptr || *name_ == '\0') return out.c_str();
    std::vector<const HX_BLOCK*> chain;
    for (const HX_BLOCK* b = this; b != nullptr; b = b->parent_)
        chain.push_back(b);
    for (auto it = chain.rbegin(); it != chain.rend(); ++it) {
        if (it != chain.rbegin()) out += '/';
        if ((*it)->name_ != nullptr) out += (*it)->name_;
    }
    return out.c_str();
}

uint16_t HX_BLOCK::find_pin(const char* name, uint8_t ignore_case) const {
    if (name == nullptr) return HX_NO_INDEX;
    if (ignore_case || pin_count_ <= kIndexedPinCount) {
        for (uint16_t i = 0; i < pin_count_; ++i) {
            const char* pin_name = pins_[i].name_;
            if (pin_name == nullptr) continue;
            if (ignore_case ? UT_STR::EqualNoCase(pin_name, name)
                            : std::strcmp(pin_name, name) == 0)
                return i;
        }
        return HX_NO_INDEX;
    }
    auto [it, made] = design_->store_->pin_names.try_emplace(this);
    if (made) {
        it->second.reserve(pin_count_);
        for (uint16_t i = 0; i < pin_count_; ++i) {
            if (pins_[i].name_ != nullptr) it->second.try_emplace(pins_[i].name_, i);
        }
    }
    auto found = it->second.find(name);
    return found == it->second.end() ? HX_NO_INDEX : found->second;
}

bool HX_BLOCK::check_pins(uint8_t require_names) const {
    if (require_names) {
        for (uint16_t i = 0; i < pin_count_; ++i) {
            if (pins_[i].name_ == nullptr || *pins_[i].name_ == '\0') return false;
        }
    }
    if (is_primitive()) return true;
    // A name shared by two pins is the first pin found for it by another index.
    for (uint16_t i = 0; i < pin_count_; ++i) {
        const char* name = pins_[i].name_;
        if (name != nullptr && *name != '\0' && find_pin(name, 0) != i) return false;
    }
    return true;
}

bool HX_BLOCK::isempty() const {
    if (lists_ == nullptr) return true;
    if (!lists_->children.empty()) return false;
    return std::all_of(lists_->signals.begin(), lists_->signals.end(),
                       [](const HX_SIGNAL* s) { return s == nullptr; });
}

UT_BLIST_ITER<HX_BLOCK>* HX_BLOCK::create_child_iter() const {
    return new UT_BLIST_ITER<HX_BLOCK>(lists_ ? lists_->children : kNoBlocks);
}

UT_BLISTS_ITER<HX_SIGNAL>* HX_BLOCK::create_signal_iter() const {
    return new UT_BLISTS_ITER<HX_SIGNAL>(lists_ ? lists_->signals : kNoSignals);
}

UT_BLIST_ITER<HX_SIGNAL>* HX_BLOCK::create_global_siglist(uint8_t own_pins) const {
    std::vector<HX_SIGNAL*> list;
    std::unordered_set<const HX_SIGNAL*> seen;
    auto note = [&](HX_SIGNAL* s) {
        if (s != nullptr && s->is_global() && seen.insert(s).second) list.push_back(s);
    };
    if (lists_ != nullptr) {
        for (const HX_BLOCK* child : lists_->children) {
            for (uint16_t i = 0; i < child->pin_count_; ++i)
                note(child->pins_[i].outer_);
        }
    }
    if (own_pins) {
        for (uint16_t i = 0; i < pin_count_; ++i)
            note(pins_[i].inner_);
    }
    return new UT_BLIST_ITER<HX_SIGNAL>(std::move(list));
}

void HX_BLOCK::delete_global_siglist(UT_BLIST_ITER<HX_SIGNAL>* iter) const {
    delete iter;
}

HX_MAPSIGNAL* HX_BASEPHYSBLOCK::create_map_signal(uint16_t index, const char* name) {
    if (index >= get_pin_count()) return nullptr;
    return get_design()->make_mapsignal(this, index, name);
}

UT_BLIST_ITER<HX_BLOCK>* HX_BASEPHYSBLOCK::create_log_child_iter() const {
    const auto& map = get_design()->log_children_;
    auto it = map.find(this);
    return new UT_BLIST_ITER<HX_BLOCK>(it == map.end() ? kNoBlocks : it->second);
}

// --- primitives --------------------------------------------------------------

HX_BLOCK* HX_PRIMITIVE::get_block() {
    if (physical_) return static_cast<HX_PHYSPRIM*>(this);
    return static_cast<HX_LOGPRIM*>(this);
}

const HX_BLOCK* HX_PRIMITIVE::get_block() const {
    return const_cast<HX_PRIMITIVE*>(this)->get_block();
}

uint16_t HX_PRIMITIVE::get_pin_count() const {
    return get_block()->get_pin_count();
}

HX_PIN_PRIMITIVE* HX_PRIMITIVE::get_prim_pin(uint16_t index) const {
    return get_block()->get_pin(index);
}

uint16_t HX_PRIMITIVE::get_prim_index(int32_t role, uint16_t ordinal) const {
    return hx_prim_pin_index(type_, width_, role, ordinal);
}

bool HX_PRIMITIVE::is_param_pin(int32_t role) const {
    return hx_prim_role_repeats(type_, role);
}

bool HX_PRIMITIVE::type_has_width(int32_t type) {
    return hx_prim_takes_width(type);
}

uint32_t HX_PRIMITIVE::pin_count_for(int32_t type, uint16_t width) {
    return hx_prim_pin_count(type, width);
}

// --- signals, connections, networks, map signals ----------------------------

void HX_SIGNAL::set_name(const char* name) {
    HX_DESIGN* design = get_design();
    if (is_global()) {
        design->rename_global(this, name);
    } else {
        name_ = design->intern(name);
    }
}

HX_DESIGN* HX_SIGNAL::get_design() const {
    if (is_global()) return reinterpret_cast<HX_DESIGN*>(owner_ & ~uintptr_t{1});
    return get_block()->get_design();
}

HX_SIGNAL::CONN_ITER* HX_SIGNAL::create_conn_iter() const {
    return new CONN_ITER(&last_conn_);
}

void HX_SIGNAL::delete_conn_iter(CONN_ITER* iter) const {
    delete iter;
}

HX_CONN* HX_CONN_LIST_ITER::l_next() {
    HX_CONN* last = *last_;
    if (done_ || last == nullptr) return nullptr;
    HX_CONN* item = prev_ == nullptr ? last->next_ : prev_->next_;
    // Stop after the list's current last, so appends made meanwhile are seen.
    if (item == last) done_ = true;
    prev_ = item;
    return item;
}

const char* HX_NETWORK::get_name() const {
    const HX_SIGNAL* top = highest_;
    if (top == nullptr || top->get_name() == nullptr) return nullptr;
    HX_DESIGN* design = top->get_design();
    if (top->is_global()) {
        design->name_buffer_ = top->get_name();
    } else {
        std::string name = top->get_block()->get_hiername();
        name += '/';
        name += top->get_name();
        design->name_buffer_ = std::move(name);
    }
    return design->name_buffer_.c_str();
}

UT_BLIST_ITER<HX_SIGNAL>* HX_NETWORK::create_signal_iter() const {
    std::vector<HX_SIGNAL*> members;
    members.reserve(members_);
    if (last_member_ != nullptr) {
        HX_SIGNAL* s = last_member_;
        do {
            s = s->next_member_;
            members.push_back(s);
        } while (s != last_member_);
    }
    return new UT_BLIST_ITER<HX_SIGNAL>(std::move(members));
}

void HX_NETWORK::delete_signal_iter(UT_BLIST_ITER<HX_SIGNAL>* iter) const {
    delete iter;
}

void HX_MAPSIGNAL::set_name(const char* name) {
    name_ = block_->get_design()->intern(name);
}

HX_CONN* HX_MAPSIGNAL::create_mapconn(HX_BLOCK* block, uint16_t index) {
    HX_DESIGN* design = block_->get_design();
    if (!design->owns(block) || block->is_physical() || index >= block->get_pin_count())
        return nullptr;
    HX_PIN* pin = block->get_pin(index);
    if (!design->mapsignal_of_pin_.try_emplace(pin, this).second) return nullptr;
    HX_CONN* conn = design->make_conn(pin);
    HX_DESIGN::append_conn(last_conn_, conn);
    return conn;
}

HX_SIGNAL::CONN_ITER* HX_MAPSIGNAL::create_conn_iter() const {
    return new HX_SIGNAL::CONN_ITER(&last_conn_);
}

void HX_MAPSIGNAL::delete_conn_iter(HX_SIGNAL::CONN_ITER* iter) const {
    delete iter;
}

// --- the design: construction and destruction ------------------------------

HX_DESIGN::HX_DESIGN(HX_LIBRARY* library, const char* name)
    : library_(library), store_(std::make_unique<HX_DESIGN_STORAGE>()) {
    name_ = intern(name);
}

HX_DESIGN::~HX_DESIGN() {
    for (HX_BLOCK* block : blocks_) {
        for (uint16_t i = 0; i < block->pin_count_; ++i)
            block->pins_[i].~HX_PIN();
        if (block->lists_ != nullptr) {
            for (HX_SIGNAL* s : block->lists_->signals) {
                if (s != nullptr) s->~HX_SIGNAL();
            }
        }
        switch (block->flags_) {
            case 0:
                static_cast<HX_LOGBLOCK*>(block)->~HX_LOGBLOCK();
                break;
            case HX_BLK_PHYSICAL:
                static_cast<HX_PHYSBLOCK*>(block)->~HX_PHYSBLOCK();
                break;
            case HX_BLK_PRIMITIVE:
                static_cast<HX_LOGPRIM*>(block)->~HX_LOGPRIM();
                break;
            default:
                static_cast<HX_PHYSPRIM*>(block)->~HX_PHYSPRIM();
                break;
        }
    }
    for (HX_SIGNAL* s : globals_)
        s->~HX_SIGNAL();
    for (HX_NETWORK* net : networks_) {
        if (net != nullptr) net->~HX_NETWORK();
    }
    for (HX_MAPSIGNAL* m : mapsignals_)
        m->~HX_MAPSIGNAL();
}

void HX_DESIGN::set_name(const char* name) {
    name_ = intern(name);
}

const char* HX_DESIGN::intern(const char* text) {
    if (text == nullptr) return nullptr;
    if (*text == '\0') return "";
    std::size_t size = std::strlen(text) + 1;
    char* copy = static_cast<char*>(store_->text->alloc(size, 1));
    std::memcpy(copy, text, size);
    return copy;
}

void HX_DESIGN::share_text_of(const HX_DESIGN& source) {
    auto hold = [&](const std::shared_ptr<HX_ARENA>& arena) {
        auto& held = store_->shared_text;
        if (arena != store_->text && std::find(held.begin(), held.end(), arena) == held.end())
            held.push_back(arena);
    };
    hold(source.store_->text);
    for (const auto& arena : source.store_->shared_text)
        hold(arena);
}

// --- the design: blocks ------------------------------------------------------

// Makes a block of kind T under `parent`, or the root of T's kind when the
// parent is null. Null when that root exists already, or when the parent is
// a primitive below a root or belongs to another design. A root primitive
// takes children: the text makes every later block of its design one.
template <class T, class... Args>
T* HX_DESIGN::make_block(HX_BLOCK* parent, uint16_t pin_count, const char* name, Args&&... args) {
    constexpr bool physical = std::is_base_of_v<HX_BASEPHYSBLOCK, T>;
    constexpr bool primitive = std::is_base_of_v<HX_PRIMITIVE, T>;
    HX_BLOCK* root = physical ? static_cast<HX_BLOCK*>(phys_root_) : log_root_;
    if (parent == nullptr ? root != nullptr
                          : !owns(parent) || (parent->is_primitive() && parent != root))
        return nullptr;
    void* memory = store_->objects.alloc(sizeof(T), alignof(T));
    T* block = new (memory) T(std::forward<Args>(args)...);
    block->design_ = this;
    block->parent_ = parent;
    block->name_ = intern(name);
    block->flags_ = (physical ? HX_BLK_PHYSICAL : 0) | (primitive ? HX_BLK_PRIMITIVE : 0);
    block->pin_count_ = pin_count;
    block->pins_ = make_pins(block, pin_count);
    blocks_.push_back(block);
    if (parent != nullptr) {
        parent->lists().children.push_back(block);
    } else if constexpr (physical) {
        phys_root_ = block;
    } else {
        log_root_ = block;
    }
    return block;
}

HX_PIN* HX_DESIGN::make_pins(HX_BLOCK* block, uint16_t count) {
    if (count == 0) return nullptr;
    auto* memory = static_cast<std::byte*>(
        store_->objects.alloc(kPinHeader + count * sizeof(HX_PIN), alignof(HX_PIN)));
    std::memcpy(memory, &block, sizeof block);
    HX_PIN* pins = reinterpret_cast<HX_PIN*>(memory + kPinHeader);
    for (uint16_t i = 0; i < count; ++i) {
        HX_PIN* pin = new (&pins[i]) HX_PIN();
        pin->index_ = i;
    }
    return pins;
}

void HX_DESIGN::make_prim_pins(HX_BLOCK* block, HX_PRIMITIVE* prim) {
    uint16_t index = 0;
    hx_prim_for_each_pin(
        prim->get_type(), prim->get_width(), [&](int32_t role, uint16_t ordinal, bool repeated) {
            HX_PIN& pin = block->pins_[index++];
            pin.role_ = static_cast<uint8_t>(role);
            pin.dir_ = static_cast<uint8_t>(hx_prim_pin_dir(prim->get_type(), role));
            pin.name_ = hx_prim_pin_name(role, repeated ? ordinal : HX_NO_INDEX);
        });
}

template <class T>
T* HX_DESIGN::make_prim(HX_BLOCK* parent, int32_t type, uint16_t width, const char* name) {
    if (!hx_prim_takes_width(type)) width = HX_NO_INDEX;
    const uint32_t count = hx_prim_pin_count(type, width);
    if (count == 0) return nullptr;
    T* prim = make_block<T>(parent, static_cast<uint16_t>(count), name, static_cast<uint8_t>(type),
                            width);
    if (prim != nullptr) make_prim_pins(prim, prim);
    return prim;
}

HX_LOGBLOCK* HX_DESIGN::create_logblock(HX_BASELOGBLOCK* parent, uint16_t width, const char* name) {
    return make_block<HX_LOGBLOCK>(parent, width, name);
}

HX_PHYSBLOCK* HX_DESIGN::create_physblock(HX_BASEPHYSBLOCK* parent, uint16_t width,
                                          const char* name) {
    return make_block<HX_PHYSBLOCK>(parent, width, name);
}

HX_LOGPRIM* HX_DESIGN::create_logprim(HX_BASELOGBLOCK* parent, int32_t type, uint16_t width,
                                      const char* name) {
    return make_prim<HX_LOGPRIM>(parent, type, width, name);
}

HX_PHYSPRIM* HX_DESIGN::create_physprim(HX_BASEPHYSBLOCK* parent, int32_t type, uint16_t width,
                                        const char* name) {
    return make_prim<HX_PHYSPRIM>(parent, type, width, name);
}

UT_BLIST_ITER<HX_BLOCK>* HX_DESIGN::create_block_iter() const {
    return new UT_BLIST_ITER<HX_BLOCK>(blocks_);
}

UT_BLISTS_ITER<HX_NETWORK>* HX_DESIGN::create_network_iter() const {
    return new UT_BLISTS_ITER<HX_NETWORK>(networks_);
}

UT_BLIST_ITER<HX_MAPSIGNAL>* HX_DESIGN::create_mapsignal_iter() const {
    return new UT_BLIST_ITER<HX_MAPSIGNAL>(mapsignals_);
}

UT_BLIST_ITER<HX_SIGNAL>* HX_DESIGN::create_global_iter() const {
    return new UT_BLIST_ITER<HX_SIGNAL>(globals_);
}

// --- the design: signals and networks ---------------------------------------

HX_SIGNAL* HX_DESIGN::make_signal(const char* name) {
    // The name goes right behind the signal: finding a signal by name then
    // touches one place in memory, not two.
    const std::size_t length = name && *name ? std::strlen(name) + 1 : 0;
    auto* memory = static_cast<std::byte*>(
        store_->objects.alloc(sizeof(HX_SIGNAL) + length, alignof(HX_SIGNAL)));
    auto* signal = new (memory) HX_SIGNAL();
    if (length > 0) {
        char* text = reinterpret_cast<char*>(memory + sizeof(HX_SIGNAL));
        std::memcpy(text, name, length);
        signal->name_ = text;
    } else {
        signal->name_ = intern(name);
    }
    return signal;
}

HX_SIGNAL* HX_DESIGN::create_signal(HX_BLOCK* block, const char* name) {
    if (!owns(block)) return nullptr;
    HX_SIGNAL* signal = make_signal(name);
    signal->owner_ = reinterpret_cast<uintptr_t>(block);
    std::vector<HX_SIGNAL*>& signals = block->lists().signals;
    signal->slot_ = static_cast<uint32_t>(signals.size());
    signals.push_back(signal);
    make_network(signal, next_tag());
    return signal;
}

HX_SIGNAL* HX_DESIGN::create_global_signal(const char* name) {
    if (name == nullptr || global_by_name_.contains(name)) return nullptr;
    HX_SIGNAL* signal = make_signal(name);
    signal->owner_ = reinterpret_cast<uintptr_t>(this) | 1;
    signal->slot_ = static_cast<uint32_t>(globals_.size());
    globals_.push_back(signal);
    global_by_name_.emplace(signal->name_, signal);
    make_network(signal, next_tag());
    return signal;
}

HX_SIGNAL* HX_DESIGN::find_global_signal(const char* name) const {
    if (name == nullptr) return nullptr;
    auto it = global_by_name_.find(name);
    return it == global_by_name_.end() ? nullptr : it->second;
}

void HX_DESIGN::rename_global(HX_SIGNAL* signal, const char* name) {
    auto it = signal->name_ ? global_by_name_.find(signal->name_) : global_by_name_.end();
    if (it != global_by_name_.end() && it->second == signal) global_by_name_.erase(it);
    signal->name_ = intern(name);
    if (signal->name_ != nullptr) global_by_name_.try_emplace(signal->name_, signal);
}

uint32_t HX_DESIGN::next_tag() {
    ++last_tag_;
    // Tags are handed out in rising order, so a free one is found without a
    // lookup until the numbers wrap or a file brought in larger tags.
    if (last_tag_ != 0 && last_tag_ > store_->tags.max_tag()) return last_tag_;
    while (last_tag_ == 0 || store_->tags.find(last_tag_) != nullptr)
        ++last_tag_;
    return last_tag_;
}

HX_NETWORK* HX_DESIGN::make_network(HX_SIGNAL* first, uint32_t tag) {
    void* memory = store_->spare_networks;
    if (memory != nullptr) {
        std::memcpy(&store_->spare_networks, memory, sizeof(void*));
    } else {
        memory = store_->objects.alloc(sizeof(HX_NETWORK), alignof(HX_NETWORK));
    }
    auto* net = new (memory) HX_NETWORK();
    net->tag_ = tag;
    net->highest_ = first;
    net->last_member_ = first;
    net->members_ = 1;
    first->next_member_ = first;
    first->network_ = net;
    net->slot_ = static_cast<uint32_t>(networks_.size());
    networks_.push_back(net);
    ++network_count_;
    store_->tags.insert(net);
    return net;
}

HX_NETWORK* HX_DESIGN::find_net_tag(uint32_t tag) const {
    return store_->tags.find(tag);
}

// Dropped tags are never handed out again (new tags rise past them), so a
// chain of joins ends at a live network or at a tag nothing took over.
HX_NETWORK* HX_DESIGN::follow_net_tag(uint32_t tag) const {
    HX_DESIGN_STORAGE& store = *store_;
    if (HX_NETWORK* net = store.tags.find(tag)) return net;
    if (store.joined_tags.empty()) return nullptr;
    for (; store.joined_indexed < store.joined_tags.size(); ++store.joined_indexed) {
        const auto& [gone, kept] = store.joined_tags[store.joined_indexed];
        store.joined_index[gone] = kept;
    }
    for (std::size_t step = 0; step < store.joined_tags.size(); ++step) {
        auto next = store.joined_index.find(tag);
        if (next == store.joined_index.end()) return nullptr;
        tag = next->second;
        if (HX_NETWORK* net = store.tags.find(tag)) return net;
    }
    return nullptr;
}

HX_NETWORK* hx_find_net_tag(const HX_DESIGN* design, uint32_t tag) {
    return design ? design->find_net_tag(tag) : nullptr;
}

void HX_DESIGN::join_networks(HX_NETWORK* a, HX_NETWORK* b) {
    if (a == b) return;
    // The network holding the higher signal survives, with its tag and its
    // properties; ties go to `a`, the caller's outer side.
    HX_NETWORK* keep = a;
    HX_NETWORK* gone = b;
    if (signal_rank(b->highest_) < signal_rank(a->highest_)) std::swap(keep, gone);
    // Walk the smaller ring: the larger one's object takes on the survivor's
    // identity, so that joining nets one by one stays linear.
    if (gone->members_ > keep->members_) {
        exchange_identity(keep, gone);
        std::swap(keep, gone);
    }
    HX_SIGNAL* s = gone->last_member_;
    do {
        s = s->next_member_;
        s->network_ = keep;
    } while (s != gone->last_member_);
    HX_SIGNAL* keep_first = keep->last_member_->next_member_;
    keep->last_member_->next_member_ = gone->last_member_->next_member_;
    gone->last_member_->next_member_ = keep_first;
    keep->last_member_ = gone->last_member_;
    keep->members_ += gone->members_;
    keep->copy_properties(gone->get_props(), 0);
    store_->joined_tags.emplace_back(gone->tag_, keep->tag_);
    drop_network(gone);
}

void HX_DESIGN::exchange_identity(HX_NETWORK* x, HX_NETWORK* y) {
    store_->tags.erase(x->tag_);
    store_->tags.erase(y->tag_);
    std::swap(x->tag_, y->tag_);
    std::swap(x->slot_, y->slot_);
    std::swap(x->highest_, y->highest_);
    std::swap(x->props_, y->props_);
    networks_[x->slot_] = x;
    networks_[y->slot_] = y;
    store_->tags.insert(x);
    store_->tags.insert(y);
}

void HX_DESIGN::drop_network(HX_NETWORK* net) {
    store_->tags.erase(net->tag_);
    networks_[net->slot_] = nullptr;
    --network_count_;
    net->~HX_NETWORK();
    // Joins drop a network for each pin that links two sides; the next new
    // network takes its place in the arena.
    std::memcpy(static_cast<void*>(net), &store_->spare_networks, sizeof(void*));
    store_->spare_networks = net;
}

void HX_DESIGN::unlink_member(HX_SIGNAL* signal) {
    HX_NETWORK* net = signal->network_;
    HX_SIGNAL* prev = signal;
    while (prev->next_member_ != signal)
        prev = prev->next_member_;
    if (prev == signal) {
        drop_network(net);
    } else {
        prev->next_member_ = signal->next_member_;
        if (net->last_member_ == signal) net->last_member_ = prev;
        --net->members_;
        if (net->highest_ == signal) {
            HX_SIGNAL* best = net->last_member_;
            for (HX_SIGNAL* s = best->next_member_; s != net->last_member_; s = s->next_member_) {
                if (signal_rank(s) < signal_rank(best)) best = s;
            }
            net->highest_ = best;
        }
    }
    signal->network_ = nullptr;
    signal->next_member_ = nullptr;
}

void HX_DESIGN::append_conn(HX_CONN*& last, HX_CONN* conn) {
    if (last == nullptr) {
        conn->next_ = conn;
    } else {
        conn->next_ = last->next_;
        last->next_ = conn;
    }
    last = conn;
}

HX_CONN* HX_DESIGN::make_conn(HX_PIN* pin) {
    auto* conn = new (store_->objects.alloc(sizeof(HX_CONN), alignof(HX_CONN))) HX_CONN();
    conn->pin_ = pin;
    return conn;
}

HX_CONN* HX_DESIGN::create_conn(HX_SIGNAL* signal, HX_BLOCK* block, uint16_t index) {
    if (signal == nullptr || !owns(block) || index >= block->pin_count_ ||
        signal->get_design() != this)
        return nullptr;
    HX_PIN* pin = &block->pins_[index];
    HX_SIGNAL** side = nullptr;
    if (signal->get_block() == block) {
        side = &pin->inner_;
    } else if (signal->is_global() || signal->get_block() == block->parent_) {
        side = &pin->outer_;
    }
    if (side == nullptr || *side != nullptr) return nullptr;
    *side = signal;
    HX_CONN* conn = make_conn(pin);
    HX_DESIGN::append_conn(signal->last_conn_, conn);
    if (pin->inner_ != nullptr && pin->outer_ != nullptr)
        join_networks(pin->outer_->network_, pin->inner_->network_);
    return conn;
}

bool HX_DESIGN::merge_signals(HX_SIGNAL* global, HX_SIGNAL*& signal, uint8_t keep_signal,
                              uint8_t drop_props) {
    if (global == nullptr || signal == nullptr || global == signal || !global->is_global() ||
        global->get_design() != this || signal->get_design() != this)
        return false;
    HX_SIGNAL* old = signal;
    if (old->last_conn_ != nullptr) {
        HX_CONN* c = old->last_conn_;
        do {
            c = c->next_;
            HX_PIN* pin = c->pin_;
            (pin->inner_ == old ? pin->inner_ : pin->outer_) = global;
        } while (c != old->last_conn_);
        // Splice the connection ring onto the global signal's ring.
        if (global->last_conn_ == nullptr) {
            global->last_conn_ = old->last_conn_;
        } else {
            HX_CONN* global_first = global->last_conn_->next_;
            global->last_conn_->next_ = old->last_conn_->next_;
            old->last_conn_->next_ = global_first;
            global->last_conn_ = old->last_conn_;
        }
        old->last_conn_ = nullptr;
    }
    leave_network_for(old, global->network_);
    if (!drop_props) global->copy_properties(old->get_props(), 0);
    if (keep_signal) {
        make_network(old, next_tag());
    } else {
        delete_signal(old);
    }
    signal = global;
    return true;
}

// Takes `signal` out of its network and joins what is left of that network
// to `net`. The signal leaves its own network before the join, so that the
// walk to its place in the member ring covers only that network, not the
// one it joins (a global net may gather thousands of merged signals).
void HX_DESIGN::leave_network_for(HX_SIGNAL* signal, HX_NETWORK* net) {
    HX_NETWORK* own = signal->network_;
    if (own == net) {
        unlink_member(signal);
    } else if (own->members_ == 1) {
        net->copy_properties(own->get_props(), 0);
        unlink_member(signal);  // drops `own`
    } else {
        unlink_member(signal);
        join_networks(net, own);
    }
}

void HX_DESIGN::delete_signal(HX_SIGNAL* signal) {
    if (signal->network_ != nullptr) unlink_member(signal);
    if (signal->is_global()) {
        rename_global(signal, nullptr);
        globals_.erase(globals_.begin() + signal->slot_);
        for (std::size_t i = signal->slot_; i < globals_.size(); ++i)
            globals_[i]->slot_ = static_cast<uint32_t>(i);
    } else {
        signal->get_block()->lists_->signals[signal->slot_] = nullptr;
    }
    signal->~HX_SIGNAL();
}

// --- the design: mapping -----------------------------------------------------

HX_MAPSIGNAL* HX_DESIGN::make_mapsignal(HX_BASEPHYSBLOCK* block, uint16_t index, const char* name) {
    HX_PIN* pin = block->get_pin(index);
    if (mapsignal_of_pin_.contains(pin)) return nullptr;
    auto* m =
        new (store_->objects.alloc(sizeof(HX_MAPSIGNAL), alignof(HX_MAPSIGNAL))) HX_MAPSIGNAL();
    m->block_ = block;
    m->pin_ = index;
    m->name_ = intern(name);
    mapsignal_of_pin_.emplace(pin, m);
    HX_DESIGN::append_conn(m->last_conn_, make_conn(pin));
    mapsignals_.push_back(m);
    return m;
}

bool HX_DESIGN::set_block_phys_parent(HX_BLOCK* log, HX_BASEPHYSBLOCK* phys) {
    if (!owns(log) || !owns(phys) || log->is_physical() || !phys->is_physical()) return false;
    if (!phys_parent_.try_emplace(log, phys).second) return false;
    log_children_[phys].push_back(log);
    return true;
}
