// The preset that a pipe follows, and the modules that it allows together with the pipe's multiplexer.
#pragma once

#include <string>

#include "core/preset/qvpreset.h"

class QvMuxer;

// What a new stream gets when it is added without codec or settings.
struct StreamDefaults {
    std::string codec;  // module name; "" when the preset's entry has none
    AnyDict settings;   // of the encoder; empty when nothing is stored for it
    AnyDict params;     // of the stream in the multiplexer
};

class ActivePreset {
  public:
    const QvPreset& preset() const { return preset_; }
    // The lists of allowed modules are unchanged until follow().
    void set(const QvPreset& preset) { preset_ = preset; }
    // Takes another preset of the same profile: the built-in one, or a user's as a dictionary. A profile that
    // is unknown, none, or another one is an assertion.
    void switchToBuiltin(const Any& profile);
    void switchToUser(const Any& dict);

    // Rebuilds the lists for this multiplexer, which may be null.
    void follow(const QvMuxer* muxer);
    // Module names. Type 1 video, 2 audio.
    const AnyVector& codecs(int type) const;
    // Whether the multiplexer, which must exist, takes this codec under this preset.
    bool takes(const char* codec, const QvMuxer& muxer) const;
    AnyDict lists() const;  // "muxers", "vcodecs", "acodecs"

    // For the stream of that type and number with that codec; null for the first one that is allowed. A
    // user's preset answers what it holds for the stream. A codec that is not allowed, or no allowed codec at
    // all, is an assertion.
    StreamDefaults defaults(int type, int nr, const char* codec, const QvMuxer& muxer) const;

  private:
    void switchTo(const QvPreset& preset, const char* otherProfile);

    QvPreset preset_;
    AnyVector muxers_;
    AnyVector videoCodecs_;
    AnyVector audioCodecs_;
};
