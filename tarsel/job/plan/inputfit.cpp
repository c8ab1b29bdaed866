#include "tarsel/job/plan/inputfit.h"

#include <span>

namespace {

using Matcher = QvFormatMatcher;

// Matched one by one, as an encoder may lack some of them.
constexpr int kFormats[] = {Matcher::dimensions | Matcher::framerate, Matcher::frameAspect, Matcher::channels,
                            Matcher::samplerate, Matcher::bitsPerSample};
constexpr int kAll[] = {Matcher::type,         Matcher::dimensions | Matcher::framerate,
                        Matcher::frameAspect,  Matcher::videoBitrate,
                        Matcher::gop,          Matcher::channels,
                        Matcher::samplerate,   Matcher::audioBitrate,
                        Matcher::bitsPerSample};

}  // namespace

bool fitsInputs(const PlanOptions& options) {
    return options.preset && (options.match || !options.preset->reason().empty());
}

void fitEncoder(QvEncoder& encoder, int type, const QvDecodePipe& decoder, int stream,
                const PlanOptions& options) {
    for (const int property : options.match ? std::span<const int>(kAll) : std::span<const int>(kFormats)) {
        const Matcher matcher(property, 0, &options.preset->preset());
        try {
            if (type == qvVideoStream)
                matcher.matchVideo(&decoder, stream, static_cast<QvVideoEncoder*>(&encoder));
            else
                matcher.matchAudio(&decoder, stream, static_cast<QvAudioEncoder*>(&encoder));
        } catch (const QvParamException&) {  // not one of its parameters
        }
    }
}
