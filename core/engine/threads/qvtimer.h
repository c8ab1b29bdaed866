// Time for measuring and for log lines. Not for dates, see core/measure/datetime.h.
#pragma once

#include <memory>

#include "core/arch/api.h"

class QV_API QvTimer {
  public:
    QvTimer();  // starts
    ~QvTimer();
    QvTimer(const QvTimer&) = delete;
    QvTimer& operator=(const QvTimer&) = delete;

    void start();
    double stop();  // seconds since start; the timer runs on

    // Seconds since the first call in this process, in whole milliseconds.
    static double time();
    // Seconds of the system's counter, which never goes back; its origin is arbitrary.
    static double absoluteTime();

    enum Format : unsigned { sm = 0x736D, msm = 0x6D736D, hmsm = 0x686D736D };

    // Writes `seconds`, rounded to the nearest millisecond, with its zero; numbers ignore the locale:
    //     sm "3661.500"   msm "61:01.500"   hmsm "1:01:01.500"
    // Another format leaves the buffer unchanged. The buffer needs `strtimeSize` characters. Times beyond
    // 100,000,000,000 s are written as that much, NaN as 0.
    static void strtime(char* buffer, double seconds, unsigned format);
    static constexpr int strtimeSize = 32;

  private:
    struct Counter;
    std::unique_ptr<Counter> counter_;
};
