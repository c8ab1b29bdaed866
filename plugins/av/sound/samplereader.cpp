#include "plugins/av/sound/samplereader.h"

#include <algorithm>
#include <cstring>
#include <utility>

#include "core/media/qvbuffer.h"
#include "plugins/av/sound/decodedsamples.h"

namespace av {

SampleReader::SampleReader() = default;
SampleReader::~SampleReader() = default;

std::unique_ptr<SampleReader> SampleReader::open(const MediaBytes& bytes, const std::string& format,
                                                 int stream, std::shared_ptr<const PacketIndex> index,
                                                 bool hasZero, std::int64_t zero, std::int64_t zeroBase,
                                                 std::string& reason) {
    std::unique_ptr<SampleReader> reader(new SampleReader);
    reader->decoded_ = DecodedSamples::open(bytes, format, stream, std::move(index), reason);
    if (!reader->decoded_ || !reader->decoded_->describe(reader->format_, reason) ||
        !reader->decoded_->place(hasZero, zero, zeroBase, reader->format_, reason))
        return nullptr;
    return reader;
}

std::size_t SampleReader::sampleBytes() const {
    return static_cast<std::size_t>(format_.channels) * static_cast<std::size_t>(format_.bits / 8);
}

bool SampleReader::seek(long long sample) {
    if (sample < 0 || sample > format_.samples) return false;
    const std::size_t size = sampleBytes();
    const bool isDecoded =
        sample >= blockAt_ && sample < blockAt_ + static_cast<long long>(block_.size() / size);
    if (sample != next_ && !isDecoded) restart_ = true;
    next_ = sample;
    return true;
}

// Reads the next block into block_, which is empty at the end.
bool SampleReader::fetch() {
    if (std::exchange(restart_, false)) {
        block_.clear();
        ended_ = false;
        if (!decoded_->start(next_)) {
            failure_ = decoded_->failure();
            restart_ = true;
            return false;
        }
    }
    const auto result = decoded_->next(blockAt_, block_);
    concealed_ = std::max(concealed_, decoded_->undecoded());
    if (result == DecodedSamples::Next::block) return true;
    block_.clear();
    ended_ = true;
    if (result == DecodedSamples::Next::failed) failure_ = decoded_->failure();
    return result == DecodedSamples::Next::end;
}

int SampleReader::read(QvPcm& to, int count) {
    const std::size_t bytes = sampleBytes();
    count = static_cast<int>(std::min<long long>(count, format_.samples - next_));
    to.setSamples(0);
    int done = 0;
    while (done < count) {
        const auto size = static_cast<long long>(block_.size() / bytes);
        if (restart_ || (!ended_ && next_ >= blockAt_ + size)) {
            if (!fetch()) return -1;
            continue;
        }
        // Silence before the block, and after the last one.
        const bool silent = ended_ || next_ < blockAt_;
        long long n = count - done;
        if (!ended_) n = std::min(n, silent ? blockAt_ - next_ : blockAt_ + size - next_);
        unsigned char* const target = to.ptr(done);
        if (silent)
            std::memset(target, format_.bits == 8 ? 0x80 : 0, static_cast<std::size_t>(n) * bytes);
        else
            std::memcpy(target, block_.data() + static_cast<std::size_t>(next_ - blockAt_) * bytes,
                        static_cast<std::size_t>(n) * bytes);
        done += static_cast<int>(n);
        next_ += n;
    }
    to.setSamples(done);
    return done;
}

}  // namespace av
