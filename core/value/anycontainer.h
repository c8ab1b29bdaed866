// The two containers of Any: an ordered sequence and a dictionary with text keys.
//
// Elements keep their address while others are added, so references from append, set, at and get may be kept
// and written through. Copies are deep. Failed lookups return Any::invalid(), -1 or null and never insert.
// Neither class locks; const operations may run in several threads at once.
#pragma once

#include <cstddef>
#include <iterator>
#include <string_view>
#include <utility>

#include "core/arch/api.h"
#include "core/value/any.h"

class QV_API AnyVector {
  public:
    AnyVector() noexcept = default;
    // One to eleven elements in order: AnyVector(1, "two", 3.0). One alone is explicit, so that an Any that
    // holds a vector converts to that vector. They delegate, so that a failure half-way releases what is
    // there.
    explicit AnyVector(const Any& first) : AnyVector() { append(first); }
    template <class First, class... Rest>
    requires(sizeof...(Rest) >= 1 && sizeof...(Rest) <= 10) AnyVector(First&& first, Rest&&... rest)
        : AnyVector() {
        append(Any(std::forward<First>(first)));
        (append(Any(std::forward<Rest>(rest))), ...);
    }
    AnyVector(const AnyVector& other);
    AnyVector(AnyVector&& other) noexcept;
    virtual ~AnyVector();
    AnyVector& operator=(const AnyVector& other);
    AnyVector& operator=(AnyVector&& other);

    // The empty sentinel; every operation that would write to it is an assertion.
    static AnyVector& null();

    int size() const;
    bool empty() const { return size() == 0; }
    bool isValid() const { return size() > 0; }
    bool isNull() const;

    // Any::invalid() outside the range, which can't be written.
    Any& at(int index);
    const Any& at(int index) const;
    Any& operator[](int index) { return at(index); }
    const Any& operator[](int index) const { return at(index); }
    // An assertion on an empty vector.
    Any& front();
    const Any& front() const;
    Any& back();
    const Any& back() const;
    void set(int index, const Any& value);  // an assertion outside the range

    // Each returns the new element, or the container inside it.
    Any& append(const Any& value);
    Any& append(Any&& value);
    AnyDict& append(const AnyDict& value);
    AnyDict& append(AnyDict&& value);
    AnyVector& append(const AnyVector& value);
    AnyVector& append(AnyVector&& value);
    AnyVector& operator<<(const Any& value) {
        append(value);
        return *this;
    }
    void extend(const AnyVector& other);        // may be this vector itself
    void insert(const Any& value, int index);   // 0 to size(), else ignored
    void remove(int index);                     // ignored outside the range
    void removeMany(const AnyVector& indices);  // positions before the call, in any order
    Any popBack();                              // invalid on an empty vector
    void clear();
    void resize(int count);       // new elements are invalid; a negative count is an assertion
    void swap(AnyVector& other);  // an assertion if `other` is the null sentinel

    // The first index greater than `after` whose element is ==, or -1. Pass a result to continue.
    int indexOf(const Any& value, int after = -1) const;
    int find(const Any& value, int after = -1) const { return indexOf(value, after); }
    bool contains(const Any& value) const { return indexOf(value) >= 0; }
    // The first Float closer to `x` than `epsilon`, or -1.
    int ffind(double x, double epsilon) const;
    // The index of the number nearest to `value`, the earliest of equals; -1 if `value` is no number. The
    // scan ends at the first element that is not a number.
    int nearest(const Any& value) const;

    // Text elements only, with the separator between them if it is not empty; invalid if there is no text.
    Any join(const Any& separator) const;
    static AnyVector split(const Any& text, const Any& delimiter);

    void sort(bool reverse = false);  // by Any's operator<; NaN comes after all other Floats
    void sortDicts(const char* key);  // every element must be a Dict; a missing key reads as invalid

    // The value at a path as "2.name.0": indices and keys separated by dots; null if there is none.
    Any* descendant(const char* format, ...) QV_PRINTF(2, 3);
    const Any* descendant(const char* format, ...) const QV_PRINTF(2, 3);

    bool operator==(const AnyVector& other) const;
    bool operator!=(const AnyVector& other) const { return !(*this == other); }

    template <class Element>
    class Iterator {
      public:
        using iterator_category = std::forward_iterator_tag;
        using value_type = Any;
        using difference_type = std::ptrdiff_t;
        using pointer = Element*;
        using reference = Element&;

        Iterator() = default;
        explicit Iterator(Any* const* position) : position_(position) {}
        Element& operator*() const { return **position_; }
        Element* operator->() const { return *position_; }
        Iterator& operator++() {
            ++position_;
            return *this;
        }
        Iterator operator++(int) { return Iterator(position_++); }
        bool operator==(const Iterator&) const = default;

      private:
        Any* const* position_ = nullptr;
    };
    using iterator = Iterator<Any>;
    using const_iterator = Iterator<const Any>;
    iterator begin() { return iterator(elements()); }
    iterator end() { return iterator(elements() + size()); }
    const_iterator begin() const { return const_iterator(elements()); }
    const_iterator end() const { return const_iterator(elements() + size()); }

  private:
    struct Impl;
    Impl* impl_ = nullptr;  // made with the first element

    Impl& writable();  // an assertion on the null sentinel
    Any* const* elements() const;

    friend struct AnyPath;  // the walk of descendant
};

// Keys of at most 40 characters, in an order of their own: by signed bytes, a shorter key before its
// continuations. Positions go in key order; each positional call walks from the first entry, so prefer the
// iterator: for (auto [key, value] : dict) ... value->set(1).
class QV_API AnyDict {
  public:
    static constexpr int maxKeyLength = 40;

    struct Entry {
        const char* key;  // null for a position that does not exist
        Any* value;       // never null; to be written through only if the dictionary may be
    };

    AnyDict() noexcept = default;
    // One to eight pairs of key and value, set in the order given: AnyDict("type", 1, "name", "x").
    template <std::convertible_to<Any> Value, class... Rest>
    requires(sizeof...(Rest) % 2 == 0 && sizeof...(Rest) <= 14)
        AnyDict(const char* key, Value&& value, Rest&&... rest)
        : AnyDict() {
        setPairs(key, std::forward<Value>(value), std::forward<Rest>(rest)...);
    }
    AnyDict(const AnyDict& other);
    AnyDict(AnyDict&& other) noexcept;
    virtual ~AnyDict();
    AnyDict& operator=(const AnyDict& other);
    AnyDict& operator=(AnyDict&& other);

    // The empty sentinel; every operation that would write to it is an assertion.
    static AnyDict& null();

    int size() const;
    bool empty() const { return size() == 0; }
    bool isNull() const;

    // Any::invalid() if the key is absent; dict["x"] = 1 on an absent key is an assertion, use set.
    Any& get(const char* key);
    const Any& get(const char* key) const;
    Any& operator[](const char* key) { return get(key); }
    const Any& operator[](const char* key) const { return get(key); }
    bool isSet(const char* key) const;  // also for a value that is invalid
    bool contains(const char* key) const { return isSet(key); }

    // The key is cut to its first 40 characters, and only here: a longer key is not found again under its
    // full text. A null key is an assertion. The result is the stored value.
    Any& set(const char* key, const Any& value);
    Any& set(const char* key, Any&& value);
    Any& set(const char* key, const AnyDict& value);
    Any& set(const char* key, AnyDict&& value);
    Any& set(const char* key, const AnyVector& value);
    Any& set(const char* key, AnyVector&& value);
    void remove(const char* key);
    void clear();
    void update(const AnyDict& other);  // sets every entry of `other` here; nested containers are replaced
    void swap(AnyDict& other);          // an assertion if `other` is the null sentinel

    // The value if its type is exactly the one named, else the default.
    int getInt32(const char* key, int otherwise = 0) const;
    long long getInt64(const char* key, long long otherwise = 0) const;
    double getDouble(const char* key, double otherwise = 0.0) const;
    double getFloat(const char* key, double otherwise = 0.0) const { return getDouble(key, otherwise); }
    const char* getString(const char* key, const char* otherwise = nullptr) const;
    const unsigned short* getWString(const char* key, const unsigned short* otherwise = nullptr) const;
    const AnyVector& getVector(const char* key, const AnyVector& otherwise = AnyVector::null()) const;
    const AnyDict& getDict(const char* key, const AnyDict& otherwise = AnyDict::null()) const;

    const char* getKey(int position) const;
    Any& getVal(int position);
    const Any& getVal(int position) const;
    void getKeyVal(int position, Any& key, Any& value) const;  // both invalid outside the range
    Entry getEntry(int position) const;
    Entry at(int position) const { return getEntry(position); }
    int find(const Any& value) const;  // the position of the first equal value, or -1

    // The value at a path as "files.0.name": keys and indices separated by dots; null if there is none.
    Any* descendant(const char* format, ...) QV_PRINTF(2, 3);
    const Any* descendant(const char* format, ...) const QV_PRINTF(2, 3);

    bool operator==(const AnyDict& other) const;
    bool operator!=(const AnyDict& other) const { return !(*this == other); }

    class QV_API iterator {
      public:
        using iterator_category = std::forward_iterator_tag;
        using value_type = Entry;
        using difference_type = std::ptrdiff_t;
        using pointer = const Entry*;
        using reference = Entry;

        iterator() = default;
        explicit iterator(void* node) : node_(node) {}
        Entry operator*() const;
        iterator& operator++();
        iterator operator++(int) {
            iterator before = *this;
            ++*this;
            return before;
        }
        bool operator==(const iterator&) const = default;

      private:
        void* node_ = nullptr;
    };
    using const_iterator = iterator;
    iterator begin() const;
    iterator end() const;

  private:
    struct Impl;
    Impl* impl_ = nullptr;  // made with the first entry

    Impl& writable();  // an assertion on the null sentinel
    Any& slot(const char* key);
    Any* lookup(std::string_view key) const;

    template <class Value, class... Rest>
    void setPairs(const char* key, Value&& value, Rest&&... rest) {
        set(key, Any(std::forward<Value>(value)));
        if constexpr (sizeof...(Rest) > 0) setPairs(std::forward<Rest>(rest)...);
    }

    friend struct AnyPath;  // the walk of descendant
};
