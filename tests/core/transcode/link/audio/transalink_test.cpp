#include "core/transcode/link/audio/transalink.h"
#include "builtin/modules.h"
#include "core/filter/qvprocesspipe.h"
#include "tests/support/checks.h"
#include "tests/support/fake_filters.h"
#include "tests/support/fake_streams.h"

namespace {

AnyDict source(int channel) { return AnyDict("channel", channel); }
AnyDict source(int stream, int channel) { return AnyDict("stream", stream, "channel", channel); }
AnyVector points(double in, double out) { return AnyVector(Any(MediaTime(in)), Any(MediaTime(out))); }
AnyDict customFilter(const AnyDict& filter) { return AnyDict("customFilters", AnyVector(Any(filter))); }

// One audio link; the driver's counts come from the test.
struct Job {
    explicit Job(long long samples, int inRate = 48000, int outRate = 48000, int inChannels = 2,
                 int outChannels = 2, int outBits = 16)
        : decoder(1, QvFramerate::f25p()), encoder(QvFramerate::f25p()) {
        plugin.audio("aquant").audio("srconvert").audio("chconvert").audio("adelay").add(new QvAfModule);
        decoder.audio(samples, inRate, inChannels);
        encoder.audio(outRate, outChannels, outBits);
    }
    int open(int stream = 0) {
        link.init(&decoder, stream, &encoder, 0);
        const int result = link.open(params.empty() ? nullptr : &params);
        if (result == 0) decoder.seek(link.inPoint(), 2, stream);
        return result;
    }
    FakeAudioEncoder& audio() { return *encoder.audios.front(); }

    FakePlugin plugin;
    FakeDecoder decoder;
    FakeEncodePipe encoder;
    TransALink link;
    AnyDict params;
};

TEST(TransALink, HandsTheDecodersOwnBufferToTheEncoder) {
    Job job(4000);
    ASSERT_EQ(job.open(), 0);
    EXPECT_EQ(job.link.totalOutSamples(), 4000);
    for (const int n : {1920, 1920, 0, 160}) EXPECT_EQ(job.link.processFrame(n), 0);
    EXPECT_EQ(job.audio().counts, (std::vector<int>{1920, 1920, 160}));
    for (const auto* pcm : job.audio().addresses) EXPECT_EQ(pcm, job.decoder.getAudioPtr(0));
    EXPECT_TRUE(job.link.finished());
    EXPECT_DOUBLE_EQ(job.link.completed(), 3999 * 100.0 / 4000);
    EXPECT_EQ(job.link.outProcessed(), 4000);
}

TEST(TransALink, SilenceFollowsAShortStream) {
    for (const int bits : {8, 16}) {
        Job job(2500, 48000, 48000, 2, 2, bits);
        ASSERT_EQ(job.open(), 0);
        for (const int n : {1000, 1000, 1000, 500, 1601, 1602}) EXPECT_EQ(job.link.processFrame(n), 0);
        const int first = bits == 16 ? 500 : 1000;  // a pipe fills its last request by itself
        EXPECT_EQ(job.audio().counts, (std::vector<int>{1000, 1000, first, 500, 1601, 1602}));
        const int silent = bits == 8 ? 128 : 0;
        const auto begin = job.audio().values.begin() + 2000 + first;
        EXPECT_TRUE(std::all_of(begin, job.audio().values.end(), [=](int v) { return v == silent; })) << bits;
    }
}

// Every step is whole, from the first one on.
TEST(TransALink, PadsTheEndToTheSampleWhereItIsAsked) {
    for (const int samples : {0, 1, 999, 1000, 2500})
        for (const int bits : {8, 16}) {  // through a pipe, and without one
            SCOPED_TRACE(testing::Message() << samples << " samples to " << bits << " bits");
            Job job(samples, 48000, 48000, 2, 2, bits);
            job.decoder.tracks[0]->total = samples;
            job.params.set("audioConversion", AnyDict("padEnd", 1));
            ASSERT_EQ(job.open(), 0);
            for (const int n : {1000, 1000, 1601}) {
                const size_t before = job.audio().values.size();
                EXPECT_EQ(job.link.processFrame(n), 0);
                EXPECT_EQ(job.audio().values.size() - before, static_cast<size_t>(n));
            }
            EXPECT_EQ(job.link.outProcessed(), 3601);
            if (bits == 8) continue;
            const auto begin = job.audio().values.begin() + samples;
            EXPECT_EQ(std::count(begin, job.audio().values.end(), 0), 3601 - samples);
            EXPECT_EQ(std::count(job.audio().values.begin(), begin, 0), 0) << "the sound itself";
        }
}

TEST(TransALink, FailuresComeOut) {
    const struct {
        std::function<void(Job&)> arrange;
        int open, step;
        const char* text;
    } rows[] = {
        {[](Job& j) { j.decoder.tracks[0]->params.set("samplerate", 0); }, -1, 0, ""},
        {[](Job& j) { j.audio().params.set("samplerate", 0); }, -1, 0, ""},
        {[](Job& j) {  // a rate converter without rates
             j.params.set("audioEffects", customFilter(AnyDict("name", "srconvert", "_on", 1)));
         },
         -1, 0, "invalid samplerates (==0)"},
        {[](Job& j) { j.decoder.tracks[0]->total = 0; }, 0, -1, "Audio error, can not read samples"},
        {[](Job& j) {
             j.decoder.extra.set("srParams", AnyDict("frame", 1536));
             j.audio().params.set("srPossible", 0);
             j.params.set("smartRender", 1);
             j.audio().result = -7;
         },
         0, -7, ""},
        {[](Job& j) {
             j.decoder.tracks[0]->total = 0;
             j.audio().params.set("samplerate", 44100);  // through a pipe
         },
         0, -1, ""},
        {[](Job& j) { j.audio().result = -4; }, 0, 0, ""},  // the end of a writer is no failure
        {[](Job& j) { j.audio().result = -7; }, 0, -7, ""},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        Job job(4000);
        row.arrange(job);
        ASSERT_EQ(job.open(), row.open);
        if (row.open == 0) {
            EXPECT_EQ(job.link.processFrame(100), row.step);
        }
        if (row.open + row.step != 0) {
            EXPECT_EQ(job.link.errorCode(), row.open + row.step);
        }
        EXPECT_NE(std::string(job.link.errorDesc()).find(row.text), std::string::npos);
        EXPECT_EQ(std::string(job.link.errorDesc()).find("0x"), std::string::npos) << "an address";
    }
}

TEST(TransALink, RangeOfSamples) {
    const struct {
        long long samples;
        int inRate, outRate;
        double in, out;
        long long total;
    } rows[] = {
        {441000, 44100, 48000, 1.0, 3.0, 96000},
        {480000, 48000, 44100, 0.5, 2.5, 88200},
        {-1, 48000, 48000, -1, 0, 92233720368547LL},
        {-1, 8000, 192000, -1, 0, 24 * 92233720368547LL},
        {86400LL * 44100, 44100, 48000, -1, 0, 86400LL * 48000},
        {86400LL * 48000, 48000, 44100, 3600.0, 86399.5, 3651457950},
        {48000, 48000, 48000, 0.25, 0, 36000},
    };
    for (const auto& row : rows) {
        LogCapture log;
        Job job(row.samples, row.inRate, row.outRate);
        if (row.in >= 0) job.params.set("inOutPoints", points(row.in, row.out));
        ASSERT_EQ(job.open(), 0);
        EXPECT_EQ(job.link.totalOutSamples(), row.total);
        EXPECT_EQ(log.count("ALink.open: input stream has "), 2) << "before the matrix and before the range";
    }
}

TEST(TransALink, TheConvertersAreAsTheJobSays) {
    Job job(4000, 44100, 48000);
    job.params.set("audioConversion", AnyDict("rateQuality", "high", "dither", "triangular"));
    ASSERT_EQ(job.open(), 0);
    EXPECT_EQ(job.link.filter("srconvert", 0)->getParam("quality"), Any("high"));
    EXPECT_EQ(job.link.filter("aquant", 1)->getParam("dither"), Any("triangular"));
}

TEST(TransALink, ANegativeDelaySkipsInput) {
    Job job(48000);
    job.params.set("audioEffects", customFilter(AnyDict("name", "adelay", "_on", 1, "delay", -200)));
    ASSERT_EQ(job.open(), 0);
    EXPECT_EQ(job.link.inPoint(), MediaTime(0.2));
    EXPECT_EQ(job.link.totalOutSamples(), 38400);
    EXPECT_EQ(job.link.processFrame(10), 0);
    EXPECT_EQ(job.audio().values.front(), 9600 % 1000 + 1);
}

TEST(TransALink, AMatrixThatDoesNotFitIsReplaced) {
    const struct {
        AnyVector matrix;
        const char* line;
    } rows[] = {
        {AnyVector(Any(source(0))), "it has 1 out channels, and encoder has 2."},
        {AnyVector(Any(AnyVector(Any(5))), Any(source(1))), "Invalid channel map at 0, 0"},
        {AnyVector(Any(source(0)), Any(source(7, 0))), "input stream number (7)>= nr of input streams(1)"},
        {AnyVector(Any(source(0)), Any(source(2))), "input channel (2)>= nr of input cannels(2)"},
    };
    for (const auto& row : rows) {
        LogCapture log;
        Job job(4000);
        job.params.set("connMatrix", row.matrix);
        ASSERT_EQ(job.open(), 0);
        EXPECT_TRUE(log.contains(row.line)) << row.line;
        EXPECT_TRUE(log.contains("Using default audio connection matrix"));
        EXPECT_FALSE(job.link.filter("chconvert", 0)) << "straight channels need no conversion";
    }
}

TEST(TransALink, AGoodMatrixGoesToTheConverter) {
    Job job(4000);
    job.params.set("connMatrix", AnyVector(Any(0), Any(AnyVector(Any(source(0)), Any(source(1))))));
    ASSERT_EQ(job.open(), 0);
    auto* converter = job.link.filter("chconvert", 0);
    ASSERT_TRUE(converter);
    EXPECT_EQ(converter->getParam("connMatrix").asVector(), AnyVector(Any(-1), Any(AnyVector(0, 1))));

    Job second(4000, 48000, 48000, 1, 2);
    second.decoder.audio(4000, 48000, 2);
    ASSERT_EQ(second.open(1), 0);
    EXPECT_FALSE(second.link.filter("chconvert", 0)) << "the channels of its own stream count";
}

TEST(TransALink, SmartRenderingPassesCountsOnly) {
    for (const auto& answer : {Any(0), Any(-16), Any(1), Any()}) {
        Job job(44100, 44100, 48000);
        job.decoder.extra.set("srParams", AnyDict("frame", 1536));
        if (answer.isValid()) job.audio().params.set("srPossible", answer);
        job.params = AnyDict("smartRender", 2, "inOutPoints", points(0.5, 1.0));
        ASSERT_EQ(job.open(), 0);
        const bool possible = answer == Any(0) || answer == Any(-16);
        EXPECT_EQ(job.audio().params.getInt32("smartRender", -1), possible ? 2 : 0);
        EXPECT_EQ(job.link.totalOutSamples(), possible ? 22050 : 24000);
        if (!possible) continue;
        EXPECT_EQ(job.audio().params.get("decoderStruct").asDict().getInt64("sample0"), 22050);
        EXPECT_EQ(job.link.processFrame(1764), 0);
        EXPECT_EQ(job.audio().addresses.back(), nullptr);
        EXPECT_EQ(job.audio().counts.back(), 1764);
        EXPECT_EQ(job.link.outSamplesPerFrames(25, QvFramerate::f25p()), 44100);
        EXPECT_TRUE(job.decoder.requests.empty());
    }
}

TEST(TransALink, MixesStreams) {
    Job job(100, 48000, 48000, 2, 3);
    job.decoder.audio(100, 48000, 1);
    job.link.init(&job.decoder, 0, &job.encoder, 0);
    const AnyVector matrix(Any(AnyVector(Any(source(1)), Any(source(1, 0)))), Any(0), Any(source(0)));
    AnyVector selected;
    EXPECT_EQ(job.link._getNeededInputStreams(matrix, selected, true), AnyVector(0, 1));
    EXPECT_EQ(job.link._connMatrixToFilter(matrix),
              AnyVector(Any(AnyVector(1, 2)), Any(-1), Any(AnyVector(Any(0)))));
    job.decoder.readSamples(10, 0);
    job.decoder.seekToSample(50, 1);
    job.decoder.readSamples(8, 1);
    auto* mix = job.link._muxStreams();
    ASSERT_TRUE(mix);
    EXPECT_EQ(mix->samples(), 8);
    ASSERT_EQ(mix->channels(), 3);
    const auto* values = reinterpret_cast<const short*>(mix->ptr(2));
    EXPECT_EQ(std::vector<short>(values, values + 3), (std::vector<short>{3, 3, 53}));
}

}  // namespace
