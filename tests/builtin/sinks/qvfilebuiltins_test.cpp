#include "builtin/sinks/qvfilebuiltins.h"

#include <filesystem>

#include "tests/support/checks.h"
#include "tests/support/log_capture.h"
#include "tests/support/temp_folder.h"

namespace {

class FileOutput : public testing::Test {
  protected:
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
    EXPECT_TRUE(std::filesystem::exists(folder_.file("second")));
    EXPECT_EQ(sink_.close(), 0);
    EXPECT_EQ(static_cast<QvCodec&>(sink_).getParam("filesWritten").size(), 1);
}

TEST_F(FileOutput, FullDisk) {
    sink_.setParam("filename", "/dev/full");
    for (const bool byFlush : {true, false}) {
        ASSERT_EQ(sink_.open(), 0);
        ASSERT_TRUE(put("does not fit"));
        LogCapture log;
        if (byFlush) {
            EXPECT_EQ(sink_.flush(), -1);
        }
        EXPECT_EQ(sink_.close(), -1);
        EXPECT_NE(std::string(sink_.errorDesc()).find("No space left"), std::string::npos)
            << sink_.errorDesc();
        EXPECT_TRUE(log.contains("FileSink, Error, can not flush /dev/full", QvLogMask::error));
        EXPECT_EQ(sink_.getState(), QvCodec::stateInitialised);
    }
    sink_.setParam("filename", Any(name_.c_str()));
    EXPECT_EQ(sink_.open(), 0);
    EXPECT_EQ(sink_.close(), 0);
}

TEST_F(FileOutput, BadNamesAndNone) {
    for (const Any& name :
         {Any(folder_.file("no/such/folder").c_str()), Any(folder_.path().c_str()), Any(""), Any(3)}) {
        sink_.setParam("filename", name);
        EXPECT_EQ(sink_.open(), -1);
        EXPECT_EQ(std::string(sink_.errorDesc()).rfind("Failed to open output file", 0), 0u);
        EXPECT_EQ(sink_.getState(), QvCodec::stateInitialised);
    }
    EXPECT_EQ(sink_.setParam("bufsize", 0), QvStatus::invalidParam);
    sink_.setParam("filename", Any(name_.c_str()));
    sink_.stream()->setParam(qvSinkDoNothing, 1);
    ASSERT_EQ(sink_.open(), 0);
    EXPECT_EQ(sink_.flush(), 0);
    EXPECT_EQ(sink_.close(), 0);
    EXPECT_FALSE(std::filesystem::exists(name_)) << "nothing is made where nothing is written";
}

TEST(FileSink, NeedsInit) {
    FileSink sink;
    EXPECT_EQ(sink.stream(), nullptr);
    EXPECT_EQ(sink.setParam("filename", "x"), -1);
    EXPECT_THROW(sink.open(), QvAssertFailure);
    EXPECT_THROW(sink.close(), QvAssertFailure);
    EXPECT_THROW(sink.abort(), QvAssertFailure);
}

TEST(NullSink, Swallows) {
    NullSink sink;
    sink.init();
    ASSERT_EQ(sink.open(), 0);
    auto* out = sink.stream()->input();
    unsigned char byte = 0;
    for (int i = 0; i < 100; ++i) EXPECT_EQ(out->copybytes(out, &byte, 1), 1u);
    EXPECT_EQ(sink.flush() + sink.close() + sink.open() + sink.abort(), 0);
}

}  // namespace
