#include "core/transcode/link/audio/audiomuxer.h"

#include "core/decode/qvdecoder.h"
#include "core/encode/qvencoder.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/transcode/link/audio/channelrules_p.h"

namespace {

Any streamParam(const QvDecodePipe& decoder, int stream, const char* name) {
    return decoder.getParam(Any::sprintf("audio%d/%s", stream, name).asString());
}

int firstSelectedStream(const QvDecodePipe& decoder) {
    for (int i = 0; i < decoder.nrAudioStreams(); ++i)
        if (decoder.isSelected(qvAudioStream, i)) return i;
    return -1;
}

Any channelEntry(int channel) { return AnyDict("channel", channel); }

}  // namespace

int AudioMuxer::init(QvDecodePipe* decoder, QvAudioEncoder* encoder, int outChannels, const AnyVector* matrix,
                     int stream) {
    matrix_.clear();
    decoder_ = decoder;
    encoder_ = encoder;
    if (!decoder || !encoder) {
        qv_dbg()->log(QvLogMask::error, "[AudioMuxer]::init - error no decoder or encoder");
        return QvStatus::failed;
    }
    decStream_ = stream >= 0 ? stream : firstSelectedStream(*decoder);
    if (decStream_ < 0) {
        qv_dbg()->log(QvLogMask::error, "[AudioMuxer]::init - error no decoder stream selected");
        return QvStatus::failed;
    }
    decCodec_ = streamParam(*decoder, decStream_, "codec");
    encName_ = encoder->name();
    inChannels_ = streamParam(*decoder, decStream_, "channels").asInt32(0);
    outChannels_ = outChannels;
    if (!matrix) {
        setPassthrough();
        return QvStatus::ok;
    }
    if (matrix->size() != outChannels) {
        qv_dbg()->log(QvLogMask::error,
                      "[AudioMuxer]::init - error nr out channels is %d, and conn marix size is %d",
                      outChannels, matrix->size());
        return QvStatus::failed;
    }
    matrix_ = *matrix;
    return QvStatus::ok;
}

void AudioMuxer::connect(int inChannel, int outChannel) {
    if (outChannel < 0 || outChannel >= matrix_.size()) {
        qv_dbg()->log(QvLogMask::error,
                      "Connection matrix error, output channel %d >= nr of output channels %d", outChannel,
                      matrix_.size());
        return;
    }
    if (isConnected(inChannel, outChannel)) return;
    Any& entry = matrix_.at(outChannel);
    if (!entry.isVector()) entry = entry.isDict() ? AnyVector(entry) : AnyVector();
    entry.asVector().append(channelEntry(inChannel));
}

void AudioMuxer::disconnect(int inChannel, int outChannel) {
    if (outChannel < 0 || outChannel >= matrix_.size() || !matrix_.at(outChannel).isVector()) return;
    AnyVector& sources = matrix_.at(outChannel).asVector();
    for (int i = sources.size() - 1; i >= 0; --i)
        if (sources.at(i).isDict() && sources.at(i).asDict().getInt32("channel", -1) == inChannel)
            sources.remove(i);
}

bool AudioMuxer::isConnected(int inChannel, int outChannel) const {
    return connectedTo(outChannel).contains(Any(inChannel));
}

AnyVector AudioMuxer::connectedTo(int outChannel) const {
    AnyVector channels;
    const Any& entry = matrix_.at(outChannel);
    const AnyVector sources = entry.isVector() ? entry.asVector() : AnyVector(entry);
    for (const Any& source : sources)
        if (source.isDict() && source.asDict().get("channel").isInt32())
            channels.append(source.asDict().get("channel"));
    return channels;
}

void AudioMuxer::setPassthrough() {
    matrix_.clear();
    for (int i = 0; i < outChannels_; ++i) matrix_.append(AnyVector());
    qvchannels::Layout layout;
    layout.codec = decCodec_.asString("");
    if (encoder_) layout.target = qvModuleTraits(*encoder_).family;
    layout.inChannels = inChannels_;
    layout.outChannels = outChannels_;
    const Any dolby = decoder_ ? streamParam(*decoder_, decStream_, "dolby") : Any();
    if (dolby.isDict()) layout.dolby = &dolby.asDict();
    for (const auto& connection : qvchannels::connections(layout)) connect(connection.in, connection.out);
}
