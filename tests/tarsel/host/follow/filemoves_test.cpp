// Putting files away, and what is known of a file that others may write.
#include "tarsel/host/follow/filemoves.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <filesystem>

#include <unistd.h>

#include "tests/support/temp_folder.h"

namespace fs = std::filesystem;

namespace {

TEST(FileMoves, NothingIsOverwritten) {
    const TempFolder folder;
    const std::string to = folder.file("done");
    for (const char* text : {"first", "second", "third"}) {
        const std::string file = folder.write("clip.wav", text);
        moveInto(file, to, factsOf(file));
        EXPECT_FALSE(fs::exists(file));
    }
    EXPECT_EQ(TempFolder::read(to + "/clip.wav"), "first");
    EXPECT_EQ(TempFolder::read(to + "/clip (2).wav"), "second");
    EXPECT_EQ(TempFolder::read(to + "/clip (3).wav"), "third");
}

TEST(FileMoves, AChangedFileStays) {
    const TempFolder folder;
    const std::string file = folder.write("clip.wav", "old");
    const FileFacts facts = factsOf(file);
    folder.write("clip.wav", "newer");
    EXPECT_THROW(removeFile(file, facts), std::exception);
    EXPECT_THROW(moveInto(file, folder.file("done"), facts), std::exception);
    EXPECT_EQ(TempFolder::read(file), "newer");
    EXPECT_TRUE(fs::is_empty(folder.file("done")));
    removeFile(file, factsOf(file));
    EXPECT_FALSE(fs::exists(file));
}

// /dev/shm is another disk wherever it exists and folders for tests are not on it.
TEST(FileMoves, AnotherDiskGetsACopy) {
    const fs::path other = fs::path("/dev/shm") / ("qv-moves-" + std::to_string(::getpid()));
    std::error_code error;
    if (!fs::create_directory(other, error)) GTEST_SKIP() << "no /dev/shm";
    const TempFolder folder;
    const std::string text(3000000, 'x'), file = folder.write("clip.wav", text);
    fs::last_write_time(file, fs::last_write_time(file) - std::chrono::hours(1000));
    const auto time = fs::last_write_time(file);
    const std::string to = moveInto(file, other.string(), factsOf(file));
    EXPECT_EQ(TempFolder::read(to), text);
    EXPECT_EQ(fs::last_write_time(to), time);
    EXPECT_FALSE(fs::exists(file));
    EXPECT_EQ(std::distance(fs::directory_iterator(other), {}), 1) << "a part of the copy is left";
    fs::remove_all(other);
}

TEST(FileFacts, SeesAWriterAndNoReader) {
    const TempFolder folder;
    const std::string file = folder.write("clip.wav", "text");
    EXPECT_FALSE(isBeingWritten(file));
    std::FILE* const reader = std::fopen(file.c_str(), "rb");
    EXPECT_FALSE(isBeingWritten(file));
    std::FILE* const writer = std::fopen(file.c_str(), "ab");
    EXPECT_TRUE(isBeingWritten(file));
    std::fclose(writer);
    EXPECT_FALSE(isBeingWritten(file));
    std::fclose(reader);
    EXPECT_EQ(digestOf(file, [] { return false; }),
              "982d9e3eb996f559e633f4d194def3761d909f5a3b647d1a851fead67c32c9d1");
    EXPECT_FALSE(digestOf(file, [] { return true; }));
    fs::create_symlink(file, folder.file("link"));
    EXPECT_EQ(factsOf(folder.file("link")).kind, FileFacts::Kind::link);
    EXPECT_TRUE(isWithin("/a/b", "/a"));
    EXPECT_TRUE(isWithin("/a", "/a"));
    EXPECT_FALSE(isWithin("/ab", "/a"));
}

}  // namespace
