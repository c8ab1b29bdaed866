// The small values in which the engine talks about media: rates, times, rectangles and bit rates.
#pragma once

#include "core/media/bitrate.h"
#include "core/media/datetime.h"
#include "core/media/mediatime.h"
#include "core/media/qvframerate.h"
#include "core/media/qvratio.h"
#include "core/media/rect.h"
#include "core/media/timecode.h"
