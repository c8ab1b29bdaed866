#include "core/encode/encodefactory.h"

#include <memory>

#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"

QvEncodePipe* QvEncFactory::encodePipe() {
    std::unique_ptr<QvCodec> codec;
    if (QvModule* module = qv_registry()->module("encpipe")) codec.reset(module->create());
    if (!codec) {
        qv_dbg()->error("[QvEncFactory]Internal error, there is no encode pipe module");
        return nullptr;
    }
    codec->init();
    return static_cast<QvEncodePipe*>(codec.release()->getInterface(QvModuleType::encodePipe));
}

QvEncodePipe* QvEncFactory::encodePipe(const AnyDict&) { return encodePipe(); }
