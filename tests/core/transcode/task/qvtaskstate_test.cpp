#include "core/transcode/task/qvtaskstate.h"

#include <random>

#include "core/document/xmldom.h"
#include "core/engine/status.h"
#include "core/measure/qvgeometry.h"
#include "core/measure/streamtype.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"

namespace {

Any source(int type, const std::string& file, int number = 0) {
    return Any(AnyDict("file", file.c_str(), "stream", Any(Pair(type, number))));
}

Any file(const std::string& name) { return Any(AnyDict("filename", name.c_str())); }

// Streams of these types, each with a source for each letter: file "a" and so on.
QvTaskState stateOf(const std::vector<int>& types, const Texts& letters) {
    AnyVector out, in, files;
    for (std::size_t i = 0; i < types.size(); ++i) {
        out.append(AnyDict("type", types[i]));
        AnyVector sources;
        for (const char letter : letters.at(i)) sources.append(source(types[i], std::string(1, letter)));
        in.append(AnyDict("type", types[i], "sources", sources));
        for (const char letter : letters.at(i))
            if (!files.contains(file(std::string(1, letter)))) files.append(file(std::string(1, letter)));
    }
    QvTaskState state;
    state.set("encoder", AnyDict("streams", out));
    state.set("streams", in);
    if (!files.empty()) state.set("files", files);
    return state;
}

std::string filesOf(const QvTaskState& state, int stream) {
    std::string letters;
    for (int i = 0; i < state.nrSources(stream); ++i)
        letters += state.source(stream, i).filename().asString("?");
    return letters;
}

std::string enabledOf(const QvTaskState& state) {
    std::string flags;
    for (const Any& flag : state.segments()) flags += flag == 1 ? '1' : '0';
    return flags;
}

AnyVector newSources(const std::string& name) { return AnyVector(source(1, name), source(2, name)); }

TEST(QvTaskState, SegmentsAreCountedOverTheStreamsThatHaveSources) {
    const struct {
        std::vector<int> types;
        Texts letters;
        int kept, segments;
    } rows[] = {
        {{}, {}, 0, 0},
        {{1, 2, 2}, {"ab", "ab", ""}, 2, 2},  // the third is a free slot
        {{1, 2}, {"ab", "abc"}, -1, 0},
        {{1, 2}, {"", ""}, 0, 0},
    };
    for (const auto& row : rows) {
        QvTaskState state = stateOf(row.types, row.letters);
        const QvTaskState& reader = state;
        EXPECT_EQ(reader.nrSegments(), row.segments);
        EXPECT_FALSE(state.isSet("#nsegs"));
        EXPECT_EQ(state.nrSegments(), row.segments);
        EXPECT_EQ(state.get("#nsegs"), row.kept);
    }
    QvTaskState kept = stateOf({1}, {"ab"});
    EXPECT_EQ(kept.nrSegments(), 2);
    kept.set("streams", AnyVector());
    EXPECT_EQ(kept.nrSegments(), 2) << "code that changes the streams removes the count";
    EXPECT_EQ(QvTaskState(static_cast<const AnyDict&>(kept)).nrSegments(), 0) << "a count from elsewhere";
}

TEST(QvTaskState, WhatIsAbsentReadsAsEmpty) {
    const QvTaskState state;
    QvTaskState::Segment segment;
    std::array<int, 3> counts{9, 9, 9};
    EXPECT_TRUE(state.isEnabled());
    EXPECT_TRUE(state.isSegmentEnabled(0));
    EXPECT_TRUE(state.segments().empty() && state.streams_in().isNull() && state.sources(0).isNull());
    EXPECT_EQ(state.source(0, 0).type(), 0);
    EXPECT_FALSE(state.source(0, 0).filename().isValid() || state.outputFilename().isValid() ||
                 state.encoder().presetName().isValid() || state.encoder().muxerDisplayName().isValid());
    EXPECT_EQ(state.nrStreams(counts), 0);
    EXPECT_EQ(counts, (std::array<int, 3>{}));
    EXPECT_EQ(state.getSegment(0, &segment), QvStatus::invalidStructure);
    EXPECT_EQ(state.fileByFilename("a"), -1);
    EXPECT_EQ(failureOf([&] { state.encoder().stream(0); }), "Invalid list index");
}

TEST(QvTaskState, StreamsAndFilesAreFound) {
    QvTaskState state = stateOf({1, 2, 2, 4}, {"ab", "ac", "", "bb"});
    std::array<int, 3> all{}, fed{};
    EXPECT_EQ(state.nrStreams(all), 4);
    EXPECT_EQ(state.nrValidStreams(fed), 3);
    EXPECT_EQ(all, (std::array<int, 3>{1, 2, 1}));
    EXPECT_EQ(fed, (std::array<int, 3>{1, 1, 1}));
    EXPECT_EQ(state.nrStreams(qvVideoStream | qvAudioStream), 3);
    EXPECT_EQ(state.nrStreams(0), 4);
    EXPECT_EQ(state.source(Pair(2, 0), 1).filename(), "c");
    EXPECT_EQ(state.streamsForFile("a"), AnyVector(Any(Pair(1, 0)), Any(Pair(2, 0))));
    EXPECT_EQ(state.streamsForFile("b"), AnyVector(Any(Pair(4, 0))));
    Any& sound = state.get("streams").asVector().at(1).asDict().get("sources").asVector().at(0);
    sound.asDict().set("stream", Any(Pair(2, 3)));
    EXPECT_EQ(state.streamsForFile("a"), AnyVector(Any(Pair(1, 0)), Any(Pair(2, 3)))) << "of the file";

    QvTaskState::Segment segment;
    std::vector<int> places;
    AnyVector files;
    state.get("files").asVector().remove(2);  // "c"
    ASSERT_EQ(state.getSegment(1, &segment, &places), 0);
    ASSERT_EQ(segment.size(), 4);
    EXPECT_EQ(segment.at(1)->filename(), "c");
    EXPECT_EQ(segment.at(2)->type(), 0);
    EXPECT_EQ(places, (std::vector<int>{1, -1, -1, 1}));
    EXPECT_EQ(state.getFilesForSegment(1, files), 0);
    EXPECT_EQ(files, AnyVector(file("b")));
    EXPECT_EQ(state.getSegment(2, &segment), QvStatus::invalidStructure);
    EXPECT_NE(failureOf([&] { state.getSegment(0, nullptr); }), "no failure");

    state.removeSlots();
    EXPECT_EQ(state.streams_in().size(), 3);
    EXPECT_EQ(state.nrStreams(0), 3);
    EXPECT_EQ(filesOf(state, 2), "bb");
    state.get("files").asVector().append(AnyDict());
    EXPECT_NE(failureOf([&] { state.fileByFilename("z"); }), "no failure");
}

TEST(QvTaskState, TheOutputSaysWhatItIs) {
    const EngineScope engine;
    const QvEncodePipeState output(AnyDict(
        "muxer", AnyDict("name", "rawmux"), "profile", 50331648, "streams",
        AnyVector(
            Any(AnyDict("type", 1, "codec", AnyDict("name", "rawvenc"), "codecInfo",
                        AnyDict("displayName", "Raw Video", "width", 720, "framerate", QvFramerate::f25p()))),
            Any(AnyDict("type", 2, "codec", AnyDict("name", "rawaenc"))), Any(3))));
    EXPECT_EQ(output.nrStreams(), 3);
    EXPECT_EQ(output.nrStreams(255), 3);
    EXPECT_EQ(output.nrStreams(1), 1);
    EXPECT_EQ(output.stream(Pair(2, 0)).codecDisplayName(), "rawaenc");
    EXPECT_EQ(output.stream(0).codecDisplayName(), "Raw Video");
    EXPECT_EQ(output.stream(0).width(), 720);
    EXPECT_EQ(output.stream(0).height(), 0);
    EXPECT_TRUE(output.stream(0).framerate().isFramerate());
    EXPECT_TRUE(output.stream(Pair(2, 1)).empty() && output.stream(2).empty());
    EXPECT_EQ(output.muxerDisplayName(), "rawmux");
}

TEST(QvTaskState, AnotherOutputReplacesThisOne) {
    QvTaskState state = stateOf({1, 2}, {"ab", "ab"}), other = stateOf({1, 2}, {"c", "c"});
    other.setOutputFilename("new");
    other.set("presetName", "P");
    state.update(other);
    EXPECT_EQ(state.outputFilename(), "new");
    EXPECT_EQ(state.get("presetName"), "P");
    EXPECT_EQ(filesOf(state, 0), "ab");
    other.set("muxerName", "M");
    state.update(other, 1);
    EXPECT_FALSE(state.isSet("muxerName"));
    EXPECT_EQ(filesOf(state, 0) + filesOf(state, 1), "acac");
    EXPECT_EQ(state.fileByFilename("c"), 2);
    EXPECT_NE(failureOf([&] { state.updateOutput(AnyDict(), Any()); }), "no failure");
    QvTaskState narrow = stateOf({1, 2}, {"c", "c"});
    narrow.get("streams").asVector().remove(1);
    EXPECT_EQ(failureOf([&] { state.update(narrow, 0); }),
              "[QvTaskState::update] Invalid number of input streams");
}

// Each is an assertion that changes nothing.
TEST(QvTaskState, MisuseChangesNothing) {
    using Act = std::function<void(QvTaskState&)>;
    const AnyVector mixed(source(1, "a"), source(1, "a")), one(source(1, "a")), files(file("c"));
    const struct {
        const char* what;
        Texts letters;
        Act act;
        const char* message;
    } rows[] = {
        {"the first segment of all", {"", ""}, [&](auto& s) { s.addSegment(newSources("c"), files); }, ""},
        {"too few sources", {"a", "a"}, [&](auto& s) { s.addSegment(one, files); }, ""},
        {"another type", {"a", "a"}, [&](auto& s) { s.addSegment(mixed, files); }, ""},
        {"a gap", {"a", "a"}, [&](auto& s) { s.addSegment(newSources("c"), files, 2); }, ""},
        {"beyond the end",
         {"a", "a"},
         [&](auto& s) { s.updateSegment(newSources("c"), files, 1); },
         "[QvTaskState] updateSegment: invalid segment index."},
        {"a free slot", {"a", ""}, [&](auto& s) { s.updateSegment(newSources("c"), files, 0); }, ""},
        {"an update to another type", {"a", "a"}, [&](auto& s) { s.updateSegment(mixed, files, 0); }, ""},
        {"an update without its file",
         {"a", "a"},
         [&](auto& s) { s.updateSegment(newSources("c"), {}, 0); },
         ""},
        {"files without a name",
         {"a", "a"},
         [&](auto& s) {
             s.get("files").asVector().append(AnyDict());
             s.remove("#nsegs");
             const QvTaskState before = s;
             EXPECT_NE(failureOf([&] { s.addSegment(newSources("c"), files); }), "no failure");
             s.remove("#nsegs");
             EXPECT_EQ(s, before);
             s.get("files").asVector().remove(1);
             s.removeSegment(9);
         },
         ""},
        {"no such segment", {"a", "a"}, [&](auto& s) { s.removeSegment(1); }, ""},
        {"a negative one", {"a", "a"}, [&](auto& s) { s.removeSegment(-1); }, ""},
        {"a swap with none", {"a", "a"}, [&](auto& s) { s.swapSegments(0, 1); }, ""},
        {"a flag of none", {"a", "a"}, [&](auto& s) { s.setSegmentEnabled(1, false); }, ""},
    };
    for (const auto& row : rows) {
        QvTaskState state = stateOf({1, 2}, row.letters);
        const QvTaskState before = state;
        EXPECT_EQ(failureOf([&] { row.act(state); }), row.message) << row.what;
        state.remove("#nsegs");
        EXPECT_EQ(state, before) << row.what;
    }
    QvTaskState empty;
    EXPECT_NE(failureOf([&] { empty.addSegment({}, {}); }), "no failure");
    EXPECT_EQ(empty.swapSegments(0, 0), QvStatus::failed);
}

TEST(QvTaskState, TheSameStreamsNeedNoFilesToBeUpdated) {
    QvTaskState state = stateOf({1, 2}, {"a", "a"});
    AnyVector sources = newSources("a");
    sources.at(0).asDict().set("process", AnyDict("smartRender", 1));
    EXPECT_EQ(state.updateSegment(sources, {}, 0), 0);
    EXPECT_EQ(state.processParams(0, 0).smartRender(), 1);
    sources.at(1).asDict().set("stream", Any(Pair(2, 1)));
    EXPECT_NE(failureOf([&] { state.updateSegment(sources, {}, 0); }), "no failure");
}

// Against lists of letters and flags.
TEST(QvTaskState, OperationsOnSegmentsKeepStreamsFlagsAndFilesTogether) {
    std::mt19937 random(7);
    const auto below = [&](std::size_t n) { return static_cast<int>(random() % n); };
    for (int round = 0; round < 50; ++round) {
        QvTaskState state = stateOf({1, 2}, {"a", "a"});
        std::string letters = "a", flags = "1", known = "a";
        if (round % 2 == 1) state.setEnabled(false);
        for (int step = 0; step < 40; ++step) {
            const std::string name(1, static_cast<char>('a' + below(6)));
            const std::size_t n = letters.size();
            const auto learn = [&] {
                if (known.find(name) == std::string::npos) known += name;
            };
            const int action = n == 0 ? 0 : below(5);
            if (action == 0) {
                const int at = below(n + 2) - 1;
                const auto place = at < 0 ? n : static_cast<std::size_t>(at);
                ASSERT_EQ(state.addSegment(newSources(name), AnyVector(file(name)), at), 0);
                letters.insert(place, name);
                flags.insert(place, round % 2 == 1 ? "0" : "1");
                learn();
            } else if (action == 1) {
                const int at = below(n);
                ASSERT_EQ(state.removeSegment(at), 0);
                letters.erase(static_cast<std::size_t>(at), 1);
                flags.erase(static_cast<std::size_t>(at), 1);
            } else if (action == 2) {
                const int a = below(n), b = below(n);
                ASSERT_EQ(state.swapSegments(a, b), 0);
                std::swap(letters[static_cast<std::size_t>(a)], letters[static_cast<std::size_t>(b)]);
                std::swap(flags[static_cast<std::size_t>(a)], flags[static_cast<std::size_t>(b)]);
            } else if (action == 3) {
                const int at = below(n);
                const bool elsewhere = letters[static_cast<std::size_t>(at)] != name[0];
                ASSERT_EQ(state.updateSegment(newSources(name), AnyVector(file(name)), at), 0);
                letters[static_cast<std::size_t>(at)] = name[0];
                if (elsewhere) learn();
            } else {
                const int at = below(n);
                state.setSegmentEnabled(at, below(2) == 1);
                flags[static_cast<std::size_t>(at)] = state.isSegmentEnabled(at) ? '1' : '0';
            }
            ASSERT_EQ(filesOf(state, 0), letters);
            ASSERT_EQ(filesOf(state, 1), letters);
            ASSERT_EQ(enabledOf(state), flags);
            ASSERT_EQ(state.nrSegments(), static_cast<int>(letters.size()));
            std::string names;
            for (const Any& one : state.inputFilenames()) names += one.asString("?");
            ASSERT_EQ(names, known) << "files stay when the last segment that used them goes";
        }
    }
}

// --- Random states.

using Random = std::mt19937;

Any randomValue(Random& random, int depth) {
    const auto number = static_cast<int>(random());
    switch (random() % (depth > 0 ? 12 : 10)) {
        case 0: return Any(number);
        case 1: return Any(static_cast<long long>(random()) * number);
        case 2: return Any(static_cast<double>(number) / 1024);
        case 3: return Any(("t<&>\"" + std::string(random() % 9, 'x') + "\n ").c_str());
        case 4: return wide("\xC3\xA4 " + std::to_string(number));
        case 5: return Any(QvFramerate(30000 / 1001.0));
        case 6: return Any(Pair(number, 4));
        case 7: return Any(MediaTime(number * 4001LL));
        case 8: return Any(QvRect(1, 2, static_cast<int>(random() % 99), 4));
        case 9: return Any();
        case 10: {
            AnyVector vector;
            for (auto left = random() % 4; left > 0; --left) vector.append(randomValue(random, depth - 1));
            return Any(vector);
        }
        default: {
            AnyDict dict;
            for (auto left = random() % 4; left > 0; --left)
                dict.set(("k" + std::to_string(random() % 99)).c_str(), randomValue(random, depth - 1));
            return Any(dict);
        }
    }
}

QvTaskState randomState(Random& random) {
    const std::vector<int> types(random() % 4, 2);
    QvTaskState state = stateOf(types, Texts(types.size(), std::string("abcba").substr(0, random() % 6)));
    for (const char* key : {"postProcess", "presetName", "extra"}) state.set(key, randomValue(random, 3));
    for (Any& stream : state.get("streams").asVector())
        if (stream.asDict().get("sources").isVector())
            for (Any& one : stream.asDict().get("sources").asVector())
                one.asDict().set("process", AnyDict("more", randomValue(random, 3)));
    if (state.nrSegments() > 0) state.setSegmentEnabled(0, random() % 2 == 1);
    return state;
}

TEST(QvTaskState, StoredAndReadItStoresTheSameBytes) {
    const TempFolder folder;
    const std::string name = folder.file("state.xml");
    const auto store = [&](const AnyDict& state) {
        EXPECT_EQ(XmlParser::storeDict(name.c_str(), state, "TranscodeTask", "2.0"), 0);
        return TempFolder::read(name);
    };
    Random random(11);
    for (int i = 0; i < 100; ++i) {
        const QvTaskState state = randomState(random);
        const std::string first = store(state);
        QvTaskState back;
        Any root, version;
        ASSERT_EQ(XmlParser::restoreDict(name.c_str(), back, root, version), 0);
        ASSERT_FALSE(back.isSet("#nsegs"));
        ASSERT_EQ(back.nrSegments(), state.nrSegments());
        ASSERT_EQ(enabledOf(back), enabledOf(state));
        ASSERT_EQ(store(back), first);
    }
}

}  // namespace
