// Each member of the pipe fails at each point, as a status, as a broken contract and for want of memory.

#include "core/encode/qvencodepipe.h"
#include "tests/support/checks.h"
#include "tests/support/failing_codecs.h"
#include "tests/support/pictures.h"

namespace {

struct PipeFailure : testing::Test {
    PipeFailure() : pipe_(QvEncodePipe::create()), frame_(makePicture(QvFourcc::I420, 32, 32)) {
        fillSound(pcm_, 480, 2, 2, 48000);
        pipe_->setParam("video0",
                        AnyDict("type", static_cast<int>(QvFourcc::I420), "width", 32, "height", 32));
        pipe_->setParam("audio0", AnyDict("samplerate", 48000, "channels", 2, "bitsPerSample", 16));
        pipe_->setFilename(Any(folder_.file("out.x").c_str()));
    }

    // A status, or `failure` for an assertion.
    template <class Action>
    static int result(Action action) {
        try {
            return action();
        } catch (const QvAssertFailure&) {
            return FailingOutputs::failure;
        } catch (const std::bad_alloc&) {
            return FailingOutputs::failure;
        }
    }
    int write() {
        return result([&] {
            const int written = pipe_->writeFrame(&frame_, 0);
            return written != 0 ? written : pipe_->writePcm(&pcm_, 0);
        });
    }
    void expectWorkingPipe() {
        outputs_.failAt.clear();
        ASSERT_EQ(pipe_->open(), 0);
        for (int i = 0; i < 3; ++i) ASSERT_EQ(write(), 0);
        ASSERT_EQ(pipe_->close(), 0) << pipe_->errorDesc();
        EXPECT_EQ(std::filesystem::file_size(folder_.file("out.raw")), 3u * 1536);
        EXPECT_EQ(std::filesystem::file_size(folder_.file("out.wav")), 80u + 3 * 480 * 4);
    }
    // Opens, writes and ends with `call` failing, and looks at what is reported and whether all members end.
    void run(const std::string& call) {
        const bool byStatus = outputs_.how == FailingOutputs::status;
        const bool atOpen = call.ends_with(".open"), atWrite = call.ends_with(".write");
        outputs_.failAt = call;
        const int opened = result([&] { return pipe_->open(); });
        EXPECT_EQ(atOpen || atWrite ? FailingOutputs::failure : 0, atOpen ? opened : opened + write());
        EXPECT_TRUE(!(atOpen || atWrite) || !byStatus || pipe_->errorDesc() == call + " fails");
        if (!atOpen) {
            const bool aborting = call.ends_with(".abort");
            outputs_.calls.clear();
            EXPECT_EQ((aborting ? pipe_->abort() : pipe_->close()) != 0, !atWrite);
            if (call.starts_with("rawmux.") && byStatus) {
                EXPECT_EQ(std::string(pipe_->errorDesc()).find(aborting ? "Aborting muxer" : "Closing muxer"),
                          0u)
                    << pipe_->errorDesc();
            }
            EXPECT_TRUE(atWrite || outputs_.how == FailingOutputs::noMemory || *pipe_->errorDesc());
            for (const std::string member : {"filesink", "rawmux", "rawvenc", "rawaenc"})
                EXPECT_EQ(std::count(outputs_.calls.begin(), outputs_.calls.end(),
                                     member + (aborting ? ".abort" : ".close")),
                          1);
        }
        EXPECT_EQ(pipe_->getState(), QvCodec::stateInitialised);
    }

    FailingOutputs outputs_;
    TempFolder folder_;
    std::unique_ptr<QvEncodePipe> pipe_;
    QvFrame frame_;
    QvPcm pcm_;
};

TEST_F(PipeFailure, IsToldAndLeavesThePipeUsable) {
    for (const std::string member : {"filesink", "rawmux", "rawvenc", "rawaenc"})
        for (const std::string what : {".open", ".close", ".abort", ".write"})
            for (const auto how :
                 {FailingOutputs::status, FailingOutputs::assertion, FailingOutputs::noMemory}) {
                if (what == ".write" && !member.ends_with("enc")) continue;
                SCOPED_TRACE(testing::Message() << member << what << ", way " << how);
                outputs_.how = how;
                run(member + what);
                expectWorkingPipe();
            }
}

TEST_F(PipeFailure, OpensFromTheEndAndClosesFromTheStart) {
    outputs_.calls.clear();
    ASSERT_EQ(pipe_->open(), 0);
    ASSERT_EQ(pipe_->close(), 0);
    EXPECT_EQ(outputs_.calls, (Texts{"filesink.open", "rawmux.open", "rawvenc.open", "rawaenc.open",
                                     "rawvenc.close", "rawaenc.close", "rawmux.close", "filesink.close"}));
}

TEST_F(PipeFailure, FullDiskIsToldAtWritingOrAtTheLatestAtClosing) {
    for (const char* name : {"out.raw", "out.wav"}) {
        SCOPED_TRACE(name);
        std::filesystem::remove(folder_.file(name));
        std::filesystem::create_symlink("/dev/full", folder_.file(name));
        int result = pipe_->open();
        for (int i = 0; i < 3 && result == 0; ++i) result = write();
        EXPECT_TRUE(result == 0 || *pipe_->errorDesc());
        const int closed = pipe_->close();
        EXPECT_TRUE(result != 0 || closed != 0);
        std::filesystem::remove(folder_.file(name));
        expectWorkingPipe();
    }
}

}  // namespace
