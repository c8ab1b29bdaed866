// Whole jobs of the engine against the plainest program that moves the same bytes.
#include <algorithm>
#include <chrono>
#include <cstring>
#include <fstream>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include <fcntl.h>
#include <sys/resource.h>
#include <unistd.h>

#include "bench/ratio.h"
#include "core/decode/decodefactory.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/modules/init.h"
#include "core/engine/modules/qvregistry.h"
#include "core/measure/fourcc.h"
#include "core/media/qvbuffer.h"
#include "core/preset/qvpresetmgr.h"
#include "core/transcode/run/qvtranscoder.h"
#include "tests/support/temp_folder.h"

namespace {

constexpr int kWidth = 1920, kHeight = 1080;

std::unique_ptr<QvDecodePipe> rawSource(const std::string& name, unsigned fourcc, int width, int height) {
    std::unique_ptr<QvDecodePipe> decoder(
        static_cast<QvDecodePipe*>(qv_registry()->newCodec("rawdec")->getInterface(2)));
    decoder->setParam("filename", name.c_str());
    decoder->setParam("FOURCC", static_cast<int>(fourcc));
    decoder->setParam("width", width);
    decoder->setParam("height", height);
    decoder->open();
    decoder->select(1, 0);
    return decoder;
}

std::unique_ptr<QvDecodePipe> generator(int seconds, bool sound = false) {
    AnyDict video, audio, streams;
    video.set("width", kWidth);
    video.set("height", kHeight);
    video.set("framerate", 25.0);
    video.set("duration", static_cast<double>(seconds));
    AnyVector vids;
    vids.append(video);
    streams.set("vids", vids);
    AnyVector auds;
    audio.set("duration", static_cast<double>(seconds));
    auds.append(audio);
    if (sound) streams.set("auds", auds);
    std::unique_ptr<QvDecodePipe> decoder(
        static_cast<QvDecodePipe*>(qv_registry()->newCodec("testgen")->getInterface(2)));
    decoder->setParam("streams", streams);
    decoder->open();
    decoder->select(1, 0);
    if (sound) decoder->select(2, 0);
    return decoder;
}

// An output for every stream of a decoder, in the formats that they have.
std::unique_ptr<QvEncodePipe> outputFor(QvDecodePipe& decoder, const char* muxer) {
    std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    pipe->clearStreams();
    pipe->setMuxer(muxer);
    for (int i = 0; i < decoder.nrStreams(1); ++i) {
        pipe->addVideoStream(Any("rawvenc"));
        QvCodec& encoder = *pipe->videoEncoder(i);
        for (const char* key : {"width", "height", "framerate"})
            encoder.setParam(key, decoder.getVideoParam(i, key));
        encoder.setParam("type", decoder.getVideoParam(i, "FOURCC"));
    }
    for (int i = 0; i < decoder.nrStreams(2); ++i) {
        pipe->addAudioStream(Any("rawaenc"));
        for (const char* key : {"samplerate", "channels", "bitsPerSample"})
            pipe->audioEncoder(i)->setParam(key, decoder.getAudioParam(i, key));
    }
    return pipe;
}

// Transcodes every stream of a decoder to files, or to nothing.
int transcode(QvDecodePipe& decoder, const char* muxer, const std::string& output) {
    const auto pipe = outputFor(decoder, muxer);
    if (!output.empty()) pipe->setFilename(Any(output.c_str()));
    QvTranscoder transcoder;
    transcoder.setEncoder(pipe.get());
    transcoder.setDecoder(&decoder);
    transcoder.setParam("startDelay", 0);
    transcoder.linkAll();
    return transcoder.transcode(true);
}

// What the main loop passes on, without the loop.
void bareCalls(QvDecodePipe& decoder) {
    const auto pipe = outputFor(decoder, "nullmux");
    pipe->videoStream(0)->setEnabled(true);
    decoder.seek(MediaTime(), qvVideoStream, 0);
    pipe->open();
    while (decoder.readFrame(0) == 0) pipe->writeFrame(decoder.getFramePtr(0), 0);
    pipe->close();
}

// Stops a job of picture and sound on a worker at many moments. The longest time until it has ended, in ms.
double longestStop(QvDecodePipe& decoder, int stops) {
    const auto pipe = outputFor(decoder, "nullmux");
    QvTranscoder transcoder;
    transcoder.setEncoder(pipe.get());
    transcoder.setDecoder(&decoder);
    transcoder.setParam("startDelay", 0);
    transcoder.linkAll();
    double longest = 0;
    for (int i = 0; i < stops; ++i) {
        transcoder.transcode(false);
        if (i % 3 == 0) transcoder.pause();
        std::this_thread::sleep_for(std::chrono::microseconds(i * 7919 % 20000));
        const double begun = qvBenchSeconds(QvBenchClock::wall);
        transcoder.stop();
        longest = std::max(longest, (qvBenchSeconds(QvBenchClock::wall) - begun) * 1000);
    }
    return longest;
}

// What the plainest copier does: blocks of 1 MiB.
void copyFile(const std::string& from, const std::string& to) {
    static std::vector<char> block(1 << 20);
    const int in = open(from.c_str(), O_RDONLY), out = open(to.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    for (ssize_t n; (n = read(in, block.data(), block.size())) > 0;)
        if (write(out, block.data(), static_cast<size_t>(n)) != n) break;
    close(in);
    close(out);
}

void fill(const std::string& name, size_t bytes, const std::string& header = "") {
    std::ofstream file(name, std::ios::binary);
    file.write(header.data(), static_cast<std::streamsize>(header.size()));
    std::string block(1 << 20, '\0');
    for (size_t i = 0; i < block.size(); ++i) block[i] = static_cast<char>(i * 2654435761u >> 13);
    for (; bytes > 0; bytes -= std::min(bytes, block.size()))
        file.write(block.data(), static_cast<std::streamsize>(std::min(bytes, block.size())));
}

std::string wavHeader(unsigned dataBytes) {
    std::string h = "RIFF....WAVEfmt ";
    const auto put32 = [&](unsigned v) { h.append(reinterpret_cast<const char*>(&v), 4); };
    const auto put16 = [&](unsigned short v) { h.append(reinterpret_cast<const char*>(&v), 2); };
    put32(16), put16(1), put16(2), put32(48000), put32(192000), put16(4), put16(16);
    h += "data";
    put32(dataBytes);
    const unsigned riff = dataBytes + 36;
    std::memcpy(h.data() + 4, &riff, 4);
    return h;
}

double peakMiB() {
    rusage usage{};
    getrusage(RUSAGE_SELF, &usage);
    return static_cast<double>(usage.ru_maxrss) / 1024;
}

}  // namespace

int main() {
    init_wrapper(nullptr);
    qvPresetMgr()->update();
    const TempFolder folder;
    QvRatioBench bench("whole jobs");

    QvFrame from, to;
    from.init(QvFourcc::BGR4, kWidth, kHeight);
    to.init(QvFourcc::BGR4, kWidth, kHeight);
    std::memset(from.plane(0, false), 1, static_cast<size_t>(from.total_bytes()));
    std::memset(to.plane(0, false), 2, static_cast<size_t>(to.total_bytes()));
    constexpr int kSeconds = 4, kFrames = kSeconds * 25;
    auto source = generator(kSeconds);
    bench.compare(
        "test generator to nullmux, a frame : memcpy of it", 4.0, [&] { transcode(*source, "nullmux", ""); },
        [&] {
            for (int i = 0; i < kFrames; ++i)
                std::memcpy(to.plane(0, false), from.plane(0, false),
                            static_cast<size_t>(from.total_bytes()));
        });

    // Pictures of one pixel, so that nearly all of the time is the loop's and that of the calls through it.
    const std::string dots = folder.file("dots.bgr4");
    fill(dots, 4 * 100000);
    auto pixels = rawSource(dots, QvFourcc::BGR4, 1, 1);
    bench.compare(
        "1x1 pictures to nullmux : the same calls of decoder and output", 3.0,
        [&] { transcode(*pixels, "nullmux", ""); }, [&] { bareCalls(*pixels); });

    const std::string raw = folder.file("in.yuv");
    fill(raw, size_t{kWidth} * kHeight * 3 / 2 * 100);
    auto reader = rawSource(raw, QvFourcc::I420, kWidth, kHeight);
    bench.compare(
        "raw I420 file to raw file : 1 MiB read and write", 1.5,
        [&] { transcode(*reader, "rawmux", folder.file("out.yuv")); },
        [&] { copyFile(raw, folder.file("copy.yuv")); });

    const std::string wav = folder.file("in.wav");
    constexpr unsigned kWavBytes = 256u << 20;
    fill(wav, kWavBytes, wavHeader(kWavBytes));
    std::unique_ptr<QvDecodePipe> sound(QvDecFactory::decodePipe(Any(wav.c_str())));
    sound->select(2, 0);
    bench.compare(
        "WAV to WAV : 1 MiB read and write", 1.5,
        [&] { transcode(*sound, "rawmux", folder.file("out.wav")); },
        [&] { copyFile(wav, folder.file("copy.wav")); });

    auto film = generator(kSeconds, true);
    const double begun = qvBenchSeconds(QvBenchClock::wall);
    transcode(*film, "nullmux", "");
    QvRatioBench::tell("a frame of 1920x1080 with its sound",
                       (qvBenchSeconds(QvBenchClock::wall) - begun) * 1000 / kFrames, "ms");
    QvRatioBench::tell("longest of 300 stops of such a job", longestStop(*film, 300), "ms");

    // The peak must not move with the length of the input: the second job is four times the first.
    const double before = peakMiB();
    fill(raw, size_t{kWidth} * kHeight * 3 / 2 * 400);
    reader = rawSource(raw, QvFourcc::I420, kWidth, kHeight);
    transcode(*reader, "nullmux", "");
    QvRatioBench::tell("peak memory, 100 frames", before, "MiB");
    QvRatioBench::tell("peak memory, 400 frames", peakMiB(), "MiB");
    cleanup_wrapper();
}
