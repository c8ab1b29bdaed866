// The presets of this plug-in. Tasks and users' presets store the numbers: they never change.
#pragma once

namespace av {

struct OwnPreset {
    int profile;
    const char* symbol;
    const char* name;
    const char* group;
    const char *video, *audio, *muxers;  // names separated by ' ', the default first
};

inline constexpr int ownPresetOfAll = 0x2800030;  // every codec and every multiplexer

inline constexpr OwnPreset ownPresets[] = {
    {0x2800001, "AV_WEB_H264", "H.264 for the web", "Web", "h264venc", "aacaenc", "mp4mux"},
    {0x2800002, "AV_WEB_H265", "H.265", "Web", "h265venc", "aacaenc", "mp4mux mkvmux rawmux"},
    {0x2800003, "AV_WEB_AV1", "AV1", "Web", "av1venc", "opusaenc", "webmmux mkvmux"},
    {0x2800004, "AV_MKV_H264", "H.264 in Matroska", "Web", "h264venc", "aacaenc", "mkvmux"},
    {0x2800010, "AV_PRORES", "ProRes master", "Masters", "proresvenc", "mpegpcmenc", "movmux"},
    {0x2800011, "AV_DNXHR", "DNxHR master", "Masters", "vc3venc", "mpegpcmenc", "mxfmux movmux"},
    {0x2800012, "AV_FFV1", "FFV1 archive", "Masters", "ffv1venc", "flacaenc", "mkvmux"},
    {0x2800013, "AV_MOV_H264", "H.264 in QuickTime", "Masters", "h264venc", "aacaenc", "movmux"},
    {0x2800020, "AV_MP3", "MP3", "Sound", "", "mp3aenc", "rawmux"},
    {0x2800021, "AV_AAC", "AAC", "Sound", "", "aacaenc", "mp4mux rawmux"},
    {0x2800022, "AV_FLAC", "FLAC", "Sound", "", "flacaenc", "flacmux oggmux"},
    {0x2800023, "AV_OPUS", "Opus", "Sound", "", "opusaenc", "oggmux"},
    // What is asked for by the names of codecs alone.
    {ownPresetOfAll, "AV_ANY", "Any codecs", "Any",
     "h264venc h265venc av1venc mpegvenc mpeg4venc vc3venc dvvenc dv100venc mj2kvenc proresvenc ffv1venc "
     "rawvenc",
     "aacaenc mpegaenc mpegpcmenc mp3aenc ddaenc ddproaenc ddplusproaenc flacaenc opusaenc rawaenc",
     "mkvmux movmux mp4mux mxfmux mptsmux mpegpsmux webmmux dvavimux dvmux y4mmux flacmux oggmux rawmux "
     "unitmux"},
};

// "" for a number that none of them has.
constexpr const char* ownPresetSymbol(int profile) {
    for (const OwnPreset& row : ownPresets)
        if (row.profile == profile) return row.symbol;
    return "";
}

}  // namespace av
