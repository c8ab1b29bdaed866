// The matrix of a mix against its definition, one product at a time.
#include "core/compose/qvaudiomix.h"

#include "core/media/qvpcm.h"
#include "tests/support/checks.h"
#include "tests/support/wav_bytes.h"

namespace {

struct Input {
    QvPcm pcm;
    Input(int samples, int channels, unsigned seed, int shift = 8) {
        pcm.init(samples, channels, 4, 48000);
        pcm.setSamples(samples);
        fillBytes(pcm.ptr(0), static_cast<std::size_t>(pcm.bytes()), seed);
        for (int i = 0; i < samples * channels; ++i) value(i) >>= shift;
    }
    std::int32_t& value(int i) { return reinterpret_cast<std::int32_t*>(pcm.ptr(0))[i]; }
};

TEST(QvAudioMix, EachProductIsShiftedBySelf) {
    constexpr int samples = 1003;
    std::vector<Input> inputs;
    AnyVector counts;
    for (const int channels : {1, 2, 5, 1}) {
        inputs.emplace_back(samples, channels, static_cast<unsigned>(channels + counts.size()),
                            counts.size() == 3 ? 0 : 8);
        counts.append(Any(channels));
    }
    TPtrList<QvPcm> list;
    for (Input& input : inputs) list.append(&input.pcm);
    for (const int outs : {1, 2, 3, 4, 7, 21}) {
        SCOPED_TRACE(outs);
        QvAudioMix mix;
        mix.init(outs, counts);
        double weights[21][4][5] = {};
        const struct {
            int out, stream, channel;
            double weight;
        } rows[] = {{0, 0, 0, 1.0},  {0, 1, 1, -0.3333}, {0, 2, 4, 0.7071}, {1, 2, 2, 2.5},
                    {1, 2, 3, -1.0}, {1, 1, 0, 1e-5},    {0, 3, 0, -31000}, {1, 3, 0, 0.99999},
                    {1, 0, 0, 0.0},  {2, 0, 0, 1.0},     {3, 3, 0, 0.5},    {5, 0, 0, -0.25},
                    {6, 2, 0, 1.0},  {20, 3, 0, 1.0},    {16, 0, 0, 3.0}};
        for (const auto& row : rows) {
            if (row.out >= outs) continue;
            mix.setWeight(row.out, row.stream, row.channel, row.weight);
            weights[row.out][row.stream][row.channel] = row.weight;
        }
        EXPECT_EQ(mix.weight(0, 0, 0), 65536.0);
        QvPcm out;
        out.init(10, outs, 4, 48000);
        ASSERT_EQ(mix.mixChannels(samples, out, list), 0);
        ASSERT_EQ(out.samples(), samples);
        const auto* got = reinterpret_cast<const std::int32_t*>(out.ptr(0));
        for (int t = 0; t < samples; ++t)
            for (int o = 0; o < outs; ++o) {
                std::uint32_t sum = 0;
                for (int s = 0; s < 4; ++s)
                    for (int c = 0; c < counts.at(s).asInt32(); ++c) {
                        const auto coefficient = static_cast<long long>(weights[o][s][c] * 65536.0 + 0.5);
                        const long long x =
                            inputs[static_cast<std::size_t>(s)].value(t * counts.at(s).asInt32() + c);
                        sum += static_cast<std::uint32_t>(x * coefficient >> 16);
                    }
                auto wanted = static_cast<std::int32_t>(sum);
                // The clamp counts values, so it ends before the last samples of several channels.
                if (t * outs + o < samples) wanted = std::clamp(wanted, -8388608, 8388607);
                ASSERT_EQ(got[t * outs + o], wanted) << t << " " << o;
            }
    }
}

// Coefficients of 64 bits come from stored matrices alone.
TEST(QvAudioMix, StoresAndRestores) {
    QvAudioMix mix;
    mix.initLinear(AnyVector(2, 1));
    EXPECT_EQ(mix.nrOutChannels(), 3);
    EXPECT_EQ(mix.maxNrInChannels(0), 2);
    EXPECT_EQ(mix.weight(2, 1, 0), 65536.0);
    EXPECT_EQ(mix.weight(1, 0, 1), 65536.0);
    EXPECT_EQ(mix.weight(1, 0, 0), 0.0);
    AnyDict dict;
    mix.store(dict);
    EXPECT_TRUE(dict.get("weights").asDict() ==
                AnyDict("0_0_0", 65536LL, "1_0_1", 65536LL, "2_1_0", 65536LL));
    dict.get("weights").asDict().set("0_1_0", Any(-(1LL << 40) + 3));
    dict.get("weights").asDict().set("a_b", Any(1));
    QvAudioMix back;
    ASSERT_EQ(back.restore(dict), 0);
    EXPECT_EQ(back.weight(0, 1, 0), static_cast<double>(-(1LL << 40) + 3));
    Input first(9, 2, 1), second(9, 1, 2);
    TPtrList<QvPcm> list;
    list.append(&first.pcm);
    list.append(&second.pcm);
    QvPcm out;
    out.init(9, 3, 4, 48000);
    ASSERT_EQ(back.mixChannels(9, out, list), 0);
    const auto* got = reinterpret_cast<const std::int32_t*>(out.ptr(0));
    for (int t = 3; t < 9; ++t) {
        const __int128 product = static_cast<__int128>(second.value(t)) * (-(1LL << 40) + 3);
        const auto sum =
            static_cast<std::uint32_t>(product >> 16) + static_cast<std::uint32_t>(first.value(2 * t));
        EXPECT_EQ(got[t * 3], static_cast<std::int32_t>(sum));
    }

    const struct {
        const char* key;
        Any value;
    } wrong[] = {{"name", "x"},
                 {"nrOutChannels", "3"},
                 {"nrInStreams", Any()},
                 {"nrInStreams", -1},
                 {"weights", 1},
                 {"maxNrInChannels", 2000000000},
                 {"nrInStreams", 2000000000},
                 {"weights", AnyDict("7_0_0", 1)}};
    for (const auto& row : wrong) {
        AnyDict damaged = dict;
        damaged.set(row.key, row.value);
        EXPECT_EQ(back.restore(damaged), -1) << row.key;
        EXPECT_EQ(back.nrOutChannels(), 0);
    }
}

TEST(QvAudioMix, MisuseIsAnAssertion) {
    QvAudioMix mix;
    EXPECT_THROW(mix.init(0, AnyVector(Any(1))), QvAssertFailure);
    mix.init(2, AnyVector(1, 2));
    EXPECT_THROW(mix.setWeight(2, 0, 0, 1), QvAssertFailure);
    EXPECT_THROW(mix.setWeight(0, 2, 0, 1), QvAssertFailure);
    EXPECT_THROW(mix.setWeight(0, 0, 2, 1), QvAssertFailure);
    EXPECT_THROW(mix.weight(-1, 0, 0), QvAssertFailure);
    mix.setWeight(0, 1, 1, 1.0);
    Input few(4, 1, 1), right(4, 2, 1);
    QvPcm out, narrowOut;
    out.init(4, 2, 4, 48000);
    narrowOut.init(4, 2, 2, 48000);
    TPtrList<QvPcm> list;
    list.append(&few.pcm);
    list.append(&few.pcm);
    EXPECT_THROW(mix.mixChannels(4, out, list), QvAssertFailure);  // the second stream has one channel
    list.set(1, &right.pcm);
    EXPECT_EQ(mix.mixChannels(4, out, list), 0);
    EXPECT_THROW(mix.mixChannels(5, out, list), QvAssertFailure);
    EXPECT_THROW(mix.mixChannels(4, narrowOut, list), QvAssertFailure);
    list.append(&right.pcm);
    EXPECT_THROW(mix.mixChannels(4, out, list), QvAssertFailure);
    TPtrList<QvPcm> fewer;
    fewer.append(&few.pcm);
    EXPECT_EQ(mix.mixChannels(0, out, fewer), 0);
}

}  // namespace
