#include "core/stream/qvbuffifo.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <deque>
#include <random>

#include "streamtools.h"

namespace {

AnyDict ring(int size, int chunk) { return AnyDict("size", size, "chunk", chunk); }

// A FIFO of 16 bytes in blocks of 8.
struct Ring : testing::Test {
    void SetUp() override {
        fifo.init(ring(16, 9));
        in = fifo.input();
        out = fifo.output();
    }
    QvBufStreamFifo fifo;
    bufstream *in, *out;
};

// Any order of the four ways in and out against a queue. Writers keep one byte free, as they must.
void driveAgainstModel(unsigned size, unsigned chunk, int steps, unsigned seed) {
    QvBufStreamFifo fifo;
    ASSERT_EQ(fifo.init(ring(static_cast<int>(size), static_cast<int>(chunk))), 0);
    bufstream *const in = fifo.input(), *const out = fifo.output();
    std::deque<unsigned char> model;
    std::mt19937 random(seed);
    const auto below = [&](unsigned limit) { return static_cast<unsigned>(random() % (limit + 1)); };
    unsigned char next = 0;
    std::vector<unsigned char> scratch(size + chunk);
    const auto fill = [&](unsigned char* to, unsigned n) {
        for (unsigned i = 0; i < n; ++i) model.push_back(to[i] = next++);
    };
    const auto isNext = [&](const unsigned char* p, unsigned n) {
        return std::equal(p, p + n, model.begin());
    };

    for (int step = 0; step < steps; ++step) {
        ASSERT_EQ(usable(out), model.size()) << "step " << step;
        const unsigned free = usable(in), way = random() % 4;
        ASSERT_LE(free, size);
        if (way == 0) {
            const unsigned n = below(chunk + 2);
            unsigned char* const block = in->request(in, n);
            ASSERT_TRUE(block || n >= free || n >= chunk) << "step " << step << " write " << n;
            if (!block || n >= usable(in)) continue;
            const unsigned m = random() % 4 ? n : below(n);
            fill(block, m);
            ASSERT_EQ(in->confirm(in, m), m);
        } else if (way == 1) {
            const unsigned n = below(std::min(free ? free - 1 : 0, size / 3));
            fill(scratch.data(), n);
            ASSERT_EQ(in->copybytes(in, scratch.data(), n), n);
        } else if (way == 2) {
            const unsigned n = below(chunk);
            const unsigned char* const block = out->request(out, n);
            ASSERT_TRUE(block ? n <= model.size() && isNext(block, n) : n > model.size() || n >= chunk)
                << "step " << step << " read " << n;
            const unsigned m = !block ? 0 : random() % 4 ? n : below(n);
            ASSERT_TRUE(!block || out->confirm(out, m) == m);
            model.erase(model.begin(), model.begin() + m);
        } else {
            const unsigned n = below(chunk - 1), got = out->copybytes(out, scratch.data(), n);
            ASSERT_EQ(got, n <= model.size() ? n : 0);
            ASSERT_TRUE(isNext(scratch.data(), got)) << "step " << step;
            model.erase(model.begin(), model.begin() + got);
        }
    }
}

TEST(QvBufStreamFifo, IsAQueueWhateverTheOrderOfOperations) {
    driveAgainstModel(61, 17, 400'000, 1);
    driveAgainstModel(40, 40, 250'000, 2);
    driveAgainstModel(1000, 11, 200'000, 3);
    driveAgainstModel(256, 129, 150'000, 4);
    driveAgainstModel(3, 2, 50'000, 5);
}

TEST(QvBufStreamFifo, DefaultsAreStoredAndResizeStartsAnew) {
    QvBufStreamFifo fifo;
    EXPECT_THROW(fifo.input(), QvAssertFailure);
    EXPECT_THROW(fifo.output(), QvAssertFailure);
    ASSERT_EQ(fifo.init(), 0);
    EXPECT_TRUE(fifo.size() == 2'097'152 && fifo.getParam("chunk") == 262'145);
    bufstream* in = fifo.input();
    EXPECT_TRUE(in->chunksize(in) == 262'144u && fifo.output()->chunksize(fifo.output()) == 262'144u);
    EXPECT_TRUE(usable(in) == 2'097'152u && in->flags == 1 && !in->split && !in->free && !in->state);
    in->done(in, 0);
    EXPECT_TRUE(put(in, "lost"));
    ASSERT_EQ(fifo.resize(1000, 11), 0);
    EXPECT_EQ(fifo.input()->chunksize(fifo.input()), 10u);
    EXPECT_TRUE(usable(fifo.output()) == 0 && usable(fifo.input()) == 1000);
    fifo.destroy(0);
    EXPECT_FALSE(fifo.inited());
    EXPECT_THROW(fifo.output(), QvAssertFailure);
}

TEST(QvBufStreamFifo, SizesThatMakeNoRingAreAsserted) {
    for (const auto& [size, chunk] : {std::pair{10, 11}, {-1, 0}, {100, -1}, {-5, -5}, {0, 1}}) {
        QvBufStreamFifo fifo;
        EXPECT_THROW(fifo.init(ring(size, chunk)), QvAssertFailure) << size << " " << chunk;
        EXPECT_FALSE(fifo.inited());
    }
    QvBufStreamFifo empty;
    ASSERT_EQ(empty.init(ring(0, 0)), 0);
    EXPECT_FALSE(empty.input()->request(empty.input(), 1));
    EXPECT_FALSE(empty.output()->request(empty.output(), 1));
}

TEST_F(Ring, ABlockOverTheEndIsContiguousForBothSides) {
    ASSERT_TRUE(put(in, "0123456789ab"));
    EXPECT_EQ(take(out, 8), "01234567");
    ASSERT_TRUE(put(in, "ABCDEFG"));  // 4 bytes to the end, 3 from the start on
    EXPECT_EQ(take(out, 4), "89ab");
    EXPECT_EQ(take(out, 7), "ABCDEFG");
    EXPECT_EQ(usable(out), 0u);
    EXPECT_FALSE(out->request(out, 1));
}

TEST_F(Ring, CopyingInTakesTheLastByteAndRequestsDoNot) {
    ASSERT_EQ(copyIn(in, "0123456789abcdef"), 16u);
    ASSERT_EQ(take(out, 8), "01234567");
    ASSERT_EQ(copyIn(in, "xy"), 2u);  // now the data wraps and 6 bytes are free
    ASSERT_EQ(usable(in), 6u);
    EXPECT_FALSE(in->request(in, 6));
    EXPECT_TRUE(in->request(in, 5));
    EXPECT_EQ(copyIn(in, "abcdefgh"), 6u);
    EXPECT_EQ(usable(out), 0u) << "a ring filled to the last byte reads as empty";
}

// Kernels that commit more than they were given, or twice, must not reach behind the ring.
TEST_F(Ring, CommitsAreBoundedByTheBlock) {
    EXPECT_FALSE(in->request(in, 17));
    EXPECT_EQ(in->confirm(in, 5), 0u) << "without a block";
    ASSERT_TRUE(in->request(in, 4));
    EXPECT_EQ(in->confirm(in, 1'000'000), 16u);
    EXPECT_EQ(in->confirm(in, 1), 0u) << "twice";
    EXPECT_EQ(out->confirm(out, 1'000'000), 16u);
    EXPECT_EQ(out->confirm(out, 1), 0u);

    ASSERT_TRUE(put(in, "abc"));
    ASSERT_EQ(take(out, 1), "a");
    ASSERT_TRUE(in->request(in, 2));
    ASSERT_EQ(copyIn(in, "d"), 1u);
    EXPECT_EQ(in->confirm(in, 2), 0u) << "the block is void after a copy";
    EXPECT_EQ(copyOut(out, 3), "bcd");
    EXPECT_EQ(copyOut(out, 1), "");
}

TEST(QvBufStreamFifo, FlushThrowsAwayAndObserversHearInOrder) {
    QvBufStreamFifo fifo;
    std::vector<std::string> heard;
    HeardItems first(heard, "1 "), second(heard, "2 ");
    EXPECT_EQ(fifo.unregisterObserver(&first), -1);
    EXPECT_EQ(fifo.registerObserver(&first), 0);
    EXPECT_EQ(fifo.registerObserver(&second), 0);
    LogCapture log;
    EXPECT_EQ(fifo.registerObserver(&first), -1);
    EXPECT_TRUE(log.contains("Observer already registered!!"));
    ASSERT_EQ(fifo.init(ring(100, 11)), 0);
    bufstream* in = fifo.input();
    EXPECT_EQ(tell(in, QvAuxId::SAMPLE_INFO, 1, 7), 0u);
    EXPECT_THAT(heard, testing::ElementsAre("1 SAMPLE_INFO/7/4", "2 SAMPLE_INFO/7/4"));
    EXPECT_EQ(fifo.unregisterObserver(&first), 0);
    EXPECT_EQ(fifo.observers()->size(), 1);
    EXPECT_EQ(fifo.unregisterAllObservers(), 0);
    tell(in, QvAuxId::SAMPLE_INFO);
    EXPECT_EQ(heard.size(), 2u);

    put(in, "abc");
    fifo.flush();
    EXPECT_EQ(usable(fifo.output()), 0u);
}

TEST(QvBufStream, ParametersStay) {
    QvBufStreamFifo fifo;
    EXPECT_TRUE(!fifo.getParam("size").isValid() && fifo.size() == 0);
    EXPECT_EQ(fifo.setParamDict(AnyDict("size", 50, "chunk", 5, "other", "x")), 0);
    fifo.reset();
    EXPECT_FALSE(fifo.inited()) << "reset is for streams that have been inited";
    ASSERT_EQ(fifo.init(), 0);
    put(fifo.input(), "abc");
    fifo.reset();
    EXPECT_TRUE(usable(fifo.output()) == 0 && fifo.getParam("other") == "x" && fifo.enabled());
    fifo.setEnabled(false);
    EXPECT_FALSE(fifo.enabled());
    fifo.lock();
    fifo.lock();
    fifo.unlock();
    fifo.unlock();
}

class Draining : public QvBufStreamFifoCb {
  public:
    void cbProgress(int bytes) override {
        calls.push_back(bytes);
        if (drain) text += copyOut(output(), static_cast<unsigned>(bytes));
    }
    void cbAuxinfo(unsigned, unsigned id, void*, unsigned) override { ids.push_back(id); }

    std::vector<int> calls;
    std::vector<unsigned> ids;
    std::string text;
    bool drain = true;
};

TEST(QvBufStreamFifoCb, CallsAtTheThresholdAndStopsOnWish) {
    Draining fifo;
    ASSERT_EQ(fifo.init(ring(1004, 500)), 0);
    EXPECT_EQ(fifo.getParam("callback"), Any(200)) << "a fifth of the ring";
    ASSERT_EQ(fifo.init(AnyDict("size", 400, "chunk", 201, "callback", 100)), 0);
    bufstream* in = fifo.input();
    const std::string sixty = pattern(60), forty = pattern(40);
    ASSERT_TRUE(put(in, sixty));
    EXPECT_TRUE(fifo.calls.empty());
    ASSERT_EQ(copyIn(in, forty), 40u);
    EXPECT_THAT(fifo.calls, testing::ElementsAre(100));
    for (int i = 0; i < 100; ++i) ASSERT_TRUE(put(in, pattern(99, static_cast<unsigned>(i)))) << i;
    EXPECT_EQ(fifo.text.substr(0, 100), sixty + forty);
    EXPECT_EQ(tell(in, QvAuxId::STREAM_END_CODE), 0u);
    EXPECT_THAT(fifo.ids, testing::ElementsAre(unsigned{QvAuxId::STREAM_END_CODE}));
    EXPECT_EQ(fifo.registerObserver(nullptr), -10);
    EXPECT_EQ(fifo.observers(), nullptr);

    qv_log()->clear();
    fifo.stopProcessing();
    EXPECT_EQ(qv_log()->nrErrors(), 1);
    EXPECT_FALSE(in->request(in, 1));
    EXPECT_EQ(copyIn(in, "x"), 0u);
    ASSERT_EQ(fifo.init(), 0);
    EXPECT_TRUE(put(fifo.input(), "x")) << "a new start";
}

TEST(QvBufFifoDbg, LogsTrafficOnWishAndStaysAQueue) {
    LogCapture log;
    QvBufFifoDbg quiet, locked, loud;
    ASSERT_EQ(quiet.init(ring(100, 11)), 0);
    ASSERT_EQ(locked.init(AnyDict("size", 100, "chunk", 11, "global_lock", 1)), 0);
    ASSERT_EQ(loud.init(AnyDict("size", 100, "chunk", 11, "log", 1)), 0);
    EXPECT_EQ(log.count("using global lock", QvLogMask::debug), 1);
    EXPECT_EQ(log.count("logging traffic", QvLogMask::debug), 1);
    log.clear();
    for (QvBufStreamFifo* fifo : std::initializer_list<QvBufStreamFifo*>{&quiet, &locked}) {
        ASSERT_TRUE(put(fifo->input(), "abc"));
        EXPECT_EQ(take(fifo->output(), 3), "abc");
    }
    EXPECT_TRUE(log.lines().empty());
    ASSERT_TRUE(put(loud.input(), "abc"));
    ASSERT_EQ(copyIn(loud.input(), "de"), 2u);
    tell(loud.input(), QvAuxId::VIDEO_AU_CODE, 5);
    EXPECT_EQ(copyOut(loud.output(), 5), "abcde");
    EXPECT_EQ(log.count("fifow_request numSamples=3", QvLogMask::progress), 1);
    EXPECT_EQ(log.count("fifow_confirm numSamples=3, ret=3, empty=97"), 1);
    EXPECT_EQ(log.count("fifow_auxinfo id=983041 (VIDEO_AU_CODE) size=4"), 1);
    EXPECT_EQ(log.count("fifor_copybytes numSamples=5, ret=5, full=0"), 1);
}

}  // namespace
