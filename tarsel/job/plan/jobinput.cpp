#include "tarsel/job/plan/jobinput.h"

#include <algorithm>

QvRatio InputStream::rate() const {
    return type == qvVideoStream ? picture.rate.rate() : QvRatio(sound.samplerate, 1);
}

std::optional<QvFramerate> JobInput::frameRate() const {
    if (video.empty()) return std::nullopt;
    return video.front().picture.rate;
}

JobInput readInput(const Source& source) {
    JobInput input;
    input.name = source.name();
    input.damage = source.damage();
    input.duration = source.duration();
    QvDecodePipe& decoder = source.decoder();
    for (int i = 0; i < decoder.nrStreams(qvVideoStream); ++i) {
        InputStream stream;
        stream.units = decoder.nrFrames(i);
        stream.picture = pictureFormat(source, i);
        input.video.push_back(stream);
    }
    for (int i = 0; i < decoder.nrStreams(qvAudioStream); ++i) {
        const auto ask = [&](const char* name) { return decoder.getAudioParam(i, name).asInt32(0); };
        InputStream stream;
        stream.type = qvAudioStream;
        // Of a join these are with the silence that fills segments.
        stream.units = decoder.getAudioParam(i, "samples").asInt64(decoder.nrSamples(i));
        // A mix has 32 bits, of which 24 are used.
        stream.sound = {ask("samplerate"), ask("channels"), std::min(ask("bitsPerSample"), 24)};
        input.audio.push_back(stream);
    }
    return input;
}
