#include "core/engine/modules/qvplugin.h"

#include "core/arch/qvassert.h"
#include "core/engine/modules/qvmodule.h"

QvModuleList::QvModuleList() = default;
QvModuleList::~QvModuleList() = default;

void QvModuleList::append(QvModule* module) { modules_.emplace_back(module); }

QvModule* QvModuleList::at(int index) const {
    return index >= 0 && index < nr() ? modules_[static_cast<std::size_t>(index)].get() : nullptr;
}

QvPlugin::QvPlugin(const char* name, const char* desc)
    : description_(desc ? desc : ""), name_(name ? name : "") {}

QvPlugin::~QvPlugin() = default;

void QvPlugin::addModule(QvModule* module) {
    QV_ASSERT(module);
    module->plugin_ = this;
    modules_.append(module);
}

Any QvPlugin::getAttr(const char* key) const { return attributes_.get(key); }
void QvPlugin::setAttr(const char* key, const Any& value) { attributes_.set(key, value); }
