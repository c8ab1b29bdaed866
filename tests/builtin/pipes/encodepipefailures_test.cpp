// Each member of the pipe fails at each point, as a status and as a broken contract.
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <memory>

#include "core/encode/qvencodepipe.h"
#include "core/engine/qvexception.h"
#include "tests/support/failing_codecs.h"
#include "tests/support/log_capture.h"
#include "tests/support/pictures.h"
#include "tests/support/temp_folder.h"

namespace {

struct Point {
    const char* call;
    FailingOutputs::How how;
};

void PrintTo(const Point& point, std::ostream* out) {
    *out << point.call << (point.how == FailingOutputs::status ? " by status" : " by assertion");
}

std::vector<Point> points() {
    static std::vector<std::string> names;
    if (names.empty())
        for (const char* member : {"filesink", "rawmux", "rawvenc", "rawaenc"})
            for (const char* what : {"open", "close", "abort", "write"})
                if (std::string(what) != "write" || std::string(member).ends_with("enc"))
                    names.push_back(std::string(member) + "." + what);
    std::vector<Point> all;
    for (const auto& name : names)
        for (const auto how : {FailingOutputs::status, FailingOutputs::assertion})
            all.push_back({name.c_str(), how});
    return all;
}

class PipeFailure : public testing::TestWithParam<Point> {
  protected:
    PipeFailure() : pipe_(QvEncodePipe::create()), frame_(makePicture(QvFourcc::I420, 32, 32)) {
        fillSound(pcm_, 480, 2, 2, 48000);
        pipe_->setParam("video0",
                        AnyDict("type", static_cast<int>(QvFourcc::I420), "width", 32, "height", 32));
        pipe_->setParam("audio0", AnyDict("samplerate", 48000, "channels", 2, "bitsPerSample", 16));
        pipe_->setFilename(Any(folder_.file("out.x").c_str()));
    }

    // 0, the first status that is not, or failure for an assertion.
    int write() {
        try {
            const int result = pipe_->writeFrame(&frame_, 0);
            return result != 0 ? result : pipe_->writePcm(&pcm_, 0);
        } catch (const QvAssertFailure&) {
            return FailingOutputs::failure;
        }
    }
    int open() {
        try {
            return pipe_->open();
        } catch (const QvAssertFailure&) {
            return FailingOutputs::failure;
        }
    }
    int calls(const std::string& name) const {
        return static_cast<int>(std::count(outputs_.calls.begin(), outputs_.calls.end(), name));
    }
    void expectWorkingPipe() {
        outputs_.failAt.clear();
        ASSERT_EQ(pipe_->open(), 0);
        for (int i = 0; i < 3; ++i) ASSERT_EQ(write(), 0);
        ASSERT_EQ(pipe_->close(), 0) << pipe_->errorDesc();
        EXPECT_EQ(std::filesystem::file_size(folder_.file("out.raw")), 3u * 1536);
        EXPECT_EQ(std::filesystem::file_size(folder_.file("out.wav")), 80u + 3 * 480 * 4);
    }

    FailingOutputs outputs_;
    TempFolder folder_;
    std::unique_ptr<QvEncodePipe> pipe_;
    QvFrame frame_;
    QvPcm pcm_;
};

INSTANTIATE_TEST_SUITE_P(Points, PipeFailure, testing::ValuesIn(points()));

TEST_P(PipeFailure, IsToldAndLeavesThePipeUsable) {
    const std::string call = GetParam().call;
    const bool byStatus = GetParam().how == FailingOutputs::status;
    const bool atOpen = call.ends_with(".open");
    const bool atWrite = call.ends_with(".write");
    const bool aborting = call.ends_with(".abort");
    outputs_.failAt = call;
    outputs_.how = GetParam().how;

    const int opened = open();
    EXPECT_EQ(opened, atOpen ? FailingOutputs::failure : 0);
    if (atOpen) {
        EXPECT_EQ(pipe_->getState(), QvCodec::stateInitialised);
        if (byStatus) {
            EXPECT_EQ(pipe_->errorDesc(), call + " fails");
        }
    } else {
        const int written = write();
        EXPECT_EQ(written, atWrite ? FailingOutputs::failure : 0);
        if (atWrite && byStatus) {
            EXPECT_EQ(pipe_->errorDesc(), call + " fails");
        }
        outputs_.calls.clear();
        const int ended = aborting ? pipe_->abort() : pipe_->close();
        EXPECT_EQ(ended != 0, !atWrite) << ended;
        if (ended != 0) {
            EXPECT_STRNE(pipe_->errorDesc(), "");
        }
        for (const char* member : {"filesink", "rawmux", "rawvenc", "rawaenc"})
            EXPECT_EQ(calls(std::string(member) + (aborting ? ".abort" : ".close")), 1) << member;
        EXPECT_EQ(pipe_->getState(), QvCodec::stateInitialised);
    }
    expectWorkingPipe();
}

TEST_F(PipeFailure, TextsOfTheEnds) {
    struct Row {
        const char* call;
        bool abort;
        const char* text;
    };
    for (const auto& row : {Row{"rawmux.close", false, "Closing muxer 'rawmux' failed."},
                            Row{"filesink.close", false, "Closing sink failed."},
                            Row{"rawmux.abort", true, "Aborting muxer 'rawmux' failed."},
                            Row{"filesink.abort", true, "Aborting sink failed."}}) {
        outputs_.failAt = row.call;
        ASSERT_EQ(pipe_->open(), 0);
        LogCapture log;
        EXPECT_EQ(row.abort ? pipe_->abort() : pipe_->close(), FailingOutputs::failure);
        EXPECT_STREQ(pipe_->errorDesc(), row.text);
        EXPECT_EQ(pipe_->errorCode(), -1);
        EXPECT_TRUE(log.contains(row.text, QvLogMask::error));
    }
}

TEST_F(PipeFailure, SecondEncoderIsNamed) {
    outputs_.failAt = "rawaenc.open";
    LogCapture log;
    EXPECT_EQ(pipe_->open(), FailingOutputs::failure);
    EXPECT_TRUE(log.contains("EncodePipe.open: error (-77) at stream audio #1 (rawaenc)", QvLogMask::error));
    outputs_.failAt = "rawaenc.close";
    EXPECT_EQ(pipe_->open(), 0);
    EXPECT_EQ(pipe_->close(), FailingOutputs::failure);
    EXPECT_TRUE(log.contains("EncodePipe.close: error (-77) at stream audio #1 (rawaenc)", QvLogMask::error));
}

TEST_F(PipeFailure, OpensFromTheEndAndClosesFromTheStart) {
    outputs_.calls.clear();
    ASSERT_EQ(pipe_->open(), 0);
    EXPECT_EQ(outputs_.calls,
              (std::vector<std::string>{"filesink.open", "rawmux.open", "rawvenc.open", "rawaenc.open"}));
    outputs_.calls.clear();
    ASSERT_EQ(pipe_->close(), 0);
    EXPECT_EQ(outputs_.calls,
              (std::vector<std::string>{"rawvenc.close", "rawaenc.close", "rawmux.close", "filesink.close"}));
}

TEST_F(PipeFailure, FullDiskIsToldAtWritingOrAtTheLatestAtClosing) {
    for (const char* name : {"out.raw", "out.wav"}) {
        SCOPED_TRACE(name);
        std::filesystem::remove(folder_.file(name));
        std::filesystem::create_symlink("/dev/full", folder_.file(name));
        int result = pipe_->open();
        for (int i = 0; i < 3 && result == 0; ++i) result = write();
        const std::string text = pipe_->errorDesc();
        const int closed = pipe_->close();
        EXPECT_TRUE(result != 0 || closed != 0);
        if (result != 0) {
            EXPECT_NE(text, "");
        }
        std::filesystem::remove(folder_.file(name));
        expectWorkingPipe();
    }
}

TEST_F(PipeFailure, AvchdBitrateIsKeptWithinItsLimit) {
    struct Row {
        double maximum, average;
        int audioKilobits;
        bool adjusted;
    };
    for (const auto& row : {Row{22000000, 21000000, 536, false}, Row{22000001, 21000000, 536, true}}) {
        outputs_.params = AnyDict("rawvenc._isAVCHD", 1, "rawvenc.maxVBitrate", row.maximum,
                                  "rawvenc.vBitrate", row.average, "rawaenc.aBitrate", row.audioKilobits);
        LogCapture log;
        ASSERT_EQ(pipe_->open(), 0);
        pipe_->close();
        EXPECT_EQ(log.contains("larger than maximal allowed for AVCHD", QvLogMask::warning), row.adjusted);
    }
}

}  // namespace
