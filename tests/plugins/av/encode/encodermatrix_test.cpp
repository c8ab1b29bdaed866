// Every encoder into every container: written and read again, or refused with a reason.
#include <gmock/gmock.h>

#include <filesystem>
#include <sstream>

#include "tests/plugins/av/films.h"

namespace {

using testing::ContainsRegex;
using testing::HasSubstr;

constexpr struct {
    const char *muxer, *extension;
} muxers[] = {{"mp4mux", "mp4"},   {"movmux", "mov"}, {"mkvmux", "mkv"},    {"webmmux", "webm"},
              {"mxfmux", "mxf"},   {"mptsmux", "ts"}, {"mpegpsmux", "mpg"}, {"dvmux", "dv"},
              {"dvavimux", "avi"}, {"y4mmux", "y4m"}, {"flacmux", "flac"},  {"oggmux", "ogg"}};

struct Row {
    const char *encoder, *picture;  // no picture: an encoder of sound
    const char* taken;              // extensions
    const char* codec;              // as `info` reads it
};
constexpr Row rows[] = {
    {"h264venc", "96x64", "mp4 mov mkv ts mpg", "H.264"},
    {"mpegvenc", "720x576", "mp4 mov mkv mxf ts mpg", "MPEG-2"},
    {"mpegvenc:standard=MPEG-1", "352x288", "mp4 mkv ts mpg", "MPEG-1"},
    {"mpeg4venc", "96x64", "mp4 mov mkv ts avi", "MPEG-4"},
    {"mpeg4venc:standard=H.263", "176x144", "mp4 mov mkv avi", "H.263"},
    {"vc3venc", "256x120", "mov mkv mxf", "DNxHD"},
    {"dvvenc", "720x576", "mov mkv mxf dv avi", "DV"},
    {"dv100venc", "1440x1080", "mov mkv mxf dv avi", "DV"},
    {"mj2kvenc", "96x64", "mov mkv mxf", "JPEG 2000"},
    {"h265venc:preset=ultrafast", "96x64", "mp4 mov mkv ts", "H.265"},
    {"proresvenc", "96x64", "mov mkv mxf", "ProRes"},
    {"ffv1venc", "96x64", "mkv avi", "FFV1"},
    {"av1venc:preset=8", "96x64", "mp4 mkv webm", "AV1"},
    {"aacaenc", "", "mp4 mov mkv ts", "AAC"},
    {"mpegaenc", "", "mkv ts mpg avi", "MP2"},
    {"mpegpcmenc", "", "mp4 mov mkv mpg avi", "PCM"},
    {"mp3aenc", "", "mp4 mov mkv ts mpg avi", "MP3"},
    {"ddaenc", "", "mp4 mov mkv ts mpg avi", "Dolby"},
    {"ddproaenc", "", "mp4 mov mkv ts mpg avi", "Dolby"},
    {"ddplusproaenc", "", "mp4 mov mkv ts", "Dolby"},
    {"flacaenc", "", "mp4 mkv flac ogg", "FLAC"},
    {"opusaenc", "", "mp4 mkv webm ts ogg", "Opus"},
    {"rawaenc", "", "mov mkv mpg", "PCM"},
};

class EncoderMatrix : public FilmsInTheTool, public testing::WithParamInterface<Row> {};

TEST_P(EncoderMatrix, isWrittenAndReadOrRefused) {
    const Row& row = GetParam();
    const bool sound = *row.picture == '\0';
    for (const auto& [muxer, extension] : muxers) {
        SCOPED_TRACE(muxer);
        const std::string file = std::string("x.") + extension;
        const Outcome made =
            tarsel({"transcode", std::string("testgen:duration=0.2,size=") + (sound ? "96x64" : row.picture),
                    "-y", "-q", sound ? "--no-video" : "--no-audio", sound ? "--acodec" : "--vcodec",
                    row.encoder, "--muxer", muxer, "-o", file});
        if ((std::string(" ") + row.taken + " ").find(std::string(" ") + extension + " ") ==
            std::string::npos) {
            EXPECT_NE(made.status, 0);
            EXPECT_THAT(made.err, ContainsRegex("does not|requires video|holds sound alone|leaves nothing"));
            EXPECT_FALSE(std::filesystem::exists(folder.file(file)));
            continue;
        }
        EXPECT_EQ(made.status, 0) << made.err;
        const std::string said = tarsel({"info", file}).out;
        EXPECT_THAT(said, HasSubstr(std::string(" 0   ") + row.codec));
        if (!sound) {
            EXPECT_THAT(said, HasSubstr(", 5 frames,"));
        }
    }
}
INSTANTIATE_TEST_SUITE_P(Each, EncoderMatrix, testing::ValuesIn(rows));

}  // namespace
