// Mixes of files against a model of the mix, seeks, and set-ups that can't be opened.
#include "builtin/decoders/mix/aumixdec.h"

#include <cmath>

#include "builtin/decoders/mix/adecstream.h"
#include "builtin/shared/inputnesting.h"
#include "core/compose/qvaudiomixdecsetup.h"
#include "core/decode/decodefactory.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/job/filtersstate.h"
#include "core/media/qvpcm.h"
#include "tests/support/checks.h"
#include "tests/support/counted_memory.h"
#include "tests/support/engine.h"
#include "tests/support/wav_bytes.h"

namespace {

using Values = std::vector<int>;
using Pipe = std::unique_ptr<QvDecodePipe>;

class AuMixDec : public testing::Test {
  protected:
    EngineScope engine;
    TempFolder folder;
    QvAudioMixDecSetup setup;

    std::string makeWav(const std::string& name, unsigned samples, unsigned channels = 1,
                        unsigned rate = 48000, unsigned bits = 16) const {
        const auto seed = static_cast<unsigned>(name[0]);
        return folder.write(
            name, riff(wavChunk("fmt ", wavFormat(1, channels, rate, bits)) +
                       wavChunk("data", patternBytes(std::size_t{samples} * channels * bits / 8, seed))));
    }
    // One channel of such a file of 16 bits, in the range of 24.
    static Values channelOf(const std::string& file, unsigned channels, unsigned channel) {
        const std::string data = TempFolder::read(file).substr(44);
        Values values;
        for (std::size_t at = channel * 2; at < data.size(); at += channels * 2)
            values.push_back(static_cast<std::int16_t>(leNumber(data, at, 2)) * 256);
        return values;
    }
    std::string document(const std::string& name, const std::string& source) const {
        return folder.write(name, "<Metafile><AudioInterleave><channels><ch>" + source +
                                      "</ch></channels></AudioInterleave></Metafile>");
    }

    Pipe openSetup(int rate = 0) const { return Pipe(setup.createMixDecoder(rate)); }
    static Pipe openFile(const std::string& name) { return Pipe(QvDecFactory::decodePipe(narrow(name))); }
    // A decoder that is not open yet.
    static Pipe decoderOf(const std::string& file) {
        Pipe decoder(static_cast<QvDecodePipe*>(qv_registry()->newCodec("aumixdec")));
        decoder->setParam("filename", narrow(file));
        return decoder;
    }
    static std::string failureIn(const QvDecodePipe& decoder) {
        return decoder.QvCodec::getParam("inputFailure").asString("");
    }

    // All values up to the end, read in pieces.
    static Values readAll(QvDecodePipe& decoder, int piece) {
        Values values;
        for (int read; (read = decoder.readSamples(piece, 0)) > 0;) append(values, *decoder.getAudioPtr(0));
        return values;
    }
    static void append(Values& values, const QvPcm& pcm) {
        const auto* from = reinterpret_cast<const std::int32_t*>(pcm.ptr(0));
        values.insert(values.end(), from, from + pcm.samples() * pcm.channels());
    }
};

// Gains of these sum up to less than full scale, so that the clamp has no say.
TEST_F(AuMixDec, EightFilesAreMixedSampleForSample) {
    constexpr unsigned outs = 3;
    AnyVector names;
    std::vector<Values> sounds;
    std::size_t longest = 0;
    for (unsigned i = 0; i < 8; ++i) {
        const unsigned channels = 1 + i % 3, samples = 9000 + 1000 * i;
        const std::string name =
            makeWav(std::string(1, static_cast<char>('a' + i)) + ".wav", samples, channels);
        names.append(narrow(name));
        sounds.push_back(channelOf(name, channels, channels - 1));
        longest = std::max<std::size_t>(longest, samples);
    }
    setup.setInFileNames(names);
    setup.setNrOutChannels(outs);
    std::vector<long long> wanted((longest + 2) * outs);
    for (unsigned i = 0; i < 8; ++i)
        for (unsigned out = 0; out < outs; ++out) {
            if ((i + out) % 4 == 0) continue;
            const double weight = (i % 2 ? -0.11 : 0.097) * (out + 1) / 3;
            setup.setWeight(static_cast<int>(out), static_cast<int>(i), 0, static_cast<int>(i % 3), weight);
            const auto fixed = static_cast<long long>(weight * 65536 + 0.5);
            for (std::size_t t = 0; t < sounds[i].size(); ++t)
                wanted[t * outs + out] += sounds[i][t] * fixed >> 16;
        }
    for (const int piece : {997, 4096, 100000}) {
        const Pipe decoder = openSetup();
        ASSERT_TRUE(decoder);
        EXPECT_EQ(failureIn(*decoder), "");
        EXPECT_EQ(decoder->nrSamples(0), static_cast<long long>(longest));
        EXPECT_EQ(decoder->getAudioParam(0, "channels").asInt32(), 3);
        EXPECT_EQ(decoder->getAudioParam(0, "bitsPerSample").asInt32(), 32);
        EXPECT_TRUE(decoder->getAudioParam(0, "codec") == "WAV");
        EXPECT_TRUE(decoder->QvCodec::getParam("filesize").isInt64());
        const Values got = readAll(*decoder, piece);
        // Up to two samples of silence follow.
        ASSERT_GE(got.size(), longest * outs);
        ASSERT_LE(got.size(), (longest + 2) * outs);
        for (std::size_t i = 0; i < got.size(); ++i) ASSERT_EQ(got[i], wanted[i]) << i;
    }
}

TEST_F(AuMixDec, TheClampEndsAfterAsManyValuesAsSamples) {
    const std::string name = makeWav("a.wav", 600);
    setup.setInFileNames(AnyVector(narrow(name)));
    setup.setNrOutChannels(2);
    for (const int out : {0, 1}) setup.setWeight(out, 0, 0, 0, 3.0);
    const Pipe decoder = openSetup();
    const Values sound = channelOf(name, 1, 0);
    ASSERT_EQ(decoder->readSamples(600, 0), 600);
    Values got;
    append(got, *decoder->getAudioPtr(0));
    bool beyond = false;
    for (int i = 0; i < 1200; ++i) {
        const int loud = sound[static_cast<std::size_t>(i / 2)] * 3;
        ASSERT_EQ(got[static_cast<std::size_t>(i)], i < 600 ? std::clamp(loud, -8388608, 8388607) : loud);
        beyond |= i >= 600 && std::abs(loud) > 8388608;
    }
    EXPECT_TRUE(beyond);
}

TEST_F(AuMixDec, SeeksAreExactAtEqualRates) {
    const Values sound = channelOf(makeWav("a.wav", 20000, 2), 2, 1);
    const Values other = channelOf(makeWav("b.wav", 5000), 1, 0);
    setup.setInFileNames(AnyVector(narrow(folder.file("a.wav")), narrow(folder.file("b.wav"))));
    setup.setNrOutChannels(1);
    setup.setWeight(0, 0, 0, 1, 1.0);
    setup.setWeight(0, 1, 0, 0, 1.0);
    const Pipe decoder = openSetup();
    decoder->readSamples(1234, 0);
    for (const int at : {0, 1, 4999, 5000, 777, 19999, 12345}) {
        SCOPED_TRACE(at);
        ASSERT_EQ(decoder->seekToSample(at, 0), 0);
        const int count = std::min(100, 20000 - at);
        ASSERT_EQ(decoder->readSamples(count, 0), count);
        Values got;
        append(got, *decoder->getAudioPtr(0));
        EXPECT_EQ(decoder->getAudioPtr(0)->position(), at + count);
        for (int i = 0; i < count; ++i) {
            const auto t = static_cast<std::size_t>(at + i);
            const int sum = sound[t] + (t < other.size() ? other[t] : 0);
            ASSERT_EQ(got[static_cast<std::size_t>(i)], std::clamp(sum, -8388608, 8388607)) << i;
        }
    }
    EXPECT_EQ(decoder->seekToSample(20000, 0), -4);
    EXPECT_EQ(decoder->seekToSample(-1, 0), -4);
}

TEST_F(AuMixDec, ReadsTakeNoMemory) {
    makeWav("a.wav", 40000, 2);
    makeWav("b.wav", 40000, 1, 44100);
    setup.setInFileNames(AnyVector(narrow(folder.file("a.wav")), narrow(folder.file("b.wav"))));
    for (const int out : {0, 1}) setup.setWeight(out, out, 0, 0, 0.5);
    const Pipe decoder = openSetup();
    for (int i = 0; i < 4; ++i) decoder->readSamples(4096, 0);
    const int before = allocations;
    for (int i = 0; i < 4; ++i) ASSERT_EQ(decoder->readSamples(4096, 0), 4096);
    EXPECT_EQ(allocations, before);
}

// A tone through the rate converter: after a seek it is where it was, once the converter has begun.
TEST_F(AuMixDec, OtherRatesAreConverted) {
    std::string data;
    for (int i = 0; i < 44100; ++i)
        data += leBytes(static_cast<std::uint16_t>(std::lround(20000 * std::sin(i * 0.05))), 2);
    folder.write("a.wav", riff(wavChunk("fmt ", wavFormat(1, 1, 44100, 16)) + wavChunk("data", data)));
    makeWav("b.wav", 100, 1, 48000);
    setup.setInFileNames(AnyVector(narrow(folder.file("a.wav")), narrow(folder.file("b.wav"))));
    setup.setWeight(0, 0, 0, 0, 1.0);
    setup.setWeight(1, 1, 0, 0, 1.0);
    const Pipe decoder = openSetup();
    EXPECT_EQ(decoder->getAudioParam(0, "samplerate").asInt32(), 48000);
    EXPECT_EQ(decoder->nrSamples(0), 48000);
    EXPECT_NEAR(decoder->getAudioParam(0, "duration").asDouble(), 1.0, 1e-6);
    const Values whole = readAll(*decoder, 1000);
    ASSERT_EQ(decoder->seekToSample(24000, 0), 0);
    ASSERT_EQ(decoder->readSamples(2000, 0), 2000);
    Values part;
    append(part, *decoder->getAudioPtr(0));
    for (std::size_t i = 400; i < 2000; ++i)
        ASSERT_NEAR(part[i * 2], whole[(24000 + i) * 2], 8388608 * 0.003) << i;
    EXPECT_EQ(openSetup(22050)->nrSamples(0), 22050);
}

TEST_F(AuMixDec, FiltersOfAStreamAreApplied) {
    const std::string name = makeWav("a.wav", 500);
    setup.setInFileNames(AnyVector(narrow(name)));
    setup.setWeight(0, 0, 0, 0, 1.0);
    const std::unique_ptr<QvCodec> volume(qv_registry()->newCodec("avol"));
    volume->setParam("mute", 1);
    FiltersState filters;
    AnyDict state;
    volume->store(state);
    state.set("_on", 1);
    filters.setFilter("avol", state);
    setup.setFilters(0, 0, filters);
    EXPECT_EQ(readAll(*openSetup(), 500), Values(502, 0));
    setup.setFilters(0, 0, FiltersState());
    EXPECT_EQ(readAll(*openSetup(), 500).front(), channelOf(name, 1, 0).front());
}

TEST_F(AuMixDec, AFailedInputLeavesADecoderThatReadsNothing) {
    makeWav("a.wav", 100);
    folder.write("bad.wav", "no sound");
    folder.write("text.srt", "1\n00:00:01,000 --> 00:00:02,000\nHello\n");
    for (const char* file : {"none.wav", "bad.wav", "text.srt", "what.ever"}) {
        SCOPED_TRACE(file);
        LogCapture log;
        const std::string name = document(
            "x.mmf", "<src file='a.wav' channel='0'/><src file='" + std::string(file) + "' channel='0'/>");
        const Pipe decoder = openFile(name);
        ASSERT_TRUE(decoder);
        EXPECT_NE(failureIn(*decoder).find(file), std::string::npos) << failureIn(*decoder);
        EXPECT_TRUE(log.contains("[mixadec] Failed to open input file " + folder.file(file)));
        EXPECT_TRUE(log.contains("[mixadec]Failed to open input file(s)"));
        EXPECT_EQ(decoder->nrStreams(2), 1);
        AnyDict params;
        decoder->getStreamParams(2, 0, params);
        EXPECT_TRUE(params.empty());
        EXPECT_EQ(decoder->readSamples(10, 0), -1);
        EXPECT_EQ(decoder->seekToSample(0, 0), -4);
    }
}

TEST_F(AuMixDec, AStreamThatCantBeSelectedIsRefused) {
    struct Refusing : BaseDecodePipe {
        int select(int, int) override { return QvStatus::failed; }
    } refusing;
    std::string reason;
    EXPECT_EQ(ADecStream(&refusing, 0, Any("a.wav")).prepare(48000, nullptr, reason), QvStatus::failed);
    EXPECT_EQ(reason, "it can't be selected");
}

TEST_F(AuMixDec, WhatCantBeMixedIsRefused) {
    makeWav("a.wav", 100, 2);
    folder.write("list.mmf", "<BatchList/>");
    folder.write("mono.mmf", "<Metafile><MonoInterleave/></Metafile>");
    folder.write(
        "damaged.mmf",
        "<Metafile><AudioInterleave><channels><ch><src/></ch></channels></AudioInterleave></Metafile>");
    document("stream.mmf", "<src file='a.wav' stream='1' channel='0'/>");
    document("channel.mmf", "<src file='a.wav' channel='2'/>");
    document("huge.mmf", "<src file='a.wav' channel='2147483647'/>");
    document("weight.mmf", "<src file='a.wav' channel='0' gain='1e300'/>");
    document("silent.mmf", "");
    folder.write("decoder.mmf",
                 "<Metafile><AudioInterleave><channels><ch><src file='a.wav' channel='0'/></ch></channels>"
                 "<decoders><dec file='a.wav' decoder='none'/></decoders></AudioInterleave></Metafile>");
    const struct {
        const char* file;
        int code;
        const char *error, *reason;
    } rows[] = {
        {"none.mmf", -15, "[audiomixdec]Failed to open ", "Can not open file"},
        {"list.mmf", -15, "[audiomixdec]Failed to open ", "missing <Metafile> tag"},
        {"mono.mmf", -1, "[audiomixdec]Failed to open ", "no mix"},
        {"damaged.mmf", -15, "[audiomixdec]Failed to open ", "without 'file'"},
        {"stream.mmf", -1, "[mixadec]Failed to select input streams(s)", "Invalid stream number 1 for file "},
        {"channel.mmf", -1, "[mixadec]Failed to setup mixing", "no channel 2"},
        {"huge.mmf", -1, "[audiomixdec]Failed to open ", "channel"},
        {"weight.mmf", -1, "[audiomixdec]Failed to open ", "weight"},
        {"silent.mmf", -1, "[audiomixdec]Failed to open ", "no channel has a source"},
        {"decoder.mmf", -1, "[audiomixdec]Failed to open ", "no decoder 'none'"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.file);
        const Pipe decoder = decoderOf(folder.file(row.file));
        EXPECT_EQ(decoder->open(), row.code);
        EXPECT_EQ(std::string(decoder->errorDesc()).rfind(row.error, 0), 0u) << decoder->errorDesc();
        EXPECT_NE(failureIn(*decoder).find(row.reason), std::string::npos) << failureIn(*decoder);
        EXPECT_FALSE(openFile(folder.file(row.file)));
        EXPECT_NE(decoder->getState(), 3);
    }
    AudioMixDec fresh;
    fresh.init();
    EXPECT_EQ(failureOf([&] { fresh.open(); }), "open: open parameters not defined");
    EXPECT_EQ(failureOf([&] { fresh.setParam("filename", Any(1)); }), "Invalid value type for 'filename'");
    EXPECT_EQ(fresh.setParam("metaState", Any(1)), -13);
    EXPECT_EQ(fresh.setParam("metaState", AnyDict("name", "x")), 0);
    EXPECT_FALSE(fresh.QvCodec::getParam("filename").isValid());
    EXPECT_EQ(fresh.open(), -1);
    fresh.setParam("filename", Any("x.mmf"));
    EXPECT_TRUE(fresh.QvCodec::getParam("metaState").asDict().empty());
}

TEST_F(AuMixDec, MixesOfMixesAreFinite) {
    makeWav("a.wav", 100);
    document("0.mmf", "<src file='a.wav' channel='0' gain='0.5'/>");
    for (int i = 1; i <= InputNesting::maxDepth; ++i)
        document(std::to_string(i) + ".mmf", "<src file='" + std::to_string(i - 1) + ".mmf' channel='0'/>");
    const Pipe inner = openFile(folder.file("0.mmf"));
    const Pipe deepest = openFile(folder.file(std::to_string(InputNesting::maxDepth - 1) + ".mmf"));
    ASSERT_TRUE(inner && deepest);
    EXPECT_EQ(failureIn(*deepest), "");
    Values wanted = readAll(*inner, 64), got = readAll(*deepest, 64);
    wanted.resize(100);
    got.resize(100);
    EXPECT_EQ(got, wanted);
    const Pipe tooDeep = openFile(folder.file(std::to_string(InputNesting::maxDepth) + ".mmf"));
    ASSERT_TRUE(tooDeep);
    EXPECT_NE(failureIn(*tooDeep).find("more than 8 metafiles inside one another"), std::string::npos)
        << failureIn(*tooDeep);

    document("self.mmf", "<src file='a.wav' channel='0'/><src file='./self.mmf' channel='0'/>");
    const Pipe self = openFile(folder.file("self.mmf"));
    ASSERT_TRUE(self);
    EXPECT_NE(failureIn(*self).find("it is an input of itself"), std::string::npos) << failureIn(*self);

    std::string many;
    for (int i = 0; i <= InputNesting::maxInputs; ++i) {
        const std::string name = "link" + std::to_string(i) + ".wav";
        std::filesystem::create_symlink(folder.file("a.wav"), folder.file(name));
        many += "<src file='" + name + "' channel='0'/>";
    }
    const Pipe crowded = openFile(document("many.mmf", many));
    ASSERT_TRUE(crowded);
    EXPECT_NE(failureIn(*crowded).find("more than 512 inputs"), std::string::npos) << failureIn(*crowded);
}

}  // namespace
