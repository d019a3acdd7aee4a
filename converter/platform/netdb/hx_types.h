// Enumerations and value records of the netlist database.
#pragma once

#include <cstdint>

/// Kind of a property's value.
enum HX_PROP_TYPE : int32_t {
    HX_PROP_FLAG = 0,       // no value
    HX_PROP_INT = 1,        // signed 32-bit
    HX_PROP_FLOAT = 2,      // double
    HX_PROP_STRING = 3,     // text
    HX_PROP_OBJECT = 4,     // reference to a database object (never parsed from text)
    HX_PROP_TIMING = 5,     // HX_PROP_TIMING_DATA
    HX_PROP_PINREF = 6,     // HX_PROP_PINREF_DATA
    HX_PROP_PARAM = 7,      // parameter name (text)
    HX_PROP_TIMINGSTR = 8,  // timing constraint kept as text
};
inline constexpr int HX_PROP_TYPE_COUNT = 9;

/// Primitive kinds. Every value 0 to 18 is used.
enum HX_PRIMITIVE_TYPE : int32_t {
    HX_PRIM_BUF = 0,
    HX_PRIM_CKBUF = 1,
    HX_PRIM_AND = 2,
    HX_PRIM_OR = 3,
    HX_PRIM_XOR = 4,
    HX_PRIM_TRI = 5,
    HX_PRIM_FF = 6,
    HX_PRIM_LATCH = 7,
    HX_PRIM_PAD = 8,
    HX_PRIM_ONE = 9,
    HX_PRIM_ZERO = 10,
    HX_PRIM_PULLUP = 11,
    HX_PRIM_PULLDOWN = 12,
    HX_PRIM_RAM = 13,
    HX_PRIM_ROM = 14,
    HX_PRIM_RAMS = 15,
    HX_PRIM_RAMD = 16,
    HX_PRIM_MUX = 17,
    HX_PRIM_SFF = 18,
};
inline constexpr int HX_PRIMITIVE_TYPE_COUNT = 19;

/// Roles of primitive pins. Every value 0 to 15 is used.
enum HX_PIN_PRIMITIVE_TYPE : int32_t {
    HX_PPIN_IN = 0,
    HX_PPIN_OUT = 1,
    HX_PPIN_CTL = 2,
    HX_PPIN_CLK = 3,
    HX_PPIN_CE = 4,
    HX_PPIN_SET = 5,
    HX_PPIN_RST = 6,
    HX_PPIN_PAD = 7,
    HX_PPIN_ADR = 8,
    HX_PPIN_RADR = 9,
    HX_PPIN_WADR = 10,
    HX_PPIN_SEL = 11,
    HX_PPIN_INA = 12,
    HX_PPIN_INB = 13,
    HX_PPIN_SSET = 14,
    HX_PPIN_SRST = 15,
};
inline constexpr int HX_PIN_PRIMITIVE_TYPE_COUNT = 16;

/// Pin directions, stored in one byte.
enum HX_PIN_TYPE : int32_t {
    HX_PIN_NOTYPE = 0,
    HX_PIN_IN = 1,
    HX_PIN_OUT = 2,
    HX_PIN_TRI = 3,
    HX_PIN_BI = 4,
};

/// Kind of a database file.
enum HX_FILE_TYPE : int32_t {
    HX_FILE_DESIGN = 0,
    HX_FILE_LIBRARY = 1,
    HX_FILE_UNKNOWN = -1,  // not a database file, or unreadable
};

/// Block kind flags.
enum : uint8_t {
    HX_BLK_PHYSICAL = 1,
    HX_BLK_PRIMITIVE = 2,
};

/// Pin index or width meaning "none" / "not found".
inline constexpr uint16_t HX_NO_INDEX = 0xFFFF;
/// A timing number that is not set.
inline constexpr int32_t HX_TIME_UNSET = INT32_MIN;

/// Time units of timing records.
enum HX_TIME_UNIT : int32_t {
    HX_UNIT_PS = 0,
    HX_UNIT_NS = 1,
    HX_UNIT_US = 2,
    HX_UNIT_NONE = 3,
};

/// Clock edge of a pin reference.
enum HX_EDGE : int32_t {
    HX_EDGE_RISING = 0,
    HX_EDGE_FALLING = 1,
    HX_EDGE_NONE = 3,
};

/// Timing record {min, max, unit}; unset numbers hold HX_TIME_UNSET.
struct HX_PROP_TIMING_DATA {
    int32_t min = HX_TIME_UNSET;
    int32_t max = HX_TIME_UNSET;
    int32_t unit = HX_UNIT_NONE;
    bool operator==(const HX_PROP_TIMING_DATA&) const = default;
};

/// Pin-reference record: a delay relative to an edge of another pin of the
/// same block. `pin` is that pin's index (HX_NO_INDEX when unset).
struct HX_PROP_PINREF_DATA {
    int32_t min = HX_TIME_UNSET;
    int32_t max = HX_TIME_UNSET;
    int32_t unit = HX_UNIT_NONE;
    uint16_t pin = HX_NO_INDEX;
    int32_t edge = HX_EDGE_NONE;
    uint8_t inverted = 0;
    bool operator==(const HX_PROP_PINREF_DATA&) const = default;
};
