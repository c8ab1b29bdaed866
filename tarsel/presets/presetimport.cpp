#include "tarsel/presets/presetimport.h"

#include <optional>
#include <unordered_map>

#include "tarsel/presets/presetsearch.h"
#include "tarsel/presets/presetstore.h"
#include "tarsel/presets/presetwords.h"
#include "tarsel/words/failure.h"

namespace {

constexpr int kOlderForm = 1;

std::string cleanName(const std::string& given) {
    const std::string name = presetNameOf(given);
    return name.empty() ? "preset" : name;
}

// The names that presets have, and which ones are still free.
class Names {
  public:
    explicit Names(const QvUserPresets& presets) {
        for (std::string& name : builtinFoldedNames()) places_.emplace(std::move(name), -1);
        for (int i = 0; i < presets.count(); ++i) take(presets.at(i).name(), i);
    }
    void take(const std::string& name, int place) { places_.emplace(foldedName(name), place); }
    bool isFree(const std::string& name) const { return !places_.contains(foldedName(name)); }
    // Of a preset that may be replaced.
    std::optional<int> placeOf(const std::string& name) const {
        const auto found = places_.find(foldedName(name));
        return found == places_.end() || found->second < 0 ? std::nullopt : std::optional(found->second);
    }
    std::string numbered(const std::string& name) {
        int& number = numbers_[foldedName(name)];
        std::string other;
        do other = name + " (" + std::to_string(++number) + ")";
        while (!isFree(other));
        return other;
    }

  private:
    std::unordered_map<std::string, int> places_;   // -1 for built-in presets
    std::unordered_map<std::string, int> numbers_;  // the last one that each name got
};

}  // namespace

ImportReport importPresets(const std::string& file, bool overwrite, QvUserPresets& presets) {
    ImportReport report;
    QvUserPresets fresh;
    int form = 0;
    report.skipped = loadPresets(file, fresh, &form);
    Names names(presets);
    for (int i = 0; i < fresh.count(); ++i) {
        QvPreset preset = fresh.at(i);
        const std::string given = preset.name();
        std::string name = cleanName(given);
        if (form == kOlderForm)
            report.lines.push_back(inQuotes(given) + " converted to the profile " + preset.symbol());
        if (form == kOlderForm && preset.isDisabled())
            report.lines.push_back(inQuotes(given) + " is hidden: its profile is not available here");
        if (const auto place = overwrite ? names.placeOf(name) : std::nullopt) {
            name = presets.at(*place).name();
            preset.set("name", name.c_str());
            presets.AnyVector::set(*place, Any(preset));
            ++report.replaced;
            report.lines.push_back(inQuotes(name) + " replaced");
            continue;
        }
        if (!names.isFree(name)) name = names.numbered(name);
        if (name != given)
            report.lines.push_back(inQuotes(given) + " renamed to " + inQuotes(name) +
                                   ": the name can't be given, or is in use");
        preset.set("name", name.c_str());
        names.take(name, presets.count());
        presets.AnyVector::append(Any(preset));  // its name is known to be free
        ++report.added;
    }
    return report;
}
