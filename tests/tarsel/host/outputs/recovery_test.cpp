// What is done with work folders that are found: by their owner, and by a manifest that may be anything.
#include "tarsel/host/outputs/recovery.h"

#include <gtest/gtest.h>

#include <ctime>
#include <optional>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include "tarsel/host/outputs/manifest.h"
#include "tarsel/host/outputs/owner.h"
#include "tests/support/child.h"
#include "tests/support/temp_folder.h"

namespace {

namespace fs = std::filesystem;

using Outcome = Leftover::Outcome;

// The end of a process, as an owner that was.
Owner ended() {
    int channel[2];
    if (pipe(channel) != 0) return {};
    inChild([&] {
        const std::string text = Owner::self().text();
        return write(channel[1], text.data(), text.size()) < 0;
    });
    char text[1024];
    const ssize_t size = read(channel[0], text, sizeof text);
    close(channel[0]);
    close(channel[1]);
    return Owner::parse({text, static_cast<size_t>(size)}).value();
}

Owner with(Owner owner, const char* host, const char* boot) {
    if (host) owner.host = host;
    if (boot) owner.boot = boot;
    return owner;
}

class Recovery : public testing::Test {
  protected:
    // A work folder of this owner text, with a file of 5 bytes.
    void leave(const std::optional<std::string>& owner) const {
        fs::remove_all(work());
        fs::create_directory(work());
        fs::permissions(work(), fs::perms::owner_all);
        if (owner) folder.write(".tarsel-abc/owner", *owner);
        folder.write(".tarsel-abc/out.wav", "bytes");
    }
    fs::path work() const { return folder.path() / ".tarsel-abc"; }
    std::vector<Leftover> recover(const RecoveryRules& rules = {}) const {
        return recoverPlace(folder.path().string(), rules);
    }
    // What became of the only folder; nothing remains of it exactly if it says so.
    Outcome outcome(const RecoveryRules& rules = {}) const {
        const auto found = recover(rules);
        EXPECT_EQ(found.size(), 1u);
        if (found.empty()) return Outcome::failed;
        EXPECT_EQ(found[0].remains(), fs::exists(work())) << static_cast<int>(found[0].outcome);
        return found[0].outcome;
    }

    TempFolder folder;
};

TEST_F(Recovery, TheOwnerDecides) {
    const Owner gone = ended();
    const struct {
        const char* what;
        std::optional<std::string> owner;
        Outcome byARun, onDemand;
    } cases[] = {
        {"ended", gone.text(), Outcome::removed, Outcome::removed},
        {"ended before a restart", with(gone, nullptr, "earlier").text(), Outcome::removed, Outcome::removed},
        {"in a container here", with(gone, "container", nullptr).text(), Outcome::removed, Outcome::removed},
        {"another host", with(gone, "far", "away").text(), Outcome::elsewhere, Outcome::removed},
        {"at work, where locks do nothing", Owner::self().text(), Outcome::inUse, Outcome::inUse},
        {"its number was given again",
         [] {
             Owner o = Owner::self();
             ++o.started;
             return o.text();
         }(),
         Outcome::removed, Outcome::removed},
        {"ended before it had a name", "", Outcome::removed, Outcome::removed},
        {"another version", "tarsel-owner 2\n", Outcome::ownerless, Outcome::removed},
        {"cut", gone.text().substr(0, gone.text().size() - 3), Outcome::ownerless, Outcome::removed},
        {"none", std::nullopt, Outcome::ownerless, Outcome::removed},
    };
    for (const auto& c : cases) {
        leave(c.owner);
        EXPECT_EQ(outcome(), c.byARun) << c.what;
        leave(c.owner);
        EXPECT_EQ(outcome({.all = true}), c.onDemand) << c.what;
    }
    leave(std::nullopt);
    const auto found = recover({.all = true});
    EXPECT_EQ(found.at(0).files, 1u);
    EXPECT_EQ(found.at(0).bytes, 5);
}

// Its parent may wait long until it asks how it ended.
TEST_F(Recovery, AZombieIsGone) {
    int channel[2];
    ASSERT_EQ(pipe(channel), 0);
    const pid_t child = fork();
    if (child == 0) {
        const std::string text = Owner::self().text();
        _exit(write(channel[1], text.data(), text.size()) < 0);
    }
    siginfo_t info{};
    waitid(P_PID, static_cast<id_t>(child), &info, WEXITED | WNOWAIT);
    char text[1024];
    const ssize_t size = read(channel[0], text, sizeof text);
    leave(std::string(text, static_cast<size_t>(size)));
    EXPECT_EQ(outcome(), Outcome::removed);
    waitpid(child, nullptr, 0);
    close(channel[0]);
    close(channel[1]);
}

TEST_F(Recovery, ALockProtects) {
    leave(ended().text());
    const int lock = open((work() / "owner").c_str(), O_RDWR | O_CLOEXEC);
    ASSERT_EQ(flock(lock, LOCK_EX), 0);
    EXPECT_EQ(outcome({.all = true, .stale = 0}), Outcome::inUse);
    close(lock);
    EXPECT_EQ(outcome(), Outcome::removed);
}

TEST_F(Recovery, AnotherHostsFolderBecomesStale) {
    leave(with(ended(), "far", "away").text());
    const auto date = [&](const fs::path& path, long long age) {
        const timespec times[2] = {{std::time(nullptr) - age, 0}, {std::time(nullptr) - age, 0}};
        utimensat(AT_FDCWD, path.c_str(), times, 0);
    };
    for (const char* name : {"owner", "out.wav", "."}) date(work() / name, 5000);
    EXPECT_EQ(outcome({.stale = 6000}), Outcome::elsewhere);
    date(work() / "out.wav", 1000);
    EXPECT_EQ(outcome({.stale = 4000}), Outcome::elsewhere) << "it is being written";
    EXPECT_EQ(outcome({.stale = 500}), Outcome::removed);
}

TEST_F(Recovery, WhatIsNotOursStays) {
    leave(ended().text());
    fs::permissions(work(), fs::perms::group_write, fs::perm_options::add);
    EXPECT_EQ(outcome({.all = true}), Outcome::notOurs);
    if (geteuid() == 0) {
        leave(ended().text());
        ASSERT_EQ(chown(work().c_str(), 65534, 65534), 0);
        EXPECT_EQ(outcome({.all = true}), Outcome::notOurs);
    }
    fs::remove_all(work());
    const TempFolder other;
    other.write("kept", "kept");
    fs::create_directory_symlink(other.path(), work());
    EXPECT_TRUE(recover({.all = true}).empty());
    EXPECT_EQ(TempFolder::read(other.file("kept")), "kept");
}

// It is named, and tried again.
TEST_F(Recovery, AFolderOfAnother) {
    leave(ended().text());
    fs::create_directory(work() / "theirs");
    for (int i = 0; i < 2; ++i) {
        EXPECT_EQ(outcome(), Outcome::failed);
        EXPECT_EQ(recover().at(0).detail, "the folder 'theirs' is in it");
        EXPECT_FALSE(fs::exists(work() / "out.wav"));
    }
    fs::remove(work() / "theirs");
    EXPECT_EQ(outcome(), Outcome::removed);
}

// Each is refused as a whole: nothing moves, nothing is removed.
TEST_F(Recovery, AManifestThatIsNotRight) {
    const auto sealed = [](const std::string& rows) {
        uint64_t sum = 0xcbf29ce484222325;
        const std::string text = "tarsel-manifest 1\n" + rows;
        for (const char c : text) sum = (sum ^ static_cast<unsigned char>(c)) * 0x100000001b3;
        char end[32];
        std::snprintf(end, sizeof end, "end %016llx\n", static_cast<unsigned long long>(sum));
        return text + end;
    };
    const std::string good = sealed("old old-0 a.png\nnew out.wav b%20c%25.png\n");
    ASSERT_TRUE(Manifest::parse(good));
    EXPECT_EQ(Manifest::parse(good)->text(), good);
    EXPECT_EQ(Manifest::parse(good)->fresh[0].name, "b c%.png");
    std::vector<std::string> bad{
        "",
        "tarsel-manifest 1\n",
        sealed("").replace(16, 1, "2"),
        sealed("new out.wav ../b.png\n"),
        sealed("new out.wav /b.png\n"),
        sealed("new out.wav ..\n"),
        sealed("new out.wav .\n"),
        sealed("new out.wav \n"),
        sealed("new  b.png\n"),
        sealed("new out.wav\n"),
        sealed("new ../x/out.wav b.png\n"),
        sealed("new out.wav %2e%2e%2fb.png\n"),
        sealed("new out.wav b%00.png\n"),
        sealed("new out.wav b%2\n"),
        sealed("new out.wav b%zz.png\n"),
        sealed("new out.wav b.png\nnew out.png b.png\n"),
        sealed("new out.wav b.png\nnew out.wav c.png\n"),
        sealed("old out.wav b.png\nnew out.wav c.png\n"),
        sealed("link out.wav b.png\n"),
        sealed("new out.wav b.png"),
        good + "\n",
        "\n" + good,
    };
    for (size_t length = 0; length < good.size(); ++length) bad.push_back(good.substr(0, length));
    for (size_t at = 0; at < good.size(); ++at) {
        bad.push_back(good);
        bad.back()[at] ^= 1;
    }
    for (const auto& text : bad) EXPECT_FALSE(Manifest::parse(text)) << text;
    leave(ended().text());
    for (size_t i = 0; i < 22; ++i)
        for (const char* state : {Manifest::kMovingOldIn, Manifest::kMovingNewOut}) {
            folder.write(std::string(".tarsel-abc/") + state, bad[i]);
            EXPECT_EQ(outcome({.all = true}), Outcome::unreadable) << bad[i];
            EXPECT_TRUE(fs::exists(work() / "out.wav"));
            fs::remove(work() / state);
        }
    folder.write(std::string(".tarsel-abc/") + Manifest::kMovingNewOut, good);
    EXPECT_EQ(outcome(), Outcome::completed);
    EXPECT_EQ(TempFolder::read(folder.file("b c%.png")), "bytes");
}

// Many clean one place at once, and runs start there.
TEST_F(Recovery, AtTheSameTime) {
    for (int round = 0; round < 20; ++round) {
        leave(ended().text());
        folder.write(std::string(".tarsel-abc/") + Manifest::kMovingNewOut,
                     Manifest{{}, {{"out.wav", "a.wav"}}}.text());
        std::vector<pid_t> children;
        for (int i = 0; i < 4; ++i) {
            const pid_t child = fork();
            if (child == 0) {
                for (const auto& found : recover())
                    if (found.remains() && found.outcome != Outcome::inUse) _exit(1);
                _exit(0);
            }
            children.push_back(child);
        }
        for (const pid_t child : children) {
            int status = 0;
            waitpid(child, &status, 0);
            EXPECT_EQ(status, 0);
        }
        EXPECT_FALSE(fs::exists(work()));
        EXPECT_EQ(TempFolder::read(folder.file("a.wav")), "bytes");
        fs::remove(folder.file("a.wav"));
    }
}

}  // namespace
