// Any bytes as a metafile, in which "@" is the name of a sound: what check() lets pass opens without an
// assertion and is written and read again as it was; a decoder of it either opens, and then seeks and reads
// without more samples than it may, or says why not.
#include <memory>
#include <string>

#include "core/arch/qvexception.h"
#include "core/compose/qvaudiomixdecsetup.h"
#include "core/compose/qvmetafile.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/modules/init.h"
#include "core/engine/modules/qvregistry.h"
#include "tests/fuzz/fuzz.h"
#include "tests/support/wav_bytes.h"

namespace {

const std::uint8_t* bytesOf(const std::string& text) {
    return reinterpret_cast<const std::uint8_t*>(text.data());
}

const MemoryFile& soundFile() {
    static const std::string wav =
        riff(wavChunk("fmt ", wavFormat(1, 2, 8000, 16)) + wavChunk("data", patternBytes(4 * 600)));
    static const MemoryFile file(bytesOf(wav), wav.size(), ".wav");
    return file;
}

std::string withSound(const std::uint8_t* data, std::size_t size) {
    std::string text;
    for (std::size_t i = 0; i < size; ++i)
        data[i] == '@' ? text += soundFile().name() : text += static_cast<char>(data[i]);
    return text;
}

bool opens(const MemoryFile& file, QvMetafile& metafile) {
    try {
        return metafile.open(file.name()) == 0;
    } catch (const QvAssertFailure&) {
        return false;
    }
}

void checkSetup(const AnyDict& stored) {
    QvAudioMixDecSetup setup;
    if (setup.restore(stored) != 0) return;
    AnyDict first, second;
    setup.store(first);
    QvAudioMixDecSetup again;
    require(again.restore(first) == 0);
    again.store(second);
    require(first == second);
    QvAudioMixDecSetup::check(stored);
}

void checkDecoder(const MemoryFile& file) {
    std::unique_ptr<QvCodec> codec(qv_registry()->newCodec("aumixdec"));
    auto& decoder = *static_cast<QvDecodePipe*>(codec->getInterface(2));
    decoder.setParam("filename", file.name());
    if (decoder.open() != 0) {
        require(*decoder.errorDesc() != 0 && decoder.QvCodec::getParam("inputFailure").isTrue());
        return;
    }
    if (decoder.QvCodec::getParam("inputFailure").isTrue()) {
        require(decoder.readSamples(10, 0) == -1);
        return;
    }
    require(decoder.readSamples(1000, 0) <= 1000);
    decoder.seekToSample(decoder.nrSamples(0) - 1, 0);
    require(decoder.readSamples(1000, 0) <= 3);
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) { return init_wrapper(nullptr); }

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string text = withSound(data, size);
    const MemoryFile file(bytesOf(text), text.size(), ".mmf");
    const bool sound = QvMetafile::check(file.name()).empty();
    QvMetafile metafile;
    require(opens(file, metafile) == sound);
    require(sound || metafile.nrElements() == 0);
    for (int i = 0; i < metafile.nrElements(); ++i)
        if (metafile.element(i).isDict()) checkSetup(metafile.element(i).asDict());
    checkDecoder(file);
    return 0;
}
