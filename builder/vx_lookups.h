// Keyed lookups of the builder: blocks by the hierarchical name the writer
// gives them, networks by name. Each answers exactly what a walk of the
// design in its own order would answer (the first match), without the walk.
//
// Both index one design at a time and are made on the first lookup in it.
// They hold positions in the design's orders, never pointers, and confirm
// every candidate against the design as it is now, so a stale entry can cost
// a comparison but never give a wrong answer.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

class HX_BLOCK;
class HX_DESIGN;
class HX_NETWORK;

/// Hash of a name as the lookup tables key it.
uint32_t vx_name_hash(std::string_view name);

/// Open-addressing multiset of (name hash, position) pairs.
///
/// Entry layout, 8 bytes: hash u32 | position u32 (UINT32_MAX: empty).
/// Linear probing, at most half full; entries are never removed.
class VX_NAME_TABLE {
  public:
    void clear();
    /// Room for `more` entries beyond those held, without growing between.
    void reserve(std::size_t more);
    void insert(uint32_t hash, uint32_t position);
    /// Calls visit(position) for every entry of that hash.
    template <class Visit>
    void for_each(uint32_t hash, Visit visit) const {
        if (entries_.empty()) return;
        const std::size_t mask = entries_.size() - 1;
        for (std::size_t i = hash & mask; entries_[i].position != kEmpty; i = (i + 1) & mask) {
            if (entries_[i].hash == hash) visit(entries_[i].position);
        }
    }

  private:
    static constexpr uint32_t kEmpty = UINT32_MAX;
    struct Entry {
        uint32_t hash;
        uint32_t position;
    };
    void rehash(std::size_t capacity);

    std::vector<Entry> entries_;
    std::size_t used_ = 0;
};

/// Blocks of one design by written hierarchical name: the plain hierarchical
/// name, with ".TRANSPARENT" appended for a block carrying TRANSPARENT.
/// Blocks made since the last lookup are added at the next one; a block's
/// name and properties must not change once a lookup has seen it (the reader
/// names blocks only in their own statement).
class VX_BLOCK_INDEX {
  public:
    /// The first block of `design`, in creation order, of the kind that
    /// `physical` says, answering to `name`; null when there is none.
    HX_BLOCK* find(HX_DESIGN* design, const char* name, bool physical);

  private:
    void catch_up(HX_DESIGN* design);

    HX_DESIGN* design_ = nullptr;
    std::size_t indexed_ = 0;
    VX_NAME_TABLE table_;
};

/// Networks of one design by name (HX_NETWORK::get_name). Networks made
/// since the last lookup are added at the next one. Anything that may rename
/// networks already seen must call invalidate() (the whole index is made
/// again at the next lookup) or renamed() for the one network concerned.
class VX_NET_INDEX {
  public:
    using Accept = bool (*)(const HX_NETWORK* net, int32_t kind);
    /// The first network of `design`, in network order, called `name` that
    /// accept(net, kind) takes; null when there is none.
    HX_NETWORK* find(HX_DESIGN* design, const char* name, Accept accept, int32_t kind);
    void invalidate() { stale_ = true; }
    void renamed(const HX_DESIGN* design, const HX_NETWORK* net);

  private:
    void catch_up(HX_DESIGN* design);
    void add(const HX_NETWORK* net);

    HX_DESIGN* design_ = nullptr;
    std::size_t indexed_ = 0;
    bool stale_ = true;
    VX_NAME_TABLE table_;
};
