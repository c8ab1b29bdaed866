#include "core/preset/loadedpresets_p.h"

QvLoadedPresets::QvLoadedPresets(QvPresetList& list, Names names) : list_(list), names_(names) {
    for (int i = 0; i < list.size(); ++i)
        if (list.at(i).isDict()) places_.emplace(list.at(i).asDict().getString("name", ""), i);
}

// Names are not given back while a file is loaded, so the search continues after the last number.
std::string QvLoadedPresets::freeName(const std::string& name) {
    int& number = numbers_[name];
    std::string numbered;
    do numbered = name + " (" + std::to_string(++number) + ")";
    while (places_.contains(numbered));
    return numbered;
}

void QvLoadedPresets::add(QvPreset preset) {
    std::string name = preset.name();
    const auto used = places_.find(name);
    if (names_ != Names::asTheyAre && used != places_.end()) {
        if (names_ == Names::replace) {
            preset.setName(name.c_str());
            list_.set(used->second, Any(preset));
            return;
        }
        name = freeName(name);
        preset.set("name", name.c_str());
    }
    places_.emplace(name, list_.size());
    list_.append(static_cast<const AnyDict&>(preset));
}
