// The record of an output that counts bytes and drops them.
#pragma once

#include "core/stream/bufstream.h"

// Null without memory; `onError`, which may be null, gets the reason.
bufstream* nullRecordNew(unsigned size, void (*onError)(const char* text));
