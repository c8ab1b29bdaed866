#include "core/filter/srscaler.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include "builtin/kernels/convert/plan.h"
#include "builtin/kernels/convert/workspace.h"
#include "builtin/kernels/formats/formats.h"
#include "core/engine/threads/qvthreadpool.h"
#include "core/measure/fourcc.h"

namespace srk {

namespace {

constexpr int mostThreads = 16;
constexpr int bandsPerThread = 2;  // a helper that wakes late leaves more to the others
constexpr int leastBandLines = 8;
constexpr uint32_t extended = qvFourcc("EXT1"), hdyc = qvFourcc("HDYC");

// One side of a call.
struct Side {
    uint32_t fourcc;
    const void* data;
    int stride, width, height;
};

// A format whose alpha would be dropped anyway.
uint32_t withoutAlpha(uint32_t fourcc) {
    switch (fourcc) {
        case qvFourcc("BGRA"): return qvFourcc("BGR4");
        case qvFourcc("R32A"): return qvFourcc("R32C");
        case qvFourcc("VUYA"): return qvFourcc("VUY4");
        default: return fourcc;
    }
}

const QvScalePicture* extension(const Side& side) {
    return side.fourcc == extended ? static_cast<const QvScalePicture*>(side.data) : nullptr;
}

// False: no such picture.
bool unwrap(Side& side) {
    if (!side.data) return false;
    if (const auto* picture = extension(side)) {
        if (picture->tag != extended) return false;
        side.fourcc = picture->fourcc;
        side.width = picture->width;
        side.height = picture->height;
    }
    return side.width > 0 && side.height > 0;
}

bool describe(Picture& picture, const Side& side, int number) {
    picture.number = number & 0xffff;
    picture.format = &formats()[static_cast<size_t>(picture.number)];
    picture.depth = number >> 16 ? number >> 16 : 16;
    picture.width = side.width;
    picture.height = side.height;
    return true;
}

bool placePlanes(Picture& picture, const Side& original) {
    if (const auto* record = extension(original)) {
        const int strides[3] = {record->stride, record->stride1, record->stride2};
        return layOut(picture, record->planes, strides);
    }
    return layOut(picture, static_cast<Byte*>(const_cast<void*>(original.data)), original.stride);
}

// A span from centre to centre of the outermost source samples, in 1/256, over n target samples: shrunk so
// that the centre of a target sample lies over the middle of the source samples that it covers.
Mapping shrunk(long long first, long long last, int n, unsigned rule) {
    const long long span = last - first;
    const long long t = (std::llabs(span) + n + 256) / (2LL * n);
    const long long shift = last > first ? t - 128 : 128 - t;
    if (rule != 1) first += rule == 2 ? 2 * shift : shift;
    if (rule != 2) last -= rule == 1 ? 2 * shift : shift;
    const double start = static_cast<double>(first) / 256;
    if (n == 1) return {start, 1};
    return {start, static_cast<double>(last - first) / 256 / (n - 1)};
}

struct Rect {
    int left, top, right, bottom;
};

// The part of the target that is written; its corner lies on whole groups of samples.
bool targetRect(unsigned mode, const int* rectangles, const Picture& target, bool interlaced,
                Request& request) {
    Rect rect = {0, 0, target.width - 1, target.height - 1};
    if ((mode & QvScale::placeTarget) && rectangles) {
        rect = {rectangles[4], rectangles[5], std::min(rectangles[6], rect.right),
                std::min(rectangles[7], rect.bottom)};
        const int across = target.format->packing == Packing::v210 ? 6 : target.format->across();
        const int down = target.format->down() * (interlaced ? 2 : 1);
        if (rect.left < 0 || rect.top < 0) return false;
        rect.left -= rect.left % across;
        rect.top -= rect.top % down;
    }
    if (rect.right < rect.left || rect.bottom < rect.top) return false;
    request.left = rect.left;
    request.top = rect.top;
    request.width = rect.right - rect.left + 1;
    request.height = rect.bottom - rect.top + 1;
    return true;
}

void sourceMapping(unsigned mode, unsigned flags, const int* rectangles, const Picture& source,
                   Request& request) {
    long long left = 0, top = 0, right = (source.width - 1) * 256LL, bottom = (source.height - 1) * 256LL;
    unsigned across = 0, down = 0;
    if ((mode & QvScale::cropSource) && rectangles) {
        left = rectangles[0];
        top = rectangles[1];
        right = rectangles[2];
        bottom = rectangles[3];
        across = flags >> 12 & 3;
        down = flags >> 14 & 3;
    }
    request.across = shrunk(left, right, request.width, across);
    request.down = shrunk(top, bottom, request.height, down);
}

// Planes that begin at the target rectangle.
Picture corner(Picture target, const Request& request) {
    const Format& format = *target.format;
    for (int p = 0; p < format.planes(); ++p) {
        const int down = p ? format.down() : 1;
        if (target.planes[p].data)
            target.planes[p].data +=
                target.planes[p].stride * (request.top / down) + lineBytes(format, request.left, p);
    }
    target.width = request.width;
    target.height = request.height;
    return target;
}

Filter filterOf(unsigned flags) {
    switch (flags & QvScale::kindMask) {
        case QvScale::nearest: return Filter::nearest;
        case QvScale::high: return Filter::sinc;
        default: return Filter::cubic;
    }
}

Matrix matrixOf(unsigned flags, unsigned bit709) { return flags & bit709 ? Matrix::bt709 : Matrix::bt601; }

// Without a line of each plane in each field a picture counts as progressive.
bool hasFields(const Picture& picture) { return picture.height / picture.format->down() > 1; }

struct BandRange {
    int field, first, last;
};

// Bands of one field follow each other; the last one takes what the others leave.
BandRange bandRange(const Plan& plan, int bands, int band) {
    const int fields = plan.route.fields, perField = bands / fields;
    const int field = band % fields, index = band / fields;
    const int lines = fieldLines(plan.route.request.height, fields, field);
    const int step = plan.route.target->down();
    const int height = std::max((lines + 1) / perField / step * step, step);
    const int first = std::min(index * height, lines);
    return {field, first, index == perField - 1 ? lines : std::min(first + height, lines)};
}

int threadCount(unsigned mode) {
    return mode & QvScale::oneThread ? 1 : std::min(qvThreadPool().width(), mostThreads);
}

int bandCount(int threads, const Plan& plan) {
    int bands = threads == 1 ? 1 : bandsPerThread * threads;
    bands = std::clamp((plan.route.request.height + 4) / leastBandLines, 1, bands);
    return plan.route.fields == 2 ? std::max(2, (bands + 1) / 2 * 2) : bands;
}

// Returns a workspace also when a band throws.
class Borrowed {
  public:
    explicit Borrowed(const Plan& plan) : plan_(plan), workspace_(plan.takeWorkspace()) {}
    ~Borrowed() { plan_.giveBack(std::move(workspace_)); }
    Borrowed(const Borrowed&) = delete;
    Borrowed& operator=(const Borrowed&) = delete;
    Workspace& get() { return *workspace_; }

  private:
    const Plan& plan_;
    std::unique_ptr<Workspace> workspace_;
};

void run(unsigned mode, const Plan& plan, const Picture& source, const Picture& target) {
    const int threads = threadCount(mode);
    const int bands = bandCount(threads, plan);
    plan.provideWorkspaces(std::min(threads, bands));
    const auto work = [&](int band) {
        const auto range = bandRange(plan, bands, band);
        if (range.first >= range.last) return;
        Borrowed workspace(plan);
        runBand(plan, workspace.get(), source, target, range.field, range.first, range.last);
    };
    if (threads == 1)
        for (int band = 0; band < bands; ++band) work(band);
    else
        qvThreadPool().parallelFor(bands, work);
}

bool scale(unsigned mode, Side from, Side to, unsigned flags, const int* rectangles) {
    const Side givenFrom = from, givenTo = to;
    if (!unwrap(from) || !unwrap(to)) return false;
    if (from.fourcc != to.fourcc) from.fourcc = withoutAlpha(from.fourcc);
    if (from.fourcc == hdyc) flags = (flags & ~QvScale::source601) | QvScale::source709;
    if (to.fourcc == hdyc) flags = (flags & ~QvScale::target601) | QvScale::target709;
    const int sourceNumber = formatNumber(from.fourcc), targetNumber = formatNumber(to.fourcc);
    if (sourceNumber < 0 || targetNumber < 0) return false;
    Picture source, target;
    describe(source, from, sourceNumber);
    describe(target, to, targetNumber);
    if (!placePlanes(source, givenFrom) || !placePlanes(target, givenTo)) return false;

    Request request;
    request.interlaced = (flags & QvScale::interlaced) && hasFields(source) && hasFields(target);
    if (flags & QvScale::clip) {
        mode &= ~QvScale::cropSource;
        source.width = target.width = std::min(source.width, target.width);
        source.height = target.height = std::min(source.height, target.height);
        flags &= ~QvScale::kindMask;
    }
    request.source = source.number;
    request.sourceDepth = source.depth;
    request.sourceWidth = source.width;
    request.sourceHeight = source.height;
    request.target = target.number;
    request.targetDepth = target.depth;
    request.filter = filterOf(flags);
    request.standard = request.filter == Filter::cubic;
    request.sourceMatrix = matrixOf(flags, QvScale::source709);
    request.targetMatrix = matrixOf(flags, QvScale::target709);
    if (!targetRect(mode, rectangles, target, request.interlaced, request)) return false;
    sourceMapping(mode, flags, rectangles, source, request);
    const auto plan = planOf(request);
    if (!plan) return false;
    run(mode, *plan, source, corner(target, request));
    return true;
}

}  // namespace

}  // namespace srk

int SRScaler(unsigned mode, unsigned sourceFourcc, const void* source, int sourceStride, int sourceWidth,
             int sourceHeight, unsigned targetFourcc, void* target, int targetStride, int targetWidth,
             int targetHeight, long long, unsigned flags, const int* rectangles) {
    return srk::scale(mode, {sourceFourcc, source, sourceStride, sourceWidth, sourceHeight},
                      {targetFourcc, target, targetStride, targetWidth, targetHeight}, flags, rectangles)
               ? 1
               : 0;
}
