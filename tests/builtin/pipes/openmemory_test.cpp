// Each allocation of an output's opening fails in turn, alone or with all later ones: the output then is as
// it was, and opens when there is memory.
#include <functional>

#include "core/arch/qvexception.h"
#include "core/preset/qvprofile.h"
#include "core/stream/qvbufstrm.h"
#include "tests/support/failing_memory.h"
#include "tests/support/output_pipe.h"
#include "tests/support/platform_scope.h"

namespace {

struct OpenWithoutMemory : OutputPipe {
    // What a failed opening leaves in a stream: a listener whose owner goes is a stray access later.
    void expectNothingLeft() {
        ASSERT_EQ(pipe_->getState(), QvCodec::stateInitialised);
        for (int i = 0; i < pipe_->nrStreams(); ++i) {
            QvBufStream* stream = pipe_->streamAt(i)->bitstream;
            EXPECT_TRUE(!stream->observers() || stream->observers()->empty());
        }
        EXPECT_EQ(openFiles(), filesBefore_);
    }
    static long openFiles() {
        const std::filesystem::directory_iterator all("/proc/self/fd");
        return std::distance(begin(all), end(all));
    }
    // Opens with `refuse` in force until that goes well.
    template <class Refuse>
    void openUntilItWorks(Refuse refuse) {
        filesBefore_ = openFiles();
        for (int nth = 1; nth < 10000; ++nth) {
            bool opened = false;
            const bool refused = refuse(nth, opened);
            if (!refused) {
                EXPECT_TRUE(opened) << pipe_->errorDesc();
                ASSERT_EQ(pipe_->abort(), 0);
                EXPECT_GT(nth, 1) << "nothing was refused";
                return;
            }
            SCOPED_TRACE(nth);
            if (opened) {  // it got by without
                ASSERT_EQ(pipe_->abort(), 0);
            }
            expectNothingLeft();
        }
        FAIL() << "it never opened";
    }
    bool open() {
        try {
            return pipe_->open() == 0;
        } catch (const QvMemoryFailure&) {
        } catch (const std::bad_alloc&) {
        }
        return false;
    }

    long filesBefore_ = 0;
};

TEST_F(OpenWithoutMemory, IsUndoneWhateverTheForm) {
    const struct {
        const char* name;
        bool avi;
        bool video, audio;
        int split, png;
    } forms[] = {{"raw", false, true, true, 0, 0},
                 {"pictures", false, true, false, 1, 0},
                 {"PNG pictures", false, true, false, 1, 1},
                 {"channels", false, false, true, 1, 0},
                 {"AVI", true, true, true, 0, 0}};
    for (const auto& form : forms) {
        SCOPED_TRACE(form.name);
        if (form.avi) {
            ASSERT_EQ(pipe_->applyPreset(QvProfile::aviRaw, 0), 0);
        }
        pipe_->clearStreams();
        pipe_->setFilename(Any(folder_.file("out.x").c_str()));
        if (form.video) addVideo(QvFourcc::I420, 32, 32);
        if (form.audio) addAudio(2, 16, 48000);
        if (form.split) {
            for (const char* name : {"muxer/splitVideo", "muxer/splitAudio"}) pipe_->setParam(name, 1);
            pipe_->setParam("muxer/rawAsPng", form.png);
        }
        for (const auto extent : {FailingMemory::once, FailingMemory::andAllLater})
            openUntilItWorks([&](int nth, bool& opened) {
                const FailingMemory memory(nth, extent);
                opened = open();
                return FailingMemory::failed();
            });
        openUntilItWorks([&](int nth, bool& opened) {
            NoMemory blocks(nth - 1);
            const PlatformScope scope(blocks);
            opened = open();
            return !opened;
        });
    }
}

}  // namespace
