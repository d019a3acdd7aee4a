#include <gtest/gtest.h>

#include <cstring>
#include <map>
#include <memory>
#include <random>
#include <set>
#include <string>
#include <vector>

#include "hx_library.h"
#include "hx_storage.h"
#include "ut_btr_tree.h"

namespace {

template <class Iter, class T = std::remove_pointer_t<decltype(std::declval<Iter>().l_next())>>
std::vector<T*> drain(Iter* iter) {
    std::vector<T*> out;
    while (T* item = iter->l_next())
        out.push_back(item);
    delete iter;
    return out;
}

std::vector<std::string> prop_names(const HX_OBJECT& object) {
    std::vector<std::string> names;
    auto* iter = object.create_prop_iter();
    if (iter == nullptr) return names;
    while (HX_PROPERTY* prop = iter->l_next())
        names.emplace_back(prop->get_name());
    object.delete_prop_iter(iter);
    return names;
}

class DesignTest : public ::testing::Test {
  protected:
    DesignTest() : library("lib", 0), design(library.create_design("top")) {}
    HX_LIBRARY library;
    HX_DESIGN* design;
};

TEST_F(DesignTest, PropertiesKeepOrderReplaceInPlaceAndGoLastWhenRemade) {
    HX_LOGBLOCK* root = design->create_logblock(nullptr, 0, "top");
    root->create_prop("A", 1);
    root->create_prop("B", "x", 1);
    root->create_prop("C", HX_PROP_FLAG);
    root->create_prop("A", "now text", 1);
    EXPECT_EQ(prop_names(*root), (std::vector<std::string>{"A", "B", "C"}));
    EXPECT_EQ(root->find_prop("A")->get_kind(), HX_PROP_STRING);

    root->delete_prop("A", 0);
    root->create_prop("A", 2);
    EXPECT_EQ(prop_names(*root), (std::vector<std::string>{"B", "C", "A"}));
    EXPECT_TRUE(root->delete_prop("b", 1));
    EXPECT_FALSE(root->delete_prop("c", 0));
}

TEST_F(DesignTest, PropertyWalkMayDeleteThePropertyItStandsOn) {
    HX_LOGBLOCK* root = design->create_logblock(nullptr, 0, "top");
    for (const char* name : {"P0", "P1", "P2", "P3"})
        root->create_prop(name, 0);
    std::vector<std::string> seen;
    auto* iter = root->create_prop_iter();
    while (HX_PROPERTY* prop = iter->l_next()) {
        seen.emplace_back(prop->get_name());
        if (seen.size() % 2 == 1) {
            root->create_prop(("N" + seen.back()).c_str(), 1);
            root->delete_prop(prop);
        }
    }
    root->delete_prop_iter(iter);
    // Appends made during the walk are visited too.
    EXPECT_EQ(seen,
              (std::vector<std::string>{"P0", "P1", "P2", "P3", "NP0", "NP2", "NNP0", "NNNP0"}));
    EXPECT_EQ(prop_names(*root), (std::vector<std::string>{"P1", "P3", "NP2", "NNNP0"}));
}

TEST(PropertyTest, PredefinedNamesHaveTheirKinds) {
    HX_PROP_TYPE kind = HX_PROP_STRING;
    EXPECT_TRUE(HX_PROPERTY::get_type("CLKREF", kind));
    EXPECT_EQ(kind, HX_PROP_PINREF);
    EXPECT_TRUE(HX_PROPERTY::get_type("PERIOD", kind));
    EXPECT_EQ(kind, HX_PROP_TIMINGSTR);
    kind = HX_PROP_STRING;
    EXPECT_FALSE(HX_PROPERTY::get_type("clkref", kind));
    EXPECT_EQ(kind, HX_PROP_STRING);
}

TEST_F(DesignTest, PrimitivesGetTheirPinLayout) {
    HX_LOGBLOCK* root = design->create_logblock(nullptr, 0, "top");
    HX_LOGPRIM* ramd = design->create_logprim(root, HX_PRIM_RAMD, 2, "mem");
    ASSERT_NE(ramd, nullptr);
    HX_PRIMITIVE* prim = ramd->get_primitive();
    std::vector<std::string> names;
    for (uint16_t i = 0; i < prim->get_pin_count(); ++i)
        names.emplace_back(prim->get_prim_pin(i)->get_name());
    EXPECT_EQ(names, (std::vector<std::string>{"IN", "WADR0", "WADR1", "RADR0", "RADR1", "CLK",
                                               "CE", "OUT"}));
    EXPECT_EQ(prim->get_prim_index(HX_PPIN_RADR, 1), 4);
    EXPECT_EQ(prim->get_prim_index(HX_PPIN_RADR, 2), HX_NO_INDEX);
    EXPECT_EQ(prim->get_prim_index(HX_PPIN_CLK, HX_NO_INDEX), 5);
    EXPECT_EQ(prim->get_prim_index(HX_PPIN_SEL, HX_NO_INDEX), HX_NO_INDEX);
    EXPECT_TRUE(prim->is_param_pin(HX_PPIN_WADR));
    EXPECT_FALSE(prim->is_param_pin(HX_PPIN_IN));
    EXPECT_EQ(prim->get_width(), 2);
    EXPECT_EQ(prim->get_block(), ramd);
    EXPECT_EQ(ramd->get_pin(7)->get_dir(), HX_PIN_OUT);
    EXPECT_EQ(ramd->get_pin(7)->get_block(), ramd);

    HX_LOGPRIM* tri = design->create_logprim(root, HX_PRIM_TRI, 5, nullptr);
    EXPECT_EQ(tri->get_primitive()->get_width(), HX_NO_INDEX);
    EXPECT_EQ(tri->get_pin(2)->get_dir(), HX_PIN_TRI);
    EXPECT_EQ(tri->get_pin(2)->get_role(), HX_PPIN_OUT);
    EXPECT_EQ(design->create_logprim(root, HX_PRIM_PAD, 0, nullptr)->get_pin(0)->get_dir(),
              HX_PIN_BI);
    EXPECT_EQ(design->create_logprim(root, HX_PRIM_AND, HX_NO_INDEX, nullptr), nullptr);
    EXPECT_EQ(design->create_logprim(root, 19, 0, nullptr), nullptr);
    EXPECT_EQ(design->create_logprim(root, HX_PRIM_RAMD, 40000, nullptr), nullptr);
}

TEST_F(DesignTest, OneRootPerKindAndChildrenInOrder) {
    HX_LOGBLOCK* root = design->create_logblock(nullptr, 2, "top");
    EXPECT_EQ(design->create_logblock(nullptr, 2, "again"), nullptr);
    HX_PHYSBLOCK* phys = design->create_physblock(nullptr, 1, "top");
    EXPECT_EQ(design->get_log_root(), root);
    EXPECT_EQ(design->get_phys_root(), phys);
    HX_LOGBLOCK* a = design->create_logblock(root, 1, "a");
    HX_LOGPRIM* g = design->create_logprim(root, HX_PRIM_BUF, 0, "g");
    EXPECT_EQ(design->create_logblock(g, 1, "under a primitive"), nullptr);
    EXPECT_EQ(drain(root->create_child_iter()), (std::vector<HX_BLOCK*>{a, g}));
    EXPECT_EQ(drain(design->create_block_iter()), (std::vector<HX_BLOCK*>{root, phys, a, g}));
    EXPECT_STREQ(g->get_hiername(), "top/g");
    a->set_name("");
    EXPECT_STREQ(a->get_hiername(), "");
    EXPECT_EQ(root->get_pin(0)->get_name(), nullptr);
    EXPECT_EQ(root->get_pin(0)->get_dir(), HX_PIN_NOTYPE);
    EXPECT_EQ(g->get_flags(), HX_BLK_PRIMITIVE);
    EXPECT_EQ(phys->get_flags(), HX_BLK_PHYSICAL);
}

TEST_F(DesignTest, FindPinAndCheckPinsFollowRenames) {
    HX_LOGBLOCK* root = design->create_logblock(nullptr, 40, "top");
    for (uint16_t i = 0; i < 40; ++i)
        root->get_pin(i)->set_name(("p" + std::to_string(i)).c_str());
    EXPECT_EQ(root->find_pin("p33", 0), 33);
    EXPECT_TRUE(root->check_pins(0));
    root->get_pin(33)->set_name("q");
    EXPECT_EQ(root->find_pin("p33", 0), HX_NO_INDEX);
    EXPECT_EQ(root->find_pin("q", 0), 33);
    EXPECT_EQ(root->find_pin("Q", 1), 33);
    root->get_pin(5)->set_name("q");
    EXPECT_FALSE(root->check_pins(0));
    root->get_pin(5)->set_name("");
    root->get_pin(6)->set_name("");
    EXPECT_TRUE(root->check_pins(0));
    EXPECT_FALSE(root->check_pins(1));
}

// Restating a pin's name keeps it; absent and empty names stay apart.
TEST_F(DesignTest, PinNamesRestatedOrSwitchedBetweenAbsentAndEmpty) {
    HX_LOGBLOCK* root = design->create_logblock(nullptr, 20, "top");
    for (uint16_t i = 0; i < 20; ++i)
        root->get_pin(i)->set_name(("p" + std::to_string(i)).c_str());
    EXPECT_EQ(root->find_pin("p7", 0), 7);  // builds the index
    root->get_pin(7)->set_name("p7");
    root->get_pin(8)->set_name("x");
    EXPECT_EQ(root->find_pin("p7", 0), 7);
    EXPECT_EQ(root->find_pin("x", 0), 8);
    EXPECT_EQ(root->find_pin("p8", 0), HX_NO_INDEX);

    HX_PIN* pin = root->get_pin(9);
    pin->set_name("");
    pin->set_name(nullptr);
    EXPECT_EQ(pin->get_name(), nullptr);
    pin->set_name("");
    ASSERT_NE(pin->get_name(), nullptr);
    EXPECT_STREQ(pin->get_name(), "");

    HX_LOGPRIM* gate = design->create_logprim(root, HX_PRIM_AND, 2, "g");
    gate->get_pin(1)->set_name("IN1");
    gate->get_pin(2)->set_name("Z");
    EXPECT_STREQ(gate->get_pin(1)->get_name(), "IN1");
    EXPECT_STREQ(gate->get_pin(2)->get_name(), "Z");
}

// Long names and many objects cross chunk, fault-window and huge-page
// boundaries of the arenas; every name must read back intact.
TEST_F(DesignTest, NamesSurviveEveryKindOfArenaChunk) {
    HX_LOGBLOCK* root = design->create_logblock(nullptr, 0, "top");
    const std::string long_name(300000, 'n');
    HX_SIGNAL* big = design->create_signal(root, long_name.c_str());
    std::vector<HX_SIGNAL*> signals;
    std::vector<HX_BLOCK*> blocks;
    for (int i = 0; i < 60000; ++i) {
        const std::string name = "s" + std::to_string(i) + std::string(i % 23, 'x');
        signals.push_back(design->create_signal(root, name.c_str()));
        blocks.push_back(design->create_logprim(root, HX_PRIM_BUF, 0, name.c_str()));
    }
    HX_SIGNAL* last = design->create_signal(root, long_name.c_str());
    EXPECT_EQ(big->get_name(), long_name);
    EXPECT_EQ(last->get_name(), long_name);
    for (int i = 0; i < 60000; ++i) {
        const std::string name = "s" + std::to_string(i) + std::string(i % 23, 'x');
        ASSERT_EQ(signals[i]->get_name(), name);
        ASSERT_EQ(blocks[i]->get_name(), name);
        ASSERT_EQ(blocks[i]->get_pin(1)->get_block(), blocks[i]);
    }
}

// Joins drop networks, whose memory new networks take over: tags, places
// and members must stay consistent through many rounds of both.
TEST_F(DesignTest, NetworksMadeAfterJoinsKeepTagsAndPlacesApart) {
    HX_LOGBLOCK* root = design->create_logblock(nullptr, 0, "top");
    std::vector<HX_NETWORK*> made;
    for (int round = 0; round < 50; ++round) {
        HX_LOGBLOCK* child = design->create_logblock(root, 4, nullptr);
        for (uint16_t i = 0; i < 4; ++i) {
            design->create_conn(design->create_signal(root, "o"), child, i);
            design->create_conn(design->create_signal(child, "i"), child, i);  // joins
        }
        made.push_back(design->create_signal(root, "fresh")->get_network());
    }
    std::set<uint32_t> tags;
    size_t live = 0;
    for (size_t slot = 0; slot < design->network_slots(); ++slot) {
        HX_NETWORK* net = design->network_at(slot);
        if (net == nullptr) continue;
        ++live;
        EXPECT_EQ(net->get_slot(), slot);
        EXPECT_EQ(design->find_net_tag(net->get_tag()), net);
        EXPECT_TRUE(tags.insert(net->get_tag()).second);
        EXPECT_EQ(drain(net->create_signal_iter()).size(), net->get_member_count());
    }
    EXPECT_EQ(live, design->network_count());
    EXPECT_EQ(live, 50u * 5);
    for (HX_NETWORK* net : made)
        EXPECT_EQ(net->get_member_count(), 1u);
}

// The signal cache's table grows by half into sizes of every kind, up to
// huge pages; lookups, removals and copies must agree with a plain map.
TEST(SignalTableTest, AgreesWithAMapAcrossGrowthAndCopies) {
    HX_LIBRARY library("lib", 0);
    HX_DESIGN* design = library.create_design("d");
    HX_LOGBLOCK* root = design->create_logblock(nullptr, 0, "top");
    auto by_name = [](const HX_SIGNAL* s, const char* key) {
        return std::strcmp(s->get_name(), key);
    };
    UT_BTR_TREE<HX_SIGNAL> table(by_name);
    std::map<std::string, HX_SIGNAL*> expected;
    for (int i = 0; i < 150000; ++i) {
        const std::string name = "n" + std::to_string(i);
        HX_SIGNAL* s = design->create_signal(root, name.c_str());
        ASSERT_TRUE(table.s_add(s->get_name(), s));
        expected.emplace(name, s);
        if (i % 7 == 3) {
            const std::string gone = "n" + std::to_string(i / 2);
            EXPECT_EQ(table.s_remove(gone.c_str()), expected[gone]);
            expected.erase(gone);
        }
    }
    UT_BTR_TREE<HX_SIGNAL> copy(table);
    table.flush(false);
    EXPECT_EQ(copy.count(), expected.size());
    for (const auto& [name, s] : expected)
        ASSERT_EQ(copy.s_find(name.c_str()), s);
    EXPECT_EQ(copy.s_find("n1"), nullptr);  // removed at i == 3
    EXPECT_EQ(table.s_find("n0"), nullptr);
}

// A two-level net: top/n -> pin of u1 -> u1/m -> pin of a primitive.
TEST_F(DesignTest, NetworksJoinThroughPinsAndKeepTheHighestSignalsTag) {
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 0, "top");
    HX_LOGBLOCK* u1 = design->create_logblock(top, 1, "u1");
    HX_LOGPRIM* g = design->create_logprim(u1, HX_PRIM_BUF, 0, "g");
    HX_SIGNAL* m = design->create_signal(u1, "m");
    HX_SIGNAL* n = design->create_signal(top, "n");
    const uint32_t tag_n = n->get_network()->get_tag();
    const uint32_t tag_m = m->get_network()->get_tag();
    m->get_network()->create_prop("FROM_M", 1);
    m->get_network()->create_prop("BOTH", 1);
    n->get_network()->create_prop("BOTH", 2);
    EXPECT_EQ(design->network_count(), 2u);

    ASSERT_NE(design->create_conn(m, g, 0), nullptr);
    ASSERT_NE(design->create_conn(m, u1, 0), nullptr);   // inner side of u1's pin
    EXPECT_EQ(design->create_conn(m, u1, 0), nullptr);   // side taken
    EXPECT_EQ(design->create_conn(m, top, 0), nullptr);  // top has no pin 0
    ASSERT_NE(design->create_conn(n, u1, 0), nullptr);   // outer side: joins the nets
    EXPECT_EQ(u1->get_pin(0)->get_inner_signal(), m);
    EXPECT_EQ(u1->get_pin(0)->get_outer_signal(), n);

    HX_NETWORK* net = n->get_network();
    EXPECT_EQ(m->get_network(), net);
    EXPECT_EQ(net->get_highest_signal(), n);
    EXPECT_EQ(net->get_tag(), tag_n);
    EXPECT_EQ(hx_find_net_tag(design, tag_n), net);
    EXPECT_EQ(hx_find_net_tag(design, tag_m), nullptr);
    EXPECT_EQ(design->network_count(), 1u);
    EXPECT_STREQ(net->get_name(), "top/n");
    EXPECT_EQ(net->find_prop("BOTH")->get_int(), 2);
    EXPECT_NE(net->find_prop("FROM_M"), nullptr);
    EXPECT_EQ(net->get_member_count(), 2u);
    EXPECT_EQ(drain(design->create_network_iter()), (std::vector<HX_NETWORK*>{net}));
}

// The lower net has more members than the upper one, so the joined network
// is built from the lower one's ring but must still carry the upper one's
// identity: tag, properties, highest signal and place in the network order.
TEST_F(DesignTest, JoiningALargerLowerNetKeepsTheUpperNetsIdentity) {
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 0, "top");
    HX_LOGBLOCK* u1 = design->create_logblock(top, 1, "u1");
    HX_LOGBLOCK* u2 = design->create_logblock(u1, 1, "u2");
    HX_SIGNAL* n = design->create_signal(top, "n");
    HX_SIGNAL* other = design->create_signal(top, "other");
    HX_SIGNAL* m = design->create_signal(u1, "m");
    HX_SIGNAL* k = design->create_signal(u2, "k");
    design->create_conn(k, u2, 0);
    design->create_conn(m, u2, 0);
    design->create_conn(m, u1, 0);
    ASSERT_EQ(m->get_network()->get_member_count(), 2u);
    n->get_network()->create_prop("SIDE", "upper", 1);
    m->get_network()->create_prop("SIDE", "lower", 1);
    const uint32_t tag_n = n->get_network()->get_tag();
    const uint32_t tag_m = m->get_network()->get_tag();

    design->create_conn(n, u1, 0);
    HX_NETWORK* net = k->get_network();
    EXPECT_EQ(n->get_network(), net);
    EXPECT_EQ(m->get_network(), net);
    EXPECT_EQ(net->get_tag(), tag_n);
    EXPECT_EQ(net->get_highest_signal(), n);
    EXPECT_EQ(net->get_member_count(), 3u);
    EXPECT_STREQ(net->find_prop("SIDE")->get_text(), "upper");
    EXPECT_EQ(hx_find_net_tag(design, tag_n), net);
    EXPECT_EQ(hx_find_net_tag(design, tag_m), nullptr);
    EXPECT_EQ(drain(design->create_network_iter()),
              (std::vector<HX_NETWORK*>{net, other->get_network()}));
    EXPECT_STREQ(net->get_name(), "top/n");
}

TEST_F(DesignTest, ConnectionsFollowTheHierarchyRules) {
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 1, "top");
    HX_LOGBLOCK* u1 = design->create_logblock(top, 1, "u1");
    HX_LOGBLOCK* u2 = design->create_logblock(u1, 1, "u2");
    HX_SIGNAL* n = design->create_signal(top, "n");
    EXPECT_EQ(design->create_conn(n, u2, 0), nullptr);  // two levels down
    HX_SIGNAL* g = design->create_global_signal("vcc");
    EXPECT_EQ(design->create_global_signal("vcc"), nullptr);
    ASSERT_NE(design->create_conn(g, u2, 0), nullptr);
    ASSERT_NE(design->create_conn(g, u1, 0), nullptr);
    EXPECT_EQ(drain(u1->create_global_siglist(0)), (std::vector<HX_SIGNAL*>{g}));
    EXPECT_EQ(drain(top->create_global_siglist(0)), (std::vector<HX_SIGNAL*>{g}));
    EXPECT_STREQ(g->get_network()->get_name(), "vcc");
    HX_LIBRARY other("other", 0);
    HX_DESIGN* elsewhere = other.create_design("x");
    HX_LOGBLOCK* x = elsewhere->create_logblock(nullptr, 1, "x");
    EXPECT_EQ(design->create_conn(n, x, 0), nullptr);
}

TEST_F(DesignTest, MergeSignalsMovesEveryConnectionToTheGlobal) {
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 1, "top");
    HX_LOGPRIM* a = design->create_logprim(top, HX_PRIM_BUF, 0, "a");
    HX_LOGPRIM* b = design->create_logprim(top, HX_PRIM_BUF, 0, "b");
    HX_SIGNAL* n = design->create_signal(top, "n");
    HX_SIGNAL* other = design->create_signal(top, "other");
    design->create_conn(n, a, 1);
    design->create_conn(n, b, 0);
    design->create_conn(n, top, 0);
    n->create_prop("SIG_ALIAS", "x", 1);
    n->get_network()->create_prop("KEEP", 7);
    HX_SIGNAL* vcc = design->create_global_signal("vcc");
    const uint32_t global_tag = vcc->get_network()->get_tag();

    HX_SIGNAL* ref = n;
    EXPECT_FALSE(design->merge_signals(other, ref, 0, 0));  // not a global
    ASSERT_TRUE(design->merge_signals(vcc, ref, 0, 0));
    EXPECT_EQ(ref, vcc);
    EXPECT_EQ(a->get_pin(1)->get_outer_signal(), vcc);
    EXPECT_EQ(b->get_pin(0)->get_outer_signal(), vcc);
    EXPECT_EQ(top->get_pin(0)->get_inner_signal(), vcc);
    std::vector<HX_BLOCK*> blocks;
    auto* conns = vcc->create_conn_iter();
    while (HX_CONN* c = conns->l_next())
        blocks.push_back(c->get_block());
    vcc->delete_conn_iter(conns);
    EXPECT_EQ(blocks, (std::vector<HX_BLOCK*>{a, b, top}));
    EXPECT_EQ(drain(top->create_signal_iter()), (std::vector<HX_SIGNAL*>{other}));
    EXPECT_EQ(vcc->get_network()->get_tag(), global_tag);
    EXPECT_EQ(vcc->get_network()->find_prop("KEEP")->get_int(), 7);
    EXPECT_STREQ(vcc->find_prop("SIG_ALIAS")->get_text(), "x");
    EXPECT_EQ(design->network_count(), 2u);
    EXPECT_EQ(drain(top->create_global_siglist(1)), (std::vector<HX_SIGNAL*>{vcc}));
}

// A merged signal whose net runs on into a child block: the rest of that net
// joins the global signal's network, which keeps the global's tag.
TEST_F(DesignTest, MergeSignalsBringsTheRestOfTheNetAlong) {
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 0, "top");
    HX_LOGBLOCK* u1 = design->create_logblock(top, 1, "u1");
    HX_SIGNAL* n = design->create_signal(top, "n");
    HX_SIGNAL* m = design->create_signal(u1, "m");
    design->create_conn(m, u1, 0);
    design->create_conn(n, u1, 0);
    n->get_network()->create_prop("FROM_N", 1);
    HX_SIGNAL* vcc = design->create_global_signal("vcc");
    const uint32_t global_tag = vcc->get_network()->get_tag();

    HX_SIGNAL* ref = n;
    ASSERT_TRUE(design->merge_signals(vcc, ref, 0, 0));
    HX_NETWORK* net = vcc->get_network();
    EXPECT_EQ(m->get_network(), net);
    EXPECT_EQ(net->get_tag(), global_tag);
    EXPECT_EQ(net->get_highest_signal(), vcc);
    EXPECT_EQ(net->get_member_count(), 2u);
    EXPECT_NE(net->find_prop("FROM_N"), nullptr);
    EXPECT_EQ(u1->get_pin(0)->get_outer_signal(), vcc);
    EXPECT_EQ(drain(design->create_network_iter()), (std::vector<HX_NETWORK*>{net}));
}

TEST_F(DesignTest, MapSignalsAndPhysicalParents) {
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 0, "top");
    HX_LOGBLOCK* u1 = design->create_logblock(top, 2, "u1");
    HX_LOGBLOCK* u2 = design->create_logblock(top, 1, "u2");
    HX_PHYSBLOCK* chip = design->create_physblock(nullptr, 0, "top");
    HX_PHYSBLOCK* slot = design->create_physblock(chip, 2, "slot");
    HX_MAPSIGNAL* m = slot->create_map_signal(1, "m");
    ASSERT_NE(m, nullptr);
    EXPECT_EQ(slot->create_map_signal(1, "again"), nullptr);
    EXPECT_EQ(slot->create_map_signal(2, "out of range"), nullptr);
    EXPECT_EQ(slot->get_pin(1)->get_map_signal(), m);
    ASSERT_NE(m->create_mapconn(u1, 0), nullptr);
    EXPECT_EQ(m->create_mapconn(u1, 0), nullptr);
    EXPECT_EQ(m->create_mapconn(slot, 0), nullptr);
    EXPECT_EQ(u1->get_pin(0)->get_map_signal(), m);
    std::vector<HX_BLOCK*> ends;
    auto* conns = m->create_conn_iter();
    while (HX_CONN* c = conns->l_next())
        ends.push_back(c->get_block());
    m->delete_conn_iter(conns);
    EXPECT_EQ(ends, (std::vector<HX_BLOCK*>{slot, u1}));

    EXPECT_TRUE(design->set_block_phys_parent(u2, slot));
    EXPECT_TRUE(design->set_block_phys_parent(u1, slot));
    EXPECT_FALSE(design->set_block_phys_parent(u1, chip));
    EXPECT_FALSE(design->set_block_phys_parent(slot, chip));
    EXPECT_EQ(u1->get_phys_parent(), slot);
    EXPECT_EQ(drain(slot->create_log_child_iter()), (std::vector<HX_BLOCK*>{u2, u1}));
}

// The leaf design: a root with pins a and y, a buffer between them, and a
// global signal on the buffer's input side.
class GraftTest : public ::testing::Test {
  protected:
    GraftTest() : library("lib", 0) {
        leaf = library.create_design("leaf");
        HX_LOGBLOCK* root = leaf->create_logblock(nullptr, 2, "leaf");
        root->get_pin(0)->set_name("a");
        root->get_pin(0)->set_dir(HX_PIN_IN);
        root->get_pin(1)->set_name("y");
        HX_LOGPRIM* buf = leaf->create_logprim(root, HX_PRIM_BUF, 0, "b");
        buf->create_prop("DRIVE", 4);
        HX_SIGNAL* a = leaf->create_signal(root, "a");
        HX_SIGNAL* y = leaf->create_signal(root, "y");
        leaf->create_conn(a, root, 0);
        leaf->create_conn(a, buf, 0);
        leaf->create_conn(y, buf, 1);
        leaf->create_conn(y, root, 1);
        y->get_network()->create_prop("JOINED", static_cast<int32_t>(a->get_network()->get_tag()));
        HX_LOGPRIM* pull = leaf->create_logprim(root, HX_PRIM_PULLUP, 0, "p");
        leaf->create_conn(leaf->create_global_signal("gnd"), pull, 0);

        top = library.create_design("top");
        top_root = top->create_logblock(nullptr, 0, "top");
        top->create_signal(top_root, "filler");  // so that tags differ from leaf's
    }
    HX_LIBRARY library;
    HX_DESIGN* leaf;
    HX_DESIGN* top;
    HX_LOGBLOCK* top_root;
};

TEST_F(GraftTest, InstantiateThenGraftCopiesTheContents) {
    HX_LOGBLOCK* inst = top->instantiate(top_root, leaf, 0);
    ASSERT_NE(inst, nullptr);
    EXPECT_STREQ(inst->get_name(), "leaf");
    EXPECT_STREQ(inst->find_prop("TYPE")->get_text(), "leaf");
    EXPECT_STREQ(inst->get_pin(0)->get_name(), "a");
    EXPECT_EQ(inst->get_pin(0)->get_dir(), HX_PIN_IN);

    DARRAY_NAME globals;
    ASSERT_EQ(top->graft(inst, leaf, 0, 0, &globals, 0), inst);
    auto children = drain(inst->create_child_iter());
    ASSERT_EQ(children.size(), 2u);
    EXPECT_STREQ(children[0]->get_hiername(), "top/leaf/b");
    EXPECT_EQ(children[0]->find_prop("DRIVE")->get_int(), 4);
    auto signals = drain(inst->create_signal_iter());
    ASSERT_EQ(signals.size(), 2u);
    EXPECT_EQ(inst->get_pin(0)->get_inner_signal(), signals[0]);
    EXPECT_EQ(children[0]->get_pin(1)->get_outer_signal(), signals[1]);
    HX_SIGNAL* gnd = top->find_global_signal("gnd");
    ASSERT_NE(gnd, nullptr);
    EXPECT_EQ(children[1]->get_pin(0)->get_outer_signal(), gnd);
    ASSERT_EQ(globals.count(), 1);
    EXPECT_STREQ(globals[0], "gnd");

    // The JOINED tag now names the copy of net a, not leaf's own.
    HX_NETWORK* y_net = signals[1]->get_network();
    EXPECT_EQ(static_cast<uint32_t>(y_net->find_prop("JOINED")->get_int()),
              signals[0]->get_network()->get_tag());
    // A second graft into the same, no longer empty, instance is refused.
    EXPECT_EQ(top->graft(inst, leaf, 0, 0, nullptr, 0), nullptr);
}

TEST_F(GraftTest, GraftRefusesMismatchedPinsAndChangesNothing) {
    HX_LOGBLOCK* wrong = top->create_logblock(top_root, 2, "leaf");
    wrong->get_pin(0)->set_name("a");
    wrong->get_pin(1)->set_name("z");
    const size_t blocks = top->block_count();
    EXPECT_EQ(top->graft(wrong, leaf, 0, 0, nullptr, 0), nullptr);
    EXPECT_EQ(top->block_count(), blocks);
    EXPECT_EQ(top->instantiate(top_root, nullptr, 0), nullptr);
    HX_PHYSBLOCK* phys_root = top->create_physblock(nullptr, 0, "top");
    EXPECT_EQ(top->instantiate(phys_root, leaf, 0), nullptr);  // leaf has no physical root
}

// Copies share the names of what they were grafted from, also at second
// hand; the names must outlive the designs they came from.
TEST_F(GraftTest, GraftedNamesOutliveTheirSourceDesigns) {
    auto mid = std::make_unique<HX_DESIGN>(&library, "mid");
    HX_LOGBLOCK* mid_root = mid->create_logblock(nullptr, 0, "mid");
    HX_LOGBLOCK* inner = mid->instantiate(mid_root, leaf, 1);
    ASSERT_EQ(mid->graft(inner, leaf, 0, 0, nullptr, 0), inner);

    HX_LIBRARY other("other", 0);
    HX_DESIGN* last = other.create_design("last");
    HX_LOGBLOCK* last_root = last->create_logblock(nullptr, 0, "last");
    HX_LOGBLOCK* inst = last->instantiate(last_root, mid.get(), 1);
    ASSERT_EQ(last->graft(inst, mid.get(), 0, 0, nullptr, 0), inst);
    mid.reset();
    leaf->get_log_root()->get_pin(0)->set_name("renamed");

    auto copies = drain(inst->create_child_iter());
    ASSERT_EQ(copies.size(), 1u);
    EXPECT_STREQ(copies[0]->get_name(), "leaf");
    EXPECT_STREQ(copies[0]->get_pin(0)->get_name(), "a");
    auto prims = drain(copies[0]->create_child_iter());
    ASSERT_EQ(prims.size(), 2u);
    EXPECT_STREQ(prims[0]->get_hiername(), "last/mid/leaf/b");
    EXPECT_STREQ(prims[0]->get_pin(0)->get_name(), "IN");
}

TEST(LibraryTest, NamesAndAliasesFollowTheCaseSenseFlag) {
    HX_LIBRARY lib("lib", 0);
    HX_DESIGN* cpu = lib.create_design("Cpu");
    EXPECT_EQ(lib.create_design("CPU"), nullptr);
    EXPECT_EQ(lib.find_design("cpu"), cpu);
    EXPECT_TRUE(lib.alias_design("cpu", "core"));
    EXPECT_FALSE(lib.alias_design("nothing", "x"));
    EXPECT_FALSE(lib.alias_design("cpu", "CORE"));
    EXPECT_EQ(lib.find_design("Core"), cpu);
    ASSERT_TRUE(lib.set_casesense(1));
    EXPECT_EQ(lib.find_design("cpu"), nullptr);
    EXPECT_EQ(lib.find_design("Cpu"), cpu);
    HX_DESIGN* other = lib.create_design("cpu");
    ASSERT_NE(other, nullptr);
    EXPECT_FALSE(lib.set_casesense(0));  // Cpu and cpu would become one name
    EXPECT_EQ(lib.get_casesense(), 1);
    EXPECT_EQ(drain(lib.create_liblink_iter()).size(), 2u);
}

}  // namespace

namespace {

struct FakeNet {
    uint32_t tag;
    uint32_t get_tag() const { return tag; }
};

// Tags come mostly in rising order, but files may bring any: the table must
// agree with a plain map whichever part (array or hashed) holds a tag, also
// while the array grows over tags that were hashed before.
TEST(TagTableTest, AgreesWithAMapForDenseAndSparseTags) {
    std::mt19937 random(7);
    std::vector<std::unique_ptr<FakeNet>> nets;
    std::map<uint32_t, FakeNet*> expected;
    HX_TAG_TABLE<FakeNet> table;
    uint32_t next = 1;
    for (int step = 0; step < 20000; ++step) {
        const int action = static_cast<int>(random() % 10);
        uint32_t tag = action < 5   ? next++
                       : action < 7 ? static_cast<uint32_t>(random() % 20000)
                                    : static_cast<uint32_t>(random());
        if (action == 9 && !expected.empty()) {
            auto it = expected.begin();
            std::advance(it, random() % expected.size());
            table.erase(it->first);
            expected.erase(it);
            continue;
        }
        nets.push_back(std::make_unique<FakeNet>(FakeNet{tag}));
        const bool fresh = !expected.contains(tag);
        ASSERT_EQ(table.insert(nets.back().get()), fresh) << "tag " << tag;
        if (fresh) expected.emplace(tag, nets.back().get());
    }
    EXPECT_EQ(table.size(), expected.size());
    for (const auto& [tag, net] : expected)
        ASSERT_EQ(table.find(tag), net) << "tag " << tag;
    for (uint32_t probe = 0; probe < 30000; ++probe) {
        if (!expected.contains(probe)) {
            ASSERT_EQ(table.find(probe), nullptr) << "tag " << probe;
        }
    }
}

}  // namespace
