// Pictures, and the sound that belongs to them, from source to file.
#include "tests/system/tool.h"

namespace {

class Picture : public Tool {};

// Four seconds at 29.97 hold 119 whole frames, and these last 175104 samples at 44100 Hz.
TEST_F(Picture, GeneratedFramesAndTheirSamples) {
    const Outcome o = works({"transcode", "testgen:size=96x64,rate=30000/1001,duration=4", "-o", "card.raw"});
    EXPECT_EQ(o.err, "tarsel: wrote 'card.raw' and 'card.wav', 119 frames, 175104 samples\n");
    EXPECT_EQ(listing(), (std::set<std::string>{"card.raw", "card.wav"}));
    EXPECT_EQ(size("card.raw"), 119 * 96 * 64 * 4);
    EXPECT_EQ(wavPart(contents("card.wav"), "data").size(), 175104u * 2 * 2);
    EXPECT_NE(wavPart(contents("card.wav"), "data").find_first_not_of('\0'), std::string::npos);
    works({"transcode", "testgen:size=96x64,rate=30000/1001,duration=4", "-o", "again.raw"});
    EXPECT_TRUE(contents("card.raw") == contents("again.raw"));
    EXPECT_TRUE(contents("card.wav") == contents("again.wav"));
}

TEST_F(Picture, PicturesAsFiles) {
    works({"transcode", "testgen:size=64x48,rate=25,duration=0.48", "-o", "shot.png"});
    EXPECT_EQ(listing().size(), 13u) << "twelve pictures and their sound";
    works({"frame", "testgen:size=64x48,rate=25,duration=0.48", "--at", "7f", "-o", "seven.png"});
    EXPECT_TRUE(contents("seven.png") == contents("shot#07.png"));
    // A frame of a raw file is the one that the generator made.
    works({"transcode", "testgen:size=64x48,rate=25,duration=0.48", "-o", "card.raw"});
    works({"frame", "card.raw", "--raw", "size=64x48,pixel=BGR4,rate=25", "--at", "0.3", "-o", "raw.png"});
    EXPECT_TRUE(contents("seven.png") == contents("raw.png"));
    fails(4, {"frame", "testgen", "-o", "raw.png"}, {"'raw.png'", "exists", "-y"});
}

// Where points lie is a matter of the plan (jobplan_test.cpp).
TEST_F(Picture, FramesBetweenPointsAreThoseOfTheInput) {
    makeYuv("clip.yuv", 100);
    takesParts({{{"--from", "1", "--to", "3"}, 25, 50},
                {{"--to", "00:00:00:10"}, 0, 10},
                {{"--from", "-00:00:00:20", "--to", "-0"}, 80, 20},
                {{"--from=-50f", "--duration=7f"}, 50, 7}});
}

TEST_F(Picture, AFileThatEndsWithinAFrame) {
    makeYuv("clip.yuv", 2.5);
    const auto job = asYuv({"transcode", "clip.yuv", "-o", "out.yuv"}),
               shot = asYuv({"frame", "clip.yuv", "-o", "x.png"});
    fails(3, job, {"'clip.yuv' is damaged", "frame 3", "2 whole", "--accept-partial"});
    fails(3, shot, {"'clip.yuv' is damaged", "after 2 whole ones", "--accept-partial"});
    works(job + Words{"--accept-partial"});
    EXPECT_TRUE(contents("clip.yuv").substr(0, 2 * kFrame) == contents("out.yuv"));
    EXPECT_THAT(works(shot + Words{"--accept-partial"}).err,
                testing::HasSubstr("tarsel: warning: 'clip.yuv' is damaged"));
}

}  // namespace
