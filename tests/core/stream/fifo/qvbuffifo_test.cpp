#include "core/stream/fifo/qvbuffifo.h"

#include <gmock/gmock.h>

#include <deque>
#include <random>

#include "core/engine/status.h"
#include "tests/core/stream/streamtools.h"

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
template <class Fifo = QvBufStreamFifo>
void driveAgainstModel(unsigned size, unsigned chunk, int steps, unsigned seed) {
    Fifo fifo;
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
    driveAgainstModel<QvBufFifoDbg>(61, 17, 2000, 6);
}

TEST_F(Ring, ANewSizeThrowsAwayWhatIsIn) {
    put(in, "abc");
    ASSERT_EQ(fifo.resize(40, 11), 0);
    EXPECT_EQ(usable(fifo.output()), 0u);
    EXPECT_EQ(usable(fifo.input()), 40u);
    EXPECT_EQ(copyIn(fifo.input(), patternBytes(40)), 40u);
}

TEST(QvBufStreamFifo, SizesThatMakeNoRingAreAsserted) {
    for (const auto& [size, chunk] : {std::pair{10, 11}, {-1, 0}, {100, -1}, {-5, -5}, {0, 1}}) {
        QvBufStreamFifo fifo;
        EXPECT_THROW(fifo.init(ring(size, chunk)), QvAssertFailure) << size << " " << chunk;
        EXPECT_FALSE(fifo.inited());
    }
}

// A caller can tell want of memory from sizes that never fit.
TEST(QvBufStreamFifo, WantOfMemoryIsAnAssertionOfItsOwn) {
    NoMemory none;
    const PlatformScope scope(none);
    QvBufStreamFifo fifo;
    EXPECT_EQ(failureOf([&] { fifo.init(ring(100, 10)); }), "Fifo init failed");
    EXPECT_THROW(fifo.init(ring(100, 10)), QvMemoryFailure);
    try {
        fifo.init(ring(10, 11));
        FAIL();
    } catch (const QvMemoryFailure&) {
        FAIL() << "these sizes never fit";
    } catch (const QvAssertFailure&) {
    }
    EXPECT_FALSE(fifo.inited());
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

// Kernels that commit more than they were given, or twice, must not reach past the ring.
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
    ASSERT_EQ(fifo.init(ring(100, 11)), 0);
    bufstream* in = fifo.input();
    EXPECT_EQ(tell(in, QvAuxId::SAMPLE_INFO, 1, 7), 0u);
    EXPECT_THAT(heard, testing::ElementsAre("1 SAMPLE_INFO/7/4", "2 SAMPLE_INFO/7/4"));
    EXPECT_STREQ(qvAuxInfoName(5), "?");
    heard.clear();
    struct Leaving : QvAuxInfoObserver {
        explicit Leaving(QvBufStream& from) : from_(from) {}
        void auxInfo(unsigned, unsigned, void*, unsigned) override { from_.unregisterObserver(this); }
        QvBufStream& from_;
    } leaving(fifo);
    EXPECT_EQ(fifo.unregisterObserver(&second), 0);
    fifo.registerObserver(&leaving);
    fifo.registerObserver(&second);
    tell(in, QvAuxId::SAMPLE_INFO);
    EXPECT_EQ(heard.size(), 2u) << "the one after the one that left hears as well";
    EXPECT_EQ(fifo.unregisterObserver(&leaving), QvStatus::failed);
    EXPECT_EQ(fifo.unregisterObserver(&first), 0);
    EXPECT_EQ(fifo.unregisterAllObservers(), 0);
    tell(in, QvAuxId::SAMPLE_INFO);
    EXPECT_EQ(heard.size(), 2u);

    put(in, "abc");
    fifo.flush();
    EXPECT_EQ(usable(fifo.output()), 0u);
}

class Draining : public QvBufStreamFifoCb {
  public:
    void cbProgress(int bytes) override {
        calls.push_back(bytes);
        if (refusing) throw 5;
        text += copyOut(output(), static_cast<unsigned>(bytes));
    }

    std::vector<int> calls;
    std::string text;
    bool refusing = false;
};

// What the consumer did not take stays in the ring; it is called again for new bytes, not for those that it
// refused.
TEST(QvBufStreamFifoCb, AConsumerThatThrowsIsNotCalledAgainForTheSameBytes) {
    Draining fifo;
    ASSERT_EQ(fifo.init(AnyDict("size", 100, "chunk", 21, "callback", 10)), 0);
    bufstream* in = fifo.input();
    fifo.refusing = true;
    EXPECT_THROW(put(in, "0123456789"), int);
    EXPECT_THROW(copyIn(in, "abcdefghijkl"), int);
    fifo.refusing = false;
    EXPECT_TRUE(put(in, "ABCDE"));
    EXPECT_EQ(copyIn(in, "FGHI"), 4u);
    EXPECT_THAT(fifo.calls, testing::ElementsAre(10, 12));
    EXPECT_TRUE(put(in, "J"));
    EXPECT_THAT(fifo.calls, testing::ElementsAre(10, 12, 10));
    EXPECT_EQ(fifo.text, "0123456789");
    EXPECT_EQ(copyOut(fifo.output(), 20), "abcdefghijklABCDEFGH");
}

TEST(QvBufStreamFifoCb, CallsAtTheThresholdAndStopsOnWish) {
    Draining fifo;
    ASSERT_EQ(fifo.init(ring(1004, 500)), 0);
    ASSERT_EQ(fifo.init(AnyDict("size", 400, "chunk", 201, "callback", 100)), 0);
    bufstream* in = fifo.input();
    const std::string sixty = patternBytes(60), forty = patternBytes(40);
    ASSERT_TRUE(put(in, sixty));
    EXPECT_TRUE(fifo.calls.empty());
    ASSERT_EQ(copyIn(in, forty), 40u);
    EXPECT_THAT(fifo.calls, testing::ElementsAre(100));
    for (int i = 0; i < 100; ++i) ASSERT_TRUE(put(in, patternBytes(99, static_cast<unsigned>(i)))) << i;
    EXPECT_EQ(fifo.text.substr(0, 100), sixty + forty);

    qv_log()->clear();
    fifo.stopProcessing();
    EXPECT_EQ(qv_log()->nrErrors(), 1);
    EXPECT_FALSE(in->request(in, 1));
    EXPECT_EQ(copyIn(in, "x"), 0u);
    ASSERT_EQ(fifo.init(), 0);
    EXPECT_TRUE(put(fifo.input(), "x")) << "a new start";
}

}  // namespace
