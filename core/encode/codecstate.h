// States of the codecs of an output beyond those of QvCodec.
#pragma once

#include "core/engine/modules/qvcodec.h"

// Between open and close.
constexpr auto qvStateOpen = static_cast<QvCodec::State>(3);
