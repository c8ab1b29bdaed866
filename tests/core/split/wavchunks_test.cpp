#include "core/split/wavchunks.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/support/wav_bytes.h"

namespace {

struct Chunk {
    std::string id, data;
    bool operator==(const Chunk& other) const { return id == other.id && data == other.data; }
};

AnyVector list(const std::vector<Chunk>& chunks) {
    AnyVector result;
    for (const Chunk& chunk : chunks)
        result.append(
            AnyDict("id", chunk.id.c_str(), "data",
                    Any(static_cast<const void*>(chunk.data.data()), static_cast<int>(chunk.data.size()))));
    return result;
}
std::vector<Chunk> plain(const AnyVector& chunks) {
    std::vector<Chunk> result;
    for (const Any& chunk : chunks) {
        const Any& data = chunk.asDict().get("data");
        result.push_back({chunk.asDict().getString("id", ""),
                          {static_cast<const char*>(data.asGeneric()), static_cast<size_t>(data.size())}});
    }
    return result;
}

std::string field(const std::string& text, size_t bytes) {
    return text + std::string(bytes - text.size(), '\0');
}

std::string bext(uint64_t reference, const std::string& loudness, int version = 2) {
    return field("A boat ", 256) + field("Recorder", 32) + field("REF1", 32) + "2024-02-29" + "23:59:58" +
           leBytes(reference, 8) + leBytes(static_cast<uint64_t>(version), 2) + std::string(64, 'u') +
           loudness + std::string(180, '\0') + "A=PCM,F=48000\r\n";
}
const std::string measured =
    leBytes(0xF700, 2) + leBytes(500, 2) + leBytes(0xFF38, 2) + leBytes(1, 2) + leBytes(2, 2);
const std::string unknown = leBytes(0x7FFF7FFF, 4) + leBytes(0x7FFF7FFF, 4) + leBytes(0x7FFF, 2);

std::string cue(const std::vector<std::pair<uint32_t, uint32_t>>& points) {
    std::string data = leBytes(points.size(), 4);
    for (const auto& [id, sample] : points)
        data += leBytes(id, 4) + leBytes(sample, 4) + "data" + leBytes(0, 8) + leBytes(sample, 4);
    return data;
}
std::string label(uint32_t id, const std::string& text) { return wavChunk("labl", leBytes(id, 4) + text); }
std::string region(uint32_t id, uint32_t length) {
    return wavChunk("ltxt", leBytes(id, 4) + leBytes(length, 4) + "rgn " + leBytes(0, 8));
}
std::string ixml(unsigned high, uint32_t low, unsigned rate, unsigned bits) {
    return "<BWFXML><PROJECT>P</PROJECT><SCENE></SCENE><SPEED><FILE_SAMPLE_RATE>" + std::to_string(rate) +
           "</FILE_SAMPLE_RATE><AUDIO_BIT_DEPTH>" + std::to_string(bits) +
           "</AUDIO_BIT_DEPTH><TIMESTAMP_SAMPLES_SINCE_MIDNIGHT_HI>" + std::to_string(high) +
           "</TIMESTAMP_SAMPLES_SINCE_MIDNIGHT_HI><TIMESTAMP_SAMPLES_SINCE_MIDNIGHT_LO>" +
           std::to_string(low) + "</TIMESTAMP_SAMPLES_SINCE_MIDNIGHT_LO></SPEED></BWFXML>";
}

TEST(WavChunks, TimesMoveWithThePart) {
    const std::vector<Chunk> source = {
        {"bext", bext(0xFFFFFF00, measured)},
        {"iXML", ixml(0, 0xFFFFFF00, 48000, 24)},
        {"LIST", "adtl" + label(1, "one") + label(2, "two") + region(3, 4800) + label(4, "four")},
        {"LIST", "INFO" + wavChunk("INAM", "A name")},
        {"cue ", cue({{1, 47999}, {2, 48000}, {3, 96000}, {4, 144001}})},
    };
    EXPECT_EQ(plain(QvWavChunks::ofPart(list(source), {.fromRate = 48000, .toRate = 48000})), source);

    const std::vector<Chunk> part = {
        {"bext", bext(0xFFFFFF00ULL + 48000, unknown)},
        {"iXML", ixml(1, 48000 - 256, 48000, 16)},
        {"LIST", "adtl" + label(2, "two") + region(3, 4800)},
        source[3],
        {"cue ", cue({{2, 0}, {3, 48000}})},
    };
    EXPECT_EQ(plain(QvWavChunks::ofPart(list(source), {48000, 96000, 48000, 48000, 16})), part);

    const std::vector<Chunk> halved = {
        {"bext", bext((0xFFFFFF00ULL + 48000) / 2, unknown)},
        {"iXML", ixml(0, 0x7FFFFF80U + 24000, 24000, 24)},
        {"LIST", "adtl" + label(2, "two") + region(3, 2400)},
        source[3],
        {"cue ", cue({{2, 0}, {3, 24000}})},
    };
    EXPECT_EQ(plain(QvWavChunks::ofPart(list(source), {48000, 96000, 48000, 24000, 24})), halved);

    const auto changed =
        plain(QvWavChunks::ofPart(list(source), {.fromRate = 48000, .toRate = 48000, .changed = true}));
    EXPECT_EQ(changed[0].data, bext(0xFFFFFF00, unknown));
    const std::vector<Chunk> old = {{"bext", bext(0, measured, 1)}};
    EXPECT_EQ(plain(QvWavChunks::ofPart(list(old), {0, 10, 8000, 8000}))[0].data, old[0].data)
        << "the first version has no loudness";
    const std::vector<Chunk> none = {{"cue ", cue({{1, 5}})}};
    EXPECT_TRUE(QvWavChunks::ofPart(list(none), {6, -1, 8000, 8000}).empty());
}

// Each prefix of each chunk, and numbers at their ends: nothing is read outside, and the rest stays.
TEST(WavChunks, DamagedOnesAreHarmless) {
    const std::string endless = "adtllabl" + leBytes(0xFFFFFFFF, 4) + "abc";
    const std::vector<Chunk> source = {
        {"bext", bext(UINT64_MAX, measured)},
        {"iXML", ixml(0xFFFFFFFF, 0xFFFFFFFF, 8000, 16)},
        {"iXML", "<FILE_SAMPLE_RATE>1<FILE_SAMPLE_RATE>"},
        {"LIST", endless},
        {"LIST", "adtl" + label(1, "one") + region(1, 0xFFFFFFFF)},
        {"cue ", leBytes(0xFFFFFFFF, 4) + cue({{1, 0xFFFFFFFF}}).substr(4)},
    };
    for (const Chunk& chunk : source)
        for (size_t size = 1; size <= chunk.data.size(); ++size) {
            const AnyVector one = list({{chunk.id, chunk.data.substr(0, size)}});
            const AnyDict described = QvWavChunks::describe(one);
            EXPECT_LE(described.size(), 1);
            for (const long long first : {0LL, 1LL, 1LL << 62})
                EXPECT_LE(QvWavChunks::ofPart(one, {first, 100, 8000, 1'000'000}).size(), 1);
        }
    AnyVector strange(1, "text", AnyDict("id", "bext"), AnyDict("data", 5));
    EXPECT_TRUE(QvWavChunks::describe(strange).empty());
    QvWavChunks::ofPart(strange, {1, 100, 8000, 8000});
}

TEST(WavChunks, SayWhatTheyHold) {
    const AnyDict all = QvWavChunks::describe(list({
        {"bext", bext(172800000, measured)},
        {"iXML", ixml(0, 5, 48000, 24)},
        {"LIST", "INFO" + wavChunk("INAM", "A name\0\0") + wavChunk("IART", "Someone")},
        {"cue ", cue({{7, 100}, {8, 200}})},
        {"LIST", "adtl" + label(8, "here")},
    }));
    const AnyDict& origin = all.get("bext").asDict();
    EXPECT_STREQ(origin.getString("description", ""), "A boat");
    EXPECT_STREQ(origin.getString("originator", ""), "Recorder");
    EXPECT_STREQ(origin.getString("originationDate", ""), "2024-02-29");
    EXPECT_STREQ(origin.getString("originationTime", ""), "23:59:58");
    EXPECT_STREQ(origin.getString("codingHistory", ""), "A=PCM,F=48000");
    EXPECT_EQ(origin.getInt64("timeReference", 0), 172800000);
    EXPECT_EQ(origin.getInt32("version", 0), 2);
    const auto isDescribed = [](size_t bytes) {
        return QvWavChunks::describe(list({{"bext", bext(0, measured).substr(0, bytes)}})).isSet("bext");
    };
    EXPECT_TRUE(isDescribed(602)) << "a chunk without coding history";
    EXPECT_FALSE(isDescribed(601));
    const AnyVector& info = all.get("info").asVector();
    ASSERT_EQ(info.size(), 2);
    EXPECT_STREQ(info.at(1).asDict().getString("id", ""), "IART");
    EXPECT_STREQ(info.at(1).asDict().getString("text", ""), "Someone");
    EXPECT_STREQ(all.get("iXML").asDict().getString("project", ""), "P");
    EXPECT_FALSE(all.get("iXML").asDict().isSet("scene"));
    const AnyVector& cues = all.get("cues").asVector();
    ASSERT_EQ(cues.size(), 2);
    EXPECT_FALSE(cues.at(0).asDict().isSet("label"));
    EXPECT_EQ(cues.at(1).asDict().getInt64("position", 0), 200);
    EXPECT_STREQ(cues.at(1).asDict().getString("label", ""), "here");
}

}  // namespace
