#include "builtin/pipes/output/members/pipehost.h"

#include <cstdarg>

#include "core/arch/formattext_p.h"
#include "core/arch/qvexception.h"
#include "core/engine/modules/qvcodec.h"
#include "core/engine/status.h"

int PipeHost::fail(int code, const char* format, ...) {
    va_list args;
    va_start(args, format);
    const QvFormattedText<1023> text(format, args);
    va_end(args);
    storeFailure(code, text.text());
    return code;
}

int PipeHost::take(const QvCodec& member, int result) {
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
