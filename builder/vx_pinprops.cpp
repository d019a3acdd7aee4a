// Pin property rules: the reserved names that name a pin, connect it, set its
// direction or toggle its inversion flags; everything else goes through the
// generic rule with pin-reference and timing properties allowed.
#include "vx_builder_internal.h"
#include "vx_typenames.h"

bool VRX::assign_signal(HX_BLOCK* block, uint16_t index, const VX_PROP& prop) {
    if (!vx_is(prop.name, "CONN")) return false;
    if (prop.value[0] == '\0') {
        vrx_parse_warning("ignoring CONN property without name on PIN");
        return true;
    }
    HX_SIGNAL* signal = physical ? phys_signals.find_or_create(prop.value, 1)
                                 : log_signals.find_or_create(prop.value, 0);
    if (signal != nullptr) design->create_conn(signal, block, index);
    return true;
}

void VRX::set_pin_type(HX_PIN* pin, const char* value) {
    const VX_TYPE_ROW* row = vx_find_pin_type(value);
    if (row == nullptr)
        vx_error("unrecognized pin TYPE name: %s", value);
    else
        pin->set_dir(static_cast<uint8_t>(row->value));
}

namespace {

// A bare flag toggles; a flag given a value is ignored with a warning.
void toggle_flag(uint8_t (HX_PIN::*get)() const, void (HX_PIN::*set)(uint8_t), HX_PIN* pin,
                 const VX_PROP& prop, const char* warning) {
    if (prop.value[0] != '\0')
        vrx_parse_warning(warning);
    else
        (pin->*set)((pin->*get)() ? 0 : 1);
}

}  // namespace

void VRX::do_pin_props(HX_BLOCK* block, uint16_t index, VX_PROP_ARRAY* props) {
    HX_PIN* pin = block->get_pin(index);
    if (props == nullptr || pin == nullptr) return;
    for (int32_t i = 0; i < props->count; ++i) {
        const VX_PROP& prop = props->entries[i];
        if (vx_is(prop.name, "NAME")) {
            pin->set_name(prop.value);
        } else if (assign_signal(block, index, prop)) {
        } else if (vx_is(prop.name, "TYPE")) {
            if (grafting)
                vrx_parse_warning("Ignoring pin TYPE property on hierarchical block.");
            else
                set_pin_type(pin, prop.value);
        } else if (vx_is(prop.name, "MAPINV")) {
            toggle_flag(&HX_PIN::get_mapinv, &HX_PIN::set_mapinv, pin, prop,
                        "ignoring MAPINV property value on PIN");
        } else if (!vx_is(prop.name, "RCSID")) {
            assign_hxb_prop(pin, prop, 1);
        }
    }
}

void VRX::do_primpin_props(HX_PRIMITIVE* prim, uint16_t index, VX_PROP_ARRAY* props) {
    HX_PIN_PRIMITIVE* pin = prim->get_prim_pin(index);
    if (props == nullptr || pin == nullptr) return;
    for (int32_t i = 0; i < props->count; ++i) {
        const VX_PROP& prop = props->entries[i];
        if (vx_is(prop.name, "NAME")) {
            pin->set_name(prop.value);
        } else if (assign_signal(prim->get_block(), index, prop)) {
        } else if (vx_is(prop.name, "INV")) {
            toggle_flag(&HX_PIN::get_inverted, &HX_PIN::set_inverted, pin, prop,
                        "ignoring INV property value on PIN");
        } else if (vx_is(prop.name, "MAPINV")) {
            toggle_flag(&HX_PIN::get_mapinv, &HX_PIN::set_mapinv, pin, prop,
                        "ignoring MAPINV property value on PIN");
        } else if (vx_is(prop.name, "TYPE")) {
            set_pin_type(pin, prop.value);
        } else {
            assign_hxb_prop(pin, prop, 1);
        }
    }
}
