#include "plugins/av/mux/containers.h"

#include <cstring>
#include <string_view>
#include <vector>

namespace av {

namespace {

using enum MuxCodec;
using namespace FilmWord;
using namespace MuxTrait;

// clang-format off
constexpr auto codecRows = std::to_array<MuxCodecRow>({
    {h264,     AV_CODEC_ID_H264,       "H.264",     "H264,AVC ,AVC1",           true},
    {hevc,     AV_CODEC_ID_HEVC,       "H.265",     "HEVC,H265,HVC1",           true},
    {av1,      AV_CODEC_ID_AV1,        "AV1",       "AV01,AV1 ",                true},
    {vp8,      AV_CODEC_ID_VP8,        "VP8",       "VP80,VP8 ",                false},
    {vp9,      AV_CODEC_ID_VP9,        "VP9",       "VP90,VP9 ",                false},
    {mpeg1,    AV_CODEC_ID_MPEG1VIDEO, "MPEG-1",    "MPG1,MP1V,MPEG",           true},
    {mpeg2,    AV_CODEC_ID_MPEG2VIDEO, "MPEG-2",    "MPG2,MP2V,M2V ",           true},
    {mpeg4,    AV_CODEC_ID_MPEG4,      "MPEG-4",    "MP4V,FMP4,MPG4",           true},
    {h263,     AV_CODEC_ID_H263,       "H.263",     "H263,S263",                false},
    {dnxhd,    AV_CODEC_ID_DNXHD,      "DNxHD",     "AVDN,VC3 ,VC-3,DNXH,AVDH", false},
    {dv,       AV_CODEC_ID_DVVIDEO,    "DV",        "DV  ,DVSD,DV25,DV50,DVH1,DV1H,DVCP", false},
    {jpeg2000, AV_CODEC_ID_JPEG2000,   "JPEG 2000", "MJ2K,MJP2,JP2K,J2K ,MJ2 ", false},
    {prores,   AV_CODEC_ID_PRORES,     "ProRes",    "PRRS,PRES,APCN,APCH,APCS,APCO,AP4H,AP4X", false},
    {ffv1,     AV_CODEC_ID_FFV1,       "FFV1",      "FFV1",                     false},
    {mjpeg,    AV_CODEC_ID_MJPEG,      "JPEG",      "MJPG,JPEG",                false},
    {raw,      AV_CODEC_ID_RAWVIDEO,   "raw pictures", "",                      false},
    {aac,      AV_CODEC_ID_AAC,        "AAC",       "AAC ,MP4A",                true},
    {mp2,      AV_CODEC_ID_MP2,        "MPEG audio", "MP2 ,MPA ,MPGA,MP1 ",     false},
    {mp3,      AV_CODEC_ID_MP3,        "MP3",       "MP3 ,.MP3",                false},
    {ac3,      AV_CODEC_ID_AC3,        "AC-3",      "AC-3,AC3 ",                false},
    {eac3,     AV_CODEC_ID_EAC3,       "E-AC-3",    "EC-3,EAC3,E-AC",           false},
    {flac,     AV_CODEC_ID_FLAC,       "FLAC",      "FLAC",                     false},
    {opus,     AV_CODEC_ID_OPUS,       "Opus",      "OPUS",                     false},
    {vorbis,   AV_CODEC_ID_VORBIS,     "Vorbis",    "VORB",                     false},
    {pcm,      AV_CODEC_ID_PCM_S16LE,  "PCM",       "PCM ,LPCM",                false},
});
static_assert(codecRows.size() == static_cast<std::size_t>(MuxCodec::count));

constexpr std::uint32_t everySound = codecBits(aac, mp2, mp3, ac3, eac3, flac, opus, vorbis, pcm);
constexpr std::uint32_t everything = (1u << static_cast<int>(MuxCodec::count)) - 1;
constexpr std::uint32_t mp4Codecs = codecBits(h264, hevc, av1, vp9, mpeg1, mpeg2, mpeg4, h263, mjpeg, jpeg2000, aac, mp3, ac3, eac3, flac, opus, vorbis, pcm);
constexpr std::uint32_t movCodecs = codecBits(h264, hevc, mpeg2, mpeg4, h263, dnxhd, dv, jpeg2000, prores, mjpeg, raw, aac, mp3, ac3, eac3, pcm);

// In the order of muxerModules.
constexpr auto containers = std::to_array<Container>({
    // format        codecs                                                     video sound  pipe
    //   words
    //   traits
    {"mp4",          mp4Codecs,                                                    16, 32, PipeForm::fragments,
         title | commonTags | chapters | timecode | language | creationTime | location,
         lengths | indexInFront | pixels},
    {"mov",          movCodecs,                                                    16, 32, PipeForm::fragments,
         title | commonTags | chapters | timecode | language | creationTime | location,
         lengths | indexInFront | pixels},
    {"matroska",     everything,                                                   16, 64, PipeForm::live,
         title | commonTags | allTags | chapters | timecode | language,
         lengths},
    {"webm",         codecBits(vp8, vp9, av1, opus, vorbis),                       16, 32, PipeForm::live,
         title | commonTags | allTags | chapters | language,
         lengths},
    {"mxf",          codecBits(mpeg2, h264, dnxhd, dv, jpeg2000, prores, pcm),      1, 16, PipeForm::none,
         title | timecode | creationTime,
         pixels | needsVideo | soundHeader, codecBit(h264)},
    {"mpegts",       codecBits(h264, hevc, mpeg1, mpeg2, mpeg4, aac, mp2, mp3, ac3, eac3, opus), 8, 32, PipeForm::same,
         title | language,
         adts},
    {"vob",          codecBits(h264, mpeg1, mpeg2, mp2, mp3, ac3, pcm),             8, 16, PipeForm::same,
         0,
         adts | bigPcm, 0, nullptr, "mpeg"},
    {"dv",           codecBits(dv, pcm),                                            1, 4,  PipeForm::same,
         timecode,
         counted | needsVideo | pixels, 0, "rawvideo"},
    {"avi",          codecBits(dv, mpeg4, h263, mjpeg, ffv1, raw, mp2, mp3, ac3, pcm),    8, 32, PipeForm::none,
         title | commonTags | language,
         adts | counted, codecBit(mpeg4)},
    {"yuv4mpegpipe", codecBits(raw),                                                1, 0,  PipeForm::same,
         0,
         counted | needsVideo | wrapsPictures},
    {"flac",         codecBits(flac),                                               0, 1,  PipeForm::same,
         title | commonTags | allTags,
         counted},
    {"ogg",          codecBits(flac, opus, vorbis),                                 0, 8,  PipeForm::same,
         title | commonTags | allTags | chapters,
         0},
});
static_assert(containers.size() == muxerModules.size());

// Formats that an extension asks for, where they are not the container's own.
constexpr struct {
    const char *module, *extension, *container, *format;
} formats[] = {
    {"mp4mux",    "mov", "movmux",    "mov"},
    {"mp4mux",    "m4a", "mp4mux",    "ipod"},
    {"mp4mux",    "3gp", "mp4mux",    "3gp"},
};
// clang-format on

char upper(char c) { return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c; }

}  // namespace

const MuxCodecRow* muxCodec(std::uint32_t fourcc) {
    char text[5] = {};
    for (int i = 0; i < 4; ++i) text[i] = upper(static_cast<char>(fourcc >> 8 * i & 255));
    for (const MuxCodecRow& row : codecRows) {
        const std::string_view names = row.fourccs;
        for (std::size_t at = 0; at + 4 <= names.size(); at += 5)
            if (names.substr(at, 4) == std::string_view(text, 4)) return &row;
    }
    return nullptr;
}

std::uint32_t muxFourcc(AVCodecID id) {
    for (const MuxCodecRow& row : codecRows) {
        if (row.id != id || std::strlen(row.fourccs) < 4) continue;
        std::uint32_t fourcc = 0;
        for (int i = 3; i >= 0; --i) fourcc = fourcc << 8 | static_cast<unsigned char>(row.fourccs[i]);
        return fourcc;
    }
    return 0;
}

const MuxCodecRow& muxCodecRow(MuxCodec codec) { return codecRows[static_cast<std::size_t>(codec)]; }

bool isSound(MuxCodec codec) { return (everySound & codecBit(codec)) != 0; }

const MuxerModule& Container::module() const {
    return muxerModules[static_cast<std::size_t>(this - containers.data())];
}

std::string Container::takenNames(bool video) const {
    std::vector<std::string> names;
    for (const MuxCodecRow& row : codecRows)
        if (takes(row.codec) && isSound(row.codec) != video) names.push_back(row.name);
    std::string all;
    for (std::size_t i = 0; i < names.size(); ++i)
        all += (i == 0 ? "" : i + 1 == names.size() ? " and " : ", ") + names[i];
    return all;
}

const Container* containerOf(const char* module) {
    for (std::size_t i = 0; i < muxerModules.size(); ++i)
        if (std::strcmp(muxerModules[i].name, module) == 0) return &containers[i];
    return nullptr;
}

ContainerForm formFor(const Container& container, const std::string& extension) {
    for (const auto& row : formats)
        if (std::strcmp(row.module, container.module().name) == 0 && extension == row.extension)
            return {containerOf(row.container), row.format};
    return {&container, container.format};
}

}  // namespace av
