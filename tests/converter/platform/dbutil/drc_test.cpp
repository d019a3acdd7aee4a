#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "hx_design.h"
#include "hx_library.h"
#include "hxb_drc.h"
#include "msg_capture.h"
#include "ut_str.h"

namespace {

using Texts = std::vector<std::string>;

// A clean design to spoil: root "top" with input pin "a" and output pin "y",
// and a buffer "u1" from a to y.
class DrcTest : public testing::Test {
  protected:
    DrcTest() {
        design_ = library_.create_design("d");
        top_ = design_->create_logblock(nullptr, 2, "top");
        name_pin(top_, 0, "a", HX_PIN_IN);
        name_pin(top_, 1, "y", HX_PIN_OUT);
        a_ = signal("a");
        y_ = signal("y");
        design_->create_conn(a_, top_, 0);
        design_->create_conn(y_, top_, 1);
        buffer("u1", a_, y_);
    }

    static void name_pin(HX_BLOCK* block, uint16_t index, const char* name, uint8_t dir) {
        block->get_pin(index)->set_name(name);
        block->get_pin(index)->set_dir(dir);
    }
    HX_SIGNAL* signal(const char* name, HX_BLOCK* block = nullptr) {
        return design_->create_signal(block ? block : top_, name);
    }
    // A primitive of `type` under `parent` with `in` on every pin but the
    // last and `out` on the last (either may be null).
    HX_LOGPRIM* prim(int32_t type, const char* name, HX_SIGNAL* in, HX_SIGNAL* out,
                     HX_BASELOGBLOCK* parent = nullptr) {
        HX_LOGPRIM* p = design_->create_logprim(parent ? parent : top_, type, 2, name);
        const uint16_t last = static_cast<HX_BLOCK*>(p)->get_pin_count() - 1;
        for (uint16_t i = 0; in && i < last; ++i) {
            EXPECT_NE(design_->create_conn(in, p, i), nullptr);
        }
        if (out) {
            EXPECT_NE(design_->create_conn(out, p, last), nullptr);
        }
        return p;
    }
    HX_LOGPRIM* buffer(const char* name, HX_SIGNAL* in, HX_SIGNAL* out,
                       HX_BASELOGBLOCK* parent = nullptr) {
        return prim(HX_PRIM_BUF, name, in, out, parent);
    }

    int run() {
        capture_.clear();
        return drc_.run(design_);
    }
    Texts errors() const { return capture_.texts(PORT_MSG_ERROR); }
    Texts warnings() const { return capture_.texts(PORT_MSG_WARNING); }

    MsgCapture capture_;
    HX_LIBRARY library_{"lib", 0};
    HX_DESIGN* design_;
    HX_LOGBLOCK* top_;
    HX_SIGNAL* a_;
    HX_SIGNAL* y_;
    Hxb_DRC drc_;
};

TEST_F(DrcTest, ACleanDesignAndOneWithoutRoot) {
    EXPECT_EQ(run(), 0);
    EXPECT_TRUE(capture_.messages().empty());

    capture_.clear();
    EXPECT_EQ(drc_.run(library_.create_design("e")), 1);
    EXPECT_EQ(warnings(), Texts{"design 'e' has no root block"});
    EXPECT_EQ(capture_.messages()[0].module, "Hxb");
    EXPECT_EQ(drc_.getNumWarnings(), 1);
}

TEST_F(DrcTest, PinsWithoutNameOrWithTheSameName) {
    HX_LOGBLOCK* box = design_->create_logblock(top_, 5, "box");
    const char* names[] = {nullptr, "p", "q", "p", "p"};
    for (uint16_t i = 0; i < 5; ++i) {
        if (names[i]) box->get_pin(i)->set_name(names[i]);
        design_->create_conn(a_, box, i);
    }
    EXPECT_EQ(run(), 2);
    EXPECT_EQ(warnings(), Texts{"design 'd': pin 0 of block 'top/box' has no name"});
    EXPECT_EQ(errors(), Texts{"design 'd': block 'top/box' has more than one pin named 'p'"});
    EXPECT_EQ(drc_.getNumErrors(), 1);
    EXPECT_EQ(drc_.getNumWarnings(), 1);
}

TEST_F(DrcTest, UnconnectedPinsOfChildrenButNotOfTheRootOrUnused) {
    buffer("u2", nullptr, nullptr)->get_pin(1)->create_prop("UNUSED", HX_PROP_FLAG);
    design_->create_logblock(top_, 1, "box")->get_pin(0)->set_name("p");
    EXPECT_EQ(run(), 2);
    EXPECT_EQ(errors(), (Texts{"design 'd': pin 'IN' of block 'top/u2' has no outer signal",
                               "design 'd': pin 'p' of block 'top/box' has no outer signal"}));

    drc_.setCheck(Hxb_DRC::CHECK_UNCONNECTED_PIN, Hxb_DRC::STATUS_WARNING);
    EXPECT_EQ(run(), 1);
    EXPECT_EQ(warnings().size(), 2u);
    EXPECT_EQ(drc_.getNumErrors(), 0);
    EXPECT_EQ(drc_.getNumWarnings(), 2);

    drc_.setCheck(Hxb_DRC::CHECK_UNCONNECTED_PIN, Hxb_DRC::STATUS_IGNORE);
    EXPECT_EQ(run(), 0);
    EXPECT_TRUE(capture_.messages().empty());
}

TEST_F(DrcTest, NetworksWithLoadsButNoDriver) {
    HX_SIGNAL* n = signal("n");
    buffer("u2", n, nullptr)->get_pin(1)->create_prop("UNUSED", HX_PROP_FLAG);
    signal("floating");  // no pins: no loads either
    EXPECT_EQ(run(), 2);
    EXPECT_EQ(errors(), Texts{"design 'd': network 'top/n' has loads but no driver"});

    n->set_name(nullptr);
    run();
    EXPECT_EQ(errors(), Texts{UT_STR::Format("design 'd': unnamed network with tag %u has loads "
                                             "but no driver",
                                             n->get_network()->get_tag())});
}

TEST_F(DrcTest, DriversCountedOncePerNetUnlessWeak) {
    // Global signals and the root's inputs drive; a flip-flop's reset on a global is driven.
    HX_SIGNAL* gsr = design_->create_global_signal("GSR");
    HX_LOGPRIM* ff = design_->create_logprim(top_, HX_PRIM_FF, 0, "ff");
    for (uint16_t i = 0; i < static_cast<HX_BLOCK*>(ff)->get_pin_count(); ++i) {
        const uint8_t role = ff->get_pin(i)->get_role();
        design_->create_conn(role == HX_PPIN_OUT ? y_ : role == HX_PPIN_RST ? gsr : a_, ff, i);
    }
    EXPECT_EQ(run(), 2);
    EXPECT_EQ(errors(), Texts{"design 'd': network 'top/y' has 2 drivers, among them pin 'OUT' "
                              "of block 'top/u1' and pin 'OUT' of block 'top/ff'"});

    // Tri-state outputs and pulls share a net with each other and one driver.
    HX_SIGNAL* bus = signal("bus");
    prim(HX_PRIM_TRI, "t1", a_, bus);
    prim(HX_PRIM_TRI, "t2", a_, bus);
    prim(HX_PRIM_PULLUP, "pu", nullptr, bus);
    buffer("u3", a_, bus);
    buffer("u4", bus, y_);
    run();
    EXPECT_EQ(errors(), Texts{"design 'd': network 'top/y' has 3 drivers, among them pin 'OUT' "
                              "of block 'top/u1' and pin 'OUT' of block 'top/ff'"});
}

TEST_F(DrcTest, BlocksWithContentsPassNetsThroughAndBlackBoxesEndThem) {
    // sub: its output pin driven inside by a buffer from its input pin.
    HX_LOGBLOCK* sub = design_->create_logblock(top_, 2, "sub");
    name_pin(sub, 0, "i", HX_PIN_IN);
    name_pin(sub, 1, "o", HX_PIN_OUT);
    HX_SIGNAL* si = signal("si", sub);
    HX_SIGNAL* so = signal("so", sub);
    design_->create_conn(si, sub, 0);
    design_->create_conn(so, sub, 1);
    buffer("b", si, so, sub);
    HX_SIGNAL* m = signal("m");
    design_->create_conn(a_, sub, 0);
    design_->create_conn(m, sub, 1);
    buffer("u2", m, nullptr)->get_pin(1)->create_prop("UNUSED", HX_PROP_FLAG);
    EXPECT_EQ(run(), 0) << testing::PrintToString(errors());

    // A black box's output drives; its input loads.
    HX_LOGBLOCK* bb = design_->create_logblock(top_, 2, "bb");
    name_pin(bb, 0, "i", HX_PIN_IN);
    name_pin(bb, 1, "o", HX_PIN_OUT);
    HX_SIGNAL* k = signal("k");
    design_->create_conn(signal("undriven"), bb, 0);
    design_->create_conn(k, bb, 1);
    buffer("u3", k, nullptr)->get_pin(1)->create_prop("UNUSED", HX_PROP_FLAG);
    EXPECT_EQ(run(), 2);
    EXPECT_EQ(errors(), Texts{"design 'd': network 'top/undriven' has loads but no driver"});
}

TEST_F(DrcTest, ReportLimitHoldsFloodsBackPerCheckAndKeepsCountsExact) {
    for (const char* name : {"b1", "b2", "b3", "b4"})
        buffer(name, nullptr, nullptr)->get_pin(0)->create_prop("UNUSED", HX_PROP_FLAG);
    HX_SIGNAL* n = signal("n");
    buffer("b5", n, y_);  // y gets a second driver
    drc_.setReportLimit(2, "ask for all");
    EXPECT_EQ(run(), 2);
    EXPECT_EQ(errors(), (Texts{"design 'd': pin 'OUT' of block 'top/b1' has no outer signal",
                               "design 'd': pin 'OUT' of block 'top/b2' has no outer signal",
                               "design 'd': network 'top/y' has 2 drivers, among them pin "
                               "'OUT' of block 'top/u1' and pin 'OUT' of block 'top/b5'",
                               "design 'd': network 'top/n' has loads but no driver",
                               "2 more findings 'pin without outer signal' not shown (the first "
                               "2 are above); ask for all"}));
    EXPECT_EQ(drc_.getNumErrors(), 6);
    EXPECT_EQ(drc_.getNumOmitted(Hxb_DRC::CHECK_UNCONNECTED_PIN), 2);
}

TEST_F(DrcTest, ALibraryRunCoversEveryDesignAndCountsAfresh) {
    HX_DESIGN* bad = library_.create_design("bad");
    HX_PHYSBLOCK* root = bad->create_physblock(nullptr, 0, "chip");
    bad->create_physprim(root, HX_PRIM_ONE, 0, "vcc");
    library_.create_design("e");
    drc_.setCheck(Hxb_DRC::CHECK_UNCONNECTED_PIN, Hxb_DRC::STATUS_WARNING);
    drc_.setCheck(static_cast<Hxb_DRC::Check>(5), Hxb_DRC::STATUS_ERROR);  // no such check

    capture_.clear();
    EXPECT_EQ(drc_.run(&library_), 1);
    EXPECT_EQ(warnings(), (Texts{"design 'bad': pin 'OUT' of block 'chip/vcc' has no outer signal",
                                 "design 'e' has no root block"}));
    EXPECT_EQ(drc_.getNumWarnings(), 2);
    EXPECT_EQ(run(), 0);
    EXPECT_EQ(drc_.getNumWarnings(), 0);
}

}  // namespace
