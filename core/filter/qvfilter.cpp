#include "core/filter/qvfilter.h"

#include <cstring>
#include <initializer_list>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/status.h"

namespace {

constexpr const char* commonKeys[] = {"_on", "_position", "_front"};

AnyDict commonDefaults() {
    AnyDict common;
    common.set("_on", 1);
    common.set("_position", 0);
    common.set("_front", 0);
    return common;
}

bool isOneOf(const char* name, std::initializer_list<const char*> names) {
    for (const auto* candidate : names)
        if (std::strcmp(name, candidate) == 0) return true;
    return false;
}

bool isCommonKey(const char* name) { return isOneOf(name, {"_on", "_position", "_front"}); }

bool getCommon(const QvCodec& filter, const AnyDict& common, const char* name, Any& value) {
    if (common.isSet(name)) {
        value = common.get(name);
        return true;
    }
    if (std::strcmp(name, "info") != 0) return false;
    AnyDict info;
    filter.store(info);
    for (const auto* key : commonKeys) info.remove(key);
    value = info;
    return true;
}

void storeCommon(const QvCodec& filter, const AnyDict& common, AnyDict& dict) {
    for (const auto* key : commonKeys) dict.set(key, common.get(key));
    dict.set("name", filter.name());
}

int restoreCommon(const QvCodec& filter, AnyDict& common, const AnyDict& dict) {
    const Any& name = dict.get("name");
    if (name != filter.name()) {
        qv_dbg()->write("Invalid state dict, module name is %s", name.asString("n/a"));
        return QvStatus::failed;
    }
    for (const auto* key : commonKeys)
        if (dict.get(key).isInt32()) common.set(key, dict.get(key));
    return QvStatus::ok;
}

}  // namespace

QvVideoFilter::QvVideoFilter(const QvModule* module) : QvCodec(module), common_(commonDefaults()) {}

int QvVideoFilter::init() { return QvCodec::init(); }

int QvVideoFilter::setParam(const char* name, const Any& value) {
    const bool isCommon = isCommonKey(name);
    if (!isCommon && !isOneOf(name, {"_previewMode", "_totalFrames"})) return QvCodec::setParam(name, value);
    _traceParam(name, value);
    if (isCommon) common_.set(name, value);
    return QvStatus::ok;
}

void QvVideoFilter::getParam(const char* name, Any& value) const {
    if (!getCommon(*this, common_, name, value)) QvCodec::getParam(name, value);
}

void* QvVideoFilter::getInterface(int kind) const {
    return kind == QvModuleType::videoFilter ? const_cast<QvVideoFilter*>(this) : nullptr;
}

void QvVideoFilter::store(AnyDict& dict) const { storeCommon(*this, common_, dict); }

int QvVideoFilter::restore(const AnyDict& dict) { return restoreCommon(*this, common_, dict); }

int QvVideoFilter::apply(QvFrame&) { QV_FAIL("Apply not implemented"); }

QvAudioFilter::QvAudioFilter(const QvModule* module) : QvCodec(module), common_(commonDefaults()) {}

int QvAudioFilter::init() { return QvCodec::init(); }

int QvAudioFilter::setParam(const char* name, const Any& value) {
    const bool isCommon = isCommonKey(name);
    if (!isCommon && !isOneOf(name, {"_previewMode", "_totalFrames", "vf_base"}))
        return QvCodec::setParam(name, value);
    _traceParam(name, value);
    if (isCommon) common_.set(name, value);
    return QvStatus::ok;
}

void QvAudioFilter::getParam(const char* name, Any& value) const {
    if (!getCommon(*this, common_, name, value)) QvCodec::getParam(name, value);
}

void* QvAudioFilter::getInterface(int kind) const {
    return kind == QvModuleType::audioFilter ? const_cast<QvAudioFilter*>(this) : nullptr;
}

void QvAudioFilter::store(AnyDict& dict) const { storeCommon(*this, common_, dict); }

int QvAudioFilter::restore(const AnyDict& dict) { return restoreCommon(*this, common_, dict); }
