// The keywords by which a text netlist names primitive kinds, primitive pin
// roles and pin directions, and the database values they stand for.
//
// Reader and writer use the same rows, so a value written out reads back as
// itself. Each table is an ordered array ending in a row without keyword;
// the first matching row wins in both directions. The row order is part of
// the format (it is not the order of the values).
#pragma once

#include <cstdint>

struct VX_PRIM_TYPE_ROW {
    const char* keyword;  // null in the terminating row
    int32_t value;        // HX_PRIMITIVE_TYPE
    uint8_t needs_width;  // the PRIM statement takes a width of at least 2
};

struct VX_TYPE_ROW {
    const char* keyword;  // null in the terminating row
    int32_t value;        // HX_PIN_PRIMITIVE_TYPE or HX_PIN_TYPE
};

extern const VX_PRIM_TYPE_ROW vx_prim_types[20];
extern const VX_TYPE_ROW vx_prim_pin_types[17];
extern const VX_TYPE_ROW vx_pin_types[6];

/// Keyword to row; null when the keyword is not in the table.
const VX_PRIM_TYPE_ROW* vx_find_prim_type(const char* keyword);
const VX_TYPE_ROW* vx_find_prim_pin_type(const char* keyword);
const VX_TYPE_ROW* vx_find_pin_type(const char* keyword);

/// Value to keyword; null when no row holds the value.
const char* vx_prim_type_name(int32_t value);
const char* vx_prim_pin_name(int32_t value);
const char* vx_pin_type_name(int32_t value);
