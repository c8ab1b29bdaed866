// The rate converter, compared with the definition of its arithmetic, and with libsoxr called directly.
#include "builtin/sound/format/srconvert.h"

#include <array>
#include <cmath>
#include <numbers>

#include "builtin/pipes/audiopipe.h"
#include "builtin/sound/format/resampler.h"
#include "builtin/sound/format/soxrrate.h"
#include "core/engine/modules/qvregistry.h"
#include "tests/builtin/sound/sounds.h"
#include "tests/support/engine.h"
#include "tests/support/fake_streams.h"
#include "tests/support/log_capture.h"
#include "tests/support/platform_scope.h"
#include "tests/support/vector_targets.h"

#if __has_include(<soxr.h>)
#include <soxr.h>
#endif

namespace {

using Opened = OpenedSound<QvSamplerate2>;

constexpr int usualRates[] = {8000,  11025, 12000, 16000, 22050, 24000,  32000,
                              44100, 48000, 64000, 88200, 96000, 176400, 192000};

// The converter by its definition, one sum after the other, over a whole stream with silence around it.
class Model {
  public:
    Model(int in, int out) : in_(in), out_(out), accumulator_(out / 2 - 64 * (out - in)) {
        const double cutoff = out < in ? 0.93 * out / in : 1.0;
        half_.push_back(static_cast<int32_t>(std::floor(cutoff * 16384 + 0.1)));
        for (int i = 1; i < 512; ++i) {
            const double window = bessel(9.0 * std::sqrt(1 - std::pow(i / 511.0, 2))) / bessel(9.0);
            const double x = i * std::numbers::pi / 64;
            half_.push_back(static_cast<int32_t>(std::round(std::sin(x * cutoff) / x * window * 16384)));
        }
        half_.push_back(0);
    }

    // The next output sample.
    void next(const Values& stream, int channels, Values& to) {
        accumulator_ += (out_ - in_) * 64;
        while (accumulator_ < 0) accumulator_ += out_, phase_ += 1;
        while (accumulator_ > out_) accumulator_ -= out_, phase_ -= 1;
        index_ += (phase_ >> 6) + 1;
        phase_ &= 63;
        const long long count = static_cast<long long>(stream.size()) / channels;
        for (int c = 0; c < channels; ++c) {
            long long sum = 0;
            for (long long p = std::max(index_ - 7, 0LL); p <= std::min(index_ + 8, count - 1); ++p)
                sum +=
                    static_cast<long long>(half_[static_cast<size_t>(std::abs((p - index_) * 64 - phase_))]) *
                    stream[static_cast<size_t>(p * channels + c)];
            to.push_back(
                static_cast<int32_t>(std::clamp<long long>((sum + 8191) >> 14, INT32_MIN, INT32_MAX)));
        }
    }
    long long index() const { return index_; }

  private:
    static double bessel(double x) {
        double sum = 1, term = 1;
        for (int k = 1; term > sum * 1e-21; ++k) sum += term *= std::pow(x / 2 / k, 2);
        return sum;
    }

    long long in_, out_, accumulator_, index_ = -1;
    int phase_ = 0;
    std::vector<int32_t> half_;
};

Values modelled(const Values& in, int channels, int inRate, int outRate, size_t samples) {
    Model model(inRate, outRate);
    Values out;
    for (size_t i = 0; i < samples; ++i) model.next(in, channels, out);
    return out;
}

// All that comes out is right, and nothing but a batch and the taps is held back.
void compareWithModel(int inRate, int outRate, int channels, int samples, int batch, const Blocks& blocks) {
    SCOPED_TRACE(testing::Message() << inRate << " to " << outRate << ", " << channels << " channels, batch "
                                    << batch);
    const Values in = noise(static_cast<size_t>(samples * channels), static_cast<unsigned>(inRate + outRate));
    Opened filter{{"inSamplerate", inRate}, {"outSamplerate", outRate}, {"splsToGet", batch}};
    const Values out = throughFilter(filter, in, channels, blocks);
    const double ratio = static_cast<double>(outRate) / inRate;
    const auto made = out.size() / static_cast<size_t>(channels);
    EXPECT_GE(static_cast<double>(made), samples * ratio - batch - 50 * std::max(ratio, 1.0));
    ASSERT_TRUE(out == modelled(in, channels, inRate, outRate, made));
    EXPECT_EQ(filter.pcm()->position(), static_cast<long long>(made));
    EXPECT_EQ(filter.pcm()->samplerate(), outRate);
}

}  // namespace

TEST(Srconvert, EqualsTheModelForAllUsualRatesAndAnyBlocks) {
    const Blocks blocks[] = {{}, {1}, {7, 1, 300, 16, 2}, {441}};
    const int batches[] = {1000, 16, 1, 37, 1601};
    unsigned k = 0;
    for (const int in : usualRates)
        for (const int out : usualRates) {
            if (in == out) continue;
            const int samples = std::max(600, static_cast<int>(4000LL * in / std::max(in, out)));
            compareWithModel(in, out, 1 + static_cast<int>(k % 2), samples, batches[k % 5], blocks[k % 4]);
            if (HasFatalFailure()) return;
            ++k;
        }
    compareWithModel(44100, 48000, 2, 60000, 1920, {1764, 16, 30000});
    compareWithModel(1, 3, 1, 400, 1, {});
    compareWithModel(999983, 7, 1, 3000000, 5, {999983});
}

TEST(Srconvert, TakesOneToSixteenChannelsOnAnyVectorUnit) {
    for (const int64_t target : machineTargets()) {
        const OnTarget only(target);
        SCOPED_TRACE(hwy::TargetName(target));
        for (int channels = 1; channels <= 16; ++channels)
            for (const auto& [in, out] : {std::pair(44100, 48000), std::pair(96000, 44100)})
                compareWithModel(in, out, channels, 900, 100, {channels * 11, 3});
    }
}

TEST(Srconvert, SumsArePinned) {
    // The shape of the filter, worked out apart from the code: its middle, the cutoff, the unused tap.
    const snd::Resampler up(1, 1, 44100, 48000), down(1, 1, 48000, 44100);
    EXPECT_EQ(up.table()[7], 16384);
    EXPECT_EQ(down.table()[7], 13999);  // 0.93 * 0.91875 * 16384 = 13999.2
    EXPECT_EQ(up.table()[15], 0);
    EXPECT_EQ(down.table()[15], 0);
    EXPECT_EQ(up.table().size(), 1024u);
    EXPECT_EQ((snd::RateNeed{44100, 48000}).inputFor(1000), 1 + 999LL * 44100 / 48000 + 16);
}

// Two channels become one with a bit more to shift, one becomes two with the same sums.
TEST(Srconvert, ResamplerMixesTwoAndSpreadsOne) {
    for (const int64_t target : machineTargets()) {
        const OnTarget only(target);
        const Values values = noise(2 * 400);
        std::vector<double> in(values.begin(), values.end());
        in.resize(in.size() + snd::Resampler::padding);
        const int n = 300;
        Values one(n), two(2 * n), apart(2 * n), single(n);
        snd::Resampler(2, 1, 48000, 44100).make(in.data(), 400, one.data(), n);
        snd::Resampler(2, 2, 48000, 44100).make(in.data(), 400, apart.data(), n);
        snd::Resampler(1, 2, 48000, 44100).make(in.data(), 400, two.data(), n);
        snd::Resampler(1, 1, 48000, 44100).make(in.data(), 400, single.data(), n);
        for (size_t i = 0; i < n; ++i) {
            ASSERT_EQ(two[2 * i], single[i]);
            ASSERT_EQ(two[2 * i + 1], single[i]);
            const int64_t left = apart[2 * i], right = apart[2 * i + 1];
            const bool limited = std::max(std::abs(left), std::abs(right)) >= INT32_MAX;
            ASSERT_TRUE(limited || std::abs(2 * one[i] - left - right) <= 2) << i;
        }
    }
    const std::vector<double> ones(
        40, 3);  // 16 taps of the same weight pair: (sum + 16383) >> 15 of 2 * 3 * table
    const snd::Resampler reference(2, 1, 2, 4);
    int64_t sum = 0;
    for (size_t k = 7; k < 16; ++k) sum += 6 * std::lround(reference.table()[k]);
    int32_t first = 0;
    snd::Resampler(2, 1, 2, 4).make(ones.data(), 20, &first, 1);
    EXPECT_EQ(first, (sum + 16383) >> 15);
}

TEST(Srconvert, SaysHowMuchInputItNeeds) {
    for (const auto& [in, out] : {std::pair(44100, 48000), {192000, 8000}, {8000, 192000}, {48000, 48000}}) {
        Opened filter{{"inSamplerate", in}, {"outSamplerate", out}, {"splsToGet", 480}};
        for (int round = 0; round < 5; ++round) {
            const int need = filter.getParam("splsNeed").asInt32(-1);
            ASSERT_GT(need, 0);
            for (const int part : {need - 1, 1}) {
                EXPECT_EQ(filter.samples(), 0);
                QvPcm pcm = pcmOf(bytesOf(noise(static_cast<size_t>(part))), 1, 4);
                ASSERT_EQ(filter.write(pcm), 0);
                if (in == out) break;
            }
            EXPECT_GE(filter.samples(), in == out ? 479 : 480) << in << " to " << out << ", round " << round;
            filter.erase(filter.samples());
        }
    }
    QvSamplerate2 closed;
    ASSERT_EQ(closed.init(), 0);
    EXPECT_FALSE(closed.getParam("splsNeed").isValid()) << "only while open";
}

// With batches of 0 all input is used at once, with silence after it, as far as the output has room.
TEST(Srconvert, ABatchOfZeroTakesTheWholeBuffer) {
    const Values in = noise(2 * 500);
    Opened filter{{"inSamplerate", 44100}, {"outSamplerate", 96000}, {"splsToGet", 0}};
    QvPcm pcm = pcmOf(bytesOf(in), 2, 4, 44100);
    ASSERT_EQ(filter.write(pcm), 0);
    EXPECT_EQ(filter.pcm()->size(), static_cast<int>(96000 / 44100.0 * 1.02 * 500));
    Bytes out;
    take(filter, out);
    const auto made = out.size() / 8;
    EXPECT_EQ(made, 1089u);  // the last one lies at 1088 * 44100 / 96000 = 499.8
    EXPECT_TRUE(valuesOf(out) == modelled(in, 2, 44100, 96000, made));

    // A sound that does not know its rate gets room as one of 48 kHz does.
    Opened other{{"inSamplerate", 44100}, {"outSamplerate", 96000}, {"splsToGet", 0}};
    QvPcm unknown = pcmOf(bytesOf(in), 2, 4, 0);
    ASSERT_EQ(other.write(unknown), 0);
    EXPECT_EQ(other.pcm()->size(), static_cast<int>(96000 / 48000.0 * 1.02 * 500));
}

TEST(Srconvert, EqualRatesCopyAnyWidth) {
    for (const int width : {1, 2, 3, 4}) {
        const Bytes in = noiseBytes(static_cast<size_t>(600 * width));
        Opened filter{{"inSamplerate", 48000}, {"outSamplerate", 48000}};
        EXPECT_TRUE(throughFilter(filter, in, 2, width, {13, 100}) == in);
    }
}

TEST(Srconvert, CloseForgetsTheStream) {
    const Values in = noise(3000);
    LogCapture log;
    Opened filter{{"inSamplerate", 32000}, {"outSamplerate", 48000}, {"splsToGet", 100}};
    EXPECT_TRUE(log.contains("Opening samplerate converter, 32000->48000", QvLogMask::info));
    const Values first = throughFilter(filter, in, 1);
    ASSERT_EQ(filter.close(), 0);
    EXPECT_EQ(filter.getParam("splsToGet"), Any(1000));
    filter.setParam("splsToGet", 100);
    ASSERT_EQ(filter.open(), 0);
    EXPECT_TRUE(throughFilter(filter, in, 1) == first);
}

TEST(Srconvert, RatesHoldUntilClose) {
    const Values in = noise(4000);
    for (const auto& [inRate, outRate] : {std::pair(0, 0), {192000, 8000}, {1, 1 << 30}}) {
        Opened filter{{"inSamplerate", 8000}, {"outSamplerate", 96000}, {"splsToGet", 100}};
        Values out = throughFilter(filter, in, 1);
        filter.setParam("inSamplerate", inRate);
        filter.setParam("outSamplerate", outRate);
        for (const int32_t value : throughFilter(filter, in, 1)) out.push_back(value);
        Values both = in;
        both.insert(both.end(), in.begin(), in.end());
        EXPECT_TRUE(out == modelled(both, 1, 8000, 96000, out.size())) << inRate;
    }
    QvSamplerate2 late;
    ASSERT_EQ(late.init(), 0);
    ASSERT_EQ(late.open(), 0);
    late.setParam("inSamplerate", 1 << 30);
    QvPcm pcm = pcmOf(bytesOf(in), 1, 4);
    EXPECT_EQ(late.write(pcm), QvStatus::failed);
}

TEST(Srconvert, RefusesWhatItCanNotConvert) {
    QvSamplerate2 fresh;
    EXPECT_THROW(fresh.setParam("inSamplerate", 1), QvAssertFailure);
    ASSERT_EQ(fresh.init(), 0);
    EXPECT_EQ(fresh.setParam("quality", "best"), QvStatus::invalidParam);
    EXPECT_EQ(fresh.setParam("quality", 1), QvStatus::invalidParam);
    EXPECT_EQ(fresh.setParam("splsToGet", -1), QvStatus::invalidParam);
    EXPECT_EQ(fresh.setParam("inSamplerate", -8000), QvStatus::invalidParam);
    QvPcm pcm = pcmOf(bytesOf(noise(100)), 1, 4), narrow = pcmOf(noiseBytes(100), 1, 2);
    EXPECT_THROW(fresh.write(pcm), QvAssertFailure) << "not open";
    fresh.setParam("inSamplerate", 1 << 30);
    fresh.setParam("outSamplerate", 48000);
    EXPECT_EQ(fresh.open(), QvStatus::failed);
    fresh.setParam("inSamplerate", 0);
    ASSERT_EQ(fresh.open(), 0);
    EXPECT_EQ(fresh.write(pcm), QvStatus::failed);
    EXPECT_STREQ(fresh.errorDesc(), "[srconvert::writepcm]failed to allocate samplerate converter");

    Opened filter{{"inSamplerate", 44100}, {"outSamplerate", 48000}, {"splsToGet", 16}};
    EXPECT_THROW(filter.write(narrow), QvAssertFailure);
    ASSERT_EQ(filter.write(pcm), 0);
    const int before = filter.samples();
    QvPcm stereo = pcmOf(bytesOf(noise(100)), 2, 4);
    EXPECT_EQ(filter.write(stereo), QvStatus::failed);
    EXPECT_EQ(filter.samples(), before);
    filter.setParam("splsToGet", INT32_MAX);
    EXPECT_EQ(filter.write(pcm), QvStatus::outOfMemory);
    EXPECT_TRUE(
        std::string(filter.errorDesc()).starts_with("[srconvert::writepcm]failed to allocate space for "));
    EXPECT_EQ(filter.samples(), before);
    filter.setParam("splsToGet", 16);
    EXPECT_EQ(filter.write(pcm), 0);
    Bytes out;
    take(filter, out);
    Values both = noise(100);
    both.insert(both.end(), both.begin(), both.begin() + 100);
    EXPECT_TRUE(valuesOf(out) == modelled(both, 1, 44100, 48000, out.size() / 4))
        << "nothing is lost by a failure";
}

TEST(Srconvert, WithoutMemoryKeepsWhatItHad) {
    const Values in = noise(30000);
    QvPcm large = pcmOf(bytesOf(in), 1, 4),
          small = pcmOf(bytesOf(Values(in.begin(), in.begin() + 500)), 1, 4);
    NoMemory none, once(1);
    {
        const PlatformScope scope(none);
        Opened filter{{"inSamplerate", 44100}, {"outSamplerate", 48000}};
        EXPECT_EQ(filter.write(small), QvStatus::failed);
        EXPECT_STREQ(filter.errorDesc(), "[srconvert::writepcm]failed to allocate samplerate converter");
    }
    const PlatformScope scope(once);
    Opened filter{{"inSamplerate", 44100}, {"outSamplerate", 48000}, {"splsToGet", 100}};
    ASSERT_EQ(filter.write(small), 0);
    Bytes out;
    take(filter, out);
    filter.setParam("splsToGet", 100000);
    EXPECT_EQ(filter.write(large), QvStatus::outOfMemory);
    filter.setParam("splsToGet", 100);
    EXPECT_EQ(filter.write(small), 0);
    take(filter, out);
    Values both(in.begin(), in.begin() + 500);
    both.insert(both.end(), in.begin(), in.begin() + 500);
    EXPECT_TRUE(valuesOf(out) == modelled(both, 1, 44100, 48000, out.size() / 4));
}

#if __has_include(<soxr.h>)

namespace {

Values bySoxr(const Values& in, int channels, int inRate, int outRate) {
    const auto io = soxr_io_spec(SOXR_INT32_I, SOXR_INT32_I);
    const auto quality = soxr_quality_spec(SOXR_VHQ, 0);
    const size_t samples = in.size() / static_cast<size_t>(channels);
    Values out(static_cast<size_t>(static_cast<double>(samples) * outRate / inRate + 100) *
               static_cast<size_t>(channels));
    size_t made = 0;
    EXPECT_EQ(
        soxr_oneshot(inRate, outRate, static_cast<unsigned>(channels), in.data(), samples, nullptr,
                     out.data(), out.size() / static_cast<size_t>(channels), &made, &io, &quality, nullptr),
        nullptr);
    out.resize(made * static_cast<size_t>(channels));
    return out;
}

}  // namespace

TEST(SrconvertHigh, EqualsLibsoxrWhateverTheBlocks) {
    const struct {
        int in, out, channels;
        Blocks blocks;
    } rows[] = {{44100, 48000, 2, {1764, 16}}, {48000, 44100, 1, {1, 5000}}, {96000, 48000, 6, {}},
                {8000, 192000, 1, {333}},      {192000, 8000, 2, {7919}},    {44100, 47999, 16, {100}}};
    for (const auto& row : rows) {
        const auto n = static_cast<size_t>(row.channels) * 20000;
        const Values in = noise(n);
        Values padded = in;  // silence at the end brings out what the filter holds back
        padded.resize(n + static_cast<size_t>(row.channels) * 40000);
        Opened filter{{"inSamplerate", row.in}, {"outSamplerate", row.out}, {"quality", "high"}};
        Values out = throughFilter(filter, padded, row.channels, row.blocks);
        const Values expected = bySoxr(in, row.channels, row.in, row.out);
        ASSERT_GE(out.size(), expected.size()) << row.in << " to " << row.out;
        out.resize(expected.size());
        EXPECT_TRUE(out == expected) << row.in << " to " << row.out;
    }
}

// Both qualities put an impulse at the same place, and a sine keeps its phase to the end of a long stream.
TEST(SrconvertHigh, IsInStepWithTheStandardQuality) {
    for (const auto& [in, out] :
         {std::pair(44100, 48000), std::pair(48000, 44100), std::pair(96000, 44100)}) {
        const int seconds = 60;
        Values sine(static_cast<size_t>(in) * seconds);
        for (size_t i = 0; i < sine.size(); ++i)
            sine[i] = static_cast<int32_t>(
                4e6 * std::sin(2 * std::numbers::pi * 997.0 * static_cast<double>(i) / in));
        Opened high{{"inSamplerate", in}, {"outSamplerate", out}, {"quality", "high"}};
        Opened standard{{"inSamplerate", in}, {"outSamplerate", out}};
        const Values best = throughFilter(high, sine, 1, {in}),
                     usual = throughFilter(standard, sine, 1, {in});
        ASSERT_GT(best.size(), static_cast<size_t>(out) * (seconds - 1));
        double worst = 0;
        for (size_t i = 2000; i < best.size(); ++i) {
            const double ideal = 4e6 * std::sin(2 * std::numbers::pi * 997.0 * static_cast<double>(i) / out);
            worst = std::max(worst, std::abs(best[i] - ideal));
        }
        EXPECT_LT(worst, 2.0) << in << " to " << out << ", of 4e6";
        double difference = 0;
        for (size_t i = best.size() / 2; i < std::min(best.size(), usual.size()); ++i)
            difference = std::max(difference, std::abs(static_cast<double>(best[i]) - usual[i]));
        EXPECT_LT(difference, 4e6 * 0.06) << in << " to " << out;
    }
}

#endif

// Both qualities bring the same number of samples through a pipe, the last ones of the input among them.
TEST(SrconvertHigh, CountsAreThoseOfTheStandardQuality) {
    if (!snd::SoxrRate::isBuiltIn()) GTEST_SKIP() << "built without libsoxr";
    const EngineScope engine;
    for (const auto& [in, out] : {std::pair(44100, 48000), std::pair(96000, 44100), std::pair(8000, 192000)})
        for (const int length : {in / 2 + 1, in / 2 + 333, 5})
            for (const char* quality : {"standard", "high"}) {
                SCOPED_TRACE(testing::Message() << in << " to " << out << ", " << length << ", " << quality);
                FakeDecoder decoder(1, QvFramerate::f25p());
                decoder.audio(length, in);
                QvAf pipe;
                auto* wide = static_cast<QvAudioFilter*>(qv_registry()->newCodec("aquant"));
                auto* rate = static_cast<QvAudioFilter*>(qv_registry()->newCodec("srconvert"));
                pipe.addFilter(wide, -1);
                pipe.addFilter(rate, -1);
                ASSERT_EQ(pipe.init(), 0);
                wide->setParam("outBitsPerSample", 32);
                rate->setParam("inSamplerate", in);
                rate->setParam("outSamplerate", out);
                rate->setParam("quality", quality);
                ASSERT_EQ(pipe.open(), 0);
                const int due = static_cast<int>(static_cast<long long>(length) * out / in), step = out / 25;
                for (int done = 0; done < due; done += step) {
                    const int want = std::min(step, due - done);
                    ASSERT_EQ(pipe.process(&decoder, 0, want), 0) << done;
                    pipe.erase(want);
                }
                EXPECT_EQ(pipe.process(&decoder, 0, out), QvStatus::endOfStream);
                pipe.close();
            }
}

TEST(SrconvertHigh, IsRefusedWithoutTheLibrary) {
    QvSamplerate2 filter;
    ASSERT_EQ(filter.init(), 0);
    filter.setParam("inSamplerate", 44100);
    filter.setParam("outSamplerate", 48000);
    EXPECT_EQ(filter.setParam("quality", "high"), 0);
    EXPECT_EQ(filter.open(), snd::SoxrRate::isBuiltIn() ? 0 : QvStatus::failed);
    AnyDict stored;
    filter.store(stored);
    EXPECT_EQ(stored.get("quality"), Any("high"));
}
