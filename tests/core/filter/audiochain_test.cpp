// The plan of the automatic audio chain.
#include <gtest/gtest.h>

#include <cmath>
#include <memory>
#include <string>

#include "builtin/modules.h"
#include "core/engine/qvexception.h"
#include "core/filter/jobdescription.h"
#include "core/filter/qvprocesspipe.h"
#include "core/filter/qvprocessutil.h"
#include "core/media/qvgeometry.h"
#include "tests/support/fake_filters.h"
#include "tests/support/fake_streams.h"
#include "tests/support/log_capture.h"

namespace {

using Pipe = std::unique_ptr<QvAProcessPipe>;

struct Format {
    int bits, rate, channels;
};

AudioJobDescription job(const Format& in, const Format& out, const AnyVector& matrix = {}) {
    AudioJobDescription job;
    job.inBitsPerSample = in.bits;
    job.inSamplerate = in.rate;
    job.inChannels = in.channels;
    job.outBitsPerSample = out.bits;
    job.outSamplerate = out.rate;
    job.outChannels = out.channels;
    job.connMatrix = matrix;
    return job;
}

Any sources(std::initializer_list<int> channels) {
    AnyVector list;
    for (const int channel : channels) list.append(AnyDict("channel", channel));
    return list;
}

AnyDict filter(const char* name, int position, int front) {
    return AnyDict("name", name, "_on", 1, "_position", position, "_front", front);
}

class AudioChain : public testing::Test {
  protected:
    AudioChain() {
        for (const char* name : {"aquant", "srconvert", "chconvert", "adelay", "avol", "dynamics"})
            plugin_.audio(name);
        plugin_.add(new QvAfModule);
    }
    static Pipe make(const AudioJobDescription& job) {
        MediaTime delay;
        return Pipe(QvProcessUtil::createAudioPipe(job, delay));
    }
    static std::string plan(const AudioJobDescription& job) {
        const Pipe pipe = make(job);
        if (!pipe) return "none";
        std::string names;
        for (int i = 0; i < pipe->nrFilters(); ++i) {
            auto& filter = *pipe->filter(i);
            names += std::string(i ? " " : "") + filter.name();
            if (Any(filter.name()) == "aquant")
                names += std::to_string(filter.getParam("outBitsPerSample").asInt32(0));
        }
        EXPECT_NE(pipe->filter(0)->getState(), 3) << "the link opens it";
        return names;
    }
    FakePlugin plugin_;
};

TEST_F(AudioChain, Plans) {
    struct Row {
        Format in, out;
        const char* plan;
    };
    const Row rows[] = {
        {{16, 48000, 2}, {16, 48000, 2}, "none"},
        {{16, 48000, 2}, {24, 48000, 2}, "aquant32 aquant24"},
        {{32, 48000, 2}, {16, 48000, 2}, "aquant16"},
        {{16, 44100, 2}, {16, 48000, 2}, "aquant32 srconvert aquant16"},
        {{16, 48000, 2}, {16, 48000, 6}, "aquant32 chconvert aquant16"},
        {{16, 44100, 2}, {16, 48000, 6}, "aquant32 srconvert chconvert aquant16"},
        {{16, 44100, 6}, {16, 48000, 2}, "aquant32 chconvert srconvert aquant16"},
        {{32, 44100, 6}, {32, 48000, 2}, "chconvert srconvert aquant32"},
    };
    for (const auto& row : rows) EXPECT_EQ(plan(job(row.in, row.out)), row.plan);
}

TEST_F(AudioChain, CustomFiltersStandAroundTheConverters) {
    auto description = job({16, 44100, 2}, {16, 48000, 2});
    description.filters =
        AnyVector(Any(filter("avol", 2, 0)), Any(filter("dynamics", 1, 0)), Any(filter("avol", 1, 1)));
    EXPECT_EQ(plan(description), "aquant32 avol srconvert dynamics avol aquant16");
    description.outSamplerate = 44100;
    EXPECT_EQ(plan(description), "aquant32 avol dynamics avol aquant16");
}

TEST_F(AudioChain, TheMatrixIsNormalised) {
    const Format stereo{16, 48000, 2};
    const auto matrixOf = [&](const AnyVector& matrix) -> Any {
        const Pipe pipe = make(job(stereo, stereo, matrix));
        return pipe ? pipe->filter("chconvert", 0)->getParam("connMatrix") : Any("none");
    };
    EXPECT_EQ(matrixOf(AnyVector(sources({0}), sources({1}))), Any("none"));
    EXPECT_EQ(matrixOf(AnyVector(Any(AnyDict("channel", 0)), sources({1}))), Any("none"));
    EXPECT_EQ(matrixOf(AnyVector(sources({1}), sources({0}))),
              Any(AnyVector(Any(AnyVector(Any(1))), Any(AnyVector(Any(0))))));
    EXPECT_EQ(matrixOf(AnyVector(Any(0), sources({0, 1}))), Any(AnyVector(Any(-1), Any(AnyVector(0, 1)))));
    EXPECT_EQ(matrixOf(AnyVector(sources({0}), Any(AnyVector()))),
              Any(AnyVector(Any(AnyVector(Any(0))), Any(-1))));
}

TEST_F(AudioChain, OnlyAPositiveDelayIsAFilter) {
    struct Row {
        Any delay;
        const char* plan;
        double offset;
    };
    const Row rows[] = {
        {Any(200), "aquant32 adelay aquant16", 0},
        {Any(-200), "none", 0.2},
        {Any(-1500.0), "none", 1.5},
        {Any(0), "none", 0},
        {Any("text"), "none", 0},
    };
    for (const auto& row : rows) {
        auto description = job({16, 48000, 2}, {16, 48000, 2});
        AnyDict state = filter("adelay", 1, 0);
        state.set("delay", row.delay);
        description.filters = AnyVector(Any(state));
        EXPECT_EQ(plan(description), row.plan);
        MediaTime offset;
        Pipe pipe(QvProcessUtil::createAudioPipe(description, offset));
        EXPECT_EQ(offset, MediaTime(row.offset));
        description.outBitsPerSample = 24;
        pipe.reset(QvProcessUtil::createAudioPipe(description, offset));
        EXPECT_EQ(pipe->filter("adelay", 0) != nullptr, row.delay == Any(200));
    }
}

TEST_F(AudioChain, TheReportGoesToWhoNeedsIt) {
    FakeDecoder decoder(1, QvFramerate::f25p());
    decoder.audio(5000, 48000, 2);
    ASSERT_EQ(static_cast<QvDecodePipe&>(decoder).QvDecodePipe::open(), 0);
    Pipe pipe(QvAProcessPipe::create());
    for (const char* name : {"avol", "dynamics"})
        pipe->addFilter(static_cast<QvAudioFilter*>(qv_registry()->newCodec(name)), -1);
    QvProcessUtil::applyStreamReport(pipe.get(), &decoder, 0, 0, 5000);
    EXPECT_TRUE(decoder.requests.empty());

    auto* needy = static_cast<FakeAudioFilter*>(pipe->filter(1));
    needy->known.set("_needsReport", 1);
    needy->known.set("_streamReport", Any());
    QvProcessUtil::applyStreamReport(pipe.get(), &decoder, 0, 0, 5000);
    const Any report = needy->getParam("_streamReport");
    ASSERT_TRUE(report.isDict());
    EXPECT_NEAR(report.asDict().getDouble("peakLeveldB"), 20 * std::log10(1000.0 / 32768), 1e-9);

    // One that claims it and does not take it is told of, and the run goes on.
    LogCapture log;
    static_cast<FakeAudioFilter*>(pipe->filter(0))->known.set("_needsReport", 1);
    EXPECT_NO_THROW(QvProcessUtil::applyStreamReport(pipe.get(), &decoder, 0, 0, 5000));
    EXPECT_TRUE(log.contains("Filter avol claimed that it needs stream report", QvLogMask::error));
    QvProcessUtil::applyStreamReport(pipe.get(), &decoder, 3, 0, 5000);
    EXPECT_TRUE(log.contains("Can not get audio stream report", QvLogMask::error));
}

TEST(AudioChainWithout, AMissingConverterIsNamed) {
    FakePlugin plugin;
    MediaTime delay;
    const auto why = [&]() -> std::string {
        try {
            Pipe(QvProcessUtil::createAudioPipe(job({16, 44100, 2}, {16, 48000, 2}), delay));
        } catch (const QvAssertFailure& failure) {
            return failure.what();
        }
        return "";
    };
    EXPECT_NE(why().find("filter module 'srconvert' is not available"), std::string::npos);
    plugin.audio("srconvert");
    EXPECT_NE(why().find("module 'aprocess' is not available"), std::string::npos);
    plugin.add(new QvAfModule);
    EXPECT_NE(why().find("filter module 'aquant' is not available"), std::string::npos);
}

}  // namespace
