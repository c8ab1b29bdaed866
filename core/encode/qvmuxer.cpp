#include "core/encode/qvmuxer.h"

#include <cstring>

#include "core/arch/qvexception.h"
#include "core/engine/modules/params.h"
#include "core/measure/qvgeometry.h"

namespace {

constexpr QvParamRow<QvMuxer> rows[] = {
    {.name = "profile", .flags = qvParamIgnored},
    {.name = "type", .flags = qvParamIgnored},
    {.name = "pal", .flags = qvParamIgnored},
    {.name = "filename", .flags = qvParamIgnored},
    {.name = "settings", .flags = qvParamIgnored},
    {.name = "bitrate", .flags = qvParamIgnored},
    {.name = "adjustSettings", .flags = qvParamIgnored},
    {.name = "_totalFrames", .flags = qvParamIgnored},
    {.name = "meta", .flags = qvParamIgnored},
    {.name = "timecodeOffset", .flags = qvParamIgnored},
};

}  // namespace

const char* qvStreamTypeName(int type) {
    switch (type) {
        case qvVideoStream: return "video";
        case qvAudioStream: return "audio";
        default: return "subpic";
    }
}

int QvMuxer::flush() { return QvStatus::ok; }

int QvMuxer::muxElementaryStreams(QvFileMuxConfig&, QvBufStream&) { return QvStatus::failed; }

int QvMuxer::setStreamParams(int program, int stream, const AnyDict& params) {
    int sum = 0;
    for (const auto [name, value] : params) {
        try {
            sum += setStreamParam(program, stream, name, *value);
        } catch (const QvParamException&) {
            continue;
        }
    }
    return sum;
}

void QvMuxer::getStreamParams(int, int, AnyDict& params) const { params.clear(); }

int QvMuxer::setStreamParam(int, int, const char*, const Any&) { return QvStatus::invalidParam; }

void QvMuxer::getStreamParam(int program, int stream, const char* name, Any& value) const {
    AnyDict params;
    getStreamParams(program, stream, params);
    value = params.get(name);
}

int QvMuxer::setParam(const char* name, const Any& value) {
    if (auto result = _setRow<QvMuxer>(rows, *this, name, value)) return *result;
    return QvCodec::setParam(name, value);
}

void QvMuxer::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "maxStreams") == 0)
        value = AnyDict("vids", 1, "auds", 1, "subs", 0, "total", 2);
    else if (std::strcmp(name, "programsSupported") == 0)
        value = 0;
    else
        QvCodec::getParam(name, value);
}

void* QvMuxer::getInterface(int kind) const { return kind == 10 ? const_cast<QvMuxer*>(this) : nullptr; }
