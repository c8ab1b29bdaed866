// What options do to the picture, from the command line to the file.
#include "tests/system/tool.h"

namespace {

using testing::HasSubstr;
struct Box {
    size_t x, y, width, height;
};

class Effects : public Tool {
  protected:
    // A part of a 64x48 I420 frame, upside down if asked for.
    static std::string part(const std::string& frame, const Box& box, bool flip = false) {
        std::string cut;
        size_t plane = 0;
        for (const size_t scale : {1u, 2u, 2u}) {
            const size_t stride = 64 / scale, rows = box.height / scale;
            for (size_t row = 0; row < rows; ++row) {
                const size_t y = box.y / scale + (flip ? rows - 1 - row : row);
                cut += frame.substr(plane + y * stride + box.x / scale, box.width / scale);
            }
            plane += stride * 48 / scale;
        }
        return cut;
    }
    std::string result(const Words& options) const {
        works(asYuv(Words{"transcode", "clip.yuv", "-q", "-y", "-o", "out.yuv"} + options));
        return contents("out.yuv");
    }
    // The bytes of the picture that `frame` makes of a generated clip.
    std::string shown(const Words& options,
                      const std::string& input = "testgen:size=320x240,duration=0.4,audio=0") const {
        works(Words{"frame", input, "--at", "0.2", "-y", "-o", "shown.png"} + options);
        return contents("shown.png");
    }
    void makeOverlays() const {
        folder.write("x.srt", "1\n00:00:00,000 --> 00:00:09,000\nHello, <i>world</i>\n\n");
        works({"frame", "testgen:size=64x48", "-o", "l.png"});
    }
};

TEST_F(Effects, TheCropKeepsItsPart) {
    makeYuv("clip.yuv", 2);
    const std::string first = contents("clip.yuv").substr(0, kFrame);
    const struct {
        const char* text;
        Box box;
    } cases[] = {
        {"32x16", {16, 16, 32, 16}},
        {"32x16+8+4", {8, 4, 32, 16}},
        {"32x16-8-4", {24, 28, 32, 16}},
        {"16:9", {0, 6, 64, 36}},
    };
    for (const auto& c : cases) {
        const size_t bytes = c.box.width * c.box.height * 3 / 2;
        const std::string cut = result({std::string("--crop=") + c.text});
        EXPECT_EQ(cut.size(), 2 * bytes) << c.text;
        EXPECT_TRUE(cut.substr(0, bytes) == part(first, c.box)) << c.text;
    }
    EXPECT_TRUE(result({"--flip"}).substr(0, kFrame) == part(first, {0, 0, 64, 48}, true));
    // The picture is turned first.
    EXPECT_TRUE(result({"--crop", "64x16+0+0", "--flip"}).substr(0, 64 * 24) ==
                part(first, {0, 32, 64, 16}, true));
    EXPECT_EQ(result({"--crop", "32x16", "--size", "80x60"}).size(), 2u * 80 * 60 * 3 / 2);
}

TEST_F(Effects, AFrameShowsWhatARunWrites) {
    makeOverlays();
    const std::string plain = shown({});
    const Words cases[] = {
        {"--flip"},
        {"--crop", "100x80-10+20"},
        {"--timecode=10:00:00:00"},
        {"--timecode=mode=frames,x=10,y=10,color=yellow,size=40"},
        {"--subtitles", "x.srt", "--subtitle-style", "size=20,color=00ff00,effect=none,encoding=utf-8"},
        {"--logo", "l.png@-20,20", "--logo", "l.png@20,-20,0.5"},
        {"--filter", "brightness:brightness=0.2"},
        {"--crop", "16:9", "--logo", "l.png@-8,8", "--subtitles", "x.srt", "--timecode", "--fade", "10f"},
    };
    for (const Words& options : cases) {
        SCOPED_TRACE(testing::PrintToString(options));
        const std::string picture = shown(options);
        works(Words{"transcode", "testgen:size=320x240,duration=0.4,audio=0", "-q", "-o", "run.png"} +
              options);
        EXPECT_FALSE(picture == plain);
        EXPECT_TRUE(picture == contents("run#5.png"));
        for (const auto& name : listing())
            if (name.rfind("run", 0) == 0) std::filesystem::remove(folder.file(name));
    }
}

TEST_F(Effects, FieldsBecomeFrames) {
    const Words job = {"transcode", "testgen:size=64x48,rate=25i,duration=1,audio=0", "-y", "-o", "x.raw"};
    Words all;
    for (const char* method : {"", "=top", "=bottom", "=bob", "=double", "=reverse"}) {
        const Outcome o = tarsel(job + Words{std::string("--deinterlace") + method});
        EXPECT_THAT(o.err, HasSubstr(method == std::string("=double") ? ", 50 frames" : ", 25 frames"));
        all.push_back(contents("x.raw"));
    }
    EXPECT_TRUE(all[0] == all[1]);
    for (size_t i = 1; i < all.size(); ++i)
        for (size_t k = i + 1; k < all.size(); ++k) EXPECT_FALSE(all[i] == all[k]) << i << k;
}

TEST_F(Effects, FormatsThatNothingCanBeDrawnOn) {
    makeOverlays();
    for (const std::string pixel : {"v210", "Y216", "YUYV", "UYVY", "I422"}) {
        const Words job = {
            "transcode", "testgen:size=96x64,duration=0.2,audio=0", "--pixel", pixel, "-y", "-o", "x.raw"};
        works(job);
        const std::string plain = contents("x.raw");
        works(job + Words{"--logo", "l.png@8,8", "--subtitles", "x.srt"});
        EXPECT_EQ(contents("x.raw").size(), plain.size());
        EXPECT_FALSE(contents("x.raw") == plain) << pixel;
    }
}

TEST_F(Effects, NamesOfAnyCharacters) {
    makeOverlays();
    const std::string at5 = shown({"--logo", "l.png@5,6"}), text = shown({"--subtitles", "x.srt"});
    for (const std::string name : {"a b", "l@2x", "new\nline", "@", "c,d=e:f", "-x", "\xFF\xFE"}) {
        std::filesystem::copy_file(folder.file("l.png"), folder.file(name + ".png"));
        std::filesystem::copy_file(folder.file("x.srt"), folder.file(name + ".srt"));
        EXPECT_TRUE(shown({"--logo=" + name + ".png@5,6"}) == at5) << name;
        EXPECT_TRUE(shown({"--subtitles=" + name + ".srt"}) == text) << name;
    }
}

TEST_F(Effects, WhatCanNotBeDoneIsTold) {
    makeOverlays();
    makeYuv("clip.yuv", 2);
    makeWav("in.wav", 4410);
    folder.write("bad.png", "no picture");
    folder.write("bad.srt", std::string("\0\1\2\0text", 8));
    const struct {
        int status;
        Words options;
        Words parts;
    } cases[] = {
        {2, {"--crop", "400x240"}, {"--crop", "'400x240'", "beyond", "320x240"}},
        {2, {"--crop", "2x2"}, {"less than 4x4"}},
        {2, {"--crop", "100x100+5+99999999999"}, {"WxH+X+Y"}},
        {2, {"--deinterlace"}, {"--deinterlace", "progressive", "25i"}},
        {2, {"--timecode=10;00;00;00"}, {"drop frame", "25"}},
        {2, {"--timecode=colour=red"}, {"'colour'", "did you mean 'color'?"}},
        {2, {"--timecode=x=5,y=9999"}, {"y", "'9999'", "240"}},
        {2, {"--logo", "l.png@400,0"}, {"'l.png@400,0'", "beyond", "320x240"}},
        {3, {"--logo", "gone.png@4,5"}, {"'gone.png'", "no such file"}},
        {3, {"--logo", "bad.png@4,5"}, {"can't read the picture 'bad.png'", "no PNG file"}},
        {3, {"--subtitles", "gone\n.srt"}, {"'gone\\x0a.srt'", "no such file"}},
        {3, {"--subtitles", "/dev/null"}, {"'/dev/null'", "no regular file"}},
        {3, {"--subtitles", "bad.srt"}, {"bad.srt"}},
        {2, {"--subtitle-style", "size=3"}, {"--subtitle-style", "--subtitles"}},
        {3, {"--subtitles", "x.srt", "--subtitle-style", "font=gone.ttf"}, {"'gone.ttf'", "no such file"}},
        {2, {"--flip", "--filter", "flipper"}, {"--filter flipper", "taken"}},
        {2, {"--filter", "brightness:gamma=much"}, {"--filter brightness", "'gamma'"}},
    };
    for (const auto& c : cases) {
        fails(c.status, Words{"transcode", "testgen:size=320x240,duration=0.4", "-o", "x.raw"} + c.options,
              c.parts);
        fails(c.status, Words{"frame", "testgen:size=320x240,duration=0.4", "-o", "x.png"} + c.options,
              c.parts);
    }
    fails(2, asYuv({"transcode", "clip.yuv", "--crop", "31x16", "-o", "x.yuv"}),
          {"share their colour", "even"});
    fails(2,
          {"transcode", "clip.yuv", "--raw", "size=64x48,pixel=I420,rate=25i", "--crop", "32x16+0+2", "-o",
           "x.yuv"},
          {"multiple of 4"});
    for (const char* option : {"--crop=8x8", "--flip", "--timecode", "--logo=l.png"})
        fails(2, {"transcode", "in.wav", option, "-o", "x.wav"},
              {std::string(option).substr(0, std::string(option).find('=')), "no picture"});
}

TEST_F(Effects, AFilterThatFailsFailsTheJob) {
    const Words job{"transcode", "testgen:size=64x48,duration=0.4,audio=0"};
    const Words toI422{"--pixel", "I422", "--filter", "scaler:outWidth=64,outHeight=48,FOURCC=I422,_front=1"};
    folder.write("precious.yuv", "precious");
    makeOverlays();
    const struct {
        int status;
        Words options;
        Words parts;
    } cases[] = {
        {4,
         {"--filter", "rawdump:filename=/dev/full", "-o", "x.avi"},
         {"the filter 'rawdump' can't write '/dev/full': the disk is full"}},
        {4, {"--filter", "rawdump:filename=/dev/full", "--muxer", "nullmux"}, {"rawdump", "/dev/full"}},
        {4, {"--filter", "rawdump:filename=no/x", "-o", "x.avi"}, {"'no/x'", "'no' does not exist"}},
        {4, {"--filter", "rawdump:filename=precious.yuv", "-o", "x.avi"}, {"'precious.yuv'", "exists"}},
        {2, {"--filter", "rawdump", "-o", "x.avi"}, {"rawdump", "none is named"}},
        {4, {"--filter", "logo:filename=l.png", "-o", "l.png", "-y"}, {"'l.png'", "input"}},
        {1, toI422 + Words{"--filter", "timecode:_front=1", "-o", "x.raw"}, {"timecode", "I422"}},
        {1, toI422 + Words{"--filter", "brightness:gamma=2,_front=1", "-o", "x.raw"}, {"brightness filter"}},
    };
    for (const auto& c : cases) fails(c.status, job + c.options, c.parts);
    makeYuv("clip.yuv", 2);
    const std::string clip = contents("clip.yuv");
    works(asYuv({"transcode", "clip.yuv", "--filter", "rawdump:filename=precious.yuv", "-o", "x.yuv", "-y"}));
    EXPECT_TRUE(clip == contents("precious.yuv"));
}

// Chroma with as many rows as luma, and a box that is nobody's choice.
TEST_F(Effects, WhatChangesNothingKeepsEveryByte) {
    const std::string clip = patternBytes(64 * 48 * 2 * 3);
    folder.write("clip.raw", clip);
    for (const char* filter : {"deinterlace", "flipper:flip=0", "cropper", "cropper:mode=1", "videofade"}) {
        works({"transcode", "clip.raw", "--raw", "size=64x48,pixel=I422,rate=25", "--filter", filter, "-o",
               "out.raw", "-y"});
        const std::string out = contents("out.raw");
        EXPECT_TRUE(out == clip) << filter;
    }
    works({"frame", "testgen:size=160x90", "--filter", "cropper:mode=3,cropAspect=1.0", "--size", "90x90",
           "-o", "square.png"});
    works({"frame", "testgen:size=160x90", "--crop", "88x88+0+0", "--size", "90x90", "-o", "cut.png"});
    EXPECT_TRUE(contents("square.png") == contents("cut.png")) << "as much of the input as has the shape";
}

}  // namespace
