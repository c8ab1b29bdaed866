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
    {"srconvert", {.convertsFormat = true, .convertsRate = true}},
    {"adelay", {.delays = true}},
    {"deinterlace", {.deinterlaces = true}},
    {"bobber", {.deinterlaces = true}},
    {"frconvert", {.repeatsFrames = true}},
    {"rawaenc", {.uncompressed = true}},
    {"rawvenc", {.uncompressed = true}},
    {"mj2kvenc", {.wholePictures = true}},
    {"mpegvenc", {.matchesGop = true}},
};

constexpr struct {
    const char* attribute;
    bool ModuleTraits::*trait;
} switches[] = {
    {"onlyScales", &ModuleTraits::onlyScales},       {"convertsFormat", &ModuleTraits::convertsFormat},
    {"ownStatistics", &ModuleTraits::ownStatistics}, {"watchDiscSpace", &ModuleTraits::watchDiscSpace},
    {"convertsRate", &ModuleTraits::convertsRate},   {"delays", &ModuleTraits::delays},
    {"deinterlaces", &ModuleTraits::deinterlaces},   {"repeatsFrames", &ModuleTraits::repeatsFrames},
    {"uncompressed", &ModuleTraits::uncompressed},   {"wholePictures", &ModuleTraits::wholePictures},
    {"matchesGop", &ModuleTraits::matchesGop},
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

}  // namespace

ModuleTraits qvModuleTraits(std::string_view name, const QvModule* module) {
    ModuleTraits traits = fixedTraits(name);
    if (!module) return traits;
    if (const Any family = module->getAttr("codecFamily"); family.isString())
        traits.family = familyOf(family.asString());
    for (const auto& [attribute, trait] : switches)
        if (const Any value = module->getAttr(attribute); value.isValid()) traits.*trait = value.isTrue();
    return traits;
}

ModuleTraits qvModuleTraits(const QvCodec& codec) { return qvModuleTraits(codec.name(), codec.module()); }
