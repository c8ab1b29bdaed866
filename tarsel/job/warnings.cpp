#include "tarsel/job/warnings.h"

#include <algorithm>

#include "tarsel/host/events.h"
#include "tarsel/host/plugins.h"
#include "tarsel/source/source.h"
#include "tarsel/words/messages.h"

void Warnings::add(const std::vector<std::string>& lines) {
    lines_.insert(lines_.end(), lines.begin(), lines.end());
}

void Warnings::addEngine(const std::function<std::string(std::string)>& named) {
    for (const std::string& text : engineWarnings()) {
        const std::string line = lineOf(Msg::engineWarns, {named(text)});
        if (std::find(lines_.begin(), lines_.end(), line) == lines_.end()) lines_.push_back(line);
    }
}

std::size_t Warnings::count() const { return lines_.size() + static_cast<std::size_t>(pluginWarnings()); }

void Warnings::show() const {
    for (const auto& line : lines_) tell(Level::warning, line);
}

void Warnings::refuse(bool quiet, const std::string& output) const {
    if (count() == 0) return;
    if (!quiet) show();
    throw failure(Msg::warningsCount, {output, std::to_string(count())});
}
