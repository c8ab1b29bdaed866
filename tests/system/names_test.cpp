// What the names of inputs and outputs mean: pixel formats, numbers, and one file for one stream.
#include <nlohmann/json.hpp>

#include "tests/system/tool.h"

namespace {

using testing::HasSubstr;
using Json = nlohmann::json;

class Names : public Tool {
  protected:
    static constexpr const char* kCard = "testgen:size=64x48,rate=25,duration=2f,audio=0";
    Json list(const char* command) const { return Json::parse(works({command, "--json"}).out); }
};

// Each name that is listed is written in its format, and read again without an option.
TEST_F(Names, OfRawFilesSayTheirPixelFormat) {
    const Json names = list("formats")["raw_names"];
    ASSERT_GE(names.size(), 15u);
    for (const Json& row : names) {
        if (row["fourcc"].is_null()) continue;
        const std::string extension = row["extension"], fourcc = row["fourcc"], name = "o." + extension;
        works({"transcode", kCard, "-o", name, "-q", "--no-sync"});
        works(
            {"transcode", kCard, "--format", "raw", "--pixel", fourcc, "-o", "any", "-q", "--no-sync", "-y"});
        EXPECT_TRUE(contents(name) == contents("any")) << extension;
        const Json info =
            Json::parse(works({"info", name, "--raw", "size=64x48,rate=25", "--json"}).out)[0]["streams"][0];
        EXPECT_EQ(info["codec"], fourcc) << extension;
        EXPECT_EQ(info["frames"], 2) << extension;
    }
    works({"transcode", kCard, "-o", "upper.UYVY", "-q", "--no-sync"});
    EXPECT_TRUE(contents("upper.UYVY") == contents("o.uyvy"));
    works({"transcode", kCard, "-o", "forced.uyvy", "--format", "yuyv", "-q", "--no-sync"});
    EXPECT_TRUE(contents("forced.uyvy") == contents("o.yuyv"));
    works({"transcode", kCard, "-o", "same.yuy2", "--pixel", "YUYV", "-q", "--no-sync"});
    works({"transcode", kCard, "-o", "kept.raw", "-q", "--no-sync"});
    EXPECT_EQ(size("kept.raw"), 2 * 64 * 48 * 4);
    // Of a stream as well.
    const Outcome o = works({"transcode", kCard, "-o", "-", "--format", "uyvy", "-q", "--no-sync"});
    EXPECT_TRUE(o.out == contents("o.uyvy"));
    // Others write all kinds of YUV as .yuv.
    works({"transcode", "o.yuv", "--raw", "size=64x48,pixel=UYVY", "-o", "other.raw", "-q", "--no-sync",
           "--accept-partial"});
}

TEST_F(Names, ThatContradictAFormatOrSayNoneAreRefused) {
    folder.write("a.uyvy", std::string(64 * 48 * 2, 'x'));
    folder.write("a.rgb", std::string(64 * 48 * 3, 'x'));
    const struct {
        int status;
        Words arguments, parts;
    } rows[] = {
        {2, {kCard, "-o", "x.uyvy", "--pixel", "I420"}, {"--pixel I420", "'x.uyvy'", "UYVY", ".i420"}},
        {2, {kCard, "-o", "x.yuv", "--pixel", "BGR4"}, {"'x.yuv'", "I420", ".bgr4"}},
        {2, {kCard, "-o", "x.yuv", "--pixel", "YUYV"}, {"'x.yuv'", ".yuyv"}},
        {2, {kCard, "-o", "x", "--format", "yv12", "--pixel", "I420"}, {"--format yv12", "YV12"}},
        {2, {kCard, "-o", "x.rgb"}, {"'x.rgb'", "order", ".bgr3", "--format raw"}},
        {2, {kCard, "-o", "x.rgba", "--pixel", "BGRA"}, {"'x.rgba'", ".bgra"}},
        {2, {kCard, "-o", "x.uyv"}, {"'uyv'", "'uyvy'"}},
        {2,
         {"a.uyvy", "--raw", "size=64x48,pixel=YUYV", "-o", "x.avi"},
         {"--raw pixel=YUYV", "'a.uyvy'", "UYVY"}},
        {2, {"a.rgb", "--raw", "size=64x48", "-o", "x.avi"}, {"'a.rgb'", "order", "pixel="}},
        {2, {"a.uyvy", "--raw", "rate=25", "-o", "x.avi"}, {"size"}},
        {3, {"a.uyvy", "-o", "x.avi"}, {"'a.uyvy'", "no header", "--raw"}},
        {2, {"a.uyvy", "--raw", "size=64x48,pixels=UYVY", "-o", "x.avi"}, {"'pixels'", "'pixel'"}},
    };
    for (const auto& row : rows) fails(row.status, Words{"transcode"} + row.arguments, row.parts);
    works({"transcode", "a.rgb", "--raw", "size=64x48,pixel=BGR3", "-o", "x.avi", "-q"});
}

TEST_F(Names, NumberPicturesAsTheirPatternSays) {
    const char* card = "testgen:size=64x48,rate=25,duration=3f";
    works({"transcode", card, "-o", "pic_%04d.png", "-q"});
    EXPECT_EQ(listing(), (std::set<std::string>{"pic_0000.png", "pic_0001.png", "pic_0002.png", "pic.wav"}));
    works({"transcode", card, "-o", "plain.png", "-q"});
    EXPECT_TRUE(contents("pic_0002.png") == contents("plain#2.png"));
    fails(4, {"transcode", card, "-o", "pic_%04d.png"}, {"pic_0", "exists", "-y"});
    // The rest of a longer set goes with its sound, other names stay.
    folder.write("pic_7.png", "other");
    folder.write("pic_0009x.png", "other");
    const Outcome o =
        works({"transcode", "testgen:size=64x48,rate=25,duration=1f,audio=0", "-o", "pic_%04d.png", "-y"});
    EXPECT_THAT(o.err, HasSubstr("wrote 'pic_0000.png', 1 frame"));
    EXPECT_EQ(listing(), (std::set<std::string>{"pic_0000.png", "pic_7.png", "pic_0009x.png", "plain#0.png",
                                                "plain#1.png", "plain#2.png", "plain.wav"}));
    std::filesystem::create_directory(folder.file("50%d"));
    works({"transcode", card, "-o", "50%d/100%%_%d.png", "-q"});
    EXPECT_EQ(size("50%d/100%_2.png"), size("plain#2.png"));
    works({"transcode", card, "-o", "50%%.png", "-q"});
    EXPECT_TRUE(contents("50%#2.png") == contents("plain#2.png"));
    // A failure leaves nothing, and names in messages are final ones.
    fails(4, {"transcode", card, "-o", "absent/p%d.png"}, {"'absent/p%d.png'", "folder"});
    for (const char* name : {"%d_%d.png", "%s.png", "x%.png", "%4d.png"})
        fails(2, {"transcode", card, "-o", name}, {name, "%d or %04d", "%%"});
    fails(2, {"transcode", card, "-o", "n%d.png", "--save-task", "t.xml"}, {"--save-task", "'n%d.png'"});
    fails(2, {"frame", card, "-o", "shot_%03d.png", "--at", "0"}, {"'shot_%03d.png'", "one"});
    fails(2, {"frame", card, "-o", "sheet_%d.png", "--sheet", "2x1"}, {"'sheet_%d.png'", "one"});
}

TEST_F(Names, OneFileHoldsOneSound) {
    const std::string a = contents(makeWav("a.wav", 4000)), b = contents(makeWav("b.wav", 5000));
    fails(2, {"transcode", "a.wav", "b.wav", "-o", "c.wav"},
          {"'c.wav'", "one sound", "have 2", "-o 'c_%d.wav'"});
    works({"transcode", "a.wav", "b.wav", "-o", "c_%d.wav", "-q"});
    EXPECT_TRUE(wavPart(contents("c_0.wav"), "data") == wavPart(a, "data"));
    EXPECT_TRUE(wavPart(contents("c_1.wav"), "data") == wavPart(b, "data"));
    makeYuv("p.yuv", 1);
    makeYuv("q.yuv", 1);
    const Words raw = {"--raw", "size=64x48,rate=25"};
    fails(2, Words{"transcode", "p.yuv", "q.yuv", "-o", "r.yuv"} + raw,
          {"'r.yuv'", "one picture", "r_%d.yuv"});
    works(Words{"transcode", "p.yuv", "q.yuv", "-o", "r_%02d.yuv", "-q"} + raw);
    EXPECT_TRUE(contents("r_00.yuv") == contents("p.yuv") && contents("r_01.yuv") == contents("q.yuv"));
    fails(2, Words{"transcode", "p.yuv", "a.wav", "b.wav", "-o", "s.png"} + raw, {"'s.png'", "sound", "2"});
    works(Words{"transcode", "p.yuv", "a.wav", "b.wav", "-o", "all.avi", "-q"} + raw);
    fails(2, {"transcode", "a.wav", "b.wav", "-o", "c%d.wav", "--split-channels"}, {"one sound", "for each"});
    works({"transcode", "testgen:size=64x48,rate=25,duration=1f", "--split-channels", "-o", "f%d.png", "-q"});
    EXPECT_TRUE(size("f0.png") > 0 && size("f#00.wav") > 0 && size("f#01.wav") > 0);
    works({"transcode", "a.wav", "--split-channels", "-o", "ch_%d.wav", "-q"});
    EXPECT_EQ(size("ch_0.wav"), size("ch_1.wav"));
    EXPECT_GT(size("ch_1.wav"), 2000);
    // Without a set a percent sign is a letter.
    works({"transcode", "a.wav", "-o", "100%.wav", "-q"});
    EXPECT_TRUE(wavPart(contents("100%.wav"), "data") == wavPart(a, "data"));
}

TEST_F(Names, RatesArePrintedAsTheyAreTypedAndNotThoseOfFields) {
    EXPECT_THAT(works({"info", "testgen:size=64x48,rate=29.97i"}).out, HasSubstr(" 29.97i fps"));
    EXPECT_THAT(works({"info", "testgen:size=64x48,rate=50fi"}).out, HasSubstr(" 50fi fps"));
    fails(2, {"transcode", kCard, "--rate", "50i", "-o", "x.raw"}, {"--rate", "'50i'", "fields", "use 25i"});
    makeYuv("a.yuv", 1);
    fails(2, {"transcode", "a.yuv", "--raw", "size=64x48,rate=50,interlaced=1", "-o", "x.raw"},
          {"--raw rate", "'50'", "use 25i"});
    fails(2, {"transcode", "a.yuv", "--raw", "size=64x48,rate=25i,interlaced=2", "-o", "x.raw"},
          {"interlaced=2", "rate=25i"});
}

TEST_F(Names, OfModulesShowTheirParameters) {
    const Outcome o = works({"modules", "logo"});
    for (const char* part : {"logo", "video filter", "alpha", "Float", "0 to 1, default 1", "xpos", "pixels"})
        EXPECT_THAT(o.out, HasSubstr(part));
    EXPECT_THAT(works({"modules", "rawdec"}).out, HasSubstr("needed"));
    fails(5, {"modules", "brigthness"}, {"'brigthness'", "'brightness'"});
    fails(2, {"transcode", kCard, "--filter", "logo:alpah=1", "-o", "x.raw"},
          {"'alpah'", "'alpha'", "tarsel modules logo"});
    // Every module that works says what it takes, and a parameter that is listed is one that it knows.
    for (const Json& module : list("modules")) {
        const std::string name = module["name"];
        if (module["kind"] == "video filter" && module["usable"].get<bool>()) {
            EXPECT_FALSE(module["parameters"].empty()) << name;
        }
        for (const Json& p : module["parameters"]) {
            EXPECT_FALSE(p["name"].get<std::string>().empty()) << name;
            if (!p["read_only"].get<bool>()) {
                EXPECT_FALSE(p["type"].get<std::string>().empty() && p["meaning"].get<std::string>().empty())
                    << name << p;
            }
        }
    }
}

}  // namespace
