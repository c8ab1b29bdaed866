// Text operations of Any.
#include <algorithm>
#include <cstdarg>
#include <iterator>
#include <string>
#include <vector>

#include "core/arch/cformat.h"
#include "core/arch/widename.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"
#include "core/value/anytext_p.h"

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

// The characters as they stand, without regard to what they encode.
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

}  // namespace

Any Any::toString() const {
    if (isString()) return *this;
    if (!isWString()) return Any();
    const QvWideView text = qvWideView(*this);
    return qvTextOf(std::string_view(qv_narrow_name(text.data(), text.size())));
}

Any Any::toWString() const {
    if (isWString()) return *this;
    if (!isString()) return Any();
    const QvWideString text = qv_wide_name(qvNarrowView(*this));
    return qvTextOf(QvWideView(text.data(), text.size()));
}

Any Any::substr(int start, int end) const {
    QV_ASSERT_MSG(isText(), "Any.substr: invalid type");
    if (size() == 0) return *this;
    if (isWString()) return part(QvWideView(asWString(), static_cast<std::size_t>(size())), start, end);
    return part(std::string_view(asString(), static_cast<std::size_t>(size())), start, end);
}

Any Any::replace(const Any& find, const Any& with) const {
    QV_ASSERT(isText() && find.isText() && with.isText());
    if (isString() && find.isString() && with.isString())
        return replaced(unitsOf<char>(*this), unitsOf<char>(find), unitsOf<char>(with));
    return replaced(widened(*this), unitsOf<unsigned short>(find.toWString()),
                    unitsOf<unsigned short>(with.toWString()));
}

AnyVector Any::split(const Any& delimiter) const { return AnyVector::split(*this, delimiter); }

Any Any::strcat(const Any& a, const Any& b) {
    if (a.isString() && b.isString()) {
        std::string joined(qvNarrowView(a));
        return qvTextOf(std::string_view(joined.append(qvNarrowView(b))));
    }
    auto joined = unitsOf<unsigned short>(a.toWString());
    std::ranges::copy(unitsOf<unsigned short>(b.toWString()), std::back_inserter(joined));
    return qvTextOf(QvWideView(joined));
}

Any Any::sprintf(const char* format, ...) {
    char buffer[2048];
    va_list args;
    va_start(args, format);
    const int length = qv_vformat(buffer, sizeof buffer, format, args);
    va_end(args);
    return Any(length < 0 ? "" : buffer);
}
