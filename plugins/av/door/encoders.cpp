#include <cstring>
#include <string>

#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/measure/fourcc.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"
#include "plugins/av/door/avmodules.h"
#include "plugins/av/door/ownpresets.h"

namespace av {
namespace {

struct EncoderModule {
    const char* name;
    int type;
    const char* description;
    const char* displayName;
    const char* muxers;     // more than the engine's own table has, separated by ' '
    bool onlyKeys = false;  // each picture is coded by itself
};

constexpr int video = QvModuleType::videoEncoder;
constexpr int audio = QvModuleType::audioEncoder;

// clang-format off
constexpr EncoderModule modules[] = {
    {"h264venc",      video, "H.264 encoder",          "H.264",      "rawmux mp4mux movmux mkvmux mptsmux mpegpsmux mxfmux"},
    {"mpegvenc",      video, "MPEG-1 and -2 encoder",  "MPEG-1/2",   "rawmux mp4mux movmux mkvmux mptsmux mpegpsmux mxfmux"},
    {"mpeg4venc",     video, "MPEG-4 Visual encoder",  "MPEG-4",     "rawmux mp4mux movmux mkvmux mptsmux"},
    {"vc3venc",       video, "VC-3 (DNxHD, DNxHR) encoder", "VC-3",  "rawmux movmux mkvmux mxfmux", true},
    {"dvvenc",        video, "DV encoder",             "DV",         "rawmux dvmux dvavimux movmux mkvmux mxfmux", true},
    {"dv100venc",     video, "DVCPRO HD encoder",      "DVCPRO HD",  "rawmux dv100mux dvavimux movmux mkvmux mxfmux", true},
    {"mj2kvenc",      video, "JPEG 2000 encoder",      "JPEG 2000",  "rawmux mj2mux movmux mkvmux mxfmux", true},
    {"h265venc",      video, "H.265 encoder",          "H.265",      "rawmux mp4mux movmux mkvmux mptsmux"},
    {"proresvenc",    video, "ProRes encoder",         "ProRes",     "movmux mkvmux mxfmux", true},
    {"ffv1venc",      video, "FFV1 encoder",           "FFV1",       "mkvmux"},
    {"av1venc",       video, "AV1 encoder",            "AV1",        "webmmux mkvmux mp4mux"},
    {"aacaenc",       audio, "AAC encoder",            "AAC",        "rawmux mp4mux movmux mkvmux mptsmux mpegpsmux"},
    {"mpegaenc",      audio, "MPEG audio layer 2 encoder", "MPEG Audio", "rawmux mkvmux mptsmux mpegpsmux"},
    {"mpegpcmenc",    audio, "PCM encoder",            "PCM",        "movmux mkvmux mxfmux mpegpsmux"},
    {"mp3aenc",       audio, "MP3 encoder",            "MP3",        "rawmux mp4mux movmux mkvmux mptsmux"},
    {"ddaenc",        audio, "AC-3 encoder",           "Dolby Digital", "rawmux mp4mux movmux mkvmux mptsmux mpegpsmux"},
    {"ddproaenc",     audio, "AC-3 encoder, 5.1",      "Dolby Digital Pro", "rawmux mp4mux movmux mkvmux mptsmux mpegpsmux"},
    {"ddplusproaenc", audio, "E-AC-3 encoder",         "Dolby Digital Plus", "rawmux mp4mux movmux mkvmux mptsmux"},
    {"flacaenc",      audio, "FLAC encoder",           "FLAC",       "flacmux oggmux mkvmux mp4mux"},
    {"opusaenc",      audio, "Opus encoder",           "Opus",       "oggmux webmmux mkvmux mp4mux mptsmux"},
};
// clang-format on

AnyVector wordsOf(const char* text) {
    AnyVector all;
    while (*text) {
        const std::size_t length = std::strcspn(text, " ");
        all.append(Any(std::string(text, length).c_str()));
        text += length;
        text += std::strspn(text, " ");
    }
    return all;
}

}  // namespace

void addEncoders(QvPlugin& plugin, const std::shared_ptr<CodecLibrary>& library) {
    for (const EncoderModule& row : modules) {
        QvModule* const module = newModule(library, row.type, row.name, row.description, row.displayName);
        module->setAttr("compatMuxers", wordsOf(row.muxers));
        if (row.onlyKeys) module->setAttr("onlyKeys", 1);
        plugin.addModule(module);
    }
    AnyVector presets;
    for (const OwnPreset& row : ownPresets) {
        AnyDict preset("profile", row.profile, "name", row.name, "group", row.group);
        if (*row.video) preset.set("video", wordsOf(row.video));
        preset.set("audio", wordsOf(row.audio));
        preset.set("muxers", wordsOf(row.muxers));
        presets.append(preset);
    }
    plugin.setAttr("presets", presets);
}

}  // namespace av
