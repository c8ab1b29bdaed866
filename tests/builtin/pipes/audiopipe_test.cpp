#include "builtin/pipes/audiopipe.h"

#include <gtest/gtest.h>

#include <memory>

#include "core/engine/qvexception.h"
#include "core/engine/status.h"
#include "tests/support/fake_filters.h"
#include "tests/support/fake_streams.h"
#include "tests/support/log_capture.h"

namespace {

class Named : public FakeAudioFilter {
  public:
    explicit Named(const char* name) : name_(name) {}
    const char* name() const override { return name_; }

  private:
    const char* name_;
};

struct Pipe : QvAf {
    explicit Pipe(std::initializer_list<const char*> names) {
        for (const char* name : names) addFilter(new Named(name), -1);
        init();
    }
    FakeAudioFilter& at(int i) { return static_cast<FakeAudioFilter&>(*filter(i)); }
    void converter(int i, int in, int out) {
        at(i).setParam("inSamplerate", in);
        at(i).setParam("outSamplerate", out);
        at(i).ratio = static_cast<double>(out) / in;
    }
};

struct Source : FakeDecoder {
    explicit Source(long long samples, int samplerate = 48000) : FakeDecoder(1, QvFramerate::f25p()) {
        audio(samples, samplerate);
    }
};

// Takes n samples off the front and returns the first channel's values.
std::vector<int> take(QvAf& pipe, int n) {
    std::vector<int> values;
    for (int i = 0; i < n; ++i) values.push_back(*reinterpret_cast<const short*>(pipe.pcm()->ptr(i)));
    pipe.erase(n);
    return values;
}

TEST(AudioPipe, GivesWhatIsAskedFor) {
    Source decoder(10000);
    Pipe pipe({"a", "b"});
    ASSERT_EQ(pipe.open(), 0);
    EXPECT_EQ(pipe.process(&decoder, 0, 1000), 0);
    EXPECT_EQ(pipe.samples(), 1000);
    EXPECT_EQ(pipe.process(&decoder, 0, 800), 0);
    EXPECT_EQ(decoder.requests, std::vector<int>{1000});
    EXPECT_EQ(take(pipe, 700).back(), 700);
    EXPECT_EQ(pipe.process(&decoder, 0, 900), 0);
    EXPECT_EQ(decoder.requests.back(), 600);
    const auto values = take(pipe, 900);
    EXPECT_EQ(values.front(), 701);
    EXPECT_EQ(values.back(), 1600 - 1000);  // values start again after 1000
    EXPECT_EQ(pipe.samplesIn(), 1600);
    EXPECT_EQ(pipe.samplesOut(), 1600);
    EXPECT_EQ(pipe.close(), 0);
    EXPECT_EQ(pipe.samples(), 0);
}

TEST(AudioPipe, EndsWithSilenceAndSaysSo) {
    Source decoder(600);
    Pipe pipe({"a"});
    ASSERT_EQ(pipe.open(), 0);
    EXPECT_EQ(pipe.process(&decoder, 0, 1000), QvStatus::endOfStream);
    ASSERT_EQ(pipe.samples(), 1000);
    const auto values = take(pipe, 1000);
    EXPECT_EQ(values[599], 600);
    EXPECT_EQ(values[600], 0);
    EXPECT_EQ(values[999], 0);
    EXPECT_EQ(pipe.samplesIn(), 1000);
}

TEST(AudioPipe, SilenceFlushesWhatAFilterHoldsBack) {
    Source decoder(600);
    Pipe pipe({"a", "b"});
    pipe.at(0).holdBack = 100;
    ASSERT_EQ(pipe.open(), 0);
    EXPECT_EQ(pipe.process(&decoder, 0, 600), QvStatus::endOfStream);
    EXPECT_EQ(take(pipe, 600).back(), 600);
}

TEST(AudioPipe, TheReadsFollowTheConvertersRatio) {
    Source decoder(100000, 44100);
    Pipe pipe({"a", "srconvert", "b"});
    pipe.converter(1, 44100, 48000);
    ASSERT_EQ(pipe.open(), 0);
    EXPECT_EQ(pipe.process(&decoder, 0, 1920), 0);
    EXPECT_EQ(decoder.requests.front(), 1764);
    EXPECT_EQ(pipe.at(1).getParam("splsToGet"), Any(1920));
    EXPECT_EQ(pipe.samples(), 1920);
    EXPECT_EQ(pipe.process(&decoder, 0, 1922), 0);
    EXPECT_EQ(decoder.requests.back(), 16);  // never less
    EXPECT_EQ(pipe.at(1).getParam("splsToGet"), Any(16));
}

TEST(AudioPipe, RatesOfZeroDoNotOpen) {
    Pipe pipe({"srconvert"});
    EXPECT_EQ(pipe.open(), -1);
    EXPECT_STREQ(pipe.errorDesc(), "invalid samplerates (==0)");
    pipe.converter(0, 48000, 44100);
    EXPECT_EQ(pipe.open(), 0);
}

TEST(AudioPipe, ErrorsComeOutAtOnce) {
    {
        Source decoder(600);
        Pipe pipe({"a", "b"});
        pipe.at(1).writeResult = -9;
        ASSERT_EQ(pipe.open(), 0);
        EXPECT_EQ(pipe.process(&decoder, 0, 100), -9);
    }
    {
        Source decoder(0);
        Pipe pipe({"a"});
        ASSERT_EQ(pipe.open(), 0);
        EXPECT_EQ(pipe.process(&decoder, 0, 100), -1) << "no format to make silence of";
    }
    {
        Source decoder(600);
        Pipe pipe({});
        ASSERT_EQ(pipe.open(), 0);
        EXPECT_LT(pipe.process(&decoder, 0, 100), 0);
    }
    {
        Pipe pipe({"a"});
        ASSERT_EQ(pipe.open(), 0);
        EXPECT_EQ(pipe.process(nullptr, 0, 100), QvStatus::endOfStream);
    }
}

TEST(AudioPipe, AFilterThatGivesNothingDoesNotHang) {
    Source decoder(600);
    Pipe pipe({"a", "b"});
    pipe.at(1).swallows = true;
    ASSERT_EQ(pipe.open(), 0);
    EXPECT_EQ(pipe.process(&decoder, 0, 100), -1);
    EXPECT_STREQ(pipe.errorDesc(), "the audio filters give no samples");
}

TEST(AudioPipe, PositionsAndNames) {
    Pipe pipe({"a", "b"});
    pipe.addFilter(new Named("c"), 1);
    pipe.addFilter(new Named("a"), -5);
    const char* order[] = {"a", "c", "b", "a"};
    for (int i = 0; i < 4; ++i) EXPECT_STREQ(pipe.filter(i)->name(), order[i]);
    EXPECT_EQ(pipe.filter("a", 1), pipe.filter(3));
    EXPECT_EQ(pipe.filter("a", 2), nullptr);
    EXPECT_EQ(pipe.filter(4), nullptr);
    pipe.removeFilter(0);
    EXPECT_EQ(pipe.nrFilters(), 3);
    EXPECT_THROW(pipe.removeFilter(3), QvAssertFailure);
    pipe.clear();
    EXPECT_EQ(pipe.nrFilters(), 0);
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
