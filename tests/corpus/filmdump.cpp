// Reads a film as the engine does, and writes a sum of each picture and of all sound, for compare.py.
//
// usage: filmdump FILM FOLDER SEEKS
//
// Standard output, a line each:
//     video N FOURCC WIDTH HEIGHT FRAMES RATE VARIABLE CONCEALED
//     audio N SAMPLERATE CHANNELS BITS SAMPLES CONCEALED
//     seek KIND N PLACE        what comes after a seek differs from reading from the start
//     error TEXT
// FOLDER/vN has the CRC-32 of each frame's planes, four bytes little-endian; FOLDER/aN the samples.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <random>
#include <string>
#include <vector>

#include <zlib.h>

#include "core/measure/qvframerate.h"
#include "core/media/qvbuffer.h"
#include "core/media/qvframe.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"
#include "plugins/av/decoder/avdec.h"
#include "plugins/av/source/librarylog.h"
#include "tests/support/engine.h"

namespace {

constexpr int blockSamples = 4000;

std::uint32_t sumOf(const QvFrame& frame) {
    uLong sum = crc32(0, nullptr, 0);
    for (int plane = 0; plane < frame.planes(); ++plane)
        for (int y = 0; y < frame.height(plane); ++y)
            sum = crc32(sum, frame.plane(plane) + std::ptrdiff_t{y} * frame.stride(plane),
                        static_cast<uInt>(frame.width(plane) * frame.pixelBytes(plane)));
    return static_cast<std::uint32_t>(sum);
}

class Dump {
  public:
    Dump(av::AvDec& film, std::string folder, int seeks)
        : film_(film), folder_(std::move(folder)), seeks_(seeks) {}

    void pictures(int stream) {
        film_.select(qvVideoStream, stream);
        std::vector<std::uint32_t> sums;
        while (film_.readFrame(stream) == 0) sums.push_back(sumOf(*film_.getFramePtr(stream)));
        AnyDict all;
        film_.getStreamParams(qvVideoStream, stream, all);
        std::printf("video %d %u %d %d %zu %.6f %d %lld\n", stream,
                    static_cast<unsigned>(all["FOURCC"].asInt32(0)), all["width"].asInt32(0),
                    all["height"].asInt32(0), sums.size(),
                    static_cast<double>(film_.nrFrames(stream)) / all["duration"].asDouble(1),
                    all["variableRate"].asInt32(0), all["concealed"].asInt64(0));
        if (sums.size() != static_cast<std::size_t>(film_.nrFrames(stream)))
            std::printf("error %d frames were announced\n", film_.nrFrames(stream));
        write("v", stream, sums.data(), sums.size() * sizeof sums[0]);
        for (int i = 0; i < seeks_ && !sums.empty(); ++i) {
            const std::size_t n = random_() % sums.size();
            if (film_.seekToFrame(static_cast<long long>(n), stream) != 0 || film_.readFrame(stream) != 0 ||
                sumOf(*film_.getFramePtr(stream)) != sums[n])
                std::printf("seek video %d %zu\n", stream, n);
        }
        film_.deselect(qvVideoStream, stream);
    }

    void sound(int stream) {
        film_.select(qvAudioStream, stream);
        std::vector<unsigned char> all;
        while (film_.readSamples(blockSamples, stream) > 0) append(stream, all);
        AnyDict params;
        film_.getStreamParams(qvAudioStream, stream, params);
        const std::size_t size = static_cast<std::size_t>(params["channels"].asInt32(1)) *
                                 static_cast<std::size_t>(params["bytesPerSample"].asInt32(1));
        std::printf("audio %d %d %d %d %zu %lld\n", stream, params["samplerate"].asInt32(0),
                    params["channels"].asInt32(0), params["bitsPerSample"].asInt32(0), all.size() / size,
                    params["concealed"].asInt64(0));
        if (all.size() / size != static_cast<std::size_t>(film_.nrSamples(stream)))
            std::printf("error %lld samples were announced\n", film_.nrSamples(stream));
        write("a", stream, all.data(), all.size());
        for (int i = 0; i < seeks_ && !all.empty(); ++i) {
            const std::size_t n = random_() % (all.size() / size);
            std::vector<unsigned char> part;
            if (film_.seekToSample(static_cast<long long>(n), stream) == 0 &&
                film_.readSamples(blockSamples, stream) > 0)
                append(stream, part);
            if (part.empty() ||
                !std::equal(part.begin(), part.end(), all.begin() + static_cast<long>(n * size)))
                std::printf("seek audio %d %zu\n", stream, n);
        }
        film_.deselect(qvAudioStream, stream);
    }

  private:
    av::AvDec& film_;
    std::string folder_;
    int seeks_;
    std::mt19937 random_{1};

    void append(int stream, std::vector<unsigned char>& to) {
        const QvPcm& pcm = *film_.getAudioPtr(stream);
        const auto bytes = static_cast<std::size_t>(pcm.samples()) *
                           static_cast<std::size_t>(pcm.channels() * pcm.bytesPerSample());
        to.insert(to.end(), pcm.ptr(0), pcm.ptr(0) + bytes);
    }
    void write(const char* kind, int stream, const void* data, std::size_t bytes) const {
        std::ofstream file(folder_ + "/" + kind + std::to_string(stream), std::ios::binary);
        file.write(static_cast<const char*>(data), static_cast<std::streamsize>(bytes));
        if (!file.flush()) std::printf("error %s can't be written\n", folder_.c_str());
    }
};

}  // namespace

int main(int count, char** words) {
    if (count != 4) {
        std::fputs("usage: filmdump FILM FOLDER SEEKS\n", stderr);
        return 2;
    }
    const EngineScope engine;
    av::sendLibraryLog();
    av::AvDec film;
    film.setParam("filename", Any(words[1]));
    if (film.init() != 0 || film.open() != 0) {
        std::printf("error %s\n", film.errorDesc());
        return 3;
    }
    Dump dump(film, words[2], std::atoi(words[3]));
    for (int i = 0; i < film.nrStreams(qvVideoStream); ++i) dump.pictures(i);
    for (int i = 0; i < film.nrStreams(qvAudioStream); ++i) dump.sound(i);
    return 0;
}
