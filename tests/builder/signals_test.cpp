// Pin properties that connect and flag pins, signal statements, global
// signals, merge records resolved to network tags, and map signals.
#include <algorithm>

#include "builder_fixture.h"

namespace builder_test {
namespace {

TEST_F(BuilderTest, PinConnectionsDirectionsAndInversionFlags) {
    ASSERT_EQ(read("DESIGN d {\n"
                   "   BLOCK d 3 {\n"
                   "      PIN a (TYPE=IN CONN=a MAPINV MAPINV INV RCSID=1)\n"
                   "      PIN b (TYPE=BI CONN=\"\" MAPINV=1 MAPINV)\n"
                   "      PIN c (TYPE=bidir TYPE=NOTYPE)\n"
                   "   }\n"
                   "   PRIM BUF (NAME=g) {\n"
                   "      PIN IN (CONN=a INV INV INV=1 MAPINV)\n"
                   "      PIN OUT (CONN=y INV TYPE=TRI)\n"
                   "   }\n"
                   "   PHYSBLOCK d 1 { PIN p (CONN=a) }\n"
                   "   PHYSPRIM BUF { PIN IN (CONN=a) }\n"
                   "}\n"),
              VX_PARSE_ERROR);
    EXPECT_EQ(reports(), (std::vector<std::string>{
                             W(4, "ignoring CONN property without name on PIN"),
                             W(4, "ignoring MAPINV property value on PIN"),
                             E(5, "unrecognized pin TYPE name: bidir"),
                             W(8, "ignoring INV property value on PIN"),
                         }));
    const HX_BLOCK* r = root();
    const HX_PIN* a = r->get_pin(0);
    EXPECT_EQ(a->get_dir(), HX_PIN_IN);
    EXPECT_EQ(a->get_mapinv(), 0);     // toggled twice
    EXPECT_EQ(prop_names(a), "INV ");  // no inversion flag on a block pin
    const HX_PIN* b = r->get_pin(1);
    EXPECT_EQ(b->get_dir(), HX_PIN_BI);
    EXPECT_EQ(b->get_mapinv(), 1);
    EXPECT_EQ(b->get_inner_signal(), nullptr);
    EXPECT_EQ(r->get_pin(2)->get_dir(), HX_PIN_NOTYPE);

    const HX_BLOCK* g = child(r, 0);
    const HX_PIN* in = g->get_pin(0);
    EXPECT_EQ(in->get_inverted(), 0);
    EXPECT_EQ(in->get_mapinv(), 1);
    EXPECT_EQ(in->get_outer_signal(), a->get_inner_signal());  // one signal per name
    const HX_PIN* out = g->get_pin(1);
    EXPECT_EQ(out->get_inverted(), 1);
    EXPECT_EQ(out->get_dir(), HX_PIN_TRI);
    ASSERT_NE(out->get_outer_signal(), nullptr);
    EXPECT_STREQ(out->get_outer_signal()->get_name(), "y");

    // The same name in the physical hierarchy is another signal, of the physical root.
    const HX_BLOCK* pr = design()->get_phys_root();
    const HX_SIGNAL* pa = pr->get_pin(0)->get_inner_signal();
    ASSERT_NE(pa, nullptr);
    EXPECT_NE(pa, a->get_inner_signal());
    EXPECT_EQ(pa->get_block(), pr);
    EXPECT_EQ(child(pr, 0)->get_pin(0)->get_outer_signal(), pa);
}

TEST_F(BuilderTest, SignalStatementsGlobalsAndAliases) {
    ASSERT_EQ(read("DESIGN d {\n"
                   "   BLOCK d 1 { PIN a (TYPE=IN CONN=a) }\n"
                   "   BLOCK u 2 { PIN x (CONN=g) PIN y (CONN=a) }\n"
                   "   PHYSBLOCK d 1 { PIN p (CONN=pn) }\n"
                   "   SIGNAL g (GLOBAL X=1 NAME=n SIG_ALIAS=al RCSID=r)\n"
                   "   SIGNAL fresh (F=1)\n"
                   "   PHYSSIGNAL pfresh (F=2)\n"
                   "   SIGNAL a (SIG_ALIAS=al2 P=@q)\n"
                   "}\n"),
              VX_OK);
    EXPECT_EQ(reports(), std::vector<std::string>{W(5, "ignoring NAME property on signal")});
    HX_SIGNAL* g = design()->find_global_signal("g");
    ASSERT_NE(g, nullptr);
    EXPECT_EQ(child(root(), 0)->get_pin(0)->get_outer_signal(), g);
    EXPECT_EQ(prop_names(g->get_network()), "X ");
    EXPECT_EQ(text_prop(g->get_network(), "X"), "1");
    EXPECT_EQ(prop_names(g), "SIG_ALIAS ");  // alias names stay on the signal
    EXPECT_EQ(text_prop(g, "SIG_ALIAS"), "al");

    HX_NETWORK* fresh = net_named(design(), "d/fresh");
    ASSERT_NE(fresh, nullptr);
    EXPECT_EQ(fresh->get_highest_signal()->get_block(), root());
    EXPECT_EQ(text_prop(fresh, "F"), "1");
    HX_NETWORK* pfresh = net_named(design(), "d/pfresh");
    ASSERT_NE(pfresh, nullptr);
    EXPECT_EQ(pfresh->get_highest_signal()->get_block(), design()->get_phys_root());
    EXPECT_EQ(text_prop(pfresh, "F"), "2");

    HX_SIGNAL* a = root()->get_pin(0)->get_inner_signal();
    EXPECT_EQ(text_prop(a, "SIG_ALIAS"), "al2");
    EXPECT_EQ(prop_kind(a->get_network(), "P"), HX_PROP_PARAM);
    EXPECT_EQ(own_texts(PORT_MSG_STATUS).back(), "DRC complete\n");
}

TEST_F(BuilderTest, MergeRecordsBecomeTagsOfTheNamedNets) {
    ASSERT_EQ(read("DESIGN d {\n"
                   "   BLOCK d 2 { PIN a (TYPE=IN CONN=a) PIN b (TYPE=IN CONN=b) }\n"
                   "   BLOCK u 1 { PIN x (CONN=g) }\n"
                   "   PHYSBLOCK d 1 { PIN p (CONN=p) }\n"
                   "   SIGNAL a (MERGEDTO=d/late JOINED=g MERGEDFROM=d/p)\n"
                   "   SIGNAL b (MERGEDFROM=d/b JOINED=d/nosuch)\n"
                   "   SIGNAL g (GLOBAL)\n"
                   "   SIGNAL late\n"
                   "}\n"),
              VX_OK);
    HX_NETWORK* a = net_named(design(), "d/a");
    HX_NETWORK* b = net_named(design(), "d/b");
    HX_NETWORK* late = net_named(design(), "d/late");
    HX_NETWORK* g = net_named(design(), "g");
    ASSERT_TRUE(a && b && late && g);
    ASSERT_EQ(prop_names(a), "MERGEDTO JOINED ");  // a physical net never matches MERGEDFROM
    EXPECT_EQ(prop_kind(a, "MERGEDTO"), HX_PROP_INT);
    EXPECT_EQ(a->find_prop("MERGEDTO")->get_int(), static_cast<int32_t>(late->get_tag()));
    EXPECT_EQ(a->find_prop("JOINED")->get_int(), static_cast<int32_t>(g->get_tag()));
    ASSERT_EQ(prop_names(b), "MERGEDFROM ");
    EXPECT_EQ(b->find_prop("MERGEDFROM")->get_int(), static_cast<int32_t>(b->get_tag()));

    std::vector<std::string> warnings = own_texts(PORT_MSG_WARNING);
    std::sort(warnings.begin(), warnings.end());
    EXPECT_EQ(warnings, (std::vector<std::string>{
                            "Net d/nosuch in JOINED property on net d/b not found\n",
                            "Net d/p in MERGEDFROM property on net d/a not found\n",
                        }));
    EXPECT_TRUE(reports().empty());
}

TEST_F(BuilderTest, EveryDesignOfAFileHasItsMergeRecordsResolved) {
    const char* const text =
        "DESIGN d1 {\n"
        "   BLOCK d1 2 { PIN a (TYPE=IN CONN=a) PIN b (TYPE=OUT CONN=a) }\n"
        "   SIGNAL a (MERGEDTO=d1/a JOINED=d1/none)\n"
        "}\n"
        "DESIGN d2 {\n"
        "   BLOCK d2 2 { PIN a (TYPE=IN CONN=a) PIN b (TYPE=OUT CONN=a) }\n"
        "   SIGNAL a (MERGEDFROM=d2/a)\n"
        "}\n";
    for (uint8_t is_design : {0, 1}) {
        SCOPED_TRACE(is_design);
        capture.clear();
        ASSERT_EQ(read(text, is_design), VX_OK);
        EXPECT_FALSE(has_merge_records(vrx.get_library()));
        HX_NETWORK* a1 = net_named(design_named(vrx.get_library(), "d1"), "d1/a");
        HX_NETWORK* a2 = net_named(design_named(vrx.get_library(), "d2"), "d2/a");
        ASSERT_TRUE(a1 && a2);  // each design has a signal a of its own
        ASSERT_EQ(prop_names(a1), "MERGEDTO ");
        EXPECT_EQ(a1->find_prop("MERGEDTO")->get_int(), static_cast<int32_t>(a1->get_tag()));
        EXPECT_EQ(prop_names(a2), "MERGEDFROM ");
        std::vector<std::string> warnings{"Net d1/none in JOINED property on net d1/a not found\n"};
        if (is_design)  // only d2 is stored
            warnings.push_back(
                "1 design read is not part of the stored design 'd2' (neither "
                "grafted nor instantiated into it): 'd1'; the input may be cut "
                "short\n");
        EXPECT_EQ(own_texts(PORT_MSG_WARNING), warnings);
    }
}

TEST_F(BuilderTest, MapSignalsAndMapConnections) {
    ASSERT_EQ(read("DESIGN d {\n"
                   "   BLOCK d 1 { PIN a (TYPE=IN CONN=a) }\n"
                   "   BLOCK lb 1 { PIN x (CONN=a) }\n"
                   "   BLOCK lb2 1 { PIN x (CONN=a) }\n"
                   "   BLOCK lb3 1 { PIN x (CONN=a) }\n"
                   "   PHYSBLOCK d 1 { PIN pa (CONN=pa) }\n"
                   "   PHYSBLOCK pb 2 { PIN q (CONN=pa) PIN r }\n"
                   "   PHYSBLOCK pc 1 { PIN q (CONN=pa) }\n"
                   "   MAPSIGNAL d/nosuch { MAPCONN d/lb x () }\n"
                   "   MAPSIGNAL d/pb q (NAME=ms P=1) {\n"
                   "      MAPCONN d/lb x (MAPINV FOO)\n"
                   "      MAPCONN d/lb2 ()\n"
                   "      MAPCONN d/nolb x ()\n"
                   "   }\n"
                   "   MAPSIGNAL d/pb r () {\n"
                   "      MAPCONN d/lb3 nosuchpin ()\n"
                   "   }\n"
                   "   MAPSIGNAL d/pc {\n"
                   "      MAPCONN d/lb ()\n"
                   "      MAPCONN d/lb3 x ()\n"
                   "   }\n"
                   "   MAPSIGNAL d/pb zz () { }\n"
                   "}\n"),
              VX_PARSE_ERROR);
    EXPECT_EQ(reports(),
              (std::vector<std::string>{
                  E(9, "Unable to find physical block d/nosuch for map signal."),
                  W(11, "Ignoring unrecogized mapconn prop FOO"),
                  W(12,
                    "No logical pin specified in MAPCONN statement, setting physical parent "
                    "only."),
                  E(13, "Unable to find logical block d/nolb for map connect."),
                  E(16, "cannot find pin nosuchpin on logical block d/lb3.\n"),
                  E(19, "Block d/lb cannot map to different physical parents."),
                  E(20, "Block d/lb3 cannot map to different physical parents."),
                  W(20, "Ignoring pin specified on logical child (MAPCONN) declaration."),
                  E(22, "Pin zz does not exist on block d/pb for mapsig."),
              }));
    HX_BLOCK* pb = block_named(design(), "d/pb", true);
    HX_BLOCK* lb = block_named(design(), "d/lb");
    ASSERT_TRUE(pb && lb);
    for (const char* name : {"d/lb", "d/lb2", "d/lb3"})
        EXPECT_EQ(block_named(design(), name)->get_phys_parent(), pb) << name;
    HX_MAPSIGNAL* ms = pb->get_pin(0)->get_map_signal();
    ASSERT_NE(ms, nullptr);
    EXPECT_STREQ(ms->get_name(), "ms");
    EXPECT_EQ(text_prop(ms, "P"), "1");
    EXPECT_EQ(lb->get_pin(0)->get_map_signal(), ms);
    EXPECT_EQ(lb->get_pin(0)->get_mapinv(), 1);
    ASSERT_NE(pb->get_pin(1)->get_map_signal(), nullptr);
    EXPECT_EQ(pb->get_pin(1)->get_map_signal()->get_name(), nullptr);
}

// Statements the database cannot carry out are reported at their line, and
// nothing half-made is left behind.
TEST_F(BuilderTest, StatementsWithNothingToActOnAreReported) {
    ASSERT_EQ(read("DESIGN d {\n"
                   "   BLOCK d 1 { PIN a (TYPE=IN CONN=a) }\n"
                   "   BLOCK lb 1 { PIN x (CONN=a) }\n"
                   "   PHYSBLOCK d 1 { PIN pa }\n"
                   "   PHYSBLOCK pb 1 { PIN q }\n"
                   "   MAPSIGNAL d/pb q (NAME=first) { }\n"
                   "   MAPSIGNAL d/pb q (NAME=second) { MAPCONN d/lb x () }\n"
                   "}\n"
                   "DESIGN e {\n"
                   "   BLOCK e 1 { PIN a (TYPE=IN CONN=a) }\n"
                   "   PHYSSIGNAL p (GLOBAL F=2)\n"
                   "}\n",
                   0),
              VX_PARSE_ERROR);
    const std::vector<std::string> got = reports();
    ASSERT_GE(got.size(), 2u) << ::testing::PrintToString(got);
    EXPECT_EQ(got.front().rfind("E Line number 7: ", 0), 0u) << got.front();  // pin has one
    EXPECT_EQ(got.back().rfind("E Line number 11: ", 0), 0u) << got.back();   // no physical root
    HX_DESIGN* d = design_named(vrx.get_library(), "d");
    EXPECT_STREQ(block_named(d, "d/pb", true)->get_pin(0)->get_map_signal()->get_name(), "first");
    EXPECT_EQ(block_named(d, "d/lb")->get_pin(0)->get_map_signal(), nullptr);
    EXPECT_EQ(design()->find_global_signal("p"), nullptr);
}

}  // namespace
// The copy of a design with merge records keeps them as references to its own
// nets, which the target's pin connections may then join into outer ones.
TEST_F(BuilderTest, GraftedMergeRecordsFollowTheCopiedNets) {
    const char* const text =
        "DESIGN cell {\n"
        "   BLOCK cell 2 { PIN a (TYPE=IN CONN=a) PIN y (TYPE=OUT CONN=y) }\n"
        "   PRIM BUF (NAME=b1) { PIN IN (CONN=a) PIN OUT (CONN=m) }\n"
        "   PRIM BUF (NAME=b2) { PIN IN (CONN=m) PIN OUT (CONN=y) }\n"
        "   SIGNAL m (MERGEDTO=cell/y)\n"
        "}\n"
        "DESIGN top {\n"
        "   BLOCK top 2 { PIN i (TYPE=IN CONN=i) PIN o (TYPE=OUT CONN=o) }\n"
        "   BLOCK cell (NAME=u1) { PIN a (CONN=i) PIN y (CONN=o) }\n"
        "}\n";
    ASSERT_EQ(read(text, 0), VX_OK);
    EXPECT_FALSE(has_merge_records(vrx.get_library()));
    HX_DESIGN* top = design_named(vrx.get_library(), "top");
    HX_NETWORK* m = net_named(top, "top/u1/m");
    HX_NETWORK* o = net_named(top, "top/o");
    ASSERT_TRUE(m && o);
    ASSERT_EQ(prop_names(m), "MERGEDTO ");
    // The copy of cell/y was joined into top/o; its tag leads there.
    EXPECT_EQ(top->follow_net_tag(static_cast<uint32_t>(m->find_prop("MERGEDTO")->get_int())), o);
    EXPECT_TRUE(own_texts(PORT_MSG_WARNING).empty());

    // Written as text, the copy's section names the net by its own signal,
    // so that the record reads back to the same net.
    ASSERT_EQ(read(text, 1), VX_OK);
    const std::string written = dir.file("out.vrx");
    ASSERT_EQ(vrx.vrx_write(written.c_str(), nullptr, 0), VX_OK);
    EXPECT_NE(ScratchDir::read_file(written).find("SIGNAL m (MERGEDTO=top/u1/y)"),
              std::string::npos);
    capture.clear();
    ASSERT_EQ(vrx.vrx_read(written.c_str(), 1, 0, 0), VX_OK);
    EXPECT_TRUE(own_texts(PORT_MSG_WARNING).empty());
    HX_NETWORK* m_again = net_named(design(), "top/u1/m");
    ASSERT_NE(m_again, nullptr);
    EXPECT_EQ(
        design()->follow_net_tag(static_cast<uint32_t>(m_again->find_prop("MERGEDTO")->get_int())),
        net_named(design(), "top/o"));
}

}  // namespace builder_test
