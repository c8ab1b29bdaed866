#include "builtin/video/overlay/timecodewriter.h"

#include <climits>
#include <tuple>

#include "core/caption/text/qvtextrenderingoptions.h"
#include "core/media/qvdraw.h"
#include "tests/builtin/video/effect_frames.h"
#include "tests/support/counted_memory.h"

namespace {

const QvFramerate pal(QvRatio(25, 1)), palFields(QvRatio(25, 1), 1), ntsc(QvRatio(30000, 1001)),
    drop(QvRatio(30000, 1001), 0, true);

using Writer = OpenedEffect<TimecodeWriter>;

std::string written(const Params& params, QvFrame frame) {
    Writer writer(params);
    EXPECT_EQ(writer.apply(frame), 0);
    return pictureBytes(frame);
}

// What the renderer draws.
std::string drawn(const char* text, int size, QvPoint at, QvFrame frame, const QvColor* color = nullptr) {
    QvTextRenderingOptions options;
    options.fontRegular = qv_registry()->defaultFontFile(0);
    options.charSize = size;
    QvSubtitle line;
    line.text = text;
    line.position = at;
    QvSubtitleRender render;
    render.init(options);
    render.render(frame, line, color);
    return pictureBytes(frame);
}

using Timecode = TextEffect;

TEST_F(Timecode, CountsAsItsParametersSay) {
    const struct {
        Params params;
        QvFramerate rate;
        int number;
        const char* text;
    } cases[] = {
        {{{"start", "InPoint"}}, pal, 90061, "01:00:02:11*"},
        {{{"start", "InPoint"}}, drop, 1800, "00;01;00;02*"},
        {{{"start", "InPoint"}, {"startOffset", 25}}, pal, 50, "00:00:01:00*"},
        {{{"start", "InPoint"}, {"dropFrame", 0}}, drop, 1800, "00:01:00:00*"},
        {{{"start", "InPoint"}, {"dropFrame", 1}}, ntsc, 1800, "00;01;00;02*"},
        {{{"start", "InPoint"}, {"dropFrame", 1}}, pal, 1500, "00:01:00:00*"},
        {{{"startOffset", 30}}, pal, 7, "23:59:58:20*"},
        {{{"startOffset", INT_MIN}, {"mode", 0}}, pal, 7, "2147483647"},
        {{{"mode", 7}, {"startOffset", 3}}, pal, 42, "-3"},
    };
    for (const auto& c : cases) {
        const QvFrame frame = black(320, 100, c.rate, c.number);
        EXPECT_EQ(written(c.params, frame), drawn(c.text, 14, {112, 79}, frame)) << c.text;
    }
    Writer writer;
    QvFrame first = black(320, 100, pal, 500), later = black(320, 100, pal, 525);
    const std::string expected = drawn("00:00:01:00*", 14, {112, 79}, later);
    writer.apply(first);
    writer.apply(later);
    EXPECT_EQ(pictureBytes(later), expected) << "the first frame stays the first";
}

TEST_F(Timecode, SizeAndPlaceFollowThePicture) {
    const auto text = "00:00:00:00*";
    for (const auto& [w, h, size] : {std::tuple{1920, 1080, 94}, {64, 100, 14}}) {
        const QvFrame frame = black(w, h, pal, 0);
        EXPECT_EQ(written({}, frame), drawn(text, size, {w * 35 / 100, h - size * 3 / 2}, frame)) << w;
    }
    const QvFrame frame = black(720, 576, pal, 0);
    EXPECT_EQ(written({{"positionX", 10}, {"positionY", 20}}, frame), drawn(text, 49, {10, 20}, frame));
    EXPECT_EQ(written({{"positionY", 20}}, frame), drawn(text, 49, {252, 503}, frame)) << "x decides";
    const QvColor orange(255, 40, 0, false);
    EXPECT_EQ(written({{"colorG", 40}, {"colorB", 0}}, frame), drawn(text, 49, {252, 503}, frame, &orange));
    const AnyDict options("charSizePt", 20, "subEncoding", 2);
    EXPECT_EQ(written({{"renderingOptions", options}}, frame), drawn(text, 20, {252, 546}, frame));
}

TEST_F(Timecode, TheStarStandsInOneField) {
    const std::string plain = written({}, black(320, 100, pal, 0));
    const std::string fields = written({}, black(320, 100, palFields, 0));
    int odd = 0, even = 0;
    for (std::size_t i = 0; i < plain.size(); ++i)
        if (plain[i] != fields[i]) ++(i / (320 * 4) % 2 ? odd : even);
    EXPECT_GT(odd, 10);
    EXPECT_EQ(even, 0);
}

TEST_F(Timecode, WriteDrawsOntoACopyAndTakesNoMemoryForAStillText) {
    for (const unsigned fourcc : {QvFourcc::I420, QvFourcc::YUYV, QvFourcc::BGR3, QvFourcc::Y216}) {
        const QvFrame original = black(320, 240, palFields, 3, fourcc);
        QvFrame given(original);
        Writer writer(Params{{"start", "InPoint"}});
        EXPECT_EQ(writer.write(given), 0);
        ASSERT_EQ(writer.ready(), 1);
        EXPECT_EQ(pictureBytes(given), pictureBytes(original));
        EXPECT_EQ(pictureBytes(*writer.frame()), written({{"start", "InPoint"}}, original));
        EXPECT_NE(pictureBytes(*writer.frame()), pictureBytes(original)) << given.str_four_cc();
        EXPECT_EQ(writer.frame()->frameNr, 3);
        writer.next();
        EXPECT_EQ(writer.ready(), 0);
        const int before = allocations;
        for (int i = 0; i < 5; ++i) writer.apply(given);
        EXPECT_EQ(allocations, before);
        QvFrame nothing;
        EXPECT_EQ(writer.apply(nothing), QvStatus::invalidArgument);
    }
}

}  // namespace
