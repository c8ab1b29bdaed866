#include "core/stream/file/qvfilebufstream.h"

#include "core/engine/status.h"
#include "core/stream/iofailure.h"
#include "tests/core/stream/streamtools.h"
#include "tests/support/failing_memory.h"

namespace {

using namespace QvAuxId;

AnyDict output(const std::string& name, int size = 64) {
    return AnyDict("outfilename", name.c_str(), "size", size);
}
AnyDict source(const std::string& name, int size = 64) {
    return AnyDict("infilename", name.c_str(), "size", size);
}

std::string nameOf(bufstream* bs) {
    unsigned short units[300] = {};
    if (bs->auxinfo(bs, 0, FILE_NAME_INFO, units, sizeof units)) return "?";
    return qv_narrow_name(units, QvWideString(units).size());
}

TEST_F(FileStream, WritesBlocksAndBytesInOrder) {
    bufstream* in = begin();
    std::string expected;
    for (unsigned i = 0; i < 40; ++i) {
        const std::string block = patternBytes(i % 65, i),
                          more = patternBytes(i % 3 ? 0 : i * 7 % 200, i + 100);
        ASSERT_TRUE(put(in, block));
        ASSERT_EQ(copyIn(in, more), more.size());
        expected += block + more;
    }
    stream.destroy(0);
    EXPECT_EQ(stream.ioError(), 0);
    EXPECT_EQ(bytes(), expected);
}

TEST(QvNullBufStream, TakesAndCountsWhatNobodyKeeps) {
    QvNullBufStream stream;
    EXPECT_THROW(stream.init(AnyDict("size", -1)), QvAssertFailure);
    EXPECT_EQ(stream.init(AnyDict("size", 0)), 0);
    ASSERT_EQ(stream.init(AnyDict("size", 64)), 0);
    bufstream* in = stream.input();
    EXPECT_EQ(usable(in), 64u);
    EXPECT_TRUE(put(in, patternBytes(64)));
    EXPECT_FALSE(in->request(in, 65));
    EXPECT_EQ(copyIn(in, patternBytes(1000)), 1000u);
    EXPECT_EQ(ask<uint64_t>(in, BYTECOUNT_INFO), 1064u);
}

TEST(QvIoFailure, TheFirstOneStaysAndIsLoggedOnce) {
    QvIoFailure failure;
    const LogCapture log;
    failure.report(0, "First", qv_wide_name("a"));
    failure.report(ENOSPC, "Second", qv_wide_name("b"));
    EXPECT_EQ(failure.code(), EIO) << "an error without a number";
    EXPECT_TRUE(failure.text().starts_with("First 'a': "));
    EXPECT_EQ(log.count("", QvLogMask::error), 1);
    failure.clear();
    failure.report(ECANCELED, "Third", qv_wide_name("c"));
    EXPECT_EQ(failure.code(), ECANCELED);
    EXPECT_EQ(log.count("", QvLogMask::error), 1) << "the user asked for it";
}

TEST_F(FileStream, AFullBufferLeavesRoom) {
    bufstream* in = begin();
    ASSERT_TRUE(put(in, patternBytes(60)));
    EXPECT_EQ(usable(in), 4u);
    ASSERT_TRUE(put(in, "abcd"));
    EXPECT_GT(usable(in), 0u) << "a writer that takes what is usable must get on";
    EXPECT_EQ(in->confirm(in, 1000), 64u) << "bounded by the buffer";
}

TEST_F(FileStream, WhatCanNotBeOpened) {
    for (const std::string& bad : {folder.file("none/a"), folder.path().string(), std::string(),
                                   folder.file(std::string(3000, 'n'))}) {
        EXPECT_EQ(stream.init(output(bad)), QvStatus::failed) << bad;
        EXPECT_EQ(stream.init(source(bad + "/none/x")), QvStatus::failed) << bad;
        EXPECT_FALSE(stream.inited());
    }
    EXPECT_EQ(stream.init(output(folder.file("a"), -1)), QvStatus::failed);
    EXPECT_EQ(stream.init(AnyDict("outfilename", 5)), QvStatus::failed);
    NoMemory none;
    PlatformScope scope(none);
    EXPECT_EQ(stream.init(output(folder.file("b"))), QvStatus::failed);
}

TEST_F(FileStream, NamesOfAnyKindReachTheDisc) {
    for (const Any& name :
         {wide(folder.file("\xD0\x96\xF0\x9F\x98\x80.b")), narrow(folder.file("not\xFFutf8\xC3"))}) {
        ASSERT_EQ(stream.init(AnyDict("outfilename", name)), 0);
        ASSERT_EQ(copyIn(stream.input(), "content"), 7u);
        EXPECT_EQ(tell(stream.input(), BUF_SEEK_INFO, BufSeekInfo{0, "C", 1}), 0u);
        stream.destroy(0);
        ASSERT_EQ(stream.init(AnyDict("infilename", name)), 0);
        EXPECT_EQ(copyOut(stream.output(), 100), "Content");
        stream.destroy(0);
        stream.setParamDict(AnyDict("infilename", Any()));
    }
    EXPECT_EQ(bytes("not\xFFutf8\xC3"), "Content");
    EXPECT_EQ(bytes("\xD0\x96\xF0\x9F\x98\x80.b"), "Content");
}

TEST_F(FileStream, AnswersAboutItself) {
    bufstream* in = begin();
    put(in, "12345");
    copyIn(in, "678");
    put(in, "9");
    EXPECT_EQ(ask<uint64_t>(in, BYTECOUNT_INFO), 9u);
    EXPECT_EQ(ask<uint32_t>(in, BYTECOUNT_INFO), 0u) << "needs 64 bits";
    EXPECT_EQ(nameOf(in), folder.file("a.bin"));
    EXPECT_EQ(tell(in, FLUSH_BUFFER), 0u);
    EXPECT_EQ(bytes(), "12345678") << "the record's own buffer stays";
    EXPECT_EQ(stream.writeOut(), 0);
    EXPECT_EQ(bytes(), "123456789");
}

TEST_F(FileStream, SplitsIntoNumberedFiles) {
    for (const auto& [name, second, third] : {std::tuple{"clip.mpg", "clip001.mpg", "clip002.mpg"},
                                              {"clip", "clip001", "clip002"},
                                              {"a.b.c", "a.b001.c", "a.b002.c"}}) {
        bufstream* in = begin(name);
        put(in, "first");
        EXPECT_EQ(tell(in, SPLIT_OUTPUT), 0u);
        EXPECT_EQ(ask<uint64_t>(in, BYTECOUNT_INFO), 0u);
        EXPECT_EQ(ask<int32_t>(in, FILE_SPLIT_COUNT_INFO), 1);
        put(in, "second");
        EXPECT_EQ(in->split(in), 0u);
        EXPECT_EQ(nameOf(in), folder.file(third));
        put(in, "third");
        stream.destroy(0);
        EXPECT_EQ(bytes(name) + bytes(second) + bytes(third), "firstsecondthird");
    }
    bufstream* in = begin("v.x");
    for (const int count : {999, 1000, 1001}) {
        while (ask<int32_t>(in, FILE_SPLIT_COUNT_INFO) < count) ASSERT_EQ(in->split(in), 0u);
        EXPECT_EQ(nameOf(in), folder.file("v" + std::to_string(count) + ".x"));
    }
}

// The dot of a folder's name counts when the file has none, and that folder isn't there.
TEST_F(FileStream, ASplitThatFailsLeavesNoFileAndIsTold) {
    ASSERT_TRUE(std::filesystem::create_directory(folder.file("dir.v1")));
    bufstream* in = begin("dir.v1/clip");
    put(in, "kept");
    EXPECT_EQ(in->split(in), BUFSTREAM_FAILED);
    EXPECT_FALSE(in->request(in, 1));
    EXPECT_EQ(copyIn(in, "x"), 0u);
    EXPECT_EQ(stream.ioError(), ENOENT);
    stream.destroy(0);
    EXPECT_EQ(bytes("dir.v1/clip"), "kept");
}

TEST_F(FileStream, AFullDiscReachesTheWriterAndWhoeverCloses) {
    FullDisc disc(10'000);
    PlatformScope scope(disc);
    qv_log()->clear();
    bufstream* in = begin("full.bin", 4000);
    int blocks = 0;
    while (blocks < 100 && put(in, patternBytes(3000))) ++blocks;
    EXPECT_LT(blocks, 8);
    EXPECT_TRUE(!in->request(in, 1) && copyIn(in, "x") == 0);
    EXPECT_EQ(stream.ioError(), ENOSPC);
    EXPECT_NE(stream.ioErrorText().find("full.bin"), std::string::npos) << stream.ioErrorText();
    EXPECT_EQ(qv_log()->nrErrors(), 1) << "reported once";
    EXPECT_EQ(in->split(in), BUFSTREAM_FAILED);
    stream.destroy(0);
    EXPECT_EQ(stream.ioError(), ENOSPC);

    // All that was written fits into buffers: only closing finds out.
    for (const bool asked : {false, true}) {
        in = begin("small.bin", 4000);
        EXPECT_EQ(stream.ioError(), 0);
        ASSERT_TRUE(put(in, "abc"));
        EXPECT_EQ(asked ? stream.writeOut() : -1, -1);
        if (!asked) stream.destroy(0);
        EXPECT_EQ(stream.ioError(), ENOSPC);
    }
}

TEST_F(FileStream, PatchesGoInWhenTheFileIsClosed) {
    for (const int abort : {0, 1}) {
        bufstream* in = begin();
        std::vector<std::string> heard;
        HeardItems observer(heard);
        stream.registerObserver(&observer);
        put(in, "0123456789");
        std::string data = "AB";
        EXPECT_EQ(tell(in, BUF_SEEK_INFO, BufSeekInfo{1, data.data(), 2}), 0u);
        data = "XX";  // the stream has its own copy
        tell(in, BUF_SEEK_INFO, BufSeekInfo{2, "c", 1});
        EXPECT_EQ(heard.size(), 2u);
        stream.unregisterAllObservers();
        put(in, "tail");
        stream.destroy(abort);
        EXPECT_EQ(bytes(), abort ? "0123456789tail" : "0Ac3456789tail");
        EXPECT_EQ(stream.ioError(), 0);
    }
    bufstream* in = begin();
    put(in, "0123");
    tell(in, BUF_SEEK_INFO, BufSeekInfo{-5, "x", 1});
    tell(in, BUF_SEEK_INFO, BufSeekInfo{0, "x", 1});
    stream.destroy(0);
    EXPECT_EQ(bytes(), "0123") << "nothing after the patch that failed";
    EXPECT_EQ(stream.ioError(), EINVAL);
}

// A file without its patches would pass for a complete one.
TEST_F(FileStream, PatchesThatGetNoMemoryAreAFailure) {
    bool reached = true;
    for (int nth = 1; reached; ++nth) {
        bufstream* in = begin();
        put(in, "0123");
        tell(in, BUF_SEEK_INFO, BufSeekInfo{0, "x", 1});
        {
            const FailingMemory memory(nth);
            stream.destroy(0);
            reached = FailingMemory::failed();
        }
        EXPECT_TRUE(bytes() == "x123" || stream.ioError() == ENOMEM) << nth;
    }
}

// A pipe has nothing to go back to, so what wants to is a failure and not a file with holes.
TEST_F(FileStream, AStreamTakesNoPatches) {
    for (const bool patched : {false, true}) {
        ASSERT_EQ(stream.init(output("/dev/null")), 0);
        bufstream* in = stream.input();
        ASSERT_TRUE(put(in, patternBytes(60)));
        ASSERT_EQ(copyIn(in, patternBytes(500)), 500u);
        const BufSeekInfo change{0, "x", 1};
        if (patched) tell(in, BUF_SEEK_INFO, change);
        stream.destroy(0);
        EXPECT_EQ(stream.ioError(), patched ? ESPIPE : 0);
        EXPECT_EQ(stream.ioTaken(), 560u);
    }
}

TEST_F(FileStream, FlushEndsThePatchesWhileTheFileIsOpen) {
    bufstream* in = begin();
    put(in, "0123456789");
    tell(in, BUF_SEEK_INFO, BufSeekInfo{4, "ABC", 3});
    stream.flush();
    EXPECT_EQ(bytes(), "0123ABC789");
    EXPECT_FALSE(stream.input()->request(in, 1));
    EXPECT_EQ(tell(in, BUF_SEEK_INFO, BufSeekInfo{0, "Z", 1}), BUFSTREAM_FAILED);
    stream.flush();
    stream.destroy(0);
    EXPECT_EQ(bytes(), "0123ABC789");
}

TEST_F(FileStream, ReadsByBlocksAndBytes) {
    const std::string content = patternBytes(1000);
    ASSERT_EQ(stream.init(source(folder.write("a.bin", content), 100)), 0);
    bufstream* out = stream.output();
    EXPECT_EQ(ask<uint64_t>(out, FILE_SIZE_INFO), 1000u);
    std::string read = take(out, 30);
    for (const unsigned n : {5u, 333u}) read += take(out, 90).append(copyOut(out, n));
    EXPECT_EQ(ask<uint64_t>(out, BYTECOUNT_INFO), read.size());
    EXPECT_FALSE(out->request(out, 101)) << "more than the buffer";
    ASSERT_TRUE(out->request(out, 40));
    const unsigned buffered = usable(out);
    EXPECT_EQ(out->confirm(out, 5000), buffered) << "bounded by what is buffered";
    read += content.substr(read.size(), buffered);
    read += copyOut(out, 10'000);
    EXPECT_TRUE(read == content);
    EXPECT_TRUE(!out->request(out, 1) && copyOut(out, 1).empty());
}

TEST_F(FileStream, SwapsPairsWhateverTheLengthOfTheReads) {
    for (const size_t length : {1000u, 1001u}) {
        const std::string content = patternBytes(length);
        std::string swapped = content;
        for (size_t i = 0; i + 1 < length; i += 2) std::swap(swapped[i], swapped[i + 1]);
        for (const int size : {7, 64, 99}) {
            QvFileBufStream stream;
            ASSERT_EQ(stream.init(source(folder.write("s.bin", content), size)), 0);
            bufstream* out = stream.output();
            EXPECT_EQ(tell(out, FILE_SWAP_BYTES), 0u);
            std::string read;
            for (unsigned i = 0; read.size() < length && i < 2000; ++i) {
                const unsigned n = 1 + i * 5 % 13;
                read += i % 2 ? copyOut(out, n) : take(out, std::min(n, static_cast<unsigned>(size)));
                if (i > 1500) read += copyOut(out, 1);
            }
            EXPECT_TRUE(read == swapped) << length << " by " << size;
            EXPECT_EQ(ask<uint64_t>(out, BYTECOUNT_INFO), length);
        }
    }
}

TEST(QvFileBufStreamRwWrite, GoesBackReadsAndWritesOn) {
    TempFolder folder;
    QvFileBufStreamRwWrite stream;
    ASSERT_EQ(stream.init(output(folder.file("rw.bin"), 16)), 0);
    bufstream* bs = stream.input();
    put(bs, "0123456789");
    copyIn(bs, "abcdefghij");
    EXPECT_EQ(tell(bs, BUF_SEEK_INFO, BufSeekInfo{2, "PP", 2}), 0u);
    put(bs, "XYZ");
    EXPECT_EQ(ask<int64_t>(bs, BYTECOUNT_INFO), 23);
    EXPECT_EQ(tell(bs, FILE_SEEK, int64_t{0}, 2), 0u);
    EXPECT_EQ(ask<int64_t>(bs, BYTECOUNT_INFO), 0) << "the argument, whatever the origin";

    EXPECT_EQ(tell(bs, FILE_SEEK, int64_t{5}), 0u);
    EXPECT_EQ(tell(bs, FILE_MODE_READ), 0u);
    EXPECT_EQ(take(bs, 4), "5678");
    EXPECT_EQ(copyOut(bs, 3), "9ab");
    EXPECT_EQ(tell(bs, FILE_MODE_WRITE), 0u);
    put(bs, "--");
    EXPECT_EQ(ask<int64_t>(bs, BYTECOUNT_INFO), 14);
    EXPECT_EQ(ask<int64_t>(bs, FILE_SIZE_INFO), 23);
    EXPECT_EQ(tell(bs, FILE_MODE_READ), 0u);
    EXPECT_EQ(copyOut(bs, 100), "efghijXYZ");
    EXPECT_EQ(tell(bs, BUF_SEEK_INFO, BufSeekInfo{0, "00", 2}), 0u);
    EXPECT_EQ(copyOut(bs, 1), "");

    EXPECT_EQ(tell(bs, FILE_SEEK, int64_t{0}, 3), BUFSTREAM_FAILED);
    EXPECT_EQ(tell(bs, FILE_SEEK, int64_t{-1}), BUFSTREAM_FAILED);
    stream.destroy(0);
    EXPECT_EQ(TempFolder::read(folder.file("rw.bin")), "00PP456789ab--efghijXYZ");
}

TEST(QvFileBufStreamRwWrite, TheRestOfABlockIsReadOnlyOnce) {
    TempFolder folder;
    QvFileBufStreamRwWrite stream;
    ASSERT_EQ(stream.init(output(folder.file("rw.bin"), 16)), 0);
    bufstream* bs = stream.input();
    const std::string content = patternBytes(100);
    copyIn(bs, content);
    tell(bs, FILE_SEEK, int64_t{0});
    tell(bs, FILE_MODE_READ);
    EXPECT_EQ(take(bs, 14), content.substr(0, 14));
    EXPECT_EQ(take(bs, 5), content.substr(14, 5));
    EXPECT_EQ(bs->confirm(bs, 1000), 11u) << "what the buffer of 16 bytes holds";
    EXPECT_EQ(copyOut(bs, 1000), content.substr(30));
}

TEST(QvFileBufStreamRwWrite, AbortDropsTheBufferAndFlushCloses) {
    TempFolder folder;
    QvFileBufStreamRwWrite stream;
    ASSERT_EQ(stream.init(output(folder.file("rw.bin"), 16)), 0);
    put(stream.input(), "lost");
    stream.destroy(1);
    EXPECT_EQ(TempFolder::read(folder.file("rw.bin")), "");
    ASSERT_EQ(stream.init(), 0);
    put(stream.input(), "kept");
    stream.flush();
    EXPECT_EQ(TempFolder::read(folder.file("rw.bin")), "kept");
    EXPECT_EQ(copyIn(stream.input(), "x"), 0u);
    stream.destroy(0);
    EXPECT_EQ(TempFolder::read(folder.file("rw.bin")), "kept");

    FullDisc disc(5);
    PlatformScope scope(disc);
    ASSERT_EQ(stream.init(output(folder.file("full.bin"), 16)), 0);
    put(stream.input(), "0123456789");
    stream.destroy(0);
    EXPECT_EQ(stream.ioError(), ENOSPC);
}

}  // namespace
