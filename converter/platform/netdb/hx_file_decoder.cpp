// Reading: the bytes of a database file checked and decoded into a design or
// library.
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

/// A refusal of the file's content.
struct Corrupt {
    const char* what;
};

[[noreturn]] void corrupt(const char* what) {
    throw Corrupt{what};
}

}  // namespace

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
