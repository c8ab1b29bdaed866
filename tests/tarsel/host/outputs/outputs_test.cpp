// Results get their names as a whole, whatever ends the run or fails in between.
#include "tarsel/host/outputs/outputs.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <map>
#include <set>
#include <span>
#include <thread>

#include <sched.h>
#include <sys/stat.h>

#include "tarsel/host/outputs/recovery.h"
#include "tarsel/words/failure.h"
#include "tests/support/child.h"
#include "tests/support/temp_folder.h"

namespace {

namespace fs = std::filesystem;

using Files = std::map<std::string, std::string>;

struct Job {
    const char* what;
    std::string output, extension;
    Files before;
    Files written;  // by the engine's names
    Files after;
};

// The first ones differ in how their files are placed, the others in which files these are.
constexpr size_t kKinds = 4;
const Job kJobs[] = {
    {"a file", "a.wav", "wav", {}, {{"out.wav", "new"}}, {{"a.wav", "new"}}},
    {"over a file", "a.wav", "wav", {{"a.wav", "old"}}, {{"out.wav", "new"}}, {{"a.wav", "new"}}},
    {"two files",
     "a.yuv",
     "raw",
     {{"x", "x"}},
     {{"out.raw", "new"}, {"out.wav", "n"}},
     {{"a.yuv", "new"}, {"a.wav", "n"}, {"x", "x"}}},
    {"a shorter sequence without sound",
     "a.png",
     "png",
     {{"a#00.png", "0"}, {"a#01.png", "1"}, {"a#02.png", "2"}, {"a.wav", "s"}, {"a#00.wav", "c"}},
     {{"out#0.png", "n0"}, {"out#1.png", "n1"}},
     {{"a#0.png", "n0"}, {"a#1.png", "n1"}}},
    {"what is of another set",
     "a.png",
     "png",
     {{"a#0.png", "0"},
      {"a#0#1.png", "b"},
      {"a2#0.png", "b"},
      {"a#x.png", "b"},
      {"a.png", "b"},
      {"a#1.bmp", "b"}},
     {{"out#0.png", "n0"}, {"out.wav", "n"}},
     {{"a#0.png", "n0"},
      {"a.wav", "n"},
      {"a#0#1.png", "b"},
      {"a2#0.png", "b"},
      {"a#x.png", "b"},
      {"a.png", "b"},
      {"a#1.bmp", "b"}}},
    {"sound that had no pictures",
     "a.png",
     "png",
     {{"a.wav", "b"}},
     {{"out#0.png", "n"}},
     {{"a.wav", "b"}, {"a#0.png", "n"}}},
    {"a shorter sequence with numbers of its own",
     "p_%03d.png",
     "png",
     {{"p_000.png", "0"},
      {"p_001.png", "1"},
      {"p_1000.png", "k"},
      {"p.wav", "s"},
      {"p#00.wav", "c"},
      {"p_1.png", "b"},
      {"p.png", "b"}},
     {{"out#0.png", "n0"}},
     {{"p_000.png", "n0"}, {"p_1.png", "b"}, {"p.png", "b"}}},
    {"numbered streams",
     "c%d.yuv",
     "raw",
     {{"c0.yuv", "0"}, {"c2.yuv", "2"}, {"c2.wav", "2"}, {"c2.png", "b"}, {"cx.yuv", "b"}},
     {{"out#00.raw", "n0"}, {"out#01.raw", "n1"}, {"out.wav", "s"}},
     {{"c0.yuv", "n0"}, {"c1.yuv", "n1"}, {"c0.wav", "s"}, {"c2.png", "b"}, {"cx.yuv", "b"}}},
    {"frames next to a sound that is not theirs",
     "a.yuv",
     "raw",
     {{"a.yuv", "old"}, {"a.wav", "s"}},
     {{"out.raw", "new"}},
     {{"a.yuv", "new"}, {"a.wav", "s"}}},
    {"fewer channels",
     "a.wav",
     "wav",
     {{"a#00.wav", "0"}, {"a#01.wav", "1"}, {"a.wav", "mix"}},
     {{"out#00.wav", "n"}},
     {{"a#00.wav", "n"}, {"a.wav", "mix"}}},
};

// Hundreds of runs bring their files to the disk: where there is one in memory, it is used.
struct FastFolder {
    FastFolder() {
        if (access("/dev/shm", W_OK) == 0) setenv("TMPDIR", "/dev/shm", 0);
    }
};

class OutputsTest : public testing::Test {
  protected:
    // By names in the folder: under /dev, full names are those of devices.
    OutputsTest() { fs::current_path(folder.path()); }
    ~OutputsTest() override { fs::current_path("/"); }

    void fill(const Files& files) const {
        for (const auto& entry : fs::directory_iterator(folder.path())) fs::remove_all(entry);
        for (const auto& [name, bytes] : files) folder.write(name, bytes);
    }
    // With work folders, whose names differ, as "work".
    Files found() const {
        Files files;
        for (const auto& entry : fs::directory_iterator(folder.path()))
            if (entry.is_directory())
                files["work"] = "";
            else
                files[entry.path().filename().string()] = TempFolder::read(entry.path().string());
        return files;
    }
    static OutputPolicy policy() {
        OutputPolicy policy(true);
        policy.quiet = true;
        return policy;
    }
    int run(const Job& job) const {
        try {
            Outputs outputs(job.output, "-o", {}, policy());
            if (job.written.size() > 1) outputs.expectSet();
            if (const auto numbered = NumberedName::parse(job.output)) outputs.number(*numbered);
            const fs::path work = fs::path(outputs.begin(job.extension)).parent_path();
            for (const auto& [name, bytes] : job.written) std::ofstream(work / name) << bytes;
            outputs.commit();
            return 0;
        } catch (const Failure& failure) {
            return static_cast<int>(failure.exit());
        }
    }
    std::vector<Leftover> recover() const { return recoverPlace(folder.path().string(), {}); }

    FastFolder fast;
    TempFolder folder;
};

TEST_F(OutputsTest, ASetReplacesTheFormerOneAndNothingElse) {
    for (const auto& job : kJobs) {
        fill(job.before);
        EXPECT_EQ(run(job), 0) << job.what;
        EXPECT_EQ(found(), job.after) << job.what;
    }
}

TEST_F(OutputsTest, AKillBetweenAnyTwoCallsLeavesAllOldOrAllNew) {
    for (const auto& job : std::span(kJobs).first(kKinds)) {
        bool old = false, fresh = false;
        for (int n = 1;; ++n) {
            fill(job.before);
            if (!killedBefore(n, [&] { return run(job); })) break;
            for (const auto& left : recover()) EXPECT_FALSE(left.remains()) << job.what << n;
            const Files now = found();
            old = old || now == job.before;
            fresh = fresh || now == job.after;
            EXPECT_TRUE(now == job.before || now == job.after) << job.what << ", call " << n;
        }
        EXPECT_TRUE(old && fresh) << job.what;
    }
}

// The recovery is killed as well, and the next one finishes. Each starts with a copy of what a killed run
// left.
TEST_F(OutputsTest, ARecoveryMayBeKilled) {
    const Job& job = kJobs[3];
    const TempFolder copies;
    std::vector<fs::path> stages;
    for (int n = 1;; ++n) {
        fill(job.before);
        if (!killedBefore(n, [&] { return run(job); })) break;
        const fs::path copy = copies.file(std::to_string(n));
        fs::copy(folder.path(), copy, fs::copy_options::recursive);
        const auto left = recover();
        if (!left.empty() && left[0].outcome != Leftover::Outcome::removed) stages.push_back(copy);
    }
    ASSERT_GE(stages.size(), 10u);
    for (const size_t stage : {size_t{0}, stages.size() / 3, stages.size() / 2, stages.size() - 1}) {
        Files first;
        for (int n = 1;; ++n) {
            fill({});
            fs::copy(stages[stage], folder.path(), fs::copy_options::recursive);
            const bool killed = killedBefore(n, [&] { return recover().empty(); });
            recover();
            if (first.empty()) first = found();
            EXPECT_TRUE(first == job.before || first == job.after);
            EXPECT_EQ(found(), first) << stage << ", " << n;
            if (!killed) break;
        }
    }
}

TEST_F(OutputsTest, WhatTheDiskDoesNotTakeLeavesTheOld) {
    for (const auto& job : kJobs)
        for (const int call : {SYS_fdatasync, SYS_syncfs, SYS_fsync, SYS_renameat2})
            for (const int error : {EIO, ENOSPC, ENOTSUP}) {
                fill(job.before);
                const int status = inChild([&] {
                    failCalls({call}, error);
                    return run(job);
                });
                const bool single = job.written.size() == 1 &&
                                    std::all_of(job.before.begin(), job.before.end(), [&](const auto& file) {
                                        return job.after.count(file.first);
                                    });
                const bool used =
                    call == SYS_fsync || call == SYS_renameat2 || (call == SYS_fdatasync) == single;
                // A file system that knows no synchronisation has nothing to fail.
                const bool harmless = call != SYS_renameat2 && error == ENOTSUP;
                EXPECT_EQ(status, used && !harmless ? 4 : 0) << job.what << call << ", " << error;
                EXPECT_EQ(found(), status == 0 ? job.after : job.before) << job.what << call << ", " << error;
            }
}

// Outputs of one job in two folders, the second of which gets one of them.
class Together : public OutputsTest {
  protected:
    static constexpr const char* kNames[] = {"a.yuv", "a.wav", "dump", "sub/task.xml"};

    void fill(bool old) const {
        OutputsTest::fill({});
        fs::create_directory(folder.file("sub"));
        for (const char* name : kNames)
            if (old) folder.write(name, "old");
    }
    static int run() {
        try {
            const auto files = std::make_shared<Transaction>();
            Outputs set("a.yuv", "-o", {}, policy(), files), dump("dump", "--filter", {}, policy(), files),
                task("sub/task.xml", "--save-task", {}, policy(), files);
            set.expectSet();
            const fs::path work = fs::path(set.begin("raw")).parent_path();
            std::ofstream(work / "out.raw") << "new";
            std::ofstream(work / "out.wav") << "new";
            std::ofstream(dump.begin("")) << "new";
            std::ofstream(task.begin("xml")) << "new";
            Outputs* const all[] = {&set, &dump, &task};
            Outputs::commit(all);
            return 0;
        } catch (const Failure& failure) {
            return static_cast<int>(failure.exit());
        }
    }
    // What the files of a folder hold: "old", "new", or a mixture.
    std::string state(const std::string& where) const {
        std::set<std::string> found;
        for (const std::string name : kNames)
            if ((name.rfind("sub/", 0) == 0) == (where == "sub"))
                found.insert(fs::exists(folder.file(name)) ? TempFolder::read(folder.file(name)) : "none");
        return found.size() == 1 ? *found.begin() : "a mixture";
    }
    // Whether a work folder stands there. One that was just made may have no more than an unfinished file
    // `owner`, if that is allowed.
    enum class Owner { finished, mayBeUnfinished };
    bool littered(Owner owner = Owner::finished) const {
        for (const auto& entry : fs::recursive_directory_iterator(folder.path())) {
            if (entry.path().filename().string().rfind(".tarsel", 0) != 0) continue;
            if (owner == Owner::finished) return true;
            for (const auto& inside : fs::directory_iterator(entry.path()))
                if (inside.path().filename() != "owner") return true;
        }
        return false;
    }
    void recoverAll() const {
        for (const char* place : {"", "sub"})
            for (const auto& left : recoverPlace(folder.file(place), {})) EXPECT_FALSE(left.remains());
    }
};

TEST_F(Together, AKillLeavesNoMixtureInAFolder) {
    for (const bool old : {false, true}) {
        const std::string before = old ? "old" : "none";
        std::set<std::string> seen;
        for (int n = 1;; ++n) {
            fill(old);
            if (!killedBefore(n, [] { return run(); })) break;
            recoverAll();
            for (const char* where : {"", "sub"}) {
                EXPECT_TRUE(state(where) == before || state(where) == "new") << where << n << state(where);
                seen.insert(state(where));
            }
            EXPECT_FALSE(littered()) << n;
        }
        EXPECT_EQ(seen, (std::set<std::string>{before, "new"}));
    }
}

#ifdef __x86_64__
TEST_F(Together, OneCallThatFailsTakesAllFoldersBack) {
    for (const long call : {SYS_fsync, SYS_renameat2, SYS_syncfs}) {
        int calls = 0;
        for (int n = 1;; ++n, ++calls) {
            fill(true);
            const int status = withFailure(call, n, EIO, [] { return run(); });
            if (status < 0) break;
            EXPECT_EQ(status, 4) << call << ", " << n;
            EXPECT_EQ(state("") + state("sub"), "oldold") << call << ", " << n;
            EXPECT_FALSE(littered()) << call << ", " << n;
        }
        EXPECT_GE(calls, 2) << call;
    }
}
#endif

// What ends the process may come at any moment of a placement.
TEST_F(Together, AnEndMeetsNoHalfPlacement) {
    for (int round = 0; round < 300; ++round) {
        fill(true);
        inChild([&] {
            std::atomic<bool> begun{false};
            std::thread placing([&] {
                begun = true;
                run();
            });
            placing.detach();
            while (!begun) sched_yield();
            for (int i = 0; i < round * 20; ++i) begun = true;
            Transaction::abandonAll();
            return 0;
        });
        // A folder that was just made has no owner yet, and remains until it is old.
        for (const char* place : {"", "sub"}) recoverPlace(folder.file(place), {});
        for (const char* where : {"", "sub"})
            EXPECT_TRUE(state(where) == "old" || state(where) == "new") << round << where << state(where);
        EXPECT_FALSE(littered(Owner::mayBeUnfinished)) << round;
    }
}

// What can't be known of the old file's list is not given away.
TEST_F(OutputsTest, AListThatCanNotBeReadCountsAsLost) {
    const struct {
        int error;
        mode_t mode;
    } cases[] = {{ENODATA, 0664}, {ENOTSUP, 0664}, {ENOENT, 0644}, {EACCES, 0644}};
    for (const auto& c : cases) {
        fill({{"a.wav", "old"}});
        ASSERT_EQ(chmod(folder.file("a.wav").c_str(), 0664), 0);
        EXPECT_EQ(inChild([&] {
                      failCalls({SYS_getxattr}, c.error);
                      return run(kJobs[1]);
                  }),
                  0);
        struct stat status {};
        ASSERT_EQ(stat(folder.file("a.wav").c_str(), &status), 0);
        EXPECT_EQ(status.st_mode & 07777u, c.mode) << c.error;
    }
}

#ifdef __x86_64__
// One call fails in the middle of a placement: the files go back.
TEST_F(OutputsTest, OneCallThatFailsTakesAllBack) {
    for (const auto& job : std::span(kJobs).first(kKinds))
        for (const long call : {SYS_fsync, SYS_renameat2}) {
            int calls = 0;
            for (int n = 1;; ++n, ++calls) {
                fill(job.before);
                const int status = withFailure(call, n, EIO, [&] { return run(job); });
                if (status < 0) break;
                EXPECT_EQ(status, 4) << job.what << call << ", " << n;
                EXPECT_EQ(found(), job.before) << job.what << call << ", " << n;
            }
            EXPECT_GE(calls, 1) << job.what << call;
        }
}
#endif

TEST_F(OutputsTest, WhatIsInTheWayIsKept) {
    const Job& job = kJobs[3];
    const auto inTheWay = [&] {
        const auto left = recover();
        return !left.empty() && left[0].outcome == Leftover::Outcome::inTheWay;
    };
    for (int n = 1; !inTheWay(); ++n) {
        fill(job.before);
        ASSERT_TRUE(killedBefore(n, [&] { return run(job); }));
        for (const auto& [name, bytes] : job.after)
            if (!fs::exists(folder.file(name))) folder.write(name, "of another");
        for (const auto& [name, bytes] : job.before)
            if (!fs::exists(folder.file(name))) folder.write(name, "of another");
    }
    Files now = found();
    const auto left = recover();
    EXPECT_EQ(now, found());
    EXPECT_EQ(now[left.at(0).detail], "of another");
    for (const auto& [name, bytes] : now)
        if (bytes == "of another") fs::remove(folder.file(name));
    EXPECT_FALSE(recover().at(0).remains());
    now = found();
    EXPECT_TRUE(now == job.before || now == job.after);
}

// Each run cleans the folder when it starts; none takes the new folder of another one for one that was left.
TEST_F(OutputsTest, RunsThatStartTogether) {
    fill({});
    const auto many = [&](int number) {
        const std::string name = std::to_string(number);
        const Job job{"", name + ".wav", "wav", {}, {{"out.wav", name}}, {}};
        for (int i = 0; i < 200; ++i)
            if (run(job) != 0) return 1;
        return 0;
    };
    std::vector<pid_t> children;
    for (int i = 0; i < 4; ++i) {
        children.push_back(fork());
        if (children.back() == 0) _exit(many(i));
    }
    for (const pid_t child : children) {
        int status = 0;
        waitpid(child, &status, 0);
        EXPECT_EQ(status, 0);
    }
    EXPECT_EQ(found(), (Files{{"0.wav", "0"}, {"1.wav", "1"}, {"2.wav", "2"}, {"3.wav", "3"}}));
}

}  // namespace
