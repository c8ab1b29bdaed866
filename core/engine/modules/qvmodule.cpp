#include "core/engine/modules/qvmodule.h"

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvcodec.h"

namespace {

constexpr char displayNameKey[] = "displayName";

}  // namespace

QvModule::QvModule(int type, const char* name, const char* desc, const char* displayName) {
    attributes_.set("type", type);
    if (name) name_ = name;
    if (desc) description_ = desc;
    if (displayName) attributes_.set(displayNameKey, displayName);
}

QvModule::~QvModule() {
    const std::lock_guard lock(instancesLock_);
    if (instances_.empty()) return;
    qv_dbg()->warning("%s: *** %d instances still alive",
                      attributes_.get(displayNameKey).asString("<unknown>"), instances_.size());
    for (QvCodec* codec : instances_) {
        codec->module_ = nullptr;
        codec->listed_ = false;
    }
}

const char* QvModule::desc() const { return description_.asString(""); }
const char* QvModule::name() const { return name_.asString(""); }

const char* QvModule::displayName() const {
    const Any& shown = attributes_.get(displayNameKey);
    return shown.isString() ? shown.asString() : name();
}

Any QvModule::getAttr(const char* key) const { return attributes_.get(key); }
void QvModule::setAttr(const char* key, const Any& value) { attributes_.set(key, value); }
void QvModule::getAttrs(AnyDict& attributes) const { attributes = attributes_; }

void QvModule::setAttrs(const AnyDict& attributes) {
    for (const auto& [key, value] : attributes) setAttr(key, *value);
}

void QvModule::enlist(QvCodec* codec) const {
    const std::lock_guard lock(instancesLock_);
    QV_ASSERT_MSG(!instances_.contains(codec), "QvModule._setAttrs: object already in list!");
    instances_.append(codec);
    codec->listed_ = true;
}

void QvModule::codecCreated(QvCodec* codec) const {
    QV_ASSERT_MSG(codec, "QvModule.codecCreated: null object passed");
    QV_ASSERT_MSG(codec->module_ == this, "QvModule.codecCreated: invalid object.");
    enlist(codec);
}

QvCodec* QvModule::_setAttrs(QvCodec* codec) const {
    QV_ASSERT_MSG(codec, "QvModule.codecCreated: null object passed");
    QV_ASSERT_MSG(!codec->module_, "QvModule._setAttrs: instance already has _module.");
    codec->module_ = this;
    enlist(codec);
    return codec;
}

void QvModule::codecDeleted(QvCodec* codec) const {
    QV_ASSERT_MSG(codec && codec->module_ == this, "QvModule.codecCreated: invalid object.");
    const std::lock_guard lock(instancesLock_);
    const int index = instances_.indexOf(codec);
    QV_ASSERT_MSG(index >= 0, "QvModule.releaseCodec: object not found.");
    instances_.remove(index);
    codec->listed_ = false;
}

TPtrList<QvCodec> QvModule::codecList() const {
    const std::lock_guard lock(instancesLock_);
    return instances_;
}
