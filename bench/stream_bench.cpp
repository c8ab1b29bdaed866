// The streams against memcpy and plain write: what buffering, splitting and side information cost.
#include <array>
#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include <fcntl.h>
#include <unistd.h>

#include "bench/ratio.h"
#include "core/split/qvbufstreamsplit.h"
#include "core/stream/fifo/qvbuffifo.h"
#include "core/stream/file/qvfilebufstream.h"
#include "core/stream/platformblock_p.h"
#include "tests/support/temp_folder.h"

namespace {

using Bytes = std::vector<unsigned char>;

Bytes noise(size_t count) {
    Bytes bytes(count);
    uint32_t state = 1;
    for (auto& b : bytes) b = static_cast<unsigned char>((state = state * 1664525u + 1013904223u) >> 24);
    return bytes;
}

void require(bool ok) {
    if (ok) return;
    std::fprintf(stderr, "a stream failed: the figures mean nothing\n");
    std::exit(1);
}

// In pieces that the stream has room for, as an encoder does it.
void putBlocks(bufstream* in, const unsigned char* data, size_t bytes) {
    while (bytes) {
        const auto piece =
            static_cast<unsigned>(std::min<size_t>({bytes, in->usable(in), in->chunksize(in)}));
        unsigned char* block = in->request(in, piece);
        require(block);
        std::memcpy(block, data, piece);
        in->confirm(in, piece);
        data += piece;
        bytes -= piece;
    }
}

class PlainFile {
  public:
    explicit PlainFile(const std::string& name)
        : fd_(open(name.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644)) {}
    ~PlainFile() { close(fd_); }
    void write(const unsigned char* data, size_t bytes) {
        require(::write(fd_, data, bytes) == static_cast<ssize_t>(bytes));
    }

  private:
    int fd_;
};

void benchFifo(QvRatioBench& bench) {
    constexpr size_t total = 8 << 20, ringBytes = 0x200000 + 0x40000;
    const Bytes source = noise(total);
    // Placed as the ring is: the speed of memcpy depends on how the low bits of both addresses differ.
    const PlatformBlock target(ringBytes);
    QvBufStreamFifo fifo;
    fifo.init();
    bufstream *in = fifo.input(), *out = fifo.output();
    for (const unsigned piece : {4096u, 65'536u, 262'143u}) {
        const auto ours = [&] {
            for (size_t at = 0; at + piece <= total; at += piece) {
                unsigned char* block = in->request(in, piece);
                require(block);
                std::memcpy(block, &source[at], piece);
                in->confirm(in, piece);
                require(out->request(out, piece));
                out->confirm(out, piece);
            }
        };
        const auto peer = [&] {
            size_t to = 0;
            for (size_t at = 0; at + piece <= total; at += piece) {
                if (to + piece > ringBytes) to = 0;
                std::memcpy(target.data() + to, &source[at], piece);
                to += piece;
            }
        };
        bench.compare("FIFO, blocks of " + std::to_string(piece) + " : memcpy", 1.1, ours, peer, 15);
    }
}

void benchPictures(QvRatioBench& bench, const TempFolder& folder) {
    constexpr size_t picture = 1920 * 1080 * 3 / 2, count = 24;
    const Bytes pixels = noise(picture);
    const std::string name = folder.file("v.raw");
    const auto plain = [&] {
        PlainFile file(name);
        for (size_t i = 0; i < count; ++i) file.write(pixels.data(), picture);
    };
    const auto stream = [&](auto&& put) {
        QvFileBufStream file;
        require(file.init(AnyDict("outfilename", name.c_str())) == 0);
        for (size_t i = 0; i < count; ++i) put(file.input());
        file.destroy(0);
        require(file.ioError() == 0);
    };
    bench.compare(
        "1080p pictures, copybytes : write", 1.2,
        [&] {
            stream([&](bufstream* in) {
                require(in->copybytes(in, const_cast<unsigned char*>(pixels.data()), picture) == picture);
            });
        },
        plain);
    bench.compare(
        "1080p pictures, request and confirm : write", 1.5,
        [&] { stream([&](bufstream* in) { putBlocks(in, pixels.data(), picture); }); }, plain);

    const auto split = [&] {
        QvBsSplitVideo file;
        const int size = picture + 10;
        require(file.init(AnyDict("outfilename", name.c_str(), "size", size, "chunk", size)) == 0);
        for (size_t i = 0; i < count; ++i) {
            putBlocks(file.input(), pixels.data(), picture);
            uint32_t bytes = picture;
            file.input()->auxinfo(file.input(), 0, QvAuxId::VIDEO_AU_CODE, &bytes, sizeof bytes);
        }
        file.destroy(0);
        require(file.ioError() == 0);
    };
    const auto plainFiles = [&] {
        for (size_t i = 0; i < count; ++i)
            PlainFile(folder.file("p" + std::to_string(i))).write(pixels.data(), picture);
    };
    bench.compare("1080p pictures, a file each : write", 1.5, split, plainFiles);
}

void benchWav(QvRatioBench& bench, const TempFolder& folder) {
    constexpr int channels = 2, unitSamples = 1920, units = 3000;
    constexpr size_t unitBytes = unitSamples * channels * 2;
    const Bytes samples = noise(unitBytes);
    const auto ours = [&](int split) {
        QvBsSplitAudio wav;
        AnyDict params("outfilename", folder.file("a.wav").c_str(), "samplerate", 48'000, "channels",
                       channels, "bitsPerSample", 16, "split", split);
        require(wav.init(params) == 0);
        for (int i = 0; i < units; ++i) {
            putBlocks(wav.input(), samples.data(), unitBytes);
            uint32_t bytes = unitBytes;
            wav.input()->auxinfo(wav.input(), 0, QvAuxId::AUDIO_AU_CODE, &bytes, sizeof bytes);
        }
        wav.input()->auxinfo(wav.input(), 0, QvAuxId::STREAM_END_CODE, nullptr, 0);
        wav.destroy(0);
        require(wav.ioError() == 0);
    };
    bench.compare(
        "WAV : write of each unit", 1.2, [&] { ours(0); },
        [&] {
            PlainFile file(folder.file("b.wav"));
            file.write(samples.data(), 80);
            for (int i = 0; i < units; ++i) file.write(samples.data(), unitBytes);
        });
    bench.compare(
        "WAV, a file for each channel : split and write", 1.2, [&] { ours(1); },
        [&] {
            PlainFile left(folder.file("l.wav")), right(folder.file("r.wav"));
            std::array<std::array<uint16_t, unitSamples>, channels> split;
            for (int i = 0; i < units; ++i) {
                for (size_t s = 0; s < unitSamples; ++s)
                    for (size_t c = 0; c < channels; ++c)
                        std::memcpy(&split[c][s], &samples[(s * channels + c) * 2], 2);
                left.write(reinterpret_cast<unsigned char*>(split[0].data()), sizeof split[0]);
                right.write(reinterpret_cast<unsigned char*>(split[1].data()), sizeof split[1]);
            }
        });
}

}  // namespace

int main() {
    const TempFolder folder;
    QvRatioBench bench("streams");
    benchFifo(bench);
    benchPictures(bench, folder);
    benchWav(bench, folder);
    return 0;
}
