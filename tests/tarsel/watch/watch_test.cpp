// When a file of a watched folder is due, which names wait, and what is remembered of a file.
#include <gtest/gtest.h>

#include "tarsel/watch/arrivals.h"
#include "tarsel/watch/copynames.h"
#include "tarsel/watch/memory.h"
#include "tests/support/temp_folder.h"

namespace {

FileFacts fileOf(long long bytes, long long modified = 1) {
    return {FileFacts::Kind::file, bytes, modified, 1, 2};
}

TEST(Arrivals, IsDueWhenNothingHasChangedForTheTime) {
    Arrivals arrivals(100);
    arrivals.see("a", fileOf(1), 0);
    arrivals.see("a", fileOf(1), 90);  // the same: the time runs on
    EXPECT_EQ(arrivals.next(), 100);
    EXPECT_FALSE(arrivals.due(99));
    EXPECT_EQ(arrivals.due(100), "a");
    arrivals.see("a", fileOf(2), 99);
    EXPECT_FALSE(arrivals.due(198));
    arrivals.see("a", fileOf(2, 5), 150);  // its time alone
    EXPECT_FALSE(arrivals.due(249));
    EXPECT_EQ(arrivals.due(250), "a");
    arrivals.see("a", {}, 260);
    EXPECT_TRUE(arrivals.empty());
    EXPECT_FALSE(arrivals.next());
}

TEST(Arrivals, TheOneThatWaitedLongestComesFirst) {
    Arrivals arrivals(100);
    arrivals.see("b", fileOf(1), 0);
    arrivals.see("a", fileOf(1), 10);
    EXPECT_EQ(arrivals.due(500), "b");
    arrivals.postpone("b", 500, 1000);
    EXPECT_EQ(arrivals.due(500), "a");
    // Whatever is seen meanwhile.
    arrivals.see("b", fileOf(7), 600);
    arrivals.forget("a");
    EXPECT_FALSE(arrivals.due(1499));
    EXPECT_EQ(arrivals.due(1500), "b");
}

TEST(CopyNames, NamesOfCopyToolsWait) {
    for (const char* name : {".clip.wav.Ab3dEf", ".clip.wav", "clip.wav.part", "CLIP.WAV.PART", "clip.wav~",
                             "~$clip.doc", "clip.crdownload", "clip.wav.filepart", "clip.tmp"})
        EXPECT_TRUE(isUnfinishedName(name)) << name;
    for (const char* name : {"clip.wav", "part.wav", "tmp", "a~b.wav", "clip.part.wav", "department"})
        EXPECT_FALSE(isUnfinishedName(name)) << name;
}

WatchedFile record(const std::string& name, WatchedFile::State state) {
    WatchedFile file;
    file.name = name;
    file.facts = fileOf(10, 20);
    file.digest = "abc";
    file.state = state;
    file.made["RAW\t/out"] = {{"/out/x \xff%.wav", 5, 6}};
    file.outputs = {"/out/x \xff%.wav"};
    return file;
}

TEST(WatchMemory, SurvivesTornAndDamagedLines) {
    const TempFolder folder;
    const std::string path = folder.file("memory"), odd = "a\n\xff\"%41 \\.wav";
    {
        WatchMemory memory(path);
        memory.remember(record(odd, WatchedFile::State::begun));
        memory.remember(record(odd, WatchedFile::State::done));
        memory.remember(record("second", WatchedFile::State::failed));
    }
    std::string text = TempFolder::read(path);
    const size_t last = text.rfind('\n', text.size() - 2) + 1;
    for (size_t cut = last; cut < text.size(); cut += 7) {
        folder.write("memory", text.substr(0, cut));
        WatchMemory memory(path);
        ASSERT_TRUE(memory.find(odd)) << cut;
        EXPECT_EQ(memory.find(odd)->state, WatchedFile::State::done);
        EXPECT_FALSE(memory.find("second")) << cut;
        memory.remember(record("third", WatchedFile::State::closed));  // after the torn line
    }
    text[last + 30] ^= 1;
    folder.write("memory", text);
    WatchMemory memory(path);
    EXPECT_FALSE(memory.find("second"));
    const WatchedFile* const known = memory.find(odd);
    ASSERT_TRUE(known);
    EXPECT_TRUE(known->isCertainly(fileOf(10, 20)));
    EXPECT_FALSE(known->isCertainly(fileOf(10, 21)));
    ASSERT_EQ(known->made.count("RAW\t/out"), 1u);
    EXPECT_EQ(known->made.at("RAW\t/out").front().name, "/out/x \xff%.wav");
    ASSERT_TRUE(memory.makerOf("/out/x \xff%.wav"));
    EXPECT_EQ(*memory.makerOf("/out/x \xff%.wav"), odd);
}

TEST(WatchMemory, StaysSmallAndIsOneProcesss) {
    const TempFolder folder;
    const std::string path = folder.file("memory");
    {
        WatchMemory memory(path);
        EXPECT_THROW(WatchMemory second(path), std::exception) << "two at once";
        for (int i = 0; i < 1200; ++i) memory.remember(record("same", WatchedFile::State::begun));
        memory.remember(record("other", WatchedFile::State::closed));
    }
    const auto before = TempFolder::read(path).size();
    {
        WatchMemory memory(path);
        memory.remember(record("third", WatchedFile::State::closed));
        EXPECT_THROW(WatchMemory second(path), std::exception) << "the lock is that of the new file";
    }
    EXPECT_LT(TempFolder::read(path).size(), before / 100);
    WatchMemory memory(path);
    for (const char* name : {"same", "other", "third"}) EXPECT_TRUE(memory.find(name)) << name;
}

}  // namespace
