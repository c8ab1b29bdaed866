#include "tests/core/stream/streamtools.h"

namespace {

struct Layout {
    size_t head, body, block;
    bool moves;
};

BufReorderInfo orderOf(const Layout& l) {
    return {{0, l.head, 0}, {l.head + l.body, l.block, 0}, {l.head, l.body, 0}};
}

using BlockMove = FileStream;

TEST_F(BlockMove, PutsTheBlockBehindTheHead) {
    constexpr size_t mib = 1 << 20;
    for (const Layout& l : {Layout{40, 5000, 80, false},
                            {40, mib, 3000, true},
                            {40, mib - 41, 300, false},
                            {1000, 3 * mib + 17, 70'000, true},
                            {5, 2 * mib, 0, true}}) {
        for (const int abort : {0, 1}) {
            const std::string head = patternBytes(l.head, 1), body = patternBytes(l.body, 2),
                              block = patternBytes(l.block, 3);
            bufstream* in = begin();
            copyIn(in, head + body + block);
            EXPECT_EQ(tell(in, QvAuxId::BUF_SEEK_REORDER, orderOf(l)), 0u);
            stream.destroy(abort);
            EXPECT_TRUE(bytes() == (l.moves ? head + block + body : head + body + block))
                << l.head << " " << l.body << " " << l.block;
            EXPECT_EQ(stream.ioError(), 0) << stream.ioErrorText();
        }
    }
}

TEST_F(BlockMove, ExtentsThatAreNotTheFilesLeaveItAlone) {
    const std::string content = patternBytes(3 << 20);
    const uint64_t size = content.size(), huge = ~uint64_t{0};
    for (const BufReorderInfo& bad : {BufReorderInfo{{0, 10, 0}, {size - 5, 10, 0}, {10, size - 15, 0}},
                                      {{0, 10, 0}, {size - 5, 5, 0}, {20, size - 25, 0}},
                                      {{0, huge, 0}, {2 << 20, huge, 0}, {10, huge, 0}},
                                      {{0, 10, 0}, {huge, 5, 0}, {10, 100, 0}}}) {
        bufstream* in = begin();
        copyIn(in, content);
        tell(in, QvAuxId::BUF_SEEK_REORDER, bad);
        stream.destroy(0);
        EXPECT_TRUE(bytes() == content);
        EXPECT_NE(stream.ioError(), 0);
    }
}

}  // namespace
