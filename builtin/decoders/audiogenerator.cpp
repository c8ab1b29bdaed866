#include "builtin/decoders/audiogenerator.h"

#include <algorithm>
#include <cstring>
#include <memory>

#include "core/arch/qvassert.h"
#include "core/engine/status.h"
#include "core/media/qvsoundbytes.h"

int SoundLoop::init(const QvPcm& sound, int length, long long total) {
    *this = SoundLoop();
    const int result = sound_.init(length, sound.channels(), sound.bytesPerSample(), sound.samplerate());
    if (result != QvStatus::ok) return result;
    const int count = std::min(length, sound.samples());
    if (count > 0)
        std::memcpy(sound_.ptr(0), sound.ptr(0), static_cast<std::size_t>(sound_.samples2bytes(count)));
    length_ = length;
    total_ = total;
    return QvStatus::ok;
}

void SoundLoop::seek(long long sample) {
    delivered_ = sample;
    position_ = static_cast<int>(sample % length_);
}

void SoundLoop::copy(unsigned char* to, int count) {
    delivered_ += count;
    while (count > 0) {
        const int run = std::min(count, length_ - position_);
        const auto bytes = static_cast<std::size_t>(sound_.samples2bytes(run));
        std::memcpy(to, sound_.ptr(position_), bytes);
        to += bytes;
        count -= run;
        position_ = (position_ + run) % length_;
    }
}

// Of silence. Samples of one byte have none that is 0 in all formats.
int AudioGenerator::takeFormat(const AnyDict& dict, QvPcmFormat& format) {
    constexpr int mostRate = 768000, mostChannels = 64;
    format.samplerate = dict.getInt32("samplerate", format.samplerate);
    format.channels = dict.getInt32("channels", format.channels);
    format.bitsPerSample = dict.getInt32("bitsPerSample", format.bitsPerSample);
    const bool known =
        format.samplerate >= 1 && format.samplerate <= mostRate && format.channels >= 1 &&
        format.channels <= mostChannels &&
        (format.bitsPerSample == 16 || format.bitsPerSample == 24 || format.bitsPerSample == 32);
    return known ? QvStatus::ok : QvStatus::invalidStructure;
}

int AudioGenerator::init(const AnyDict& dict) {
    QvPcmFormat format;
    QvSoundBytes::getInfo(0, nullptr, &format);
    const bool silent = dict["content"] == "silence";
    if (silent && takeFormat(dict, format) != QvStatus::ok) return QvStatus::invalidStructure;
    samplerate_ = format.samplerate;
    channels_ = format.channels;
    const int bytesPerSample = (format.bitsPerSample + 7) / 8;
    QV_ASSERT_MSG(takeDuration(dict, "samples", samplerate_), "testgen: duration not set");
    params.set("codec", Any("PCM"));
    params.set("samplerate", Any(samplerate_));
    params.set("channels", Any(channels_));
    params.set("bitsPerSample", Any(format.bitsPerSample));
    params.set("bytesPerSample", Any(bytesPerSample));
    countSamples();

    std::unique_ptr<QvPcm> sound(silent ? new QvPcm : QvSoundBytes::create(0));
    // Of a sound without samples the loop is silence.
    if (silent)
        if (const int result = sound->init(1, channels_, bytesPerSample, samplerate_); result != QvStatus::ok)
            return result;
    const int length = static_cast<int>(std::min<long long>(samples_, samplerate_));
    if (!sound) return QvStatus::failed;
    if (const int result = loop_.init(*sound, length, samples_); result != QvStatus::ok) return result;
    return output_.init(samplerate_, channels_, bytesPerSample, samplerate_);
}

void AudioGenerator::close() {
    loop_ = SoundLoop();
    output_.destroy();
    samples_ = 0;
    duration = MediaTime();
    params.clear();
}

void AudioGenerator::countSamples() {
    samples_ = std::max(duration.position(samplerate_), 0LL);
    params.set("duration", Any(duration.seconds()));
    params.set("samples", Any(samples_));
}

void AudioGenerator::setDuration(const MediaTime& length) {
    duration = length;
    countSamples();
    loop_.setTotal(samples_);
}

int AudioGenerator::readSamples(int count) {
    count = static_cast<int>(std::clamp<long long>(count, 0, std::max(loop_.left(), 0LL)));
    if (loop_.left() <= 0) {
        output_.setSamples(0);
        output_.setPosition(loop_.total());
        return QvStatus::endOfStream;
    }
    if (count > output_.size() && output_.grow(count - output_.size()) < 0) return QvStatus::outOfMemory;
    if (count > 0) loop_.copy(output_.ptr(0), count);
    output_.setSamples(count);
    output_.setPosition(output_.position() + count);
    return count;
}

int AudioGenerator::seekToSample(long long sample) {
    QV_ASSERT_MSG(sample >= 0 && sample < loop_.total(), "testgen: seek over end");
    loop_.seek(sample);
    output_.setSamples(0);
    output_.setPosition(sample);
    return QvStatus::ok;
}
