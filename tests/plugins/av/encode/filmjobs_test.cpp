// Films that the tool writes, as ffprobe and ffmpeg read them, and why others are refused.
#include <gmock/gmock.h>

#include <filesystem>
#include <sstream>

#include "tests/plugins/av/films.h"

namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

class FilmJobs : public FilmsInTheTool {
  protected:
    Outcome job(const std::string& picture, const Words& options) const {
        Words words = {"transcode", "testgen:" + picture + ",rate=25,duration=0.4", "-y", "-q"};
        words.insert(words.end(), options.begin(), options.end());
        return tarsel(words);
    }
    std::string facts(const std::string& name) const {
        return runProgram({"/usr/bin/env", "ffprobe", "-v", "error", "-show_streams", folder.file(name)}).out;
    }
    std::string samples(const std::string& name) const {
        const std::string raw = folder.file("samples.raw");
        EXPECT_EQ(ffmpeg({"-i", folder.file(name), "-f", "s16le", raw}).status, 0) << name;
        return TempFolder::read(raw);
    }
};

TEST_F(FilmJobs, areWhatTheirOptionsSay) {
    const struct {
        const char *name, *picture;
        Words options;
        const char* fact;
    } rows[] = {
        {"a.mov", "size=96x64", {"--vcodec", "proresvenc:codecProfile=proxy"}, "codec_tag_string=apco"},
        {"b.mov", "size=96x64", {"--vcodec", "proresvenc:codecProfile=4444"}, "codec_tag_string=ap4h"},
        {"c.mxf", "size=96x64", {"--vcodec", "proresvenc"}, "codec_name=prores"},
        {"d.mkv",
         "size=96x64",
         {"--vcodec", "h265venc:avOptions=x265-params=aq-mode=1", "--bitrate", "300k", "--two-pass"},
         "codec_name=hevc"},
        {"g.mkv", "size=1280x720", {"--vcodec", "h265venc:preset=ultrafast,threads=40"}, "codec_name=hevc"},
        {"e.mxf", "size=1920x1080", {"--vcodec", "vc3venc", "--rate", "25i"}, "field_order=tt"},
        {"h.mov", "size=720x576", {"--vcodec", "jpeg2000", "--rate", "25i"}, "field_order=tt"},
        {"j.mkv", "size=320x240", {"--vcodec", "mpeg1"}, "codec_name=mpeg1video"},
        {"i.avi", "size=352x288", {"--vcodec", "h263"}, "codec_name=h263"},
        {"f.mp4",
         "size=96x64",
         {"--vcodec", "h264venc:codecProfile=baseline", "--muxer",
          "mp4mux:avOptions=movflags=+frag_keyframe"},
         "profile=Constrained Baseline"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        Words options = row.options;
        options.insert(options.end(), {"-o", row.name});
        const Outcome made = job(row.picture, options);
        EXPECT_EQ(made.status, 0) << made.err;
        EXPECT_THAT(facts(row.name), HasSubstr(row.fact));
        const Outcome read = ffmpeg({"-xerror", "-i", folder.file(row.name), "-map", "0", "-f", "null", "-"});
        EXPECT_EQ(read.status, 0) << read.err;
        EXPECT_EQ(read.err, "");
    }
}

// An archive has the pictures that its source has; the others take another form when they are asked.
TEST_F(FilmJobs, keepTheFormOfTheirPictures) {
    const struct {
        const char *layout, *options, *name;
        const char* kept;  // as the result is read
    } rows[] = {
        {"yuv420p", "ffv1venc", "a.mkv", "yuv420p"},     {"yuv422p", "ffv1venc", "b.mkv", "yuv422p"},
        {"yuv420p10", "ffv1venc", "c.mkv", "yuv420p16"}, {"yuv422p10", "ffv1venc", "d.mkv", "yuv422p16"},
        {"bgra", "ffv1venc", "e.mkv", "bgra"},           {"rgba64", "ffv1venc", "f.mkv", "gbrap16"},
        {"yuv422p10", "vc3venc", "g.mov", "yuv422p10"},  {"yuv420p10", "h264venc", "h.mp4", "yuv420p"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        const std::string from =
            film("from.mkv", {"-c:v", "ffv1", "-pix_fmt", row.layout}, "testsrc2=size=320x240:duration=0.2");
        const Outcome made = tarsel({"transcode", "from.mkv", "-y", "--vcodec", row.options, "-o", row.name});
        EXPECT_EQ(made.status, 0) << made.err;
        EXPECT_THAT(facts(row.name), HasSubstr(std::string("pix_fmt=") + row.kept));
        if (std::string(row.options) == "ffv1venc") {
            EXPECT_TRUE(pictures(folder.file(row.name), row.layout) == pictures(from, row.layout));
        }
    }
    for (const char* options : {"h264venc W016 yuv420p10 x.mp4", "mpegvenc YUYV yuv422p x.ts"}) {
        std::istringstream words(options);
        std::string codec, pixel, layout, name;
        words >> codec >> pixel >> layout >> name;
        EXPECT_EQ(job("size=96x64", {"--vcodec", codec, "--pixel", pixel, "-o", name}).status, 0) << options;
        EXPECT_THAT(facts(name), HasSubstr("pix_fmt=" + layout));
    }
    EXPECT_THAT(job("size=96x64", {"--vcodec", "mpegvenc", "--pixel", "b64a", "-o", "x.ts"}).err,
                HasSubstr("--pixel b64a: the encoder 'mpegvenc' takes I420, YUYV"));
}

// The engine puts a header before raw sound for MXF.
TEST_F(FilmJobs, haveTheSoundsOfMxfUnchanged) {
    for (const char* channels : {"1", "2", "6"})
        for (const char* codec : {"rawaenc", "mpegpcmenc"}) {
            const auto make = [&](const Words& more) {
                Words words = {"--acodec", codec, "--samplerate", "48000", "--channels", channels};
                words.insert(words.end(), more.begin(), more.end());
                const Outcome made = job("size=720x576", words);
                EXPECT_EQ(made.status, 0) << made.err;
            };
            make({"--vcodec", "dvvenc", "-o", "a.mxf"});
            make({"--no-video", "-o", "a.mov"});
            EXPECT_EQ(samples("a.mxf").size(), samples("a.mov").size()) << channels << codec;
            EXPECT_TRUE(samples("a.mxf") == samples("a.mov")) << channels << codec;
        }
}

TEST_F(FilmJobs, areRefusedWithTheEncodersOwnReason) {
    const struct {
        Words options;
        const char* why;
    } rows[] = {
        {{"--vcodec", "h264venc:avOptions=max_pixels=1", "-o", "x.mkv"}, "these settings: 96x64 I420, 25p"},
        {{"--vcodec", "h264venc:codecProfile=highest", "-o", "x.mkv"}, "can't take this value"},
        {{"--vcodec", "h264venc", "--size", "95x63", "-o", "x.mkv"}, "multiples of 2, not 95x63"},
        {{"--vcodec", "vc3venc", "--size", "720x576", "--rate", "25i", "-o", "x.mkv"}, "--rate 25i"},
        {{"--muxer", "mp4mux:avOptions=movflags=+faststart", "-o", "x.mp4"}, "parameter 'fastStart'"},
        {{"--vcodec", "vc3venc", "--size", "256x120", "--muxer", "mxfmux:seekable=0", "-o", "x.mxf"}, "pipe"},
        {{"--vcodec", "mpeg4venc:avOptions=threads=100000", "-o", "x.mkv"}, "own parameters decide"},
        {{"--vcodec", "mpegvenc:vbr=0,vBitrate=50000000", "-o", "x.mkv"}, "filled up to 50000 kbit/s"},
        {{"--vcodec", "mpeg4venc:standard=H.263", "-o", "x.mkv"}, "takes 128x96, 176x144"},
        {{"--vcodec", "h263", "--size", "176x144", "-o", "x.ts"}, "does not"},
        {{"--vcodec", "h264venc:codecProfile=high", "--crf", "0", "-o", "x.mkv"}, "no lossless"},
        {{"--vcodec", "h264venc:codecProfile=baseline", "--rate", "25i", "-o", "x.mkv"}, "no interlaced"},
        {{"--vcodec", "h264venc", "--crf", "-1", "-o", "x.mkv"}, "neither a quality nor a bit rate"},
    };
    for (const auto& row : rows) {
        const Outcome made = job("size=96x64", row.options);
        EXPECT_NE(made.status, 0);
        EXPECT_THAT(made.err, AllOf(HasSubstr(row.why), Not(HasSubstr("not described"))));
        EXPECT_FALSE(std::filesystem::exists(folder.file("x.mkv")));
    }
}

// Sound and pictures of a film in fragments begin together, and all of its units are counted.
// The system's own reason, and the name that the user gave, from whichever thread, process or stream it
// comes.
TEST_F(FilmJobs, sayWhyTheirOutputTakesNoMore) {
    const std::pair<std::string, std::string> films[] = {
        {"prores", "a.mov"}, {"ffv1", "b.mkv"}, {"ffv1", "c.avi"}};
    ProcessOptions options;
    options.folder = folder.path().string();
    for (const auto& [codec, name] : films)
        for (const char* more : {"", " --split 2"}) {
            const std::string command = "ulimit -f 300; exec " QV_BINARY_DIR
                                        "/bin/tarsel transcode testgen:size=320x240,rate=25,duration=4 -y -q "
                                        "--vcodec " +
                                        codec + " -o " + name + more;
            const Outcome failed = runProgram({"/bin/sh", "-c", command}, options);
            EXPECT_EQ(failed.status, 4) << name << more;
            EXPECT_EQ(failed.err, "tarsel: can't write '" + name +
                                      "': the file is larger than the disk or a limit of the system allows; "
                                      "choose another disk, or raise the limit (ulimit -f)\n");
        }
    EXPECT_TRUE(std::filesystem::is_empty(folder.path()));
}

TEST_F(FilmJobs, beginTogetherInFragments) {
    for (const char* options :
         {"frag_duration=100000", "movflags=frag_keyframe", "movflags=+frag_every_frame"})
        for (const auto& [name, muxer] : {std::pair("x.mp4", "mp4mux"), std::pair("x.mov", "movmux")}) {
            SCOPED_TRACE(std::string(options) + name);
            const Outcome made =
                job("size=96x64", {"--muxer", std::string(muxer) + ":avOptions=" + options, "-o", name});
            EXPECT_EQ(made.status, 0) << made.err;
            EXPECT_THAT(facts(name), AllOf(HasSubstr("start_time=0.000000"), HasSubstr("start_time=-0.02")));
        }
}

// Which rates of bits there are follows from the rate of samples and the channels, not from the usual ones.
TEST_F(FilmJobs, haveTheBitRateOfTheirSoundOrNone) {
    const struct {
        Words options;
        int status, bits;
        const char* why;
    } rows[] = {
        {{"--acodec", "mp2", "--samplerate", "16000", "--audio-bitrate", "320k"}, 2, 0, "8k, 16k, 24k"},
        {{"--acodec", "mp2", "--samplerate", "16000", "--audio-bitrate", "24k"}, 0, 24000, ""},
        {{"--acodec", "mp2:aBitrate=384", "--samplerate", "16000"}, 2, 0, "aBitrate"},
        {{"--acodec", "aac", "--samplerate", "8000", "--audio-bitrate", "512k"}, 2, 0, "32k, 48k, 64k, 96k"},
        {{"--acodec", "aac", "--samplerate", "8000", "--audio-bitrate", "96k"}, 0, 0, ""},
        {{"--acodec", "aac:aBitrate=96", "--samplerate", "8000", "--channels", "1"}, 2, 0, "aBitrate"},
    };
    for (const auto& row : rows) {
        Words options = row.options;
        options.insert(options.end(), {"--no-video", "-o", "x.mkv"});
        const Outcome made = job("size=96x64", options);
        EXPECT_EQ(made.status, row.status) << made.err;
        EXPECT_THAT(made.err, HasSubstr(row.why));
        if (row.bits > 0) {
            EXPECT_THAT(facts("x.mkv"), HasSubstr("bit_rate=" + std::to_string(row.bits)));
        }
    }
}

// Why there is no VC-1, and what is known without a plug-in.
TEST_F(FilmJobs, haveAReasonForEachModuleThatIsMissing) {
    const std::string all = tarsel({"modules", "--missing"}).out;
    EXPECT_THAT(all, AllOf(HasSubstr("\namraenc         audio encoder  libavcodec is packaged without"),
                           HasSubstr("\nasfmux          multiplexer "), Not(HasSubstr("no plug-in"))));
    const std::string present = tarsel({"modules"}).out;
    std::istringstream lines(all);
    for (std::string line; std::getline(lines, line);)
        EXPECT_THAT("\n" + present, Not(HasSubstr("\n" + line.substr(0, line.find(' ')) + " "))) << line;
    EXPECT_THAT(tarsel({"modules", "--missing", "vc1venc", "--json"}).out,
                AllOf(HasSubstr("\"name\": \"vc1venc\""), HasSubstr("\"reason\": \"libavcodec reads VC-1")));
    EXPECT_THAT(tarsel({"--no-plugins", "modules", "--missing", "h264venc"}).out, HasSubstr("no plug-in"));
    EXPECT_EQ(tarsel({"modules", "--missing", "rawvenc"}).status, 2);
}

}  // namespace
