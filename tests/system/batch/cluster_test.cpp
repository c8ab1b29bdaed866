// Batches on a cluster: with programs that stand for Slurm's, and with Slurm itself where it is installed.
#include <chrono>
#include <limits>
#include <nlohmann/json.hpp>
#include <sstream>

#include "tests/system/tool.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;
namespace fs = std::filesystem;
using Json = nlohmann::json;

class Cluster : public Tool {
  protected:
    void SetUp() override {
        Tool::SetUp();
        makeWav("in.wav", 400);
        works({"batch", "l.xml", "new"});
    }

    Outcome batch(const Words& arguments) const {
        return tarsel(Words{"batch", "l.xml"} + arguments, surroundings());
    }
    Outcome submit(const Words& options = {}) const { return batch(Words{"submit", "--slurm"} + options); }
    Json states() const { return Json::parse(batch({"status", "--json"}).out, nullptr, false); }
    size_t count(const std::string& state) const {
        const Json rows = states();
        return static_cast<size_t>(
            std::count_if(rows.begin(), rows.end(), [&](const Json& row) { return row["state"] == state; }));
    }
    void addTasks(int from, int to, const Words& options = {"--bits", "24"}) const {
        for (int n = from; n <= to; ++n)
            works(Words{"batch", "l.xml", "add", "in.wav", "-o", std::to_string(n) + ".wav"} + options);
    }
    static Words lines(const std::string& text) {
        Words all;
        std::istringstream in(text);
        for (std::string line; std::getline(in, line);) all.push_back(line);
        return all;
    }
    // The steps of a task, without what differs from run to run.
    Words steps(const std::string& id) const {
        Words steps;
        for (const std::string& line : lines(contents("l.xml.journal.d/" + id))) {
            const Json step = Json::parse(line.substr(line.find(' ')), nullptr, false);
            std::string text = step.value("event", "?");
            for (const Json& file : step.value("files", Json::array()))
                text += " " + file.value("name", "") + " " + file.value("digest", "");
            steps.push_back(text);
        }
        return steps;
    }

    ProcessOptions surroundings() const {
        ProcessOptions options = here();
        options.environment = environment;
        return options;
    }

    Words environment;
};

// sbatch and the others note what they were given; the queue is a file, and nothing runs by itself.
class FakeSlurm : public Cluster {
  protected:
    void SetUp() override {
        Cluster::SetUp();
        fs::create_directory(folder.path() / "bin");
        program("sbatch", R"(n=$(($(cat "$S/count") + 1)); [ ! -e "$S/refuse$n" ] || {
            echo "sbatch: error: no such partition" >&2; exit 1; }
            [ ! -e "$S/mute" ] || exit 0
            echo $n >"$S/count"; printf '%s\n' "$@" >"$S/arguments$n"; cat >"$S/script$n"
            for word; do case $word in --job-name=*) name=${word#*=};; --array=*) last=${word##*-};; esac; done
            for k in $(seq 0 ${last%%%*}); do echo "$name|$n|$k|PENDING" >>"$S/queue"; done; echo $n)");
        program("squeue", R"([ ! -e "$S/silent" ] || { echo "squeue: error: no contact" >&2; exit 1; }
            [ -z "$SQUEUE_PARTITION" ] && cat "$S/queue"
            [ ! -e "$S/ending" ] || { sed -i "/|\($(cat "$S/ending")\)|/d" "$S/queue"; rm "$S/ending"; })");
        // What was cancelled is still there at the next question, as one that cleans up.
        program("scancel", R"(shift; echo "$@" | sed 's/ /\\|/g' >"$S/ending")");
        program("sacct", R"([ -e "$S/ends" ] && cat "$S/ends")");
        folder.write("bin/queue", "");
        folder.write("bin/count", "0");
        environment = {"PATH=" + folder.file("bin") + ":/usr/bin:/bin", "SQUEUE_PARTITION=other"};
    }
    void program(const char* name, const std::string& text) const {
        const std::string file = folder.write(std::string("bin/") + name,
                                              "#!/bin/sh\nS='" + folder.file("bin") + "'\n" + text + "\n");
        fs::permissions(file, fs::perms::owner_all);
    }
    void setQueue(const std::string& text) const { folder.write("bin/queue", text); }
    Words queue() const { return lines(contents("bin/queue")); }
    std::string argument(int job, const std::string& option) const {
        for (const std::string& line : lines(contents("bin/arguments" + std::to_string(job))))
            if (line.rfind(option, 0) == 0) return line.substr(option.size());
        return "none";
    }
    // As the node does.
    Outcome element(int job, int index) const {
        ProcessOptions options = surroundings();
        options.environment.push_back("SLURM_ARRAY_TASK_ID=" + std::to_string(index));
        options.environment.push_back("SLURM_CPUS_ON_NODE=300");
        return runProgram({"sh", folder.file("bin/script" + std::to_string(job))}, options);
    }
};

TEST_F(FakeSlurm, WhatWaitsForOthersIsInLaterArrays) {
    addTasks(1, 5);
    works({"batch", "l.xml", "add", "1.wav", "-o", "6.wav", "--channels", "1"});
    works({"batch", "l.xml", "add", "6.wav", "-o", "7.wav", "--samplerate", "8000"});
    works({"batch", "l.xml", "add", "5.wav", "-o", "8.wav", "--channels", "1"});
    EXPECT_THAT(submit({"--array-size", "2", "--jobs", "1", "--", "--partition=night", "-n1"}).err,
                HasSubstr("8 tasks submitted as jobs 1, 2, 3, 4, 5"));
    const char* arrays[] = {"0-1%1", "0-1%1", "0-0%1", "0-1%1", "0-0%1"};
    const char* after[] = {"none", "none", "none", "afterany:1:3", "afterany:4"};
    for (int job = 1; job <= 5; ++job) {
        EXPECT_EQ(argument(job, "--array="), arrays[job - 1]) << job;
        EXPECT_EQ(argument(job, "--dependency="), after[job - 1]) << job;
        EXPECT_EQ(argument(job, "--partition="), "night");
    }
    EXPECT_EQ(count("queued"), 8u);
    // What is queued is not submitted again; what waits for it is.
    EXPECT_THAT(submit().err, HasSubstr("0 tasks submitted; 0 done before, 8 queued or running"));
    ASSERT_EQ(queue().size(), 8u);
    setQueue(queue()[0] + "\n" + queue()[7] + "\n");
    EXPECT_EQ(count("lost"), 6u);
    EXPECT_THAT(submit().err, HasSubstr("6 tasks submitted as jobs 6, 7"));
    EXPECT_EQ(argument(7, "--dependency="), "afterany:6:1");
}

TEST_F(FakeSlurm, AnElementRunsItsTask) {
    const std::string list = "it's \"$(touch hacked)\"\r\n#SBATCH --hold\n%j.xml";
    works({"batch", list, "new"});
    const std::string out = "o' $(touch hacked).wav";
    works({"batch", list, "add", "in.wav", "-o", "first.wav"});
    works({"batch", list, "add", "in.wav", "-o", out, "--bits", "24"});
    works({"batch", list, "add", out, "-o", "last.wav", "--bits", "16"});
    EXPECT_EQ(tarsel({"batch", list, "submit", "--slurm"}, surroundings()).status, 0);
    EXPECT_THAT(contents("bin/script1"), Not(HasSubstr("\r\n"))) << "which sbatch refuses";
    EXPECT_THAT(argument(1, "--output="), HasSubstr("it's \"$(touch hacked)\""));
    // One whose input was not made has failed, also where an old file has its name.
    makeWav(out, 10);
    const Outcome early = element(2, 0);
    EXPECT_EQ(early.status, 1);
    EXPECT_THAT(early.err, HasSubstr("its input comes from task 2, which is not done"));
    EXPECT_EQ(contents("last.wav"), "");
    fs::remove(folder.file(out));
    EXPECT_EQ(element(1, 1).status, 0);
    EXPECT_EQ(element(2, 0).status, 0);
    ASSERT_FALSE(queue().empty());
    setQueue(queue()[0] + "\n");
    EXPECT_THAT(tarsel({"batch", list, "status"}, surroundings()).out,
                HasSubstr("3 tasks, 2 done, 1 queued"));
    EXPECT_FALSE(fs::exists(folder.file("hacked")));
}

TEST_F(FakeSlurm, ANodeThatLacksSomethingSaysWhat) {
    makeWav("gone.wav", 400);
    works({"batch", "l.xml", "add", "gone.wav", "-o", "1.wav"});
    works({"batch", "l.xml", "add", "1.wav", "-o", "2.wav", "--preset", "WAV"});
    fs::create_directory(folder.path() / "plugins");
    fs::copy_file(QV_BINARY_DIR "/plugins/pcm8_plugin.so", folder.file("plugins/pcm8_plugin.so"));
    folder.write("tone.pcm8", patternBytes(5000));
    works({"--plugins", "plugins", "batch", "l.xml", "add", "tone.pcm8", "-o", "3.wav"});
    const std::string family = runProgram({"fc-match", "--format=%{family[0]}", "sans"}).out;
    folder.write("s.srt", "1\n00:00:00,000 --> 00:00:01,000\nHello\n");
    works({"batch", "l.xml", "add", "testgen:size=64x64,rate=25,duration=0.2", "--no-audio", "-o", "4.yuv",
           "--subtitles", "s.srt", "--subtitle-style", "font=" + family});
    EXPECT_EQ(tarsel({"--plugins", "plugins", "batch", "l.xml", "submit", "--slurm"}, surroundings()).status,
              0);
    fs::remove(folder.file("gone.wav"));
    fs::remove(folder.file("plugins/pcm8_plugin.so"));
    folder.write("fonts.conf", "<?xml version='1.0'?><fontconfig><dir>/none</dir></fontconfig>");
    environment.push_back("FONTCONFIG_FILE=" + folder.file("fonts.conf"));
    EXPECT_EQ(element(1, 1).status, 5);
    EXPECT_EQ(element(1, 2).status, 5);
    setQueue("");
    EXPECT_THAT(states()[2]["error"], HasSubstr("'pcm8dec'"));
    EXPECT_THAT(states()[3]["error"], HasSubstr("there is no font '" + family + "' here"));
    environment.resize(2);
    EXPECT_EQ(element(1, 0).status, 3);
    EXPECT_EQ(element(2, 0).status, 1);
    EXPECT_THAT(states()[0]["error"], HasSubstr("gone.wav"));
    EXPECT_THAT(states()[1]["error"], HasSubstr("task 1"));
    EXPECT_THAT(submit().err, HasSubstr("4 tasks submitted"));
}

TEST_F(FakeSlurm, OneThatRefusesOrIsSilent) {
    addTasks(1, 3);
    const struct {
        Words options;
        int status;
        const char* says;
    } rows[] = {{{"--", "script.sh"}, 2, "--partition=NAME"},
                {{"--", "--arr=1-9"}, 2, "can't be given"},
                {{"--", "-Jname"}, 2, "can't be given"},
                {{"--", "-HvJname"}, 2, "can't be given"},
                {{"--", "-Q"}, 2, "can't be given"},
                {{"--array-size", "1001"}, 2, "1001"},
                {{"--jobs", "0"}, 2, "--jobs"},
                {{"-y", "-n"}, 2, "-n"}};
    for (const auto& row : rows) failsAs(row.status, submit(row.options), {row.says}, row.says);
    EXPECT_EQ(batch({"submit"}).status, 2);
    folder.write("bin/refuse1", "");
    failsAs(1, submit(), {"'sbatch' refuses", "no such partition"}, "refuse");
    EXPECT_EQ(count("waiting"), 3u);
    fs::remove(folder.file("bin/refuse1"));
    folder.write("bin/mute", "");
    failsAs(1, submit(), {"'sbatch' refuses: it says nothing"}, "mute");
    fs::remove(folder.file("bin/mute"));
    EXPECT_EQ(count("waiting"), 3u);
    folder.write("bin/refuse3", "");
    failsAs(1, submit({"--array-size", "1"}), {"in part: after 2 of 3 tasks", "no such partition"}, "partly");
    EXPECT_EQ(count("queued"), 2u);
    EXPECT_EQ(count("waiting"), 1u);
    // Without a whole answer nothing is submitted, as it may be in the queue.
    const std::string whole = contents("bin/queue");
    const size_t second = whole.find('\n') + 1;
    for (const std::string& cut : {whole.substr(0, second + 5), whole.substr(0, whole.find('|')) + "\n"}) {
        setQueue(cut);
        failsAs(1, submit(), {"can't read what 'squeue' says"}, cut);
    }
    setQueue("hello\n" + whole);
    EXPECT_EQ(count("queued"), 2u);
    setQueue(whole);
    folder.write("bin/silent", "");
    failsAs(1, submit(), {"'squeue' refuses", "no contact"}, "silent");
    EXPECT_THAT(batch({"status"}).err, HasSubstr("no contact"));
    EXPECT_EQ(count("submitted"), 2u);
    fs::remove(folder.file("bin/silent"));
    EXPECT_THAT(batch({"cancel"}).err, HasSubstr("jobs 1, 2 cancelled"));
    EXPECT_THAT(batch({"cancel"}).err, HasSubstr("none of its tasks"));
    const std::string array = argument(1, "--job-name=");
    folder.write("bin/ends", array + "|1_0|OUT_OF_MEMORY\n");
    EXPECT_THAT(batch({"status"}).out, HasSubstr("\tthe scheduler: OUT_OF_MEMORY\n"));
    environment = {"PATH=" + folder.path().string()};
    failsAs(5, submit(), {"can't start 'squeue'"}, "no Slurm");
}

// 2,001 tasks are three arrays; a hand-made list costs less than as many runs of the tool.
TEST_F(FakeSlurm, ArraysHaveAThousandTasks) {
    addTasks(1, 1);
    const std::string list = contents("l.xml");
    const size_t from = list.find("<TranscodeTask"), to = list.rfind("</TranscodeTask>") + 16;
    const std::string one = list.substr(from, to - from);
    std::string all = list.substr(0, from);
    for (int n = 1; n <= 2001; ++n) {
        std::string task = one;
        for (size_t at; (at = task.find("/1.wav")) != std::string::npos;)
            task.replace(at, 6, "/n" + std::to_string(n) + ".wav");
        all += task;
    }
    folder.write("l.xml", all + list.substr(to));
    EXPECT_THAT(submit().err, HasSubstr("2001 tasks submitted as jobs 1, 2, 3"));
    EXPECT_EQ(argument(1, "--array="), "0-999");
    EXPECT_EQ(argument(2, "--array="), "0-999");
    EXPECT_EQ(argument(3, "--array="), "0-0");
    EXPECT_EQ(queue().size(), 2001u);
    EXPECT_EQ(element(3, 0).status, 0);
    EXPECT_TRUE(fs::exists(folder.file("n2001.wav")));
}

// --- Slurm itself

class RealSlurm : public Cluster {
  protected:
    void SetUp() override {
        for (const char* program : {"/usr/sbin/munged", "/usr/sbin/slurmctld", "/usr/sbin/slurmd"})
            if (!fs::exists(program)) GTEST_SKIP() << "slurm-wlm and munge are not installed";
        if (geteuid() != 0) GTEST_SKIP() << "a node daemon needs root";
        Cluster::SetUp();
        ProcessOptions options = here();
        options.environment = {"SLURM_ONE_MACHINE_CORES=8"};
        const std::string wait =
            "echo \"$SLURM_ONE_MACHINE\" >machine; echo ready; until [ -e stop ] || [ ! -d /proc/" +
            std::to_string(getpid()) + " ]; do sleep 0.1; done";
        slurm_ = std::make_unique<Process>(
            Words{QV_SOURCE_DIR "/examples/slurm-one-machine.sh", "sh", "-c", wait}, options);
        ASSERT_TRUE(slurm_->waitFor("ready")) << slurm_->finish().err;
        machine_ = lines(contents("machine")).at(0);
        environment = {"SLURM_CONF=" + machine_.string() + "/slurm.conf"};
    }
    void TearDown() override {
        if (!slurm_) return;
        folder.write("stop", "");
        EXPECT_EQ(slurm_->finish().status, 0);
        EXPECT_FALSE(fs::exists(machine_)) << "the script leaves its folder";
    }
    Outcome slurm(const Words& words) const { return runProgram(words, surroundings()); }
    template <class Condition>
    static bool comes(Condition condition) {
        const auto end = std::chrono::steady_clock::now() + std::chrono::minutes(10);
        for (; std::chrono::steady_clock::now() < end; usleep(100000))
            if (condition()) return true;
        return false;
    }
    bool allEnd() const {
        return comes([&] {
            const Outcome o = slurm({"squeue", "--noheader"});
            return o.status == 0 && o.out.empty();
        });
    }
    // Of the last run of a task; 0 if there was none, which kill() would take for all of this group.
    pid_t processOf(const std::string& id) const {
        const std::string journal = contents("l.xml.journal.d/" + id);
        const size_t at = journal.rfind("\"pid\":");
        const pid_t process = at == std::string::npos ? 0 : std::atoi(journal.c_str() + at + 6);
        return process > 1 ? process : std::numeric_limits<pid_t>::max();
    }
    std::string slurmSays() const {
        return slurm({"sh", "-c", "squeue; sinfo -R; tail -n 30 '" + machine_.string() + "'/slurm*.log"}).out;
    }
    void endAtOnce(const std::string& daemon) const {
        const pid_t process = std::atoi(TempFolder::read((machine_ / (daemon + ".pid")).string()).c_str());
        ASSERT_GT(process, 1);
        EXPECT_EQ(kill(process, SIGKILL), 0);
        const std::string exe = "/proc/" + std::to_string(process) + "/exe";
        EXPECT_TRUE(comes([&] { return !fs::exists(exe); }));
    }
    void start(const std::string& daemon) const {
        EXPECT_EQ(slurm({"/usr/sbin/" + daemon, "-f", (machine_ / "slurm.conf").string()}).status, 0);
    }
    // Tasks that take long enough to be met at work.
    void addLong(int count) const {
        for (int n = 1; n <= count; ++n)
            works({"batch", "l.xml", "add",
                   "testgen:size=640x480,rate=25,duration=" + std::to_string(100 + n), "-o",
                   std::to_string(n) + ".raw", "--no-audio", "--size", "16x12"});
    }
    // Of jobs with whose numbers new ones begin again: a node takes no second one of a number.
    bool nodeIsFree() const {
        const fs::directory_iterator spool(machine_ / "spool");
        return std::none_of(begin(spool), end(spool), [](const auto& file) { return file.is_socket(); });
    }
    size_t queued() const { return lines(slurm({"squeue", "--noheader", "--array"}).out).size(); }
    // Stops each element that is met, until those in the queue are all stopped: their jobs, by tasks.
    std::map<std::string, std::string> hold() const {
        std::map<std::string, std::string> held;
        EXPECT_TRUE(comes([&] {
            for (const Json& row : states())
                if (row["state"] == "running" && row["job"].is_string() &&
                    kill(processOf(row["id"]), SIGSTOP) == 0)
                    held[row["id"]] = row["job"];
            // One may have been done by the time it was stopped.
            for (const Json& row : states())
                if (row["state"] != "running" && held.erase(row["id"]) > 0)
                    kill(processOf(row["id"]), SIGCONT);
            return held.size() == queued();
        })) << slurmSays();
        return held;
    }
    // Nothing was begun again once it was done, and all is.
    void allAreDoneOnce(int longOnes) const {
        for (const Json& row : states()) {
            EXPECT_EQ(row["state"], "done") << row["error"];
            const Words all = steps(row["id"]);
            const auto done = std::find_if(
                all.begin(), all.end(), [](const std::string& step) { return step.rfind("done", 0) == 0; });
            EXPECT_EQ(std::distance(done, all.end()), 1) << testing::PrintToString(all);
        }
        for (int n = 1; n <= longOnes; ++n)
            EXPECT_EQ(size(std::to_string(n) + ".raw"), (100 + n) * 25 * 16 * 12 * 4) << n;
        EXPECT_EQ(litter(), std::set<std::string>());
    }
    std::set<std::string> litter() const {
        std::set<std::string> names;
        for (const std::string& name : listing())
            if (name.find(".tarsel") != std::string::npos) names.insert(name);
        return names;
    }

    std::unique_ptr<Process> slurm_;
    fs::path machine_;
};

TEST_F(RealSlurm, TwentyTasksAreAsALocalRunMakesThem) {
    addTasks(1, 19);
    works({"batch", "l.xml", "add", "7.wav", "-o", "20.wav", "--channels", "1"});
    EXPECT_EQ(batch({"run"}).status, 0);
    std::map<std::string, Words> journals;
    std::vector<std::string> outputs;
    for (const Json& row : states()) journals[row["id"]] = steps(row["id"]);
    for (int n = 1; n <= 20; ++n) {
        outputs.push_back(contents(std::to_string(n) + ".wav"));
        fs::remove(folder.file(std::to_string(n) + ".wav"));
    }
    fs::remove_all(folder.file("l.xml.journal.d"));
    EXPECT_THAT(submit().err, HasSubstr("20 tasks submitted as jobs 1, "));
    ASSERT_TRUE(allEnd());
    EXPECT_EQ(count("done"), 20u) << batch({"status"}).out;
    for (const auto& [id, wanted] : journals) EXPECT_EQ(steps(id), wanted);
    for (int n = 1; n <= 20; ++n)
        EXPECT_TRUE(contents(std::to_string(n) + ".wav") == outputs[static_cast<size_t>(n) - 1]) << n;
    EXPECT_THAT(submit().err, HasSubstr("0 tasks submitted; 20 done before"));
    EXPECT_EQ(litter(), std::set<std::string>());
}

// The elements are held in the middle of their work, so that nothing depends on how fast they are.
TEST_F(RealSlurm, WhatWasCutOffIsDoneByTheNextSubmission) {
    addLong(6);
    works({"batch", "l.xml", "add", "in.wav", "-o", "7.wav"});
    EXPECT_EQ(submit().status, 0);
    const auto held = hold();
    ASSERT_GE(held.size(), 3u);
    const auto cancelled = held.begin(), killed = std::next(cancelled), left = std::next(killed);
    EXPECT_EQ(slurm({"scancel", cancelled->second}).status, 0);
    EXPECT_EQ(kill(processOf(killed->first), SIGKILL), 0);
    ASSERT_TRUE(comes([&] { return queued() == held.size() - 2; })) << slurmSays();
    // A controller that has not yet noted what runs starts it again, and takes the node out of use for that.
    const fs::path noted = machine_ / "state" / "job_state";
    const auto before = fs::file_time_type::clock::now();
    EXPECT_EQ(slurm({"scontrol", "update", "JobId=" + left->second, "Comment=note"}).status, 0);
    ASSERT_TRUE(comes([&] { return fs::exists(noted) && fs::last_write_time(noted) > before; }));
    for (const char* daemon : {"slurmctld", "slurmd"}) {
        endAtOnce(daemon);
        start(daemon);
    }
    ASSERT_TRUE(comes([&] { return queued() == held.size() - 2; })) << slurmSays();
    for (const auto& [id, job] : held) kill(processOf(id), SIGCONT);
    ASSERT_TRUE(allEnd()) << slurmSays();
    EXPECT_THAT(submit().err, HasSubstr("2 tasks submitted"));
    ASSERT_TRUE(allEnd()) << slurmSays();
    allAreDoneOnce(6);
}

// A controller that forgets the list, as it does when it ends before it has noted what it was given.
TEST_F(RealSlurm, WhatTheControllerForgetsRunsOnce) {
    addLong(2);
    fs::copy(machine_ / "state", machine_ / "before", fs::copy_options::recursive);
    EXPECT_EQ(submit().status, 0);
    const auto held = hold();
    ASSERT_EQ(held.size(), 2u);
    for (const char* daemon : {"slurmd", "slurmctld"}) endAtOnce(daemon);
    fs::remove_all(machine_ / "state");
    fs::rename(machine_ / "before", machine_ / "state");
    // Or new jobs get the numbers of those that it has forgotten, and the daemon of the node ends them, too.
    std::ofstream(machine_ / "slurm.conf", std::ios::app) << "FirstJobId=1000\n";
    start("slurmctld");
    // The elements are there, and only their locks say so.
    ASSERT_TRUE(comes([&] { return slurm({"squeue"}).status == 0; }));
    EXPECT_EQ(queued(), 0u);
    EXPECT_THAT(submit().err, HasSubstr("0 tasks submitted; 0 done before, 2 queued or running"));
    start("slurmd");  // which ends them, as the controller does not know them
    ASSERT_TRUE(comes([&] { return count("running") == 0 && nodeIsFree(); })) << slurmSays();
    EXPECT_THAT(submit().err, HasSubstr("2 tasks submitted"));
    ASSERT_TRUE(allEnd()) << slurmSays();
    allAreDoneOnce(2);
}

TEST_F(RealSlurm, AJobInPartsHasTheBytesOfTheWhole) {
    const Words job = {"transcode", "testgen:size=64x48,rate=29.97,duration=12.3", "--fade", "4", "-y"};
    const auto split = [&](const Words& options) {
        return tarsel(job + Words{"-o", "o' $(x)%j.avi", "--split", "3", "--slurm"} + options,
                      surroundings());
    };
    works(job + Words{"-o", "whole.avi"});
    EXPECT_EQ(split({"--", "--partition=all"}).status, 0);
    EXPECT_TRUE(contents("o' $(x)%j.avi") == contents("whole.avi"));
    fs::remove(folder.file("o' $(x)%j.avi"));
    const std::set<std::string> before = listing();
    failsAs(1, split({"--", "--partition=none"}), {"'sbatch' refuses"}, "partition");
    failsAs(2, split({"--", "--array=1"}), {"can't be given"}, "own option");
    failsAs(2, tarsel({"run", "t.xml", "--slurm"}), {"--split"}, "no parts");
    EXPECT_EQ(listing(), before);
    // Parts that Slurm holds are waited for, with its reason. One that is ended from outside fails the job,
    // and the others are gone with it.
    Process endless(words({"transcode", "testgen:size=640x480,rate=25,duration=20000", "--no-audio", "--size",
                           "16x12", "-o", "long.avi", "--split", "2", "--slurm", "--", "--hold"}),
                    surroundings());
    EXPECT_TRUE(endless.waitFor("the reason in the scheduler's word is JobHeldUser"));
    EXPECT_EQ(slurm({"sh", "-c", "scontrol release $(squeue -h -o %F)"}).status, 0);
    ASSERT_TRUE(comes([&] { return lines(slurm({"squeue", "-h", "-r", "-t", "R"}).out).size() == 2; }));
    EXPECT_EQ(slurm({"sh", "-c", "scancel $(squeue -h -r -o %i | head -n 1)"}).status, 0);
    const Outcome end = endless.finish();
    EXPECT_EQ(end.status, 1);
    EXPECT_THAT(end.err, HasSubstr("can't make 'long.avi': part "));
    EXPECT_EQ(slurm({"squeue", "-h"}).out, "");
    EXPECT_EQ(listing(), before);
}

}  // namespace
