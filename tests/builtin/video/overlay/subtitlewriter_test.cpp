#include "builtin/video/overlay/subtitlewriter.h"

#include "tests/builtin/video/effect_frames.h"

namespace {

// Shown from 1 to 2 s, from 3 to 4 s and from 5 to 6 s.
constexpr const char* srt =
    "1\n00:00:01,000 --> 00:00:02,000\nHello\n\n"
    "2\n00:00:03,000 --> 00:00:04,000\n<i>two</i>\nlines\n\n"
    "3\n00:00:05,000 --> 00:00:06,000\n\xE9t\xE9\n\n";

class Subtitle : public TextEffect {
  protected:
    static QvFrame blank(int number, const QvFramerate& rate) {
        return black(320, 240, rate, number, QvFourcc::I420);
    }
    std::string at(int number, Params params = {}, const QvFramerate& rate = QvFramerate(QvRatio(25, 1))) {
        QvFrame frame = blank(number, rate);
        params.insert(params.begin(), {"subtitle_filename", file_.c_str()});
        EXPECT_EQ(OpenedEffect<SubtitleWriter>(params).apply(frame), 0);
        return pictureBytes(frame);
    }
    bool shows(int number, const Params& params = {}, const QvFramerate& rate = QvFramerate(QvRatio(25, 1))) {
        return at(number, params, rate) != pictureBytes(blank(number, rate));
    }

    TempFolder folder_;
    std::string file_ = folder_.write("talk.srt", srt);
};

TEST_F(Subtitle, IsShownAtItsTime) {
    const struct {
        Params params;
        double rate;
        int first, last;  // frames of the first subtitle
    } cases[] = {
        {{}, 25, 25, 50},
        {{}, 29.97, 30, 59},
        {{{"delay", -1000.0}}, 25, 0, 25},
        {{{"speed", 0.5}, {"delay", -500}}, 25, 25, 75},
    };
    for (const auto& c : cases) {
        const QvFramerate rate(c.rate);
        const std::string text = at(c.first, c.params, rate);
        EXPECT_EQ(text, at(c.last, c.params, rate));
        EXPECT_TRUE(shows(c.first, c.params, rate)) << c.first;
        EXPECT_FALSE(c.first > 0 && shows(c.first - 1, c.params, rate)) << c.first;
        EXPECT_FALSE(shows(c.last + 1, c.params, rate)) << c.last;
    }
    EXPECT_NE(at(30), at(80)) << "another text";
}

TEST_F(Subtitle, FrameNumbersCountAtTheFilesRateOrThePictures) {
    file_ = folder_.write("talk.sub", "{25}{50}Hello\n");
    const QvFramerate fifty(QvRatio(50, 1));
    EXPECT_TRUE(shows(25, {}, fifty));
    EXPECT_FALSE(shows(24, {}, fifty) || shows(51, {}, fifty));
    const Params at25{{"framerate", QvFramerate(QvRatio(25, 1))}};
    EXPECT_TRUE(shows(50, at25, fifty) && shows(100, at25, fifty));
    EXPECT_FALSE(shows(49, at25, fifty) || shows(101, at25, fifty));
}

TEST_F(Subtitle, EncodingIsOfTheFile) {
    const std::string latin = at(125, {{"encoding", 1252}});
    EXPECT_NE(latin, at(125)) << "é is no ASCII";
    file_ = folder_.write("utf8.srt", "1\n00:00:05,000 --> 00:00:06,000\n\xC3\xA9t\xC3\xA9\n");
    EXPECT_EQ(latin, at(125));
    EXPECT_EQ(latin, at(125, {{"encoding", 1}}));
}

TEST_F(Subtitle, LooksAsItsParametersSay) {
    const std::string plain = at(30);
    std::vector<std::string> all{plain};
    for (const Params& params : {Params{{"colorB", 0}},
                                 {{"font_size", 20}},
                                 {{"fontEffect", 1}},
                                 {{"fontEffect", 3}},
                                 {{"pixelAspect", 2.0}}}) {
        all.push_back(at(30, params));
        for (std::size_t i = 0; i + 1 < all.size(); ++i)
            EXPECT_NE(all[i], all.back()) << params[0].first << i;
    }
    const LogCapture log;
    EXPECT_FALSE(shows(30, {{"font_filename", "/nowhere.ttf"}}));
    EXPECT_EQ(log.count("The font /nowhere.ttf can't be read"), 1);
}

TEST_F(Subtitle, LettersWithoutAFontAreNamedOnce) {
    file_ = folder_.write("talk.srt",
                          "1\n00:00:01,000 --> 00:00:02,000\n\xF4\x8F\xBF\xBD\xF4\x8F\xBF\xBD\n\n"
                          "2\n00:00:03,000 --> 00:00:04,000\n\xF4\x8F\xBF\xBD Hello\n");
    const LogCapture log;
    EXPECT_TRUE(shows(30));
    EXPECT_TRUE(log.contains("no font of this system has U+10FFFD", 4));
}

TEST_F(Subtitle, AFileOfAnyOriginIsReadIfAsked) {
    file_ = folder_.write("talk.sub", "{1}{1}50\n{100}{150}Hello\n");
    const Params normal{{"normalize", 1}};
    EXPECT_TRUE(shows(50, normal) && shows(75, normal)) << "at the rate of the file";
    EXPECT_FALSE(shows(49, normal) || shows(76, normal));
    const Params at25{{"normalize", 1}, {"framerate", QvFramerate(QvRatio(25, 1))}};
    EXPECT_TRUE(shows(100, at25) && !shows(99, at25)) << "unless another is given";
    file_ = folder_.write("none.srt", "no times");
    EXPECT_FALSE(shows(30, normal));
}

TEST_F(Subtitle, FilesWithoutSubtitles) {
    for (const std::string& name :
         {folder_.file("gone.srt"), folder_.write("talk.txt", srt), folder_.file("")}) {
        SubtitleWriter writer;
        writer.init();
        writer.setParam("subtitle_filename", name.c_str());
        EXPECT_EQ(writer.open(), QvStatus::cannotParse) << name;
        EXPECT_EQ(std::string(writer.errorDesc()), "Failed to read subtitle file " + name);
    }
    file_.clear();
    EXPECT_FALSE(shows(30)) << "without a file";
    const LogCapture log;
    file_ = folder_.write("empty.srt", "");
    EXPECT_FALSE(shows(30));
    EXPECT_TRUE(log.contains("empty.srt has no subtitles", 4));
}

}  // namespace
