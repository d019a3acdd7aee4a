#include "random_design.h"

#include <climits>
#include <cmath>
#include <cstring>
#include <random>
#include <string>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "hx_design.h"
#include "hx_library.h"

namespace vrx_test {
namespace {

class Generator {
  public:
    Generator(HX_DESIGN& design, uint64_t seed, const RandomDesignOptions& options)
        : design_(design), rng_(seed), options_(options), text_(options.text_expressible) {
        if (text_) options_.quotes_in_names = false;
    }

    void run() {
        make_roots();
        for (int i = 0; i < options_.blocks - 2; ++i)
            make_block();
        make_globals();
        for (int i = 0; i < options_.signals; ++i)
            make_signal();
        for (int i = 0; i < options_.connections; ++i)
            connect();
        if (text_) connect_unused_globals();
        for (int i = 0; i < options_.merges && !text_; ++i)
            merge();
        for (int i = 0; i < options_.map_signals; ++i)
            make_map_signal();
        set_phys_parents();
        if (text_) {
            collect_text_targets();
            for (int i = 0; i < options_.props; ++i)
                add_text_prop(pick(targets_));
            for (int i = 0; i < 3; ++i)
                add_text_prop({&design_, nullptr});
            keep_unconnected_signals();
            pin_refs_last();
            return;
        }
        collect_targets();
        for (int i = 0; i < options_.props; ++i)
            add_prop(pick(targets_));
        for (int i = 0; i < 3; ++i)
            add_prop({&design_, nullptr});
    }

  private:
    uint32_t below(uint32_t n) { return n == 0 ? 0 : static_cast<uint32_t>(rng_() % n); }
    bool chance(int percent) { return below(100) < static_cast<uint32_t>(percent); }
    template <class T>
    T* pick(const std::vector<T*>& list) {
        return list.empty() ? nullptr : list[below(static_cast<uint32_t>(list.size()))];
    }

    /// A name: now and then absent, empty or with odd characters. The text
    /// stays valid until the next call; the database keeps its own copy.
    const char* name(const char* stem) {
        const uint32_t roll = below(100);
        if (roll < 6 && !text_) return nullptr;
        if (roll < 12 && !text_) return "";
        name_ = stem + std::to_string(++counter_);
        if (roll < 16) name_ += " with space";
        if (roll < 19) name_ += options_.quotes_in_names ? "\"q\\\xc3\xa9" : "(q)\\\xc3\xa9{}";
        return name_.c_str();
    }

    void make_roots() {
        const bool logical = chance(92);
        if (logical)
            add_logical(design_.create_logblock(nullptr, static_cast<uint16_t>(below(4)),
                                                root_name("top")));
        if (!logical || chance(70)) {
            add_physical(design_.create_physblock(nullptr, static_cast<uint16_t>(below(4)),
                                                  root_name("chip")));
        }
    }

    /// In text, blocks with children become designs named after their
    /// hierarchical names: the design's name in the root's keeps those apart
    /// across a library.
    const char* root_name(const char* stem) {
        if (!text_) return name(stem);
        const char* design_name = design_.get_name();
        name_ = std::string(design_name ? design_name : "") + "_" + name(stem);
        return name_.c_str();
    }

    void make_block() {
        const bool physical = log_parents_.empty() || (!phys_parents_.empty() && chance(35));
        const bool primitive = chance(45);
        const char* block_name = name(primitive ? "p" : "u");
        if (primitive) {
            const int32_t type = next_type_++ % HX_PRIMITIVE_TYPE_COUNT;
            const uint16_t width = HX_PRIMITIVE::type_has_width(type)
                                       ? static_cast<uint16_t>((text_ ? 2 : 1) + below(3))
                                       : HX_NO_INDEX;
            if (physical) {
                add_physical(design_.create_physprim(pick(phys_parents_), type, width, block_name));
            } else {
                add_logical(design_.create_logprim(pick(log_parents_), type, width, block_name));
            }
            return;
        }
        const auto width = static_cast<uint16_t>(below(6));
        if (physical) {
            add_physical(design_.create_physblock(pick(phys_parents_), width, block_name));
        } else {
            add_logical(design_.create_logblock(pick(log_parents_), width, block_name));
        }
    }

    void add_logical(HX_BASELOGBLOCK* block) {
        if (block == nullptr) return;
        logical_.push_back(block);
        if (!block->is_primitive() && (!options_.flat || logical_.size() == 1))
            log_parents_.push_back(block);
        dress_block(block);
    }

    void add_physical(HX_BASEPHYSBLOCK* block) {
        if (block == nullptr) return;
        physical_.push_back(block);
        if (!block->is_primitive() && (!options_.flat || physical_.size() == 1))
            phys_parents_.push_back(block);
        dress_block(block);
    }

    void dress_block(HX_BLOCK* block) {
        blocks_.push_back(block);
        if (chance(20)) {
            const auto user = static_cast<uint8_t>(1 + below(3));
            if (!text_)
                block->set_user(user);
            else if (!block->is_physical())
                block->set_user(1);
        }
        for (uint16_t i = 0; i < block->get_pin_count(); ++i)
            dress_pin(block, block->get_pin(i));
    }

    void dress_pin(HX_BLOCK* block, HX_PIN* pin) {
        pins_.push_back(pin);
        pin_blocks_.push_back(block);
        if (!block->is_primitive()) {
            const bool named = chance(85);
            const bool dup = !named && chance(50);
            pin->set_name(named || text_ ? name("P") : (dup ? "dup" : nullptr));
            pin->set_dir(static_cast<uint8_t>(below(5)));
        } else {
            if (chance(10)) pin->set_name(name("R"));
            if (chance(20)) pin->set_inverted(1);
            if (chance(5)) {
                const auto dir = static_cast<uint8_t>(below(5));
                if (!text_) pin->set_dir(dir);  // text keeps the role's own direction
            }
        }
        if (chance(10) && !text_) pin->set_mapinv(1);
    }

    void make_globals() {
        for (int i = 0; i < options_.globals; ++i) {
            const bool empty = i == 0 && chance(30) && !text_;
            const std::string text = empty ? "" : "G" + std::to_string(i);
            if (HX_SIGNAL* global = design_.create_global_signal(text.c_str())) {
                globals_.push_back(global);
            }
        }
    }

    void make_signal() {
        HX_BLOCK* owner = chance(80) ? pick(containers()) : pick(blocks_);
        if (text_) owner = pick(sections());
        if (owner == nullptr) return;
        if (HX_SIGNAL* signal = design_.create_signal(owner, name("n"))) {
            signals_.push_back(signal);
            signals_of_[owner].push_back(signal);
        }
    }

    std::vector<HX_BLOCK*> containers() const {
        std::vector<HX_BLOCK*> out(log_parents_.begin(), log_parents_.end());
        out.insert(out.end(), phys_parents_.begin(), phys_parents_.end());
        return out;
    }

    /// The blocks whose signals a text netlist holds: roots and blocks with
    /// children.
    std::vector<HX_BLOCK*> sections() const {
        std::vector<HX_BLOCK*> out;
        for (HX_BLOCK* block : containers()) {
            if (block->get_parent() == nullptr || block->child_count() != 0) out.push_back(block);
        }
        return out;
    }

    /// Joins a signal to a block pin: the inner side from the block's own
    /// signals, the outer side from its parent's signals or the globals.
    void connect() {
        HX_BLOCK* block = pick(blocks_);
        if (block == nullptr || block->get_pin_count() == 0) return;
        const auto index = static_cast<uint16_t>(below(block->get_pin_count()));
        HX_SIGNAL* signal = nullptr;
        if (chance(40)) {
            signal = pick(signals_of_[block]);
        } else if (block->get_parent() != nullptr && chance(80)) {
            signal = pick(signals_of_[block->get_parent()]);
        } else if (!text_ || block->get_parent() != nullptr) {
            signal = pick(globals_);  // a root pin has no outer side in text
        }
        if (signal != nullptr && design_.create_conn(signal, block, index) != nullptr)
            connected_.insert(signal);
    }

    /// Text names a global signal only where a child pin carries it: each
    /// goes on the first free outer side of a child pin.
    void connect_unused_globals() {
        for (HX_SIGNAL* global : globals_) {
            for (size_t i = 0; i < pins_.size() && !connected_.contains(global); ++i) {
                HX_BLOCK* block = pin_blocks_[i];
                if (block->get_parent() == nullptr || pins_[i]->get_outer_signal() != nullptr)
                    continue;
                const auto index = static_cast<uint16_t>(pins_[i] - block->get_pin(0));
                if (design_.create_conn(global, block, index) != nullptr) connected_.insert(global);
            }
        }
    }

    /// The reader resolves pin references once a block's pins are all
    /// named, and attaches them then: after the pin's other properties.
    void pin_refs_last() {
        for (HX_PIN* pin : pins_) {
            auto* iter = pin->create_prop_iter();
            if (iter == nullptr) continue;
            std::vector<std::unique_ptr<HX_PROPERTY>> refs;
            while (const HX_PROPERTY* prop = iter->l_next()) {
                if (prop->get_kind() == HX_PROP_PINREF) refs.push_back(prop->clone(nullptr));
            }
            pin->delete_prop_iter(iter);
            for (auto& ref : refs) {
                pin->delete_prop(ref->get_name(), 0);
                pin->create_prop(std::move(ref), nullptr);
            }
        }
    }

    /// A signal that no pin names reaches text only through a property.
    void keep_unconnected_signals() {
        for (HX_SIGNAL* signal : signals_) {
            if (!connected_.contains(signal))
                signal->get_network()->create_prop("KEEP", HX_PROP_FLAG);
        }
    }

    void merge() {
        HX_SIGNAL* global = pick(globals_);
        HX_SIGNAL* signal = pick(signals_);
        if (global == nullptr || signal == nullptr) return;
        HX_BLOCK* owner = signal->get_block();
        HX_SIGNAL* merged = signal;
        if (!design_.merge_signals(global, merged, 0, static_cast<uint8_t>(below(2)))) return;
        std::erase(signals_, signal);
        std::erase(signals_of_[owner], signal);
    }

    void make_map_signal() {
        HX_BASEPHYSBLOCK* block = pick(physical_);
        if (block == nullptr || block->get_pin_count() == 0) return;
        const auto index = static_cast<uint16_t>(below(block->get_pin_count()));
        const char* map_name = name("m");
        // Text carries a map signal's name when it has one that is not empty.
        const bool unnamed = text_ && (map_name == nullptr || *map_name == '\0');
        HX_MAPSIGNAL* map = block->create_map_signal(index, unnamed ? nullptr : map_name);
        if (map == nullptr) return;
        maps_.push_back(map);
        const uint32_t links = below(4);
        for (uint32_t i = 0; i < links; ++i) {
            HX_BASELOGBLOCK* log = pick(logical_);
            if (log == nullptr || log->get_pin_count() == 0) continue;
            const auto pin = static_cast<uint16_t>(below(log->get_pin_count()));
            if (text_ && !map_into(log, block)) continue;
            if (map->create_mapconn(log, pin) != nullptr && text_ && chance(30))
                log->get_pin(pin)->set_mapinv(1);
        }
    }

    /// In text a map connection also makes the map signal's block the
    /// logical block's physical parent.
    bool map_into(HX_BASELOGBLOCK* log, HX_BASEPHYSBLOCK* phys) {
        if (log->get_phys_parent() == nullptr) design_.set_block_phys_parent(log, phys);
        return log->get_phys_parent() == phys;
    }

    void set_phys_parents() {
        if (physical_.empty()) return;
        for (HX_BASELOGBLOCK* log : logical_) {
            if (chance(30)) design_.set_block_phys_parent(log, pick(physical_));
        }
    }

    /// What a property on an object may be, in text.
    enum class Role { kObject, kPin, kSignal };

    /// An object that can carry properties; `block` is set when it is one
    /// (in text also: the block of a pin).
    struct Target {
        HX_OBJECT* object;
        HX_BLOCK* block;
        Role role = Role::kObject;
    };

    template <class T>
    void add_targets(const std::vector<T*>& list) {
        for (T* item : list)
            targets_.push_back({item, nullptr});
    }

    void collect_targets() {
        targets_.push_back({&design_, nullptr});
        if (design_.get_library() != nullptr) targets_.push_back({design_.get_library(), nullptr});
        for (HX_BLOCK* block : blocks_)
            targets_.push_back({block, block});
        add_targets(pins_);
        add_targets(signals_);
        add_targets(globals_);
        add_targets(maps_);
        for (HX_SIGNAL* signal : signals_)
            targets_.push_back({signal->get_network(), nullptr});
        for (HX_SIGNAL* signal : globals_)
            targets_.push_back({signal->get_network(), nullptr});
    }

    /// Targets whose properties text carries: no roots or root pins.
    void collect_text_targets() {
        targets_.push_back({&design_, nullptr});
        if (design_.get_library() != nullptr) targets_.push_back({design_.get_library(), nullptr});
        for (HX_BLOCK* block : blocks_) {
            if (block->get_parent() != nullptr) targets_.push_back({block, block});
        }
        for (size_t i = 0; i < pins_.size(); ++i) {
            if (pin_blocks_[i]->get_parent() != nullptr)
                targets_.push_back({pins_[i], pin_blocks_[i], Role::kPin});
        }
        for (HX_SIGNAL* signal : signals_)
            targets_.push_back({signal, nullptr, Role::kSignal});
        for (HX_SIGNAL* signal : globals_)
            targets_.push_back({signal, nullptr, Role::kSignal});
        add_targets(maps_);
        for (HX_SIGNAL* signal : signals_)
            targets_.push_back({signal->get_network(), nullptr});
        for (HX_SIGNAL* signal : globals_)
            targets_.push_back({signal->get_network(), nullptr});
    }

    /// A property that reads back from text as itself: its kind is the one
    /// its name and value give on reading.
    void add_text_prop(Target target) {
        static const char* const kSignalNames[] = {"SIG_ALIAS", "USER_ALIAS", "RECOVERED_NAME"};
        static const char* const kNames[] = {"P0",    "P1",   "P2",       "X Y",
                                             "DRIVE", "LOAD", "MAXDELAY", "CLKREF"};
        const size_t choices = target.role == Role::kPin ? 8 : 6;  // timing, pin refs: pins only
        const char* prop_name = target.role == Role::kSignal
                                    ? kSignalNames[below(std::size(kSignalNames))]
                                    : kNames[below(static_cast<uint32_t>(choices))];
        HX_OBJECT* object = target.object;
        if (chance(10) && object->find_prop(prop_name) != nullptr)
            object->delete_prop(prop_name, 0);
        object->create_prop(make_text_value(target.block, prop_name), nullptr);
    }

    std::unique_ptr<HX_PROPERTY> make_text_value(HX_BLOCK* block, const char* prop_name) {
        const std::string_view name(prop_name);
        if (name == "DRIVE")
            return HX_PROPERTY::make_int(prop_name, chance(25) ? INT32_MAX : random_int() | 1);
        if (name == "LOAD") return HX_PROPERTY::make_float(prop_name, sixth_decimal_float());
        if (name == "MAXDELAY") return HX_PROPERTY::make_timing(prop_name, timing());
        if (name == "CLKREF") return pinref(block, prop_name);
        switch (below(3)) {
            case 0:
                return HX_PROPERTY::make_flag(prop_name);
            case 1:
                return HX_PROPERTY::make_text(prop_name, HX_PROP_PARAM, text());
            default: {
                static const char* const kTexts[] = {"abc", "two words", "q'uote\\",
                                                     "\xc3\xa9t\xc3\xa9", "line\tend"};
                return HX_PROPERTY::make_text(prop_name, HX_PROP_STRING,
                                              kTexts[below(std::size(kTexts))]);
            }
        }
    }

    /// A float that "%f" writes exactly: a whole number of 64ths.
    double sixth_decimal_float() {
        if (chance(10)) return -0.0;
        const auto whole = static_cast<int64_t>(rng_() >> 24) - (int64_t{1} << 39);
        return std::ldexp(static_cast<double>(whole), -6);
    }

    Target pick(const std::vector<Target>& list) {
        return list.empty() ? Target{&design_, nullptr}
                            : list[below(static_cast<uint32_t>(list.size()))];
    }

    void add_prop(Target target) {
        HX_OBJECT* object = target.object;
        static const char* const kNames[] = {"P0", "P1",    "P2",  "P3",   "P4",      "LOAD",
                                             "",   "DRIVE", "X Y", "TYPE", "MAXDELAY"};
        const char* prop_name = kNames[below(std::size(kNames))];
        if (chance(10) && object->find_prop(prop_name) != nullptr) {
            object->delete_prop(prop_name, 0);  // created again below: goes last
        }
        object->create_prop(make_value(target.block, prop_name), nullptr);
    }

    std::unique_ptr<HX_PROPERTY> make_value(HX_BLOCK* block, const char* prop_name) {
        switch (below(HX_PROP_TYPE_COUNT)) {
            case HX_PROP_FLAG:
                return HX_PROPERTY::make_flag(prop_name);
            case HX_PROP_INT:
                return HX_PROPERTY::make_int(prop_name, random_int());
            case HX_PROP_FLOAT:
                return HX_PROPERTY::make_float(prop_name, random_float());
            case HX_PROP_STRING:
                return HX_PROPERTY::make_text(prop_name, HX_PROP_STRING, text());
            case HX_PROP_OBJECT:
                return HX_PROPERTY::make_object(prop_name,
                                                chance(10) ? nullptr : pick(targets_).object);
            case HX_PROP_TIMING:
                return HX_PROPERTY::make_timing(prop_name, timing());
            case HX_PROP_PINREF:
                return pinref(block, prop_name);
            case HX_PROP_PARAM:
                return HX_PROPERTY::make_text(prop_name, HX_PROP_PARAM, text());
            default:
                return HX_PROPERTY::make_text(prop_name, HX_PROP_TIMINGSTR, "TS_CLK=PERIOD 10 ns");
        }
    }

    int32_t random_int() {
        switch (below(4)) {
            case 0:
                return INT32_MIN;
            case 1:
                return INT32_MAX;
            default:
                return static_cast<int32_t>(below(2000)) - 1000;
        }
    }

    double random_float() {
        if (chance(10)) return -0.0;
        return std::ldexp(static_cast<double>(rng_() >> 11), static_cast<int>(below(80)) - 70) *
               (chance(50) ? -1.0 : 1.0);
    }

    const char* text() {
        static const char* const kTexts[] = {
            "", "abc", "two words", "q\"uote\\", "\xc3\xa9t\xc3\xa9", "line\tend", "@not a param"};
        const char* text = kTexts[below(std::size(kTexts))];
        return options_.quotes_in_names || std::strchr(text, '"') == nullptr ? text : "q'uote\\";
    }

    int32_t time_value() {
        return chance(25) ? HX_TIME_UNSET : static_cast<int32_t>(below(100000));
    }

    HX_PROP_TIMING_DATA timing() {
        HX_PROP_TIMING_DATA record;
        record.min = time_value();
        record.max = time_value();
        record.unit = static_cast<int32_t>(below(4));
        return record;
    }

    /// A pin reference names a pin of the same block; other objects get a
    /// timing record instead.
    std::unique_ptr<HX_PROPERTY> pinref(HX_BLOCK* block, const char* prop_name) {
        if (block == nullptr || block->get_pin_count() == 0) {
            return HX_PROPERTY::make_timing(prop_name, timing());
        }
        HX_PROP_PINREF_DATA record;
        const HX_PROP_TIMING_DATA delay = timing();
        record.min = delay.min;
        record.max = delay.max;
        record.unit = delay.unit;
        record.pin = static_cast<uint16_t>(below(block->get_pin_count()));
        record.edge = chance(50) ? HX_EDGE_RISING : HX_EDGE_FALLING;
        record.inverted = static_cast<uint8_t>(below(2));
        return HX_PROPERTY::make_pinref(prop_name, record);
    }

    HX_DESIGN& design_;
    std::mt19937_64 rng_;
    RandomDesignOptions options_;
    bool text_;  // only what a text netlist carries
    std::string name_;
    int counter_ = 0;
    int32_t next_type_ = 0;
    std::vector<HX_BLOCK*> blocks_;
    std::vector<HX_BASELOGBLOCK*> logical_, log_parents_;
    std::vector<HX_BASEPHYSBLOCK*> physical_, phys_parents_;
    std::vector<HX_PIN*> pins_;
    std::vector<HX_BLOCK*> pin_blocks_;  // the block of each of pins_
    std::unordered_set<HX_SIGNAL*> connected_;
    std::vector<HX_SIGNAL*> signals_, globals_;
    std::unordered_map<HX_BLOCK*, std::vector<HX_SIGNAL*>> signals_of_;
    std::vector<HX_MAPSIGNAL*> maps_;
    std::vector<Target> targets_;
};

}  // namespace

void fill_random_design(HX_DESIGN& design, uint64_t seed, const RandomDesignOptions& options) {
    Generator(design, seed, options).run();
}

HX_LIBRARY* make_random_library(HX_ENVIRONMENT& env, uint64_t seed, int designs,
                                const RandomDesignOptions& options) {
    const bool text = options.text_expressible;
    std::mt19937_64 rng(seed);
    const auto casesense = static_cast<uint8_t>(rng() % 2);
    const std::string lib_name = "lib" + std::to_string(seed);
    const bool unnamed = rng() % 8 == 0 && !text;
    HX_LIBRARY* library = env.create_library(unnamed ? "" : lib_name.c_str(), casesense);
    for (int i = 0; i < designs; ++i) {
        // With case sense on, names that differ only in case are distinct designs.
        const std::string name =
            (casesense && i % 2 == 1) ? "D" + std::to_string(i - 1) : "d" + std::to_string(i);
        HX_DESIGN* design = library->create_design(name.c_str());
        if (design == nullptr) continue;
        fill_random_design(*design, rng(), options);
        if (rng() % 2 == 0) library->alias_design(name.c_str(), ("alias_" + name).c_str());
    }
    const auto version = static_cast<int32_t>(rng() % 100);
    if (text)
        library->create_prop("LIBVER", std::to_string(version).c_str(), 1);
    else
        library->create_prop("LIBVER", version);
    if (rng() % 2 == 0) library->create_prop("NOTE", "made by the test generator", 1);
    return library;
}

}  // namespace vrx_test
