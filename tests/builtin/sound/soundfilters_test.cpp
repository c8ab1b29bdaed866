// What holds for every filter of sound: the sizes of the buffers written make no difference to what comes
// out, with 1 to 16 channels and values out to the ends of 32 bits.
#include <memory>

#include "core/engine/modules/qvregistry.h"
#include "tests/builtin/sound/sounds.h"
#include "tests/support/engine.h"

namespace {

AnyVector points(int last) {
    AnyVector list;
    for (const int i : {0, 1, 2})
        list.append(Any(AnyDict("time", i * 0.003, "volume", i == 1 ? 250 : last, "out_ch", 2 * i)));
    return list;
}

AnyVector swapped(int channels) {
    AnyVector matrix(Any(-1));
    for (int i = channels - 1; i > 0; --i) matrix.append(Any(AnyVector(Any(i), Any(0), Any(i / 2))));
    return matrix;
}

const AnyDict levels("samplePeakdB", -9.0, "truePeakdB", -9.0);
const AnyDict allStages("limiterActive", 1, "compressorActive", 1, "expanderActive", 1, "noisegateActive", 1);

struct Row {
    const char* module;
    AnyDict params;
    int most = 16;  // channels
};

std::unique_ptr<QvAudioFilter> opened(const Row& row, int channels) {
    std::unique_ptr<QvAudioFilter> filter(static_cast<QvAudioFilter*>(qv_registry()->newCodec(row.module)));
    EXPECT_EQ(filter->setParamDict(row.params), 0) << filter->errorDesc();
    if (Any(row.module) == "chconvert") filter->setParam("connMatrix", swapped(channels));
    EXPECT_EQ(filter->open(), 0) << filter->errorDesc();
    return filter;
}

TEST(SoundFilters, GiveTheSameForAnyBlocksOfOneToSixteenChannels) {
    const EngineScope engine;
    const Row rows[] = {
        {"aquant", AnyDict("outBitsPerSample", 24)},
        {"aquant", AnyDict("outBitsPerSample", 16, "dither", "triangular")},
        {"chconvert", {}},
        {"srconvert", AnyDict("inSamplerate", 48000, "outSamplerate", 44100, "splsToGet", 16)},
        {"avol", AnyDict("volume", 5.0, "channel2_volume", -3.0)},
        {"avol", AnyDict("volume", 40.0, "precision", 16)},
        {"adelay", AnyDict("delay", 4)},
        {"dynamics", allStages, 8},
        {"audiolevel", AnyDict("volume_list_0", points(0), "volume_list_7", points(90))},
        {"panning", AnyDict("panning_list_0", points(80), "panning_list_1", points(-100))},
        {"normalizer", AnyDict("target", 20.0, "truePeak", 20.0, "_streamReport", levels)},
    };
    for (const Row& row : rows)
        for (int channels = 1; channels <= row.most; ++channels) {
            SCOPED_TRACE(testing::Message() << row.module << ", " << channels << " channels");
            const Values in = noise(static_cast<size_t>(500 * channels), static_cast<unsigned>(channels));
            const auto whole = opened(row, channels);
            const Bytes expected = throughFilter(*whole, bytesOf(in), channels, 4);
            ASSERT_GT(expected.size(), in.size());
            for (const Blocks& blocks : {Blocks{1}, Blocks{7, 0, 130}}) {
                const auto filter = opened(row, channels);
                ASSERT_TRUE(throughFilter(*filter, bytesOf(in), channels, 4, blocks) == expected);
            }
        }
    for (const auto& [module, most] :
         {std::pair{"avol", 8}, {"audiolevel", 8}, {"panning", 8}, {"dynamics", 8}, {"aquant", -1}}) {
        const std::unique_ptr<QvCodec> filter(qv_registry()->newCodec(module));
        EXPECT_EQ(filter->getParam("_maxChannels").asInt32(-1), most) << module;
    }
}

}  // namespace
