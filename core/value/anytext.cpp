#include "core/value/anytext_p.h"

#include <algorithm>
#include <iterator>
#include <string>
#include <vector>

#include "core/arch/widename.h"
#include "core/value/anycontainer.h"
#include "core/value/utf.h"

namespace {

constexpr std::size_t longestReplaced = 4095;
// A replacement longer than what it replaces comes to its end, or has filled the result, in fewer steps.
constexpr std::size_t mostGrowingSteps = 2 * longestReplaced;
// Units that replacements may bring in altogether, for those that only shift text about.
constexpr std::size_t mostWork = std::size_t{1} << 26;

template <class Unit>
std::vector<Unit> unitsOf(const Any& value) {
    if constexpr (sizeof(Unit) == 1) {
        const auto text = qvNarrowView(value);
        return {text.begin(), text.end()};
    } else {
        const auto text = qvWideView(value);
        return {text.begin(), text.end()};
    }
}

// Replaces the leftmost occurrence until there is none. `done` holds no occurrence, and `rest` is what
// follows, last character first; a replacement goes back to `rest`, as it may be part of an occurrence.
template <class Unit>
class Replacer {
  public:
    Replacer(const std::vector<Unit>& find, const std::vector<Unit>& with)
        : find_(find), with_(with), grows_(with.size() > find.size()) {
        // What lies after the bound only moves further away.
        if (grows_) with_.resize(std::min(with_.size(), longestReplaced + 2 * find_.size()));
    }

    std::vector<Unit> run(const std::vector<Unit>& text) {
        if (find_ == with_) return text;
        if (find_.empty()) return filled();
        rest_.assign(text.rbegin(), text.rend());
        while (!rest_.empty() && !finished()) {
            done_.push_back(rest_.back());
            rest_.pop_back();
            if (endsWithFind()) substitute();
        }
        done_.insert(done_.end(), rest_.rbegin(), rest_.rend());
        return std::move(done_);
    }

  private:
    const std::vector<Unit>& find_;
    std::vector<Unit> with_;
    bool grows_;
    std::vector<Unit> done_, rest_;
    std::size_t steps_ = 0;

    bool finished() const {
        if (grows_) return steps_ > mostGrowingSteps || done_.size() >= longestReplaced + find_.size();
        return steps_ * with_.size() > mostWork;
    }
    bool endsWithFind() const {
        return done_.size() >= find_.size() && std::equal(find_.rbegin(), find_.rend(), done_.rbegin());
    }
    void substitute() {
        ++steps_;
        done_.resize(done_.size() - find_.size());
        rest_.insert(rest_.end(), with_.rbegin(), with_.rend());
        const std::size_t needed = longestReplaced + 2 * find_.size() + with_.size();
        if (grows_ && rest_.size() > 4 * needed)
            rest_.erase(rest_.begin(), rest_.end() - static_cast<std::ptrdiff_t>(needed));
    }
    // The empty text is found in front of any text, again and again.
    std::vector<Unit> filled() const {
        std::vector<Unit> result;
        while (result.size() < longestReplaced) result.insert(result.end(), with_.begin(), with_.end());
        return result;
    }
};

template <class Unit>
Any replaced(const std::vector<Unit>& text, const std::vector<Unit>& find, const std::vector<Unit>& with) {
    auto result = Replacer<Unit>(find, with).run(text);
    result.resize(std::min(result.size(), longestReplaced));
    if constexpr (sizeof(Unit) == 1)
        return qvTextOf(std::string_view(result.data(), result.size()));
    else
        return qvTextOf(QvWideView(result));
}

// The characters unchanged, without regard to what they encode.
std::vector<unsigned short> widened(const Any& value) {
    if (value.isWString()) return unitsOf<unsigned short>(value);
    std::vector<unsigned short> units;
    for (const char c : qvNarrowView(value)) units.push_back(static_cast<unsigned char>(c));
    return units;
}

template <class View>
Any part(View text, int start, int end) {
    const int length = qvTextLength(text.size());
    if (end < 0) end += length + 1;
    if (start < 0) start += length;
    QV_ASSERT_MSG(start >= 0 && end >= 0 && end <= length && start < end, "Any.substr: index out of range");
    return qvTextOf(View(text.data() + start, static_cast<std::size_t>(end - start)));
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

Any qvNarrowText(const Any& text) {
    if (text.isString()) return text;
    if (!text.isWString()) return Any();
    const QvWideView units = qvWideView(text);
    return qvTextOf(std::string_view(qv_narrow_name(units.data(), units.size())));
}

Any qvWideText(const Any& text) {
    if (text.isWString()) return text;
    if (!text.isString()) return Any();
    const QvWideString units = qv_wide_name(qvNarrowView(text));
    return qvTextOf(QvWideView(units.data(), units.size()));
}

Any qvTextPart(const Any& text, int start, int end) {
    QV_ASSERT_MSG(text.isText(), "Any.substr: invalid type");
    if (text.size() == 0) return text;
    const auto size = static_cast<std::size_t>(text.size());
    if (text.isWString()) return part(QvWideView(text.asWString(), size), start, end);
    return part(std::string_view(text.asString(), size), start, end);
}

Any qvTextReplaced(const Any& text, const Any& find, const Any& with) {
    QV_ASSERT(text.isText() && find.isText() && with.isText());
    if (text.isString() && find.isString() && with.isString())
        return replaced(unitsOf<char>(text), unitsOf<char>(find), unitsOf<char>(with));
    return replaced(widened(text), unitsOf<unsigned short>(qvWideText(find)),
                    unitsOf<unsigned short>(qvWideText(with)));
}

Any qvTextAppended(const Any& a, const Any& b) {
    if (a.isString() && b.isString()) {
        std::string joined(qvNarrowView(a));
        return qvTextOf(std::string_view(joined.append(qvNarrowView(b))));
    }
    auto joined = unitsOf<unsigned short>(qvWideText(a));
    std::ranges::copy(unitsOf<unsigned short>(qvWideText(b)), std::back_inserter(joined));
    return qvTextOf(QvWideView(joined));
}

AnyVector qvTextPieces(const Any& text, const Any& delimiter) {
    QV_ASSERT(text.isText() && delimiter.isText());
    if (text.isWString()) return pieces(qvWideView(text), qvWideView(qvWideText(delimiter)));
    return pieces(qvNarrowView(text), qvNarrowView(qvNarrowText(delimiter)));
}

Any qvTextsJoined(const AnyVector& parts, const Any& separator) {
    bool wide = separator.isWString();
    bool anything = false;
    for (const Any& part : parts) {
        if (!part.isText()) continue;
        wide = wide || part.isWString();
        anything = anything || part.size() > 0;
    }
    if (!anything) return Any::invalid();
    if (!wide) {
        const auto narrow = [](std::string& to, const Any& part) { to += qvNarrowView(part); };
        return joined<std::string>(parts, separator, narrow);
    }
    const auto wider = [](std::vector<unsigned short>& to, const Any& part) {
        const Any converted = qvWideText(part);
        const auto text = qvWideView(converted);
        to.insert(to.end(), text.begin(), text.end());
    };
    return joined<std::vector<unsigned short>>(parts, separator, wider);
}
