#include "plugins/av/picture/framereader.h"

#include <algorithm>
#include <optional>
#include <utility>

#include "core/measure/mediatime.h"
#include "core/media/qvframe.h"
#include "plugins/av/picture/decodedpictures.h"
#include "plugins/av/picture/picturecaptions.h"
#include "plugins/av/picture/pictureform.h"
#include "plugins/av/picture/picturetimes.h"
#include "plugins/av/picture/pictureturner.h"
#include "plugins/av/picture/picturewords.h"
#include "plugins/av/source/limits.h"

namespace av {

namespace {

constexpr std::size_t notShown = static_cast<std::size_t>(-1);
// The longest time for which a picture can stay. A longer step is a jump of the clock, as where recordings
// were joined.
constexpr int longestStepOfBroadcast = 10;  // seconds
constexpr int longestStepOfFile = 30 * 60 * 60;
constexpr int mostStarts = 8;  // failed starts for one picture; then only the first packet is tried

// Whether B-frames are always shown as soon as they are decoded, so that the order of presentation follows
// from the order of decoding.
bool hasSimpleReordering(AVCodecID codec) {
    return codec == AV_CODEC_ID_MPEG1VIDEO || codec == AV_CODEC_ID_MPEG2VIDEO || codec == AV_CODEC_ID_MPEG4 ||
           codec == AV_CODEC_ID_VC1;
}

Rational rational(AVRational r) { return {r.num, r.den}; }

}  // namespace

// Decodes the pictures by number. The presentation number counts them in the order in which they are shown,
// from 0; packets are numbered as in the index, in decoding order.
class FrameReader::Decoding {
  public:
    explicit Decoding(std::unique_ptr<DecodedPictures> source)
        : source_(std::move(source)), held_(av_frame_alloc()), coming_(av_frame_alloc()) {}

    bool begin(bool holes, std::string& reason);
    // On success picture() is the one of that presentation number, or the last one before it if it can't be
    // decoded.
    Read show(std::size_t wanted, std::string& failure);
    const AVFrame& picture() const { return *held_; }
    const AVFrame& first() const { return *coming_; }  // after begin()
    // Of picture 0, in units of the stream's time base.
    std::int64_t firstTime() const { return hasTimes() ? pictures_.front().time : 0; }
    // Whether the reader's frame already has the picture, as when it is shown again.
    bool isWritten() const { return written_ == heldNumber_; }
    bool shows(std::size_t number) const { return heldNumber_ == number; }
    void setWritten() { written_ = heldNumber_; }
    void describe(PictureFormat& format);

    DecodedPictures& source() { return *source_; }
    const std::vector<TimedPicture>& pictures() const { return pictures_; }
    const PicturePlan& plan() const { return plan_; }
    int concealed() const { return concealed_; }
    // The picture as it is delivered; null if it can't be turned.
    const AVFrame* upright(const AVFrame& picture) const { return turner ? turner->turn(picture) : &picture; }
    std::unique_ptr<FormWriter> writer;
    std::unique_ptr<PictureTurner> turner;  // null: as it is coded

  private:
    std::unique_ptr<DecodedPictures> source_;
    std::vector<TimedPicture> pictures_;
    std::vector<std::size_t> number_;  // of a packet: the presentation number of its picture, or notShown
    std::vector<bool> noStart_;  // of a packet: decoding can't start there, even if it is flagged as key
    std::vector<bool> counted_;  // of a presentation number: concealed_ includes it
    PicturePlan plan_;
    FramePtr held_;    // what picture() returns
    FramePtr coming_;  // the picture after it, already decoded
    std::optional<std::size_t> heldNumber_, comingNumber_, written_;
    std::size_t startedAt_ = 0;  // packet
    bool checkStart_ = false;    // the next picture will show whether decoding could start at startedAt_
    bool ended_ = false;
    int concealed_ = 0;

    bool decodeOrder(std::string& reason);
    bool dropSecondFields();
    bool isSecondField(std::size_t packet) const;
    void numberPackets();
    bool findFirst(std::string& reason);
    std::size_t startFor(std::size_t wanted) const;
    bool reach(std::size_t wanted, std::string& failure);
    void dropStart(int& dropped);
    Read advance(std::size_t wanted, int& dropped, std::string& failure);
    Read pull(std::string& failure);
    void conceal(std::size_t number);
    bool hasTimes() const;
};

bool FrameReader::Decoding::hasTimes() const {
    const AVCodecDescriptor* const codec = avcodec_descriptor_get(source_->codec().codec_id);
    if (!codec || !(codec->props & AV_CODEC_PROP_REORDER)) return true;
    const auto& packets = source_->packets();
    const auto untimed = static_cast<std::size_t>(
        std::count_if(packets.begin(), packets.end(),
                      [](const IndexedPacket& packet) { return packet.pts == AV_NOPTS_VALUE; }));
    // Without a container the library has guessed all times if one is missing.
    const bool bare = (source_->container().iformat->flags & AVFMT_GENERIC_INDEX) != 0;
    return untimed == 0 || (!bare && hasSimpleReordering(source_->codec().codec_id));
}

// Without times only the codec knows the order of presentation: decodes the whole stream once to find it.
bool FrameReader::Decoding::decodeOrder(std::string& reason) {
    pictures_.clear();
    while (true) {
        switch (source_->next(*coming_)) {
            case DecodedPictures::Next::picture:
                pictures_.push_back(
                    {static_cast<std::int64_t>(pictures_.size()), DecodedPictures::packetOf(*coming_)});
                break;
            case DecodedPictures::Next::failed: reason = source_->failure(); return false;
            case DecodedPictures::Next::end: return source_->seek(0);
        }
    }
}

bool FrameReader::Decoding::isSecondField(std::size_t packet) const {
    const auto& packets = source_->packets();
    if (packet == 0 || packets[packet].position >= 0 || packets[packet - 1].position < 0) return false;
    return packets[packet].pts == packets[packet - 1].pts + packets[packet - 1].duration;
}

// In transport streams each field of a picture can be a packet of its own, the second without a position in
// the file. Some pictures are decoded to see whether that is so here.
bool FrameReader::Decoding::dropSecondFields() {
    constexpr int enough = 8;  // decoded pictures
    const AVFieldOrder order = source_->stream().codecpar->field_order;
    if (source_->codec().codec_id != AV_CODEC_ID_H264 || order == AV_FIELD_PROGRESSIVE) return true;
    bool any = false;
    for (std::size_t i = 0; i < source_->packets().size() && !any; ++i) any = isSecondField(i);
    if (!any) return true;
    bool fields = true;
    for (int i = 0; i < enough && source_->next(*coming_) == DecodedPictures::Next::picture; ++i)
        fields = fields && !isSecondField(DecodedPictures::packetOf(*coming_));
    if (fields)
        std::erase_if(pictures_, [&](const TimedPicture& picture) { return isSecondField(picture.packet); });
    return source_->seek(0);
}

void FrameReader::Decoding::numberPackets() {
    number_.assign(source_->packets().size(), notShown);
    for (std::size_t i = 0; i < pictures_.size(); ++i) number_[pictures_[i].packet] = i;
}

// Drops the pictures before the first decoded one: they need pictures that are not in the file.
bool FrameReader::Decoding::findFirst(std::string& reason) {
    while (!comingNumber_ && !ended_) {
        if (pull(reason) == Read::failed) return false;
        if (source_->position() > static_cast<std::size_t>(limits::silentPackets)) break;
    }
    if (!comingNumber_) {
        reason = "none of its pictures can be decoded";
        return false;
    }
    concealed_ += static_cast<int>(*comingNumber_);
    counted_.erase(counted_.begin(), counted_.begin() + static_cast<std::ptrdiff_t>(*comingNumber_));
    pictures_.erase(pictures_.begin(), pictures_.begin() + static_cast<std::ptrdiff_t>(*comingNumber_));
    numberPackets();
    comingNumber_ = 0;
    return true;
}

bool FrameReader::Decoding::begin(bool holes, std::string& reason) {
    if (!held_ || !coming_) {
        reason = "out of memory";
        return false;
    }
    if (source_->packets().empty()) {
        reason = "its stream of pictures is empty";
        return false;
    }
    const AVStream& stream = source_->stream();
    const Rational base = rational(stream.time_base);
    const AVRational guess = av_guess_frame_rate(&source_->container(), &source_->stream(), nullptr);
    const Rational rate = rational(guess);
    noStart_.assign(source_->packets().size(), false);
    std::vector<Rational> hints = {rational(stream.avg_frame_rate), rate, rational(stream.r_frame_rate)};
    if (hasTimes()) {
        const bool broadcast = (source_->container().iformat->flags & AVFMT_TS_DISCONT) != 0;
        const std::int64_t usual = rate.num > 0 ? av_rescale_q(1, av_inv_q(guess), stream.time_base) : 1;
        const std::int64_t longest =
            base.den * (broadcast ? longestStepOfBroadcast : longestStepOfFile) / base.num;
        pictures_ = presentedPictures(source_->packets(), std::max<std::int64_t>(usual, 1), longest);
        if (!dropSecondFields()) {
            reason = source_->failure();
            return false;
        }
    } else if (!decodeOrder(reason)) {
        return false;
    }
    numberPackets();
    counted_.assign(pictures_.size(), false);
    if (!findFirst(reason)) return false;
    if (hasTimes()) {
        const IndexedPacket& last = source_->packets()[pictures_.back().packet];
        plan_ = planPictures(pictures_, base, hints, last.duration, holes);
    } else {
        const bool known = rate.num > 0;
        plan_ = planPictures(pictures_, known ? Rational{rate.den, rate.num} : Rational{1, 25}, {}, 1);
    }
    return true;
}

void FrameReader::Decoding::conceal(std::size_t number) {
    if (counted_[number]) return;
    counted_[number] = true;
    ++concealed_;
}

// Decodes the next picture that is shown into coming_.
FrameReader::Read FrameReader::Decoding::pull(std::string& failure) {
    comingNumber_.reset();
    while (!ended_) {
        switch (source_->next(*coming_)) {
            case DecodedPictures::Next::failed: failure = source_->failure(); return Read::failed;
            case DecodedPictures::Next::end: ended_ = true; break;
            case DecodedPictures::Next::picture: {
                const std::size_t packet = DecodedPictures::packetOf(*coming_);
                if (packet >= number_.size() || number_[packet] == notShown) continue;
                comingNumber_ = number_[packet];
                bool damaged = source_->isConcealed(*coming_, packet);
                for (std::size_t i = packet + 1; i < number_.size() && number_[i] == notShown; ++i)
                    damaged = damaged || source_->isConcealed(*coming_, i);
                if (damaged) conceal(*comingNumber_);
                return Read::picture;
            }
        }
    }
    return Read::end;
}

// The last packet from which the picture can be decoded as it would be from the start of the stream: a key
// picture that is not shown after it. A picture that follows a key picture in the stream, but is shown before
// it, needs what precedes the key picture.
std::size_t FrameReader::Decoding::startFor(std::size_t wanted) const {
    const auto& packets = source_->packets();
    for (std::size_t i = pictures_[wanted].packet; i > 0; --i)
        if (packets[i].key() && !noStart_[i] && number_[i] != notShown && number_[i] <= wanted) return i;
    return 0;
}

// Prepares to decode up to the wanted picture: continues from here, or seeks to a key picture.
bool FrameReader::Decoding::reach(std::size_t wanted, std::string& failure) {
    const std::size_t start = startFor(wanted);
    const bool ahead = (heldNumber_ && *heldNumber_ <= wanted) || (comingNumber_ && *comingNumber_ <= wanted);
    if (ahead && start <= source_->position()) return true;
    heldNumber_.reset();
    comingNumber_.reset();
    ended_ = false;
    startedAt_ = start;
    checkStart_ = start > 0;
    if (source_->seek(start)) return true;
    failure = source_->failure();
    return false;
}

// Excludes startedAt_ as a start. A start that fails may cost a decoding to the end of the film, so after
// mostStarts of them only the first packet is left.
void FrameReader::Decoding::dropStart(int& dropped) {
    noStart_[startedAt_] = true;
    if (++dropped == mostStarts) std::fill_n(noStart_.begin(), static_cast<std::ptrdiff_t>(startedAt_), true);
}

// Decodes up to the wanted picture. Read::end: the decoder skipped it.
FrameReader::Read FrameReader::Decoding::advance(std::size_t wanted, int& dropped, std::string& failure) {
    if (!reach(wanted, failure)) return Read::failed;
    for (;;) {
        if (!comingNumber_ && !ended_ && pull(failure) == Read::failed) return Read::failed;
        if (std::exchange(checkStart_, false)) {
            // Some containers flag as keys what needs pictures before it.
            const bool started = comingNumber_ == number_[startedAt_] && coming_->key_frame;
            if (!started) {
                dropStart(dropped);
                comingNumber_.reset();
                if (!reach(wanted, failure)) return Read::failed;
                continue;
            }
        }
        if (!comingNumber_ || *comingNumber_ > wanted) return Read::end;
        std::swap(held_, coming_);
        heldNumber_ = std::exchange(comingNumber_, std::nullopt);
        if (*heldNumber_ == wanted) return Read::picture;
    }
}

FrameReader::Read FrameReader::Decoding::show(std::size_t wanted, std::string& failure) {
    if (heldNumber_ == wanted) return Read::picture;
    for (int dropped = 0;;) {
        if (const Read result = advance(wanted, dropped, failure); result != Read::end) return result;
        if (startedAt_ > 0 && !counted_[wanted] && startFor(wanted) == startedAt_) {
            // The picture may be missing only because decoding started at this key picture and not at an
            // earlier one.
            dropStart(dropped);
            heldNumber_.reset();
            comingNumber_.reset();
            continue;
        }
        conceal(wanted);
        if (heldNumber_) return Read::picture;
        if (startedAt_ == 0) break;
        // The picture before it is shown instead, but it has to be decoded from an earlier start.
        dropStart(dropped);
    }
    failure = "its pictures can't be decoded";
    return Read::failed;
}

void FrameReader::Decoding::describe(PictureFormat& format) {
    const AVFrame& first = *coming_;
    const AVStream& stream = source_->stream();
    format.width = first.width;
    format.height = first.height;
    format.rate = QvFramerate(plan_.rate, fieldOrderOf(first));
    format.variable = plan_.variable;
    format.frames = plan_.frames;
    const AVRational aspect =
        av_guess_sample_aspect_ratio(&source_->container(), &source_->stream(), coming_.get());
    const double width = aspect.num > 0 && aspect.den > 0 ? av_q2d(aspect) : 0;
    if (width <= limits::widestPixel && 1 <= width * limits::widestPixel) format.pixelAspect = width;
    format.fieldOrder = fieldOrderOf(first);
    format.colourMatrix = matrixOf(first);
    format.primaries = codePoint(first.color_primaries);
    format.transfer = codePoint(first.color_trc);
    format.space = codePoint(first.colorspace);
    format.turn = turnOf(stream, first);
    format.codec = codecName(source_->codec().codec_id);
    format.bitrate = static_cast<double>(stream.codecpar->bit_rate);
}

FrameReader::FrameReader() = default;
FrameReader::~FrameReader() = default;

int FrameReader::concealed() const { return decoding_->concealed(); }

std::unique_ptr<FrameReader> FrameReader::open(const MediaBytes& bytes, const std::string& format, int stream,
                                               std::shared_ptr<const PacketIndex> index,
                                               const Options& options, std::string& reason) {
    std::unique_ptr<FrameReader> reader(new FrameReader);
    auto source = DecodedPictures::open(bytes, format, stream, std::move(index), options.threads, reason);
    if (!source) return nullptr;
    reader->decoding_ = std::make_unique<Decoding>(std::move(source));
    if (!reader->decoding_->begin(options.holes, reason)) return nullptr;
    if (!reader->describe(options.upright)) {
        reason = reader->failure_;
        return nullptr;
    }
    return reader;
}

bool FrameReader::describe(bool upright) {
    Decoding& decoding = *decoding_;
    decoding.describe(format_);
    if (upright && format_.turn.any()) turnUpright();
    const AVFrame& first = *decoding.upright(decoding.first());
    const PictureForm form = formOf(static_cast<AVPixelFormat>(first.format), isFullRange(first));
    if (form.fourcc == 0) {
        failure_ = "its pictures have a form that is not known";
        return false;
    }
    format_.fourcc = static_cast<int>(form.fourcc);
    format_.lost = form.lost;
    frame_ = std::make_unique<QvFrame>();
    if (format_.width > limits::side || format_.height > limits::side ||
        frame_->init(form.fourcc, format_.width, format_.height) != 0) {
        failure_ = "there is no memory for its pictures";
        return false;
    }
    decoding.writer = std::make_unique<FormWriter>(form, format_.width, format_.height);
    const AVRational base = decoding.source().stream().time_base;
    const std::int64_t farthest = INT64_MAX / base.num;
    zero_ = std::clamp(decoding.firstTime(), -farthest, farthest) * base.num;
    zeroBase_ = base.den;
    return true;
}

// Rotates all pictures as the film's display matrix says, if their pixel format allows it.
void FrameReader::turnUpright() {
    auto turner = std::make_unique<PictureTurner>(format_.turn);
    const AVFrame* const first = turner->turn(decoding_->first());
    if (!first) return;
    format_.turn = {};
    format_.width = first->width;
    format_.height = first->height;
    format_.fieldOrder = fieldOrderOf(*first);
    format_.rate = QvFramerate(format_.rate.rate(), format_.fieldOrder);
    if (turner->swapsSides()) format_.pixelAspect = 1 / format_.pixelAspect;
    decoding_->turner = std::move(turner);
}

bool FrameReader::seek(int n) {
    if (n < 0 || n > format_.frames) return false;
    next_ = n;
    return true;
}

FrameReader::Read FrameReader::read() {
    if (next_ >= format_.frames) return Read::end;
    const auto& shown = decoding_->plan().shown;
    const auto n = static_cast<std::size_t>(next_);
    const std::size_t wanted = shown.empty() ? n : shown[n];
    const Read result = decoding_->show(wanted, failure_);
    if (result != Read::picture) return result;
    const AVFrame& picture = decoding_->picture();
    if (!decoding_->isWritten()) {
        const AVFrame* const shownAs = decoding_->upright(picture);
        if (!shownAs || !decoding_->writer->write(*shownAs, *frame_)) {
            failure_ = "a picture can't be converted";
            return Read::failed;
        }
        frame_->framerate = QvFramerate(format_.rate.rate(), fieldOrderOf(*shownAs));
        decoding_->setWritten();
    }
    frame_->setYUVMatrix(static_cast<QvYUVMatrix>(format_.colourMatrix));
    frame_->frameNr = next_++;
    // A picture that is shown for several frames carries its captions in the first of them only.
    if (decoding_->shows(wanted) && (shown.empty() || n == 0 || shown[n - 1] != shown[n]))
        carryCaptions(picture, MediaTime(frame_->frameNr, format_.rate, MediaTime::defaultTimescale),
                      *frame_);
    else if (frame_->subpic())
        frame_->clearSubpic();
    return Read::picture;
}

}  // namespace av
