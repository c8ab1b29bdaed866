#include "plugins/av/mux/sinkbytes.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <new>

#include "core/stream/qvbufstrm.h"

namespace av {

namespace {

constexpr int bufferBytes = 256 * 1024;
constexpr std::int64_t piece = 1 << 30;  // counts of the output are 32 bits

}  // namespace

SinkBytes::SinkBytes(QvBufStream& output, bool seekable) : output_(output) {
    auto* buffer = static_cast<unsigned char*>(av_malloc(bufferBytes));
    if (!buffer) return;
    io_ =
        avio_alloc_context(buffer, bufferBytes, 1, this, nullptr, writeBytes, seekable ? seekBytes : nullptr);
    if (!io_)
        av_free(buffer);
    else
        io_->seekable = seekable ? AVIO_SEEKABLE_NORMAL : 0;
}

SinkBytes::~SinkBytes() {
    if (io_) av_freep(&io_->buffer);
    avio_context_free(&io_);
}

bool SinkBytes::fail(const char* what) {
    if (failed()) return false;
    error_ = output_.ioError() != 0 ? output_.ioError() : EIO;
    problem_ = output_.ioErrorText();
    if (problem_.empty()) problem_ = what;
    return false;
}

int SinkBytes::writeBytes(void* self, std::uint8_t* data, int bytes) {
    auto& sink = *static_cast<SinkBytes*>(self);
    try {
        return sink.write(data, bytes) ? bytes : AVERROR(EIO);
    } catch (const std::bad_alloc&) {
        sink.fail("There is no memory for a correction of the output");
        return AVERROR(ENOMEM);
    }
}

std::int64_t SinkBytes::seekBytes(void* self, std::int64_t offset, int origin) {
    auto& sink = *static_cast<SinkBytes*>(self);
    if (origin & AVSEEK_SIZE) return sink.end_;
    const std::int64_t to = offset + (origin == SEEK_CUR   ? sink.position_
                                      : origin == SEEK_END ? sink.end_
                                                           : 0);
    if (to < 0) return AVERROR(EINVAL);
    return sink.position_ = to;
}

bool SinkBytes::write(const std::uint8_t* data, std::int64_t bytes) {
    if (failed()) return false;
    const bool continues = !corrections_.empty() && position_ == endOfLast();
    if (position_ < end_ || (position_ > end_ && continues)) {
        correct(data, bytes);
        return true;
    }
    if (position_ > end_) {
        gapStart_ = end_;
        gapBytes_ = position_ - end_;
        static constexpr std::array<std::uint8_t, 65536> zeros{};
        while (end_ < position_)
            if (!append(zeros.data(), std::min<std::int64_t>(zeros.size(), position_ - end_))) return false;
    }
    if (!append(data, bytes)) return false;
    position_ = end_;
    return true;
}

bool SinkBytes::append(const std::uint8_t* data, std::int64_t bytes) {
    auto* const out = output_.input();
    if (!out) return fail("The output is not open");
    while (bytes > 0) {
        const auto now = static_cast<unsigned>(std::min(bytes, piece));
        if (out->copybytes(out, const_cast<std::uint8_t*>(data), now) != now)
            return fail("The output takes no more");
        data += now;
        bytes -= now;
        end_ += now;
    }
    return true;
}

std::int64_t SinkBytes::endOfLast() const {
    return corrections_.back().position + static_cast<std::int64_t>(corrections_.back().bytes.size());
}

// A write that continues the one before it belongs to it, also where it reaches beyond the end.
void SinkBytes::correct(const std::uint8_t* data, std::int64_t bytes) {
    if (corrections_.empty() || position_ != endOfLast()) corrections_.push_back({position_, {}});
    auto& to = corrections_.back().bytes;
    to.insert(to.end(), data, data + bytes);
    position_ += bytes;
}

bool SinkBytes::moveFromGap() {
    if (failed() || gapBytes_ < 8) return false;
    const auto found =
        std::find_if(corrections_.rbegin(), corrections_.rend(),
                     [this](const Correction& correction) { return correction.position == gapStart_; });
    if (found == corrections_.rend()) return false;
    std::vector<std::uint8_t> block = std::move(found->bytes);
    found->bytes.resize(8);
    for (int i = 0; i < 4; ++i)
        found->bytes[static_cast<std::size_t>(i)] = static_cast<std::uint8_t>(gapBytes_ >> (24 - 8 * i));
    std::copy_n("free", 4, found->bytes.begin() + 4);
    return append(block.data(), static_cast<std::int64_t>(block.size()));
}

bool SinkBytes::finish() {
    for (Correction& correction : corrections_) {
        if (failed()) return false;
        auto& bytes = correction.bytes;
        const std::int64_t inside = end_ - correction.position;
        if (inside < static_cast<std::int64_t>(bytes.size())) {
            if (!append(bytes.data() + inside, static_cast<std::int64_t>(bytes.size()) - inside))
                return false;
            bytes.resize(static_cast<std::size_t>(inside));
        }
        BufSeekInfo change{correction.position, bytes.data(), static_cast<std::uint32_t>(bytes.size())};
        auto* const out = output_.input();
        if (!out || out->auxinfo(out, 0, QvAuxId::BUF_SEEK_INFO, &change, sizeof change) != 0)
            return fail("The output can't be corrected; write it with seekable=0");
    }
    corrections_.clear();
    return !failed();
}

}  // namespace av
