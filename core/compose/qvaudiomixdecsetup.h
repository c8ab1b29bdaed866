// What the decoder "aumixdec" is to read: for each output channel the channels that feed it, each of a stream
// of a file, with their weights. It is stored as a dictionary ("AudioMixSetup") and as an element of a
// metafile.
//
//     QvAudioMixDecSetup setup;
//     setup.setInFileNames(AnyVector(Any("left.wav"), Any("right.wav")));  // two channels, both silent
//     setup.setWeight(0, 0, 0, 0, 1.0);
//     setup.setWeight(1, 1, 0, 0, 1.0);
//     QvDecodePipe* decoder = setup.createMixDecoder(0);
//
// Functions with an index return -1 (or null) if it is out of range.
#pragma once

#include <memory>
#include <string>

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class FiltersState;
class QvDecodePipe;

class QV_API QvAudioMixDecSetup {
  public:
    static constexpr int maxChannels =
        256;  // that check() accepts: of the mix, of a file; also streams of a file

    QvAudioMixDecSetup() = default;

    // Also makes as many output channels as files, all silent, and forgets the decoders. 0.
    int setInFileNames(const AnyVector& names);
    Any inFileName(int file) const;
    const AnyVector& inFileNames() const { return inFileNames_; }

    // Replaces the output channels by silent ones. -1 for a negative number, and whenever there are more than
    // 16 before the call.
    int setNrOutChannels(int n);
    int nrOutChannels() const { return outChannels_.size(); }
    int setChannelPosition(int channel, const char* position);

    // The module that opens a file; null: the one that its extension asks for.
    int setDecoder(int file, const char* name);
    int setDecoder(const Any& file, const char* name);
    const char* decoder(int file) const;
    const char* decoder(const Any& file) const;

    // Adds a source to an output channel. Channel 0 replaces the weight of the first source with that file
    // and stream; any other channel is added each time.
    int setWeight(int out, int file, int stream, int channel, double weight);
    int setWeight(int out, const Any& file, int stream, int channel, double weight);

    // Filters that a stream of a file goes through before it is mixed, kept as they are given.
    int setFilters(int file, int stream, const FiltersState& filters);
    int setFilters(const Any& file, int stream, const FiltersState& filters);
    // Lives until the next call or change; null when there are none.
    const FiltersState* filters(int file, int stream) const;
    const FiltersState* filters(const Any& file, int stream) const;

    // The numbers of the streams of a file that feed anything, each once.
    AnyVector getFileActiveStreams(const Any& file) const;
    const AnyVector& outChannels() const { return outChannels_; }

    void store(AnyDict& dict) const;
    int restore(const AnyDict& dict);  // -1 if it is none of a set-up, which is unchanged
    int save(const Any& path) const;   // as a metafile: QvMetafile::save
    // From a metafile: its code if it can't be opened; -1 if it holds no set-up. The log has the reason.
    int load(const Any& path);

    // The first wrong entry of a dictionary, as a word that describes it; empty if all are valid. restore()
    // accepts wrong entries, and uses what it can of them.
    static std::string check(const AnyDict& dict);

    // An open decoder of one audio stream for the caller, at `targetSamplerate` or, for 0, the highest rate
    // of all inputs. Null when it can't be opened. A decoder whose inputs fail counts as open and reads
    // nothing: its "inputFailure" then holds the reason (a text).
    QvDecodePipe* createMixDecoder(int targetSamplerate) const;

  private:
    void _createMuteChannels(int n);

    AnyVector outChannels_;  // Dicts: "source", a Vector of Dicts "src", "stream", "channel", "weight"; "pos"
    AnyVector inFileNames_;
    AnyVector decoders_;  // a name or invalid, for each file
    AnyVector filters_;   // Dicts: "file", "stream", "filters"
    mutable std::shared_ptr<FiltersState> asked_;
};
