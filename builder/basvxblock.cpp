// Designs, root blocks, child and template blocks, grafted instances of other
// designs, primitives and their pins, and the physical root derived from the
// logical one.
#include <string>
#include <vector>

#include "hxb_util.h"
#include "port_msg.h"
#include "ut_darray.h"
#include "vx_builder_internal.h"
#include "vx_typenames.h"

namespace {

constexpr uint16_t kNoWidth = 0xFFFF;

// Properties that a physical root derived from the logical root takes over.
constexpr const char* kPhysRootProps[] = {"SIMPRIMTYPE", "MAPMODIFY", "TERMINAL",
                                          "CCE_DELAYS",  "IOCOMP",    "PREDEFINED"};

// The logical root's pins in declaration order, with their directions: what
// a derived physical root gets. One list per process, like the reader.
DARRAY_NAME physpin_names;
UT_DARRAY<HX_PIN_TYPE> physpin_dirs;

// Any pin of `root` whose signal belongs to no block.
bool touches_global(const HX_BLOCK* root) {
    for (uint16_t i = 0; i < root->get_pin_count(); ++i) {
        const HX_PIN* pin = root->get_pin(i);
        for (const HX_SIGNAL* s : {pin->get_inner_signal(), pin->get_outer_signal()}) {
            if (s != nullptr && s->is_global()) return true;
        }
    }
    return false;
}

Port_MsgManData block_msg(int line) {
    return Port_MsgManData::createObject("Quorra", "basvxblock", line, "$Revision: 1.2 $");
}

}  // namespace

// --- Designs ---------------------------------------------------------------------

void VRX::begin_design(const char* name, VX_PROP_ARRAY* props) {
    log_signals.flush(false);
    phys_signals.flush(false);
    log_root = nullptr;
    phys_root = nullptr;
    if (library == nullptr) return;
    HX_DESIGN* found = library->find_design(name);
    if (found != nullptr) {
        vx_warning("redundant design name: %s", name);
    } else {
        found = library->create_design(name);
    }
    design = found;
    lookups->designs_before_last_design_file = lookups->designs_before_file;
    log_signals.design = found;
    phys_signals.design = found;
    if (found == nullptr) return;
    lookups->nets.invalidate();
    do_design_props(found, props);
}

void VRX::end_design() {
    if (design == nullptr || log_root == nullptr) return;
    if (make_physroot && phys_root == nullptr && log_root->find_prop("PHYSICAL") != nullptr)
        create_physroot(log_root);
    reset_physpins();
}

void VRX::add_alias(const char* name, const char* alias) {
    if (library == nullptr) return;
    if (!library->alias_design(name, alias)) vx_error("cannot alias %s to %s", alias, name);
}

// --- Blocks ------------------------------------------------------------------------

// What every block and primitive statement starts with; false when there is
// no design to build into.
bool VRX::start_block_statement(uint8_t physical_stmt) {
    physical = physical_stmt;
    grafting = 0;
    curr_block = nullptr;
    init_curr_indices(0);
    if (design == nullptr) return false;
    lookups->nets.invalidate();  // the statement may join or rename networks
    return true;
}

void VRX::begin_block(const char* label, uint16_t width, uint8_t physical_stmt,
                      VX_PROP_ARRAY* props) {
    pending_pinrefs = 0;
    if (!start_block_statement(physical_stmt)) return;
    if (physical ? phys_root == nullptr : log_root == nullptr) {
        begin_root_block(label, width, props);
        return;
    }
    HX_DESIGN* source = graft_source(label);
    if (source != nullptr)
        begin_grafted_block(source, props);
    else
        begin_template_block(label, width, props);
}

// The root is named after its design, whatever the statement's label.
void VRX::begin_root_block(const char* label, uint16_t width, VX_PROP_ARRAY* props) {
    if (width == kNoWidth) {
        vx_error("Root block %s must have width.", label);
        return;
    }
    if (adopt_existing_root(label)) return;
    const char* name = design->get_name();
    HX_BLOCK* root = physical
                         ? static_cast<HX_BLOCK*>(design->create_physblock(nullptr, width, name))
                         : design->create_logblock(nullptr, width, name);
    if (physical)
        phys_root = static_cast<HX_BASEPHYSBLOCK*>(root);
    else
        log_root = static_cast<HX_BASELOGBLOCK*>(root);
    curr_block = root;
    do_block_props(root, props);
}

// A design met again may have the root that a statement would make: the
// statement is refused, and the statements after it go into that root.
bool VRX::adopt_existing_root(const char* label) {
    HX_BLOCK* existing =
        physical ? static_cast<HX_BLOCK*>(design->get_phys_root()) : design->get_log_root();
    if (existing == nullptr) return false;
    vx_error("Root block %s: design %s has a %s root block already.", label,
             vx_text(design->get_name()), physical ? "physical" : "logical");
    if (physical)
        phys_root = design->get_phys_root();
    else
        log_root = design->get_log_root();
    return true;
}

// The other design of the library that a block statement instantiates, or
// null when the block is built from its own statement.
HX_DESIGN* VRX::graft_source(const char* label) {
    HX_DESIGN* source = library ? library->find_design(label) : nullptr;
    if (source == nullptr || source == design) return nullptr;
    if (!is_design && nograft) {
        block_msg(__LINE__).issueInfo(
            "Inhibiting graft of design '%s' into design '%s' because of -nograft option.\n",
            vx_text(source->get_name()), vx_text(design->get_name()));
        return nullptr;
    }
    const bool has_root =
        physical ? source->get_phys_root() != nullptr : source->get_log_root() != nullptr;
    if (!has_root) return nullptr;
    grafting = 1;
    return source;
}

void VRX::begin_template_block(const char* label, uint16_t width, VX_PROP_ARRAY* props) {
    if (width == kNoWidth) {
        vx_error("No pin count specified for template block %s", label);
        return;
    }
    HX_BLOCK* block =
        physical ? static_cast<HX_BLOCK*>(design->create_physblock(phys_root, width, label))
                 : design->create_logblock(log_root, width, label);
    if (block == nullptr) {  // the database refused it; nothing of the statement is kept
        vx_error("cannot create block %s in design %s", label, vx_text(design->get_name()));
        return;
    }
    curr_block = block;
    do_block_props(block, props);
}

namespace {

// Instance and graft of `source` under `root`, for either hierarchy.
template <class Root, class Instance>
HX_BLOCK* make_graft(VRX& vrx, HX_DESIGN* design, Root* root, HX_DESIGN* source, const char* kind,
                     Instance* (HX_DESIGN::*instantiate)(Root*, HX_DESIGN*, uint8_t),
                     void (VRX::*apply)(HX_BLOCK*, VX_PROP_ARRAY*), VX_PROP_ARRAY* props) {
    const char* name = vx_text(source->get_name());
    Instance* instance = (design->*instantiate)(root, source, 0);
    if (instance == nullptr) {
        vx_error("cannot make %s instance of design %s", kind, name);
        return nullptr;
    }
    instance->delete_prop("TYPE", 0);
    (vrx.*apply)(instance, props);
    HX_BLOCK* grafted = design->graft(instance, source, 0, 0, nullptr, 0);
    if (grafted == nullptr) vx_error("cannot graft %s design %s", kind, name);
    return grafted;
}

}  // namespace

void VRX::begin_grafted_block(HX_DESIGN* source, VX_PROP_ARRAY* props) {
    const char* kind = physical ? "physical" : "logical";
    const HX_BLOCK* source_root =
        physical ? static_cast<const HX_BLOCK*>(source->get_phys_root()) : source->get_log_root();
    if (touches_global(source_root)) {
        vx_error("Global signal connected to %s root block pin on design %s", kind,
                 vx_text(source->get_name()));
        return;
    }
    resolve_before_graft(source);
    using PhysInstantiate = HX_PHYSBLOCK* (HX_DESIGN::*)(HX_BASEPHYSBLOCK*, HX_DESIGN*, uint8_t);
    using LogInstantiate = HX_LOGBLOCK* (HX_DESIGN::*)(HX_BASELOGBLOCK*, HX_DESIGN*, uint8_t);
    if (physical)
        curr_block = make_graft(*this, design, phys_root, source, kind,
                                static_cast<PhysInstantiate>(&HX_DESIGN::instantiate),
                                &VRX::do_block_props, props);
    else
        curr_block = make_graft(*this, design, log_root, source, kind,
                                static_cast<LogInstantiate>(&HX_DESIGN::instantiate),
                                &VRX::do_block_props, props);
    if (curr_block != nullptr) lookups->grafts.emplace_back(design, source);
}

// --- Primitives --------------------------------------------------------------------

void VRX::begin_prim(const char* type, uint16_t width, uint8_t physical_stmt,
                     VX_PROP_ARRAY* props) {
    if (!start_block_statement(physical_stmt)) return;
    const VX_PRIM_TYPE_ROW* row = vx_find_prim_type(type);
    if (row == nullptr) {
        vx_error("Unknown primitive type specified: %s", type);
        return;
    }
    if (width == kNoWidth && row->needs_width) {
        vx_error("BLOCK type %s must have width", type);
        return;
    }
    if (width != kNoWidth && !row->needs_width) {
        vx_warning("BLOCK type %s does not need width - ignoring...", type);
        width = kNoWidth;
    }
    if (width != kNoWidth && width < 2) {
        vx_error("BLOCK type %s must have width 2 or greater", type);
        return;
    }
    HX_BLOCK* prim = create_prim(type, row->value, width);
    if (prim == nullptr) return;
    curr_block = prim;
    do_block_props(prim, props);
}

// A child of the root of the statement's kind, whatever that root is, or
// that root itself when the design has none yet; null after an error.
HX_BLOCK* VRX::create_prim(const char* keyword, int32_t type, uint16_t width) {
    HX_BLOCK* root = physical ? static_cast<HX_BLOCK*>(phys_root) : log_root;
    if (root == nullptr && adopt_existing_root(keyword)) return nullptr;
    HX_BLOCK* prim =
        physical ? static_cast<HX_BLOCK*>(design->create_physprim(phys_root, type, width, nullptr))
                 : design->create_logprim(log_root, type, width, nullptr);
    if (prim == nullptr) {  // more pins than a block can have
        vx_error("cannot create primitive %s of width %u", keyword, unsigned(width));
        return nullptr;
    }
    if (root != nullptr) return prim;
    if (physical)
        phys_root = static_cast<HX_BASEPHYSBLOCK*>(prim);
    else
        log_root = static_cast<HX_BASELOGBLOCK*>(prim);
    // A root primitive's pins are its design's ports; those that no PIN
    // statement names stay unused.
    for (uint16_t i = 0; i < prim->get_pin_count(); ++i)
        prim->get_pin(i)->create_prop("UNUSED", HX_PROP_FLAG);
    return prim;
}

// --- Pins --------------------------------------------------------------------------

void VRX::do_pin(const char* name, VX_PROP_ARRAY* props) {
    if (curr_block == nullptr) return;
    HX_PRIMITIVE* prim = curr_block->get_primitive();
    HX_PIN* pin = nullptr;
    if (grafting)
        pin = do_graft_pin(name, props);
    else if (prim != nullptr)
        pin = do_prim_pin(prim, name, props);
    else
        pin = do_plain_pin(name, props);
    // Read after the properties, so a TYPE property is in the direction.
    if (pin != nullptr && curr_block == log_root)
        add_physpin(pin->get_name(), static_cast<HX_PIN_TYPE>(pin->get_dir()));
}

HX_PIN* VRX::do_graft_pin(const char* name, VX_PROP_ARRAY* props) {
    const uint16_t index = Hxb_Util::find_pin(curr_block, name, 0);
    if (index == HX_NO_INDEX) {
        vrx_parse_error("hierarchical block pin mismatch encountered.");
        return nullptr;
    }
    do_pin_props(curr_block, index, props);
    return curr_block->get_pin(index);
}

HX_PIN* VRX::do_prim_pin(HX_PRIMITIVE* prim, const char* name, VX_PROP_ARRAY* props) {
    const VX_TYPE_ROW* row = vx_find_prim_pin_type(name);
    if (row == nullptr) {
        vx_error("unrecognized primitive PIN type: %s", name);
        return nullptr;
    }
    const int32_t role = row->value;
    uint16_t ordinal = HX_NO_INDEX;
    if (prim->is_param_pin(role)) ordinal = curr_indices[role]++;
    const uint16_t index = prim->get_prim_index(role, ordinal);
    HX_PIN_PRIMITIVE* pin = prim->get_prim_pin(index);
    if (pin == nullptr) {
        vrx_parse_error("invalid primitive pin");
        return nullptr;
    }
    if (curr_block == log_root || curr_block == phys_root) pin->delete_prop("UNUSED", 0);
    do_primpin_props(prim, index, props);
    return pin;
}

HX_PIN* VRX::do_plain_pin(const char* name, VX_PROP_ARRAY* props) {
    const uint16_t position = curr_indices[0];
    HX_PIN* pin = curr_block->get_pin(position);
    if (pin == nullptr) {
        vrx_parse_error("root block pin count exceeded");
        return nullptr;
    }
    pin->set_name(name);
    do_pin_props(curr_block, position, props);
    ++curr_indices[0];
    return pin;
}

void VRX::end_block() {
    if (curr_block == nullptr) return;
    if (!curr_block->check_pins(0))
        vx_error("block %s: pin check failed", vx_text(curr_block->get_name()));
    name_unnamed_pins();
    if (pending_pinrefs) parse_pending_pinrefs();
}

void VRX::name_unnamed_pins() {
    for (uint16_t i = 0; i < curr_block->get_pin_count(); ++i) {
        HX_PIN* pin = curr_block->get_pin(i);
        if (pin->get_name() != nullptr) continue;
        vx_error("block %s: pin %d is unnamed", vx_text(curr_block->get_name()), int(i));
        pin->set_name(UT_STR::Format("**UNDEFINED.%d**", int(i)).c_str());
    }
}

// Pin references name other pins of the block: they are parsed once every
// pin has its name.
void VRX::parse_pending_pinrefs() {
    std::vector<HX_PROPERTY*> waiting;
    for (uint16_t i = 0; i < curr_block->get_pin_count(); ++i) {
        HX_PIN* pin = curr_block->get_pin(i);
        const HX_PROPLIST* list = pin->get_props();
        if (list == nullptr || list->count() == 0) continue;
        waiting.clear();
        for (HX_PROPERTY* prop : list->items()) {
            HX_PROP_TYPE kind = HX_PROP_STRING;
            if (prop != nullptr && prop->get_kind() == HX_PROP_STRING &&
                HX_PROPERTY::get_type(prop->get_name(), kind) && kind == HX_PROP_PINREF)
                waiting.push_back(prop);
        }
        for (HX_PROPERTY* prop : waiting) {
            const std::string value = vx_text(prop->get_text());
            std::string message;
            std::unique_ptr<HX_PROPERTY> parsed =
                Hxb_Util::parse_prop(prop->get_name(), value.c_str(), message, curr_block);
            const char* block_name = vx_text(curr_block->get_name());
            const char* pin_name = vx_text(pin->get_name());
            if (parsed == nullptr) {
                vx_error("block %s, pin %s property: %s", block_name, pin_name, message.c_str());
                continue;
            }
            if (!message.empty())
                vx_warning("block %s, pin %s property: %s", block_name, pin_name, message.c_str());
            pin->delete_prop(prop);
            pin->create_prop(std::move(parsed), nullptr);
        }
    }
}

// --- The derived physical root ----------------------------------------------------

void VRX::add_physpin(const char* name, HX_PIN_TYPE direction) {
    physpin_names.add(name);
    physpin_dirs.add(direction);
}

void VRX::reset_physpins() {
    physpin_names.clear();
    physpin_dirs.clear();
}

HX_PHYSBLOCK* VRX::create_physroot(HX_BASELOGBLOCK* log_block) {
    if (design == nullptr) return nullptr;
    const auto count = static_cast<uint16_t>(physpin_names.count());
    HX_PHYSBLOCK* root = design->create_physblock(nullptr, count, design->get_name());
    if (root == nullptr) return nullptr;  // the design has a physical root already
    for (const char* name : kPhysRootProps) {
        if (const HX_PROPERTY* prop = log_block->find_prop(name)) root->create_prop(prop, nullptr);
    }
    for (uint16_t i = 0; i < count; ++i) {
        HX_PIN* pin = root->get_pin(i);
        pin->set_name(physpin_names[i]);
        pin->set_dir(static_cast<uint8_t>(physpin_dirs[i]));
        const uint16_t logical = Hxb_Util::find_pin(log_block, physpin_names[i], 0);
        if (logical != HX_NO_INDEX)
            pin->copy_properties(log_block->get_pin(logical)->get_props(), 1);
    }
    return root;
}
