#include "tarsel/job/post.h"

#include <algorithm>
#include <filesystem>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/host/command.h"
#include "tarsel/host/events.h"
#include "tarsel/words/messages.h"

namespace {

std::string quoted(const std::string& name) { return QvFile::shellQuote(Any(name.c_str())).asString(); }

// The name that the digits at `at` count from 1, all names when they count none of them. Moves `at` past
// them.
std::string counted(const std::vector<std::string>& names, const std::string& command, size_t& at) {
    size_t number = 0;
    for (; at < command.size() && command[at] >= '0' && command[at] <= '9'; ++at) {
        const size_t next = number * 10 + static_cast<size_t>(command[at] - '0');
        if (next == 0 || next > names.size()) break;
        number = next;
    }
    if (number > 0) return quoted(names[number - 1]);
    std::string all;
    for (const auto& name : names) all += (all.empty() ? "" : " ") + quoted(name);
    return all;
}

std::string baseName(const std::vector<std::string>& outputs) {
    const std::string stem = std::filesystem::path(outputs.front()).stem().string();
    return outputs.size() > 1 ? stem.substr(0, stem.rfind('#')) : stem;
}

std::string folderName(const std::string& output) {
    const std::string folder = std::filesystem::path(output).parent_path().string();
    return folder.empty() ? "./" : folder + "/";
}

// The standard output that has the result, and a stream that has the objects of --progress, get nothing else.
const char* redirection(bool outputTaken) {
    const int objects = Events::get().descriptor();
    const bool noOutput = objects == 1 || outputTaken, noErrors = objects == 2;
    return noOutput && noErrors ? "exec >/dev/null 2>&1\n"
           : noOutput           ? "exec 1>&2\n"
           : noErrors           ? "exec 2>&1\n"
                                : "";
}

}  // namespace

std::string postCommand(const std::string& command, const std::vector<std::string>& inputs,
                        const std::vector<std::string>& outputs) {
    std::string result;
    for (size_t i = 0; i < command.size();) {
        const std::string two = command.substr(i, 2), three = command.substr(i, 3);
        if (three == "%op" && !outputs.empty()) {
            result += quoted(folderName(outputs.front()));
            i += 3;
        } else if (three == "%ob" && !outputs.empty()) {
            result += quoted(baseName(outputs));
            i += 3;
        } else if (two == "%i" || two == "%o") {
            result += counted(two == "%i" ? inputs : outputs, command, i += 2);
        } else {
            result += command[i++];
        }
    }
    return result;
}

bool postNames(const std::string& command, const std::vector<std::string>& inputs, const std::string& input) {
    std::vector<std::string> others = inputs;
    std::replace(others.begin(), others.end(), input, input + "x");
    return postCommand(command, inputs, {}) != postCommand(command, others, {});
}

void runPost(const PostJob& job, Signals& signals) {
    const std::string first = job.outputs.empty() ? job.output : job.outputs.front();
    const auto stopIfSignalled = [&](Msg why) {
        if (const Exit signalled = signals.received(); signalled != Exit::done)
            throw Failure(signalled, lineOf(why, {first}));
    };
    stopIfSignalled(Msg::stoppedBeforePost);
    const std::string line = redirection(job.outputTaken) + postCommand(job.command, job.inputs, job.outputs);
    const auto report = [] { tell(Level::note, lineOf(Msg::postRuns)); };
    ShellCommand command;
    int status = 0;
    {
        const Signals::Watch running(signals, {.first = [&](int signal) { command.signal(signal); },
                                               .second = [&] { return command.kill(), false; },
                                               .report = report,
                                               .last = Msg::stoppedInPost,
                                               .file = first});
        command.start(line);
        // One that came before there was anybody to pass it on.
        if (const int signal = signals.number()) command.signal(signal);
        status = command.wait();
    }
    stopIfSignalled(Msg::stoppedInPost);
    if (status == 0) return;
    if (status < 0) throw failure(Msg::postNotRun, {job.output});
    throw failure(Msg::postFailed, {std::to_string(status), job.output});
}
