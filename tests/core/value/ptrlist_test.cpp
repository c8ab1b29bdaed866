#include "core/value/ptrlist.h"

#include "tests/support/checks.h"

namespace {

TEST(PtrList, entries) {
    int a = 1, b = 2, c = 3;
    TPtrList<int> list;
    list.append(&b);
    list.insert(0, &a);
    list.insert(-1, &c);
    EXPECT_TRUE(list[0] == &a && list.at(1) == &b && list.back() == &c && list.indexOf(&c) == 2);
    list.set(2, &a);
    EXPECT_TRUE(!list.contains(&c) && list.indexOf(&a) == 0 && list.remove(1) == &b && list.size() == 2);
}

TEST(PtrList, positionsOutsideTheRange) {
    int a = 1;
    TPtrList<int> list;
    EXPECT_EQ(failureOf([&] { list.back(); }), "");
    for (int i = 0; i < 2; ++i, list.insert(0, &a)) {
        for (int outside : {-1, 1, 99}) {
            EXPECT_EQ(failureOf([&] { list.at(outside); }), "") << outside;
            EXPECT_EQ(failureOf([&] { list.set(outside, &a); }), "") << outside;
            EXPECT_EQ(list.remove(outside), nullptr) << outside;
        }
        EXPECT_EQ(failureOf([&] { list.insert(2, &a); }), "");
        EXPECT_EQ(failureOf([&] { list.insert(-2, &a); }), "");
    }
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
