#include "vx_lookups.h"

#include <cstring>
#include <functional>
#include <string>

#include "hx_design.h"

uint32_t vx_name_hash(std::string_view name) {
    const std::size_t h = std::hash<std::string_view>{}(name);
    return static_cast<uint32_t>(h ^ (static_cast<uint64_t>(h) >> 32));
}

// --- VX_NAME_TABLE -------------------------------------------------------------

void VX_NAME_TABLE::clear() {
    std::vector<Entry>().swap(entries_);
    used_ = 0;
}

void VX_NAME_TABLE::insert(uint32_t hash, uint32_t position) {
    if ((used_ + 1) * 2 > entries_.size()) grow();
    const std::size_t mask = entries_.size() - 1;
    std::size_t i = hash & mask;
    while (entries_[i].position != kEmpty)
        i = (i + 1) & mask;
    entries_[i] = {hash, position};
    ++used_;
}

// Entries of one hash keep their relative order when moved, so visits stay
// in insertion order.
void VX_NAME_TABLE::grow() {
    std::vector<Entry> old;
    old.swap(entries_);
    entries_.assign(old.empty() ? 64 : old.size() * 2, Entry{0, kEmpty});
    used_ = 0;
    for (const Entry& entry : old) {
        if (entry.position != kEmpty) insert(entry.hash, entry.position);
    }
}

// --- VX_BLOCK_INDEX ------------------------------------------------------------

namespace {

// The block's hierarchical name as written, into `out`.
void written_name(const HX_BLOCK* block, std::string& out) {
    out = block->get_hiername();
    if (block->find_prop("TRANSPARENT") != nullptr) out += ".TRANSPARENT";
}

}  // namespace

void VX_BLOCK_INDEX::catch_up(HX_DESIGN* design) {
    if (design != design_) {
        design_ = design;
        indexed_ = 0;
        table_.clear();
    }
    std::string name;
    for (; indexed_ < design->block_count(); ++indexed_) {
        written_name(design->block_at(indexed_), name);
        table_.insert(vx_name_hash(name), static_cast<uint32_t>(indexed_));
    }
}

HX_BLOCK* VX_BLOCK_INDEX::find(HX_DESIGN* design, const char* name, bool physical) {
    if (design == nullptr || name == nullptr) return nullptr;
    catch_up(design);
    HX_BLOCK* found = nullptr;
    uint32_t found_at = UINT32_MAX;
    std::string candidate;
    table_.for_each(vx_name_hash(name), [&](uint32_t position) {
        if (position >= found_at) return;
        HX_BLOCK* block = design->block_at(position);
        if (block == nullptr || block->is_physical() != physical) return;
        written_name(block, candidate);
        if (candidate != name) return;
        found = block;
        found_at = position;
    });
    return found;
}

// --- VX_NET_INDEX --------------------------------------------------------------

void VX_NET_INDEX::add(const HX_NETWORK* net) {
    const char* name = net->get_name();
    if (name != nullptr) table_.insert(vx_name_hash(name), net->get_slot());
}

void VX_NET_INDEX::catch_up(HX_DESIGN* design) {
    if (design != design_ || stale_) {
        design_ = design;
        indexed_ = 0;
        stale_ = false;
        table_.clear();
    }
    for (; indexed_ < design->network_slots(); ++indexed_) {
        if (const HX_NETWORK* net = design->network_at(indexed_)) add(net);
    }
}

void VX_NET_INDEX::renamed(const HX_DESIGN* design, const HX_NETWORK* net) {
    // A network not yet seen is added, under its name of then, by catch_up.
    if (net != nullptr && design == design_ && !stale_ && net->get_slot() < indexed_) add(net);
}

HX_NETWORK* VX_NET_INDEX::find(HX_DESIGN* design, const char* name, Accept accept, int32_t kind) {
    if (design == nullptr || name == nullptr) return nullptr;
    catch_up(design);
    HX_NETWORK* found = nullptr;
    uint32_t found_at = UINT32_MAX;
    table_.for_each(vx_name_hash(name), [&](uint32_t slot) {
        if (slot >= found_at) return;
        HX_NETWORK* net = design->network_at(slot);
        if (net == nullptr) return;
        const char* current = net->get_name();
        if (current == nullptr || std::strcmp(current, name) != 0 || !accept(net, kind)) return;
        found = net;
        found_at = slot;
    });
    return found;
}
