// Copies of frames that are worked on: an assignment for which there is no memory leaves a frame without
// planes.
#pragma once

#include <new>

#include "core/media/qvframe.h"

// Throws bad_alloc if there is no memory for the planes.
inline void qvCopyWhole(QvFrame& to, const QvFrame& from) {
    if (to.copy(from) != 0) throw std::bad_alloc();
}
