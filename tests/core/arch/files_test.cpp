#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "tests/support/checks.h"

namespace {

namespace fs = std::filesystem;

struct Files : testing::Test {
    TempFolder temp;
    QvPlatform& platform = qv_platform();

    std::string make(std::string_view name, std::string_view bytes = "x") { return temp.write(name, bytes); }
};

TEST_F(Files, ModesThatAreNoneAndFoldersDoNotOpen) {
    const std::string there = make("there", "kept");
    for (const char* mode : {"", "x", "+", "q+"})
        EXPECT_FALSE(platform.openFile(there.c_str(), mode)) << mode;
    for (const char* mode : {"r", "rb", "w", "a+"})
        EXPECT_FALSE(platform.openFile(temp.path().c_str(), mode)) << mode;
    EXPECT_EQ(TempFolder::read(there), "kept");
    std::FILE* const file = platform.openFile(there.c_str(), "r+b");
    ASSERT_TRUE(file);
    EXPECT_TRUE(fcntl(fileno(file), F_GETFD) & FD_CLOEXEC) << "not inherited";
    std::fclose(file);
}

TEST_F(Files, PositionsBeyondFourGigabytesAreExact) {
    std::FILE* const file = platform.openFile(temp.file("sparse").c_str(), "w+b");
    ASSERT_NE(file, nullptr);
    constexpr long long far = 0x1'2345'6789;
    EXPECT_EQ(platform.seek(file, far, SEEK_SET), 0);
    std::fputc('z', file);
    EXPECT_EQ(platform.tell(file), far + 1);
    EXPECT_EQ(platform.seek(file, -1, SEEK_END), 0);
    EXPECT_EQ(std::fgetc(file), 'z');
    EXPECT_EQ(platform.seek(file, -1, SEEK_SET), -1);
    std::fclose(file);
}

// /dev/shm is a disc of its own on Linux.
TEST_F(Files, MovingToAnotherDiscKeepsContentAndTimeAndLeavesNoPart) {
    const std::string from = make("from", std::string(3'000'000, 'm'));
    const fs::path other = fs::path("/dev/shm") / temp.path().filename();
    std::error_code error;
    if (!fs::create_directory(other, error)) GTEST_SKIP() << "no second disc";
    if (struct stat a, b; stat(from.c_str(), &a) == 0 && stat(other.c_str(), &b) == 0 && a.st_dev == b.st_dev)
        GTEST_SKIP() << "one disc only";
    const auto time = fs::last_write_time(from);
    const std::string to = (other / "to").string();

    EXPECT_EQ(platform.moveFile(from.c_str(), to.c_str(), false), 0);
    EXPECT_TRUE(!fs::exists(from) && fs::last_write_time(to) == time);
    const std::string second = make("second", "two");
    EXPECT_EQ(platform.moveFile(second.c_str(), to.c_str(), false), -1);
    EXPECT_TRUE(fs::exists(second) && fs::file_size(to) == 3'000'000u);
    EXPECT_EQ(std::distance(fs::directory_iterator(other), {}), 1);
    fs::remove_all(other);
}

TEST_F(Files, StatusFollowsLinksAndSameFileSeesThroughThem) {
    const std::string file = make("file", "12345");
    fs::create_symlink(file, temp.file("link"));
    fs::create_hard_link(file, temp.file("hard"));
    fs::create_symlink(temp.file("nowhere"), temp.file("dangling"));
    QvFileStatus status;
    ASSERT_TRUE(platform.status(temp.file("link").c_str(), status));
    EXPECT_TRUE(status.size == 5 && status.isRegular);
    EXPECT_FALSE(platform.status(temp.file("dangling").c_str(), status));
    EXPECT_TRUE(platform.sameFile(file.c_str(), temp.file("hard").c_str()));
    EXPECT_TRUE(platform.sameFile(file.c_str(), (temp.path() / "." / "link").c_str()));
    EXPECT_FALSE(platform.sameFile(file.c_str(), make("other").c_str()));
    EXPECT_FALSE(platform.sameFile(temp.file("gone").c_str(), temp.file("gone").c_str()));
}

}  // namespace
