#include "tarsel/batch/arrays.h"

#include <algorithm>

#include "tarsel/cluster/shellword.h"

std::vector<TaskArray> arraysOf(const std::vector<TaskPlace>& places,
                                const std::vector<std::vector<Before>>& order, size_t most) {
    const size_t count = places.size();
    std::vector<size_t> levels(count, 0), arrayOf(count, 0);
    std::vector<std::vector<size_t>> byLevel;
    for (size_t i = 0; i < count; ++i) {
        if (!places[i].due) continue;
        // Those that wait for what is queued already hold up no others either.
        for (const Before& before : order[i]) {
            const TaskPlace& earlier = places[before.task];
            if (earlier.due) levels[i] = std::max(levels[i], levels[before.task] + 1);
            if (!earlier.job.empty()) levels[i] = std::max(levels[i], size_t{1});
        }
        if (byLevel.size() <= levels[i]) byLevel.resize(levels[i] + 1);
        byLevel[levels[i]].push_back(i);
    }
    std::vector<TaskArray> arrays;
    for (const std::vector<size_t>& level : byLevel)  // the first may be empty
        for (size_t k = 0; k < level.size(); ++k) {
            if (k % most == 0) arrays.emplace_back();
            const size_t task = level[k];
            arrayOf[task] = arrays.size() - 1;
            arrays.back().tasks.push_back(task);
            for (const Before& before : order[task]) {
                if (places[before.task].due) arrays.back().after.insert(arrayOf[before.task]);
                if (!places[before.task].job.empty()) arrays.back().jobs.insert(places[before.task].job);
            }
        }
    return arrays;
}

std::string ElementScript::text() const {
    const std::string most = std::to_string(mostCores);
    std::string script = "#!/bin/sh\nset --";
    for (size_t i = 0; i < tasks.size(); ++i) script += " " + tasks[i] + "@" + places[i];
    script += "\nshift " + index + "\ncores=" + cores;
    script += "\n[ \"$cores\" -le " + most + " ] || cores=" + most + "\nexec " + shellWord(words.at(0));
    if (!log.empty()) script += " --log " + shellWord(log + ".") + "\"${1%@*}\"";
    for (size_t i = 1; i < words.size(); ++i) script += " " + shellWord(words[i]);
    return script + " --threads \"$cores\" --task \"${1%@*}\" --snapshot " + shellWord(snapshot + "@") +
           "\"${1#*@}\"\n";
}
