// Each allocation that a task file's check or opening takes fails in turn, alone or with all later ones:
// there is a fault, no exception, and nothing that was made.
#include "core/decode/qvdecoder.h"
#include "core/engine/status.h"
#include "core/transcode/batch/qvtaskfile.h"
#include "core/transcode/task/qvtranscodetask.h"
#include "tests/core/transcode/batch/soundtask.h"
#include "tests/support/failing_memory.h"

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

}  // namespace
