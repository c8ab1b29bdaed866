#include "core/job/filtersstate.h"

#include <cstring>
#include <string>
#include <vector>

#include "core/arch/qvassert.h"

namespace {

constexpr const char* customKey = "customFilters";

bool hasFixedPlace(const char* name) {
    return std::strcmp(name, "deinterlace") == 0 || std::strcmp(name, "cropper") == 0 ||
           std::strcmp(name, "flipper") == 0;
}

bool isActive(const AnyDict& filter) { return filter.getInt32("_on", 0) != 0; }

bool hasName(const Any& filter, const char* name) {
    return filter.isDict() && filter.asDict().get("name") == name;
}

}  // namespace

void FiltersState::setFilter(const char* name, const AnyDict& dict) {
    if (!hasFixedPlace(name) && get(customKey).isVector()) {
        for (Any& filter : get(customKey).asVector()) {
            if (!hasName(filter, name)) continue;
            filter = dict;
            return;
        }
    }
    appendFilter(name, dict);
}

void FiltersState::appendFilter(const char* name, const AnyDict& dict) {
    if (hasFixedPlace(name)) {
        set(name, dict);
        return;
    }
    if (!get(customKey).isVector()) set(customKey, AnyVector());
    get(customKey).asVector().append(dict);
}

AnyVector FiltersState::names(bool activeOnly) const {
    const auto takesPart = [&](const Any& filter) {
        return filter.isDict() && (!activeOnly || filter.asDict().get("_on").isTrue());
    };
    AnyVector names;
    for (const auto [key, filter] : *this)
        if (takesPart(*filter)) names.append(Any(key));
    for (const Any& filter : getVector(customKey))
        if (takesPart(filter)) names.append(filter.asDict().get("name"));
    return names;
}

TRefList<AnyDict> FiltersState::list() const {
    TRefList<AnyDict> filters;
    for (const auto [key, filter] : *this)
        if (filter->isDict()) filters.append(&filter->asDict());
    for (const Any& filter : getVector(customKey))
        if (filter.isDict()) filters.append(const_cast<AnyDict*>(&filter.asDict()));
    return filters;
}

TRefList<AnyDict> FiltersState::getActive() const {
    const auto all = list();
    TRefList<AnyDict> active;
    for (auto* filter : all)
        if (isActive(*filter)) active.append(filter);
    return active;
}

int FiltersState::count() const { return list().size(); }

int FiltersState::activeCount() const { return getActive().size(); }

AnyDict& FiltersState::filterAt(int index) const {
    const auto all = list();
    QV_ASSERT(index >= 0 && index < all.size());
    return *all.at(index);
}

void FiltersState::setFilterAt(int index, const AnyDict& dict) { filterAt(index) = dict; }

int FiltersState::indexOf(const char* name, int after) const {
    const auto all = list();
    QV_ASSERT(after >= -1 && after < all.size());
    for (int i = after + 1; i < all.size(); ++i)
        if (all.at(i)->get("name") == name) return i;
    return 0;
}

AnyDict* FiltersState::findFilter(const char* name, const AnyDict* previous) const {
    const Any* fixed = hasFixedPlace(name) && get(name).isDict() ? &get(name) : nullptr;
    if (fixed && !previous) return const_cast<AnyDict*>(&fixed->asDict());
    // After a fixed entry comes the first custom filter.
    bool reached = !previous || (fixed && previous == &fixed->asDict());
    for (const Any& filter : getVector(customKey)) {
        if (!hasName(filter, name)) continue;
        if (reached) return const_cast<AnyDict*>(&filter.asDict());
        reached = &filter.asDict() == previous;
    }
    return nullptr;
}

void FiltersState::removeInactive() {
    std::vector<std::string> inactive;
    for (const auto [key, filter] : *this)
        if (filter->isDict() && !isActive(filter->asDict())) inactive.emplace_back(key);
    for (const auto& name : inactive) remove(name.c_str());
    if (!get(customKey).isVector()) return;
    AnyVector& custom = get(customKey).asVector();
    for (int i = custom.size() - 1; i >= 0; --i)
        if (!custom.at(i).isDict() || !isActive(custom.at(i).asDict())) custom.remove(i);
}
