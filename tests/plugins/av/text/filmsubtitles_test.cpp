// Text subtitles of films: shown, written in other forms and burnt in.
#include <gmock/gmock.h>

#include "core/engine/status.h"
#include "plugins/av/decoder/avdec.h"
#include "plugins/av/text/eventtext.h"
#include "tests/plugins/av/films.h"
#include "tests/support/engine.h"

namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

TEST(EventText, keepsWhatTheEngineDraws) {
    const struct {
        const char *event, *text;
    } cases[] = {
        {"a, b\\Nc\\nd\\he", "a, b|c|d e"},
        {"{\\i1}x{\\i0} {\\b700}y{\\b0}", "<i>x</i> <b>y</b>"},
        {"{\\i1\\b1}x{\\r}y", "<i><b>x</i></b>y"},
        {"{\\an8}{\\fs20\\c&HFF&}top{a comment}", "{\\an8}top"},
        {"{\\p1}m 0 0 l 9 9{\\p0}text{\\i}{\\b}{\\", "text{\\"},
        {"last\r\nline\n\\N", "last|line"},
        {"", ""},
    };
    for (const auto& c : cases)
        EXPECT_EQ(av::textOfEvent(std::string("0,0,Default,,0,0,0,,") + c.event), c.text);
    EXPECT_EQ(av::textOfEvent("0,0,Default"), "");
}

class FilmSubtitles : public FilmsInTheTool {
  protected:
    void SetUp() override {
        FilmsInTheTool::SetUp();
        if (IsSkipped()) return;
        folder.write("a.srt", kText);
        folder.write("b.srt", "1\n00:00:00,400 --> 00:00:00,800\nDeux\n");
    }
    // A film with both, and pictures that start `late`, so that its times are not those of the container.
    std::string filmWith(const std::string& name, const std::string& codec, const Words& pictures,
                         const std::string& late = "0") const {
        Words words = {"-itsoffset",
                       late,
                       "-f",
                       "lavfi",
                       "-i",
                       "testsrc2=size=320x240:rate=25:duration=2",
                       "-itsoffset",
                       late,
                       "-i",
                       folder.file("a.srt"),
                       "-itsoffset",
                       late,
                       "-i",
                       folder.file("b.srt"),
                       "-map",
                       "0",
                       "-map",
                       "1",
                       "-map",
                       "2",
                       "-c:s",
                       codec,
                       "-metadata:s:s:0",
                       "language=eng",
                       "-metadata:s:s:1",
                       "language=fra"};
        words.insert(words.end(), pictures.begin(), pictures.end());
        words.push_back(folder.file(name));
        const Outcome made = ffmpeg(words);
        EXPECT_EQ(made.status, 0) << made.err;
        return name;
    }
    std::string read(const std::string& name) const { return TempFolder::read(folder.file(name)); }

    static constexpr const char* kText =
        "1\n00:00:00,200 --> 00:00:00,600\nOne <i>and</i>\ntwo\n\n"
        "2\n00:00:01,000 --> 00:00:01,480\nA & b c\n\n";
};

TEST_F(FilmSubtitles, areThoseOfTheFilesTheyCameFrom) {
    const struct {
        const char *name, *codec, *shown;
        Words pictures;
        const char* late;
    } cases[] = {
        {"x.mkv", "srt", "SubRip", {"-c:v", "mpeg4"}, "0"},
        {"y.mkv", "ass", "ASS", {"-c:v", "mpeg4"}, "2"},
        {"x.mp4", "mov_text", "QuickTime", {"-c:v", "mpeg4"}, "0"},
        {"y.mov", "mov_text", "QuickTime", {"-c:v", "mpeg4", "-bf", "2"}, "0"},
        {"x.webm", "webvtt", "WebVTT", {"-c:v", "libvpx", "-b:v", "200k"}, "0"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        filmWith(c.name, c.codec, c.pictures, c.late);
        const Outcome shown = tarsel({"info", c.name});
        EXPECT_THAT(shown.out,
                    AllOf(HasSubstr("video 0 "), HasSubstr("subpicture 0   " + std::string(c.shown)),
                          HasSubstr("2 subtitles, 0:00:00.200 to 0:00:01.480, eng"),
                          HasSubstr("1 subtitle, 0:00:00.400 to 0:00:00.800, fr")))
            << shown.err;
        const Outcome first = tarsel({"captions", c.name, "--srt"});
        EXPECT_EQ(first.out, kText) << first.err;
        for (const char* choice : {"1", "fra", "fre"})
            EXPECT_THAT(tarsel({"captions", c.name, "--srt", "--stream", choice}).out,
                        AllOf(HasSubstr("Deux"), HasSubstr("0,400")));
        EXPECT_THAT(tarsel({"captions", c.name, "--vtt"}).out, HasSubstr("A &amp; b c"));
        // Pictures go without them unless they are asked for.
        EXPECT_EQ(tarsel({"transcode", c.name, "-y", "-o", "plain.i420"}).status, 0);
        EXPECT_EQ(tarsel({"transcode", c.name, "-y", "--subtitles", c.name, "-o", "film.i420"}).status, 0);
        const Outcome file = tarsel({"transcode", c.name, "-y", "--subtitles", "a.srt", "-o", "file.i420"});
        EXPECT_EQ(file.status, 0) << file.err;
        EXPECT_TRUE(read("film.i420") == read("file.i420"));
        EXPECT_FALSE(read("film.i420") == read("plain.i420"));
    }
    const Outcome saved = tarsel({"transcode", "x.mkv", "-y", "--subtitles", "x.mp4", "--subtitle-style",
                                  "stream=fra", "--save-task", "t.xml", "-o", "film.i420"});
    EXPECT_EQ(saved.status, 0) << saved.err;
    const std::string film = read("film.i420");
    EXPECT_EQ(tarsel({"run", "t.xml", "-y"}).status, 0);
    EXPECT_TRUE(read("film.i420") == film);
    EXPECT_EQ(tarsel({"transcode", "x.mkv", "-y", "--subtitles", "b.srt", "-o", "file.i420"}).status, 0);
    EXPECT_TRUE(read("file.i420") == film);
}

TEST_F(FilmSubtitles, goWithTheFramesOfTheirFilm) {
    const EngineScope engine;
    av::AvDec film;
    film.setParam("filename", Any(folder.file(filmWith("x.mkv", "srt", {"-c:v", "mpeg4"})).c_str()));
    ASSERT_EQ(film.open(), QvStatus::ok) << film.errorDesc();
    ASSERT_EQ(film.nrStreams(qvSubpicStream), 2);
    EXPECT_EQ(film.duration(qvSubpicStream, 0), MediaTime(1.48));
    const struct {
        int frame, stream;
        const char* text;  // null: nothing is shown
    } cases[] = {{0, 0, nullptr},    {5, 0, "One <i>and</i>|two"},
                 {15, 1, "Deux"},    {18, 0, nullptr},
                 {37, 0, "A & b c"}, {38, 0, nullptr},
                 {10, 1, "Deux"},    {9, 1, nullptr}};
    for (const auto& c : cases) {
        ASSERT_EQ(film.seek(MediaTime(c.frame / 25.0), qvSubpicStream, c.stream), QvStatus::ok);
        ASSERT_EQ(film.readFrame(0), QvStatus::ok);
        AnyDict shown;
        EXPECT_EQ(film.readMeta(c.stream, 0, shown) == QvStatus::ok, c.text != nullptr) << c.frame;
        EXPECT_STREQ(shown.getString("text", ""), c.text ? c.text : "") << c.frame;
    }
}

TEST_F(FilmSubtitles, thatAreNotThereAreNamed) {
    filmWith("x.mkv", "srt", {"-c:v", "mpeg4"});
    film("bare.mkv", {"-c:v", "mpeg4"});
    const struct {
        Words words;
        int status;
        const char* part;
    } cases[] = {
        {{"captions", "x.mkv", "--srt", "--stream", "deu"}, 3, "it has 0 eng, 1 fr"},
        {{"captions", "x.mkv", "--srt", "--stream", "2"}, 3, "it has 0 eng, 1 fr"},
        {{"captions", "bare.mkv", "--srt"}, 3, "none of text"},
        {{"captions", "a.srt", "--vtt", "--stream", "1"}, 3, "'1'"},
        {{"captions", "x.mkv"}, 2, "give --srt"},
        {{"frame", "x.mkv", "--subtitles", "bare.mkv", "-o", "x.png"}, 3, "none of text"},
        {{"frame", "x.mkv", "--subtitles", "x.mkv", "--subtitle-style", "stream=9", "-o", "x.png"}, 3, "'9'"},
    };
    for (const auto& c : cases) {
        const Outcome o = tarsel(c.words);
        EXPECT_EQ(o.status, c.status) << o.err;
        EXPECT_THAT(o.err, HasSubstr(c.part));
    }
    // Bytes that are no text lose their subtitle, not the others.
    std::string bytes = read("x.mkv");
    const std::size_t at = bytes.find("A & b");
    ASSERT_NE(at, std::string::npos);
    bytes[at] = '\xFF';
    folder.write("bad.mkv", bytes);
    const Outcome o = tarsel({"captions", "bad.mkv", "--srt"});
    EXPECT_THAT(o.out, AllOf(HasSubstr("One"), Not(HasSubstr("b c"))));
    EXPECT_THAT(o.err, HasSubstr("1 of its subtitles"));
}

}  // namespace
