#include "core/filter/filtersstate.h"

#include <gtest/gtest.h>

#include "core/engine/qvexception.h"

namespace {

AnyDict filter(const char* name, int on = 1, int tag = 0) {
    return AnyDict("name", name, "_on", on, "tag", tag);
}

FiltersState sample() {
    FiltersState state;
    state.setFilter("logo", filter("logo", 1, 1));
    state.setFilter("flipper", filter("flipper", 0, 2));
    state.appendFilter("logo", filter("logo", 0, 3));
    state.setFilter("cropper", filter("cropper", 1, 4));
    state.appendFilter("timecode", filter("timecode", 1, 5));
    return state;
}

std::vector<int> tags(const TRefList<AnyDict>& list) {
    std::vector<int> tags;
    for (const auto* entry : list) tags.push_back(entry->getInt32("tag"));
    return tags;
}

TEST(FiltersState, FixedFiltersComeFirstInTheOrderOfTheirNames) {
    const FiltersState state = sample();
    EXPECT_EQ(tags(state.list()), (std::vector<int>{4, 2, 1, 3, 5}));
    EXPECT_EQ(tags(state.getActive()), (std::vector<int>{4, 1, 5}));
    EXPECT_EQ(state.names(false), AnyVector("cropper", "flipper", "logo", "logo", "timecode"));
    EXPECT_EQ(state.names(true), AnyVector("cropper", "logo", "timecode"));
    EXPECT_EQ(state.count(), 5);
    EXPECT_EQ(state.activeCount(), 3);
}

TEST(FiltersState, SetReplacesTheFirstOfItsName) {
    FiltersState state = sample();
    state.setFilter("logo", filter("logo", 1, 9));
    state.setFilter("flipper", filter("flipper", 1, 8));
    state.setFilter("avol", filter("avol", 1, 7));
    EXPECT_EQ(tags(state.list()), (std::vector<int>{4, 8, 9, 3, 5, 7}));
    state.setFilterAt(3, filter("logo", 1, 6));
    EXPECT_EQ(state.filterAt(3).getInt32("tag"), 6);
    EXPECT_THROW(state.filterAt(6), QvAssertFailure);
    EXPECT_THROW(state.filterAt(-1), QvAssertFailure);
}

TEST(FiltersState, Searches) {
    const FiltersState state = sample();
    EXPECT_EQ(state.indexOf("logo"), 2);
    EXPECT_EQ(state.indexOf("logo", 2), 3);
    EXPECT_EQ(state.indexOf("nothing"), 0);
    EXPECT_THROW(state.indexOf("logo", 5), QvAssertFailure);
    EXPECT_THROW(state.indexOf("logo", -2), QvAssertFailure);

    const auto* first = state.findFilter("logo");
    ASSERT_TRUE(first);
    EXPECT_EQ(first->getInt32("tag"), 1);
    const auto* second = state.findFilter("logo", first);
    ASSERT_TRUE(second);
    EXPECT_EQ(second->getInt32("tag"), 3);
    EXPECT_FALSE(state.findFilter("logo", second));
    EXPECT_EQ(state.findFilter("cropper")->getInt32("tag"), 4);
    EXPECT_FALSE(state.findFilter("deinterlace"));
    EXPECT_FALSE(FiltersState().findFilter("logo", first));
}

TEST(FiltersState, RemovesWhatIsNotActive) {
    FiltersState state = sample();
    state.appendFilter("odd", AnyDict("name", "odd", "_on", "yes"));
    state.removeInactive();
    EXPECT_EQ(tags(state.list()), (std::vector<int>{4, 1, 5}));
    FiltersState all;
    all.appendFilter("logo", filter("logo", 0));
    all.removeInactive();
    EXPECT_TRUE(all.get("customFilters").isVector());
    EXPECT_EQ(all.count(), 0);
}

TEST(FiltersState, ForeignContentsAreNoFilters) {
    FiltersState state =
        AnyDict("flipper", 5, "customFilters", AnyVector(1, "logo", Any(filter("logo", 1, 1))));
    EXPECT_EQ(tags(state.list()), std::vector<int>{1});
    EXPECT_FALSE(state.findFilter("flipper"));
    state.set("customFilters", "text");
    EXPECT_EQ(state.count(), 0);
    state.appendFilter("avol", filter("avol", 1, 2));
    EXPECT_EQ(tags(state.list()), std::vector<int>{2});
}

}  // namespace
