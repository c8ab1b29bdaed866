#include "builtin/decoders/wavdec.h"

#include "tests/support/checks.h"
#include "tests/support/pictures.h"
#include "tests/support/wav_bytes.h"

namespace {

class Wav : public testing::Test {
  protected:
    Wav() { decoder.init(); }

    int open(const std::string& bytes) {
        decoder.setParam("filename", folder.write("a.wav", bytes).c_str());
        return decoder.open();
    }
    // Everything from the present position on, read in blocks of `block` samples.
    std::string readAll(int block) {
        std::string all;
        while ((last = decoder.readSamples(block, 0)) > 0) {
            EXPECT_EQ(last, decoder.getAudioPtr(0)->samples());
            all += soundBytes(*decoder.getAudioPtr(0));
        }
        return all;
    }

    TempFolder folder;
    WavDec decoder;
    int last = 0;
};

std::string stereo16(std::string_view data) {
    return riff(wavChunk("fmt ", wavFormat(1, 2, 48000, 16)) + wavChunk("data", data));
}

TEST_F(Wav, ReadsOfAnySizeAndSeeksGiveTheSameBytes) {
    const std::string data = patternBytes(4 * 70000);
    ASSERT_EQ(open(stereo16(data)), 0);
    for (const int block : {7, 4097, 2000000000}) {
        ASSERT_EQ(decoder.seekToSample(0, 0), 0);
        EXPECT_TRUE(readAll(block) == data) << block;
    }
    for (const long long sample : {69999LL, 1LL, 12345LL}) {
        ASSERT_EQ(decoder.seekToSample(sample, 0), 0);
        EXPECT_EQ(decoder.getAudioPtr(0)->position(), sample);
        EXPECT_TRUE(readAll(4096) == data.substr(static_cast<std::size_t>(sample) * 4)) << sample;
    }
    EXPECT_EQ(decoder.readSamples(0, 0), 0);
    EXPECT_EQ(decoder.readSamples(-1, 0), -4);
    EXPECT_EQ(decoder.seekToSample(-1, 0), -4);
    EXPECT_EQ(decoder.seekToSample(1LL << 62, 0), 0);
    EXPECT_EQ(decoder.readSamples(10, 0), -4);
}

TEST_F(Wav, FindsItsChunksAmongOthers) {
    const std::string format = wavChunk("fmt ", wavFormat(1, 1, 8000, 8));
    const std::string data = "\x01\x02\x03\x04\x05\x06";
    const std::string dataChunk = wavChunk("data", data);
    const std::string extended = wavChunk("fmt ", wavExtensible(1, 1, 8000, 8, 4));
    const std::string unpadded = "LIST" + leBytes(3, 4) + "abc", unknown = "\xFF\xFF\xFF\xFF";
    const std::string rf64 =
        "RF64" + unknown + "WAVE" +
        wavChunk("ds64", leBytes(100, 8) + leBytes(6, 8) + leBytes(6, 8) + leBytes(0, 4)) + format + "data" +
        unknown + data + "tail";
    const struct {
        const char* what;
        std::string file;
    } cases[] = {
        {"plain", riff(format + dataChunk)},
        {"an odd one before", riff(wavChunk("LIST", "abc") + format + dataChunk)},
        {"an odd one without its padding", riff(unpadded + format + dataChunk)},
        {"the word in a text", riff(format + wavChunk("LIST", "ISFTdata\x02\0\0\0") + dataChunk)},
        {"extensible", riff(extended + dataChunk)},
        {"chunks behind the data", riff(format + dataChunk + wavChunk("LIST", "INFOabcd"))},
        {"a far chunk", riff(format + wavChunk("bext", std::string(90000, 'd')) + dataChunk)},
        {"64-bit sizes", rf64},
    };
    for (const auto& c : cases) {
        ASSERT_EQ(open(c.file), 0) << c.what << ": " << decoder.errorDesc();
        EXPECT_TRUE(readAll(4) == data) << c.what;
        EXPECT_FALSE(decoder.getAudioParam(0, "truncated").isValid()) << c.what;
    }
}

TEST_F(Wav, RefusesWhatItCanNotRead) {
    const std::string format = wavChunk("fmt ", wavFormat(1, 2, 48000, 16));
    const std::string data = wavChunk("data", patternBytes(64));
    const auto with = [&](const std::string& fields) { return riff(wavChunk("fmt ", fields) + data); };
    const char* unsupported = "WAV format not supported";
    const char* unparsed = "Failed to parse WAV file";
    const std::string padded = leBytes(1, 2) + leBytes(2, 2) + leBytes(48000, 4) + leBytes(384000, 4) +
                               leBytes(8, 2) + leBytes(24, 2);
    const struct {
        const char* what;
        std::string file;
        const char* text;
    } cases[] = {
        {"float", with(wavFormat(3, 2, 48000, 32)), unsupported},
        {"extensible without extension", with(wavFormat(0xFFFE, 2, 48000, 16)), unsupported},
        {"nine channels", with(wavFormat(1, 9, 48000, 16)), unsupported},
        {"a negative rate", with(wavFormat(1, 2, 0x80000000, 16)), unsupported},
        {"32 bits", with(wavFormat(1, 2, 48000, 32)), unsupported},
        {"24 bits in four bytes", with(padded), unsupported},
        {"another form", "RIFF" + leBytes(100, 4) + "AVI " + format + data, unparsed},
        {"an empty chunk before", riff(wavChunk("LIST", "") + format + data), unparsed},
        {"a chunk of 2 GiB before", "RIFF" + leBytes(99, 4) + "WAVELIST" + leBytes(0x80000000, 4) + format,
         unparsed},
        {"no format", riff(data), unparsed},
        {"data too far", riff(format + std::string(100000, 'x') + data), unparsed},
        {"nothing", "", unparsed},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(open(c.file), -15) << c.what;
        EXPECT_STREQ(decoder.errorDesc(), c.text) << c.what;
        EXPECT_EQ(decoder.getState(), 2) << c.what;
    }
    for (const Any& name : {Any(), Any(""), Any("/no/such/file.wav"), Any(folder.path().c_str())}) {
        decoder.setParam("filename", name);
        EXPECT_EQ(decoder.open(), -9);
        EXPECT_STREQ(decoder.errorDesc(), "Failed to open file for reading");
    }
}

TEST_F(Wav, TruncationAtEveryByteIsToldOrRefused) {
    const std::string data = patternBytes(4 * 60);
    const std::string whole = stereo16(data);
    for (std::size_t length = 0; length <= whole.size(); ++length) {
        if (length < 44) {
            EXPECT_EQ(open(whole.substr(0, length)), -15) << length;
            continue;
        }
        ASSERT_EQ(open(whole.substr(0, length)), 0) << length;
        const long long present = static_cast<long long>(length - 44) / 4;
        EXPECT_EQ(decoder.nrSamples(0), present);
        EXPECT_TRUE(readAll(16) == data.substr(0, static_cast<std::size_t>(present) * 4));
        EXPECT_EQ(last, -4);
        EXPECT_EQ(decoder.getAudioParam(0, "truncated") == Any(1), present < 60) << length;
        EXPECT_TRUE(decoder.getAudioParam(0, "samplesExpected") == (present < 60 ? Any(60LL) : Any()));
    }
}

TEST_F(Wav, SizesThatWereNeverWrittenMeanToTheEnd) {
    const std::string format = wavChunk("fmt ", wavFormat(1, 2, 48000, 16));
    const std::string data = patternBytes(4 * 500);
    for (const std::uint64_t size : {0ull, 0xFFFFFFFFull, 0x7FFFF000ull, 0x7FFFFFFCull}) {
        const std::string file =
            "RIFF" + leBytes(size, 4) + "WAVE" + format + "data" + leBytes(size, 4) + data;
        ASSERT_EQ(open(file), 0);
        EXPECT_EQ(decoder.nrSamples(0), 500) << size;
        EXPECT_FALSE(decoder.getAudioParam(0, "truncated").isValid()) << size;
        EXPECT_EQ(decoder.getParam("filesize").toInt64(), static_cast<long long>(file.size())) << size;
    }
    ASSERT_EQ(open(riff(format + wavChunk("data", "") + wavChunk("LIST", "INFOabcd"))), 0);
    EXPECT_EQ(decoder.nrSamples(0), 0) << "an empty chunk that others follow is empty";
    EXPECT_EQ(decoder.readSamples(10, 0), -4);

    ASSERT_EQ(open("RIFF" + leBytes(36, 4) + "WAVE" + format + "data" + leBytes(0xFFFFFFF0, 4) + data), 0);
    EXPECT_EQ(decoder.nrSamples(0), 500);
    EXPECT_EQ(decoder.getAudioParam(0, "samplesExpected").toInt64(), 0xFFFFFFF0 / 4);
}

TEST_F(Wav, FilesBeyondFourGigabytesAreReadToTheirEnd) {
    const std::string head = "RIFF" + leBytes(0, 4) + "WAVE" + wavChunk("fmt ", wavFormat(1, 2, 48000, 16));
    const long long bytes = (5LL << 30) + 8;
    const std::string name =
        folder.write("big.wav", head + "data" + leBytes(static_cast<std::uint32_t>(bytes), 4));
    std::filesystem::resize_file(name, 44 + static_cast<std::uintmax_t>(bytes));  // sparse
    decoder.setParam("filename", name.c_str());
    ASSERT_EQ(decoder.open(), 0);
    EXPECT_EQ(decoder.nrSamples(0), bytes / 4);
    ASSERT_EQ(decoder.seekToSample(bytes / 4 - 10, 0), 0);
    EXPECT_EQ(decoder.readSamples(100, 0), 10);
}

}  // namespace
