#include "core/stream/qvbytesource.h"

#include <stdexcept>

#include "tests/support/checks.h"

namespace {

const std::string text = "0123456789abcdefghij";

std::string readOf(QvByteSource& source, std::size_t count) {
    std::string to(count, '?');
    to.resize(source.read(to.data(), count));
    return to;
}

// Callbacks over a text that give at most `most` bytes at once.
struct Feed {
    std::string bytes = text;
    std::size_t most = 3;
    std::size_t at = 0;
    int closed = 0;

    QvSourceCallbacks callbacks() {
        return {
            .read = [this](void* to, std::size_t count) -> long long {
                const std::size_t got = std::min({count, most, bytes.size() - std::min(at, bytes.size())});
                bytes.copy(static_cast<char*>(to), got, at);
                at += got;
                return static_cast<long long>(got);
            },
            .seek =
                [this](long long position) {
                    at = static_cast<std::size_t>(position);
                    return true;
                },
            .size = [this] { return static_cast<long long>(bytes.size()); },
            .close = [this] { ++closed; }};
    }
};

TEST(ByteSource, EveryKindGivesTheSameBytes) {
    const TempFolder folder;
    Feed feed;
    const auto* begin = reinterpret_cast<const unsigned char*>(text.data());
    const struct {
        const char* what;
        std::unique_ptr<QvByteSource> source;
    } kinds[] = {
        {"block", qvBlockSource(text.data(), text.size())},
        {"own block", qvBlockSource(std::vector<unsigned char>(begin, begin + text.size()))},
        {"file", qvFileSource(narrow(folder.write("a", text)), 4)},
        {"wide name", qvFileSource(wide(folder.write("b", text)))},
        {"callbacks", qvCallbackSource(feed.callbacks())},
    };
    for (const auto& [what, source] : kinds) {
        SCOPED_TRACE(what);
        ASSERT_TRUE(source);
        EXPECT_EQ(source->size(), 20);
        EXPECT_TRUE(source->seekable());
        EXPECT_EQ(readOf(*source, 7), "0123456");
        EXPECT_EQ(readOf(*source, 0), "");
        EXPECT_EQ(source->position(), 7);
        ASSERT_TRUE(source->seek(15));
        EXPECT_EQ(readOf(*source, 100), "fghij");
        EXPECT_EQ(readOf(*source, 1), "");
        EXPECT_EQ(source->problem(), "");
        ASSERT_TRUE(source->seek(0));
        EXPECT_EQ(readOf(*source, 20), text);
        EXPECT_FALSE(source->seek(-1));
        EXPECT_TRUE(source->seek(1000));
        EXPECT_EQ(readOf(*source, 1), "");
        source->close();
        source->close();
        EXPECT_EQ(readOf(*source, 1), "");
        EXPECT_FALSE(source->seek(0));
        EXPECT_EQ(source->problem(), "the source is closed");
    }
    EXPECT_EQ(feed.closed, 1);
}

TEST(ByteSource, IsClosedWhenItGoes) {
    Feed feed;
    qvCallbackSource(feed.callbacks());
    EXPECT_EQ(feed.closed, 1);
}

TEST(ByteSource, MakersRefuseWhatTheyCanNotRead) {
    const TempFolder folder;
    EXPECT_FALSE(qvFileSource(narrow(folder.file("missing"))));
    EXPECT_FALSE(qvFileSource(Any(7)));
    EXPECT_FALSE(qvFileSource(Any("")));
    EXPECT_FALSE(qvCallbackSource({}));
}

TEST(ByteSource, FailuresKeepTheirReason) {
    Feed feed;
    const auto withRead = [&feed](std::function<long long(void*, std::size_t)> read) {
        auto callbacks = feed.callbacks();
        callbacks.read = std::move(read);
        return callbacks;
    };
    const struct {
        QvSourceCallbacks callbacks;
        const char* reason;
    } cases[] = {
        {withRead([](void*, std::size_t) -> long long { return -1; }), "the source reports a failure"},
        {withRead([](void*, std::size_t) -> long long { throw std::runtime_error("line is down"); }),
         "line is down"},
        {withRead([](void*, std::size_t) -> long long { throw QvException("no card"); }), "no card"},
        {withRead([](void*, std::size_t) -> long long { throw 7; }),
         "an exception that is no std::exception"},
        {withRead([](void*, std::size_t count) { return static_cast<long long>(count) + 1; }),
         "the source reports more bytes than it was asked for"},
        {withRead([](void*, std::size_t) { return 0LL; }), "the source ends at byte 0 of 20"},
    };
    for (const auto& [callbacks, reason] : cases) {
        const auto source = qvCallbackSource(callbacks);
        EXPECT_EQ(readOf(*source, 5), "");
        EXPECT_EQ(source->problem(), reason);
    }
}

TEST(ByteSource, AfterAFailureOnlyASeekGoesOn) {
    Feed feed;
    bool down = true;
    auto callbacks = feed.callbacks();
    callbacks.read = [&feed, &down, read = callbacks.read](void* to, std::size_t count) -> long long {
        if (feed.at >= 6 && down) throw std::runtime_error("line is down");
        return read(to, count);
    };
    callbacks.seek = [&down, seek = callbacks.seek](long long position) { return !down && seek(position); };
    const auto source = qvCallbackSource(callbacks);
    EXPECT_EQ(readOf(*source, 10), "012345");
    EXPECT_TRUE(source->failed());
    EXPECT_EQ(source->problem(), "line is down");
    EXPECT_FALSE(source->seek(6));
    down = false;
    EXPECT_EQ(readOf(*source, 10), "");
    EXPECT_TRUE(source->seek(6));
    EXPECT_FALSE(source->failed());
    EXPECT_EQ(readOf(*source, 3), "678");
}

TEST(ByteSource, SizesAndSeeksThatAreNone) {
    Feed feed;
    auto callbacks = feed.callbacks();
    const struct {
        std::function<long long()> size;
        long long expected;
    } sizes[] = {
        {nullptr, QvByteSource::unknown},
        {[] { return -7LL; }, QvByteSource::unknown},
        {[] { return LLONG_MAX; }, QvByteSource::unknown},
        {[]() -> long long { throw std::runtime_error("gone"); }, QvByteSource::unknown},
        {[] { return 1LL << 60; }, 1LL << 60},
    };
    for (const auto& [size, expected] : sizes) {
        callbacks.size = size;
        EXPECT_EQ(qvCallbackSource(callbacks)->size(), expected);
    }
    callbacks = feed.callbacks();
    callbacks.seek = nullptr;
    const auto stream = qvCallbackSource(callbacks);
    EXPECT_FALSE(stream->seekable());
    EXPECT_TRUE(stream->seek(0));
    EXPECT_EQ(readOf(*stream, 4), "0123");
    EXPECT_TRUE(stream->seek(4));
    EXPECT_FALSE(stream->seek(0));
    EXPECT_EQ(stream->problem(), "the source can't be sought");
}

TEST(ByteSource, TravelsAsAParameter) {
    const auto source = qvBlockSource(text.data(), text.size());
    EXPECT_EQ(qvSourceOf(qvSourceValue(source.get())), source.get());
    EXPECT_FALSE(qvSourceValue(nullptr).isValid());
    const Any bytes(static_cast<const void*>(text.data()), 4);
    for (const Any& other : {Any(), Any(7), Any("source"), bytes}) EXPECT_EQ(qvSourceOf(other), nullptr);
}

}  // namespace
