// What a conversion has to do, without how.
#pragma once

#include "builtin/kernels/formats/formats.h"
#include "builtin/kernels/formats/matrix.h"
#include "builtin/kernels/formats/paths.h"
#include "builtin/kernels/scale/axis.h"

namespace srk {

// A call, resolved: what its result depends on besides the samples.
struct Request {
    int source = 0, sourceDepth = 16, sourceWidth = 0, sourceHeight = 0;
    int target = 0, targetDepth = 16;
    int left = 0, top = 0, width = 0, height = 0;  // target rectangle
    Mapping across, down;                          // of luma, over the whole frame
    Filter filter = Filter::cubic;
    bool standard = false, interlaced = false;
    Matrix sourceMatrix = Matrix::bt601, targetMatrix = Matrix::bt601;
    bool operator==(const Request&) const = default;
};

// What happens to the three planes of colour. RGB becomes YUV before it is scaled; all else happens after.
enum class Change : uint8_t { none, toYuv, toRgb, otherMatrix, levels };

struct Route {
    Request request;
    const Format *source = nullptr, *target = nullptr;
    Core plain = Core::none;  // `lines` or `packed8`: lines may be copied or shuffled
    bool deep = false;        // worked on as samples of 16 bits
    Change change = Change::none;
    bool alpha = false;  // both sides have it
    int fields = 1;      // each is converted as a picture of its own
    bool possible() const { return source != nullptr; }
};
Route routeOf(const Request& request);

// Lines of field `field` out of `lines`.
constexpr int fieldLines(int lines, int fields, int field) { return (lines + fields - 1 - field) / fields; }

// Full-level samples reach to the end of their range; all others are 256 times as large with 16 bits.
inline bool fullRange(const Format& format, int plane) {
    return plane == 3 || format.family() == Family::rgb;
}

// The constants of a route's change.
struct ChangeRows {
    const ToYuv* toYuv = nullptr;
    const ToRgb* toRgb = nullptr;
    const ToOther* toOther = nullptr;
    bool toVideo = false;  // levels
    Deep deep{};           // of whichever change there is
};
ChangeRows rowsOf(const Route& route);

}  // namespace srk
