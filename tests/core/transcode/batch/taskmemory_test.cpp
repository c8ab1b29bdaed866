// Each allocation that a task file's check or opening takes fails in turn, alone or with all later ones:
// there is a fault, no exception, and nothing that was made.
#include "core/arch/qvexception.h"
#include "core/decode/qvdecoder.h"
#include "core/document/xmldom.h"
#include "core/engine/status.h"
#include "core/media/qvuserdata.h"
#include "core/transcode/batch/qvbatchdecoder.h"
#include "core/transcode/batch/qvbatchtask.h"
#include "core/transcode/batch/qvtaskfile.h"
#include "core/transcode/task/qvtaskstate.h"
#include "core/transcode/task/qvtranscodetask.h"
#include "tests/core/transcode/batch/soundtask.h"
#include "tests/support/engine.h"
#include "tests/support/failing_memory.h"
#include "tests/support/fake_streams.h"

namespace {

TEST(QvTaskFileWithoutMemory, GivesAFaultAndLeavesNothing) {
    const TaskFile file;
    const Any name = file.name.c_str();
    QvDPipeList decoders;
    for (const auto extent : {FailingMemory::once, FailingMemory::andAllLater}) {
        int nth = 0;
        for (bool done = false; !done; nth += 1 + nth / 64) {  // the first ones all, then fewer
            ASSERT_LT(nth, 100000);
            QvEncodePipe* pipe = nullptr;
            QvTaskFault fault;
            std::unique_ptr<QvTask> task;
            {
                const FailingMemory memory(nth + 1, extent);
                task.reset(QvTaskFile::open(name, decoders, &pipe, nullptr, &fault));
                done = !FailingMemory::failed();
            }
            const std::unique_ptr<QvEncodePipe> owned(pipe);
            SCOPED_TRACE(nth);
            ASSERT_EQ(fault.status == QvStatus::ok, task != nullptr) << fault.reason;
            ASSERT_EQ(task != nullptr, pipe != nullptr);
            ASSERT_EQ(decoders.size(), task ? 2 : 0);
            ASSERT_TRUE(task || !fault.reason.empty());
            if (extent == FailingMemory::andAllLater && !done) {
                ASSERT_EQ(fault.status, QvStatus::outOfMemory) << fault.reason;
            }
            if (done) {
                ASSERT_TRUE(task);
            }
            task.reset();
            decoders.deleteAll();
        }
        EXPECT_GT(nth, 100);
    }
}

// The last allocations are those of the lists in which decoders are handed over.
TEST(QvBatchTaskWithoutMemory, HandsOverAllDecodersOrNone) {
    const TaskFile file;
    AnyDict stored;
    Any root, version;
    ASSERT_EQ(XmlParser::restoreDict(file.name.c_str(), stored, root, version), 0);
    const QvTaskState state(stored);
    int nth = 0;
    for (bool done = false; !done; ++nth) {
        QvDPipeList decoders;
        std::unique_ptr<QvTask> task;
        QvEncodePipe* pipe = nullptr;
        {
            const FailingMemory memory(nth + 1);
            try {
                task.reset(QvBatchTask::fromState(state, decoders, &pipe, 0));
            } catch (const QvException&) {
            } catch (const std::bad_alloc&) {
            }
            done = !FailingMemory::failed();
        }
        const std::unique_ptr<QvEncodePipe> owned(pipe);
        ASSERT_EQ(decoders.size(), task ? 2 : 0) << nth;
        task.reset();
        decoders.deleteAll();
    }
}

// Gives pictures of two buffers in turn, with metadata, and one block of sound again and again.
class SteadySource : public FakeDecoder {
  public:
    SteadySource() : FakeDecoder(1000, QvFramerate::f25p()) {
        audio(1920LL * 1000, 48000);
        for (QvFrame& picture : pictures) picture.init(QvFourcc::GRAY, 16, 8);
        track(0).pcm.init(1920, 2, 2, 48000);
        track(0).pcm.setSamples(1920);
    }
    int readFrame(int) override {
        QvFrame& picture = pictures[++next % 2];
        picture.frameNr = next;
        picture.setTimestamp(next);
        picture.setUserData(&data);
        return 0;
    }
    int readSamples(int count, int) override { return count; }
    QvFrame* getFramePtr(int) override { return &pictures[next % 2]; }

    QvFrame pictures[2];
    QvUserData data;
};

// Frames and samples of a join pass without memory being taken for them.
TEST(BatchMemory, NoneIsTakenForAFrame) {
    const EngineScope engine;
    SteadySource a, b;
    QvBatchDecoder joined;
    VideoJobDescription picture;
    picture.outWidth = 16, picture.outHeight = 8, picture.outFOURCC = QvFourcc::GRAY;
    picture.outFramerate = QvFramerate::f25p();
    joined.addOutputVideoStream(picture);
    AudioJobDescription sound;
    sound.outSamplerate = 48000, sound.outChannels = 2, sound.outBitsPerSample = 16;
    joined.addOutputAudioStream(sound);
    for (SteadySource* source : {&a, &b}) {
        QvIStream video(source, 1, 0), audio(source, 2, 0);
        QvBatchDecoder::InputSegment segment;
        segment.streams.append(&video);
        segment.streams.append(&audio);
        ASSERT_EQ(joined.insertSegment(segment, -1), 0);
    }
    ASSERT_EQ(joined.open(), 0);
    const auto step = [&] { return joined.readFrame(0) == 0 && joined.readSamples(1920, 0) == 1920; };
    for (int i = 0; i < 5; ++i) ASSERT_TRUE(step());
    bool good = true, taken = false;
    {
        const FailingMemory none(1);
        for (int i = 5; i < 995; ++i) good = step() && good;
        taken = FailingMemory::failed();
    }
    EXPECT_FALSE(taken);
    EXPECT_TRUE(good);
    for (int i = 995; i < 1010; ++i) ASSERT_TRUE(step());
    EXPECT_EQ(joined.QvCodec::getParam("currentSegment"), Any(1));
}

}  // namespace
