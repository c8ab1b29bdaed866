#include "plugins/av/mux/multiplexer.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <filesystem>
#include <span>
#include <sstream>

#include "core/encode/qvsink.h"
#include "core/measure/qvgeometry.h"
#include "tests/plugins/av/films.h"
#include "tests/plugins/av/mux/unitsender.h"
#include "tests/support/engine.h"

namespace {

using testing::HasSubstr;

class Multiplexers : public Films {
  protected:
    // Sends a film's units into a new file. "" or the text of the failure.
    std::string mux(const std::string& module, UnitSender& from, const std::string& file,
                    const AnyDict& params = AnyDict(), bool abort = false) {
        const std::unique_ptr<QvCodec> made(av::newMultiplexer(module.c_str()));
        auto& muxer = static_cast<QvMuxer&>(*made);
        const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec("filesink"));
        auto& sink = static_cast<QvSink&>(*codec);
        muxer.init();
        sink.setParam("filename", Any(file.c_str()));
        muxer.setParam("filename", Any(file.c_str()));
        muxer.setParamDict(params);
        if (!from.addTo(muxer)) return "it takes no such stream";
        muxer.attachOutStream(sink.stream());
        std::string problem;
        if (sink.open() != 0) return sink.errorDesc();
        if (muxer.open() != 0) {
            problem = muxer.errorDesc();
        } else {
            const bool sent = from.sendHeads() && from.sendUnits();
            if (!abort && muxer.close() != 0) problem = muxer.errorDesc();
            EXPECT_EQ(sent, problem.empty()) << problem;
            if (abort) muxer.abort();
        }
        from.detach();
        if (abort || !problem.empty())
            sink.abort();
        else if (sink.close() != 0)
            problem = sink.errorDesc();
        muxer.detachOutStream();
        return problem;
    }
    // Hashes of the decoded pictures or samples, one a line, and the times of the pictures in frames.
    std::string decoded(const std::string& film, const char* kind) const {
        const Outcome read = ffmpeg({"-i", film, "-map", std::string("0:") + kind, "-fps_mode", "passthrough",
                                     "-f", *kind == 'v' ? "framehash" : "hash", "-"});
        EXPECT_EQ(read.status, 0) << film << read.err;
        std::string hashes;
        std::istringstream lines(read.out);
        for (std::string line; std::getline(lines, line);)
            if (line[0] != '#') hashes += line.substr(line.find_last_of(" =") + 1) + '\n';
        return hashes;
    }
    std::string samples(const std::string& film) const {
        const std::string raw = folder.file("samples.raw");
        EXPECT_EQ(ffmpeg({"-i", film, "-map", "0:a", "-f", "s16le", raw}).status, 0) << film;
        return TempFolder::read(raw);
    }
    // In frames or samples, from the first that is shown.
    static std::vector<std::int64_t> times(const UnitSender& film, std::size_t stream) {
        std::vector<std::int64_t> all;
        for (const auto& unit : film.units)
            if (unit.stream == stream) all.push_back(unit.pts);
        const std::int64_t first = all.empty() ? 0 : *std::min_element(all.begin(), all.end());
        for (std::int64_t& time : all) time -= first;
        return all;
    }

    EngineScope engine_;
};

// The films that encoders would send: pictures with B-frames and not, sound with and without priming.
struct Source {
    const char *name, *file;
    std::vector<std::string> options;
    const char* pictures = "testsrc2=size=96x64:rate=25:duration=2";
};
const Source kPictures[] = {
    {"H.264", "h264.mp4", {"-c:v", "libx264", "-bf", "2", "-g", "12", "-pix_fmt", "yuv420p"}},
    {"H.265",
     "hevc.mp4",
     {"-c:v", "libx265", "-x265-params", "log-level=none:bframes=3", "-pix_fmt", "yuv420p"}},
    {"AV1", "av1.mkv", {"-c:v", "libaom-av1", "-cpu-used", "8"}},
    {"VP8", "vp8.mkv", {"-c:v", "libvpx"}},
    {"VP9", "vp9.mkv", {"-c:v", "libvpx-vp9", "-deadline", "realtime"}},
    {"MPEG-1", "mpeg1.mkv", {"-c:v", "mpeg1video", "-bf", "2", "-g", "12"}},
    {"MPEG-2", "mpeg2.mkv", {"-c:v", "mpeg2video", "-bf", "2", "-g", "12"}},
    {"MPEG-4", "mpeg4.mp4", {"-c:v", "mpeg4", "-bf", "2"}},
    {"DNxHD",
     "dnxhd.mov",
     {"-c:v", "dnxhd", "-profile:v", "dnxhr_sq", "-pix_fmt", "yuv422p"},
     "testsrc2=size=256x128:rate=25:duration=1"},
    {"DV", "dv.mov", {"-c:v", "dvvideo", "-pix_fmt", "yuv420p"}, "testsrc2=size=720x576:rate=25:duration=1"},
    {"JPEG 2000", "j2k.mov", {"-c:v", "jpeg2000", "-pix_fmt", "yuv420p"}},
    {"ProRes", "prores.mov", {"-c:v", "prores_ks", "-profile:v", "3"}},
    {"FFV1", "ffv1.mkv", {"-c:v", "ffv1", "-level", "3"}},
    {"JPEG", "mjpeg.mkv", {"-c:v", "mjpeg"}},
};
const Source kSounds[] = {
    {"AAC", "aac.mp4", {"-c:a", "aac"}},        {"MPEG audio", "mp2.mka", {"-c:a", "mp2"}},
    {"MP3", "mp3.mka", {"-c:a", "libmp3lame"}}, {"AC-3", "ac3.mka", {"-c:a", "ac3"}},
    {"E-AC-3", "eac3.mka", {"-c:a", "eac3"}},   {"FLAC", "flac.mka", {"-c:a", "flac"}},
    {"Opus", "opus.mka", {"-c:a", "libopus"}},  {"Vorbis", "vorbis.mka", {"-c:a", "libvorbis"}},
    {"PCM", "pcm.mka", {"-c:a", "pcm_s16le"}},
};

class EveryContainer : public Multiplexers {
  protected:
    std::string make(const Source& source, bool video) {
        const std::string file = folder.file(source.file);
        if (std::filesystem::exists(file)) return file;
        Words words = {"-f", "lavfi", "-i",
                       video ? source.pictures : "sine=frequency=440:sample_rate=48000:duration=2"};
        if (!video) words.insert(words.end(), {"-ac", "2"});
        words.insert(words.end(), source.options.begin(), source.options.end());
        words.push_back(file);
        const Outcome made = ffmpeg(words);
        EXPECT_EQ(made.status, 0) << made.err;
        return file;
    }
};

// Each codec alone in each container: refused by name, or every unit arrives with its time.
TEST_F(EveryContainer, takesEachCodecOfItsRowAndNamesTheOthers) {
    const struct {
        const char *module, *extension;
    } outputs[] = {
        {"mp4mux", "mp4"},   {"movmux", "mov"}, {"mkvmux", "mkv"},    {"webmmux", "webm"},
        {"mxfmux", "mxf"},   {"mptsmux", "ts"}, {"mpegpsmux", "mpg"}, {"dvmux", "dv"},
        {"dvavimux", "avi"}, {"y4mmux", "y4m"}, {"flacmux", "flac"},  {"oggmux", "ogg"},
    };
    for (const bool video : {true, false})
        for (const Source& source :
             video ? std::span<const Source>(kPictures) : std::span<const Source>(kSounds)) {
            const std::string from = make(source, video);
            UnitSender film(from);
            ASSERT_EQ(film.streams.size(), 1u) << source.name;
            const std::string whole = video ? decoded(from, "v") : samples(from);
            for (const auto& output : outputs) {
                SCOPED_TRACE(std::string(source.name) + " in " + output.module);
                const av::Container& container = *av::containerOf(output.module);
                const std::string names = ", " + container.takenNames(video) + ",";
                const std::string name = source.name;
                const bool takes = names.find(", " + name + ",") != std::string::npos ||
                                   names.find(", " + name + " and ") != std::string::npos ||
                                   names.find(" and " + name + ",") != std::string::npos;
                const std::string file = folder.file(std::string("out.") + output.extension);
                const std::string problem = mux(output.module, film, file);
                const bool ordered =
                    film.streams[0].picture.delay > 0 &&
                    (container.inOrder & av::codecBit(av::muxCodec(film.streams[0].picture.codec)->codec));
                if (!takes || ordered || (!video && container.needsVideo)) {
                    EXPECT_FALSE(problem.empty());
                    continue;
                }
                EXPECT_EQ(problem, "");
                if (!problem.empty()) continue;
                UnitSender result(file, &film);
                if (result.streams.size() != 1u) {
                    ADD_FAILURE() << result.streams.size();
                    continue;
                }
                if (video || name != "PCM") EXPECT_EQ(result.streams[0].units, film.streams[0].units);
                if (video)
                    EXPECT_TRUE(decoded(file, "v") == whole) << "decodes to something else";
                else  // but for what is before the first and after the last sample that is heard
                    EXPECT_NE(samples(file).find(whole.substr(whole.size() / 10, whole.size() * 8 / 10)),
                              std::string::npos)
                        << whole.size() << " " << samples(file).size();
                const std::string module = output.module;
                if (video && module != "dvavimux" && module != "mpegpsmux" &&
                    times(result, 0) != times(film, 0))
                    ADD_FAILURE() << testing::PrintToString(times(result, 0))
                                  << testing::PrintToString(times(film, 0));
            }
        }
}

}  // namespace
