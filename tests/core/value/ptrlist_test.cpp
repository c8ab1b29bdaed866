#include "core/value/ptrlist.h"

#include <gtest/gtest.h>

#include "tests/core/value/value_support.h"

namespace {

TEST(PtrList, entries) {
    int a = 1, b = 2, c = 3;
    TPtrList<int> list;
    EXPECT_TRUE(list.empty());
    list.append(&b);
    list.insert(0, &a);
    list.insert(-1, &c);
    EXPECT_TRUE(list[0] == &a && list.at(1) == &b && list.back() == &c);
    EXPECT_EQ(list.indexOf(&c), 2);
    list.set(2, &a);
    EXPECT_FALSE(list.contains(&c));
    EXPECT_EQ(list.indexOf(&a), 0);
    EXPECT_EQ(list.remove(1), &b);
    EXPECT_EQ(list.size(), 2);
    int sum = 0;
    for (const int* entry : list) sum += *entry;
    EXPECT_EQ(sum, 2);
}

TEST(PtrList, positionsOutsideTheRange) {
    int a = 1;
    TPtrList<int> list;
    for (int i = 0; i < 2; ++i) {
        for (int outside : {-1, 1, 99}) {
            EXPECT_EQ(failureOf([&] { list.at(outside); }), "") << outside;
            EXPECT_EQ(failureOf([&] { list.set(outside, &a); }), "") << outside;
            EXPECT_EQ(list.remove(outside), nullptr) << outside;
        }
        EXPECT_EQ(failureOf([&] { list.insert(2, &a); }), "");
        EXPECT_EQ(failureOf([&] { list.insert(-2, &a); }), "");
        if (i == 0) {
            EXPECT_EQ(failureOf([&] { list.back(); }), "");
            list.append(&a);
        }
    }
    EXPECT_EQ(list.size(), 1);
}

TEST(PtrList, copiesSharePointeesOnly) {
    AnyDict first("a", 1), second;
    TRefList<AnyDict> list;
    list.append(&first);
    TRefList<AnyDict> copy = list;
    list.append(&second);
    EXPECT_EQ(copy.size(), 1);
    copy = list;
    list.clear();
    EXPECT_EQ(copy[1], &second);

    const AnyVector pointers = copy.toVector();
    EXPECT_TRUE(pointers[0].isGeneric() && pointers[0].size() == 0);
    EXPECT_EQ(pointers[0].asDict(), first);
    EXPECT_EQ(TRefList<AnyDict>(pointers)[1], &second);
    copy = list;
    EXPECT_TRUE(copy.empty());
}

}  // namespace
