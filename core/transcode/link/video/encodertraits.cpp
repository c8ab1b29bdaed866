#include "core/transcode/link/video/encodertraits_p.h"

#include <algorithm>

#include "core/encode/qvencodepipe.h"
#include "core/measure/fourcc.h"

namespace {

std::optional<unsigned> fourccOf(const Any& value) {
    if (!value.isInt32()) return std::nullopt;
    return static_cast<unsigned>(value.asInt32());
}

// A parameter of the encoder, or an attribute of its module.
Any listOf(const QvEncodePipe& pipe, int stream) {
    Any list = pipe.getParam(Any::sprintf("video%d/inFOURCC", stream).asString());
    const auto* encoder = list.isVector() ? nullptr : pipe.videoEncoder(stream);
    return encoder && encoder->module() ? encoder->getAttr("inFOURCC") : list;
}

}  // namespace

EncoderTraits::EncoderTraits(const QvEncodePipe& pipe, int stream) {
    const auto ask = [&](const char* name) {
        return pipe.getParam(Any::sprintf("video%d/%s", stream, name).asString());
    };
    const Any blanking = ask("_needTopBlanking");
    topBlankingLines = blanking.isInt32() ? blanking.asInt32() : 0;
    selected = fourccOf(ask("selectedFOURCC"));
    if (!selected)
        if (const Any list = listOf(pipe, stream); list.isVector())
            for (const Any& format : list.asVector()) accepted.push_back(fourccOf(format));
    width = ask("width").asInt32(0);
    height = ask("height").asInt32(0);
}

unsigned EncoderTraits::formatFor(unsigned input) const {
    if (selected) return *selected;
    if (accepted.empty() || std::find(accepted.begin(), accepted.end(), input) != accepted.end())
        return input;
    // 16 bits stay 16 bits, whatever the list says.
    if (input == QvFourcc::W016) return QvFourcc::Y216;
    return accepted.front().value_or(input);
}
