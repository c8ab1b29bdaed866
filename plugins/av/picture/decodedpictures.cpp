#include "plugins/av/picture/decodedpictures.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <utility>

#include "core/arch/platform.h"
#include "plugins/av/picture/picturewords.h"
#include "plugins/av/source/limits.h"

namespace av {

namespace {

constexpr int mostThreads = 16;

// A film may state any number where the libraries have an enumeration, and they hand it on.
template <class Code>
void keepKnown(Code& code, Code end, Code unspecified) {
    std::uint32_t number = 0;
    static_assert(sizeof code == sizeof number);
    std::memcpy(&number, &code, sizeof number);
    if (number >= static_cast<std::uint32_t>(end)) code = unspecified;
}

void keepKnownColours(AVFrame& picture) {
    keepKnown(picture.color_range, AVCOL_RANGE_NB, AVCOL_RANGE_UNSPECIFIED);
    keepKnown(picture.color_primaries, AVCOL_PRI_NB, AVCOL_PRI_UNSPECIFIED);
    keepKnown(picture.color_trc, AVCOL_TRC_NB, AVCOL_TRC_UNSPECIFIED);
    keepKnown(picture.colorspace, AVCOL_SPC_NB, AVCOL_SPC_UNSPECIFIED);
}

}  // namespace

std::unique_ptr<DecodedPictures> DecodedPictures::open(const MediaBytes& bytes, const std::string& format,
                                                       int stream, std::shared_ptr<const PacketIndex> index,
                                                       int threads, std::string& reason) {
    auto pictures = std::make_unique<DecodedPictures>();
    pictures->input_ = MediaInput::open(bytes, format, reason);
    if (!pictures->input_) return nullptr;
    if (stream < 0 || static_cast<unsigned>(stream) >= pictures->input_->context().nb_streams) {
        reason = "the stream is not there any more";
        return nullptr;
    }
    pictures->stream_ = stream;
    pictures->index_ = std::move(index);
    pictures->input_->selectOnly(stream);
    pictures->threads_ = threads;
    return pictures->openCodec(reason) ? std::move(pictures) : nullptr;
}

bool DecodedPictures::openCodec(std::string& reason) {
    const AVCodecParameters& parameters = *stream().codecpar;
    const AVCodec* const decoder = avcodec_find_decoder(parameters.codec_id);
    if (!decoder) {
        char tag[AV_FOURCC_MAX_STRING_SIZE] = {};
        const bool known = parameters.codec_id != AV_CODEC_ID_NONE;
        reason = std::string("there is no decoder for ") +
                 (known ? codecName(parameters.codec_id)
                        : std::string(av_fourcc_make_string(tag, parameters.codec_tag)));
        return false;
    }
    codec_.reset(avcodec_alloc_context3(decoder));
    packet_.reset(av_packet_alloc());
    if (!codec_ || !packet_ || avcodec_parameters_to_context(codec_.get(), &parameters) < 0) {
        reason = "out of memory";
        return false;
    }
    codec_->pkt_timebase = stream().time_base;
    concealed_.watch(*codec_);
    codec_->max_pixels = limits::pixels;
    codec_->thread_count = std::clamp(threads_ > 0 ? threads_ : qv_platform().processors(), 1, mostThreads);
    codec_->thread_type = FF_THREAD_FRAME | FF_THREAD_SLICE;
    if (const int result = avcodec_open2(codec_.get(), decoder, nullptr); result < 0) {
        reason = std::string("its ") + codecName(parameters.codec_id) + " can't be decoded (" +
                 errorText(result) + ")";
        return false;
    }
    return true;
}

bool DecodedPictures::seek(std::size_t packet) {
    const bool atStart = packet == 0 && !started_;
    waiting_ = draining_ = false;
    av_packet_unref(packet_.get());
    position_ = packet;
    // What a damaged stream has left in the codec is not all flushed; the start is that of a new one.
    if (packet > 0 || atStart)
        avcodec_flush_buffers(codec_.get());
    else if (!openCodec(failure_))
        return false;
    if (atStart) return true;
    const bool found =
        packet == 0 ? input_->rewind() : input_->seekTo(stream_, index_->keyOf(stream_, packet), packet);
    if (!found) failure_ = input_->failure();
    return found;
}

bool DecodedPictures::feed() {
    started_ = true;
    if (!waiting_) {
        switch (input_->read(*packet_)) {
            case MediaInput::Read::packet: break;
            case MediaInput::Read::failed:
                // What the index has is what can be read: beyond it the damage is known.
                if (position_ < packets().size()) {
                    failure_ = input_->failure();
                    return false;
                }
                [[fallthrough]];
            case MediaInput::Read::end:
                draining_ = true;
                avcodec_send_packet(codec_.get(), nullptr);
                return true;
        }
        codec_->reordered_opaque = static_cast<std::int64_t>(position_++);
    }
    const int result = avcodec_send_packet(codec_.get(), packet_.get());
    waiting_ = result == AVERROR(EAGAIN);
    if (result == AVERROR(ENOMEM)) {
        failure_ = "out of memory";
        return false;
    }
    // Other failures are the packet's own: its picture does not come, and the reader sees that.
    if (!waiting_) av_packet_unref(packet_.get());
    return true;
}

// Of JPEG 2000 only the container knows that a picture is two fields.
void DecodedPictures::takeFields(AVFrame& picture) {
    const AVCodecParameters& is = *stream().codecpar;
    if (is.codec_id != AV_CODEC_ID_JPEG2000 || is.field_order <= AV_FIELD_PROGRESSIVE) return;
    picture.interlaced_frame = 1;
    picture.top_field_first = is.field_order == AV_FIELD_TT || is.field_order == AV_FIELD_BT;
}

DecodedPictures::Next DecodedPictures::next(AVFrame& picture) {
    for (;;) {
        const int result = avcodec_receive_frame(codec_.get(), &picture);
        if (result >= 0) {
            takeFields(picture);
            keepKnownColours(picture);
            return Next::picture;
        }
        if (result == AVERROR_EOF) return Next::end;
        if (draining_ && result == AVERROR(EAGAIN)) return Next::end;
        if (result == AVERROR(ENOMEM)) {
            failure_ = "out of memory";
            return Next::failed;
        }
        if (draining_) continue;  // a damaged picture among the last ones
        if (!feed()) return Next::failed;
    }
}

bool DecodedPictures::isConcealed(const AVFrame& picture, std::size_t packet) const {
    // With threads of frames flags may be set too late; see ConcealedPackets.
    const bool late = (codec_->active_thread_type & FF_THREAD_FRAME) != 0;
    const int flags = late ? 0 : picture.decode_error_flags;
    return flags != 0 || (picture.flags & AV_FRAME_FLAG_CORRUPT) != 0 || concealed_.has(packet);
}

}  // namespace av
