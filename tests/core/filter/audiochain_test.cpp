// The plan of the automatic audio chain.
#include <cmath>

#include "tests/core/filter/chains.h"

namespace {

using Pipe = std::unique_ptr<QvAProcessPipe>;

struct Job : AudioJobDescription {
    // Bits, samples a second and channels, first of the input.
    Job(int bits, int rate, int channels, int toBits, int toRate, int toChannels) {
        inBitsPerSample = bits, inSamplerate = rate, inChannels = channels;
        outBitsPerSample = toBits, outSamplerate = toRate, outChannels = toChannels;
    }
    Pipe pipe() { return Pipe(QvProcessUtil::createAudioPipe(*this, startOffset)); }
    std::string plan() {
        return planOf(pipe(), [](QvAudioFilter& filter) {
            EXPECT_NE(filter.getState(), 3) << "the link opens it";
            return Any(filter.name()) != "aquant"
                       ? ""
                       : std::to_string(filter.getParam("outBitsPerSample").asInt32(0));
        });
    }
    MediaTime startOffset;
};

Any sources(std::initializer_list<int> channels) {
    AnyVector list;
    for (const int channel : channels) list.append(AnyDict("channel", channel));
    return list;
}

class AudioChain : public testing::Test {
  protected:
    AudioChain() {
        for (const char* name : {"aquant", "srconvert", "chconvert", "adelay", "avol", "dynamics"})
            plugin_.audio(name);
        plugin_.add(new QvAfModule);
    }
    FakePlugin plugin_;
};

TEST_F(AudioChain, Plans) {
    const std::pair<Job, const char*> rows[] = {
        {{16, 48000, 2, 16, 48000, 2}, "none"},
        {{16, 48000, 2, 24, 48000, 2}, "aquant32 aquant24"},
        {{32, 48000, 2, 16, 48000, 2}, "aquant16"},
        {{16, 44100, 2, 16, 48000, 2}, "aquant32 srconvert aquant16"},
        {{16, 48000, 2, 16, 48000, 6}, "aquant32 chconvert aquant16"},
        {{16, 44100, 2, 16, 48000, 6}, "aquant32 srconvert chconvert aquant16"},
        {{16, 44100, 6, 16, 48000, 2}, "aquant32 chconvert srconvert aquant16"},
        {{32, 44100, 6, 32, 48000, 2}, "chconvert srconvert aquant32"},
    };
    for (auto [job, plan] : rows) EXPECT_EQ(job.plan(), plan);
    Job job(16, 44100, 2, 16, 48000, 2);
    job.filters = AnyVector(Any(stored("avol", AnyDict("_position", 2, "_front", 0))),
                            Any(stored("dynamics", AnyDict("_position", 1, "_front", 0))),
                            Any(stored("avol", AnyDict("_position", 1, "_front", 1))));
    EXPECT_EQ(job.plan(), "aquant32 avol srconvert dynamics avol aquant16");
    job.outSamplerate = 44100;
    EXPECT_EQ(job.plan(), "aquant32 avol dynamics avol aquant16");
}

TEST_F(AudioChain, TheMatrixIsNormalised) {
    const auto matrixOf = [](const AnyVector& matrix) {
        Job job(16, 48000, 2, 16, 48000, 2);
        job.connMatrix = matrix;
        const Pipe pipe = job.pipe();
        return pipe ? pipe->filter("chconvert", 0)->getParam("connMatrix") : Any("none");
    };
    const auto one = [](int channel) { return Any(AnyVector(Any(channel))); };
    EXPECT_EQ(matrixOf(AnyVector(sources({0}), sources({1}))), Any("none"));
    EXPECT_EQ(matrixOf(AnyVector(Any(AnyDict("channel", 0)), sources({1}))), Any("none"));
    EXPECT_EQ(matrixOf(AnyVector(sources({1}), sources({0}))), Any(AnyVector(one(1), one(0))));
    EXPECT_EQ(matrixOf(AnyVector(Any(0), sources({0, 1}))), Any(AnyVector(Any(-1), Any(AnyVector(0, 1)))));
    EXPECT_EQ(matrixOf(AnyVector(sources({0}), Any(AnyVector()))), Any(AnyVector(one(0), Any(-1))));
}

TEST_F(AudioChain, ConvertersGetTheirSettings) {
    Job job(24, 44100, 2, 16, 48000, 2);
    Pipe pipe = job.pipe();
    EXPECT_FALSE(pipe->filter("srconvert", 0)->getParam("quality").isValid()) << "as a new one is";
    EXPECT_FALSE(pipe->filter("aquant", 1)->getParam("dither").isValid());
    job.conversion.rateQuality = "high";
    job.conversion.dither = "triangular";
    pipe = job.pipe();
    EXPECT_EQ(pipe->filter("srconvert", 0)->getParam("quality"), Any("high"));
    EXPECT_FALSE(pipe->filter("aquant", 0)->getParam("dither").isValid()) << "only the last one narrows";
    EXPECT_EQ(pipe->filter("aquant", 1)->getParam("dither"), Any("triangular"));
}

TEST_F(AudioChain, OnlyAPositiveDelayIsAFilter) {
    for (const auto& [delay, offset] : {std::pair{Any(200), 0.0},
                                        {Any(-200), 0.2},
                                        {Any(-1500.0), 1.5},
                                        {Any(0), 0.0},
                                        {Any("text"), 0.0}}) {
        const bool isFilter = delay == Any(200);
        Job job(16, 48000, 2, 16, 48000, 2);
        job.filters = AnyVector(Any(stored("adelay", AnyDict("delay", delay))));
        EXPECT_EQ(job.plan(), isFilter ? "aquant32 adelay aquant16" : "none");
        EXPECT_EQ(job.startOffset, MediaTime(offset));
        job.outBitsPerSample = 24;
        EXPECT_EQ(job.plan(), isFilter ? "aquant32 adelay aquant24" : "aquant32 aquant24");
    }
}

TEST_F(AudioChain, TheReportGoesToWhoNeedsIt) {
    FakeDecoder decoder(1, QvFramerate::f25p());
    decoder.audio(5000, 48000, 2);
    ASSERT_EQ(static_cast<QvDecodePipe&>(decoder).QvDecodePipe::open(), 0);
    const Pipe pipe(QvAProcessPipe::create());
    for (const char* name : {"avol", "dynamics"})
        pipe->addFilter(static_cast<QvAudioFilter*>(qv_registry()->newCodec(name)), -1);
    const auto known = [&](int i) -> AnyDict& {
        return static_cast<FakeAudioFilter*>(pipe->filter(i))->known;
    };
    const auto apply = [&](int stream) {
        QvProcessUtil::applyStreamReport(pipe.get(), &decoder, stream, 0, 5000);
    };
    apply(0);
    EXPECT_TRUE(decoder.requests.empty()) << "nobody needs it";
    // A filter that claims it and does not take it is reported, and the others get it.
    const LogCapture log;
    for (const int i : {0, 1}) known(i).set("_needsReport", 1);
    known(1).set("_streamReport", Any());
    apply(0);
    EXPECT_NEAR(known(1).get("_streamReport").asDict().getDouble("peakLeveldB"),
                20 * std::log10(1000.0 / 32768), 1e-9);
    EXPECT_TRUE(log.contains("Filter avol claimed that it needs stream report", QvLogMask::error));
    apply(3);
    EXPECT_TRUE(log.contains("Can not get audio stream report", QvLogMask::error));
}

TEST(AudioChainWithout, AMissingModuleIsNamed) {
    FakePlugin plugin;
    const auto why = [] { return failureOf([] { Job(16, 44100, 2, 16, 48000, 2).pipe(); }); };
    EXPECT_EQ(why(), "filter module 'srconvert' is not available");
    plugin.audio("srconvert");
    EXPECT_EQ(why(), "module 'aprocess' is not available");
    plugin.add(new QvAfModule);
    EXPECT_EQ(why(), "filter module 'aquant' is not available");
}

}  // namespace
