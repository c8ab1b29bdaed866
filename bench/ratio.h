// Ratios that are measured in one run: ours and a peer's take turns, so both see the same machine.
//
//     QvRatioBench bench("frame copy");
//     bench.compare("QvFrame copy : memcpy", 1.1, [&] { a = b; }, [&] { memcpy(p, q, n); });
//
// Each side runs in rounds of some milliseconds under Google Benchmark's clock rules; the best round of each
// counts, since noise only ever adds. What is printed: our time, the peer's, the ratio and the aim.
//
// Work of one thread is measured by that thread's processor time: by the wall clock a busy machine made
// ratios of 0.2 to 9 out of the same two pieces of work.
#pragma once

#include <algorithm>
#include <cstdio>
#include <functional>
#include <limits>
#include <string>

#include <time.h>

#include <benchmark/benchmark.h>

enum class QvBenchClock { wall, thread };

inline double qvBenchSeconds(QvBenchClock clock) {
    timespec now{};
    clock_gettime(clock == QvBenchClock::wall ? CLOCK_MONOTONIC : CLOCK_THREAD_CPUTIME_ID, &now);
    return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) * 1e-9;
}

class QvRatioBench {
  public:
    explicit QvRatioBench(const char* title, QvBenchClock clock = QvBenchClock::wall) : clock_(clock) {
        std::printf("%s\n%-58s %12s %12s %8s %6s\n", title, "", "ours", "peer", "ratio", "aim");
    }

    // Runs both sides in turn, each at least `rounds` times. `scale`: how much of our work is one of the
    // peer's. Returns the ratio.
    double compare(const std::string& name, double aim, const std::function<void()>& ours,
                   const std::function<void()>& peer, int rounds = 7) {
        const int oursLoops = loopsFor(ours), peerLoops = loopsFor(peer);
        double oursBest = std::numeric_limits<double>::max(), peerBest = oursBest;
        for (int i = 0; i < rounds; ++i) {
            oursBest = std::min(oursBest, timeOf(ours, oursLoops));
            peerBest = std::min(peerBest, timeOf(peer, peerLoops));
        }
        const double ratio = oursBest / peerBest;
        std::printf("%-58s %12s %12s %8.2f %6.2f%s\n", name.c_str(), text(oursBest).c_str(),
                    text(peerBest).c_str(), ratio, aim, ratio <= aim ? "" : "  above");
        std::fflush(stdout);
        return ratio;
    }

    // A figure without a peer.
    static void tell(const std::string& name, double value, const char* unit) {
        std::printf("%-58s %12.2f %s\n", name.c_str(), value, unit);
    }

  private:
    double timeOf(const std::function<void()>& work, int loops) const {
        const double begin = qvBenchSeconds(clock_);
        for (int i = 0; i < loops; ++i) {
            work();
            benchmark::ClobberMemory();
        }
        return (qvBenchSeconds(clock_) - begin) / loops;
    }

    // Enough loops for about 20 ms.
    int loopsFor(const std::function<void()>& work) const {
        work();
        const double once = std::max(timeOf(work, 1), 1e-9);
        return std::clamp(static_cast<int>(0.02 / once), 1, 10000000);
    }

    static std::string text(double seconds) {
        char buffer[32];
        if (seconds < 1e-6)
            std::snprintf(buffer, sizeof buffer, "%.2f ns", seconds * 1e9);
        else if (seconds < 1e-3)
            std::snprintf(buffer, sizeof buffer, "%.2f us", seconds * 1e6);
        else
            std::snprintf(buffer, sizeof buffer, "%.3f ms", seconds * 1e3);
        return buffer;
    }

    const QvBenchClock clock_;
};
