// The plain list of a conversion: every line is unpacked, scaled by both passes and packed, however little
// there is to do.
#pragma once

#include "builtin/kernels/convert/route.h"
#include "builtin/kernels/convert/stages.h"

namespace srk {

StageList basicStages(const Route& route, int field);

}  // namespace srk
