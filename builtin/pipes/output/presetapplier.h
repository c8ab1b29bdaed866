// Makes a pipe follow a preset: its multiplexer, its programs, and one stream for each that it describes.
#pragma once

#include <vector>

#include "builtin/pipes/output/pipestate.h"

class PresetApplier {
  public:
    // All are borrowed for the life of the object.
    PresetApplier(OutputStreams& streams, MuxerPlace& end, ActivePreset& preset, StreamBuilder& builder,
                  MuxerExchange& exchange, PipeState& state, PipeHost& host)
        : streams_(streams),
          end_(end),
          preset_(preset),
          builder_(builder),
          exchange_(exchange),
          state_(state),
          host_(host) {}

    // The built-in preset of a profile.
    int applyBuiltin(int profile, bool keepFilters);
    // A user's preset, or the built-in one of its profile. `module` is the name of the pipe's module.
    int apply(const QvPreset& preset, bool keepFilters, const char* module);

  private:
    int build(const QvPreset& preset, const std::vector<StreamSnapshot>& former);
    int addDefaultStreams(const QvPreset& preset);
    int addPresetStreams(const QvPreset& preset);
    int applyLoose(const QvPreset& preset);
    int restoreWhole(const QvPreset& preset, const char* module);
    int startMuxer(const QvPreset& preset, const char* preferred);
    void giveFilters(const std::vector<StreamSnapshot>& former);

    OutputStreams& streams_;
    MuxerPlace& end_;
    ActivePreset& preset_;
    StreamBuilder& builder_;
    MuxerExchange& exchange_;
    PipeState& state_;
    PipeHost& host_;
};
