// Stops, pauses and resumes of a job on a worker, at random moments and from several threads.
#include <chrono>
#include <random>
#include <thread>

#include "builtin/modules.h"
#include "tests/core/transcode/transcode_fixture.h"
#include "tests/support/fake_filters.h"

namespace {

#if defined(__has_feature)
#if __has_feature(thread_sanitizer)
#define QV_FEWER_ROUNDS
#endif
#elif defined(__SANITIZE_THREAD__)
#define QV_FEWER_ROUNDS
#endif
#ifdef QV_FEWER_ROUNDS
constexpr unsigned rounds = 100;
#else
constexpr unsigned rounds = 1000;
#endif

constexpr int samplesPerFrame = 1920;

class RandomStops : public testing::Test {
  protected:
    RandomStops() { plugin.audio("aquant").add(new QvAfModule); }
    FakePlugin plugin;
};

// None, a moment, or long enough for some frames.
void waitAWhile(std::mt19937& random) {
    const unsigned kind = static_cast<unsigned>(random() % 3);
    if (kind == 1) std::this_thread::yield();
    if (kind == 2) std::this_thread::sleep_for(std::chrono::microseconds(random() % 300));
}

void pauseAndResume(QvTranscoder& t, std::mt19937& random) {
    for (auto left = random() % 6; left > 0; --left) {
        waitAWhile(random);
        random() % 2 == 0 ? t.pause() : t.unpause();
    }
}

TEST_F(RandomStops, EachRunEndsAndTheNextOneBegins) {
    for (unsigned round = 0; round < rounds && !HasFailure(); ++round) {
        SCOPED_TRACE(round);
        std::mt19937 random(round);
        // A short job may end by itself, while it is being stopped or paused.
        const bool isShort = random() % 4 == 0;
        const int frames = isShort ? 1 + static_cast<int>(random() % 20) : 1000000;
        LinkedJob job(frames);
        job.beQuiet();
        QvTranscoder& t = job.t;
        const int runs = 1 + static_cast<int>(random() % 2);
        for (int run = 0; run < runs; ++run) {
            job.events.take();
            job.pipe.video.numbers.clear();
            job.pipe.sound->total = 0;
            ASSERT_EQ(t.transcode(false), 0);
            std::thread other;
            if (random() % 3 == 0)
                other = std::thread([&t, seed = random()] {
                    std::mt19937 own(seed);
                    pauseAndResume(t, own);
                    if (own() % 2 == 0) t.stop();
                });
            pauseAndResume(t, random);
            waitAWhile(random);
            t.stop();
            if (other.joinable()) other.join();
            EXPECT_EQ(t.getState(), QvTranscoder::connected);
            EXPECT_FALSE(t.isTranscoding());
            EXPECT_STREQ(t.errorDesc(), "");

            const std::string events = job.events.take();
            EXPECT_TRUE(events.ends_with("close done1") || (isShort && events.ends_with("close done0")))
                << events;
            EXPECT_EQ(events.find("done"), events.rfind("done")) << events;
            EXPECT_EQ(events.find("abort"), events.npos) << events;
            const auto& numbers = job.pipe.video.numbers;
            for (size_t i = 0; i < numbers.size(); ++i) ASSERT_EQ(numbers[i], static_cast<int>(i));
            const long long written = static_cast<long long>(numbers.size()) * samplesPerFrame;
            EXPECT_LE(job.pipe.sound->total, written);
            EXPECT_GE(job.pipe.sound->total, written - samplesPerFrame)
                << "the sound of the last frame alone may lack";
            if (events.ends_with("done0")) {
                EXPECT_EQ(numbers.size(), static_cast<size_t>(frames));
                EXPECT_EQ(job.pipe.sound->total, written);
            }
            t.unpause();  // of no run, for the next one
        }
    }
}

}  // namespace
