#include "tarsel/watch/arrivals.h"

#include <algorithm>

void Arrivals::see(const std::string& name, const FileFacts& facts, long long now) {
    if (facts.kind == FileFacts::Kind::absent) return forget(name);
    const auto [place, fresh] = files_.try_emplace(name);
    Entry& entry = place->second;
    if (!fresh && entry.facts == facts) return;
    entry.facts = facts;
    entry.due = std::max(now + settle_, entry.postponed ? entry.due : 0);
}

void Arrivals::postpone(const std::string& name, long long now, long long delay) {
    const auto place = files_.find(name);
    if (place == files_.end()) return;
    place->second.due = now + delay;
    place->second.postponed = true;
}

std::optional<std::string> Arrivals::due(long long now) const {
    auto first = files_.end();
    for (auto at = files_.begin(); at != files_.end(); ++at)
        if (at->second.due <= now && (first == files_.end() || at->second.due < first->second.due))
            first = at;
    if (first == files_.end()) return std::nullopt;
    return first->first;
}

std::optional<long long> Arrivals::next() const {
    std::optional<long long> next;
    for (const auto& [name, entry] : files_) next = std::min(next.value_or(entry.due), entry.due);
    return next;
}

const FileFacts* Arrivals::facts(const std::string& name) const {
    const auto place = files_.find(name);
    return place == files_.end() ? nullptr : &place->second.facts;
}
