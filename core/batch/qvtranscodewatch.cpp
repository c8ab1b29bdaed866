#include "core/batch/qvtranscodewatch_p.h"

#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"

QvTranscodeWatch::QvTranscodeWatch(QvWatchProcessor& processor) : processor_(processor) {
    setParam("startDelay", 0);  // nobody waits for transcode() to return
}

std::unique_ptr<QvTranscodeWatch> QvTranscodeWatch::create(QvWatchProcessor& processor, QvDecodePipe& decoder,
                                                           QvEncodePipe& pipe) {
    auto made = std::make_unique<QvTranscodeWatch>(processor);
    made->setEncoder(&pipe);
    if (made->encoder() != &pipe) {
        qv_log()->error("    Transcoding error, setEncoder failed");
        return nullptr;
    }
    if (!made->linkStreams(decoder, qvVideoStream, pipe.nrVideoStreams(),
                           "    Transcoding error, video link %d failed") ||
        !made->linkStreams(decoder, qvAudioStream, pipe.nrAudioStreams(),
                           "    Transcoding error, audio link %d failed"))
        return nullptr;
    return made;
}

bool QvTranscodeWatch::linkStreams(QvDecodePipe& decoder, int type, int count, const char* failure) {
    for (int k = 0; k < count; ++k) {
        const bool selected = decoder.isSelected(type, k) || decoder.select(type, k) == QvStatus::ok;
        if (!selected || link(&decoder, type, k, k) < 0) {
            qv_log()->error(failure, k);
            return false;
        }
    }
    return true;
}
