#include "tarsel/job/plan/jobinput.h"

#include <algorithm>

#include "tarsel/source/wavwords.h"
#include "tarsel/words/xmlnames.h"

QvRatio InputStream::rate() const {
    return type == qvVideoStream ? picture.rate.rate() : QvRatio(sound.samplerate, 1);
}

std::optional<QvFramerate> JobInput::frameRate() const {
    if (video.empty()) return std::nullopt;
    return video.front().picture.rate;
}

namespace {

void readWords(const QvDecodePipe& decoder, int type, int number, InputStream& stream) {
    const auto word = [&](const char* name) {
        const Any text = decoder.getStreamParam(type, number, name);
        const std::string found = text.isText() ? text.toString().asString("") : "";
        return xmlKeeps(found) ? found : "";
    };
    stream.language = word("language");
    stream.title = word("title");
}

}  // namespace

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
        readWords(decoder, qvVideoStream, i, stream);
        input.video.push_back(stream);
    }
    for (int i = 0; i < decoder.nrStreams(qvAudioStream); ++i) {
        const auto ask = [&](const char* name) { return decoder.getAudioParam(i, name).asInt32(0); };
        InputStream stream;
        stream.type = qvAudioStream;
        // In a join this count includes the silence that fills segments.
        stream.units = decoder.getAudioParam(i, "samples").asInt64(decoder.nrSamples(i));
        // The sound of a mix has 32 bits; 24 of them are significant.
        stream.sound = {ask("samplerate"), ask("channels"), std::min(ask("bitsPerSample"), 24)};
        readWords(decoder, qvAudioStream, i, stream);
        input.audio.push_back(stream);
    }
    const auto& codec = static_cast<const QvCodec&>(decoder);
    const Any meta = codec.getParam("meta"), chunks = codec.getParam("chunks");
    if (meta.isDict())
        input.meta = meta.asDict();
    else if (chunks.isVector())
        input.meta = wavWords(chunks.asVector());
    return input;
}
