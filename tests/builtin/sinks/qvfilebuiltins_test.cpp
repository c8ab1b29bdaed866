#include "builtin/sinks/qvfilebuiltins.h"

#include "tests/support/checks.h"

namespace {

struct FileOutput : testing::Test {
    FileOutput() {
        sink_.init();
        sink_.setParam("filename", Any(name_.c_str()));
        sink_.setParam("bufsize", 1000);
    }
    // As a multiplexer does: room first, then the bytes.
    bool put(const std::string& text) {
        auto* out = sink_.stream()->input();
        auto* block = out->request(out, static_cast<unsigned>(text.size()));
        if (!block) return false;
        text.copy(reinterpret_cast<char*>(block), text.size());
        return out->confirm(out, static_cast<unsigned>(text.size())) == text.size();
    }

    TempFolder folder_;
    std::string name_ = folder_.file("out.bin");
    FileSink sink_;
};

TEST_F(FileOutput, FlushWritesCloseCompletesAndOpeningAgainClosesFirst) {
    ASSERT_EQ(sink_.open(), 0);
    ASSERT_TRUE(put("hello "));
    EXPECT_EQ(TempFolder::read(name_), "");
    EXPECT_EQ(sink_.flush(), 0);
    EXPECT_EQ(TempFolder::read(name_), "hello ");
    ASSERT_TRUE(put("world"));
    sink_.setParam("filename", Any(folder_.file("second").c_str()));
    ASSERT_EQ(sink_.open(), 0);
    EXPECT_EQ(TempFolder::read(name_), "hello world");
    EXPECT_EQ(sink_.abort(), 0);
}

}  // namespace
