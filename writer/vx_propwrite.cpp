// Properties in a written netlist: "NAME", "NAME=value" or "NAME=@param"
// inside the parenthesised list after an object's header or pin. The list is
// opened by the first property written (" (") and closed by the caller.
//
// The property filter, when given, renames or drops each property first.
// Net tags of merge records are written as the name of the net they stand
// for, so that the text holds nothing that only the database knows.
//
// Every name and value is one token that reads back as itself: property
// names are quoted by the rule for object names, and the formatted timing,
// pin-reference and timing-string texts and parameter values are quoted by
// the same rule as names when they would not (a blank, a separator, a
// keyword, an empty text).
#include <charconv>
#include <cmath>
#include <cstdio>
#include <cstring>

#include "hx_design.h"
#include "hx_property.h"
#include "hxb_propfilter.h"
#include "hxb_util.h"
#include "vrx.h"
#include "vx_write_internal.h"

namespace {

// The text of one property, reused so that writing allocates nothing once
// the longest property has been seen.
std::string prop_text;

// Starts the text of a property: the lead-in that opens the list or follows
// the one before, then the name.
void begin_text(uint8_t opened, std::string_view name) {
    prop_text.assign(opened ? " " : " (");
    prop_text += name;
}

// Six decimals where they read back as the same value, so that the usual
// values look as they always did; else the shortest text that reads back
// exactly (1e-09 would be 0.000000). False for a NaN or an infinity, which
// the reader refuses: they are written as "%f" gives them.
bool append_float(double value) {
    char digits[400];  // "%f" of the largest double fits
    const int n = std::snprintf(digits, sizeof digits, "%f", value);
    if (n <= 0) return false;
    const char* end = digits + n;
    if (!std::isfinite(value)) {
        prop_text.append(digits, static_cast<std::size_t>(end - digits));
        return false;
    }
    double back = 0.0;
    const auto parsed = std::from_chars(digits, end, back);
    if (parsed.ec != std::errc() || std::memcmp(&back, &value, sizeof value) != 0) {
        end = std::to_chars(digits, digits + sizeof digits, value).ptr;
    }
    prop_text.append(digits, static_cast<std::size_t>(end - digits));
    return true;
}

}  // namespace

void VRX::do_prop(const HX_PROPERTY* prop, uint8_t* opened, const HX_BLOCK* block) {
    // Whether the value is a net's tag goes by the stored name: a filter may
    // rename the property on its way out.
    const bool net_tag = prop->names_network_tag();
    if (prop_filter != nullptr) {
        const HX_PROPERTY* mapped = nullptr;
        prop_filter->map_prop(prop, mapped);
        if (mapped == nullptr) return;
        prop = mapped;
    }
    const VX_LEGALNAME token = vrx_legal(prop->get_name(), nullptr);
    const char* name = prop->get_name();
    switch (prop->get_kind()) {
        case HX_PROP_FLAG:
            if (*opened) {
                write_pair(" ", token.view());
                note_foreign_kind(prop);
                return;
            }
            begin_text(*opened, token.view());
            break;
        case HX_PROP_INT: {
            if (std::strcmp(name, "CREATE_TIMESTAMP") == 0) return;
            const int32_t value = prop->get_int();
            begin_text(*opened, token.view());
            prop_text += '=';
            if (net_tag) {
                const HX_NETWORK* net =
                    design ? design->follow_net_tag(static_cast<uint32_t>(value)) : nullptr;
                if (net == nullptr) {
                    if (scratch_write) return;
                    vx_write_msg(__LINE__).issueInternal(
                        "No net found for tag in %s=%d property.\n", name, value);
                    return;
                }
                const std::string local = section_net_name(net);
                // An unnamed net is named as its highest signal is.
                const void* named = net->get_highest_signal() != nullptr
                                        ? static_cast<const void*>(net->get_highest_signal())
                                        : net;
                prop_text +=
                    vrx_legal(local.empty() ? net->get_name() : local.c_str(), named).view();
            } else {
                vx_append_int(prop_text, value);
            }
            break;
        }
        case HX_PROP_FLOAT:
            begin_text(*opened, token.view());
            prop_text += '=';
            if (!append_float(prop->get_float()))
                note_unreadable(prop_text.substr(prop_text.find_first_not_of(" (")));
            break;
        case HX_PROP_STRING:
            begin_text(*opened, token.view());
            prop_text += '=';
            prop_text += vrx_legal(vx_text(prop->get_text()), nullptr).view();
            break;
        case HX_PROP_OBJECT:
            if (scratch_write) return;
            vx_write_msg(__LINE__).issueWarning("Unable to write out OBJECT prop.\n");
            return;
        case HX_PROP_TIMING: {
            HX_PROP_TIMING_DATA record{INT32_MIN, INT32_MIN, 3};
            prop->get_timing(record);
            begin_text(*opened, token.view());
            prop_text += '=';
            prop_text += vrx_legal(Hxb_Util::form_timing(record).c_str(), nullptr).view();
            break;
        }
        case HX_PROP_PINREF: {
            if (block == nullptr) {
                if (scratch_write) return;
                vx_write_msg(__LINE__).issueError(
                    "Ignoring pinref property found on non-block object\n");
                return;
            }
            HX_PROP_PINREF_DATA record{INT32_MIN, INT32_MIN, 3, 65535, 3, 0};
            prop->get_pinref(record);
            begin_text(*opened, token.view());
            prop_text += '=';
            std::string value = Hxb_Util::form_pinref(record, block);
            // An unnamed pin goes by the name invented for it where it is written.
            if (const HX_PIN* pin = block->get_pin(record.pin); pin && !vx_present(pin->get_name()))
                value.replace(0, value.find(','), vrx_legal(nullptr, pin).view());
            prop_text += vrx_legal(value.c_str(), nullptr).view();
            break;
        }
        case HX_PROP_PARAM: {
            const char* value = prop->get_text();
            if (value == nullptr) {
                vx_write_fatal(__LINE__, "parameter %s with NULL value", name);
                return;
            }
            begin_text(*opened, token.view());
            prop_text += '=';
            prop_text += vrx_legal(("@" + std::string(value)).c_str(), nullptr).view();
            break;
        }
        case HX_PROP_TIMINGSTR:
            begin_text(*opened, token.view());
            prop_text += '=';
            prop_text += vrx_legal(Hxb_Util::form_timingstr(prop).c_str(), nullptr).view();
            break;
        default:
            vx_write_fatal(__LINE__, "invalid property type.\n");
            return;
    }
    write_item(prop_text);
    note_foreign_kind(prop);
    *opened = 1;
}

// The reader takes a predefined name's value as that name's kind: a value
// of another kind is refused there, or comes back as another kind.
void VRX::note_foreign_kind(const HX_PROPERTY* prop) {
    HX_PROP_TYPE kind = prop->get_kind();
    if (HX_PROPERTY::get_type(prop->get_name(), kind) && kind != prop->get_kind())
        note_unreadable(prop->get_name());
}

// Text is read a section at a time, each as a design of its own, where only
// the section block's signals are known by name. A net whose highest signal
// lies outside the section is named after a signal of the section block on
// it; empty when the net's own name serves (or no such signal exists).
std::string VRX::section_net_name(const HX_NETWORK* net) const {
    const HX_BLOCK* section = signal_section;
    const HX_SIGNAL* highest = net->get_highest_signal();
    if (section == nullptr || highest == nullptr || highest->is_global() ||
        highest->get_block() == section)
        return {};
    const HX_SIGNAL* local = nullptr;
    UT_BLIST_ITER<HX_SIGNAL>* members = net->create_signal_iter();
    while (const HX_SIGNAL* s = members->l_next()) {
        if (!s->is_global() && s->get_block() == section && s->get_name() != nullptr) {
            local = s;
            break;
        }
    }
    net->delete_signal_iter(members);
    if (local == nullptr) return {};
    std::string name = section->get_hiername();
    name += '/';
    name += local->get_name();
    return name;
}

void VRX::write_prop_list(const HX_OBJECT* object, uint8_t* opened, const HX_BLOCK* block) {
    UT_BLISTS_ITER<HX_PROPERTY>* iter = object->create_prop_iter();
    if (iter == nullptr) return;
    while (const HX_PROPERTY* prop = iter->l_next())
        do_prop(prop, opened, block);
    object->delete_prop_iter(iter);
}

void VRX::write_props(const HX_OBJECT* object, uint8_t* opened) {
    write_prop_list(object, opened, nullptr);
}

uint8_t VRX::has_props(const HX_OBJECT* object) {
    UT_BLISTS_ITER<HX_PROPERTY>* iter = object->create_prop_iter();
    if (iter == nullptr) return 0;
    uint8_t found = 0;
    while (const HX_PROPERTY* prop = iter->l_next()) {
        if (prop->get_kind() == HX_PROP_OBJECT) continue;
        const HX_PROPERTY* mapped = prop;
        if (prop_filter != nullptr) {
            mapped = nullptr;
            prop_filter->map_prop(prop, mapped);
        }
        if (mapped != nullptr) {
            found = 1;
            break;
        }
    }
    object->delete_prop_iter(iter);
    return found;
}
