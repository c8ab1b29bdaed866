// Lists of pointers that own nothing: clearing or destroying a list never touches what it points to.
#pragma once

#include <cstddef>
#include <iterator>
#include <vector>

#include "core/arch/api.h"

class AnyVector;

// The untyped list on which TPtrList and TRefList are built. Copies share the pointees.
class QV_API PtrListImp {
  public:
    PtrListImp() = default;
    // Takes the pointer that each element holds, as toVector() gives them.
    explicit PtrListImp(const AnyVector& pointers);
    PtrListImp(const PtrListImp& other) = default;
    PtrListImp(PtrListImp&& other) noexcept = default;
    virtual ~PtrListImp();
    PtrListImp& operator=(const PtrListImp& other) = default;
    PtrListImp& operator=(PtrListImp&& other) noexcept = default;

    int size() const { return static_cast<int>(array_.size()); }
    bool empty() const { return array_.empty(); }
    void clear();  // keeps the array for the next use
    // A Generic of size 0, a borrowed pointer, for each entry.
    AnyVector toVector() const;

  protected:
    void append(void* pointer);
    void* at(int index) const;              // an assertion outside the range
    void set(int index, void* pointer);     // an assertion outside the range
    void insert(int index, void* pointer);  // in front of `index`; -1 appends; else an assertion
    void* remove(int index);                // what was taken out, null outside the range
    int find(const void* pointer) const;    // the first index, or -1
    void sortByAddress();                   // takes no memory
    void* const* data() const { return array_.data(); }

  private:
    std::vector<void*> array_;
};

// Objects that somebody else will delete.
template <class T>
class TPtrList : public PtrListImp {
  public:
    TPtrList() = default;
    explicit TPtrList(const AnyVector& pointers) : PtrListImp(pointers) {}

    void append(T* object) { PtrListImp::append(untyped(object)); }
    void insert(int index, T* object) { PtrListImp::insert(index, untyped(object)); }
    void set(int index, T* object) { PtrListImp::set(index, untyped(object)); }
    T* at(int index) const { return static_cast<T*>(PtrListImp::at(index)); }
    T* operator[](int index) const { return at(index); }
    T* back() const { return at(size() - 1); }  // an assertion on an empty list
    T* remove(int index) { return static_cast<T*>(PtrListImp::remove(index)); }
    int indexOf(const T* object) const { return PtrListImp::find(object); }
    bool contains(const T* object) const { return indexOf(object) >= 0; }

    class const_iterator {
      public:
        using iterator_category = std::forward_iterator_tag;
        using value_type = T*;
        using difference_type = std::ptrdiff_t;
        using pointer = T* const*;
        using reference = T*;

        const_iterator() = default;
        explicit const_iterator(void* const* position) : position_(position) {}
        T* operator*() const { return static_cast<T*>(*position_); }
        const_iterator& operator++() {
            ++position_;
            return *this;
        }
        const_iterator operator++(int) { return const_iterator(position_++); }
        bool operator==(const const_iterator&) const = default;

      private:
        void* const* position_ = nullptr;
    };
    using iterator = const_iterator;
    const_iterator begin() const { return const_iterator(data()); }
    const_iterator end() const { return const_iterator(data() + size()); }

  private:
    static void* untyped(const T* object) { return const_cast<void*>(static_cast<const void*>(object)); }
};

// A view of objects that live inside a dictionary or another structure.
template <class T>
class TRefList : public TPtrList<T> {
  public:
    using TPtrList<T>::TPtrList;
};
