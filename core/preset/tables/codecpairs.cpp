#include "core/preset/tables/codecpairs_p.h"

#include <string_view>

#include "core/engine/modules/qvmodule.h"
#include "core/preset/tables/profilesymbols_p.h"

namespace {

constexpr int video = QvModuleType::videoEncoder;
constexpr int audio = QvModuleType::audioEncoder;

// clang-format off
constexpr CodecPairs pairs[] = {
    {"rawvenc",       video, {"rawmux", "rawavimux"}},
    {"rawaenc",       audio, {"rawmux", "rawavimux", "mvrawmux"}},
    {"mpegvenc",      video, {"mpegpsmux", "mpegtsmux", "mptsmux", "rawmux", "mp4mux", "mxfmux"}},
    {"mpegaenc",      audio, {"mpegpsmux", "mpegtsmux", "mptsmux", "rawmux", "mvrawmux"}},
    {"mpegpcmenc",    audio, {"mpegpsmux", "mpegtsmux", "mptsmux", "mp4mux", "mj2mux", "mxfmux"}},
    {"vc1venc",       video, {"rawmux", "asfmux", "mpegtsmux", "mptsmux"}},
    {"wmaaenc",       audio, {"asfmux"}},
    {"mj2kvenc",      video, {"rawmux", "mj2mux", "mxfmux"}},
    {"aacaenc",       audio, {"mj2mux", "rawmux", "mpegpsmux", "mpegtsmux", "mptsmux", "mp4mux", "mkvmux", "mvrawmux"}},
    {"h264venc",      video, {"rawmux", "mp4mux", "mpegpsmux", "mpegtsmux", "mptsmux"}},
    {"h264mfxvenc",   video, {"rawmux", "mp4mux", "mpegpsmux", "mpegtsmux", "mptsmux"}},
    {"bch264venc",    video, {"mxfmux", "rawmux", "mp4mux", "mpegpsmux", "mpegtsmux", "mptsmux"}},
    {"h264cudavenc",  video, {"mxfmux", "rawmux", "mp4mux", "mpegpsmux", "mpegtsmux", "mptsmux"}},
    {"h264openclvenc", video, {"mxfmux", "rawmux", "mp4mux", "mpegpsmux", "mpegtsmux", "mptsmux"}},
    {"svcvenc",       video, {"rawmux"}},
    {"divxh264venc",  video, {"mkvmux"}},
    {"dvvenc",        video, {"dvmux", "dvavimux", "mxfmux"}},
    {"dv100venc",     video, {"dv100mux", "dvavimux", "mxfmux"}},
    {"dummyaenc",     audio, {"dvavimux", "dvmux", "dv100mux"}},
    {"ddaenc",        audio, {"rawmux", "mpegpsmux", "mpegtsmux", "mptsmux", "mvrawmux"}},
    {"ddproaenc",     audio, {"rawmux", "mpegpsmux", "mpegtsmux", "mptsmux", "mkvmux", "mp4mux", "mvrawmux"}},
    {"ddplusproaenc", audio, {"rawmux", "mpegpsmux", "mpegtsmux", "mptsmux", "mkvmux", "mp4mux", "mvrawmux"}},
    {"mpeg4venc",     video, {"rawmux", "mp4mux", "mptsmux"}},
    {"amraenc",       audio, {"rawmux", "mp4mux"}},
    {"avsvenc",       video, {"rawmux"}},
    {"divxvenc",      video, {"dmfmux", "rawmux", "mkvmux"}},
    {"mp3aenc",       audio, {"dmfmux", "mkvmux"}},
    {"mvcvenc",       video, {"mvrawmux"}},
    {"vc3venc",       video, {"mxfmux", "rawmux"}},
};
// clang-format on

// Whether a profile is one of those from `first` to `last`, both included.
constexpr bool isWithin(int profile, int first, int last) { return profile >= first && profile <= last; }

}  // namespace

std::span<const CodecPairs> qvCodecPairs() { return pairs; }

CodecCompat qvInstalledPairs(const InstalledModules& installed) {
    CodecCompat compatible;
    for (const CodecPairs& row : pairs) {
        if (!installed.has(row.encoder)) continue;
        compatible.addCodec(row.encoder);
        for (const char* muxer : row.muxers)
            if (installed.has(muxer)) compatible.add(row.encoder, muxer);
    }
    return compatible;
}

std::optional<bool> qvPairByProfile(const char* encoder, const char* muxer, int profile) {
    if (std::string_view(encoder) != "mpegpcmenc") return std::nullopt;
    using profileScheme::named;
    if (std::string_view(muxer) == "mptsmux")
        return isWithin(profile, named("BD_H264_HDMV"), named("BD_VC1")) || profile == named("AVCHD");
    if (std::string_view(muxer) == "mp4mux")
        return isWithin(profile, named("XDCAM_EX_1920"), named("XDCAM_EX_1280"));
    return std::nullopt;
}
