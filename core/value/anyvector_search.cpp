// Searching, sorting and text of AnyVector.
#include <algorithm>
#include <cmath>
#include <string>
#include <vector>

#include "core/arch/qvassert.h"
#include "core/value/anycontainer.h"
#include "core/value/anytext_p.h"
#include "core/value/utf.h"

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

// Pieces between delimiters. An empty one is a String in both widths.
template <class View>
AnyVector pieces(View text, View delimiter) {
    AnyVector result;
    std::size_t first = 0;
    if (!delimiter.empty()) QvUtf::next(delimiter, first);
    const View mark(delimiter.data(), first);
    auto from = text.begin();
    while (true) {
        const auto to = mark.empty() ? text.end() : std::search(from, text.end(), mark.begin(), mark.end());
        result.append(from == to ? Any("") : qvTextOf(View(from, to)));
        if (to == text.end()) return result;
        from = to + static_cast<std::ptrdiff_t>(mark.size());
    }
}

template <class Text, class Append>
Any joined(const AnyVector& parts, const Any& separator, Append append) {
    Text result;
    bool first = true;
    for (const Any& part : parts) {
        if (!part.isText()) continue;
        if (!first && separator.isTrue()) append(result, separator);
        append(result, part);
        first = false;
    }
    return qvTextOf(result);
}

}  // namespace

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

Any AnyVector::join(const Any& separator) const {
    bool wide = separator.isWString();
    bool anything = false;
    for (const Any& part : *this) {
        if (!part.isText()) continue;
        wide = wide || part.isWString();
        anything = anything || part.size() > 0;
    }
    if (!anything) return Any::invalid();
    if (!wide) {
        const auto narrow = [](std::string& to, const Any& part) { to += qvNarrowView(part); };
        return joined<std::string>(*this, separator, narrow);
    }
    return joined<std::vector<unsigned short>>(*this, separator,
                                               [](std::vector<unsigned short>& to, const Any& part) {
                                                   const Any converted = part.toWString();
                                                   const auto text = qvWideView(converted);
                                                   to.insert(to.end(), text.begin(), text.end());
                                               });
}

AnyVector AnyVector::split(const Any& text, const Any& delimiter) {
    QV_ASSERT(text.isText() && delimiter.isText());
    const Any mark = text.isWString() ? delimiter.toWString() : delimiter.toString();
    return text.isWString() ? pieces(qvWideView(text), qvWideView(mark))
                            : pieces(qvNarrowView(text), qvNarrowView(mark));
}

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
