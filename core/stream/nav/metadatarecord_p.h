// The record of QvMetadataFile: eight slots with a file each.
#pragma once

#include "core/arch/widename.h"
#include "core/stream/bufstream.h"

// Null for a base name that is empty or longer than 2,047 units, or without memory. What is not about slots
// goes to `inner`, which is borrowed and may be null: those calls fail then. Only files that a slot has
// opened are deleted at the end.
bufstream* metadataRecordNew(const QvWideString& baseName, bufstream* inner);
