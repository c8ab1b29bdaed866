// What the tests of video effects share.
#pragma once

#include <algorithm>
#include <cstring>
#include <initializer_list>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "builtin/video/samplelayout.h"
#include "core/engine/modules/qvregistry.h"
#include "core/measure/qvgeometry.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/pictures.h"

using Params = std::vector<std::pair<const char*, Any>>;

// An effect with parameters, opened.
template <class Effect>
struct OpenedEffect : Effect {
    OpenedEffect(std::initializer_list<Params::value_type> params = {}) : OpenedEffect(Params(params)) {}
    explicit OpenedEffect(const Params& params) {
        this->init();
        for (const auto& [name, value] : params) EXPECT_EQ(this->setParam(name, value), 0) << name;
        EXPECT_EQ(this->open(), 0) << this->errorDesc();
    }
    // The frame that comes out, or an empty one.
    const QvFrame& through(QvFrame& frame) {
        static const QvFrame nothing;
        EXPECT_EQ(this->write(frame), 0) << this->errorDesc();
        return this->ready() ? *this->frame() : nothing;
    }
};

// For effects that draw text.
class TextEffect : public testing::Test {
  protected:
    void SetUp() override {
        if (qv_registry()->defaultFontFile(0).isFalse()) GTEST_SKIP() << "no font on this system";
    }
    static QvFrame black(int width, int height, const QvFramerate& rate, int number,
                         unsigned fourcc = QvFourcc::BGR4) {
        QvFrame frame;
        frame.init(fourcc, width, height);
        frame.setBlack();
        frame.framerate = rate;
        frame.frameNr = number;
        return frame;
    }

    EngineScope engine_;
};

inline std::string fourccName(unsigned fourcc) { return qvFourccText(fourcc).data(); }

inline int sampleRows(const QvFrame& frame, int plane) {
    return frame.plane_bytes(plane) / frame.stride(plane);
}

inline const unsigned char* rowOf(const QvFrame& frame, int plane, int y) {
    return frame.plane(plane) + static_cast<std::ptrdiff_t>(frame.stride(plane)) * y;
}

// The bytes of a picture, without those that only pad rows.
inline std::string samplesOf(const QvFrame& frame) {
    std::string all;
    for (int p = 0; p < frame.planes(); ++p) {
        const int bytes =
            frame.pixelBytes(p) > 0 ? frame.width(p) * frame.pixelBytes(p) : (frame.width() + 5) / 6 * 16;
        for (int y = 0; y < sampleRows(frame, p); ++y)
            all.append(reinterpret_cast<const char*>(rowOf(frame, p, y)), static_cast<size_t>(bytes));
    }
    return all;
}

// What an effect makes of a frame in place is what it makes of one that it is given.
template <class Effect>
void sameInPlace(Effect&& written, Effect&& applied, QvFrame& frame) {
    QvFrame copy = frame;
    copySamples(copy, frame);
    EXPECT_EQ(applied.apply(copy), 0);
    EXPECT_TRUE(samplesOf(written.through(frame)) == samplesOf(copy)) << frame.str_four_cc();
}
