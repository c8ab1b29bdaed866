// SMPTE timecode.
#pragma once

#include "core/arch/api.h"

class QvFramerate;

class QV_API QvTimecode {
  public:
    static constexpr int textSize = 48;  // what pprint needs at most, with its terminating zero

    constexpr QvTimecode() = default;
    constexpr QvTimecode(int h, int m, int s, int f, bool df = false, bool field = false)
        : hours_(h), minutes_(m), seconds_(s), frames_(f), field_(field), df_(df) {}

    // Reads "HH:MM:SS:FF". A ";" anywhere stands for ":" and makes it drop frame. Text without exactly four
    // parts, or null, reads as all zeros (df may be set).
    explicit QvTimecode(const char* text);

    // Of a frame number; with countFields it counts fields, and the rate's frames are pairs of them.
    // Drop frame as the rate says; hours wrap at 24. A rate of zero gives zeros.
    QvTimecode(int frameNr, const QvFramerate& rate, bool countFields);

    int hours() const { return hours_; }
    int minutes() const { return minutes_; }
    int seconds() const { return seconds_; }
    int frames() const { return frames_; }
    bool field() const { return field_; }  // the second field of the frame is meant
    bool df() const { return df_; }

    // The way back. The rate decides about drop frame, not this timecode.
    int frameNr(const QvFramerate& rate, bool countFields) const;

    // The frame number, without fields, over the display rate; 0.0 if that is zero. The second argument has
    // no effect.
    double seconds(const QvFramerate& rate, bool countFields) const;

    // "HH:MM:SS:FF", or with ";" at all three places; dst holds at least textSize characters.
    void pprint(char* dst, bool semicolons) const;

    bool operator==(const QvTimecode&) const = default;

  private:
    int hours_ = 0;
    int minutes_ = 0;
    int seconds_ = 0;
    int frames_ = 0;
    bool field_ = false;
    bool df_ = false;

    long long frameCount(const QvFramerate& rate, long long fps) const;
};
