#include <gtest/gtest.h>

#include <map>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include "ut_blist_iter.h"
#include "ut_btr_tree.h"
#include "ut_darray.h"
#include "ut_nch_cache.h"
#include "ut_str.h"

namespace {

struct Named {
    std::string name;
};

int compare_named(const Named* entry, const char* key) {
    return UT_STR::Compare(entry->name.c_str(), key);
}

int deleted_count = 0;
void count_delete(Named*) {
    ++deleted_count;
}

using Tree = UT_BTR_TREE<Named>;

TEST(BtrTree, AddGivesAnEmptySlotForANewKeyAndTheHeldEntryAfterwards) {
    Tree tree(compare_named);
    Named a{"a"};
    Named*& slot = tree.add("a");
    EXPECT_EQ(slot, nullptr);
    slot = &a;
    EXPECT_EQ(tree.add("a"), &a);
    EXPECT_EQ(tree.s_find("a"), &a);
    EXPECT_EQ(tree.s_find("b"), nullptr);
    EXPECT_EQ(tree.count(), 1u);
}

TEST(BtrTree, SlotLeftEmptyCountsAsAbsentAndIsReused) {
    Tree tree(compare_named);
    EXPECT_EQ(tree.add("x"), nullptr);
    EXPECT_EQ(tree.s_find("x"), nullptr);
    Named x{"x"};
    EXPECT_EQ(tree.add("x"), nullptr);
    EXPECT_TRUE(tree.s_add("x", &x));
    EXPECT_EQ(tree.s_find("x"), &x);
    EXPECT_EQ(tree.count(), 1u);
}

TEST(BtrTree, SlotReplacementAndSAddRefusal) {
    Tree tree(compare_named);
    Named first{"n"}, second{"n"};
    EXPECT_TRUE(tree.s_add("n", &first));
    EXPECT_FALSE(tree.s_add("n", &second));
    EXPECT_EQ(tree.s_find("n"), &first);
    tree.add("n") = &second;  // replacing what the slot held
    EXPECT_EQ(tree.s_find("n"), &second);
    EXPECT_EQ(tree.count(), 1u);
}

TEST(BtrTree, FlushEmptiesAndReleasesOnlyWhenAsked) {
    std::vector<Named> items{{"a"}, {"b"}, {"c"}};
    Tree tree(compare_named, count_delete);
    for (Named& n : items)
        tree.s_add(n.name.c_str(), &n);
    deleted_count = 0;
    tree.flush(false);
    EXPECT_EQ(deleted_count, 0);
    EXPECT_EQ(tree.s_find("a"), nullptr);
    EXPECT_EQ(tree.count(), 0u);

    for (Named& n : items)
        tree.s_add(n.name.c_str(), &n);
    tree.add("left-empty");
    tree.flush(true);
    EXPECT_EQ(deleted_count, 3);
    EXPECT_EQ(tree.s_find("b"), nullptr);
    // Usable again after a flush.
    EXPECT_TRUE(tree.s_add("b", &items[1]));
    EXPECT_EQ(tree.s_find("b"), &items[1]);
}

TEST(BtrTree, OverriddenDeleteFunctionIsTheOneFlushCalls) {
    struct Owning : Tree {
        Owning() : Tree(compare_named) {}
        std::vector<std::string> released;
        void del_func(Named* entry) override { released.push_back(entry->name); }
    };
    Named a{"a"};
    Owning tree;
    tree.s_add("a", &a);
    tree.flush(true);
    EXPECT_EQ(tree.released, std::vector<std::string>{"a"});
}

TEST(BtrTree, AgreesWithAnOrderedMapUnderRandomAddsAndRemovals) {
    std::mt19937 rng(12345);
    std::vector<std::unique_ptr<Named>> pool;
    for (int i = 0; i < 3000; ++i)
        pool.push_back(std::make_unique<Named>(Named{"s" + std::to_string(i)}));
    Tree tree(compare_named);
    std::map<std::string, Named*> model;
    for (int step = 0; step < 60000; ++step) {
        Named* n = pool[rng() % pool.size()].get();
        const char* key = n->name.c_str();
        switch (rng() % 3) {
            case 0:
                EXPECT_EQ(tree.s_add(key, n), model.emplace(n->name, n).second);
                break;
            case 1: {
                auto it = model.find(n->name);
                Named* expected = it == model.end() ? nullptr : it->second;
                if (it != model.end()) model.erase(it);
                ASSERT_EQ(tree.s_remove(key), expected) << "step " << step;
                break;
            }
            default: {
                auto it = model.find(n->name);
                ASSERT_EQ(tree.s_find(key), it == model.end() ? nullptr : it->second)
                    << "step " << step;
            }
        }
    }
    EXPECT_EQ(tree.count(), model.size());
    for (const auto& [name, entry] : model)
        EXPECT_EQ(tree.s_find(name.c_str()), entry);
}

TEST(DArray, MakeArrayCopiesTheElements) {
    UT_DARRAY<int> numbers;
    EXPECT_EQ(numbers.a_makearray(), nullptr);
    for (int i = 0; i < 100; ++i)
        numbers.add(i * i);
    EXPECT_EQ(numbers.count(), 100);
    int* plain = numbers.a_makearray();
    numbers[5] = -1;
    EXPECT_EQ(plain[5], 25);
    EXPECT_EQ(plain[99], 99 * 99);
    von_free(plain);
    von_free(nullptr);
}

TEST(DArray, NameArrayKeepsItsOwnCopiesAndAbsentNames) {
    DARRAY_NAME names;
    char buffer[] = "first.vrx";
    names.add(buffer);
    names.add(nullptr);
    names.add("third");
    buffer[0] = 'X';
    ASSERT_EQ(names.count(), 3);
    const char** plain = names.a_makearray();
    EXPECT_STREQ(plain[0], "first.vrx");
    EXPECT_EQ(plain[1], nullptr);
    EXPECT_STREQ(plain[2], "third");
    von_free(plain);

    DARRAY_NAME copy = names;
    names.clear();
    EXPECT_EQ(names.count(), 0);
    ASSERT_EQ(copy.count(), 3);
    EXPECT_STREQ(copy[0], "first.vrx");
    EXPECT_EQ(copy[1], nullptr);
}

TEST(ListIterators, WalkInOrderSeeAppendsAndSkipHoles) {
    int a = 1, b = 2, c = 3;
    std::vector<int*> list{&a, nullptr, &b};
    UT_BLIST_ITER<int> all(list);
    EXPECT_EQ(all.l_next(), &a);
    EXPECT_EQ(all.l_next(), nullptr);  // the hole itself
    EXPECT_EQ(all.l_next(), &b);
    list.push_back(&c);  // may reallocate
    EXPECT_EQ(all.l_next(), &c);
    EXPECT_EQ(all.l_next(), nullptr);
    EXPECT_EQ(all.l_next(), nullptr);

    UT_BLISTS_ITER<int> filled(list);
    EXPECT_EQ(filled.l_next(), &a);
    EXPECT_EQ(filled.l_next(), &b);
    EXPECT_EQ(filled.l_next(), &c);
    EXPECT_EQ(filled.l_next(), nullptr);

    std::vector<int*> empty;
    EXPECT_EQ(UT_BLISTS_ITER<int>(empty).l_next(), nullptr);
}

TEST(NameCache, ExactOrCaseFoldedMatching) {
    UT_NCH_CACHE exact(0);
    for (const char* kw : {"DESIGN", "BLOCK", "PIN"})
        EXPECT_TRUE(exact.add(kw, 1));
    EXPECT_FALSE(exact.add("PIN", 2));
    ASSERT_NE(exact.find("PIN"), nullptr);
    EXPECT_EQ(*exact.find("PIN"), 1);
    EXPECT_EQ(exact.find("Pin"), nullptr);
    EXPECT_EQ(exact.find("PINS"), nullptr);
    EXPECT_EQ(exact.find(nullptr), nullptr);

    UT_NCH_CACHE folded(1);
    folded.add("Design", 7);
    ASSERT_NE(folded.find("DESIGN"), nullptr);
    EXPECT_EQ(*folded.find("design"), 7);
    EXPECT_EQ(folded.count(), 1u);
}

}  // namespace
