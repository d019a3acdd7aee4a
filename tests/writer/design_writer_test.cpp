#include <string>

#include "writer_access.h"

namespace writer_test {
namespace {

using DesignWriterTest = WriterFixture;

TEST_F(DesignWriterTest, HierarchicalBlocksGetSectionsDeepestFirst) {
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 0, "top");
    HX_LOGBLOCK* a = design->create_logblock(top, 2, "a");
    name_pin(a, 0, "p", HX_PIN_IN);
    name_pin(a, 1, "r", HX_PIN_NOTYPE);
    a->create_prop("HP", 1);
    HX_LOGBLOCK* b = design->create_logblock(a, 1, "b");
    name_pin(b, 0, "q", HX_PIN_IN);
    HX_LOGPRIM* g = design->create_logprim(b, HX_PRIM_BUF, 0, "g");
    design->create_logblock(a, 0, "e");                              // a leaf, empty
    design->create_signal(design->create_logblock(a, 0, "f"), "s");  // a leaf with contents
    HX_SIGNAL* n = design->create_signal(top, "n");
    HX_SIGNAL* m = design->create_signal(a, "m");
    HX_SIGNAL* k = design->create_signal(b, "k");
    ASSERT_TRUE(design->create_conn(n, a, 0) && design->create_conn(m, a, 0) &&
                design->create_conn(m, b, 0) && design->create_conn(k, b, 0) &&
                design->create_conn(k, g, 0));
    EXPECT_EQ(body(), text(R"(
DESIGN top/a/b {
   BLOCK top/a/b 1 {
      PIN q (TYPE=IN CONN=k)
   }
   PRIM BUF (NAME=g) {
      PIN IN (NAME=IN CONN=k)
      PIN OUT (NAME=OUT)
   }
}
DESIGN top/a {
   BLOCK top/a 2 {
      PIN p (TYPE=IN CONN=m)
      PIN r (TYPE=NOTYPE)
   }
   BLOCK top/a/b (NAME=b) {
      PIN q (CONN=m)
   }
   BLOCK e 0 (NAME=e) {
   }
   BLOCK top/a/f 0 (NAME=f) {
   }
}
DESIGN d {
   BLOCK top 0 (NAME=top) {
   }
   BLOCK top/a (NAME=a HP=1) {
      PIN p (CONN=n)
      PIN r
   }
}
)"));
}

TEST_F(DesignWriterTest, SectionLabelsOfClashingUnnamedAndTransparentBlocks) {
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 0, "top");
    HX_LOGBLOCK* same = design->create_logblock(top, 0, "top");
    design->create_logblock(same, 0, "z");
    HX_LOGBLOCK* unnamed = design->create_logblock(top, 0, nullptr);
    design->create_logblock(unnamed, 0, "z2");
    HX_LOGBLOCK* t = design->create_logblock(top, 0, "t");
    t->create_prop("TRANSPARENT", "old value", 1);
    t->create_prop("X", 1);
    design->create_logblock(t, 0, "z3");
    EXPECT_EQ(body(), text(R"(
DESIGN <same>_top {
   BLOCK top/top 0 {
   }
   BLOCK z 0 (NAME=z) {
   }
}
DESIGN <anon> {
   BLOCK <anon> 0 {
   }
   BLOCK z2 0 (NAME=z2) {
   }
}
DESIGN top/t.TRANSPARENT {
   BLOCK top/t.TRANSPARENT 0 {
   }
   BLOCK z3 0 (NAME=z3) {
   }
}
DESIGN d {
   BLOCK top 0 (NAME=top) {
   }
   BLOCK <same>_top (NAME=top) {
   }
   BLOCK <anon> (NAME=<anon>) {
   }
   BLOCK top/t.TRANSPARENT (NAME=t X=1 TRANSPARENT) {
   }
}
)",
                           {{"<same>", "OBJ_$1"}, {"<anon>", "OBJ_$2"}}));
}

TEST_F(DesignWriterTest, ChildrenKeepTheirOrderInEveryList) {
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 0, "top");
    HX_LOGBLOCK* h = design->create_logblock(top, 0, "h");
    std::string section = "DESIGN top/h {\n   BLOCK top/h 0 {\n   }\n";
    std::string instances;
    for (int i = 0; i < 20; ++i) {
        const std::string name = "c" + std::to_string(i);
        design->create_logblock(h, 0, name.c_str());
        design->create_logblock(top, 0, name.c_str());
        section += "   BLOCK " + name + " 0 (NAME=" + name + ") {\n   }\n";
        instances += "   BLOCK top/" + name + " 0 (NAME=" + name + ") {\n   }\n";
    }
    EXPECT_EQ(body(), text(section + "}\nDESIGN d {\n   BLOCK top 0 (NAME=top) {\n   }\n" +
                           "   BLOCK top/h (NAME=h) {\n   }\n" + instances + "}\n"));
}

class LeafDesignTest : public DesignWriterTest {
  protected:
    LeafDesignTest() {
        design->create_prop("P", 1);
        design->create_prop("F", HX_PROP_FLAG);
        top = design->create_logblock(nullptr, 3, "top");
        top->set_user(1);
        top->create_prop("TP", 1);  // a root header carries no properties
        name_pin(top, 0, "a", HX_PIN_IN)->create_prop("LOC", "P1", 1);  // nor do root pins
        name_pin(top, 1, "y", HX_PIN_OUT);
        top_pin = name_pin(top, 2, nullptr, HX_PIN_BI);
        HX_SIGNAL* a = design->create_signal(top, "a");
        HX_SIGNAL* w = design->create_signal(top, "w");
        unnamed = design->create_signal(top, nullptr);  // named the same on both sides
        design->create_conn(a, top, 0);
        design->create_conn(unnamed, top, 2);

        HX_LOGBLOCK* u1 = design->create_logblock(top, 2, "u1");
        u1->set_user(1);
        u1->create_prop("X", 1);
        name_pin(u1, 0, "d", HX_PIN_IN)->create_prop("LOC", "P4", 1);
        name_pin(u1, 1, "q", HX_PIN_OUT);
        design->create_conn(a, u1, 0);

        HX_LOGPRIM* g1 = design->create_logprim(top, HX_PRIM_AND, 3, "g1");
        g1->set_user(1);
        g1->create_prop("P", "v", 1);
        g1->get_pin(1)->set_inverted(1);
        HX_PROP_PINREF_DATA clkref;
        clkref.pin = 0;
        clkref.edge = HX_EDGE_RISING;
        g1->get_pin(3)->create_prop(HX_PROPERTY::make_pinref("CLKREF", clkref), nullptr);
        design->create_conn(a, g1, 0);
        design->create_conn(w, g1, 3);

        design->create_conn(a, design->create_logprim(top, HX_PRIM_PAD, 0, "pad1"), 0);
        design->create_logprim(top, HX_PRIM_BUF, 0, "BLOCK");
        HX_LOGBLOCK* spaced = design->create_logblock(top, 1, "x y");
        name_pin(spaced, 0, "PIN", HX_PIN_NOTYPE);
        design->create_conn(unnamed, spaced, 0);
    }

    std::string expected(const std::string& user) const {
        return text(R"(
DESIGN d (P=1 F) {
   BLOCK top 3 (NAME=top<user>) {
      PIN a (TYPE=IN CONN=a)
      PIN y (TYPE=OUT)
      PIN <pin> (TYPE=BI CONN=<sig>)
   }
   BLOCK top/u1 2 (NAME=u1<user> X=1) {
      PIN d (TYPE=IN CONN=a LOC=P4)
      PIN q (TYPE=OUT)
   }
   PRIM AND 3 (NAME=g1<user> P=v) {
      PIN IN (NAME=IN0 CONN=a)
      PIN IN (NAME=IN1 INV)
      PIN IN (NAME=IN2)
      PIN OUT (NAME=OUT CONN=w CLKREF=IN0,R)
   }
   PRIM PAD (NAME=pad1) {
      PIN PAD (NAME=PAD TYPE=BI CONN=a)
   }
   PRIM BUF (NAME="BLOCK") {
      PIN IN (NAME=IN)
      PIN OUT (NAME=OUT)
   }
   BLOCK "top/x y" 1 (NAME="x y") {
      PIN "PIN" (TYPE=NOTYPE CONN=<sig>)
   }
}
)",
                    {{"<user>", user}, {"<pin>", "OBJ_$1"}, {"<sig>", "OBJ_$2"}});
    }

    HX_LOGBLOCK* top = nullptr;
    HX_PIN* top_pin = nullptr;
    HX_SIGNAL* unnamed = nullptr;
};

TEST_F(LeafDesignTest, OneSectionWithHeadersAndPinsOfEveryForm) {
    EXPECT_EQ(body(), expected(" USER"));
    EXPECT_EQ(body(nullptr, 1), expected(""));  // omit_user
}

TEST_F(DesignWriterTest, RootPrimitiveListsEveryPinWithItsType) {
    HX_LOGPRIM* root = design->create_logprim(nullptr, HX_PRIM_AND, 2, "rp");
    root->set_user(1);
    root->create_prop("Q", 1);
    root->get_pin(1)->set_inverted(1);
    root->get_pin(1)->create_prop("R", 1);
    EXPECT_EQ(body(), text(R"(
DESIGN d {
   PRIM AND 2 (NAME=rp USER) {
      PIN IN (NAME=IN0 TYPE=IN)
      PIN IN (NAME=IN1 INV TYPE=IN)
      PIN OUT (NAME=OUT TYPE=OUT)
   }
}
)"));
}

TEST_F(DesignWriterTest, SignalStatementsCarryGlobalsAndProperties) {
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 1, "top");
    name_pin(top, 0, "o", HX_PIN_OUT);
    HX_LOGBLOCK* h = design->create_logblock(top, 1, "h");
    name_pin(h, 0, "hp", HX_PIN_NOTYPE);
    HX_LOGBLOCK* leaf = design->create_logblock(h, 1, "leaf");
    name_pin(leaf, 0, "lp", HX_PIN_NOTYPE);
    HX_LOGBLOCK* u1 = design->create_logblock(top, 2, "u1");
    name_pin(u1, 0, "v", HX_PIN_NOTYPE);
    name_pin(u1, 1, "g", HX_PIN_NOTYPE);
    HX_SIGNAL* vcc = design->create_global_signal("VCC");
    HX_SIGNAL* gnd = design->create_global_signal("GND");
    HX_SIGNAL* hn = design->create_signal(top, "hn");
    HX_SIGNAL* o = design->create_signal(top, "o");
    design->create_signal(top, "quiet");
    HX_SIGNAL* spaced = design->create_signal(top, "a b");
    HX_SIGNAL* unnamed = design->create_signal(top, nullptr);
    HX_SIGNAL* inner = design->create_signal(h, "inner");
    ASSERT_TRUE(design->create_conn(vcc, u1, 0) && design->create_conn(gnd, u1, 1) &&
                design->create_conn(hn, h, 0) && design->create_conn(inner, h, 0) &&
                design->create_conn(inner, leaf, 0) && design->create_conn(o, top, 0));
    ASSERT_EQ(inner->get_network()->get_highest_signal(), hn);
    vcc->create_prop("V", 1);
    vcc->get_network()->create_prop("NP", 2);
    hn->get_network()->create_prop("NETP", 1);  // written once, with the highest signal
    inner->create_prop("OWN", 1);
    o->create_prop("S", 1);
    o->get_network()->create_prop("N", 2);
    spaced->create_prop("X", 1);
    unnamed->create_prop("Y", 1);
    EXPECT_EQ(body(), text(R"(
DESIGN top/h {
   BLOCK top/h 1 {
      PIN hp (TYPE=NOTYPE CONN=inner)
   }
   BLOCK leaf 1 (NAME=leaf) {
      PIN lp (TYPE=NOTYPE CONN=inner)
   }
   SIGNAL inner (OWN=1)
}
DESIGN d {
   BLOCK top 1 (NAME=top) {
      PIN o (TYPE=OUT CONN=o)
   }
   BLOCK top/h (NAME=h) {
      PIN hp (CONN=hn)
   }
   BLOCK top/u1 2 (NAME=u1) {
      PIN v (TYPE=NOTYPE CONN=VCC)
      PIN g (TYPE=NOTYPE CONN=GND)
   }
   SIGNAL VCC ( GLOBAL V=1 NP=2)
   SIGNAL GND ( GLOBAL)
   SIGNAL hn (NETP=1)
   SIGNAL o (S=1 N=2)
   SIGNAL "a b" (X=1)
   SIGNAL <u> (Y=1)
}
)",
                           {{"<u>", "OBJ_$1"}}));
}

TEST_F(DesignWriterTest, SignalWhosePropertiesAreAllSkippedLeavesTheTextReadable) {
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 0, "top");
    design->create_signal(top, "s")->create_prop("CREATE_TIMESTAMP", 5);
    design->create_signal(top, "t")->create_prop("T", 1);
    const std::string written = body();
    const std::string head = text("DESIGN d {\n   BLOCK top 0 (NAME=top) {\n   }\n");
    const std::string tail = text("   SIGNAL t (T=1)\n}\n");
    // Either no statement for s, or one without a property list.
    EXPECT_TRUE(written == head + tail || written == head + text("   SIGNAL s\n") + tail)
        << written;
}

TEST_F(DesignWriterTest, MapSignalsAndUnmappedLogicalChildren) {
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 0, "top");
    HX_LOGBLOCK* l1 = design->create_logblock(top, 2, "l1");
    name_pin(l1, 0, "a", HX_PIN_NOTYPE);
    name_pin(l1, 1, "b", HX_PIN_NOTYPE);
    HX_LOGBLOCK* l2 = design->create_logblock(top, 1, "l2");
    name_pin(l2, 0, "c", HX_PIN_NOTYPE)->set_mapinv(1);
    HX_LOGBLOCK* l3 = design->create_logblock(top, 0, "l3");
    HX_LOGBLOCK* l4 = design->create_logblock(top, 1, "l4");
    name_pin(l4, 0, "d", HX_PIN_NOTYPE);
    HX_PHYSBLOCK* ptop = design->create_physblock(nullptr, 0, "ptop");
    HX_PHYSBLOCK* pb = design->create_physblock(ptop, 2, "pb");
    name_pin(pb, 0, "p0", HX_PIN_NOTYPE);
    name_pin(pb, 1, "p1", HX_PIN_NOTYPE);
    pb->set_user(1);  // USER is for logical blocks only
    HX_PHYSBLOCK* pc = design->create_physblock(pb, 1, "pc");
    design->create_physprim(ptop, HX_PRIM_BUF, 0, "pg");
    name_pin(pc, 0, "x", HX_PIN_NOTYPE);
    design->create_signal(ptop, "ps")->create_prop("W", 1);
    HX_MAPSIGNAL* m1 = pb->create_map_signal(0, "m1");
    HX_MAPSIGNAL* m2 = pb->create_map_signal(1, nullptr);
    HX_MAPSIGNAL* m3 = pc->create_map_signal(0, "m3");
    ASSERT_TRUE(m1 && m2 && m3);
    m1->create_prop("MP", 1);
    ASSERT_TRUE(m1->create_mapconn(l1, 0) && m1->create_mapconn(l2, 0) &&
                m2->create_mapconn(l1, 1) && m3->create_mapconn(l4, 0));
    // l1 and l4 are mapped through their pins already; l3 only by its parent.
    ASSERT_TRUE(design->set_block_phys_parent(l1, pb) && design->set_block_phys_parent(l3, pb) &&
                design->set_block_phys_parent(l4, pc));
    EXPECT_EQ(body(), text(R"(
DESIGN ptop/pb {
   PHYSBLOCK ptop/pb 2 {
      PIN p0 (TYPE=NOTYPE)
      PIN p1 (TYPE=NOTYPE)
   }
   PHYSBLOCK pc 1 (NAME=pc) {
      PIN x (TYPE=NOTYPE)
   }
}
DESIGN d {
   BLOCK top 0 (NAME=top) {
   }
   PHYSBLOCK ptop 0 (NAME=ptop) {
   }
   BLOCK top/l1 2 (NAME=l1) {
      PIN a (TYPE=NOTYPE)
      PIN b (TYPE=NOTYPE)
   }
   BLOCK top/l2 1 (NAME=l2) {
      PIN c (TYPE=NOTYPE)
   }
   BLOCK top/l3 0 (NAME=l3) {
   }
   BLOCK top/l4 1 (NAME=l4) {
      PIN d (TYPE=NOTYPE)
   }
   PHYSBLOCK ptop/pb (NAME=pb) {
      PIN p0
      PIN p1
   }
   PHYSPRIM BUF (NAME=pg) {
      PIN IN (NAME=IN)
      PIN OUT (NAME=OUT)
   }
   PHYSSIGNAL ps (W=1)
   MAPSIGNAL ptop/pb/pc x (NAME=m3) {
      MAPCONN top/l4 d
   }
   MAPSIGNAL ptop/pb p0 (NAME=m1 MP=1) {
      MAPCONN top/l1 a
      MAPCONN top/l2 c (MAPINV)
   }
   MAPSIGNAL ptop/pb p1 {
      MAPCONN top/l1 b
   }
   MAPSIGNAL ptop/pb {
      MAPCONN top/l3
   }
}
)"));
}

TEST_F(DesignWriterTest, FilterThatDropsEverythingOpensNoListAndStaysForLaterWrites) {
    design->create_prop("DP", 1);
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 0, "top");
    HX_LOGBLOCK* u1 = design->create_logblock(top, 1, "u1");
    u1->create_prop("UP", 1);
    name_pin(u1, 0, "p", HX_PIN_NOTYPE);
    HX_SIGNAL* g = design->create_global_signal("G");
    g->create_prop("GP", 1);
    design->create_conn(g, u1, 0);
    design->create_signal(top, "s")->create_prop("SP", 1);
    const std::string filter = dir.file("all.flt");
    ScratchDir::write_file(filter, "# every property\n*\n");
    const std::string expected = text(R"(
DESIGN d {
   BLOCK top 0 (NAME=top) {
   }
   BLOCK top/u1 1 (NAME=u1) {
      PIN p (TYPE=NOTYPE CONN=G)
   }
   SIGNAL G ( GLOBAL)
}
)");
    EXPECT_EQ(body(filter.c_str()), expected);
    EXPECT_EQ(body(), expected);  // no filter named: the earlier one stays
}

}  // namespace
}  // namespace writer_test
