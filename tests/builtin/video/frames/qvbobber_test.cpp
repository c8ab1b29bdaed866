#include "builtin/video/frames/qvbobber.h"

#include <algorithm>
#include <climits>
#include <cstring>
#include <functional>

#include "builtin/video/frames/bobrows.h"
#include "tests/support/checks.h"
#include "tests/support/pictures.h"
#include "tests/support/vector_targets.h"

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
            // Noise that does not change comes out whole, but for bits that no sample has.
            const bool isWhole = format.pixelBytes > 0 && format.fourcc != QvFourcc::R555;
            for (; bob.ready() > 0 && height % 2 == 0; bob.next())
                EXPECT_EQ(pictureBytes(*bob.frame()) == pictureBytes(in), isWhole) << in.str_four_cc();
        }
}

// Against the formula in plain numbers, sample by sample, on every vector unit and with odd lengths.
TEST(BobRows, AllUnitsFollowTheFormula) {
    using qvbob::Samples;
    const struct {
        Samples samples;
        std::size_t lane;
        std::vector<std::pair<int, int>> fields;  // shift and bits
    } layouts[] = {
        {Samples::bytes, 1, {{0, 8}}},
        {Samples::words, 2, {{0, 16}}},
        {Samples::tens, 4, {{0, 10}, {10, 10}, {20, 10}}},
        {Samples::rgb555, 2, {{0, 5}, {5, 5}, {10, 5}}},
        {Samples::rgb565, 2, {{0, 5}, {5, 6}, {11, 5}}},
    };
    QvFrame noise = makePicture(QvFourcc::GRAY, 303, 7);
    const auto row = [&](int y) { return noise.pixelPtr(1, y); };
    for (int i = 0; i < 300; i += 3)  // much stands nearly still
        for (int r = 0; r < 3; ++r) row(3 + r)[i] = static_cast<unsigned char>(row(r)[i] ^ (i & 3));
    for (const int64_t target : machineTargets())
        for (const auto& layout : layouts)
            for (const int w : {0, 77, 256})
                for (const bool moved : {false, true}) {
                    const OnTarget only(target);
                    const std::size_t bytes = layout.lane == 1 ? 299 : 296;
                    const qvbob::Triple now{row(0), row(1), row(2)}, before{row(3), row(4), row(5)};
                    row(6)[bytes] = 0xA5;
                    qvbob::fillRow(layout.samples, row(6), now, moved ? qvbob::Triple() : before, w, bytes);
                    EXPECT_EQ(row(6)[bytes], 0xA5) << "beyond the row";
                    for (std::size_t i = 0; i + 4 <= bytes; i += layout.lane)
                        for (const auto& [shift, bits] : layout.fields) {
                            const auto at = [&, shift = shift, bits = bits](int y) {
                                unsigned lane = 0;
                                std::memcpy(&lane, row(y) + i, layout.lane);
                                return static_cast<int>(lane >> shift & ((1u << bits) - 1));
                            };
                            const int a = at(0), o = at(1), b = at(2);
                            int motion = moved ? INT_MAX : 0;
                            for (int r = 0; r < 3 && !moved; ++r)
                                motion = std::max(motion, std::abs(at(r) - at(3 + r)));
                            const int room = 32 * std::max(12 * (1 << bits) / 256 - motion, 0);
                            const int woven = std::clamp(o, std::min(a, b) - room, std::max(a, b) + room);
                            ASSERT_EQ(at(6), (((a + b + 1) >> 1) * (256 - w) + woven * w + 128) >> 8)
                                << static_cast<int>(layout.samples) << " byte " << i << " w " << w;
                        }
                }
}
