#include "core/preset/storedequal_p.h"

#include <algorithm>
#include <iterator>

#include "core/value/anycontainer.h"

namespace {

bool isMark(const char* key) { return key[0] == '#'; }

int storedSize(const AnyDict& dict) {
    int count = 0;
    for (const auto [key, value] : dict) count += isMark(key) ? 0 : 1;
    return count;
}

bool equalDicts(const AnyDict& a, const AnyDict& b) {
    if (storedSize(a) != storedSize(b)) return false;
    for (const auto [key, value] : a)
        if (!isMark(key) && !(b.isSet(key) && qvStoredEqual(*value, b.get(key)))) return false;
    return true;
}

}  // namespace

bool qvStoredEqual(const Any& a, const Any& b) {
    if (a.isDict() && b.isDict()) return equalDicts(a.asDict(), b.asDict());
    if (a.isVector() && b.isVector())
        return a.asVector().size() == b.asVector().size() &&
               std::equal(a.asVector().begin(), a.asVector().end(), b.asVector().begin(), qvStoredEqual);
    if (a.isText() && b.isText() && a.isString() != b.isString()) return a.toString() == b.toString();
    return a == b;
}
