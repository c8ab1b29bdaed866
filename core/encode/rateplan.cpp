// Bit rates of an encode pipe: what its encoders are set to, and what would fit a file of a given size.
#include <algorithm>

#include "core/encode/qvencodepipe.h"
#include "core/encode/qvencoder.h"
#include "core/engine/qvutil.h"
#include "core/measure/bitrate.h"
#include "core/measure/streamtype.h"

namespace {

constexpr double overheadShare = 1.0 / 50;  // of the file, for the multiplexer
constexpr double mostForAudio = 1.0 / 3;    // of what is left, when rates are suggested

// Bits per second of all encoders of a type. One that keeps a quality has no target and counts as nothing.
double sumOfTargets(const QvEncodePipe& pipe, int type) {
    double sum = 0;
    for (int i = 0; i < pipe.nrStreams(type); ++i) {
        const QvEncoder* const encoder = pipe.encoder(type, i);
        const Any rate = encoder ? encoder->getParam("bitrate") : Any();
        if (rate.isBitrate()) sum += std::max(0, rate.asBitrate().target);
    }
    return sum;
}

// Bits per second for all streams together; 0 if the arguments make no rate.
double budget(double seconds, double bytes) {
    if (!(seconds > 0) || !(bytes > 0)) return 0;
    return bytes * 8 * (1 - overheadShare) / seconds;
}

}  // namespace

int QvUtil::getRates(const QvEncodePipe* pipe, double& video, double& audio) {
    video = audio = 0;
    if (!pipe) return -1;
    video = sumOfTargets(*pipe, qvVideoStream);
    audio = sumOfTargets(*pipe, qvAudioStream);
    return 0;
}

double QvUtil::targetBitrate(const QvEncodePipe* pipe, double seconds, double bytes) {
    double video, audio;
    const double all = budget(seconds, bytes);
    if (getRates(pipe, video, audio) != 0 || all <= 0) return 0;
    return std::max(0.0, all - audio) / std::max(1, pipe->nrStreams(qvVideoStream));
}

int QvUtil::suggestRates(const QvEncodePipe* pipe, double seconds, double bytes, double& video,
                         double& audio) {
    const double all = budget(seconds, bytes);
    if (getRates(pipe, video, audio) != 0) return -1;
    const int videoStreams = pipe->nrStreams(qvVideoStream), audioStreams = pipe->nrStreams(qvAudioStream);
    const double forAudio = videoStreams == 0 ? all : std::min(audio, all * mostForAudio);
    audio = audioStreams == 0 ? 0 : forAudio / audioStreams;
    video = videoStreams == 0 ? 0 : (all - forAudio) / videoStreams;
    return all > 0 ? 0 : -1;
}

Any QvUtil::codecStructParam(const QvCodec* codec, const char* field) {
    if (!codec || !field) return Any();
    const Any settings = codec->getParam("settings");
    return settings.isDict() ? settings.asDict().get(field) : Any();
}
