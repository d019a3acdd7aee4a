// A set of entries found by a text key. Entries are non-owning pointers; the
// key is whatever the compare function matches against an entry (for the
// converter's signal caches, the signal's name).
//
// Storage: one open-addressing table of {hash, entry} slots (linear probing,
// at most 70% full, backward-shift removal). The key text itself is not kept:
// a lookup compares the key's hash with the slot's, then asks comp_func of the
// entry. So lookups allocate nothing and an entry costs 16 bytes of table.
// The table grows by half (a doubling would leave it up to two thirds empty)
// and takes any size, a slot's home being the hash scaled to the size.
// Large tables are mapped (on huge pages from 2 MiB), sized to whole pages.
//
// add(key) gives the slot for key: the held entry, or an empty slot to fill.
// An empty slot left unfilled counts as absent and is reused. A slot reference
// stays valid until the next add or s_add.
#pragma once

#include <sys/mman.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <new>
#include <string_view>

template <class T>
class UT_BTR_TREE {
  public:
    using compare_fn = int (*)(const T* entry, const char* key);
    using delete_fn = void (*)(T* entry);

    /// compare returns 0 when the entry answers to the key; release, when given,
    /// is what flush(true) does with each entry.
    explicit UT_BTR_TREE(compare_fn compare, delete_fn release = nullptr)
        : compare_(compare), release_(release) {}
    virtual ~UT_BTR_TREE() { release_table(slots_, size_); }
    UT_BTR_TREE(const UT_BTR_TREE& other)
        : compare_(other.compare_), release_(other.release_), used_(other.used_) {
        if (other.size_ == 0) return;
        size_ = other.size_;
        slots_ = make_table(size_);
        std::memcpy(static_cast<void*>(slots_), other.slots_, size_ * sizeof(Slot));
    }
    UT_BTR_TREE& operator=(const UT_BTR_TREE& other) {
        if (this != &other) {
            UT_BTR_TREE copy(other);
            std::swap(compare_, copy.compare_);
            std::swap(release_, copy.release_);
            std::swap(slots_, copy.slots_);
            std::swap(size_, copy.size_);
            std::swap(used_, copy.used_);
        }
        return *this;
    }

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
        if (size_ == 0) return nullptr;
        const std::uint64_t hash = hash_key(key);
        for (std::size_t i = home(hash); slots_[i].hash != 0; i = next(i)) {
            if (matches(slots_[i], key, hash)) return slots_[i].entry;
        }
        return nullptr;
    }

    /// Takes the entry under key out of the tree and returns it (null when absent).
    T* s_remove(const char* key) {
        if (size_ == 0) return nullptr;
        const std::uint64_t hash = hash_key(key);
        for (std::size_t i = home(hash); slots_[i].hash != 0; i = next(i)) {
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
            for (std::size_t i = 0; i < size_; ++i) {
                if (slots_[i].entry != nullptr) del_func(slots_[i].entry);
            }
        }
        release_table(slots_, size_);
        slots_ = nullptr;
        size_ = 0;
        used_ = 0;
    }

    /// Number of filled entries.
    std::size_t count() const {
        std::size_t n = 0;
        for (std::size_t i = 0; i < size_; ++i)
            n += slots_[i].entry != nullptr;
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

    static constexpr std::size_t kMapped = std::size_t{64} << 10;
    static constexpr std::size_t kHugePage = std::size_t{2} << 20;

    // The hash's low half scaled to the table size (the high half carries
    // the set top bit): any size will do.
    std::size_t home(std::uint64_t hash) const {
        return static_cast<std::size_t>((hash & 0xFFFFFFFFu) * size_ >> 32);
    }
    std::size_t next(std::size_t i) const { return i + 1 == size_ ? 0 : i + 1; }
    // How far slot `j` lies behind slot `i` on the probe path.
    std::size_t behind(std::size_t i, std::size_t j) const {
        return j >= i ? j - i : j + size_ - i;
    }

    bool matches(const Slot& slot, const char* key, std::uint64_t hash) const {
        return slot.hash == hash && slot.entry != nullptr && comp_func(slot.entry, key) == 0;
    }

    // Index of key's filled slot, else of the slot where key goes: an unfilled
    // slot of the same hash on its probe path, or the free slot ending the path.
    std::size_t locate(const char* key, std::uint64_t hash) const {
        std::size_t reusable = size_;
        std::size_t i = home(hash);
        for (; slots_[i].hash != 0; i = next(i)) {
            if (matches(slots_[i], key, hash)) return i;
            if (slots_[i].hash == hash && slots_[i].entry == nullptr && reusable == size_)
                reusable = i;
        }
        return reusable != size_ ? reusable : i;
    }

    // Slots that fill the memory a table of at least `want` slots takes.
    static std::size_t table_size(std::size_t want) {
        std::size_t bytes = want * sizeof(Slot);
        const std::size_t unit = bytes >= kHugePage ? kHugePage : 4096;
        bytes = (bytes + unit - 1) / unit * unit;
        return bytes / sizeof(Slot);
    }

    // Zeroed memory for `size` slots. Tables from 64 KiB on are mapped, so
    // that an outgrown one goes back to the system rather than leave a hole
    // in the heap; from 2 MiB on on huge pages, which spares a fault per
    // small page as the table fills.
    static Slot* make_table(std::size_t size) {
        const std::size_t bytes = size * sizeof(Slot);
        if (bytes < kMapped) {
            void* memory = std::calloc(size, sizeof(Slot));
            if (memory == nullptr) throw std::bad_alloc();
            return static_cast<Slot*>(memory);
        }
        const std::size_t align = bytes >= kHugePage ? kHugePage : 4096;
        void* base = mmap(nullptr, bytes + align - 4096, PROT_READ | PROT_WRITE,
                          MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
        if (base == MAP_FAILED) throw std::bad_alloc();
        const auto raw = reinterpret_cast<std::uintptr_t>(base);
        const std::uintptr_t start = (raw + align - 1) & ~(std::uintptr_t{align} - 1);
        if (start != raw) munmap(base, start - raw);
        const std::uintptr_t tail = raw + align - 4096 - start;
        if (tail != 0) munmap(reinterpret_cast<void*>(start + bytes), tail);
#ifdef MADV_HUGEPAGE
        if (align == kHugePage) madvise(reinterpret_cast<void*>(start), bytes, MADV_HUGEPAGE);
#endif
        return reinterpret_cast<Slot*>(start);
    }

    static void release_table(Slot* table, std::size_t size) {
        if (table == nullptr) return;
        if (size * sizeof(Slot) < kMapped) {
            std::free(table);
        } else {
            munmap(table, size * sizeof(Slot));
        }
    }

    void grow_if_needed() {
        if (size_ != 0 && (used_ + 1) * 10 <= size_ * 7) return;
        Slot* old = slots_;
        const std::size_t old_size = size_;
        size_ = table_size(old_size == 0 ? 16 : old_size + old_size / 2);
        slots_ = make_table(size_);
        used_ = 0;
        for (std::size_t k = 0; k < old_size; ++k) {
            const Slot& slot = old[k];
            if (slot.entry == nullptr) continue;  // unfilled slots are dropped
            std::size_t i = home(slot.hash);
            while (slots_[i].hash != 0)
                i = next(i);
            slots_[i] = slot;
            ++used_;
        }
        release_table(old, old_size);
    }

    // Backward-shift removal keeps every probe path free of holes.
    void erase_at(std::size_t hole) {
        for (std::size_t j = next(hole); slots_[j].hash != 0; j = next(j)) {
            if (behind(home(slots_[j].hash), j) >= behind(hole, j)) {
                slots_[hole] = slots_[j];
                hole = j;
            }
        }
        slots_[hole] = Slot{};
        --used_;
    }

    compare_fn compare_;
    delete_fn release_;
    Slot* slots_ = nullptr;
    std::size_t size_ = 0;
    std::size_t used_ = 0;  // slots with a hash, filled or not
};
