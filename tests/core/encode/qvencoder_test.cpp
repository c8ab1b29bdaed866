#include "core/encode/qvencoder.h"

#include <map>

#include "core/measure/qvgeometry.h"
#include "tests/support/checks.h"
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

}  // namespace
