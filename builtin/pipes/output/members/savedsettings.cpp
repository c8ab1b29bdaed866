#include "builtin/pipes/output/members/savedsettings.h"

#include "core/engine/modules/qvcodec.h"

void SavedSettings::keep(const QvCodec& codec) {
    AnyDict settings;
    codec.store(settings);
    byModule_.insert_or_assign(codec.name(), std::move(settings));
}

const AnyDict* SavedSettings::of(const char* module) const {
    const auto found = byModule_.find(module);
    return found == byModule_.end() ? nullptr : &found->second;
}
