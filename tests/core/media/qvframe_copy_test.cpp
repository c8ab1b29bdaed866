// Copies and field operations, held against references over plain bytes.
#include <algorithm>
#include <functional>

#include "core/media/qvframe.h"
#include "tests/core/media/frame_model.h"
#include "tests/support/checks.h"

namespace {

using namespace QvFourcc;

// What a target row is made of: a row of the first (0) or second source, or the average of two of its rows.
struct From {
    int row;
    int source = 0;
    int averagedWith = -1;
};

enum class Height { same, twice, half };

struct Operation {
    const char* name;
    std::function<int(QvFrame& to, const QvFrame& a, const QvFrame& b)> run;
    std::function<From(int row, int rows)> from;
    int interlaced;  // of the result; that of the sources is 1
    Height height = Height::same;
};

// Below three rows a shifted picture has no row of the last one's field above it: that row comes straight.
const Operation operations[] = {
    {"copy", [](auto& to, auto& a, auto&) { return to.copy(a); }, [](int row, int) { return From{row}; }, 1},
    {"flip", [](auto& to, auto& a, auto&) { return to.copy(a, true); },
     [](int row, int rows) { return From{rows - 1 - row}; }, 2},
    {"shift", [](auto& to, auto& a, auto&) { return to.copyShifted(a); },
     [](int row, int rows) { return From{row < rows - 1 ? row + 1
                                         : rows >= 3    ? rows - 2
                                                        : rows - 1}; }, 2},
    {"switch", [](auto& to, auto& a, auto&) { return to.copySwitched(a); },
     [](int row, int rows) { return From{row == rows - 1 && rows % 2 ? row : row ^ 1}; }, 2},
    {"combine", [](auto& to, auto& a, auto& b) { return to.combineFields(a, b); },
     [](int row, int) {
         return From{row, row % 2};
     },
     0},
    {"weave", [](auto& to, auto& a, auto& b) { return to.interlace(a, b); },
     [](int row, int) {
         return From{row / 2, row % 2};
     },
     2, Height::twice},
    {"first field", [](auto& to, auto& a, auto&) { return to.copyDeinterlaced(a, true); },
     [](int row, int) { return From{2 * row}; }, 0, Height::half},
    {"second field", [](auto& to, auto& a, auto&) { return to.copyDeinterlaced(a, false); },
     [](int row, int) { return From{2 * row + 1}; }, 0, Height::half},
    {"bob", [](auto& to, auto& a, auto&) { return to.copyBob(a); },
     [](int row, int) {
         return From{2 * row, 0, 2 * row + 1};
     },
     0, Height::half},
};

int heightOf(const QvFrame& source, Height height) {
    if (height == Height::same) return source.height();
    if (height == Height::twice) return 2 * source.height();
    return source.is420() ? source.height() / 4 * 2 : source.height() / 2;
}

// The target's bytes with the rows of the sources in them.
FrameModel expected(FrameModel to, const FrameModel& a, const FrameModel& b, const Operation& operation) {
    const bool words = to.fourcc == b64a || to.fourcc == Y216 || to.fourcc == W016;
    for (int p = 0; p < static_cast<int>(to.planes.size()); ++p)
        for (int row = 0; row < to.rows(p); ++row) {
            const From from = operation.from(row, to.rows(p));
            const FrameModel& source = from.source ? b : a;
            if (from.row >= source.rows(p)) continue;
            const auto plane = static_cast<std::size_t>(p);
            const int bytes = std::min(to.strides[plane], source.strides[plane]);
            const int unit = from.averagedWith >= 0 && words ? 2 : 1;
            for (int i = 0; i + unit <= bytes; i += unit) {
                int value = source.sample(p, from.row, i, unit);
                if (from.averagedWith >= 0)
                    value = (value + source.sample(p, from.averagedWith, i, unit)) / 2;
                to.setSample(p, row, i, unit, value);
            }
        }
    return to;
}

// Calls check with three pictures of each format, size and padding.
void forAll(const std::function<void(QvFrame& a, QvFrame& b, QvFrame& target)>& check) {
    unsigned seed = 1;
    for (unsigned fourcc : allFormats())
        for (const auto& size : oddSizes)
            for (int padding : {0, 3}) {
                SCOPED_TRACE(std::string(qvFourccText(fourcc).data()) + " " + std::to_string(size.width) +
                             "x" + std::to_string(size.height) + " +" + std::to_string(padding));
                QvFrame a, b, target;
                makeNoise(a, fourcc, size.width, size.height, padding, ++seed);
                makeNoise(b, fourcc, size.width, size.height, 3 - padding, ++seed);
                makeNoise(target, fourcc, size.width, size.height, 3 - padding, ++seed);
                check(a, b, target);
                if (testing::Test::HasFailure()) return;
            }
}

TEST(QvFrameCopy, EveryRowComesFromItsPlace) {
    for (const auto& operation : operations)
        forAll([&](QvFrame& a, QvFrame& b, QvFrame& target) {
            SCOPED_TRACE(operation.name);
            const auto before = modelOf(target);
            ASSERT_EQ(operation.run(target, a, b), 0);
            ASSERT_EQ(target.height(), heightOf(a, operation.height));
            // What no row reaches stays, but for the repeated row of a shift, which comes with its padding.
            const bool kept = before.height == target.height() && std::string(operation.name) != "shift";
            const auto got = modelOf(target);
            ASSERT_EQ(got, expected(kept ? before : got, modelOf(a), modelOf(b), operation));
            EXPECT_TRUE(target.frameNr == a.frameNr && target.getTimestamp() == a.getTimestamp());
            EXPECT_EQ(target.framerate, QvFramerate(25.0, operation.interlaced));

            QvFrame other, self(a);
            other.init(a.four_cc() == GRAY ? BGR4 : GRAY, 3, 3);
            EXPECT_EQ(operation.run(other, a, b), 0);
            EXPECT_EQ(operation.run(self, self, b), 0);
            // Half a sample at the end of a row has no average.
            if (std::string(operation.name) == "bob" && a.four_cc() == W016 && a.width() % 2) return;
            EXPECT_EQ(pixelsOf(other), pixelsOf(target));
            EXPECT_EQ(pixelsOf(self), pixelsOf(target));
        });
}

TEST(QvFrameCopy, TakesForeignPlanes) {
    forAll([](QvFrame& source, QvFrame&, QvFrame& target) {
        const auto wanted = expected(modelOf(target), modelOf(source), {}, operations[0]);
        target.copyFramett(*source.getFrame_tt(), false);
        EXPECT_EQ(modelOf(target), wanted);
        EXPECT_NE(target.frameNr, source.frameNr);

        QvFrame kept, plain;
        kept.copyFramett(*source.getFrame_tt(), true);
        plain.copyFramett(*source.getFrame_tt(), false);
        for (int p = 0; p < source.planes(); ++p)
            EXPECT_TRUE(kept.stride(p) == source.stride(p) && plain.stride(p) <= source.stride(p)) << p;
        // Bottom-up planes.
        if (source.isPlanar()) return;
        frame_tt upsideDown = *source.getFrame_tt();
        upsideDown.planes[0] = source.plane(0, true);
        upsideDown.strides[0] = source.stride(0, true);
        QvFrame turned, flipped;
        flipped.copy(source, true);
        turned.copyFramett(upsideDown, false);
        EXPECT_EQ(modelOf(turned), modelOf(flipped));
    });
}

TEST(QvFrameFields, ChangeDominanceMovesAllRows) {
    forAll([](QvFrame& source, QvFrame&, QvFrame&) {
        for (bool up : {true, false}) {
            const auto before = modelOf(source);
            auto wanted = before;
            for (int p = 0; p < source.planes(); ++p) {
                const int stride = source.stride(p);
                const int rows = stride ? source.plane_bytes(p) / stride : 0;
                for (int row = 0; row < rows; ++row) {
                    int from = up ? row + 1 : row - 1;
                    if (up && row == rows - 1) from = rows >= 3 ? rows - 2 : rows - 1;
                    if (!up && row == 0) from = rows >= 3 ? 1 : 0;
                    for (int i = 0; i < stride; ++i) wanted.at(p, row, i) = before.at(p, from, i);
                }
            }
            source.framerate.setInterlaced(1);
            source.changeDominance(up);
            EXPECT_EQ(modelOf(source), wanted);
            EXPECT_EQ(source.framerate.interlaced(), 2);
        }
    });
}

TEST(QvFrameFields, WeavingRefusesUnlikeFields) {
    QvFrame a, b, target;
    makeNoise(a, I420, 8, 4, 0, 1);
    LogCapture log;
    for (const auto& [fourcc, width, height] : {std::tuple(YV12, 8, 4), {I420, 6, 4}, {I420, 8, 6}}) {
        makeNoise(b, fourcc, width, height, 0, 2);
        EXPECT_EQ(target.interlace(a, b), -1);
        EXPECT_EQ(target.combineFields(a, b), -1);
        EXPECT_FALSE(target.inited());
    }
    EXPECT_EQ(log.count("top and bottom fields different", QvLogMask::error), 6);
}

}  // namespace
