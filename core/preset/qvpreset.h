// A preset: what an output must be. A built-in one says which encoders and multiplexers a profile allows; a
// user's adds the settings of the multiplexer and of each stream, and refers to the built-in one of the same
// profile. A preset is a dictionary, so it is stored and read like any value.
//
// Keys: "profile", "name", "custom" (0 built-in, 1 a user's), optional "shortName", "info", "disabled";
// built-in: "videoCodecs", "audioCodecs", "muxers" (module names, the first is the default); a user's:
// "muxer", "streams", "programs", "extension"; optional "PresetMeta", see QvPresetMeta. Keys that begin with
// "#" are marks of the running program.
#pragma once

#include <optional>

#include "core/arch/api.h"
#include "core/preset/qvpresetmeta.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvEncodePipe;
struct BuiltinCatalogue;

class QV_API QvPreset : public AnyDict {
  public:
    QvPreset();                               // a user preset without profile, named "<invalid>"
    QvPreset(int profile, const char* name);  // a user preset
    explicit QvPreset(const AnyDict& dict);   // completes what `dict` lacks
    // A user preset that holds what the pipe is set to now, with its "info" made. Neither pipe nor name may
    // be null (assertions). The third argument is not used.
    QvPreset(const QvEncodePipe* pipe, const char* name, bool = false);

    bool isCustom() const { return get("custom").isTrue(); }
    bool isBuiltin() const { return !isCustom(); }
    int profile() const { return getInt32("profile", -1); }
    const char* name() const;
    const char* shortName() const;
    void setShortName(const char* name);
    const char* symbol() const;  // of the profile number, "" if it has none
    const Any& info() const { return get("info"); }
    void setInfo(const Any& text);   // asserts anything but text
    void setName(const char* name);  // user presets only, and no name of a built-in one (assertions)
    void setDisabled(bool on);
    bool isDisabled() const { return get("disabled").isTrue(); }
    void setPostprocessCmd(const Any& command);  // user presets only (assertion)
    Any postprocessCmd() const;
    AnyDict muxerParams() const;
    AnyVector programs() const;
    std::optional<QvPresetMeta> presetMeta() const;  // "PresetMeta", if it is there

    // Whether this installation can use the preset: tried once, on a new encode pipe, and kept as the marks
    // "#valid" and "#err". A dictionary without "profile", "custom" or "name" is an assertion. error() is the
    // reason, invalid for a valid preset or one that was not tried.
    bool isValid();
    bool checkValid();  // tries again
    const Any& error() const { return get("#err"); }
    // Sets "info" to a line about format, video and sound, unless it holds a text already. It is read from
    // `pipe`, to which this preset was applied; null: from a new one.
    void createInfo(const QvEncodePipe* pipe = nullptr);

    // A copy whose profile, and that of its streams and multiplexer, is QvProfile::none. A stream of another
    // profile is an assertion, and so is a built-in preset.
    QvPreset toNone(int = 0) const;

    // The modules that are allowed. A user's preset takes them from the built-in one; empty if that is
    // missing.
    AnyVector muxers() const { return allowed("muxers"); }
    AnyVector videoCodecs() const { return allowed("videoCodecs"); }
    AnyVector audioCodecs() const { return allowed("audioCodecs"); }
    AnyVector codecs(int kind) const;  // 7 video, 6 audio
    Any defaultMuxer() const;          // a name, or invalid
    bool muxerAllowed(const char* name) const;

    // The stored settings of the index-th stream of a type, or of the last when there are fewer; with a
    // codec name the last of the first index + 1 that uses it. Empty when there is none. User presets only.
    AnyDict streamParams(int type, int index, const char* codec) const;

    // Whether an encoder and a multiplexer go together under this profile, and which modules of a kind
    // (7 video encoders, 6 audio encoders, 10 multiplexers) go with one.
    bool isCompatible(const char* codec, const char* muxer) const;
    AnyVector getCompatible(const char* name, int kind) const;

  private:
    friend struct BuiltinCatalogue;  // which makes the built-in ones
    QvPreset(int profile, const char* name, const Any& video, const Any& audio, const Any& muxers);

    AnyVector allowed(const char* key) const;
    const AnyDict* base() const;
};

// Each element is a dictionary that is a QvPreset.
class QV_API QvPresetList : public AnyVector {
  public:
    QvPreset preset(int index) const;
    int indexOfName(const char* name) const;  // -1 when absent
    int indexOfProfile(int profile) const;    // -1 when absent
};
