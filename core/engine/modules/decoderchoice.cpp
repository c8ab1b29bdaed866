#include "core/engine/modules/decoderchoice_p.h"

#include "core/engine/modules/qvmodule.h"

namespace {

bool isDecoder(const QvModule& module) { return module.getAttr("type") == Any(QvModuleType::decoder); }

QvKnownModules enabledDecoders(QvKnownModules modules) {
    std::erase_if(modules, [](const QvModule* m) { return !isDecoder(*m) || qvIsDisabled(*m); });
    return modules;
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
int bestOf(const QvKnownModules& candidates, const Any& ext) {
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

}  // namespace

bool qvIsDisabled(const QvModule& module) { return module.getAttr("disabled").asInt32(0) != 0; }

std::unique_ptr<AnyVector> qvInputExtensions(const QvKnownModules& modules, bool dot, bool star) {
    AnyVector known;
    for (const QvModule* decoder : enabledDecoders(modules)) {
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
    return patterns;
}

AnyVector qvDecodersFor(const QvKnownModules& modules, const char* ext) {
    const Any wanted(ext ? ext : "");
    QvKnownModules candidates = enabledDecoders(modules);
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
