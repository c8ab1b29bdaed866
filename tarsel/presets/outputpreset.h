// The preset of an output: which multiplexer and encoders write it, and what they are set to.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include <qvplugcore/qvplugcore.h>

// What a preset asks of a stream; what it leaves open follows the input.
struct PresetPicture {
    std::optional<int> width, height;
    std::optional<QvFramerate> rate;
    std::optional<unsigned> fourcc;

    bool any() const { return width || height || rate || fourcc; }
};
struct PresetSound {
    std::optional<int> samplerate, channels, bits;
};

class OutputPreset {
  public:
    // `muxer`: one of those that the preset allows; empty for its default. Throws Failure.
    OutputPreset(const QvPreset& preset, const std::string& muxer);

    const QvPreset& preset() const { return preset_; }
    std::string name() const { return preset_.name(); }
    const std::string& muxer() const { return muxer_; }
    // Whether outputs have streams of this type.
    bool has(int type) const;
    // Whether the streams are those that the tool writes by itself, without an encoder.
    bool isRaw() const;

    // A pipe with this preset, without streams, that writes by `muxer`. Throws Failure.
    std::unique_ptr<QvEncodePipe> makePipe(const char* muxer) const;
    // Adds the next stream of a type with the preset's settings. Throws Failure.
    QvEncoder& addStream(QvEncodePipe& pipe, int type) const;
    // What the encoder of the number-th stream is set to. `fitted`: to an input, so that what it can't be set
    // to is left open.
    PresetPicture picture(const QvCodec& encoder, int number, bool fitted) const;
    PresetSound sound(const QvCodec& encoder, int number, bool fitted) const;

    // The settings that the preset stores for the encoder of the number-th stream; empty for none.
    AnyDict storedCodec(int type, int number = 0) const;

  private:
    bool says(const QvCodec& encoder, int type, int number, const char* name, const char* range,
              bool fitted) const;

    QvPreset preset_;
    std::string muxer_;
};

// Whether an encoder takes any format, so that what it lists is a proposal only.
bool isRawEncoder(const QvCodec& encoder);
bool isRawEncoderName(std::string_view name);

// Of a job's options: the preset named, or, without a name, the first one that goes with the extension of an
// output that nothing else writes; null for none. `muxer`: that of --muxer, or empty. `output`: its name as
// the user gave it. Throws Failure.
std::shared_ptr<const OutputPreset> outputPreset(const std::string& name, const std::string& extension,
                                                 const std::string& muxer, const std::string& output);
