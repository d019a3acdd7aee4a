#include <memory>
#include <string>

#include "hxb_propfilter.h"
#include "writer_access.h"

namespace writer_test {
namespace {

class PropertyWriterTest : public ::testing::Test {
  protected:
    PropertyWriterTest() { A::design(vrx) = design; }

    /// The properties of `object` as write_props writes them from `column`.
    std::string props(const HX_OBJECT& object, uint8_t opened = 0, int32_t column = 0) {
        ScratchStream out(vrx, dir);
        A::column(vrx) = column;
        last_opened = opened;
        A::write_props(vrx, &object, &last_opened);
        return out.bytes();
    }

    MsgCapture capture;
    ScratchDir dir;
    VRX vrx;
    HX_LIBRARY lib{"lib", 0};
    HX_DESIGN* design = lib.create_design("d");
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 0, "top");
    HX_OBJECT object;
    uint8_t last_opened = 0;
};

TEST_F(PropertyWriterTest, ValuesOfEveryWrittenKind) {
    object.create_prop("F", HX_PROP_FLAG);
    object.create_prop("INIT", -3);
    object.create_prop(HX_PROPERTY::make_float("X", 2.5), nullptr);
    object.create_prop("S1", "", 1);
    object.create_prop("S2", "a b", 1);
    object.create_prop("S3", "PIN", 1);
    object.create_prop("S4", "v", 1);
    EXPECT_EQ(props(object), R"( (F INIT=-3 X=2.500000 S1="" S2="a b" S3="PIN" S4=v)");
    EXPECT_EQ(last_opened, 1);

    HX_OBJECT second;
    second.create_prop(HX_PROPERTY::make_timing("MAXDELAY", {2, 5, HX_UNIT_NS}), nullptr);
    second.create_prop(HX_PROPERTY::make_timing("SETUP", {}), nullptr);
    // Timing strings and parameters are quoted only where a bare word would
    // not read back whole.
    second.create_prop(HX_PROPERTY::make_text("TIMESPEC", HX_PROP_TIMINGSTR, "TS a"), nullptr);
    second.create_prop(HX_PROPERTY::make_text("P", HX_PROP_PARAM, "x y"), nullptr);
    second.create_prop("CREATE_TIMESTAMP", "t", 1);  // skipped only as an integer
    second.create_prop("F", HX_PROP_FLAG);
    EXPECT_EQ(props(second),
              " (MAXDELAY=2:5ns SETUP=: TIMESPEC=\"TS a\" P=\"@x y\" CREATE_TIMESTAMP=t F");
    EXPECT_EQ(props(second, 1),
              " MAXDELAY=2:5ns SETUP=: TIMESPEC=\"TS a\" P=\"@x y\" CREATE_TIMESTAMP=t F");
    EXPECT_TRUE(capture.messages().empty());
}

TEST_F(PropertyWriterTest, FloatsKeepSixDecimalsOnlyWhereTheyReadBackExactly) {
    const std::pair<double, std::string> cases[] = {
        {0.1, "0.100000"},
        {-0.0, "-0.000000"},
        {1e20, "100000000000000000000.000000"},
        {1e-9, "1e-09"},
        {-1e-300, "-1e-300"},
        {0.1234567, "0.1234567"},
        {1.0 / 3, "0.3333333333333333"},
    };
    for (const auto& [value, expected] : cases) {
        HX_OBJECT holder;
        holder.create_prop(HX_PROPERTY::make_float("CAP", value), nullptr);
        EXPECT_EQ(props(holder), " (CAP=" + expected) << expected;
    }
    EXPECT_TRUE(capture.messages().empty());
}

TEST_F(PropertyWriterTest, SkippedPropertiesOpenNoList) {
    object.create_prop("CREATE_TIMESTAMP", 12345);
    EXPECT_EQ(props(object), "");
    EXPECT_EQ(last_opened, 0);
    EXPECT_TRUE(capture.messages().empty());

    HX_OBJECT reference;
    reference.create_prop(HX_PROPERTY::make_object("REF", top), nullptr);
    EXPECT_EQ(props(reference), "");
    EXPECT_EQ(last_opened, 0);
    expect_writer_report(capture, PORT_MSG_WARNING, "Unable to write out OBJECT prop.\n");

    capture.clear();
    HX_OBJECT pinref;
    HX_PROP_PINREF_DATA record;
    record.pin = 0;
    pinref.create_prop(HX_PROPERTY::make_pinref("CLKREF", record), nullptr);
    EXPECT_EQ(props(pinref), "");  // only pins have a block to name the pin in
    expect_writer_report(capture, PORT_MSG_ERROR,
                         "Ignoring pinref property found on non-block object\n");
}

TEST_F(PropertyWriterTest, NetTagsBecomeNetNames) {
    HX_SIGNAL* clk = design->create_global_signal("clk_net");
    HX_SIGNAL* spaced = design->create_global_signal("a b");
    HX_SIGNAL* unnamed = design->create_signal(top, nullptr);
    object.create_prop("MERGEDTO", static_cast<int32_t>(clk->get_network()->get_tag()));
    object.create_prop("MERGEDFROM", static_cast<int32_t>(unnamed->get_network()->get_tag()));
    object.create_prop("JOINED", static_cast<int32_t>(spaced->get_network()->get_tag()));
    EXPECT_EQ(props(object), " (MERGEDTO=clk_net MERGEDFROM=OBJ_$1 JOINED=\"a b\"");
    EXPECT_TRUE(capture.messages().empty());

    HX_OBJECT missing;
    missing.create_prop("MERGEDTO", 999);
    EXPECT_EQ(props(missing), "");
    EXPECT_EQ(last_opened, 0);
    expect_writer_report(capture, PORT_MSG_INTERNAL,
                         "No net found for tag in MERGEDTO=999 property.\n");
}

TEST_F(PropertyWriterTest, ListWrapsBetweenPropertiesOnly) {
    object.create_prop("LONGNAME", 12345);
    EXPECT_EQ(props(object, 1, 70), "\r\n LONGNAME=12345");
    // A flag in an open list is a pair, which may reach column 80.
    HX_OBJECT flag;
    flag.create_prop("ABCDEFGHI", HX_PROP_FLAG);
    EXPECT_EQ(props(flag, 1, 70), " ABCDEFGHI");
    EXPECT_EQ(props(flag, 1, 71), "\r\n ABCDEFGHI");
    EXPECT_EQ(props(flag, 0, 70), "\r\n (ABCDEFGHI");
}

TEST_F(PropertyWriterTest, UnknownKindIsFatalAndTheExitHandlerMayReturn) {
    object.create_prop(std::make_unique<HX_PROPERTY>("ODD", static_cast<HX_PROP_TYPE>(9)), nullptr);
    props(object);
    EXPECT_EQ(capture.exits(), std::vector<int>{2});
    expect_writer_report(capture, PORT_MSG_FATAL, "invalid property type.\n");
}

TEST_F(PropertyWriterTest, FilterRenamesAndDrops) {
    const std::string rules = dir.file("rules.flt");
    ScratchDir::write_file(rules, "DROP\nOLD=NEW\nMERGED*=HIST_*\n");
    Hxb_PropFiltStatus status = HXB_PROPFILT_NOT_READ;
    A::prop_filter(vrx) =
        new Hxb_PropFilter(rules.c_str(), &status, nullptr, Hxb_PropFilter::FROM_DATABASE);
    ASSERT_EQ(status, HXB_PROPFILT_READ);
    object.create_prop("DROP", 1);
    object.create_prop("OLD", "v w", 1);
    object.create_prop("KEEP", 3);
    EXPECT_EQ(props(object), R"( (NEW="v w" KEEP=3)");
    // A renamed tag property still names its net, not the net's number.
    HX_OBJECT merged;
    merged.create_prop(
        "MERGEDTO",
        static_cast<int32_t>(design->create_global_signal("g")->get_network()->get_tag()));
    EXPECT_EQ(props(merged), " (HIST_TO=g");
    HX_OBJECT dropped;
    dropped.create_prop("DROP", HX_PROP_FLAG);
    EXPECT_EQ(props(dropped), "");
    EXPECT_EQ(last_opened, 0);
}

}  // namespace
}  // namespace writer_test
