// The modules of the library, in the order in which lookups find them.
#include <array>
#include <cstring>
#include <memory>

#include "builtin/builtinmodule.h"
#include "builtin/creators.h"
#include "core/arch/qvassert.h"
#include "core/caption/subtitle/qvsubtitlefilter.h"
#include "core/compose/qvviewsetup.h"
#include "core/engine/modules/builtinplugin_p.h"
#include "core/engine/modules/qvplugin.h"

namespace {

using namespace QvModuleType;

// clang-format off
constexpr QvBuiltinRow registered[] = {
    {"filesink",     sink,         "File output",                    "File output",                newFilesink},
    {"nullsink",     sink,         "Null sink",                      "Null",                       newNullsink,
     {.internal = true}},
    {"scaler",       videoFilter,  "Scaler/Color converter",         "Scaler/Color Converter",     newScaler},
    {"vprocess",     videoPipe,    "Video processing pipe",          "Video pipe",                 newVprocess},
    {"encpipe",      encodePipe,   "Default exporter",               "Default exporter",           newEncpipe},
    {"dummyaenc",    audioEncoder, "Pass through audio",             "DV Audio",                   newDummyaenc},
    {"rawdec",       decoder,      "Raw video file reader",          "Raw file import",            newRawdec,
     {.exts = "raw rgb yuv i420 yv12 yuy2 yuyv bgr4 bgr3 bgra rgb3 rgb4 argb v210", .priority = 10,
      .skipAuto = true}},
    {"flipper",      videoFilter,  "Vertical flipper",               "Flip vertically",            newFlipper},
    {"rawmux",       muxer,        "Elementary stream export",       "Elementary",                 newRawmux},
    {"rawvenc",      videoEncoder, "RAW/YUV encoder",                "RAW/YUV",                    newRawvenc,
     {.inFourcc = "BGR4 BGR3 I420 YUY2 YV12 Y216"}},
    {"rawaenc",      audioEncoder, "RAW Wave audio encoder module",  "RAW Wave Audio",             newRawaenc},
    {"frconvert",    videoFilter,  "Framerate converter",            "Change framerate",           newFrconvert},
    {"srconvert",    audioFilter,  "Samplerate converter",           "Change samplerate",          newSrconvert},
    {"deinterlace",  videoFilter,  "Field deinterlace",              "Deinterlace",                newDeinterlace},
    {"logo",         videoFilter,  "Insert logo into frame",         "Logo",                       newLogo},
    {"bobber",       videoFilter,  "Auto bob",                       "Auto bob",                   newBobber,
     {.preroll = 1}},
    {"cropper",      videoFilter,  "Crop filter",                    "Crop/pad",                   newCropper},
    {"timecode",     videoFilter,  "Timecode inserter",              "Timecode",                   newTimecode},
    {"subimport",    decoder,      "Text subtitle importer",         "Subtitle import",            newSubimport,
     {.exts = "sub srt", .priority = 10}},
    {"testgen",      decoder,      "Test stream generator",          "Test input",                 newTestgen,
     {.exts = "", .priority = 10, .skipAuto = true, .internal = true}},
    {"chconvert",    audioFilter,  "Audio channel number converter", "Channel mapping",            newChconvert},
    {"aquant",       audioFilter,  "Audio quantization converter",   "Change sample format",       newAquant},
    {"aprocess",     audioPipe,    "Audio processing pipe",          "Audio processing pipe",      newAprocess},
    {"avol",         audioFilter,  "Audio volume",                   "Audio volume",               newAvol},
    {"rawdump",      videoFilter,  "Raw frame dump (debug)",         "Raw frame dump (debug)",     newRawdump},
    {"brightness",   videoFilter,  "Brightness/contrast/gamma",      "Brightness/contrast/gamma",  newBrightness},
    {"animatedlogo", videoFilter,  "Animated logo",                  "Animated logo",              newAnimatedlogo},
    {"nullmux",      muxer,        "Dummy multiplexer",              "Null",                       newNullmux,
     {.internal = true}},
    {"normalizer",   audioFilter,  "Normalize Sound Level",          "Normalizer",                 newNormalizer},
    {"dynamics",     audioFilter,  "Dynamics Processing",            "Dynamics Processing",        newDynamics},
    {"adelay",       audioFilter,  "Audio delay",                    "Audio delay",                newAdelay},
    {"p2dec",        decoder,      "P2 decoder wrapper",             "P2 decoder wrapper",         newP2dec,
     {.exts = "xml", .priority = 9}},
    {"userdata",     videoFilter,  "User data callback filter",      "User data callback filter",  newUserdata},
    {"rawavimux",    muxer,        "Uncompressed AVI muxer",         "AVI Stream",                 newRawavimux},
    {"wavdec",       decoder,      "WAV file import",                "WAV file import",            newWavdec,
     {.exts = "wav", .priority = 10}},
    {"aumixdec",     decoder,      "Mixing audio import",            "Mixing audio import",        newAumixdec,
     {.exts = "mmf", .priority = 11}},
    {"mvprocess",    videoPipe,    "Multi-View process pipeline",    "MV process",                 newMvprocess},
    {"mvmetadec",    decoder,      "MV interleaving importer",       "MV import",                  newMvmetadec,
     {.exts = "mmf mvf", .priority = 10}},
    {"memmux",       muxer,        "Memory buffer 'multiplexer'",    "Stream output",              newMemmux,
     {.internal = true}},
    {"memsink",      sink,         "Memory sink",                    "Memory sink",                newMemsink,
     {.internal = true}},
    {"sccdec",       decoder,      "Scenarist SCC CC reader",        "SCC reader",                 newSccdec,
     {.exts = "scc sc2", .priority = 10, .internal = true}},
    {"videofade",    videoFilter,  "Video fade filter",              "Video fade filter",          newVideofade},
    {"audiolevel",   audioFilter,  "Audio level filter",             "Audio level filter",         newAudiolevel},
    {"panning",      videoFilter,  "Audio panning filter",           "Audio panning filter",       newPanning},
};
static_assert(std::size(registered) == 44);

// Module classes that the registry does not list; code of the library makes them by class ("builtin/modules.h").
constexpr QvBuiltinRow unregistered[] = {
    {"subtitle",     videoFilter,  "Subtitle render",                "Subtitle render",            newSubtitle},
    {"meminput",     decoder,      "Memory input",                   "Memory input",               newMeminput,
     {.internal = true}},
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
    QvViewSetup::registerElement();
    if (plugin.nrModules() == 0) addModules(plugin);
    return &plugin;
}

QvPlugin* qvSubtitlePlugin() {
    static QvPlugin plugin("subtitle", "Subtitle render");
    if (plugin.nrModules() == 0)
        plugin.addModule(std::make_unique<QvBuiltinModule>(qvBuiltinRow("subtitle")).release());
    return &plugin;
}
