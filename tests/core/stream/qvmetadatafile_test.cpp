#include "core/stream/qvmetadatafile.h"

#include "streamtools.h"

namespace {

using namespace QvAuxId;

unsigned act(metadata_storage* m, unsigned id, unsigned slot = 0, std::string_view data = {}) {
    return m->auxinfo(m, slot, id, data.empty() ? nullptr : bytesOf(data),
                      static_cast<unsigned>(data.size()));
}

TEST(QvMetadataFile, SlotsKeepWhatIsWrittenUntilTheEnd) {
    TempFolder folder;
    folder.write("pass.md5", "another job's");
    QvMetadataFile file;
    ASSERT_EQ(file.init(folder.file("pass").c_str(), false), 0);
    metadata_storage* m = file.metadata();
    ASSERT_TRUE(m);
    const struct {
        unsigned id;
        const char* data;
        unsigned result;
    } steps[] = {{METADATA_WRITE, "x", BUFSTREAM_FAILED},  // not open
                 {METADATA_OPEN_WRITE, "", 0},
                 {METADATA_OPEN_WRITE, "", BUFSTREAM_FAILED},  // open already
                 {METADATA_WRITE, "statistics", 0},
                 {METADATA_DELETE, "", BUFSTREAM_FAILED},
                 {METADATA_CLOSE, "", 0},
                 {METADATA_CLOSE, "", 0},
                 {METADATA_OPEN_READ, "", 0}};
    for (const auto& step : steps) EXPECT_EQ(act(m, step.id, 3, step.data), step.result) << &step - steps;
    EXPECT_EQ(TempFolder::read(folder.file("pass.md3")), "statistics");
    const auto read = [&] {
        std::string text(5, ' ');
        return act(m, METADATA_READ, 3, text) == 0 ? text : "failed";
    };
    EXPECT_EQ(read(), "stati");
    uint32_t length = 0;
    EXPECT_EQ(m->auxinfo(m, 3, METADATA_LENGTH, &length, sizeof length), 0u);
    EXPECT_EQ(length, 10u);
    EXPECT_EQ(read(), "stics") << "the length keeps the position";
    EXPECT_EQ(read(), "failed");
    EXPECT_EQ(act(m, METADATA_REWIND, 3), 0u);
    EXPECT_EQ(read(), "stati");
    for (const unsigned id : {METADATA_READ, METADATA_REWIND, METADATA_LENGTH, METADATA_OPEN_READ})
        EXPECT_EQ(act(m, id, 2), BUFSTREAM_FAILED) << "slot without a file, " << id;
    EXPECT_EQ(act(m, METADATA_OPEN_WRITE, 8), BUFSTREAM_FAILED);
    EXPECT_EQ(act(m, BYTECOUNT_INFO), BUFSTREAM_FAILED);
    EXPECT_EQ(usable(m), 0u);
    EXPECT_FALSE(m->request(m, 1));

    EXPECT_EQ(act(m, METADATA_OPEN_WRITE, 7), 0u);
    file.destroy(0);
    EXPECT_FALSE(std::filesystem::exists(folder.file("pass.md3")));
    EXPECT_FALSE(std::filesystem::exists(folder.file("pass.md7")));
    EXPECT_EQ(TempFolder::read(folder.file("pass.md5")), "another job's");
}

TEST(QvMetadataFile, ASlotIsDeletedOnWish) {
    TempFolder folder;
    QvMetadataFile file;
    ASSERT_EQ(file.init(folder.file("p").c_str(), false), 0);
    metadata_storage* m = file.metadata();
    act(m, METADATA_OPEN_WRITE, 0);
    act(m, METADATA_CLOSE, 0);
    EXPECT_TRUE(std::filesystem::exists(folder.file("p.md0")));
    EXPECT_EQ(act(m, METADATA_DELETE, 0), 0u);
    EXPECT_FALSE(std::filesystem::exists(folder.file("p.md0")));
    EXPECT_EQ(act(m, METADATA_DELETE, 1), 0u) << "no file is as good as a deleted one";
}

TEST(QvMetadataFile, DummiesAndBadNames) {
    LogCapture log;
    QvMetadataFile file;
    EXPECT_EQ(file.metadata(), nullptr);
    EXPECT_TRUE(log.contains("metadata not inited!!!!!!!!!!!!!!!!!!", QvLogMask::debug));
    ASSERT_EQ(file.init("some", true), 0);
    EXPECT_TRUE(log.contains("new dummy metadata filename is some"));
    log.clear();
    EXPECT_TRUE(file.inited() && file.isDummy());
    EXPECT_EQ(file.filename(), "some");
    EXPECT_EQ(file.metadata(), nullptr);
    EXPECT_TRUE(log.lines().empty());
    EXPECT_THROW(file.init("", false), QvAssertFailure);
    EXPECT_THROW(file.init(std::string(2048, 'n').c_str(), false), QvAssertFailure);
    EXPECT_FALSE(file.inited());
    EXPECT_EQ(file.init(std::string(2047, 'n').c_str(), false), 0);
    QvMetadataFile copy(file);
    EXPECT_EQ(copy.metadata(), file.metadata());
}

}  // namespace
