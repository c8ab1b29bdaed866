#include "core/value/ptrlist.h"

#include <utility>

#include "core/value/anycontainer.h"
#include "core/value/qvassert.h"

PtrListImp::PtrListImp() noexcept = default;

PtrListImp::PtrListImp(const AnyVector& pointers) {
    for (const Any& pointer : pointers) append(pointer.asGeneric());
}

PtrListImp::PtrListImp(const PtrListImp& other)
    : array_(other.empty() ? nullptr : new std::vector<void*>(*other.array_)) {}

PtrListImp::PtrListImp(PtrListImp&& other) noexcept : array_(std::exchange(other.array_, nullptr)) {}

PtrListImp::~PtrListImp() { delete array_; }

PtrListImp& PtrListImp::operator=(const PtrListImp& other) {
    if (this == &other) return *this;
    if (other.empty())
        clear();
    else
        array() = *other.array_;
    return *this;
}

PtrListImp& PtrListImp::operator=(PtrListImp&& other) noexcept {
    if (this != &other) {
        delete array_;
        array_ = std::exchange(other.array_, nullptr);
    }
    return *this;
}

std::vector<void*>& PtrListImp::array() {
    if (!array_) array_ = new std::vector<void*>;
    return *array_;
}

void PtrListImp::clear() {
    if (array_) array_->clear();
}

AnyVector PtrListImp::toVector() const {
    AnyVector result;
    for (int i = 0; i < size(); ++i) result.append(Any(static_cast<const void*>(at(i))));
    return result;
}

void PtrListImp::append(void* pointer) { array().push_back(pointer); }

void* PtrListImp::at(int index) const {
    QV_ASSERT(index >= 0 && index < size());
    return (*array_)[static_cast<std::size_t>(index)];
}

void PtrListImp::set(int index, void* pointer) {
    QV_ASSERT(index >= 0 && index < size());
    (*array_)[static_cast<std::size_t>(index)] = pointer;
}

void PtrListImp::insert(int index, void* pointer) {
    if (index == -1) return append(pointer);
    QV_ASSERT(index >= 0 && index <= size());
    array().insert(array().begin() + index, pointer);
}

void* PtrListImp::remove(int index) {
    if (index < 0 || index >= size()) return nullptr;
    void* const taken = at(index);
    array_->erase(array_->begin() + index);
    return taken;
}

int PtrListImp::find(const void* pointer) const {
    for (int i = 0; i < size(); ++i)
        if (at(i) == pointer) return i;
    return -1;
}
