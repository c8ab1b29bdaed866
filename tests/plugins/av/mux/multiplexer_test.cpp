#include "plugins/av/mux/multiplexer.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <filesystem>
#include <span>
#include <sstream>

#include "core/encode/qvfilemux.h"
#include "core/encode/qvsink.h"
#include "core/measure/fourcc.h"
#include "core/measure/mediatime.h"
#include "core/measure/qvgeometry.h"
#include "tests/plugins/av/films.h"
#include "tests/plugins/av/mux/unitsender.h"
#include "tests/support/engine.h"
#include "tests/support/log_capture.h"
#include "tests/support/pictures.h"

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
            EXPECT_TRUE(sent || !problem.empty());
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
        const Outcome read =
            ffmpeg({"-threads", "1", "-i", film, "-map", std::string("0:") + kind, "-fps_mode", "passthrough",
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
                if (!takes || ordered || (!video && container.is(av::MuxTrait::needsVideo))) {
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
                const std::string module = output.module;
                if (video || name != "PCM") {  // whose units are cut anew
                    EXPECT_EQ(result.streams[0].units, film.streams[0].units);
                }
                if (video) {
                    EXPECT_TRUE(decoded(file, "v") == whole) << "decodes to something else";
                    if (module != "dvavimux" && module != "mpegpsmux") {  // have no time for each picture
                        EXPECT_EQ(times(result, 0), times(film, 0));
                    }
                } else {  // but for what is before the first and after the last sample that is heard
                    EXPECT_NE(samples(file).find(whole.substr(whole.size() / 10, whole.size() * 8 / 10)),
                              std::string::npos);
                }
            }
        }
}

TEST_F(EveryContainer, holdsOnePicture) {
    const struct {
        const char *module, *name;
        int source;
    } cases[] = {
        {"mp4mux", "a.mp4", 0},    {"movmux", "b.mov", 11}, {"mkvmux", "c.mkv", 1},
        {"webmmux", "d.webm", 4},  {"mxfmux", "e.mxf", 6},  {"mptsmux", "f.ts", 0},
        {"mpegpsmux", "g.mpg", 6}, {"dvmux", "h.dv", 9},    {"dvavimux", "i.avi", 12},
    };
    for (const auto& c : cases) {
        UnitSender film(make(kPictures[c.source], true));
        film.units.resize(1);
        const std::string to = folder.file(c.name);
        EXPECT_EQ(mux(c.module, film, to), "") << c.name;
        const std::string pictures = decoded(to, "v");
        EXPECT_EQ(std::count(pictures.begin(), pictures.end(), '\n'), 1) << c.name;
    }
}

// FLAC's length and digest are known at the end.
TEST_F(EveryContainer, hasTheOwnDataOfACodecAsTheyBecame) {
    const std::string from = make(kSounds[5], false);
    for (const char* name : {"flacmux x.flac", "mkvmux x.mkv", "mp4mux x.mp4"}) {
        UnitSender film(from);
        std::string& data = film.streams[0].finalData = film.streams[0].extradata;
        ASSERT_EQ(data.size(), 34u);
        data.replace(18, 16, "a digest of sums");
        const std::string module(name, std::strchr(name, ' ')), to = folder.file(std::strchr(name, ' ') + 1);
        ASSERT_EQ(mux(module, film, to), "");
        EXPECT_THAT(TempFolder::read(to), HasSubstr(data)) << name;
    }
}

// H.264 with B-frames and AAC with priming.
class FilmWithSound : public Multiplexers {
  protected:
    void SetUp() override {
        Multiplexers::SetUp();
        if (IsSkipped()) return;
        ASSERT_EQ(ffmpeg({"-f", "lavfi", "-i", "testsrc2=size=96x64:rate=30000/1001:duration=3", "-f",
                          "lavfi", "-i", "aevalsrc=sin(440*2*PI*t*t):s=48000:d=3", "-c:v", "libx264", "-bf",
                          "2", "-g", "15", "-c:a", "aac", file})
                      .status,
                  0);
        film = std::make_unique<UnitSender>(file);
        ASSERT_EQ(film->streams.size(), 2u);
        ASSERT_GT(film->streams[0].picture.delay, 0);
        ASSERT_GT(film->streams[1].sound.initialPadding, 0);
    }
    // What the engine's decoder reads.
    std::string heard(const std::string& film) const {
        const std::string tool = QV_BINARY_DIR "/bin/tarsel";
        const Outcome read = runProgram({tool, "transcode", film, "-y", "-o", folder.file("x.wav")});
        EXPECT_EQ(read.status, 0) << read.err;
        return TempFolder::read(folder.file("x.wav")).substr(44);
    }
    std::string file = folder.file("film.mp4");
    std::unique_ptr<UnitSender> film;
};

TEST_F(FilmWithSound, startsAndEndsAtTheSameTimeInEveryForm) {
    const std::string pictures = decoded(file, "v"), sound = heard(file);
    const struct {
        const char *module, *name;
        AnyDict params;
        bool exact;
    } cases[] = {
        {"mp4mux", "a.mp4", AnyDict("_totalFrames", 90), true},
        {"mp4mux", "b.mp4", AnyDict("seekable", 0), true},
        {"mp4mux", "c.mov", AnyDict("fastStart", 0), true},
        {"movmux", "d.mov", AnyDict("_totalFrames", 90), true},
        {"mkvmux", "e.mkv", AnyDict(), false},
        {"mkvmux", "f.mkv", AnyDict("seekable", 0), false},
        {"mptsmux", "g.ts", AnyDict(), false},
        {"mptsmux", "h.m2ts", AnyDict(), false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        const std::string to = folder.file(c.name);
        ASSERT_EQ(mux(c.module, *film, to, c.params), "");
        const UnitSender result(to, film.get());
        ASSERT_EQ(result.streams.size(), 2u);
        EXPECT_EQ(times(result, 0), times(*film, 0));
        EXPECT_TRUE(decoded(to, "v") == pictures);
        const std::string now = heard(to);
        if (c.exact) {
            EXPECT_TRUE(now == sound) << now.size() << " of " << sound.size();
        } else {
            // Matroska counts in milliseconds, and transport streams can't say what is priming.
            const long most = 3 * (c.module == std::string("mkvmux") ? 48 : 1024), at = 3 * 24000;
            const auto found = now.find(sound.substr(at, 3 * 96000));
            ASSERT_NE(found, std::string::npos);
            EXPECT_LE(std::abs(static_cast<long>(found) - at), most);
        }
    }
    const auto places = [this](const char* name) {
        const std::string bytes = TempFolder::read(folder.file(name));
        return std::pair(bytes.find("moov"), bytes.find("mdat"));
    };
    EXPECT_LT(places("a.mp4").first, places("a.mp4").second) << "the index is in front";
    EXPECT_GT(places("c.mov").first, places("c.mov").second);
    EXPECT_EQ(TempFolder::read(folder.file("b.mp4")).find("mfra") == std::string::npos, false);
}

// Containers that take sound only beside pictures.
TEST_F(Multiplexers, carryPcmBesidePictures) {
    const struct {
        const char *module, *name;
        Words pictures;
    } cases[] = {
        {"mxfmux", "a.mxf", {"-c:v", "mpeg2video", "-bf", "2", "-g", "12"}},
        {"dvmux", "b.dv", {"-s", "720x576", "-pix_fmt", "yuv420p", "-c:v", "dvvideo"}},
        {"dvavimux", "c.avi", {"-s", "720x576", "-pix_fmt", "yuv420p", "-c:v", "dvvideo"}},
        {"mpegpsmux", "d.mpg", {"-c:v", "mpeg2video", "-bf", "2", "-g", "12"}},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        const std::string from = folder.file("from.mov"), to = folder.file(c.name);
        Words words = {"-f",   "lavfi",    "-i", kMoving,
                       "-f",   "lavfi",    "-i", "aevalsrc=sin(440*2*PI*t*t)|sin(300*t*t):s=48000:d=2",
                       "-c:a", "pcm_s16le"};
        words.insert(words.end(), c.pictures.begin(), c.pictures.end());
        words.push_back(from);
        const Outcome made = ffmpeg(words);
        ASSERT_EQ(made.status, 0) << made.err;
        UnitSender film(from);
        ASSERT_EQ(mux(c.module, film, to, AnyDict("meta", AnyDict("timecode", "10:00:00:00"))), "");
        EXPECT_TRUE(decoded(to, "v") == decoded(from, "v"));
        const std::string now = samples(to), before = samples(from);
        ASSERT_EQ(now.size(), before.size());
        std::size_t other = 0;
        for (std::size_t i = 0; i < now.size(); ++i) other += now[i] != before[i];
        // Some values of samples are marks of errors in DV, and become their neighbours.
        EXPECT_LE(other, c.module == std::string("dvmux") ? now.size() / 500 : 0);
        if (c.module != std::string("mxfmux")) continue;
        const Outcome shown = runProgram({"/usr/bin/env", "ffprobe", "-v", "error", "-show_format", to});
        EXPECT_THAT(shown.out, HasSubstr("timecode=10:00:00:00"));
    }
}

TEST_F(FilmWithSound, isMadeOfElementaryStreams) {
    for (const char* codec : {"h264 libx264", "h265 libx265", "m2v mpeg2video"}) {
        SCOPED_TRACE(codec);
        const std::string extension(codec, std::strchr(codec, ' ')), encoder = std::strchr(codec, ' ') + 1;
        const std::string pictures = folder.file("a." + extension), sound = folder.file("a.aac"),
                          to = folder.file("out.mov"), same = folder.file("same.mov");
        const Words coded = {"-i", file, "-an", "-c:v", encoder, "-bf", "2", "-g", "15"};
        for (const std::string& output : {same, pictures}) {
            Words words = coded;
            words.push_back(output);
            ASSERT_EQ(ffmpeg(words).status, 0);
        }
        ASSERT_EQ(ffmpeg({"-i", file, "-vn", "-c", "copy", sound}).status, 0);
        QvFileMuxConfig config;
        config.addStream(qvVideoStream, Any(pictures.c_str()), "h264venc").framerate =
            QvFramerate(30000.0 / 1001);
        auto& second = config.addStream(qvAudioStream, Any(sound.c_str()), "aacaenc");
        second.samplerate = 48000;
        second.channels = 1;
        double last = 0;
        config.watch = [&last](double part) { return part >= std::exchange(last, part); };
        const std::unique_ptr<QvCodec> made(av::newMultiplexer("movmux")),
            sinkCodec(qv_registry()->newCodec("filesink"));
        auto& muxer = static_cast<QvMuxer&>(*made);
        auto& sink = static_cast<QvSink&>(*sinkCodec);
        muxer.init();
        sink.setParam("filename", Any(to.c_str()));
        muxer.attachOutStream(sink.stream());
        ASSERT_EQ(sink.open(), 0);
        ASSERT_EQ(muxer.muxElementaryStreams(config, *sink.stream()), 0) << muxer.errorDesc();
        ASSERT_EQ(sink.close(), 0) << sink.errorDesc();
        EXPECT_EQ(muxer.nrStreams(0), 0);
        const UnitSender expected(same), result(to, &expected);
        ASSERT_EQ(result.streams.size(), 2u);
        EXPECT_EQ(times(result, 0), times(expected, 0));
        EXPECT_TRUE(decoded(to, "v") == decoded(same, "v"));
        EXPECT_EQ(result.streams[1].units, film->streams[1].units);
        EXPECT_GE(last, 0.99);
    }
}

// More units than were announced: the index is at the end, and the film is whole.
TEST_F(FilmWithSound, hasItsIndexAtTheEndWhereItsSpaceIsTooSmall) {
    ASSERT_EQ(ffmpeg({"-f", "lavfi", "-i", "testsrc2=size=16x16:rate=100:duration=60", "-c:v", "libx264",
                      "-g", "1", "-preset", "ultrafast", file})
                  .status,
              0);
    UnitSender many(file);
    const std::string to = folder.file("late.mp4");
    ASSERT_EQ(mux("mp4mux", many, to, AnyDict("_totalFrames", 1)), "");
    const std::string bytes = TempFolder::read(to);
    EXPECT_GT(bytes.find("moov"), bytes.find("mdat"));
    EXPECT_EQ(UnitSender(to).units.size(), 6000u);
}

TEST_F(FilmWithSound, isNotWrittenToAFullDiskOrAfterAnAbort) {
    for (const int seekable : {0, 1})
        for (const char* module : {"mp4mux", "mkvmux", "mptsmux"})
            EXPECT_THAT(mux(module, *film, "/dev/full", AnyDict("seekable", seekable)),
                        HasSubstr("No space left"))
                << module << seekable;
    EXPECT_EQ(mux("mp4mux", *film, folder.file("gone.mp4"), AnyDict(), true), "");
    EXPECT_EQ(UnitSender(folder.file("gone.mp4")).streams.size(), 0u) << "there is no index";
    EXPECT_THAT(mux("dvavimux", *film, folder.file("x.avi"), AnyDict("seekable", 0)), HasSubstr("pipe"));
}

TEST_F(FilmWithSound, isRefusedWithAReason) {
    const std::string to = folder.file("x.mp4");
    const auto refused = [&](auto change) {
        UnitSender wrong(file);
        change(wrong);
        return mux("mp4mux", wrong, to);
    };
    EXPECT_THAT(refused([](UnitSender& f) { f.streams[0].picture.codec = 0x31564646; }),
                HasSubstr("Video stream #0: MP4 does not hold FFV1, but H.264"));
    EXPECT_THAT(refused([](UnitSender& f) { f.streams[0].picture.codec = 0x58585858; }), HasSubstr("'XXXX'"));
    EXPECT_THAT(refused([](UnitSender& f) { f.streams[0].picture.codec = 0x20434141; }),
                HasSubstr("AAC is no codec of pictures"));
    EXPECT_THAT(refused([](UnitSender& f) { f.streams[0].picture.version = 7; }), HasSubstr("version 7"));
    EXPECT_THAT(refused([](UnitSender& f) { f.streams[0].picture.rateNum = 0; }), HasSubstr("no frame rate"));
    EXPECT_THAT(refused([](UnitSender& f) { f.streams[0].picture.width = 1 << 30; }),
                HasSubstr("no pictures of"));
    EXPECT_THAT(refused([](UnitSender& f) { f.streams[1].sound.channels = 100000; }),
                HasSubstr("no sound of"));
    EXPECT_THAT(refused([](UnitSender& f) { f.units[0].bytes = "not H.264"; }),
                HasSubstr("Video stream #0: a unit is no H.264"));
    EXPECT_THAT(refused([](UnitSender& f) {
                    f.units[3].dts = f.units[0].dts;
                    f.units[3].stream = 0;
                }),
                HasSubstr("out of order"));
    EXPECT_THAT(refused([](UnitSender& f) { f.units[5].pts = INT64_MAX - 5; }),
                HasSubstr("a unit has the time"));
    EXPECT_THAT(refused([](UnitSender& f) { f.units.clear(); }), HasSubstr("there is nothing in it"));
}

// Units of which nothing is heard are not written.
TEST_F(FilmWithSound, endsWhereItsSoundDoes) {
    const auto heard = [&](int trailing) {
        UnitSender from(file);
        from.streams[1].sound.trailingPadding = trailing;
        const std::string to = folder.file("cut.mp4");
        EXPECT_EQ(mux("mp4mux", from, to), "");
        return std::stoll(runProgram({"/usr/bin/env", "ffprobe", "-v", "error", "-select_streams", "a", "-of",
                                      "csv=p=0", "-show_entries", "stream=duration_ts", to})
                              .out);
    };
    const long long all = heard(0);
    constexpr int millisecond = 48;  // the unit of the list of edits
    for (const int trailing : {500, 1024, 1500, 2100})
        EXPECT_NEAR(static_cast<double>(all - heard(trailing)), trailing, millisecond);
}

TEST_F(FilmWithSound, keepsItsWordsAndNamesWhatIsLost) {
    AnyVector chapters(AnyDict("time", MediaTime(0.0), "title", "One"), AnyDict("time", 1.5, "title", "Two"));
    AnyDict meta("title", "A film", "artist", "Somebody", "timecode", "01:02:03:04", "chapters", chapters);
    const AnyDict params("meta", meta, "language", "deu", "_totalFrames", 90);
    for (const char* name : {"mp4mux x.mp4", "movmux x.mov", "mkvmux x.mkv"}) {
        SCOPED_TRACE(name);
        const std::string module(name, 6), to = folder.file(name + 7);
        ASSERT_EQ(mux(module, *film, to, params), "");
        const Outcome shown = runProgram({"/usr/bin/env", "ffprobe", "-v", "error", "-show_chapters",
                                          "-show_format", "-show_streams", to});
        // Matroska has its first picture after the priming of AAC.
        const char* const second = module == "mkvmux" ? "start_time=1.521000" : "start_time=1.500000";
        for (const char* part :
             {"title=A film", "=Somebody", "=01:02:03:04", "title=One", second, "title=Two"})
            EXPECT_THAT(shown.out, HasSubstr(part));
        EXPECT_THAT(shown.out, testing::AnyOf(HasSubstr("language=deu"), HasSubstr("language=ger")));
        EXPECT_TRUE(decoded(to, "v") == decoded(file, "v"));
    }
    LogCapture log;
    ASSERT_EQ(mux("mptsmux", *film, folder.file("x.ts"), params), "");
    EXPECT_TRUE(log.contains("does not hold: artist, chapters, timecode"));
}

TEST_F(Multiplexers, checkOptionsWhenTheyAreSet) {
    const std::unique_ptr<QvCodec> made(av::newMultiplexer("mptsmux"));
    made->init();
    EXPECT_EQ(made->setParam("avOptions", "muxrate=8000000:mpegts_service_id=5"), 0);
    const struct {
        const char *text, *why;
    } wrong[] = {
        {"muxrat=1", "similar: 'muxrate'"},
        {"muxrate", "no list of name=value"},
        {"muxrate=fast", "'fast' is no value of the option muxrate"},
        {"movflags=faststart", "'movflags' is no option of mpegts"},
    };
    for (const auto& c : wrong) {
        EXPECT_NE(made->setParam("avOptions", c.text), 0);
        EXPECT_THAT(made->errorDesc(), HasSubstr(c.why));
    }
    AnyDict state;
    made->store(state);
    EXPECT_STREQ(state.get("avOptions").asString(""), "muxrate=8000000:mpegts_service_id=5");
    EXPECT_FALSE(av::newMultiplexer("rawmux"));
}

// The engine's own encoders of raw data.
TEST_F(Multiplexers, takeRawPicturesAndSound) {
    const struct {
        const char *module, *name;
        unsigned type;
        const char* layout;
        int bits;  // 0: no sound
    } cases[] = {
        {"y4mmux", "a.y4m", QvFourcc::I420, "yuv420p", 0},
        {"y4mmux", "b.y4m", QvFourcc::W016, "yuv420p16le", 0},
        {"movmux", "c.mov", QvFourcc::YUYV, "yuyv422", 16},
        {"movmux", "d.mov", QvFourcc::UYVY, "uyvy422", 24},
        {"mkvmux", "e.mkv", QvFourcc::I420, "yuv420p", 24},
        {"mkvmux", "f.mkv", QvFourcc::UYVY, "uyvy422", 16},
        {"dvavimux", "g.avi", QvFourcc::I420, "yuv420p", 16},
        {"dvavimux", "h.avi", QvFourcc::YUYV, "yuyv422", 8},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        const std::string to = folder.file(c.name);
        const std::unique_ptr<QvCodec> made(av::newMultiplexer(c.module)),
            sinkCodec(qv_registry()->newCodec("filesink")), video(qv_registry()->newCodec("rawvenc")),
            audio(qv_registry()->newCodec("rawaenc"));
        auto& muxer = static_cast<QvMuxer&>(*made);
        auto& sink = static_cast<QvSink&>(*sinkCodec);
        auto& pictures = static_cast<QvVideoEncoder&>(*video);
        auto& sound = static_cast<QvAudioEncoder&>(*audio);
        muxer.init();
        sink.setParam("filename", Any(to.c_str()));
        pictures.setParamDict(AnyDict("type", static_cast<int>(c.type), "width", 32, "height", 16,
                                      "framerate", QvFramerate(25.0)));
        sound.setParamDict(
            AnyDict("channels", 2, "bitsPerSample", c.bits ? c.bits : 16, "samplerate", 48000));
        pictures.attachOutStream(muxer.addStream(qvVideoStream, AnyDict()));
        if (c.bits) sound.attachOutStream(muxer.addStream(qvAudioStream, AnyDict()));
        muxer.attachOutStream(sink.stream());
        ASSERT_EQ(sink.open(), 0);
        ASSERT_EQ(muxer.open(), 0) << muxer.errorDesc();
        ASSERT_EQ(pictures.open(), 0);
        if (c.bits) {
            ASSERT_EQ(sound.open(), 0);
        }
        std::string sent, sentSound;
        for (unsigned i = 0; i < 10; ++i) {
            QvFrame frame = makePicture(c.type, 32, 16, i);
            sent += pictureBytes(frame);
            ASSERT_EQ(pictures.writeFrame(&frame), 0) << pictures.errorDesc();
            if (!c.bits) continue;
            QvPcm pcm;
            fillSound(pcm, 1920, 2, c.bits / 8, 48000, i);
            sentSound += soundBytes(pcm);
            ASSERT_EQ(sound.writePcm(&pcm), 0) << sound.errorDesc();
        }
        EXPECT_EQ(pictures.close(), 0);
        if (c.bits) {
            EXPECT_EQ(sound.close(), 0);
        }
        EXPECT_EQ(muxer.close(), 0) << muxer.errorDesc();
        EXPECT_EQ(sink.close(), 0) << sink.errorDesc();
        EXPECT_TRUE(Films::pictures(to, c.layout) == sent);
        if (!c.bits) continue;
        const std::string raw = folder.file("samples.raw");
        const std::string form = c.bits == 8 ? "u8" : c.bits == 16 ? "s16le" : "s24le";
        EXPECT_EQ(ffmpeg({"-i", to, "-f", form, "-c:a", "pcm_" + form, raw}).status, 0);
        EXPECT_TRUE(TempFolder::read(raw) == sentSound);
    }
}

}  // namespace
