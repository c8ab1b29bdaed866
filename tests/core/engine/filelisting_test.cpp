#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

#include "core/arch/platform.h"
#include "core/arch/widename.h"
#include "core/engine/qvfileutil.h"
#include "tests/support/log_capture.h"
#include "tests/support/temp_folder.h"

namespace {

namespace fs = std::filesystem;
using Names = std::vector<std::string>;

Any wide(const std::string& name) { return Any(qv_wide_name(name).c_str()); }

class Listing : public testing::Test {
  protected:
    TempFolder temp;
    std::string folder = temp.path().string();

    void files(const Names& names) {
        for (const std::string& name : names) temp.write(name, "");
    }
    // Names without the folder, which must be in front of each.
    Names names(const AnyVector& list) {
        Names out;
        for (const Any& entry : list) {
            const std::string name = qv_os_name(entry);
            EXPECT_EQ(name.substr(0, folder.size() + 1), folder + "/");
            out.push_back(name.substr(folder.size() + 1));
        }
        return out;
    }
    Names matching(const char* ext) {
        AnyVector list("left over", "from before");
        get_folder_files_by_ext(Any(folder.c_str()), ext, &list);
        return names(list);
    }
    std::vector<int> sequence(const std::string& name, int& digits) {
        std::vector<int> narrowNumbers, wideNumbers;
        int wideDigits = -1;
        for (const Any& number : QvFile::numberedSequence(Any(temp.file(name).c_str()), &digits))
            narrowNumbers.push_back(number.asInt32(-1));
        for (const Any& number : QvFile::numberedSequence(wide(temp.file(name)), &wideDigits))
            wideNumbers.push_back(number.asInt32(-1));
        EXPECT_EQ(narrowNumbers, wideNumbers);
        EXPECT_EQ(digits, wideDigits);
        return narrowNumbers;
    }
};

TEST_F(Listing, ExtensionsAreTheEndsOfNames) {
    files({"a.png", "b.PNG", "c.png", "png", "x.jpg", "aa.png.bak"});
    fs::create_directory(temp.file("dir.png"));
    EXPECT_EQ(matching(".png"), (Names{"a.png", "c.png", "dir.png"}));
    EXPECT_EQ(matching(".jp?"), (Names{"x.jpg"}));
    EXPECT_EQ(matching(".p*"), (Names{"a.png", "aa.png.bak", "c.png", "dir.png"}));
    EXPECT_EQ(matching("[ab].png"), Names{});
    EXPECT_EQ(matching("").size(), 9u);
    EXPECT_EQ(matching(nullptr), matching(""));
}

TEST_F(Listing, ManyStarsDoNotTakeForEver) {
    files({std::string(200, 'a')});
    std::string pattern;
    for (int i = 0; i < 100; ++i) pattern += "a*";
    EXPECT_EQ(matching((pattern + "b").c_str()), Names{});
    EXPECT_EQ(matching(pattern.c_str()).size(), 1u);
}

TEST_F(Listing, PlugInsAreFilesByTheirEnding) {
    files({"one_plugin.so", "two_plugin.so", "plugin.so", "three_plugin.so.1"});
    fs::create_directory(temp.file("dir_plugin.so"));
    AnyVector list;
    get_folder_plugin_dlls(Any(folder.c_str()), &list);
    EXPECT_EQ(names(list), (Names{"one_plugin.so", "two_plugin.so"}));
}

TEST_F(Listing, LeavesOutDotsAndOnWishFolders) {
    files({"b", "a.x", ".hidden", ".h.x", "..x"});
    fs::create_directory(temp.file("sub"));
    EXPECT_EQ(names(QvFile::ls(Any(folder.c_str()), 0)), (Names{"..x", ".h.x", "a.x", "b", "sub"}));
    EXPECT_EQ(names(QvFile::ls(Any(folder.c_str()), 1)), (Names{"..x", ".h.x", "a.x", "b"}));
    EXPECT_EQ(names(QvFile::ls(Any(folder.c_str()), 2)), names(QvFile::ls(Any(folder.c_str()), 0)));
}

TEST_F(Listing, WideListingsLoseNoFile) {
    files({"\xC3\xA9", "\xFF\xFE", "ok"});
    const AnyVector list = QvFile::ls(wide(folder), 1);
    ASSERT_EQ(list.size(), 3);
    for (const Any& name : list) {
        EXPECT_TRUE(name.isWString());
        EXPECT_TRUE(QvFile::isFile(name));
        EXPECT_EQ(QvFile::rm(name), 0);
    }
    EXPECT_TRUE(fs::is_empty(folder));
}

TEST_F(Listing, MissesAreLinesInTheLog) {
    LogCapture log;
    const std::string absent = temp.file("absent");
    AnyVector list;
    get_folder_files_by_ext(Any(absent.c_str()), ".x", &list);
    get_folder_files_by_ext(wide(absent), ".x", &list);
    EXPECT_TRUE(log.contains("get_folder_files_by_extA - invalid folder: " + absent, 32));
    EXPECT_TRUE(log.contains("get_folder_files_by_extW - Invalid (w)folder: " + absent, 32));
    get_folder_files_by_ext(Any(folder.c_str()), ".x", &list);
    get_folder_files_by_ext(wide(folder), ".x", &list);
    EXPECT_TRUE(log.contains("get_folder_files_by_extA - no files found: *.x", 32));
    EXPECT_TRUE(log.contains("get_folder_files_by_extW - no files found: *.x", 32));
}

TEST_F(Listing, SequencesHaveOneLengthPrefixAndExtension) {
    files({"a001.png", "a002.png", "a10.png", "a003.PNG", "b004.png", "a005.jpg", "a0010.png"});
    fs::create_directory(temp.file("a006.png"));
    int digits = -1;
    EXPECT_EQ(sequence("a001.png", digits), (std::vector<int>{1, 2}));
    EXPECT_EQ(digits, 3);
    EXPECT_EQ(sequence("a777.png", digits), (std::vector<int>{1, 2}));  // need not be there itself
    EXPECT_EQ(sequence("b004.png", digits), std::vector<int>{});
    EXPECT_EQ(digits, 0);
    EXPECT_EQ(sequence("none.png", digits), std::vector<int>{});
    EXPECT_EQ(digits, 0);
}

TEST_F(Listing, SequenceNumbersAreSortedWithZeroAndWithinRange) {
    files({"p10", "p00", "p09", "p11"});
    int digits = -1;
    EXPECT_EQ(sequence("p10", digits), (std::vector<int>{0, 9, 10, 11}));
    EXPECT_EQ(digits, 2);
    files({"7", "3", "x"});
    EXPECT_EQ(sequence("7", digits), (std::vector<int>{3, 7}));
    files({"q00000000000001", "q99999999999999", "q00000000000002"});
    EXPECT_EQ(sequence("q00000000000001", digits), (std::vector<int>{1, 2}));
    EXPECT_EQ(digits, 14);
    EXPECT_EQ(QvFile::numberedSequence(Any(5), nullptr).size(), 0);
}

TEST_F(Listing, ARelativeNameIsLookedForInTheCurrentFolder) {
    const fs::path before = fs::current_path();
    files({"r1.x", "r2.x"});
    fs::current_path(folder);
    int digits = 0;
    EXPECT_EQ(QvFile::numberedSequence("r1.x", &digits).size(), 2);
    fs::current_path(before);
}

TEST_F(Listing, RemovalTakesWhatIsListedAndReportsWhatIsLeft) {
    fs::create_directories(temp.file("tree/sub/deep"));
    files({"tree/a", "tree/sub/b", "tree/sub/deep/\xFF"});
    EXPECT_EQ(QvFile::rmdir(wide(temp.file("tree"))), 0);
    EXPECT_FALSE(fs::exists(temp.file("tree")));
    EXPECT_EQ(QvFile::rmdir(Any(temp.file("tree").c_str())), -1);

    fs::create_directories(temp.file("kept/sub"));
    files({"kept/.profile", "kept/sub/x"});
    EXPECT_EQ(QvFile::rmdir(Any(temp.file("kept").c_str())), -1);
    EXPECT_TRUE(fs::exists(temp.file("kept/.profile")));
    EXPECT_FALSE(fs::exists(temp.file("kept/sub")));
}

}  // namespace
