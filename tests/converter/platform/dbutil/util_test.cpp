#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "hx_design.h"
#include "hx_library.h"
#include "hxb_util.h"
#include "msg_capture.h"
#include "pm_device.h"

namespace {

// A design with a logical root "top" and a flip-flop "u1" under it.
class UtilTest : public testing::Test {
  protected:
    UtilTest() {
        design_ = library_.create_design("d");
        top_ = design_->create_logblock(nullptr, 3, "top");
        ff_ = design_->create_logprim(top_, HX_PRIM_FF, HX_NO_INDEX, "u1");
    }

    std::unique_ptr<HX_PROPERTY> parse(const char* name, const char* value) {
        message_.clear();
        return Hxb_Util::parse_prop(name, value, message_, ff_);
    }
    // The text of `value` read as `name` and written back.
    std::string reformed(const char* name, const char* value) {
        auto prop = parse(name, value);
        if (prop == nullptr) return "refused: " + message_;
        HX_PROP_PINREF_DATA pinref;
        HX_PROP_TIMING_DATA timing;
        if (prop->get_pinref(pinref)) return Hxb_Util::form_pinref(pinref, ff_);
        EXPECT_TRUE(prop->get_timing(timing));
        return Hxb_Util::form_timing(timing);
    }

    HX_LIBRARY library_{"lib", 0};
    HX_DESIGN* design_;
    HX_LOGBLOCK* top_;
    HX_LOGPRIM* ff_;
    std::string message_;
};

TEST_F(UtilTest, TimingAndPinReferenceRecordsSurviveFormAndParse) {
    const int32_t numbers[] = {HX_TIME_UNSET, 0, -7, INT32_MAX, HX_TIME_UNSET + 1};
    const uint16_t clk = ff_->get_prim_index(HX_PPIN_CLK, HX_NO_INDEX);
    for (int32_t min : numbers) {
        for (int32_t max : numbers) {
            for (int32_t unit = HX_UNIT_PS; unit <= HX_UNIT_NONE; ++unit) {
                const HX_PROP_TIMING_DATA timing{min, max, unit};
                auto prop = parse("MAXDELAY", Hxb_Util::form_timing(timing).c_str());
                ASSERT_NE(prop, nullptr) << message_;
                HX_PROP_TIMING_DATA back;
                EXPECT_TRUE(prop->get_timing(back));
                EXPECT_EQ(back, timing);

                for (int32_t edge : {HX_EDGE_RISING, HX_EDGE_FALLING, HX_EDGE_NONE}) {
                    const HX_PROP_PINREF_DATA ref{min, max, unit, clk, edge, uint8_t(edge & 1)};
                    prop = parse("CLKREF", Hxb_Util::form_pinref(ref, ff_).c_str());
                    ASSERT_NE(prop, nullptr) << message_;
                    HX_PROP_PINREF_DATA ref_back;
                    EXPECT_TRUE(prop->get_pinref(ref_back));
                    EXPECT_EQ(ref_back, ref);
                }
            }
        }
    }
}

TEST_F(UtilTest, TextFormsAreReadLenientlyAndWrittenInOneSpelling) {
    EXPECT_EQ(reformed("SETUP", "2:5ns"), "2:5ns");
    EXPECT_EQ(reformed("SETUP", ":5ns"), ":5ns");
    EXPECT_EQ(reformed("SETUP", "7:"), "7:");
    EXPECT_EQ(reformed("SETUP", ":"), ":");
    EXPECT_EQ(reformed("SETUP", "+3:-4NS"), "3:-4ns");
    EXPECT_EQ(reformed("CLKREF", "CLK,R,0:2ns"), "CLK,R,0:2ns");
    EXPECT_EQ(reformed("CLKREF", "IN"), "IN");
    EXPECT_EQ(reformed("CLKREF", "CLK,f,:1Us,inv"), "CLK,F,:1us,INV");
    EXPECT_EQ(reformed("CLKREF", "CLK,:"), "CLK");
    EXPECT_EQ(reformed("CLKREF", "clk,R"), "refused: property CLKREF: no pin 'clk' on block 'u1'");
}

TEST_F(UtilTest, ValuesThatDoNotFitTheirKindAreRefusedWithAReason) {
    const char* pinref_form = "a pin reference of the form PIN[,R|F][,MIN:MAXUNIT][,INV]";
    const std::vector<std::vector<std::string>> cases = {
        {"DRIVE", "abc", "'abc' is not an integer"},
        {"DRIVE", "", "'' is not an integer"},
        {"DRIVE", " 5", "' 5' is not an integer"},
        {"DRIVE", "+-5", "'+-5' is not an integer"},
        {"DRIVE", "2147483648", "'2147483648' is out of range"},
        {"DRIVE", "-2147483648", "'-2147483648' is out of range"},  // the "unset" marker
        {"LOAD", "nan", "'nan' is not a number"},
        {"LOAD", "1e999", "'1e999' is out of range"},
        {"HOLD", "5ns", "'5ns' is not a timing of the form MIN:MAXUNIT"},
        {"HOLD", "1ns:2", "'1ns:2' is not a timing of the form MIN:MAXUNIT"},
        {"HOLD", "1:2:3", "'1:2:3' is not a timing of the form MIN:MAXUNIT"},
        {"HOLD", "1:-2147483648ns", "'1:-2147483648ns' is out of range"},
        {"HOLDREF", "CLK,INV,R", std::string("'CLK,INV,R' is not ") + pinref_form},
        {"HOLDREF", ",R", std::string("',R' is not ") + pinref_form},
        {"HOLDREF", "CLK,R,", std::string("'CLK,R,' is not ") + pinref_form},
        {"HOLDREF", "CLK,R,1:2xs", std::string("'CLK,R,1:2xs' is not ") + pinref_form},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(parse(c[0].c_str(), c[1].c_str()), nullptr) << c[1];
        EXPECT_EQ(message_, "property " + c[0] + ": " + c[2]);
    }
    message_.clear();
    EXPECT_EQ(Hxb_Util::parse_prop("CLKREF", "CLK,R", message_, nullptr), nullptr);
    EXPECT_EQ(message_, "property CLKREF: pin 'CLK' named outside a block");
    EXPECT_EQ(parse("", "1"), nullptr);
    EXPECT_EQ(message_, "property without a name");
}

TEST_F(UtilTest, KindsOfOtherNamesAndFlags) {
    struct Case {
        const char* name;
        const char* value;
        HX_PROP_TYPE kind;
        const char* text;
    };
    for (const Case& c :
         {Case{"INIT", "", HX_PROP_FLAG, nullptr}, Case{"INIT", nullptr, HX_PROP_FLAG, nullptr},
          Case{"INIT", "@width", HX_PROP_PARAM, "width"},
          Case{"INIT", "x@y", HX_PROP_STRING, "x@y"}, Case{"UNUSED", "", HX_PROP_FLAG, nullptr},
          Case{"TIMESPEC", "TS01 = PERIOD 10 ns", HX_PROP_TIMINGSTR, nullptr}}) {
        auto prop = parse(c.name, c.value);
        ASSERT_NE(prop, nullptr) << c.name;
        EXPECT_EQ(prop->get_kind(), c.kind) << c.name;
        if (c.text) {
            EXPECT_STREQ(prop->get_text(), c.text);
        }
        EXPECT_TRUE(message_.empty());
    }
    EXPECT_EQ(Hxb_Util::form_timingstr(parse("PERIOD", "10 ns HIGH").get()), "10 ns HIGH");
    EXPECT_EQ(parse("FANOUT", "-12")->get_int(), -12);
    EXPECT_EQ(parse("CAP", "2.5")->get_float(), 2.5);

    auto flag = parse("TRANSPARENT", "yes");
    ASSERT_NE(flag, nullptr);
    EXPECT_EQ(flag->get_kind(), HX_PROP_FLAG);
    EXPECT_EQ(message_, "property TRANSPARENT is a flag: value 'yes' ignored");
}

TEST_F(UtilTest, PinReferencesToPinsWithoutName) {
    MsgCapture capture;
    // An unnamed pin is written under the name the reader gives it, and found again.
    const HX_PROP_PINREF_DATA ref{.pin = 1, .edge = HX_EDGE_RISING};
    const std::string text = Hxb_Util::form_pinref(ref, top_);
    EXPECT_EQ(text, "**UNDEFINED.1**,R");
    top_->get_pin(1)->set_name("**UNDEFINED.1**");
    auto prop = Hxb_Util::parse_prop("CLKREF", text.c_str(), message_, top_);
    ASSERT_NE(prop, nullptr) << message_;
    EXPECT_TRUE(capture.messages().empty());

    // A pin the block does not have: written, with a warning; refused on reading.
    EXPECT_EQ(Hxb_Util::form_pinref({.pin = 9, .inverted = 1}, ff_), "**UNDEFINED.9**,INV");
    EXPECT_EQ(Hxb_Util::form_pinref({}, nullptr), "**UNDEFINED.65535**");
    EXPECT_EQ(
        capture.texts(PORT_MSG_WARNING),
        (std::vector<std::string>{"pin reference to pin 9, which block 'u1' does not have",
                                  "pin reference to pin 65535, which block '' does not have"}));
    EXPECT_EQ(parse("CLKREF", "**UNDEFINED.9**,INV"), nullptr);
}

TEST_F(UtilTest, LookupsAndThePhysicalProperty) {
    top_->get_pin(0)->set_name("Data");
    EXPECT_EQ(Hxb_Util::find_pin(top_, "DATA", 0), HX_NO_INDEX);
    EXPECT_EQ(Hxb_Util::find_pin(top_, "DATA", 1), 0);
    EXPECT_EQ(Hxb_Util::find_pin(nullptr, "Data", 0), HX_NO_INDEX);
    HX_SIGNAL* gsr = design_->create_global_signal("GSR");
    EXPECT_EQ(Hxb_Util::find_global_sig(design_, "GSR"), gsr);
    EXPECT_EQ(Hxb_Util::find_global_sig(nullptr, "GSR"), nullptr);
    library_.create_prop("COUNT", 3);
    EXPECT_EQ(Hxb_Util::get_string_prop(&library_, "COUNT"), nullptr);

    const PM_PIC pic("dev1", nullptr, nullptr);
    EXPECT_TRUE(Hxb_Util::set_physical_prop(ff_, &pic));
    EXPECT_STREQ(Hxb_Util::get_string_prop(ff_, "PHYSICAL"), "dev1");
    HX_PHYSBLOCK* phys = design_->create_physblock(nullptr, 0, "p");
    EXPECT_FALSE(Hxb_Util::set_physical_prop(phys, &pic));
    EXPECT_EQ(phys->prop_count(), 0);
    EXPECT_FALSE(Hxb_Util::set_physical_prop(top_, nullptr));
}

}  // namespace
