#include "core/measure/timecode.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <limits>
#include <string>

#include "core/measure/exactmath_p.h"
#include "core/measure/qvframerate.h"

namespace {

long long wholeRate(const QvFramerate& rate) { return qvmath::truncTo<int>(std::ceil(rate.rate().ratio())); }

// Drop frame leaves out the first `drop` numbers of each minute but every tenth.
struct DropFrame {
    long long drop;
    long long minute;  // frames of a minute without a drop
    explicit DropFrame(long long fps) : drop(fps == 60 ? 4 : 2), minute(fps == 60 ? 3600 : 1800) {}
    long long tenMinutes() const { return 10 * minute - 9 * drop; }
};

int readNumber(const char* text) {
    constexpr long low = std::numeric_limits<int>::min(), high = std::numeric_limits<int>::max();
    return static_cast<int>(std::clamp(std::strtol(text, nullptr, 10), low, high));
}

}  // namespace

QvTimecode::QvTimecode(const char* text) {
    if (!text) return;
    std::string plain(text);
    df_ = plain.find(';') != std::string::npos;
    std::replace(plain.begin(), plain.end(), ';', ':');
    if (std::count(plain.begin(), plain.end(), ':') != 3) return;
    const char* part = plain.c_str();
    for (int* field : {&hours_, &minutes_, &seconds_, &frames_}) {
        *field = readNumber(part);
        while (*part && *part++ != ':') {
        }
    }
}

QvTimecode::QvTimecode(int frameNr, const QvFramerate& rate, bool countFields) : df_(rate.df()) {
    long long frame = frameNr;
    long long fps = wholeRate(rate);
    if (countFields) {
        field_ = frame % 2 != 0;
        frame /= 2;
        fps /= 2;
    }
    if (fps == 0) return;
    long long minutes = 0;
    if (df_) {
        const DropFrame count(fps);
        minutes = frame / count.tenMinutes() * 10;
        frame %= count.tenMinutes();
        if (frame > count.minute - 1) {
            // The first minute of ten is whole, each further one begins with number `drop`.
            const long long shortMinute = count.minute - count.drop;
            frame -= count.minute;
            minutes += 1 + frame / shortMinute;
            frame = frame % shortMinute + count.drop;
        }
        seconds_ = static_cast<int>(frame / fps);
    } else {
        minutes = frame / fps / 60;
        seconds_ = static_cast<int>(frame / fps % 60);
    }
    frames_ = static_cast<int>(frame % fps);
    minutes_ = static_cast<int>(minutes % 60);
    hours_ = static_cast<int>(minutes / 60 % 24);
}

long long QvTimecode::frameCount(const QvFramerate& rate, long long fps) const {
    using qvmath::Wide;
    const long long minutes = 60LL * hours_ + minutes_;
    if (!rate.df()) return qvmath::saturate(Wide(minutes * 60 + seconds_) * fps + frames_);
    const DropFrame count(fps);
    const Wide undropped = Wide(fps) * seconds_ + minutes * count.minute + frames_;
    return qvmath::saturate(undropped - (minutes - minutes / 10) * count.drop);
}

int QvTimecode::frameNr(const QvFramerate& rate, bool countFields) const {
    const long long fps = wholeRate(rate);
    if (!countFields) return static_cast<int>(frameCount(rate, fps));
    const auto frames = static_cast<unsigned>(frameCount(rate, fps / 2));
    return static_cast<int>(2 * frames + (field_ ? 1 : 0));
}

double QvTimecode::seconds(const QvFramerate& rate, bool) const {
    const double display = rate.displayRate();
    return display == 0.0 ? 0.0 : static_cast<double>(frameCount(rate, wholeRate(rate))) / display;
}

void QvTimecode::pprint(char* dst, bool semicolons) const {
    const char* format = semicolons ? "%.2d;%.2d;%.2d;%.2d" : "%.2d:%.2d:%.2d:%.2d";
    std::snprintf(dst, textSize, format, hours_, minutes_, seconds_, frames_);
}
