#include "plugins/av/door/avmodules.h"

#include <utility>

#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"
#include "plugins/av/door/codeclibrary.h"
#include "plugins/av/door/extensions.h"

namespace av {
namespace {

class AvModule : public QvModule {
  public:
    AvModule(std::shared_ptr<CodecLibrary> library, int type, const char* name, const char* description,
             const char* displayName)
        : QvModule(type, name, description, displayName), library_(std::move(library)) {}
    QvCodec* create() override {
        QvCodec* const codec = library_->create(*this);
        return codec ? _setAttrs(codec) : nullptr;
    }

  private:
    std::shared_ptr<CodecLibrary> library_;
};

}  // namespace

QvModule* newModule(const std::shared_ptr<CodecLibrary>& library, int type, const char* name,
                    const char* description, const char* displayName) {
    return new AvModule(library, type, name, description, displayName);
}

void addDecoders(QvPlugin& plugin, const std::shared_ptr<CodecLibrary>& library) {
    AnyVector names;
    for (const char* extension : extensions) names.append(Any(extension));
    QvModule* const decoder =
        newModule(library, QvModuleType::decoder, "avdec", "Film reader", "Film import");
    decoder->setAttr("exts", names);
    decoder->setAttr("priority", 50);
    plugin.addModule(decoder);
}

}  // namespace av
