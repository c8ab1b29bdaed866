#include "plugins/av/decoder/filmstreams.h"

#include <algorithm>
#include <climits>

#include "core/engine/status.h"
#include "core/media/qvframe.h"
#include "plugins/av/decoder/filmfacts.h"
#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/limits.h"

namespace av {

namespace {

void setText(const AVDictionary* tags, const char* tag, const char* key, AnyDict& params) {
    const AVDictionaryEntry* const entry = av_dict_get(tags, tag, nullptr, 0);
    if (entry && entry->value && *entry->value) params.set(key, Any(entry->value));
}

}  // namespace

void describeStream(const AVStream& stream, AnyDict& params) {
    const AVDictionaryEntry* const language = av_dict_get(stream.metadata, "language", nullptr, 0);
    if (language && std::string(language->value) != "und")
        setText(stream.metadata, "language", "language", params);
    const AVCodecParameters& codec = *stream.codecpar;
    if (const char* profile = avcodec_profile_name(codec.codec_id, codec.profile))
        params.set("codecProfile", Any(profile));
    setText(stream.metadata, "title", "title", params);
    if (stream.id > 0) params.set("codecParams", AnyDict("pid", stream.id));
}

PictureStream::PictureStream(std::unique_ptr<PictureSource> reader, const AVStream* stream)
    : reader_(std::move(reader)) {
    const PictureFormat& format = reader_->format();
    params.set("FOURCC", format.fourcc);
    params.set("width", format.width);
    params.set("height", format.height);
    params.set("framerate", Any(format.rate));
    params.set("pixelAspect", format.pixelAspect);
    params.set("frameAspect", format.pixelAspect * format.width / format.height);
    params.set("frames", format.frames);
    params.set("duration", format.frames / format.rate.rate().ratio());
    params.set("codec", Any(format.codec.c_str()));
    params.set("videoCodec", Any(format.codec.c_str()));
    params.set("pal", format.rate.isPAL() ? 1 : 0);
    params.set("nrViews", 1);
    if (format.bitrate > 0) params.set("vBitrate", format.bitrate);
    if (format.turn.clockwise != 0) params.set("rotation", format.turn.clockwise);
    if (format.turn.mirrored) params.set("mirrored", 1);
    if (format.colourMatrix != 0) params.set("colourMatrix", format.colourMatrix);
    if (format.primaries != 0) params.set("colourPrimaries", format.primaries);
    if (format.transfer != 0) params.set("colourTransfer", format.transfer);
    if (format.space != 0) params.set("colourSpace", format.space);
    if (format.variable) params.set("variableRate", 1);
    if (!format.lost.empty()) params.set("conversion", Any(format.lost.c_str()));
    if (stream) describeStream(*stream, params);
}

bool PictureStream::seek(long long frame) {
    if (frame < 0 || frame > reader_->format().frames || !reader_->seek(static_cast<int>(frame)))
        return false;
    next_ = frame;
    return true;
}

MediaTime PictureStream::shownAt() const {
    return MediaTime(std::max(next_ - 1, 0LL), reader_->format().rate, MediaTime::defaultTimescale);
}

int PictureStream::read() {
    switch (reader_->read()) {
        case FrameReader::Read::end: return QvStatus::endOfStream;
        case FrameReader::Read::failed: return QvStatus::cannotParse;
        case FrameReader::Read::picture: break;
    }
    ++next_;
    if (reader_->concealed() != concealed_) {
        concealed_ = reader_->concealed();
        params.set("concealed", Any(static_cast<long long>(concealed_)));
    }
    return QvStatus::ok;
}

void PictureStream::setTruncated(long long expected) {
    if (expected <= reader_->format().frames) return;
    params.set("truncated", 1);
    params.set("framesExpected", Any(expected));
}

void PictureStream::setLost(long long pictures) {
    params.set("truncated", 1);
    params.set("framesLost", Any(pictures));
    params.set("framesExpected", reader_->format().frames);
}

void PictureStream::setEstimated(long long frames) {
    frames = std::clamp<long long>(frames, reader_->format().frames, limits::frames);
    params.set("frames", static_cast<int>(frames));
    params.set("duration", static_cast<double>(frames) / reader_->format().rate.rate().ratio());
    params.set("estimated", 1);
}

SoundStream::SoundStream(std::unique_ptr<SampleReader> reader, const AVStream& stream)
    : reader_(std::move(reader)) {
    const SoundFormat& format = reader_->format();
    const int bytes = format.bits / 8;
    params.set("samplerate", format.samplerate);
    params.set("channels", format.channels);
    params.set("bitsPerSample", format.bits);
    params.set("bytesPerSample", bytes);
    params.set("samples", Any(format.samples));
    params.set("duration", static_cast<double>(format.samples) / format.samplerate);
    params.set("codec", Any(format.codec.c_str()));
    if (format.bitrate > 0) params.set("aBitrate", format.bitrate);
    if (!format.lost.empty()) params.set("conversion", Any(format.lost.c_str()));
    if (format.mask != 0) params.set("channelMask", Any(static_cast<long long>(format.mask)));
    describeStream(stream, params);
    const AVCodecID codec = stream.codecpar->codec_id;
    if (codec == AV_CODEC_ID_AC3 || codec == AV_CODEC_ID_EAC3) {
        // What the engine connects channels and encoders by.
        params.set("codec", "Dolby");
        params.set("codecProfile", Any(format.codec.c_str()));
        params.set("dolby", Any(speakerPlaces(*stream.codecpar)));
    }
    pcm = std::make_unique<QvPcm>();
    pcm->init(0, format.channels, bytes, format.samplerate);
}

int SoundStream::read(int count) {
    const long long left = reader_->format().samples - position_;
    const long long most = INT_MAX / std::max(pcm->channels() * pcm->bytesPerSample(), 1);
    count = static_cast<int>(std::min<long long>({count, left, most}));
    pcm->setSamples(0);
    if (count <= 0) return QvStatus::endOfStream;
    if (count > pcm->size() && pcm->grow(count - pcm->size()) < 0) return QvStatus::outOfMemory;
    const int got = reader_->read(*pcm, count);
    if (got < 0) return QvStatus::cannotParse;
    position_ += got;
    pcm->setPosition(position_);
    if (reader_->concealed() != concealed_) {
        concealed_ = reader_->concealed();
        params.set("concealed", Any(concealed_));
    }
    return got > 0 ? got : QvStatus::endOfStream;
}

bool SoundStream::seek(long long sample) {
    if (sample < 0 || !reader_->seek(std::min(sample, reader_->format().samples))) return false;
    position_ = sample;
    pcm->setSamples(0);
    pcm->setPosition(sample);
    return true;
}

void SoundStream::setTruncated(long long expected) {
    if (expected <= reader_->format().samples) return;
    params.set("truncated", 1);
    params.set("samplesExpected", Any(expected));
}

void SoundStream::setEstimated(long long samples) {
    samples = std::max(samples, reader_->format().samples);
    params.set("samples", Any(samples));
    params.set("duration", static_cast<double>(samples) / reader_->format().samplerate);
    params.set("estimated", 1);
}

SubtitleStream::SubtitleStream(std::unique_ptr<SubtitleReader> reader, const AVStream& stream, bool counted)
    : DPipeStream(qvSubpicStream), reader_(std::move(reader)) {
    params.set("type", 1);
    params.set("format", static_cast<int>(QvSubtitles::SRT));
    if (counted) params.set("count", reader_->count());
    params.set("encoding", 0);
    params.set("codec", SubtitleReader::codecName(stream));
    params.set("textEncoding", "UTF-8");
    describeStream(stream, params);
    if (!counted || reader_->count() == 0) return;
    params.set("first", reader_->first());
    params.set("last", reader_->last());
    params.set("duration", reader_->last() - reader_->first());
    params.set("end", reader_->end());
}

}  // namespace av
