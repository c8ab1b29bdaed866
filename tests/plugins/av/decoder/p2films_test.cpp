// Clips of P2 cards with essence as cameras write it: one picture, and sounds of one channel, in MXF files.
#include <gmock/gmock.h>

#include <filesystem>

#include "tests/plugins/av/films.h"
#include "tests/support/p2_card.h"

namespace {

using testing::AllOf;
using testing::HasSubstr;

class P2Films : public FilmsInTheTool {
  protected:
    static constexpr int kSounds = 2;

    // A clip on a card of its own: the document, and real essence in the place of that of p2_card.h.
    void shoot(const std::string& card, P2CardClip clip) const {
        clip.samples.assign(kSounds, 0);
        clip.duration = clip.frames;
        writeP2Clip(folder.path() / card, clip);
        const std::string contents = card + "/CONTENTS/",
                          length = ":duration=" + std::to_string(clip.frames / 25.0);
        film(contents + "VIDEO/" + clip.name + ".MXF",
             {"-pix_fmt", "yuv422p", "-c:v", "dvvideo", "-b:v", "50M", "-f", "mxf_opatom"},
             "testsrc2=size=720x576:rate=25" + length);
        for (int i = 0; i < kSounds; ++i)
            film(sound(card, clip.name, i),
                 {"-c:a", "pcm_s16le", "-mxf_audio_edit_rate", "25", "-f", "mxf_opatom"},
                 "sine=sample_rate=48000:frequency=" + std::to_string(440 * (i + 1)) + length);
    }
    static std::string sound(const std::string& card, const std::string& clip, int number) {
        return card + "/CONTENTS/AUDIO/" + clip + "0" + std::to_string(number) + ".MXF";
    }
    std::string read(const std::string& name) const { return TempFolder::read(folder.file(name)); }
    std::string samples(const std::string& name) const {
        const std::string raw = folder.file("samples.raw");
        EXPECT_EQ(ffmpeg({"-i", folder.file(name), "-f", "s16le", raw}).status, 0);
        return TempFolder::read(raw);
    }
};

TEST_F(P2Films, areOneInputWithAllTheirFiles) {
    shoot("card", {.name = "0001AB", .frames = 10});
    const Outcome shown = tarsel({"info", "card"});
    EXPECT_THAT(shown.out, AllOf(HasSubstr("p2dec"), HasSubstr("10 frames"), HasSubstr("audio 1"),
                                 HasSubstr("0001AB"), HasSubstr("01:02:03:04"), HasSubstr("MiB")));
    const Outcome made = tarsel({"transcode", "card", "-o", "out.yuyv", "--no-audio"});
    EXPECT_EQ(made.status, 0) << made.err;
    EXPECT_EQ(read("out.yuyv"), pictures(folder.file("card/CONTENTS/VIDEO/0001AB.MXF"), "yuyv422"));
    ASSERT_EQ(tarsel({"transcode", "card", "-o", "out_%d.wav", "--no-video"}).status, 0);
    for (int i = 0; i < kSounds; ++i) {
        const std::string name = "out_" + std::to_string(i) + ".wav";
        EXPECT_EQ(samples(name), samples(sound("card", "0001AB", i))) << i;
        EXPECT_EQ(samples(name).size(), 2u * 19200);
    }
}

TEST_F(P2Films, thatSpanCardsAreJoined) {
    shoot("first", {.name = "A", .frames = 6, .next = "B"});
    shoot("second", {.name = "B", .frames = 4, .previous = "A"});
    const Outcome made = tarsel({"transcode", "second/CONTENTS/CLIP/B.XML", "-o", "out.yuyv", "--no-audio"});
    EXPECT_EQ(made.status, 0) << made.err;
    std::string all;
    for (const char* part : {"first/CONTENTS/VIDEO/A.MXF", "second/CONTENTS/VIDEO/B.MXF"})
        all += pictures(folder.file(part), "yuyv422");
    EXPECT_EQ(read("out.yuyv"), all);
    ASSERT_EQ(tarsel({"transcode", "first", "-o", "out_%d.wav", "--no-video"}).status, 0);
    EXPECT_EQ(samples("out_1.wav"), samples(sound("first", "A", 1)) + samples(sound("second", "B", 1)));
}

TEST_F(P2Films, thatAreDamagedSayWhatAndWhy) {
    shoot("card", {.name = "A", .frames = 10});
    const std::string file = sound("card", "A", 1), whole = read(file);
    folder.write(file, std::string(300, 'x'));
    const Outcome refused = tarsel({"info", "card"});
    EXPECT_EQ(refused.status, 3);
    EXPECT_THAT(refused.err,
                AllOf(HasSubstr("A01.MXF"), HasSubstr("using 'avdec'"), HasSubstr("it is damaged")));
    folder.write(file, whole.substr(0, whole.size() / 2));
    EXPECT_EQ(tarsel({"transcode", "card", "-o", "out.avi"}).status, 3);
    EXPECT_EQ(tarsel({"transcode", "card", "-o", "out.avi", "--accept-partial"}).status, 0);
    std::filesystem::remove(folder.file(file));
    EXPECT_THAT(tarsel({"info", "card"}).err, HasSubstr("A01.MXF is missing"));
}

}  // namespace
