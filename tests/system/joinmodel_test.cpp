// Random joins next to a model of them that is written here: which frames and samples come out, by the job,
// by its task file, and by a run after one that was killed. The inputs are the engine's own forms, or
// lossless films of the same pictures and sound. QV_JOINS and QV_SEED choose how many and which.
#include <cstdlib>
#include <map>
#include <random>

#include "tests/system/tool.h"

namespace {

using Number = long long;

struct Fraction {
    Number num = 0, den = 1;
};

Number floorOf(Number value, const Fraction& by) { return value * by.num / by.den; }
Number ceilingOf(Number value, const Fraction& by) { return (value * by.num + by.den - 1) / by.den; }
Fraction over(const Fraction& a, const Fraction& b) { return {a.num * b.den, a.den * b.num}; }

struct Input {
    const char* name;
    const char* film;  // of the same content
    int side;          // of the picture, which is a square; 0 without one
    Fraction rate;     // frames a second
    Number frames;
    int samplerate;  // 0 without sound
    int channels;
    Number samples;
};
constexpr Input kInputs[] = {
    {"p.yuv", "p.mp4", 32, {30000, 1001}, 120, 0, 0, 0},
    {"testgen:size=64x64,rate=25,duration=4", "t.mov", 64, {25, 1}, 100, 44100, 2, 176400},
    {"testgen:size=48x48,rate=24,duration=4,audio=0", "u.mkv", 48, {24, 1}, 96, 0, 0, 0},
    {"s44.wav", "s44.flac", 0, {}, 0, 44100, 2, 220500},
    {"s48.wav", "s48.m4a", 0, {}, 0, 48000, 1, 240000},
};
constexpr const char* kRaw[] = {"p.yuv", "t.yuv", "u.yuv"};  // the pictures that films are made of
constexpr int kNothing = -1;                                 // the place of what a segment lacks

// What is read side by side: two inputs at most, and captions, which nothing is made of.
struct Kind {
    int picture, sound;
    const char* extra;
};
constexpr Kind kKinds[] = {{0, kNothing, ""}, {0, 3, ""},        {1, 1, ""},        {2, kNothing, ""},
                           {2, 4, ""},        {kNothing, 3, ""}, {kNothing, 4, ""}, {0, 3, "+c.scc"}};

struct Segment {
    Kind kind{kNothing, kNothing, ""};
    Number from = 0, to = 0;  // frames, or hundredths of a second where there is no picture
    std::string word(bool films) const;
};

std::string Segment::word(bool films) const {
    const std::string range = "@" + std::to_string(from / 100) + "." +
                              std::to_string(from % 100 + 100).substr(1) + "-" + std::to_string(to / 100) +
                              "." + std::to_string(to % 100 + 100).substr(1);
    const auto name = [films](int input) {
        return std::string(films ? kInputs[input].film : kInputs[input].name);
    };
    if (kind.picture == kNothing) return name(kind.sound) + range;
    const bool other = kind.sound != kNothing && kind.sound != kind.picture;
    return name(kind.picture) + (other ? "+" + name(kind.sound) : "") + kind.extra + "@" +
           std::to_string(from) + "f-" + std::to_string(to) + "f";
}

// A frame or a sample of an input; silence or black without one; a number below 0 is any that is converted.
struct Unit {
    int input = kNothing;
    Number number = 0;
    bool operator==(const Unit&) const = default;
};
constexpr Number kAny = -1;

// For messages of the tests.
void PrintTo(const Unit& unit, std::ostream* out) { *out << unit.input << ":" << unit.number; }

struct Model {
    // The format of the output, by the first that has one, or as asked for.
    int side = 0, samplerate = 0, channels = 0;
    Fraction rate;
    std::vector<Unit> frames, samples;

    void add(const Segment& segment);

  private:
    void addPicture(const Segment& segment);
    void addSoundTo(Number end, const Segment& segment, Number first, Number most);
};

void Model::add(const Segment& segment) {
    const Kind& kind = segment.kind;
    const Input* const sound = kind.sound == kNothing ? nullptr : &kInputs[kind.sound];
    if (kind.picture != kNothing) {
        addPicture(segment);
        const Fraction& rate_ = kInputs[kind.picture].rate;
        const Number first = sound ? floorOf(segment.from, over({sound->samplerate, 1}, rate_)) : 0;
        addSoundTo(floorOf(static_cast<Number>(frames.size()), over({samplerate, 1}, rate)), segment, first,
                   sound ? sound->samples : 0);
        return;
    }
    const Number first = segment.from * sound->samplerate / 100, last = segment.to * sound->samplerate / 100;
    const Number own = (last - first) * samplerate / sound->samplerate;
    if (side == 0) return addSoundTo(static_cast<Number>(samples.size()) + own, segment, first, last);
    const Number black = std::max(1LL, ceilingOf(own, over(rate, {samplerate, 1})));
    frames.resize(frames.size() + static_cast<size_t>(black));
    addSoundTo(floorOf(static_cast<Number>(frames.size()), over({samplerate, 1}, rate)), segment, first,
               last);
}

// Output frames that begin within the segment, each with the frame that is on at its time.
void Model::addPicture(const Segment& segment) {
    const Input& input = kInputs[segment.kind.picture];
    const Fraction down = over(input.rate, rate);
    const Number count = floorOf(segment.to - segment.from, over(rate, input.rate));
    const Number begin = ceilingOf(segment.from, over(rate, input.rate));
    for (Number k = begin; k < begin + count; ++k) frames.push_back({segment.kind.picture, floorOf(k, down)});
}

// Samples of the segment's sound from `first` on, up to `most` of its input, and silence after them.
void Model::addSoundTo(Number end, const Segment& segment, Number first, Number most) {
    if (samplerate == 0) return;
    const int from = segment.kind.sound;
    const bool plain =
        from != kNothing && kInputs[from].samplerate == samplerate && kInputs[from].channels == channels;
    // A converter of the rate rings on for a while after the end.
    for (Number n = first; static_cast<Number>(samples.size()) < end; ++n)
        samples.push_back(from == kNothing || (plain && n >= most) ? Unit{} : Unit{from, plain ? n : kAny});
}

std::string sizeOf(const Input& input) {
    const std::string side = std::to_string(input.side);
    return side + "x" + side;
}
std::string rateOf(const Input& input) {
    return std::to_string(input.rate.num) + "/" + std::to_string(input.rate.den);
}

class JoinModel : public Tool, public testing::WithParamInterface<bool> {
  protected:
    void SetUp() override {
        Tool::SetUp();
        std::string pictures;
        for (int i = 0; i < 120; ++i) pictures += std::string(32 * 32 * 3 / 2, static_cast<char>(20 + i));
        folder.write("p.yuv", pictures);
        folder.write("c.scc", "Scenarist_SCC V1.0\n\n00:00:00:00\t9420 9420\n");
        for (const Input& input : {kInputs[3], kInputs[4]}) {
            std::string sound;
            for (Number i = 0; i < input.samples; ++i) {
                sound += leBytes(static_cast<std::uint64_t>(1 + i % 32000), 2);
                if (input.channels == 2) sound += leBytes(static_cast<std::uint64_t>(1 + i / 32000), 2);
            }
            const auto format = wavFormat(1, static_cast<unsigned>(input.channels),
                                          static_cast<unsigned>(input.samplerate), 16);
            folder.write(input.name, riff(wavChunk("fmt ", format) + wavChunk("data", sound)));
        }
        works({"transcode", kInputs[1].name, "-o", "tone.wav", "--no-video"});
        tone_ = wavPart(contents("tone.wav"), "data");
        if (GetParam()) makeFilms();
    }

    // Pictures in groups with frames that are predicted from later ones, sound in packets of several lengths.
    void makeFilms() {
        if (!std::filesystem::exists("/usr/bin/ffmpeg")) GTEST_SKIP() << "there is no ffmpeg here";
        const Words h264{"-c:v", "libx264", "-qp", "0", "-bf", "3", "-g", "12"};
        for (int input = 0; input < 3; ++input) {
            if (input > 0)
                works({"transcode", kInputs[input].name, "-o", kRaw[input], "--no-audio", "--pixel", "I420"});
            Words made{"-f",       "rawvideo",
                       "-pix_fmt", "yuv420p",
                       "-s",       sizeOf(kInputs[input]),
                       "-r",       rateOf(kInputs[input]),
                       "-i",       kRaw[input]};
            if (input == 1) made = made + Words{"-i", "tone.wav", "-c:a", "pcm_s16le"};
            film(made + (input == 2 ? Words{"-c:v", "ffv1"} : h264), input);
        }
        film({"-i", "s44.wav"}, 3);
        film({"-i", "s48.wav", "-c:a", "alac"}, 4);
    }
    void film(const Words& options, int input) const {
        ProcessOptions where;
        where.folder = folder.path().string();
        const Outcome made = runProgram(
            Words{"/usr/bin/ffmpeg", "-nostdin", "-v", "error"} + options + Words{kInputs[input].film},
            where);
        EXPECT_EQ(made.status, 0) << made.err;
    }

    // How the raw pictures among these words are read.
    static Words rawOf(const Words& words) {
        for (const std::string& word : words)
            for (int input = 0; input < 3; ++input)
                if (word.starts_with(kRaw[input]))
                    return {"--raw",
                            "size=" + sizeOf(kInputs[input]) + ",pixel=I420,rate=" + rateOf(kInputs[input])};
        return {};
    }

    // The frames of an input at a size, converted one by one; of a film, those that it was made of.
    const std::map<std::string, Unit>& known(int input, int side) {
        auto& found = known_[{input, side}];
        if (!found.empty()) return found;
        const std::string size = std::to_string(side) + "x" + std::to_string(side);
        const char* const name = GetParam() ? kRaw[input] : kInputs[input].name;
        const Words job{"transcode", name, "-o", "known.yuv", "-y", "--no-audio"};
        works(job + Words{"--pixel", "I420", "--size", size} + rawOf(job));
        const std::string bytes = contents("known.yuv");
        const auto frame = static_cast<size_t>(side) * static_cast<size_t>(side) * 3 / 2;
        for (size_t i = 0; i * frame < bytes.size(); ++i)
            found[bytes.substr(i * frame, frame)] = {input, static_cast<Number>(i)};
        EXPECT_EQ(found.size(), static_cast<size_t>(kInputs[input].frames)) << "frames that differ";
        return found;
    }

    std::vector<Unit> framesOf(const std::string& bytes, const Model& model) {
        const auto luma = static_cast<size_t>(model.side) * static_cast<size_t>(model.side),
                   frame = luma * 3 / 2;
        EXPECT_EQ(bytes.size() % frame, 0u);
        const std::string black = std::string(luma, 16) + std::string(luma / 2, '\x80');
        std::vector<Unit> found;
        for (size_t at = 0; at + frame <= bytes.size(); at += frame) {
            const std::string one = bytes.substr(at, frame);
            Unit unit{kNothing, one == black ? 0 : kAny};
            for (const int input : {0, 1, 2})
                if (const auto row = known(input, model.side).find(one);
                    row != known(input, model.side).end())
                    unit = row->second;
            found.push_back(unit);
        }
        return found;
    }

    std::string bytesOf(const Unit& unit, int channels) const {
        if (unit.input == kNothing) return std::string(static_cast<size_t>(channels) * 2, '\0');
        if (unit.input == 1) return tone_.substr(static_cast<size_t>(unit.number) * 4, 4);
        const std::string low = leBytes(static_cast<std::uint64_t>(1 + unit.number % 32000), 2);
        return channels == 1 ? low : low + leBytes(static_cast<std::uint64_t>(1 + unit.number / 32000), 2);
    }

    void expectSound(const std::string& data, const Model& model) const {
        const auto each = static_cast<size_t>(model.channels) * 2;
        ASSERT_EQ(data.size(), model.samples.size() * each);
        for (size_t i = 0; i < model.samples.size(); ++i) {
            const Unit& unit = model.samples[i];
            if (unit.number == kAny) continue;
            ASSERT_EQ(data.compare(i * each, each, bytesOf(unit, model.channels)), 0)
                << "sample " << i << " is not " << testing::PrintToString(unit);
        }
    }

    // The outputs that there are.
    std::map<std::string, std::string> outputs() const {
        std::map<std::string, std::string> found;
        for (const char* name : {"o.yuv", "o.wav"})
            if (size(name) >= 0) found[name] = contents(name);
        return found;
    }
    void removeOutputs() const {
        for (const char* name : {"o.yuv", "o.wav"}) std::filesystem::remove(folder.path() / name);
    }

    void expectModel(const Words& job, const Model& model);
    void expectSameFromTask(std::mt19937& random) const;

  private:
    std::string tone_;
    std::map<std::pair<int, int>, std::map<std::string, Unit>> known_;
};

void JoinModel::expectModel(const Words& job, const Model& model) {
    removeOutputs();
    works(job);
    const auto made = outputs();
    ASSERT_EQ(made.count("o.yuv"), model.side > 0 ? 1u : 0u);
    ASSERT_EQ(made.count("o.wav"), model.samplerate > 0 ? 1u : 0u);
    if (model.side > 0) {
        EXPECT_EQ(framesOf(made.at("o.yuv"), model), model.frames);
    }
    if (model.samplerate > 0) expectSound(wavPart(made.at("o.wav"), "data"), model);
}

// Killed at any moment, it leaves outputs that are whole or none, and a further run writes all.
void JoinModel::expectSameFromTask(std::mt19937& random) const {
    const auto made = outputs();
    const auto files = listing();
    works({"run", "job.xml", "-y"});
    EXPECT_TRUE(outputs() == made) << "by the task";
    removeOutputs();
    {
        Process run(words({"run", "job.xml", "-y"}), here());
        usleep(static_cast<useconds_t>(random() % 60000));
        run.signal(SIGKILL);
        run.finish();
    }
    for (const auto& [name, bytes] : outputs())
        EXPECT_TRUE(bytes == made.at(name)) << name << " is not whole";
    works({"run", "job.xml", "-y"});
    EXPECT_TRUE(outputs() == made) << "after a run that was killed";
    EXPECT_EQ(listing(), files);
}

unsigned fromEnvironment(const char* name, unsigned otherwise) {
    const char* const text = std::getenv(name);
    return text ? static_cast<unsigned>(std::strtoul(text, nullptr, 10)) : otherwise;
}

Segment randomSegment(std::mt19937& random, bool sound) {
    const auto below = [&](Number bound) {
        return static_cast<Number>(random() % static_cast<unsigned>(bound));
    };
    Segment segment;
    segment.kind = kKinds[sound ? 5 + below(2) : below(std::size(kKinds))];
    const Number all = segment.kind.picture == kNothing ? 500 : 90;
    // Two frames, of which one is there at any of the rates.
    segment.from = below(all - 2);
    segment.to = segment.from + 2 + below(std::min(all - segment.from - 1, 40LL));
    return segment;
}

// The format that the segments and the options make, of which the options are added to the job.
Model randomFormat(std::mt19937& random, const std::vector<Segment>& segments, Words& job) {
    Model model;
    for (const Segment& segment : segments) {
        if (const int input = segment.kind.picture; input != kNothing && model.side == 0)
            model.side = kInputs[input].side, model.rate = kInputs[input].rate;
        if (const int input = segment.kind.sound; input != kNothing && model.samplerate == 0)
            model.samplerate = kInputs[input].samplerate, model.channels = kInputs[input].channels;
    }
    if (model.side > 0 && random() % 3 == 0) {
        model.side = 48;
        job = job + Words{"--size", "48x48"};
    }
    if (model.side > 0 && random() % 3 == 0) {
        const Fraction rates[] = {{24, 1}, {25, 1}, {30000, 1001}};
        model.rate = rates[random() % 3];
        job = job + Words{"--rate", std::to_string(model.rate.num) + "/" + std::to_string(model.rate.den)};
    }
    if (model.samplerate > 0 && random() % 3 == 0) {
        model.samplerate = random() % 2 == 0 ? 44100 : 48000;
        job = job + Words{"--samplerate", std::to_string(model.samplerate)};
    }
    return model;
}

TEST_P(JoinModel, RandomJoinsAreAsTheModelSays) {
    constexpr unsigned usual = *QV_SANITIZE ? 8 : 50;  // a sanitizer takes ten times as long
    const unsigned seed = fromEnvironment("QV_SEED", 20261), rounds = fromEnvironment("QV_JOINS", usual);
    for (unsigned round = 0; round < rounds && !HasFailure(); ++round) {
        std::mt19937 random(seed + round);
        std::vector<Segment> segments;
        const bool sound = random() % 5 == 0;
        const unsigned count = 2 + static_cast<unsigned>(random() % 4);
        while (segments.size() < count) segments.push_back(randomSegment(random, sound));
        Words job{"transcode", "--join", "-y", "--save-task", "job.xml"};
        for (const Segment& segment : segments) job.push_back(segment.word(GetParam()));
        Model model = randomFormat(random, segments, job);
        for (const Segment& segment : segments) model.add(segment);
        job = job + rawOf(job) + Words{"-o", model.side > 0 ? "o.yuv" : "o.wav"};
        if (model.side > 0) job = job + Words{"--pixel", "I420"};
        SCOPED_TRACE("QV_SEED=" + std::to_string(seed + round) + " " + testing::PrintToString(job));
        expectModel(job, model);
        if (!HasFailure()) expectSameFromTask(random);
    }
}
INSTANTIATE_TEST_SUITE_P(OfInputs, JoinModel, testing::Bool(),
                         [](const auto& param) { return param.param ? "films" : "ownForms"; });

}  // namespace
