// Any bytes as a metafile of views and as a document of a clip, in which "@" is the name of a picture: what
// opens shows exactly the frames that it counts, and what does not says why.
#include <memory>
#include <string>

#include "core/compose/qvviewsetup.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/modules/init.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "tests/fuzz/fuzz.h"
#include "tests/support/mxf_decoder.h"

namespace {

constexpr int mostFrames = 20;

const std::uint8_t* bytesOf(const std::string& text) {
    return reinterpret_cast<const std::uint8_t*>(text.data());
}

std::string withPicture(const std::uint8_t* data, std::size_t size) {
    static const std::string line = "video 7 3";
    static const MemoryFile picture(bytesOf(line), line.size(), ".mxf");
    std::string text;
    for (std::size_t i = 0; i < size; ++i)
        data[i] == '@' ? text += picture.name() : text += static_cast<char>(data[i]);
    return text;
}

void checkSetup(const MemoryFile& file) {
    QvViewSetup setup, again;
    if (!setup.load(file.name()).empty()) return;
    AnyDict first, second;
    setup.store(first);
    require(again.restore(first).empty());
    again.store(second);
    require(first == second);
}

void checkDecoder(const char* module, const MemoryFile& file) {
    const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(module));
    auto& decoder = *static_cast<QvDecodePipe*>(codec->getInterface(2));
    decoder.setParam("filename", file.name());
    if (decoder.open() != QvStatus::ok) return require(*decoder.errorDesc() != 0);
    const int frames = decoder.nrFrames(0);
    for (int i = 0; i < std::min(frames, mostFrames); ++i)
        require(decoder.readFrame(0) == QvStatus::ok && decoder.getFramePtr(0) != nullptr);
    require(decoder.seekToFrame(frames, 0) == QvStatus::endOfStream);
    if (frames == 0 || frames > mostFrames) return;
    require(decoder.readFrame(0) == QvStatus::endOfStream);
    require(decoder.seekToFrame(frames - 1, 0) == QvStatus::ok && decoder.readFrame(0) == QvStatus::ok);
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    static QvPlugin plugin("mxf", "of the fuzzer");
    const int result = init_wrapper(nullptr);
    plugin.addModule(new MxfModule);
    qv_registry()->addPlugin(&plugin);
    return result;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    // A generator of huge pictures is what it was asked for, and slow.
    const std::string text = withPicture(data, size);
    if (text.find("testgen") != std::string::npos || text.find("rawdec") != std::string::npos) return 0;
    const MemoryFile views(bytesOf(text), text.size(), ".mvf");
    checkSetup(views);
    checkDecoder("mvmetadec", views);
    checkDecoder("p2dec", views);
    return 0;
}
