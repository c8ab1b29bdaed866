#include "builtin/pipes/encodepipe2.h"

#include <filesystem>

#include "core/filter/filtersstate.h"
#include "core/media/qvgeometry.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"
#include "tests/support/checks.h"
#include "tests/support/failing_codecs.h"
#include "tests/support/log_capture.h"
#include "tests/support/pictures.h"
#include "tests/support/temp_folder.h"

namespace {

class EncodePipeTest : public testing::Test {
  protected:
    QvEncodePipe& pipe() { return *pipe_; }
    Any get(const char* name) { return static_cast<const QvCodec&>(*pipe_).getParam(name); }
    AnyDict state() {
        AnyDict stored;
        pipe_->store(stored);
        return stored;
    }

    FailingOutputs outputs_;
    std::unique_ptr<QvEncodePipe> pipe_{QvEncodePipe::create()};
};

TEST_F(EncodePipeTest, StartsWithTheFirstPreset) {
    ASSERT_NE(pipe_, nullptr);
    EXPECT_STREQ(pipe().activePreset()->name(), "RAW/YUV");
    EXPECT_STREQ(pipe().getMuxer()->name(), "rawmux");
    EXPECT_STREQ(pipe().sink()->name(), "filesink");
    EXPECT_EQ(pipe().nrVideoStreams(), 1);
    EXPECT_EQ(pipe().nrAudioStreams(), 1);
    EXPECT_EQ(pipe().streamNr(pipe().streamAt(1)), 0);
    EXPECT_EQ(pipe().indexOf(pipe().audioStream(0)), 1);
    EXPECT_EQ(pipe().init(), 0);
}

TEST_F(EncodePipeTest, ParametersFindTheirMember) {
    for (const auto& [name, value] : {std::pair("video0/width", 640),
                                      {"audio0/channels", 6},
                                      {"muxer/splitAudio", 1},
                                      {"sink/bufsize", 4096}}) {
        EXPECT_EQ(pipe().setParam(name, value), 0);
        EXPECT_EQ(get(name), Any(value));
    }
    for (const char* nobody : {"video/width", "videox/width", "audio00001/x"})
        EXPECT_EQ(pipe().setParam(nobody, 1), 0) << "no member's name, and known to nobody";
    for (const char* wrong : {"video1/width", "video0/nonsense", "muxer/nonsense", "sink/nonsense", "video0"})
        EXPECT_THROW(pipe().setParam(wrong, 1), QvParamException) << wrong;
    EXPECT_FALSE(get("video7/width").isValid());
    EXPECT_EQ(pipe().setParam("height", 480), 0) << "to whoever knows it";
    EXPECT_EQ(get("video0/height"), Any(480));
    EXPECT_EQ(pipe().setParam("video0/width", -1), QvStatus::invalidParam);
    EXPECT_STREQ(pipe().errorDesc(), "Invalid frame size -1x480");
}

TEST_F(EncodePipeTest, ObsoleteAndDeprecatedNames) {
    for (const char* name : {"userProfile", "video", "audio"})
        EXPECT_THROW(pipe().setParam(name, 1), QvAssertFailure) << name;
    for (const char* name : {"videoAvailable", "audioAvailable"})
        EXPECT_THROW(get(name), QvAssertFailure) << name;
    EXPECT_EQ(get("videoName"), Any("rawvenc"));
    EXPECT_EQ(get("audioName"), Any("rawaenc"));
    EXPECT_EQ(pipe().setParam("preset", "x"), QvStatus::invalidArgument);
    EXPECT_STREQ(pipe().errorDesc(), "Invalid value type for 'preset'");
    EXPECT_EQ(pipe().setParam("preset", QvProfile::raw), 0);
    EXPECT_EQ(pipe().setParam("muxerName", "rawmux"), 0);
    EXPECT_EQ(get("profile"), Any(QvProfile::raw));
    EXPECT_EQ(get("extension"), Any("raw"));
    EXPECT_EQ(get("videoNecessary"), Any(0));
    outputs_.params = AnyDict("rawmux.videoNecessary", 1);
    EXPECT_EQ(get("videoNecessary"),
              Any("[Default exporter] Multiplexer rawmux requires video stream to be selected"));
}

TEST_F(EncodePipeTest, AddStreamArguments) {
    EXPECT_EQ(pipe().addVideoStream("rawvenc"), 1);
    EXPECT_EQ(pipe().addVideoStream(Any()), 2);
    const AnyDict settings("name", "rawvenc", "settingsDict", AnyDict("width", 320, "height", 200));
    EXPECT_EQ(pipe().addVideoStream(AnyDict("codec", settings, "stream", AnyDict())), 3);
    EXPECT_EQ(get("video3/width"), Any(320));
    EXPECT_EQ(pipe().addAudioStream("nosuch"), -1);
    EXPECT_STREQ(pipe().errorDesc(), "Cannot add stream: encoder 'nosuch' not loaded");
    EXPECT_EQ(pipe().addAudioStream("dummyaenc"), -1);
    EXPECT_STREQ(
        pipe().errorDesc(),
        "Encoder dummyaenc not compatible with currently selected preset RAW/YUV and/or muxer rawmux.");
    EXPECT_THROW(pipe().addAudioStream("rawvenc"), QvAssertFailure) << "of the other kind";
    EXPECT_EQ(pipe().addSubpicStream(Any()), 0) << "a stream without encoder";
    EXPECT_EQ(pipe().encoder(qvSubpicStream, 0), nullptr);
    for (const Any& bad : {Any(AnyDict("codec", "rawvenc", "colour", 1)),
                           Any(AnyDict("codec", AnyDict("width", 1))), Any(AnyDict("codec", 3))})
        EXPECT_THROW(pipe().addVideoStream(bad), QvAssertFailure);
    EXPECT_THROW(pipe().addStream(3, Any()), QvAssertFailure);
    const int before = pipe().nrStreams();
    AnyDict wrong = settings;
    wrong.set("settingsDict", AnyDict("type", 12345));
    EXPECT_LT(pipe().addVideoStream(AnyDict("codec", wrong)), 0) << "settings that can't be";
    EXPECT_EQ(pipe().nrStreams(), before);
    outputs_.params = AnyDict("rawmux.maxStreams", AnyDict("vids", 4, "auds", 1, "subs", 0, "total", 9));
    EXPECT_EQ(pipe().addVideoStream("rawvenc"), QvStatus::noStream);
    EXPECT_STREQ(pipe().errorDesc(),
                 "No (more) video streams allowed with currentlyselected preset / muxer.");
    EXPECT_EQ(pipe().addAudioStream("rawaenc"), QvStatus::noStream);
}

TEST_F(EncodePipeTest, RemovingKeepsTheOthersInPlace) {
    pipe().clearStreams();
    for (int i = 0; i < 3; ++i) {
        pipe().addVideoStream("rawvenc");
        pipe().addAudioStream("rawaenc");
        pipe().setParam(Any::sprintf("video%d/width", i).asString(), 100 + 2 * i);
    }
    LogCapture log;
    pipe().removeVideoStream(1);
    EXPECT_TRUE(log.contains("Removed video #1", QvLogMask::debug));
    EXPECT_EQ(pipe().nrVideoStreams(), 2);
    EXPECT_EQ(get("video1/width"), Any(104));
    EXPECT_EQ(pipe().getMuxer()->nrStreams(qvVideoStream), 2);
    EXPECT_EQ(pipe().getMuxer()->stream(qvVideoStream, 1)->atachee(), pipe().videoEncoder(1));
    pipe().removeStreams(qvAudioStream);
    EXPECT_EQ(pipe().nrStreams(), 2);
    EXPECT_EQ(pipe().getMuxer()->nrStreams(0), 2);
    EXPECT_THROW(pipe().removeStream(nullptr), QvAssertFailure);
    EXPECT_THROW(pipe().removeAudioStream(0), QvAssertFailure);
}

TEST_F(EncodePipeTest, NothingChangesWhileOpen) {
    TempFolder folder;
    pipe().addVideoStream("rawvenc");
    pipe().setParam("video0/framerate", QvFramerate(50.0));
    pipe().setFilename(Any(folder.file("x.raw").c_str()));
    for (int i = 0; i < 2; ++i) ASSERT_EQ(pipe().open(), 0);
    EXPECT_EQ(get("video1/framerate").asFramerate(), QvFramerate(50.0))
        << "the first one's goes to the others";
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
    filters.setFilter("cropper", AnyDict("name", "cropper", "_on", 1));
    pipe().setFilters(qvVideoStream, 0, filters);
    const AnyDict stored = state();
    EXPECT_EQ(stored.get("name"), "encpipe");
    EXPECT_EQ(*stored.descendant("streams.1.codecInfo.width"), Any(352));
    EXPECT_EQ(*stored.descendant("streams.0.type"), Any(2));

    std::unique_ptr<QvEncodePipe> other(QvEncodePipe::create());
    ASSERT_EQ(other->restore(stored), 0) << other->errorDesc();
    AnyDict again;
    other->store(again);
    EXPECT_EQ(again, stored);

    // The older form of the streams.
    AnyDict older = stored;
    older.set("streams", AnyDict("vids", AnyVector(*stored.descendant("streams.1")), "auds",
                                 AnyVector(*stored.descendant("streams.0"))));
    ASSERT_EQ(other->restore(older), 0);
    EXPECT_EQ(other->streamAt(0)->type, qvVideoStream);
    EXPECT_EQ(static_cast<QvCodec&>(*other).getParam("audio0/channels"), Any(5));
}

TEST_F(EncodePipeTest, BadStatesAreRefused) {
    const AnyDict good = state();
    const auto stream = [](int type, const char* codec) {
        return AnyVector(Any(AnyDict("type", type, "codec", AnyDict("name", codec))));
    };
    const struct {
        const char* key;
        Any value;
        int result;  // 1: an assertion
    } rows[] = {
        {"name", "other", 1},
        {"profile", "RAW", 1},
        {"profile", 0x2010001, -13},
        {"muxer", AnyDict("x", 1), -1},
        {"muxer", AnyDict("name", "nosuch"), -1},
        {"streams", AnyVector(Any(AnyDict("type", 1))), 1},
        {"streams", stream(9, "rawvenc"), 1},
        {"streams", stream(1, "zz"), -1},
        {"streams", stream(2, "rawvenc"), 1},
        {"streams", 7, 0},
        {"filename", 7, 0},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.key);
        AnyDict bad = good;
        bad.set(row.key, row.value);
        if (row.result == 1) {
            EXPECT_THROW(pipe().restore(bad), QvAssertFailure);
        } else {
            EXPECT_EQ(pipe().restore(bad), row.result);
            EXPECT_TRUE(row.result == 0 || *pipe().errorDesc());
        }
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

TEST_F(EncodePipeTest, MuxerExchangeKeepsStreamsAndTheirSettings) {
    pipe().setParam("video0", AnyDict("width", 320, "height", 240));
    pipe().setParam("muxer/splitAudio", 1);
    pipe().setFilename("kept.raw");
    pipe().audioStream(0)->setEnabled(false);
    const AnyDict before = state();
    ASSERT_EQ(pipe().setMuxer("rawmux"), 0);
    EXPECT_EQ(state(), before) << "the multiplexer's own settings come back too";
    EXPECT_FALSE(pipe().audioStream(0)->enabled());
    EXPECT_EQ(get("filename"), Any("kept.raw"));
    EXPECT_EQ(pipe().setMuxer("nosuch"), -1);
    EXPECT_STREQ(pipe().errorDesc(), "setMuxer: muxer 'nosuch' not available");
    EXPECT_EQ(pipe().setMuxer("rawvenc"), -1);
    EXPECT_STREQ(pipe().errorDesc(), "setMuxer: 'rawvenc' not allowed in current preset");
    EXPECT_EQ(state(), before);
    EXPECT_THROW(pipe().setMuxer("nullmux"), QvAssertFailure);
    EXPECT_EQ(pipe().setSink("rawmux"), -1);
    EXPECT_STREQ(pipe().errorDesc(), "[EncodePipe2] setSink: Invalid module rawmux");
    EXPECT_THROW(pipe().setSink(""), QvAssertFailure);
    EXPECT_EQ(state(), before);
}

TEST_F(EncodePipeTest, AnalysisWithoutOutput) {
    TempFolder folder;
    pipe().setFilename(Any(folder.file("nothing").c_str()));
    pipe().clearStreams();
    ASSERT_EQ(pipe().setMuxer("nullmux"), 0);
    EXPECT_STREQ(pipe().sink()->name(), "nullsink");
    ASSERT_EQ(pipe().addVideoStream("rawvenc") + pipe().addAudioStream("rawaenc"), 0);
    pipe().setParam("video0",
                    AnyDict("type", static_cast<int>(QvFourcc::BGR4), "width", 1920, "height", 1080));
    QvFrame frame = makePicture(QvFourcc::BGR4, 1920, 1080);
    QvPcm pcm;
    fillSound(pcm, 48000, 2, 2, 48000);
    for (int run = 0; run < 2; ++run) {
        ASSERT_EQ(pipe().open(), 0) << pipe().errorDesc();
        for (int i = 0; i < 5; ++i) {
            ASSERT_EQ(pipe().writeFrame(&frame, 0), 0);
            ASSERT_EQ(pipe().writePcm(&pcm, 0), 0);
        }
        EXPECT_EQ(pipe().close(), 0);
    }
    EXPECT_TRUE(std::filesystem::is_empty(folder.path()));
    pipe().videoStream(0)->setEnabled(false);
    pipe().audioStream(0)->setEnabled(false);
    EXPECT_THROW(pipe().open(), QvAssertFailure);
}

TEST_F(EncodePipeTest, CodecExchangeBringsItsSettingsBack) {
    pipe().setParam("video0", AnyDict("width", 320, "height", 240));
    const auto* before = pipe().videoEncoder(0);
    const auto* bitstream = pipe().videoStream(0)->bitstream;
    ASSERT_EQ(pipe().setCodec(qvVideoStream, 0, "rawvenc", AnyDict()), 0);
    EXPECT_NE(pipe().videoEncoder(0), before);
    EXPECT_EQ(pipe().videoStream(0)->bitstream, bitstream);
    EXPECT_EQ(bitstream->atachee(), pipe().videoEncoder(0));
    EXPECT_EQ(get("video0/width"), Any(320));
    ASSERT_EQ(pipe().setCodec(qvVideoStream, 0, "rawvenc", AnyDict("width", 64, "unknown", 3)), 0);
    EXPECT_EQ(get("video0/width"), Any(64));
    EXPECT_EQ(get("video0/height"), Any(576)) << "given parameters come on top of a fresh encoder";
    EXPECT_EQ(pipe().setCodec(qvVideoStream, 0, "dummyaenc", AnyDict()), -1);
    EXPECT_STREQ(pipe().errorDesc(),
                 "Video encoder 'dummyaenc' not compatible with currently selectedpreset 'RAW/YUV' and/or "
                 "muxer 'rawmux'");
    EXPECT_THROW(pipe().setCodec(qvVideoStream, 1, "rawvenc", AnyDict()), QvAssertFailure);
    EXPECT_THROW(pipe().setCodec(qvVideoStream, 0, "rawvenc", AnyDict("profile", 5)), QvAssertFailure);
}

TEST_F(EncodePipeTest, UserPresets) {
    pipe().setParam("video0", AnyDict("width", 160, "height", 120));
    QvPreset preset(QvProfile::raw, "mine");
    pipe().storePreset(preset);
    preset.set("name", "mine");
    EXPECT_EQ(preset.get("__class__"), "Preset");
    pipe().setParam("video0/width", 64);
    ASSERT_EQ(pipe().applyPreset(preset, 0), 0) << pipe().errorDesc();
    EXPECT_EQ(get("video0/width"), Any(160));
    EXPECT_STREQ(pipe().activePreset()->name(), "mine");
    EXPECT_EQ(pipe().addVideoStream(Any()), 1);
    EXPECT_EQ(get("video1/width"), Any(160)) << "a further stream starts like the preset's last one";

    AnyDict loose("name", "loose", "profile", QvProfile::raw, "custom", 1);
    loose.set("streams",
              AnyVector(Any(AnyDict("type", 2, "codec", AnyDict("name", "rawaenc", "channels", 6))),
                        Any(AnyDict("type", 4))));
    LogCapture log;
    EXPECT_EQ(pipe().applyPreset(QvPreset(loose), 0), 0);
    EXPECT_TRUE(
        log.contains("[EncodePipe] Apply preset: not adding subpic#0 due to muxer/preset limitation"));
    EXPECT_EQ(pipe().nrStreams(), 1);
    EXPECT_EQ(get("audio0/channels"), Any(6));

    EXPECT_EQ(pipe().applyPreset(QvPreset(0x2010001, "gone"), 0), QvStatus::invalidStructure);
    EXPECT_EQ(std::string(pipe().errorDesc()).rfind("Cannot apply preset 'gone', base profile ", 0), 0u);
    EXPECT_EQ(pipe().applyPreset(0x2010001, 0), QvStatus::invalidStructure);
    EXPECT_STREQ(pipe().errorDesc(), "Invalid preset #33619969");

    FiltersState filters;
    filters.setFilter("flipper", AnyDict("name", "flipper", "_on", 1));
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
