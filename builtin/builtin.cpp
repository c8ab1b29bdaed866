// The modules of the library, in the order in which lookups find them.
#include <array>
#include <cstring>
#include <memory>

#include "builtin/builtinmodule.h"
#include "builtin/creators.h"
#include "core/engine/builtinplugin_p.h"
#include "core/engine/qvplugin.h"
#include "core/value/qvassert.h"

namespace {

using namespace QvModuleType;

// clang-format off
constexpr QvBuiltinRow registered[] = {
    {"filesink",     sink,         "File output",                   "File output"},
    {"nullsink",     sink,         "Null sink",                     "Null", .internal = true},
    {"scaler",       videoFilter,  "Scaler/Color converter",        "Scaler/Color Converter"},
    {"vprocess",     videoPipe,    "Video processing pipe",         "Video pipe"},
    {"encpipe",      encodePipe,   "Default exporter",              "Default exporter"},
    {"dummyaenc",    audioEncoder, "Pass through audio",            "DV Audio"},
    {"rawdec",       decoder,      "Raw video file reader",         "Raw file import",
     .exts = "raw rgb yuv i420 yv12 yuy2 yuyv bgr4 bgr3 bgra rgb3 rgb4 argb v210", .priority = 10,
     .skipAuto = true},
    {"flipper",      videoFilter,  "Vertical flipper",              "Flip vertically"},
    {"rawmux",       muxer,        "Elementary stream export",      "Elementary"},
    {"rawvenc",      videoEncoder, "RAW/YUV encoder",               "RAW/YUV",
     .inFourcc = "BGR4 BGR3 I420 YUY2 YV12 Y216"},
    {"rawaenc",      audioEncoder, "RAW Wave audio encoder module", "RAW Wave Audio"},
    {"frconvert",    videoFilter,  "Framerate converter",           "Change framerate"},
    {"srconvert",    audioFilter,  "Samplerate converter",          "Change samplerate"},
    {"deinterlace",  videoFilter,  "Field deinterlace",             "Deinterlace"},
    {"logo",         videoFilter,  "Insert logo into frame",        "Logo"},
    {"bobber",       videoFilter,  "Auto bob",                      "Auto bob"},
    {"cropper",      videoFilter,  "Crop filter",                   "Crop/pad"},
    {"timecode",     videoFilter,  "Timecode inserter",             "Timecode"},
    {"subimport",    decoder,      "Text subtitle importer",        "Subtitle import",
     .exts = "sub srt", .priority = 10},
    {"testgen",      decoder,      "Test stream generator",         "Test input",
     .exts = "", .priority = 10, .skipAuto = true, .internal = true},
    {"chconvert",    audioFilter,  "Audio channel number converter", "Channel mapping"},
    {"aquant",       audioFilter,  "Audio quantization converter",  "Change sample format"},
    {"aprocess",     audioPipe,    "Audio processing pipe",         "Audio processing pipe"},
    {"avol",         audioFilter,  "Audio volume",                  "Audio volume"},
    {"rawdump",      videoFilter,  "Raw frame dump (debug)",        "Raw frame dump (debug)"},
    {"brightness",   videoFilter,  "Brightness/contrast/gamma",     "Brightness/contrast/gamma"},
    {"animatedlogo", videoFilter,  "Animated logo",                 "Animated logo"},
    {"nullmux",      muxer,        "Dummy multiplexer",             "Null", .internal = true},
    {"normalizer",   audioFilter,  "Normalize Sound Level",         "Normalizer"},
    {"dynamics",     audioFilter,  "Dynamics Processing",           "Dynamics Processing"},
    {"adelay",       audioFilter,  "Audio delay",                   "Audio delay"},
    {"p2dec",        decoder,      "P2 decoder wrapper",            "P2 decoder wrapper",
     .exts = "xml", .priority = 9},
    {"userdata",     videoFilter,  "User data callback filter",     "User data callback filter"},
    {"rawavimux",    muxer,        "Uncompressed AVI muxer",        "AVI Stream"},
    {"wavdec",       decoder,      "WAV file import",               "WAV file import",
     .exts = "wav", .priority = 10},
    {"aumixdec",     decoder,      "Mixing audio import",           "Mixing audio import",
     .exts = "mmf", .priority = 11},
    {"mvprocess",    videoPipe,    "Multi-View process pipeline",   "MV process"},
    {"mvmetadec",    decoder,      "MV interleaving importer",      "MV import",
     .exts = "mmf mvf", .priority = 10},
    {"memmux",       muxer,        "Memory buffer 'multiplexer'",   "Stream output", .internal = true},
    {"memsink",      sink,         "Memory sink",                   "Memory sink", .internal = true},
    {"sccdec",       decoder,      "Scenarist SCC CC reader",       "SCC reader",
     .exts = "scc sc2", .priority = 10, .internal = true},
    {"videofade",    videoFilter,  "Video fade filter",             "Video fade filter"},
    {"audiolevel",   audioFilter,  "Audio level filter",            "Audio level filter"},
    {"panning",      audioFilter,  "Audio panning filter",          "Audio panning filter"},
};
static_assert(std::size(registered) == 44);

// Module classes that the registry does not offer by itself; an application adds them in a plug-in of its own.
constexpr QvBuiltinRow unregistered[] = {
    {"subtitle",     videoFilter,  "Subtitle render",               "Subtitle render"},
    {"meminput",     decoder,      "Memory input",                  "Memory input", .internal = true},
};
// clang-format on

void addModules(QvPlugin& plugin) {
    for (const auto& row : registered) plugin.addModule(std::make_unique<QvBuiltinModule>(row).release());
}

}  // namespace

const QvBuiltinRow& qvBuiltinRow(const char* name) {
    for (const auto& row : registered)
        if (std::strcmp(row.name, name) == 0) return row;
    for (const auto& row : unregistered)
        if (std::strcmp(row.name, name) == 0) return row;
    QV_FAIL("no such built-in module");
}

QvPlugin* qvBuiltinPlugin() {
    static QvPlugin plugin("builtin", "Builtin modules");
    if (plugin.nrModules() == 0) addModules(plugin);
    return &plugin;
}
