// The catalogue of presets: what an update costs with few and with many modules, compared with a copy of the
// list that it makes and a walk through the modules that it looks at.
#include <benchmark/benchmark.h>

#include <string>

#include "bench/ratio.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"
#include "tests/support/preset_modules.h"

namespace {

// What every update has to do at least: ask each module for its name, and make the presets.
void leastWork(QvPresetList& made) {
    const QvRegistry& registry = *qv_registry();
    std::size_t letters = 0;
    for (int i = 0, n = registry.nrModules(); i < n; ++i)
        letters += std::string(registry.module(i)->name()).size();
    benchmark::DoNotOptimize(letters);
    made = qvPresetMgr()->builtinPresets();
}

void measure(QvRatioBench& bench, const std::string& what, double aim) {
    QvPresetMgr& catalogue = *qvPresetMgr();
    catalogue.update();
    QvPresetList made;
    bench.compare(
        "update with " + what + " : the least work", aim, [&] { catalogue.update(); },
        [&] { leastWork(made); });
    const double begin = qvBenchSeconds(QvBenchClock::thread);
    for (int i = 0; i < 20; ++i) catalogue.update();
    const double each = (qvBenchSeconds(QvBenchClock::thread) - begin) / 20;
    QvRatioBench::tell("  " + std::to_string(qv_registry()->nrModules()) + " modules, " +
                           std::to_string(catalogue.builtinPresets().size()) + " presets",
                       each * 1e3, "ms");
}

// Encoders with a pair and a preset of their own, until there are `count` modules.
void fillUp(PresetModules& modules, int count) {
    AnyVector presets;
    while (qv_registry()->nrModules() < count) {
        const Any name = Any::sprintf("own%03dvenc", presets.size());
        modules.add(name.asString()).setAttr("compatMuxers", AnyVector("rawmux", "mp4mux"));
        AnyDict preset("profile", QvProfile::firstOfPlugins + presets.size(), "name", name, "group", "Own");
        preset.set("video", AnyVector(name));
        preset.set("audio", AnyVector("aacaenc", "rawaenc"));
        preset.set("muxers", AnyVector("mp4mux", "rawmux"));
        presets.append(preset);
    }
    modules.plugin().setAttr("presets", presets);
}

}  // namespace

int main() {
    QvRatioBench bench("catalogue of presets", QvBenchClock::thread);
    {
        const PresetModules builtin;
        measure(bench, "the built-in modules", 40);
    }
    PresetModules modules(PresetModules::all());
    measure(bench, "all modules of the tables", 6);
    fillUp(modules, 200);
    measure(bench, "200 modules", 8);
}
