#include "plugins/av/encode/videocodecs.h"

#include <array>
#include <cstring>

#include "core/measure/fourcc.h"

namespace av {

namespace {

using namespace QvFourcc;
using namespace VideoTrait;

constexpr VideoForm x264Forms[] = {{I420, AV_PIX_FMT_YUV420P},
                                   {W016, AV_PIX_FMT_YUV420P10LE, "high10"},
                                   {YUYV, AV_PIX_FMT_YUV422P, "high422"},
                                   {Y216, AV_PIX_FMT_YUV422P10LE, "high422"},
                                   {BGR4, AV_PIX_FMT_YUV444P, "high444"}};
constexpr VideoForm x265Forms[] = {{I420, AV_PIX_FMT_YUV420P},
                                   {W016, AV_PIX_FMT_YUV420P10LE},
                                   {YUYV, AV_PIX_FMT_YUV422P},
                                   {Y216, AV_PIX_FMT_YUV422P10LE},
                                   {BGR4, AV_PIX_FMT_YUV444P}};
constexpr VideoForm aomForms[] = {{I420, AV_PIX_FMT_YUV420P}, {W016, AV_PIX_FMT_YUV420P10LE}};
constexpr VideoForm plainForms[] = {{I420, AV_PIX_FMT_YUV420P}};
constexpr VideoForm mpeg2Forms[] = {{I420, AV_PIX_FMT_YUV420P}, {YUYV, AV_PIX_FMT_YUV422P, "422"}};
constexpr VideoForm dnxForms[] = {{YUYV, AV_PIX_FMT_YUV422P},
                                  {Y216, AV_PIX_FMT_YUV422P10LE, "dnxhr_hqx"},
                                  {b64a, AV_PIX_FMT_YUV444P10LE, "dnxhr_444"}};
// The layout follows from profile and height, see VideoEnc::layout.
constexpr VideoForm dvForms[] = {{YUYV, AV_PIX_FMT_YUV422P}};
constexpr VideoForm j2kForms[] = {{YUYV, AV_PIX_FMT_YUV422P},
                                  {I420, AV_PIX_FMT_YUV420P},
                                  {BGR4, AV_PIX_FMT_RGB24},
                                  {b64a, AV_PIX_FMT_RGB48LE}};
constexpr VideoForm proresForms[] = {{Y216, AV_PIX_FMT_YUV422P10LE}, {b64a, AV_PIX_FMT_YUVA444P10LE, "4444"}};
constexpr VideoForm ffv1Forms[] = {{I420, AV_PIX_FMT_YUV420P},     {YUYV, AV_PIX_FMT_YUV422P},
                                   {W016, AV_PIX_FMT_YUV420P16LE}, {Y216, AV_PIX_FMT_YUV422P16LE},
                                   {BGR4, AV_PIX_FMT_BGR0},        {BGRA, AV_PIX_FMT_BGRA},
                                   {b64a, AV_PIX_FMT_RGBA64LE}};

constexpr unsigned predictive = rated | groups | reorders | pixelAspect;

constexpr const char* speeds =
    " ultrafast superfast veryfast faster fast medium slow slower veryslow placebo ";
constexpr const char* x264Tunes = " film animation grain stillimage psnr ssim fastdecode zerolatency ";
constexpr const char* x265Tunes = " psnr ssim grain fastdecode zerolatency animation ";

// clang-format off
constexpr auto rows = std::to_array<VideoCodec>({
    // module    standard  encoder       forms        fourcc  ext     traits
    //   sides min max step      bit/s min max default    quality default max  preset default      tune    N    M  max M
    {"h264venc",    "",       "libx264",    x264Forms,   qvFourcc("H264"), "264",  predictive | interlaced | setsFirst | borrows | statsFile | captions,
        16, 16384, 2,   32e3, 800e6, 0,       "crf", 21, 51,      "preset", "medium",         "tune", 250, 4, 17, "x264-params=force-cfr=1", "", speeds, x264Tunes},
    {"mpegvenc",    "MPEG-2", "mpeg2video", mpeg2Forms,  qvFourcc("MPG2"), "m2v",  predictive | interlaced | statsText | captions,
        16, 4096, 2,    100e3, 300e6, 8e6,    "", 0, 0,         "", "",                        "",     15,  3, 8,  "sc_threshold=1000000000", ""},
    {"mpegvenc",    "MPEG-1", "mpeg1video", plainForms,  qvFourcc("MPG1"), "m1v",  predictive | statsText,
        16, 4080, 2,    100e3, 100e6, 1.15e6, "", 0, 0,         "", "",                        "",     15,  3, 8,  "sc_threshold=1000000000", ""},
    {"mpeg4venc",   "MPEG-4", "mpeg4",      plainForms,  qvFourcc("MP4V"), "m4v",  predictive | interlaced | setsFirst | statsText,
        16, 4096, 2,    16e3, 100e6, 2e6,     "", 0, 0,         "", "",                        "",     150, 1, 4,  "sc_threshold=1000000000", ""},
    {"mpeg4venc",   "H.263",  "h263",       plainForms,  qvFourcc("H263"), "263",  rated | groups | statsText,
        96, 1408, 4,    16e3, 8e6, 96e3,      "", 0, 0,         "", "",                        "",     150, 1, 1,  "sc_threshold=1000000000", ""},
    {"vc3venc",     "",       "dnxhd",      dnxForms,    qvFourcc("AVDN"), "dnxhd", interlaced | keepsForm,
        256, 8192, 2,   1e6, 2e9, 0,          "", 0, 0,         "", "",                        "",     1,   1, 1,  "", "dnxhr_hq"},
    {"dvvenc",      "",       "dvvideo",    dvForms,     qvFourcc("DVSD"), "dv",   interlaced,
        480, 1440, 1,   25e6, 100e6, 0,        "", 0, 0,         "", "",                        "",     1,   1, 1,  "", "25"},
    {"dv100venc",   "",       "dvvideo",    dvForms,     qvFourcc("DVH1"), "dv",   interlaced,
        720, 1440, 1,   100e6, 100e6, 0,      "", 0, 0,         "", "",                        "",     1,   1, 1,  "", "100"},
    {"mj2kvenc",    "",       "jpeg2000",   j2kForms,    qvFourcc("MJ2K"), "j2k",  interlaced,
        16, 8192, 1,    1e6, 2e9, 0,          "", 0, 0,         "", "",                        "",     1,   1, 1,  "format=j2k", ""},
    {"h265venc",    "",       "libx265",    x265Forms,   qvFourcc("HEVC"), "265",  predictive | setsFirst | borrows | statsFile,
        16, 16384, 2,   32e3, 800e6, 0,       "crf", 24, 51,      "preset", "medium",         "tune", 250, 5, 17, "", "", speeds, x265Tunes},
    {"proresvenc",  "",       "prores_ks",  proresForms, qvFourcc("APCH"), "mov",  interlaced | keepsForm,
        16, 16384, 2,   1e6, 4e9, 0,          "", 0, 0,         "", "",                        "",     1,   1, 1,  "vendor=apl0", "hq"},
    {"ffv1venc",    "",       "ffv1",       ffv1Forms,   qvFourcc("FFV1"), "mkv",  interlaced | keepsForm,
        16, 16384, 1,   1e6, 4e9, 0,          "", 0, 0,         "", "",                        "",     1,   1, 1,  "level=3:slicecrc=1:slices=4", ""},
    {"av1venc",     "",       "libaom-av1", aomForms,    qvFourcc("AV01"), "obu",  rated | groups | borrows | statsText | pixelAspect,
        16, 16384, 2,   32e3, 800e6, 0,       "crf", 32, 63,      "cpu-used", "6",            "tune", 250, 1, 1,  "row-mt=1", ""},
});
// clang-format on

}  // namespace

const VideoForm* VideoCodec::form(unsigned fourcc) const {
    for (const VideoForm& row : forms)
        if (row.fourcc == fourcc) return &row;
    for (const VideoForm& row : forms)
        if (qvEqualFourcc(row.fourcc, fourcc)) return &row;
    return nullptr;
}

const AVCodec* VideoCodec::library() const { return avcodec_find_encoder_by_name(encoder); }

const VideoCodec* videoCodec(const char* module, const char* standard) {
    for (const VideoCodec& row : rows)
        if (std::strcmp(row.module, module) == 0 && (!standard || std::strcmp(row.standard, standard) == 0))
            return &row;
    return nullptr;
}

}  // namespace av
