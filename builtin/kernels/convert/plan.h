// Everything about a conversion that does not depend on the pictures' memory: made when a call is met for the
// first time, kept for those that follow.
#pragma once

#include <array>
#include <memory>
#include <mutex>
#include <vector>

#include "builtin/kernels/formats/formats.h"
#include "builtin/kernels/formats/matrix.h"
#include "builtin/kernels/formats/paths.h"
#include "builtin/kernels/scale/deep.h"
#include "builtin/kernels/scale/scale8.h"

namespace srk {

// A call, resolved: what its result depends on beside the samples.
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

// The planes that scale alike: luma, alpha and RGB, or chroma.
struct Group {
    Axis across, down;
    Across bytesAcross;
    DeepAcross deepAcross;
    // Samples that need no words between the passes: across, lines are copied, or chroma of every second
    // pixel is repeated, interpolated or picked out behind the pass down.
    enum Spread : uint8_t { none, asIs, repeated, doubled, everySecond } spread = none;
    std::vector<int8_t> bytesDown;  // of the pass down, for each line
    std::vector<Byte> pixelsDown;   // the same for rgb4ToChroma: four for each line, or four for all
    bool copies() const { return across.copies && down.copies; }
    bool empty() const { return across.source == 0 || down.source == 0; }  // nothing to scale from
};

struct Scaling {
    Group luma, chroma;
    const Group& of(int plane) const { return plane == 1 || plane == 2 ? chroma : luma; }
};

class Workspace;

struct Plan {
    Request request;
    const Format *source = nullptr, *target = nullptr;
    Path path;
    bool deep = false;
    bool rgbToYuv = false;     // before scaling
    bool yuvToRgb = false;     // behind it
    bool otherMatrix = false;  // behind it
    bool levels = false;       // behind it
    bool floatRgb = false;     // one side is RGB in floats, which has a matrix of its own
    bool alpha = false;        // both sides have it
    bool again = false;        // chroma is brought to its size behind the matrix
    bool pixels = false;       // RGB of unchanged size to chroma of every second pixel
    int fields = 1;
    Scaling scaling[2];  // for each field
    Scaling second[2];   // if `again`
    int workWidth = 0;   // samples of the widest line in work

    // Memory of the bands that are at work, kept between pictures.
    // Makes what so many threads take at once, so that none of them has to later.
    void provideWorkspaces(int threads) const;
    std::unique_ptr<Workspace> takeWorkspace() const;
    void giveBack(std::unique_ptr<Workspace> workspace) const noexcept;
    void keepWorkspaces();  // makes room for those that come back

    Plan();
    ~Plan();
    Plan(const Plan&) = delete;
    Plan& operator=(const Plan&) = delete;

  private:
    static constexpr size_t mostKept = 16;  // as many threads as share a picture

    mutable std::mutex lock_;
    mutable std::vector<std::unique_ptr<Workspace>> idle_;
};

// Lines of field `field` out of `lines`.
constexpr int fieldLines(int lines, int fields, int field) { return (lines + fields - 1 - field) / fields; }

std::shared_ptr<const Plan> planOf(const Request& request);

// Converts target lines first to last - 1 of a field's part of the target rectangle.
void runBand(const Plan& plan, Workspace& workspace, const Picture& source, const Picture& target, int field,
             int first, int last);

}  // namespace srk
