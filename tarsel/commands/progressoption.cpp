#include "tarsel/commands/progressoption.h"

#include "tarsel/host/events.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/messages.h"

void ProgressOption::add(Command& command) {
    command.option("--progress", text,
                   "How progress is shown: objects to FD or FILE, or stderr; or a line each SECONDS",
                   "auto|json[:FD|:FILE]|log[:SECONDS]|none", {"auto", "json", "log", "none"});
}

void ProgressOption::open(const std::string& output, std::vector<std::string> others, bool overwrite,
                          const std::string& version) {
    mode = parseProgress(text);
    if (mode.how != ProgressMode::How::json) return;
    if (mode.target == "1" && (output == "-" || output == "/dev/stdout"))
        throw failure(Msg::optionsExclude, {"--progress " + text, "-o " + output});
    others.push_back(output);
    std::erase(others, "");
    Events::get().open(mode.target, others, overwrite, version);
}

void openEventsFor(std::span<char*> words, const std::string& version) {
    for (size_t i = 1; i < words.size() && std::string_view(words[i]) != "--"; ++i) {
        const std::string word = words[i], name = "--progress";
        if (word.rfind(name, 0) != 0) continue;
        const bool whole = word == name && i + 1 < words.size();
        if (!whole && word.rfind(name + "=", 0) != 0) continue;
        try {
            const ProgressMode mode = parseProgress(whole ? words[i + 1] : word.substr(name.size() + 1));
            // Nothing that exists is emptied for it.
            if (mode.how == ProgressMode::How::json) Events::get().open(mode.target, {}, false, version);
        } catch (const Failure&) {
            // What is wrong with the line as a whole is said.
        }
        return;
    }
}
