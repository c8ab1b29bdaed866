#include "tarsel/source/joinedsound.h"

#include <algorithm>
#include <cstring>
#include <new>

namespace {

// Values of `from` bytes as the upper ones of `to`. One byte is unsigned, more are signed.
void place(unsigned char* out, int to, int outStep, const unsigned char* in, int from, int inStep,
           int count) {
    const unsigned char turn = from == 1 && to > 1 ? 0x80 : 0;
    for (int i = 0; i < count; ++i, out += outStep, in += inStep) {
        std::memset(out, 0, static_cast<size_t>(to - from));
        std::memcpy(out + to - from, in, static_cast<size_t>(from));
        out[to - 1] ^= turn;
    }
}

}  // namespace

JoinedSound::JoinedSound(const std::vector<Part>& parts) : parts_(parts) {
    for (const Part& part : parts) {
        const auto ask = [&](const char* name) {
            return part.decoder->getAudioParam(part.stream, name).asInt32(0);
        };
        first_.push_back(channels_);
        channels_ += ask("channels");
        bytes_ = std::max(bytes_, (ask("bitsPerSample") + 7) / 8);
        rate_ = ask("samplerate");
        samples_ = std::max(samples_, part.decoder->nrSamples(part.stream));
    }
    params_ = AnyDict("samplerate", rate_, "channels", channels_, "bitsPerSample", 8 * bytes_, "samples",
                      samples_, "codec", "PCM");
    params_.set("duration", static_cast<double>(samples_) / std::max(rate_, 1));
    QvDecodePipe::init();
    QvDecodePipe::open();
}

int JoinedSound::setParam(const char* name, const Any& value) {
    int result = QvStatus::ok;
    for (const Part& part : parts_)
        if (const int status = part.decoder->setParam(name, value); result == QvStatus::ok) result = status;
    return result;
}

void JoinedSound::getStreamParams(int type, int, AnyDict& params) const {
    params.clear();
    if (type != qvAudioStream) return;
    params = params_;
    long long clipped = 0;
    for (const Part& part : parts_)
        if (const Any own = part.decoder->getAudioParam(part.stream, "clippedSamples"); own.isInt())
            clipped += own.toInt64();
    if (clipped > 0) params.set("clippedSamples", Any(clipped));
}

int JoinedSound::selected(AnyDict& dict) const {
    dict.set("video", AnyVector());
    dict.set("audio", AnyVector(Any(0)));
    return QvStatus::ok;
}

int JoinedSound::seekToSample(long long sample, int) {
    pcm_.setSamples(0);
    position_ = sample;
    for (const Part& part : parts_) {
        const long long own = std::min(sample, part.decoder->nrSamples(part.stream));
        if (const int result = part.decoder->seekToSample(own, part.stream); result != QvStatus::ok)
            return result;
    }
    return QvStatus::ok;
}

bool JoinedSound::makeRoom(int count) {
    if (pcm_.inited() && pcm_.size() >= count) return true;
    return pcm_.init(count, channels_, bytes_, rate_) == QvStatus::ok;
}

int JoinedSound::readSamples(int count, int) {
    count = static_cast<int>(std::min<long long>(count, samples_ - position_));
    pcm_.setSamples(0);
    if (count < 1) return QvStatus::endOfStream;
    if (!makeRoom(count)) return setError(QvStatus::outOfMemory, "no memory for %d samples", count);
    if (const int result = pcm_.addSilence(count)) return result;
    for (size_t i = 0; i < parts_.size(); ++i) {
        const int result = parts_[i].decoder->readSamples(count, parts_[i].stream);
        if (result < 0 && result != QvStatus::endOfStream)
            return setError(result, "%s", parts_[i].decoder->errorDesc());
        const long long due = parts_[i].decoder->nrSamples(parts_[i].stream) - position_;
        if (std::max(result, 0) < std::min<long long>(count, due))
            return setError(QvStatus::failed, "a sound ended before its length");
        const QvPcm* in = parts_[i].decoder->getAudioPtr(parts_[i].stream);
        if (result < 1 || !in || in->samples() < 1) continue;
        const int got = std::min(count, in->samples()), from = in->bytesPerSample();
        for (int channel = 0; channel < in->channels(); ++channel)
            place(pcm_.ptr(0) + ptrdiff_t{first_[i] + channel} * bytes_, bytes_, channels_ * bytes_,
                  in->ptr(0) + ptrdiff_t{channel} * from, from, in->channels() * from, got);
    }
    position_ += count;
    pcm_.setPosition(position_);
    return count;
}
