#include <algorithm>
#include <bit>
#include <cstdarg>
#include <cstdint>
#include <cstring>
#include <iterator>
#include <map>
#include <memory>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/value/anycontainer.h"
#include "core/value/anypath_p.h"
#include "core/value/astring.h"

namespace {

std::uint64_t byteAt(std::string_view text, std::size_t i) { return static_cast<unsigned char>(text[i]); }

// Four bytes as a number, the first one highest.
std::uint64_t fourAt(std::string_view text, std::size_t i) {
    return byteAt(text, i) << 24 | byteAt(text, i + 1) << 16 | byteAt(text, i + 2) << 8 | byteAt(text, i + 3);
}

// Eight bytes of a key as one number that sorts as they do: signed, a missing byte first. Built of few loads,
// which overlap where less than eight bytes are there.
[[gnu::always_inline]] inline std::uint64_t wordAt(std::string_view key, std::size_t from) {
    if (from >= key.size()) return 0;
    const std::string_view part = key.substr(from, 8);
    const std::size_t size = part.size();
    const auto shift = static_cast<int>(64 - 8 * size);
    std::uint64_t word = 0;
    if (size == 8)
        word = fourAt(part, 0) << 32 | fourAt(part, 4);
    else if (size >= 4)
        word = fourAt(part, 0) << 32 | fourAt(part, size - 4) << shift;
    else
        word = byteAt(part, 0) << 56 | byteAt(part, size / 2) << (56 - 8 * (size / 2)) |
               byteAt(part, size - 1) << shift;
    return word ^ (0x8080808080808080u >> shift << shift);
}

// The first bytes of a key decide most comparisons.
struct KeyHead {
    static constexpr std::size_t size = 16;
    std::uint64_t first, second;

    explicit KeyHead(std::string_view key) : first(wordAt(key, 0)), second(wordAt(key, 8)) {}
    bool operator==(const KeyHead&) const = default;
};

struct SoughtKey {
    KeyHead head;
    std::string_view text;

    explicit SoughtKey(std::string_view key) : head(key), text(key) {}
    std::string_view view() const { return text; }
};

// A stored key lies whole in its tree node.
struct StoredKey {
    KeyHead head;
    std::uint32_t length;
    AString<AnyDict::maxKeyLength> text;

    explicit StoredKey(std::string_view key)
        : head(key), length(static_cast<std::uint32_t>(key.size())), text(key.data()) {}
    std::string_view view() const { return {text.c_str(), length}; }
};

// By signed bytes over the shorter length, then the shorter first. Equal heads do not mean equal bytes: a
// missing byte looks like the lowest one, so the lengths have the last word.
struct KeyOrder {
    using is_transparent = void;

    template <class A, class B>
    bool operator()(const A& a, const B& b) const {
        if (a.head.first != b.head.first) return a.head.first < b.head.first;
        if (a.head.second != b.head.second) return a.head.second < b.head.second;
        const std::string_view x = a.view();
        const std::string_view y = b.view();
        const std::size_t common = std::min(x.size(), y.size());
        for (std::size_t i = KeyHead::size; i < common; ++i)
            if (x[i] != y[i]) return static_cast<signed char>(x[i]) < static_cast<signed char>(y[i]);
        return x.size() < y.size();
    }
};

inline bool same(const SoughtKey& a, const StoredKey& b) {
    return a.head == b.head && a.text.size() == b.length && (b.length <= KeyHead::size || a.text == b.view());
}

using Tree = std::map<StoredKey, Any, KeyOrder>;

// An iterator of the tree is one pointer, which is how AnyDict::iterator carries it.
static_assert(sizeof(Tree::iterator) == sizeof(void*) && std::is_trivially_copyable_v<Tree::iterator>);
Tree::iterator treeIterator(void* node) { return std::bit_cast<Tree::iterator>(node); }

}  // namespace

struct AnyDict::Impl {
    Tree tree;
};

AnyDict& AnyDict::null() {
    static AnyDict& shared = *[] {
        static AnyDict made;
        made.impl_ = new Impl;
        return &made;
    }();
    return shared;
}

AnyDict::AnyDict(const AnyDict& other) {
    if (!other.empty()) impl_ = new Impl(*other.impl_);
}

AnyDict::AnyDict(AnyDict&& other) noexcept {
    if (!other.isNull()) impl_ = std::exchange(other.impl_, nullptr);
}

AnyDict::~AnyDict() { delete impl_; }

AnyDict& AnyDict::operator=(const AnyDict& other) {
    QV_ASSERT(!isNull());
    if (this != &other) *this = AnyDict(other);
    return *this;
}

// The old entries go last: `other` may be in one of them.
AnyDict& AnyDict::operator=(AnyDict&& other) {
    QV_ASSERT(!isNull());
    if (this == &other) return *this;
    AnyDict taken(std::move(other));
    std::swap(impl_, taken.impl_);
    return *this;
}

AnyDict::Impl& AnyDict::writable() {
    if (!impl_)
        impl_ = new Impl;
    else
        QV_ASSERT(!isNull());
    return *impl_;
}

bool AnyDict::isNull() const { return impl_ && impl_ == null().impl_; }
int AnyDict::size() const { return impl_ ? static_cast<int>(impl_->tree.size()) : 0; }

Any* AnyDict::lookup(std::string_view key) const {
    if (!impl_ || key.size() > maxKeyLength) return nullptr;
    const SoughtKey sought(key);
    const auto place = impl_->tree.lower_bound(sought);
    return place != impl_->tree.end() && same(sought, place->first) ? &place->second : nullptr;
}

Any& AnyDict::get(const char* key) {
    Any* const found = key ? lookup(key) : nullptr;
    return found ? *found : Any::invalid();
}

const Any& AnyDict::get(const char* key) const {
    const Any* const found = key ? lookup(key) : nullptr;
    return found ? *found : Any::invalid();
}

bool AnyDict::isSet(const char* key) const { return key && lookup(key); }

// The entry of a key, made if need be.
Any& AnyDict::slot(const char* key) {
    QV_ASSERT(key);
    Tree& tree = writable().tree;
    const SoughtKey sought(std::string_view(key, strnlen(key, maxKeyLength)));
    const auto place = tree.lower_bound(sought);
    if (place != tree.end() && same(sought, place->first)) return place->second;
    return tree.try_emplace(place, StoredKey(sought.text))->second;
}

// A container is copied before its entry is made: it may hold this dictionary.
Any& AnyDict::set(const char* key, const Any& value) {
    if (value.isDict() || value.isVector()) return set(key, Any(value));
    return slot(key) = value;
}
Any& AnyDict::set(const char* key, Any&& value) {
    if (value.isDict() && &value.asDict() == this) return set(key, Any(std::as_const(value)));
    return slot(key) = std::move(value);
}
Any& AnyDict::set(const char* key, const AnyDict& value) { return set(key, Any(value)); }
Any& AnyDict::set(const char* key, AnyDict&& value) { return set(key, Any(std::move(value))); }
Any& AnyDict::set(const char* key, const AnyVector& value) { return set(key, Any(value)); }
Any& AnyDict::set(const char* key, AnyVector&& value) { return set(key, Any(std::move(value))); }

void AnyDict::remove(const char* key) {
    if (!isSet(key)) return;
    Tree& tree = writable().tree;
    tree.erase(tree.find(SoughtKey(key)));
}

void AnyDict::clear() { writable().tree.clear(); }

void AnyDict::update(const AnyDict& other) {
    AnyDict copy(other);
    for (auto [key, value] : copy) set(key, std::move(*value));
}

void AnyDict::swap(AnyDict& other) {
    QV_ASSERT(!other.isNull());
    if (isNull()) {
        other.writable();  // so that the sentinel keeps an entry by which it is recognised
        delete std::exchange(impl_, new Impl);
    }
    std::swap(impl_, other.impl_);
}

int AnyDict::getInt32(const char* key, int otherwise) const { return get(key).asInt32(otherwise); }
long long AnyDict::getInt64(const char* key, long long otherwise) const {
    return get(key).asInt64(otherwise);
}
double AnyDict::getDouble(const char* key, double otherwise) const { return get(key).asDouble(otherwise); }
const char* AnyDict::getString(const char* key, const char* otherwise) const {
    return get(key).asString(otherwise);
}
const unsigned short* AnyDict::getWString(const char* key, const unsigned short* otherwise) const {
    return get(key).asWString(otherwise);
}
const AnyVector& AnyDict::getVector(const char* key, const AnyVector& otherwise) const {
    const Any& value = get(key);
    return value.isVector() ? value.asVector() : otherwise;
}
const AnyDict& AnyDict::getDict(const char* key, const AnyDict& otherwise) const {
    const Any& value = get(key);
    return value.isDict() ? value.asDict() : otherwise;
}

AnyDict::Entry AnyDict::getEntry(int position) const {
    if (position < 0 || position >= size()) return {nullptr, &Any::invalid()};
    return *iterator(std::bit_cast<void*>(std::next(impl_->tree.begin(), position)));
}

const char* AnyDict::getKey(int position) const { return getEntry(position).key; }
Any& AnyDict::getVal(int position) { return *getEntry(position).value; }
const Any& AnyDict::getVal(int position) const { return *getEntry(position).value; }

void AnyDict::getKeyVal(int position, Any& key, Any& value) const {
    const Entry entry = getEntry(position);
    if (entry.key) {
        Any copy(*entry.value);  // `key` may be the value that holds this dictionary
        key = entry.key;
        value = std::move(copy);
    } else {
        key.invalidate();
        value.invalidate();
    }
}

int AnyDict::find(const Any& value) const {
    int position = 0;
    for (const Entry entry : *this) {
        if (*entry.value == value) return position;
        ++position;
    }
    return -1;
}

bool AnyDict::operator==(const AnyDict& other) const {
    if (impl_ == other.impl_) return true;
    const auto equal = [](Entry a, Entry b) {
        return std::strcmp(a.key, b.key) == 0 && *a.value == *b.value;
    };
    return size() == other.size() && std::equal(begin(), end(), other.begin(), equal);
}

Any* AnyDict::descendant(const char* format, ...) {
    va_list args;
    va_start(args, format);
    Any* const found = AnyPath::find(*this, format, args);
    va_end(args);
    return found;
}

const Any* AnyDict::descendant(const char* format, ...) const {
    va_list args;
    va_start(args, format);
    const Any* const found = AnyPath::find(*this, format, args);
    va_end(args);
    return found;
}

AnyDict::iterator AnyDict::begin() const {
    return impl_ ? iterator(std::bit_cast<void*>(impl_->tree.begin())) : iterator();
}
AnyDict::iterator AnyDict::end() const {
    return impl_ ? iterator(std::bit_cast<void*>(impl_->tree.end())) : iterator();
}

AnyDict::Entry AnyDict::iterator::operator*() const {
    auto& [key, value] = *treeIterator(node_);
    return {key.text.c_str(), &value};
}

AnyDict::iterator& AnyDict::iterator::operator++() {
    node_ = std::bit_cast<void*>(std::next(treeIterator(node_)));
    return *this;
}
