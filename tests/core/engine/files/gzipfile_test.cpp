#include <random>

#include "core/engine/files/qvfileutil.h"
#include "tests/support/checks.h"

namespace {

class GzipFile : public testing::Test {
  protected:
    TempFolder temp;
    Any name = Any(temp.file("block.dat").c_str());

    int pack(const std::string& bytes) {
        return QvFile::compress(name, reinterpret_cast<const unsigned char*>(bytes.data()),
                                static_cast<int>(bytes.size()));
    }
    // The bytes, "refused" or "empty".
    std::string unpack() {
        Any out = "left over";
        if (QvFile::decompress(name, out) != 0) return out.isValid() ? "left" : "refused";
        if (!out.isValid()) return "empty";
        return {static_cast<const char*>(out.asGeneric()), static_cast<std::size_t>(out.size())};
    }
    static std::string noise(std::size_t size) {
        std::mt19937 random(3);
        std::string bytes(size, '\0');
        for (char& c : bytes) c = static_cast<char>(random());
        return bytes;
    }
};

TEST_F(GzipFile, BlocksComeBackWhateverTheirSize) {
    for (const std::size_t size : {1u, 100u, 204'799u, 204'800u, 204'801u, 1'000'000u}) {
        const std::string bytes = noise(size);
        ASSERT_EQ(pack(bytes), 0);
        EXPECT_TRUE(unpack() == bytes) << size;
    }
    EXPECT_EQ(TempFolder::read(temp.file("block.dat")).substr(0, 2), "\x1F\x8B");
    ASSERT_EQ(pack(""), 0);
    EXPECT_EQ(unpack(), "empty");
}

TEST_F(GzipFile, EveryTruncationAndEveryFlippedByteOfTheDataIsSeen) {
    ASSERT_EQ(pack("some text, some text, some other text"), 0);
    const std::string packed = TempFolder::read(temp.file("block.dat"));
    for (std::size_t size = 1; size < packed.size(); ++size) {
        temp.write("block.dat", packed.substr(0, size));
        EXPECT_EQ(unpack(), "refused") << size;
    }
    constexpr std::size_t header = 10;
    for (std::size_t i = header; i < packed.size(); ++i) {
        std::string damaged = packed;
        damaged[i] = static_cast<char>(damaged[i] ^ 0x55);
        temp.write("block.dat", damaged);
        EXPECT_EQ(unpack(), "refused") << i;
    }
}

TEST_F(GzipFile, WhatIsNoGzipFileIsRefused) {
    EXPECT_EQ(unpack(), "refused");  // no file
    temp.write("block.dat", "plain text that zlib would hand on");
    EXPECT_EQ(unpack(), "refused");
    Any out;
    EXPECT_EQ(QvFile::decompress(Any(temp.path().c_str()), out), -1);
    EXPECT_EQ(QvFile::decompress(5, out), -1);
}

TEST_F(GzipFile, AFullDiscIsAFailureEvenWhenOnlyClosingMeetsIt) {
    FullDisc disc(0);
    const PlatformScope scope(disc);
    EXPECT_EQ(pack("few bytes, all in the library's buffer"), -1);
    EXPECT_EQ(pack(noise(1'000'000)), -1);
}

}  // namespace
