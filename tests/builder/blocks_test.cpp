// Designs, root and child blocks, primitives, pins, grafted instances of
// other designs and physical roots derived from logical ones.
#include <algorithm>

#include "builder_fixture.h"
#include "design_compare.h"

namespace builder_test {
namespace {

/// The block's pin names in index order, each followed by a space.
std::string pin_names(const HX_BLOCK* block) {
    std::string names;
    for (uint16_t i = 0; i < block->get_pin_count(); ++i) {
        const char* name = block->get_pin(i)->get_name();
        names += std::string(name ? name : "<none>") + " ";
    }
    return names;
}

TEST_F(BuilderTest, RootAndTemplateBlocksAndTheirPins) {
    ASSERT_EQ(read("DESIGN d {\n"
                   "   BLOCK top (X) { PIN lost }\n"
                   "   BLOCK top 2 (Y) {\n"
                   "      PIN a (TYPE=IN CONN=a)\n"
                   "      PIN b (TYPE=OUT CONN=b)\n"
                   "      PIN c (Z)\n"
                   "   }\n"
                   "   BLOCK u 3 (Q) { PIN x (CONN=a) }\n"
                   "   BLOCK v 2 (Q) { PIN x PIN x }\n"
                   "   BLOCK w (Q)\n"
                   "   BLOCK d 1 (Q) { PIN k }\n"
                   "}\n"),
              VX_PARSE_ERROR);
    EXPECT_EQ(reports(), (std::vector<std::string>{
                             E(2, "Root block top must have width."),
                             E(6, "root block pin count exceeded"),
                             E(8, "block u: pin 1 is unnamed"),
                             E(8, "block u: pin 2 is unnamed"),
                             E(9, "block v: pin check failed"),
                             E(10, "No pin count specified for template block w"),
                         }));
    HX_BLOCK* r = root();
    EXPECT_STREQ(r->get_name(), "d");  // named after the design, not the label
    EXPECT_EQ(pin_names(r), "a b ");
    EXPECT_EQ(r->get_pin(1)->get_dir(), HX_PIN_OUT);
    EXPECT_EQ(prop_names(r), "Y ");
    ASSERT_EQ(r->child_count(), 3u);  // u, v and the block labelled like the design
    HX_BLOCK* u = child(r, 0);
    EXPECT_EQ(pin_names(u), "x **UNDEFINED.1** **UNDEFINED.2** ");
    EXPECT_EQ(u->get_pin(0)->get_outer_signal(), r->get_pin(0)->get_inner_signal());
    HX_BLOCK* own = child(r, 2);
    EXPECT_STREQ(own->get_name(), "d");  // its own design's name is never grafted
    EXPECT_EQ(pin_names(own), "k ");
}

TEST_F(BuilderTest, RepeatedDesignNameWarnsAndAddsToTheDesign) {
    read(
        "DESIGN d {\n"
        "   BLOCK d 1 { PIN a (TYPE=IN) }\n"
        "}\n"
        "DESIGN d {\n"
        "   BLOCK d 1 { PIN b (TYPE=IN) }\n"
        "}\n"
        "DESIGN d e { }\n"
        "DESIGN nosuch f { }\n",
        0);
    // What the database makes of a second root is its own affair; the reports are not.
    const std::vector<std::string> got = reports();
    for (const std::string& wanted :
         {W(4, "redundant design name: d"), E(8, "cannot alias f to nosuch")})
        EXPECT_NE(std::find(got.begin(), got.end(), wanted), got.end())
            << wanted << ::testing::PrintToString(got);
    EXPECT_EQ(vrx.get_library()->design_count(), 1u);
    EXPECT_EQ(vrx.get_library()->find_design("e"), vrx.get_library()->find_design("d"));
}

TEST_F(BuilderTest, RootPrimitiveKeepsUnusedAndTakesLaterBlocksAsChildren) {
    ASSERT_EQ(read("DESIGN p {\n"
                   "   PRIM AND 3 (NAME=g) { PIN IN (X) PIN IN }\n"
                   "   BLOCK u 1 (X) { PIN x }\n"
                   "   PRIM BUF (Y)\n"
                   "}\n"),
              VX_OK);
    EXPECT_TRUE(reports().empty()) << ::testing::PrintToString(reports());
    HX_BLOCK* g = root();
    ASSERT_TRUE(g->is_primitive());
    EXPECT_STREQ(g->get_name(), "g");
    ASSERT_EQ(g->get_pin_count(), 4);
    EXPECT_EQ(prop_names(g->get_pin(0)), "X ");
    EXPECT_EQ(prop_names(g->get_pin(1)), "");
    EXPECT_EQ(prop_kind(g->get_pin(2), "UNUSED"), HX_PROP_FLAG);
    EXPECT_EQ(prop_kind(g->get_pin(3), "UNUSED"), HX_PROP_FLAG);
    ASSERT_EQ(g->child_count(), 2u);
    EXPECT_TRUE(child(g, 1)->is_primitive());
}

TEST_F(BuilderTest, RootPrimitiveWithChildrenIsWrittenSoThatItReadsBack) {
    ASSERT_EQ(read("DESIGN cell { BLOCK cell 1 { PIN a (TYPE=IN CONN=a) }\n"
                   "   PRIM BUF (NAME=bb) { PIN IN (CONN=a) PIN OUT (CONN=z) } }\n"
                   "DESIGN p {\n"
                   "   PRIM AND 2 (NAME=g) { PIN IN (CONN=a) PIN IN (CONN=b) PIN OUT (CONN=y) }\n"
                   "   PRIM OR 2 (NAME=o) { PIN IN (CONN=a) PIN IN (CONN=b) PIN OUT (CONN=y) }\n"
                   "   BLOCK cell (NAME=c) { PIN a (CONN=b) }\n"
                   "   SIGNAL y (LOAD=2) }\n"),
              VX_OK);
    HX_DESIGN* original = design();
    const std::string text = dir.file("out.vrx");
    ASSERT_EQ(vrx.vrx_write(text.c_str(), nullptr, 0), VX_OK);
    capture.clear();
    ASSERT_EQ(vrx.vrx_read(text.c_str(), 1, 0, 0), VX_OK);
    EXPECT_TRUE(reports().empty() && own_texts(PORT_MSG_WARNING).empty());
    vrx_test::CompareOptions structural;
    structural.structural = true;
    EXPECT_EQ(vrx_test::compare_designs(*original, *design(), structural), "");
}

TEST_F(BuilderTest, PrimitiveWidthsRolesAndOrdinals) {
    ASSERT_EQ(
        read("DESIGN q {\n"
             "   BLOCK q 1 { PIN a (TYPE=IN CONN=a) }\n"
             "   PRIM AND (N) { PIN IN }\n"
             "   PRIM AND 1 (N)\n"
             "   PRIM NAND 2 (N)\n"
             "   PRIM BUF 4 (NAME=b) { PIN IN (NAME=first) PIN IN (NAME=second) PIN FOO (X) }\n"
             "   PRIM AND 3 (NAME=g) {\n"
             "      PIN IN (NAME=i0) PIN IN (NAME=i1) PIN IN (NAME=i2) PIN IN (NAME=i3)\n"
             "      PIN OUT (NAME=o)\n"
             "   }\n"
             "   PHYSBLOCK q 1 { PIN p }\n"
             "   PHYSPRIM XOR 2 (NAME=x)\n"
             "}\n"),
        VX_PARSE_ERROR);
    EXPECT_EQ(reports(), (std::vector<std::string>{
                             E(3, "BLOCK type AND must have width"),
                             E(4, "BLOCK type AND must have width 2 or greater"),
                             E(5, "Unknown primitive type specified: NAND"),
                             W(6, "BLOCK type BUF does not need width - ignoring..."),
                             E(6, "unrecognized primitive PIN type: FOO"),
                             E(8, "invalid primitive pin"),
                         }));
    ASSERT_EQ(root()->child_count(), 2u);
    HX_BLOCK* b = child(root(), 0);
    EXPECT_EQ(b->get_primitive()->get_width(), HX_NO_INDEX);
    EXPECT_EQ(pin_names(b), "second OUT ");  // a single role is found again, not the next
    HX_BLOCK* g = child(root(), 1);
    EXPECT_EQ(pin_names(g), "i0 i1 i2 o ");
    EXPECT_EQ(prop_names(g->get_pin(2)), "");  // only root primitives mark unused pins
    EXPECT_EQ(block_named(design(), "q/x", true)->get_primitive()->get_type(), HX_PRIM_XOR);
}

TEST_F(BuilderTest, PinReferencesAreParsedOnceTheBlockIsComplete) {
    ASSERT_EQ(read("DESIGN d {\n"
                   "   BLOCK d 3 {\n"
                   "      PIN a (TYPE=IN SETUPREF=cc,R HOLDREF=nosuch)\n"
                   "      PIN b (TYPE=IN CLKREF=cc,F,1:2ns)\n"
                   "      PIN c (TYPE=IN NAME=cc)\n"
                   "   }\n"
                   "   BLOCK u 1 (CLKREF=x) { PIN x (MAXDELAY=1:2ns) }\n"
                   "}\n"),
              VX_PARSE_ERROR);
    EXPECT_EQ(reports(), (std::vector<std::string>{
                             E(6,
                               "block d, pin a property: property HOLDREF: no pin 'nosuch' "
                               "on block 'd'"),
                             E(7, "PINREF properties are only allowed on pins"),
                         }));
    HX_PROP_PINREF_DATA ref;
    ASSERT_TRUE(root()->get_pin(0)->find_prop("SETUPREF")->get_pinref(ref));
    EXPECT_EQ(ref.pin, 2);
    EXPECT_EQ(ref.edge, HX_EDGE_RISING);
    EXPECT_EQ(text_prop(root()->get_pin(0), "HOLDREF"), "nosuch");  // left as written
    ASSERT_TRUE(root()->get_pin(1)->find_prop("CLKREF")->get_pinref(ref));
    EXPECT_EQ(ref.edge, HX_EDGE_FALLING);
    EXPECT_EQ(ref.max, 2);
    EXPECT_EQ(prop_kind(child(root(), 0)->get_pin(0), "MAXDELAY"), HX_PROP_TIMING);
}

const char* const kGraftLibrary =
    "DESIGN sub {\n"
    "   BLOCK sub 2 { PIN a (TYPE=IN CONN=a) PIN y (TYPE=OUT CONN=y) }\n"
    "   PRIM BUF (NAME=b1) { PIN IN (CONN=a) PIN OUT (CONN=m) }\n"
    "   PRIM BUF (NAME=b2) { PIN IN (CONN=m) PIN OUT (CONN=y) }\n"
    "}\n"
    "DESIGN ponly { PHYSBLOCK ponly 1 { PIN p } }\n"
    "DESIGN top {\n"
    "   BLOCK top 1 { PIN i (TYPE=IN CONN=i) }\n"
    "   BLOCK sub 2 (NAME=u1) {\n"
    "      PIN a (CONN=i TYPE=OUT MAPINV)\n"
    "      PIN y (CONN=o)\n"
    "   }\n"
    "   BLOCK sub (NAME=u2)\n"
    "   BLOCK ponly 1 (NAME=u3) { PIN p (CONN=i) }\n"
    "   SIGNAL top/u1/m (NP=1)\n"
    "   SIGNAL top/u1/zz (NP=2)\n"
    "   PHYSSIGNAL top/u1/m (NP=3)\n"
    "}\n";
const char* const kNetNotFound = "Net top/u1/zz not found in design";
const char* const kPhysNetNotFound = "Net top/u1/m not found in design";

TEST_F(BuilderTest, BlockNamingAnotherDesignIsAGraftedCopy) {
    ASSERT_EQ(read(kGraftLibrary, 1, 0, 1), VX_OK);  // nograft does nothing for a design
    EXPECT_EQ(reports(),
              (std::vector<std::string>{W(10, "Ignoring pin TYPE property on hierarchical block."),
                                        W(16, kNetNotFound), W(17, kPhysNetNotFound)}));
    EXPECT_EQ(text_prop(net_named(design(), "top/u1/m"), "NP"), "1");  // a net inside the copy
    EXPECT_TRUE(own_texts(PORT_MSG_INFO).empty());
    HX_BLOCK* u1 = block_named(design(), "top/u1");
    EXPECT_EQ(u1->child_count(), 2u);
    EXPECT_EQ(prop_names(u1), "");  // the instance's TYPE is gone
    const HX_PIN* a = u1->get_pin(0);
    EXPECT_EQ(a->get_dir(), HX_PIN_IN);
    EXPECT_EQ(a->get_mapinv(), 1);
    EXPECT_EQ(a->get_outer_signal(), root()->get_pin(0)->get_inner_signal());
    EXPECT_EQ(block_named(design(), "top/u2")->child_count(), 2u);
    HX_BLOCK* u3 = block_named(design(), "top/u3");  // only a physical root: not grafted
    EXPECT_EQ(pin_names(u3), "p ");
}

TEST_F(BuilderTest, NograftKeepsALibrarysDesignsApart) {
    ASSERT_EQ(read(kGraftLibrary, 0, 0, 1), VX_PARSE_ERROR);
    const std::string inhibit =
        "Inhibiting graft of design 'sub' into design 'top' because of -nograft option.\n";
    // Said for every design named, whether or not it could have been grafted.
    const std::string inhibit_ponly =
        "Inhibiting graft of design 'ponly' into design 'top' because of -nograft option.\n";
    EXPECT_EQ(own_texts(PORT_MSG_INFO),
              (std::vector<std::string>{inhibit, inhibit, inhibit_ponly}));
    EXPECT_EQ(reports(),
              (std::vector<std::string>{E(13, "No pin count specified for template block sub"),
                                        W(15, kPhysNetNotFound), W(16, kNetNotFound),
                                        W(17, kPhysNetNotFound)}));
    HX_BLOCK* u1 = block_named(design_named(vrx.get_library(), "top"), "top/u1");
    EXPECT_EQ(u1->child_count(), 0u);
    EXPECT_EQ(u1->get_pin(0)->get_dir(), HX_PIN_OUT);  // a template's pin takes its TYPE
}

TEST_F(BuilderTest, PhysicalRootDerivedFromALogicalRootMarkedPhysical) {
    const char* const text =
        "DESIGN d {\n"
        "   BLOCK d 2 (PHYSICAL IOCOMP=x OTHER=y) {\n"
        "      PIN a (TYPE=IN CONN=a LOC=P1)\n"
        "      PIN b (TYPE=OUT CONN=a)\n"
        "   }\n"
        "}\n"
        "DESIGN e { BLOCK e 1 (PHYSICAL) { PIN z (TYPE=BI) } }\n"
        "DESIGN f { BLOCK f 1 { PIN q (TYPE=IN) } }\n";
    ASSERT_EQ(read(text, 0, 1), VX_OK);
    const std::string no_picspec =
        "library has no picspec: creating empty PHYSICAL prop in design ";
    EXPECT_EQ(reports(),
              (std::vector<std::string>{W(2, no_picspec + "'d'"), W(7, no_picspec + "'e'")}));
    HX_LIBRARY* lib = vrx.get_library();
    EXPECT_EQ(prop_kind(design_named(lib, "d")->get_log_root(), "PHYSICAL"), HX_PROP_FLAG);
    HX_BLOCK* d = design_named(lib, "d")->get_phys_root();
    ASSERT_NE(d, nullptr);
    EXPECT_STREQ(d->get_name(), "d");
    EXPECT_EQ(pin_names(d), "a b ");
    EXPECT_EQ(d->get_pin(0)->get_dir(), HX_PIN_IN);
    EXPECT_EQ(d->get_pin(1)->get_dir(), HX_PIN_OUT);
    EXPECT_EQ(prop_names(d->get_pin(0)), "LOC ");
    EXPECT_EQ(prop_names(d), "IOCOMP ");
    HX_BLOCK* e = design_named(lib, "e")->get_phys_root();
    ASSERT_NE(e, nullptr);
    EXPECT_EQ(pin_names(e), "z ");  // only this design's pins
    EXPECT_EQ(e->get_pin(0)->get_dir(), HX_PIN_BI);
    EXPECT_EQ(design_named(lib, "f")->get_phys_root(), nullptr);

    ASSERT_EQ(read(text, 0, 0), VX_OK);
    EXPECT_EQ(design_named(vrx.get_library(), "d")->get_phys_root(), nullptr);
}

TEST_F(BuilderTest, PhysicalRootTakesNoPinsOfAnEarlierFailedRead) {
    ASSERT_EQ(read("DESIGN a { BLOCK a 2 { PIN x PIN y } BLOCK", 0, 1), VX_PARSE_ERROR);
    ASSERT_EQ(read("DESIGN b { BLOCK b 1 (PHYSICAL) { PIN z } }\n", 0, 1), VX_OK);
    ASSERT_NE(design()->get_phys_root(), nullptr);
    EXPECT_EQ(pin_names(design()->get_phys_root()), "z ");
}

}  // namespace
}  // namespace builder_test
