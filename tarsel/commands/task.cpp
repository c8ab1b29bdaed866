// tarsel task: shows, checks and changes task files.
#include <filesystem>
#include <set>

#include "tarsel/commands/commands.h"
#include "tarsel/host/console.h"
#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/outputs/outputs.h"
#include "tarsel/host/signals.h"
#include "tarsel/job/task/storedtask.h"
#include "tarsel/job/task/taskfiles.h"
#include "tarsel/job/task/tasktext.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

const std::vector<std::string> kActions = {"show", "check", "relink"};

struct Given {
    std::string action;
    std::vector<std::string> words;
    bool json = false;
};

void check(const StoredTask& task) {
    AnyDict state = task.enabled();
    changeTaskFiles(state, [](const std::string& name, TaskFileUse use) {
        if (use == TaskFileUse::input) requireInput(name);
        if (use == TaskFileUse::filterReads) requireFile(name);
        return name;
    });
    tell(Level::note, inQuotes(task.name()) + " is sound, and its inputs are there");
}

// A file, or all that is in a folder, under another name.
class Relink {
  public:
    // `rule`: OLD=NEW.
    Relink(const std::string& rule, const StoredTask& task)
        : folder_(fs::path(absoluteName(task.name())).parent_path()) {
        const size_t equals = rule.find('=');
        if (equals == std::string::npos || equals == 0 || equals + 1 == rule.size())
            throw failure(Msg::taskRelinkWrong, {"relink", rule});
        old_ = rule.substr(0, equals);
        new_ = rule.substr(equals + 1);
    }

    std::string operator()(const std::string& name) {
        const fs::path full = absolute(folder_ / name), from = absolute(old_), to = absolute(new_);
        fs::path changed;
        if (name == old_ || full == from)
            changed = to;
        else if (const fs::path rest = full.lexically_relative(from); !rest.empty() && *rest.begin() != "..")
            changed = to / rest;
        else
            return name;
        changed_.insert(name);
        return fs::path(name).is_absolute() ? changed.string() : changed.lexically_relative(folder_).string();
    }

    size_t count() const { return changed_.size(); }
    const std::string& old() const { return old_; }

  private:
    // Without "." and "..", and without a separator at the end.
    static fs::path absolute(const fs::path& name) {
        const fs::path whole = absoluteName(name.string());
        return whole.has_filename() ? whole : whole.parent_path();
    }

    fs::path folder_;
    std::string old_, new_;
    std::set<std::string> changed_;
};

void relink(const std::string& rule, const StoredTask& task, Signals& signals) {
    Relink change(rule, task);
    AnyDict state = task.raw();
    changeTaskFiles(state, [&](const std::string& name, TaskFileUse) { return change(name); });
    if (change.count() == 0) throw failure(Msg::taskRelinkNothing, {task.name(), change.old()});
    Outputs outputs(task.name(), "the task", {}, OutputPolicy(true));
    const Signals::Watch placing(signals, {.first = {}, .second = [&] { return outputs.leave(); }});
    const std::string reason = writeTask(state, outputs.begin("xml"));
    if (!reason.empty()) throw writeFailure(task.name(), outputs.withFinalNames(reason));
    outputs.commit();
    tell(Level::note, inQuotes(task.name()) + ": " + std::to_string(change.count()) +
                          (change.count() == 1 ? " name changed" : " names changed"));
}

void runAction(const Given& given, Signals& signals) {
    const bool relinks = given.action == "relink";
    const size_t wanted = relinks ? 2 : 1;
    if (given.words.size() != wanted)
        throw failure(relinks ? Msg::taskRelinkWords : Msg::taskWords, {given.action});
    const StoredTask task(given.words.back());
    if (relinks) return relink(given.words.front(), task, signals);
    if (given.action == "check") return check(task);
    printText(given.json ? taskJson(task) : taskText(task));
}

}  // namespace

void addTask(CommandLine& line, Signals& signals) {
    Command command = line.command("task", "Show or check a task file, or change the names of files in it");
    auto given = std::make_shared<Given>();
    command.choiceArgument("ACTION", given->action, "show, check, or relink OLD=NEW", kActions);
    command.arguments("TASK", given->words, "The task file; for relink, OLD=NEW in front of it", 2);
    command.flag("--json", given->json, "Show it as JSON");
    command.action([&signals, given] { runAction(*given, signals); });
}
