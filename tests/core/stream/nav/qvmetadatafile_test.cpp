#include "core/stream/nav/qvmetadatafile.h"

#include "tests/core/stream/streamtools.h"

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

    EXPECT_EQ(act(m, METADATA_OPEN_WRITE, 7), 0u);
    file.destroy(0);
    EXPECT_FALSE(std::filesystem::exists(folder.file("pass.md3")));
    EXPECT_FALSE(std::filesystem::exists(folder.file("pass.md7")));
    EXPECT_EQ(TempFolder::read(folder.file("pass.md5")), "another job's");
}

}  // namespace
