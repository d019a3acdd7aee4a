// What the builder's files share: the parse-time message helpers, the rule
// that renames an object from a NAME property, the process-wide LOG_PM flag
// and the keyed lookups.
#pragma once

#include <cstdarg>
#include <cstdint>
#include <cstring>
#include <unordered_set>
#include <utility>
#include <vector>

#include "ut_str.h"
#include "vrx.h"
#include "vx_lookups.h"
#include "vx_text.h"

/// Set once a library's LOG_PM value failed validation; never cleared, so an
/// empty PHYSICAL flag without a device stops every later conversion too.
extern uint8_t log_pm_invalid;

/// Line-numbered parse error or warning, formatted first.
void vx_error(const char* format, ...) UT_PRINTF_FORMAT(1, 2);
void vx_warning(const char* format, ...) UT_PRINTF_FORMAT(1, 2);

/// NAME renames any object with a set_name; an empty value gives an empty name.
template <class Named>
bool VRX::assign_name(Named* object, const VX_PROP& prop) {
    if (!vx_is(prop.name, "NAME")) return false;
    object->set_name(prop.value);
    return true;
}

/// A regular file that was read, so that no write replaces it.
struct VX_INPUT_FILE {
    Port::FileId id;
    std::string name;
};

/// The builder's keyed lookups, the designs whose merge records wait, and
/// which design was grafted into which. Designs are counted in library order:
/// those read before the current file, and before the file of the last
/// DESIGN statement.
struct VX_LOOKUPS {
    std::vector<VX_INPUT_FILE> inputs;
    VX_BLOCK_INDEX blocks;
    VX_NET_INDEX nets;
    std::vector<HX_DESIGN*> merge_pending;  // in the order their first record came
    std::unordered_set<HX_DESIGN*> merge_pending_set;
    std::vector<std::pair<const HX_DESIGN*, const HX_DESIGN*>> grafts;  // (into, from)
    std::size_t designs_before_file = 0;
    std::size_t designs_before_last_design_file = 0;
};
