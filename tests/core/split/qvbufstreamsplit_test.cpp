#include "core/split/qvbufstreamsplit.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include "core/image/qvimage.h"
#include "core/media/qvframe.h"
#include "core/split/wavheader_p.h"
#include "tests/core/stream/streamtools.h"

namespace {

using namespace QvAuxId;

void unit(QvBufStream& stream, unsigned id, std::string_view data) {
    ASSERT_EQ(copyIn(stream.input(), data), data.size());
    tell(stream.input(), id, static_cast<uint32_t>(data.size()));
}

Texts namesIn(const TempFolder& folder) {
    Texts names;
    for (const auto& entry : std::filesystem::directory_iterator(folder.path()))
        names.push_back(entry.path().filename().string());
    std::sort(names.begin(), names.end());
    return names;
}

struct QvBsSplitVideoTest : testing::Test {
    AnyDict pictures() const {
        return AnyDict("outfilename", folder.file("clip.m2v").c_str(), "size", 4096, "chunk", 513);
    }
    TempFolder folder;
    QvBsSplitVideo stream;
};

struct QvBsSplitAudioTest : testing::Test {
    void begin(int rate, int channels, int bits, int split = 0, int result = 0) {
        AnyDict params("outfilename", folder.file("take.wav").c_str(), "samplerate", rate, "channels",
                       channels, "bitsPerSample", bits, "split", split, "size", 20'000, "chunk", 1001);
        if (chunks.isValid()) params.set("chunks", chunks);
        ASSERT_EQ(stream.init(params), result) << rate << ' ' << channels << ' ' << bits << ' ' << split;
    }
    TempFolder folder;
    QvBsSplitAudio stream;
    Any chunks;
};

TEST_F(QvBsSplitVideoTest, EachUnitIsAFileWithANumber) {
    for (const auto& [digits, names] : {std::pair{Any(), Texts{"clip#0.m2v", "clip#1.m2v"}},
                                        {4, {"clip#0000.m2v", "clip#0001.m2v"}},
                                        {-3, {"clip#0.m2v", "clip#1.m2v"}}}) {
        AnyDict params = pictures();
        params.set("nrDigits", digits);
        ASSERT_EQ(stream.init(params), 0);
        unit(stream, VIDEO_AU_CODE, patternBytes(2000, 1));  // larger than a chunk
        unit(stream, VIDEO_AU_CODE, "");
        stream.destroy(0);
        EXPECT_EQ(namesIn(folder), names);
        EXPECT_TRUE(TempFolder::read(folder.file(names[0])) == patternBytes(2000, 1));
        EXPECT_EQ(TempFolder::read(folder.file(names[1])), "");
        for (const auto& name : names) std::filesystem::remove(folder.file(name));
    }
}

TEST_F(QvBsSplitVideoTest, UnitsRunOverTheEndOfTheRing) {
    ASSERT_EQ(stream.init(pictures()), 0);
    for (unsigned i = 0; i < 20; ++i) {
        unit(stream, VIDEO_AU_CODE, patternBytes(1500 + i, i));
        const std::string name = folder.file("clip#" + std::to_string(i) + ".m2v");
        EXPECT_TRUE(TempFolder::read(name) == patternBytes(1500 + i, i)) << i;
    }
}

TEST_F(QvBsSplitVideoTest, FailuresStopTheRingAndUseUpANumber) {
    std::filesystem::create_directory(folder.file("clip#0.m2v"));
    ASSERT_EQ(stream.init(pictures()), 0);
    unit(stream, VIDEO_AU_CODE, "abc");
    EXPECT_EQ(copyIn(stream.input(), "x"), 0u);
    EXPECT_NE(stream.ioError(), 0);
    tell(stream.input(), VIDEO_AU_CODE, 3u);
    EXPECT_EQ(TempFolder::read(folder.file("clip#1.m2v")), "abc");
    EXPECT_THROW(tell(stream.input(), VIDEO_AU_CODE, 1u), QvAssertFailure) << "nothing was written";

    FullDisc disc(100);
    PlatformScope scope(disc);
    ASSERT_EQ(stream.init(pictures()), 0);
    EXPECT_EQ(stream.ioError(), 0);
    std::filesystem::remove(folder.file("clip#0.m2v"));
    unit(stream, VIDEO_AU_CODE, patternBytes(300));
    EXPECT_EQ(stream.ioError(), ENOSPC);
    EXPECT_FALSE(stream.input()->request(stream.input(), 1));
}

TEST_F(QvBsSplitVideoTest, PicturesBecomePng) {
    QvFrame picture;
    const std::string pixels = patternBytes(20 * 92);  // rows of 90 bytes end at a multiple of 4
    AnyDict params("outfilename", folder.file("p.raw").c_str(), "size", 10'000, "chunk", 4000);
    params.update(
        AnyDict("png", 1, "width", 30, "height", 20, "FOURCC", static_cast<int>(unsigned{QvFourcc::BGR3})));
    ASSERT_EQ(stream.init(params), 0);
    unit(stream, VIDEO_AU_CODE, pixels);
    unit(stream, VIDEO_AU_CODE, pixels);
    EXPECT_THAT(namesIn(folder), testing::ElementsAre("p#0.png", "p#1.png"));
    ASSERT_EQ(QvImage::loadFrame(picture, folder.file("p#1.png").c_str()), 0);
    for (int y = 0; y < 20; ++y)
        for (int x = 0; x < 30; ++x) {
            ASSERT_EQ(std::memcmp(picture.pixelPtr(x, y), pixels.data() + 92 * y + 3 * x, 3), 0)
                << x << "," << y;
        }

    ASSERT_EQ(copyIn(stream.input(), "short"), 5u);
    tell(stream.input(), VIDEO_AU_CODE, 5u);
    EXPECT_FALSE(stream.input()->request(stream.input(), 1)) << "a picture that is too short stops the ring";
    ASSERT_EQ(stream.init(), 0);
    EXPECT_THROW(unit(stream, VIDEO_AU_CODE, patternBytes(4000)), QvAssertFailure) << "larger than a chunk";
}

// --- WAV

TEST_F(QvBsSplitAudioTest, HeaderStatesTheStreamExactly) {
    for (const auto& [rate, channels, bits, width] :
         {std::tuple{48'000u, 2u, 16u, 2u}, {96'000, 6, 24, 3}, {48'000, 2, 20, 3}}) {
        begin(int(rate), int(channels), int(bits));
        const std::string samples = patternBytes(width * channels * 100), name = folder.file("take.wav");
        unit(stream, AUDIO_AU_CODE, std::string_view(samples).substr(0, 700));  // may end inside a sample
        unit(stream, AUDIO_AU_CODE, std::string_view(samples).substr(std::min<size_t>(700, samples.size())));
        tell(stream.input(), STREAM_END_CODE);
        stream.destroy(0);
        const auto size = static_cast<uint32_t>(samples.size());
        EXPECT_EQ(TempFolder::read(name),
                  "RIFF" + leBytes(size + 72, 4) + "WAVEfmt " + leBytes(40, 4) + leBytes(0xFFFE, 2) +
                      leBytes(channels, 2) + leBytes(rate, 4) + leBytes(width * channels * rate, 4) +
                      leBytes(width * channels, 2) + leBytes(8 * width, 2) + leBytes(22, 2) +
                      leBytes(bits, 2) + leBytes(0, 4) +
                      std::string("\x01\0\0\0\0\0\x10\0\x80\0\0\xAA\0\x38\x9B\x71", 16) + "fact" +
                      leBytes(4, 4) + leBytes(100 * channels, 4) + "data" + leBytes(size, 4) + samples);
        EXPECT_EQ(stream.ioError(), 0);
    }
}

TEST_F(QvBsSplitAudioTest, EachChannelIsAMonoFile) {
    for (const int bits : {8, 16, 20, 24, 32}) {
        begin(100, 3, bits, 1);
        const size_t width = static_cast<size_t>((bits + 7) / 8);
        const std::string samples = patternBytes(width * 3 * 700);
        for (size_t at = 0; at < samples.size();
             at += 5000)  // units end inside samples, and hold above a second
            unit(stream, AUDIO_AU_CODE, std::string_view(samples).substr(at, 5000));
        tell(stream.input(), STREAM_END_CODE);
        EXPECT_THAT(namesIn(folder), testing::ElementsAre("take#00.wav", "take#01.wav", "take#02.wav"));
        for (size_t c = 0; c < 3; ++c) {
            const std::string file = TempFolder::read(folder.file("take#0" + std::to_string(c) + ".wav"));
            std::string channel;
            for (size_t i = 0; i < 700; ++i) channel += samples.substr((i * 3 + c) * width, width);
            ASSERT_TRUE(file.substr(80) == channel) << bits << " bits, channel " << c;
            EXPECT_TRUE(leNumber(file, 22, 2) == 1 && leNumber(file, 76, 4) == 700 * width);
            EXPECT_EQ(leNumber(file, 68, 4), 700u);
        }
        EXPECT_EQ(stream.ioError(), 0);
        EXPECT_EQ(copyIn(stream.input(), "abc"), 3u);
        tell(stream.input(), AUDIO_AU_CODE, 3u);
        EXPECT_FALSE(stream.input()->request(stream.input(), 1)) << "nothing goes in after the end";
    }
}

TEST_F(QvBsSplitAudioTest, AStreamThatEndsInsideASampleIsTold) {
    begin(48'000, 2, 16);
    unit(stream, AUDIO_AU_CODE, "0123456789");
    qv_log()->clear();
    tell(stream.input(), STREAM_END_CODE);
    EXPECT_EQ(qv_log()->nrWarnings(), 1);
    const std::string file = TempFolder::read(folder.file("take.wav"));
    EXPECT_EQ(file.substr(80), "01234567");
    EXPECT_EQ(leNumber(file, 76, 4), 8u);
}

TEST_F(QvBsSplitAudioTest, RefusesWhatNoWavCanHold) {
    const int impossible[][4] = {{0, 2, 16, 0},           {-1, 2, 16, 0},      {48'000, 0, 16, 0},
                                 {48'000, -2, 16, 0},     {48'000, 2, 0, 0},   {48'000, 2, 33, 0},
                                 {48'000, 70'000, 16, 0}, {48'000, 33, 16, 1}, {48'000, 2, -8, 1}};
    for (const auto& [rate, channels, bits, split] : impossible) {
        begin(rate, channels, bits, split, -1);
        EXPECT_FALSE(stream.inited());
    }
    EXPECT_TRUE(namesIn(folder).empty());
    EXPECT_TRUE(wavFormatIsLegal({.samplerate = 1, .channels = 1, .bitsPerSample = 1}));
    // The bytes of a sample of all channels are a field of 16 bits.
    for (const int channels : {32'767, 32'768})
        EXPECT_EQ(wavFormatIsLegal({.samplerate = 48'000, .channels = channels, .bitsPerSample = 16}),
                  channels * 2 <= 0xFFFF);
}

TEST_F(QvBsSplitAudioTest, AFullDiscStopsTheRing) {
    for (const int split : {0, 1}) {
        FullDisc disc(30'000);
        PlatformScope scope(disc);
        begin(1000, 2, 16, split);
        int units = 0;
        while (units < 100 && stream.input()->request(stream.input(), 1)) {
            unit(stream, AUDIO_AU_CODE, patternBytes(4000));
            ++units;
        }
        EXPECT_LT(units, 40);
        EXPECT_EQ(stream.ioError(), ENOSPC);
        stream.destroy(1);
    }
}

// Nobody can go back to the header of a pipe: it states what was expected, or that nothing is known.
TEST_F(QvBsSplitAudioTest, AStreamGetsItsHeaderAtOnce) {
    const std::string name = folder.file("take.wav");
    ASSERT_EQ(mkfifo(name.c_str(), 0600), 0);
    constexpr uint32_t unknown = 0xFFFFFFFF;
    const struct {
        Any expected;
        uint32_t riff, fact, data;
    } rows[] = {{Any(100), 472, 200, 400},
                {Any(100LL), 472, 200, 400},
                {Any(), unknown, unknown, unknown},
                {Any(-1), unknown, unknown, unknown},
                {Any(1LL << 61), unknown, unknown, unknown}};
    for (const auto& row : rows) {
        const int reader = ::open(name.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
        const AnyDict params("outfilename", name.c_str(), "samplerate", 48000, "channels", 2, "bitsPerSample",
                             16, "size", 20'000, "chunk", 1001, "expectedSamples", row.expected);
        ASSERT_EQ(stream.init(params), 0) << stream.ioErrorText();
        const std::string samples = patternBytes(400);
        unit(stream, AUDIO_AU_CODE, samples);
        tell(stream.input(), STREAM_END_CODE);
        EXPECT_EQ(stream.ioTaken(), 480u);
        stream.destroy(0);
        EXPECT_EQ(stream.ioError(), 0) << stream.ioErrorText();
        std::string got(1000, '?');
        got.resize(static_cast<size_t>(std::max(read(reader, got.data(), got.size()), ssize_t{0})));
        close(reader);
        ASSERT_EQ(got.size(), 480u);
        EXPECT_EQ(got.substr(80), samples);
        EXPECT_EQ(leNumber(got, 4, 4), row.riff);
        EXPECT_EQ(leNumber(got, 68, 4), row.fact);
        EXPECT_EQ(leNumber(got, 76, 4), row.data);
    }
}

TEST_F(QvBsSplitAudioTest, TheNullDeviceIsNotLargerThanAHeaderCanState) {
    QvIoFailure failure;
    qv_log()->clear();
    writeWavHeader(qv_wide_name("/dev/null"), {48'000, 2, 16}, failure);
    EXPECT_EQ(qv_log()->nrWarnings(), 0);
}

TEST(WavHeader, SizesBeyondFourGibAreTheLargestAndTold) {
    const WavFormat stereo = {48'000, 2, 16};
    const auto field = [&](uint64_t fileBytes, size_t at) {
        const auto header = wavHeader(stereo, {fileBytes});
        return leNumber(std::string(header.begin(), header.end()), at, 4);
    };
    constexpr uint64_t most = 0xFFFFFFFF;
    EXPECT_EQ(field(most + 8, 4), most);
    EXPECT_EQ(field(most + 9, 4), most);
    EXPECT_EQ(field(most * 2 + 2 + 80, 68), most);

    TempFolder folder;  // a hole takes no room on the disc
    const std::string name = folder.write("big.wav", "");
    std::filesystem::resize_file(name, most + 9);
    QvIoFailure failure;
    qv_log()->clear();
    ASSERT_TRUE(writeWavHeader(qv_wide_name(name), stereo, failure));
    EXPECT_EQ(qv_log()->nrWarnings(), 1);
    EXPECT_EQ(std::filesystem::file_size(name), most + 9);
    std::ifstream in(name, std::ios::binary);
    std::string header(80, '\0');
    in.read(header.data(), 80);
    EXPECT_EQ(leNumber(header, 4, 4), most);
    EXPECT_EQ(leNumber(header, 76, 4), most + 9 - 80);
    EXPECT_FALSE(writeWavHeader(qv_wide_name(folder.file("none.wav")), stereo, failure));
    EXPECT_EQ(failure.code(), ENOENT);
}

TEST(WavHeader, StatesTheChannelMaskOnRequest) {
    const auto mask = [](const WavFormat& format) {
        const auto bytes = wavHeader(format, {1000});
        return leNumber(std::string(bytes.begin(), bytes.end()), 40, 4);
    };
    EXPECT_EQ(mask({48'000, 6, 24}), 0u);
    EXPECT_EQ(mask({48'000, 6, 24, 0x8000'003F}), 0x8000'003Fu);
}

// Of the same length as the other, so that the samples stay where they are.
TEST(WavHeader, Rf64HasSizesOf64Bits) {
    const WavFormat format = {96'000, 3, 20};
    constexpr uint64_t file = (5ULL << 30) + 80 + 26, trailing = 26;
    const auto bytes = wavHeader(format, {file, trailing, true});
    const std::string header(bytes.begin(), bytes.end());
    const std::string expected = "RF64" + leBytes(0xFFFFFFFF, 4) + "WAVE" +
                                 wavChunk("ds64", leBytes(file - 8, 8) + leBytes(5ULL << 30, 8) +
                                                      leBytes((5ULL << 30) / 9, 8) + leBytes(0, 4)) +
                                 wavChunk("fmt ", wavFormat(1, 3, 96'000, 24)) + "data" +
                                 leBytes(0xFFFFFFFF, 4);
    EXPECT_EQ(header, expected);
    const auto id = [&](uint64_t fileBytes) {
        return static_cast<char>(wavHeader(format, {fileBytes, 0, true})[1]);
    };
    EXPECT_EQ(id(0xFFFFFFFFULL + 8), 'I') << "what fits stays as it is";
    EXPECT_EQ(id(0xFFFFFFFFULL + 9), 'F');
    EXPECT_EQ(id(wavLengthUnknown), 'I');

    TempFolder folder;
    const std::string name = folder.write("big.wav", "");
    std::filesystem::resize_file(name, file);
    QvIoFailure failure;
    qv_log()->clear();
    ASSERT_TRUE(writeWavHeader(qv_wide_name(name), format, failure, trailing, true));
    EXPECT_EQ(qv_log()->nrWarnings(), 0);
    std::ifstream in(name, std::ios::binary);
    std::string written(80, '\0');
    in.read(written.data(), 80);
    EXPECT_EQ(written, expected);
}

AnyDict chunk(const char* id, const std::string& data) {
    return AnyDict("id", id, "data",
                   Any(static_cast<const void*>(data.data()), static_cast<int>(data.size())));
}

TEST_F(QvBsSplitAudioTest, ChunksFollowTheSamples) {
    chunks = AnyVector(chunk("bext", "odd"), chunk("iXML", "even"));
    const std::string trailing = wavChunk("bext", "odd") + wavChunk("iXML", "even");
    for (const int split : {0, 1})
        for (const size_t samples : {size_t{5}, size_t{6}}) {
            begin(8'000, 3, 8, split);
            unit(stream, AUDIO_AU_CODE, patternBytes(samples * 3));
            tell(stream.input(), STREAM_END_CODE);
            stream.destroy(0);
            EXPECT_EQ(stream.ioError(), 0);
            const size_t bytes = split ? samples : samples * 3, padded = bytes + bytes % 2;
            for (const std::string& name : namesIn(folder)) {
                if (name.find('#') == std::string::npos ? split : !split) continue;
                const std::string file = TempFolder::read(folder.file(name));
                EXPECT_EQ(file.substr(80 + padded), trailing) << name;
                EXPECT_EQ(leNumber(file, 4, 4), file.size() - 8);
                EXPECT_EQ(leNumber(file, 76, 4), bytes);
                EXPECT_EQ(leNumber(file, 68, 4), bytes);
            }
        }
    for (const Any& bad :
         {Any(1), Any(AnyVector(1)), Any(AnyVector(chunk("abc", "d"))),
          Any(AnyVector(AnyDict("id", "abcd", "data", "text"))), Any(AnyVector(chunk("abcd", "")))}) {
        chunks = bad;
        begin(8'000, 1, 8, 0, -1);
    }
}

TEST_F(QvBsSplitAudioTest, ADiscThatIsFullAtTheChunksIsTold) {
    FullDisc disc(100'000);
    PlatformScope scope(disc);
    chunks = AnyVector(chunk("iXML", std::string(200'000, 'x')));
    begin(1000, 2, 16);
    unit(stream, AUDIO_AU_CODE, patternBytes(4000));
    tell(stream.input(), STREAM_END_CODE);
    EXPECT_EQ(stream.ioError(), ENOSPC);
}

}  // namespace
