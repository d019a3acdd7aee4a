// Binary design and library files; the layout is described in hx_file.h.
#include "hx_file.h"

#include <sys/mman.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <new>
#include <unordered_map>
#include <vector>

#include "hx_design.h"
#include "hx_library.h"
#include "hx_prim_layout.h"
#include "hx_storage.h"
#include "port_file.h"
#include "port_msg.h"
#include "ut_ptrfile.h"

#if defined(__x86_64__) && (defined(__GNUC__) || defined(__clang__))
#include <nmmintrin.h>
#define HX_FILE_HW_CRC 1
#endif

namespace {

constexpr const char* kRevision = "$Revision: 1.0 $";
constexpr std::size_t kMagicSize = 8;
constexpr char kDesignMagic[kMagicSize + 1] = "\x89HXDSGN\n";
constexpr char kLibraryMagic[kMagicSize + 1] = "\x89HXLIBR\n";
constexpr std::size_t kChecksumEnd = 12;  // the checksum covers every byte from here on
constexpr uint32_t kAbsent = 0xFFFFFFFF;
// A global signal's connection to a pin's inner side has this bit in the
// block index; merging a block's signal into a global one puts it there.
constexpr uint32_t kInnerSide = 0x80000000;

// Record flags.
constexpr uint8_t kProps = 1;  // the object's properties are in the property section
constexpr uint8_t kNamed = 2;  // pins: a name follows

// Targets of object properties.
enum ObjectKind : uint8_t {
    kObjNone,
    kObjLibrary,
    kObjDesign,
    kObjBlock,
    kObjPin,
    kObjSignal,
    kObjNetwork,
    kObjMap,
};

// Smallest encoded sizes, for checking counts against the bytes left.
constexpr std::size_t kMinString = 4;
constexpr std::size_t kMinPin = 4;
constexpr std::size_t kMinBlock = 10 + kMinString;
constexpr std::size_t kMinSignal = 9 + kMinString;
constexpr std::size_t kMinConn = 6;
constexpr std::size_t kMinNetwork = 9;
constexpr std::size_t kMinMap = 11 + kMinString;
constexpr std::size_t kMinParents = 8;
constexpr std::size_t kMinDesign = kMinString + 25;
constexpr std::size_t kMinAlias = kMinString + 4;
constexpr std::size_t kMinProp = kMinString + 1;

// --- CRC-32C -------------------------------------------------------------------
// Hardware instructions where the processor has them (several GB/s), else
// slicing by 8 tables; both give the same values.

constexpr uint32_t kCrcPolynomial = 0x82F63B78;  // Castagnoli, reflected

struct CrcTables {
    uint32_t t[8][256];
};

constexpr CrcTables make_crc_tables() {
    CrcTables tables{};
    for (uint32_t i = 0; i < 256; ++i) {
        uint32_t crc = i;
        for (int bit = 0; bit < 8; ++bit)
            crc = (crc >> 1) ^ ((crc & 1) ? kCrcPolynomial : 0);
        tables.t[0][i] = crc;
    }
    for (int k = 1; k < 8; ++k) {
        for (uint32_t i = 0; i < 256; ++i) {
            const uint32_t prev = tables.t[k - 1][i];
            tables.t[k][i] = (prev >> 8) ^ tables.t[0][prev & 0xFF];
        }
    }
    return tables;
}

constexpr CrcTables kCrc = make_crc_tables();

uint32_t load_le32(const uint8_t* p) {
    return uint32_t{p[0]} | uint32_t{p[1]} << 8 | uint32_t{p[2]} << 16 | uint32_t{p[3]} << 24;
}

uint32_t crc_portable(uint32_t crc, const uint8_t* p, std::size_t n) {
    const auto& t = kCrc.t;
    for (; n >= 8; n -= 8, p += 8) {
        const uint32_t one = load_le32(p) ^ crc;
        const uint32_t two = load_le32(p + 4);
        crc = t[7][one & 0xFF] ^ t[6][(one >> 8) & 0xFF] ^ t[5][(one >> 16) & 0xFF] ^
              t[4][one >> 24] ^ t[3][two & 0xFF] ^ t[2][(two >> 8) & 0xFF] ^
              t[1][(two >> 16) & 0xFF] ^ t[0][two >> 24];
    }
    for (; n > 0; --n, ++p)
        crc = t[0][(crc ^ *p) & 0xFF] ^ (crc >> 8);
    return crc;
}

#ifdef HX_FILE_HW_CRC
__attribute__((target("sse4.2"))) uint32_t crc_hardware(uint32_t crc, const uint8_t* p,
                                                        std::size_t n) {
    uint64_t wide = crc;
    for (; n >= 8; n -= 8, p += 8) {
        uint64_t word;
        std::memcpy(&word, p, sizeof word);
        wide = _mm_crc32_u64(wide, word);
    }
    crc = static_cast<uint32_t>(wide);
    for (; n > 0; --n, ++p)
        crc = _mm_crc32_u8(crc, *p);
    return crc;
}

bool have_hardware_crc() {
    static const bool yes = __builtin_cpu_supports("sse4.2");
    return yes;
}
#endif

// --- large buffers ---------------------------------------------------------------
// Buffers that grow with the design go on huge pages where the system offers
// them: page faults and TLB misses are a large part of the cost otherwise.

constexpr std::size_t kHugePage = std::size_t{2} << 20;
constexpr std::size_t kLarge = kHugePage / 2;

void* big_alloc(std::size_t bytes) {
    if (bytes < kLarge) return ::operator new(bytes);
    const std::size_t rounded = (bytes + kHugePage - 1) / kHugePage * kHugePage;
    void* p = std::aligned_alloc(kHugePage, rounded);
    if (p == nullptr) throw std::bad_alloc();
#ifdef MADV_HUGEPAGE
    madvise(p, rounded, MADV_HUGEPAGE);
#endif
    return p;
}

void big_free(void* p, std::size_t bytes) {
    if (bytes < kLarge)
        ::operator delete(p);
    else
        std::free(p);
}

template <class T>
struct BigAlloc {
    using value_type = T;
    BigAlloc() = default;
    template <class U>
    BigAlloc(const BigAlloc<U>&) {}
    T* allocate(std::size_t n) { return static_cast<T*>(big_alloc(n * sizeof(T))); }
    void deallocate(T* p, std::size_t n) { big_free(p, n * sizeof(T)); }
    bool operator==(const BigAlloc&) const { return true; }
};

template <class T>
using BigVector = std::vector<T, BigAlloc<T>>;

/// A refusal to write what the file's 32-bit counts and positions cannot
/// hold; nothing is written then.
struct TooLarge {
    std::string what;
};

// --- little-endian output --------------------------------------------------------

/// The file's bytes in chunks that never move, so that a count can be
/// patched after its records and nothing is copied as the file grows.
class Output {
  public:
    Output() = default;
    Output(const Output&) = delete;
    Output& operator=(const Output&) = delete;
    ~Output() {
        for (const Chunk& chunk : chunks_)
            big_free(chunk.data, chunk.capacity);
    }

    void u8(uint8_t v) { put(v); }
    void u16(uint16_t v) { put(v); }
    void u32(uint32_t v) { put(v); }
    void u64(uint64_t v) { put(v); }
    void text(const char* s) {
        if (s == nullptr) {
            u32(kAbsent);
            return;
        }
        const std::size_t length = std::strlen(s);
        if (length >= kAbsent) throw TooLarge{"a name or text of 4 GiB or more"};
        char* p = room(length + 5);
        store(p, static_cast<uint32_t>(length));
        std::memcpy(p + 4, s, length + 1);
        at_ = p + length + 5;
    }
    /// Where the next byte goes, for patch_u32.
    char* mark() { return room(4); }
    std::size_t size() const { return closed_ + static_cast<std::size_t>(at_ - begin_); }
    /// Overwrites a u32 written at `where` (a count known only afterwards).
    static void patch_u32(char* where, uint32_t v) { store(where, v); }

    /// Calls `sink(data, size)` for each piece in order; false stops.
    template <class Sink>
    bool each_piece(Sink sink) {
        close_chunk();
        for (const Chunk& chunk : chunks_) {
            if (chunk.used > 0 && !sink(chunk.data, chunk.used)) return false;
        }
        return true;
    }

  private:
    static constexpr std::size_t kChunk = std::size_t{4} << 20;
    struct Chunk {
        char* data;
        std::size_t used;
        std::size_t capacity;
    };

    template <class T>
    static void store(char* p, T v) {
        for (std::size_t i = 0; i < sizeof(T); ++i)
            p[i] = static_cast<char>(v >> (8 * i));
    }
    template <class T>
    void put(T v) {
        char* p = room(sizeof(T));
        store(p, v);
        at_ = p + sizeof(T);
    }
    /// At least `n` contiguous bytes at the cursor.
    [[gnu::always_inline]] char* room(std::size_t n) {
        if (static_cast<std::size_t>(end_ - at_) < n) [[unlikely]]
            next_chunk(n);
        return at_;
    }
    /// Counts the bytes written since the last call as the current chunk's.
    void close_chunk() {
        if (chunks_.empty()) return;
        const auto added = static_cast<std::size_t>(at_ - begin_);
        chunks_.back().used += added;
        closed_ += added;
        begin_ = at_;
    }
    [[gnu::noinline]] void next_chunk(std::size_t n) {
        close_chunk();
        const std::size_t capacity = std::max(kChunk, (n + kHugePage - 1) / kHugePage * kHugePage);
        chunks_.reserve(chunks_.size() + 1);
        char* data = static_cast<char*>(big_alloc(capacity));
        chunks_.push_back(Chunk{data, 0, capacity});
        begin_ = at_ = data;
        end_ = data + capacity;
    }

    std::vector<Chunk> chunks_;
    char* begin_ = nullptr;  // bytes before this are counted in closed_
    char* at_ = nullptr;
    char* end_ = nullptr;
    std::size_t closed_ = 0;  // bytes in earlier chunks
};

/// Open-addressing map from object addresses to their positions in the file,
/// sized once: the encoder numbers every block of a design this way.
class AddressIndex {
  public:
    explicit AddressIndex(std::size_t count) {
        std::size_t capacity = 16;
        int bits = 4;
        while (capacity < count * 2) {
            capacity *= 2;
            ++bits;
        }
        slots_.assign(capacity, Slot{nullptr, 0});
        shift_ = 64 - bits;
    }
    void add(const void* key, uint32_t value) {
        std::size_t i = home(key);
        while (slots_[i].key != nullptr)
            i = (i + 1) & (slots_.size() - 1);
        slots_[i] = Slot{key, value};
    }
    /// Asks for the key's home slot ahead of an add or find. (The slots sit
    /// on huge pages: a prefetch that misses the TLB may be dropped.)
    void warm(const void* key) const { __builtin_prefetch(&slots_[home(key)]); }
    uint32_t find(const void* key) const {
        for (std::size_t i = home(key);; i = (i + 1) & (slots_.size() - 1)) {
            if (slots_[i].key == key) return slots_[i].value;
            if (slots_[i].key == nullptr) return kAbsent;
        }
    }

  private:
    struct Slot {
        const void* key;
        uint32_t value;
    };
    std::size_t home(const void* key) const {
        return static_cast<std::size_t>(reinterpret_cast<uintptr_t>(key) * 0x9E3779B97F4A7C15ull >>
                                        shift_);
    }
    BigVector<Slot> slots_;
    int shift_ = 60;
};

/// Where an object property's target sits in the file.
struct ObjectRef {
    uint8_t kind = kObjNone;
    uint32_t design = 0;
    uint32_t index = 0;
    uint16_t pin = 0;
};

/// A refusal of the file's content.
struct Corrupt {
    const char* what;
};

[[noreturn]] void corrupt(const char* what) {
    throw Corrupt{what};
}

template <class T>
void store_le(char* p, T v) {
    for (std::size_t i = 0; i < sizeof(T); ++i)
        p[i] = static_cast<char>(v >> (8 * i));
}

// --- progress --------------------------------------------------------------------

struct ProgressHook {
    HX_FILE_PROGRESS_FN fn = nullptr;
    void* context = nullptr;

    void report(uint64_t done, uint64_t total) const {
        if (fn != nullptr) fn(context, done, total);
    }
};

ProgressHook progress_hook;

// Records decoded between two progress reports: a few milliseconds' work.
constexpr uint32_t kRecordsPerReport = 65536;

}  // namespace

void HX_FILE_IO::set_progress(HX_FILE_PROGRESS_FN fn, void* context) {
    progress_hook = ProgressHook{fn, context};
}

uint32_t HX_FILE_IO::checksum(const void* data, std::size_t size, uint32_t crc) {
    const auto* p = static_cast<const uint8_t*>(data);
#ifdef HX_FILE_HW_CRC
    if (have_hardware_crc()) return ~crc_hardware(~crc, p, size);
#endif
    return ~crc_portable(~crc, p, size);
}

uint32_t HX_FILE_IO::checksum_portable(const void* data, std::size_t size, uint32_t crc) {
    return ~crc_portable(~crc, static_cast<const uint8_t*>(data), size);
}

// --- writing ---------------------------------------------------------------------

/// The connections of a run of signals, as block positions and pin indexes.
/// Connections are small nodes spread over the design's memory, and walking
/// one ring after the other waits for each node in turn. The run's rings are
/// walked side by side instead, one node of each per round, so that their
/// loads overlap; the pins are then resolved in sweeps of independent loads.
class HX_FILE_IO::ConnBatch {
  public:
    static constexpr std::size_t kSignals = 512;

    void gather(const HX_SIGNAL* const* signals, std::size_t n) {
        walk_rings(signals, n);
        place(n);
        inner_sides(signals, n);
    }

    /// Blocks to their positions, with kInnerSide where it applies.
    void resolve(const AddressIndex& blocks) {
        constexpr std::size_t kAhead = 16;
        const std::size_t n = blocks_.size();
        for (std::size_t j = 0; j < n; ++j) {
            if (j + kAhead < n) blocks.warm(blocks_[j + kAhead]);
            where_[j] |= blocks.find(blocks_[j]);
        }
    }

    std::size_t begin(std::size_t signal) const { return starts_[signal]; }
    std::size_t end(std::size_t signal) const { return starts_[signal + 1]; }
    uint32_t where(std::size_t j) const { return where_[j]; }
    uint16_t pin(std::size_t j) const { return pins_[j]; }

  private:
    struct Walk {
        const HX_CONN* at;
        const HX_CONN* last;
        uint32_t signal;
    };

    /// The pins in rounds: the i-th connection of every ring in round i.
    void walk_rings(const HX_SIGNAL* const* signals, std::size_t n) {
        Walk walks[kSignals];
        std::size_t active = 0;
        for (std::size_t i = 0; i < n; ++i) {
            counts_[i] = 0;
            const HX_CONN* last = signals[i]->last_conn_;
            if (last != nullptr) walks[active++] = Walk{last, last, static_cast<uint32_t>(i)};
        }
        found_.clear();
        while (active > 0) {
            std::size_t kept = 0;
            for (std::size_t k = 0; k < active; ++k) {
                const Walk w = walks[k];
                const HX_CONN* conn = w.at->next_;
                __builtin_prefetch(conn->pin_);
                found_.push_back(Found{conn->pin_, w.signal});
                ++counts_[w.signal];
                if (conn != w.last) walks[kept++] = Walk{conn, w.last, w.signal};
            }
            active = kept;
        }
    }

    /// Sorts the pins by signal, keeping each ring's order; each pin to its
    /// block and index.
    void place(std::size_t n) {
        starts_[0] = 0;
        for (std::size_t i = 0; i < n; ++i)
            starts_[i + 1] = starts_[i] + counts_[i];
        for (std::size_t i = 0; i < n; ++i)
            counts_[i] = starts_[i];
        const std::size_t total = found_.size();
        sorted_.resize(total);
        for (const Found& f : found_)
            sorted_[counts_[f.signal]++] = f.pin;
        blocks_.resize(total);
        pins_.resize(total);
        where_.assign(total, 0);
        constexpr std::size_t kAhead = 8;
        for (std::size_t j = 0; j < total; ++j) {
            if (j + kAhead < total) {
                const HX_PIN* ahead = sorted_[j + kAhead];
                __builtin_prefetch(reinterpret_cast<const char*>(ahead - ahead->index_) -
                                   sizeof(HX_BLOCK*));
            }
            pins_[j] = sorted_[j]->index_;
            blocks_[j] = sorted_[j]->get_block();
        }
    }

    /// A global signal may sit on either side of a pin, or on both, in
    /// which case its two connections to the pin are alike; the second is
    /// taken as the inner one.
    void inner_sides(const HX_SIGNAL* const* signals, std::size_t n) {
        for (std::size_t i = 0; i < n; ++i) {
            const HX_SIGNAL* signal = signals[i];
            if (!signal->is_global()) continue;
            both_sides_.clear();
            for (std::size_t j = starts_[i]; j < starts_[i + 1]; ++j) {
                const HX_PIN* pin = sorted_[j];
                bool inner = pin->inner_ == signal;
                if (inner && pin->outer_ == signal) inner = seen_both(pin);
                if (inner) where_[j] = kInnerSide;
            }
        }
    }

    /// True when a connection to this pin was seen before.
    bool seen_both(const HX_PIN* pin) {
        const bool seen =
            std::find(both_sides_.begin(), both_sides_.end(), pin) != both_sides_.end();
        both_sides_.push_back(pin);
        return seen;
    }

    struct Found {
        const HX_PIN* pin;
        uint32_t signal;
    };
    std::vector<Found> found_;
    std::vector<const HX_PIN*> sorted_;
    std::vector<const HX_BLOCK*> blocks_;
    std::vector<uint16_t> pins_;
    std::vector<uint32_t> where_;
    std::vector<const HX_PIN*> both_sides_;
    uint32_t counts_[kSignals];
    std::size_t starts_[kSignals + 1];
};

class HX_FILE_IO::Encoder {
  public:
    void design_file(const HX_DESIGN& design) {
        magic_ = kDesignMagic;
        if (design.get_library() != nullptr)
            refs_.emplace(design.get_library(), ObjectRef{kObjLibrary});
        design_record(design);
        property_section();
    }

    void library_file(const HX_LIBRARY& library) {
        magic_ = kLibraryMagic;
        refs_.emplace(&library, ObjectRef{kObjLibrary});
        out_.text(library.get_name());
        out_.u8(library.get_casesense());
        out_.u8(note_props(library));
        designs_of(library);
        out_.u32(field(designs_.size(), kAbsent - 1, "designs"));
        for (const HX_DESIGN* design : designs_)
            design_record(*design);
        aliases(library);
        property_section();
    }

    /// Bytes of the whole file, header included.
    std::size_t file_size() const { return kHeaderSize + out_.size(); }

    /// Calls `sink(data, size)` for the header and then each piece of the
    /// body; false stops.
    template <class Sink>
    bool pieces(Sink sink) {
        char header[kHeaderSize] = {};
        std::memcpy(header, magic_, kMagicSize);
        store_le(header + kChecksumEnd, kFormatVersion);
        store_le(header + 16, static_cast<uint64_t>(out_.size()));
        uint32_t crc = checksum(header + kChecksumEnd, kHeaderSize - kChecksumEnd);
        out_.each_piece([&](const char* data, std::size_t size) {
            crc = checksum(data, size, crc);
            return true;
        });
        store_le(header + kMagicSize, crc);
        return sink(header, kHeaderSize) && out_.each_piece(sink);
    }

    std::string joined() {
        std::string bytes;
        pieces([&](const char* data, std::size_t size) {
            bytes.append(data, size);
            return true;
        });
        return bytes;
    }

  private:
    /// `n` for a 32-bit field that holds up to `limit`; beyond it the file
    /// would hold a wrapped count, so the write is refused.
    uint32_t field(std::size_t n, std::size_t limit, const char* what) const {
        if (n <= limit) return static_cast<uint32_t>(n);
        const HX_DESIGN* design = lists_.empty() ? nullptr : lists_.back().design;
        const char* name = design != nullptr ? design->get_name() : nullptr;
        throw TooLarge{UT_STR::Format("%s%s%s has more %s than a database file can hold (%zu)",
                                      design ? "design '" : "the library", name ? name : "",
                                      design ? "'" : "", what, limit)};
    }

    /// The design's objects in file order, kept for object properties.
    struct DesignLists {
        const HX_DESIGN* design;
        BigVector<const HX_SIGNAL*> signals;
        BigVector<const HX_NETWORK*> networks;
    };

    uint8_t note_props(const HX_OBJECT& object) {
        if (object.prop_count() == 0) return 0;
        with_props_.push_back(&object);
        props_design_.push_back(lists_.empty() ? nullptr : lists_.back().design);
        return kProps;
    }

    void designs_of(const HX_LIBRARY& library) {
        auto* iter = library.create_liblink_iter();
        while (HX_LIBLINK* link = iter->l_next())
            designs_.push_back(link->get_design());
        library.delete_liblink_iter(iter);
    }

    void design_record(const HX_DESIGN& design) {
        lists_.push_back(DesignLists{&design, {}, {}});
        out_.text(design.get_name());
        out_.u8(note_props(design));
        out_.u32(design.last_tag_);
        AddressIndex blocks(design.blocks_.size());
        block_records(design, blocks);
        signal_records(design, blocks);
        network_records();
        map_records(design, blocks);
        parent_records(design, blocks);
    }

    void block_records(const HX_DESIGN& design, AddressIndex& index) {
        // A block's position keeps the top bit free (kInnerSide).
        out_.u32(field(design.blocks_.size(), kInnerSide - 1, "blocks"));
        const HX_BLOCK* last_parent = nullptr;  // siblings mostly follow each other
        uint32_t parent = 0;
        for (std::size_t i = 0; i < design.blocks_.size(); ++i) {
            const HX_BLOCK* block = design.blocks_[i];
            if (i + 16 < design.blocks_.size()) index.warm(design.blocks_[i + 16]);
            index.add(block, static_cast<uint32_t>(i));
            if (block->parent_ != last_parent) {
                last_parent = block->parent_;
                parent = last_parent ? index.find(last_parent) + 1 : 0;
            }
            block_record(*block, parent);
        }
    }

    void block_record(const HX_BLOCK& block, uint32_t parent) {
        const HX_PRIMITIVE* prim = block.get_primitive();
        out_.u8(block.flags_);
        out_.u8(block.user_);
        out_.u8(prim ? prim->get_type() : 0);
        out_.u8(note_props(block));
        out_.u16(prim ? prim->get_width() : block.pin_count_);
        out_.u32(parent);
        out_.text(block.name_);
        const std::vector<const char*>* names = prim ? &default_pin_names(*prim) : nullptr;
        for (uint16_t i = 0; i < block.pin_count_; ++i) {
            pin_record(block.pins_[i], names ? (*names)[i] : nullptr);
        }
    }

    /// The names that the pins of a fresh primitive of this kind get.
    const std::vector<const char*>& default_pin_names(const HX_PRIMITIVE& prim) {
        const uint32_t key = uint32_t{prim.get_type()} << 16 | prim.get_width();
        if (key == names_key_ && !pin_names_.empty()) return pin_names_;
        names_key_ = key;
        pin_names_.clear();
        hx_prim_for_each_pin(
            prim.get_type(), prim.get_width(), [&](int32_t role, uint16_t ordinal, bool repeated) {
                pin_names_.push_back(hx_prim_pin_name(role, repeated ? ordinal : HX_NO_INDEX));
            });
        return pin_names_;
    }

    /// `made_as` is the name the pin was made with (null for plain blocks);
    /// the name is written only when it differs.
    void pin_record(const HX_PIN& pin, const char* made_as) {
        const bool same =
            pin.name_ == made_as || (pin.name_ && made_as && std::strcmp(pin.name_, made_as) == 0);
        out_.u8(static_cast<uint8_t>(note_props(pin) | (same ? 0 : kNamed)));
        out_.u8(pin.dir_);
        out_.u8(pin.mapinv_);
        out_.u8(pin.inverted_);
        if (!same) out_.text(pin.name_);
    }

    void signal_records(const HX_DESIGN& design, const AddressIndex& blocks) {
        number_networks(design);
        const BigVector<const HX_SIGNAL*>& signals = list_signals(design);
        out_.u32(field(signals.size(), kAbsent - 1, "signals"));
        ConnBatch batch;
        for (std::size_t first = 0; first < signals.size(); first += ConnBatch::kSignals) {
            const std::size_t n = std::min(ConnBatch::kSignals, signals.size() - first);
            batch.gather(&signals[first], n);
            batch.resolve(blocks);
            for (std::size_t i = 0; i < n; ++i)
                signal_record(*signals[first + i], owners_[first + i], batch, i);
        }
    }

    void signal_record(const HX_SIGNAL& signal, uint32_t owner, const ConnBatch& batch,
                       std::size_t i) {
        out_.u32(owner);
        out_.u8(note_props(signal));
        out_.text(signal.name_);
        out_.u32(field(batch.end(i) - batch.begin(i), kAbsent, "connections on a signal"));
        for (std::size_t j = batch.begin(i); j < batch.end(i); ++j) {
            out_.u32(batch.where(j));
            out_.u16(batch.pin(j));
        }
    }

    /// File positions of the design's networks, and their highest signals.
    void number_networks(const HX_DESIGN& design) {
        BigVector<const HX_NETWORK*>& nets = lists_.back().networks;
        net_index_.assign(design.networks_.size(), kAbsent);
        for (std::size_t i = 0; i < design.networks_.size(); ++i) {
            if (design.networks_[i] == nullptr) continue;
            net_index_[i] = static_cast<uint32_t>(nets.size());
            nets.push_back(design.networks_[i]);
        }
        highest_.assign(nets.size(), kAbsent);
    }

    /// The signals in file order: the globals, then each block's.
    const BigVector<const HX_SIGNAL*>& list_signals(const HX_DESIGN& design) {
        BigVector<const HX_SIGNAL*>& signals = lists_.back().signals;
        owners_.clear();
        auto add = [&](const HX_SIGNAL* signal, uint32_t owner) {
            signals.push_back(signal);
            owners_.push_back(owner);
        };
        for (const HX_SIGNAL* global : design.globals_)
            add(global, 0);
        for (std::size_t b = 0; b < design.blocks_.size(); ++b) {
            const std::vector<HX_SIGNAL*>* list = design.blocks_[b]->signal_list();
            if (list == nullptr) continue;
            for (const HX_SIGNAL* signal : *list) {
                if (signal != nullptr) add(signal, static_cast<uint32_t>(b + 1));
            }
        }
        note_highest(signals);
        return signals;
    }

    /// Which file signal is each network's highest. Signals and networks
    /// are asked for ahead: each one is a cache miss otherwise.
    void note_highest(const BigVector<const HX_SIGNAL*>& signals) {
        constexpr std::size_t kSignal = 16, kNetwork = 8;
        const std::size_t n = signals.size();
        for (std::size_t i = 0; i < n; ++i) {
            if (i + kSignal < n) __builtin_prefetch(&signals[i + kSignal]->network_);
            if (i + kNetwork < n) __builtin_prefetch(signals[i + kNetwork]->network_);
            const HX_NETWORK* net = signals[i]->network_;
            if (net != nullptr && net->highest_ == signals[i]) {
                highest_[net_index_[net->slot_]] = static_cast<uint32_t>(i);
            }
        }
    }

    /// A ring of connections; `skip_first` leaves out a map signal's own pin.
    void connections(const HX_CONN* last, const AddressIndex& blocks, bool skip_first) {
        char* at = out_.mark();
        out_.u32(0);
        std::size_t count = 0;
        if (last != nullptr) {
            const HX_CONN* conn = last;
            do {
                conn = conn->next_;
                if (skip_first && conn == last->next_) continue;
                out_.u32(blocks.find(conn->pin_->get_block()));
                out_.u16(conn->pin_->index_);
                ++count;
            } while (conn != last);
        }
        Output::patch_u32(at, field(count, kAbsent, "connections on a map signal"));
    }

    void network_records() {
        const auto& nets = lists_.back().networks;
        out_.u32(field(nets.size(), kAbsent - 1, "networks"));
        for (std::size_t k = 0; k < nets.size(); ++k) {
            if (k + 16 < nets.size()) __builtin_prefetch(nets[k + 16]);
            out_.u32(nets[k]->tag_);
            out_.u32(highest_[k]);
            out_.u8(note_props(*nets[k]));
        }
    }

    void map_records(const HX_DESIGN& design, const AddressIndex& blocks) {
        out_.u32(field(design.mapsignals_.size(), kAbsent - 1, "map signals"));
        for (const HX_MAPSIGNAL* map : design.mapsignals_) {
            out_.u32(blocks.find(map->block_));
            out_.u16(map->pin_);
            out_.u8(note_props(*map));
            out_.text(map->name_);
            connections(map->last_conn_, blocks, true);
        }
    }

    /// Each physical block's logical children, in the order given.
    void parent_records(const HX_DESIGN& design, const AddressIndex& blocks) {
        char* at = out_.mark();
        out_.u32(0);
        uint32_t count = 0;
        for (std::size_t b = 0; b < design.blocks_.size() && !design.log_children_.empty(); ++b) {
            auto it = design.log_children_.find(design.blocks_[b]);
            if (it == design.log_children_.end() || it->second.empty()) continue;
            out_.u32(static_cast<uint32_t>(b));
            out_.u32(field(it->second.size(), kAbsent, "logical blocks in a physical block"));
            for (const HX_BLOCK* child : it->second)
                out_.u32(blocks.find(child));
            ++count;
        }
        Output::patch_u32(at, count);
    }

    void aliases(const HX_LIBRARY& library) {
        std::unordered_map<const HX_DESIGN*, uint32_t> index;
        for (std::size_t i = 0; i < designs_.size(); ++i) {
            index.emplace(designs_[i], static_cast<uint32_t>(i));
        }
        out_.u32(field(library.aliases().size(), kAbsent, "aliases"));
        for (const auto& [alias, design] : library.aliases()) {
            out_.text(alias.c_str());
            out_.u32(index.at(design));
        }
    }

    void property_section() {
        for (std::size_t k = 0; k < with_props_.size(); ++k) {
            const HX_PROPLIST* list = with_props_[k]->get_props();
            out_.u32(field(list->count(), kAbsent, "properties on an object"));
            for (const HX_PROPERTY* prop : list->items()) {
                if (prop != nullptr) property(*prop, props_design_[k]);
            }
        }
    }

    /// A tag property is stored with the tag of the network it names now:
    /// the one it was given may belong to a network since joined away.
    static uint32_t int_value(const HX_PROPERTY& prop, const HX_DESIGN* design) {
        const auto value = static_cast<uint32_t>(prop.get_int());
        if (design == nullptr || !prop.names_network_tag()) return value;
        const HX_NETWORK* net = design->follow_net_tag(value);
        return net != nullptr ? net->tag_ : value;
    }

    void property(const HX_PROPERTY& prop, const HX_DESIGN* design) {
        out_.text(prop.get_name());
        out_.u8(static_cast<uint8_t>(prop.get_kind()));
        HX_PROP_PINREF_DATA record;
        HX_PROP_TIMING_DATA timing;
        switch (prop.get_kind()) {
            case HX_PROP_INT:
                out_.u32(int_value(prop, design));
                break;
            case HX_PROP_FLOAT: {
                const double value = prop.get_float();
                uint64_t bits;
                std::memcpy(&bits, &value, sizeof bits);
                out_.u64(bits);
                break;
            }
            case HX_PROP_STRING:
            case HX_PROP_PARAM:
            case HX_PROP_TIMINGSTR:
                out_.text(prop.get_text());
                break;
            case HX_PROP_OBJECT:
                object_ref(prop.get_object());
                break;
            case HX_PROP_TIMING:
                prop.get_timing(timing);
                times(timing.min, timing.max, timing.unit);
                break;
            case HX_PROP_PINREF:
                prop.get_pinref(record);
                times(record.min, record.max, record.unit);
                out_.u16(record.pin);
                out_.u32(static_cast<uint32_t>(record.edge));
                out_.u8(record.inverted);
                break;
            default:
                break;
        }
    }

    void times(int32_t min, int32_t max, int32_t unit) {
        out_.u32(static_cast<uint32_t>(min));
        out_.u32(static_cast<uint32_t>(max));
        out_.u32(static_cast<uint32_t>(unit));
    }

    void object_ref(const HX_OBJECT* target) {
        if (target != nullptr && !refs_built_) build_refs();
        ObjectRef ref;
        if (target != nullptr) {
            auto it = refs_.find(target);
            if (it != refs_.end()) ref = it->second;
        }
        out_.u8(ref.kind);
        out_.u32(ref.design);
        out_.u32(ref.index);
        out_.u16(ref.pin);
    }

    /// Positions of every object that an object property may point at; made
    /// on the first such property only.
    void build_refs() {
        refs_built_ = true;
        for (uint32_t d = 0; d < lists_.size(); ++d) {
            const DesignLists& lists = lists_[d];
            refs_.emplace(lists.design, ObjectRef{kObjDesign, d});
            const auto& blocks = lists.design->blocks_;
            for (uint32_t b = 0; b < blocks.size(); ++b) {
                refs_.emplace(blocks[b], ObjectRef{kObjBlock, d, b});
                for (uint16_t p = 0; p < blocks[b]->pin_count_; ++p) {
                    refs_.emplace(&blocks[b]->pins_[p], ObjectRef{kObjPin, d, b, p});
                }
            }
            add_refs(lists.signals, kObjSignal, d);
            add_refs(lists.networks, kObjNetwork, d);
            add_refs(lists.design->mapsignals_, kObjMap, d);
        }
    }

    template <class List>
    void add_refs(const List& list, uint8_t kind, uint32_t design) {
        for (uint32_t i = 0; i < list.size(); ++i) {
            refs_.emplace(list[i], ObjectRef{kind, design, i});
        }
    }

    const char* magic_ = kDesignMagic;
    Output out_;
    std::vector<const HX_DESIGN*> designs_;
    std::vector<DesignLists> lists_;
    std::vector<const HX_OBJECT*> with_props_;
    std::vector<const HX_DESIGN*> props_design_;  // the design of each, null for a library
    BigVector<uint32_t> net_index_;               // design's network slot -> file position
    BigVector<uint32_t> highest_;                 // file network -> its highest signal
    BigVector<uint32_t> owners_;                  // file signal -> its block's position + 1, or 0
    uint32_t names_key_ = kAbsent;
    std::vector<const char*> pin_names_;
    std::unordered_map<const void*, ObjectRef> refs_;
    bool refs_built_ = false;
};

std::string HX_FILE_IO::encode(const HX_DESIGN& design) {
    Encoder encoder;
    encoder.design_file(design);
    return encoder.joined();
}

std::string HX_FILE_IO::encode(const HX_LIBRARY& library) {
    Encoder encoder;
    encoder.library_file(library);
    return encoder.joined();
}

// --- reading ---------------------------------------------------------------------

class HX_FILE_IO::Decoder {
  public:
    Decoder(const uint8_t* body, std::size_t size) : p_(body), end_(body + size), begin_(body) {}

    std::unique_ptr<HX_LIBRARY> design_file() {
        const char* name = peek_design_name();
        library_ = std::make_unique<HX_LIBRARY>(name, 0);
        design_record();
        property_section();
        expect_end();
        report_progress();
        return std::move(library_);
    }

    std::unique_ptr<HX_LIBRARY> library_file() {
        const char* name = text();
        const uint8_t casesense = u8();
        const uint8_t flags = u8();
        if (casesense > 1 || (flags & ~kProps) != 0) corrupt("bad library record");
        library_ = std::make_unique<HX_LIBRARY>(name, casesense);
        note_props(flags, library_.get());
        const uint32_t designs = count(kMinDesign);
        designs_.reserve(designs);
        for (uint32_t i = 0; i < designs; ++i)
            design_record();
        aliases();
        property_section();
        expect_end();
        report_progress();
        return std::move(library_);
    }

  private:
    /// A design's objects by file position.
    struct DesignObjects {
        HX_DESIGN* design = nullptr;
        BigVector<HX_BLOCK*> blocks;
        std::vector<HX_SIGNAL*> signals;
        std::vector<int32_t> signal_rank;  // -1 global, else the block's depth
        std::vector<uint32_t> block_depth;
        std::vector<HX_NETWORK*> networks;
    };

    // The cursor: every read is checked against the end of the content.
    std::size_t left() const { return static_cast<std::size_t>(end_ - p_); }
    void need(std::size_t n) const {
        if (left() < n) corrupt("content ends early");
    }
    template <class T>
    T get() {
        need(sizeof(T));
        T v = 0;
        for (std::size_t i = 0; i < sizeof(T); ++i)
            v = static_cast<T>(v | T{p_[i]} << (8 * i));
        p_ += sizeof(T);
        return v;
    }
    uint8_t u8() { return get<uint8_t>(); }
    uint16_t u16() { return get<uint16_t>(); }
    uint32_t u32() { return get<uint32_t>(); }
    uint64_t u64() { return get<uint64_t>(); }
    int32_t i32() { return static_cast<int32_t>(u32()); }

    /// A count of records of at least `min_size` bytes each, checked against
    /// the bytes left before anyone allocates for them.
    uint32_t count(std::size_t min_size) {
        const uint32_t n = u32();
        if (n > left() / min_size) corrupt("a count exceeds the content");
        return n;
    }

    /// A name in place: the file's bytes end in a 0 byte and hold no other.
    const char* text() {
        const uint32_t length = u32();
        if (length == kAbsent) return nullptr;
        if (length >= left()) corrupt("a name runs past the end");
        const char* s = reinterpret_cast<const char*>(p_);
        if (p_[length] != 0 || std::memchr(s, 0, length) != nullptr) corrupt("a name is not text");
        p_ += length + 1;
        return s;
    }

    const char* peek_design_name() {
        const uint8_t* at = p_;
        const char* name = text();
        p_ = at;
        return name;
    }

    void expect_end() const {
        if (p_ != end_) corrupt("bytes after the content");
    }

    /// Bytes of the file (its header included) decoded so far.
    void report_progress() const {
        progress_hook.report(kHeaderSize + static_cast<uint64_t>(p_ - begin_),
                             kHeaderSize + static_cast<uint64_t>(end_ - begin_));
    }

    /// Calls `record` `n` times, with a progress report after each chunk.
    template <class Record>
    void in_chunks(uint32_t n, Record record) {
        for (uint32_t i = 0; i < n;) {
            const uint32_t chunk_end = n - i > kRecordsPerReport ? i + kRecordsPerReport : n;
            for (; i < chunk_end; ++i)
                record(i);
            report_progress();
        }
    }

    /// `pin_block`: the block of a pin, whose pin references name its pins.
    void note_props(uint8_t flags, HX_OBJECT* object, const HX_BLOCK* pin_block = nullptr) {
        if (flags & kProps) with_props_.push_back(PropOwner{object, pin_block});
    }

    void design_record() {
        DesignObjects& objects = designs_.emplace_back();
        const char* name = text();
        const uint8_t flags = u8();
        const uint32_t last_tag = u32();
        if ((flags & ~kProps) != 0) corrupt("bad design record");
        objects.design = library_->create_design(name);
        if (objects.design == nullptr) corrupt("a design name is absent or taken");
        note_props(flags, objects.design);
        block_records(objects);
        signal_records(objects);
        network_records(objects);
        map_records(objects);
        parent_records(objects);
        objects.design->last_tag_ = last_tag;
    }

    void block_records(DesignObjects& objects) {
        const uint32_t n = count(kMinBlock);
        objects.blocks.reserve(n);
        objects.block_depth.reserve(n);
        in_chunks(n, [&](uint32_t) { block_record(objects); });
    }

    void block_record(DesignObjects& objects) {
        const uint8_t kind = u8();
        const uint8_t user = u8();
        const uint8_t type = u8();
        const uint8_t flags = u8();
        const uint16_t width = u16();
        const uint32_t parent = u32();
        const char* name = text();
        if (kind > (HX_BLK_PHYSICAL | HX_BLK_PRIMITIVE) || (flags & ~kProps) != 0 ||
            (!(kind & HX_BLK_PRIMITIVE) && type != 0))
            corrupt("bad block record");
        if (parent > objects.blocks.size()) corrupt("a block's parent is unknown");
        HX_BLOCK* up = parent ? objects.blocks[parent - 1] : nullptr;
        const uint32_t pins =
            (kind & HX_BLK_PRIMITIVE) ? HX_PRIMITIVE::pin_count_for(type, width) : width;
        if (pins > left() / kMinPin) corrupt("pins run past the end");
        HX_BLOCK* block = make_block(*objects.design, kind, up, type, width, name);
        const HX_PRIMITIVE* prim = block->get_primitive();
        if (prim != nullptr && prim->get_width() != width) corrupt("bad primitive width");
        block->user_ = user;
        note_props(flags, block);
        for (uint16_t i = 0; i < block->pin_count_; ++i)
            pin_record(*objects.design, block->pins_[i]);
        objects.blocks.push_back(block);
        objects.block_depth.push_back(up ? objects.block_depth[parent - 1] + 1 : 0);
    }

    /// Makes the block through the design, which refuses a parent of the
    /// other kind, a primitive parent below the root or a second root.
    static HX_BLOCK* make_block(HX_DESIGN& design, uint8_t kind, HX_BLOCK* parent, uint8_t type,
                                uint16_t width, const char* name) {
        const bool physical = (kind & HX_BLK_PHYSICAL) != 0;
        if (parent != nullptr && parent->is_physical() != physical) {
            corrupt("a block's parent is of the other kind");
        }
        HX_BLOCK* block = nullptr;
        if (physical) {
            auto* up = static_cast<HX_BASEPHYSBLOCK*>(parent);
            block = (kind & HX_BLK_PRIMITIVE)
                        ? static_cast<HX_BLOCK*>(design.create_physprim(up, type, width, name))
                        : design.create_physblock(up, width, name);
        } else {
            auto* up = static_cast<HX_BASELOGBLOCK*>(parent);
            block = (kind & HX_BLK_PRIMITIVE)
                        ? static_cast<HX_BLOCK*>(design.create_logprim(up, type, width, name))
                        : design.create_logblock(up, width, name);
        }
        if (block == nullptr) corrupt("a block cannot be made");
        return block;
    }

    void pin_record(HX_DESIGN& design, HX_PIN& pin) {
        const uint8_t flags = u8();
        pin.dir_ = u8();
        pin.mapinv_ = u8();
        pin.inverted_ = u8();
        if ((flags & ~(kProps | kNamed)) != 0) corrupt("bad pin record");
        if (pin.dir_ > HX_PIN_BI) corrupt("a pin direction is unknown");
        if (flags & kNamed) pin.name_ = design.intern(text());
        note_props(flags, &pin, pin.get_block());
    }

    void signal_records(DesignObjects& objects) {
        const uint32_t n = count(kMinSignal);
        objects.signals.reserve(n);
        objects.signal_rank.reserve(n);
        ahead_ = Ahead(p_, end_, n);
        for (uint32_t i = 0; i < Ahead::kDistance; ++i)
            ahead_.step(objects.blocks);
        in_chunks(n, [&](uint32_t) { signal_record(objects); });
    }

    /// Reads connections ahead of the decoder and asks for what making them
    /// will load: the block's entry in the list, the block, the pin. Each
    /// is a cache miss otherwise, one after the other. Anything odd in the
    /// bytes just ends the look ahead; the decoder itself checks everything.
    class Ahead {
      public:
        static constexpr uint32_t kDistance = 24;  // connections; a stage each third

        Ahead() = default;
        Ahead(const uint8_t* p, const uint8_t* end, uint32_t records)
            : p_(p), end_(end), records_(records) {}

        /// One connection further, and each stage a step on.
        void step(const BigVector<HX_BLOCK*>& blocks) {
            ring_[read_++ % kDistance] = parse();
            const Upcoming& far = back(0);
            if (far.block < blocks.size()) __builtin_prefetch(&blocks[far.block]);
            const Upcoming& middle = back(kDistance / 3);
            if (middle.block < blocks.size()) __builtin_prefetch(blocks[middle.block]);
            const Upcoming& near = back(2 * kDistance / 3);
            if (near.block < blocks.size())
                __builtin_prefetch(blocks[near.block]->get_pin(near.pin));
        }

      private:
        struct Upcoming {
            uint32_t block = kAbsent;
            uint16_t pin = 0;
        };

        /// The connection read `k` before the last one.
        const Upcoming& back(uint32_t k) const {
            return ring_[(read_ + kDistance - 1 - k) % kDistance];
        }

        Upcoming parse() {
            while (conns_ == 0) {
                if (records_ == 0 || !skip_header()) return {};
                --records_;
            }
            if (end_ - p_ < 6) return {};
            --conns_;
            const Upcoming next{load_le32(p_) & ~kInnerSide,
                                static_cast<uint16_t>(p_[4] | p_[5] << 8)};
            p_ += 6;
            return next;
        }

        /// Past a signal record's owner, flags and name to its connections.
        bool skip_header() {
            if (end_ - p_ < 9) return false;
            const uint32_t length = load_le32(p_ + 5);
            p_ += 9;
            if (length != kAbsent) {
                if (static_cast<std::size_t>(end_ - p_) <= length) return false;
                p_ += length + 1;
            }
            if (end_ - p_ < 4) return false;
            conns_ = load_le32(p_);
            p_ += 4;
            return true;
        }

        const uint8_t* p_ = nullptr;
        const uint8_t* end_ = nullptr;
        uint32_t records_ = 0;
        uint32_t conns_ = 0;
        uint64_t read_ = 0;
        Upcoming ring_[kDistance];
    };

    void signal_record(DesignObjects& objects) {
        const uint32_t owner = u32();
        const uint8_t flags = u8();
        const char* name = text();
        if ((flags & ~kProps) != 0) corrupt("bad signal record");
        if (owner > objects.blocks.size()) corrupt("a signal's block is unknown");
        HX_SIGNAL* signal = owner == 0
                                ? make_global(*objects.design, name)
                                : objects.design->create_signal(objects.blocks[owner - 1], name);
        if (signal == nullptr) corrupt("a signal cannot be made");
        note_props(flags, signal);
        objects.signals.push_back(signal);
        objects.signal_rank.push_back(
            owner == 0 ? -1 : static_cast<int32_t>(objects.block_depth[owner - 1]));
        const uint32_t conns = count(kMinConn);
        for (uint32_t i = 0; i < conns; ++i) {
            ahead_.step(objects.blocks);
            const uint32_t raw = u32();
            HX_BLOCK* block = block_at(objects, raw & ~kInnerSide);
            const uint16_t pin = u16();
            if ((raw & kInnerSide) == 0) {
                if (objects.design->create_conn(signal, block, pin) == nullptr) {
                    corrupt("a connection cannot be made");
                }
            } else if (owner != 0) {
                corrupt("a connection cannot be made");
            } else {
                connect_inside(*objects.design, signal, block, pin);
            }
        }
    }

    /// What create_conn does, for the inner side that it keeps for the
    /// block's own signals.
    static void connect_inside(HX_DESIGN& design, HX_SIGNAL* global, HX_BLOCK* block,
                               uint16_t index) {
        HX_PIN* pin = block->get_pin(index);
        if (pin == nullptr || pin->inner_ != nullptr) corrupt("a connection cannot be made");
        pin->inner_ = global;
        HX_DESIGN::append_conn(global->last_conn_, design.make_conn(pin));
        if (pin->outer_ != nullptr) design.join_networks(pin->outer_->network_, global->network_);
    }

    /// A global signal; one without a name, or with the name of an earlier
    /// one (both possible after renaming), is made under a name of its own
    /// and then renamed, as it was made originally.
    static HX_SIGNAL* make_global(HX_DESIGN& design, const char* name) {
        if (HX_SIGNAL* global = design.create_global_signal(name)) return global;
        std::string stand_in = "\x01";
        HX_SIGNAL* global = nullptr;
        while (global == nullptr) {
            stand_in += '\x01';
            global = design.create_global_signal(stand_in.c_str());
        }
        global->set_name(name);
        return global;
    }

    static HX_BLOCK* block_at(const DesignObjects& objects, uint32_t index) {
        if (index >= objects.blocks.size()) corrupt("a block index is out of range");
        return objects.blocks[index];
    }

    /// The connections made the networks; the records give each its tag,
    /// its highest signal and its place in the design's order.
    void network_records(DesignObjects& objects) {
        HX_DESIGN& design = *objects.design;
        const uint32_t n = count(kMinNetwork);
        if (n != design.network_count_) corrupt("the networks do not match the connections");
        for (HX_NETWORK* net : design.networks_) {
            if (net != nullptr) net->slot_ = kAbsent;
        }
        objects.networks.reserve(n);
        std::vector<uint32_t> top(n);
        std::vector<uint32_t> tags(n);
        in_chunks(n, [&](uint32_t k) {
            tags[k] = u32();
            top[k] = u32();
            const uint8_t flags = u8();
            if ((flags & ~kProps) != 0 || top[k] >= objects.signals.size()) {
                corrupt("bad network record");
            }
            HX_NETWORK* net = objects.signals[top[k]]->network_;
            if (net->slot_ != kAbsent) corrupt("two network records name one network");
            net->slot_ = k;
            net->highest_ = objects.signals[top[k]];
            note_props(flags, net);
            objects.networks.push_back(net);
        });
        check_highest(objects, top);
        objects.design->networks_ = objects.networks;
        retag(*objects.design, objects.networks, tags);
    }

    /// The highest signal named by a record must be nearest the root.
    static void check_highest(const DesignObjects& objects, const std::vector<uint32_t>& top) {
        for (std::size_t i = 0; i < objects.signals.size(); ++i) {
            const uint32_t k = objects.signals[i]->network_->slot_;
            if (objects.signal_rank[i] < objects.signal_rank[top[k]]) {
                corrupt("a network's highest signal is not its highest");
            }
        }
    }

    /// Gives the networks the tags of the file. Rebuilding made the same
    /// tags as the original in the usual case, so only the others move: all
    /// their old tags go before any new one comes in.
    static void retag(HX_DESIGN& design, const std::vector<HX_NETWORK*>& nets,
                      const std::vector<uint32_t>& tags) {
        HX_TAG_TABLE<>& table = design.store_->tags;
        for (std::size_t k = 0; k < nets.size(); ++k) {
            if (nets[k]->tag_ != tags[k]) table.erase(nets[k]->tag_);
        }
        for (std::size_t k = 0; k < nets.size(); ++k) {
            if (nets[k]->tag_ == tags[k]) continue;
            nets[k]->tag_ = tags[k];
            if (!table.insert(nets[k])) corrupt("two networks share a tag");
        }
    }

    void map_records(DesignObjects& objects) {
        const uint32_t n = count(kMinMap);
        for (uint32_t i = 0; i < n; ++i) {
            HX_BLOCK* block = block_at(objects, u32());
            const uint16_t pin = u16();
            const uint8_t flags = u8();
            const char* name = text();
            if (!block->is_physical() || (flags & ~kProps) != 0) corrupt("bad map signal record");
            HX_MAPSIGNAL* map = static_cast<HX_BASEPHYSBLOCK*>(block)->create_map_signal(pin, name);
            if (map == nullptr) corrupt("a map signal cannot be made");
            note_props(flags, map);
            const uint32_t conns = count(kMinConn);
            for (uint32_t c = 0; c < conns; ++c) {
                HX_BLOCK* log = block_at(objects, u32());
                if (map->create_mapconn(log, u16()) == nullptr) {
                    corrupt("a map connection cannot be made");
                }
            }
        }
    }

    void parent_records(DesignObjects& objects) {
        const uint32_t n = count(kMinParents);
        for (uint32_t i = 0; i < n; ++i) {
            HX_BLOCK* phys = block_at(objects, u32());
            if (!phys->is_physical()) corrupt("a physical parent is a logical block");
            const uint32_t children = count(4);
            for (uint32_t c = 0; c < children; ++c) {
                HX_BLOCK* log = block_at(objects, u32());
                if (!objects.design->set_block_phys_parent(log,
                                                           static_cast<HX_BASEPHYSBLOCK*>(phys))) {
                    corrupt("a physical parent cannot be set");
                }
            }
        }
    }

    void aliases() {
        const uint32_t n = count(kMinAlias);
        for (uint32_t i = 0; i < n; ++i) {
            const char* alias = text();
            const uint32_t design = u32();
            if (design >= designs_.size()) corrupt("an alias names an unknown design");
            if (!library_->alias_design(designs_[design].design->get_name(), alias)) {
                corrupt("an alias cannot be made");
            }
        }
    }

    void property_section() {
        in_chunks(static_cast<uint32_t>(with_props_.size()), [&](uint32_t k) {
            HX_OBJECT* object = with_props_[k].object;
            const uint32_t n = count(kMinProp);
            if (n == 0) corrupt("an empty property list");
            for (uint32_t i = 0; i < n; ++i)
                object->create_prop(property(with_props_[k].pin_block), nullptr);
            if (object->prop_count() != static_cast<int>(n)) corrupt("a property name repeats");
        });
    }

    std::unique_ptr<HX_PROPERTY> property(const HX_BLOCK* pin_block) {
        const char* name = text();
        const uint8_t kind = u8();
        if (name == nullptr) corrupt("a property has no name");
        switch (kind) {
            case HX_PROP_FLAG:
                return HX_PROPERTY::make_flag(name);
            case HX_PROP_INT:
                return HX_PROPERTY::make_int(name, i32());
            case HX_PROP_FLOAT: {
                const uint64_t bits = u64();
                double value;
                std::memcpy(&value, &bits, sizeof value);
                return HX_PROPERTY::make_float(name, value);
            }
            case HX_PROP_STRING:
            case HX_PROP_PARAM:
            case HX_PROP_TIMINGSTR:
                return HX_PROPERTY::make_text(name, static_cast<HX_PROP_TYPE>(kind),
                                              property_text());
            case HX_PROP_OBJECT:
                return HX_PROPERTY::make_object(name, object_ref());
            case HX_PROP_TIMING:
                return HX_PROPERTY::make_timing(name, timing());
            case HX_PROP_PINREF:
                return HX_PROPERTY::make_pinref(name, pinref(pin_block));
            default:
                corrupt("unknown property kind");
        }
    }

    const char* property_text() {
        const char* value = text();
        if (value == nullptr) corrupt("a property has no text");
        return value;
    }

    int32_t time_unit() {
        const int32_t unit = i32();
        if (unit < HX_UNIT_PS || unit > HX_UNIT_NONE) corrupt("a time unit is unknown");
        return unit;
    }

    HX_PROP_TIMING_DATA timing() {
        HX_PROP_TIMING_DATA record;
        record.min = i32();
        record.max = i32();
        record.unit = time_unit();
        return record;
    }

    /// A pin reference on a pin names a pin of the same block.
    HX_PROP_PINREF_DATA pinref(const HX_BLOCK* pin_block) {
        HX_PROP_PINREF_DATA record;
        record.min = i32();
        record.max = i32();
        record.unit = time_unit();
        record.pin = u16();
        record.edge = i32();
        record.inverted = u8();
        if (record.edge != HX_EDGE_RISING && record.edge != HX_EDGE_FALLING &&
            record.edge != HX_EDGE_NONE)
            corrupt("a clock edge is unknown");
        if (pin_block != nullptr && record.pin >= pin_block->get_pin_count())
            corrupt("a pin reference names a pin its block does not have");
        return record;
    }

    HX_OBJECT* object_ref() {
        const uint8_t kind = u8();
        const uint32_t design = u32();
        const uint32_t index = u32();
        const uint16_t pin = u16();
        if (kind == kObjNone || kind == kObjLibrary) {
            if (design != 0 || index != 0 || pin != 0) corrupt("bad object reference");
            return kind == kObjNone ? nullptr : library_.get();
        }
        if (design >= designs_.size()) corrupt("an object reference names an unknown design");
        const DesignObjects& objects = designs_[design];
        switch (kind) {
            case kObjDesign:
                return objects.design;
            case kObjBlock:
                return block_at(objects, index);
            case kObjPin:
                return pin_at(objects, index, pin);
            case kObjSignal:
                return at(objects.signals, index);
            case kObjNetwork:
                return at(objects.networks, index);
            case kObjMap:
                return at(objects.design->mapsignals_, index);
            default:
                corrupt("bad object reference");
        }
    }

    static HX_PIN* pin_at(const DesignObjects& objects, uint32_t block, uint16_t pin) {
        HX_PIN* found = block_at(objects, block)->get_pin(pin);
        if (found == nullptr) corrupt("an object reference names an unknown pin");
        return found;
    }

    template <class T>
    static T* at(const std::vector<T*>& list, uint32_t index) {
        if (index >= list.size()) corrupt("an object reference is out of range");
        return list[index];
    }

    const uint8_t* p_;
    const uint8_t* end_;
    const uint8_t* begin_;
    std::unique_ptr<HX_LIBRARY> library_;
    std::vector<DesignObjects> designs_;
    struct PropOwner {
        HX_OBJECT* object;
        const HX_BLOCK* pin_block;
    };
    std::vector<PropOwner> with_props_;
    Ahead ahead_;
};

namespace {

uint32_t header_u32(const uint8_t* p) {
    return load_le32(p);
}
uint64_t header_u64(const uint8_t* p) {
    return uint64_t{load_le32(p)} | uint64_t{load_le32(p + 4)} << 32;
}

bool is_prefix_of_magic(const uint8_t* data, std::size_t size) {
    return std::memcmp(data, kDesignMagic, size) == 0 ||
           std::memcmp(data, kLibraryMagic, size) == 0;
}

std::string format(const char* text, unsigned long long a, unsigned long long b) {
    char buffer[160];
    std::snprintf(buffer, sizeof buffer, text, a, b);
    return buffer;
}

/// The reason to refuse the header, or empty when the content may be decoded.
std::string check_header(const uint8_t* data, std::size_t size, HX_FILE_TYPE expected) {
    if (size < kMagicSize) {
        return is_prefix_of_magic(data, size)
                   ? format("truncated (%llu bytes, the header alone takes %llu)", size,
                            HX_FILE_IO::kHeaderSize)
                   : "not a netlist database file";
    }
    const HX_FILE_TYPE kind = HX_FILE_IO::kind_of(data, size);
    if (kind == HX_FILE_UNKNOWN) return "not a netlist database file";
    if (kind != expected) {
        return kind == HX_FILE_DESIGN ? "a design file, not a library file"
                                      : "a library file, not a design file";
    }
    if (size < HX_FILE_IO::kHeaderSize) {
        return format("truncated (%llu bytes, the header alone takes %llu)", size,
                      HX_FILE_IO::kHeaderSize);
    }
    const uint64_t body = header_u64(data + 16);
    const std::size_t have = size - HX_FILE_IO::kHeaderSize;
    if (body > have) {
        return format("truncated (%llu of %llu bytes)", size,
                      body > UINT64_MAX - HX_FILE_IO::kHeaderSize ? UINT64_MAX
                                                                  : body + HX_FILE_IO::kHeaderSize);
    }
    if (body < have) {
        return format("corrupt (%llu bytes, the header announces %llu)", size,
                      body + HX_FILE_IO::kHeaderSize);
    }
    if (HX_FILE_IO::checksum(data + kChecksumEnd, size - kChecksumEnd) != header_u32(data + 8)) {
        return "corrupt (checksum mismatch)";
    }
    const uint32_t version = header_u32(data + 12);
    if (version > HX_FILE_IO::kFormatVersion) {
        return format("written by a newer version (format %llu, this version reads format %llu)",
                      version, HX_FILE_IO::kFormatVersion);
    }
    if (version == 0 || header_u64(data + 24) != 0) return "corrupt (bad header)";
    return {};
}

}  // namespace

HX_FILE_TYPE HX_FILE_IO::kind_of(const void* data, std::size_t size) {
    if (size < kMagicSize) return HX_FILE_UNKNOWN;
    if (std::memcmp(data, kDesignMagic, kMagicSize) == 0) return HX_FILE_DESIGN;
    if (std::memcmp(data, kLibraryMagic, kMagicSize) == 0) return HX_FILE_LIBRARY;
    return HX_FILE_UNKNOWN;
}

std::unique_ptr<HX_LIBRARY> HX_FILE_IO::decode(const void* data, std::size_t size,
                                               HX_FILE_TYPE expected, std::string& reason) {
    const auto* bytes = static_cast<const uint8_t*>(data);
    reason = check_header(bytes, size, expected);
    if (!reason.empty()) return nullptr;
    Decoder decoder(bytes + kHeaderSize, size - kHeaderSize);
    try {
        return expected == HX_FILE_DESIGN ? decoder.design_file() : decoder.library_file();
    } catch (const Corrupt& refusal) {
        reason = std::string("corrupt (") + refusal.what + ")";
    }
    return nullptr;
}

// --- files -----------------------------------------------------------------------
//
// get_file_type reads the magic, and the file object cannot seek back. The
// bytes it took are kept, per file object, for the read that follows; the
// read tells from the number of bytes left whether they were taken.

namespace {

struct TakenBytes {
    const UT_PTRFILE* file = nullptr;
    uint8_t bytes[kMagicSize] = {};
    std::size_t count = 0;
};

constexpr std::size_t kMaxTaken = 16;
std::mutex taken_mutex;
std::vector<TakenBytes> taken_list;

void remember_taken(const TakenBytes& taken) {
    std::lock_guard<std::mutex> lock(taken_mutex);
    std::erase_if(taken_list, [&](const TakenBytes& t) { return t.file == taken.file; });
    if (taken_list.size() == kMaxTaken) taken_list.erase(taken_list.begin());
    taken_list.push_back(taken);
}

TakenBytes recall_taken(const UT_PTRFILE* file) {
    std::lock_guard<std::mutex> lock(taken_mutex);
    auto it = std::find_if(taken_list.begin(), taken_list.end(),
                           [&](const TakenBytes& t) { return t.file == file; });
    if (it == taken_list.end()) return {};
    TakenBytes taken = *it;
    taken_list.erase(it);
    return taken;
}

bool readable(const UT_PTRFILE* file) {
    return file != nullptr && file->is_open() && file->access() == Port::ACCESS_READ;
}

/// The whole file, whether or not get_file_type took its first bytes.
/// Bytes from big_alloc.
class BigBytes {
  public:
    BigBytes() = default;
    BigBytes(const BigBytes&) = delete;
    BigBytes& operator=(const BigBytes&) = delete;
    ~BigBytes() {
        if (data_ != nullptr) big_free(data_, size_);
    }
    void reset(std::size_t size) {
        auto* fresh = static_cast<uint8_t*>(big_alloc(size));
        if (data_ != nullptr) big_free(data_, size_);
        data_ = fresh;
        size_ = size;
    }
    uint8_t* get() const { return data_; }

  private:
    uint8_t* data_ = nullptr;
    std::size_t size_ = 0;
};

bool read_all(UT_PTRFILE* file, BigBytes& buffer, const uint8_t*& data, std::size_t& size) {
    const TakenBytes taken = recall_taken(file);
    size = static_cast<std::size_t>(file->size());
    buffer.reset(size + kMagicSize);
    uint8_t* rest = buffer.get() + taken.count;
    const std::size_t got = file->read(rest, size);
    if (got == size) {
        data = rest;
        return true;
    }
    if (got + taken.count != size) return false;
    std::memcpy(buffer.get(), taken.bytes, taken.count);
    data = buffer.get();
    return true;
}

}  // namespace

HX_FILE_TYPE HX_FILE_IO::peek_type(UT_PTRFILE* file) {
    if (!readable(file)) return HX_FILE_UNKNOWN;
    TakenBytes taken;
    taken.file = file;
    taken.count = file->read(taken.bytes, kMagicSize);
    if (taken.count > 0) remember_taken(taken);
    return kind_of(taken.bytes, taken.count);
}

std::unique_ptr<HX_LIBRARY> HX_FILE_IO::read(UT_PTRFILE* file, HX_FILE_TYPE expected, bool quiet) {
    std::string reason;
    std::unique_ptr<HX_LIBRARY> library;
    if (!readable(file)) {
        reason = "not open for reading";
    } else {
        // Running out of memory is not the file's fault: std::bad_alloc goes
        // on to the caller, as everywhere in the database.
        BigBytes buffer;
        const uint8_t* data = nullptr;
        std::size_t size = 0;
        if (read_all(file, buffer, data, size)) {
            library = decode(data, size, expected, reason);
        } else {
            reason = "could not be read completely";
        }
    }
    if (library == nullptr && !quiet) {
        PORT_MSG("HX", kRevision)
            .issueError("cannot read database file '%s': %s\n", file ? file->name() : "",
                        reason.c_str());
    }
    return library;
}

bool HX_FILE_IO::write(UT_PTRFILE* file, const HX_DESIGN& design) {
    if (!writable(file)) return false;
    Encoder encoder;
    try {
        encoder.design_file(design);
    } catch (const TooLarge& refusal) {
        return refuse(file, refusal.what);
    }
    return write(file, encoder);
}

bool HX_FILE_IO::write(UT_PTRFILE* file, const HX_LIBRARY& library) {
    if (!writable(file)) return false;
    Encoder encoder;
    try {
        encoder.library_file(library);
    } catch (const TooLarge& refusal) {
        return refuse(file, refusal.what);
    }
    return write(file, encoder);
}

// Nothing of the file is written: its close leaves the destination as it was.
bool HX_FILE_IO::refuse(UT_PTRFILE* file, const std::string& why) {
    PORT_MSG("HX", kRevision)
        .issueError("cannot write database file '%s': %s\n", file->name(), why.c_str());
    file->fail();
    return false;
}

bool HX_FILE_IO::writable(const UT_PTRFILE* file) {
    return file != nullptr && file->is_open() && file->access() == Port::ACCESS_WRITE;
}

bool HX_FILE_IO::write(UT_PTRFILE* file, Encoder& encoder) {
    const uint64_t total = encoder.file_size();
    uint64_t done = 0;
    encoder.pieces([&](const char* data, std::size_t size) {
        if (!file->write(data, size)) return false;
        done += size;
        progress_hook.report(done, total);
        return true;
    });
    if (!file->failed()) return true;
    file->fail();
    return false;
}

// --- the environment's file operations ----------------------------------------

namespace {

bool report_write(UT_PTRFILE* file, bool written) {
    if (!written) {
        const int error = file != nullptr ? file->error() : 0;
        PORT_MSG("HX", kRevision)
            .issueError("cannot write database file '%s'%s%s\n", file ? file->name() : "",
                        error != 0 ? ": " : "", error != 0 ? std::strerror(error) : "");
    }
    return written;
}

}  // namespace

HX_FILE_TYPE HX_ENVIRONMENT::get_file_type(UT_PTRFILE* file) {
    return HX_FILE_IO::peek_type(file);
}

HX_DESIGN* HX_ENVIRONMENT::create_design(UT_PTRFILE* file, uint8_t quiet) {
    std::unique_ptr<HX_LIBRARY> library = HX_FILE_IO::read(file, HX_FILE_DESIGN, quiet != 0);
    if (library == nullptr) return nullptr;
    auto* links = library->create_liblink_iter();
    HX_DESIGN* design = links->l_next()->get_design();
    library->delete_liblink_iter(links);
    adopt(std::move(library));
    return design;
}

HX_LIBRARY* HX_ENVIRONMENT::create_library(UT_PTRFILE* file) {
    std::unique_ptr<HX_LIBRARY> library = HX_FILE_IO::read(file, HX_FILE_LIBRARY, false);
    return library ? adopt(std::move(library)) : nullptr;
}

bool HX_ENVIRONMENT::write_design(UT_PTRFILE* file, HX_DESIGN* design) {
    if (design == nullptr) {
        if (file != nullptr) file->fail();
        return report_write(file, false);
    }
    return report_write(file, HX_FILE_IO::write(file, *design));
}

bool HX_ENVIRONMENT::write_library(UT_PTRFILE* file, HX_LIBRARY* library) {
    if (library == nullptr) {
        if (file != nullptr) file->fail();
        return report_write(file, false);
    }
    return report_write(file, HX_FILE_IO::write(file, *library));
}
