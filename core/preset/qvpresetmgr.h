// The engine's catalogue of presets: the built-in ones for which modules are installed, and which encoder
// goes with which multiplexer. The registry owns it. It changes only in update(), which runs when no task
// does; reading needs no lock.
#pragma once

#include <memory>

#include "core/arch/api.h"
#include "core/preset/qvpreset.h"

class QV_API QvPresetMgr {
  public:
    QvPresetMgr();
    ~QvPresetMgr();
    QvPresetMgr(const QvPresetMgr&) = delete;
    QvPresetMgr& operator=(const QvPresetMgr&) = delete;

    const QvPresetList& builtinPresets() const;
    QvPreset builtinPreset(int index) const;

    // Index of the built-in preset of a profile (of any scheme), -1 if there is none. Asserts before update.
    int findByProfile(int profile) const;
    bool profileAvailable(int profile) const { return findByProfile(profile) >= 0; }

    // Whether an encoder goes with a multiplexer, by what they are and under a profile (-1: any).
    bool isCompatible(const char* codec, const char* muxer) const;
    bool isCompatible(const char* codec, const char* muxer, int profile) const;
    // The modules of a kind (7 video encoders, 6 audio encoders, 10 multiplexers) that go with a module.
    AnyVector getCompatible(const char* name, int kind) const { return getCompatible(name, kind, -1); }
    AnyVector getCompatible(const char* name, int kind, int profile) const;
    // What can stand in for a module, or null.
    const char* getSubstitute(const char* codec) const;

    // Builds everything anew from the modules that are installed now.
    void update();

  private:
    struct Private;
    std::unique_ptr<Private> p_;
};

// The registry's catalogue.
QV_API QvPresetMgr* qvPresetMgr();
