// The keyword tables: every value reads back as itself through its keyword,
// and each lookup stays within its own table.
#include <gtest/gtest.h>

#include <set>
#include <string>

#include "hx_types.h"
#include "vx_typenames.h"

namespace {

template <class Row>
int rows_of(const Row* rows) {
    int n = 0;
    while (rows[n].keyword != nullptr)
        ++n;
    return n;
}

TEST(TypeNames, EveryValueOnceAndBackThroughItsKeyword) {
    ASSERT_EQ(rows_of(vx_prim_types), HX_PRIMITIVE_TYPE_COUNT);
    ASSERT_EQ(rows_of(vx_prim_pin_types), HX_PIN_PRIMITIVE_TYPE_COUNT);
    ASSERT_EQ(rows_of(vx_pin_types), 5);

    std::set<int> seen;
    for (int v = 0; v < HX_PRIMITIVE_TYPE_COUNT; ++v) {
        const char* k = vx_prim_type_name(v);
        ASSERT_NE(k, nullptr) << v;
        ASSERT_EQ(vx_find_prim_type(k)->value, v);
        seen.insert(v);
    }
    for (int v = 0; v < HX_PIN_PRIMITIVE_TYPE_COUNT; ++v) {
        const char* k = vx_prim_pin_name(v);
        ASSERT_NE(k, nullptr) << v;
        ASSERT_EQ(vx_find_prim_pin_type(k)->value, v);
    }
    for (int v = 0; v < 5; ++v) {
        const char* k = vx_pin_type_name(v);
        ASSERT_NE(k, nullptr) << v;
        ASSERT_EQ(vx_find_pin_type(k)->value, v);
    }
    EXPECT_EQ(seen.size(), 19u);
}

TEST(TypeNames, RowsAndFlagsAsTheFormatFixesThem) {
    // The row order is part of the format; spot-check the places where it is
    // not the order of the values.
    EXPECT_STREQ(vx_prim_types[5].keyword, "MUX");
    EXPECT_EQ(vx_prim_types[5].value, HX_PRIM_MUX);
    EXPECT_STREQ(vx_prim_types[18].keyword, "ROM");
    EXPECT_STREQ(vx_prim_pin_types[15].keyword, "PAD");
    EXPECT_STREQ(vx_pin_types[3].keyword, "TRI");
    EXPECT_EQ(vx_pin_types[3].value, HX_PIN_TRI);

    std::string with_width;
    for (const VX_PRIM_TYPE_ROW* r = vx_prim_types; r->keyword; ++r)
        if (r->needs_width) with_width += std::string(r->keyword) + " ";
    EXPECT_EQ(with_width, "AND OR XOR RAM RAMS RAMD ROM ");
}

TEST(TypeNames, SameWordDifferentTablesAndUnknownWords) {
    EXPECT_EQ(vx_find_prim_type("PAD")->value, HX_PRIM_PAD);
    EXPECT_EQ(vx_find_prim_pin_type("PAD")->value, HX_PPIN_PAD);
    EXPECT_EQ(vx_find_prim_type("TRI")->value, HX_PRIM_TRI);
    EXPECT_EQ(vx_find_pin_type("TRI")->value, HX_PIN_TRI);
    EXPECT_EQ(vx_find_pin_type("IN")->value, HX_PIN_IN);
    EXPECT_EQ(vx_find_prim_pin_type("IN")->value, HX_PPIN_IN);

    EXPECT_EQ(vx_find_prim_type("and"), nullptr);  // keywords are exact
    EXPECT_EQ(vx_find_prim_type("NAND"), nullptr);
    EXPECT_EQ(vx_find_prim_type(nullptr), nullptr);
    EXPECT_EQ(vx_find_pin_type("PAD"), nullptr);
    EXPECT_EQ(vx_prim_type_name(19), nullptr);
    EXPECT_EQ(vx_prim_pin_name(-1), nullptr);
    EXPECT_EQ(vx_pin_type_name(5), nullptr);
}

}  // namespace
