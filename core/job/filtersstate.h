// The saved state of a filter chain.
//
// `deinterlace`, `cropper` and `flipper` have a fixed place and stand under their own name; all other filters
// stand in order in the vector "customFilters", each a dictionary with at least "name". "_on" is true in the
// dictionary of an active filter; the rest is what the filter's store wrote.
//
// A dictionary "scaler" (with "_on") makes the automatic chain convert even between equal formats, and gives
// its scaler the integers "inITU", "outITU" and "quality" that it holds.
#pragma once

#include "core/arch/api.h"
#include "core/value/anycontainer.h"
#include "core/value/ptrlist.h"

class QV_API FiltersState : public AnyDict {
  public:
    FiltersState() = default;
    FiltersState(const AnyDict& dict) : AnyDict(dict) {}

    // Replaces the filter of that name; a custom filter that is not there yet is appended.
    void setFilter(const char* name, const AnyDict& dict);
    // As setFilter, but a custom filter is always appended, so that one name can occur many times.
    void appendFilter(const char* name, const AnyDict& dict);

    // The names of the fixed filters in key order, then those of the custom filters. With `activeOnly` those
    // whose "_on" is false are left out.
    AnyVector names(bool activeOnly = false) const;
    // The dictionaries in the same order. They stay owned by this state and end with its next change.
    TRefList<AnyDict> list() const;
    // Of these the ones whose "_on" is a nonzero Int32.
    TRefList<AnyDict> getActive() const;
    int count() const;
    int activeCount() const;

    // By the index into list(); out of range asserts.
    AnyDict& filterAt(int index) const;
    void setFilterAt(int index, const AnyDict& dict);
    // Searches list() from after + 1; `after` lies between -1 and its size - 1. 0 also when nothing is found.
    int indexOf(const char* name, int after = -1) const;
    // The first filter of that name, or with `previous` the next one of that name; null at the end.
    AnyDict* findFilter(const char* name, const AnyDict* previous = nullptr) const;

    // Removes every filter whose "_on" is not a nonzero Int32; "customFilters" itself stays.
    void removeInactive();
};
