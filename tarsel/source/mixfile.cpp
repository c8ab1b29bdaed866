#include "tarsel/source/mixfile.h"

#include "tarsel/host/files.h"
#include "tarsel/source/source.h"
#include "tarsel/words/messages.h"

namespace {

constexpr int kDecoder = 2;
constexpr const char* kMix = "AudioInterleave";
constexpr const char* kMono = "MonoInterleave";

[[noreturn]] void refuse(const std::string& name, const std::string& why) {
    if (name.empty()) throw failure(Msg::mixSources, {"--ch", why});
    throw failure(Msg::mixInput, {name, why});
}

std::string textOf(const Any& value) { return value.toString().asString(""); }

QvAudioMixDecSetup setupOf(const QvDecodePipe& decoder) {
    QvAudioMixDecSetup setup;
    const Any state = decoder.QvCodec::getParam("metaState");
    if (state.isDict()) setup.restore(state.asDict());
    return setup;
}

std::vector<std::string> inputsOf(const QvDecodePipe& decoder) {
    std::vector<std::string> names;
    const QvAudioMixDecSetup setup = setupOf(decoder);
    for (const Any& name : setup.inFileNames()) names.push_back(textOf(name));
    return names;
}

// One channel for each file.
AnyDict mixOf(const std::string& name, const AnyDict& mono) {
    const Any folder = QvFile::getPath(Any(name.c_str()));
    AnyVector channels;
    for (const Any& entry : mono.getVector("channels")) {
        const Any& file = entry.asDict().get("src");
        // An empty name is refused with the set-up.
        const bool whole = file.size() == 0 || QvFile::isAbsolutePath(file);
        const Any path = whole ? file : QvFile::joinPath(folder, file);
        AnyDict channel("source",
                        AnyVector(Any(AnyDict("src", path, "stream", 0, "channel", 0, "weight", 1.0))));
        const Any& position = entry.asDict().get("pos");
        if (position.isText()) channel.set("pos", position);
        channels.append(channel);
    }
    return AnyDict("name", "AudioMixSetup", "outChannels", channels);
}

std::unique_ptr<QvDecodePipe> opened(const std::string& name, const char* parameter, const Any& value) {
    auto decoder = makeCodec<QvDecodePipe>("aumixdec", kDecoder);
    decoder->setParam("openParameters", AnyDict("extended", 1));  // of WAV files
    decoder->setParam(parameter, value);
    const bool open = decoder->open() == QvStatus::ok;
    requireMixed(name, *decoder);
    if (!open) refuse(name, decoder->errorDesc());
    return decoder;
}

}  // namespace

bool isMixName(const std::string& name) { return QvFile::getExt(Any(name.c_str()), true) == "mmf"; }

AnyDict readMix(const std::string& name) {
    requireInput(name);
    if (const std::string fault = QvMetafile::check(Any(name.c_str())); !fault.empty()) refuse(name, fault);
    const QvMetafile file(Any(name.c_str()));
    const Any &mix = file.element(kMix), &mono = file.element(kMono);
    AnyDict setup;
    if (mix.isDict())
        setup = mix.asDict();
    else if (mono.isDict())
        setup = mixOf(name, mono.asDict());
    else
        throw failure(Msg::mixNone, {name});
    if (const std::string fault = QvAudioMixDecSetup::check(setup); !fault.empty()) refuse(name, fault);
    return setup;
}

std::unique_ptr<QvDecodePipe> openMix(const std::string& name) {
    if (QvMetafile::check(Any(name.c_str())).empty()) {
        const QvMetafile file(Any(name.c_str()));
        if (!file.contains(kMix) && !file.contains(kMono)) return nullptr;
    }
    const AnyDict setup = readMix(name);
    if (setup.isSet("__class__")) return opened(name, "filename", Any(name.c_str()));
    return openMix(name, setup);
}

std::unique_ptr<QvDecodePipe> openMix(const std::string& name, const AnyDict& setup) {
    return opened(name, "metaState", Any(setup));
}

void requireMixed(const std::string& name, const QvDecodePipe& decoder) {
    const std::string reason = textOf(decoder.QvCodec::getParam("inputFailure"));
    if (reason.empty()) return;
    const QvAudioMixDecSetup setup = setupOf(decoder);
    for (const Any& input : setup.inFileNames()) {
        const std::string file = textOf(input);
        // A mix might be this one again; the reason says what is in it.
        if (isMixName(file) || setup.decoder(input)) continue;
        std::string why;
        try {
            const Source source(file, "");
        } catch (const Failure& failure) {
            why = failure.what();
        }
        if (why.empty()) continue;
        throw Failure(Exit::input, (name.empty() ? "--ch" : "can't open " + inQuotes(name)) + ": " + why);
    }
    refuse(name, reason);
}

std::vector<std::string> mixedFiles(const QvDecodePipe& decoder) {
    std::vector<std::string> files;
    for (const std::string& file : inputsOf(decoder)) {
        files.push_back(file);
        if (!isMixName(file)) continue;
        const Source inner(file, "");
        files.insert(files.end(), inner.files().begin() + 1, inner.files().end());
    }
    return files;
}

std::string mixDamage(const QvDecodePipe& decoder) {
    for (const std::string& file : inputsOf(decoder)) {
        std::string damage;
        try {
            damage = Source(file, "").damage();
        } catch (const Failure&) {  // only the decoder that the mix names opens it
        }
        if (!damage.empty()) return inQuotes(file) + ": " + damage;
    }
    return "";
}
