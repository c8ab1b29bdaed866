#include <sys/resource.h>

#include "tests/support/checks.h"

namespace {

namespace fs = std::filesystem;

struct Folders : testing::Test {
    TempFolder temp;
    QvPlatform& platform = qv_platform();

    Texts list(const std::string& folder) {
        std::vector<QvFolderEntry> entries;
        EXPECT_EQ(platform.listFolder(folder.c_str(), entries), 0);
        Texts names;
        for (const auto& entry : entries) names.push_back(entry.name + (entry.isFolder ? "/" : ""));
        return names;
    }
    std::string folder(std::string_view name) {
        fs::create_directories(temp.path() / name);
        return temp.file(name);
    }
};

TEST_F(Folders, ListingSortsTellsFoldersThroughLinksAndKeepsAnyBytes) {
    folder("sub");
    for (const char* name : {"b", "\xFF\xFE", "A"}) temp.write(name, "");
    fs::create_symlink("sub", temp.file("link"));
    fs::create_symlink("gone", temp.file("dangling"));
    const std::string before = platform.currentFolder();
    EXPECT_EQ(list(temp.path()), (Texts{"./", "../", "A", "b", "dangling", "link/", "sub/", "\xFF\xFE"}));
    EXPECT_EQ(platform.currentFolder(), before);
    std::vector<QvFolderEntry> entries;
    EXPECT_EQ(platform.listFolder(temp.file("b").c_str(), entries), -1);
    EXPECT_EQ(platform.listFolder("", entries), -1);
    EXPECT_TRUE(entries.empty());
}

TEST_F(Folders, RemovalNeverLeavesTheFolderThroughALink) {
    const std::string outside = folder("outside"), inside = folder("inside/deep");
    temp.write("outside/precious", "kept");
    fs::create_directory_symlink(outside, temp.file("inside/deep/way-out"));
    fs::create_symlink(temp.file("outside/precious"), temp.file("inside/file-link"));
    EXPECT_EQ(platform.removeTree(temp.file("inside").c_str(), nullptr), 0);
    EXPECT_FALSE(fs::exists(temp.file("inside")));
    EXPECT_EQ(TempFolder::read(temp.file("outside/precious")), "kept");

    fs::create_directory_symlink(outside, temp.file("link"));
    for (const char* name : {"link", "link/", "link//"})
        EXPECT_EQ(platform.removeTree(temp.file(name).c_str(), nullptr), -1) << name;
    EXPECT_EQ(TempFolder::read(temp.file("outside/precious")), "kept");
}

TEST_F(Folders, RemovalKeepsWhatItIsToldAndSaysSo) {
    folder("top/sub");
    for (const char* name : {"top/sub/keep.me", "top/sub/other", "top/loose"}) temp.write(name, "x");
    const auto keep = [](std::string_view name) { return name == "keep.me"; };
    EXPECT_EQ(platform.removeTree(temp.file("top").c_str(), keep), -1);
    EXPECT_TRUE(fs::exists(temp.file("top/sub/keep.me")));
    EXPECT_FALSE(fs::exists(temp.file("top/sub/other")) || fs::exists(temp.file("top/loose")));
}

TEST_F(Folders, ATreeDeeperThanFilesMayBeOpenIsRefusedWithoutHarm) {
    std::string deep = "top";
    for (int i = 0; i < 80; ++i) deep += "/d";
    folder(deep);
    rlimit former;
    ASSERT_EQ(getrlimit(RLIMIT_NOFILE, &former), 0);
    const rlimit few{40, former.rlim_max};
    ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &few), 0);
    EXPECT_EQ(platform.removeTree(temp.file("top").c_str(), nullptr), -1);
    EXPECT_TRUE(fs::exists(temp.file(deep)));
    setrlimit(RLIMIT_NOFILE, &former);
    EXPECT_EQ(platform.removeTree(temp.file("top").c_str(), nullptr), 0);
}

}  // namespace
