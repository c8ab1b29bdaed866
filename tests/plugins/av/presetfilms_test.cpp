// Presets as people use them: a spread of them, and what ffprobe says of the films. `./dev sweep --kind
// preset` tries all.
#include <gmock/gmock.h>

#include "tests/plugins/av/films.h"

namespace {

using testing::HasSubstr;

class PresetFilms : public FilmsInTheTool {
  protected:
    Outcome made(const std::string& preset, const std::string& file) const {
        Words words = {"transcode", "testgen:size=96x64,rate=25,duration=0.4", "--preset"};
        words.push_back(preset);
        words.insert(words.end(), {"-o", file});
        return tarsel(words);
    }
    std::string probed(const std::string& name) const {
        const std::string asked =
            "stream=codec_name,width,height,sample_aspect_ratio,field_order,r_frame_rate,sample_rate,"
            "channels";
        return runProgram({"/usr/bin/env", "ffprobe", "-v", "error", "-of", "csv=p=0", "-show_entries", asked,
                           folder.file(name)})
            .out;
    }
};

TEST_F(PresetFilms, areWhatTheirNamesSay) {
    const struct {
        const char *preset, *file, *picture, *sound;
    } rows[] = {
        {"IPOD_H264_320x240", "a.mp4", "h264,320,240,1:1,progressive,30000/1001\n", "aac,48000,2"},
        {"3GP_MPEG4", "b.mp4", "mpeg4,176,144,12:11,unknown,15/1\n", "aac,48000,2"},
        {"3GP_H263", "l.3gp", "h263,176,144,12:11,progressive,15/1\n", "aac,48000,2"},
        {"3GP_H263", "m.mp4", "h263,176,144,12:11,progressive,15/1\n", "aac,48000,2"},
        {"VCD", "c.mpg", "mpeg1video,352,288,178:163,unknown,25/1\n", "mp2,44100,2"},
        {"BD_MPEG", "d.ts", "mpeg2video,1920,1080,1:1,tt,25/1", "ac3,48000,2"},
        {"DTV_ATSC_SD", "e.ts", "mpeg2video,704,480,10:11,tt,30000/1001", "ac3,48000,2"},
        {"XDCAM_IMX_50", "f.mxf", "mpeg2video,720,608,152:135,tt,25/1", "pcm_s16le,48000,2"},
        {"XDCAM_HD_420_540_8_75", "g.mxf", "mpeg2video,1440,540,2:3,progressive,25/1", "pcm_s16le,48000,2"},
        {"XDCAM_EX_1440", "h.mp4", "mpeg2video,1440,1080,4:3,tt,25/1", "pcm_s16le,48000,2"},
        {"DVCPRO100_1080i", "i.dv", "dvvideo,1440,1080,4:3,unknown,25/1\n", "pcm_s16le,48000,2"},
        {"P2_DVCPRO100_720p", "j.mxf", "dvvideo,960,720,4:3,progressive,50/1\n", "pcm_s16le,48000,2"},
        {"H264_HIGH", "k.mpg", "h264,96,64,1:1,progressive,25/1\n", "ac3,48000,2"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.preset);
        const Outcome o = made(row.preset, row.file);
        EXPECT_EQ(o.status, 0) << o.err;
        const std::string said = probed(row.file);
        EXPECT_THAT(said, HasSubstr(row.picture));
        EXPECT_THAT(said, HasSubstr(row.sound));
    }
    const Outcome o = made("DVCPRO100_720p", "n.dv");
    EXPECT_EQ(o.status, 4);
    EXPECT_THAT(o.err, HasSubstr("does not hold DVCPRO HD of 720 lines with sound"));
}

}  // namespace
