#include "builtin/video/qvbobber.h"

#include <algorithm>
#include <functional>

#include "tests/builtin/kernels/targets.h"
#include "tests/support/checks.h"
#include "tests/support/pictures.h"

namespace {

using Scene = std::function<int(int x, int y, int field)>;  // 0 to 255; fields count up, two a frame

// Frame n of a scene as GRAY, shot interlaced.
QvFrame shot(const Scene& scene, int n, int order = 1) {
    QvFrame frame;
    frame.init(QvFourcc::GRAY, 40, 24);
    for (int y = 0; y < 24; ++y)
        for (int x = 0; x < 40; ++x)
            *frame.pixelPtr(x, y) =
                static_cast<unsigned char>(scene(x, y, 2 * n + (y % 2 == order - 1 ? 0 : 1)));
    frame.framerate = QvFramerate(QvRatio(30000, 1001), order);
    frame.frameNr = 50 + n;
    return frame;
}

struct Bob : QvBobber {
    explicit Bob(int alpha = 255) {
        QvBobber::init();
        setParam("alpha", alpha);
        EXPECT_EQ(open(), 0);
    }
    // The largest error against the scene as it was, over the frames from the third on.
    int worst(const Scene& scene, int order) {
        int most = 0;
        for (int n = 0; n < 5; ++n) {
            QvFrame in = shot(scene, n, order);
            EXPECT_EQ(write(in), 0);
            for (int k = 0; k < 2; ++k, next())
                for (int i = 0; n >= 2 && i < 40 * 24; ++i)
                    most = std::max(most, std::abs(*frame()->pixelPtr(i % 40, i / 40) -
                                                   scene(i % 40, i / 40, 2 * n + k)));
        }
        return most;
    }
};

}  // namespace

TEST(QvBobber, TwoFramesOfEachAtTwiceTheRate) {
    Bob bob;
    int number = 100;
    for (int n : {0, 1, 3}) {
        QvFrame in = shot([](int, int, int field) { return field; }, n);
        in.setSubpic(AnyDict("name", "cc_data"));
        ASSERT_EQ(bob.write(in), 0);
        for (int left = 2; left > 0; --left, bob.next()) {
            EXPECT_EQ(bob.ready(), left);
            const QvFrame& out = *bob.frame();
            EXPECT_EQ(out.frameNr, number++);
            EXPECT_TRUE(out.framerate == QvFramerate(QvRatio(60000, 1001)));
            EXPECT_EQ(out.plane()[(2 - left) * out.stride()], 2 * n + 2 - left) << "row of the field shown";
            EXPECT_EQ(out.subpic() != nullptr, left == 2) << "captions leave once";
        }
        EXPECT_EQ(bob.ready(), 0);
    }
    bob.close();
    bob.open();
    QvFrame again = shot([](int, int, int) { return 0; }, 3);
    bob.write(again);
    EXPECT_EQ(bob.frame()->frameNr, 106);
    QvFrame hostile = again;
    hostile.framerate = QvFramerate(QvRatio(2147483647, 1));
    EXPECT_NE(bob.write(hostile), 0);
    EXPECT_EQ(bob.ready(), 0);
}

TEST(QvBobber, NoCombWhereItMovesFullDetailWhereItStands) {
    const Scene still = [](int x, int y, int) { return y == 9 || y == 14 || x == 5 ? 230 : 20; };
    const Scene moving = [](int x, int, int field) { return (x - 5 * field) % 40 < 6 ? 230 : 20; };
    const Scene slope = [](int x, int y, int field) { return 3 * x + 2 * y + 9 * field; };
    const struct {
        const char* what;
        const Scene& scene;
        int alpha, least, most;
    } rows[] = {
        {"still lines, woven", still, 255, 0, 0},           {"still lines, interpolated", still, 0, 200, 210},
        {"moving bar, woven", moving, 255, 0, 0},           {"moving bar, interpolated", moving, 0, 0, 0},
        {"a slope that brightens", slope, 255, 0, 2},       {"the same, interpolated", slope, 0, 0, 2},
        {"still lines, half of each", still, 128, 95, 110},
    };
    for (const int order : {1, 2})
        for (const auto& row : rows) {
            const int worst = Bob(row.alpha).worst(row.scene, order);
            EXPECT_GE(worst, row.least) << row.what << order;
            EXPECT_LE(worst, row.most) << row.what << order;
        }
}

TEST(QvBobber, EveryFormatAndShape) {
    for (const QvPixelFormat& format : qvPixelFormats())
        for (const int height : {1, 2, 3, 8}) {
            Bob bob;
            QvFrame in = makePicture(format.fourcc, 18, height, 7);
            in.framerate.setInterlaced(1);
            ASSERT_EQ(bob.write(in), 0);
            ASSERT_EQ(bob.write(in), 0);
            EXPECT_EQ(bob.ready(), 2);
            // Noise that stands still comes out whole, but for bits that no sample has.
            const bool isWhole = format.pixelBytes > 0 && format.fourcc != QvFourcc::R555;
            for (; bob.ready() > 0 && height % 2 == 0; bob.next())
                EXPECT_EQ(pictureBytes(*bob.frame()) == pictureBytes(in), isWhole) << in.str_four_cc();
        }
}

TEST(QvBobber, AllVectorUnitsGiveTheSameBytes) {
    for (const QvPixelFormat& format : qvPixelFormats()) {
        std::string first;
        for (const int64_t target : machineTargets()) {
            const OnTarget only(target);
            Bob bob(77);
            std::string all;
            for (const int seed : {7, 8, 8}) {  // noise that moves, then noise that stands
                QvFrame in = makePicture(format.fourcc, 83, 5, static_cast<unsigned>(seed));
                in.framerate.setInterlaced(1);
                ASSERT_EQ(bob.write(in), 0);
                for (; bob.ready() > 0; bob.next()) all += pictureBytes(*bob.frame());
            }
            if (first.empty()) first = all;
            EXPECT_TRUE(all == first) << qvFourccText(format.fourcc).data() << target;
        }
    }
}
