// Property rules on reading: the reserved names of the library, designs,
// blocks, primitives and map signals, and the generic rule that parses every
// other property into a typed database property.
#include <memory>
#include <string>

#include "hxb_util.h"
#include "port_msg.h"
#include "vx_builder_internal.h"

uint8_t log_pm_invalid = 0;

void vx_error(const char* format, ...) {
    std::va_list args;
    va_start(args, format);
    const std::string text = UT_STR::VFormat(format, args);
    va_end(args);
    vrx_parse_error(text.c_str());
}

void vx_warning(const char* format, ...) {
    std::va_list args;
    va_start(args, format);
    const std::string text = UT_STR::VFormat(format, args);
    va_end(args);
    vrx_parse_warning(text.c_str());
}

void VRX::assign_hxb_prop(HX_OBJECT* object, const VX_PROP& prop, uint8_t on_pin) {
    if (vx_is(prop.name, "RCSID")) return;
    HX_PROP_TYPE kind = HX_PROP_STRING;
    if (HX_PROPERTY::get_type(prop.name, kind) && kind == HX_PROP_PINREF) {
        if (on_pin) {
            // Parsed at the end of the block, once every pin it may name exists.
            object->create_prop(prop.name, prop.value, 0);
            pending_pinrefs = 1;
        } else {
            vrx_parse_error("PINREF properties are only allowed on pins");
        }
        return;
    }
    std::string message;
    std::unique_ptr<HX_PROPERTY> parsed =
        Hxb_Util::parse_prop(prop.name, prop.value, message, curr_block);
    if (parsed == nullptr) {
        vrx_parse_error(message.c_str());
        return;
    }
    if (!message.empty()) vrx_parse_warning(message.c_str());
    if (parsed->get_kind() == HX_PROP_TIMING && !on_pin) {
        vrx_parse_error("TIMING properties are only allowed on pins");
        return;
    }
    object->create_prop(std::move(parsed), nullptr);
}

void VRX::do_library_props(VX_PROP_ARRAY* props) {
    if (props == nullptr || library == nullptr) return;
    for (int32_t i = 0; i < props->count; ++i) {
        const VX_PROP& prop = props->entries[i];
        if (vx_is(prop.name, "NAME"))
            library->set_name(prop.value);
        else if (vx_is(prop.name, "CASESENSE"))
            library->set_casesense(1);
        else
            assign_hxb_prop(library, prop, 0);
    }
    const char* device = Hxb_Util::get_string_prop(library, "LOG_PM");
    if (device == nullptr) return;
    const PM_SPEC devices(nullptr, PM_BIND_DEVICE);
    if (devices.isvalidpmname(device, 1)) {
        delete picspec;
        picspec = new PM_PIC(device, nullptr, nullptr);
    } else {
        log_pm_invalid = 1;
        vx_warning("invalid LOG_PM library property '%s' ignored\n", device);
    }
}

void VRX::do_design_props(HX_DESIGN* target, VX_PROP_ARRAY* props) {
    if (props == nullptr) return;
    for (int32_t i = 0; i < props->count; ++i) {
        const VX_PROP& prop = props->entries[i];
        if (vx_is(prop.name, "NAME"))
            vx_warning(
                "NAME property on design '%s' ignored: a design keeps the name of its "
                "DESIGN statement",
                vx_text(target->get_name()));
        else
            assign_hxb_prop(target, prop, 0);
    }
}

// An empty PHYSICAL flag; true when it was handled here, false when the
// entry goes on to the generic rule.
bool VRX::do_physical_flag(HX_BLOCK* block) {
    if (picspec != nullptr) {
        if (!block->is_physical())
            Hxb_Util::set_physical_prop(block, picspec);
        else
            vx_warning("PHYSICAL flag on physical block '%s' ignored", vx_text(block->get_name()));
        return true;
    }
    const char* design_name = design ? vx_text(design->get_name()) : "";
    if (log_pm_invalid) {
        vx_error(
            "Empty PHYSICAL property found in design '%s', but library's LOG_PM value could "
            "not be validated. If the LOG_PM value is valid, the problem is most likely "
            "that the <pmname>.acd file was not in place when the LOG_PM property was "
            "processed.\n",
            design_name);
        Port_MsgDispatcher::exit(2);
        return true;  // a host whose exit handler returns gets no PHYSICAL property
    }
    vx_warning("library has no picspec: creating empty PHYSICAL prop in design '%s'", design_name);
    return false;
}

void VRX::do_block_props(HX_BLOCK* block, VX_PROP_ARRAY* props) {
    if (props == nullptr) return;
    for (int32_t i = 0; i < props->count; ++i) {
        const VX_PROP& prop = props->entries[i];
        if (assign_name(block, prop)) continue;
        if (vx_is(prop.name, "PHYSICAL") && prop.value[0] == '\0' && do_physical_flag(block))
            continue;
        if (vx_is(prop.name, "USER")) {
            if (!block->is_physical())
                block->set_user(1);
            else
                vx_warning("Ignoring USER flag on physical block %s", block->get_hiername());
        } else if (vx_is(prop.name, "PHYSTYPE")) {
            vrx_parse_error("PHYSTYPE keyword no longer supported");
        } else {
            assign_hxb_prop(block, prop, 0);
        }
    }
}

void VRX::do_mapsignal_props(HX_MAPSIGNAL* map, VX_PROP_ARRAY* props) {
    if (props == nullptr) return;
    for (int32_t i = 0; i < props->count; ++i) {
        if (!assign_name(map, props->entries[i])) assign_hxb_prop(map, props->entries[i], 0);
    }
}
