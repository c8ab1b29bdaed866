#include "builtin/sinks/filelesssink.h"

#include "core/engine/modules/params.h"
#include "core/measure/qvgeometry.h"

int FilelessSink::setParam(const char* name, const Any& value) {
    static constexpr QvParamRow<FilelessSink> rows[] = {
        {"filename", {}, qvParamIgnored},
        {"bufsize", {}, qvParamIgnored},
    };
    if (auto result = _setRow<FilelessSink>(rows, *this, name, value)) return *result;
    return QvSink::setParam(name, value);
}
