#include "core/engine/files/qvfileutil.h"

#include <sys/stat.h>

#include "tests/support/checks.h"

namespace {

namespace fs = std::filesystem;

// Everything is asked for by narrow and by wide names.
class FileUtil : public testing::TestWithParam<Any (*)(const std::string&)> {
  protected:
    TempFolder temp;
    Any name(std::string_view file) { return GetParam()(temp.file(file)); }
};
INSTANTIATE_TEST_SUITE_P(Widths, FileUtil, testing::Values(narrow, wide),
                         [](const auto& info) { return info.index == 0 ? "Narrow" : "Wide"; });

TEST_P(FileUtil, FilesWithAnyBytesInTheirNamesOpenAndGo) {
    for (const char* file : {"plain", "\xC3\xA9\xF0\x9F\x8E\xAC", "\xFF\xC3", "a'b \"c\n"}) {
        void* const stream = qvfopen(name(file), "wb+");
        ASSERT_NE(stream, nullptr) << file;
        std::fputs("0123456789", static_cast<std::FILE*>(stream));
        EXPECT_EQ(QvFile::fseek64(stream, 4, SEEK_SET), 0);
        EXPECT_EQ(QvFile::flength(stream), 10);  // and the place stays
        EXPECT_EQ(QvFile::ftell64(stream), 4);
        std::fclose(static_cast<std::FILE*>(stream));
        EXPECT_TRUE(fs::exists(temp.file(file)) && QvFile::isFile(name(file)));
        EXPECT_EQ(QvFile::flength(name(file)), 10);
        EXPECT_EQ(QvFile::rm(name(file)), 0);
        EXPECT_EQ(QvFile::rm(name(file)), -1);
    }
}

TEST_P(FileUtil, AFileThatDoesNotOpenIsALineInTheLog) {
    LogCapture log;
    EXPECT_TRUE(!qvfopen(name("absent"), "rb") && !qvfopen(name(""), "rb"));
    EXPECT_TRUE(log.contains("qvfopen: failed to open '" + temp.file("absent") + "' in mode 'rb'", 32));
    EXPECT_TRUE(QvFile::flength(name("absent")) == -1 && QvFile::flength(name("")) == -1);
    ASSERT_EQ(mkfifo(temp.file("pipe").c_str(), 0600), 0);
    EXPECT_EQ(QvFile::flength(name("pipe")), -1);  // without waiting for it
    EXPECT_TRUE(QvFile::isFile(name("pipe")));
}

TEST_P(FileUtil, FoldersAreMadeWithTheirParents) {
    for (int i = 0; i < 2; ++i) EXPECT_EQ(QvFile::mkpath(name("a/b//c/")), 0);
    EXPECT_TRUE(QvFile::isDir(name("a/b/c")) && !QvFile::isFile(name("a/b/c")));
    EXPECT_EQ(QvFile::mkpath(GetParam()("")), 0);
    temp.write("file", "");
    EXPECT_TRUE(QvFile::mkpath(name("file/x")) == -1 && QvFile::mkpath(name("file")) == -1);
    EXPECT_EQ(QvFile::mkdir(name("d")), 0);
    EXPECT_TRUE(QvFile::mkdir(name("d")) == -1 && QvFile::mkdir(name("no/d")) == -1);
}

TEST_P(FileUtil, MovingLosesNothing) {
    temp.write("from", "new");
    temp.write("to", "old");
    EXPECT_EQ(QvFile::mv(name("from"), name("to"), false), -1);
    EXPECT_EQ(QvFile::mv(name("absent"), name("to"), true), -1);
    EXPECT_EQ(QvFile::mv(name("to"), name("to"), true), 0);
    EXPECT_EQ(TempFolder::read(temp.file("to")), "old");
    EXPECT_EQ(QvFile::mv(name("from"), narrow(temp.file("to")), true), 0);
    fs::create_directory(temp.file("folder"));
    EXPECT_EQ(QvFile::mv(name("to"), name("folder"), true), -1);
    EXPECT_EQ(QvFile::mv(name("to"), name("folder/inside"), false), 0);
    EXPECT_EQ(TempFolder::read(temp.file("folder/inside")), "new");
}

TEST(FileUtilPlain, CommandsTakeQuotedNamesOfBothWidths) {
    const TempFolder temp;
    const Any file = wide(temp.file("it's; exit 9"));
    EXPECT_EQ(execute_process(Any::strcat("touch ", QvFile::shellQuote(file))), 0);
    EXPECT_TRUE(QvFile::isFile(file));
    EXPECT_EQ(execute_process("exit 7"), 7);
}

}  // namespace
