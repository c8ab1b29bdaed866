// What the user sets an output's encoders to, whichever they are.
#pragma once

#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <qvplugcore/qvplugcore.h>

// Texts are as they were given; empty when they were not.
struct EncoderOptions {
    using Settings = std::vector<std::pair<std::string, std::string>>;

    // The first one that asks something of the encoders of this type of stream; empty for none.
    std::string given(int type) const;
    // What is asked of them, for plans: "crf 20, tune film, two passes".
    std::string text(int type) const;
    // Throws Failure (usage) for options that exclude each other.
    void check() const;

    bool sets(std::string_view name) const;  // of the encoders of the picture, by --vcodec

    std::string crf, bitrate, audioBitrate;
    bool twoPass = false;
    Settings video, audio;  // of --vcodec and --acodec
};

// A bit rate: "800k", "5M", "1.5M", or bits a second. Throws Failure (usage).
int parseBitrate(const std::string& text, const std::string& option);

// Sets an encoder of a type. `output`: for messages. Throws Failure for what it does not have, or does not
// take. Bit rates of sound are left to setSoundRate.
void setEncoder(QvEncoder& encoder, int type, const EncoderOptions& options, const std::string& output);
// Which bit rates of sound there are depends on its format, which the encoder has by now. Throws Failure.
void setSoundRate(QvEncoder& encoder, const EncoderOptions& options);
// Throws Failure for an encoder of the picture that is left with neither a quality nor a bit rate.
void checkQuality(const QvEncoder& encoder);
