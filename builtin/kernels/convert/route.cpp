#include "builtin/kernels/convert/route.h"

namespace srk {

namespace {

Change changeOf(const Request& request, const Format& a, const Format& b) {
    const bool fromYuv = a.family() == Family::yuv, toYuv = b.family() == Family::yuv;
    if (!fromYuv && toYuv) return Change::toYuv;
    if (fromYuv && !toYuv) return Change::toRgb;
    if (!fromYuv) return a.family() != b.family() ? Change::levels : Change::none;
    return request.sourceMatrix != request.targetMatrix ? Change::otherMatrix : Change::none;
}

bool scales(const Request& request) {
    const Mapping same;
    return request.across != same || request.down != same || request.left || request.top;
}

Deep deepOf(const Route& route) {
    const auto& request = route.request;
    const bool floats =
        route.source->packing == Packing::floatRgb || route.target->packing == Packing::floatRgb;
    switch (route.change) {
        case Change::none: break;
        case Change::levels: return deepLevels(route.target->family() == Family::video);
        case Change::otherMatrix: return deepToOther(request.sourceMatrix);
        case Change::toYuv:
            return floats ? floatToYuv(request.targetMatrix)
                          : deepToYuv(request.targetMatrix, route.source->family() == Family::video);
        case Change::toRgb:
            return floats ? floatToRgb(request.sourceMatrix)
                          : deepToRgb(request.sourceMatrix, route.target->family() == Family::video);
    }
    return {};
}

}  // namespace

Route routeOf(const Request& request) {
    Route route;
    const Format& a = formats()[static_cast<size_t>(request.source)];
    const Format& b = formats()[static_cast<size_t>(request.target)];
    const Path& path = pathOf(request.source, request.target, Use::scaling);
    if (!path) return route;
    route.request = request;
    route.source = &a;
    route.target = &b;
    route.deep = isDeep(path.from);
    route.change = changeOf(request, a, b);
    route.alpha = a.alpha() && b.alpha();
    if (!scales(request) && route.change != Change::otherMatrix && request.sourceDepth == request.targetDepth)
        route.plain = pathOf(request.source, request.target, Use::plain).from;
    const bool wholeLines = route.plain == Core::lines || route.plain == Core::packed8;
    route.fields = request.interlaced && !wholeLines ? 2 : 1;
    return route;
}

ChangeRows rowsOf(const Route& route) {
    ChangeRows rows;
    rows.toVideo = route.target->family() == Family::video;
    rows.toYuv = &toYuv(route.request.targetMatrix, route.source->family() == Family::video);
    rows.toRgb = &toRgb(route.request.sourceMatrix, rows.toVideo);
    rows.toOther = &toOther(route.request.sourceMatrix);
    rows.deep = deepOf(route);
    return rows;
}

}  // namespace srk
