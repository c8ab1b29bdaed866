#include "builtin/shared/rawoutput.h"

#include <algorithm>
#include <array>
#include <cstring>

#include "core/stream/qvbufstrm.h"

RawOutput::RawOutput(QvBufStream& stream) : stream_(stream) {
    stream_.lock();
    through_ = stream_.getParam(rawWriteThrough).isTrue();
}

RawOutput::~RawOutput() { unlock(); }

void RawOutput::unlock() {
    if (locked_) stream_.unlock();
    locked_ = false;
}

unsigned RawOutput::largestBlock() const {
    auto* out = stream_.input();
    return out ? out->chunksize(out) : 0;
}

bool RawOutput::sound() const { return stream_.ioError() == 0; }

std::string RawOutput::fault() const {
    const auto text = stream_.ioErrorText();
    return text.empty() ? "Can not write to the output" : text;
}

RawPutResult RawOutput::put(const unsigned char* data, uint64_t bytes) {
    const auto result = through_ ? putThrough(data, bytes) : putBlocks(data, bytes);
    return result == RawPutResult::noBlock && !sound() ? RawPutResult::failed : result;
}

RawPutResult RawOutput::putThrough(const unsigned char* data, uint64_t bytes) {
    constexpr uint64_t piece = 1u << 30;  // counts are 32 bits
    auto* out = stream_.input();
    if (!out) return RawPutResult::noBlock;
    while (bytes > 0) {
        asked_ = static_cast<unsigned>(std::min(bytes, piece));
        if (out->copybytes(out, const_cast<unsigned char*>(data), asked_) != asked_)
            return RawPutResult::failed;
        data += asked_;
        bytes -= asked_;
    }
    return RawPutResult::ok;
}

// A block longer than the stream's chunk is never contiguous at the end of a ring, so pieces stay below it.
RawPutResult RawOutput::putBlocks(const unsigned char* data, uint64_t bytes) {
    auto* out = stream_.input();
    if (!out) return RawPutResult::noBlock;
    const unsigned largest = largestBlock();
    while (bytes > 0) {
        uint64_t piece = std::min<uint64_t>(out->usable(out), bytes);
        if (largest > 0) piece = std::min<uint64_t>(piece, largest);
        asked_ = static_cast<unsigned>(piece > 0 ? piece : std::min<uint64_t>(bytes, UINT32_MAX));
        auto* block = piece > 0 ? out->request(out, asked_) : nullptr;
        if (!block) return RawPutResult::noBlock;
        std::memcpy(block, data, asked_);
        out->confirm(out, asked_);
        data += asked_;
        bytes -= asked_;
    }
    return RawPutResult::ok;
}

int RawOutput::announce(unsigned code, uint64_t bytes, unsigned infoBytes) {
    std::array<uint32_t, 8> info{};
    info[0] = static_cast<uint32_t>(bytes);
    auto* out = stream_.input();
    return static_cast<int>(out->auxinfo(out, 0, code, info.data(), infoBytes));
}
