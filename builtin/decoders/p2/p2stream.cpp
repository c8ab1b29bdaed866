#include "builtin/decoders/p2/p2stream.h"

#include <algorithm>

#include "core/engine/status.h"
#include "core/measure/exactmath_p.h"
#include "core/measure/qvgeometry.h"

namespace {

std::string valueText(const Any& value) {
    if (value.isInt()) return std::to_string(value.toInt64());
    if (!value.isFramerate()) return value.toString().asString("nothing");
    const QvRatio& rate = value.asFramerate().rate();
    return std::to_string(rate.num) + "/" + std::to_string(rate.den) +
           (value.asFramerate().interlaced() ? " interlaced" : "");
}

// What the parts of a stream have in common, with its name for people.
struct Common {
    const char* key;
    const char* name;
};
constexpr Common pictureKeys[] = {
    {"width", "width"}, {"height", "height"}, {"FOURCC", "pixel format"}, {"framerate", "frame rate"}};
constexpr Common soundKeys[] = {
    {"samplerate", "sample rate"}, {"channels", "number of channels"}, {"bytesPerSample", "sample size"}};

template <std::size_t Count>
std::string difference(const Common (&keys)[Count], const AnyDict& first, const AnyDict& other) {
    for (const Common& common : keys)
        if (valueText(first.get(common.key)) != valueText(other.get(common.key)))
            return std::string("its ") + common.name + " is " + valueText(other.get(common.key)) + ", not " +
                   valueText(first.get(common.key)) + " as of the part before it";
    return "";
}

}  // namespace

const char* P2Stream::lengthKey() const { return type_ == qvVideoStream ? "frames" : "samples"; }

const char* P2Stream::expectedKey() const {
    return type_ == qvVideoStream ? "framesExpected" : "samplesExpected";
}

// Marks a part that ends before the length that it is said to have. Sound may end within the last unit.
void P2Stream::compare(Part& part, const P2Length& said) const {
    if (part.params.get("truncated").isTrue()) return;  // its decoder knows
    const bool video = type_ == qvVideoStream;
    const QvRatio rate = video ? part.params.get("framerate").asFramerate().rate()
                               : QvRatio(part.params.getInt32("samplerate"), 1);
    const auto places = [&](long long units) {
        return qvmath::mulDiv(units, said.num, rate.num, 1LL * said.den * rate.den);
    };
    const long long expected = places(said.count);
    if (part.length + (video ? 0 : places(1)) >= expected) return;
    part.params.set("truncated", Any(1));
    part.params.set(expectedKey(), Any(expected));
}

std::string P2Stream::append(std::unique_ptr<QvDecodePipe> decoder, const P2Length& said) {
    const bool video = type_ == qvVideoStream;
    if (decoder->nrStreams(type_) == 0) return video ? "it has no picture" : "it has no sound";
    Part part;
    decoder->getStreamParams(type_, 0, part.params);
    const AnyDict& params = part.params;
    if (video && (!params.get("framerate").isFramerate() || params.getInt32("width") < 1 ||
                  params.get("framerate").asFramerate().rate().ratio() <= 0))
        return "the format of its picture is not known";
    if (!video && (params.getInt32("samplerate") < 1 || params.getInt32("channels") < 1 ||
                   params.getInt32("bytesPerSample") < 1))
        return "the format of its sound is not known";
    if (!parts_.empty()) {
        const AnyDict& first = parts_.front().params;
        const std::string other =
            video ? difference(pictureKeys, first, params) : difference(soundKeys, first, params);
        if (!other.empty()) return other;
    }
    part.start = length();
    part.length = std::max<long long>(video ? decoder->nrFrames(0) : decoder->nrSamples(0), 0);
    compare(part, said);
    part.decoder = std::move(decoder);
    parts_.push_back(std::move(part));
    return "";
}

void P2Stream::alignTo(const P2Stream& picture) {
    const QvRatio rate = picture.parts_.front().params.get("framerate").asFramerate().rate();
    const int samplerate = parts_.front().params.getInt32("samplerate");
    for (std::size_t i = 0; i < parts_.size(); ++i) {
        const Part& frames = picture.parts_[i];
        const auto sampleAt = [&](long long frame) {
            return qvmath::mulDiv(frame, samplerate, rate.den, rate.num);
        };
        parts_[i].start = sampleAt(frames.start);
        if (i + 1 < parts_.size())
            parts_[i].length = sampleAt(frames.start + frames.length) - parts_[i].start;
    }
}

long long P2Stream::length() const { return parts_.empty() ? 0 : parts_.back().start + parts_.back().length; }

long long P2Stream::bytes() const {
    long long sum = 0;
    for (const Part& part : parts_)
        if (const Any size = part.decoder->QvCodec::getParam("filesize"); size.isInt()) sum += size.toInt64();
    return sum;
}

void P2Stream::describe() {
    const bool video = type_ == qvVideoStream;
    params_ = parts_.front().params;
    long long missing = 0;
    for (const Part& part : parts_) {
        const Any& expected = part.params.get(expectedKey());
        const Any& own = part.params.get(lengthKey());
        if (part.params.get("truncated").isTrue() && expected.isInt() && own.isInt())
            missing += std::max(expected.toInt64() - own.toInt64(), 0LL);
    }
    params_.remove("truncated");
    params_.remove(expectedKey());
    if (missing > 0) {
        params_.set("truncated", Any(1));
        params_.set(expectedKey(), Any(length() + missing));
    }
    if (video) {
        params_.set("frames", Any(static_cast<int>(std::min<long long>(length(), 0x7fffffff))));
        params_.set("duration", Any(static_cast<double>(length()) /
                                    params_.get("framerate").asFramerate().rate().ratio()));
    } else {
        params_.set("samples", Any(length()));
        params_.set("duration", Any(static_cast<double>(length()) / params_.getInt32("samplerate")));
    }
}

int P2Stream::fail(int code, const std::string& text) {
    failure_ = text;
    return code;
}

int P2Stream::select() {
    for (Part& part : parts_)
        if (const int result = part.decoder->select(type_, 0); result != QvStatus::ok)
            return fail(result, part.decoder->errorDesc());
    selected_ = true;
    return QvStatus::ok;
}

int P2Stream::deselect() {
    selected_ = false;
    for (Part& part : parts_) part.decoder->deselect(type_, 0);
    return QvStatus::ok;
}

// At the end of a part the next one begins at its start.
int P2Stream::enterPart() {
    while (at_ + 1 < parts_.size() && position_ >= parts_[at_ + 1].start) {
        ++at_;
        if (parts_[at_].length == 0) continue;
        QvDecodePipe& next = *parts_[at_].decoder;
        const int result = type_ == qvVideoStream ? next.seekToFrame(0, 0) : next.seekToSample(0, 0);
        if (result != QvStatus::ok) return fail(QvStatus::failed, next.errorDesc());
    }
    return QvStatus::ok;
}

int P2Stream::readFrame() {
    // A decoder may count by the number in its frame.
    if (frame_) frame_->frameNr = ownNumber_;
    frame_ = nullptr;
    if (position_ >= length()) return QvStatus::endOfStream;
    if (const int result = enterPart(); result != QvStatus::ok) return result;
    const Part& part = parts_[at_];
    const int result = part.decoder->readFrame(0);
    if (result == QvStatus::endOfStream) return fail(QvStatus::failed, "it ends before its last frame");
    if (result != QvStatus::ok) return fail(result, part.decoder->errorDesc());
    frame_ = part.decoder->getFramePtr(0);
    if (!frame_) return fail(QvStatus::failed, "its decoder gave no frame");
    ownNumber_ = frame_->frameNr;
    frame_->frameNr = static_cast<int>(position_);
    ++position_;
    return QvStatus::ok;
}

// Appends `count` samples of the part, and silence where it has fewer: `left` of it are to come.
int P2Stream::readPiece(int count, long long left) {
    QvDecodePipe& decoder = *parts_[at_].decoder;
    const int wanted = static_cast<int>(std::clamp<long long>(left, 0, count));
    const int read = wanted > 0 ? decoder.readSamples(wanted, 0) : 0;
    if (read < 0 && read != QvStatus::endOfStream) return fail(read, decoder.errorDesc());
    const QvPcm* from = read > 0 ? decoder.getAudioPtr(0) : nullptr;
    const int given = from ? std::min({read, from->samples(), wanted}) : 0;
    if (given > 0 &&
        (from->channels() != joined_.channels() || from->bytesPerSample() != joined_.bytesPerSample()))
        return fail(QvStatus::failed, "the format of its sound changed");
    if ((given > 0 && joined_.write(given, from->ptr(0)) != QvStatus::ok) ||
        joined_.addSilence(count - given) != QvStatus::ok)
        return fail(QvStatus::outOfMemory, "no memory for its samples");
    return QvStatus::ok;
}

int P2Stream::readSamples(int count) {
    count = static_cast<int>(std::clamp<long long>(length() - position_, 0, std::max(count, 0)));
    if (count == 0) return QvStatus::endOfStream;
    if (const int result = enterPart(); result != QvStatus::ok) return result;
    const auto samplesLeft = [this] {
        return parts_[at_].decoder->nrSamples(0) - (position_ - parts_[at_].start);
    };
    if (parts_.size() == 1) {
        const int read = parts_[0].decoder->readSamples(count, 0);
        if (read < 0) return fail(read, parts_[0].decoder->errorDesc());
        position_ += read;
        return read;
    }
    const AnyDict& format = parts_.front().params;
    if (!joined_.inited() || joined_.size() < count) {
        joined_.destroy();
        if (joined_.init(count, format.getInt32("channels"), format.getInt32("bytesPerSample"),
                         format.getInt32("samplerate")) != QvStatus::ok)
            return fail(QvStatus::outOfMemory, "no memory for its samples");
    }
    joined_.setSamples(0);
    for (int missing = count; missing > 0;) {
        if (const int result = enterPart(); result != QvStatus::ok) return result;
        const long long end = parts_[at_].start + parts_[at_].length;
        const int piece = static_cast<int>(std::min<long long>(missing, end - position_));
        if (const int result = readPiece(piece, samplesLeft()); result != QvStatus::ok) return result;
        position_ += piece;
        missing -= piece;
    }
    joined_.setPosition(position_);
    return count;
}

// The same buffer for all reads: callers may ask for it once.
QvPcm* P2Stream::pcm() { return parts_.size() == 1 ? parts_[0].decoder->getAudioPtr(0) : &joined_; }

int P2Stream::seek(long long place) {
    if (place < 0 || place >= length()) return QvStatus::endOfStream;
    std::size_t part = parts_.size() - 1;
    while (part > 0 && place < parts_[part].start) --part;
    if (frame_) frame_->frameNr = ownNumber_;
    frame_ = nullptr;
    QvDecodePipe& decoder = *parts_[part].decoder;
    const long long own = place - parts_[part].start;
    const bool video = type_ == qvVideoStream;
    // Silence at the end of a part is nowhere in its file.
    if (video || own < decoder.nrSamples(0)) {
        const int result = video ? decoder.seekToFrame(own, 0) : decoder.seekToSample(own, 0);
        if (result != QvStatus::ok) return fail(QvStatus::failed, decoder.errorDesc());
    }
    at_ = part;
    position_ = place;
    return QvStatus::ok;
}
