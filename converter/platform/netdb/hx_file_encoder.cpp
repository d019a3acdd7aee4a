// Writing: a design or library encoded as the bytes of a database file.
#include "hx_file.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <memory>
#include <new>
#include <string>
#include <unordered_map>
#include <vector>

#include "hx_design.h"
#include "hx_file_internal.h"
#include "hx_library.h"
#include "hx_prim_layout.h"
#include "hx_storage.h"
#include "port_file.h"
#include "port_msg.h"
#include "ut_ptrfile.h"

using namespace hx_file_internal;

namespace {

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

template <class T>
void store_le(char* p, T v) {
    for (std::size_t i = 0; i < sizeof(T); ++i)
        p[i] = static_cast<char>(v >> (8 * i));
}

}  // namespace

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
