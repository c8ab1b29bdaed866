// The members of measures that speak in values.
#include "core/measure/bitrate.h"
#include "core/measure/measuretext_p.h"
#include "core/measure/qvframerate.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

Any QvFramerate::desc(bool showDf, bool showPulldown) const {
    return Any(qvRateText(*this, showDf, showPulldown).c_str());
}

int QvFramerate::findInVector(const AnyVector& rates, bool exact, bool compareDf) const {
    for (int i = 0; i < rates.size(); ++i)
        if (rates.at(i).isFramerate() && qvRateMatches(*this, rates.at(i).asFramerate(), exact, compareDf))
            return i;
    return -1;
}

Any QvBitrate::desc() const { return Any(qvBitrateText(*this).c_str()); }
