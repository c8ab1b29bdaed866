#include "core/transcode/batch/qvbatchdecoder.h"

#include <numeric>
#include <random>
#include <set>
#include <utility>

#include "core/engine/qvutil.h"
#include "core/measure/mediarange.h"
#include "core/media/qvuserdata.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/fake_streams.h"

namespace {

const QvFramerate f25 = QvFramerate::f25p(), f29 = QvFramerate::f29p(), f50 = QvFramerate::f50p();
constexpr int notSelected = -77;

MediaTime frameTime(long long frame, const QvFramerate& rate) { return qvInstantOf(frame, rate.rate()); }
MediaTime sampleTime(long long sample, int rate) { return qvInstantOf(sample, QvRatio(rate, 1)); }

// Frames say in their pixels whose they are and which; reads need a selected stream.
class Source : public FakeDecoder {
  public:
    Source(int id, int frames, const QvFramerate& rate, int width = 16, int height = 8)
        : FakeDecoder(frames, rate, width, height), id_(id) {}

    int readFrame(int stream) override {
        if (!isSelected(1, stream)) return setError(notSelected, "not selected");
        if (const int result = FakeDecoder::readFrame(stream)) return result;
        for (int y = 0; y < frame.height(); ++y)
            std::memset(frame.pixelPtr(0, y), id_, static_cast<std::size_t>(frame.width()));
        std::memcpy(frame.plane(), &frame.frameNr, sizeof frame.frameNr);
        if (onFrame) onFrame(frame);
        return 0;
    }
    int readSamples(int count, int stream) override {
        if (!isSelected(2, stream)) return setError(notSelected, "not selected");
        return failSound ? setError(-1, "the sound is gone") : FakeDecoder::readSamples(count, stream);
    }
    int select(int type, int stream) override {
        chosen.insert({type, stream});
        return 0;
    }
    int deselect(int type, int stream) override {
        chosen.erase({type, stream});
        return 0;
    }
    bool isSelected(int type, int stream) const override { return chosen.count({type, stream}) > 0; }
    int setReadUserData(int, int, bool on) override { return readsData = on, 0; }
    bool readUserData(int, int) const override { return readsData; }

    std::set<std::pair<int, int>> chosen;
    std::function<void(QvFrame&)> onFrame;
    bool failSound = false, readsData = false;

  private:
    int id_;
};

struct Shown {
    int id;
    int source;  // number in its source
    bool operator==(const Shown&) const = default;
};

void PrintTo(const Shown& shown, std::ostream* out) { *out << shown.id << ":" << shown.source; }

Shown shownBy(const QvFrame& frame) {
    int number = 0;
    std::memcpy(&number, frame.plane(), sizeof number);
    return {*frame.pixelPtr(frame.width() - 1, frame.height() - 1), number};
}

VideoJobDescription picture(const QvFramerate& rate, int width = 16, int height = 8) {
    VideoJobDescription job;
    job.outWidth = width;
    job.outHeight = height;
    job.outFOURCC = QvFourcc::GRAY;
    job.outFramerate = rate;
    job.outFrameAspect = 2.0;
    return job;
}

AudioJobDescription sound(int samplerate, int channels = 2, int bits = 16) {
    AudioJobDescription job;
    job.outSamplerate = samplerate;
    job.outChannels = channels;
    job.outBitsPerSample = bits;
    return job;
}

// The values of the first channel; 0 is silence.
std::vector<int> valuesOf(const QvPcm& pcm) {
    std::vector<int> values;
    for (int i = 0; i < pcm.samples(); ++i) {
        short value = 0;
        std::memcpy(&value, pcm.ptr(i), sizeof value);
        values.push_back(value);
    }
    return values;
}

// What FakeDecoder gives from sample `from` on.
std::vector<int> counting(long long from, long long count) {
    std::vector<int> values;
    for (long long i = from; i < from + count; ++i) values.push_back(static_cast<int>(i % 1000 + 1));
    return values;
}

void add(std::vector<int>& to, const std::vector<int>& values) {
    to.insert(to.end(), values.begin(), values.end());
}

class BatchDecoder : public testing::Test {
  protected:
    BatchDecoder() { joined.init(); }

    Source& source(int frames, const QvFramerate& rate, int width = 16, int height = 8) {
        sources.push_back(
            std::make_unique<Source>(static_cast<int>(sources.size()) + 1, frames, rate, width, height));
        return *sources.back();
    }
    // All streams of the types of `mask`, with points of the segment.
    int insert(Source& from, int mask = 3, const InOutPoints& points = InOutPoints(), int position = -1) {
        std::vector<QvIStream> streams;
        for (const int type : {2, 1})
            for (int i = 0; (type & mask) && i < from.nrStreams(type); ++i)
                streams.emplace_back(&from, type, i);
        return insert(streams, points, position);
    }
    int insert(std::vector<QvIStream>& streams, const InOutPoints& points = InOutPoints(),
               int position = -1) {
        QvBatchDecoder::InputSegment segment;
        segment.points = points;
        for (QvIStream& stream : streams) segment.streams.append(&stream);
        return joined.insertSegment(segment, position);
    }
    // As a transcoder does: a frame, then the samples due by then.
    void run(const QvFramerate& rate, int samplerate, int audios = 1) {
        shown.clear();
        heard.assign(static_cast<std::size_t>(audios), {});
        for (int n = 0; joined.readFrame(0) == 0; ++n) {
            ASSERT_LT(n, 100000);
            ASSERT_EQ(joined.getFramePtr(0)->frameNr, n);
            shown.push_back(shownBy(*joined.getFramePtr(0)));
            for (int i = 0; i < audios; ++i) {
                auto& values = heard[static_cast<std::size_t>(i)];
                const auto due = static_cast<int>(QvUtil::samplesForFrames(n + 1, rate, samplerate) -
                                                  static_cast<long long>(values.size()));
                ASSERT_EQ(joined.readSamples(due, i), due);
                add(values, valuesOf(*joined.getAudioPtr(i)));
            }
        }
        ASSERT_EQ(joined.readFrame(0), QvStatus::endOfStream);
    }
    std::vector<int> readAll(int block, int stream = 0) {
        std::vector<int> values;
        for (int n = joined.readSamples(block, stream); n > 0; n = joined.readSamples(block, stream)) {
            EXPECT_EQ(joined.getAudioPtr(stream)->samples(), n);
            add(values, valuesOf(*joined.getAudioPtr(stream)));
        }
        EXPECT_EQ(joined.readSamples(block, stream), QvStatus::endOfStream);
        return values;
    }

    EngineScope engine;
    std::vector<std::unique_ptr<Source>> sources;
    QvBatchDecoder joined;
    std::vector<Shown> shown;
    std::vector<std::vector<int>> heard;
};

// Seams to the sample, at rates that no whole number of samples fits, are in qvbatchtask_test.cpp.

// Joins of sources with other rates, with cuts anywhere, against a model in exact integers.
TEST_F(BatchDecoder, RandomJoinsAreWhatAModelSays) {
    const QvFramerate rates[] = {f25, f29, QvFramerate::f23p(), f50, QvFramerate(QvRatio(1000, 33))};
    for (const QvFramerate& rate : rates) source(90, rate).audio(48000 * 4, 48000);
    std::mt19937 random(7);
    const auto upTo = [&](int n) { return static_cast<int>(random() % static_cast<unsigned>(n + 1)); };
    for (int round = 0; round < 50; ++round) {
        const QvFramerate out = rates[upTo(4)];
        joined.clearOutputStreams(3);
        joined.clearSegments();
        joined.addOutputVideoStream(picture(out));
        joined.addOutputAudioStream(sound(48000));
        std::vector<Shown> frames;
        for (int i = upTo(4); i >= 0; --i) {
            const int which = upTo(4);
            const QvFramerate in = rates[which];
            const int from = upTo(80);
            const int count = upTo(89 - from) + 1;
            ASSERT_EQ(insert(*sources[static_cast<std::size_t>(which)], 3,
                             {frameTime(from, in), frameTime(from + count, in)}),
                      0);
            // Frame k of the output lies in frame `at(k)` of the input.
            const long long num = 1LL * in.rate().num * out.rate().den;
            const long long den = 1LL * in.rate().den * out.rate().num;
            const auto at = [&](long long k) { return static_cast<int>(k * num / den); };
            long long first = 0;
            while (at(first) < from) ++first;
            for (long long k = 0; k < count * den / num; ++k) frames.push_back({which + 1, at(first + k)});
        }
        ASSERT_EQ(joined.open(), 0) << joined.errorDesc();
        ASSERT_EQ(joined.nrFrames(0), static_cast<int>(frames.size()));
        run(out, 48000);
        ASSERT_EQ(shown, frames) << "round " << round;
        ASSERT_EQ(static_cast<long long>(heard[0].size()),
                  QvUtil::samplesForFrames(static_cast<int>(frames.size()), out, 48000));
    }
}

// Sound that ends early is filled up in its place, whether its source ends or its own out point.
TEST_F(BatchDecoder, ShortSoundIsFilledAndLongSoundIsDropped) {
    for (const bool byPoint : {false, true}) {
        SCOPED_TRACE(byPoint);
        joined.clearSegments();
        joined.clearOutputStreams(3);
        joined.addOutputVideoStream(picture(f25));
        joined.addOutputAudioStream(sound(48000));
        auto& shorter = static_cast<Source&>(source(50, f25).audio(byPoint ? 96000 : 48000, 48000));
        auto& longer = static_cast<Source&>(source(25, f25).audio(200000, 48000));
        std::vector<QvIStream> streams{{&shorter, 1, 0}, {&shorter, 2, 0}};
        if (byPoint) streams[1].setOutPoint(MediaTime(1.0));
        ASSERT_EQ(insert(streams), 0);
        ASSERT_EQ(insert(longer), 0);
        ASSERT_EQ(insert(streams), 0);
        ASSERT_EQ(joined.open(), 0);
        run(f25, 48000);
        std::vector<int> values = counting(0, 48000);
        add(values, std::vector<int>(48000, 0));
        add(values, counting(0, 48000));
        add(values, counting(0, 48000));
        add(values, std::vector<int>(48000, 0));
        EXPECT_EQ(heard[0], values);
    }
}

// A read stops at the last sample of a segment and continues in the next one, for each stream by itself.
TEST_F(BatchDecoder, SoundAloneIsJoinedToTheSample) {
    joined.addOutputAudioStream(sound(44100));
    joined.addOutputAudioStream(sound(44100));
    auto& a = static_cast<Source&>(source(1, f25).audio(5000, 44100).audio(5000, 44100));
    auto& b = static_cast<Source&>(source(1, f25).audio(777, 44100).audio(777, 44100));
    ASSERT_EQ(insert(a, 2, {sampleTime(100, 44100), sampleTime(1701, 44100)}), 0);
    ASSERT_EQ(insert(b, 2), 0);
    ASSERT_EQ(insert(a, 2, {sampleTime(4999, 44100), MediaTime()}), 0);
    ASSERT_EQ(joined.open(), 0);
    std::vector<int> values = counting(100, 1601);
    add(values, counting(0, 777));
    add(values, counting(4999, 1));
    EXPECT_EQ(joined.nrSamples(0), static_cast<long long>(values.size()));
    for (const int block : {1, 100, 1600, 1601, 5000}) {
        SCOPED_TRACE(block);
        EXPECT_EQ(readAll(block, 0), values);
        EXPECT_EQ(readAll(block, 1), values);
        ASSERT_EQ(joined.seekToSample(0, 0), 0);
        ASSERT_EQ(joined.seekToSample(0, 1), 0);
    }
    // One after the other in each block, as a transcoder reads them.
    std::vector<int> both[2];
    for (int n = 1; n > 0;)
        for (int i = 0; i < 2; ++i) {
            n = joined.readSamples(1600, i);
            if (n > 0) add(both[i], valuesOf(*joined.getAudioPtr(i)));
        }
    EXPECT_EQ(both[0], values);
    EXPECT_EQ(both[1], values);
}

// Sources of other rates, widths and channels: the counts are those of the output, no segment is silent.
TEST_F(BatchDecoder, SoundIsConvertedInEachSegment) {
    joined.addOutputAudioStream(sound(48000));
    const int rates[] = {44100, 48000, 32000, 96000, 11025};
    long long total = 0;
    for (const int rate : rates) {
        auto& from = static_cast<Source&>(source(1, f25).audio(rate / 3, rate));
        ASSERT_EQ(insert(from, 2), 0);
        total += 48000LL * (rate / 3) / rate;
    }
    ASSERT_EQ(joined.open(), 0) << joined.errorDesc();
    EXPECT_EQ(joined.nrSamples(0), total);
    EXPECT_EQ(static_cast<long long>(readAll(1601).size()), total);

    joined.close();
    joined.clearSegments();
    joined.clearOutputStreams(2);
    joined.addOutputAudioStream(sound(48000, 1));
    std::vector<QvIStream> streams{{sources[1].get(), 2, 0}};
    LogCapture log;
    ASSERT_EQ(insert(streams), 0);
    ASSERT_EQ(joined.open(), 0);
    EXPECT_TRUE(log.contains("channel number differ, conn matrix required"));
    ASSERT_EQ(joined.readSamples(10, 0), 10);
    EXPECT_EQ(joined.getAudioPtr(0)->channels(), 2) << "left for the encoder to refuse";
    joined.close();

    streams[0].params.setAudioChannelMap(AnyVector(Any(AnyDict("channel", 1))));
    joined.clearSegments();
    ASSERT_EQ(insert(streams), 0);
    ASSERT_EQ(joined.open(), 0);
    ASSERT_EQ(joined.readSamples(10, 0), 10);
    EXPECT_EQ(joined.getAudioPtr(0)->channels(), 1);
    EXPECT_EQ(valuesOf(*joined.getAudioPtr(0)), counting(0, 10));
}

// Pixels are not copied; what goes with a frame goes with it, and only with it.
TEST_F(BatchDecoder, FramesPassWithWhatTheyCarry) {
    joined.addOutputVideoStream(picture(f25));
    QvUserData data;
    auto& from = source(6, f25);
    from.onFrame = [&](QvFrame& frame) {
        frame.meta().clear();
        if (frame.frameNr % 2 == 0) frame.setUserData(&data);
        if (frame.frameNr == 3) frame.setSubpic(AnyDict("text", "x"));
        frame.setTimestamp(1000 + frame.frameNr);
    };
    ASSERT_EQ(insert(from, 1, {frameTime(1, f25), frameTime(6, f25)}), 0);
    ASSERT_EQ(joined.open(), 0);
    EXPECT_EQ(joined.getFramePtr(0)->frameNr, -1);
    for (int i = 1; i < 6; ++i) {
        ASSERT_EQ(joined.readFrame(0), 0);
        QvFrame& frame = *joined.getFramePtr(0);
        EXPECT_EQ(frame.frameNr, i - 1);
        EXPECT_EQ(frame.plane(), from.frame.plane());
        EXPECT_EQ(frame.stride(), from.frame.stride());
        EXPECT_EQ(frame.userData(), i % 2 == 0 ? &data : nullptr);
        EXPECT_EQ(frame.subpic() != nullptr, i == 3);
        EXPECT_EQ(frame.getTimestamp(), 1000 + i);
        frame.setSubpic(AnyDict("text", "of a meta source"));
    }
    EXPECT_EQ(joined.readFrame(0), QvStatus::endOfStream);
    EXPECT_EQ(shownBy(*joined.getFramePtr(0)), (Shown{1, 5})) << "the last frame may be needed again";
}

// A filter of a segment asks the source of that segment alone.
TEST_F(BatchDecoder, UserDataAreReadForTheFiltersOfASegment) {
    joined.addOutputVideoStream(picture(f25));
    const AnyDict filter("name", "userdata", "_on", 1, "_position", 1);
    for (const bool filtered : {false, true, true}) {
        std::vector<QvIStream> streams{{&source(2, f25), 1, 0}};
        if (filtered) streams[0].params.setFilters(AnyDict("customFilters", AnyVector(Any(filter))));
        ASSERT_EQ(insert(streams), 0);
    }
    ASSERT_EQ(joined.open(), 0) << joined.errorDesc();
    for (int i = 0; i < 6; ++i) {
        ASSERT_EQ(joined.readFrame(0), 0);
        for (int k = 0; k < 3; ++k)
            EXPECT_EQ(sources[static_cast<std::size_t>(k)]->readsData, k > 0 && k <= i / 2) << i;
    }
}

TEST_F(BatchDecoder, PicturesOfOtherSizesAreScaled) {
    joined.addOutputVideoStream(picture(f25, 32, 16));
    ASSERT_EQ(insert(source(2, f25, 16, 8), 1), 0);
    ASSERT_EQ(insert(source(2, f25, 32, 16), 1), 0);
    ASSERT_EQ(insert(source(2, f25, 64, 64), 1), 0);
    ASSERT_EQ(joined.open(), 0) << joined.errorDesc();
    for (const int id : {1, 1, 2, 2, 3, 3}) {
        ASSERT_EQ(joined.readFrame(0), 0);
        const QvFrame& frame = *joined.getFramePtr(0);
        EXPECT_EQ(frame.width(), 32);
        EXPECT_EQ(frame.height(), 16);
        EXPECT_EQ(shownBy(frame).id, id);
    }
    EXPECT_EQ(joined.readFrame(0), QvStatus::endOfStream);
}

// Only the streams of the segment that plays are selected, so that others can do without file and codec.
TEST_F(BatchDecoder, OnlyTheSegmentAtHandIsSelectedAndASecondRunIsTheSame) {
    joined.addOutputVideoStream(picture(f25));
    joined.addOutputAudioStream(sound(48000));
    for (int i = 0; i < 4; ++i) ASSERT_EQ(insert(static_cast<Source&>(source(3, f25).audio(9600, 48000))), 0);
    ASSERT_EQ(joined.open(), 0);
    for (int segment = 0; segment < 4; ++segment)
        for (int i = 0; i < 3; ++i) {
            ASSERT_EQ(joined.readFrame(0), 0);
            EXPECT_EQ(joined.getParam("currentSegment"), Any(segment));
            for (int k = 0; k < 4; ++k)
                EXPECT_EQ(sources[static_cast<std::size_t>(k)]->chosen.size(), k == segment ? 2U : 0U);
        }
    ASSERT_EQ(joined.seekToFrame(0, 0), 0);
    ASSERT_EQ(joined.seekToSample(0, 0), 0);
    EXPECT_EQ(joined.getParam("currentSegment"), Any(0));
    run(f25, 48000);
    const auto first = shown;
    const auto firstSound = heard;
    EXPECT_EQ(first.size(), 12U);
    // In the middle of a run, too.
    ASSERT_EQ(joined.seekToFrame(0, 0), 0);
    ASSERT_EQ(joined.seekToSample(0, 0), 0);
    for (int i = 0; i < 7; ++i) ASSERT_EQ(joined.readFrame(0), 0);
    ASSERT_EQ(joined.seekToFrame(0, 0), 0);
    ASSERT_EQ(joined.seekToSample(0, 0), 0);
    run(f25, 48000);
    EXPECT_EQ(shown, first);
    EXPECT_EQ(heard, firstSound);
    // The first of two passes reads the picture alone, and no more than that goes back.
    for (const int frames : {2, 7, 13}) {
        ASSERT_EQ(joined.seekToFrame(0, 0), 0);
        ASSERT_EQ(joined.seekToSample(0, 0), 0);
        for (int i = 0; i < frames; ++i) joined.readFrame(0);
        ASSERT_EQ(joined.seekToFrame(0, 0), 0);
        for (std::size_t k = 0; k < 4; ++k) EXPECT_EQ(sources[k]->chosen.size(), k == 0 ? 2U : 0U);
        run(f25, 48000);
        EXPECT_EQ(shown, first);
        EXPECT_EQ(heard, firstSound);
    }
    EXPECT_NE(failureOf([&] { joined.seekToFrame(1, 0); }), "no failure");
    EXPECT_NE(failureOf([&] { joined.seekToSample(1, 0); }), "no failure");
    ASSERT_EQ(joined.close(), 0);
    for (const auto& source : sources) EXPECT_TRUE(source->chosen.empty());
    ASSERT_EQ(joined.open(), 0);
    run(f25, 48000);
    EXPECT_EQ(shown, first);
}

// A picture that an encoder takes over in coded form is not read, so the sound says where a segment ends.
TEST_F(BatchDecoder, SoundLeadsWhereThePictureIsPassedOn) {
    joined.addOutputVideoStream(picture(f25));
    joined.addOutputAudioStream(sound(48000));
    auto& a = static_cast<Source&>(source(50, f25).audio(96000, 48000));
    auto& b = static_cast<Source&>(source(50, f25).audio(96000, 48000));
    for (Source* each : {&a, &b}) each->extra.set("srParams", AnyDict("decoder_name", "coded", "id", 1));
    ASSERT_EQ(insert(a, 3, {frameTime(5, f25), frameTime(10, f25)}), 0);
    ASSERT_EQ(insert(b, 3, {frameTime(20, f25), frameTime(23, f25)}), 0);
    ASSERT_EQ(joined.open(), 0);

    Any answer = Pair(1, 0);
    joined.getParam("srParams", answer);
    ASSERT_TRUE(answer.isDict());
    EXPECT_TRUE(answer.asDict().get("join_decoder").isTrue());
    EXPECT_EQ(answer.asDict().get("decoder_name"), Any("coded"));
    const AnyVector& parts = answer.asDict().get("segments").asVector();
    ASSERT_EQ(parts.size(), 2);
    EXPECT_EQ(parts.at(0).asDict().get("frame0").toInt32(), 5);
    EXPECT_EQ(parts.at(0).asDict().get("nrFrames").toInt32(), 5);
    EXPECT_EQ(parts.at(1).asDict().get("frame0").toInt32(), 20);

    EXPECT_NE(failureOf([&] { joined.setParam("smartRenderingOn", Pair(1, 0)); }), "no failure");
    joined.seekToFrame(0, 0);
    joined.seekToSample(0, 0);
    std::vector<int> values = counting(9600, 9600);
    add(values, counting(38400, 5760));
    EXPECT_EQ(readAll(1920), values);
    joined.close();

    // Sound that is shorter than such a picture is filled up, and longer sound is cut.
    joined.clearSegments();
    for (const double end : {0.3, 0.9}) {
        std::vector<QvIStream> streams{{&a, 1, 0}, {&a, 2, 0}};
        streams[0].params.setInOutPoints({frameTime(5, f25), frameTime(10, f25)});
        streams[1].params.setInOutPoints({MediaTime(0.2), MediaTime(end)});
        ASSERT_EQ(insert(streams), 0);
    }
    ASSERT_EQ(joined.open(), 0);
    EXPECT_NE(failureOf([&] { joined.setParam("smartRenderingOn", Pair(1, 0)); }), "no failure");
    values = counting(9600, 4800);
    add(values, std::vector<int>(4800, 0));
    add(values, counting(9600, 9600));
    for (const int block : {1000, 1920}) {
        joined.seekToSample(0, 0);
        EXPECT_EQ(readAll(block), values);
    }
    joined.close();

    // Filters would be passed by, and so would a source that can't.
    VideoJobDescription other = picture(f50);
    joined.clearOutputStreams(1);
    joined.addOutputVideoStream(other);
    ASSERT_EQ(joined.open(), 0);
    answer = Pair(1, 0);
    joined.getParam("srParams", answer);
    EXPECT_FALSE(answer.isDict());
    for (const Pair wrong : {Pair(1, 1), Pair(2, -1), Pair(4, 0)}) {
        answer = wrong;
        joined.getParam("srParams", answer);
        EXPECT_FALSE(answer.isDict());
    }
}

TEST_F(BatchDecoder, AnswersAsADecoderDoes) {
    joined.addOutputVideoStream(picture(f29, 64, 32));
    joined.addOutputAudioStream(sound(44100, 2, 24));
    auto& a = static_cast<Source&>(source(60, f29, 64, 32).audio(88200, 44100));
    ASSERT_EQ(insert(a), 0);
    EXPECT_STREQ(joined.name(), "batchdec");
    const struct {
        const char* name;
        Any answer;
    } rows[] = {
        {"displayName", "Batch decoder"},
        {"typeName", "batch"},
        {"filename", "N/A"},
        {"decoder_name", "n/a"},
        {"currentSegment", 0},
        {"notSeekable", 0},
        {"video0/width", 64},
        {"video0/height", 32},
        {"video0/framerate", f29},
        {"video0/frames", 60},
        {"video0/pixelAspect", 1.0},
        {"video0/frameAspect", 2.0},
        {"video0/codec", "GRAY"},
        {"video0/FOURCC", static_cast<int>(QvFourcc::GRAY)},
        {"video0/duration", 2.002},
        {"video0/_selected", 1},
        {"audio0/samplerate", 44100},
        {"audio0/channels", 2},
        {"audio0/bitsPerSample", 24},
        {"audio0/bytesPerSample", 3},
        {"audio0/samples", 88288LL},  // as long as the picture
        {"audio0/duration", 88288 / 44100.0},
        {"audio0/aDuration", 88288 / 44100.0},
        {"audio0/_selected", 1},
    };
    for (const auto& row : rows) {
        const Any answer = joined.QvCodec::getParam(row.name);
        if (row.answer.isFloat())
            EXPECT_NEAR(answer.toDouble(), row.answer.asDouble(), 1e-9) << row.name;
        else if (row.answer.isInt())
            EXPECT_EQ(answer.toInt64(), row.answer.toInt64()) << row.name;
        else
            EXPECT_EQ(answer, row.answer) << row.name;
    }
    EXPECT_EQ(joined.nrSamples(0), 88200) << "of the source";
    EXPECT_TRUE(joined.QvCodec::getParam("video1").asDict().empty());
    a.extra.set("notSeekable", 1);
    EXPECT_TRUE(joined.QvCodec::getParam("notSeekable").isTrue());
    for (const char* ignored : {"FOURCC", "fastAccess", "subpicMode", "subpicOverlay"})
        EXPECT_EQ(joined.setParam(ignored, 1), 0);
    EXPECT_NE(failureOf([&] { joined.setParam("width", 1); }), "no failure");
    EXPECT_EQ(joined.nrStreams(1), 1);
    EXPECT_EQ(joined.nrStreams(2), 1);
    EXPECT_EQ(joined.nrStreams(0), 2);
    EXPECT_EQ(joined.nrStreams(4), 0);
    EXPECT_TRUE(joined.isSelected(4, 9));
    EXPECT_NE(failureOf([&] {
                  AnyDict dict;
                  joined.selected(dict);
              }),
              "no failure");
}

TEST_F(BatchDecoder, SegmentsThatDoNotFitAreRefused) {
    joined.addOutputVideoStream(picture(f25));
    joined.addOutputAudioStream(sound(48000));
    auto& a = static_cast<Source&>(source(50, f25).audio(96000, 48000));
    std::vector<QvIStream> streams{{&a, 2, 0}};
    EXPECT_EQ(insert(streams), -1);
    EXPECT_STREQ(joined.errorDesc(), "Invalid number of video streams in segment.");
    streams = {{&a, 1, 0}};
    EXPECT_EQ(insert(streams), -1);
    EXPECT_STREQ(joined.errorDesc(), "Invalid number of audio streams in segment.");
    EXPECT_EQ(failureOf([&] {
                  insert(a, 3, {MediaTime(1.0), MediaTime(1.0)});
              }),
              "insertSegment: invalid segment.inOutPoints, duration = 0");
    streams = {{nullptr, 1, 0}, {&a, 2, 0}};
    EXPECT_EQ(insert(streams), -1);
    EXPECT_EQ(insert(a, 3, InOutPoints(), 1), QvStatus::invalidArgument);
    EXPECT_EQ(joined.nrFrames(0), 0);
    LogCapture log;
    EXPECT_EQ(insert(a, 3, {MediaTime(0.0), MediaTime(9.0)}), 0);
    EXPECT_TRUE(
        log.contains("specified duration of 9.000000 s exceeds stream duration of 2.000000 s, reducing."));
    EXPECT_EQ(joined.nrFrames(0), 50);
    EXPECT_EQ(insert(a, 3, {MediaTime(1.0), MediaTime(1.2)}, 0), 0);
    ASSERT_EQ(joined.open(), 0);
    EXPECT_EQ(insert(a), QvStatus::illegalState);
    run(f25, 48000);
    EXPECT_EQ(shown.size(), 55U);
    EXPECT_EQ(shown[0], (Shown{1, 25}));
}

TEST_F(BatchDecoder, FailuresEndTheReadWithTheirReason) {
    joined.addOutputVideoStream(picture(f25));
    joined.addOutputAudioStream(sound(48000));
    auto& a = static_cast<Source&>(source(3, f25).audio(9600, 48000));
    auto& b = static_cast<Source&>(source(5, f25).audio(9600, 48000));
    ASSERT_EQ(insert(a), 0);
    ASSERT_EQ(insert(b), 0);
    ASSERT_EQ(joined.open(), 0);
    b.failAt = 2;
    for (int i = 0; i < 5; ++i) ASSERT_EQ(joined.readFrame(0), 0);
    EXPECT_EQ(joined.readFrame(0), -1);
    EXPECT_STREQ(joined.errorDesc(), "the disc is gone");
    b.failSound = true;
    EXPECT_EQ(joined.readSamples(10, 0), -1);
    EXPECT_STREQ(joined.errorDesc(), "the sound is gone");
    joined.close();
    EXPECT_EQ(joined.readFrame(0), QvStatus::illegalState);
    EXPECT_EQ(joined.readSamples(1, 0), QvStatus::illegalState);

    // A source that ends before its out point gives way to the next one.
    b.failAt = -1;
    b.failSound = false;
    a.truncatedAt = 1;
    ASSERT_EQ(joined.open(), 0);
    run(f25, 48000);
    EXPECT_EQ(shown, (std::vector<Shown>{{1, 0}, {2, 0}, {2, 1}, {2, 2}, {2, 3}, {2, 4}}));
    joined.close();
    b.seekResult = -1;
    ASSERT_EQ(joined.open(), 0);
    ASSERT_EQ(joined.readFrame(0), 0);
    EXPECT_EQ(joined.readFrame(0), -1) << "the second segment can't be reached";
    joined.close();

    // What can't be converted is known before anything is read.
    b.seekResult = 0;
    b.video.set("framerate", QvFramerate(QvRatio(200, 1)));
    const int opened = joined.open();
    EXPECT_EQ(opened, -1);
    EXPECT_STREQ(joined.errorDesc(), "Failed to open video process pipe");
    EXPECT_EQ(a.chosen.size() + b.chosen.size(), 0U);
}

}  // namespace
