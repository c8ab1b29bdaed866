// What a transcode will do, planned from descriptions of inputs: no file is read.
#include "tarsel/job/plan/jobplan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>

#include "tarsel/words/timespec.h"
#include "tests/tarsel/refusal.h"

namespace {

using testing::HasSubstr;

// The filters that a plan needs come from the engine's modules.
class Plan : public testing::Test {
  protected:
    static void SetUpTestSuite() { init_wrapper(nullptr); }
    static void TearDownTestSuite() { cleanup_wrapper(); }
};

InputStream video(const char* rate, long long frames, int width = 64, int height = 48) {
    InputStream stream;
    stream.units = frames;
    stream.picture = {width, height, QvFourcc::I420, parseRate(rate, ""), 1.0 * width / height};
    return stream;
}

InputStream sound(int samplerate, long long samples) {
    InputStream stream;
    stream.type = qvAudioStream;
    stream.units = samples;
    stream.sound = {samplerate, 2, 16};
    return stream;
}

JobInput input(const char* name, std::vector<InputStream> pictures, std::vector<InputStream> sounds = {}) {
    JobInput all;
    all.name = name;
    all.video = std::move(pictures);
    all.audio = std::move(sounds);
    return all;
}

PlanOptions to(const char* output) {
    PlanOptions options;
    options.inputs = {"in"};
    options.output = output;
    return options;
}

JobPlan planned(const PlanOptions& options, std::vector<JobInput> inputs) {
    return planJob(options, outputForm(options, OutputPlace::files), std::move(inputs));
}

TEST_F(Plan, PointsAndLengthsOfOneStream) {
    const struct {
        InputStream stream;
        const char *from, *to, *duration, *rate;
        int samplerate;
        double in, out;  // seconds
        long long expected;
    } rows[] = {
        {video("25", 100), "", "", "", "", 0, 0, 4, 100},
        {video("25", 100), "1", "3", "", "", 0, 1, 3, 50},
        {video("25", 100), "-10f", "-5f", "", "", 0, 3.6, 3.8, 5},
        {video("25", 100), "00:00:01:05", "", "7f", "", 0, 1.2, 1.48, 7},
        {video("25", 100), "", "9", "", "", 0, 0, 4, 100},
        {video("25", 100), "", "", "", "50", 0, 0, 4, 200},
        {video("25", 100), "", "", "", "29.97", 0, 0, 4, 119},
        {video("50", 99), "", "", "", "25", 0, 0, 1.98, 50},
        {video("60000/1001", 99), "", "", "", "2997/100", 0, 0, 1.65165, 49},
        // Frames that begin between two ticks.
        {video("7.55", 20), "", "", "", "", 0, 0, 2.649007, 20},
        {video("7.55", 20), "10f", "", "5f", "", 0, 1.324503, 1.986755, 5},
        {sound(44100, 88200), "", "", "", "", 0, 0, 2, 88200},
        {sound(44100, 88200), "0.5", "", "1", "", 48000, 0.5, 1.5, 48000},
        {sound(44100, 88200), "", "0.500015", "", "", 96000, 0, 0.500015, 48000},  // 22050 whole samples
    };
    for (const auto& row : rows) {
        const bool isVideo = row.stream.type == qvVideoStream;
        PlanOptions options = to(isVideo ? "out.raw" : "out.wav");
        options.from = row.from;
        options.to = row.to;
        options.duration = row.duration;
        options.effects.rate = row.rate;
        if (row.samplerate) options.samplerate = row.samplerate;
        const JobPlan plan =
            planned(options, {isVideo ? input("in", {row.stream}) : input("in", {}, {row.stream})});
        const std::string what = std::string(row.from) + " " + row.to + " " + row.duration + " " + row.rate;
        ASSERT_EQ(plan.streams.size(), 1u);
        EXPECT_NEAR(plan.streams[0].part.in.seconds(), row.in, 1e-6) << what;
        EXPECT_NEAR(plan.streams[0].part.out.seconds(), row.out, 1e-6) << what;
        EXPECT_EQ(plan.streams[0].expected, row.expected) << what;
        EXPECT_EQ(plan.warnings.size(), options.to == "9" ? 1u : 0u) << what;
    }
}

// Sound has the samples of the picture's frames, and times from the end are the picture's.
TEST_F(Plan, SoundKeepsToThePicture) {
    PlanOptions options = to("out.avi");
    options.from = "-1";
    const JobPlan plan =
        planned(options, {input("clip", {video("25", 100)}), input("long", {}, {sound(44100, 198450)})});
    ASSERT_EQ(plan.streams.size(), 2u);
    EXPECT_EQ(plan.streams[1].part.input, 1);
    EXPECT_DOUBLE_EQ(plan.streams[1].part.in.seconds(), 3);
    EXPECT_EQ(plan.streams[0].expected, 25);
    EXPECT_EQ(plan.streams[1].expected, 44100);
    EXPECT_EQ(plan.streams[1].own, 66150);
    options.from.clear();
    options.effects.rate = "30000/1001";
    const JobPlan ntsc = planned(options, {input("clip", {video("25", 100)}, {sound(48000, 192000)})});
    EXPECT_EQ(ntsc.streams[1].expected, 119 * 1001 * 48000LL / 30000);
}

// The delay skips the input's beginning, and nothing comes in its place.
TEST_F(Plan, SoundThatComesEarlierIsShorter) {
    const struct {
        const char *to, *filter;
        long long expected;
    } rows[] = {
        {"", "adelay:delay=-500", 66150}, {"1", "adelay:delay=-500", 44100}, {"", "adelay:delay=500", 88200}};
    for (const auto& row : rows) {
        PlanOptions options = to("out.wav");
        options.to = row.to;
        options.effects.filters = {row.filter};
        const JobPlan plan = planned(options, {input("in", {}, {sound(44100, 88200)})});
        EXPECT_EQ(plan.streams.at(0).expected, row.expected) << row.to << row.filter;
    }
}

// With the sound of a take, and what is said of the lengths.
TEST_F(Plan, SoundAndPictureEndTogether) {
    const struct {
        const char *rate, *delay, *from;
        long long frames, samples;  // of the inputs, at 48000 Hz
        int end;                    // -1: --shortest, 1: --longest
        long long expected;         // frames
        const char* note;           // a part of it
    } rows[] = {
        {"25", "", "", 50, 96000, 0, 50, ""},
        {"25", "", "", 50, 96047, 0, 50, ""},
        {"25", "", "", 50, 96048, 0, 50, "is cut: it lasts 0:00:02.001, and the picture 0:00:02.000"},
        {"25", "", "", 50, 48000, 0, 50, "followed by silence: it lasts 0:00:01.000"},
        {"25", "", "", 50, 0, 0, 50, "followed by silence: it lasts 0:00:00.000"},
        {"25", "", "1", 50, 96960, 0, 25, ""},
        {"25", "", "1", 50, 97920, 0, 25, "is cut: it lasts 0:00:01.040"},
        {"25", "", "1", 50, 24000, 0, 25, "followed by silence: it lasts 0:00:00.000"},
        {"25", "", "", 50, 49000, -1, 25, "is cut: it lasts 0:00:01.021"},
        {"25", "", "", 50, 960000, -1, 50, "is cut"},
        {"25", "", "1", 50, 72000, -1, 12, ""},
        {"30000/1001", "", "", 50, 48048, -1, 30, ""},
        {"25", "", "", 50, 144000, 1, 75, ""},
        {"25", "", "", 50, 144001, 1, 76, "followed by silence"},
        {"25", "", "", 50, 1000, 1, 50, "followed by silence"},
        {"30000/1001", "", "", 50, 96096, 1, 60, ""},
        {"25", "0.5", "", 50, 96000, 1, 63, "followed by silence: it lasts 0:00:02.500"},
        {"25", "-0.5", "", 50, 96000, -1, 37, "is cut: it lasts 0:00:01.500"},
        {"25", "0.5", "", 50, 96000, 0, 50, "is cut: it lasts 0:00:02.500"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(testing::Message() << row.frames << " " << row.samples << " " << row.end);
        PlanOptions options = to("out.avi");
        options.sound.delay = row.delay;
        options.from = row.from;
        options.shortest = row.end < 0;
        options.longest = row.end > 0;
        const JobPlan plan = planned(options, {input("clip", {video(row.rate, row.frames)}),
                                               input("take", {}, {sound(48000, row.samples)})});
        EXPECT_EQ(plan.streams.at(0).expected, row.expected);
        EXPECT_EQ(plan.streams.at(0).hold, row.expected > row.frames);
        EXPECT_EQ(plan.streams.at(1).expected,
                  QvUtil::samplesForFrames(static_cast<int>(row.expected), parseRate(row.rate, ""), 48000));
        EXPECT_EQ(plan.notes.empty(), *row.note == 0) << testing::PrintToString(plan.notes);
        EXPECT_THAT(testing::PrintToString(plan.notes), HasSubstr(row.note));
    }
}

// What rounds is dithered, what copies is not.
TEST_F(Plan, SoundIsConvertedAsItNeeds) {
    const struct {
        std::function<void(PlanOptions&)> set;
        int bits;  // of the input
        const char *dither, *quality;
        std::vector<std::string> chain;
    } rows[] = {
        {[](auto&) {}, 16, "none", "standard", {}},
        {[](auto& o) { o.bits = 16; }, 24, "triangular", "standard", {"aquant dither=triangular"}},
        {[](auto& o) { o.bits = 24; }, 16, "none", "standard", {}},
        {[](auto& o) { o.bits = 8, o.sound.dither = "none"; }, 16, "none", "standard", {}},
        {[](auto& o) { o.channels = 1; }, 8, "triangular", "standard", {"aquant dither=triangular"}},
        {[](auto& o) { o.channels = 3; }, 16, "none", "standard", {}},
        {[](auto& o) { o.sound.map = "1,0,-"; }, 16, "none", "standard", {}},
        {[](auto& o) { o.sound.map = "1,0+1"; }, 16, "triangular", "standard", {"aquant dither=triangular"}},
        {[](auto& o) { o.samplerate = 48000; }, 24, "none", "high", {"srconvert quality=high"}},
        {[](auto& o) {
             o.sound.volumes = {"-6", "a:0=+2.5"};
         },
         24,
         "none",
         "standard",
         {"avol volume=2.5"}},
        {[](auto& o) { o.sound.delay = "0.25"; }, 16, "none", "standard", {"adelay delay=250"}},
        {[](auto& o) { o.sound.normalize = "peak", o.effects.fade = "0.5,1"; },
         24,
         "none",
         "standard",
         {"audiolevel in=0.5 out=1", "normalizer mode=peak target=-1"}},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        PlanOptions options = to("out.wav");
        row.set(options);
        InputStream take = sound(44100, 88200);
        take.sound.bits = row.bits;
        const JobPlan plan = planned(options, {input("in", {}, {take})});
        const PlannedStream& stream = plan.streams.at(0);
        EXPECT_EQ(stream.conversion.dither, row.dither);
        EXPECT_EQ(stream.conversion.rateQuality, row.quality);
        EXPECT_EQ(stream.chain, row.chain);
    }
}

TEST_F(Plan, SoundsThatCanNotBeMadeAreRefused) {
    const struct {
        std::function<void(PlanOptions&)> set;
        int channels;  // of the first sound; the second has two
        const char* part;
    } rows[] = {
        {[](auto& o) { o.sound.map = "0,2"; }, 2,
         "--map: it takes channel 2, and the last one of 'one' is 1"},
        {[](auto& o) { o.sound.map = "a:2.0"; }, 2, "--map: it takes sound 2, and the last one is 1"},
        {[](auto& o) { o.sound.map = "a:1.0,5"; }, 2,
         "--map: it takes channel 5, and the last one of 'one' is 1"},
        {[](auto& o) { o.sound.map = "0", o.channels = 1; }, 2, "--channels contradicts it"},
        {[](auto& o) { o.sound.volumes = {"a:2=3"}; }, 2, "--volume a:2: the last sound of the output is 1"},
        {[](auto& o) { o.sound.volumes = {"3"}; }, 10, "--volume: the sound of 'one' has 10 channels"},
        {[](auto& o) { o.effects.fade = "1"; }, 9, "--fade: the sound of 'one' has 9 channels"},
        {[](auto& o) { o.channels = 2; }, 40, "--channels: 40 channels to 2 would mix more than 16"},
        {[](auto& o) { o.sound.delay = "-4"; }, 2, "--delay: nothing of the sound of 'one' is left"},
        {[](auto& o) { o.sound.delay = "3601"; }, 2, "more than an hour"},
        {[](auto& o) { o.sound.delay = "1", o.effects.filters = {"adelay:delay=3"}; }, 2, "--filter adelay"},
        {[](auto& o) { o.shortest = true; }, 2, "--shortest: this job has not both"},
        {[](auto& o) { o.noAudio = true, o.sound.dither = "none"; }, 2, "no"},
    };
    for (const auto& row : rows) {
        PlanOptions options = to("out_%d.wav");
        row.set(options);
        InputStream first = sound(48000, 96000);
        first.sound.channels = row.channels;
        EXPECT_THAT(
            refusal([&] {
                planned(options, {input("one", {}, {first}), input("two", {}, {sound(48000, 96000)})});
            }),
            HasSubstr(row.part));
    }
}

TEST_F(Plan, PointsThatLeaveNothingAreRefused) {
    const struct {
        const char *from, *to, *duration, *part;
    } rows[] = {
        {"-5", "", "", "--from: '-5' is before the start"},
        {"--1", "", "", "not a time"},
        {"-1", "3", "", "--to 3: it is not after --from -1"},
        {"", "", "0", "--duration: '0' is no length"},
        {"", "", "-1", "not a time"},
        {"4", "", "", "--from 4"},
        {"0.01", "0.02", "", "no frame"},
        {"", "0:99", "", "'0:99'"},
        {"nan", "", "", "'nan'"},
        {"99999999999999999999", "", "", "not a time"},
    };
    for (const auto& row : rows) {
        PlanOptions options = to("out.raw");
        options.from = row.from;
        options.to = row.to;
        options.duration = row.duration;
        EXPECT_THAT(refusal([&] { planned(options, {input("in", {video("25", 100)})}); }),
                    HasSubstr(row.part))
            << row.from << " " << row.to << " " << row.duration;
    }
}

TEST_F(Plan, SizesThatKeepTheShape) {
    const struct {
        int width, height;
        const char *size, *fit, *crop, *pixel;
        double aspect;  // of the input; 0 for that of its frame
        Size expected;
    } rows[] = {
        {640, 360, "1280x-1", "", "", "", 0, {1280, 720}},
        {640, 360, "-1x90", "", "", "", 0, {160, 90}},
        {720, 576, "-1x576", "", "", "", 16 / 9.0, {1024, 576}},
        {100, 74, "75x-1", "", "", "BGR4", 0, {75, 56}},
        {100, 74, "70x-1", "", "", "I420", 0, {70, 52}},
        {640, 360, "100x-1", "", "4:3", "BGR4", 0, {100, 75}},
        {640, 360, "", "100x100", "", "BGR4", 0, {100, 56}},
        {640, 360, "", "1000x72", "", "", 0, {128, 72}},
        {640, 360, "", "33x33", "", "", 0, {32, 18}},
        {720, 576, "", "1920x1080", "", "", 4 / 3.0, {1440, 1080}},
        {640, 360, "", "100x100,bars", "", "", 0, {100, 100}},
        {640, 360, "", "101x99,crop", "", "BGR4", 0, {101, 99}},
    };
    for (const auto& row : rows) {
        PlanOptions options = to("out.raw");
        options.effects.size = row.size;
        options.effects.fit = row.fit;
        options.effects.crop = row.crop;
        options.effects.pixel = row.pixel;
        InputStream stream = video("25", 2, row.width, row.height);
        if (row.aspect > 0) stream.picture.aspect = row.aspect;
        const PlannedStream out = planned(options, {input("in", {stream})}).streams.at(0);
        EXPECT_EQ(out.picture.width, row.expected.width) << row.size << row.fit;
        EXPECT_EQ(out.picture.height, row.expected.height) << row.size << row.fit;
    }
}

// Which streams of two films and a caption file are written, as "v0.1": video stream 1 of input 0.
TEST_F(Plan, WhichStreamsAreTaken) {
    const struct {
        const char* output;
        OutputPlace place;
        bool noVideo, noAudio;
        const char* taken;    // or a part of the refusal
        const char* muxer;    // null for a refusal
        const char* warning;  // a part of it
    } rows[] = {
        {"o.avi", OutputPlace::files, false, false, "v0.0 a0.0 v1.0 a1.0 a1.1", "rawavimux", "'captions'"},
        {"o.avi", OutputPlace::files, false, true, "v0.0 v1.0", "rawavimux", "'captions'"},
        {"o_%d.wav", OutputPlace::files, false, false, "a0.0 a1.0 a1.1", "rawmux", "'captions'"},
        {"o_%d.raw", OutputPlace::files, false, false, "v0.0 a0.0 v1.0 a1.0 a1.1", "rawmux", "'captions'"},
        {"pipe.wav", OutputPlace::stream, false, false, "a0.0", "rawmux", "'two'"},
        {"pipe", OutputPlace::stream, true, false, "a0.0", "rawmux", "'captions'"},
        {"pipe", OutputPlace::stream, false, false, "v0.0", "rawmux", "'two'"},
        {"null", OutputPlace::nullDevice, false, false, "v0.0 a0.0 v1.0 a1.0 a1.1", "nullmux", "'captions'"},
        {"", OutputPlace::nowhere, false, true, "v0.0 v1.0", "nullmux", "'captions'"},
        {"o.raw", OutputPlace::files, false, false, "o_%d.raw", nullptr, nullptr},
        {"o.png", OutputPlace::files, false, false, "picture", nullptr, nullptr},
        {"o.avi", OutputPlace::files, true, true, "--no-audio", nullptr, nullptr},
        {"o.raw", OutputPlace::files, true, false, "--no-video", nullptr, nullptr},
    };
    const std::vector<JobInput> inputs = {
        input("one", {video("25", 4)}, {sound(44100, 7056)}),
        input("two", {video("25", 4)}, {sound(44100, 7056), sound(48000, 7680)}), input("captions", {})};
    for (const auto& row : rows) {
        PlanOptions options = to(row.output);
        options.noVideo = row.noVideo;
        options.noAudio = row.noAudio;
        JobPlan plan;
        const std::string line =
            refusal([&] { plan = planJob(options, outputForm(options, row.place), inputs); });
        if (!row.muxer) {
            EXPECT_THAT(line, HasSubstr(row.taken)) << row.output;
            continue;
        }
        EXPECT_EQ(line, "");
        std::string taken;
        for (const PlannedStream& s : plan.streams)
            taken += (taken.empty() ? "" : " ") + std::string(s.isVideo() ? "v" : "a") +
                     std::to_string(s.part.input) + "." + std::to_string(s.part.stream);
        EXPECT_EQ(taken, row.taken) << row.output;
        EXPECT_STREQ(plan.output.muxer(), row.muxer) << row.output;
        EXPECT_THAT(testing::PrintToString(plan.warnings), HasSubstr(row.warning)) << row.output;
    }
}

TEST_F(Plan, TextShowsWhatIsReadDoneAndWritten) {
    PlanOptions options = to("x.uyvy");
    options.from = "1";
    options.to = "3";
    options.bits = 24;
    options.effects.filters = {"brightness:brightness=0.5", "avol"};
    JobInput clip = input("clip", {video("25", 100)}, {sound(44100, 176400)});
    clip.duration = 4;
    EXPECT_EQ(planText(planned(options, {clip})),
              "input   'clip'  0:00:04.000\n"
              "stream  video 0 of 'clip', 0:00:01.000 to 0:00:03.000\n"
              "filter  scaler FOURCC='UYVY' outHeight=48 outWidth=64\n"
              "filter  brightness brightness=0.5\n"
              "encoder rawvenc: 64x48 UYVY 25\n"
              "expect  50 frames, 307200 bytes\n"
              "stream  audio 0 of 'clip', 0:00:01.000 to 0:00:03.000\n"
              "filter  avol\n"
              "encoder rawaenc: 44100 Hz, 2 ch, 24 bit\n"
              "expect  88200 samples, 529200 bytes\n"
              "output  'x.uyvy' by rawmux, 816.8 KiB\n");
}

}  // namespace
