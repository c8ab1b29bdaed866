// The small values in which the engine talks about media: rates, times, rectangles and bit rates.
#pragma once

#include "core/measure/bitrate.h"
#include "core/measure/datetime.h"
#include "core/measure/mediatime.h"
#include "core/measure/qvframerate.h"
#include "core/measure/qvratio.h"
#include "core/measure/rect.h"
#include "core/measure/timecode.h"
