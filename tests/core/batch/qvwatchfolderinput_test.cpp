#include "core/batch/qvwatchfolderinput.h"

#include <sys/stat.h>

#include "tests/support/checks.h"

namespace {

namespace fs = std::filesystem;

// An input whose wait is a function of the test.
class WatchInput : public QvWatchFolderInput {
  public:
    std::function<void()> during;  // while the writers are waited for
    int waits = 0, waited = 0;     // milliseconds of the last wait
    bool goesOn = true;

  protected:
    bool waitForWriters(int milliseconds) override {
        ++waits;
        waited = milliseconds;
        if (during) std::exchange(during, nullptr)();
        return goesOn;
    }
};

class QvWatchFolderInputTest : public testing::Test {
  protected:
    int open(int mode) {
        const Any moveTo = narrow(folder_.file("done"));
        return input_.open(narrow(in()), mode, &moveTo);
    }
    std::string in() const { return folder_.file("in"); }
    std::string inside(const std::string& name) const { return folder_.file("in/" + name); }
    void write(const std::string& name, const std::string& text = "x") { folder_.write("in/" + name, text); }
    // The names in the queue, taken off it.
    Texts drain() {
        Texts names;
        while (input_.nrFiles() > 0) {
            names.push_back(fs::path(input_.nextFile().toString().asString()).filename().string());
            results_.push_back(input_.fileProcessed());
        }
        return names;
    }

    TempFolder folder_;
    WatchInput input_;
    std::vector<int> results_;
    const bool made_ = fs::create_directory(folder_.file("in"));
};

}  // namespace

TEST_F(QvWatchFolderInputTest, TakesFilesInTheOrderOfDiscovery) {
    write("b");
    write("a");
    ASSERT_EQ(open(QvWatchFolderInput::keep), 0);
    EXPECT_EQ(input_.waits, 1);
    EXPECT_EQ(input_.waited, 2000);
    EXPECT_EQ(input_.nrFiles(), 2);
    EXPECT_EQ(input_.nextFile(), narrow(inside("a")));
    EXPECT_EQ(input_.nextFile(), narrow(inside("a"))) << "it stays in the queue";
    write("0");
    EXPECT_EQ(drain(), (Texts{"a", "b", "0"}));
    EXPECT_EQ(input_.waits, 2) << "without new files nothing waits";
    EXPECT_EQ(results_, (std::vector<int>{0, 0, 0}));
    LogCapture log;
    input_.debugDump();
    EXPECT_EQ(
        log.texts(),
        (Texts{"Watch folder input, dump, 0 files in que, 3 files processed",
               "Files in que:", "Processed files:", "  0, md5=8420cdcfef65d595f9dfe766da6487f9",
               "  a, md5=b975c10ca8b6f1c0e299c33161267769", "  b, md5=fe5feb92ec2faee6771cd73a8f573175"}));
}

TEST_F(QvWatchFolderInputTest, WaitsForFilesToBeComplete) {
    write("grows");
    write("empty", "");
    write("goes");
    write("same");
    write("shrinks", "12345");
    write("is replaced by a pipe");
    input_.during = [this] {
        write("grows", "xy");
        write("shrinks", "1");
        fs::remove(inside("goes"));
        fs::remove(inside("is replaced by a pipe"));
        mkfifo(inside("is replaced by a pipe").c_str(), 0600);
        write("later");
    };
    LogCapture log;
    ASSERT_EQ(open(QvWatchFolderInput::keep), 0);
    EXPECT_EQ(input_.nrFiles(), 1);
    EXPECT_TRUE(log.contains(" QvWatchFolderInput::_scan Found new file to process grows.", QvLogMask::info));
    EXPECT_TRUE(log.contains("Wont add grows yet old l=1, newl=2", QvLogMask::info));
    EXPECT_TRUE(log.contains("Wont add goes yet old l=1, newl=-1"));
    EXPECT_TRUE(log.contains("Wont add empty yet old l=0, newl=0"));
    EXPECT_TRUE(log.contains("Adding same, l=1", QvLogMask::info));
    EXPECT_EQ(drain(), (Texts{"same", "grows", "later", "shrinks"}));
    write("empty", "x");
    EXPECT_EQ(input_.scan(), 0);
    EXPECT_EQ(drain(), Texts{"empty"});
}

TEST_F(QvWatchFolderInputTest, GivesAScanUp) {
    write("a");
    input_.goesOn = false;
    ASSERT_EQ(open(QvWatchFolderInput::keep), 0);
    EXPECT_EQ(input_.nrFiles(), 0);
    input_.goesOn = true;
    EXPECT_EQ(input_.scan(), 0);
    EXPECT_EQ(drain(), Texts{"a"});
}

TEST_F(QvWatchFolderInputTest, DoesWithAFileWhatTheModeSays) {
    const struct {
        int mode;
        bool stays, moved;
    } modes[] = {{QvWatchFolderInput::QV_WFINPUT_KEEP, true, false},
                 {QvWatchFolderInput::QV_WFINPUT_MOVE, false, true},
                 {QvWatchFolderInput::QV_WFINPUT_DELETE, false, false}};
    for (const auto& row : modes) {
        write("a", "first");
        ASSERT_EQ(open(row.mode), 0);
        EXPECT_EQ(drain(), Texts{"a"}) << row.mode;
        EXPECT_EQ(fs::exists(inside("a")), row.stays) << row.mode;
        EXPECT_EQ(fs::exists(folder_.file("done/a")), row.moved) << row.mode;

        write("a", "again");
        EXPECT_EQ(input_.scan(), 0);
        EXPECT_EQ(input_.nrFiles(), 0) << "a name is taken once";
        ASSERT_EQ(open(row.mode), 0);
        EXPECT_EQ(drain(), Texts{"a"}) << "and again after the next open";
        EXPECT_EQ(TempFolder::read(folder_.file("done/a")), row.moved ? "again" : "");
        fs::remove_all(folder_.file("done"));
    }
}

TEST_F(QvWatchFolderInputTest, ReportsFilesThatItCanNotPutAway) {
    write("a");
    write("b");
    ASSERT_EQ(open(QvWatchFolderInput::move), 0);
    fs::create_directories(folder_.file("done/a"));  // a folder never gives way
    write("late");
    LogCapture log;
    EXPECT_EQ(input_.fileProcessed(), -8);
    EXPECT_TRUE(log.contains(
        "QvWatchFolderInput::_postprocess, can not move " + inside("a") + " to " + folder_.file("done") + ".",
        QvLogMask::error));
    EXPECT_EQ(input_.nrFiles(), 1) << "nothing was looked for after a failure";
    EXPECT_TRUE(fs::exists(inside("a")));
    EXPECT_EQ(drain(), (Texts{"b", "late"}));

    write("c");
    ASSERT_EQ(open(QvWatchFolderInput::deleteFiles), 0);
    EXPECT_EQ(input_.nextFile(), narrow(inside("a")));
    fs::remove(inside("a"));
    EXPECT_EQ(input_.fileProcessed(), -8);
    EXPECT_TRUE(log.contains("QvWatchFolderInput::_postprocess, can not delete " + inside("a") + ".",
                             QvLogMask::error));
}

TEST_F(QvWatchFolderInputTest, AssertsAnUnknownModeAndLeavesTheFile) {
    write("a");
    for (const int mode : {0, 4, -1}) {
        ASSERT_EQ(open(mode), 0) << mode;
        EXPECT_EQ(input_.nrFiles(), 1);
        EXPECT_THROW(input_.fileProcessed(), QvAssertFailure) << mode;
        EXPECT_EQ(input_.nrFiles(), 0) << "it is not tried again";
        EXPECT_EQ(input_.scan(), 0);
        EXPECT_EQ(input_.nrFiles(), 0);
        EXPECT_EQ(TempFolder::read(inside("a")), "x");
    }
}

TEST_F(QvWatchFolderInputTest, PassesOverWhatIsNoFile) {
    const std::string bytes = "\xFF\xFE name", quoted = "a \"b\" %s\n<c>",
                      digest = "b975c10ca8b6f1c0e299c33161267769";
    fs::create_directory(inside("folder"));
    fs::create_directory_symlink(folder_.path(), inside("link to a folder"));
    fs::create_symlink(folder_.file("nothing"), inside("link to nothing"));
    fs::create_symlink("loop", inside("loop"));
    mkfifo(inside("pipe").c_str(), 0600);
    folder_.write("elsewhere", "x");
    fs::create_symlink(folder_.file("elsewhere"), inside("link to a file"));
    for (const std::string& name : {bytes, quoted, digest, std::string(255, 'n'), std::string("a")})
        write(name);
    ASSERT_EQ(open(QvWatchFolderInput::deleteFiles), 0);
    Texts found = drain(), expected{bytes, quoted, digest, std::string(255, 'n'), "a", "link to a file"};
    std::sort(found.begin(), found.end());
    std::sort(expected.begin(), expected.end());
    EXPECT_EQ(found, expected);
    EXPECT_TRUE(fs::exists(folder_.file("elsewhere"))) << "a link goes, not what it leads to";
    for (const std::string& name : expected)
        EXPECT_FALSE(fs::exists(fs::symlink_status(inside(name)))) << name;

    write("\xC3\xA4");
    write(bytes);
    ASSERT_EQ(input_.open(wide(in()), QvWatchFolderInput::deleteFiles), 0);
    EXPECT_EQ(input_.nrFiles(), 2);
    EXPECT_TRUE(input_.nextFile().isWString());
    while (input_.nrFiles() > 0) EXPECT_EQ(input_.fileProcessed(), 0);
    EXPECT_FALSE(fs::exists(inside(bytes)));
}

// Other systems' separators are letters here.
TEST_F(QvWatchFolderInputTest, TakesNamesWithBackslashesAsTheyAre) {
    const Texts names{"a\\b", "b", "c\\", "d:\\..\\b", "\\\\host\\b"};
    for (const int mode :
         {QvWatchFolderInput::keep, QvWatchFolderInput::move, QvWatchFolderInput::deleteFiles}) {
        for (const std::string& name : names) write(name, name);
        ASSERT_EQ(open(mode), 0);
        Texts found = drain(), expected = names;
        std::sort(found.begin(), found.end());
        std::sort(expected.begin(), expected.end());
        EXPECT_EQ(found, expected) << mode;
        for (const std::string& name : names) {
            EXPECT_EQ(fs::exists(inside(name)), mode == QvWatchFolderInput::keep) << name;
            if (mode == QvWatchFolderInput::move) {
                EXPECT_EQ(TempFolder::read(folder_.file("done/" + name)), name);
            }
        }
    }
}

TEST_F(QvWatchFolderInputTest, LeavesFilesThatItMayNotRead) {
    struct NoAccess : QvPlatform {
        std::FILE* openFile(const char* name, const char* mode) override {
            return std::strstr(name, "secret") ? nullptr : QvPlatform::openFile(name, mode);
        }
    } platform;
    write("secret");
    write("plain");
    {
        const PlatformScope scope(platform);
        ASSERT_EQ(open(QvWatchFolderInput::deleteFiles), 0);
        EXPECT_EQ(drain(), Texts{"plain"});
    }
    EXPECT_TRUE(fs::exists(inside("secret")));
    EXPECT_EQ(input_.scan(), 0);
    EXPECT_EQ(drain(), Texts{"secret"});
}

TEST_F(QvWatchFolderInputTest, RefusesWhatItCanNotWatch) {
    const Any folder = narrow(in()), none = narrow(folder_.file("none")), number(5);
    folder_.write("file", "x");
    const Any file = narrow(folder_.file("file")), below = narrow(folder_.file("file/below"));
    const std::string move =
        "QvWatchFolderInput::open, 'move to' folder not set, required for QV_WFINPUT_MOVE mode.";
    const struct {
        const Any* folder;
        int mode;
        const Any* moveTo;
        int result;
        std::string line;
    } rows[] = {
        {&none, 1, nullptr, -9, "QvWatchFolderInput::open, " + folder_.file("none") + " is not folder."},
        {&file, 1, nullptr, -9, "QvWatchFolderInput::open, " + folder_.file("file") + " is not folder."},
        {&number, 1, nullptr, -9, "QvWatchFolderInput::open,  is not folder."},
        {&folder, 2, nullptr, -13, move},
        {&folder, 2, &number, -13, move},
        {&folder, 2, &below, 0,
         "QvWatchFolderInput::open, can not create 'move to' folder " + folder_.file("file/below") + "."},
    };
    for (const auto& row : rows) {
        LogCapture log;
        EXPECT_EQ(input_.open(*row.folder, row.mode, row.moveTo), row.result) << row.line;
        EXPECT_TRUE(log.contains(row.line, QvLogMask::error)) << row.line;
        EXPECT_EQ(input_.isOpen(), row.result == 0);
    }
    LogCapture log;
    const Any made = narrow(folder_.file("one/two"));
    EXPECT_EQ(input_.open(folder, QvWatchFolderInput::move, &made), 0);
    EXPECT_TRUE(fs::is_directory(folder_.file("one/two")));
    EXPECT_TRUE(
        log.contains("QvWatchFolderInput::open, created 'move to' folder " + folder_.file("one/two") + ".",
                     QvLogMask::info));
    EXPECT_FALSE(input_.nextFile().isValid());
    EXPECT_EQ(input_.fileProcessed(), -18);
    input_.close();
    EXPECT_FALSE(input_.nextFile().isValid());
    EXPECT_EQ(input_.fileProcessed(), -18);
    EXPECT_EQ(input_.scan(), -18);
    for (const char* line :
         {"nextFile, no files in que", "fileProcessed, job que empty and fileProcessed() called.",
          "nextFile, not opened", "fileProcessed, not opened", "scan, not opened"})
        EXPECT_TRUE(log.contains(std::string("QvWatchFolderInput::") + line, QvLogMask::error)) << line;
}
