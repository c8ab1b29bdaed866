#include "tarsel/cluster/slurm.h"

#include <algorithm>
#include <charconv>
#include <optional>
#include <set>
#include <sstream>
#include <string_view>

#include "tarsel/host/command.h"
#include "tarsel/words/messages.h"

namespace {

using Words = std::vector<std::string>;

// Seconds that a program may take.
constexpr double kChangeTimeout = 60;  // to submit or cancel
constexpr double kQueueTimeout = 30;   // to list the queue
constexpr double kHistoryTimeout = 5;  // for ended jobs, which are not essential

// Variables of the environment, or their prefixes, that change what these programs do or print. The programs
// don't get them.
const Words& changingVariables() {
    static const Words prefixes = {"SQUEUE_",      "SCANCEL_",         "SACCT_",         "SBATCH_ARRAY_INX=",
                                   "SBATCH_WAIT=", "SBATCH_CLUSTERS=", "SLURM_CLUSTERS="};
    return prefixes;
}

// Options of sbatch that this tool sets itself, or with which it could not follow the array.
constexpr std::string_view kForbiddenLetters = "JadMWhVQ";
constexpr std::string_view kForbiddenOptions[] = {
    "--job-name", "--array",    "--dependency", "--clusters", "--wait", "--help",  "--usage",
    "--version",  "--parsable", "--test-only",  "--quiet",    "--wrap", "--jobid", "--no-kill-on-invalid-dep",
};
// Short options without a value: other letters may follow in the same word.
constexpr std::string_view kFlagLetters = "bHIkOsuv";
constexpr size_t kShortestPrefix = 4;  // long options may be shortened; shorter than this they are ambiguous

bool isForbidden(std::string_view word) {
    if (!word.starts_with("--")) {
        const size_t last = std::min(word.find_first_not_of(kFlagLetters, 1), word.size() - 1);
        return kForbiddenLetters.find(word[last]) != std::string_view::npos;
    }
    const std::string_view name = word.substr(0, word.find('='));
    return std::any_of(
        std::begin(kForbiddenOptions), std::end(kForbiddenOptions),
        [&](std::string_view whole) { return name.size() >= kShortestPrefix && whole.starts_with(name); });
}

// Slurm replaces '%' and a letter in the name of an output by a value; "%%" is a '%'. A '\' switches that
// off, so a name that has one can't be written safely.
std::string outputName(const std::string& name) {
    if (name.find('\\') != std::string::npos) return "/dev/null";
    std::string pattern;
    for (const char c : name) pattern += c == '%' ? std::string("%%") : std::string(1, c);
    return pattern;
}

std::optional<size_t> indexOf(const std::string& text) {
    size_t index = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), index);
    if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
    return index;
}

Words fieldsOf(const std::string& line, char separator) {
    Words fields;
    std::istringstream text(line);
    for (std::string field; std::getline(text, field, separator);) fields.push_back(field);
    return fields;
}

Answer ask(const Words& words, const std::string& input, double seconds) {
    return askProgram(words, input, seconds, changingVariables());
}

[[noreturn]] void refuse(const std::string& program, const std::string& text) {
    throw failure(Msg::schedulerRefuses, {program, text.empty() ? "it says nothing" : inLine(text)});
}

Answer askOrThrow(const Words& words, const std::string& input, double seconds) {
    Answer answer = ask(words, input, seconds);
    if (answer.status != 0) refuse(words[0], answer.err);
    return answer;
}

}  // namespace

std::string SlurmScheduler::indexWord() const { return "\"$SLURM_ARRAY_TASK_ID\""; }
std::string SlurmScheduler::coresWord() const {
    return "\"${SLURM_CPUS_ON_NODE:-${SLURM_CPUS_PER_TASK:-1}}\"";
}

// sbatch takes a word that is no option for the script, so each value has to be in the word of its option.
void SlurmScheduler::checkOptions(const Words& options) const {
    for (const std::string& word : options) {
        if (word.size() < 2 || word[0] != '-' || word == "--") throw failure(Msg::schedulerWord, {word});
        if (isForbidden(word)) throw failure(Msg::schedulerOwnOption, {word});
    }
}

std::string SlurmScheduler::submit(const ClusterArray& array) const {
    Words words = {"sbatch",
                   "--parsable",
                   "--job-name=" + array.name,
                   "--array=0-" + std::to_string(array.size - 1) +
                       (array.atOnce > 0 ? "%" + std::to_string(array.atOnce) : ""),
                   "--output=" + outputName(array.output),
                   "--open-mode=append"};
    if (!array.after.empty()) words.push_back("--dependency=afterany:" + joined(array.after, ":"));
    words.insert(words.end(), array.options.begin(), array.options.end());
    const Answer answer = askOrThrow(words, array.script, kChangeTimeout);
    // "123" or "123;cluster"
    const std::string job = answer.out.substr(0, answer.out.find_first_of(";\n"));
    if (!indexOf(job)) refuse(words[0], answer.out + answer.err);
    return job;
}

std::vector<ClusterElement> SlurmScheduler::elements(const Words& arrays) const {
    std::vector<ClusterElement> elements;
    if (arrays.empty()) return elements;
    const std::set<std::string> wanted(arrays.begin(), arrays.end());
    const Answer answer =
        askOrThrow({"squeue", "--noheader", "--array", "--format=%j|%F|%K|%T|%r"}, "", kQueueTimeout);
    // An element that is missing here would be submitted again, so a truncated answer is an error.
    if (!answer.out.empty() && answer.out.back() != '\n') throw failure(Msg::schedulerGarbled, {"squeue"});
    for (const std::string& line : fieldsOf(answer.out, '\n')) {
        const Words fields = fieldsOf(line, '|');
        if (fields.empty() || !wanted.count(fields[0])) continue;
        const auto index = fields.size() >= 4 && indexOf(fields[1]) ? indexOf(fields[2]) : std::nullopt;
        if (!index) throw failure(Msg::schedulerGarbled, {"squeue"});
        elements.push_back(
            {fields[0], fields[1], *index, fields[3] == "PENDING", fields.size() > 4 ? fields[4] : ""});
    }
    return elements;
}

std::map<std::pair<std::string, size_t>, std::string> SlurmScheduler::ends(const Words& arrays) const {
    std::map<std::pair<std::string, size_t>, std::string> ends;
    if (arrays.empty()) return ends;
    Answer answer;
    try {
        answer = ask({"sacct", "--noheader", "--allocations", "--parsable2", "--starttime=now-30days",
                      "--name=" + joined(arrays, ","), "--format=JobName,JobID,State"},
                     "", kHistoryTimeout);
    } catch (const Failure&) {
        return ends;
    }
    if (answer.status != 0) return ends;
    for (const std::string& line : fieldsOf(answer.out, '\n')) {
        const Words fields = fieldsOf(line, '|');
        if (fields.size() != 3) continue;
        const size_t at = fields[1].find('_');
        if (const auto index = at == std::string::npos ? std::nullopt : indexOf(fields[1].substr(at + 1)))
            ends[{fields[0], *index}] = fields[2];
    }
    return ends;
}

void SlurmScheduler::cancel(const Words& jobs) const {
    if (jobs.empty()) return;
    Words words = {"scancel", "--quiet"};
    words.insert(words.end(), jobs.begin(), jobs.end());
    askOrThrow(words, "", kChangeTimeout);
}
