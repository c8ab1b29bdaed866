// Frames, samples and clock time.
#pragma once

class QvFramerate;

// Frame number, truncated, at a time in ticks of a 27 MHz clock. `rate` is made a fraction with a denominator
// below 10000; 0 if it has none.
long long qvFrameAtPts(long long pts, double rate);

// Truncated. 0 for a rate of 0.
long long qvSamplesForFrames(int frames, const QvFramerate& rate, int samplerate);

// Truncated; hours beyond an int are its largest. Parts of a negative time are negative.
void qvClockTime(double seconds, int& h, int& m, int& s);
void qvClockTimeMs(long long milliseconds, int& h, int& m, int& s, int& ms);
