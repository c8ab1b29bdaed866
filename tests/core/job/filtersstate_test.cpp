#include "core/job/filtersstate.h"

#include "tests/support/checks.h"

namespace {

using Tags = std::vector<int>;

AnyDict filter(const char* name, int on, int tag) { return AnyDict("name", name, "_on", on, "tag", tag); }

FiltersState sample() {
    FiltersState state;
    state.setFilter("logo", filter("logo", 1, 1));
    state.setFilter("flipper", filter("flipper", 0, 2));
    state.appendFilter("logo", filter("logo", 0, 3));
    state.setFilter("cropper", filter("cropper", 1, 4));
    state.appendFilter("timecode", filter("timecode", 1, 5));
    return state;
}

Tags tags(const TRefList<AnyDict>& list) {
    Tags tags;
    for (const auto* entry : list) tags.push_back(entry->getInt32("tag"));
    return tags;
}

TEST(FiltersState, FixedFiltersComeFirstInTheOrderOfTheirNames) {
    FiltersState state = sample();
    EXPECT_EQ(tags(state.list()), (Tags{4, 2, 1, 3, 5}));
    EXPECT_EQ(tags(state.getActive()), (Tags{4, 1, 5}));
    EXPECT_EQ(state.names(false), AnyVector("cropper", "flipper", "logo", "logo", "timecode"));
    EXPECT_EQ(state.names(true), AnyVector("cropper", "logo", "timecode"));
    EXPECT_EQ(state.activeCount(), 3);

    state.setFilter("logo", filter("logo", 1, 9));
    state.setFilter("flipper", filter("flipper", 1, 8));
    state.setFilter("avol", filter("avol", 1, 7));
    EXPECT_EQ(tags(state.list()), (Tags{4, 8, 9, 3, 5, 7})) << "the first of its name";
    state.setFilterAt(3, filter("logo", 1, 6));
    EXPECT_EQ(state.filterAt(3).getInt32("tag"), 6);
    for (const int wrong : {6, -1}) EXPECT_THROW(state.filterAt(wrong), QvAssertFailure);
}

TEST(FiltersState, Searches) {
    const FiltersState state = sample();
    EXPECT_EQ(state.indexOf("logo"), 2);
    EXPECT_EQ(state.indexOf("logo", 2), 3);
    EXPECT_EQ(state.indexOf("nothing"), 0);
    for (const int wrong : {5, -2}) EXPECT_THROW(state.indexOf("logo", wrong), QvAssertFailure);
    Tags found;
    for (const AnyDict* at = nullptr; (at = state.findFilter("logo", at));)
        found.push_back(at->getInt32("tag"));
    EXPECT_EQ(found, (Tags{1, 3}));
    EXPECT_EQ(state.findFilter("cropper")->getInt32("tag"), 4);
    EXPECT_FALSE(state.findFilter("deinterlace"));
    EXPECT_FALSE(FiltersState().findFilter("logo", state.findFilter("logo")));
}

TEST(FiltersState, WhatIsInactiveOrForeign) {
    FiltersState state = sample();
    state.appendFilter("odd", AnyDict("name", "odd", "_on", "yes"));
    state.removeInactive();
    EXPECT_EQ(tags(state.list()), (Tags{4, 1, 5}));
    FiltersState all;
    all.appendFilter("logo", filter("logo", 0, 1));
    all.removeInactive();
    EXPECT_TRUE(all.get("customFilters").isVector());
    EXPECT_EQ(all.count(), 0);

    state = AnyDict("flipper", 5, "customFilters", AnyVector(1, "logo", Any(filter("logo", 1, 1))));
    EXPECT_EQ(tags(state.list()), Tags{1});
    EXPECT_FALSE(state.findFilter("flipper"));
    state.set("customFilters", "text");
    EXPECT_EQ(state.count(), 0);
    state.appendFilter("avol", filter("avol", 1, 2));
    EXPECT_EQ(tags(state.list()), Tags{2});
}

}  // namespace
