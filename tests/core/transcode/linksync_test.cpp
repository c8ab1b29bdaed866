// Video and audio links driven together by counts: after each turn the audio output holds exactly the samples
// that belong to the frames written so far.
#include <gtest/gtest.h>

#include <memory>

#include "builtin/modules.h"
#include "core/decode/qvtestgenerator.h"
#include "core/filter/qvprocesspipe.h"
#include "core/transcode/translink.h"
#include "tests/support/fake_filters.h"
#include "tests/support/fake_streams.h"

namespace {

struct Row {
    const char* name;
    QvRatio rate;
    int frames;
    int inRate, outRate;
    long long samples;
};

const Row rows[] = {
    {"ntsc48", {30000, 1001}, 119, 48000, 48000, 190590},
    {"ntsc44", {30000, 1001}, 119, 44100, 44100, 175104},
    {"ntscConverted", {30000, 1001}, 119, 44100, 48000, 190590},
    {"film48", {24000, 1001}, 1000, 48000, 48000, 2002000},
    {"pal", {25, 1}, 100, 48000, 48000, 192000},
    {"double", {60000, 1001}, 601, 32000, 44100, 442176},
    {"odd", {15, 2}, 31, 11025, 11025, 45570},
};

class LinkSync : public testing::TestWithParam<Row> {};

TEST_P(LinkSync, AudioHoldsTheSamplesOfTheFramesWritten) {
    const Row& row = GetParam();
    FakePlugin plugin;
    plugin.audio("aquant").audio("srconvert").add(new QvAfModule);
    const QvFramerate rate(row.rate);
    FakeDecoder decoder(row.frames, rate);
    decoder.audio(1LL << 30, row.inRate);
    FakeEncodePipe encoder(rate);
    encoder.audio(row.outRate);
    TransVLink video;
    TransALink audio;
    ASSERT_EQ(video.init(&decoder, 0, &encoder, 0), 0);
    ASSERT_EQ(audio.init(&decoder, 0, &encoder, 0), 0);
    ASSERT_EQ(video.open(nullptr), 0);
    ASSERT_EQ(audio.open(nullptr), 0);
    if (auto* converter = audio.filter("srconvert", 0))
        static_cast<FakeAudioFilter*>(converter)->ratio = static_cast<double>(row.outRate) / row.inRate;

    auto& sound = *encoder.audios.front();
    while (!video.finished()) {
        ASSERT_EQ(video.processFrame(0), 0);
        const int written = static_cast<int>(video.outProcessed());
        const long long due = audio.outSamplesPerFrames(written, rate);
        EXPECT_EQ(due, static_cast<long long>(written) * row.outRate * row.rate.den / row.rate.num);
        ASSERT_EQ(audio.processFrame(static_cast<int>(due - audio.outProcessed())), 0);
        ASSERT_EQ(sound.total, due) << "after frame " << written;
        ASSERT_EQ(audio.outProcessed(), due);
    }
    EXPECT_EQ(static_cast<int>(encoder.video.numbers.size()), row.frames);
    EXPECT_EQ(sound.total, row.samples);
}

INSTANTIATE_TEST_SUITE_P(Rates, LinkSync, testing::ValuesIn(rows),
                         [](const auto& info) { return std::string(info.param.name); });

// The example that the tool shows, but for the size of its pictures.
TEST(LinkSyncOfTheGenerator, FourSecondsOfNtsc) {
    FakePlugin plugin;
    plugin.add(new TestGeneratorModule);
    GeneratorVParams picture;
    picture.duration = MediaTime(4.0);
    picture.framerate = QvFramerate(30000.0 / 1001);
    picture.width = 64;
    picture.height = 48;
    GeneratorAParams beep;
    beep.duration = MediaTime(4.0);
    std::unique_ptr<QvDecodePipe> source(QvTestGenerator::create(&picture, &beep));
    ASSERT_TRUE(source);
    ASSERT_EQ(source->open(), 0);
    source->select(1, 0);
    source->select(2, 0);
    FakeEncodePipe encoder(QvFramerate::f29p(), 64, 48);
    encoder.video.params.set("inFOURCC", AnyVector(Any(static_cast<int>(QvFourcc::BGR4))));
    encoder.audio(44100);
    TransVLink video;
    TransALink audio;
    ASSERT_EQ(video.init(source.get(), 0, &encoder, 0), 0);
    ASSERT_EQ(audio.init(source.get(), 0, &encoder, 0), 0);
    ASSERT_EQ(video.open(nullptr), 0);
    ASSERT_EQ(audio.open(nullptr), 0);
    EXPECT_EQ(video.totalOutFrames(), 119);
    EXPECT_EQ(audio.totalOutSamples(), 176400);
    while (!video.finished()) {
        ASSERT_EQ(video.processFrame(0), 0);
        const int written = static_cast<int>(video.outProcessed());
        const long long due = audio.outSamplesPerFrames(written, video.outFramerate());
        ASSERT_EQ(audio.processFrame(static_cast<int>(due - audio.outProcessed())), 0);
    }
    EXPECT_EQ(encoder.video.numbers.size(), 119u);
    EXPECT_EQ(encoder.video.numbers.back(), 118);
    EXPECT_EQ(encoder.audios.front()->total, 175104);
    EXPECT_FALSE(audio.finished());
    video.close();
    audio.close();
    source.reset();
}

}  // namespace
