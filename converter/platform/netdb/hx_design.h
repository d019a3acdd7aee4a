// The netlist database: designs and what they hold.
//
// A design owns its blocks (a logical and a physical hierarchy, each under
// at most one root), their pins, the signals inside blocks, the design's
// global signals, the networks that group connected signals, connections and
// map signals. Objects live in the design's arenas and never move while the
// design exists, so their addresses identify them. Names live in the design's
// text arena; a name may be absent (null) or empty, and the two stay apart.
//
// Lookups by key (network tag, global signal name, a pin's map signal, a
// block's physical parent) are hashed; nothing scans a list per lookup.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <unordered_map>
#include <vector>

#include "hx_property.h"
#include "hx_types.h"
#include "ut_blist_iter.h"
#include "ut_darray.h"
#include "ut_lazy_map.h"

class HX_BLOCK;
class HX_BASELOGBLOCK;
class HX_BASEPHYSBLOCK;
class HX_CONN;
class HX_DESIGN;
class HX_LIBRARY;
class HX_MAPSIGNAL;
class HX_NETWORK;
class HX_PRIMITIVE;
class HX_SIGNAL;
struct HX_DESIGN_STORAGE;

/// A pin of a block or primitive.
///
/// Layout, 40 bytes: properties 8 | name 8 | outer signal 8 | inner signal 8 |
/// index u16 | direction u8 | map inversion u8 | role u8 | inverted u8 | pad 2.
/// A block's pins sit in one array that is preceded by a pointer to the
/// block, which is how a pin finds its block without storing it.
class HX_PIN : public HX_OBJECT {
  public:
    const char* get_name() const { return name_; }
    void set_name(const char* name);
    uint16_t get_index() const { return index_; }
    HX_BLOCK* get_block() const;

    uint8_t get_dir() const { return dir_; }
    void set_dir(uint8_t dir) { dir_ = dir; }
    /// The signal outside the block (in its parent, or global).
    HX_SIGNAL* get_outer_signal() const { return outer_; }
    /// The signal inside the block (in the block itself).
    HX_SIGNAL* get_inner_signal() const { return inner_; }
    HX_MAPSIGNAL* get_map_signal() const;
    uint8_t get_mapinv() const { return mapinv_; }
    void set_mapinv(uint8_t value) { mapinv_ = value; }

    /// Primitive pins: the role (HX_PIN_PRIMITIVE_TYPE) and the inversion flag.
    uint8_t get_role() const { return role_; }
    uint8_t get_inverted() const { return inverted_; }
    void set_inverted(uint8_t value) { inverted_ = value; }

  private:
    friend class HX_DESIGN;
    friend class HX_BLOCK;
    friend class HX_FILE_IO;
    friend class HX_GRAFT;
    HX_PIN() = default;

    const char* name_ = nullptr;
    HX_SIGNAL* outer_ = nullptr;
    HX_SIGNAL* inner_ = nullptr;
    uint16_t index_ = 0;
    uint8_t dir_ = HX_PIN_NOTYPE;
    uint8_t mapinv_ = 0;
    uint8_t role_ = 0;
    uint8_t inverted_ = 0;
};

/// Pins of primitives are plain pins whose role and inversion flag matter.
using HX_PIN_PRIMITIVE = HX_PIN;

/// What a block holds beyond its pins: made when it gets its first child or
/// signal, so primitives and other leaves never pay for it.
struct HX_BLOCK_LISTS {
    std::vector<HX_BLOCK*> children;
    std::vector<HX_SIGNAL*> signals;  // holes where signals were deleted
    uint32_t depth = 0;               // below the root
};

/// Common part of every block and primitive.
///
/// Layout, 56 bytes: properties 8 | name 8 | design 8 | parent 8 | pins 8 |
/// lists 8 (children, signals and depth, made on first use) | pin count u16 |
/// kind flags u8 | user flag u8 | 4 bytes that a primitive's own fields reuse.
class HX_BLOCK : public HX_OBJECT {
  public:
    uint16_t get_pin_count() const { return pin_count_; }
    /// The pin at `index`, or null when out of range.
    HX_PIN* get_pin(uint16_t index) const { return index < pin_count_ ? &pins_[index] : nullptr; }
    /// HX_BLK_PHYSICAL and HX_BLK_PRIMITIVE bits.
    uint8_t get_flags() const { return flags_; }
    bool is_physical() const { return (flags_ & HX_BLK_PHYSICAL) != 0; }
    bool is_primitive() const { return (flags_ & HX_BLK_PRIMITIVE) != 0; }
    /// The primitive this block is, or null.
    HX_PRIMITIVE* get_primitive();
    const HX_PRIMITIVE* get_primitive() const;

    const char* get_name() const { return name_; }
    void set_name(const char* name);
    HX_DESIGN* get_design() const { return design_; }
    HX_BLOCK* get_parent() const { return parent_; }
    uint8_t get_user() const { return user_; }
    void set_user(uint8_t value) { user_ = value; }
    /// Logical blocks: the physical block this one maps into, or null.
    HX_BASEPHYSBLOCK* get_phys_parent() const;
    /// Depth below the root (the root is 0).
    uint32_t get_depth() const {
        if (lists_ != nullptr) return lists_->depth;
        return parent_ != nullptr ? parent_->lists_->depth + 1 : 0;
    }

    /// Names from the root down to this block joined by "/"; empty when this
    /// block's own name is absent or empty. The text stays valid until the
    /// next get_hiername or network name of the same design.
    const char* get_hiername() const;
    /// Index of the pin called `name`, or HX_NO_INDEX. Exact names are found
    /// by key (an index is kept for blocks with many pins); `ignore_case`
    /// compares ASCII letters without regard to case.
    uint16_t find_pin(const char* name, uint8_t ignore_case) const;
    /// False when two pins of a non-primitive block share a non-empty name;
    /// with `require_names` set, also when a pin has no name.
    bool check_pins(uint8_t require_names) const;
    /// No child blocks and no signals of its own.
    bool isempty() const;

    size_t child_count() const { return lists_ ? lists_->children.size() : 0; }
    UT_BLIST_ITER<HX_BLOCK>* create_child_iter() const;
    void delete_child_iter(UT_BLIST_ITER<HX_BLOCK>* iter) const { delete iter; }
    /// The block's own signals in creation order.
    UT_BLISTS_ITER<HX_SIGNAL>* create_signal_iter() const;
    void delete_signal_iter(UT_BLISTS_ITER<HX_SIGNAL>* iter) const { delete iter; }
    /// Global signals on the outer side of a child's pin or of one of this
    /// block's own pins, each once, in the order first met. With `own_pins`
    /// clear only the children's pins are looked at.
    UT_BLIST_ITER<HX_SIGNAL>* create_global_siglist(uint8_t own_pins) const;
    void delete_global_siglist(UT_BLIST_ITER<HX_SIGNAL>* iter) const;

  protected:
    HX_BLOCK() = default;
    ~HX_BLOCK();

  private:
    friend class HX_DESIGN;
    friend class HX_FILE_IO;
    friend class HX_GRAFT;

    HX_BLOCK_LISTS& lists();
    const std::vector<HX_SIGNAL*>* signal_list() const {
        return lists_ ? &lists_->signals : nullptr;
    }

    const char* name_ = nullptr;
    HX_DESIGN* design_ = nullptr;
    HX_BLOCK* parent_ = nullptr;
    HX_PIN* pins_ = nullptr;
    HX_BLOCK_LISTS* lists_ = nullptr;
    uint16_t pin_count_ = 0;
    uint8_t flags_ = 0;
    uint8_t user_ = 0;
};

class HX_BASELOGBLOCK : public HX_BLOCK {
  protected:
    HX_BASELOGBLOCK() = default;
};

class HX_BASEPHYSBLOCK : public HX_BLOCK {
  public:
    /// A map signal on pin `index`, whose first connection is that pin.
    /// Null when the index is out of range or the pin has a map signal.
    HX_MAPSIGNAL* create_map_signal(uint16_t index, const char* name);
    /// Logical blocks whose physical parent this block is, in the order
    /// they were given it.
    UT_BLIST_ITER<HX_BLOCK>* create_log_child_iter() const;
    void delete_log_child_iter(UT_BLIST_ITER<HX_BLOCK>* iter) const { delete iter; }

  protected:
    HX_BASEPHYSBLOCK() = default;
};

class HX_LOGBLOCK : public HX_BASELOGBLOCK {
  private:
    friend class HX_DESIGN;
    HX_LOGBLOCK() = default;
};

class HX_PHYSBLOCK : public HX_BASEPHYSBLOCK {
  private:
    friend class HX_DESIGN;
    HX_PHYSBLOCK() = default;
};

/// The primitive side of HX_LOGPRIM and HX_PHYSPRIM: type and width.
/// Pins are made with the primitive, one per role (a repeated role once per
/// width bit), named after the role with the ordinal for repeated roles.
class HX_PRIMITIVE {
  public:
    HX_BLOCK* get_block();
    const HX_BLOCK* get_block() const;
    uint8_t get_type() const { return type_; }
    /// The width of a type that takes one, else HX_NO_INDEX.
    uint16_t get_width() const { return width_; }
    uint16_t get_pin_count() const;
    HX_PIN_PRIMITIVE* get_prim_pin(uint16_t index) const;
    /// Index of the `ordinal`-th pin of `role` (HX_NO_INDEX: the first), or
    /// HX_NO_INDEX when there is none.
    uint16_t get_prim_index(int32_t role, uint16_t ordinal) const;
    /// True for the roles that this type repeats (AND inputs, RAM addresses).
    bool is_param_pin(int32_t role) const;

    /// True when `type` takes a width.
    static bool type_has_width(int32_t type);
    /// Pin count of a primitive of `type` and `width`, or 0 when the type is
    /// unknown or the count would not fit in 16 bits.
    static uint32_t pin_count_for(int32_t type, uint16_t width);

  protected:
    HX_PRIMITIVE(uint8_t type, uint16_t width, bool physical)
        : type_(type), physical_(physical), width_(width) {}

  private:
    uint8_t type_;
    uint8_t physical_;
    uint16_t width_;
};

class HX_LOGPRIM : public HX_BASELOGBLOCK, public HX_PRIMITIVE {
  public:
    using HX_BASELOGBLOCK::get_pin_count;

  private:
    friend class HX_DESIGN;
    HX_LOGPRIM(uint8_t type, uint16_t width) : HX_PRIMITIVE(type, width, false) {}
};

class HX_PHYSPRIM : public HX_BASEPHYSBLOCK, public HX_PRIMITIVE {
  public:
    using HX_BASEPHYSBLOCK::get_pin_count;

  private:
    friend class HX_DESIGN;
    HX_PHYSPRIM(uint8_t type, uint16_t width) : HX_PRIMITIVE(type, width, true) {}
};

/// A net inside one block, or a global signal (no block).
///
/// Layout, 56 bytes: properties 8 | name 8 | owner 8 (the block, or for a
/// global signal the design with the low bit set) | network 8 | last
/// connection 8 (circular list) | next member of the network 8 (circular) |
/// position in the owner's signal list u32 | pad 4.
class HX_SIGNAL : public HX_OBJECT {
  public:
    const char* get_name() const { return name_; }
    void set_name(const char* name);
    /// Owning block; null for a global signal.
    HX_BLOCK* get_block() const {
        return (owner_ & 1) ? nullptr : reinterpret_cast<HX_BLOCK*>(owner_);
    }
    bool is_global() const { return (owner_ & 1) != 0; }
    HX_NETWORK* get_network() const { return network_; }
    HX_DESIGN* get_design() const;

    class CONN_ITER;
    /// Connections in the order they were made.
    CONN_ITER* create_conn_iter() const;
    void delete_conn_iter(CONN_ITER* iter) const;

  private:
    friend class HX_DESIGN;
    friend class HX_NETWORK;
    friend class HX_FILE_IO;
    HX_SIGNAL() = default;

    const char* name_ = nullptr;
    uintptr_t owner_ = 0;
    HX_NETWORK* network_ = nullptr;
    HX_CONN* last_conn_ = nullptr;
    HX_SIGNAL* next_member_ = nullptr;
    uint32_t slot_ = 0;
};

/// A connection of a signal or map signal to a pin.
///
/// Layout, 16 bytes: pin 8 | next connection of the same owner 8.
class HX_CONN {
  public:
    HX_PIN* get_pin() const { return pin_; }
    HX_BLOCK* get_block() const { return pin_->get_block(); }
    uint16_t get_index() const { return pin_->get_index(); }

  private:
    friend class HX_DESIGN;
    friend class HX_SIGNAL;
    friend class HX_MAPSIGNAL;
    friend class HX_BASEPHYSBLOCK;
    friend class HX_CONN_LIST_ITER;
    friend class HX_FILE_IO;
    HX_PIN* pin_ = nullptr;
    HX_CONN* next_ = nullptr;
};

/// Iterator over a circular list of connections.
class HX_CONN_LIST_ITER {
  public:
    explicit HX_CONN_LIST_ITER(HX_CONN* const* last) : last_(last) {}
    HX_CONN* l_next();

  private:
    HX_CONN* const* last_;
    HX_CONN* prev_ = nullptr;
    bool done_ = false;
};

class HX_SIGNAL::CONN_ITER : public HX_CONN_LIST_ITER {
  public:
    using HX_CONN_LIST_ITER::HX_CONN_LIST_ITER;
};

/// The signals of one net across the hierarchy.
///
/// Layout, 40 bytes: properties 8 | highest signal 8 | last member 8
/// (circular list through the signals) | tag u32 | position in the design's
/// network list u32 | member count u32.
class HX_NETWORK : public HX_OBJECT {
  public:
    uint32_t get_tag() const { return tag_; }
    /// Its place in the design's network order (HX_DESIGN::network_at).
    uint32_t get_slot() const { return slot_; }
    /// The member nearest the root; a global signal is highest of all.
    HX_SIGNAL* get_highest_signal() const { return highest_; }
    uint32_t get_member_count() const { return members_; }
    /// The hierarchical name of the highest signal ("top/u1/n"), the plain
    /// name for a global signal, or null when the highest signal has no
    /// name. Valid until the next name asked of the same design.
    const char* get_name() const;
    /// Members, starting after the last one added.
    UT_BLIST_ITER<HX_SIGNAL>* create_signal_iter() const;
    void delete_signal_iter(UT_BLIST_ITER<HX_SIGNAL>* iter) const;

  private:
    friend class HX_DESIGN;
    friend class HX_FILE_IO;
    HX_NETWORK() = default;

    HX_SIGNAL* highest_ = nullptr;
    HX_SIGNAL* last_member_ = nullptr;
    uint32_t tag_ = 0;
    uint32_t slot_ = 0;
    uint32_t members_ = 0;
};

/// A map signal sits on a pin of a physical block and connects logical
/// pins that map onto it.
class HX_MAPSIGNAL : public HX_OBJECT {
  public:
    const char* get_name() const { return name_; }
    void set_name(const char* name);
    HX_BASEPHYSBLOCK* get_block() const { return block_; }
    /// Index of the physical pin it sits on.
    uint16_t get_pin_index() const { return pin_; }
    /// Connects pin `index` of logical block `block`. Null on a bad index, a
    /// physical block, a block of another design, or a pin that already has
    /// a map signal.
    HX_CONN* create_mapconn(HX_BLOCK* block, uint16_t index);
    /// Connections in the order made; the first is the physical pin.
    HX_SIGNAL::CONN_ITER* create_conn_iter() const;
    void delete_conn_iter(HX_SIGNAL::CONN_ITER* iter) const;

  private:
    friend class HX_DESIGN;
    friend class HX_BASEPHYSBLOCK;
    friend class HX_FILE_IO;
    HX_MAPSIGNAL() = default;

    const char* name_ = nullptr;
    HX_BASEPHYSBLOCK* block_ = nullptr;
    HX_CONN* last_conn_ = nullptr;
    uint16_t pin_ = 0;
};

/// A design of a library.
class HX_DESIGN : public HX_OBJECT {
  public:
    HX_DESIGN(HX_LIBRARY* library, const char* name);
    ~HX_DESIGN();
    HX_DESIGN(const HX_DESIGN&) = delete;
    HX_DESIGN& operator=(const HX_DESIGN&) = delete;

    const char* get_name() const { return name_; }
    void set_name(const char* name);
    HX_LIBRARY* get_library() const { return library_; }
    HX_BASELOGBLOCK* get_log_root() const { return log_root_; }
    HX_BASEPHYSBLOCK* get_phys_root() const { return phys_root_; }

    // Blocks. A null parent makes the root of that kind; null when the design
    // already has one, when the parent is of the other kind or of another
    // design, when the parent is a primitive other than the root (a root
    // primitive takes children), or (primitives) when the type is unknown, a width is missing,
    // or the pin count would not fit in 16 bits. A plain block has `width`
    // unnamed pins of direction NOTYPE.
    HX_LOGBLOCK* create_logblock(HX_BASELOGBLOCK* parent, uint16_t width, const char* name);
    HX_PHYSBLOCK* create_physblock(HX_BASEPHYSBLOCK* parent, uint16_t width, const char* name);
    HX_LOGPRIM* create_logprim(HX_BASELOGBLOCK* parent, int32_t type, uint16_t width,
                               const char* name);
    HX_PHYSPRIM* create_physprim(HX_BASEPHYSBLOCK* parent, int32_t type, uint16_t width,
                                 const char* name);

    /// A child of `root` named after `other`, with the pins (count, names,
    /// directions) of other's root of the same kind, and, unless
    /// `omit_type_prop` is set, the string property TYPE holding other's
    /// name. Null when other has no such root or `root` is not this design's.
    HX_LOGBLOCK* instantiate(HX_BASELOGBLOCK* root, HX_DESIGN* other, uint8_t omit_type_prop);
    HX_PHYSBLOCK* instantiate(HX_BASEPHYSBLOCK* root, HX_DESIGN* other, uint8_t omit_type_prop);
    /// Copies the contents of other's root of the instance's kind into
    /// `instance`: child blocks (recursively, with pins, flags and
    /// properties), signals, connections, networks with tags new to this
    /// design, map signals and physical parents inside the copy. Other's
    /// global signals become the same-named globals of this design. The
    /// inner signals of other's root pins become the inner signals of the
    /// instance's pins. `omit_props` copies no properties; `omit_maps` no map
    /// signals or physical parents; `globals_out`, when given, receives the
    /// names of the global signals used; `check_only` only tests that the
    /// instance matches. Returns the instance, or null (nothing changed)
    /// when its pins do not match other's root or it has contents already.
    HX_LOGBLOCK* graft(HX_LOGBLOCK* instance, HX_DESIGN* other, uint8_t omit_props,
                       uint8_t omit_maps, DARRAY_NAME* globals_out, uint8_t check_only);
    HX_PHYSBLOCK* graft(HX_PHYSBLOCK* instance, HX_DESIGN* other, uint8_t omit_props,
                        uint8_t omit_maps, DARRAY_NAME* globals_out, uint8_t check_only);

    /// A signal in `block` with a network of its own (new tag).
    HX_SIGNAL* create_signal(HX_BLOCK* block, const char* name);
    /// A global signal; null when one of that name exists.
    HX_SIGNAL* create_global_signal(const char* name);
    HX_SIGNAL* find_global_signal(const char* name) const;
    UT_BLIST_ITER<HX_SIGNAL>* create_global_iter() const;
    void delete_global_iter(UT_BLIST_ITER<HX_SIGNAL>* iter) const { delete iter; }

    /// Connects `signal` to pin `index` of `block`: the pin's inner signal
    /// when the signal belongs to the block, its outer signal when it belongs
    /// to the block's parent or is global. Joins the networks of a pin's two
    /// sides. Null (nothing changed) for a side that is taken, a bad index or
    /// a signal of another block or design.
    HX_CONN* create_conn(HX_SIGNAL* signal, HX_BLOCK* block, uint16_t index);

    /// Moves every connection of `signal` to `global`, joins their networks
    /// and points `signal` at `global`. The emptied signal is deleted unless
    /// `keep_signal` is set; its properties move to the global signal (those
    /// of the global signal win) unless `drop_props` is set. False (nothing
    /// changed) when `global` is not a global signal of this design, or
    /// `signal` is not a signal of this design.
    bool merge_signals(HX_SIGNAL* global, HX_SIGNAL*& signal, uint8_t keep_signal,
                       uint8_t drop_props);

    /// Makes `phys` the physical parent of logical block `log`. False when
    /// either is of the wrong kind or design, or `log` already has one.
    bool set_block_phys_parent(HX_BLOCK* log, HX_BASEPHYSBLOCK* phys);

    /// Every block in creation order.
    UT_BLIST_ITER<HX_BLOCK>* create_block_iter() const;
    void delete_block_iter(UT_BLIST_ITER<HX_BLOCK>* iter) const { delete iter; }
    /// Every network in creation order (joined-away networks are gone).
    UT_BLISTS_ITER<HX_NETWORK>* create_network_iter() const;
    void delete_network_iter(UT_BLISTS_ITER<HX_NETWORK>* iter) const { delete iter; }
    /// Map signals in creation order.
    UT_BLIST_ITER<HX_MAPSIGNAL>* create_mapsignal_iter() const;
    void delete_mapsignal_iter(UT_BLIST_ITER<HX_MAPSIGNAL>* iter) const { delete iter; }

    HX_NETWORK* find_net_tag(uint32_t tag) const;
    /// The network a tag property (MERGEDTO, MERGEDFROM, JOINED) names: the
    /// network with that tag, or, when that one was since joined into
    /// another, the network that took it over.
    HX_NETWORK* follow_net_tag(uint32_t tag) const;
    size_t block_count() const { return blocks_.size(); }
    /// The block made `position`-th (0 first), or null past the last.
    HX_BLOCK* block_at(size_t position) const {
        return position < blocks_.size() ? blocks_[position] : nullptr;
    }
    /// Positions in the network order: network_at(p) for p below
    /// network_slots() is the network at that place, or null where a network
    /// was joined away. A network keeps its place until it is joined away;
    /// new networks take places after the last.
    size_t network_slots() const { return networks_.size(); }
    HX_NETWORK* network_at(size_t slot) const {
        return slot < networks_.size() ? networks_[slot] : nullptr;
    }
    size_t network_count() const { return network_count_; }
    size_t global_count() const { return globals_.size(); }

    /// Copies `text` into the design's text arena (null stays null).
    const char* intern(const char* text);
    /// Scratch text for names that the database composes.
    std::string& name_buffer() const { return name_buffer_; }

  private:
    friend class HX_BLOCK;
    friend class HX_PIN;
    friend class HX_SIGNAL;
    friend class HX_NETWORK;
    friend class HX_MAPSIGNAL;
    friend class HX_BASEPHYSBLOCK;
    friend class HX_FILE_IO;
    friend class HX_GRAFT;

    template <class T, class... Args>
    T* make_block(HX_BLOCK* parent, uint16_t pin_count, const char* name, Args&&... args);
    template <class T>
    T* make_prim(HX_BLOCK* parent, int32_t type, uint16_t width, const char* name);
    HX_PIN* make_pins(HX_BLOCK* block, uint16_t count);
    void make_prim_pins(HX_BLOCK* block, HX_PRIMITIVE* prim);
    HX_SIGNAL* make_signal(const char* name);
    HX_NETWORK* make_network(HX_SIGNAL* first, uint32_t tag);
    HX_CONN* make_conn(HX_PIN* pin);
    static void append_conn(HX_CONN*& last, HX_CONN* conn);
    HX_MAPSIGNAL* make_mapsignal(HX_BASEPHYSBLOCK* block, uint16_t index, const char* name);
    uint32_t next_tag();
    void register_tag(HX_NETWORK* net);
    void join_networks(HX_NETWORK* a, HX_NETWORK* b);
    void exchange_identity(HX_NETWORK* x, HX_NETWORK* y);
    void drop_network(HX_NETWORK* net);
    void unlink_member(HX_SIGNAL* signal);
    void leave_network_for(HX_SIGNAL* signal, HX_NETWORK* net);
    void delete_signal(HX_SIGNAL* signal);
    void rename_global(HX_SIGNAL* signal, const char* name);
    /// Lets this design's blocks and pins point at names held by `source`.
    void share_text_of(const HX_DESIGN& source);
    bool owns(const HX_BLOCK* block) const { return block && block->design_ == this; }

    HX_LIBRARY* library_;
    const char* name_ = nullptr;
    HX_BASELOGBLOCK* log_root_ = nullptr;
    HX_BASEPHYSBLOCK* phys_root_ = nullptr;
    std::unique_ptr<HX_DESIGN_STORAGE> store_;
    std::vector<HX_BLOCK*> blocks_;
    std::vector<HX_NETWORK*> networks_;
    size_t network_count_ = 0;
    std::vector<HX_SIGNAL*> globals_;
    std::vector<HX_MAPSIGNAL*> mapsignals_;
    UT_LAZY_MAP<std::string_view, HX_SIGNAL*> global_by_name_;
    UT_LAZY_MAP<const HX_PIN*, HX_MAPSIGNAL*> mapsignal_of_pin_;
    UT_LAZY_MAP<const HX_BLOCK*, HX_BASEPHYSBLOCK*> phys_parent_;
    UT_LAZY_MAP<const HX_BLOCK*, std::vector<HX_BLOCK*>> log_children_;
    uint32_t last_tag_ = 0;
    mutable std::string name_buffer_;
};

/// The network of `design` whose tag is `tag`, or null.
HX_NETWORK* hx_find_net_tag(const HX_DESIGN* design, uint32_t tag);
