#include "plugins/av/picture/framereader.h"

#include <cstring>
#include <random>

#include "core/media/qvframe.h"
#include "core/value/any.h"
#include "tests/plugins/av/films.h"
#include "tests/support/engine.h"

namespace {

using av::FrameReader;

// The planes without padding; words moved back to the low bits.
std::string bytesOf(const QvFrame& frame, int shift) {
    std::string bytes;
    for (int plane = 0; plane < frame.planes(); ++plane)
        for (int y = 0; y < frame.height(plane); ++y) {
            const auto* row = frame.plane(plane) + std::ptrdiff_t{y} * frame.stride(plane);
            const int count = frame.width(plane) * frame.pixelBytes(plane);
            if (shift == 0) {
                bytes.append(reinterpret_cast<const char*>(row), static_cast<std::size_t>(count));
                continue;
            }
            for (int i = 0; i < count; i += 2) {
                const int value = (row[i] | row[i + 1] << 8) >> shift;
                bytes += {static_cast<char>(value), static_cast<char>(value >> 8)};
            }
        }
    return bytes;
}

class FrameReaderOfFilms : public Films {
  protected:
    std::unique_ptr<FrameReader> open(const std::string& film, int threads = 2, bool upright = false) {
        bytes_ = std::make_unique<av::MediaBytes>(Any(film.c_str()));
        std::string reason;
        const auto input = av::MediaInput::open(*bytes_, "", reason);
        index_ = input ? av::PacketIndex::build(*input, reason) : nullptr;
        auto reader =
            index_ ? FrameReader::open(*bytes_, "", 0, index_, {threads, upright}, reason) : nullptr;
        EXPECT_TRUE(reader) << reason;
        return reader;
    }

    // Every picture in order, then in any order, against what ffmpeg makes of the film.
    void compare(const std::string& film, const std::string& layout, int shift, int frames,
                 bool upright = false) {
        SCOPED_TRACE(film);
        const auto reader = open(film, 2, upright);
        ASSERT_TRUE(reader);
        const std::string expected = pictures(film, layout);
        ASSERT_EQ(reader->format().frames, frames);
        const std::size_t size = expected.size() / static_cast<std::size_t>(frames);
        ASSERT_EQ(size * static_cast<std::size_t>(frames), expected.size());
        const auto same = [&](int n) {
            if (reader->read() != FrameReader::Read::picture || reader->frame().frameNr != n) return false;
            const std::string bytes = bytesOf(reader->frame(), shift);
            return bytes.size() == size &&
                   std::memcmp(bytes.data(), expected.data() + size * static_cast<std::size_t>(n), size) == 0;
        };
        for (int n = 0; n < frames; ++n) ASSERT_TRUE(same(n)) << "picture " << n;
        EXPECT_EQ(reader->read(), FrameReader::Read::end);
        std::mt19937 random(1);
        for (int i = 0; i < 40; ++i) {
            const int n = static_cast<int>(random() % static_cast<unsigned>(frames));
            ASSERT_TRUE(reader->seek(n));
            ASSERT_TRUE(same(n)) << "after a seek to picture " << n;
        }
        EXPECT_EQ(reader->concealed(), 0);
    }

    EngineScope engine_;
    std::unique_ptr<av::MediaBytes> bytes_;
    std::shared_ptr<const av::PacketIndex> index_;  // of the film that was opened last
};

TEST_F(FrameReaderOfFilms, everyPictureIsTheSameInOrderAndAfterSeeks) {
    const struct {
        const char* name;
        Words options;
        const char* layout;
        int shift;
    } cases[] = {
        {"open.ts", {"-c:v", "mpeg2video", "-g", "12", "-bf", "2", "-flags", "-cgop"}, "yuv420p", 0},
        {"closed.mpg",
         {"-c:v", "mpeg2video", "-g", "10", "-bf", "2", "-flags", "+cgop", "-sc_threshold", "1000000000"},
         "yuv420p",
         0},
        {"opengop.mp4",
         {"-c:v", "libx264", "-x264-params", "keyint=6:open-gop=1:bframes=2:b-adapt=0:scenecut=0"},
         "yuv420p",
         0},
        {"packed.avi", {"-c:v", "mpeg4", "-g", "15", "-bf", "2"}, "yuv420p", 0},
        {"b.mp4", {"-c:v", "mpeg4", "-g", "15", "-bf", "2"}, "yuv420p", 0},
        {"bare.m2v", {"-c:v", "mpeg2video", "-g", "12", "-bf", "2"}, "yuv420p", 0},
        {"intra.mov", {"-c:v", "prores_ks", "-profile:v", "2"}, "yuv422p10le", -1},
        {"hidden.webm",
         {"-c:v", "libvpx", "-auto-alt-ref", "1", "-lag-in-frames", "10", "-g", "20"},
         "yuv420p",
         0},
        {"vp9.webm", {"-c:v", "libvpx-vp9", "-deadline", "realtime", "-g", "20"}, "yuv420p", 0},
        {"theora.ogv", {"-c:v", "libtheora", "-g", "16"}, "yuv420p", 0},
        {"vector.flv", {"-c:v", "flv", "-g", "12"}, "yuv420p", 0},
        {"media.wmv", {"-c:v", "wmv2", "-g", "12"}, "yuv420p", 0},
        {"first.mpg", {"-c:v", "mpeg1video", "-g", "12", "-bf", "2"}, "yuv420p", 0},
        {"lossless.mkv", {"-c:v", "ffv1", "-pix_fmt", "yuv420p10le"}, "yuv420p10le", 6},
        {"half.mkv", {"-c:v", "ffv1", "-pix_fmt", "yuv422p"}, "yuyv422", 0},
        {"rgb.mkv", {"-c:v", "ffv1", "-pix_fmt", "bgra"}, "bgra", 0},
        {"deep.mkv", {"-c:v", "ffv1", "-pix_fmt", "gbrp12le"}, "bgra64le", 0},
    };
    for (const auto& c : cases) {
        const std::string file = film(c.name, c.options);
        if (c.shift >= 0) compare(file, c.layout, c.shift, 50);
    }
}

TEST_F(FrameReaderOfFilms, uprightPicturesAreTurnedAndMirroredExactly) {
    const struct {
        const char* codec;
        const char* layout;
        bool exact;  // a quarter turn of 4:2:2 is converted
    } films[] = {{"mpeg4", "yuv420p", true}, {"prores_ks", "yuv422p10le", false}, {"png", "bgra", true}};
    const int matrices[][4] = {{0, 1, -1, 0}, {-1, 0, 0, -1}, {0, -1, 1, 0}, {-1, 0, 0, 1},
                               {1, 0, 0, -1}, {0, 1, 1, 0},   {0, -1, -1, 0}};
    for (const auto& [codec, layout, exact] : films) {
        const std::string plain =
            film("plain.mov", {"-c:v", codec}, "testsrc2=size=98x62:rate=25:duration=0.2");
        for (const auto& m : matrices) {
            SCOPED_TRACE(std::string(codec) + " " + std::to_string(m[0]) + std::to_string(m[1]));
            const std::string turned = turnedFilm(plain, {m[0], m[1], m[2], m[3]});
            const bool quarter = m[0] == 0;
            const auto reader = open(turned, 1, true);
            ASSERT_TRUE(reader);
            EXPECT_EQ(reader->format().width, quarter ? 62 : 98);
            EXPECT_FALSE(reader->format().turn.any());
            if (exact)
                compare(turned, layout, 0, 5, true);
            else
                EXPECT_EQ(reader->read(), FrameReader::Read::picture);
        }
    }
}

TEST_F(FrameReaderOfFilms, anEditListDecidesWhatIsThere) {
    film("whole.mp4", {"-c:v", "mpeg4", "-g", "25", "-bf", "2"});
    const std::string cut = folder.file("cut.mp4");
    ASSERT_EQ(ffmpeg({"-ss", "0.4", "-i", folder.file("whole.mp4"), "-c", "copy", cut}).status, 0);
    compare(cut, "yuv420p", 0, 40);
}

TEST_F(FrameReaderOfFilms, aVariableRateBecomesAUsualOne) {
    // Pictures 10 to 19 are not there: the one before them stays.
    const std::string file = film("gap.mkv", {"-vf", "select=not(between(n\\,10\\,19))", "-fps_mode",
                                              "passthrough", "-c:v", "ffv1", "-pix_fmt", "yuv420p"});
    const auto reader = open(file);
    ASSERT_TRUE(reader);
    EXPECT_TRUE(reader->format().variable);
    EXPECT_EQ(reader->format().rate.rate(), QvRatio(24000, 1001));  // nearest to 39 pictures in 1.96 s
    const std::string expected = pictures(file, "yuv420p");
    const std::size_t size = expected.size() / 40;
    for (int n = 0; n < reader->format().frames; ++n) {
        ASSERT_EQ(reader->read(), FrameReader::Read::picture);
        const int due = (n * 1001 + 24) / (24 * 40);  // of the source, whose pictures last 40 ms
        const int shown = due < 10 ? due : due < 20 ? 9 : due - 10;
        EXPECT_TRUE(bytesOf(reader->frame(), 0) ==
                    expected.substr(static_cast<std::size_t>(shown) * size, size))
            << n;
    }
    EXPECT_EQ(reader->format().frames, 48);
}

TEST_F(FrameReaderOfFilms, whatNoFilmCanMeanIsTakenAsNotStated) {
    std::string bytes = TempFolder::read(film("film.m2v", {"-c:v", "mpeg2video", "-color_primaries", "bt709",
                                                           "-color_trc", "bt709", "-colorspace", "bt709"}));
    const std::string colours("\1\1\1", 3), display("\0\0\1\xB5", 4);
    std::size_t at = bytes.find(display);  // the extension of the sequence; the next one has the colours
    for (at = bytes.find(display, at + 1); at != std::string::npos; at = bytes.find(display, at + 1))
        if (bytes.compare(at + 5, 3, colours) == 0) bytes.replace(at + 5, 3, "\xC3\xFF\xFE");
    folder.write("codes.m2v", bytes);
    const auto codes = open(folder.file("codes.m2v"));
    ASSERT_TRUE(codes);
    for (const int number : {codes->format().primaries, codes->format().transfer, codes->format().space,
                             codes->format().colourMatrix})
        EXPECT_EQ(number, 0);
    EXPECT_EQ(codes->read(), FrameReader::Read::picture);

    for (const auto& [aspect, expected] : {std::pair{"1/2000000000", 1.0}, {"2/1", 2.0}, {"30000/1", 1.0}}) {
        const auto reader = open(film(
            "aspect.mov", {"-vf", std::string("setsar=") + aspect + ":max=2147483647", "-c:v", "mjpeg"}));
        ASSERT_TRUE(reader);
        EXPECT_EQ(reader->format().pixelAspect, expected) << aspect;
    }
}

TEST_F(FrameReaderOfFilms, aHoleInTheFileIsCountedAndTheRestIsExact) {
    const std::string file = film("hole.mkv", {"-c:v", "mpeg2video", "-g", "1", "-q:v", "2"});
    const auto whole = open(file);
    ASSERT_TRUE(whole);
    std::string bytes = TempFolder::read(file);
    // Within the data of picture 20.
    bytes.replace(static_cast<std::size_t>(index_->packets(0)[20].position) + 300, 20, 20, '\x55');
    folder.write("damaged.mkv", bytes);
    const auto damaged = open(folder.file("damaged.mkv"));
    ASSERT_TRUE(damaged);
    const int frames = whole->format().frames;
    ASSERT_EQ(damaged->format().frames, frames);
    int different = 0;
    for (int n = 0; n < frames; ++n) {
        ASSERT_EQ(whole->read(), FrameReader::Read::picture);
        ASSERT_EQ(damaged->read(), FrameReader::Read::picture);
        different += bytesOf(whole->frame(), 0) != bytesOf(damaged->frame(), 0);
    }
    EXPECT_EQ(different, 1);
    EXPECT_EQ(damaged->concealed(), 1);
}

// Each picture says that decoding can start with it, and none but the first two can be decoded.
TEST_F(FrameReaderOfFilms, startsThatGiveNothingEndAtTheFirstPicture) {
    const std::string file = film("keys.mp4", {"-c:v", "libx264", "-g", "1", "-bf", "0"});
    const auto whole = open(file);
    ASSERT_TRUE(whole);
    ASSERT_TRUE(whole->seek(1));
    ASSERT_EQ(whole->read(), FrameReader::Read::picture);
    std::string bytes = TempFolder::read(file);
    const auto& packets = index_->packets(0);
    for (std::size_t i = 2; i < packets.size(); ++i) {
        // The length of the first unit stays, and nothing of what it holds.
        const auto at = static_cast<std::size_t>(packets[i].position) + 5;
        const std::size_t size = std::size_t{packets[i].bytes} - 5;
        bytes.replace(at, size, size, '\xff');
    }
    folder.write("damaged.mp4", bytes);
    const auto damaged = open(folder.file("damaged.mp4"));
    ASSERT_TRUE(damaged);
    ASSERT_EQ(damaged->format().frames, 50);
    for (const int n : {40, 10, 49}) {
        ASSERT_TRUE(damaged->seek(n));
        ASSERT_EQ(damaged->read(), FrameReader::Read::picture) << n;
        EXPECT_TRUE(bytesOf(damaged->frame(), 0) == bytesOf(whole->frame(), 0)) << n;
    }
    EXPECT_EQ(damaged->concealed(), 3);
}

}  // namespace
