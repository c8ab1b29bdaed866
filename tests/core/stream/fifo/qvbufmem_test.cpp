#include "core/stream/fifo/qvbufmem.h"

#include "tests/core/stream/streamtools.h"

namespace {

using namespace QvAuxId;

std::string payloadOf(const QvAuxinfoData& item) {
    return item.payload()
               ? std::string(reinterpret_cast<char*>(item.payload()), static_cast<size_t>(item.payloadSize()))
               : std::string();
}

struct MemOut {
    MemOut() {
        stream.setOutputQueue(&queue);
        EXPECT_EQ(stream.init(), 0);
        in = stream.input();
    }
    QvAuxinfoQueue queue;
    QvMemOutStream stream;
    bufstream* in;
};

TEST(QvMemOutStream, CutsAccessUnitsOutOfTheRing) {
    MemOut out;
    EXPECT_EQ(out.stream.output(), nullptr);
    const std::string data = patternBytes(20);
    ASSERT_TRUE(put(out.in, data));
    const uint32_t info[8] = {10, 11, 12, 13, 14, 15, 16, 17};
    EXPECT_EQ(tell(out.in, VIDEO_AU_CODE, info), 0u);
    ASSERT_EQ(out.queue.hasData(), 1);
    const QvAuxinfoData first = out.queue.popData();
    EXPECT_EQ(first.infoId(), int{VIDEO_AU_CODE});
    ASSERT_EQ(first.infoSize(), 32);
    EXPECT_EQ(std::memcmp(first.info(), info, sizeof info), 0);
    EXPECT_EQ(payloadOf(first), data.substr(0, 10));
    EXPECT_EQ(out.in->auxinfo(out.in, 0, AUDIO_AU_CODE, const_cast<uint32_t*>(info), 4), 0u);
    EXPECT_EQ(payloadOf(out.queue.popData()), data.substr(10));
    EXPECT_EQ(out.queue.hasData(), 0);
    EXPECT_THROW(out.queue.popData(), QvAssertFailure);
}

TEST(QvMemOutStream, UnitsLargerThanAChunkComeOutWholeAlsoOverTheEnd) {
    MemOut out;
    const std::string large = patternBytes(900'000);
    for (int round = 0; round < 9; ++round) {
        for (size_t at = 0; at < large.size();) {
            const size_t piece = std::min<size_t>(out.in->chunksize(out.in), large.size() - at);
            ASSERT_TRUE(put(out.in, std::string_view(large).substr(at, piece)));
            at += piece;
        }
        ASSERT_EQ(tell(out.in, VIDEO_AU_CODE, static_cast<uint32_t>(large.size())), 0u);
        ASSERT_TRUE(payloadOf(out.queue.popData()) == large) << "round " << round;
    }
}

TEST(QvMemOutStream, OtherInformationIsQueuedOrPassedOver) {
    MemOut out;
    for (const unsigned id : {ID_PICTURE_START_CODE, ID_SEQ_START_CODE, ID_SEQ_END_CODE, ID_GOP_START_CODE,
                              STATISTIC_INFO, CPB_FULLNESS, AUDIO_SYNC_CODE, ID_ISO_END_CODE,
                              VIDEO_STREAM_INFO, VIDEO_AU_INFO, AUDIO_STREAM_INFO, AUDIO_AU_INFO})
        EXPECT_TRUE(tell(out.in, id, 1) == 0 && !out.queue.hasData()) << qvAuxInfoName(id);
    EXPECT_EQ(tell(out.in, BUF_SEEK_INFO, BufSeekInfo{5, "abc", 3}), BUFSTREAM_FAILED);
    EXPECT_EQ(tell(out.in, STREAM_END_CODE), BUFSTREAM_FAILED);
    const QvAuxinfoData seek = out.queue.popData();
    EXPECT_TRUE(seek.infoId() == 0xC0011 && seek.infoSize() == 20);
    EXPECT_TRUE(!seek.payload() && seek.payloadSize() == 0);
    const QvAuxinfoData end = out.queue.popData();
    EXPECT_TRUE(end.infoId() == int{STREAM_END_CODE} && !end.info());
}

TEST(QvMemOutStream, MisuseIsAssertedAndLosesNothing) {
    MemOut out;
    ASSERT_TRUE(put(out.in, "0123456789"));
    unsigned char big[257] = {4};
    EXPECT_THROW(out.in->auxinfo(out.in, 0, VIDEO_AU_CODE, big, 257), QvAssertFailure);
    EXPECT_THROW(out.in->auxinfo(out.in, 0, VIDEO_AU_CODE, nullptr, 4), QvAssertFailure);
    EXPECT_THROW(tell(out.in, VIDEO_AU_CODE, 11u), QvAssertFailure) << "more than was written";
    EXPECT_THROW(out.in->request(out.in, 0), QvAssertFailure);
    EXPECT_THROW(copyIn(out.in, patternBytes(262'145)), QvAssertFailure);
    EXPECT_EQ(out.queue.hasData(), 0);
    tell(out.in, VIDEO_AU_CODE, 10u);
    EXPECT_EQ(payloadOf(out.queue.popData()), "0123456789");
}

TEST(QvAuxinfoQueue, HandsUnitsFromOneThreadToAnother) {
    MemOut out;
    constexpr uint32_t units = 20'000;
    std::thread writer([&] {
        for (uint32_t i = 0; i < units; ++i) {
            const uint32_t info[2] = {i % 600 + 4, i};
            put(out.in, patternBytes(info[0], i));
            tell(out.in, VIDEO_AU_CODE, info);
        }
        tell(out.in, STREAM_END_CODE);
    });
    QvAuQueuePoll& consumer = out.queue;
    uint32_t received = 0;
    for (;;) {
        while (!consumer.hasData()) std::this_thread::yield();
        const QvAuxinfoData item = consumer.popData();
        if (item.infoId() == int{STREAM_END_CODE}) break;
        const auto* info = static_cast<const uint32_t*>(item.info());
        ASSERT_EQ(info[1], received);
        ASSERT_TRUE(payloadOf(item) == patternBytes(info[0], received)) << "unit " << received;
        ++received;
    }
    writer.join();
    EXPECT_EQ(received, units);
}

}  // namespace
