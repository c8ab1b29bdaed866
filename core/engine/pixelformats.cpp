// Which pixel formats stand for each other, and how many blocks a picture has.
#include <algorithm>

#include "core/engine/qvutil.h"
#include "core/media/fourcc.h"

bool QvUtil::equalFcc(unsigned a, unsigned b) { return qvEqualFourcc(a, b); }

bool QvUtil::exchengeableFOURCC(int a, int b) {
    return qvExchangeableFourcc(static_cast<unsigned>(a), static_cast<unsigned>(b));
}

int QvUtil::macroblocks(int width, int height) {
    if (width <= 0 || height <= 0) return 0;
    const long long count = ((width + 15LL) / 16) * ((height + 15LL) / 16);
    return static_cast<int>(std::min<long long>(count, 0x7FFFFFFF));
}
