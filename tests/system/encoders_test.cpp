// Encoders chosen by name and what they are set to, through an encoder plug-in whose files say it as lines.
#include "tests/system/tool.h"

namespace {

namespace fs = std::filesystem;
using testing::AllOf;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

class Encoders : public Tool {
  protected:
    Encoders() {
        fs::create_directory(folder.file("plugins"));
        const fs::path plugin = folder.file("plugins/coders_plugin.so");
        fs::copy_file(QV_BINARY_DIR "/plugins/coders_plugin.so", plugin);
        fs::permissions(plugin, fs::perms{0755});
        fs::permissions(plugin.parent_path(), fs::perms{0755});
    }
    static Words coded(const Words& words) { return Words{"--no-plugins", "--plugins", "plugins"} + words; }
    static Words job(const Words& options) {
        return coded({"transcode", "testgen:size=64x48,rate=25,duration=0.2"}) + options;
    }
    // What the multiplexer and the encoders say of themselves in the file of a job.
    std::string made(const std::string& name, const Words& options) const {
        works(job({"-o", name, "-y"}) + options);
        return heads(contents(name));
    }
    static std::string heads(const std::string& file) {
        std::string text;
        for (size_t at = 0; at < file.size(); at = file.find('\n', at) + 1) {
            const std::string line = file.substr(at, file.find('\n', at) - at);
            if (line != "picture" && line != "sound") text += line + "|";
        }
        return text;
    }
    static long long count(const std::string& text, const std::string& what) {
        long long n = 0;
        for (size_t at = 0; (at = text.find(what, at)) != std::string::npos; at += what.size()) ++n;
        return n;
    }
};

TEST_F(Encoders, AreChosenByCodecAndByExtension) {
    const std::string h264 = "h264venc crf 23 rate 2000000 tune |", aac = "aacaenc crf  rate 128000 tune |";
    const std::string flac = "flacaenc crf  rate  tune |", ffv1 = "ffv1venc crf  rate  tune |";
    const struct {
        const char* file;
        Words options;
        std::string heads;
    } rows[] = {
        {"a.mp4", {}, "mp4mux seekable 1|" + h264 + aac},
        {"a.mkv", {}, "mkvmux seekable 1|" + h264 + aac},
        {"b.mkv", {"--vcodec", "ffv1", "--acodec", "FLAC"}, "mkvmux seekable 1|" + ffv1 + flac},
        {"c.mkv", {"--acodec", "flacaenc"}, "mkvmux seekable 1|" + h264 + flac},
        {"d.mkv", {"--vcodec", "none", "--acodec", "flac"}, "mkvmux seekable 1|" + flac},
        {"a.m4a", {}, "mp4mux seekable 1|" + aac},
        {"e.mp4", {"--preset", "h264_high", "--acodec", "none"}, "mp4mux seekable 1|" + h264},
        {"f.out", {"--format", "mkv", "--vcodec", "H.264"}, "mkvmux seekable 1|" + h264 + aac},
        {"g.mkv", {"--muxer", "mkvmux:seekable=0"}, "mkvmux seekable 0|" + h264 + aac},
        {"h.mp4",
         {"--vcodec", "h264:tune=film", "--crf", "18"},
         "mp4mux seekable 1|h264venc crf 18 rate 2000000 tune film|" + aac},
        {"i.mp4",
         {"--bitrate", "1.5M", "--audio-bitrate", "192k"},
         "mp4mux seekable 1|h264venc crf 23 rate 1500000 tune |aacaenc crf  rate 192000 tune |"},
    };
    for (const auto& row : rows) EXPECT_EQ(made(row.file, row.options), row.heads) << row.file;
    EXPECT_EQ(count(contents("a.mp4"), "picture\n"), 5);
    // The picture keeps the size of the input, unless the preset was asked for.
    const auto plan = [&](const Words& options) { return works(job(options + Words{"--dry-run"})).out; };
    EXPECT_THAT(plan({"-o", "x.mp4"}),
                AllOf(HasSubstr("preset  'H.264 High', the first installed one for .mp4"),
                      HasSubstr("h264venc: 64x48")));
    EXPECT_THAT(plan({"-o", "x.mkv", "--vcodec", "ffv1"}),
                HasSubstr("preset  'Any codec', for --vcodec 'ffv1' in mkvmux"));
    for (const Words& parts : {Words{}, Words{"--cut", "0-0.1"}})
        EXPECT_THAT(plan(Words{"-o", "x.mp4", "--two-pass"} + parts), HasSubstr("I420 25, two passes\n"));
    EXPECT_THAT(plan({"-o", "x.mp4", "--vcodec", "h264:tune=a,crf=2"}), HasSubstr("25, tune 'a', crf '2'\n"));
    EXPECT_THAT(plan({"-o", "x.mp4", "--preset", "h264_high"}),
                AllOf(HasSubstr("320x240"), Not(HasSubstr("preset  "))));
    EXPECT_THAT(plan({"--muxer", "nullmux", "--vcodec", "ffv1"}), HasSubstr("encoder ffv1venc"));
    EXPECT_THAT(plan({"-o", "x.i420", "--vcodec", "raw", "--acodec", "pcm"}), HasSubstr("encoder rawvenc"));
}

TEST_F(Encoders, RefuseWhatDoesNotGoTogether) {
    const struct {
        int status;
        Words options, parts;
    } rows[] = {
        {2, {"-o", "x.mp4", "--vcodec", "ffv1"}, {"--vcodec 'ffv1'", "mp4mux", "'x.mp4'", "one of: h264"}},
        {2, {"-o", "x.mp4", "--preset", "h264_high", "--acodec", "flac"}, {"'H.264 High'", "one of aac"}},
        {5, {"-o", "x.mp4", "--vcodec", "prores"}, {"--vcodec 'prores'", "proresvenc is not installed"}},
        {5, {"-o", "x.mp4", "--vcodec", "proresvenc"}, {"proresvenc is not installed"}},
        {5, {"-o", "x.mp4", "--vcodec", "h246"}, {"'h246'", "did you mean 'h264'?"}},
        {5, {"-o", "x.mp4", "--acodec", "h264"}, {"--acodec", "'h264'"}},
        {5, {"-o", "x.webm"}, {"'x.webm'", "av1venc", "opusaenc", "webmmux"}},
        {5, {"-o", "x.ts", "--vcodec", "h264"}, {"'x.ts'", "mptsmux is not installed"}},
        {2, {"-o", "x.wav", "--acodec", "aac"}, {"--acodec 'aac'", "raw streams"}},
        {2, {"-o", "x.m4a", "--vcodec", "h264"}, {"--vcodec 'h264'", "sound alone"}},
        {2, {"-o", "x.i420", "--crf", "20"}, {"--crf", "'x.i420'"}},
        {2, {"-o", "x.mkv", "--vcodec", "ffv1", "--crf", "20"}, {"--crf", "ffv1venc"}},
        {2, {"-o", "x.mkv", "--vcodec", "ffv1", "--bitrate", "1M"}, {"--bitrate", "ffv1venc"}},
        {2, {"-o", "x.mkv", "--vcodec", "ffv1", "--two-pass"}, {"--two-pass", "'ffv1venc'"}},
        {2, {"-o", "x.mp4", "--crf", "99"}, {"--crf", "0 to 51"}},
        {2, {"-o", "x.mp4", "--vcodec", "h264:tuen=film"}, {"tuen", "h264venc"}},
        {2, {"-o", "x.mp4", "--vcodec", "none:tune=film"}, {"--vcodec none"}},
        {2, {"-o", "x.mp4", "--bitrate", "10k"}, {"--bitrate 10k", "100k to 50M"}},
        {2, {"-o", "x.mp4", "--audio-bitrate", "100k"}, {"96k, 128k, 192k"}},
        {2, {"-o", "x.mp4", "--bitrate", "fast"}, {"'fast'"}},
        {2, {"-o", "x.mp4", "--bitrate", "nan"}, {"'nan'"}},
        {2, {"-o", "x.mp4", "--bitrate", "5G"}, {"'5G'"}},
        {2, {"-o", "x.mp4", "--crf", "20", "--two-pass"}, {"--crf", "--two-pass"}},
        {2, {"-o", "x.mp4", "--vcodec", "none", "--crf", "20"}, {"--crf", "no picture"}},
        {2, {"-o", "x.mkv", "--muxer", "mkvmux:seekabel=0"}, {"seekabel", "mkvmux"}},
        {2, {"-o", "x.foo", "--vcodec", "h264"}, {"'foo'"}},
        {2, {"-o", "-", "--vcodec", "h264"}, {"--format"}},
    };
    for (const auto& row : rows) fails(row.status, job(row.options), row.parts);
    fails(2, coded({"transcode", "-", "--input-format", "wav", "-o", "x.mp4", "--two-pass"}), {"--two-pass"});
}

TEST_F(Encoders, AreKeptByAPresetOfOnesOwn) {
    ProcessOptions own = here();
    own.environment = {"HOME=" + folder.path().string()};
    const auto run = [&](const Words& words) { return tarsel(coded(words), own); };
    EXPECT_EQ(run({"presets", "save", "Mine", "--preset", "h264_high", "--vcodec", "h264:tune=film", "--crf",
                   "30", "--audio-bitrate", "192k"})
                  .status,
              0);
    EXPECT_EQ(
        run({"presets", "save", "Lossless", "--muxer", "mkvmux", "--vcodec", "ffv1", "--acodec", "flac"})
            .status,
        0);
    const Words card = {"transcode", "testgen:size=64x48,rate=25,duration=0.2", "--match"};
    EXPECT_EQ(run(card + Words{"--preset", "Mine", "-o", "m.mp4"}).status, 0);
    EXPECT_EQ(heads(contents("m.mp4")),
              "mp4mux seekable 1|h264venc crf 30 rate 2000000 tune film|aacaenc crf  rate 192000 tune |");
    EXPECT_EQ(run(card + Words{"--preset", "Lossless", "-o", "l.mkv"}).status, 0);
    EXPECT_THAT(contents("l.mkv"), AllOf(HasSubstr("ffv1venc"), HasSubstr("flacaenc")));
    const struct {
        Words options;
        const char* part;
    } wrong[] = {
        {{"--crf", "20"}, "no encoder has a quality"},
        {{"--preset", "h264_high", "--vcodec", "ffv1"}, "'H.264 High'"},
        {{"--preset", "h264_high", "--crf", "99"}, "0 to 51"},
        {{"--preset", "h264_high", "--acodec", "none", "--audio-bitrate", "64k"}, "no sound"},
    };
    for (const auto& row : wrong)
        EXPECT_THAT(run(Words{"presets", "save", "X"} + row.options).err, HasSubstr(row.part));
}

// A container for a pipe is written from front to end, without going back.
TEST_F(Encoders, WriteContainersToPipes) {
    const Outcome o = works(job({"-o", "-", "--format", "mkv"}));
    EXPECT_THAT(o.out, StartsWith("mkvmux seekable 0\n"));
    EXPECT_EQ(count(o.out, "picture\n"), 5);
    EXPECT_GT(count(o.out, "sound\n"), 0);
    const std::string raw = works(job({"-o", "-", "--format", "y4m"})).out;
    EXPECT_THAT(raw, StartsWith("y4mmux seekable 0\n"));
    EXPECT_EQ(raw.size(), std::strlen("y4mmux seekable 0\n") + 5 * kFrame);
    works(job({"-o", "t.mkv", "--save-task", "t.xml"}));
    EXPECT_EQ(works(coded({"run", "t.xml", "-o", "-"})).out, o.out);
}

TEST_F(Encoders, TwoPassesGoOverJobsJoinsAndTasks) {
    const Words rest = {"--two-pass", "--bitrate", "1M", "--progress", "json"};
    for (const Words& parts : {Words{}, Words{"--cut", "0-0.08", "--cut", "0.12-0.2"}}) {
        const Outcome o = works(job(parts + rest + Words{"-o", "x.mp4", "--save-task", "t.xml", "-y"}));
        EXPECT_THAT(o.err, AllOf(HasSubstr("\"passes\":2"), HasSubstr("\"percent\":100.0")));
        const std::string file = contents("x.mp4");
        EXPECT_THAT(file, HasSubstr("rate 1000000 tune  with statistics\n"));
        EXPECT_EQ(count(file, "picture\n"), parts.empty() ? 5 : 4);
        works(coded({"run", "t.xml", "-y"}));
        EXPECT_EQ(contents("x.mp4"), file);
    }
    // What is left of the first pass goes with the run.
    for (const std::string& name : listing()) EXPECT_EQ(name.find(".md"), std::string::npos) << name;
}

}  // namespace
