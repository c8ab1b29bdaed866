#include "builtin/decoders/wavdec.h"

#include <algorithm>
#include <bit>
#include <cmath>

#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "tests/support/checks.h"
#include "tests/support/pictures.h"
#include "tests/support/wav_bytes.h"

namespace {

class Wav : public testing::Test {
  protected:
    Wav() { decoder.init(); }

    int openExtended(const std::string& bytes) {
        decoder.setParam("extended", 1);
        return open(bytes);
    }
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
    EXPECT_EQ(decoder.readSamples(-1, 0), QvStatus::endOfStream);
    EXPECT_EQ(decoder.seekToSample(-1, 0), QvStatus::endOfStream);
    EXPECT_EQ(decoder.seekToSample(1LL << 62, 0), 0);
    EXPECT_EQ(decoder.readSamples(10, 0), QvStatus::endOfStream);
}

TEST_F(Wav, FindsItsChunksAmongOthers) {
    const std::string format = wavChunk("fmt ", wavFormat(1, 1, 8000, 8));
    const std::string data = "\x01\x02\x03\x04\x05\x06";
    const std::string dataChunk = wavChunk("data", data);
    const std::string extended = wavChunk("fmt ", wavExtensible(1, 1, 8000, 8, 4));
    const std::string unpadded = "LIST" + leBytes(3, 4) + "abc";
    const struct {
        const char* what;
        std::string file;
    } cases[] = {
        {"plain", riff(format + dataChunk)},
        {"an odd one before", riff(wavChunk("LIST", "abc") + format + dataChunk)},
        {"an odd one without its padding", riff(unpadded + format + dataChunk)},
        {"the word in a text", riff(format + wavChunk("LIST", "ISFTdata\x02\0\0\0") + dataChunk)},
        {"extensible", riff(extended + dataChunk)},
        {"chunks after the data", riff(format + dataChunk + wavChunk("LIST", "INFOabcd"))},
        {"a far chunk", riff(format + wavChunk("bext", std::string(90000, 'd')) + dataChunk)},
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
        EXPECT_EQ(open(c.file), QvStatus::noSegment) << c.what;
        EXPECT_STREQ(decoder.errorDesc(), c.text) << c.what;
        EXPECT_EQ(decoder.getState(), 2) << c.what;
    }
    for (const Any& name : {Any(), Any(""), Any("/no/such/file.wav"), Any(folder.path().c_str())}) {
        decoder.setParam("filename", name);
        EXPECT_EQ(decoder.open(), QvStatus::cannotParse);
        EXPECT_STREQ(decoder.errorDesc(), "Failed to open file for reading");
    }
}

TEST_F(Wav, TruncationAtEveryByteIsToldOrRefused) {
    const std::string data = patternBytes(4 * 60);
    const std::string whole = stereo16(data);
    for (std::size_t length = 0; length <= whole.size(); ++length) {
        if (length < 44) {
            EXPECT_EQ(open(whole.substr(0, length)), QvStatus::noSegment) << length;
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
    EXPECT_EQ(decoder.readSamples(10, 0), QvStatus::endOfStream);

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

// --- What "extended" adds.

std::string floatBytes(std::initializer_list<float> values) {
    std::string bytes;
    for (const float value : values) bytes += leBytes(std::bit_cast<std::uint32_t>(value), 4);
    return bytes;
}
std::string doubleBytes(std::initializer_list<double> values) {
    std::string bytes;
    for (const double value : values) bytes += leBytes(std::bit_cast<std::uint64_t>(value), 8);
    return bytes;
}
std::string whole(std::initializer_list<std::int64_t> values, int bytes) {
    std::string all;
    for (const std::int64_t value : values) all += leBytes(static_cast<std::uint64_t>(value), bytes);
    return all;
}

std::string wavOf(const std::string& format, const std::string& data) {
    return riff(wavChunk("fmt ", format) + wavChunk("data", data));
}

// The same file with every number turned around, for those whose chunks are "fmt " and "data".
// `guid`: so many bytes of the sub-format are turned; some writers turn fewer than four.
std::string bigEndian(std::string file, std::size_t width, std::size_t guid = 4) {
    const auto turn = [&](std::size_t at, std::size_t bytes) {
        const auto begin = file.begin() + static_cast<std::ptrdiff_t>(at);
        std::reverse(begin, begin + static_cast<std::ptrdiff_t>(bytes));
    };
    file.replace(0, 4, "RIFX");
    const std::size_t formatBytes = leNumber(file, 16, 4), data = 20 + formatBytes;
    const std::size_t end = data + 8 + leNumber(file, data + 4, 4);
    for (const std::size_t at : {std::size_t{4}, std::size_t{16}, std::size_t{24}, std::size_t{28}, data + 4})
        turn(at, 4);
    for (const std::size_t at : {20UL, 22UL, 32UL, 34UL}) turn(at, 2);
    if (formatBytes == 40) {
        for (const std::size_t at : {36UL, 38UL, 46UL, 48UL, 50UL}) turn(at, 2);
        turn(40, 4);
        turn(44, guid);
    }
    for (std::size_t at = data + 8; at + width <= end; at += width) turn(at, width);
    return file;
}

TEST_F(Wav, ExtendedReadsOtherValues) {
    const struct {
        const char* what;
        unsigned tag, bits;
        std::string stored, delivered;
        int deliveredBits;
        long long clipped;
    } cases[] = {
        {"32-bit PCM", 1, 32, whole({0, 256, 127, 128, 129, 384, -128, -384, 0x7FFFFFFF, INT32_MIN}, 4),
         whole({0, 1, 0, 0, 1, 2, 0, -2, 0x7FFFFF, -0x800000}, 3), 24, 0},
        {"32-bit float", 3, 32,
         floatBytes({0, 0.5F, -1, 1, 1.001F, -2, 1e30F, INFINITY, -INFINITY, NAN, 0x1p-24F, 0x1.8p-23F}),
         whole(
             {0, 0x400000, -0x800000, 0x7FFFFF, 0x7FFFFF, -0x800000, 0x7FFFFF, 0x7FFFFF, -0x800000, 0, 0, 2},
             3),
         24, 6},
        {"64-bit float", 3, 64,
         doubleBytes({0, -0.5, 1, -1, 1 + 1e-12, -1e300, NAN, 0x1p-24, 0x1.8p-23, 0x1.0000001p-24}),
         whole({0, -0x400000, 0x7FFFFF, -0x800000, 0x7FFFFF, -0x800000, 0, 0, 2, 1}, 3), 24, 3},
        {"A-law", 6, 8, "\xD5\x55\xAA\x2A\x80", whole({8, -8, 32256, -32256, 5504}, 2), 16, 0},
        {"mu-law", 7, 8, std::string("\xFF\x7F\x80\0\xEF", 5), whole({0, 0, 32124, -32124, 132}, 2), 16, 0},
        {"12-bit PCM", 1, 12, whole({0x7FF0, -0x8000}, 2), whole({0x7FF0, -0x8000}, 2), 16, 0},
        {"20-bit PCM", 1, 20, whole({0x7FFFF0, -0x800000}, 3), whole({0x7FFFF0, -0x800000}, 3), 24, 0},
        {"5-bit PCM", 1, 5, "\x80\xF8", "\x80\xF8", 8, 0},
    };
    for (const auto& c : cases)
        for (const bool extensible : {false, true}) {
            const auto format =
                extensible ? wavExtensible(c.tag, 1, 8000, c.bits, 4) : wavFormat(c.tag, 1, 8000, c.bits);
            const std::string plain = wavOf(format, c.stored), turned = bigEndian(plain, (c.bits + 7) / 8);
            const std::string half = bigEndian(plain, (c.bits + 7) / 8, 2);
            const std::string left = bigEndian(plain, (c.bits + 7) / 8, 0);
            for (const std::string& file : {plain, turned, half, left})
                for (const int block : {1, 7, 4096}) {
                    decoder.setParam("extended", 0);
                    EXPECT_EQ(open(file), QvStatus::noSegment) << c.what;
                    ASSERT_EQ(openExtended(file), 0) << c.what << decoder.errorDesc();
                    EXPECT_EQ(readAll(block), c.delivered) << c.what;
                    EXPECT_EQ(decoder.getAudioParam(0, "bitsPerSample").toInt32(), c.deliveredBits);
                    EXPECT_EQ(decoder.getAudioPtr(0)->bytesPerSample(), c.deliveredBits / 8);
                    const std::string order = file.starts_with("RIFX") ? ", big-endian" : "";
                    EXPECT_EQ(decoder.getAudioParam(0, "sourceFormat").asString(), c.what + order);
                    ASSERT_EQ(decoder.seekToSample(1, 0), 0);
                    const auto width = static_cast<std::size_t>(c.deliveredBits / 8);
                    EXPECT_EQ(readAll(block), c.delivered.substr(width)) << c.what;
                    EXPECT_EQ(decoder.getAudioParam(0, "clippedSamples").asInt64(0), c.clipped) << c.what;
                }
        }
}

TEST_F(Wav, ExtendedReadsBigEndianPcm) {
    for (const unsigned bits : {8U, 16U, 24U}) {
        const std::string data = patternBytes(bits / 8 * 2 * 100);
        ASSERT_EQ(openExtended(bigEndian(wavOf(wavFormat(1, 2, 48000, bits), data), bits / 8)), 0);
        EXPECT_TRUE(readAll(7) == data) << bits;
    }
}

TEST_F(Wav, ClippedSamplesAreCountedOnceAndWarnedOf) {
    std::string data;
    for (int i = 0; i < 50000; ++i) data += floatBytes({i % 10 == 0 ? 1.5F : 0.25F, 0});
    ASSERT_EQ(openExtended(wavOf(wavFormat(3, 2, 8000, 32), data)), 0);
    EXPECT_EQ(decoder.readSamples(25000, 0), 25000);
    EXPECT_EQ(decoder.getAudioParam(0, "clippedSamples").toInt64(), 2500);
    decoder.seekToSample(10000, 0);
    EXPECT_EQ(decoder.readSamples(30000, 0), 30000);
    EXPECT_EQ(decoder.getAudioParam(0, "clippedSamples").toInt64(), 4000);
    // In a range they are counted from nothing.
    EXPECT_EQ(decoder.setParam("clipRange", AnyVector(20000, 30000)), 0);
    decoder.seekToSample(0, 0);
    EXPECT_EQ(decoder.readSamples(50000, 0), 50000);
    EXPECT_EQ(decoder.getAudioParam(0, "clippedSamples").toInt64(), 1000);
    qv_log()->clear();
    decoder.close();
    AnyVector warnings;
    qv_log()->getAll(warnings);
    ASSERT_EQ(warnings.size(), 1);
    EXPECT_STREQ(warnings.at(0).asDict().getString("text", ""),
                 "1000 samples beyond full scale were clipped");
}

TEST_F(Wav, ExtendedReadsOtherFiles) {
    const std::string data = patternBytes(18 * 9), unknown = "\xFF\xFF\xFF\xFF";
    const std::string format = wavChunk("fmt ", wavExtensible(1, 9, 48000, 16, 0x1FF));
    const std::string ds64 =
        wavChunk("ds64", leBytes(900, 8) + leBytes(data.size(), 8) + leBytes(9, 8) + leBytes(0, 4));
    for (const char* id : {"RF64", "BW64"}) {
        const std::string file =
            id + unknown + "WAVE" + ds64 + format + "data" + unknown + data + wavChunk("bext", "abcd");
        decoder.setParam("extended", 0);
        EXPECT_EQ(open(file), QvStatus::noSegment);
        EXPECT_STREQ(decoder.errorDesc(), "Failed to parse WAV file");
        ASSERT_EQ(openExtended(file), 0) << decoder.errorDesc();
        EXPECT_TRUE(readAll(4) == data);
        EXPECT_EQ(decoder.getAudioParam(0, "channelMask").toInt64(), 0x1FF);
        EXPECT_EQ(decoder.getParam("chunks").asVector().size(), 1);
    }
    const std::string far = wavChunk("LIST", "") + format + wavChunk("axml", std::string(300000, 'd'));
    ASSERT_EQ(openExtended(riff(far + wavChunk("data", data))), 0);
    EXPECT_TRUE(readAll(4) == data);
    AnyDict state;
    decoder.store(state);
    WavDec other;
    other.init();
    other.setParam("settings", state.get("settings"));
    EXPECT_TRUE(other.getParam("extended").isTrue());
}

TEST_F(Wav, ExtendedRefusesWhatItCanNotRead) {
    const std::string data = patternBytes(64 * 9);
    const std::string padded = leBytes(1, 2) + leBytes(2, 2) + leBytes(48000, 4) + leBytes(384000, 4) +
                               leBytes(8, 2) + leBytes(24, 2);
    for (const std::string& format :
         {wavFormat(1, 2, 48000, 64), wavFormat(1, 2, 48000, 0), wavFormat(3, 2, 48000, 16),
          wavFormat(3, 1, 48000, 24), wavFormat(6, 1, 8000, 16), wavFormat(0x11, 2, 48000, 4),
          wavFormat(1, 0, 48000, 16), wavFormat(1, 257, 48000, 16), wavFormat(3, 2, 0, 32), padded}) {
        EXPECT_EQ(openExtended(wavOf(format, data)), QvStatus::noSegment);
        EXPECT_STREQ(decoder.errorDesc(), "WAV format not supported");
    }
}

TEST_F(Wav, ChunksAroundTheSamplesAreKeptOrNamed) {
    const std::string format = wavChunk("fmt ", wavFormat(1, 1, 8000, 8));
    const auto kept = [&] {
        std::string list;
        const Any chunks = decoder.getParam("chunks"), others = decoder.getParam("otherChunks");
        for (const Any& chunk : chunks.asVector()) {
            const Any& bytes = chunk.asDict().get("data");
            list += chunk.asDict().getString("id", "") +
                    ("=" + std::string(static_cast<const char*>(bytes.asGeneric()),
                                       static_cast<std::size_t>(bytes.size()))) +
                    " ";
        }
        for (const Any& id : others.asVector()) list += id.asString() + std::string(";");
        return list;
    };
    const std::string odd = wavChunk("data", "abc");
    const std::string before = wavChunk("bext", "B") + wavChunk("JUNK", "jj") + wavChunk("smpl", "s");
    const std::string after = wavChunk("LIST", "INFOx") + wavChunk("LIST", "adtlyz") +
                              wavChunk("LIST", "wavl") + wavChunk("iXML", "<x/>") + wavChunk("cue ", "c") +
                              wavChunk("smpl", "s");
    const std::string unpadded = "data" + leBytes(3, 4) + "abc";
    const struct {
        const char* what;
        std::string file, kept;
    } cases[] = {
        {"before and after", riff(before + format + odd + after),
         "bext=B LIST=INFOx LIST=adtlyz iXML=<x/> cue =c smpl;LIST;"},
        {"without padding", riff(format + unpadded + wavChunk("iXML", "<y/>")), "iXML=<y/> "},
        {"a chunk that was cut", riff(format + odd + "bext" + leBytes(100, 4) + "abc"), ""},
        {"no chunk", riff(format + odd + std::string(40, '\1')), ""},
        {"an empty one", riff(format + odd + wavChunk("bext", "") + wavChunk("cue ", "d")), "cue =d bext;"},
        {"too large", riff(format + odd + wavChunk("iXML", std::string(17 << 20, ' '))), "iXML;"},
        {"samples of unknown length",
         "RIFF" + leBytes(0, 4) + "WAVE" + before + format + "data" + leBytes(0, 4) + "abc", "bext=B smpl;"},
    };
    for (const auto& c : cases) {
        ASSERT_EQ(openExtended(c.file), 0) << c.what;
        EXPECT_EQ(kept(), c.kept) << c.what;
        EXPECT_EQ(readAll(2), "abc") << c.what;
        decoder.setParam("extended", 0);
        ASSERT_EQ(open(c.file), 0) << c.what;
        EXPECT_EQ(kept(), "") << c.what;
    }
}

}  // namespace
