// Several pictures of one format as one.
#pragma once

#include <span>
#include <string>

#include "core/compose/qvviewsetup.h"
#include "core/media/qvbuffer.h"

// Why pictures of this format can't be joined so; empty if they can. Odd sizes leave no whole chroma samples
// at the seams.
std::string qvViewJoinFault(QvViewLayout layout, unsigned fourcc, int width, int height);

// Copies the pictures into `to`, which has their format and the size of all: side by side, over one another
// or row by row.
void qvJoinViews(QvViewLayout layout, std::span<QvFrame* const> views, QvFrame& to);
