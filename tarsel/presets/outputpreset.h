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

// Encoders that an output is to have; empty for the preset's own.
struct ChosenEncoders {
    const std::string& of(int type) const { return type == qvVideoStream ? video : audio; }

    std::string video, audio;
};

class OutputPreset {
  public:
    // `muxer`: one of those that the preset allows; empty for its default. `encoders` go with it under the
    // preset. `reason`: why the tool chose this preset, for --dry-run; empty where the user did. Throws
    // Failure.
    OutputPreset(const QvPreset& preset, const std::string& muxer, const ChosenEncoders& encoders = {},
                 const std::string& reason = "");

    const QvPreset& preset() const { return preset_; }
    std::string name() const { return preset_.name(); }
    const std::string& muxer() const { return muxer_; }
    const std::string& reason() const { return reason_; }
    // Whether outputs have streams of this type.
    bool has(int type) const;
    // Whether the streams are those that the tool writes by itself, without an encoder.
    bool isRaw() const;

    // A pipe with this preset, without streams, that writes by `muxer`. Throws Failure.
    std::unique_ptr<QvEncodePipe> makePipe(const char* muxer) const;
    // Adds the next stream of a type, with the preset's settings of its encoder. Throws Failure.
    QvEncoder& addStream(QvEncodePipe& pipe, int type) const;
    // What the encoder of the number-th stream is set to. `fitted`: to an input, so that what it can't be set
    // to is left open.
    PresetPicture picture(const QvCodec& encoder, int number, bool fitted) const;
    PresetSound sound(const QvCodec& encoder, int number, bool fitted) const;

    // The settings that the preset stores for the encoder of the number-th stream; empty for none.
    AnyDict storedCodec(int type, int number = 0) const;

  private:
    std::string usualEncoder(const QvMuxer& muxer, int type) const;
    bool says(const QvCodec& encoder, int type, int number, const char* name, const char* range,
              bool fitted) const;

    QvPreset preset_;
    std::string muxer_;
    ChosenEncoders encoders_;
    std::string reason_;
};

// Whether an encoder takes any format, so that what it lists is a proposal only.
bool isRawEncoder(const QvCodec& encoder);
bool isRawEncoderName(std::string_view name);
