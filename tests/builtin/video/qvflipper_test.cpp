#include "builtin/video/qvflipper.h"

#include "tests/builtin/video/effect_frames.h"
#include "tests/support/log_capture.h"

namespace {

using Opened = OpenedEffect<QvFlipper>;

}  // namespace

TEST(QvFlipper, TurnsAllRowsOfEveryFormat) {
    for (const auto& format : qvPixelFormats())
        for (const int height : {6, 7}) {
            QvFrame in = makePicture(format.fourcc, 10, height);
            in.framerate.setInterlaced(1);
            in.setTimestamp(5);
            Opened flipper;
            const QvFrame& out = flipper.through(in);
            for (int p = 0; p < in.planes(); ++p)
                for (int y = 0, last = sampleRows(in, p) - 1; y <= last; ++y)
                    EXPECT_EQ(std::memcmp(rowOf(out, p, y), rowOf(in, p, last - y),
                                          static_cast<size_t>(in.stride(p))),
                              0)
                        << fourccName(format.fourcc) << p << y;
            EXPECT_EQ(out.framerate.interlaced(), 2);
            EXPECT_EQ(out.getTimestamp(), 5);
            sameInPlace(Opened(), Opened(), in);
            sameInPlace(Opened({{"flip", 0}}), Opened({{"flip", 0}}), in);
        }
}

TEST(QvFlipper, StandsAsideAndIsStored) {
    QvFrame in = makePicture(QvFourcc::I422, 8, 6);
    Opened off({{"flip", 0}});
    EXPECT_EQ(samplesOf(off.through(in)), samplesOf(in));
    AnyDict state;
    off.store(state);
    EXPECT_EQ(state.get("state").asDict().get("flip"), Any(0));
    Opened other;
    EXPECT_EQ(other.restore(state), 0);
    EXPECT_EQ(other.getParam("flip"), Any(0));
    for (const auto& [key, value] : {std::pair<const char*, Any>{"name", "cropper"}, {"state", 7}}) {
        AnyDict wrong = state;
        wrong.set(key, value);
        const LogCapture log;
        EXPECT_EQ(other.restore(wrong), -1);
        EXPECT_TRUE(log.contains("[flipper] restore - invalid dict"));
    }
}
