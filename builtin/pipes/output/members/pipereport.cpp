#include "builtin/pipes/output/members/pipereport.h"

#include <cstdarg>

#include "core/arch/formattext_p.h"
#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/engine/modules/qvcodec.h"
#include "core/engine/status.h"

namespace {

using Text = QvFormattedText<1023>;

}  // namespace

int PipeReport::fail(int code, const char* format, ...) {
    va_list args;
    va_start(args, format);
    const Text text(format, args);
    va_end(args);
    storeFailure(code, text.text());
    return code;
}

void PipeReport::failHard(int code, const char* format, ...) {
    va_list args;
    va_start(args, format);
    const Text text(format, args);
    va_end(args);
    storeFailure(code, text.text());
    QV_FAIL(text.text());
}

int PipeReport::take(const QvCodec& member, int result) {
    storeFailure(member.errorCode() != 0 ? member.errorCode() : result, member.errorDesc());
    return result;
}

int qvOfferParam(QvCodec& member, const char* name, const Any& value) {
    try {
        const int result = member.setParam(name, value);
        return result == QvStatus::invalidParam ? QvStatus::ok : result;
    } catch (const QvParamException&) {
        return QvStatus::ok;
    }
}
