// The registry's view of modules: lookup, creation, decoders by extension, overrides.
#include <limits>
#include <vector>

#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvcodec.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"

namespace {

const char* withoutAlias(const char* name) {
    const Any asked(name);
    return asked == "colorconv" || asked == "scaler2" ? "scaler" : name;
}

bool isDisabled(const QvModule& module) { return module.getAttr("disabled").asInt32(0) != 0; }
bool isDecoder(const QvModule& module) { return module.getAttr("type") == Any(QvModuleType::decoder); }

// Every module of the registry in order, for range-for.
std::vector<QvModule*> allModules(const QvRegistry& registry) {
    std::vector<QvModule*> found;
    for (int p = 0; p < registry.nrPlugins(); ++p)
        for (int i = 0; i < registry.plugin(p)->nrModules(); ++i)
            found.push_back(registry.plugin(p)->module(i));
    return found;
}

std::vector<QvModule*> enabledDecoders(const QvRegistry& registry) {
    std::vector<QvModule*> found = allModules(registry);
    std::erase_if(found, [](const QvModule* m) { return !isDecoder(*m) || isDisabled(*m); });
    return found;
}

bool namesExtension(const QvModule& module, const Any& ext) {
    const Any exts = module.getAttr("exts");
    return exts.isVector() && exts.asVector().contains(ext);
}

constexpr long long defaultPriority = 99;
constexpr long long anyFilePenalty = 101;  // knows the file only through "*"
constexpr long long worstScore = 666;      // a decoder of this score or above is never tried

long long scoreOf(const QvModule& module, const Any& ext) {
    const Any priority = module.getAttr("priority");
    const long long score = priority.isInt32() ? priority.asInt32() : defaultPriority;
    return namesExtension(module, ext) ? score : score + anyFilePenalty;
}

// Index of the smallest score, the first on a tie; -1 if none is below the worst.
int bestOf(const std::vector<QvModule*>& candidates, const Any& ext) {
    int best = -1;
    long long bestScore = worstScore;
    for (std::size_t i = 0; i < candidates.size(); ++i) {
        const long long score = scoreOf(*candidates[i], ext);
        if (score >= bestScore) continue;
        bestScore = score;
        best = static_cast<int>(i);
    }
    return best;
}

AnyDict changedAttributes(const QvModule& module, const AnyDict& defaults) {
    AnyDict attributes;
    module.getAttrs(attributes);
    AnyDict changed;
    for (const auto& [key, value] : attributes)
        if (*value != defaults.get(key)) changed.set(key, *value);
    return changed;
}

void overrideAttributes(QvModule& module, const AnyDict& attributes) {
    for (const auto& [key, value] : attributes) module.setAttr(key, *value);
}

}  // namespace

int QvRegistry::nrModules(int type) const {
    int count = 0;
    for (const QvPlugin* plugin : plugins_)
        for (int i = 0; i < plugin->nrModules(); ++i)
            if (type == 0 || plugin->module(i)->getAttr("type") == Any(type)) ++count;
    return count;
}

QvModule* QvRegistry::module(int index) const {
    for (const QvPlugin* plugin : plugins_) {
        if (index < plugin->nrModules()) return plugin->module(index);
        index -= plugin->nrModules();
    }
    return nullptr;
}

QvModule* QvRegistry::module(const char* name) const {
    if (!name) return nullptr;
    const Any wanted(withoutAlias(name));
    for (const QvPlugin* plugin : plugins_)
        for (int i = 0; i < plugin->nrModules(); ++i)
            if (wanted == plugin->module(i)->name()) return plugin->module(i);
    return nullptr;
}

QvCodec* QvRegistry::newCodec(const char* name) {
    QvModule* found = module(name);
    std::unique_ptr<QvCodec> codec(found ? found->create() : nullptr);
    if (!codec || codec->init() != QvStatus::ok) return nullptr;
    return codec.release();
}

AnyVector QvRegistry::modules(int type) const {
    return type ? modules(AnyVector(Any(type))) : modules(AnyVector());
}

AnyVector QvRegistry::modules(const AnyVector& types) const {
    AnyVector found;
    for (QvModule* module : allModules(*this)) {
        const Any type = module->getAttr("type");
        if (!types.empty() && !(type.isInt32() && types.contains(type))) continue;
        AnyDict row;
        row.set("name", module->name());
        row.set("desc", module->desc());
        row.set("module", static_cast<const void*>(module));
        found.append(row);
    }
    return found;
}

bool QvRegistry::isModuleEnabled(const char* name) const {
    const QvModule* found = module(name);
    return found && !isDisabled(*found);
}

const AnyDict* QvRegistry::moduleDefaults(const char* name) const {
    const Any& defaults = moduleDefaults_.get(name);
    return defaults.isDict() ? &defaults.asDict() : nullptr;
}

bool QvRegistry::isOverriden(const QvModule* module) const {
    const AnyDict* defaults = module ? moduleDefaults(module->name()) : nullptr;
    if (!defaults) return false;
    AnyDict attributes;
    module->getAttrs(attributes);
    return attributes != *defaults;
}

void QvRegistry::getModuleOverrides(AnyDict& overrides) const {
    overrides.clear();
    for (const QvModule* module : allModules(*this)) {
        const AnyDict* defaults = moduleDefaults(module->name());
        const AnyDict changed = changedAttributes(*module, defaults ? *defaults : AnyDict());
        if (!changed.empty()) overrides.set(module->name(), changed);
    }
}

void QvRegistry::setModuleOverrides(const AnyDict& overrides) {
    for (const auto& [name, attributes] : overrides) {
        QvModule* found = module(name);
        if (!found)
            qv_dbg()->debug("Found overrides for module %s, but it is not loaded, skipping.", name);
        else if (!attributes->isDict())
            qv_dbg()->error("Found overrides for module %s, error in format, skipping.", name);
        else
            overrideAttributes(*found, attributes->asDict());
    }
}

AnyVector* QvRegistry::inputExts(bool dot, bool star) const {
    AnyVector known;
    for (const QvModule* decoder : enabledDecoders(*this)) {
        const Any exts = decoder->getAttr("exts");
        if (!exts.isVector()) continue;
        for (const Any& ext : exts.asVector())
            if (!known.contains(ext)) known.append(ext);
    }
    const char* format = dot && star ? "*.%s" : star ? "*%s" : dot ? ".%s" : "%s";
    auto patterns = std::make_unique<AnyVector>();
    for (const Any& name : known) {
        const Any ext = name.toString();
        if (ext.isString() && ext != "*") patterns->append(Any::sprintf(format, ext.asString()));
    }
    return patterns.release();
}

AnyVector QvRegistry::decoders(const char* ext) const {
    const Any wanted(ext ? ext : "");
    std::vector<QvModule*> candidates = enabledDecoders(*this);
    std::erase_if(candidates, [&](const QvModule* m) {
        return m->getAttr("skipAuto").isTrue() ||
               !(namesExtension(*m, wanted) || namesExtension(*m, Any("*")));
    });
    AnyVector names;
    for (int best = bestOf(candidates, wanted); best >= 0; best = bestOf(candidates, wanted)) {
        names.append(Any(candidates[static_cast<std::size_t>(best)]->name()));
        candidates.erase(candidates.begin() + best);
    }
    return names;
}
