// A set of entries found by a text key. Entries are non-owning pointers; the
// key is whatever the compare function matches against an entry (for the
// converter's signal caches, the signal's name).
//
// Storage: one open-addressing table of {hash, entry} slots (linear probing,
// at most 70% full, backward-shift removal). The key text itself is not kept:
// a lookup compares the key's hash with the slot's, then asks comp_func of the
// entry. So lookups allocate nothing and an entry costs 16 bytes of table.
//
// add(key) gives the slot for key: the held entry, or an empty slot to fill.
// An empty slot left unfilled counts as absent and is reused. A slot reference
// stays valid until the next add or s_add.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string_view>
#include <vector>

template <class T>
class UT_BTR_TREE {
  public:
    using compare_fn = int (*)(const T* entry, const char* key);
    using delete_fn = void (*)(T* entry);

    /// compare returns 0 when the entry answers to the key; release, when given,
    /// is what flush(true) does with each entry.
    explicit UT_BTR_TREE(compare_fn compare, delete_fn release = nullptr)
        : compare_(compare), release_(release) {}
    virtual ~UT_BTR_TREE() = default;
    UT_BTR_TREE(const UT_BTR_TREE&) = default;
    UT_BTR_TREE& operator=(const UT_BTR_TREE&) = default;

    /// The slot for key: holds the entry when present, else an empty slot.
    T*& add(const char* key) {
        grow_if_needed();
        const std::uint64_t hash = hash_key(key);
        std::size_t free_slot = locate(key, hash);
        Slot& slot = slots_[free_slot];
        if (slot.hash == 0) {
            slot.hash = hash;
            ++used_;
        }
        return slot.entry;
    }

    /// Stores entry under key; false (nothing stored) when key is already held.
    bool s_add(const char* key, T* entry) {
        T*& slot = add(key);
        if (slot != nullptr) return false;
        slot = entry;
        return true;
    }

    /// The entry under key, or null.
    T* s_find(const char* key) const {
        if (slots_.empty()) return nullptr;
        const std::uint64_t hash = hash_key(key);
        for (std::size_t i = hash & mask(); slots_[i].hash != 0; i = (i + 1) & mask()) {
            if (matches(slots_[i], key, hash)) return slots_[i].entry;
        }
        return nullptr;
    }

    /// Takes the entry under key out of the tree and returns it (null when absent).
    T* s_remove(const char* key) {
        if (slots_.empty()) return nullptr;
        const std::uint64_t hash = hash_key(key);
        for (std::size_t i = hash & mask(); slots_[i].hash != 0; i = (i + 1) & mask()) {
            if (matches(slots_[i], key, hash)) {
                T* entry = slots_[i].entry;
                erase_at(i);
                return entry;
            }
        }
        return nullptr;
    }

    /// Empties the tree and frees its table; with release set, del_func is called
    /// on each entry first.
    void flush(bool release) {
        if (release) {
            for (Slot& slot : slots_) {
                if (slot.entry != nullptr) del_func(slot.entry);
            }
        }
        std::vector<Slot>().swap(slots_);
        used_ = 0;
    }

    /// Number of filled entries.
    std::size_t count() const {
        std::size_t n = 0;
        for (const Slot& slot : slots_)
            n += slot.entry != nullptr;
        return n;
    }

  protected:
    virtual int comp_func(const T* entry, const char* key) const { return compare_(entry, key); }
    virtual void del_func(T* entry) {
        if (release_ != nullptr) release_(entry);
    }

  private:
    /// Layout: 8-byte hash (top bit always set; 0 marks a free slot), 8-byte entry.
    struct Slot {
        std::uint64_t hash = 0;
        T* entry = nullptr;
    };

    static std::uint64_t hash_key(const char* key) {
        const std::string_view text = key ? std::string_view(key) : std::string_view();
        return static_cast<std::uint64_t>(std::hash<std::string_view>{}(text)) | (1ULL << 63);
    }

    std::size_t mask() const { return slots_.size() - 1; }

    bool matches(const Slot& slot, const char* key, std::uint64_t hash) const {
        return slot.hash == hash && slot.entry != nullptr && comp_func(slot.entry, key) == 0;
    }

    // Index of key's filled slot, else of the slot where key goes: an unfilled
    // slot of the same hash on its probe path, or the free slot ending the path.
    std::size_t locate(const char* key, std::uint64_t hash) const {
        std::size_t reusable = slots_.size();
        std::size_t i = hash & mask();
        for (; slots_[i].hash != 0; i = (i + 1) & mask()) {
            if (matches(slots_[i], key, hash)) return i;
            if (slots_[i].hash == hash && slots_[i].entry == nullptr && reusable == slots_.size())
                reusable = i;
        }
        return reusable != slots_.size() ? reusable : i;
    }

    void grow_if_needed() {
        if (!slots_.empty() && (used_ + 1) * 10 <= slots_.size() * 7) return;
        std::vector<Slot> old;
        old.swap(slots_);
        slots_.resize(old.empty() ? 16 : old.size() * 2);
        used_ = 0;
        for (const Slot& slot : old) {
            if (slot.entry == nullptr) continue;  // unfilled slots are dropped
            std::size_t i = slot.hash & mask();
            while (slots_[i].hash != 0)
                i = (i + 1) & mask();
            slots_[i] = slot;
            ++used_;
        }
    }

    // Backward-shift removal keeps every probe path free of holes.
    void erase_at(std::size_t hole) {
        for (std::size_t j = (hole + 1) & mask(); slots_[j].hash != 0; j = (j + 1) & mask()) {
            const std::size_t home = slots_[j].hash & mask();
            if (((j - home) & mask()) >= ((j - hole) & mask())) {
                slots_[hole] = slots_[j];
                hole = j;
            }
        }
        slots_[hole] = Slot{};
        --used_;
    }

    compare_fn compare_;
    delete_fn release_;
    std::vector<Slot> slots_;
    std::size_t used_ = 0;  // slots with a hash, filled or not
};
