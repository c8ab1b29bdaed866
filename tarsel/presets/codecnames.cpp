#include "tarsel/presets/codecnames.h"

#include <algorithm>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/source/source.h"

namespace {

constexpr int kVideo = qvVideoStream, kAudio = qvAudioStream;

// The first name of a module is the one that is shown.
// clang-format off
constexpr CodecName kNames[] = {
    {"raw",        kVideo, {"rawvenc"}},
    {"rawvideo",   kVideo, {"rawvenc"}},
    {"h264",       kVideo, {"h264venc", "bch264venc", "h264mfxvenc", "h264cudavenc", "h264openclvenc", "divxh264venc"}, "H264_HIGH"},
    {"avc",        kVideo, {"h264venc", "bch264venc", "h264mfxvenc", "h264cudavenc", "h264openclvenc", "divxh264venc"}, "H264_HIGH"},
    {"h265",       kVideo, {"h265venc"}},
    {"hevc",       kVideo, {"h265venc"}},
    {"av1",        kVideo, {"av1venc"}},
    {"mpeg2",      kVideo, {"mpegvenc"}, "MPEG2_MAIN"},
    {"mpeg1",      kVideo, {"mpegvenc"}, "MPEG1", "MPEG-1"},
    {"mpeg4",      kVideo, {"mpeg4venc", "divxvenc"}, "MPEG4_HD"},
    {"h263",       kVideo, {"mpeg4venc"}, "3GP_H263", "H.263"},
    {"vc1",        kVideo, {"vc1venc"}, "VC1_MAIN"},
    {"avs",        kVideo, {"avsvenc"}},
    {"dv",         kVideo, {"dvvenc"}, "DV"},
    {"dvcpro50",   kVideo, {"dv100venc", "dvvenc"}, "DVCPRO50"},
    {"dvcprohd",   kVideo, {"dv100venc"}},
    {"dnxhd",      kVideo, {"vc3venc"}, "VC3_GENERIC"},
    {"dnxhr",      kVideo, {"vc3venc"}, "VC3_GENERIC"},
    {"vc3",        kVideo, {"vc3venc"}, "VC3_GENERIC"},
    {"jpeg2000",   kVideo, {"mj2kvenc"}, "DCI_LOSSY"},
    {"mjpeg2000",  kVideo, {"mj2kvenc"}, "DCI_LOSSY"},
    {"j2k",        kVideo, {"mj2kvenc"}, "DCI_LOSSY"},
    {"prores",     kVideo, {"proresvenc"}},
    {"ffv1",       kVideo, {"ffv1venc"}},
    {"pcm",        kAudio, {"rawaenc", "mpegpcmenc"}},
    {"lpcm",       kAudio, {"mpegpcmenc"}},
    {"aac",        kAudio, {"aacaenc"}},
    {"mp2",        kAudio, {"mpegaenc"}},
    {"mp3",        kAudio, {"mp3aenc"}},
    {"ac3",        kAudio, {"ddaenc", "ddproaenc"}},
    {"eac3",       kAudio, {"ddplusproaenc"}},
    {"flac",       kAudio, {"flacaenc"}},
    {"opus",       kAudio, {"opusaenc"}},
    {"wma",        kAudio, {"wmaaenc"}},
    {"amr",        kAudio, {"amraenc"}},
};
// clang-format on

// As the table spells it.
std::string folded(std::string_view name) {
    std::string plain;
    for (const char c : name)
        if (c != '.' && c != '-' && c != '_' && c != ' ')
            plain += c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
    return plain;
}

}  // namespace

std::span<const char* const> CodecName::encoders() const {
    const char* const* const last = std::find(modules, modules + most, nullptr);
    return {modules, last};
}

std::span<const CodecName> codecNames() { return kNames; }

const CodecName* codecName(std::string_view name, int type) {
    const auto* const found = std::find_if(
        std::begin(kNames), std::end(kNames),
        [&, plain = folded(name)](const CodecName& row) { return row.type == type && row.name == plain; });
    return found == std::end(kNames) ? nullptr : found;
}

std::vector<std::string> namesOfCodecs(int type) {
    std::vector<std::string> names = {"none"};
    for (const CodecName& row : kNames)
        if (row.type == type) names.emplace_back(row.name);
    for (std::string& module :
         moduleNames(type == kVideo ? QvModuleType::videoEncoder : QvModuleType::audioEncoder))
        names.push_back(std::move(module));
    return names;
}

std::string codecOfModule(std::string_view module) {
    for (const CodecName& row : kNames)
        for (const char* const one : row.encoders())
            if (one == module) return std::string(row.name);
    return std::string(module);
}
