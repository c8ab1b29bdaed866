#include "core/engine/modules/moduletraits_p.h"

#include "core/engine/modules/qvcodec.h"
#include "core/engine/modules/qvmodule.h"

namespace {

struct Row {
    std::string_view name;
    ModuleTraits traits;
};

constexpr Row fixedNames[] = {
    {"aacaenc", {.family = CodecFamily::aac}},
    {"ddaenc", {.family = CodecFamily::dolby}},
    {"ddproaenc", {.family = CodecFamily::dolby}},
    {"ddplusproaenc", {.family = CodecFamily::dolby}},
    {"dvcamdec", {.family = CodecFamily::dv}},
    {"dv100venc", {.family = CodecFamily::dv}},
    {"divxvenc", {.ownStatistics = true}},
    {"asfmux", {.watchDiscSpace = true}},
    {"scaler", {.onlyScales = true}},
    {"aquant", {.convertsFormat = true}},
    {"chconvert", {.convertsFormat = true}},
    {"srconvert", {.convertsFormat = true}},
};

constexpr struct {
    std::string_view name;
    CodecFamily family;
} families[] = {
    {"aac", CodecFamily::aac},
    {"dolby", CodecFamily::dolby},
    {"dv", CodecFamily::dv},
};

ModuleTraits fixedTraits(std::string_view name) {
    for (const Row& row : fixedNames)
        if (row.name == name) return row.traits;
    return {};
}

CodecFamily familyOf(std::string_view text) {
    for (const auto& row : families)
        if (row.name == text) return row.family;
    return CodecFamily::none;
}

void apply(bool& trait, const QvModule& module, const char* attribute) {
    if (const Any value = module.getAttr(attribute); value.isValid()) trait = value.isTrue();
}

}  // namespace

ModuleTraits qvModuleTraits(std::string_view name, const QvModule* module) {
    ModuleTraits traits = fixedTraits(name);
    if (!module) return traits;
    if (const Any family = module->getAttr("codecFamily"); family.isString())
        traits.family = familyOf(family.asString());
    apply(traits.onlyScales, *module, "onlyScales");
    apply(traits.convertsFormat, *module, "convertsFormat");
    apply(traits.ownStatistics, *module, "ownStatistics");
    apply(traits.watchDiscSpace, *module, "watchDiscSpace");
    return traits;
}

ModuleTraits qvModuleTraits(const QvCodec& codec) { return qvModuleTraits(codec.name(), codec.module()); }
