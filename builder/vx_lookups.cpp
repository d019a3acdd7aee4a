#include "vx_lookups.h"

#include <cstring>
#include <string>

#include "hx_design.h"
#include "vx_text.h"

namespace {

// FNV-1a, which can be fed a name piece by piece: the names indexed here are
// hierarchical, and hashing them from their pieces builds no strings.
struct NameHash {
    uint64_t state = 14695981039346656037ULL;
    void add(std::string_view piece) {
        for (const unsigned char c : piece) {
            state ^= c;
            state *= 1099511628211ULL;
        }
    }
    uint32_t value() const { return static_cast<uint32_t>(state ^ (state >> 32)); }
};

// Feeds the block's hierarchical name as HX_BLOCK::get_hiername gives it:
// the names from the root down joined by "/", nothing when the block's own
// name is absent or empty.
void add_hiername(NameHash& hash, const HX_BLOCK* block) {
    const char* own = block->get_name();
    if (own == nullptr || *own == '\0') return;
    constexpr int kDepth = 64;
    const HX_BLOCK* chain[kDepth];
    int depth = 0;
    const HX_BLOCK* b = block;
    for (; b != nullptr && depth < kDepth; b = b->get_parent())
        chain[depth++] = b;
    if (b != nullptr) {  // deeper than the chain holds: let the database compose it
        hash.add(block->get_hiername());
        return;
    }
    for (int i = depth - 1; i >= 0; --i) {
        hash.add(vx_text(chain[i]->get_name()));
        if (i > 0) hash.add("/");
    }
}

}  // namespace

uint32_t vx_name_hash(std::string_view name) {
    NameHash hash;
    hash.add(name);
    return hash.value();
}

// --- VX_NAME_TABLE -------------------------------------------------------------

void VX_NAME_TABLE::clear() {
    std::vector<Entry>().swap(entries_);
    used_ = 0;
}

void VX_NAME_TABLE::reserve(std::size_t more) {
    std::size_t capacity = entries_.empty() ? 64 : entries_.size();
    while ((used_ + more) * 2 > capacity)
        capacity *= 2;
    if (capacity != entries_.size()) rehash(capacity);
}

void VX_NAME_TABLE::insert(uint32_t hash, uint32_t position) {
    reserve(1);
    const std::size_t mask = entries_.size() - 1;
    std::size_t i = hash & mask;
    while (entries_[i].position != kEmpty)
        i = (i + 1) & mask;
    entries_[i] = {hash, position};
    ++used_;
}

// Entries of one hash keep their relative order when moved, so visits stay
// in insertion order.
void VX_NAME_TABLE::rehash(std::size_t capacity) {
    std::vector<Entry> old;
    old.swap(entries_);
    entries_.assign(capacity, Entry{0, kEmpty});
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

// The hash of the block's written name, without composing it.
uint32_t written_name_hash(const HX_BLOCK* block) {
    NameHash hash;
    add_hiername(hash, block);
    if (block->find_prop("TRANSPARENT") != nullptr) hash.add(".TRANSPARENT");
    return hash.value();
}

}  // namespace

void VX_BLOCK_INDEX::catch_up(HX_DESIGN* design) {
    if (design != design_) {
        design_ = design;
        indexed_ = 0;
        table_.clear();
    }
    table_.reserve(design->block_count() - indexed_);
    for (; indexed_ < design->block_count(); ++indexed_)
        table_.insert(written_name_hash(design->block_at(indexed_)),
                      static_cast<uint32_t>(indexed_));
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

// Keyed by the hash of HX_NETWORK::get_name: the highest signal's name,
// behind its block's hierarchical name and "/" unless the signal is global.
void VX_NET_INDEX::add(const HX_NETWORK* net) {
    const HX_SIGNAL* highest = net->get_highest_signal();
    if (highest == nullptr || highest->get_name() == nullptr) return;
    NameHash hash;
    if (!highest->is_global()) {
        add_hiername(hash, highest->get_block());
        hash.add("/");
    }
    hash.add(highest->get_name());
    table_.insert(hash.value(), net->get_slot());
}

void VX_NET_INDEX::catch_up(HX_DESIGN* design) {
    if (design != design_ || stale_) {
        design_ = design;
        indexed_ = 0;
        stale_ = false;
        table_.clear();
    }
    table_.reserve(design->network_slots() - indexed_);
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
