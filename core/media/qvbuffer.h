// The buffers that media travel in: pictures and sound.
#pragma once

#include "core/measure/fourcc.h"
#include "core/media/qvframe.h"
#include "core/media/qvpcm.h"
