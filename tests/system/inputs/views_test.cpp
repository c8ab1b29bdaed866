// Views of a picture and clips of cards: made, shown, and used as inputs.
#include <nlohmann/json.hpp>

#include "tests/support/p2_card.h"
#include "tests/system/tool.h"

namespace {

using testing::AllOf;
using testing::HasSubstr;

class Views : public Tool {
  protected:
    Views() {
        makeYuv("a.yuv", 4);
        folder.write("b.yuv", patternBytes(4 * kFrame, 7));
    }
    // The first plane of both pictures, row by row.
    std::string lumaAcross() const {
        std::string all;
        for (size_t row = 0; row < 48; ++row)
            for (const char* name : {"a.yuv", "b.yuv"}) all += contents(name).substr(row * 64, 64);
        return all;
    }
};

TEST_F(Views, AreJoinedByALayoutAndTranscoded) {
    works(asYuv({"views", "--view", "a.yuv", "--view", "b.yuv", "--layout", "side-by-side", "-o", "x.mmf"}));
    works({"transcode", "x.mmf", "-o", "out.yuv"});
    EXPECT_EQ(size("out.yuv"), 8 * static_cast<long long>(kFrame));
    EXPECT_TRUE(contents("out.yuv").substr(0, 128 * 48) == lumaAcross());
    EXPECT_THAT(works({"info", "x.mmf"}).out, HasSubstr("128x48"));
    const auto json = nlohmann::json::parse(works({"views", "x.mmf", "--json"}).out);
    EXPECT_EQ(json["layout"], "side-by-side");
    EXPECT_EQ(json["width"], 128);
    ASSERT_EQ(json["views"].size(), 2u);
    EXPECT_EQ(json["views"][1]["decoder"], "rawdec");
    // Another layout of the same, after all moved together; one view is what it was.
    std::filesystem::create_directory(folder.file("elsewhere"));
    for (const char* name : {"a.yuv", "b.yuv", "x.mmf"})
        std::filesystem::rename(folder.file(name), folder.file(std::string("elsewhere/") + name));
    works({"views", "elsewhere/x.mmf", "--layout", "right", "-o", "y.mvf"});
    works({"transcode", "y.mvf", "-o", "right.yuv"});
    EXPECT_TRUE(contents("right.yuv") == contents("elsewhere/b.yuv"));
    works({"views", "--view", "testgen:size=64x48,duration=1,views=2", "-o", "z.mvf"});
    EXPECT_THAT(works({"info", "z.mvf"}).out, HasSubstr("2 views"));
    const Outcome one = works({"transcode", "z.mvf", "-o", "one.yuv"});
    EXPECT_THAT(one.err, HasSubstr("excess views will be ignored"));
    // A task of views runs as they do.
    works({"transcode", "y.mvf", "-o", "task.yuv", "--save-task", "task.xml"});
    EXPECT_THAT(works({"info", "task.xml"}).out, HasSubstr("task"));
}

TEST_F(Views, WhatCanNotBeShownIsRefused) {
    makeWav("s.wav", 100);
    works({"mix", "--ch", "L=s.wav", "-o", "mix.mmf"});
    folder.write("bad.mmf", "<Metafile><MVInterleave><view file='a.png'/></MVInterleave></Metafile>");
    fails(3, {"transcode", "bad.mmf", "-o", "x.yuv"}, {"bad.mmf", "there is no such file"});
    fails(3, {"views", "mix.mmf"}, {"it holds no views"});
    fails(3, {"views", "--view", "s.wav"}, {"view 1", "it has no picture"});
    fails(2, {"views"}, {"--view"});
    fails(2, {"views", "--view", "testgen", "-o", "x.avi"}, {".mmf or .mvf"});
    fails(2, {"views", "--view", "testgen", "--layout", "round"}, {"round"});
    fails(3, {"views", "--view", "testgen:size=64x48", "--view", "testgen:size=64x64"},
          {"its size is 64x64, not 64x48"});
    folder.write("b.yuv", patternBytes(3 * kFrame));
    works(asYuv({"views", "--view", "a.yuv", "--view", "b.yuv", "-o", "short.mmf"}));
    fails(3, {"transcode", "short.mmf", "-o", "x.yuv"}, {"3 of 4 frames"});
    EXPECT_EQ(tarsel({"transcode", "x.mmf", "-o", "a.yuv", "-y"}).status, 3);
}

class Cards : public Tool {
  protected:
    Cards() {
        namespace fs = std::filesystem;
        fs::create_directory(folder.file("plugins"));
        const fs::path plugin = folder.file("plugins/mxf_plugin.so");
        fs::copy_file(QV_BINARY_DIR "/plugins/mxf_plugin.so", plugin);
        fs::permissions(plugin, fs::perms{0755});
        fs::permissions(plugin.parent_path(), fs::perms{0755});
    }
    static Words coded(const Words& words) { return Words{"--plugins", "plugins"} + words; }
};

TEST_F(Cards, AClipIsAnInputByItsFolder) {
    writeP2Clip(folder.path() / "card", {.name = "A", .seed = 30});
    works(coded({"transcode", "card", "-o", "out.gray", "--no-audio"}));
    EXPECT_EQ(size("out.gray"), 5 * 128);
    EXPECT_EQ(contents("out.gray")[128 * 4], 34);
    works(coded({"transcode", "card/CONTENTS/CLIP/A.XML", "-o", "out_%d.wav", "--no-video"}));
    EXPECT_GT(size("out_1.wav"), 19200);
    const auto json = nlohmann::json::parse(works(coded({"info", "card", "--json"})).out);
    EXPECT_EQ(json[0]["decoder"], "p2dec");
    EXPECT_EQ(json[0]["meta"]["clipName"], "A");
    EXPECT_THAT(works(coded({"info", "card"})).out, AllOf(HasSubstr("Two geese"), HasSubstr("01:02:03:04")));
    writeP2Clip(folder.path() / "short", {.name = "A", .samples = {}, .duration = 7});
    fails(3, coded({"transcode", "short", "-o", "short.gray"}), {"5 of 7 frames"});
    works(coded({"transcode", "short", "-o", "short.gray", "--accept-partial"}));
    // A mix that names the folder.
    folder.write(
        "card.mmf",
        "<Metafile><AudioInterleave><channels><ch pos='L'><src file='card' stream='1' channel='0'/></ch>"
        "</channels><decoders><dec file='card' decoder='p2dec'/></decoders></AudioInterleave></Metafile>");
    works(coded({"transcode", "card.mmf", "-o", "mixed.wav"}));
    EXPECT_GT(size("mixed.wav"), 3 * 9600);
    fails(3, {"--no-plugins", "info", "card"}, {"there is no decoder for MXF files here"});
    fails(3, {"transcode", "card/CONTENTS/CLIP/A.XML", "-o", "x.wav"}, {"A.MXF"});
    writeP2Clip(folder.path() / "card", {.name = "B"});
    fails(3, coded({"transcode", "card", "-o", "x.gray"}), {"2 clips: A.XML, B.XML"});
    std::filesystem::create_directory(folder.file("empty"));
    fails(3, {"info", "empty"}, {"folder"});
}

}  // namespace
