// What the journal of a task says after any end of its process.
#include <gtest/gtest.h>

#include <memory>

#include "tarsel/batch/journal.h"
#include "tests/support/temp_folder.h"

namespace {

using Step = TaskRecord::Step;
namespace fs = std::filesystem;

class Journal : public testing::Test {
  protected:
    std::string file() const { return folder.file("list.journal.d/1234"); }
    TaskRecord read() const { return TaskRecord::read(file()); }

    // A task whose output is `out.wav`, up to "placing"; the file does not have its name yet.
    void place(TaskJournal& journal) const {
        journal.started();
        folder.write("hidden", "sound");
        journal.placing({{folder.file("hidden"), folder.file("odd \xff\"%41\n.wav")}});
    }
    void giveName() const { fs::rename(folder.path() / "hidden", folder.path() / "odd \xff\"%41\n.wav"); }

    TempFolder folder;
};

TEST_F(Journal, TheLastStepCounts) {
    EXPECT_EQ(read().last, Step::none);
    TaskJournal journal(file(), "key");
    ASSERT_TRUE(journal.tryLock());
    place(journal);
    EXPECT_EQ(read().last, Step::placing);
    EXPECT_EQ(read().pid, getpid());
    EXPECT_FALSE(read().stands(false)) << "the file has no name yet";
    giveName();
    EXPECT_TRUE(read().stands(true));
    EXPECT_FALSE(read().isDone("key", false)) << "that is for who has the lock to say";
    journal.done();
    EXPECT_TRUE(read().isDone("key", true));
    EXPECT_FALSE(read().isDone("another", true));
    // Another size, another time, other bytes of that size and time.
    const std::string name = read().files.at(0).name;
    const auto time = fs::last_write_time(name);
    const std::string base = fs::path(name).filename().string();
    folder.write(base, "sound2");
    fs::last_write_time(name, time);
    EXPECT_FALSE(read().isDone("key", false));
    folder.write(base, "sounD");
    EXPECT_FALSE(read().isDone("key", false));
    fs::last_write_time(name, time);
    EXPECT_TRUE(read().isDone("key", false));
    EXPECT_FALSE(read().isDone("key", true));
    fs::remove(name);
    EXPECT_FALSE(read().isDone("key", false));
    journal.started();
    journal.failed(4, "no room");
    EXPECT_EQ(read().last, Step::failed);
    EXPECT_EQ(read().status, 4);
    EXPECT_EQ(read().failure, "no room");
    EXPECT_TRUE(read().files.empty()) << "of an earlier run";
}

// Cut anywhere, the journal never says more than what was whole, and what is added later is read.
TEST_F(Journal, TornAndDamagedLinesArePassedOver) {
    {
        TaskJournal journal(file(), "key");
        place(journal);
        giveName();
        journal.done();
    }
    const std::string all = TempFolder::read(file());
    const size_t placing = all.find('\n') + 1, done = all.find('\n', placing) + 1;
    for (size_t cut = 0; cut < all.size(); ++cut) {
        folder.write("list.journal.d/1234", all.substr(0, cut));
        const Step want = cut >= done ? Step::placing : cut >= placing ? Step::started : Step::none;
        ASSERT_EQ(read().last, want) << cut;
        TaskJournal(file(), "key").failed(1, "after a cut");
        ASSERT_EQ(read().failure, "after a cut") << cut;
    }
    for (size_t at = done; at + 1 < all.size(); ++at) {
        std::string damaged = all;
        damaged[at] = static_cast<char>(damaged[at] ^ 4);
        folder.write("list.journal.d/1234", damaged);
        ASSERT_EQ(read().last, Step::placing) << at;
    }
}

TEST_F(Journal, ItIsOneProcesss) {
    auto journal = std::make_unique<TaskJournal>(file(), "key");
    EXPECT_FALSE(RecordFile::isLocked(file()));
    ASSERT_TRUE(journal->tryLock());
    EXPECT_TRUE(RecordFile::isLocked(file()));
    EXPECT_FALSE(TaskJournal(file(), "key").tryLock());
    // Whoever has a file that was removed before its lock was had gets the one that has the name.
    TaskJournal late(file(), "key");
    fs::remove(file());
    journal.reset();
    ASSERT_TRUE(late.tryLock());
    late.started();
    EXPECT_EQ(read().last, Step::started);
    fs::create_directory(folder.path() / "list.journal.d/folder");
    EXPECT_ANY_THROW(TaskJournal(folder.file("list.journal.d/folder"), "key"));
    fs::create_symlink(file(), folder.path() / "list.journal.d/link");
    EXPECT_ANY_THROW(TaskJournal(folder.file("list.journal.d/link"), "key"));
    EXPECT_TRUE(TaskRecord::read(folder.file("list.journal.d/link")).key.empty());
}

}  // namespace
