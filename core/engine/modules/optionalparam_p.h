// Parameters that their target need not know.
#pragma once

#include "core/arch/qvexception.h"
#include "core/engine/modules/qvcodec.h"
#include "core/engine/status.h"

// Sets the parameter; a codec that doesn't know it is passed over. Its result, or QvStatus::invalidParam.
inline int qvSetOptionalParam(QvCodec& codec, const char* name, const Any& value) {
    try {
        return codec.setParam(name, value);
    } catch (const QvParamException&) {
        return QvStatus::invalidParam;
    }
}
