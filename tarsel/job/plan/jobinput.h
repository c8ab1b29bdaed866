// What a plan has to know of an input. It is read once, when the input has been opened.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "tarsel/picture/picture.h"
#include "tarsel/source/source.h"

struct SoundFormat {
    int samplerate = 0;  // samples a second
    int channels = 0;
    int bits = 0;
};

struct InputStream {
    int type = qvVideoStream;  // or qvAudioStream
    long long units = 0;       // frames or samples
    PictureFormat picture;     // of video
    SoundFormat sound;         // of audio
    std::string language, title;

    // Frames or samples a second.
    QvRatio rate() const;
    // The first instant after the last frame or sample.
    MediaTime end() const { return qvInstantOf(units, rate()); }
};

struct JobInput {
    std::string name;
    std::string damage;    // see Source::damage
    double duration = -1;  // seconds of the longest stream; negative when unknown
    std::vector<InputStream> video, audio;
    AnyDict meta;         // metadata, see filmtags.h
    bool joined = false;  // its one sound consists of the channels of other inputs, for --map
    bool joins = false;   // such an input has channels of this one

    const std::vector<InputStream>& streams(int type) const { return type == qvVideoStream ? video : audio; }
    // Of the first video stream.
    std::optional<QvFramerate> frameRate() const;
};

JobInput readInput(const Source& source);
