// What programs and people see while a job runs: objects, lines of a log, the keys of a terminal.
#include <sys/stat.h>

#include <chrono>
#include <nlohmann/json.hpp>
#include <sstream>

#include "tests/system/tool.h"

namespace {

using nlohmann::json;
using testing::HasSubstr;
using Seconds = std::chrono::duration<double>;

// Whether `value` has the form of `schema`, by the keywords that docs/progress.schema.json uses. Any other
// keyword is a fault, so that none is passed over.
bool conforms(const json& value, const json& schema);

bool isOfType(const json& value, const json& type) {
    if (type.is_array())
        return std::any_of(type.begin(), type.end(), [&](const json& one) { return isOfType(value, one); });
    return (type == "object" && value.is_object()) || (type == "array" && value.is_array()) ||
           (type == "string" && value.is_string()) || (type == "integer" && value.is_number_integer()) ||
           (type == "number" && value.is_number()) || (type == "null" && value.is_null());
}

bool hasProperties(const json& value, const json& schema) {
    const json properties = schema.value("properties", json::object());
    for (const auto& [key, form] : properties.items())
        if (value.contains(key) && !conforms(value[key], form)) return false;
    const bool closed = !schema.value("additionalProperties", true);
    for (const auto& [key, part] : value.items())
        if (closed && !properties.contains(key)) return false;
    const json required = schema.value("required", json::array());
    return std::all_of(required.begin(), required.end(),
                       [&](const json& key) { return value.contains(key); });
}

bool conforms(const json& value, const json& schema) {
    const auto fits = [&](const json& part) { return conforms(value, part); };
    if (value.is_object() && !hasProperties(value, schema)) return false;
    for (const auto& entry : schema.items()) {
        const std::string& keyword = entry.key();
        const json& what = entry.value();
        const bool known = std::set<std::string>{"$schema",  "title", "description",         "properties",
                                                 "required", "then",  "additionalProperties"}
                               .count(keyword) > 0;
        if (keyword == "type"      ? !isOfType(value, what)
            : keyword == "const"   ? value != what
            : keyword == "enum"    ? std::find(what.begin(), what.end(), value) == what.end()
            : keyword == "minimum" ? value.is_number() && value < what
            : keyword == "maximum" ? value.is_number() && value > what
            : keyword == "items"
                ? !std::all_of(value.begin(), value.end(), [&](const json& e) { return conforms(e, what); })
            : keyword == "oneOf" ? std::count_if(what.begin(), what.end(), fits) != 1
            : keyword == "allOf" ? !std::all_of(what.begin(), what.end(), fits)
            : keyword == "if"    ? fits(what) && !fits(schema["then"])
                                 : !known)
            return false;
    }
    return true;
}

class Progress : public Tool {
  protected:
    static constexpr const char* kCard = "testgen:size=64x64,rate=25,duration=2";
    static constexpr const char* kEndless = "testgen:size=64x64,rate=25,duration=20000,audio=0";

    // Nothing but objects of the schema, from "start" to "end".
    std::vector<json> objects(const std::string& text) const {
        static const json schema = json::parse(TempFolder::read(QV_SOURCE_DIR "/docs/progress.schema.json"));
        std::vector<json> all;
        std::istringstream lines(text);
        for (std::string line; std::getline(lines, line);) {
            const json object = json::parse(line, nullptr, false);
            EXPECT_FALSE(object.is_discarded()) << line;
            EXPECT_TRUE(conforms(object, schema)) << line;
            all.push_back(object);
        }
        if (all.size() < 2) all.resize(2);
        EXPECT_EQ(all.front().value("event", ""), "start") << text;
        EXPECT_EQ(all.back().value("event", ""), "end") << text;
        for (size_t i = 1; i + 1 < all.size(); ++i)
            EXPECT_TRUE(all[i].value("event", "") == "progress" || all[i].value("event", "") == "message")
                << text;
        return all;
    }
    json last(const std::string& text) const { return objects(text).back(); }
};

TEST_F(Progress, TheSchemaRefusesWhatIsNoObjectOfIt) {
    const json schema = json::parse(TempFolder::read(QV_SOURCE_DIR "/docs/progress.schema.json"));
    const std::string text = works({"transcode", kCard, "-o", "x.raw", "--progress", "json"}).err;
    const json good = last(text);
    EXPECT_TRUE(conforms(good, schema));
    for (const char* change :
         {R"({"schema": 2})", R"({"event": "stop"})", R"({"percent": 101})", R"({"frame": -1})",
          R"({"state": "asleep"})", R"({"extra": 1})", R"({"outputs": [1]})", R"({"fps": "9"})"}) {
        json bad = good;
        bad.update(json::parse(change));
        EXPECT_FALSE(conforms(bad, schema)) << change;
    }
    for (const char* key : {"status", "error", "eta_s", "event"}) {
        json bad = good;
        bad.erase(key);
        EXPECT_FALSE(conforms(bad, schema)) << key;
    }
}

TEST_F(Progress, ObjectsAndNothingElse) {
    folder.write("there.raw", "precious");
    folder.write("note.scc", "Scenarist_SCC V1.0\n\n00:00:00:00\t9420 9420\n");
    const struct {
        int status;
        Words words;
        std::string state, error;
    } cases[] = {
        {0, {kCard, "-o", "card.raw"}, "done", ""},
        {0, {kCard, "-o", "quiet.raw", "-q"}, "done", ""},
        {0, {kCard, "-o", "short.raw", "--to", "9"}, "done", ""},
        {0, {kCard, "-o", "there.raw", "-n"}, "kept", ""},
        {0, {kCard, "-o", "post.raw", "--post", "echo said; echo complained >&2"}, "done", ""},
        {0, {kCard, "-o", "never.raw", "--dry-run"}, "done", ""},
        {3, {"absent.wav", "-o", "x.wav"}, "failed", "can't open 'absent.wav'"},
        {4, {kCard, "-o", "there.raw"}, "failed", "it exists"},
        {2, {kCard, "-o", "x.raw", "--ratte", "25"}, "failed", "unknown option '--ratte'"},
        {2, {kCard, "-o", "x.raw", "--size", "wide"}, "failed", "--size"},
        {1, {kCard, "-o", "x.raw", "--to", "9", "--strict"}, "failed", "--strict"},
        {1, {kCard, "-o", "late.raw", "--post", "exit 7"}, "failed", "status 7"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::PrintToString(c.words));
        const Outcome o = tarsel(Words{"transcode"} + c.words + Words{"--progress=json"});
        EXPECT_EQ(o.status, c.status) << o.err;
        const json end = last(o.err);
        EXPECT_EQ(end.value("status", -1), c.status);
        EXPECT_EQ(end.value("state", ""), c.state);
        if (c.error.empty())
            EXPECT_TRUE(end["error"].is_null());
        else
            EXPECT_THAT(end["error"].get<std::string>(), HasSubstr(c.error));
    }
    const json done = last(works({"transcode", kCard, "-o", "again.raw", "--progress", "json"}).err);
    EXPECT_EQ(done["percent"], 100);
    EXPECT_EQ(done["frame"], 50);
    EXPECT_EQ(done["out_time_us"], 2000000);
    EXPECT_EQ(done["outputs"], json({"again.raw", "again.wav"}));
    // What is left to do after the last frame has a state of its own.
    const auto all = objects(works({"transcode", kCard, "-o", "closed.raw", "--progress", "json"}).err);
    EXPECT_EQ(
        std::count_if(all.begin(), all.end(),
                      [](const json& o) { return o.value("state", "") == "closing" && o["frame"] == 50; }),
        1);
    const json warned =
        last(works({"transcode", kCard, "-o", "w.raw", "--to", "9", "--progress", "json"}).err);
    EXPECT_EQ(warned["warnings"], 1);
    fails(2, {"--log", "stderr", "transcode", kCard, "-o", "x.raw", "--progress", "log:0"},
          {"--progress log", "'0'"});
    EXPECT_THAT(tarsel({"--log", "stderr", "transcode", kCard, "-o", "x.raw", "--progress", "json"}).err,
                HasSubstr("--log stderr: --progress json contradicts it"));
}

TEST_F(Progress, ADescriptorAFileAndAPipe) {
    const auto shell = [&](const std::string& line) { return runProgram({"bash", "-c", line}, here()); };
    const std::string run = "'" + program() + "' transcode " + kCard + " -y -o card.raw --to 9 --progress ";
    Outcome o = shell(run + "json:3 3>events");
    EXPECT_EQ(o.status, 0);
    EXPECT_THAT(o.err, testing::AllOf(HasSubstr("warning: --to 9"), HasSubstr("wrote 'card.raw'")))
        << "people read the standard error";
    EXPECT_EQ(last(contents("events"))["state"], "done");
    // What a command of the job writes goes elsewhere.
    o = shell(run + "json:1 --post 'echo said'");
    EXPECT_EQ(last(o.out)["state"], "done");
    EXPECT_THAT(o.err, HasSubstr("said"));
    works({"transcode", kCard, "-o", "other.raw", "--progress", "json:file", "-q"});
    EXPECT_EQ(last(contents("file"))["state"], "done");
    mkfifo(folder.file("pipe").c_str(), 0600);
    o = shell("cat pipe > piped & " + run + "json:pipe; wait");
    EXPECT_EQ(last(contents("piped"))["state"], "done");

    makeWav("in.wav", 1000);
    const Words job = {"transcode", "in.wav", "-o", "out.wav", "--progress"};
    fails(2, job + Words{"json:9"}, {"--progress", "no descriptor 9"});
    fails(2, job + Words{"json:0"}, {"--progress", "no descriptor 0"});
    fails(2, job + Words{"json:"}, {"--progress", "json:FD"});
    fails(4, job + Words{"json:in.wav", "-y"}, {"'in.wav'", "reads or writes it"});
    fails(4, job + Words{"json:out.wav"}, {"'out.wav'", "reads or writes it"});
    fails(4, job + Words{"json:file"}, {"'file'", "exists", "-y"});
    fails(4, job + Words{"json:no/file"}, {"'no/file'", "no such"});
    fails(2, {"transcode", "in.wav", "-o", "-", "--format", "wav", "--progress", "json:1"},
          {"json:1", "-o -"});
    EXPECT_EQ(contents("in.wav").size(), size_t{44 + 4000});
    // A reader that goes is a warning, and no reason to stop.
    o = shell(run + "json:3 3> >(head -1 >/dev/null)");
    EXPECT_EQ(size("card.raw"), 50 * 64 * 64 * 4);
    o = shell(run + "json:3 3>/dev/full");
    EXPECT_EQ(o.status, 0);
    EXPECT_THAT(o.err, HasSubstr("warning: --progress: objects were lost: descriptor 3: the disk is full"));
}

// A picture may need all frames before it.
TEST_F(Progress, OfSinglePicturesAndSheets) {
    folder.write("there.png", "precious");
    const struct {
        int status;
        Words words;
    } cases[] = {
        {0, {kCard, "-o", "shot.png", "--at", "1"}},
        {0, {kCard, "-o", "sheet.png", "--sheet", "2x2", "--rate", "50"}},
        {0, {kCard, "-o", "there.png", "-n"}},
        {3, {"absent.avi", "-o", "x.png"}},
        {2, {kCard, "-o", "x.png", "--at", "9"}},
    };
    for (const auto& c : cases) {
        const Outcome o = tarsel(Words{"frame"} + c.words + Words{"--progress", "json"});
        EXPECT_EQ(o.status, c.status) << o.err;
        const json end = last(o.err);
        EXPECT_EQ(end["status"], c.status);
        if (end["state"] != "done") continue;
        EXPECT_EQ(end["percent"], 100);
        EXPECT_EQ(end["outputs"], json({c.words[2]}));
    }
    Process run(
        words({"frame", kEndless, "--rate", "50", "--at=-1f", "-o", "x.png", "--progress", "json:events"}),
        here());
    while (contents("events").find("\"progress\"") == std::string::npos) sched_yield();
    run.signal(SIGTERM);
    EXPECT_EQ(run.finish().status, 143);
    EXPECT_EQ(last(contents("events"))["state"], "stopped");
    EXPECT_EQ(size("x.png"), -1);
    // Other commands are done at once, and say that they have no such option.
    EXPECT_THAT(last(tarsel({"info", "absent.wav", "--progress", "json"}).err)["error"].get<std::string>(),
                HasSubstr("--progress"));
}

TEST_F(Progress, TheEndComesWithASignalToo) {
    Process run(words({"transcode", kEndless, "-o", "out.raw", "--progress", "json:events"}), here());
    while (contents("events").find("\"progress\"") == std::string::npos) sched_yield();
    run.signal(SIGHUP);
    EXPECT_EQ(run.finish().status, 129);
    EXPECT_EQ(last(contents("events"))["status"], 129);
    // A stop ends the job although no one reads its objects.
    mkfifo(folder.file("pipe").c_str(), 0600);
    const int reader = open(folder.file("pipe").c_str(), O_RDWR | O_NONBLOCK | O_CLOEXEC);
    const int filler = open(folder.file("pipe").c_str(), O_WRONLY | O_NONBLOCK | O_CLOEXEC);
    Process held(words({"transcode", kEndless, "-o", "held.raw", "--progress", "json:pipe"}), here());
    char start[8];
    while (read(reader, start, 1) != 1) sched_yield();
    while (write(filler, std::string(512, '.').data(), 512) > 0) {
    }
    held.signal(SIGTERM);
    EXPECT_EQ(held.finish().status, 143);
    close(reader);
    close(filler);
}

// Two clocks: ours around the stop, which the tool's may not contain.
TEST_F(Progress, AStopDoesNotCount) {
    const auto now = [] { return std::chrono::steady_clock::now(); };
    const auto begin = now();
    Process run(words({"transcode", kEndless, "-o", "/dev/null", "--format", "raw", "--progress", "json"}),
                here());
    ASSERT_TRUE(run.waitFor("\"event\":\"progress\""));
    run.signal(SIGSTOP);
    siginfo_t info{};
    ASSERT_EQ(waitid(P_PID, static_cast<id_t>(run.id()), &info, WSTOPPED | WNOWAIT), 0);
    const auto stopped = now();
    // Longer than what the tool needs before its clock starts, which is not in its time either.
    while (now() - stopped < Seconds(3) + (stopped - begin)) poll(nullptr, 0, 100);
    const Seconds away = now() - stopped;
    run.signal(SIGCONT);
    for (int i = 0; i < 2; ++i) ASSERT_TRUE(run.waitFor("\"event\":\"progress\""));
    run.signal(SIGTERM);
    const Outcome o = run.finish();
    const Seconds all = now() - begin;
    EXPECT_LE(last(o.err)["elapsed_s"].get<double>(), (all - away).count() + 0.01) << o.err;
}

TEST_F(Progress, ALogHasALineNowAndThen) {
    const std::string slow = "testgen:size=1280x720,rate=25,duration=20000,audio=0";
    // The same by itself, after ten seconds.
    Process other(words({"transcode", slow, "-o", "/dev/null", "--format", "raw"}), here());
    Process run(words({"transcode", slow, "-o", "/dev/null", "--format", "raw", "--progress", "log:1"}),
                here());
    EXPECT_TRUE(run.waitFor("% "));
    EXPECT_TRUE(run.waitFor("% "));
    EXPECT_TRUE(other.waitFor("% "));
    run.signal(SIGTERM);
    other.signal(SIGTERM);
    const std::string log = run.finish().err;
    EXPECT_THAT(
        log, testing::MatchesRegex(
                 "(tarsel: +[0-9.]+ %  frame [0-9]+  [0-9.]+x  left [0-9:]+\n)+"
                 "(tarsel: stopping.*\n)?tarsel: stopped: a signal ended the job; no output was written\n"));
    other.finish();
}

// Ctrl-Z in a shell with job control: the terminal is the shell's meanwhile, and the keys work again
// afterwards.
TEST_F(Progress, CtrlZGivesTheTerminalBack) {
    ProcessOptions screen = here();
    screen.terminal = true;
    screen.environment = {"TERM=dumb", "HISTFILE=/dev/null"};
    folder.write("rc", "PS1='ready> '\n");
    Process shell({"bash", "--noprofile", "--noediting", "--rcfile", "rc", "-i"}, screen);
    ASSERT_TRUE(shell.waitFor("ready> "));
    shell.type("'" + program() + "' transcode " + kEndless + " -o out.raw\n");
    ASSERT_TRUE(shell.waitFor("keys: p q ?"));
    shell.type("\x1a");
    ASSERT_TRUE(shell.waitFor("Stopped"));
    ASSERT_TRUE(shell.waitFor("ready> "));
    shell.type("stty -a | tr ' ' '\\n' | grep -x -e 'icanon;*' -e 'echo;*' | tr '\\n' ' '\n");
    ASSERT_TRUE(shell.waitFor("icanon echo"));
    shell.type("fg\n");
    ASSERT_TRUE(shell.waitFor("-o out.raw"));  // the shell says what it continues
    ASSERT_TRUE(shell.waitFor("keys: p q ?"));
    shell.type("p");
    ASSERT_TRUE(shell.waitFor("paused (p resumes, q stops)"));
    shell.type("q");
    ASSERT_TRUE(shell.waitFor("stopped: a signal ended the job; no output was written"));
    ASSERT_TRUE(shell.waitFor("ready> "));
    shell.type("exit\n");
    shell.finish();
}

}  // namespace
