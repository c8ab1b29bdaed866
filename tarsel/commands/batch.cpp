// tarsel batch: lists of tasks, and their runs.
#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <map>
#include <set>

#include "tarsel/batch/batchfile.h"
#include "tarsel/batch/order.h"
#include "tarsel/batch/taskrun.h"
#include "tarsel/batch/taskstate.h"
#include "tarsel/cluster/slurm.h"
#include "tarsel/commands/batchcommands.h"
#include "tarsel/commands/commands.h"
#include "tarsel/host/console.h"
#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/signals.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

using Tasks = std::vector<BatchTask>;
using Words = std::vector<std::string>;

std::string tasksText(size_t count) { return std::to_string(count) + (count == 1 ? " task" : " tasks"); }

// --- Changes

BatchTask taskAt(const BatchFile& file, const QvBatchList& list, size_t index) {
    const Any& stored = static_cast<const AnyVector&>(list).at(static_cast<int>(index));
    return batchTask(stored.asDict(), static_cast<int>(index) + 1, file.folder());
}

// The indexes of the tasks that words name, each once, in the order of the list; "all" names all. The names
// of tasks cost a digest each, so they are made only where one is given.
std::vector<size_t> indexesOf(const BatchFile& file, const QvBatchList& list, const Words& words) {
    const auto size = static_cast<size_t>(list.size());
    Tasks tasks(size);
    const bool named = std::any_of(words.begin(), words.end(), [](const std::string& word) {
        return word != "all" && !isTaskNumber(word);
    });
    for (size_t i = 0; named && i < size; ++i) tasks[i].id = taskAt(file, list, i).id;
    std::set<size_t> found;
    for (const std::string& word : words) {
        if (word != "all") found.insert(findTask(tasks, word, file));
        for (size_t i = 0; word == "all" && i < size; ++i) found.insert(i);
    }
    return {found.begin(), found.end()};
}

void enable(const BatchFile& file, const Words& words, bool on) {
    size_t count = 0;
    file.change([&](QvBatchList& list) {
        for (const size_t i : indexesOf(file, list, words)) {
            count += list.isTaskEnabled(static_cast<int>(i)) == on ? 0 : 1;
            list.setTaskEnabled(static_cast<int>(i), on);
        }
    });
    tell(Level::note, tasksText(count) + (on ? " enabled" : " disabled"));
}

void move(const BatchFile& file, const std::string& task, const std::string& place) {
    file.change([&](QvBatchList& list) {
        const int from = static_cast<int>(indexesOf(file, list, {task}).front());
        const int to = isTaskNumber(place) ? std::stoi(place) - 1 : -1;
        if (to < 0 || to >= list.size())
            throw failure(Msg::batchPlace, {place, tasksText(static_cast<size_t>(list.size()))});
        const int step = to < from ? -1 : 1;
        for (int i = from; i != to; i += step) list.moveTask(i, step);
    });
}

void removeTasks(const BatchFile& file, const Words& words) {
    size_t count = 0;
    file.change([&](QvBatchList& list) {
        const std::vector<size_t> indexes = indexesOf(file, list, words);
        count = indexes.size();
        for (auto i = indexes.rbegin(); i != indexes.rend(); ++i) {
            const std::string name = file.journal(taskAt(file, list, *i).id);
            list.remove(static_cast<int>(*i));
            // What was done with a task means nothing without the task.
            if (!RecordFile::isLocked(name)) removeFile(name);
        }
    });
    tell(Level::note, tasksText(count) + " removed");
}

// --- What is there

Json rowOf(const BatchTask& task) {
    Json row = Json::object();
    row["number"] = task.number;
    row["id"] = task.id;
    row["enabled"] = task.enabled;
    Json inputs = Json::array();
    for (const std::string& input : task.inputs) inputs.push_back(validUtf8(input));
    row["inputs"] = inputs;
    row["output"] = validUtf8(task.output);
    return row;
}

void printRow(const BatchTask& task, const char* state) {
    std::string line = std::to_string(task.number) + "\t" + task.id + "\t" + state + "\t";
    for (const std::string& input : task.inputs) line += inQuotes(input) + " ";
    line += "-> " + (task.output.empty() ? std::string("nothing") : inQuotes(task.output));
    printText(line + "\n");
}

void list(const BatchFile& file, bool json) {
    Json rows = Json::array();
    for (const BatchTask& task : file.tasks()) {
        if (json)
            rows.push_back(rowOf(task));
        else
            printRow(task, task.enabled ? "enabled" : "disabled");
    }
    if (json) print("%s\n", rows.dump(2).c_str());
}

void status(const BatchFile& file, bool json) {
    Json rows = Json::array();
    std::map<std::string, size_t> counts;
    const Tasks tasks = file.tasks();
    const SlurmScheduler scheduler;
    TaskStates states(file, scheduler);
    for (const BatchTask& task : tasks) {
        const TaskState state = states.of(task);
        ++counts[state.name];
        const bool failed = state.name == std::string_view("failed");
        const std::string end = states.endOf(task, state), job = states.jobOf(task);
        if (!json) {
            printRow(task, state.name);
            if (failed) printText("\t" + state.record.failure + "\n");
            if (!end.empty()) printText("\tthe scheduler: " + end + "\n");
            continue;
        }
        Json row = rowOf(task);
        row["state"] = state.name;
        row["status"] = failed ? Json(state.record.status) : Json(nullptr);
        row["job"] = job.empty() ? Json(nullptr) : Json(job);
        row["end"] = end.empty() ? Json(nullptr) : Json(validUtf8(end));
        row["error"] = failed ? Json(validUtf8(state.record.failure)) : Json(nullptr);
        rows.push_back(row);
    }
    if (json) return print("%s\n", rows.dump(2).c_str());
    std::string line = tasksText(tasks.size());
    for (const auto& [name, count] : counts) line += ", " + std::to_string(count) + " " + name;
    printText(line + "\n");
}

// --- check

class Check {
  public:
    explicit Check(const BatchFile& file) : file_(file) {}

    void run() {
        QvBatchList list = file_.load();
        int number = 0;
        for (const Any& stored : list) check(batchTask(stored.asDict(), ++number, file_.folder()));
        if (faults_ > 0)
            throw failure(Msg::batchTasksUnsound,
                          {file_.shown(), std::to_string(faults_), std::to_string(number)});
        tell(Level::note, inQuotes(file_.shown()) + " is sound: " + tasksText(static_cast<size_t>(number)));
    }

  private:
    void check(const BatchTask& task) {
        if (!task.enabled) return;
        try {
            requireSound(task, shownTask(file_, task));
            for (const std::string& input : task.inputs)
                if (outputs_.writersOf(places_.of(input)).empty()) requireInput(input);
            if (!task.output.empty() && !isDevice(task.output))
                requireFolder(fs::path(task.output).parent_path().string(), task.output);
            for (const std::string& place : places_.writtenBy(task)) claim(task, place);
        } catch (const Failure& fault) {
            ++faults_;
            tell(Level::warning, "task " + std::to_string(task.number) + ": " + fault.what());
        }
    }

    void claim(const BatchTask& task, const std::string& place) {
        const auto [other, first] = owners_.emplace(place, task.number);
        if (!first) throw failure(Msg::batchOutputTwice, {place, std::to_string(other->second)});
        outputs_.add(static_cast<size_t>(task.number), place);
    }

    const BatchFile& file_;
    Places places_;
    OutputIndex outputs_;
    std::map<std::string, int> owners_;  // the task that writes to a place
    int faults_ = 0;
};

}  // namespace

void addBatch(CommandLine& line, Signals& signals, const std::string& version,
              const std::vector<std::string>& words, const std::string& log) {
    Command batch = line.command("batch", "Keep a LIST of tasks and run them");
    const auto name = std::make_shared<std::string>();
    batch.argument("LIST", *name, "A list of tasks (XML)");

    struct Given {
        Words tasks;
        bool json = false, overwrite = false;
    };
    const auto given = std::make_shared<Given>();
    const auto withTasks = [&](const char* command, const char* help, auto action) {
        Command one = batch.command(command, help);
        one.arguments("TASK", given->tasks, "Numbers or names of tasks, or all");
        one.action([name, given, action] { action(BatchFile(*name), given->tasks); });
    };
    const auto showing = [&](const char* command, const char* help, auto action) {
        Command one = batch.command(command, help);
        one.flag("--json", given->json, "Show it as JSON");
        one.action([name, given, action] { action(BatchFile(*name), given->json); });
    };

    Command fresh = batch.command("new", "Make an empty list");
    fresh.flag("-y,--overwrite", given->overwrite, "Empty a list that exists");
    fresh.action([name, given] { BatchFile(*name).make(given->overwrite); });
    addBatchAdd(batch, signals, name, words);
    showing("list", "Show the tasks", list);
    withTasks("enable", "Let runs include tasks again",
              [](const BatchFile& file, const Words& tasks) { enable(file, tasks, true); });
    withTasks("disable", "Keep tasks in the list, but don't run them",
              [](const BatchFile& file, const Words& tasks) { enable(file, tasks, false); });
    Command moving = batch.command("move", "Put a task at another place");
    moving.arguments("TASK", given->tasks, "The task, then the number that it is to have", 2);
    moving.action([name, given] {
        if (given->tasks.size() != 2) throw failure(Msg::batchWords, {"move", "move"});
        move(BatchFile(*name), given->tasks[0], given->tasks[1]);
    });
    withTasks("remove", "Take tasks out of the list", removeTasks);
    Command checking = batch.command("check", "Check whether the tasks can be run");
    checking.action([name] { Check(BatchFile(*name)).run(); });
    showing("status", "Show what was done and what is left", status);
    addBatchRun(batch, signals, name, version, log);
    addBatchCluster(batch, name, log);
}
