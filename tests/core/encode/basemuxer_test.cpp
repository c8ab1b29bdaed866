#include "core/encode/basemuxer.h"

#include "tests/support/checks.h"
#include "tests/support/test_stream.h"

namespace {

class Muxer : public BaseMuxer {
  public:
    int open() override { return 0; }
    int close() override { return 0; }
    QvBufStream* addStream(int type, const AnyDict&) override {
        return keep(type, std::make_unique<Counted>());
    }
    struct Counted : TestStream {
        Counted() { ++alive; }
        ~Counted() override { --alive; }
        static inline int alive = 0;
    };
};

TEST(BaseMuxer, AnswersForOneProgramOfOnePictureAndSound) {
    const Muxer muxer;
    EXPECT_EQ(muxer.QvCodec::getParam("programsSupported"), Any(0));
    EXPECT_EQ(muxer.QvCodec::getParam("maxStreams"),
              Any(AnyDict("vids", 1, "auds", 1, "subs", 0, "total", 2)));
}

TEST(BaseMuxer, KeepsOneListForEachType) {
    {
        Muxer muxer;
        muxer.addStream(qvVideoStream, AnyDict());
        auto* v1 = muxer.addStream(qvVideoStream, AnyDict());
        muxer.addStream(qvAudioStream, AnyDict());
        muxer.addStream(qvSubpicStream, AnyDict());
        for (const auto& [type, count] : {std::pair(0, 4), {255, 4}, {1, 2}, {2, 1}, {4, 1}, {3, 0}, {-1, 0}})
            EXPECT_EQ(muxer.nrStreams(type), count) << type;
        EXPECT_EQ(muxer.stream(qvVideoStream, 1), v1);
        muxer.removeStream(1, 0);
        EXPECT_EQ(muxer.stream(qvVideoStream, 0), v1);
        muxer.removeStreams(2 | 4);
        EXPECT_EQ(muxer.nrStreams(0), 1);
        EXPECT_EQ(Muxer::Counted::alive, 1);
        muxer.removeStreams(255);
        EXPECT_EQ(Muxer::Counted::alive, 0);
        muxer.addStream(qvAudioStream, AnyDict());
    }
    EXPECT_EQ(Muxer::Counted::alive, 0);
}

}  // namespace
