// The pin layout of each primitive type: which roles, in which order, which
// of them repeat once per width bit, and their directions and names.
// Private to the database.
#pragma once

#include <cstdint>

#include "hx_types.h"

/// True when primitives of `type` take a width.
bool hx_prim_takes_width(int32_t type);
/// True when `role` repeats once per width bit in primitives of `type`.
bool hx_prim_role_repeats(int32_t type, int32_t role);
/// Pin count of a primitive, or 0 for an unknown type, a missing or zero
/// width where one is needed, or a count above 65535.
uint32_t hx_prim_pin_count(int32_t type, uint16_t width);
/// Index of the `ordinal`-th pin of `role` (HX_NO_INDEX: the first), or
/// HX_NO_INDEX.
uint16_t hx_prim_pin_index(int32_t type, uint16_t width, int32_t role, uint16_t ordinal);
/// Direction of a fresh pin of `role`.
HX_PIN_TYPE hx_prim_pin_dir(int32_t type, int32_t role);
/// Name of a fresh pin: the role keyword, followed by the ordinal when it is
/// not HX_NO_INDEX. The text is process-wide and never freed.
const char* hx_prim_pin_name(int32_t role, uint16_t ordinal);

/// Calls `visit(role, ordinal, repeated)` for each pin in index order.
template <class Visit>
void hx_prim_for_each_pin(int32_t type, uint16_t width, Visit&& visit);

// --- implementation of the template ------------------------------------------

struct HX_PRIM_ROLE {
    int8_t role;
    bool repeated;
};
/// The role sequence of `type` (terminated by role -1), or null.
const HX_PRIM_ROLE* hx_prim_roles(int32_t type);

template <class Visit>
void hx_prim_for_each_pin(int32_t type, uint16_t width, Visit&& visit) {
    const HX_PRIM_ROLE* roles = hx_prim_roles(type);
    if (roles == nullptr) return;
    for (; roles->role >= 0; ++roles) {
        if (!roles->repeated) {
            visit(int32_t{roles->role}, uint16_t{0}, false);
            continue;
        }
        for (uint32_t n = 0; n < width; ++n)
            visit(int32_t{roles->role}, static_cast<uint16_t>(n), true);
    }
}
