// The description of an output as a task keeps it: an encode pipe as a dictionary with typed access. What is
// absent, or of another type, reads as an empty value.
#pragma once

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

// One output stream of a stored encode pipe.
class QV_API QvEncodePipeStreamState : public AnyDict {
  public:
    QvEncodePipeStreamState() = default;
    QvEncodePipeStreamState(const AnyDict& dict) : AnyDict(dict) {}

    int type() const;  // QvStreamType; 0 when absent
    AnyDict codecParams() const;
    Any codecName() const;
    AnyDict streamParams() const;
    // What the encoder says about itself, for display.
    AnyDict codecInfo() const;
    Any codecDisplayName() const;  // the codec's name when there is no other
    Any framerate() const;
    Any bitrate() const;
    int samplerate() const;  // these four: 0 when absent
    int width() const;
    int height() const;
    int channels() const;
};

// The stored encode pipe: its streams, its multiplexer, its preset.
class QV_API QvEncodePipeState : public AnyDict {
  public:
    QvEncodePipeState() = default;
    QvEncodePipeState(const AnyDict& dict) : AnyDict(dict) {}

    AnyVector streams() const;
    // Asserts "Invalid list index".
    QvEncodePipeStreamState stream(int index) const;
    // The second-th stream of the type that is first; empty when there is none.
    QvEncodePipeStreamState stream(const Pair& address) const;
    int nrStreams() const { return nrStreams(0); }
    int nrStreams(int type) const;  // of the types of a mask; 0 and 255 mean all
    AnyDict muxer() const;
    Any muxerName() const;
    Any muxerDisplayName() const;  // its name when there is no other
    AnyVector programs() const;
    // Its own, else that of the built-in preset of its "profile", else invalid.
    Any presetName() const;
};
