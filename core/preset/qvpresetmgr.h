// The engine's catalogue of presets: the built-in ones for which modules are installed, and which encoder
// goes with which multiplexer. The registry owns it. It changes only in update(), which runs when no task
// does; reading needs no lock.
#pragma once

#include <memory>

#include "core/arch/api.h"
#include "core/preset/presetgroup.h"
#include "core/preset/qvpreset.h"

class CodecCompat;

class QV_API QvPresetMgr {
  public:
    QvPresetMgr();
    ~QvPresetMgr();
    QvPresetMgr(const QvPresetMgr&) = delete;
    QvPresetMgr& operator=(const QvPresetMgr&) = delete;

    // The presets for which modules are installed: those of this library, then those that plug-ins name.
    const QvPresetList& builtinPresets() const;
    QvPreset builtinPreset(int index) const;
    const PresetGroupList& builtinGroups() const;

    // The built-in presets and groups, followed by those presets of the extended source that rest on a
    // built-in one, have a name of their own and a group. A built-in preset has the same index in both lists.
    const QvPresetList& extendedPresets() const;
    QvPreset extendedPreset(int index) const;
    const PresetGroupList& extendedGroups() const;

    // Fills the extended source from a file of user presets: 0, or the reader's result, which changes
    // nothing.
    int loadExtendedPresets(const Any& source);
    void clearExtendedPresets();

    // The presets of this library that are not here because no module makes their video, or no multiplexer
    // takes it. Each is a dictionary: "profile", "name", "group" (a name) and "waitsFor", a vector of module
    // names of which one is needed: encoders, or multiplexers if an encoder is installed.
    AnyVector missingPresets() const;

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

  protected:
    const CodecCompat& compatList() const;

  private:
    struct Private;
    std::unique_ptr<Private> p_;
};

// The registry's catalogue.
QV_API QvPresetMgr* qvPresetMgr();
