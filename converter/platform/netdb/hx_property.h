// Properties and the objects that carry them.
//
// Every database object carries an ordered list of properties whose names are
// unique within the object. Creating a property under a name the object
// already has replaces the old one in place (same position); deleting one and
// creating it again puts it last. Creation order is the order of iteration,
// and so the order in which the writer emits them.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "hx_types.h"
#include "ut_blist_iter.h"

class HX_OBJECT;

/// One named, typed value. Properties attached to an object belong to it; a
/// property made by a parser (Hxb_Util::parse_prop) belongs to its caller
/// until attached with HX_OBJECT::create_prop.
class HX_PROPERTY {
  public:
    HX_PROPERTY(const char* name, HX_PROP_TYPE kind);
    static std::unique_ptr<HX_PROPERTY> make_flag(const char* name);
    static std::unique_ptr<HX_PROPERTY> make_int(const char* name, int32_t value);
    static std::unique_ptr<HX_PROPERTY> make_float(const char* name, double value);
    /// String, parameter or timing-string kinds hold text.
    static std::unique_ptr<HX_PROPERTY> make_text(const char* name, HX_PROP_TYPE kind,
                                                  const char* text);
    static std::unique_ptr<HX_PROPERTY> make_object(const char* name, HX_OBJECT* target);
    static std::unique_ptr<HX_PROPERTY> make_timing(const char* name,
                                                    const HX_PROP_TIMING_DATA& record);
    static std::unique_ptr<HX_PROPERTY> make_pinref(const char* name,
                                                    const HX_PROP_PINREF_DATA& record);

    const char* get_name() const { return name_.c_str(); }
    HX_PROP_TYPE get_kind() const { return kind_; }
    /// True for the integer properties that hold a network's tag:
    /// MERGEDTO, MERGEDFROM and JOINED.
    bool names_network_tag() const;

    /// Value readers. Each fills or returns the value when the kind suits it
    /// (true / the value) and leaves the record untouched otherwise (false).
    bool get_pinref(HX_PROP_PINREF_DATA& record) const;
    bool get_timing(HX_PROP_TIMING_DATA& record) const;
    /// Text of a string, parameter or timing-string property; null otherwise.
    const char* get_text() const;
    double get_float() const { return kind_ == HX_PROP_FLOAT ? float_ : 0.0; }
    int32_t get_int() const { return kind_ == HX_PROP_INT ? int_ : 0; }
    HX_OBJECT* get_object() const { return kind_ == HX_PROP_OBJECT ? object_ : nullptr; }

    void set_int(int32_t value);
    void set_text(const char* text);

    /// True when `name` is a predefined property name; `kind` then receives
    /// its kind (and is left alone otherwise).
    static bool get_type(const char* name, HX_PROP_TYPE& kind);

    /// A copy under `name`, or under this property's own name when null.
    std::unique_ptr<HX_PROPERTY> clone(const char* name = nullptr) const;
    bool same_value(const HX_PROPERTY& other) const;

  private:
    std::string name_;
    HX_PROP_TYPE kind_;
    int32_t int_ = 0;
    double float_ = 0.0;
    HX_OBJECT* object_ = nullptr;
    std::string text_;
    HX_PROP_PINREF_DATA record_;  // timing kinds use its first three fields
};

/// The property list of one object. Deleting leaves a hole (null), so that a
/// walk may delete the property it stands on; holes are compacted once no
/// iterator is out. Long lists keep an index by name, so that adding or
/// finding a property never scans them.
class HX_PROPLIST {
  public:
    HX_PROPLIST() = default;
    ~HX_PROPLIST();
    HX_PROPLIST(const HX_PROPLIST&) = delete;
    HX_PROPLIST& operator=(const HX_PROPLIST&) = delete;

    HX_PROPERTY* find(const char* name) const;
    /// Attaches `prop`, replacing a property of the same name in place.
    HX_PROPERTY* put(std::unique_ptr<HX_PROPERTY> prop);
    bool remove(const HX_PROPERTY* prop);
    /// Number of properties (holes not counted).
    int count() const { return live_; }
    const std::vector<HX_PROPERTY*>& items() const { return items_; }

    UT_BLISTS_ITER<HX_PROPERTY>* create_iter() const;
    void delete_iter(UT_BLISTS_ITER<HX_PROPERTY>* iter) const;

  private:
    static constexpr std::size_t kNoSlot = SIZE_MAX;
    std::size_t slot_of(const char* name) const;
    void compact();
    void build_index();

    std::vector<HX_PROPERTY*> items_;
    std::unique_ptr<std::unordered_map<std::string_view, std::size_t>> index_;
    int live_ = 0;
    mutable int iterators_ = 0;
    std::size_t holes_ = 0;
};

/// Base of every database object: its property list, made on first use.
class HX_OBJECT {
  public:
    HX_OBJECT() = default;
    ~HX_OBJECT() { delete props_; }
    HX_OBJECT(const HX_OBJECT&) = delete;
    HX_OBJECT& operator=(const HX_OBJECT&) = delete;

    /// A property of `kind` with a default value (0, 0.0, empty text, unset
    /// records, no object); a flag property with HX_PROP_FLAG.
    HX_PROPERTY* create_prop(const char* name, HX_PROP_TYPE kind);
    /// An integer property.
    HX_PROPERTY* create_prop(const char* name, int32_t value);
    /// A string property. The database always keeps its own copy of `text`;
    /// `copy` is accepted for callers that pass 0 to mean "adopt", which this
    /// database never does.
    HX_PROPERTY* create_prop(const char* name, const char* text, uint8_t copy);
    /// Attaches a copy of `prop`, named `name` or, when null, as `prop` is.
    HX_PROPERTY* create_prop(const HX_PROPERTY* prop, const char* name);
    /// Attaches `prop` itself (renamed to `name` when not null).
    HX_PROPERTY* create_prop(std::unique_ptr<HX_PROPERTY> prop, const char* name);

    HX_PROPERTY* find_prop(const char* name) const;
    /// Deletes `prop` if it is one of this object's properties.
    bool delete_prop(HX_PROPERTY* prop);
    /// Deletes the property called `name`; with `ignore_case` set the name is
    /// compared without regard to ASCII case. False when there was none.
    bool delete_prop(const char* name, uint8_t ignore_case);
    /// Copies every property of `list` onto this object. With `replace` set a
    /// copied property replaces one of the same name; otherwise this object's
    /// own property is kept.
    void copy_properties(const HX_PROPLIST* list, uint8_t replace);

    /// The property list, or null when the object never had one.
    const HX_PROPLIST* get_props() const { return props_; }
    int prop_count() const { return props_ ? props_->count() : 0; }

    /// Iterator over the properties in order; null when there are none. The
    /// walk may delete the property it has just been given.
    UT_BLISTS_ITER<HX_PROPERTY>* create_prop_iter() const;
    void delete_prop_iter(UT_BLISTS_ITER<HX_PROPERTY>* iter) const;

  private:
    friend class HX_DESIGN;  // exchanges the lists of two networks that join
    HX_PROPLIST& props();
    HX_PROPLIST* props_ = nullptr;
};
