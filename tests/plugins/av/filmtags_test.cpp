// What films say of themselves, through the tool: from films and options into films.
#include <gmock/gmock.h>

#include "tests/plugins/av/films.h"

namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

class FilmTags : public FilmsInTheTool {
  protected:
    void SetUp() override {
        FilmsInTheTool::SetUp();
        if (IsSkipped()) return;
        make("a.mkv", "25", "title=A\n", "10:00:00:00", {"One", "Two"});
        make("b.mkv", "25", "title=B\nartist=Ann\n", "", {});
    }
    // Of two seconds; its chapters have one each.
    void make(const std::string& name, const std::string& rate, const std::string& words,
              const std::string& timecode, const Words& chapters) const {
        std::string text = ";FFMETADATA1\ncomment=same\n" + words;
        for (size_t i = 0; i < chapters.size(); ++i)
            text += "[CHAPTER]\nTIMEBASE=1/1\nSTART=" + std::to_string(i) + "\nEND=" + std::to_string(i + 1) +
                    "\ntitle=" + chapters[i] + "\n";
        Words options = {"-f", "lavfi", "-i", "sine=duration=2", "-i", folder.write("words.txt", text)};
        for (const char* word : {"-map", "0", "-map", "1", "-map", "1", "-map_metadata", "2", "-map_chapters",
                                 "2", "-metadata:s:1", "language=fra", "-metadata:s:2", "language=deu",
                                 "-c:v", "mpeg4", "-c:a", "flac"})
            options.emplace_back(word);
        options.insert(options.end(), {"-metadata:s:0", "language=swe"});
        if (!timecode.empty()) options.insert(options.end(), {"-timecode", timecode});
        film(name, options, "testsrc2=size=96x64:rate=" + rate + ":duration=2");
    }
    // What the tool says of the film that it makes with these options.
    std::string made(const Words& words) const {
        Words all = {"transcode", "-y"};
        all.insert(all.end(), words.begin(), words.end());
        const Outcome o = tarsel(all);
        EXPECT_EQ(o.status, 0) << o.err << testing::PrintToString(words);
        return shown(words.back());
    }
    std::string shown(const std::string& name) const { return tarsel({"info", name}).out; }
};

const std::string first = "chapter   0:00:00.000, ";

TEST_F(FilmTags, goIntoEachContainerThatHoldsThem) {
    for (const char* name : {"x.mkv", "x.mp4", "x.mov"})
        EXPECT_THAT(made({"a.mkv", "-o", name}),
                    AllOf(HasSubstr("title     A\n"), HasSubstr("comment   same\n"),
                          HasSubstr("timecode  10:00:00:00\n"), HasSubstr(first + "One\n"),
                          HasSubstr("chapter   0:00:01.000, Two\n"), HasSubstr(", fra,"),
                          testing::ContainsRegex(", (deu|ger),")))
            << name;
    EXPECT_THAT(shown("x.mkv"), testing::ContainsRegex("video 0 .*, swe,"));
    const Outcome o = tarsel({"transcode", "a.mkv", "-o", "x.ts"});
    EXPECT_THAT(o.err, HasSubstr("'x.ts' does not hold: chapters, comment, timecode"));
    EXPECT_THAT(made({"a.mkv", "--no-video", "-o", "x.m4a"}),
                AllOf(HasSubstr("title     A\n"), HasSubstr("Two"), HasSubstr(", fra,")));
}

// Where a container has numbers for them, they are read as these.
TEST_F(FilmTags, haveTimeAndPlaceOfTheirPictures) {
    const Words words = {"--meta", "creation_time=2020-01-02T03:04:05.000000Z",
                         "--meta", "location=+59.5000+018.2500/",
                         "--meta", "album=Al"};
    const struct {
        const char *name, *lost;
    } rows[] = {{"x.mp4", ""},
                {"x.mov", ""},
                {"x.mkv", ""},
                {"x.m4a", ""},
                {"x.mxf", "album, chapters, comment, location"}};
    for (const auto& row : rows) {
        Words all = {"transcode", "a.mkv", "-y", "-o", row.name};
        all.insert(all.end(), words.begin(), words.end());
        if (std::string(row.name) == "x.mxf")
            all.insert(all.end(), {"--vcodec", "prores", "--samplerate", "48000"});
        const Outcome o = tarsel(all);
        EXPECT_EQ(o.status, 0) << o.err;
        EXPECT_EQ(o.err.find("does not hold") == o.err.npos, !*row.lost) << o.err;
        EXPECT_THAT(o.err, HasSubstr(row.lost));
        EXPECT_THAT(shown(row.name), HasSubstr("2020-01-02T03:04:05")) << row.name;
        if (!*row.lost) {
            EXPECT_THAT(shown(row.name), testing::ContainsRegex("location  .59.5000.018.2500"));
        }
    }
    const Outcome o = tarsel(
        {"transcode", "a.mkv", "-o", "y.mp4", "--meta", "creation_time=then", "--meta", "location=here"});
    EXPECT_THAT(o.err, HasSubstr("'y.mp4' does not hold: creation_time, location"));
}

// The texts of a WAV are those of a film, and the other way.
TEST_F(FilmTags, goFromSoundFilesIntoFilmsAndBack) {
    const auto probed = [this](const char* name) {
        return runProgram({"/usr/bin/env", "ffprobe", "-v", "error", "-show_entries", "format_tags",
                           folder.file(name)})
            .out;
    };
    ASSERT_EQ(ffmpeg({"-f", "lavfi", "-i", "sine=duration=1", "-metadata", "title=Song", "-metadata",
                      "artist=Ann", folder.file("a.wav")})
                  .status,
              0);
    const Outcome o = tarsel({"transcode", "a.wav", "-o", "x.m4a"});
    EXPECT_THAT(o.err, Not(HasSubstr("LIST")));
    EXPECT_THAT(shown("x.m4a"), AllOf(HasSubstr("Song"), HasSubstr("Ann")));
    made({"x.m4a", "--meta", "track=7", "-o", "b.wav"});
    EXPECT_THAT(probed("b.wav"),
                AllOf(HasSubstr("title=Song"), HasSubstr("artist=Ann"), HasSubstr("track=7")));
    made({"a.wav", "--meta", "title=", "--meta", "album=Al", "-o", "c.wav"});
    EXPECT_THAT(probed("c.wav"), AllOf(Not(HasSubstr("Song")), HasSubstr("artist=Ann"), HasSubstr("album=Al"),
                                       HasSubstr("encoder=Lavf")));
    made({"a.wav", "-o", "d.wav"});
    EXPECT_EQ(probed("d.wav"), probed("a.wav"));
    EXPECT_THAT(tarsel({"transcode", "a.wav", "--meta", "composer=x", "-o", "e.wav"}).err,
                HasSubstr("no room"));
}

TEST_F(FilmTags, moveWithACut) {
    EXPECT_THAT(made({"a.mkv", "--from", "0.4", "-o", "x.mkv"}),
                AllOf(HasSubstr("timecode  10:00:00:10\n"), HasSubstr(first + "One\n"),
                      HasSubstr("chapter   0:00:00.600, Two\n")));
    EXPECT_THAT(
        made({"a.mkv", "--from", "1.2", "-o", "x.mp4"}),
        AllOf(HasSubstr("timecode  10:00:01:05\n"), HasSubstr(first + "Two\n"), Not(HasSubstr("One"))));
    EXPECT_THAT(made({"a.mkv", "--from", "0.4", "--rate", "50", "-o", "x.mkv"}),
                HasSubstr("timecode  10:00:00:20\n"));
    // Each group of MPEG-2 has a timecode of its own.
    made({"a.mkv", "--from", "0.4", "--vcodec", "mpeg2", "--no-audio", "-o", "x.m2v"});
    EXPECT_THAT(runProgram({"/usr/bin/env", "ffprobe", "-v", "error", "-show_frames", "-show_entries",
                            "frame_tags=timecode", folder.file("x.m2v")})
                    .out,
                AllOf(HasSubstr("timecode=10:00:00:10"), HasSubstr("timecode=10:00:00:20")));
    // A cut within a chapter makes none.
    EXPECT_THAT(made({"a.mkv", "--cut", "0-0.2", "--cut", "0.6-0.8", "--cut", "1.8-2", "-o", "x.mkv"}),
                AllOf(HasSubstr(first + "One\n  chapter   0:00:00.400, Two\n"), HasSubstr("title     A\n")));
    // 29.97 drops numbers, 25 does not.
    make("d.mkv", "30000/1001", "", "00:00:59;20", {});
    EXPECT_THAT(made({"d.mkv", "--from", "10f", "-o", "x.mov"}), HasSubstr("timecode  00:01:00;02\n"));
    EXPECT_THAT(made({"d.mkv", "--from", "10f", "--rate", "25", "-o", "x.mov"}),
                HasSubstr("timecode  00:01:00:01\n"));
}

TEST_F(FilmTags, ofJoinedFilmsAreWhatTheyShare) {
    const std::string joined =
        made({"--join", "a.mkv", "b.mkv", "a.mkv@1-2", "--save-task", "t.xml", "-o", "x.mkv"});
    EXPECT_THAT(joined, AllOf(HasSubstr("comment   same\n"), HasSubstr("timecode  10:00:00:00\n"),
                              HasSubstr(first + "One\n"), HasSubstr("0:00:02.000, B\n"),
                              HasSubstr("0:00:04.000, Two\n"), Not(HasSubstr("title   ")),
                              Not(HasSubstr("Ann")), HasSubstr(", fra,")));
    EXPECT_EQ(tarsel({"run", "t.xml", "-y"}).status, 0);
    EXPECT_EQ(shown("x.mkv"), joined);
    EXPECT_THAT(made({"--join", "b.mkv", "b.mkv", "-o", "x.mkv"}), Not(HasSubstr("chapter")));
}

TEST_F(FilmTags, areGivenAndLeftOut) {
    const std::string own =
        made({"a.mkv", "--meta", "title=My = film", "--meta", "comment=", "--meta", "timecode=01:02:03:04",
              "--language", "eng", "--save-task", "t.xml", "-o", "x.mkv"});
    EXPECT_THAT(own,
                AllOf(HasSubstr("title     My = film\n"), Not(HasSubstr("same")), HasSubstr("One"),
                      HasSubstr("timecode  01:02:03:04\n"), HasSubstr(", eng,"), Not(HasSubstr(", fra,"))));
    EXPECT_EQ(tarsel({"run", "t.xml", "-y"}).status, 0);
    EXPECT_EQ(shown("x.mkv"), own);
    EXPECT_THAT(made({"a.mkv", "--no-meta", "--meta", "artist=Eve", "-o", "x.mp4"}),
                AllOf(HasSubstr("Eve"), Not(HasSubstr("One")), Not(HasSubstr("title")),
                      Not(HasSubstr(", fra,")), Not(HasSubstr("timecode"))));
    EXPECT_THAT(
        tarsel({"transcode", "a.mkv", "--meta", "date=2001", "--dry-run", "-o", "n.mp4"}).out,
        HasSubstr("meta    2 chapters, comment 'same', date '2001', timecode '10:00:00:00', title 'A'\n"));
    const struct {
        Words options;
        const char* part;
    } wrong[] = {
        {{"--meta", "title"}, "'title' is not"},
        {{"--meta", "my key=x"}, "'my key' can't be"},
        {{"--meta", "title=a\x01"}, "characters"},
        {{"--meta", "chapters=x"}, "'chapters' can't be"},
        {{"--meta", "timecode=1:2:3:4"}, "no timecode"},
        {{"--meta", "language=fra"}, "give --language"},
        {{"--language", "french"}, "no language"},
        {{"--language", "fra,deu,eng"}, "there are 2"},
        {{"--meta", "title=x", "--format", "avi"}, "no room"},
    };
    for (const auto& c : wrong) {
        Words words = {"transcode", "a.mkv", "-o", "n.mp4"};
        words.insert(words.end(), c.options.begin(), c.options.end());
        const Outcome o = tarsel(words);
        EXPECT_EQ(o.status, 2) << o.err;
        EXPECT_THAT(o.err, HasSubstr(c.part));
    }
}

}  // namespace
