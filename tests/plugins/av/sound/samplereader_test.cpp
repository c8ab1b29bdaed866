#include "plugins/av/sound/samplereader.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstring>
#include <random>

#include "core/media/qvbuffer.h"
#include "plugins/av/source/avheaders.h"
#include "tests/plugins/av/films.h"
#include "tests/support/engine.h"

namespace {

using av::SampleReader;

class SampleReaderOfFilms : public Films {
  protected:
    std::unique_ptr<SampleReader> open(const std::string& file) {
        bytes_ = std::make_unique<av::MediaBytes>(Any(file.c_str()));
        std::string reason;
        const auto input = av::MediaInput::open(*bytes_, "", reason);
        EXPECT_TRUE(input) << reason;
        if (!input) return nullptr;
        index_ = av::PacketIndex::build(*input, reason);
        EXPECT_TRUE(index_) << reason;
        auto reader = index_ ? SampleReader::open(*bytes_, "", 0, index_, false, 0, 1, reason) : nullptr;
        EXPECT_TRUE(reader) << reason;
        return reader;
    }
    static std::string read(SampleReader& reader, int count) {
        const av::SoundFormat& format = reader.format();
        QvPcm pcm;
        pcm.init(count, format.channels, format.bits / 8, format.samplerate);
        const int got = reader.read(pcm, count);
        EXPECT_GE(got, 0) << reader.failure();
        const auto bytes = static_cast<std::size_t>(std::max(got, 0) * format.channels * format.bits / 8);
        return {reinterpret_cast<const char*>(pcm.ptr(0)), bytes};
    }
    // What ffmpeg decodes, as the engine's integers.
    std::string expected(const std::string& file, int bits) {
        const std::string raw = folder.file("samples.raw");
        const std::string kind = bits == 16 ? "s16le" : "f32le";
        EXPECT_EQ(ffmpeg({"-i", file, "-f", kind, "-c:a", "pcm_" + kind, raw}).status, 0);
        const std::string data = TempFolder::read(raw);
        if (bits == 16) return data;
        std::string whole;
        for (std::size_t at = 0; at + 4 <= data.size(); at += 4) {
            float value;
            std::memcpy(&value, data.data() + at, sizeof value);
            const auto number =
                static_cast<int>(std::clamp(std::nearbyint(value * 8388608.0), -8388608.0, 8388607.0));
            whole +=
                {static_cast<char>(number), static_cast<char>(number >> 8), static_cast<char>(number >> 16)};
        }
        return whole;
    }

    // All samples, then those after a seek to any, against what ffmpeg decodes.
    void compare(const std::string& file, bool told, bool clean = true) {
        const auto reader = open(file);
        ASSERT_TRUE(reader);
        const auto& packets = index_->packets(0);
        EXPECT_EQ(std::none_of(packets.begin(), packets.end(),
                               [](const auto& packet) { return packet.samples == av::unknownSamples; }),
                  told);
        const av::SoundFormat& format = reader->format();
        const std::string whole = expected(file, format.bits);
        const std::size_t size = static_cast<std::size_t>(format.channels * format.bits / 8);
        ASSERT_EQ(static_cast<std::size_t>(format.samples) * size, whole.size());
        ASSERT_TRUE(read(*reader, static_cast<int>(format.samples)) == whole);
        EXPECT_EQ(read(*reader, 10), "");
        std::mt19937 random(1);
        for (int i = 0; i < 20; ++i) {
            const std::size_t sample = random() % static_cast<std::size_t>(format.samples);
            ASSERT_TRUE(reader->seek(static_cast<long long>(sample)));
            const std::string part = read(*reader, 3000);
            ASSERT_TRUE(part == whole.substr(sample * size, 3000 * size)) << "after a seek to " << sample;
        }
        EXPECT_TRUE(!clean || reader->concealed() == 0);
    }

    EngineScope engine_;
    std::unique_ptr<av::MediaBytes> bytes_;
    std::shared_ptr<const av::PacketIndex> index_;
};

TEST_F(SampleReaderOfFilms, samplesAreThoseOfAReadingFromTheStartWhereverReadingBegins) {
    const struct {
        const char* name;
        Words options;
        bool told;  // by the packets, so that opening decodes no more than the first of them
    } cases[] = {
        {"a.m4a", {"-c:a", "aac", "-b:a", "48k"}, true},
        {"a.aac", {"-c:a", "aac"}, true},
        {"opus.mp4", {"-c:a", "libopus"}, true},
        {"a.mp3", {"-c:a", "libmp3lame", "-b:a", "32k"}, true},
        {"a.mp2", {"-c:a", "mp2"}, true},
        {"a.opus", {"-c:a", "libopus"}, true},
        {"short.opus", {"-c:a", "libopus", "-frame_duration", "5"}, true},
        {"a.mka", {"-c:a", "libopus"}, true},
        {"a.ogg", {"-c:a", "libvorbis"}, true},
        {"a.flac", {"-c:a", "flac", "-sample_fmt", "s16"}, true},
        {"short.flac", {"-c:a", "flac", "-sample_fmt", "s16", "-frame_size", "700"}, true},
        {"alac.m4a", {"-c:a", "alac", "-sample_fmt", "s16p"}, true},
        {"a.ac3", {"-c:a", "ac3"}, true},
        {"a.eac3", {"-c:a", "eac3"}, true},
        {"a.wav", {"-c:a", "pcm_s16le"}, true},
        {"adpcm.wav", {"-c:a", "adpcm_ms"}, true},
        {"a.wma", {"-c:a", "wmav2"}, false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        const std::string file =
            film(c.name, c.options, "aevalsrc='sin(900*t*t)/2+random(0)/9|sin(2000*t)/3':s=48000:d=3");
        compare(file, c.told);
    }
}

TEST_F(SampleReaderOfFilms, endWhereTheirFormChanges) {
    const std::string stereo = film("stereo.mp3", {"-ac", "2"}, "sine=duration=1"),
                      mono = film("mono.mp3", {"-ac", "1", "-ar", "32000", "-write_xing", "0"},
                                  "sine=duration=1");
    folder.write("both.mp3", TempFolder::read(stereo) + TempFolder::read(mono));
    const auto reader = open(folder.file("both.mp3"));
    ASSERT_TRUE(reader);
    EXPECT_EQ(reader->format().channels, 2);
    EXPECT_NE(reader->format().lost.find("32000 Hz and 1 channels"), std::string::npos)
        << reader->format().lost;
    const auto bytes = static_cast<std::size_t>(reader->format().samples) * 6;
    const std::string whole = read(*reader, 200000);
    EXPECT_EQ(whole.size(), bytes);
    EXPECT_NEAR(static_cast<double>(reader->format().samples), 44100, 1200);
}

// Frames of all modes follow each other, with those that say that there is nothing.
TEST_F(SampleReaderOfFilms, ofSpeechAreCountedByTheirModes) {
    const struct {
        const char *name, *head;
        std::vector<int> bytes;  // of a frame's bits, by mode
    } kinds[] = {{"a.amr", "#!AMR\n", {12, 13, 15, 17, 19, 20, 26, 31}},
                 {"wide.amr", "#!AMR-WB\n", {17, 23, 32, 36, 40, 46, 50, 58, 60}}};
    for (const auto& kind : kinds) {
        SCOPED_TRACE(kind.name);
        std::mt19937 random(2);
        std::string bytes = kind.head;
        for (int frame = 0; frame < 150; ++frame) {
            const auto mode =
                static_cast<std::size_t>(frame % 30 < 20 ? 2 : frame % static_cast<int>(kind.bytes.size()));
            bytes += static_cast<char>(mode << 3 | 4);
            for (int i = 0; i < kind.bytes[mode]; ++i) bytes += static_cast<char>(random());
            if (frame % 40 == 0) bytes += static_cast<char>(15 << 3 | 4);
        }
        // Codecs refuse some of these bits.
        compare(folder.write(kind.name, bytes), true, false);
    }
}

// The number of the track is replaced with a statement of 1024 samples of priming.
TEST_F(SampleReaderOfFilms, beginAfterThePrimingThatMatroskaStates) {
    const std::string file = film("a.mka", {"-c:a", "aac"}, "sine=sample_rate=48000:duration=1");
    std::string bytes = TempFolder::read(file);
    const std::size_t at = bytes.find("\x73\xC5\x88");
    ASSERT_NE(at, std::string::npos);
    const auto nanoseconds = std::string("\x56\xAA\x88") + std::string(4, '\0') + "\x01\x45\x85\x55";
    const auto plain = open(file);
    ASSERT_TRUE(plain);
    const std::string all = read(*plain, 100000);
    const auto primed = open(folder.write("primed.mka", bytes.replace(at, 11, nanoseconds)));
    ASSERT_TRUE(primed);
    EXPECT_TRUE(read(*primed, 100000) == all.substr(1024 * 3));
}

// Priming and padding are cut: what went in comes out, as long as it was.
TEST_F(SampleReaderOfFilms, haveTheLengthOfWhatWasEncoded) {
    const struct {
        const char* name;
        Words options;
    } cases[] = {
        {"a.mp3", {}},
        {"a.opus", {}},
        {"a.ogg", {}},
        {"a.flac", {}},
        {"a.wav", {}},

        {"opus.mka", {"-c:a", "libopus"}},
        {"opus.webm", {"-c:a", "libopus", "-frame_duration", "60"}},
    };
    for (const auto& c : cases) {
        const auto reader = open(film(c.name, c.options, "sine=sample_rate=48000:duration=2.345"));
        ASSERT_TRUE(reader) << c.name;
        EXPECT_EQ(reader->format().samples, 112560) << c.name;
    }
}

}  // namespace
