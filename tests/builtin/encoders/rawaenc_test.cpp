#include "builtin/encoders/rawaenc.h"

#include "builtin/encoders/qvdummyaudio.h"
#include "builtin/modules.h"
#include "core/measure/qvgeometry.h"
#include "core/stream/auxinfoid.h"
#include "tests/support/checks.h"
#include "tests/support/fake_streams.h"
#include "tests/support/pictures.h"
#include "tests/support/test_stream.h"

namespace {

struct RawAudio : testing::Test {
    RawAudio() { enc().init(); }
    RawAudioEnc& enc() { return *enc_; }
    void format(int samplerate, int channels, int bits) {
        const AnyDict params("samplerate", samplerate, "channels", channels, "bitsPerSample", bits);
        ASSERT_EQ(enc().setParamDict(params), 0);
    }
    void start(const char* muxerName) {
        out_.data.clear();
        out_.units.clear();
        muxer_ = std::make_unique<FakeMuxer>(muxerName);
        out_.setOwner(muxer_.get());
        ASSERT_EQ(enc().attachOutStream(&out_), 0);
        ASSERT_EQ(enc().open(), 0);
    }
    int write(int samples, int channels = 2, int bytes = 2, int count = -1) {
        fillSound(pcm_, samples, channels, bytes, 48000);
        return enc().writePcm(&pcm_, count);
    }

    RawAudioEncoderModule module_;
    TestStream out_;
    QvPcm pcm_;
    std::unique_ptr<FakeMuxer> muxer_;
    std::unique_ptr<RawAudioEnc> enc_{static_cast<RawAudioEnc*>(module_.create())};
};

TEST_F(RawAudio, AnnouncesAndEndsForTheElementaryExport) {
    const TestStream::Unit whole{QvAuxId::AUDIO_AU_CODE, 2000, 16}, part{QvAuxId::AUDIO_AU_CODE, 80, 16};
    const TestStream::Unit end{QvAuxId::STREAM_END_CODE, 0, 0};
    for (const auto& [muxer, units] :
         {std::pair("rawmux", std::vector{whole, part, end}), {"memmux", {whole, part}}, {"mp4mux", {}}}) {
        SCOPED_TRACE(muxer);
        start(muxer);
        for (const int count : {-1, 20, 0}) ASSERT_EQ(write(500, 2, 2, count), 0);
        EXPECT_TRUE(out_.data == soundBytes(pcm_) + soundBytes(pcm_).substr(0, 80));
        ASSERT_EQ(enc().close(), 0);
        EXPECT_EQ(out_.units, units);
    }
    start("rawmux");
    EXPECT_EQ(enc().abort(), 0);
    EXPECT_TRUE(out_.units.empty());
}

TEST_F(RawAudio, LongBuffersGoInWholeSamples) {
    format(48000, 3, 24);
    out_.chunk = 1000;
    start("rawmux");
    ASSERT_EQ(write(1000, 3, 3), 0);
    EXPECT_TRUE(out_.data == soundBytes(pcm_));
    unsigned sum = 0;
    for (const auto& unit : out_.units) sum += unit.bytes % 9 ? 0 : unit.bytes;
    EXPECT_EQ(sum, 9000u);
}

TEST_F(RawAudio, RefusesWhatDoesNotFit) {
    EXPECT_EQ(enc().open(), QvStatus::failed);
    EXPECT_STREQ(enc().errorDesc(), "Output stream not attached");
    start("rawmux");
    for (const int status : {write(10, 1), write(10, 2, 3), write(10, 2, 2, 11), enc().writePcm(nullptr)})
        EXPECT_EQ(status, QvStatus::invalidArgument);
    EXPECT_TRUE(out_.data.empty());
    out_.failAfter = 0;
    EXPECT_EQ(write(10), QvStatus::failed);
    EXPECT_STREQ(enc().errorDesc(), "Error in raw audio encoder, can not allocte buffer, size=40");
    EXPECT_EQ(enc().setParam("channels", 33), QvStatus::invalidParam);
    for (const std::string name : {"channels", "samplerate", "bitsPerSample"}) {
        const Any range = static_cast<const QvCodec&>(enc()).getParam((name + "Range").c_str());
        for (const Any& offered : range.asVector())
            EXPECT_EQ(enc().setParam(name.c_str(), offered), 0) << name << offered.toInt32();
    }
    EXPECT_EQ(enc().setParam("bitsPerSample", 0), QvStatus::invalidParam);
}

TEST_F(RawAudio, HeadsTheStreamForOneContainer) {
    for (const auto& [samplerate, channels, bits, layout] :
         {std::tuple(48000, 2, 16, 4), {96000, 8, 24, 28 + 1 + 96}, {48000, 1, 20, 64}}) {
        format(samplerate, channels, bits);
        start("mxfmux");
        for (int i = 0; i < 2; ++i) ASSERT_EQ(write(4, channels, (bits + 7) / 8), 0);
        enc().close();
        const std::string header = std::string("LPCM") + static_cast<char>(layout) + '\0';
        EXPECT_TRUE(out_.data == header + soundBytes(pcm_) + soundBytes(pcm_));
    }
}

TEST(DummyAudio, HandsParametersAndSamplesToTheMultiplexer) {
    DummyAudioEnc enc;
    enc.init();
    enc.setParam("samplerate", 32000);
    enc.setParam("unknown", 1);
    TestStream out;
    EXPECT_EQ(enc.attachOutStream(&out), QvStatus::failed);
    EXPECT_STREQ(enc.errorDesc(), "Can  not attach dummy audio, output not a muxer");
    FakeMuxer muxer("dvmux");
    muxer.refused.set("unknown", 1);
    out.setAtachee(&muxer);
    ASSERT_EQ(enc.attachOutStream(&out), 0);
    EXPECT_EQ(muxer.params, AnyDict("samplerate", 32000));
    ASSERT_EQ(enc.open(), 0);
    QvPcm pcm;
    fillSound(pcm, 30, 4, 2, 32000);
    EXPECT_EQ(enc.writePcm(&pcm), 0);
    EXPECT_TRUE(out.data == soundBytes(pcm));
    out.failAfter = 300;
    EXPECT_EQ(enc.writePcm(&pcm), QvStatus::failed);
    EXPECT_EQ(enc.close() + enc.detachOutStream(), 0);
}

}  // namespace
