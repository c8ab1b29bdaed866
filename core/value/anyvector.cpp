#include <algorithm>
#include <cmath>
#include <cstdarg>
#include <cstddef>
#include <memory>
#include <utility>
#include <vector>

#include "core/arch/qvassert.h"
#include "core/value/anycontainer.h"
#include "core/value/anypath_p.h"
#include "core/value/anytext_p.h"

namespace {

bool isNumber(const Any& value) { return value.isInt() || value.isFloat(); }

// Any's operator<, made a strict weak order: NaN comes after all other Floats.
bool before(const Any& a, const Any& b) {
    if (a.isFloat() && b.isFloat() && (std::isnan(a.asFloat()) || std::isnan(b.asFloat())))
        return !std::isnan(a.asFloat()) && std::isnan(b.asFloat());
    return a < b;
}

template <class Before>
void sortWith(AnyVector& vector, Before order) {
    std::vector<Any> sorted;
    sorted.reserve(static_cast<std::size_t>(vector.size()));
    for (Any& element : vector) sorted.push_back(std::move(element));
    std::ranges::stable_sort(sorted, order);
    std::ranges::move(sorted, vector.begin());
}

}  // namespace

// Each element has an address of its own, which it keeps whatever happens to the others.
struct AnyVector::Impl {
    std::vector<Any*> items;

    Impl() = default;
    Impl(const Impl&) = delete;
    Impl& operator=(const Impl&) = delete;
    ~Impl() { cutTo(0); }

    Any& insert(std::size_t index, std::unique_ptr<Any> fresh) {
        items.insert(items.begin() + static_cast<std::ptrdiff_t>(index), fresh.get());
        return *fresh.release();
    }
    Any& append(std::unique_ptr<Any> fresh) {
        items.push_back(fresh.get());
        return *fresh.release();
    }
    void cutTo(std::size_t count) {
        while (items.size() > count) {
            delete items.back();
            items.pop_back();
        }
    }
};

AnyVector& AnyVector::null() {
    static AnyVector& shared = *[] {
        static AnyVector made;
        made.impl_ = new Impl;
        return &made;
    }();
    return shared;
}

AnyVector::AnyVector(const AnyVector& other) {
    if (other.empty()) return;
    auto copy = std::make_unique<Impl>();
    copy->items.reserve(static_cast<std::size_t>(other.size()));
    for (const Any& element : other) copy->append(std::make_unique<Any>(element));
    impl_ = copy.release();
}

AnyVector::AnyVector(AnyVector&& other) noexcept {
    if (!other.isNull()) impl_ = std::exchange(other.impl_, nullptr);
}

AnyVector::~AnyVector() { delete impl_; }

AnyVector& AnyVector::operator=(const AnyVector& other) {
    QV_ASSERT(!isNull());
    if (this != &other) *this = AnyVector(other);
    return *this;
}

// The old elements go last: `other` may be one of them.
AnyVector& AnyVector::operator=(AnyVector&& other) {
    QV_ASSERT(!isNull());
    if (this == &other) return *this;
    AnyVector taken(std::move(other));
    std::swap(impl_, taken.impl_);
    return *this;
}

AnyVector::Impl& AnyVector::writable() {
    if (!impl_)
        impl_ = new Impl;
    else
        QV_ASSERT(!isNull());
    return *impl_;
}

bool AnyVector::isNull() const { return impl_ && impl_ == null().impl_; }
int AnyVector::size() const { return impl_ ? static_cast<int>(impl_->items.size()) : 0; }
Any* const* AnyVector::elements() const { return impl_ ? impl_->items.data() : nullptr; }

Any& AnyVector::at(int index) { return index < 0 || index >= size() ? Any::invalid() : *elements()[index]; }
const Any& AnyVector::at(int index) const {
    return index < 0 || index >= size() ? Any::invalid() : *elements()[index];
}

Any& AnyVector::front() {
    QV_ASSERT(!empty());
    return at(0);
}
const Any& AnyVector::front() const {
    QV_ASSERT(!empty());
    return at(0);
}
Any& AnyVector::back() {
    QV_ASSERT(!empty());
    return at(size() - 1);
}
const Any& AnyVector::back() const {
    QV_ASSERT(!empty());
    return at(size() - 1);
}

void AnyVector::set(int index, const Any& value) {
    QV_ASSERT(index >= 0 && index < size());
    at(index) = Any(value);  // copied first: it may hold this vector
}

Any& AnyVector::append(const Any& value) { return append(Any(value)); }
Any& AnyVector::append(Any&& value) {
    if (value.isVector() && &value.asVector() == this) return append(Any(std::as_const(value)));
    return writable().append(std::make_unique<Any>(std::move(value)));
}
AnyDict& AnyVector::append(const AnyDict& value) { return append(Any(value)).asDict(); }
AnyDict& AnyVector::append(AnyDict&& value) { return append(Any(std::move(value))).asDict(); }
AnyVector& AnyVector::append(const AnyVector& value) { return append(Any(value)).asVector(); }
AnyVector& AnyVector::append(AnyVector&& value) { return append(Any(std::move(value))).asVector(); }

void AnyVector::extend(const AnyVector& other) {
    AnyVector copy(other);
    for (Any& element : copy) append(std::move(element));
}

void AnyVector::insert(const Any& value, int index) {
    Impl& to = writable();
    if (index < 0 || index > size()) return;
    to.insert(static_cast<std::size_t>(index), std::make_unique<Any>(value));
}

void AnyVector::remove(int index) {
    if (index < 0 || index >= size()) return;
    const auto position = writable().items.begin() + index;
    delete *position;
    impl_->items.erase(position);
}

void AnyVector::removeMany(const AnyVector& indices) {
    std::vector<int> positions;
    for (const Any& index : indices) positions.push_back(index.toInt32());
    std::ranges::sort(positions, std::ranges::greater());
    for (const int position : positions) remove(position);
}

Any AnyVector::popBack() {
    if (empty()) return Any::invalid();
    Any last(std::move(back()));
    remove(size() - 1);
    return last;
}

void AnyVector::clear() { writable().cutTo(0); }

void AnyVector::resize(int count) {
    QV_ASSERT(count >= 0);
    Impl& to = writable();
    to.cutTo(static_cast<std::size_t>(count));
    to.items.reserve(static_cast<std::size_t>(count));
    while (size() < count) to.append(std::make_unique<Any>());
}

void AnyVector::swap(AnyVector& other) {
    QV_ASSERT(!other.isNull());
    if (isNull()) {
        other.writable();  // so that the sentinel keeps an element by which it is recognised
        delete std::exchange(impl_, new Impl);
    }
    std::swap(impl_, other.impl_);
}

bool AnyVector::operator==(const AnyVector& other) const {
    return impl_ == other.impl_ || std::equal(begin(), end(), other.begin(), other.end());
}

int AnyVector::indexOf(const Any& value, int after) const {
    for (int i = after < -1 ? 0 : after + 1; i < size(); ++i)
        if (at(i) == value) return i;
    return -1;
}

int AnyVector::ffind(double x, double epsilon) const {
    for (int i = 0; i < size(); ++i)
        if (at(i).isFloat() && std::fabs(at(i).asFloat() - x) < epsilon) return i;
    return -1;
}

int AnyVector::nearest(const Any& value) const {
    if (!isNumber(value)) return -1;
    const double wanted = value.toDouble();
    int best = -1;
    double smallest = 0;
    for (int i = 0; i < size() && isNumber(at(i)); ++i) {
        const double distance = std::fabs(at(i).toDouble() - wanted);
        if (best >= 0 && !(distance < smallest)) continue;
        best = i;
        smallest = distance;
    }
    return best;
}

Any AnyVector::join(const Any& separator) const { return qvTextsJoined(*this, separator); }
AnyVector AnyVector::split(const Any& text, const Any& delimiter) { return qvTextPieces(text, delimiter); }

void AnyVector::sort(bool reverse) {
    if (reverse)
        sortWith(*this, [](const Any& a, const Any& b) { return before(b, a); });
    else
        sortWith(*this, before);
}

void AnyVector::sortDicts(const char* key) {
    for (const Any& element : *this) QV_ASSERT(element.isDict());
    const auto valueOf = [key](const Any& dict) -> const Any& { return dict.asDict().get(key); };
    sortWith(*this, [&](const Any& a, const Any& b) { return before(valueOf(a), valueOf(b)); });
}

Any* AnyVector::descendant(const char* format, ...) {
    va_list args;
    va_start(args, format);
    Any* const found = AnyPath::find(*this, format, args);
    va_end(args);
    return found;
}

const Any* AnyVector::descendant(const char* format, ...) const {
    va_list args;
    va_start(args, format);
    const Any* const found = AnyPath::find(*this, format, args);
    va_end(args);
    return found;
}
