#include "core/decode/qvtestgenerator.h"

#include "core/decode/qvdecoder.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/value/anycontainer.h"

namespace {

AnyDict dictOf(const GeneratorVParams& params) {
    AnyDict dict;
    dict.set("duration", Any(params.duration));
    dict.set("framerate", Any(params.framerate));
    if (params.picture.isValid()) dict.set("picture", params.picture);
    dict.set("width", Any(params.width));
    dict.set("height", Any(params.height));
    dict.set("frameAspect", Any(params.frameAspect));
    dict.set("FOURCC", Any(static_cast<int>(params.fourcc)));
    dict.set("period", Any(params.period));
    dict.set("nrViews", Any(params.nrViews));
    return dict;
}

AnyDict dictOf(const GeneratorAParams& params) {
    AnyDict dict;
    dict.set("duration", Any(params.duration));
    dict.set("samplerate", Any(params.samplerate));
    dict.set("channels", Any(params.channels));
    dict.set("bitsPerSample", Any(params.bitsPerSample));
    dict.set("period", Any(params.period));
    dict.set("soundByte", Any(params.soundByte));
    return dict;
}

template <class Params>
AnyVector dictsOf(const TPtrList<Params>* list) {
    AnyVector dicts;
    if (list)
        for (const Params* params : *list)
            if (params) dicts.append(dictOf(*params));
    return dicts;
}

}  // namespace

QvDecodePipe* QvTestGenerator::create(const TPtrList<GeneratorVParams>* videos,
                                      const TPtrList<GeneratorAParams>* audios) {
    QvCodec* codec = qv_registry()->newCodec("testgen");
    if (!codec) return nullptr;
    auto* pipe = static_cast<QvDecodePipe*>(codec->getInterface(QvModuleType::decoder));
    AnyDict streams;
    streams.set("vids", dictsOf(videos));
    streams.set("auds", dictsOf(audios));
    pipe->setParam("streams", Any(streams));
    return pipe;
}

QvDecodePipe* QvTestGenerator::create(const GeneratorVParams* video, const GeneratorAParams* audio) {
    TPtrList<GeneratorVParams> videos;
    TPtrList<GeneratorAParams> audios;
    if (video) videos.append(const_cast<GeneratorVParams*>(video));
    if (audio) audios.append(const_cast<GeneratorAParams*>(audio));
    return create(video ? &videos : nullptr, audio ? &audios : nullptr);
}
