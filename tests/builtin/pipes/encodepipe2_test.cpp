#include "builtin/pipes/encodepipe2.h"

#include "core/job/filtersstate.h"
#include "core/measure/qvgeometry.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"
#include "tests/support/checks.h"
#include "tests/support/failing_codecs.h"
#include "tests/support/pictures.h"

namespace {

struct EncodePipeTest : testing::Test {
    QvEncodePipe& pipe() { return *pipe_; }
    Any get(const char* name) { return static_cast<const QvCodec&>(*pipe_).getParam(name); }
    AnyDict state() {
        AnyDict stored;
        pipe_->store(stored);
        return stored;
    }
    // A status with the text that goes with it.
    std::string outcome(int status) { return std::to_string(status) + " " + pipe_->errorDesc(); }

    FailingOutputs outputs_;
    std::unique_ptr<QvEncodePipe> pipe_{QvEncodePipe::create()};
};

const AnyDict cropper("name", "cropper", "_on", 1);

TEST_F(EncodePipeTest, ParametersFindTheirMember) {
    for (const auto& [name, value] : {std::pair("video0/width", 640),
                                      {"audio0/channels", 6},
                                      {"muxer/splitAudio", 1},
                                      {"sink/bufsize", 4096}}) {
        EXPECT_EQ(pipe().setParam(name, value), 0);
        EXPECT_EQ(get(name), Any(value));
    }
    for (const char* wrong : {"video1/width", "video0/nonsense", "muxer/nonsense", "sink/nonsense", "video0"})
        EXPECT_THROW(pipe().setParam(wrong, 1), QvParamException) << wrong;
    EXPECT_EQ(pipe().setParam("height", 480), 0) << "to all members that know it";
    EXPECT_EQ(get("video0/height"), Any(480));
    outputs_.params = AnyDict("rawmux.videoNecessary", 1);
    EXPECT_EQ(get("videoNecessary"),
              Any("[Default exporter] Multiplexer rawmux requires video stream to be selected"));
}

TEST_F(EncodePipeTest, WhatCanNotBeIsToldAndChangesNothing) {
    const AnyDict before = state();
    const AnyDict wrong("name", "rawvenc", "settingsDict", AnyDict("type", 12345));
    const std::pair<std::function<int()>, const char*> refused[] = {
        {[&] { return pipe().setParam("video0/width", -1); }, "-5 Invalid frame size -1x576"},
        {[&] { return pipe().setParam("preset", "x"); }, "-12 Invalid value type for 'preset'"},
        {[&] { return pipe().addAudioStream("nosuch"); },
         "-1 Cannot add stream: encoder 'nosuch' not loaded"},
        {[&] { return pipe().addAudioStream("dummyaenc"); },
         "-1 Encoder dummyaenc not compatible with currently selected preset RAW/YUV and/or muxer rawmux."},
        {[&] { return pipe().setMuxer("nosuch"); }, "-1 setMuxer: muxer 'nosuch' not available"},
        {[&] { return pipe().setMuxer("rawvenc"); }, "-1 setMuxer: 'rawvenc' not allowed in current preset"},
        {[&] { return pipe().setSink("rawmux"); }, "-1 [EncodePipe2] setSink: Invalid module rawmux"},
        {[&] { return pipe().setCodec(qvVideoStream, 0, "dummyaenc", AnyDict()); },
         "-1 Video encoder 'dummyaenc' not compatible with currently selectedpreset 'RAW/YUV' and/or muxer "
         "'rawmux'"},
        {[&] { return pipe().applyPreset(0x2010001, 0); }, "-13 Invalid preset #33619969"},
    };
    for (const auto& [act, text] : refused) EXPECT_EQ(outcome(act()), text);
    EXPECT_LT(pipe().addVideoStream(AnyDict("codec", wrong)), 0) << "settings that can't be";
    EXPECT_EQ(state(), before);
    outputs_.params = AnyDict("rawmux.maxStreams", AnyDict("vids", 1, "auds", 1, "subs", 0, "total", 9));
    EXPECT_EQ(outcome(pipe().addVideoStream("rawvenc")),
              "-6 No (more) video streams allowed with currentlyselected preset / muxer.");
    EXPECT_EQ(pipe().addAudioStream("rawaenc"), QvStatus::noStream);
}

TEST_F(EncodePipeTest, AddingAndRemovingKeepsTheOthersInPlace) {
    EXPECT_EQ(pipe().addVideoStream("rawvenc"), 1);
    EXPECT_EQ(pipe().addVideoStream(Any()), 2);
    const AnyDict settings("name", "rawvenc", "settingsDict", AnyDict("width", 320, "height", 200));
    EXPECT_EQ(pipe().addVideoStream(AnyDict("codec", settings, "stream", AnyDict())), 3);
    EXPECT_EQ(get("video3/width"), Any(320));
    EXPECT_EQ(pipe().addSubpicStream(Any()), 0) << "a stream without encoder";
    pipe().removeVideoStream(1);
    EXPECT_EQ(pipe().nrVideoStreams(), 3);
    EXPECT_EQ(get("video2/width"), Any(320));
    EXPECT_EQ(pipe().getMuxer()->nrStreams(qvVideoStream), 3);
    EXPECT_EQ(pipe().getMuxer()->stream(qvVideoStream, 2)->atachee(), pipe().videoEncoder(2));
    pipe().removeStreams(qvAudioStream);
    EXPECT_EQ(pipe().getMuxer()->nrStreams(0), 4);
}

TEST_F(EncodePipeTest, NothingChangesWhileOpen) {
    TempFolder folder;
    pipe().addVideoStream("rawvenc");
    pipe().setParam("video0/framerate", QvFramerate(50.0));
    pipe().setFilename(Any(folder.file("x.raw").c_str()));
    for (int i = 0; i < 2; ++i) ASSERT_EQ(pipe().open(), 0);
    EXPECT_EQ(get("video1/framerate").asFramerate(), QvFramerate(50.0)) << "the first one's goes to all";
    for (const int result :
         {pipe().addVideoStream("rawvenc"), pipe().setCodec(qvVideoStream, 0, "rawvenc", AnyDict()),
          pipe().setMuxer("rawmux"), pipe().setSink("nullsink"), pipe().applyPreset(QvProfile::raw, 0),
          pipe().restore(state())})
        EXPECT_EQ(result, QvStatus::illegalState);
    pipe().clearStreams();
    EXPECT_EQ(pipe().nrStreams(), 3);
    EXPECT_EQ(pipe().close(), 0);
}

TEST_F(EncodePipeTest, StateRoundTrip) {
    pipe().clearStreams();
    pipe().addAudioStream("rawaenc");
    pipe().addVideoStream("rawvenc");
    pipe().setParam("video0", AnyDict("width", 352, "height", 288, "framerate", QvFramerate(30.0)));
    pipe().setParam("audio0/channels", 5);
    pipe().setParam("muxer/splitAudio", 1);
    pipe().setFilename("some.file");
    pipe().setCreateOutFolder(true);
    FiltersState filters;
    filters.setFilter("cropper", cropper);
    pipe().setFilters(qvVideoStream, 0, filters);
    const AnyDict stored = state();
    EXPECT_EQ(stored.get("name"), "encpipe");
    EXPECT_EQ(*stored.descendant("streams.1.codecInfo.width"), Any(352));
    EXPECT_EQ(*stored.descendant("streams.0.type"), Any(2));

    pipe_.reset(QvEncodePipe::create());
    ASSERT_EQ(pipe().restore(stored), 0) << pipe().errorDesc();
    EXPECT_EQ(state(), stored);

    // The older form of the streams.
    AnyDict older = stored;
    older.set("streams", AnyDict("vids", AnyVector(*stored.descendant("streams.1")), "auds",
                                 AnyVector(*stored.descendant("streams.0"))));
    ASSERT_EQ(pipe().restore(older), 0);
    EXPECT_EQ(pipe().streamAt(0)->type, qvVideoStream);
    EXPECT_EQ(get("audio0/channels"), Any(5));
}

TEST_F(EncodePipeTest, BadStatesAreRefused) {
    const AnyDict good = state();
    const auto stream = [](int type, const char* codec) {
        return AnyVector(Any(AnyDict("type", type, "codec", AnyDict("name", codec))));
    };
    for (const auto& [key, value, result] :  // 1: an assertion
         {std::tuple<const char*, Any, int>("name", "other", 1),
          {"profile", 0x2010001, -13},
          {"muxer", AnyDict("x", 1), -1},
          {"streams", AnyVector(Any(AnyDict("type", 1))), 1},
          {"streams", stream(9, "rawvenc"), 1},
          {"streams", 7, 0},
          {"filename", 7, 0}}) {
        SCOPED_TRACE(key);
        AnyDict bad = good;
        bad.set(key, value);
        int got = 1;
        EXPECT_EQ(failureOf([&] { got = pipe().restore(bad); }) == "no failure", result != 1);
        EXPECT_EQ(got, result);
        EXPECT_TRUE(result == 0 || *pipe().errorDesc());
        ASSERT_EQ(pipe().restore(good), 0) << "whatever came before";
    }
    const AnyDict old("_preset", QvProfile::raw, "muxer", AnyDict("name", "rawmux"), "video0",
                      AnyDict("codec", "rawvenc", "width", 96), "_userProfile",
                      AnyDict("name", "mine", "profile", QvProfile::raw));
    ASSERT_EQ(pipe().restore(old), 0);
    EXPECT_STREQ(pipe().activePreset()->name(), "mine");
    EXPECT_EQ(pipe().nrStreams(), 1);
    EXPECT_EQ(get("video0/width"), Any(96));
    EXPECT_THROW(pipe().restore(AnyDict("muxer", 1)), QvAssertFailure);
}

TEST_F(EncodePipeTest, AnalysisWithoutOutput) {
    TempFolder folder;
    pipe().setFilename(Any(folder.file("nothing").c_str()));
    pipe().clearStreams();
    ASSERT_EQ(pipe().setMuxer("nullmux"), 0);
    EXPECT_STREQ(pipe().sink()->name(), "nullsink");
    EXPECT_EQ(pipe().setParam("sink/bufsize", 4096), 0);
    EXPECT_THROW(pipe().setParam("sink/nonsense", 1), QvParamException);
    EXPECT_EQ(static_cast<const QvCodec&>(*pipe().getMuxer()).getParam("maxStreams"),
              Any(AnyDict("vids", 99, "auds", 99, "subs", 99, "total", 99)));
    ASSERT_EQ(pipe().addVideoStream("rawvenc") + pipe().addAudioStream("rawaenc"), 0);
    pipe().setParam("video0", AnyDict("type", static_cast<int>(QvFourcc::BGR4), "width", 64, "height", 48));
    QvFrame frame = makePicture(QvFourcc::BGR4, 64, 48);
    QvPcm pcm;
    fillSound(pcm, 48000, 2, 2, 48000);
    for (int run = 0; run < 2; ++run) {
        ASSERT_EQ(pipe().open(), 0) << pipe().errorDesc();
        for (int i = 0; i < 5; ++i) ASSERT_EQ(pipe().writeFrame(&frame, 0) + pipe().writePcm(&pcm, 0), 0);
        EXPECT_EQ(pipe().close(), 0);
    }
    EXPECT_TRUE(std::filesystem::is_empty(folder.path()));
}

TEST_F(EncodePipeTest, CodecExchangeBringsItsSettingsBack) {
    pipe().setParam("video0", AnyDict("width", 320, "height", 240));
    ASSERT_EQ(pipe().setCodec(qvVideoStream, 0, "rawvenc", AnyDict()), 0);
    EXPECT_EQ(get("video0/width"), Any(320));
    ASSERT_EQ(pipe().setCodec(qvVideoStream, 0, "rawvenc", AnyDict("width", 64, "unknown", 3)), 0);
    EXPECT_EQ(get("video0/width"), Any(64));
    EXPECT_EQ(get("video0/height"), Any(576)) << "given parameters come on top of a fresh encoder";
}

TEST_F(EncodePipeTest, UserPresets) {
    pipe().setParam("video0", AnyDict("width", 160, "height", 120));
    QvPreset preset(QvProfile::raw, "mine");
    pipe().storePreset(preset);
    preset.set("name", "mine");
    pipe().setParam("video0/width", 64);
    ASSERT_EQ(pipe().applyPreset(preset, 0), 0) << pipe().errorDesc();
    EXPECT_EQ(get("video0/width"), Any(160));
    EXPECT_STREQ(pipe().activePreset()->name(), "mine");
    EXPECT_EQ(pipe().addVideoStream(Any()), 1);
    EXPECT_EQ(get("video1/width"), Any(160)) << "a further stream starts like the preset's last one";

    EXPECT_TRUE(outcome(pipe().applyPreset(QvPreset(0x2010001, "gone"), 0))
                    .starts_with("-13 Cannot apply preset 'gone', base profile "));

    FiltersState filters;
    filters.setFilter("cropper", cropper);
    ASSERT_EQ(pipe().applyPreset(QvProfile::raw, 0), 0);
    for (const int keep : {1, 0}) {
        pipe().setFilters(qvVideoStream, 0, filters);
        ASSERT_EQ(pipe().applyPreset(QvProfile::raw, keep), 0);
        EXPECT_EQ(pipe().filters(qvVideoStream, 0).empty(), keep == 0);
    }
}

TEST_F(EncodePipeTest, MakesTheFolderOfTheOutput) {
    TempFolder folder;
    const auto name = folder.file("a/b/c.raw");
    pipe().setFilename(Any(name.c_str()));
    EXPECT_NE(pipe().open(), 0);
    pipe().setCreateOutFolder(true);
    LogCapture log;
    EXPECT_EQ(pipe().open(), 0) << pipe().errorDesc();
    EXPECT_TRUE(log.contains("Created folder", QvLogMask::info));
    EXPECT_EQ(pipe().close(), 0);
    EXPECT_TRUE(std::filesystem::exists(name));
    pipe().setFilename(Any((name + "/d/e.raw").c_str()));
    EXPECT_NE(pipe().open(), 0);
    EXPECT_TRUE(log.contains("Failed to create folder", QvLogMask::error));
}

}  // namespace
