#include "core/engine/files/qvfileutil.h"
#include "tests/support/checks.h"

namespace {

namespace fs = std::filesystem;
using Numbers = std::vector<int>;

class Listing : public testing::Test {
  protected:
    TempFolder temp;
    std::string folder = temp.path().string();

    void files(const Texts& names) {
        for (const std::string& name : names) temp.write(name, "");
    }
    // Texts without the folder, which must be in front of each.
    Texts names(const AnyVector& list) {
        Texts out;
        for (const Any& entry : list) {
            const std::string name = qv_os_name(entry);
            EXPECT_EQ(name.substr(0, folder.size() + 1), folder + "/");
            out.push_back(name.substr(folder.size() + 1));
        }
        return out;
    }
    Texts matching(const char* ext) {
        AnyVector list("left over", "from before");
        get_folder_files_by_ext(narrow(folder), ext, &list);
        return names(list);
    }
    // The numbers found for either width, with their digits in front.
    Numbers sequence(const std::string& name) {
        int digits = -1, wideDigits = -2;
        const AnyVector found = QvFile::numberedSequence(narrow(temp.file(name)), &digits);
        EXPECT_EQ(QvFile::numberedSequence(wide(temp.file(name)), &wideDigits), found);
        EXPECT_EQ(digits, wideDigits);
        Numbers numbers{digits};
        for (const Any& number : found) numbers.push_back(number.asInt32(-1));
        return numbers;
    }
};

TEST_F(Listing, ExtensionsAreTheEndsOfNames) {
    files({"a.png", "b.PNG", "c.png", "png", "x.jpg", "aa.png.bak"});
    fs::create_directory(temp.file("dir.png"));
    EXPECT_EQ(matching(".png"), (Texts{"a.png", "c.png", "dir.png"}));
    EXPECT_EQ(matching(".jp?"), (Texts{"x.jpg"}));
    EXPECT_EQ(matching(".p*"), (Texts{"a.png", "aa.png.bak", "c.png", "dir.png"}));
    EXPECT_EQ(matching("[ab].png"), Texts{});
    EXPECT_EQ(matching("").size(), 9u);
    EXPECT_EQ(matching(nullptr), matching(""));
}

TEST_F(Listing, ManyStarsDoNotTakeForEver) {
    files({std::string(200, 'a')});
    std::string pattern;
    for (int i = 0; i < 100; ++i) pattern += "a*";
    EXPECT_EQ(matching((pattern + "b").c_str()), Texts{});
    EXPECT_EQ(matching(pattern.c_str()).size(), 1u);
}

TEST_F(Listing, LeavesOutDotsAndOnWishFolders) {
    files({"b", "a.x", ".hidden", ".h.x", "..x"});
    fs::create_directory(temp.file("sub"));
    EXPECT_EQ(names(QvFile::ls(narrow(folder), 0)), (Texts{"..x", ".h.x", "a.x", "b", "sub"}));
    EXPECT_EQ(names(QvFile::ls(narrow(folder), 1)), (Texts{"..x", ".h.x", "a.x", "b"}));
}

TEST_F(Listing, WideListingsLoseNoFile) {
    files({"\xC3\xA9", "\xFF\xFE", "ok"});
    const AnyVector list = QvFile::ls(wide(folder), 1);
    ASSERT_EQ(list.size(), 3);
    for (const Any& name : list) {
        EXPECT_TRUE(name.isWString() && QvFile::isFile(name));
        EXPECT_EQ(QvFile::rm(name), 0);
    }
    EXPECT_TRUE(fs::is_empty(folder));
}

TEST_F(Listing, SequencesHaveOneLengthPrefixAndExtension) {
    files({"a001.png", "a002.png", "a10.png", "a003.PNG", "b004.png", "a005.jpg", "a0010.png", "p10", "p00",
           "p09", "p11", "7", "3", "x", "q00000000000001", "q99999999999999", "q00000000000002"});
    fs::create_directory(temp.file("a006.png"));
    EXPECT_EQ(sequence("a001.png"), (Numbers{3, 1, 2}));
    EXPECT_EQ(sequence("a777.png"), (Numbers{3, 1, 2}));  // need not be there itself
    EXPECT_EQ(sequence("b004.png"), Numbers{0});
    EXPECT_EQ(sequence("none.png"), Numbers{0});
    EXPECT_EQ(sequence("p10"), (Numbers{2, 0, 9, 10, 11}));
    EXPECT_EQ(sequence("7"), (Numbers{1, 3, 7}));
    EXPECT_EQ(sequence("q00000000000001"), (Numbers{14, 1, 2}));
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
