#include "core/encode/qvencoder.h"

#include <climits>
#include <map>

#include "core/encode/qvmuxer.h"
#include "core/media/qvgeometry.h"
#include "tests/support/checks.h"
#include "tests/support/log_capture.h"
#include "tests/support/test_stream.h"

namespace {

class Video : public QvVideoEncoder {
  public:
    int setParam(const char* name, const Any& value) override {
        const std::string known = name;
        if (known != "vbr" && known != "vBitrate" && !known.ends_with("VBitrate"))
            return QvVideoEncoder::setParam(name, value);
        values[known] = value;
        return 0;
    }
    void getParam(const char* name, Any& value) const override {
        const auto found = values.find(name);
        if (found != values.end())
            value = found->second;
        else if (std::string(name) == "frameAspect")
            value = 1.5;
        else
            QvVideoEncoder::getParam(name, value);
    }
    using QvCodec::getParam;
    int open() override { return 0; }
    int close() override { return 5; }
    int writeFrame(QvFrame*) override { return 0; }
    QvFrame* lastFrame() override { return nullptr; }

    std::map<std::string, Any> values;
};

class Audio : public QvAudioEncoder {
  public:
    int open() override { return 0; }
    int close() override { return 0; }
    int writePcm(QvPcm*, int) override { return 0; }
};

class Muxer : public QvMuxer {
  public:
    int open() override { return 0; }
    int close() override { return 0; }
    QvBufStream* addStream(int, const AnyDict&) override { return nullptr; }
    void removeStreams(int) override {}
    void removeStream(int, int) override {}
    int nrStreams(int) const override { return 0; }
    QvBufStream* stream(int, int) const override { return nullptr; }
    int setStreamParam(int program, int stream, const char* name, const Any& value) override {
        if (std::string(name) == "unknown") return _raiseInvalidParam(name);
        return program + stream + value.toInt32();
    }
    void getStreamParams(int, int, AnyDict& params) const override { params = AnyDict("pid", 33); }
};

TEST(Encoder, KnowsItsStreamAndTheStreamIt) {
    TestStream first, second;
    Video video;
    video.init();
    EXPECT_EQ(video.attachOutStream(nullptr), QvStatus::invalidArgument);
    EXPECT_EQ(video.attachOutStream(&first), 0);
    EXPECT_EQ(video.attachOutStream(&second), 0);
    EXPECT_EQ(first.atachee(), nullptr) << "detached first";
    EXPECT_EQ(second.atachee(), &video);
    for (int i = 0; i < 2; ++i) EXPECT_EQ(video.detachOutStream(), 0);
    EXPECT_EQ(second.atachee(), nullptr);
    EXPECT_EQ(video.abort(), 5) << "closes unless there is an own";
}

TEST(Encoder, BitratesAreSpreadAndGathered) {
    const struct {
        int mode;
        Texts set;
    } rows[] = {{QvBitrate::cbr, {"vBitrate", "vbr"}},
                {QvBitrate::vbr, {"maxVBitrate", "minVBitrate", "vBitrate", "vbr"}},
                {QvBitrate::cqt, {"vbr"}}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.mode);
        Video video;
        video.init();
        EXPECT_EQ(video.setParam("bitrate", QvBitrate(row.mode, 4000000, 1000000, 8000000)), 0);
        Texts names;
        for (const auto& [name, value] : video.values) names.push_back(name);
        EXPECT_EQ(names, row.set);
        const QvBitrate back = video.getParam("bitrate").asBitrate();
        EXPECT_EQ(back.type, row.mode);
        EXPECT_EQ(back.target, row.mode == QvBitrate::cqt ? 0 : 4000000);
        EXPECT_EQ(back.max, row.mode == QvBitrate::vbr ? 8000000 : 0);
    }
    Video video;
    EXPECT_EQ(video.setParam("bitrate", 4000000), QvStatus::invalidParam);
    video.values = {{"vbr", 1}, {"vBitrate", 1e300}, {"minVBitrate", -1.9}, {"maxVBitrate", "x"}};
    const QvBitrate odd = video.getParam("bitrate").asBitrate();
    EXPECT_EQ(odd.target, INT_MAX);
    EXPECT_EQ(odd.min, -1);
    EXPECT_EQ(odd.max, 0);
}

TEST(Encoder, NamesThatEveryOneAcceptsAndTracesOnce) {
    Video video;
    Audio audio;
    Muxer muxer;
    const struct {
        QvCodec* codec;
        std::vector<const char*> names;
        int kind;
    } rows[] = {{&video, {"timecodeOffset", "extension", "adjustSettings", "getQualityStats"}, 7},
                {&audio, {"timecodeOffset", "smartRender", "adjustSettings", "tsAdjust"}, 6},
                {&muxer,
                 {"profile", "type", "pal", "filename", "settings", "bitrate", "adjustSettings",
                  "_totalFrames", "meta", "timecodeOffset"},
                 10}};
    LogCapture log;
    for (const auto& row : rows) {
        SCOPED_TRACE(row.kind);
        row.codec->init();
        for (const char* name : row.names) EXPECT_EQ(row.codec->setParam(name, 1), 0) << name;
        EXPECT_THROW(row.codec->setParam("unknown", 1), QvParamException);
        for (int kind = 0; kind < 20; ++kind)
            EXPECT_EQ(row.codec->getInterface(kind), kind == row.kind ? row.codec : nullptr) << kind;
    }
    EXPECT_EQ(log.count("setParam: adjustSettings"), 3);
    EXPECT_EQ(log.count("setParam: unknown"), 3);
    EXPECT_EQ(video.getParam("frameAspectEx"), Any(1.5));
    EXPECT_EQ(video.getParam("nrViews"), Any(1));
    EXPECT_EQ(video.getParam("multiViewPossible"), Any(0));
}

TEST(Muxer, StreamParameters) {
    Muxer muxer;
    muxer.init();
    EXPECT_EQ(muxer.setStreamParams(10, 1, AnyDict("a", 100, "unknown", 7, "z", 1000)), 11 + 100 + 11 + 1000);
    Any value;
    muxer.getStreamParam(1, 0, "pid", value);
    EXPECT_EQ(value, Any(33));
    muxer.getStreamParam(1, 0, "other", value);
    EXPECT_FALSE(value.isValid());
    EXPECT_EQ(static_cast<QvCodec&>(muxer).getParam("maxStreams"),
              Any(AnyDict("vids", 1, "auds", 1, "subs", 0, "total", 2)));
    EXPECT_EQ(muxer.flush(), 0);
}

}  // namespace
