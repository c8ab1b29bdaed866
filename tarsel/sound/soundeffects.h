// What changes a sound: options as the stored states of filters.
#pragma once

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include <qvplugcore/qvplugcore.h>

// Gains of --volume, in dB.
class Volumes {
  public:
    // `sound`: among those of the output.
    double of(int sound) const;
    // The highest sound that is named; -1 for none.
    int highest() const;

  private:
    friend Volumes parseVolumes(const std::vector<std::string>& given);
    double all_ = 0;
    std::vector<std::pair<int, double>> each_;
};

// Each "DB" or "a:N=DB". Throws Failure (usage).
Volumes parseVolumes(const std::vector<std::string>& given);

// What --normalize brings a sound to.
struct SoundTarget {
    std::string mode;  // of the filter: "loudness", "peak", "rms"
    double level = 0;  // LUFS for the loudness, otherwise dBFS
};
// "true" for the default, "LEVEL" or "MODE:LEVEL". Throws Failure (usage).
SoundTarget parseTarget(const std::string& text);

// "TIME" or "-TIME", an hour at most. Throws Failure (usage).
MediaTime parseDelay(const std::string& text, const std::optional<QvFramerate>& rate);

// A sound of more channels would lose the others.
constexpr int kMostVolumeChannels = 8;
AnyDict volumeState(double decibels);
// Any gain, precisely: one state or several in a row.
std::vector<AnyDict> gainStates(double decibels);
AnyDict delayState(const MediaTime& delay);  // to the millisecond
AnyDict normalizerState(const SoundTarget& target);

// A fade in at the start of a sound, and one out at its end.
struct SoundFade {
    double in = 0, out = 0;  // seconds
    double length = 0;       // of the whole sound
};
// Of a sound of up to 8 channels.
AnyDict soundFadeState(const SoundFade& fade, int channels);
