#include <cstddef>

#include "core/decode/qvdecoder.h"
#include "core/transcode/batch/sourcefacts_p.h"

namespace {

int placeOf(int type) { return type == qvVideoStream ? 0 : type == qvAudioStream ? 1 : 2; }

}  // namespace

SourceFacts::SourceFacts(QvDecodePipe& decoder)
    : name(decoder.name()), filename(decoder.QvCodec::getParam("filename")) {
    decoder.store(stored);
    for (const int type : {qvVideoStream, qvAudioStream, qvSubpicStream})
        for (int i = 0; i < decoder.nrStreams(type); ++i) {
            Stream& made = streams_[placeOf(type)].emplace_back();
            decoder.getStreamParams(type, i, made.params);
            made.selected = decoder.isSelected(type, i);
            made.readsUserData = decoder.readUserData(type, i);
            if (type == qvSubpicStream) continue;
            made.units = type == qvVideoStream ? decoder.nrFrames(i) : decoder.nrSamples(i);
            made.duration = decoder.duration(type, i);
        }
}

const std::vector<SourceFacts::Stream>& SourceFacts::of(int type) const {
    static const std::vector<Stream> none;
    const bool known = type == qvVideoStream || type == qvAudioStream || type == qvSubpicStream;
    return known ? streams_[placeOf(type)] : none;
}

const SourceFacts::Stream* SourceFacts::stream(int type, int number) const {
    const auto& all = of(type);
    return number >= 0 && static_cast<std::size_t>(number) < all.size()
               ? &all[static_cast<std::size_t>(number)]
               : nullptr;
}
