// Instances of other designs and grafting their contents.
#include <algorithm>
#include <cstdint>
#include <cstring>
#include <memory>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "hx_design.h"
#include "hx_library.h"

namespace {

bool same_text(const char* a, const char* b) {
    if (a == nullptr || b == nullptr) return a == b;
    return std::strcmp(a, b) == 0;
}

/// Source objects to their copies: open addressing over pointer keys
/// (linear probing, at most half full, nothing removed). A graft maps every
/// block and signal it copies, so this is leaner and quicker than a map
/// with a node per entry.
template <class Key, class Value>
class COPY_MAP {
  public:
    void reserve(std::size_t count) {
        std::size_t capacity = 16;
        while (capacity < 2 * count)
            capacity *= 2;
        if (capacity > slots_.size()) rehash(capacity);
    }
    void emplace(const Key* key, Value* value) {
        if (2 * (used_ + 1) > slots_.size()) rehash(std::max<std::size_t>(16, 2 * slots_.size()));
        Slot& slot = slots_[locate(key)];
        if (slot.key == nullptr) {
            slot = {key, value};
            ++used_;
        }
    }
    /// The copy of `key`, or null.
    Value* find(const Key* key) const {
        return slots_.empty() ? nullptr : slots_[locate(key)].value;
    }
    bool contains(const Key* key) const { return find(key) != nullptr; }

  private:
    struct Slot {
        const Key* key = nullptr;
        Value* value = nullptr;
    };
    std::size_t locate(const Key* key) const {
        const std::size_t mask = slots_.size() - 1;
        std::size_t i = (reinterpret_cast<uintptr_t>(key) * 0x9E3779B97F4A7C15ull >> 32) & mask;
        while (slots_[i].key != nullptr && slots_[i].key != key)
            i = (i + 1) & mask;
        return i;
    }
    void rehash(std::size_t capacity) {
        std::vector<Slot> old(capacity);
        old.swap(slots_);
        for (const Slot& slot : old) {
            if (slot.key != nullptr) slots_[locate(slot.key)] = slot;
        }
    }

    std::vector<Slot> slots_;
    std::size_t used_ = 0;
};

}  // namespace

/// One graft: copies the contents below a source root into an instance,
/// keeping maps from source objects to their copies.
class HX_GRAFT {
  public:
    HX_GRAFT(HX_DESIGN& target, const HX_DESIGN& source, bool copy_props)
        : target_(target), source_(source), copy_props_(copy_props) {}

    void run(const HX_BLOCK* source_root, HX_BLOCK* instance, bool copy_maps,
             DARRAY_NAME* globals_out);
    /// Gives the pins of `to` the names of those of `from` (of `source`),
    /// shared (see HX_DESIGN::share_text_of) and without the checks of
    /// HX_PIN::set_name: `to` is new and has no pin name index yet.
    static void share_pin_names(const HX_DESIGN& source, const HX_BLOCK* from, HX_BLOCK* to) {
        to->get_design()->share_text_of(source);
        for (uint16_t i = 0; i < from->get_pin_count(); ++i)
            to->pins_[i].name_ = from->pins_[i].name_;
    }

  private:
    void copy_children(const HX_BLOCK* from, HX_BLOCK* to);
    HX_BLOCK* copy_block(const HX_BLOCK* from, HX_BLOCK* parent);
    void copy_signals(const HX_BLOCK* from, HX_BLOCK* to);
    HX_SIGNAL* target_global(HX_SIGNAL* global, DARRAY_NAME* globals_out);
    void copy_connections(const HX_BLOCK* source_root, DARRAY_NAME* globals_out);
    void connect_signal(HX_SIGNAL* from, HX_SIGNAL* to, const HX_BLOCK* source_root);
    void copy_network_props();
    bool source_has_network_props() const;
    void copy_maps();
    static void copy_pin_state(const HX_PIN& from, HX_PIN& to);
    void copy_props(const HX_OBJECT& from, HX_OBJECT& to) const {
        if (copy_props_) to.copy_properties(from.get_props(), 0);
    }

    HX_DESIGN& target_;
    const HX_DESIGN& source_;
    bool copy_props_;
    COPY_MAP<HX_BLOCK, HX_BLOCK> blocks_;
    COPY_MAP<HX_SIGNAL, HX_SIGNAL> signals_;
};

void HX_GRAFT::run(const HX_BLOCK* source_root, HX_BLOCK* instance, bool copy_maps,
                   DARRAY_NAME* globals_out) {
    target_.share_text_of(source_);
    blocks_.reserve(source_.block_count());
    blocks_.emplace(source_root, instance);
    copy_children(source_root, instance);
    // Signals in source block order, so the copy's order is the source's.
    auto* iter = source_.create_block_iter();
    while (HX_BLOCK* block = iter->l_next()) {
        if (HX_BLOCK* copy = blocks_.find(block)) copy_signals(block, copy);
    }
    source_.delete_block_iter(iter);
    copy_connections(source_root, globals_out);
    copy_network_props();
    if (copy_maps) this->copy_maps();
}

// Copies depth first, each block before the blocks below it, as the source
// was made. The walk keeps its own stack: a hierarchy may be far deeper
// than the call stack would allow.
void HX_GRAFT::copy_children(const HX_BLOCK* from, HX_BLOCK* to) {
    struct Level {
        HX_BLOCK* copy;
        std::unique_ptr<UT_BLIST_ITER<HX_BLOCK>> children;
    };
    std::vector<Level> stack;
    stack.push_back({to, std::unique_ptr<UT_BLIST_ITER<HX_BLOCK>>(from->create_child_iter())});
    while (!stack.empty()) {
        const HX_BLOCK* child = stack.back().children->l_next();
        if (child == nullptr) {
            stack.pop_back();
            continue;
        }
        HX_BLOCK* copy = copy_block(child, stack.back().copy);
        if (copy != nullptr && child->child_count() != 0)
            stack.push_back(
                {copy, std::unique_ptr<UT_BLIST_ITER<HX_BLOCK>>(child->create_child_iter())});
    }
}

// The copy shares the source's names (see HX_DESIGN::share_text_of).
void HX_GRAFT::copy_pin_state(const HX_PIN& from, HX_PIN& to) {
    to.name_ = from.name_;
    to.dir_ = from.dir_;
    to.mapinv_ = from.mapinv_;
    to.inverted_ = from.inverted_;
}

HX_BLOCK* HX_GRAFT::copy_block(const HX_BLOCK* from, HX_BLOCK* parent) {
    HX_BLOCK* copy = nullptr;
    const HX_PRIMITIVE* prim = from->get_primitive();
    if (from->is_physical()) {
        auto* phys_parent = static_cast<HX_BASEPHYSBLOCK*>(parent);
        copy = prim ? static_cast<HX_BLOCK*>(target_.create_physprim(phys_parent, prim->get_type(),
                                                                     prim->get_width(), nullptr))
                    : target_.create_physblock(phys_parent, from->get_pin_count(), nullptr);
    } else {
        auto* log_parent = static_cast<HX_BASELOGBLOCK*>(parent);
        copy = prim ? static_cast<HX_BLOCK*>(target_.create_logprim(log_parent, prim->get_type(),
                                                                    prim->get_width(), nullptr))
                    : target_.create_logblock(log_parent, from->get_pin_count(), nullptr);
    }
    if (copy == nullptr) return nullptr;
    copy->name_ = from->name_;
    copy->set_user(from->get_user());
    copy_props(*from, *copy);
    for (uint16_t i = 0; i < from->get_pin_count(); ++i) {
        copy_pin_state(*from->get_pin(i), *copy->get_pin(i));
        copy_props(*from->get_pin(i), *copy->get_pin(i));
    }
    blocks_.emplace(from, copy);
    return copy;
}

void HX_GRAFT::copy_signals(const HX_BLOCK* from, HX_BLOCK* to) {
    auto* iter = from->create_signal_iter();
    while (HX_SIGNAL* signal = iter->l_next()) {
        HX_SIGNAL* copy = target_.create_signal(to, signal->get_name());
        copy_props(*signal, *copy);
        signals_.emplace(signal, copy);
    }
    from->delete_signal_iter(iter);
}

HX_SIGNAL* HX_GRAFT::target_global(HX_SIGNAL* global, DARRAY_NAME* globals_out) {
    if (HX_SIGNAL* found = signals_.find(global)) return found;
    HX_SIGNAL* copy = target_.find_global_signal(global->get_name());
    if (copy == nullptr) copy = target_.create_global_signal(global->get_name());
    if (copy == nullptr) return nullptr;
    copy_props(*global, *copy);
    if (globals_out != nullptr) globals_out->add(global->get_name());
    signals_.emplace(global, copy);
    return copy;
}

void HX_GRAFT::copy_connections(const HX_BLOCK* source_root, DARRAY_NAME* globals_out) {
    // Block signals in block creation order, then globals; each copy makes
    // its connections in the source's order.
    std::vector<HX_SIGNAL*> ordered;
    auto* blocks = source_.create_block_iter();
    while (HX_BLOCK* block = blocks->l_next()) {
        if (!blocks_.contains(block)) continue;
        auto* signals = block->create_signal_iter();
        while (HX_SIGNAL* s = signals->l_next())
            ordered.push_back(s);
        block->delete_signal_iter(signals);
    }
    source_.delete_block_iter(blocks);
    auto* globals = source_.create_global_iter();
    while (HX_SIGNAL* global = globals->l_next())
        ordered.push_back(global);
    source_.delete_global_iter(globals);
    for (HX_SIGNAL* s : ordered) {
        HX_SIGNAL* copy = s->is_global() ? nullptr : signals_.find(s);
        if (s->is_global()) {
            bool used = false;
            auto* conns = s->create_conn_iter();
            while (HX_CONN* c = conns->l_next()) {
                used = used || (c->get_block() != source_root && blocks_.contains(c->get_block()));
            }
            s->delete_conn_iter(conns);
            if (!used) continue;
            copy = target_global(s, globals_out);
            if (copy == nullptr) continue;
        }
        connect_signal(s, copy, source_root);
    }
}

void HX_GRAFT::connect_signal(HX_SIGNAL* from, HX_SIGNAL* to, const HX_BLOCK* source_root) {
    auto* conns = from->create_conn_iter();
    while (HX_CONN* c = conns->l_next()) {
        const HX_BLOCK* block = c->get_block();
        HX_BLOCK* mapped = blocks_.find(block);
        if (mapped == nullptr) continue;
        // On the source root only the inner side belongs to the contents.
        if (block == source_root && c->get_pin()->get_inner_signal() != from) continue;
        target_.create_conn(to, mapped, c->get_index());
    }
    from->delete_conn_iter(conns);
}

bool HX_GRAFT::source_has_network_props() const {
    auto* iter = source_.create_network_iter();
    bool found = false;
    while (HX_NETWORK* net = iter->l_next()) {
        if (net->get_props() != nullptr) {
            found = true;
            break;
        }
    }
    source_.delete_network_iter(iter);
    return found;
}

void HX_GRAFT::copy_network_props() {
    // Without properties to copy, the walk over every member is not needed.
    if (!copy_props_ || !source_has_network_props()) return;
    std::unordered_map<uint32_t, uint32_t> tags;
    std::vector<std::pair<const HX_NETWORK*, HX_NETWORK*>> pairs;
    auto* iter = source_.create_network_iter();
    while (HX_NETWORK* net = iter->l_next()) {
        auto* members = net->create_signal_iter();
        HX_NETWORK* copy = nullptr;
        while (HX_SIGNAL* s = members->l_next()) {
            if (HX_SIGNAL* found = signals_.find(s)) {
                copy = found->get_network();
                break;
            }
        }
        net->delete_signal_iter(members);
        if (copy == nullptr) continue;
        tags.emplace(net->get_tag(), copy->get_tag());
        pairs.emplace_back(net, copy);
    }
    source_.delete_network_iter(iter);
    for (auto& [from, to] : pairs) {
        const HX_PROPLIST* props = from->get_props();
        if (props == nullptr) continue;
        for (const HX_PROPERTY* prop : props->items()) {
            if (prop == nullptr || to->find_prop(prop->get_name()) != nullptr) continue;
            HX_PROPERTY* copy = to->create_prop(prop, nullptr);
            // Tag properties name networks of the source; point them at the copies.
            if (!copy->names_network_tag()) continue;
            // A tag of a network joined away in the source stands for the survivor.
            const HX_NETWORK* named =
                source_.follow_net_tag(static_cast<uint32_t>(copy->get_int()));
            if (named == nullptr) continue;
            auto found = tags.find(named->get_tag());
            if (found != tags.end()) copy->set_int(static_cast<int32_t>(found->second));
        }
    }
}

void HX_GRAFT::copy_maps() {
    auto* iter = source_.create_mapsignal_iter();
    while (HX_MAPSIGNAL* m = iter->l_next()) {
        HX_BLOCK* block = blocks_.find(m->get_block());
        if (block == nullptr) continue;
        auto* phys = static_cast<HX_BASEPHYSBLOCK*>(block);
        HX_MAPSIGNAL* copy = phys->create_map_signal(m->get_pin_index(), m->get_name());
        if (copy == nullptr) continue;
        copy_props(*m, *copy);
        auto* conns = m->create_conn_iter();
        conns->l_next();  // the physical pin itself
        while (HX_CONN* c = conns->l_next()) {
            if (HX_BLOCK* log = blocks_.find(c->get_block()))
                copy->create_mapconn(log, c->get_index());
        }
        m->delete_conn_iter(conns);
    }
    source_.delete_mapsignal_iter(iter);
    auto* blocks = source_.create_block_iter();
    while (HX_BLOCK* block = blocks->l_next()) {
        HX_BASEPHYSBLOCK* parent = block->get_phys_parent();
        HX_BLOCK* log = blocks_.find(block);
        HX_BLOCK* phys = parent ? blocks_.find(parent) : nullptr;
        if (log != nullptr && phys != nullptr)
            target_.set_block_phys_parent(log, static_cast<HX_BASEPHYSBLOCK*>(phys));
    }
    source_.delete_block_iter(blocks);
}

// --- HX_DESIGN entry points ----------------------------------------------------

namespace {

template <class Block>
bool pins_match(const HX_BLOCK* instance, const Block* root) {
    if (instance->get_pin_count() != root->get_pin_count()) return false;
    for (uint16_t i = 0; i < root->get_pin_count(); ++i) {
        if (!same_text(instance->get_pin(i)->get_name(), root->get_pin(i)->get_name()))
            return false;
    }
    return true;
}

template <class Made>
Made* finish_instance(Made* made, const HX_BLOCK* root, const HX_DESIGN* other,
                      uint8_t omit_type_prop) {
    if (made == nullptr) return nullptr;
    HX_GRAFT::share_pin_names(*other, root, made);
    for (uint16_t i = 0; i < root->get_pin_count(); ++i)
        made->get_pin(i)->set_dir(root->get_pin(i)->get_dir());
    if (!omit_type_prop) made->create_prop("TYPE", other->get_name(), 1);
    return made;
}

}  // namespace

HX_LOGBLOCK* HX_DESIGN::instantiate(HX_BASELOGBLOCK* root, HX_DESIGN* other,
                                    uint8_t omit_type_prop) {
    if (other == nullptr || other->log_root_ == nullptr) return nullptr;
    const HX_BLOCK* source = other->log_root_;
    return finish_instance(create_logblock(root, source->get_pin_count(), other->get_name()),
                           source, other, omit_type_prop);
}

HX_PHYSBLOCK* HX_DESIGN::instantiate(HX_BASEPHYSBLOCK* root, HX_DESIGN* other,
                                     uint8_t omit_type_prop) {
    if (other == nullptr || other->phys_root_ == nullptr) return nullptr;
    const HX_BLOCK* source = other->phys_root_;
    return finish_instance(create_physblock(root, source->get_pin_count(), other->get_name()),
                           source, other, omit_type_prop);
}

namespace {

template <class Block>
Block* graft_into(HX_DESIGN& target, Block* instance, HX_DESIGN* other, const HX_BLOCK* source,
                  uint8_t omit_props, uint8_t omit_maps, DARRAY_NAME* globals_out,
                  uint8_t check_only) {
    if (instance == nullptr || other == nullptr || other == &target || source == nullptr ||
        instance->get_design() != &target || !instance->isempty() || !pins_match(instance, source))
        return nullptr;
    if (check_only) return instance;
    HX_GRAFT graft(target, *other, !omit_props);
    graft.run(source, instance, !omit_maps, globals_out);
    return instance;
}

}  // namespace

HX_LOGBLOCK* HX_DESIGN::graft(HX_LOGBLOCK* instance, HX_DESIGN* other, uint8_t omit_props,
                              uint8_t omit_maps, DARRAY_NAME* globals_out, uint8_t check_only) {
    return graft_into(*this, instance, other, other ? other->log_root_ : nullptr, omit_props,
                      omit_maps, globals_out, check_only);
}

HX_PHYSBLOCK* HX_DESIGN::graft(HX_PHYSBLOCK* instance, HX_DESIGN* other, uint8_t omit_props,
                               uint8_t omit_maps, DARRAY_NAME* globals_out, uint8_t check_only) {
    return graft_into(*this, instance, other, other ? other->phys_root_ : nullptr, omit_props,
                      omit_maps, globals_out, check_only);
}
