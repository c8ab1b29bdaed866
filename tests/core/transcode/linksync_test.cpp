// Video and audio links driven together by counts: after each turn the audio output holds exactly the samples
// that belong to the frames written so far.
#include "builtin/modules.h"
#include "core/filter/qvprocesspipe.h"
#include "core/transcode/translink.h"
#include "tests/support/checks.h"
#include "tests/support/fake_filters.h"
#include "tests/support/fake_streams.h"

namespace {

// Returns the frames written. `perSecond` is the exact rate of the pictures.
int drive(QvDecodePipe& source, FakeEncodePipe& encoder, const QvRatio& perSecond, int inRate, int outRate) {
    TransVLink video;
    TransALink audio;
    EXPECT_EQ(video.init(&source, 0, &encoder, 0) + audio.init(&source, 0, &encoder, 0), 0);
    EXPECT_EQ(video.open(nullptr) + audio.open(nullptr), 0);
    if (auto* converter = dynamic_cast<FakeAudioFilter*>(audio.filter("srconvert", 0)))
        converter->ratio = static_cast<double>(outRate) / inRate;
    while (!video.finished() && !testing::Test::HasFailure()) {
        EXPECT_EQ(video.processFrame(0), 0);
        const int written = static_cast<int>(video.outProcessed());
        const long long due = audio.outSamplesPerFrames(written, video.outFramerate());
        EXPECT_EQ(due, static_cast<long long>(written) * outRate * perSecond.den / perSecond.num);
        EXPECT_EQ(audio.processFrame(static_cast<int>(due - audio.outProcessed())), 0);
        EXPECT_EQ(encoder.audios.front()->total, due) << "after frame " << written;
        EXPECT_EQ(audio.outProcessed(), due);
    }
    return static_cast<int>(encoder.video.numbers.size());
}

TEST(LinkSync, AudioHoldsTheSamplesOfTheFramesWritten) {
    const struct {
        QvRatio rate;
        int frames, inRate, outRate;
        long long samples;
    } rows[] = {
        {{30000, 1001}, 119, 48000, 48000, 190590}, {{30000, 1001}, 119, 44100, 44100, 175104},
        {{25, 1}, 100, 48000, 48000, 192000},       {{60000, 1001}, 601, 32000, 44100, 442176},
        {{15, 2}, 31, 11025, 11025, 45570},
    };
    FakePlugin plugin;
    plugin.audio("aquant").audio("srconvert").add(new QvAfModule);
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        FakeDecoder decoder(row.frames, QvFramerate(row.rate));
        decoder.audio(1LL << 30, row.inRate);
        FakeEncodePipe encoder{QvFramerate(row.rate)};
        encoder.audio(row.outRate);
        EXPECT_EQ(drive(decoder, encoder, row.rate, row.inRate, row.outRate), row.frames);
        EXPECT_EQ(encoder.audios.front()->total, row.samples);
    }
}

}  // namespace
