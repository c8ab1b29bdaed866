#include <algorithm>

#include "core/engine/status.h"
#include "core/media/qvbuffer.h"
#include "core/transcode/batch/boundedsound_p.h"

int BoundedSound::readSamples(int count, int) {
    const int most = static_cast<int>(std::min<long long>(count, left_));
    atEnd_ = most < 1;
    if (atEnd_) return QvStatus::endOfStream;
    const int result = source_.readSamples(most, number_);
    if (result < 0 && result != QvStatus::endOfStream) return setError(result, "%s", source_.errorDesc());
    const QvPcm* pcm = source_.getAudioPtr(number_);
    const int samples = pcm && pcm->inited() ? pcm->samples() : 0;
    if (samples < std::min<long long>(most, available_)) endedEarly_ = true;
    available_ -= samples;
    if (left_ != unbounded) left_ -= std::min<long long>(samples, left_);
    return result;
}
