#include <gmock/gmock.h>

#include <numeric>

#include "core/engine/qvutil.h"
#include "core/preset/qvprofile.h"
#include "tests/core/stream/streamtools.h"
#include "tests/support/output_pipe.h"

namespace {

using namespace std::string_literals;

// Reads an AVI file by its structure alone, and checks on the way what a reader relies on: lengths that fit
// into each other, and indexes that name exactly the chunks that are there.
class AviReader {
  public:
    struct Chunk {
        std::string id;
        size_t data, bytes;
        bool operator==(const Chunk&) const = default;
    };
    struct Stream {
        std::string header, format = {}, shape = {};
        std::vector<Chunk> chunks = {};    // by the super index
        std::vector<unsigned> units = {};  // that each of its places covers
    };

    explicit AviReader(std::string bytes) : bytes_(std::move(bytes)) {
        readSegments();
        EXPECT_EQ(declared_, streams.size());
        for (size_t i = 0; i < streams.size(); ++i) readIndex(i);
    }

    size_t number(size_t at, int width) const { return leNumber(bytes_, at, width); }
    std::string text(size_t at) const { return bytes_.substr(at, 4); }
    std::string data(const Chunk& chunk) const { return bytes_.substr(chunk.data, chunk.bytes); }
    std::string all(size_t stream) const {
        std::string joined;
        for (const auto& chunk : streams[stream].chunks) joined += data(chunk);
        return joined;
    }

    std::vector<size_t> segments;  // their lengths in bytes
    unsigned microseconds = 0, firstFrames = 0, totalFrames = 0, width = 0;
    std::vector<Stream> streams;
    std::vector<Chunk> inOrder;  // of all segments
    std::vector<Chunk> oldIndex;

  private:
    void readSegments() {
        for (size_t at = 0; at < bytes_.size();) {
            ASSERT_EQ(text(at), "RIFF");
            ASSERT_EQ(text(at + 8), segments.empty() ? "AVI " : "AVIX");
            const size_t end = at + 8 + number(at + 4, 4);
            ASSERT_LE(end, bytes_.size());
            segments.push_back(end - at);
            lists(at + 12, end, at);
            at = end;
        }
    }
    void lists(size_t at, size_t end, size_t riff) {
        while (at < end) {
            const std::string id = text(at);
            const size_t data = at + 8, bytes = number(at + 4, 4);
            ASSERT_LE(data + bytes, end) << id;
            if (id == "LIST") {
                if (text(data) == "movi") movi_ = data;
                lists(data + 4, data + bytes, riff);
            } else {
                chunk({id, data, bytes}, riff);
            }
            at = data + bytes + bytes % 2;
        }
        EXPECT_EQ(at, end);
    }
    void chunk(const Chunk& c, size_t riff) {
        const auto word = [&](size_t at) { return static_cast<unsigned>(number(c.data + at, 4)); };
        if (c.id == "avih") {
            microseconds = word(0), firstFrames = word(16), width = word(32);
            declared_ = word(24);
        } else if (c.id == "strh") {
            streams.push_back({data(c)});
        } else if (c.id == "strf") {
            streams.back().format = data(c);
        } else if (c.id == "vprp") {
            streams.back().shape = data(c);
        } else if (c.id == "indx") {
            super_.push_back(c);
        } else if (c.id == "dmlh") {
            totalFrames = word(0);
        } else if (c.id == "idx1") {
            for (size_t at = 0; at < c.bytes; at += 16)
                oldIndex.push_back({text(c.data + at), movi_ + word(at + 8) + 8, word(at + 12)});
        } else if (c.id.substr(0, 2) == "ix") {
            EXPECT_EQ(number(c.data + 12, 8), riff);
        } else {
            inOrder.push_back(c);
        }
    }
    void readIndex(size_t number_) {
        const Chunk& places = super_.at(number_);
        auto& stream = streams[number_];
        for (size_t i = 0; i < number(places.data + 4, 4); ++i) {
            const size_t place = places.data + 24 + i * 16, index = number(place, 8);
            ASSERT_EQ(text(index).substr(0, 2), "ix");
            EXPECT_EQ(number(index + 4, 4) + 8, number(place + 8, 4));
            stream.units.push_back(static_cast<unsigned>(number(place + 12, 4)));
            const size_t base = number(index + 20, 8);
            for (size_t e = 0; e < number(index + 12, 4); ++e) {
                const size_t data = base + number(index + 32 + e * 8, 4);
                stream.chunks.push_back({text(data - 8), data, number(index + 36 + e * 8, 4)});
                EXPECT_EQ(number(data - 4, 4), stream.chunks.back().bytes);
                EXPECT_EQ(stream.chunks.back().id, text(index + 16));
            }
        }
    }

    std::string bytes_;
    size_t movi_ = 0;
    unsigned declared_ = 0;
    std::vector<Chunk> super_;
};

struct RawAvi : OutputPipe {
    RawAvi() : OutputPipe("out.avi") {
        EXPECT_EQ(pipe_->applyPreset(QvProfile::aviRaw, 0), 0);
        pipe_->clearStreams();
        pipe_->setFilename(Any(folder_.file("out.avi").c_str()));
    }
    AviReader readAvi() { return AviReader(read("out.avi")); }
};

// Letters in the order of memory, small ones, great ones and digits in the three planes: rows of BGR from the
// bottom, filled up with zeros; what an odd size lacks repeats its neighbour.
TEST_F(RawAvi, PicturesOfEachType) {
    const struct {
        unsigned type;
        const char* handler;
        unsigned compression;
        int bits, width, height;
        std::string expected;
    } rows[] = {
        {QvFourcc::BGR3, "DIB ", 0, 24, 3, 2, "mnopqrstu\0\0\0abcdefghi\0\0\0"s},
        {QvFourcc::BGR4, "DIB ", 0, 32, 2, 2, "ijklmnopabcdefgh"},
        {QvFourcc::I420, "I420", QvFourcc::I420, 12, 3, 3, "abcdefghiAAAA0000"},
        {QvFourcc::YV12, "YV12", QvFourcc::YV12, 12, 4, 2, "abcdefghAB01"},
        {QvFourcc::YUYV, "YUY2", QvFourcc::YUY2, 16, 3, 2, "abcdefcdghijklij"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(testing::Message() << row.handler << row.bits << " " << row.width);
        pipe_->clearStreams();
        addVideo(row.type, row.width, row.height);
        ASSERT_EQ(pipe_->open(), 0) << pipe_->errorDesc();
        QvFrame frame = picture(0);
        for (int plane = 0; plane < frame.planes(); ++plane)
            for (int i = 0; i < frame.plane_bytes(plane); ++i)
                frame.plane(plane)[i] = static_cast<unsigned char>("aA0"[plane] + i);
        for (int i = 0; i < 2; ++i) ASSERT_EQ(pipe_->writeFrame(&frame, 0), 0);
        ASSERT_EQ(pipe_->close(), 0);
        const auto avi = readAvi();
        ASSERT_EQ(avi.streams.size(), 1u);
        const auto& stream = avi.streams[0];
        EXPECT_EQ(stream.header.substr(0, 8), std::string("vids") + row.handler);
        EXPECT_EQ(avi.all(0), row.expected + row.expected);
        EXPECT_EQ(stream.format.substr(4), leBytes(unsigned(row.width), 4) +
                                               leBytes(unsigned(row.height), 4) + leBytes(1, 2) +
                                               leBytes(unsigned(row.bits), 2) + leBytes(row.compression, 4) +
                                               leBytes(row.expected.size(), 4) + std::string(16, '\0'));
        EXPECT_EQ(leNumber(stream.header, 36, 4), row.expected.size());
    }
}

// The shape of the picture, of which the pixels are square, and the lines of its fields in order of time.
TEST_F(RawAvi, ShapeAndFields) {
    const auto words = [](std::initializer_list<unsigned> values) {
        std::string bytes;
        for (const unsigned value : values) bytes += leBytes(value, 4);
        return bytes;
    };
    const unsigned aspect = 64 << 16 | 35;  // 64:35
    const struct {
        int interlaced;
        unsigned refresh, fields;
        std::string lines;
    } rows[] = {
        {0, 25, 1, words({35, 64, 35, 64, 0, 0, 0, 0})},
        {1, 50, 2, words({18, 64, 18, 64, 0, 0, 0, 0, 17, 64, 17, 64, 0, 0, 0, 1})},
        {2, 50, 2, words({17, 64, 17, 64, 0, 0, 0, 1, 18, 64, 18, 64, 0, 0, 0, 0})},
    };
    for (const auto& row : rows) {
        pipe_->clearStreams();
        addVideo(QvFourcc::YUYV, 64, 35, QvFramerate(QvRatio(25, 1), row.interlaced));
        ASSERT_EQ(pipe_->open(), 0) << pipe_->errorDesc();
        writePicture(0);
        ASSERT_EQ(pipe_->close(), 0);
        EXPECT_EQ(readAvi().streams.at(0).shape,
                  words({0, 0, row.refresh, 64, 35, aspect, 64, 35, row.fields}) + row.lines)
            << row.interlaced;
    }
}

// A short limit makes many segments; the sound comes in pieces of other lengths than the pictures ask for.
TEST_F(RawAvi, SegmentsAndInterleaving) {
    constexpr int frames = 40, rate = 44100;
    const QvFramerate ntsc(QvRatio(30000, 1001));
    pipe_->getMuxer()->setParam("riffBytes", 20000);
    pipe_->getMuxer()->setParam("segments", 64);
    addVideo(QvFourcc::YUYV, 32, 32, ntsc);
    addAudio(1, 8, rate);
    addAudio(2, 16, 48000);
    ASSERT_EQ(pipe_->open(), 0) << pipe_->errorDesc();
    std::string pictures, mono, stereo;
    const int perSeven = static_cast<int>(QvUtil::samplesForFrames(7, ntsc, rate)) + 1;
    for (unsigned i = 0; i < frames; ++i) {
        pictures += writePicture(i);
        if (i % 7 == 0) mono += writeSound(perSeven, i, 0);
        for (const int part : {1, 1600}) stereo += writeSound(part, i, 1);
    }
    ASSERT_EQ(pipe_->close(), 0);

    const auto avi = readAvi();
    EXPECT_GT(avi.segments.size(), 10u);
    for (const size_t bytes : avi.segments) EXPECT_LE(bytes, 20000u);
    ASSERT_EQ(avi.streams.size(), 3u);
    const struct {
        const std::string& given;
        unsigned scale, rate, unit;
    } expected[] = {{pictures, 1001, 30000, 2048}, {mono, 1, rate, 1}, {stereo, 1, 48000, 4}};
    for (size_t i = 0; i < 3; ++i) {
        const auto& [given, scale, samplerate, unit] = expected[i];
        const auto& stream = avi.streams[i];
        EXPECT_TRUE(avi.all(i) == given) << i;
        EXPECT_EQ(stream.header.substr(20, 8), leBytes(scale, 4) + leBytes(samplerate, 4));
        EXPECT_EQ(stream.header.substr(32, 4), leBytes(given.size() / unit, 4));
        EXPECT_EQ(stream.header.substr(44, 4), leBytes(i ? unit : 0, 4));
        EXPECT_EQ(std::accumulate(stream.units.begin(), stream.units.end(), 0u), given.size() / unit);
    }
    EXPECT_TRUE(avi.totalFrames == 40 && avi.microseconds == 33367 && avi.width == 32);

    // The old index covers the first segment, and nothing else.
    ASSERT_TRUE(std::equal(avi.oldIndex.begin(), avi.oldIndex.end(), avi.inOrder.begin()));
    const auto first =
        std::count_if(avi.oldIndex.begin(), avi.oldIndex.end(), [](auto& c) { return c.id == "00db"; });
    EXPECT_EQ(first, avi.firstFrames);
    EXPECT_EQ(first, avi.streams[0].units[0]);

    // Each picture comes before the sound that follows it in time, and after all sound before it.
    double shown = 0, heard = 0;
    for (const auto& chunk : avi.inOrder) {
        if (chunk.id == "02wb") heard += static_cast<double>(chunk.bytes) / 4 / 48000;
        if (chunk.id != "00db") continue;
        EXPECT_NEAR(heard, shown, 0.001);
        shown += 1001.0 / 30000;
    }
}

// Pictures of an odd length. What fits to the byte stays together, in the first segment and in a later one.
TEST_F(RawAvi, ASegmentIsFilledToItsLastByte) {
    pipe_->getMuxer()->setParam("segments", 4);
    const auto lengths = [&](int limit) {
        pipe_->clearStreams();
        addVideo(QvFourcc::I420, 9, 9);
        EXPECT_EQ(pipe_->getMuxer()->setParam("riffBytes", limit), 0);
        EXPECT_EQ(pipe_->open(), 0) << pipe_->errorDesc();
        for (unsigned i = 0; i < 16; ++i) writePicture(i);
        EXPECT_EQ(pipe_->close(), 0);
        return readAvi().segments;
    };
    const auto both = lengths(2000);
    ASSERT_EQ(both.size(), 2u);
    for (const size_t length : both) {
        const int limit = static_cast<int>(length);
        EXPECT_THAT(lengths(limit), testing::Contains(length));
        EXPECT_THAT(lengths(limit - 1), testing::Each(testing::Lt(length)));
    }
}

TEST_F(RawAvi, SoundFormats) {
    for (const auto& [channels, bits, format] :
         {std::tuple(2, 16, wavFormat(1, 2, 48000, 16) + leBytes(0, 2)),
          {6, 16, wavExtensible(1, 6, 48000, 16, 0x3F)},
          {1, 20, wavExtensible(1, 1, 48000, 24, 4).replace(18, 1, "\x14")}}) {
        SCOPED_TRACE(testing::Message() << channels << " channels, " << bits << " bits");
        pipe_->clearStreams();
        addAudio(channels, bits, 48000);
        ASSERT_EQ(pipe_->open(), 0);
        const std::string given = writeSound(100001, 1);
        ASSERT_EQ(pipe_->close(), 0);
        const auto avi = readAvi();
        ASSERT_EQ(avi.streams.size(), 1u);
        EXPECT_TRUE(avi.all(0) == given);
        EXPECT_EQ(leNumber(avi.streams[0].header, 32, 4), 100001u);
        EXPECT_EQ(avi.streams[0].format, format);
    }
}

TEST_F(RawAvi, WhatItCanNotHold) {
    for (const auto& [type, name] : {std::pair{QvFourcc::GRAY, "GRAY"}, {QvFourcc::Y216, "Y216"}}) {
        addVideo(type, 32, 32);
        EXPECT_EQ(pipe_->open(), QvStatus::failed);
        EXPECT_NE(std::strstr(pipe_->errorDesc(), name), nullptr);
        pipe_->clearStreams();
    }
    pipe_->getMuxer()->setParam("segments", 3);
    pipe_->getMuxer()->setParam("riffBytes", 20000);
    addVideo(QvFourcc::BGR4, 64, 64);
    ASSERT_EQ(pipe_->open(), 0);
    QvFrame frame = makePicture(QvFourcc::BGR4, 64, 64);
    int written = 0;
    while (written < 10 && pipe_->writeFrame(&frame, 0) == 0) ++written;
    EXPECT_EQ(written, 3);
    EXPECT_NE(std::strstr(pipe_->videoEncoder(0)->errorDesc(), "index is full"), nullptr);
    EXPECT_NE(pipe_->close(), 0);

    pipe_->clearStreams();
    pipe_->setFilename(Any("/dev/full"));
    addVideo(QvFourcc::BGR4, 64, 64);
    int result = pipe_->open();
    for (int i = 0; i < 1000 && result == 0; ++i) result = pipe_->writeFrame(&frame, 0);
    EXPECT_NE(result, 0);
    pipe_->abort();
}

// Encoders that ask for room and confirm it, in pieces that do not match the pictures.
TEST_F(RawAvi, OtherWaysOfWriting) {
    addVideo(QvFourcc::v210, 50, 20);
    addAudio(2, 16, 48000);
    const auto rateOf = [](const QvCodec& codec) { return codec.getParam("estimateSecKb").toDouble(); };
    EXPECT_EQ(rateOf(*pipe_->audioEncoder(0)), 187.5);
    EXPECT_EQ(rateOf(*pipe_->getMuxer()), 187.5 + rateOf(*pipe_->videoEncoder(0)));
    ASSERT_EQ(pipe_->open(), 0);
    const std::string data = patternBytes(3 * 128 * 2 * 20);
    auto* out = pipe_->videoStream(0)->bitstream->input();
    for (size_t at = 0; at < data.size();) {
        const auto n = static_cast<unsigned>(std::min<size_t>({777, out->usable(out), data.size() - at}));
        ASSERT_TRUE(put(out, std::string_view(data).substr(at, n)));
        at += n;
    }
    ASSERT_EQ(pipe_->close(), 0);
    EXPECT_TRUE(readAvi().all(0) == data);

    ASSERT_EQ(pipe_->open(), 0);
    out = pipe_->videoStream(0)->bitstream->input();
    EXPECT_EQ(copyIn(out, data.substr(0, 100)), 100u);
    EXPECT_NE(pipe_->close(), 0);  // a part of a picture
}

}  // namespace
