#include "builtin/kernels/lines/lines.h"
#include "builtin/kernels/lines/rows8.h"

namespace srk {

namespace {

size_t count(int n) { return static_cast<size_t>(n); }

}  // namespace

void unpackLine(const Format& format, const Byte* from, const Line8& to, int width) {
    const auto& p = to.plane;
    const size_t n = count(width);
    switch (format.packing) {
        case Packing::bytes4: return split4(from, p[0], p[1], p[2], format.alpha() ? p[3] : nullptr, n);
        case Packing::bytes3: return split3(from, p[0], p[1], p[2], n);
        case Packing::vuya: return split4(from, p[2], p[1], p[0], format.alpha() ? p[3] : nullptr, n);
        case Packing::yuyv: return splitYuyv(from, p[0], p[1], p[2], n, true);
        case Packing::uyvy: return splitYuyv(from, p[0], p[1], p[2], n, false);
        case Packing::rgb565: return split565(from, p[0], p[1], p[2], n, true);
        case Packing::rgb555: return split565(from, p[0], p[1], p[2], n, false);
        default: return;
    }
}

void packLine(const Format& format, const Line8& from, Byte* to, int width) {
    const auto& p = from.plane;
    const size_t n = count(width);
    switch (format.packing) {
        case Packing::bytes4: return join4(to, p[0], p[1], p[2], format.alpha() ? p[3] : nullptr, n);
        case Packing::bytes3: return join3(to, p[0], p[1], p[2], n);
        case Packing::vuya: return join4(to, p[2], p[1], p[0], format.alpha() ? p[3] : nullptr, n);
        case Packing::yuyv: return joinYuyv(to, p[0], p[1], p[2], n, true);
        case Packing::uyvy: return joinYuyv(to, p[0], p[1], p[2], n, false);
        case Packing::rgb565: return join565(to, p[0], p[1], p[2], n, true);
        case Packing::rgb555: return join565(to, p[0], p[1], p[2], n, false);
        default: return;
    }
}

}  // namespace srk
