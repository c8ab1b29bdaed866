// Subtitles of all kinds, from the file to the picture.
#include "tests/system/tool.h"

namespace {

const std::string kTimes = "1\n00:00:00,000 --> 00:00:09,000\n";

class Subtitles : public Tool {
  protected:
    static Words job(const std::string& file, const Words& options = {}) {
        return Words{"transcode", "testgen:size=320x240,duration=0.2,audio=0",
                     "-o",        "x.yuv",
                     "-y",        "--subtitles",
                     file} +
               options;
    }
    // The pictures with a file burnt in, and what was said.
    std::string burnt(const std::string& name, const std::string& bytes, const Words& options = {}) {
        folder.write(name, bytes);
        said = works(job(name, options)).err;
        return contents("x.yuv");
    }

    std::string said;
};

TEST_F(Subtitles, FilesOfAnyOriginGiveTheSamePictures) {
    const std::string plain = burnt("x.srt", kTimes + "Hello <b>&amp</b> \xC3\xA9t\xC3\xA9\n");
    const struct {
        const char* what;
        std::string name, bytes;
    } rows[] = {
        {"carriage returns", "a.srt",
         "1\r00:00:00,000 --> 00:00:09,000\rHello <b>&amp</b> \xC3\xA9t\xC3\xA9\r"},
        {"a mark", "b.srt", "\xEF\xBB\xBF" + kTimes + "Hello <b>&amp</b> \xC3\xA9t\xC3\xA9\n"},
        {"short hours", "c.srt", "0:00:00.0 --> 0:00:09\nHello <b>&amp</b> \xC3\xA9t\xC3\xA9\n"},
        {"markup", "d.srt", kTimes + "Hello <B>&#38;amp</B> &#xE9;t&#233;"},
        {"a rate", "e.sub", "{1}{1}50\n{0}{450}Hello <b>&amp</b> \xC3\xA9t\xC3\xA9\n"},
    };
    for (const auto& row : rows) EXPECT_TRUE(burnt(row.name, row.bytes) == plain) << row.what;
    EXPECT_TRUE(burnt("f.srt", kTimes + "Hello <b>&amp</b> \xE9t\xE9\n",
                      {"--subtitle-style", "encoding=1252"}) == plain);
}

TEST_F(Subtitles, AGuessIsSaidAndDamageIsRefused) {
    const std::string russian =
        "\xCC\xFB \xF1\xE5\xE3\xEE\xE4\xED\xFF \xE8\xE4\xE5\xEC \xE2 \xEA\xE8\xED\xEE, \xE0 "
        "\xEF\xEE\xF2\xEE\xEC "
        "\xEF\xEE\xE5\xE4\xE5\xEC \xE4\xEE\xEC\xEE\xE9. \xDD\xF2\xEE \xE1\xFB\xEB\xEE \xEE\xF7\xE5\xED\xFC\n";
    burnt("x.srt", kTimes + russian);
    EXPECT_THAT(said, testing::HasSubstr("it is read as"));
    EXPECT_THAT(said, testing::HasSubstr("(1 warning)"));
    std::filesystem::remove(folder.file("x.yuv"));

    folder.write("lost.srt", kTimes + "Hello\n\n2\n00:0x:03,000 --> 00:00:04,000\nlost\n");
    folder.write("none.srt", "Once upon a time\n");
    folder.write("film.sub", std::string("\0\0\1\xBA\0binary", 11));
    folder.write("odd.srt", kTimes + "\x81\x8D\x8F\x90\x9D\xFF\xFE\n");
    const struct {
        Words job;
        int status;
        Words parts;
        bool partial;  // --accept-partial takes it
    } rows[] = {
        {job("lost.srt"), 3, {"'lost.srt'", "1 of 2", "--accept-partial"}, true},
        {job("none.srt"), 3, {"'none.srt' has no subtitles", "--accept-partial"}, true},
        {job("film.sub"), 3, {"'film.sub'", "no text"}, false},
        {job("odd.srt"), 3, {"encoding of 'odd.srt'", "encoding=windows-1252"}, false},
        {job("x.srt", {"--subtitle-style", "encoding=utf-8"}), 3, {"line 3", "1251"}, true},
        {job("x.srt", {"--subtitle-style", "align=up"}), 2, {"align", "'up'", "top-left"}, false},
        {job("x.srt", {"--subtitle-style", "margin=50%"}), 2, {"margin", "'50%'"}, false},
        {job("x.srt", {"--subtitle-style", "wrap=2"}), 2, {"wrap", "on or off"}, false},
        {job("x.srt", {"--subtitle-style", "font=No Such Family"}), 2, {"'No Such Family'", "family"}, false},
    };
    for (const auto& row : rows) {
        fails(row.status, row.job, row.parts);
        if (!row.partial) continue;
        EXPECT_THAT(works(row.job + Words{"--accept-partial"}).err, testing::HasSubstr("(1 warning)"));
        std::filesystem::remove(folder.file("x.yuv"));
    }
}

TEST_F(Subtitles, LookAsTheStyleSays) {
    const std::string text =
        kTimes + "A line that is much too long for a picture which is as small as this one\n";
    std::vector<std::string> all;
    for (const std::string style :
         {"size=13", "size=13,wrap=off", "size=13,align=top", "size=13,margin=30", "size=13,margin=20%"})
        all.push_back(burnt("x.srt", text, {"--subtitle-style", style}));
    for (size_t i = 0; i < all.size(); ++i)
        for (size_t k = 0; k < i; ++k) EXPECT_FALSE(all[i] == all[k]) << i << k;
    EXPECT_TRUE(burnt("x.srt", text, {"--subtitle-style", "size=13,margin=5%,wrap=on,align=bottom"}) ==
                all[0])
        << "the defaults";
    EXPECT_FALSE(burnt("x.srt", text, {"--subtitle-style", "size=13,font=monospace"}) == all[0]);
    const Words stamp = {"--timecode=10:00:00:00", "--subtitle-style", "size=13"};
    EXPECT_FALSE(burnt("x.srt", text, stamp) == burnt("x.srt", text,
                                                      {"--timecode=start=10:00:00:00,font=monospace,size=20",
                                                       "--subtitle-style", "size=13"}));
}

}  // namespace
