// Copies and field operations on pictures with a letter in each row.

#include "core/media/qvframe.h"
#include "tests/core/media/frame_model.h"
#include "tests/support/checks.h"

namespace {

using namespace QvFourcc;

// Every plane's rows, padding included, hold `first` and the letters after it.
void letter(QvFrame& frame, char first) {
    for (int p = 0; p < frame.planes(); ++p)
        for (int i = 0; i < frame.plane_bytes(p); ++i)
            frame.plane(p)[i] = static_cast<unsigned char>(first + i / frame.stride(p));
}

// The letter of each row, a question mark where its pixels are not all alike; planes apart.
std::string rowsOf(const QvFrame& frame) {
    QvFrame plain;
    plain.init(frame.four_cc(), frame.width(), frame.height());
    std::string text;
    for (int p = 0; p < frame.planes(); ++p) {
        if (p) text += ' ';
        for (int row = 0; row < frame.height(p); ++row) {
            const unsigned char* const first = frame.plane(p) + row * frame.stride(p);
            const bool alike = std::all_of(first, first + plain.stride(p),
                                           [&](unsigned char byte) { return byte == *first; });
            text += alike ? static_cast<char>(*first) : '?';
        }
    }
    return text;
}

struct Operation {
    const char* name;
    std::function<int(QvFrame& to, const QvFrame& a, const QvFrame& b)> run;
    int interlaced;           // of the result; that of the sources is 1
    const char *six, *five;   // of sources with the rows abcdef and ABCDEF, or one fewer
    const char *three, *two;  // of the half as many rows of chroma
};

const Operation operations[] = {
    {"copy", [](auto& to, auto& a, auto&) { return to.copy(a); }, 1, "abcdef", "abcde", "abc", "ab"},
    {"flip", [](auto& to, auto& a, auto&) { return to.copy(a, true); }, 2, "fedcba", "edcba", "cba", "ba"},
    {"shift", [](auto& to, auto& a, auto&) { return to.copyShifted(a); }, 2, "bcdefe", "bcded", "bcb", "bb"},
    {"switch", [](auto& to, auto& a, auto&) { return to.copySwitched(a); }, 2, "badcfe", "badce", "bac",
     "ba"},
    {"combine", [](auto& to, auto& a, auto& b) { return to.combineFields(a, b); }, 0, "aBcDeF", "aBcDe",
     "aBc", "aB"},
    {"weave", [](auto& to, auto& a, auto& b) { return to.interlace(a, b); }, 2, "aAbBcCdDeEfF", "aAbBcCdDeE",
     "aAbBcC", nullptr},
    {"first field", [](auto& to, auto& a, auto&) { return to.copyDeinterlaced(a, true); }, 0, "ace", "ac",
     nullptr, "a"},
    {"second field", [](auto& to, auto& a, auto&) { return to.copyDeinterlaced(a, false); }, 0, "bdf", "bd",
     nullptr, "b"},
};

TEST(QvFrameCopy, EveryRowComesFromItsPlace) {
    for (const auto& operation : operations)
        for (unsigned fourcc : allFormats())
            for (int rows : {6, 5})
                for (int padding : {0, 3}) {
                    SCOPED_TRACE(std::string(operation.name) + " " + qvFourccText(fourcc).data());
                    QvFrame a = noiseFrame(fourcc, 7, rows, padding, 1);
                    QvFrame b = noiseFrame(fourcc, 7, rows, 3 - padding, 2);
                    QvFrame target = noiseFrame(fourcc, 7, rows, 3 - padding, 3), other, self;
                    letter(a, 'a');
                    letter(b, 'A');
                    self = a;
                    other.init(fourcc == GRAY ? BGR4 : GRAY, 3, 3);
                    std::string wanted = rows == 6 ? operation.six : operation.five;
                    if (a.isPlanar()) {
                        const char* const chroma = rows == 6 ? operation.three : operation.two;
                        if (!chroma) continue;
                        wanted += std::string(" ") + chroma + " " + chroma;
                    }
                    ASSERT_EQ(operation.run(target, a, b), 0);
                    EXPECT_EQ(rowsOf(target), wanted);
                    EXPECT_TRUE(target.frameNr == a.frameNr && target.getTimestamp() == a.getTimestamp());
                    EXPECT_EQ(target.framerate, QvFramerate(25.0, operation.interlaced));
                    EXPECT_EQ(operation.run(other, a, b), 0);
                    EXPECT_EQ(rowsOf(other), wanted);
                    EXPECT_EQ(operation.run(self, self, b), 0);
                    EXPECT_EQ(rowsOf(self), wanted);
                }
}

TEST(QvFrameCopy, BobIsTheMeanOfTwoRows) {
    QvFrame bytes = noiseFrame(GRAY, 4, 4, 0, 1), words = noiseFrame(Y216, 2, 4, 0, 1);
    for (QvFrame* frame : {&bytes, &words}) {
        letter(*frame, 'a');
        frame->pixelPtr(0, 0)[1] = 200;  // with a b below
        frame->pixelPtr(0, 2)[0] = 255;  // with a d below
        frame->pixelPtr(0, 3)[0] = 254;
        ASSERT_EQ(frame->copyBob(QvFrame(*frame)), 0);
        EXPECT_EQ(frame->height(), 2);
    }
    const auto at = [](const QvFrame& frame, int x, int y) { return int{frame.pixelPtr(0, y)[x]}; };
    EXPECT_TRUE(at(bytes, 0, 0) == 'a' && at(bytes, 1, 0) == (200 + 'b') / 2 && at(bytes, 0, 1) == 254);
    const int mean = (200 * 256 + 'a' + 'b' * 257) / 2;
    EXPECT_TRUE(at(words, 0, 0) == mean % 256 && at(words, 1, 0) == mean / 256);
}

TEST(QvFrameCopy, TakesForeignPlanes) {
    for (unsigned fourcc : allFormats()) {
        QvFrame source = noiseFrame(fourcc, 7, 5, 3, 1);
        QvFrame target = noiseFrame(fourcc, 7, 5, 0, 2);
        QvFrame copy = noiseFrame(fourcc, 7, 5, 0, 2);
        target.copyFramett(*source.getFrame_tt(), false);
        copy.copy(source);
        EXPECT_EQ(modelOf(target), modelOf(copy));
        EXPECT_NE(target.frameNr, source.frameNr);
        if (source.isPlanar()) continue;
        frame_tt upsideDown = *source.getFrame_tt();  // rows from the last
        upsideDown.planes[0] = source.plane(0, true);
        upsideDown.strides[0] = source.stride(0, true);
        QvFrame turned, flipped;
        flipped.copy(source, true);
        turned.copyFramett(upsideDown, false);
        EXPECT_EQ(modelOf(turned), modelOf(flipped));
    }
}

TEST(QvFrameFields, ChangeDominanceMovesAllRows) {
    QvFrame frame = noiseFrame(I420, 7, 6, 3, 1);
    letter(frame, 'a');
    frame.changeDominance(true);
    EXPECT_EQ(rowsOf(frame), "bcdefe bcb bcb");
    EXPECT_EQ(frame.framerate.interlaced(), 2);
    letter(frame, 'a');
    frame.changeDominance(false);
    EXPECT_EQ(rowsOf(frame), "babcde bab bab");
}

}  // namespace
