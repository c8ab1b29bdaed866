// What a WAV says about its sound, on its way into the WAV that is written.
#pragma once

#include <string>

#include <qvplugcore/qvplugcore.h>

class Source;

// A part of an audio stream, and the format that it is written in.
struct WavPart {
    long long first = 0;     // sample of the source; below 0: that many of silence come before it
    long long samples = -1;  // of the source; negative: all of them
    int samplerate = 0, channels = 0, bits = 0;
    bool changed = false;            // by filters or other channels
    bool isRf64 = false;             // the file is so large that its header has no room for a channel mask
    bool isFilm = false;             // the output has the texts of "LIST" as its own
    const AnyDict* words = nullptr;  // that the output gets in the place of these; null: it keeps them
};

// Gives words and marks of the source to the stream that writes the WAV; null for an output that has no room
// for them. What is lost, as "smpl and iXML"; empty if nothing is.
std::string carryWavChunks(const Source& source, int stream, const WavPart& part, QvBufStream* output);

// From now on samples of from..to-1 are counted, if the source can tell where they are.
void countClippedWithin(const Source& source, long long from, long long to);
// Samples that were clipped while the stream was read.
long long clippedSamples(const Source& source, int stream);
