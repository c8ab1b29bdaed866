#include "core/value/ptrlist.h"

#include <algorithm>
#include <functional>

#include "core/arch/qvassert.h"
#include "core/value/anycontainer.h"

PtrListImp::PtrListImp(const AnyVector& pointers) {
    for (const Any& pointer : pointers) append(pointer.asGeneric());
}

PtrListImp::~PtrListImp() = default;

void PtrListImp::clear() { array_.clear(); }

AnyVector PtrListImp::toVector() const {
    AnyVector result;
    for (int i = 0; i < size(); ++i) result.append(Any(static_cast<const void*>(at(i))));
    return result;
}

void PtrListImp::sortByAddress() { std::sort(array_.begin(), array_.end(), std::less<>()); }

void PtrListImp::append(void* pointer) { array_.push_back(pointer); }

void* PtrListImp::at(int index) const {
    QV_ASSERT(index >= 0 && index < size());
    return array_[static_cast<std::size_t>(index)];
}

void PtrListImp::set(int index, void* pointer) {
    QV_ASSERT(index >= 0 && index < size());
    array_[static_cast<std::size_t>(index)] = pointer;
}

void PtrListImp::insert(int index, void* pointer) {
    if (index == -1) return append(pointer);
    QV_ASSERT(index >= 0 && index <= size());
    array_.insert(array_.begin() + index, pointer);
}

void* PtrListImp::remove(int index) {
    if (index < 0 || index >= size()) return nullptr;
    void* const taken = at(index);
    array_.erase(array_.begin() + index);
    return taken;
}

int PtrListImp::find(const void* pointer) const {
    for (int i = 0; i < size(); ++i)
        if (at(i) == pointer) return i;
    return -1;
}
