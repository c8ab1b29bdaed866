// Clips by their documents and folders, takes on several cards, and clips that can't be opened.
#include "builtin/decoders/p2/p2dec.h"

#include <regex>

#include <gmock/gmock.h>

#include "core/decode/decodefactory.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/mxf_decoder.h"
#include "tests/support/p2_card.h"

namespace {

namespace fs = std::filesystem;
using testing::AllOf;
using testing::HasSubstr;

class P2 : public testing::Test {
  protected:
    QvPlugin plugin{"mxf", "of the tests"};  // outlives the engine
    EngineScope engine;
    TempFolder folder;

    P2() {
        plugin.addModule(new MxfModule);
        qv_registry()->addPlugin(&plugin);
    }

    std::unique_ptr<P2Dec> open(const std::string& name, bool join = true) {
        auto decoder = std::make_unique<P2Dec>();
        decoder->init();
        decoder->setParam("filename", Any(name.c_str()));
        decoder->setParam("joinSpans", join ? 1 : 0);
        fault = decoder->open() == 0 ? "" : decoder->errorDesc();
        return decoder;
    }
    std::string faultOf(const std::string& name) { return open(name), fault; }
    static std::vector<int> frames(P2Dec& decoder) {
        std::vector<int> seen;
        while (decoder.readFrame(0) == 0) {
            EXPECT_EQ(decoder.getFramePtr(0)->frameNr, static_cast<int>(seen.size()));
            seen.push_back(decoder.getFramePtr(0)->plane(0)[0]);
        }
        return seen;
    }
    static std::vector<int> samples(P2Dec& decoder, int stream, int piece) {
        std::vector<int> all;
        for (int n; (n = decoder.readSamples(piece, stream)) > 0;) {
            const QvPcm& pcm = *decoder.getAudioPtr(stream);
            EXPECT_EQ(pcm.samples(), n);
            const auto* from = reinterpret_cast<const short*>(pcm.ptr(0));
            all.insert(all.end(), from, from + n);
        }
        return all;
    }

    std::string fault;
};

TEST_F(P2, AClipIsOneInputByItsDocumentAndItsFolders) {
    const fs::path card = folder.path() / "card";
    const std::string document = writeP2Clip(card, {.name = "0001AB", .seed = 40});
    const fs::path contents = card / "CONTENTS";
    for (const std::string& name :
         {document, card.string(), contents.string(), (contents / "CLIP").string()}) {
        const auto decoder = open(name);
        ASSERT_EQ(fault, "") << name;
        EXPECT_EQ(decoder->nrVideoStreams(), 1);
        EXPECT_EQ(decoder->nrAudioStreams(), 2);
        EXPECT_EQ(decoder->getParam("filename"), Any(document.c_str()));
        EXPECT_EQ(decoder->getParam("clipName"), Any("0001AB"));
        EXPECT_EQ(decoder->getParam("userClipName"), Any("Two geese"));
        EXPECT_EQ(decoder->getParam("meta").asDict().get("startTimecode"), Any("01:02:03:04"));
        EXPECT_EQ(decoder->getParam("inputFiles").asVector().size(), 4);
        EXPECT_EQ(decoder->nrFrames(0), 5);
        EXPECT_EQ(decoder->nrSamples(1), 9600);
        EXPECT_EQ(frames(*decoder), (std::vector{40, 41, 42, 43, 44}));
        EXPECT_EQ(samples(*decoder, 1, 5000)[9599], 2000 + 9599);
    }
    const std::unique_ptr<QvDecodePipe> found(QvDecFactory::decodePipe(Any(document.c_str())));
    ASSERT_TRUE(found);
    EXPECT_EQ(found->select(qvAudioStream, 1), 0);
    EXPECT_TRUE(found->isSelected(qvAudioStream, 1));
    EXPECT_FALSE(found->isSelected(qvAudioStream, 0));
    EXPECT_LT(found->select(qvAudioStream, 2), 0);
    // Copies on other discs may have lost the case of the letters.
    fs::rename(contents / "VIDEO", contents / "video");
    fs::rename(contents / "video/0001AB.MXF", contents / "video/0001ab.mxf");
    EXPECT_EQ(faultOf(document), "");
}

// The first part's sound lacks samples, the second one's has too many; each begins with its picture.
TEST_F(P2, ATakeOnSeveralCardsIsJoinedFromAnyOfItsParts) {
    const std::string first = writeP2Clip(
        folder.path() / "a", {.name = "A", .frames = 3, .seed = 10, .samples = {5700}, .next = "B"});
    const std::string second =
        writeP2Clip(folder.path() / "b",
                    {.name = "B", .frames = 2, .seed = 50, .samples = {4000}, .previous = "A", .next = "C"});
    const std::string third = writeP2Clip(
        folder.path() / "c", {.name = "C", .frames = 2, .seed = 90, .samples = {100}, .previous = "B"});
    std::vector<int> wanted;
    const auto add = [&wanted](int from, int count) {
        for (int i = 0; i < count; ++i) wanted.push_back(from ? from + i : 0);
    };
    add(1000, 5700), add(0, 60), add(1000, 3840), add(1000, 100);
    for (const std::string& name : {first, second, third, (folder.path() / "b").string()}) {
        const auto decoder = open(name);
        ASSERT_EQ(fault, "");
        EXPECT_EQ(decoder->getParam("filename").asString(), name.ends_with("b") ? second : name);
        EXPECT_EQ(decoder->getParam("clipName"), Any("A"));
        EXPECT_EQ(frames(*decoder), (std::vector{10, 11, 12, 50, 51, 90, 91}));
        for (const int piece : {7, 1920, 100000}) {
            ASSERT_EQ(decoder->seekToSample(0, 0), 0);
            ASSERT_EQ(samples(*decoder, 0, piece), wanted) << piece;
        }
        for (const int place : {5759, 5760, 5740, 9599, 9600, 0}) {
            ASSERT_EQ(decoder->seekToSample(place, 0), 0);
            ASSERT_EQ(samples(*decoder, 0, 100000), std::vector<int>(wanted.begin() + place, wanted.end()));
        }
        for (const int frame : {4, 2, 6, 3}) {
            ASSERT_EQ(decoder->seekToFrame(frame, 0), 0);
            ASSERT_EQ(decoder->readFrame(0), 0);
            EXPECT_EQ(decoder->getFramePtr(0)->frameNr, frame);
        }
        EXPECT_EQ(decoder->seekToFrame(7, 0), QvStatus::endOfStream);
    }
    EXPECT_EQ(open(second, false)->nrFrames(0), 2);
    fs::remove_all(folder.path() / "c");
    EXPECT_THAT(faultOf(first), HasSubstr("the part after the clip 'B' is not here"));
    fs::rename(folder.path() / "a", folder.path() / "away");
    EXPECT_EQ(open(folder.path() / "away", false)->nrFrames(0), 3);
}

TEST_F(P2, WhatIsNoWholeClipIsRefused) {
    const fs::path card = folder.path() / "card";
    const std::string document = writeP2Clip(card, {.name = "A"});
    const fs::path contents = card / "CONTENTS";
    const std::string body = TempFolder::read(document);
    const struct {
        std::string from, to, reason;
    } documents[] = {
        {"<ClipName>A</ClipName>", "", "no ClipName"},
        {">A<", ">../CLIP/A<", "VIDEO/../CLIP/A.MXF is missing"},
        {"<Video>", "<Vide0>", "line"},
        {"<Audio/>", std::string("<Audio/><Audio/><Audio/><Audio/><Audio/><Audio/><Audio/><Audio/><Audio/>"),
         "AUDIO/A02.MXF is missing"},
    };
    for (const auto& c : documents) {
        std::string text = body;
        if (const auto at = text.find(c.from); at != std::string::npos) text.replace(at, c.from.size(), c.to);
        writeText(document, text);
        EXPECT_THAT(faultOf(document), HasSubstr(c.reason)) << c.to;
    }
    std::string crowd;
    for (int i = 0; i < 17; ++i) crowd += "<Audio/>";
    writeText(document, "<P2Main><ClipContent><ClipName>A</ClipName><EssenceList><Video/>" + crowd +
                            "</EssenceList></ClipContent></P2Main>");
    EXPECT_THAT(faultOf(document), HasSubstr("17 sounds, more than 16"));
    writeText(document, "<P2Main><ClipContent><ClipName>A</ClipName></ClipContent></P2Main>");
    EXPECT_THAT(faultOf(document), HasSubstr("has no picture"));

    writeP2Clip(card, {.name = "A", .previous = "B", .next = "B"});
    writeP2Clip(card, {.name = "B", .previous = "A", .next = "A"});
    EXPECT_THAT(faultOf(document), HasSubstr("in a circle"));
    writeP2Clip(card, {.name = "A", .next = "B"});
    writeP2Clip(card, {.name = "B", .samples = {1}, .previous = "A"});
    EXPECT_THAT(faultOf(document), HasSubstr("'B' has 1 sounds, not 2"));
    writeP2Clip(card, {.name = "B", .previous = "A"});
    writeText(contents / "AUDIO/B01.MXF", "audio 10 0 44100");
    EXPECT_THAT(faultOf(document), HasSubstr("its sample rate is 44100, not 48000"));
    writeText(contents / "VIDEO/B.MXF", "damaged");
    EXPECT_THAT(faultOf(document),
                AllOf(HasSubstr("B.MXF': Failed to open file"), HasSubstr("no such essence")));
    writeP2Clip(card, {.name = "C"});
    EXPECT_THAT(faultOf(card.string()), HasSubstr("2 clips: A.XML, C.XML; give one"));
}

// A copy of a card may lack the end of a file.
TEST_F(P2, EssenceThatIsShorterThanTheDocumentSaysIsTruncated) {
    const auto expected = [](P2Dec& decoder, int type, int stream, const char* key) {
        const Any value = decoder.getStreamParam(type, stream, key);
        return decoder.getStreamParam(type, stream, "truncated").isTrue() ? value.toInt64() : 0;
    };
    const std::vector<int> samples = {15360 - 1920, 15360 - 1921};
    const std::string document =
        writeP2Clip(folder.path(), {.name = "A", .frames = 5, .samples = samples, .duration = 8});
    const auto decoder = open(document);
    ASSERT_EQ(fault, "");
    EXPECT_EQ(expected(*decoder, qvVideoStream, 0, "framesExpected"), 8);
    EXPECT_EQ(expected(*decoder, qvAudioStream, 0, "samplesExpected"), 0) << "ends within the last frame";
    EXPECT_EQ(expected(*decoder, qvAudioStream, 1, "samplesExpected"), 15360);
    const std::string body = TempFolder::read(document);
    for (const char* unit : {"1/0", "0/25", "25", "1/25x", "-1/25", ""}) {
        std::string text = body;
        text.replace(text.find("1/25"), 4, unit);
        writeText(document, text);
        EXPECT_EQ(expected(*open(document), qvVideoStream, 0, "framesExpected"), 0) << unit;
    }
    writeP2Clip(folder.path(), {.name = "A", .frames = 8, .samples = {15360}, .duration = 8});
    EXPECT_EQ(expected(*open(document), qvVideoStream, 0, "framesExpected"), 0);
}

TEST_F(P2, ADocumentMayNameItsNamespaceInEachTag) {
    const std::string document = writeP2Clip(folder.path(), {.name = "A", .duration = 5});
    const std::string text = TempFolder::read(document);
    const std::string named = std::regex_replace(text, std::regex("<(/?)([A-Z])"), "<$1p2:$2");
    writeText(document, std::regex_replace(named, std::regex("xmlns="), "xmlns:p2="));
    const auto decoder = open(document);
    EXPECT_EQ(fault, "");
    EXPECT_EQ(decoder->nrStreams(qvAudioStream), 2);
    EXPECT_EQ(decoder->nrFrames(0), 5);
}

TEST_F(P2, SoundThatCantBeReadGivesItsReason) {
    const std::string document = writeP2Clip(folder.path(), {.name = "A"});
    writeText(folder.path() / "CONTENTS" / "AUDIO" / "A00.MXF", "audio 9600 -1");
    const auto decoder = open(document);
    ASSERT_EQ(fault, "");
    EXPECT_EQ(decoder->readSamples(100, 0), QvStatus::failed);
    EXPECT_THAT(decoder->errorDesc(), HasSubstr("no such samples"));
}

TEST_F(P2, ForeignDocumentsAreRefusedQuietly) {
    for (const char* text : {"<Preset/>", "<P2Main", "", "no document", "<a><P2Main/></a>"}) {
        const std::string name = folder.write("x.xml", text);
        qv_log()->clear();
        EXPECT_NE(faultOf(name), "") << text;
        AnyVector messages;
        qv_log()->getAll(messages);
        EXPECT_EQ(messages.size(), 0) << text;
    }
    EXPECT_THAT(faultOf(folder.path().string()), HasSubstr("no P2 clip"));
}

TEST(P2Without, ADecoderForItsEssenceTheClipIsRefused) {
    const EngineScope engine;
    const TempFolder folder;
    P2Dec decoder;
    decoder.init();
    decoder.setParam("filename", Any(writeP2Clip(folder.path(), {.name = "A"}).c_str()));
    EXPECT_NE(decoder.open(), 0);
    EXPECT_THAT(decoder.errorDesc(), HasSubstr("there is no decoder for MXF files here"));
}

}  // namespace
