#include "core/split/picturequeue_p.h"

#include <gmock/gmock.h>
#include <sys/stat.h>

#include <condition_variable>
#include <mutex>

#include "core/arch/qvcancel.h"
#include "core/engine/threads/qvthreadpool.h"
#include "core/image/qvimage.h"
#include "core/media/qvframe.h"
#include "core/split/qvbufstreamsplit.h"
#include "tests/core/stream/streamtools.h"
#include "tests/support/pictures.h"

namespace {

constexpr int width = 50, height = 40;

// Keeps the names in the order in which files are opened.
class Openings : public QvPlatform {
  public:
    std::FILE* openOutput(const char* name, const std::shared_ptr<QvCancel>& cancel,
                          bool& isStream) override {
        names.push_back(std::filesystem::path(name).filename().string());
        return QvPlatform::openOutput(name, cancel, isStream);
    }
    Texts names;  // one file is written at a time
};

struct PictureQueueTest : testing::Test {
    static QvFrame picture(int number) {
        return makePicture(QvFourcc::BGR3, width, height, static_cast<unsigned>(number) + 1);
    }
    std::string name(int number) const { return folder.file("p#" + std::to_string(number) + ".png"); }
    bool put(PictureQueue& queue, int number) { return queue.put(picture(number), name(number), nullptr); }

    // A file exists and shows its picture.
    bool shows(int number) const {
        QvFrame read;
        const QvFrame made = picture(number);
        if (QvImage::loadFrame(read, name(number).c_str()) != 0 || !read.inited()) return false;
        for (int y = 0; y < height; ++y)
            for (int x = 0; x < width; ++x)
                if (std::memcmp(read.pixelPtr(x, y), made.pixelPtr(x, y), 3) != 0) return false;
        return true;
    }
    bool exists(int number) const { return std::filesystem::exists(name(number)); }

    TempFolder folder;
};

TEST_F(PictureQueueTest, FilesComeInTheirOrderOnAnyNumberOfThreads) {
    for (const int workers : {0, 1, 3, 8}) {
        Openings platform;
        Texts wanted;
        const PlatformScope scope(platform);
        QvThreadPool pool(workers);
        PictureQueue queue(pool, width, height);
        for (int i = 0; i < 60; ++i) {
            ASSERT_TRUE(put(queue, i));
            wanted.push_back("p#" + std::to_string(i) + ".png");
        }
        ASSERT_TRUE(queue.finish());
        EXPECT_EQ(platform.names, wanted);
        for (int i = 0; i < 60; ++i) ASSERT_TRUE(shows(i)) << i << " of " << workers;
        ASSERT_TRUE(put(queue, 60)) << "it works again after an end";
        ASSERT_TRUE(queue.finish());
        EXPECT_TRUE(shows(60));
        std::filesystem::remove(name(60));
    }
}

TEST_F(PictureQueueTest, AfterAFailureNothingIsWritten) {
    for (const int workers : {0, 1, 3}) {
        std::filesystem::create_directory(name(5));
        QvThreadPool pool(workers);
        {
            PictureQueue queue(pool, width, height);
            int taken = 0;
            while (taken < 100 && put(queue, taken)) ++taken;
            EXPECT_GE(taken, 5);
            EXPECT_LE(taken, 5 + 2 * pool.width()) << "no more than there is room for";
            EXPECT_FALSE(queue.finish());
            EXPECT_TRUE(queue.failure().happened && !queue.failure().opened);
            EXPECT_EQ(queue.failure().name, name(5));
            EXPECT_EQ(queue.failure().code, EISDIR);
            EXPECT_FALSE(put(queue, 7));
        }
        for (int i = 0; i < 5; ++i) EXPECT_TRUE(shows(i));
        for (int i = 6; i < 20; ++i) EXPECT_FALSE(exists(i)) << i;
        std::filesystem::remove(name(5));

        FullDisc disc(20'000);
        const PlatformScope scope(disc);
        PictureQueue queue(pool, width, height);
        int taken = 0;
        while (taken < 100 && put(queue, taken)) ++taken;
        EXPECT_FALSE(queue.finish());
        EXPECT_TRUE(queue.failure().happened && queue.failure().opened);
        EXPECT_EQ(queue.failure().code, ENOSPC);
        EXPECT_FALSE(std::filesystem::exists(queue.failure().name)) << "nothing that looks like a picture";
    }
}

// The one worker is kept busy, so pictures wait.
TEST_F(PictureQueueTest, WhatIsDroppedIsNotWritten) {
    QvThreadPool pool(1);
    struct Gate {
        std::mutex lock;
        std::condition_variable opened;
        bool open = false, passed = false;
    } gate;
    QvThreadPool::Task busy(
        [](void* context) {
            auto& at = *static_cast<Gate*>(context);
            std::unique_lock hold(at.lock);
            at.opened.wait(hold, [&] { return at.open; });
            at.passed = true;
            at.opened.notify_all();
        },
        &gate);
    ASSERT_TRUE(pool.start(busy));
    {
        PictureQueue queue(pool, width, height);
        for (int i = 0; i < 3; ++i) ASSERT_TRUE(put(queue, i));
        queue.drop();
        for (int i = 0; i < 3; ++i) EXPECT_FALSE(exists(i));
        for (int i = 3; i < 12; ++i) ASSERT_TRUE(put(queue, i)) << "the caller packs while no worker does";
        ASSERT_TRUE(queue.finish());
        for (int i = 3; i < 12; ++i) EXPECT_TRUE(shows(i)) << i;
        ASSERT_TRUE(put(queue, 12));
    }
    EXPECT_FALSE(exists(12)) << "its end drops, too";
    std::unique_lock hold(gate.lock);
    gate.open = true;
    gate.opened.notify_all();
    gate.opened.wait(hold, [&] { return gate.passed; });
}

TEST_F(PictureQueueTest, WorksInTheMemoryThatThereIs) {
    QvThreadPool pool(3);
    for (const int blocks : {0, 3, 4, 7, 8, 13}) {
        NoMemory memory(blocks);
        const PlatformScope scope(memory);
        PictureQueue queue(pool, width, height);
        if (blocks < 4) {
            EXPECT_THROW(put(queue, 0), std::bad_alloc);
            EXPECT_TRUE(queue.finish());
            continue;
        }
        for (int i = 0; i < 20; ++i) ASSERT_TRUE(put(queue, i));
        ASSERT_TRUE(queue.finish());
    }
}

// --- As a stream.

struct ParallelPictures : PictureQueueTest {
    void begin() {
        AnyDict params("outfilename", folder.file("p.raw").c_str(), "size", 20'000, "chunk", 10'000);
        params.update(AnyDict("png", 1, "width", width, "height", height, "FOURCC",
                              static_cast<int>(unsigned{QvFourcc::BGR3}), "parallel", 1));
        ASSERT_EQ(stream.init(params), 0);
    }
    bool unit(int number) {
        const std::string pixels = pictureBytes(picture(number));
        if (copyIn(stream.input(), pixels) != pixels.size()) return false;
        tell(stream.input(), QvAuxId::VIDEO_AU_CODE, static_cast<uint32_t>(pixels.size()));
        return true;
    }
    QvBsSplitVideo stream;
};

TEST_F(ParallelPictures, AllAreThereAfterTheEndOrAFlush) {
    begin();
    for (int i = 0; i < 20; ++i) ASSERT_TRUE(unit(i));
    stream.flush();
    for (int i = 0; i < 20; ++i) EXPECT_TRUE(shows(i));
    for (int i = 20; i < 30; ++i) ASSERT_TRUE(unit(i));
    stream.destroy(0);
    EXPECT_EQ(stream.ioError(), 0);
    for (int i = 20; i < 30; ++i) EXPECT_TRUE(shows(i));
}

TEST_F(ParallelPictures, AFailureStopsTheRingOrShowsAtTheEnd) {
    std::filesystem::create_directory(name(3));
    begin();
    int taken = 0;
    while (taken < 100 && unit(taken)) ++taken;
    EXPECT_LT(taken, 100);
    EXPECT_EQ(stream.ioError(), EISDIR);
    stream.destroy(0);
    EXPECT_EQ(stream.ioError(), EISDIR);
    EXPECT_FALSE(exists(4));

    begin();
    for (int i = 0; i < 4; ++i) unit(i);  // the last one fails, and no unit follows
    stream.destroy(0);
    EXPECT_EQ(stream.ioError(), EISDIR);
    EXPECT_THAT(stream.ioErrorText(), testing::HasSubstr(name(3)));
}

// A worker that waits for the reader of a pipe does not outlast a request to stop.
TEST_F(ParallelPictures, ARequestEndsTheWaitForAReader) {
    ASSERT_EQ(mkfifo(name(0).c_str(), 0600), 0);
    const auto cancel = std::make_shared<QvCancel>();
    stream.setCancel(cancel);
    begin();
    ASSERT_TRUE(unit(0));
    ASSERT_TRUE(unit(1));
    cancel->request();
    stream.destroy(0);
    EXPECT_EQ(stream.ioError(), ECANCELED);
    EXPECT_FALSE(exists(1));
}

}  // namespace
