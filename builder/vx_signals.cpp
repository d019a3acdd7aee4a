// Signal and map-signal statements: signals found by plain or hierarchical
// name, global signals, merge records, network and alias properties, and the
// mapping of logical blocks and pins onto physical ones.
#include <cstring>

#include "hxb_util.h"
#include "vx_builder_internal.h"

namespace {

// Whether the network's highest signal suits a signal statement of `kind`:
// a global signal suits every kind, a logical block SIGNAL, a physical block
// PHYSSIGNAL.
bool suits_kind(const HX_NETWORK* net, int32_t kind) {
    const HX_SIGNAL* highest = net->get_highest_signal();
    const HX_BLOCK* block = highest ? highest->get_block() : nullptr;
    if (highest == nullptr) return false;
    if (block == nullptr) return true;
    if (kind == VX_SIGNAL) return !block->is_physical();
    if (kind == VX_PHYSSIGNAL) return block->is_physical();
    return false;
}

}  // namespace

void VRX::do_signal(const char* name, VX_SIGNAL_TYPE kind, VX_PROP_ARRAY* props) {
    if (design == nullptr) return;
    const uint8_t physical_kind = kind == VX_PHYSSIGNAL ? 1 : 0;
    HX_SIGNAL* signal = nullptr;
    if (std::strchr(name, '/') != nullptr) {
        const HX_NETWORK* net = find_net_by_name(name, kind);
        if (net == nullptr) {
            vx_warning("Net %s not found in design", name);
            return;
        }
        signal = net->get_highest_signal();
    } else {
        signal = physical_kind ? phys_signals.find_or_create(name, 1)
                               : log_signals.find_or_create(name, 0);
        if (signal == nullptr) {
            // Nowhere to make it: its properties would be lost without a word.
            vx_error("Signal %s: design %s has no %s root block to hold it", name,
                     vx_text(design->get_name()), physical_kind ? "physical" : "logical");
            return;
        }
    }
    do_signal_props(signal, props, physical_kind);
}

HX_NETWORK* VRX::find_net_by_name(const char* name, VX_SIGNAL_TYPE kind) {
    return lookups->nets.find(design, name, suits_kind, kind);
}

void VRX::do_signal_props(HX_SIGNAL* signal, VX_PROP_ARRAY* props, uint8_t physical_kind) {
    if (props == nullptr) return;
    for (int32_t i = 0; i < props->count; ++i) {
        const VX_PROP& prop = props->entries[i];
        if (vx_is(prop.name, "GLOBAL")) {
            make_global(signal, physical_kind);
        } else if (vx_is(prop.name, "NAME")) {
            vrx_parse_warning("ignoring NAME property on signal");
        } else if (vx_is(prop.name, "MERGEDTO") || vx_is(prop.name, "MERGEDFROM") ||
                   vx_is(prop.name, "JOINED")) {
            do_merge_prop(signal, prop.name, prop.value);
        } else if (vx_is(prop.name, "SIG_ALIAS") || vx_is(prop.name, "USER_ALIAS") ||
                   vx_is(prop.name, "RECOVERED_NAME")) {
            assign_hxb_prop(signal, prop, 0);
        } else {
            assign_hxb_prop(signal->get_network(), prop, 0);
        }
    }
}

void VRX::make_global(HX_SIGNAL*& signal, uint8_t physical_kind) {
    const char* name = signal->get_name();
    HX_SIGNAL* global = Hxb_Util::find_global_sig(design, name);
    if (global == nullptr) global = design->create_global_signal(name);
    if (global == nullptr) return;  // an unnamed signal has no global of its name
    (physical_kind ? phys_signals : log_signals).add_signal(global);
    design->merge_signals(global, signal, 0, 0);
    signal = global;
    // The network now answers to the global signal's name.
    lookups->nets.renamed(design, global->get_network());
}

void VRX::do_merge_prop(HX_SIGNAL* signal, const char* name, const char* value) {
    const char* record = vx_is(name, "MERGEDTO")     ? "VX_MERGEDTO"
                         : vx_is(name, "MERGEDFROM") ? "VX_MERGEDFROM"
                                                     : "VX_JOINED";
    signal->get_network()->create_prop(record, value, 1);
    if (lookups->merge_pending_set.insert(design).second) lookups->merge_pending.push_back(design);
}

HX_BLOCK* VRX::get_blk(HX_DESIGN* target, const char* name, uint8_t physical_kind) {
    return lookups->blocks.find(target, name, physical_kind != 0);
}

void VRX::do_mapsignal(const char* block_name, const char* pin_name, VX_PROP_ARRAY* props) {
    HX_BLOCK* block = get_blk(design, block_name, 1);
    if (block == nullptr) {
        vx_error("Unable to find physical block %s for map signal.", block_name);
        curr_mapparent = nullptr;
        curr_mapsignal = nullptr;
        return;
    }
    auto* parent = static_cast<HX_BASEPHYSBLOCK*>(block);
    if (pin_name == nullptr) {
        if (props != nullptr)
            vx_warning("MAPSIGNAL %s: declaring physical parent, ignoring properties.", block_name);
        curr_mapparent = parent;
        curr_mapsignal = nullptr;
        return;
    }
    const uint16_t index = Hxb_Util::find_pin(block, pin_name, 0);
    if (index == HX_NO_INDEX) {
        vx_error("Pin %s does not exist on block %s for mapsig.", pin_name, block_name);
        curr_mapsignal = nullptr;
        return;
    }
    HX_MAPSIGNAL* map = parent->create_map_signal(index, nullptr);
    if (map == nullptr) {
        vx_error("Pin %s of block %s has a map signal already.", pin_name, block_name);
        curr_mapsignal = nullptr;
        curr_mapparent = parent;
        return;
    }
    do_mapsignal_props(map, props);
    curr_mapsignal = map;
    curr_mapparent = parent;
}

void VRX::add_mapconn(const char* block_name, const char* pin_name, VX_PROP_ARRAY* props) {
    if (curr_mapparent == nullptr) return;
    HX_BLOCK* block = get_blk(design, block_name, 0);
    if (block == nullptr) {
        vx_error("Unable to find logical block %s for map connect.", block_name);
        curr_mapsignal = nullptr;
        return;
    }
    const HX_BASEPHYSBLOCK* parent = block->get_phys_parent();
    if (parent == nullptr)
        design->set_block_phys_parent(block, curr_mapparent);
    else if (parent != curr_mapparent)
        vx_error("Block %s cannot map to different physical parents.", block_name);
    if (pin_name == nullptr) {
        if (curr_mapsignal != nullptr)
            vrx_parse_warning(
                "No logical pin specified in MAPCONN statement, setting physical parent only.");
        return;
    }
    if (curr_mapsignal == nullptr) {
        vrx_parse_warning("Ignoring pin specified on logical child (MAPCONN) declaration.");
        return;
    }
    const uint16_t index = Hxb_Util::find_pin(block, pin_name, 0);
    if (index == HX_NO_INDEX) {
        vx_error("cannot find pin %s on logical block %s.\n", pin_name, block_name);
        return;
    }
    HX_CONN* conn = curr_mapsignal->create_mapconn(block, index);
    if (conn == nullptr) {
        vx_error("Unable to create map connect at %s, pin %s.", block_name, pin_name);
        return;
    }
    for (int32_t i = 0; props != nullptr && i < props->count; ++i) {
        if (vx_is(props->entries[i].name, "MAPINV"))
            conn->get_pin()->set_mapinv(1);
        else
            vx_warning("Ignoring unrecogized mapconn prop %s", props->entries[i].name);
    }
}
