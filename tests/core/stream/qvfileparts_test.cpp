#include "core/stream/qvfileparts.h"

#include "tests/support/checks.h"
#include "tests/support/temp_folder.h"

namespace {

TEST(FileParts, AreOneRunOfBytes) {
    const TempFolder folder;
    const Any digits = narrow(folder.write("a", "0123456789")), letters = narrow(folder.write("b", "abcdef")),
              nothing = narrow(folder.write("c", ""));
    const auto source =
        qvFilePartsSource({{digits, 2, 3}, {nothing}, {letters}, {digits, 10}, {digits, 8}}, 1);
    ASSERT_TRUE(source);
    EXPECT_EQ(source->size(), 11);
    EXPECT_TRUE(source->seekable());
    const std::string whole = "234abcdef89";
    for (std::size_t from = 0; from <= whole.size() + 1; ++from) {
        ASSERT_TRUE(source->seek(static_cast<long long>(from)));
        std::string read(whole.size() + 2, '?');
        read.resize(source->read(read.data(), read.size()));
        EXPECT_EQ(read, from < whole.size() ? whole.substr(from) : "");
        EXPECT_FALSE(source->failed());
    }
}

TEST(FileParts, WhatIsNotThereIsNoSource) {
    const TempFolder folder;
    const Any file = narrow(folder.write("a", "0123456789"));
    for (const QvFilePart& part : {QvFilePart{file, 11}, QvFilePart{file, -1}, QvFilePart{file, 4, 7},
                                   QvFilePart{narrow(folder.file("none"))}, QvFilePart{Any()},
                                   QvFilePart{narrow(folder.path().string())}}) {
        EXPECT_EQ(qvFilePartsBytes({{file}, part}), QvByteSource::unknown);
        EXPECT_FALSE(qvFilePartsSource({{file}, part}));
    }
    EXPECT_EQ(qvFilePartsBytes({{file, 10}}), 0);
}

// What changes after the source was made is a failure with the name of the file, and no end.
TEST(FileParts, AFileThatChangesIsAFailure) {
    const TempFolder folder;
    const Any first = narrow(folder.write("a", "01234")), second = narrow(folder.write("b", "56789"));
    for (const bool gone : {false, true}) {
        folder.write("b", "56789");
        const auto source = qvFilePartsSource({{first}, {second}});
        ASSERT_TRUE(source);
        gone ? static_cast<void>(std::filesystem::remove(folder.file("b")))
             : static_cast<void>(folder.write("b", "56"));
        char read[10];
        EXPECT_EQ(source->read(read, sizeof read), gone ? 5u : 7u);
        EXPECT_TRUE(source->failed() || !source->problem().empty());
        EXPECT_NE(source->problem().find(folder.file("b")), std::string::npos) << source->problem();
    }
}

}  // namespace
