// The video filter "subtitle", which burns a subtitle file into the picture. The registry doesn't list it
// until an application adds it:
//
//     qv_registry()->addPlugin(qvSubtitlePlugin());
//     QvCodec* filter = qv_registry()->newCodec("subtitle");
//     filter->setParam("subtitle_filename", "talk.srt");
//
// From then on it can stand in filter lists and stored tasks. Its parameters: "subtitle_filename",
// "font_filename", "font_size" (pixels), "speed", "delay" (ms), "encoding" (0 ASCII, 1 UTF-8, 2 UTF-16, 3
// UTF-32, from 4 on a code page), "framerate" (of a "sub" file), "fontEffect" (0 none, 1 outline, 2 and 3
// with a shadow), "pixelAspect", "color" (0xRRGGBB).
#pragma once

#include "core/arch/api.h"

class QvPlugin;

// Of one module; lives to the end of the process.
QV_API QvPlugin* qvSubtitlePlugin();
