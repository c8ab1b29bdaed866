// Reports for filters that ask for the levels of the sound that reaches them.
#include <cmath>
#include <numeric>

#include "core/decode/qvaudiostreamreport.h"
#include "tests/core/filter/chains.h"

namespace {

// Halves its samples `times` times, and once more if it has a report.
class Halver : public FakeAudioFilter {
  public:
    using FakeAudioFilter::FakeAudioFilter;

    int setParam(const char* name, const Any& value) override {
        if (std::strcmp(name, "_streamReport") != 0) return FakeAudioFilter::setParam(name, value);
        report = value.asDict();
        return 0;
    }
    int write(QvPcm& pcm) override {
        const int before = out.samples();
        const int result = FakeAudioFilter::write(pcm);
        const int shift = known.getInt32("times", 0) + (report.empty() ? 0 : 1);
        auto* value = out.samples() > before ? reinterpret_cast<short*>(out.ptr(before)) : nullptr;
        for (int i = 0; i < (out.samples() - before) * out.channels(); ++i)
            value[i] = static_cast<short>(value[i] >> shift);
        return result;
    }
    AnyDict report;
};

class Converter : public FakeAudioFilter {
  public:
    explicit Converter(const QvModule* module) : FakeAudioFilter(module) { ratio = 2.0; }
};

class ChainLoudness : public testing::Test {
  protected:
    ChainLoudness() : decoder_(1, QvFramerate::f25p()) {
        plugin_.add(new QvAfModule);
        plugin_.add(new FakeModule<Halver>(QvModuleType::audioFilter, "avol"));
        plugin_.add(new FakeModule<Converter>(QvModuleType::audioFilter, "srconvert"));
        decoder_.audio(96000, 48000, 2);
        EXPECT_EQ(static_cast<QvDecodePipe&>(decoder_).QvDecodePipe::open(), 0);
        pipe_.reset(QvAProcessPipe::create());
    }
    Halver& halver(int times, int need) {
        auto* filter = static_cast<Halver*>(qv_registry()->newCodec("avol"));
        filter->known.set("times", times);
        filter->known.set("_needsReport", need);
        pipe_->addFilter(filter, -1);
        return *filter;
    }
    void apply(long long from, long long to) {
        QvProcessUtil::applyStreamReport(pipe_.get(), &decoder_, 0, from, to);
    }
    static double dB(int peak) { return 20 * std::log10(peak / 32768.0); }
    static double peakOf(const Halver& filter) { return filter.report.getDouble("samplePeakdB", 1.0); }

    FakePlugin plugin_;
    FakeDecoder decoder_;  // values 1 to 1000, over and over
    std::unique_ptr<QvAProcessPipe> pipe_;
};

TEST_F(ChainLoudness, ALevelIsThatOfTheSoundAtTheFilter) {
    Halver &first = halver(1, QvReportNeed::loudness), &second = halver(0, QvReportNeed::peak),
           &third = halver(0, QvReportNeed::loudness);
    apply(0, 96000);
    EXPECT_NEAR(peakOf(first), dB(1000), 1e-6) << "no filter before it";
    EXPECT_NEAR(second.report.getDouble("peakLeveldB"), dB(1000), 1e-6);
    EXPECT_FALSE(second.report.isSet("samplePeakdB")) << "it did not ask";
    EXPECT_NEAR(peakOf(third), dB(1000 >> 3), 1e-6) << "halved, and once more by each filter with a report";
    EXPECT_NEAR(third.report.getDouble("peakLeveldB"), dB(1000), 1e-6);
    for (const char* key : {"integratedLoudness", "loudnessRange", "truePeakdB", "rmsdB"})
        EXPECT_TRUE(third.report.get(key).isFloat()) << key;
    EXPECT_GE(third.report.getDouble("truePeakdB"), peakOf(third));
    EXPECT_EQ(decoder_.track(0).position, 0);
    EXPECT_TRUE(first.written.empty()) << "the chain itself is not run";
}

TEST_F(ChainLoudness, OnlyTheRangeCounts) {
    Halver &first = halver(0, QvReportNeed::loudness), &second = halver(0, QvReportNeed::loudness);
    const struct {
        long long from, to;
        int peak;
    } rows[] = {{0, 400, 400},     {1200, 1300, 300}, {95990, 200000, 1000},
                {900, 2100, 1000}, {1000, 1002, 2},   {0, 8202, 1000}};
    for (const auto& [from, to, peak] : rows) {
        first.report.clear();
        apply(from, to);
        EXPECT_NEAR(peakOf(first), dB(peak), 1e-6) << from;
        EXPECT_NEAR(peakOf(second), dB(peak >> 1), 1e-6) << from;
    }
    apply(500, 500);
    EXPECT_EQ(peakOf(first), -HUGE_VAL);
    EXPECT_EQ(first.report.getDouble("integratedLoudness", 0), -HUGE_VAL);
}

TEST_F(ChainLoudness, ConvertedRatesAreMeasuredToTheirEnd) {
    auto* converter = static_cast<Converter*>(qv_registry()->newCodec("srconvert"));
    converter->known.set("inSamplerate", 48000);
    converter->known.set("outSamplerate", 96000);
    pipe_->addFilter(converter, -1);
    Halver& last = halver(0, QvReportNeed::loudness);
    apply(0, 96000);
    EXPECT_EQ(peakOf(last), -HUGE_VAL) << "the converter gives silence";
    int read = 0;
    for (const int request : decoder_.requests)
        read += request == QvAudioStreamReport::groupSamples ? 0 : request;
    EXPECT_GE(read, 96000);
}

TEST_F(ChainLoudness, AWatchSeesAllReadingsAndEndsThem) {
    for (const double end : {2.0, 0.1, 0.5, 0.9}) {
        decoder_.close();
        EXPECT_EQ(static_cast<QvDecodePipe&>(decoder_).QvDecodePipe::open(), 0);
        pipe_->clear();
        decoder_.requests.clear();
        Halver &first = halver(1, QvReportNeed::loudness), &second = halver(0, QvReportNeed::loudness);
        std::vector<double> parts;
        const bool done =
            QvProcessUtil::applyStreamReport(pipe_.get(), &decoder_, 0, 0, 96000, [&](double part) {
                parts.push_back(part);
                return part < end;
            });
        EXPECT_EQ(done, end > 1);
        EXPECT_TRUE(std::is_sorted(parts.begin(), parts.end()));
        EXPECT_NEAR(parts.back(), std::min(end, 1.0), 0.03);
        EXPECT_EQ(first.report.empty(), end < 0.6);
        EXPECT_EQ(second.report.empty(), end < 1);
        EXPECT_EQ(decoder_.track(0).position, 0);
        EXPECT_LT(std::accumulate(decoder_.requests.begin(), decoder_.requests.end(), 0),
                  3 * 96000 * std::min(end, 1.0) + 9000);
    }
}

// Samples of four bytes, as a mixed input has them, have no report of their peak.
TEST_F(ChainLoudness, WhatCanNotBeMeasuredIsLeftOut) {
    Halver &peak = halver(0, QvReportNeed::peak), &loud = halver(0, QvReportNeed::loudness);
    decoder_.track(0).params.set("bytesPerSample", 4);
    const LogCapture log;
    apply(0, 96000);
    EXPECT_TRUE(log.contains("Can not get audio stream report", QvLogMask::error));
    EXPECT_TRUE(peak.report.empty());
    EXPECT_FALSE(loud.report.isSet("peakLeveldB"));
    EXPECT_NEAR(peakOf(loud), dB(1000), 1e-6);
    peak.label = "gone";
    loud.report.clear();
    apply(0, 96000);
    EXPECT_TRUE(log.contains(
        "Can not measure the loudness for filter avol: filter gone can not be made a second time",
        QvLogMask::error));
    EXPECT_TRUE(loud.report.empty());
    pipe_->clear();
    halver(0, QvReportNeed::peak);
    decoder_.requests.clear();
    apply(0, 96000);
    EXPECT_TRUE(decoder_.requests.empty());
}

}  // namespace
