// The order of effects before and after the automatic filters.
#include "core/engine/qvutil.h"

namespace {

int positionOf(const Any& effect) { return effect.asDict().getInt32("_position", 0); }

void insertByPosition(AnyVector& list, const Any& effect) {
    Any placed = effect;
    if (!placed.asDict().isSet("_position")) placed.asDict().set("_position", Any(0));
    int place = list.size();
    while (place > 0 && positionOf(list.at(place - 1)) > positionOf(placed)) --place;
    list.insert(placed, place);
}

}  // namespace

void QvUtil::getSortedEffects(const AnyVector& in, AnyVector& front, AnyVector& back, bool onlyActive) {
    const AnyVector effects = in;  // an output may be the input
    front.clear();
    back.clear();
    for (int i = 0; i < effects.size(); ++i) {
        const Any& effect = effects.at(i);
        if (!effect.isDict()) continue;
        if (onlyActive && effect.asDict().get("_on").isFalse()) continue;
        insertByPosition(effect.asDict().get("_front").isTrue() ? front : back, effect);
    }
}
