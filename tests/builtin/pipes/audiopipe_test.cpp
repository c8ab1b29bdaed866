#include "builtin/pipes/audiopipe.h"

#include "tests/builtin/pipes/initonce.h"
#include "tests/support/checks.h"
#include "tests/support/fake_filters.h"
#include "tests/support/fake_streams.h"

namespace {

struct Pipe : QvAf {
    explicit Pipe(std::initializer_list<const char*> names) {
        for (const char* name : names) {
            addFilter(new FakeAudioFilter, -1);
            at(nrFilters() - 1).label = name;
        }
        init();
    }
    FakeAudioFilter& at(int i) { return static_cast<FakeAudioFilter&>(*filter(i)); }
    void converter(int i, int in, int out) {
        at(i).setParam("inSamplerate", in);
        at(i).setParam("outSamplerate", out);
        at(i).ratio = static_cast<double>(out) / in;
    }
    // Takes n samples off the front and returns the first channel's values.
    std::vector<int> take(int n) {
        std::vector<int> values;
        for (int i = 0; i < n; ++i) values.push_back(*reinterpret_cast<const short*>(pcm()->ptr(i)));
        erase(n);
        return values;
    }
};

struct Source : FakeDecoder {
    explicit Source(long long samples, int samplerate = 48000) : FakeDecoder(1, QvFramerate::f25p()) {
        audio(samples, samplerate);
    }
};

TEST(AudioPipe, IsInitialisedOnce) {
    Pipe pipe({"a"});
    expectInitialisedOnce(pipe);
}

TEST(AudioPipe, GivesWhatIsAskedFor) {
    Source decoder(10000);
    Pipe pipe({"a", "b"});
    ASSERT_EQ(pipe.open(), 0);
    EXPECT_EQ(pipe.process(&decoder, 0, 1000), 0);
    EXPECT_EQ(pipe.samples(), 1000);
    EXPECT_EQ(pipe.process(&decoder, 0, 800), 0);
    EXPECT_EQ(pipe.take(700).back(), 700);
    EXPECT_EQ(pipe.process(&decoder, 0, 900), 0);
    EXPECT_EQ(decoder.requests, (std::vector<int>{1000, 600}));
    const auto values = pipe.take(900);
    EXPECT_TRUE(values.front() == 701 && values.back() == 1600 - 1000);  // they start again after 1000
    EXPECT_TRUE(pipe.samplesIn() == 1600 && pipe.samplesOut() == 1600);
    EXPECT_EQ(pipe.close(), 0);
    EXPECT_EQ(pipe.samples(), 0);
}

TEST(AudioPipe, EndsWithSilenceThatFlushesTheFilters) {
    for (const int holdBack : {0, 100}) {
        Source decoder(600);
        Pipe pipe({"a", "b"});
        pipe.at(0).holdBack = holdBack;
        ASSERT_EQ(pipe.open(), 0);
        EXPECT_EQ(pipe.process(&decoder, 0, 1000), QvStatus::endOfStream);
        ASSERT_EQ(pipe.samples(), 1000);
        const auto values = pipe.take(1000);
        EXPECT_TRUE(values[599] == 600 && values[600] == 0 && values[999] == 0);
        EXPECT_EQ(pipe.samplesIn(), 1000 + holdBack);
    }
}

// A filter that looks ahead reaches the end of the input early. All of the input comes out before the end
// does.
TEST(AudioPipe, TheEndComesAfterTheLastSampleOfTheInput) {
    for (const int holdBack : {0, 30, 100}) {
        Source decoder(1000);
        Pipe pipe({"a", "b"});
        pipe.at(0).holdBack = holdBack;
        ASSERT_EQ(pipe.open(), 0);
        for (const int want : {950, 49, 1}) {
            EXPECT_EQ(pipe.process(&decoder, 0, want), 0) << want << " with " << holdBack;
            EXPECT_NE(pipe.take(want).back(), 0);
        }
        EXPECT_EQ(pipe.process(&decoder, 0, 5), QvStatus::endOfStream);
        EXPECT_EQ(pipe.take(5), (std::vector<int>(5, 0)));
    }
}

TEST(AudioPipe, TheReadsFollowTheConvertersRatio) {
    Source decoder(100000, 44100);
    Pipe pipe({"a", "srconvert", "b"});
    EXPECT_EQ(pipe.open(), QvStatus::failed);
    EXPECT_STREQ(pipe.errorDesc(), "invalid samplerates (==0)");
    pipe.converter(1, 44100, 48000);
    ASSERT_EQ(pipe.open(), 0);
    EXPECT_EQ(pipe.process(&decoder, 0, 1920), 0);
    EXPECT_EQ(pipe.at(1).getParam("splsToGet"), Any(1920));
    EXPECT_EQ(pipe.samples(), 1920);
    EXPECT_EQ(pipe.process(&decoder, 0, 1922), 0);
    EXPECT_EQ(decoder.requests, (std::vector<int>{1764, 16}));  // never less
    EXPECT_EQ(pipe.at(1).getParam("splsToGet"), Any(16));

    Pipe front({"srconvert", "b"});
    front.converter(0, 44100, 48000);
    ASSERT_EQ(front.open(), 0);
    EXPECT_EQ(front.process(&decoder, 0, 1920), 0);
    EXPECT_EQ(front.at(0).getParam("splsToGet"), Any(1920));
}

TEST(AudioPipe, ErrorsComeOutAtOnce) {
    const struct {
        const char* what;
        std::initializer_list<const char*> filters;
        int samples;
        void (*arrange)(Pipe&);
        int result;
    } rows[] = {
        {"a filter's error", {"a", "b"}, 600, [](Pipe& p) { p.at(1).writeResult = -9; }, -9},
        {"no format to make silence of", {"a"}, 0, [](Pipe&) {}, -1},
        {"a filter gives nothing", {"a", "b"}, 600, [](Pipe& p) { p.at(1).swallows = true; }, -1},
    };
    for (const auto& row : rows) {
        Source decoder(row.samples);
        Pipe pipe(row.filters);
        row.arrange(pipe);
        ASSERT_EQ(pipe.open(), 0);
        EXPECT_EQ(pipe.process(&decoder, 0, 100), row.result) << row.what;
    }
}

TEST(AudioPipe, WrittenSamplesWaitInTheFilters) {
    Pipe pipe({"a", "b"});
    ASSERT_EQ(pipe.open(), 0);
    Source decoder(600);
    decoder.readSamples(200, 0);
    EXPECT_EQ(pipe.write(*decoder.getAudioPtr(0)), 0);
    EXPECT_EQ(pipe.samples(), 0);
    EXPECT_EQ(pipe.process(nullptr, 0, 200), 0);
    EXPECT_EQ(pipe.samples(), 200);
    EXPECT_EQ(pipe.process(nullptr, 0, 201), QvStatus::endOfStream);
}

}  // namespace
