#include "core/value/ptrlist.h"

#include "tests/support/checks.h"

namespace {

TEST(PtrList, positionsOutsideTheRange) {
    int a = 1;
    TPtrList<int> list;
    EXPECT_EQ(failureOf([&] { list.back(); }), "");
    EXPECT_EQ(list.indexOf(&a), -1);
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
}

}  // namespace
