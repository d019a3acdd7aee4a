#include "vx_typenames.h"

#include <array>

#include "ut_str.h"

const VX_PRIM_TYPE_ROW vx_prim_types[20] = {
    {"BUF", 0, 0},  {"CKBUF", 1, 0}, {"AND", 2, 1},   {"OR", 3, 1},      {"XOR", 4, 1},
    {"MUX", 17, 0}, {"TRI", 5, 0},   {"SFF", 18, 0},  {"FF", 6, 0},      {"LATCH", 7, 0},
    {"PAD", 8, 0},  {"ONE", 9, 0},   {"ZERO", 10, 0}, {"PULLUP", 11, 0}, {"PULLDOWN", 12, 0},
    {"RAM", 13, 1}, {"RAMS", 15, 1}, {"RAMD", 16, 1}, {"ROM", 14, 1},    {nullptr, 0, 0},
};

const VX_TYPE_ROW vx_prim_pin_types[17] = {
    {"IN", 0},  {"OUT", 1},   {"CTL", 2},   {"SEL", 11}, {"INA", 12},  {"INB", 13},
    {"ADR", 8}, {"RADR", 9},  {"WADR", 10}, {"CLK", 3},  {"CE", 4},    {"SET", 5},
    {"RST", 6}, {"SSET", 14}, {"SRST", 15}, {"PAD", 7},  {nullptr, 0},
};

const VX_TYPE_ROW vx_pin_types[6] = {
    {"IN", 1}, {"OUT", 2}, {"BI", 4}, {"TRI", 3}, {"NOTYPE", 0}, {nullptr, 0},
};

namespace {

template <class Row>
const Row* find_keyword(const Row* rows, const char* keyword) {
    if (keyword == nullptr) return nullptr;
    for (const Row* row = rows; row->keyword != nullptr; ++row)
        if (UT_STR::Compare(row->keyword, keyword) == 0) return row;
    return nullptr;
}

// The writer asks for a keyword per pin; a table indexed by value answers in
// one step with what the first matching row would give.
template <std::size_t N, class Row>
std::array<const char*, N> index_by_value(const Row* rows) {
    std::array<const char*, N> names{};
    for (const Row* row = rows; row->keyword != nullptr; ++row) {
        const auto v = static_cast<std::size_t>(row->value);
        if (v < N && names[v] == nullptr) names[v] = row->keyword;
    }
    return names;
}

template <std::size_t N>
const char* name_of(const std::array<const char*, N>& names, int32_t value) {
    return value >= 0 && static_cast<std::size_t>(value) < N ? names[value] : nullptr;
}

}  // namespace

const VX_PRIM_TYPE_ROW* vx_find_prim_type(const char* keyword) {
    return find_keyword(vx_prim_types, keyword);
}
const VX_TYPE_ROW* vx_find_prim_pin_type(const char* keyword) {
    return find_keyword(vx_prim_pin_types, keyword);
}
const VX_TYPE_ROW* vx_find_pin_type(const char* keyword) {
    return find_keyword(vx_pin_types, keyword);
}

const char* vx_prim_type_name(int32_t value) {
    static const auto names = index_by_value<19>(vx_prim_types);
    return name_of(names, value);
}
const char* vx_prim_pin_name(int32_t value) {
    static const auto names = index_by_value<16>(vx_prim_pin_types);
    return name_of(names, value);
}
const char* vx_pin_type_name(int32_t value) {
    static const auto names = index_by_value<5>(vx_pin_types);
    return name_of(names, value);
}
