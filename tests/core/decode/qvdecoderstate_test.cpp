#include "core/decode/qvdecoderstate.h"

#include <chrono>
#include <set>

#include "core/engine/status.h"
#include "tests/support/checks.h"
#include "tests/support/wav_bytes.h"

namespace {

namespace fs = std::filesystem;

Any block(int bytes) {
    const std::string text = patternBytes(static_cast<std::size_t>(bytes));
    return Any(static_cast<const void*>(text.data()), bytes);
}

struct DecoderState : testing::Test {
    DecoderState()
        : file(folder.write("movie.mpg", "x").c_str()), manager("index", Any(folder.path().c_str())) {}

    // The one folder that the manager made for `file`.
    fs::path kept() const {
        for (const auto& entry : fs::directory_iterator(folder.path() / "index"))
            if (entry.is_directory()) return entry.path();
        return {};
    }
    void rewriteDocument(const std::string& from, const std::string& to) {
        const std::string name = (kept() / "state.xml").string();
        std::string text = TempFolder::read(name);
        const auto at = text.find(from);
        ASSERT_NE(at, std::string::npos) << from;
        std::ofstream(name, std::ios::binary) << text.replace(at, from.size(), to);
    }

    TempFolder folder;
    Any file;
    QvDecoderStateManager manager;
};

QvDecoderState sample() {
    return QvDecoderState(AnyDict("frames", 250, "length", 1LL << 40, "note", repeated("n", 500).c_str(),
                                  "small", block(128), "my_index", block(129), "rates",
                                  AnyVector(25.0, "x")));
}

TEST_F(DecoderState, EverythingComesBack) {
    const QvDecoderState state = sample();
    ASSERT_EQ(manager.storeState(file, state), 0);
    EXPECT_TRUE(fs::exists(kept() / "my_index.dat"));

    QvDecoderStateManager later("index", Any(folder.path().c_str()));
    QvDecoderState again;
    ASSERT_EQ(later.restoreState(file, again), 0);
    EXPECT_TRUE(static_cast<const AnyDict&>(again) == state);
    EXPECT_EQ(later.restoreState("/no/such/file", again), QvStatus::failed);
}

TEST_F(DecoderState, StoringAgainReplacesAndAChangedFileVoidsIt) {
    ASSERT_EQ(manager.storeState(file, sample()), 0);
    ASSERT_EQ(manager.storeState(file, QvDecoderState(AnyDict("only", 1))), 0);
    EXPECT_FALSE(fs::exists(kept() / "my_index.dat"));
    QvDecoderState again;
    ASSERT_EQ(manager.restoreState(file, again), 0);
    EXPECT_EQ(again.size(), 1);
    const fs::path path = file.asString();
    fs::last_write_time(path, fs::last_write_time(path) + std::chrono::seconds(10));
    EXPECT_FALSE(manager.stateStored(file));
    EXPECT_TRUE(kept().empty()) << "and removes it";
}

TEST_F(DecoderState, DamageCountsAsNotStored) {
    const struct {
        const char* what;
        std::function<void()> damage;
    } cases[] = {
        {"no document", [this] { fs::remove(kept() / "state.xml"); }},
        {"no XML", [this] { folder.write("index/" + kept().filename().string() + "/state.xml", "<"); }},
        {"no time", [this] { rewriteDocument("modified", "modifies"); }},
        {"a cut block", [this] { fs::resize_file(kept() / "my_index.dat", 30); }},
        {"a name that leads out to a good block",
         [this] {
             fs::copy_file(kept() / "my_index.dat", kept() / "../my_index.dat");
             rewriteDocument("BLOB_my_index", "BLOB_../my_index");
         }},
    };
    for (const auto& c : cases) {
        ASSERT_EQ(manager.storeState(file, sample()), 0) << c.what;
        c.damage();
        QvDecoderState state;
        EXPECT_EQ(manager.restoreState(file, state), QvStatus::failed) << c.what;
        EXPECT_TRUE(kept().empty()) << c.what;
    }
}

TEST_F(DecoderState, NamesOfKeysNeverBecomePaths) {
    QvDecoderState state;
    state.set("../../out", block(500));
    ASSERT_EQ(manager.storeState(file, state), 0);
    for (const auto& entry : fs::recursive_directory_iterator(folder.path()))
        EXPECT_NE(entry.path().filename(), "out.dat");
    QvDecoderState again;
    ASSERT_EQ(manager.restoreState(file, again), 0);
    EXPECT_TRUE(again["../../out"] == block(500)) << "stays in the document";
}

TEST_F(DecoderState, ClearingTakesOnlyWhatItMade) {
    ASSERT_EQ(manager.storeState(file, sample()), 0);
    const fs::path root = folder.path() / "index";
    for (const char* name : {"cache", "0123456789ABCDEF0123456789ABCDEF", "0123456789abcdef0123456789abcde"})
        fs::create_directory(root / name);
    fs::create_directory(root / "fedcba9876543210fedcba9876543210");
    folder.write("index/0123456789abcdef0123456789abcdef", "a file");
    manager.clearStates();
    std::set<std::string> left;
    for (const auto& entry : fs::directory_iterator(root)) left.insert(entry.path().filename().string());
    EXPECT_EQ(left,
              (std::set<std::string>{"0123456789ABCDEF0123456789ABCDEF", "0123456789abcdef0123456789abcde",
                                     "0123456789abcdef0123456789abcdef", "cache"}));
}

}  // namespace
