#include "builtin/video/geometry/qvflipper.h"

#include "tests/builtin/video/effect_frames.h"

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
            EXPECT_TRUE(samplesOf(Opened({{"flip", 0}}).through(in)) == samplesOf(in));
        }
}
