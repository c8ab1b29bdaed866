#include "builtin/kernels/formats/matrix.h"

#include <array>
#include <bit>
#include <cmath>

namespace srk {

namespace {

// RGB to YUV in 1/32768. The factors of R - Y and B - Y are in 1/16384 for full levels and 1/32768 for video
// levels.
struct RgbRow {
    int r, b, g, add, yOffset, crFactor, cbFactor, factorUnit;
};

struct YuvRow {
    int y, cbToB, cbToG, crToG, crToR;
};

// clang-format off
constexpr RgbRow rgbRows[2][2] = {  // by matrix, by video levels
    {{8412, 3222, 16508, 16375, 16, 10264,  8127, 16384},
     {9794, 3752, 19222, 16380,  0, 23902, 18925, 32768}},
    {{5985, 2031, 20126, 16375, 16,  9140,  7756, 16384},
     {6969, 2365, 23434, 16384,  0, 21285, 18062, 32768}},
};
constexpr YuvRow yuvRows[2][2] = {
    {{19077, 33032, -6448, -13326, 26153}, {8188 * 2, 28368, -5537, -11445, 22461}},
    {{19077, 34610, -3493,  -8734, 29369}, {8188 * 2, 29725, -3000,  -7501, 25223}},
};
// clang-format on

constexpr double fullToVideo = 219.0 / 255.0;

// Rows of U and V over B, G, R: factor * (B - luma) and factor * (R - luma), luma in the levels of RGB.
struct Chroma {
    double u[3], v[3];
};

Chroma chromaOf(const RgbRow& row, bool videoLevels) {
    const double scale = (videoLevels ? 1 : 1 / fullToVideo) / 32768.0;
    const double luma[3] = {row.b * scale, row.g * scale, row.r * scale};
    const double cb = static_cast<double>(row.cbFactor) / row.factorUnit;
    const double cr = static_cast<double>(row.crFactor) / row.factorUnit;
    Chroma chroma;
    for (int i = 0; i < 3; ++i) {
        chroma.u[i] = cb * ((i == 0) - luma[i]);
        chroma.v[i] = cr * ((i == 2) - luma[i]);
    }
    // The luma weights of the tables add up to 1 but for their rounding.
    chroma.u[1] = -chroma.u[0] - chroma.u[2];
    chroma.v[1] = -chroma.v[0] - chroma.v[2];
    return chroma;
}

int16_t fixed(double value, double unit) { return static_cast<int16_t>(std::lround(value * unit)); }

ToYuv makeToYuv(int matrix, bool videoLevels) {
    const RgbRow& row = rgbRows[matrix][videoLevels];
    const Chroma chroma = chromaOf(row, videoLevels);
    ToYuv to{};
    to.y[0] = static_cast<int16_t>(row.b);
    to.y[1] = static_cast<int16_t>(row.g);
    to.y[2] = static_cast<int16_t>(row.r);
    for (const int i : {0, 2}) {
        to.u[i] = fixed(chroma.u[i], 32768);
        to.v[i] = fixed(chroma.v[i], 32768);
    }
    to.u[1] = static_cast<int16_t>(-to.u[0] - to.u[2]);
    to.v[1] = static_cast<int16_t>(-to.v[0] - to.v[2]);
    to.yAdd = row.add + (row.yOffset << 15);
    to.chromaAdd = (128 << 15) + (1 << 14);
    return to;
}

ToRgb makeToRgb(int matrix, bool videoLevels) {
    const YuvRow& row = yuvRows[matrix][videoLevels];
    const auto half = [](int value) { return static_cast<int16_t>((value + 1) / 2); };
    return {static_cast<int16_t>(videoLevels ? 0 : 16),
            static_cast<int16_t>(row.y),
            half(row.cbToB),
            static_cast<int16_t>(row.cbToG),
            static_cast<int16_t>(row.crToG),
            static_cast<int16_t>(row.crToR)};
}

struct Weights {
    double r, g, b;
};
constexpr Weights weights[2] = {{0.299, 0.587, 0.114}, {0.2126, 0.7152, 0.0722}};

using Rows = std::array<std::array<double, 3>, 3>;

// Over Y, Cb, Cr, where chroma has 224 steps and luma 219.
Rows otherRows(Matrix from) {
    const Weights& s = weights[static_cast<int>(from)];
    const Weights& t = weights[1 - static_cast<int>(from)];
    constexpr double step = 219.0 / 224.0;
    // R, G, B in steps of luma.
    const double r[3] = {1, 0, 2 * (1 - s.r) * step};
    const double b[3] = {1, 2 * (1 - s.b) * step, 0};
    const double g[3] = {1, -2 * s.b * (1 - s.b) / s.g * step, -2 * s.r * (1 - s.r) / s.g * step};
    Rows rows{};
    for (unsigned i = 0; i < 3; ++i) {
        rows[0][i] = t.r * r[i] + t.g * g[i] + t.b * b[i];
        rows[1][i] = (b[i] - rows[0][i]) / (2 * (1 - t.b) * step);
        rows[2][i] = (r[i] - rows[0][i]) / (2 * (1 - t.r) * step);
    }
    return rows;
}

ToOther makeToOther(Matrix from) {
    const Rows rows = otherRows(from);
    ToOther to{};
    for (unsigned i = 0; i < 3; ++i)
        for (unsigned k = 0; k < 3; ++k) to.m[i][k] = fixed(rows[i][k], 16384);
    return to;
}

constexpr double centre = 128 * 256;

// Luma weights of B, G, R, and how much of B - Y and R - Y chroma is, when samples are in 0 to 1 and chroma
// in 1/128 of a code value. The second row is what files of this format were always made with.
struct FloatRow {
    double r, second, third, cbFactor, crFactor;
};
constexpr FloatRow floatRows[2] = {
    {0.299, 0.587, 0.114, 16180.586914, 20450.785156},
    {0.2126, 0.0722, 0.7152, 50337.078125, 18206.755859},
};
// Cb to B, Cr to G, Cb to G, Cr to R.
constexpr uint32_t floatBackBits[2][4] = {{0x38819BF1, 0x37D0EF95, 0x37495E70, 0x384D17B3},
                                          {0x37A6A610, 0x3929965B, 0x394E5953, 0x38665EE9}};

}  // namespace

const ToYuv& toYuv(Matrix matrix, bool videoLevels) {
    static const ToYuv rows[4] = {makeToYuv(0, false), makeToYuv(0, true), makeToYuv(1, false),
                                  makeToYuv(1, true)};
    return rows[static_cast<int>(matrix) * 2 + videoLevels];
}

const ToRgb& toRgb(Matrix matrix, bool videoLevels) {
    static const ToRgb rows[4] = {makeToRgb(0, false), makeToRgb(0, true), makeToRgb(1, false),
                                  makeToRgb(1, true)};
    return rows[static_cast<int>(matrix) * 2 + videoLevels];
}

const ToOther& toOther(Matrix from) {
    static const ToOther rows[2] = {makeToOther(Matrix::bt601), makeToOther(Matrix::bt709)};
    return rows[static_cast<int>(from)];
}

Deep deepToYuv(Matrix matrix, bool videoLevels) {
    const RgbRow& row = rgbRows[static_cast<int>(matrix)][videoLevels];
    const Chroma chroma = chromaOf(row, videoLevels);
    const double level = videoLevels ? 1 : 256.0 / 257.0;
    Deep deep{};
    const int luma[3] = {row.b, row.g, row.r};
    for (int i = 0; i < 3; ++i) {
        deep.m[0][i] = luma[i] / 32768.0 * level;
        deep.m[1][i] = chroma.u[i] * level;
        deep.m[2][i] = chroma.v[i] * level;
    }
    deep.add[0] = row.yOffset * 256.0;
    deep.add[1] = deep.add[2] = centre;
    return deep;
}

Deep deepToRgb(Matrix matrix, bool videoLevels) {
    const YuvRow& row = yuvRows[static_cast<int>(matrix)][videoLevels];
    const double level = (videoLevels ? 1 : 257.0 / 256.0) / 16384.0;
    Deep deep{{{row.y * level, row.cbToB * level, 0},
               {row.y * level, row.cbToG * level, row.crToG * level},
               {row.y * level, 0, row.crToR * level}},
              {}};
    for (int i = 0; i < 3; ++i)
        deep.add[i] = -(videoLevels ? 0 : 16 * 256) * deep.m[i][0] - centre * (deep.m[i][1] + deep.m[i][2]);
    return deep;
}

Deep deepToOther(Matrix from) {
    const Rows rows = otherRows(from);
    Deep deep{};
    const double zero[3] = {16 * 256, centre, centre};
    for (unsigned i = 0; i < 3; ++i) {
        deep.add[i] = zero[i];
        for (unsigned k = 0; k < 3; ++k) {
            deep.m[i][k] = rows[i][k];
            deep.add[i] -= rows[i][k] * zero[k];
        }
    }
    return deep;
}

Deep deepLevels(bool toVideo) {
    const double scale = 219 * 256 / 65535.0;
    Deep deep{};
    for (int i = 0; i < 3; ++i) {
        deep.m[i][i] = toVideo ? scale : 1 / scale;
        deep.add[i] = toVideo ? 16 * 256 : -16 * 256 / scale;
    }
    return deep;
}

Deep floatToYuv(Matrix matrix) {
    const FloatRow& row = floatRows[static_cast<int>(matrix)];
    const double luma[3] = {row.third, row.second, row.r};
    Deep deep{};
    for (int i = 0; i < 3; ++i) {
        deep.m[0][i] = luma[i] * 219 * 256 / 65535;
        deep.m[1][i] = ((i == 0) - luma[i]) * 2 * row.cbFactor / 65535;
        deep.m[2][i] = ((i == 2) - luma[i]) * 2 * row.crFactor / 65535;
    }
    deep.add[0] = 16 * 256;
    deep.add[1] = deep.add[2] = centre;
    return deep;
}

Deep floatToRgb(Matrix matrix) {
    double back[4];
    for (int i = 0; i < 4; ++i)
        back[i] =
            static_cast<double>(std::bit_cast<float>(floatBackBits[static_cast<int>(matrix)][i])) * 65535 / 2;
    const double luma = 65535 / (219 * 256.0);
    Deep deep{{{luma, back[0], 0}, {luma, -back[2], -back[1]}, {luma, 0, back[3]}}, {}};
    for (int i = 0; i < 3; ++i) deep.add[i] = -16 * 256 * luma - centre * (deep.m[i][1] + deep.m[i][2]);
    return deep;
}

}  // namespace srk
