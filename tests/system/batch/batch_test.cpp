// Lists of tasks and their runs.
#include <sys/file.h>

#include <nlohmann/json.hpp>
#include <sstream>

#include "tests/system/tool.h"

namespace {

using testing::HasSubstr;
using testing::Not;
namespace fs = std::filesystem;

class Batch : public Tool {
  protected:
    void SetUp() override {
        Tool::SetUp();
        makeWav("in.wav", 4000);
        works({"batch", "l.xml", "new"});
    }

    Outcome add(const Words& job) const { return works(Words{"batch", "l.xml", "add"} + job); }
    Outcome run(const Words& options = {}) const { return tarsel(Words{"batch", "l.xml", "run"} + options); }
    std::string status() const { return works({"batch", "l.xml", "status"}).out; }
    void makeFolder(const char* name) const { fs::create_directory(folder.path() / name); }
    void remove(const char* name) const { fs::remove(folder.path() / name); }

    // What is in the folder besides inputs, lists and journals: nothing hidden may stay.
    std::set<std::string> outputs() const {
        std::set<std::string> names;
        for (const std::string& name : listing())
            if (name.rfind("l.xml", 0) != 0 && name != "in.wav") names.insert(name);
        return names;
    }

    // The journal of the only task, and the number of the process that runs it, 0 for none.
    fs::path journal() const {
        for (const auto& entry : fs::directory_iterator(folder.path() / "l.xml.journal.d"))
            if (entry.path().filename() != "run") return entry.path();
        return {};
    }
    pid_t runner() const {
        std::error_code error;
        if (!fs::exists(folder.path() / "l.xml.journal.d", error) || journal().empty()) return 0;
        const std::string lines = TempFolder::read(journal().string());
        const size_t at = lines.rfind("\"pid\":");
        return at == std::string::npos ? 0 : std::atoi(lines.c_str() + at + 6);
    }
    // Waits until a process runs it that is not `former`.
    pid_t nextRunner(Process& run, pid_t former = 0) const {
        while (run.waitFor("\"progress\""))
            if (const pid_t process = runner(); process != former) return process;
        return 0;
    }
    static char stateOf(pid_t process) {
        const std::string text = TempFolder::read("/proc/" + std::to_string(process) + "/stat");
        const size_t at = text.rfind(") ");
        return at == std::string::npos ? '-' : text[at + 2];
    }

    static bool comesToState(pid_t process, bool stopped) {
        for (int i = 0; i < 10000; ++i) {
            if ((stateOf(process) == 'T') == stopped) return true;
            usleep(1000);
        }
        return false;
    }

    // A job that runs until it is stopped, and well beyond any test.
    static Words endless(const std::string& output) {
        return {
            "testgen:size=64x64,rate=25,duration=20000", "-o", output, "--no-audio", "--muxer", "nullmux"};
    }
};

TEST_F(Batch, EachTaskIsDoneOnceUntilSomethingChanges) {
    add({"in.wav", "-o", "a.wav", "--bits", "24"});
    add({"in.wav", "-o", "b.wav", "--channels", "1"});
    EXPECT_EQ(run({"--jobs", "2"}).status, 0);
    works({"transcode", "in.wav", "-o", "want.wav", "--bits", "24"});
    EXPECT_TRUE(contents("a.wav") == contents("want.wav"));
    const auto before = fs::last_write_time(folder.file("a.wav"));
    EXPECT_THAT(run().err, HasSubstr("task 1 of 2 was done before"));
    // A place in the list and a pause in it are no change of a task.
    works({"batch", "l.xml", "move", "1", "2"});
    works({"batch", "l.xml", "disable", "all"});
    works({"batch", "l.xml", "enable", "1", "2"});
    EXPECT_THAT(status(), HasSubstr("2 tasks, 2 done"));
    EXPECT_EQ(fs::last_write_time(folder.file("a.wav")), before);
    remove("b.wav");
    EXPECT_THAT(status(), HasSubstr("1 changed, 1 done"));
    EXPECT_EQ(run().status, 0);
    // Another input: the outputs are old, and not replaced without leave.
    makeWav("in.wav", 5000);
    const Outcome refused = run();
    EXPECT_EQ(refused.status, 1);
    EXPECT_THAT(refused.err, HasSubstr("exists"));
    EXPECT_EQ(run({"-y"}).status, 0);
    works({"transcode", "in.wav", "-o", "want.wav", "--bits", "24", "-y"});
    EXPECT_TRUE(contents("a.wav") == contents("want.wav"));
    EXPECT_THAT(status(), HasSubstr("2 tasks, 2 done"));
}

TEST_F(Batch, ATaskWaitsForItsInput) {
    add({"in.wav", "-o", "mid.wav", "--samplerate", "22050"});
    EXPECT_THAT(add({"mid.wav", "-o", "end.wav", "--bits", "24"}).err, HasSubstr("task 1 makes it"));
    works({"batch", "l.xml", "check"});
    EXPECT_EQ(run({"--jobs", "4"}).status, 0);
    works({"transcode", "mid.wav", "-o", "want.wav", "--bits", "24"});
    EXPECT_TRUE(contents("end.wav") == contents("want.wav"));
    EXPECT_THAT(run().err, HasSubstr("task 2 of 2 was done before"));
    // One whose input could not be made is not tried.
    for (const char* name : {"mid.wav", "end.wav", "in.wav"}) remove(name);
    const Outcome o = run();
    EXPECT_EQ(o.status, 1);
    EXPECT_THAT(o.err, HasSubstr("its input comes from task 1, which is not done"));
}

TEST_F(Batch, FilesByAPattern) {
    makeFolder("in");
    makeFolder("done");
    for (const char* name : {"in/a b.wav", "in/c.wav", "in/%41.wav"}) makeWav(name, 500);
    fails(2, {"batch", "l.xml", "add", "--files", "in/*.wav", "-o", "done/x.wav"}, {"one name", "{name}"});
    fails(2, {"batch", "l.xml", "add", "--files", "in/*.wav", "-o", "done/{nam}.wav"}, {"'{nam}'"});
    fails(3, {"batch", "l.xml", "add", "--files", "in/*.mov", "-o", "done/{name}.wav"}, {"no such file"});
    add({"--files", "in/*[bc].wav", "-o", "done/{n}-{name}.wav"});
    EXPECT_EQ(run().status, 0);
    EXPECT_TRUE(fs::exists(folder.file("done/1-a b.wav")) && fs::exists(folder.file("done/2-c.wav")));
}

TEST_F(Batch, OutputsThatCollideAreRefused) {
    makeFolder("sub");
    fs::create_directory_symlink("sub", folder.path() / "link");
    add({"in.wav", "-o", "sub/a.wav"});
    const Words again[] = {{"in.wav", "-o", "sub/a.wav"},
                           {"in.wav", "-o", "./link/../sub/a.wav"},
                           {"in.wav", "-o", "link/a.wav"},
                           // Its sound is written next to the picture.
                           {"testgen:size=64x64,duration=0.2", "-o", "sub/a.raw"}};
    for (const Words& job : again) fails(2, Words{"batch", "l.xml", "add"} + job, {"task 1 writes it"});
    fails(2, {"batch", "l.xml", "add", "in.wav", "-o", "-"}, {"standard output"});
    fails(4, {"batch", "l.xml", "add", "in.wav", "-o", "none/a.wav"}, {"none"});
    EXPECT_THAT(status(), HasSubstr("1 task, 1 waiting"));
}

TEST_F(Batch, TheReportHasEveryTask) {
    makeWav("<b>.wav", 4000);
    add({"in.wav", "-o", "a.wav"});
    add({"<b>.wav", "-o", "b.wav"});
    remove("<b>.wav");
    EXPECT_EQ(run({"--report", "r.html"}).status, 1);
    EXPECT_THAT(contents("r.html"),
                AllOf(HasSubstr("a.wav"), HasSubstr("&lt;b&gt;.wav"), Not(HasSubstr("<b>.wav"))));
    EXPECT_EQ(run({"--report", "r.json", "-q"}).status, 1);
    EXPECT_THAT(contents("r.json"), AllOf(HasSubstr("\"tasks\""), HasSubstr("no such file")));
    for (const char* name : {"r.txt", "no/r.html", "r.html", "in.wav"})
        EXPECT_NE(run({"--report", name}).status, 0) << name;
    fails(2, {"batch", "l.xml", "add", "-", "-o", "c.wav"}, {"standard input"});
}

TEST_F(Batch, FailuresAreThoseOfOneTask) {
    makeWav("gone.wav", 500);
    add({"gone.wav", "-o", "a.wav"});
    add({"in.wav", "-o", "b.wav"});
    remove("gone.wav");
    const Outcome stopped = run({"--stop-on-error"});
    EXPECT_EQ(stopped.status, 1);
    EXPECT_FALSE(fs::exists(folder.file("b.wav")));
    const Outcome o = run({"--retry", "2"});
    EXPECT_EQ(o.status, 1);
    EXPECT_THAT(o.err, HasSubstr("task 1 is tried again"));
    EXPECT_THAT(o.err, HasSubstr("'l.xml' is not done: 1 of 2 tasks failed"));
    EXPECT_TRUE(fs::exists(folder.file("b.wav")));
    EXPECT_THAT(status(), HasSubstr("no such file"));
    EXPECT_EQ(tarsel({"batch", "l.xml", "check"}).status, 1);
    EXPECT_EQ(run({"--task", "1"}).status, 3);
    EXPECT_EQ(run({"--task", "2"}).status, 0);
    // What takes too long ends, and leaves nothing.
    works({"batch", "l.xml", "remove", "all"});
    add(endless("long.raw"));
    const Outcome late = run({"--timeout", "0.5"});
    EXPECT_EQ(late.status, 1);
    EXPECT_THAT(late.err, HasSubstr("--timeout 0.5"));
    EXPECT_EQ(outputs(), std::set<std::string>{"b.wav"});
}

TEST_F(Batch, ListsThatAreNone) {
    // What is no list is in qvbatchlist_test.cpp.
    for (const char* text : {"", "<BatchList version='2.0'><key>taskList</key><i32>1</i32></BatchList>"}) {
        folder.write("bad.xml", text);
        for (const char* command : {"run", "list", "status", "check"})
            fails(3, {"batch", "bad.xml", command}, {"'bad.xml'", "no list"});
        EXPECT_EQ(tarsel({"batch", "bad.xml", "remove", "1"}).status, 3);
        EXPECT_EQ(contents("bad.xml"), text);
        remove("bad.xml.lock");
    }
    // A task without sense is the failure of that task.
    folder.write("odd.xml",
                 "<BatchList version='2.0'><key>taskList</key><vec><TranscodeTask version='2.0'>"
                 "<key>filename</key><str>x.wav</str></TranscodeTask></vec></BatchList>");
    EXPECT_EQ(tarsel({"batch", "odd.xml", "check"}).status, 1);
    const Outcome o = tarsel({"batch", "odd.xml", "run"});
    EXPECT_EQ(o.status, 1);
    EXPECT_THAT(o.err, HasSubstr("'files' is missing"));
}

// A command in a list runs only if its user says so.
TEST_F(Batch, CommandsNeedLeave) {
    add({"in.wav", "-o", "a.wav", "--post", "touch ran"});
    add({"a.wav", "-o", "b.wav", "--post", "touch ran"});
    EXPECT_THAT(run().err, HasSubstr("'touch ran' is left out"));
    EXPECT_FALSE(fs::exists(folder.file("ran")));
    EXPECT_EQ(run({"-y", "--verify", "--allow-post"}).status, 0);
    remove("a.wav");
    EXPECT_EQ(run({"-y", "--allow-post"}).status, 0);
    EXPECT_TRUE(fs::exists(folder.file("ran")));
}

TEST_F(Batch, OneRunAtATimeAndItsTasksEndWithIt) {
    add(endless("long.raw"));
    Process first(words({"batch", "l.xml", "run", "--progress", "json"}), here());
    ASSERT_TRUE(first.waitFor("\"progress\""));
    for (int i = 0; i < 500 && status().find("1 running") == std::string::npos; ++i) {
    }
    const std::string journal = this->journal().string();
    ASSERT_FALSE(journal.empty());
    const Outcome second = run();
    EXPECT_EQ(second.status, 1);
    EXPECT_THAT(second.err, HasSubstr("process " + std::to_string(first.id()) + " on "));
    EXPECT_THAT(status(), HasSubstr("1 running"));
    first.signal(SIGKILL);
    first.finish();
    // The task's process holds this lock to its end.
    const int file = open(journal.c_str(), O_RDONLY | O_CLOEXEC);
    EXPECT_EQ(flock(file, LOCK_EX), 0);
    close(file);
    EXPECT_THAT(status(), HasSubstr("1 interrupted"));
}

// A crash is the failure of that task, and what it leaves does not stay.
TEST_F(Batch, ATaskThatCrashesHasFailed) {
    add({"testgen:size=64x64,rate=25,duration=20000", "-o", "long.raw", "--no-audio"});
    Process run(words({"batch", "l.xml", "run", "--progress", "json", "--retry", "1"}), here());
    const pid_t first = nextRunner(run);
    ASSERT_GT(first, 0);
    EXPECT_EQ(kill(first, SIGABRT), 0);
    ASSERT_TRUE(run.waitFor("task 1 is tried again: can't make"));
    const pid_t second = nextRunner(run, first);
    ASSERT_GT(second, 0);
    EXPECT_EQ(kill(second, SIGKILL), 0);
    const Outcome o = run.finish();
    EXPECT_EQ(o.status, 1) << o.err;
    EXPECT_THAT(o.err, HasSubstr("signal 6 ended the process"));
    EXPECT_THAT(o.err, HasSubstr("signal 9 ended the process"));
    EXPECT_EQ(outputs(), std::set<std::string>()) << "litter";
    EXPECT_THAT(status(), HasSubstr("1 interrupted"));
}

// Ctrl-Z stops the processes of the tasks as well, and they continue with the run.
TEST_F(Batch, AStoppedRunStopsItsTasks) {
    add(endless("long.raw"));
    Process run(words({"batch", "l.xml", "run", "--progress", "json"}), here());
    const pid_t task = nextRunner(run);
    ASSERT_GT(task, 0);
    const auto become = [&](bool stopped) {
        return comesToState(task, stopped) && comesToState(run.id(), stopped);
    };
    run.signal(SIGTSTP);
    EXPECT_TRUE(become(true));
    run.signal(SIGCONT);
    EXPECT_TRUE(become(false));
    EXPECT_TRUE(run.waitFor("\"progress\""));
    // One that is stopped ends as well.
    run.signal(SIGTSTP);
    EXPECT_TRUE(become(true));
    run.signal(SIGTERM);
    run.signal(SIGCONT);
    EXPECT_EQ(run.finish().status, 143);
    EXPECT_EQ(stateOf(task), '-');
}

// The run itself goes on, so that its keys work; only the tasks pause.
TEST_F(Batch, KeysPauseTheTasks) {
    add(endless("long.raw"));
    ProcessOptions screen = here();
    screen.terminal = true;
    Process run(words({"batch", "l.xml", "run"}), screen);
    ASSERT_TRUE(run.waitFor("p q"));
    pid_t task = 0;
    for (int i = 0; i < 10000 && task == 0; ++i, usleep(1000)) task = runner();
    ASSERT_GT(task, 0);
    for (const bool stopped : {true, false, true}) {
        run.type("p");
        EXPECT_TRUE(comesToState(task, stopped));
        EXPECT_NE(stateOf(run.id()), 'T');
    }
    run.type("q");
    EXPECT_EQ(run.finish().status, 130);
    EXPECT_EQ(stateOf(task), '-');
}

TEST_F(Batch, EachTaskHasObjectsAndALog) {
    makeWav("gone.wav", 500);
    add({"in.wav", "-o", "a.wav"});
    add({"gone.wav", "-o", "b.wav"});
    remove("gone.wav");
    const Outcome o = tarsel({"--log", "log", "batch", "l.xml", "run", "--progress", "json", "--retry", "2"});
    EXPECT_EQ(o.status, 1);
    std::map<int, nlohmann::json> ends;
    std::istringstream lines(o.err);
    for (std::string line; std::getline(lines, line);) {
        const auto object = nlohmann::json::parse(line);
        if (object["event"] != "task" || object["status"].is_null()) continue;
        EXPECT_TRUE(ends.emplace(object["task"].get<int>(), object).second) << "one end each: " << line;
    }
    ASSERT_EQ(ends.size(), 2u) << o.err;
    EXPECT_EQ(ends[1]["state"], "done");
    EXPECT_EQ(ends[1]["percent"], 100);
    EXPECT_EQ(ends[1]["outputs"].at(0), folder.file("a.wav"));
    EXPECT_EQ(ends[2]["state"], "failed");
    EXPECT_EQ(ends[2]["attempt"], 3);
    EXPECT_EQ(ends[2]["status"], 3);
    EXPECT_THAT(ends[2]["error"].get<std::string>(), HasSubstr("no such file"));
    for (int i : {1, 2}) EXPECT_GT(size("log." + ends[i]["id"].get<std::string>()), 0);
}

TEST_F(Batch, SignalsStopAllTasks) {
    add(endless("long.raw"));
    add({"in.wav", "-o", "b.wav"});
    for (const auto& [signal, status] : {std::pair{SIGINT, 130}, {SIGTERM, 143}}) {
        Process process(words({"batch", "l.xml", "run", "--jobs", "1", "--progress", "json"}), here());
        ASSERT_TRUE(process.waitFor("\"progress\""));
        process.signal(signal);
        const Outcome o = process.finish();
        EXPECT_EQ(o.status, status) << o.err;
        EXPECT_THAT(o.err, HasSubstr("0 of 2 tasks of 'l.xml' are done"));
    }
    EXPECT_EQ(outputs(), std::set<std::string>());
}

// A run that was killed after its files had their names, and before it could say so.
TEST_F(Batch, WhatWasPlacedIsDone) {
    add({"in.wav", "-o", "a.wav"});
    EXPECT_EQ(run().status, 0);
    const fs::path journal = this->journal();
    const std::string all = TempFolder::read(journal.string());
    const size_t done = all.rfind('\n', all.size() - 2) + 1;
    const auto before = fs::last_write_time(folder.file("a.wav"));
    for (const size_t length : {done, done + 1, all.size() - 1}) {  // whole, and torn lines
        folder.write(fs::relative(journal, folder.path()).string(), all.substr(0, length));
        EXPECT_THAT(status(), HasSubstr("1 interrupted")) << length;
        EXPECT_EQ(run().status, 0);
        EXPECT_EQ(fs::last_write_time(folder.file("a.wav")), before) << "it was done again";
        EXPECT_THAT(status(), HasSubstr("1 done"));
    }
    // Before they had them: it is done now.
    folder.write(fs::relative(journal, folder.path()).string(), all.substr(0, done));
    remove("a.wav");
    EXPECT_EQ(run().status, 0);
    EXPECT_TRUE(fs::exists(folder.file("a.wav")));
    // Bytes that changed under the same size and time are found if that is asked for.
    const auto time = fs::last_write_time(folder.file("a.wav"));
    std::string bytes = contents("a.wav");
    bytes.back() = static_cast<char>(bytes.back() ^ 1);
    folder.write("a.wav", bytes);
    fs::last_write_time(folder.file("a.wav"), time);
    EXPECT_EQ(run().status, 0);
    EXPECT_EQ(run({"--verify", "-y"}).status, 0);
    EXPECT_FALSE(contents("a.wav") == bytes);
}

}  // namespace
