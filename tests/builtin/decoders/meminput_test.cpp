#include "builtin/decoders/meminput.h"

#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>

#include "core/decode/decodefactory.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/media/qvbuffer.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/pictures.h"
#include "tests/support/wav_bytes.h"

namespace {

// What a decoder gives: everything that it says about its streams, and all of their contents.
struct Contents {
    std::string refusal;
    AnyVector values;
    std::string bytes;

    bool operator==(const Contents&) const = default;
};

void takeStream(QvDecodePipe& decoder, int type, Contents& contents) {
    constexpr int mostFrames = 400;
    AnyDict params;
    decoder.getStreamParams(type, 0, params);
    contents.values.append(params);
    decoder.select(type, 0);
    if (type == qvAudioStream) {
        while (decoder.readSamples(1000, 0) > 0) contents.bytes += soundBytes(*decoder.getAudioPtr(0));
        contents.values.append(Any(decoder.seekToSample(decoder.nrSamples(0) / 2, 0)));
        if (decoder.readSamples(10, 0) > 0) contents.bytes += soundBytes(*decoder.getAudioPtr(0));
        return;
    }
    contents.values.append(Any(decoder.nrFrames(0)));
    int result = 0;
    for (int frame = 0; frame < mostFrames && (result = decoder.readFrame(0)) == 0; ++frame) {
        AnyDict meta;
        if (type == qvSubpicStream && decoder.readMeta(0, 0, meta) == 0) contents.values.append(meta);
        if (type == qvVideoStream) contents.bytes += pictureBytes(*decoder.getFramePtr(0));
    }
    contents.values.append(Any(result));
}

Contents contentsOf(QvDecodePipe* opened, const Any& error) {
    const std::unique_ptr<QvDecodePipe> decoder(opened);
    Contents contents;
    if (!decoder) {
        contents.refusal = error.asString("");
        return contents;
    }
    contents.values.append(decoder->getParam("filesize"));
    for (const int type : {qvVideoStream, qvAudioStream, qvSubpicStream})
        if (decoder->nrStreams(type) > 0) takeStream(*decoder, type, contents);
    return contents;
}

QvSourceCallbacks over(const std::string& bytes, std::size_t most) {
    auto at = std::make_shared<std::size_t>(0);
    return {.read = [&bytes, most, at](void* to, std::size_t count) -> long long {
                const std::size_t got = std::min({count, most, bytes.size() - std::min(*at, bytes.size())});
                bytes.copy(static_cast<char*>(to), got, *at);
                *at += got;
                return static_cast<long long>(got);
            },
            .seek =
                [at](long long position) {
                    *at = static_cast<std::size_t>(position);
                    return true;
                },
            .size = [&bytes] { return static_cast<long long>(bytes.size()); }};
}

const AnyDict rawFormat("FOURCC", "I420", "width", 8, "height", 6);

struct Input {
    std::string name;
    std::string bytes;
    AnyDict params;
};

std::vector<Input> inputs() {
    std::vector<Input> all;
    const std::string sound = patternBytes(4 * 5000);
    all.push_back(
        {"a.wav", riff(wavChunk("fmt ", wavFormat(1, 2, 48000, 16)) + wavChunk("data", sound)), {}});
    const std::string floats = wavChunk("fmt ", wavFormat(3, 1, 8000, 32)) + wavChunk("data", sound);
    const AnyDict extended("extended", 1);
    all.push_back({"f.wav", riff(floats + wavChunk("iXML", "<a/>")), extended});
    all.push_back({"cut.wav", all.front().bytes.substr(0, 9000), {}});
    all.push_back({"none.wav", "RIFFxxxxWAVE", {}});
    all.push_back({"empty.wav", "", {}});
    all.push_back({"empty.srt", "", {}});
    all.push_back({"empty.yuv", "", rawFormat});
    all.push_back({"b.yuv", patternBytes(72 * 7 + 5), rawFormat});
    all.push_back({"c.yuv", patternBytes(72 * 4), rawFormat});
    all.back().params.set("invert", 1);
    for (const char* kind : {"scc", "srt", "sub"}) {  // what the fuzzers start from
        std::vector<std::filesystem::path> files;
        const auto folder = std::filesystem::path(QV_SOURCE_DIR) / "tests/fuzz/seeds" / kind;
        for (const auto& entry : std::filesystem::directory_iterator(folder)) files.push_back(entry.path());
        EXPECT_FALSE(files.empty()) << folder;
        std::sort(files.begin(), files.end());
        for (const auto& file : files) {
            std::ostringstream bytes;
            bytes << std::ifstream(file, std::ios::binary).rdbuf();
            all.push_back({file.stem().string() + "." + kind, bytes.str(), {}});
        }
    }
    return all;
}

class MemoryInput : public testing::Test {
  protected:
    const EngineScope engine;
    TempFolder folder;
    Any error;

    QvDecodePipe* open(std::unique_ptr<QvByteSource> source, const char* name, const AnyDict& params = {}) {
        error = Any();
        return QvDecFactory::decodeSource(std::move(source), Any(name), params, &error);
    }
    std::string refusal(std::unique_ptr<QvByteSource> source, const char* name, const AnyDict& params = {}) {
        const std::unique_ptr<QvDecodePipe> decoder(open(std::move(source), name, params));
        return decoder ? "opened" : error.asString("");
    }
};

TEST_F(MemoryInput, GivesWhatTheFileGives) {
    int opened = 0;
    for (const Input& input : inputs()) {
        const std::string file = folder.write(input.name, input.bytes);
        const Contents expected =
            contentsOf(QvDecFactory::decodePipeWith(narrow(file), input.params, &error), error);
        opened += expected.refusal.empty() ? 1 : 0;
        const auto* begin = reinterpret_cast<const unsigned char*>(input.bytes.data());
        std::unique_ptr<QvByteSource> kinds[] = {
            qvBlockSource(begin, input.bytes.size()),
            qvBlockSource(std::vector<unsigned char>(begin, begin + input.bytes.size())),
            qvFileSource(narrow(file)),
            qvCallbackSource(over(input.bytes, input.bytes.size())),
            qvCallbackSource(over(input.bytes, 7)),
        };
        for (auto& source : kinds) {
            SCOPED_TRACE(input.name + ", kind " + std::to_string(&source - kinds));
            Contents contents = contentsOf(open(std::move(source), input.name.c_str(), input.params), error);
            EXPECT_EQ(contents.refusal.empty(), expected.refusal.empty()) << contents.refusal;
            contents.refusal = expected.refusal;
            EXPECT_TRUE(contents == expected);
        }
    }
    EXPECT_GE(opened, 10);
}

TEST_F(MemoryInput, TextsNeedNeitherSizeNorSeeks) {
    for (const Input& input : inputs()) {
        const bool isText = input.name.ends_with(".scc") || input.name.ends_with(".srt");
        if (!isText) continue;
        const std::string file = folder.write(input.name, input.bytes);
        const Contents expected = contentsOf(QvDecFactory::decodePipeWith(narrow(file), {}, &error), error);
        auto stream = over(input.bytes, 11);
        stream.seek = nullptr;
        stream.size = nullptr;
        Contents contents = contentsOf(open(qvCallbackSource(stream), input.name.c_str()), error);
        EXPECT_EQ(contents.refusal.empty(), expected.refusal.empty()) << contents.refusal;
        contents.refusal = expected.refusal;
        EXPECT_TRUE(contents == expected) << input.name;
    }
}

TEST_F(MemoryInput, SourcesThatAreNotWhatTheySay) {
    const std::string wav =
        riff(wavChunk("fmt ", wavFormat(1, 1, 8000, 8)) + wavChunk("data", patternBytes(9000)));
    const std::string srt = "1\n00:00:01,000 --> 00:00:02,000\nText\n\n";
    const auto sized = [](QvSourceCallbacks source, long long bytes) {
        source.size = [bytes] { return bytes; };
        return qvCallbackSource(std::move(source));
    };
    const auto unsought = [](QvSourceCallbacks source) {
        source.seek = nullptr;
        return qvCallbackSource(std::move(source));
    };
    const auto failing = [](QvSourceCallbacks source) {
        source.read = [](void*, std::size_t) -> long long { throw std::runtime_error("line is down"); };
        return qvCallbackSource(std::move(source));
    };
    const auto endless = [](const char* line) {
        return qvCallbackSource({.read = [line](void* to, std::size_t count) {
            const std::string_view bytes = line;
            for (std::size_t i = 0; i < count; ++i) static_cast<char*>(to)[i] = bytes[i % bytes.size()];
            return static_cast<long long>(count);
        }});
    };
    const std::string noSize = "the source does not say how long it is";
    const std::string noSeek = "the source can't be sought";
    const std::string wavName = "x.wav: wavdec: Failed to open file for reading: ";
    const std::string rawName = "x.yuv: rawdec: Can not open file: ";
    const std::string srtName = "x.srt: subimport: Subtitle file x.srt can't be read or is no text";
    EXPECT_EQ(refusal(sized(over(wav, 100), -1), "x.wav"), wavName + noSize);
    EXPECT_EQ(refusal(sized(over(wav, 100), LLONG_MAX), "x.wav"), wavName + noSize);
    EXPECT_EQ(refusal(unsought(over(wav, 100)), "x.wav"), wavName + noSeek);
    EXPECT_EQ(refusal(failing(over(wav, 100)), "x.wav"),
              "x.wav: wavdec: Failed to parse WAV file: line is down");
    EXPECT_EQ(refusal(sized(over(wav, 100), 10), "x.wav"), "opened");  // more is there than it says
    EXPECT_EQ(refusal(sized(over(wav, 100), 0), "x.yuv", rawFormat), "opened");
    EXPECT_EQ(refusal(sized(over(wav, 100), -1), "x.yuv", rawFormat), rawName + noSize);
    EXPECT_EQ(refusal(unsought(over(wav, 100)), "x.yuv", rawFormat), rawName + noSeek);
    EXPECT_EQ(refusal(sized(over(srt, 5), 1000), "x.srt"), srtName + ": the source ends at byte 38 of 1000");
    EXPECT_EQ(refusal(sized(over(srt, 5), 1LL << 50), "x.srt"),
              srtName + ": the source ends at byte 0 of 1125899906842624");
    EXPECT_EQ(refusal(failing(over(srt, 5)), "x.srt"), srtName + ": line is down");
    EXPECT_EQ(refusal(failing(over(srt, 5)), "x.scc"),
              "x.scc: sccdec: Failed to open field 1 scc file x.scc: line is down");
    EXPECT_EQ(refusal(endless("a subtitle\n"), "x.srt"), srtName);
    EXPECT_EQ(refusal(endless("Scenarist_SCC\n\n"), "x.scc"),
              "x.scc: sccdec: Failed to open field 1 scc file x.scc");
}

TEST_F(MemoryInput, FailuresInTheMiddleAreErrorsOfTheRead) {
    const std::string wav =
        riff(wavChunk("fmt ", wavFormat(1, 1, 8000, 8)) + wavChunk("data", patternBytes(9000)));
    std::string cut = wav.substr(0, 5044);
    auto source = over(cut, 1000);
    source.size = [] { return 9044LL; };
    std::unique_ptr<QvDecodePipe> sound(open(qvCallbackSource(source), "x.wav"));
    ASSERT_TRUE(sound) << error.asString("");
    EXPECT_EQ(sound->nrSamples(0), 9000);
    EXPECT_EQ(sound->readSamples(6000, 0), 5000);
    EXPECT_EQ(sound->readSamples(100, 0), QvStatus::cannotParse);
    EXPECT_STREQ(sound->errorDesc(), "read samples failed: the source ends at byte 5044 of 9044");
    ASSERT_EQ(sound->seekToSample(4990, 0), 0);
    EXPECT_EQ(sound->readSamples(10, 0), 10);

    const std::string frames = patternBytes(72 * 4);
    bool down = false;
    source = over(frames, 50);
    source.read = [&down, read = source.read](void* to, std::size_t count) {
        if (down) throw std::runtime_error("line is down");
        return read(to, count);
    };
    std::unique_ptr<QvDecodePipe> picture(open(qvCallbackSource(source), "x.yuv", rawFormat));
    ASSERT_TRUE(picture) << error.asString("");
    EXPECT_EQ(picture->readFrame(0), 0);
    down = true;
    EXPECT_EQ(picture->readFrame(0), QvStatus::failed);
    EXPECT_STREQ(picture->errorDesc(), "fread() failed: line is down");
    down = false;
    ASSERT_EQ(picture->seekToFrame(3, 0), 0);
    EXPECT_EQ(picture->readFrame(0), 0);
    EXPECT_EQ(pictureBytes(*picture->getFramePtr(0)), frames.substr(72 * 3));
}

TEST_F(MemoryInput, SaysWhatItLacks) {
    const std::string wav = riff(wavChunk("fmt ", wavFormat(1, 1, 8000, 8)) + wavChunk("data", "abcd"));
    const auto block = [&wav] { return qvBlockSource(wav.data(), wav.size()); };
    EXPECT_EQ(refusal(nullptr, "x.wav"), "x.wav is in memory, and no source of its bytes is set");
    EXPECT_EQ(refusal(block(), "x.flac"), "x.flac: there is no decoder for the extension 'flac'");
    EXPECT_EQ(refusal(block(), "X.WAV"), "opened");
    EXPECT_EQ(refusal(block(), "x"), "x: there is no decoder for the extension ''");
    EXPECT_EQ(refusal(block(), "x.yuv"), "x.yuv: rawdec needs 'FOURCC'");
    EXPECT_EQ(refusal(block(), "x.wav", AnyDict("invert", 1)),
              "x.wav: wavdec does not take the parameter 'invert'");
    EXPECT_EQ(refusal(block(), "x.wav", AnyDict("decoder", "testgen")),
              "x.wav: testgen reads files only, not bytes in memory");
    EXPECT_EQ(refusal(block(), "x.wav", AnyDict("decoder", "meminput")),
              "x.wav: there is no decoder meminput");
    EXPECT_EQ(refusal(block(), "x.scc"), "x.scc: sccdec: Failed to open field 1 scc file x.scc");
}

TEST_F(MemoryInput, TakesItsParametersByHandToo) {
    const std::string sound = "abcdefgh";
    const std::string wav = riff(wavChunk("fmt ", wavFormat(1, 1, 8000, 8)) + wavChunk("data", sound));
    const auto source = qvBlockSource(wav.data(), wav.size());
    const std::unique_ptr<QvDecodePipe> input(QvDecFactory::newMemoryInput());
    EXPECT_STREQ(input->name(), "meminput");
    EXPECT_EQ(input->setParam("source", Any(7)), QvStatus::invalidParam);
    EXPECT_EQ(input->setParam("decoder", Any(7)), QvStatus::invalidParam);
    EXPECT_EQ(input->readSamples(1, 0), QvStatus::illegalState);
    EXPECT_EQ(input->setParam("source", qvSourceValue(source.get())), 0);
    EXPECT_EQ(input->setParam("extension", "wav"), 0);
    EXPECT_EQ(input->setParam("extended", 1), 0);
    ASSERT_EQ(input->open(), 0) << input->errorDesc();
    EXPECT_STREQ(input->getParam("filename").asString(), "memory.wav");
    EXPECT_STREQ(input->getParam("decoder").asString(), "wavdec");
    EXPECT_EQ(input->getParam("audio0/samplerate").toInt32(), 8000);
    EXPECT_EQ(input->getParam("extended").toInt32(), 1);
    EXPECT_EQ(input->duration(qvAudioStream, 0), MediaTime(8, 8000, MediaTime::defaultTimescale));
    EXPECT_EQ(input->seek(MediaTime(4, 8000, MediaTime::defaultTimescale), qvAudioStream, 0), 0);
    EXPECT_EQ(input->readSamples(10, 0), 4);
    EXPECT_EQ(soundBytes(*input->getAudioPtr(0)), "efgh");
    EXPECT_THROW(input->setParam("invert", 1), QvParamException);

    ASSERT_EQ(input->open(), 0);  // again, from the start
    EXPECT_EQ(input->readSamples(10, 0), 8);
    EXPECT_EQ(input->setParam("source", Any()), 0);
    EXPECT_EQ(input->getState(), QvCodec::stateInitialised);
    EXPECT_EQ(input->open(), QvStatus::failed);
}

TEST_F(MemoryInput, StoresAllButItsBytes) {
    const std::string frames = patternBytes(72 * 3);
    std::unique_ptr<QvDecodePipe> input(
        open(qvBlockSource(frames.data(), frames.size()), "x.yuv", rawFormat));
    ASSERT_TRUE(input) << error.asString("");
    AnyDict state;
    {
        const int before = qv_log()->nrWarnings();
        input->store(state);
        EXPECT_EQ(qv_log()->nrWarnings(), before + 1);
    }
    const std::unique_ptr<QvDecodePipe> again(QvDecFactory::newMemoryInput());
    ASSERT_EQ(again->restore(state), 0);
    EXPECT_EQ(again->open(), QvStatus::failed);
    EXPECT_STREQ(again->errorDesc(), "memory.yuv is in memory, and no source of its bytes is set");
    const auto source = qvBlockSource(frames.data(), frames.size());
    again->setParam("source", qvSourceValue(source.get()));
    ASSERT_EQ(again->open(), 0) << again->errorDesc();
    EXPECT_EQ(again->nrFrames(0), 3);
    EXPECT_EQ(again->restore(AnyDict("name", "wavdec")), QvStatus::failed);
}

}  // namespace
