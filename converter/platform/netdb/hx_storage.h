// Storage behind a design: arenas that never move what they hand out, a
// text arena for names, and the hashed tables that the design's lookups use.
// Private to the database.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string_view>
#include <unordered_map>
#include <vector>

class HX_BLOCK;
class HX_NETWORK;

/// Bump allocator over chunks that grow from 4 KiB to 4 MiB. Nothing is
/// freed before the arena itself; the owner runs destructors. Large chunks
/// are aligned for huge pages and offered to the system as such, which
/// spares a large design hundreds of thousands of page faults.
class HX_ARENA {
  public:
    HX_ARENA() = default;
    ~HX_ARENA();
    HX_ARENA(const HX_ARENA&) = delete;
    HX_ARENA& operator=(const HX_ARENA&) = delete;

    void* alloc(std::size_t size, std::size_t align);
    std::size_t bytes_reserved() const { return reserved_; }

  private:
    void grow(std::size_t at_least);

    std::vector<std::byte*> chunks_;
    std::byte* cur_ = nullptr;
    std::size_t left_ = 0;
    std::size_t next_chunk_ = 4096;
    std::size_t reserved_ = 0;
};

/// Open-addressing table of networks keyed by tag (linear probing,
/// backward-shift removal): 8 bytes a slot, at most half full.
class HX_TAG_TABLE {
  public:
    HX_NETWORK* find(uint32_t tag) const;
    /// False when the tag is taken.
    bool insert(HX_NETWORK* net);
    void erase(uint32_t tag);
    std::size_t size() const { return used_; }
    /// The largest tag ever inserted.
    uint32_t max_tag() const { return max_tag_; }

  private:
    std::size_t home(uint32_t tag) const;
    void rehash(std::size_t capacity);

    std::vector<HX_NETWORK*> slots_;
    std::size_t used_ = 0;
    uint32_t max_tag_ = 0;
};

/// Index of a block's pin names, kept for blocks with many pins and dropped
/// when one of their pins is renamed.
using HX_PIN_NAME_INDEX = std::unordered_map<std::string_view, uint16_t>;

struct HX_DESIGN_STORAGE {
    HX_ARENA objects;
    HX_ARENA text;
    HX_TAG_TABLE tags;
    std::unordered_map<const HX_BLOCK*, HX_PIN_NAME_INDEX> pin_names;
};
