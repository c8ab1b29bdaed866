// An input of the tool: a file, a raw file with its format given, or the built-in generator.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

class StandardInput;
struct PictureFiles;

class Source {
  public:
    // `spec`: a file name, "testgen:size=1280x720,rate=25,duration=10", or "-" for `standard`, which then
    // outlives this; null where the standard input is not taken. `raw`: the format of a raw file
    // ("size=352x288,pixel=I420,rate=25"), empty to open by extension. Throws Failure.
    // How films are read.
    struct Films {
        bool upright = true;  // turned as they say that they are to be shown
        bool exact = false;   // counted packet by packet, also where tables say how many there are
        bool survey = false;  // only what they are is asked for
    };
    Source(const std::string& spec, const std::string& raw, StandardInput* standard = nullptr,
           const Films& films = {true, false, false});
    // One that is open already; it has to outlive this.
    explicit Source(QvDecodePipe& decoder);
    // The same for a decoder that reads others.
    Source(const std::string& name, QvDecodePipe& decoder);
    // What others are read through.
    Source(const std::string& name, std::unique_ptr<QvDecodePipe> decoder);

    // Whether an input of this name needs no format from outside: the generator, or an extension with a
    // decoder.
    static bool describesItself(const std::string& spec);
    static bool isGenerator(const std::string& spec);

    QvDecodePipe& decoder() const { return *open_; }
    // The module that reads it.
    std::string decoderName() const;
    const std::string& name() const { return name_; }
    // Bytes of the file or the standard input; negative for others.
    long long bytes() const;
    bool isFile() const { return isFile_; }
    // What is read: the file and what it names, or the picture that the generator shows.
    const std::vector<std::string>& files() const { return files_; }

    // Of the first video stream.
    std::optional<QvFramerate> frameRate() const;
    // Seconds of the longest stream, of subpictures only where there is nothing else; negative when unknown.
    double duration() const;
    // Why the file holds less than its header says, or more than whole frames; empty when it is whole.
    std::string damage() const;
    // What of that which was read so far could not be decoded, as "3 pictures and 1 packet of sound"; empty
    // for nothing.
    std::string concealed() const;

    // Selects every video and audio stream.
    void selectAll();

  private:
    void openGenerator(const std::string& spec);
    void openRaw(const std::string& raw);
    void openFile(const Films& films);
    void takePictures(const PictureFiles& pictures, const std::string& raw);
    void takeStandard(StandardInput* standard, bool isRaw);
    void takeMixed();  // the files of a mix
    std::string requireDecoder() const;
    [[noreturn]] void refuseFile(const std::string& decoder, const std::string& reason) const;
    std::string head(size_t most) const;  // its first bytes
    [[noreturn]] void refuse(const std::string& why) const;

    std::string name_;
    std::string formatName_;  // whose extension says what it holds
    bool isFile_ = true;
    AnyDict pictures_;  // with which a file and those after it are opened as pictures; empty for a film
    std::vector<std::string> files_;
    StandardInput* standard_ = nullptr;
    std::unique_ptr<QvByteSource> bytes_;    // outlives the decoder that reads it
    std::unique_ptr<QvDecodePipe> decoder_;  // null where it belongs to another
    QvDecodePipe* open_ = nullptr;
};

// Sets a parameter that the decoder, encoder or filter must know; throws Failure (usage) for an unknown name
// or a value it can't take.
void setChecked(QvCodec& codec, const std::string& name, const Any& value, const std::string& what);

// The stored state of a filter, switched on.
AnyDict stateOf(const QvCodec& codec);

// Throws Failure (usage) with `option` in the line if no frame of this format can be had.
void requireFrame(const std::string& option, unsigned fourcc, int width, int height);

// What the engine warned of since the last call, as that a rate is a guess.
std::vector<std::string> engineWarnings();
// The same on the standard error, each line once. Returns how many.
int printWarnings();

// What of the input could not be decoded so far, on the standard error, as a run says it. Returns how many
// warnings.
int printConcealed(const Source& source);

// What a module is: one that is registered as a video filter and works on sound is an audio filter.
int moduleKind(const QvModule& module);

// The names of all modules of a kind.
std::vector<std::string> moduleNames(int kind);

// A new codec of a module, which must exist and be of a kind. Throws Failure (module).
template <class T>
std::unique_ptr<T> makeCodec(const std::string& module, int kind);
std::unique_ptr<QvCodec> makeAnyCodec(const std::string& module, int kind);

template <class T>
std::unique_ptr<T> makeCodec(const std::string& module, int kind) {
    return std::unique_ptr<T>(static_cast<T*>(makeAnyCodec(module, kind).release()->getInterface(kind)));
}
