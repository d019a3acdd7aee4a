// Storage behind a design: arenas that never move what they hand out, a
// text arena for names, and the hashed tables that the design's lookups use.
// Private to the database.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

#include "ut_lazy_map.h"

class HX_BLOCK;
class HX_NETWORK;

/// Bump allocator over chunks that grow from 64 bytes to 4 MiB. Nothing is
/// freed before the arena itself; the owner runs destructors. Page faults
/// are dear: chunks of 64 KiB and more are mapped and their pages faulted in
/// a window at a time, and once the arena holds 2 MiB its chunks go on huge
/// pages. Small designs so never fault in a mostly empty huge page, while a
/// large one is spared hundreds of thousands of faults.
class HX_ARENA {
  public:
    HX_ARENA() = default;
    ~HX_ARENA();
    HX_ARENA(const HX_ARENA&) = delete;
    HX_ARENA& operator=(const HX_ARENA&) = delete;

    void* alloc(std::size_t size, std::size_t align);
    std::size_t bytes_reserved() const { return reserved_; }

  private:
    struct Chunk {
        Chunk* prev;
        std::size_t size;
        bool mapped;  // else from malloc
    };
    void make_room(std::size_t size, std::size_t align);
    void grow(std::size_t at_least);

    // Small first: a library may hold hundreds of thousands of designs of a
    // block or two, and each design has two arenas.
    static constexpr std::size_t kFirstChunk = 64;

    Chunk* last_ = nullptr;  // the chunks, newest first, each at its own start
    std::byte* cur_ = nullptr;
    std::size_t left_ = 0;  // up to the end of what is faulted in
    std::byte* chunk_end_ = nullptr;
    std::size_t next_chunk_ = kFirstChunk;
    std::size_t reserved_ = 0;
};

/// Networks by tag. Tags are handed out in rising order, so most sit in a
/// plain array indexed by tag, which also keeps neighbouring tags close in
/// memory. The array never grows beyond about four times the number of
/// networks; tags beyond it (from a file, say) go to an open-addressing table (linear
/// probing, backward-shift removal, at most half full). `Net` is anything
/// with get_tag(); the database uses HX_NETWORK.
template <class Net = HX_NETWORK>
class HX_TAG_TABLE {
  public:
    Net* find(uint32_t tag) const;
    /// False when the tag is taken.
    bool insert(Net* net);
    void erase(uint32_t tag);
    std::size_t size() const { return used_; }
    /// The largest tag ever inserted.
    uint32_t max_tag() const { return max_tag_; }

  private:
    bool grow_dense(uint32_t tag);
    Net* find_sparse(uint32_t tag) const;
    bool insert_sparse(Net* net);
    void erase_sparse(uint32_t tag);
    std::size_t home(uint32_t tag) const;
    void rehash(std::size_t capacity);

    std::vector<Net*> dense_;
    std::vector<Net*> slots_;
    std::size_t used_ = 0;         // networks in both parts
    std::size_t sparse_used_ = 0;  // networks in the open-addressing part
    uint32_t max_tag_ = 0;
};

template <class Net>
Net* HX_TAG_TABLE<Net>::find(uint32_t tag) const {
    if (tag < dense_.size()) return dense_[tag];
    return sparse_used_ > 0 ? find_sparse(tag) : nullptr;
}

template <class Net>
bool HX_TAG_TABLE<Net>::insert(Net* net) {
    const uint32_t tag = net->get_tag();
    if (tag >= dense_.size() && !grow_dense(tag)) {
        if (!insert_sparse(net)) return false;
    } else {
        if (dense_[tag] != nullptr) return false;
        dense_[tag] = net;
    }
    ++used_;
    max_tag_ = std::max(max_tag_, tag);
    return true;
}

template <class Net>
void HX_TAG_TABLE<Net>::erase(uint32_t tag) {
    if (tag < dense_.size()) {
        if (dense_[tag] == nullptr) return;
        dense_[tag] = nullptr;
        --used_;
    } else if (sparse_used_ > 0 && find_sparse(tag) != nullptr) {
        erase_sparse(tag);
        --used_;
    }
}

// Makes the array reach `tag` when the tag lies within about twice the
// number of networks; moves the networks it now covers out of the table.
// The array at least doubles (up to twice that bound), so that tags which
// run just ahead of the bound, as when joins keep the count low, do not
// resize it at every insertion.
template <class Net>
bool HX_TAG_TABLE<Net>::grow_dense(uint32_t tag) {
    const std::size_t limit = 2 * (used_ + 1) + 4096;
    if (tag >= limit) return false;
    const std::size_t size =
        std::min(2 * limit, std::max<std::size_t>(tag + std::size_t{1}, dense_.size() * 2));
    dense_.resize(size, nullptr);
    if (sparse_used_ == 0) return true;
    std::vector<Net*> covered;
    for (Net* net : slots_) {
        if (net != nullptr && net->get_tag() < size) covered.push_back(net);
    }
    for (Net* net : covered) {
        erase_sparse(net->get_tag());
        dense_[net->get_tag()] = net;
    }
    return true;
}

template <class Net>
std::size_t HX_TAG_TABLE<Net>::home(uint32_t tag) const {
    return (static_cast<uint64_t>(tag) * 0x9E3779B97F4A7C15ull >> 20) & (slots_.size() - 1);
}

template <class Net>
Net* HX_TAG_TABLE<Net>::find_sparse(uint32_t tag) const {
    if (slots_.empty()) return nullptr;
    for (std::size_t i = home(tag);; i = (i + 1) & (slots_.size() - 1)) {
        Net* net = slots_[i];
        if (net == nullptr || net->get_tag() == tag) return net;
    }
}

template <class Net>
bool HX_TAG_TABLE<Net>::insert_sparse(Net* net) {
    if ((sparse_used_ + 1) * 2 > slots_.size())
        rehash(std::max<std::size_t>(16, slots_.size() * 2));
    for (std::size_t i = home(net->get_tag());; i = (i + 1) & (slots_.size() - 1)) {
        if (slots_[i] == nullptr) {
            slots_[i] = net;
            ++sparse_used_;
            return true;
        }
        if (slots_[i]->get_tag() == net->get_tag()) return false;
    }
}

template <class Net>
void HX_TAG_TABLE<Net>::erase_sparse(uint32_t tag) {
    std::size_t mask = slots_.size() - 1;
    std::size_t i = home(tag);
    while (slots_[i] != nullptr && slots_[i]->get_tag() != tag)
        i = (i + 1) & mask;
    if (slots_[i] == nullptr) return;
    slots_[i] = nullptr;
    --sparse_used_;
    // Shift back the entries of the run behind the hole that may no longer
    // be reachable from their home slot.
    for (std::size_t j = (i + 1) & mask; slots_[j] != nullptr; j = (j + 1) & mask) {
        std::size_t h = home(slots_[j]->get_tag());
        if (((j - h) & mask) >= ((j - i) & mask)) {
            slots_[i] = slots_[j];
            slots_[j] = nullptr;
            i = j;
        }
    }
}

template <class Net>
void HX_TAG_TABLE<Net>::rehash(std::size_t capacity) {
    std::vector<Net*> old(capacity, nullptr);
    old.swap(slots_);
    sparse_used_ = 0;
    for (Net* net : old) {
        if (net != nullptr) insert_sparse(net);
    }
}

/// Index of a block's pin names, kept for blocks with many pins and dropped
/// when one of their pins is renamed.
using HX_PIN_NAME_INDEX = std::unordered_map<std::string_view, uint16_t>;

struct HX_DESIGN_STORAGE {
    HX_ARENA objects;
    // Names of blocks and pins. A graft lets the copies share the source's
    // names, so the target holds on to the source's text (and to what that
    // shares in turn): names never change in place, only get replaced.
    std::shared_ptr<HX_ARENA> text = std::make_shared<HX_ARENA>();
    std::vector<std::shared_ptr<HX_ARENA>> shared_text;
    HX_TAG_TABLE<> tags;
    UT_LAZY_MAP<const HX_BLOCK*, HX_PIN_NAME_INDEX> pin_names;
    void* spare_networks = nullptr;  // dropped networks' memory, chained through it
    // Each join's dropped tag and the tag that took it over, in join order,
    // and an index of the first `joined_indexed` of them, made when asked.
    std::vector<std::pair<uint32_t, uint32_t>> joined_tags;
    UT_LAZY_MAP<uint32_t, uint32_t> joined_index;
    std::size_t joined_indexed = 0;
};
