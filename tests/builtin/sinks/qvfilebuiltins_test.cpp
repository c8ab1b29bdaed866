#include "builtin/sinks/qvfilebuiltins.h"

#include "tests/core/stream/streamtools.h"

namespace {

struct FileOutput : testing::Test {
    FileOutput() {
        sink_.init();
        sink_.setParam("filename", Any(name_.c_str()));
        sink_.setParam("bufsize", 1000);
    }
    bool put(const char* text) { return ::put(sink_.stream()->input(), text); }

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
