// Films through the tool, with the plug-in that it loads by itself.
#include <filesystem>

#include <gmock/gmock.h>

#include "core/engine/status.h"
#include "plugins/av/decoder/avdec.h"
#include "tests/plugins/av/films.h"
#include "tests/support/engine.h"

namespace {

using testing::HasSubstr;
using testing::Not;

TEST_F(FilmsInTheTool, areShownAndTranscodedToTheirLastPicture) {
    const std::string file =
        film("film.mp4", {"-c:v", "mpeg4", "-g", "12", "-bf", "2", "-metadata:s:v", "language=deu"});
    const Outcome shown = tarsel({"info", "film.mp4"});
    EXPECT_EQ(shown.status, 0) << shown.err;
    for (const char* part : {"avdec", "MPEG-4", "96x64", "25 fps", "50 frames"})
        EXPECT_THAT(shown.out, HasSubstr(part));

    const Outcome made = tarsel({"transcode", "film.mp4", "-o", "film.i420"});
    EXPECT_EQ(made.status, 0) << made.err;
    EXPECT_EQ(TempFolder::read(folder.file("film.i420")), pictures(file, "yuv420p"));

    const Outcome cut = tarsel({"transcode", "film.mp4", "--from", "31f", "--to", "34f", "-o", "cut.i420"});
    EXPECT_EQ(cut.status, 0) << cut.err;
    const std::size_t size = 96 * 64 * 3 / 2;
    EXPECT_EQ(TempFolder::read(folder.file("cut.i420")),
              pictures(file, "yuv420p").substr(31 * size, 3 * size));

    const Outcome picture = tarsel({"frame", "film.mp4", "--at", "1", "-o", "one.png"});
    EXPECT_EQ(picture.status, 0) << picture.err;
}

// A survey knows how many pictures there are and not which comes when, so it gives none.
TEST_F(FilmsInTheTool, areNotReadInASurvey) {
    const EngineScope engine;
    av::AvDec decoder;
    decoder.setParam("filename",
                     Any(film("long.mp4", {"-c:v", "mpeg4", "-bf", "2", "-c:a", "aac"},
                              "testsrc2=size=96x64:rate=25:duration=8[out0];sine=duration=8[out1]")
                             .c_str()));
    for (const bool survey : {true, false}) {
        const int expected = survey ? QvStatus::notSupported : QvStatus::ok;
        ASSERT_EQ(decoder.setParam("survey", survey ? 1 : 0), QvStatus::ok);
        ASSERT_EQ(decoder.open(), QvStatus::ok) << decoder.errorDesc();
        EXPECT_EQ(decoder.nrFrames(0), 200);
        EXPECT_EQ(decoder.seekToFrame(9, 0), expected);
        EXPECT_EQ(decoder.readFrame(0), expected);
        EXPECT_EQ(decoder.seekToSample(9, 0), expected);
        EXPECT_EQ(decoder.readSamples(64, 0), survey ? expected : 64);
    }
}

// Matroska has no table of its pictures: of one that is whole the header's word counts, with "about".
TEST_F(FilmsInTheTool, whoseHeaderStatesTheirLengthAreNotReadThroughToBeShown) {
    folder.write("texts.srt",
                 "1\n00:00:01,000 --> 00:00:02,000\nfirst\n\n2\n00:00:19,000 --> 00:00:20,000\nlast\n");
    const std::string file =
        film("long.mkv",
             {"-i", folder.file("texts.srt"), "-map", "0", "-map", "1", "-c:v", "mpeg4", "-c:a", "pcm_s16le",
              "-c:s", "srt"},
             "testsrc2=size=32x32:rate=200:duration=21[out0];sine=sample_rate=8000:duration=20[out1]");
    const std::string bytes = TempFolder::read(file);
    folder.write("cut.mkv", bytes.substr(0, bytes.size() * 95 / 100));
    const std::string duration = "\x44\x89\x88", tenSeconds = {'\x40', '\xC3', '\x88', 0, 0, 0, 0, 0};
    const std::size_t stated = bytes.find(duration);
    ASSERT_NE(stated, std::string::npos);
    folder.write("lying.mkv", std::string(bytes).replace(stated + duration.size(), 8, tenSeconds));
    const std::string late = TempFolder::read(film(
        "late.mkv", {"-vf", "setpts=PTS+10/TB", "-fps_mode", "passthrough", "-c:v", "mpeg4", "-g", "5"}));
    folder.write("latecut.mkv", late.substr(0, late.size() * 7 / 10));
    const struct {
        Words words;
        int status;
        std::vector<const char*> parts, others;
    } cases[] = {
        {{"long.mkv"}, 0, {"about 4200 frames", "about 160000 samples", "SubRip"}, {"subtitles"}},
        {{"long.mkv", "--exact"}, 0, {", 4200 frames", ", 160000 samples", "2 subtitles"}, {"about"}},
        {{"lying.mkv"}, 0, {", 4200 frames"}, {"about"}},
        {{"cut.mkv"}, 3, {"damaged", "of 4200 frames"}, {"about"}},
        {{"latecut.mkv"}, 3, {"damaged", "of 50 frames"}, {}},
    };
    for (const auto& c : cases) {
        Words words = {"info"};
        words.insert(words.end(), c.words.begin(), c.words.end());
        const Outcome shown = tarsel(words);
        EXPECT_EQ(shown.status, c.status) << shown.err;
        for (const char* part : c.parts) EXPECT_THAT(shown.out, HasSubstr(part));
        for (const char* other : c.others) EXPECT_THAT(shown.out, Not(HasSubstr(other)));
    }
    EXPECT_THAT(tarsel({"info", "--json", "long.mkv"}).out, HasSubstr("\"estimated\": true"));
}

TEST_F(FilmsInTheTool, areTurnedUprightUnlessTheyAreWantedAsCoded) {
    const std::string plain = film("plain.mov", {"-c:v", "mpeg4", "-aspect", "3:1"});
    turnedFilm(plain, {0, 1, -1, 0});
    const std::string upright = pictures(folder.file("turned.mov"), "yuv420p"),
                      coded = pictures(plain, "yuv420p");
    const std::size_t size = 96 * 64 * 3 / 2;
    const struct {
        Words words;
        std::string expected;
    } cases[] = {
        {{"turned.mov"}, upright},
        {{"turned.mov", "--no-rotate"}, coded},
        {{"--cut", "4f-9f", "--cut", "30f-32f", "turned.mov"},
         upright.substr(4 * size, 5 * size) + upright.substr(30 * size, 2 * size)},
    };
    for (const auto& c : cases) {
        Words words = {"transcode", "-y", "-o", "out.i420"};
        words.insert(words.end(), c.words.begin(), c.words.end());
        const Outcome made = tarsel(words);
        EXPECT_EQ(made.status, 0) << made.err;
        EXPECT_TRUE(TempFolder::read(folder.file("out.i420")) == c.expected) << c.words.back();
    }
    EXPECT_EQ(tarsel({"transcode", "turned.mov", "-o", "kept.i420", "--save-task", "kept.xml"}).status, 0);
    EXPECT_EQ(tarsel({"run", "-y", "kept.xml"}).status, 0);
    EXPECT_TRUE(TempFolder::read(folder.file("kept.i420")) == upright);
    EXPECT_THAT(tarsel({"info", "turned.mov"}).out,
                testing::AllOf(HasSubstr("96x64"), HasSubstr("turned by 90 degrees")));
    EXPECT_THAT(tarsel({"transcode", "--dry-run", "turned.mov", "-o", "plan.i420"}).out, HasSubstr("64x96"));
    for (const auto& [option, width] : {std::pair{"--progress=none", 64}, std::pair{"--no-rotate", 96}}) {
        EXPECT_EQ(tarsel({"frame", "turned.mov", option, "-y", "-o", "one.png"}).status, 0);
        EXPECT_EQ(static_cast<unsigned char>(TempFolder::read(folder.file("one.png"))[19]), width) << option;
    }
}

TEST_F(FilmsInTheTool, areUnknownWithoutThePlugIn) {
    film("film.mp4", {"-c:v", "mpeg4"});
    const Outcome o = tarsel({"--no-plugins", "info", "film.mp4"});
    EXPECT_EQ(o.status, 3);
    EXPECT_THAT(o.err, HasSubstr("mp4"));
    EXPECT_THAT(tarsel({"--no-plugins", "modules"}).out, Not(HasSubstr("Film reader")));
    EXPECT_THAT(tarsel({"modules"}).out, HasSubstr("Film reader"));
}

TEST_F(FilmsInTheTool, thatAreNoneAreRefusedInOneLine) {
    film("film.mp4", {"-c:v", "mpeg4"});
    const std::string bytes = TempFolder::read(folder.file("film.mp4"));
    folder.write("secret.txt", "what no film may name");
    const struct {
        const char* name;
        std::string bytes;
    } cases[] = {
        {"empty.mp4", ""},
        {"text.mkv", "This is a letter, and no film."},
        {"headless.mp4", bytes.substr(0, 200)},
        {"list.mp4", "#EXTM3U\n#EXT-X-TARGETDURATION:1\n#EXTINF:1,\nfilm.mp4\n#EXT-X-ENDLIST\n"},
        {"list.mkv", "ffconcat version 1.0\nfile film.mp4\n"},
    };
    for (const auto& c : cases) {
        folder.write(c.name, c.bytes);
        const Outcome o = tarsel({"transcode", c.name, "-o", "out.avi"});
        EXPECT_EQ(o.status, 3) << c.name << o.err;
        EXPECT_EQ(std::count(o.err.begin(), o.err.end(), '\n'), 1) << o.err;
        EXPECT_THAT(o.err, HasSubstr(c.name));
    }
    EXPECT_EQ(tarsel({"info", "missing.mp4"}).status, 3);
}

TEST_F(FilmsInTheTool, thatWereCutGiveWhatIsThere) {
    for (const char* ext : {"mp4", "mkv", "avi"}) {
        const std::string name = std::string("film.") + ext, cut = std::string("cut.") + ext;
        const std::string file = film(name, {"-c:v", "mpeg4", "-g", "12", "-movflags", "+faststart"},
                                      "testsrc2=size=96x64:rate=25:duration=8");
        const std::string bytes = TempFolder::read(file);
        folder.write(cut, bytes.substr(0, bytes.size() / 2));
        const Outcome refused = tarsel({"transcode", cut, "-y", "-o", "out.i420"});
        EXPECT_EQ(refused.status, 3) << cut << refused.err;
        EXPECT_THAT(refused.err, HasSubstr("of 200 frames"));
        const Outcome taken = tarsel({"transcode", "--accept-partial", cut, "-y", "-o", "out.i420"});
        EXPECT_EQ(taken.status, 0) << taken.err;
        // All but the last of them, of which a part may be there.
        const std::string made = TempFolder::read(folder.file("out.i420"));
        const std::size_t size = 96 * 64 * 3 / 2, whole = made.size() / size - 1;
        EXPECT_GT(whole, 50u) << cut;
        EXPECT_TRUE(made.substr(0, whole * size) == pictures(file, "yuv420p").substr(0, whole * size)) << cut;
    }
}

TEST_F(FilmsInTheTool, whoseHeadersStateMoreThanIsThereAreRefused) {
    const struct {
        const char* name;
        Words options;
    } cases[] = {
        {"cut.flac", {"-c:a", "flac"}},
        {"cut.aiff", {}},
        {"cut.au", {}},
        {"cut.caf", {"-c:a", "pcm_s16le"}},
        {"cut.w64", {"-c:a", "pcm_s16le"}},
        {"cut.mxf",
         {"-f", "lavfi", "-i", "testsrc2=size=96x64:duration=8", "-c:v", "mpeg2video", "-c:a", "pcm_s16le",
          "-ar", "48000"}},
        {"cut.mp4", {"-c:a", "aac", "-movflags", "+empty_moov", "-frag_duration", "500000"}},
    };
    for (const auto& c : cases) {
        const std::string bytes = TempFolder::read(film(c.name, c.options, "sine=duration=8"));
        EXPECT_EQ(tarsel({"transcode", c.name, "-y", "-o", "x.avi", "--muxer", "nullmux"}).status, 0)
            << c.name;
        folder.write(c.name, bytes.substr(0, bytes.size() / 20 * 11));
        EXPECT_EQ(tarsel({"transcode", c.name, "-y", "-o", "x.avi", "--muxer", "nullmux"}).status, 3)
            << c.name;
        const Outcome taken =
            tarsel({"transcode", "--accept-partial", c.name, "-y", "-o", "x.avi", "--muxer", "nullmux"});
        EXPECT_EQ(taken.status, 0) << c.name << taken.err;
    }
}

// 24 pictures are in each cluster, and two of them are lost; or those of the first, the head of which is
// damaged.
TEST_F(FilmsInTheTool, thatLackBytesInTheMiddleSayHowManyPictures) {
    const std::string whole =
        TempFolder::read(film("film.mkv", {"-c:v", "mpeg4", "-g", "12", "-cluster_time_limit", "960"},
                              "testsrc2=size=96x64:rate=25:duration=8"));
    const std::string head = "\x1F\x43\xB6\x75";
    const std::size_t first = whole.find(head, whole.find(head) + 1);
    const std::size_t second = whole.find(head, whole.find(head, first + 4) + 4);
    ASSERT_LT(second, whole.size());
    std::string zeros = whole;
    zeros.replace(first, second - first, second - first, '\0');
    for (const std::string& bytes : {whole.substr(0, first) + whole.substr(second), zeros}) {
        folder.write("film.mkv", bytes);
        const Outcome refused = tarsel({"transcode", "film.mkv", "-y", "-o", "x.avi", "--muxer", "nullmux"});
        EXPECT_EQ(refused.status, 3) << refused.err;
        EXPECT_THAT(refused.err, HasSubstr("24 of its pictures are missing"));
        const Outcome taken = tarsel({"transcode", "film.mkv", "--accept-partial", "-y", "-o", "x.i420"});
        EXPECT_EQ(taken.status, 0) << taken.err;
        EXPECT_EQ(std::filesystem::file_size(folder.path() / "x.i420"), 200u * 96 * 64 * 3 / 2)
            << "the picture before the hole stays";
        EXPECT_THAT(tarsel({"info", "film.mkv"}).out, HasSubstr("25 fps, progressive, 200 frames"));
    }
    folder.write("film.mkv", whole);
    EXPECT_EQ(tarsel({"transcode", "film.mkv", "-y", "-o", "x.avi", "--muxer", "nullmux"}).status, 0);
}

TEST_F(FilmsInTheTool, whosePicturesAreDamagedSayHowMany) {
    std::string bytes = TempFolder::read(film("film.avi", {"-c:v", "mjpeg"}));
    for (std::size_t at = bytes.size() / 2; at < bytes.size() / 2 + 1500; ++at) bytes[at] = 0;
    folder.write("film.avi", bytes);
    const auto line = [this](const Words& words) {
        const Outcome o = tarsel(words);
        EXPECT_EQ(o.status, 0) << o.err;
        const std::size_t at = o.err.find("'film.avi' is damaged in places: ");
        return at == std::string::npos ? o.err : o.err.substr(at, o.err.find('\n', at) - at);
    };
    const std::string said = line({"transcode", "film.avi", "-o", "x.avi", "--muxer", "nullmux"});
    EXPECT_THAT(said, HasSubstr("could not be decoded"));
    EXPECT_EQ(line({"scope", "film.avi"}), said);
    EXPECT_EQ(line({"compare", "film.avi", "film.avi"}), said);
    EXPECT_EQ(line({"frame", "film.avi", "--sheet", "10x5", "-o", "x.png"}), said);
    EXPECT_EQ(tarsel({"frame", "film.avi", "--sheet", "10x5", "--strict", "-y", "-o", "x.png"}).status, 1);
    EXPECT_EQ(tarsel({"frame", "film.avi", "--strict", "-o", "first.png"}).status, 0);
}

TEST_F(FilmsInTheTool, whosePicturesAreDamagedSayTheSameWithAnyThreads) {
    std::string bytes =
        TempFolder::read(film("film.mp4", {"-c:v", "libx264", "-bf", "2", "-movflags", "+faststart"},
                              "testsrc2=size=320x240:rate=25:duration=4"));
    for (std::size_t at = bytes.size() / 4; at < bytes.size(); at += bytes.size() / 20) bytes[at] ^= 0x55;
    folder.write("film.mp4", bytes);
    std::string said;
    for (const char* threads : {"1", "2", "3", "8", "8", "8"}) {
        const Outcome o = tarsel(
            {"transcode", "film.mp4", "--threads", threads, "-y", "-o", "x.avi", "--muxer", "nullmux"});
        EXPECT_THAT(o.err, HasSubstr("could not be decoded"));
        if (said.empty()) said = o.err;
        EXPECT_EQ(o.err, said) << threads;
    }
}

TEST_F(FilmsInTheTool, bringTheirSound) {
    const std::string file = folder.file("film.mkv");
    ASSERT_EQ(ffmpeg({"-f", "lavfi", "-i", kMoving, "-f", "lavfi", "-i", "sine=frequency=440:duration=2",
                      "-c:v", "mpeg4", "-c:a", "flac", file})
                  .status,
              0);
    const Outcome o = tarsel({"transcode", "film.mkv", "-o", "film.wav"});
    EXPECT_EQ(o.status, 0) << o.err;
    const auto samples = [&](const std::string& name) {
        const std::string raw = folder.file("samples.raw");
        EXPECT_EQ(ffmpeg({"-i", name, "-f", "s16le", raw}).status, 0);
        return TempFolder::read(raw);
    };
    EXPECT_EQ(samples(file).size(), 2u * 88200);
    EXPECT_TRUE(samples(folder.file("film.wav")) == samples(file));
    const Outcome part = tarsel({"transcode", "film.mkv", "--from", "20f", "--to", "30f", "-o", "part.wav"});
    EXPECT_EQ(part.status, 0) << part.err;
    EXPECT_TRUE(samples(folder.file("part.wav")) == samples(file).substr(2 * 20 * 1764, 2 * 10 * 1764));
}

TEST_F(FilmsInTheTool, sayOfThemselvesWhatTheyCarry) {
    folder.write(
        "facts.txt",
        ";FFMETADATA1\ntitle=A day at sea\nartist=Jules\n[CHAPTER]\nTIMEBASE=1/1000\nSTART=0\nEND=800\n"
        "title=Out\n[CHAPTER]\nTIMEBASE=1/1000\nSTART=800\nEND=2000\ntitle=Home\n");
    // In Matroska the sound's priming delays the first picture, where the film begins.
    const struct {
        const char* name;
        const char* second;
    } cases[] = {{"film.mov", "0:00:00.800, Home"}, {"film.mkv", "0:00:00.794, Home"}};
    for (const auto& [name, second] : cases) {
        SCOPED_TRACE(name);
        ASSERT_EQ(ffmpeg({"-f",
                          "lavfi",
                          "-i",
                          kMoving,
                          "-f",
                          "lavfi",
                          "-i",
                          "aevalsrc=0|0|0|0|0|0:c=5.1:d=2",
                          "-i",
                          folder.file("facts.txt"),
                          "-map_metadata",
                          "2",
                          "-c:v",
                          "mpeg2video",
                          "-c:a",
                          "ac3",
                          "-b:a",
                          "448k",
                          "-timecode",
                          "10:20:30:05",
                          "-metadata:s:a",
                          "language=eng",
                          folder.file(name)})
                      .status,
                  0);
        const Outcome shown = tarsel({"info", name});
        EXPECT_EQ(shown.status, 0) << shown.err;
        for (const char* part :
             {"MPEG-2 Main", "Dolby AC-3", "448 kbit/s, eng", "10:20:30:05", "A day at sea", "Jules", second})
            EXPECT_THAT(shown.out, HasSubstr(part));
        const Outcome json = tarsel({"info", "--json", name});
        for (const char* part : {R"("timecode": "10:20:30:05")", R"("time_s": 0.)", R"("title": "Home")",
                                 R"("language": "eng")", R"("profile": "AC-3")", R"("bit_rate": 448000)"})
            EXPECT_THAT(json.out, HasSubstr(part));
    }
}

TEST_F(FilmsInTheTool, areMadeOfNumberedPictures) {
    const std::string plain =
        film("plain.mkv", {"-c:v", "ffv1", "-pix_fmt", "bgra"}, "testsrc2=size=96x64:rate=25:duration=0.4");
    const std::string expected = pictures(plain, "bgra");
    const std::size_t size = 96 * 64 * 4;
    ASSERT_EQ(ffmpeg({"-i", plain, "-start_number", "8", folder.file("a%03d.png")}).status, 0);
    ASSERT_EQ(ffmpeg({"-i", plain, folder.file("b%d.jpg")}).status, 0);
    ASSERT_EQ(ffmpeg({"-i", plain, folder.file("c%02d.dpx")}).status, 0);
    const struct {
        Words words;
        std::string expected;
    } cases[] = {
        {{"a%03d.png"}, expected},
        {{"a[009-011].png"}, expected.substr(size, 3 * size)},
        {{"a%03d.png", "--from", "4f", "--to", "7f"}, expected.substr(4 * size, 3 * size)},
        {{"a%03d.png", "--cut", "7f-8f", "--cut", "1f-2f"},
         expected.substr(7 * size, size) + expected.substr(size, size)},
        {{"c%02d.dpx"}, expected},
    };
    for (const auto& c : cases) {
        Words words = {"transcode", "-y", "-o", "out.bgr4", "--pixel", "BGR4"};
        words.insert(words.end(), c.words.begin(), c.words.end());
        const Outcome made = tarsel(words);
        EXPECT_EQ(made.status, 0) << made.err;
        EXPECT_TRUE(TempFolder::read(folder.file("out.bgr4")) == c.expected) << c.words.back();
    }
    EXPECT_THAT(tarsel({"info", "--raw", "rate=24", "b%d.jpg"}).out,
                testing::AllOf(HasSubstr("24 fps"), HasSubstr("10 frames")));
    EXPECT_EQ(tarsel({"transcode", "a%03d.png", "-y", "-o", "k.bgr4", "--save-task", "k.xml"}).status, 0);
    EXPECT_EQ(tarsel({"run", "-y", "k.xml"}).status, 0);
    std::filesystem::remove(folder.file("a012.png"));
    const Outcome missing = tarsel({"transcode", "a%03d.png", "-y", "-o", "out.bgr4"});
    EXPECT_EQ(missing.status, 3);
    EXPECT_THAT(missing.err, HasSubstr("a012.png"));
}

TEST_F(FilmsInTheTool, keepTheirFieldsAndAspect) {
    film("fields.mpg",
         {"-c:v", "mpeg2video", "-flags", "+ildct+ilme", "-top", "1", "-vf", "setfield=tff,setdar=4/3"});
    const Outcome o = tarsel({"info", "--json", "fields.mpg"});
    EXPECT_EQ(o.status, 0) << o.err;
    EXPECT_THAT(o.out, HasSubstr("\"scan\": \"top first\""));
    EXPECT_THAT(o.out, HasSubstr("\"frame_aspect\": 1.333"));
}

// The numbers of the pictures stay, so what they stand for has to stay with them.
TEST_F(FilmsInTheTool, keepTheirColours) {
    const std::string large = "testsrc2=size=1280x720:rate=25:duration=0.2", small = kMoving;
    const Words pq{"-c:v",   "libx264",    "-pix_fmt",  "yuv420p10le", "-color_primaries",
                   "bt2020", "-color_trc", "smpte2084", "-colorspace", "bt2020nc"};
    const Words hd{"-c:v",  "libx264",    "-pix_fmt", "yuv420p",     "-color_primaries",
                   "bt709", "-color_trc", "bt709",    "-colorspace", "bt709"};
    const struct {
        const Words& made;
        const std::string& source;
        Words options;
        const char* colours;
        bool warns;
    } rows[] = {
        {pq, large, {"-o", "o.mp4"}, "bt2020nc,smpte2084,bt2020", false},
        {pq, large, {"-o", "o.mkv", "--vcodec", "prores"}, "bt2020nc,smpte2084,bt2020", false},
        {pq, large, {"-o", "o.mp4", "--size", "1920x1080"}, "bt2020nc,smpte2084,bt2020", false},
        {pq, large, {"-o", "o.mp4", "--size", "640x360"}, "bt470bg,smpte170m,bt470bg", true},
        {pq, large, {"-o", "o.mp4", "--matrix", "709"}, "bt709,bt709,bt709", true},
        {hd, small, {"-o", "o.mp4"}, "bt709,bt709,bt709", false},
        {hd, small, {"-o", "o.mp4", "--size", "64x48"}, "bt470bg,smpte170m,bt470bg", false},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(testing::PrintToString(row.options));
        film("film.mkv", row.made, row.source);
        Words job{"transcode", "film.mkv", "-y"};
        job.insert(job.end(), row.options.begin(), row.options.end());
        const Outcome o = tarsel(job);
        EXPECT_EQ(o.status, 0) << o.err;
        EXPECT_EQ(o.err.find("the colours of 'film.mkv' are lost") != std::string::npos, row.warns) << o.err;
        const Outcome probed =
            runProgram({"/usr/bin/env", "ffprobe", "-v", "error", "-select_streams", "v", "-show_entries",
                        "stream=color_space,color_transfer,color_primaries", "-of", "csv=p=0",
                        folder.file(row.options.at(1))});
        EXPECT_THAT(probed.out, HasSubstr(row.colours));
    }
}

TEST_F(FilmsInTheTool, thatArriveAreMadeIntoOthers) {
    std::filesystem::create_directory(folder.path() / "in");
    film("in/one.mkv", {"-c:v", "mpeg4"});
    film("in/two.ts", {"-c:v", "mpeg2video"});
    const Outcome o =
        tarsel({"watch", "in", "--once", "--settle", "0.2", "--preset", "H.264 for the web:out"});
    EXPECT_EQ(o.status, 0) << o.err;
    for (const char* made : {"out/one.mp4", "out/two.mp4"})
        EXPECT_EQ(pictures(folder.file(made), "yuv420p").size(), 50u * 96 * 64 * 3 / 2) << made;
}

}  // namespace
