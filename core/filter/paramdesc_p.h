// Descriptions of filter parameters for user interfaces: the operations of QvProcessUtil of these names.
#pragma once

#include "core/value/anycontainer.h"

AnyDict qvCreateParamDesc(const char* name, int type, int guiControl, const char* description, const Any& min,
                          const Any& max, const Any& step);
AnyDict qvCreateParamDesc(const char* name, int type, int guiControl, const char* description,
                          const AnyVector& allowed);
bool qvCheckParamDesc(const AnyDict& desc, Any* error);
