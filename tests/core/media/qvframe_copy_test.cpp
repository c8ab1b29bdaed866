// Copies and field operations, held against references over plain bytes.
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <string>

#include "core/media/qvframe.h"
#include "tests/core/media/frame_model.h"
#include "tests/support/log_capture.h"

namespace {

using namespace QvFourcc;

// What one target row is made of: a row of the source, or of the target as it then stands.
using RowSource = std::function<int(int row, int rows)>;

// Calls check(source, target, what) for each format, size and padding, with a target of the same format (so
// that what an operation leaves alone shows) or an empty one.
void forAll(const std::function<void(QvFrame&, QvFrame&)>& check) {
    unsigned seed = 1;
    for (unsigned fourcc : allFormats())
        for (const auto& size : oddSizes)
            for (int padding : {0, 3}) {
                SCOPED_TRACE(std::string(qvFourccText(fourcc).data()) + " " + std::to_string(size.width) +
                             "x" + std::to_string(size.height) + " +" + std::to_string(padding));
                QvFrame source, target;
                makeNoise(source, fourcc, size.width, size.height, padding, ++seed);
                makeNoise(target, fourcc, size.width, size.height, 3 - padding, ++seed);
                check(source, target);
                if (testing::Test::HasFailure()) return;
            }
}

// The target with rows taken from the source; -1 leaves a row.
FrameModel expected(FrameModel target, FrameModel source, const RowSource& rowOf) {
    for (std::size_t p = 0; p < target.planes.size(); ++p) {
        const int plane = static_cast<int>(p);
        const int bytes = std::min(target.strides[p], source.strides[p]);
        const int rows = target.rows(plane);
        for (int row = 0; row < rows; ++row)
            for (int i = 0, from = rowOf(row, rows); from >= 0 && i < bytes; ++i)
                target.at(plane, row, i) = source.at(plane, from, i);
    }
    return target;
}

void expectMeta(const QvFrame& frame, const QvFrame& source, int interlaced) {
    EXPECT_EQ(frame.frameNr, source.frameNr);
    EXPECT_EQ(frame.getTimestamp(), source.getTimestamp());
    EXPECT_EQ(frame.framerate.rate(), source.framerate.rate());
    EXPECT_EQ(frame.framerate.interlaced(), interlaced);
}

int sameRow(int row, int) { return row; }

TEST(QvFrameCopy, TakesWholeRowsOfTheSmallerStride) {
    forAll([](QvFrame& source, QvFrame& target) {
        const auto wanted = expected(modelOf(target), modelOf(source), sameRow);
        target = source;
        EXPECT_EQ(modelOf(target), wanted);
        expectMeta(target, source, 1);
        QvFrame other;
        other.init(source.four_cc() == GRAY ? BGR4 : GRAY, 3, 3);
        EXPECT_EQ(other.copy(source), 0);
        EXPECT_EQ(modelOf(other), expected(modelOf(other), modelOf(source), sameRow));
        const auto before = modelOf(source);
        source = static_cast<const QvFrame&>(source);
        EXPECT_EQ(modelOf(source), before);
    });
}

TEST(QvFrameCopy, FlipsRowsAndFieldOrder) {
    forAll([](QvFrame& source, QvFrame& target) {
        const RowSource flipped = [](int row, int rows) { return rows - 1 - row; };
        const auto wanted = expected(modelOf(target), modelOf(source), flipped);
        target.copy(source, true);
        EXPECT_EQ(modelOf(target), wanted);
        expectMeta(target, source, 2);
        source.copy(source, true);
        EXPECT_EQ(pixelsOf(source), pixelsOf(target));
    });
}

TEST(QvFrameCopy, TakesForeignPlanes) {
    forAll([](QvFrame& source, QvFrame& target) {
        const auto wanted = expected(modelOf(target), modelOf(source), sameRow);
        target.copyFramett(*source.getFrame_tt(), false);
        EXPECT_EQ(modelOf(target), wanted);
        EXPECT_NE(target.frameNr, source.frameNr);

        QvFrame kept, plain;
        kept.copyFramett(*source.getFrame_tt(), true);
        plain.copyFramett(*source.getFrame_tt(), false);
        for (int p = 0; p < source.planes(); ++p) {
            EXPECT_EQ(kept.stride(p), source.stride(p));
            EXPECT_LE(plain.stride(p), source.stride(p));
        }
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

TEST(QvFrameFields, Shift) {
    // Below three rows the last row has no row of its field above it and comes straight.
    const RowSource shifted = [](int row, int rows) {
        if (row < rows - 1) return row + 1;
        return rows >= 3 ? rows - 2 : rows - 1;
    };
    forAll([&](QvFrame& source, QvFrame& target) {
        EXPECT_EQ(target.copyShifted(source), 0);
        const auto got = modelOf(target), from = modelOf(source);
        // The repeated row is taken with the target's whole stride, so only the common bytes are looked at.
        for (int p = 0; p < target.planes(); ++p)
            for (int row = 0; row < target.height(p); ++row)
                for (int i = 0; i < std::min(target.stride(p), source.stride(p)); ++i)
                    ASSERT_EQ(got.at(p, row, i), from.at(p, shifted(row, target.height(p)), i))
                        << p << " " << row;
        expectMeta(target, source, 2);
        QvFrame self(source);
        self.copyShifted(self);
        EXPECT_EQ(pixelsOf(self), pixelsOf(target));
    });
}

TEST(QvFrameFields, ChangeDominanceMovesAllRows) {
    forAll([](QvFrame& source, QvFrame&) {
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

TEST(QvFrameFields, SwitchedPairs) {
    const RowSource switched = [](int row, int rows) { return row == rows - 1 && rows % 2 ? row : row ^ 1; };
    forAll([&](QvFrame& source, QvFrame& target) {
        const auto wanted = expected(modelOf(target), modelOf(source), switched);
        EXPECT_EQ(target.copySwitched(source), 0);
        EXPECT_EQ(modelOf(target), wanted);
        expectMeta(target, source, 2);
        source.copySwitched(source);
        EXPECT_EQ(pixelsOf(source), pixelsOf(target));
    });
}

TEST(QvFrameFields, Weaving) {
    forAll([](QvFrame& first, QvFrame& second) {
        QvFrame woven, combined;
        ASSERT_EQ(woven.interlace(first, second), 0);
        EXPECT_EQ(woven.height(), 2 * first.height());
        ASSERT_EQ(combined.combineFields(first, second), 0);
        EXPECT_EQ(combined.height(), first.height());
        auto a = modelOf(first), b = modelOf(second), w = modelOf(woven), c = modelOf(combined);
        for (std::size_t p = 0; p < w.planes.size(); ++p) {
            const int plane = static_cast<int>(p);
            const int bytes = std::min({a.strides[p], b.strides[p], w.strides[p]});
            for (int row = 0; row < 2 * a.rows(plane); ++row)
                for (int i = 0; i < bytes; ++i)
                    ASSERT_EQ(w.at(plane, row, i), (row % 2 ? b : a).at(plane, row / 2, i));
            for (int row = 0; row < c.rows(plane); ++row)
                for (int i = 0; i < bytes; ++i)
                    ASSERT_EQ(c.at(plane, row, i), (row % 2 ? b : a).at(plane, row, i));
        }
        expectMeta(woven, first, 2);
        expectMeta(combined, first, 0);
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

TEST(QvFrameFields, HalfPictures) {
    forAll([](QvFrame& source, QvFrame& target) {
        int height = source.height() / 2;
        if (source.four_cc() == I420 || source.four_cc() == YV12) height = height / 2 * 2;
        auto from = modelOf(source);
        for (int field : {1, 0}) {
            ASSERT_EQ(target.copyDeinterlaced(source, field), 0);
            ASSERT_EQ(target.height(), height);
            auto got = modelOf(target);
            for (std::size_t p = 0; p < got.planes.size(); ++p)
                for (int row = 0; row < got.rows(static_cast<int>(p)); ++row)
                    for (int i = 0; i < std::min(got.strides[p], from.strides[p]); ++i)
                        ASSERT_EQ(got.at(static_cast<int>(p), row, i),
                                  from.at(static_cast<int>(p), 2 * row + 1 - field, i));
            expectMeta(target, source, 0);
        }
        QvFrame bob;
        ASSERT_EQ(bob.copyBob(source), 0);
        ASSERT_EQ(bob.height(), height);
        auto got = modelOf(bob);
        const unsigned fourcc = source.four_cc();
        const int unit = fourcc == b64a || fourcc == Y216 || fourcc == W016 ? 2 : 1;
        for (std::size_t p = 0; p < got.planes.size(); ++p)
            for (int row = 0; row < got.rows(static_cast<int>(p)); ++row)
                for (int i = 0; i + unit <= std::min(got.strides[p], from.strides[p]); i += unit) {
                    const auto sample = [&](FrameModel& model, int at) {
                        const int low = model.at(static_cast<int>(p), at, i);
                        return unit == 1 ? low : low + 256 * model.at(static_cast<int>(p), at, i + 1);
                    };
                    ASSERT_EQ(sample(got, row), (sample(from, 2 * row) + sample(from, 2 * row + 1)) / 2);
                }
        expectMeta(bob, source, 0);
    });
}

}  // namespace
