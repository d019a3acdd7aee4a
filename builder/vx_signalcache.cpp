// The signal caches: signals of the design being read, by name.
#include <algorithm>

#include "ut_str.h"
#include "vrx.h"

namespace {

int compare_signal_name(const HX_SIGNAL* entry, const char* key) {
    return UT_STR::Compare(entry->get_name(), key);
}

}  // namespace

// --- VX_SIGNALCACHE ------------------------------------------------------------

VX_SIGNALCACHE::VX_SIGNALCACHE() : UT_BTR_TREE<HX_SIGNAL>(compare_signal_name) {}

// The entries are references into the design, which keeps the signals.
VX_SIGNALCACHE::~VX_SIGNALCACHE() = default;

HX_SIGNAL* VX_SIGNALCACHE::find_or_create(const char* name, uint8_t physical) {
    HX_SIGNAL*& slot = add(name);
    if (slot != nullptr || design == nullptr) return slot;
    HX_BLOCK* root = physical ? static_cast<HX_BLOCK*>(design->get_phys_root())
                              : static_cast<HX_BLOCK*>(design->get_log_root());
    // Without a root there is nowhere to make it; the empty slot counts as absent.
    if (root != nullptr) slot = design->create_signal(root, name);
    return slot;
}

void VX_SIGNALCACHE::add_signal(HX_SIGNAL* signal) {
    if (signal != nullptr) add(signal->get_name()) = signal;
}

void VRX::init_curr_indices(uint16_t value) {
    std::fill(std::begin(curr_indices), std::end(curr_indices), value);
}
