// SCC files, read and written.
#include "core/caption/cc/qvcc.h"
#include "core/engine/status.h"
#include "tests/support/checks.h"

namespace {

constexpr char guessText[] = "Framerate guess could be inaccurate, not enough frames to be sure";

struct Scc : testing::Test {
    int read(const std::string& lines, bool dropFrameLines = false) {
        return readFile(folder.write("a.scc", "Scenarist_SCC V1.0\n\n" + lines), dropFrameLines);
    }
    int readFile(const std::string& name, bool dropFrameLines = false) {
        return data.readScc(Any(name.c_str()), 0, true, rate, nullptr, dropFrameLines);
    }
    std::string words() const {
        std::string text;
        for (const auto& pair : data.pairs())
            text += Any::sprintf(text.empty() ? "%02x%02x" : " %02x%02x", pair.byte1, pair.byte2).asString();
        return text;
    }

    TempFolder folder;
    QvCcData data;
    QvFramerate rate;
    LogCapture log;
};

TEST_F(Scc, KeepsLinesWithATimecodeAndWords) {
    const struct {
        std::string lines;
        const char* words;
    } rows[] = {
        {"00:00:01:02\t9420 9420 abc 94ae\r\n", "9420 9420 94ae"},
        {"00:00:01:02\n9420 9420\n", ""},
        {"00:00:01:61 9420\n0:0:0:1 942f\n1:1:1 9420\n00:00:00:0001 9420\n00:00:00:60 94ae\n", "942f 94ae"},
        {"1:2:3:4:5 9420\n0:0:0:\t9420\n0:99:x:1 942f\n999:0:0:0 94ae", "942f 94ae"},
        {"-1:00:00:00 9420\n0:0:0:-1 9420\n9901:0:0:0 9420\n", ""},  // no place in the stream
        {"00:00:01:02 942x zzzz 1 0x7f -001 +012\n", "0942 0000 007f ffff 0012"},
        {std::string("00:00:01:02 94\0 20 94ae", 23), "94ae"},
        {"00:00:01:02 " + std::string(8176, ' ') + "9420 942f\n00:00:02:02 94ae", "9420 94ae"},
    };
    for (const auto& row : rows) {
        ASSERT_EQ(read(row.lines), 0);
        EXPECT_EQ(words(), row.words) << row.lines;
    }
    EXPECT_TRUE(log.contains("lines of more than 8192 bytes"));
    std::string many = "00:00:01:02";
    for (int i = 0; i < 1600; ++i) many += " 9420";
    ASSERT_EQ(read(many), 0);
    EXPECT_EQ(data.count(), 1600);
    // What is no SCC file keeps the list.
    for (const char* bytes : {"", "Scenarist_SC", "\nScenarist_SCC V1.0\n", "scenarist_scc V1.0\n"})
        EXPECT_EQ(readFile(folder.write("b.scc", bytes)), QvStatus::noSegment) << bytes;
    EXPECT_EQ(data.count(), 1600);
    EXPECT_EQ(readFile(folder.write("b.scc", "Scenarist_SCC")), 0);
    EXPECT_EQ(data.count(), 0);
}

TEST_F(Scc, FilesAsTheyAreFound) {
    const std::string mark = "\xEF\xBB\xBF", head = "Scenarist_SCC V1.0";
    const std::string macintosh = head + "\r\r00:00:01;02\t9420 942f\r\r00:00:02;02\t94ae\r";
    ASSERT_EQ(readFile(folder.write("a.scc", macintosh)), 0);
    EXPECT_EQ(words(), "");
    ASSERT_EQ(readFile(folder.write("a.scc", mark + macintosh), true), 0);
    EXPECT_EQ(words(), "9420 942f 94ae");
    EXPECT_FALSE(log.contains("line"));
    EXPECT_EQ(readFile(folder.write("a.scc", mark + head)), QvStatus::noSegment);

    const std::string damaged =
        head + "\r\n\r\n00:00:01:02\t9420 94x0 942f\r\n\r\n00:00:0s 9420\r\n1:2:3:4 94208";
    ASSERT_EQ(readFile(folder.write("a.scc", damaged)), 0);
    EXPECT_FALSE(log.contains("line"));
    ASSERT_EQ(readFile(folder.write("a.scc", damaged), true), 0);
    EXPECT_TRUE(log.contains("a.scc, line 3: '94x0' is no word of four hexadecimal digits"));
    EXPECT_TRUE(log.contains("a.scc, line 5: there is no timecode HH:MM:SS:FF"));
    EXPECT_TRUE(log.contains("a.scc, line 6: '94208' is no word of four hexadecimal digits"));
    std::string bad;
    for (int i = 0; i < 9; ++i) bad += "\nno";
    ASSERT_EQ(readFile(folder.write("a.scc", head + bad), true), 0);
    EXPECT_TRUE(log.contains("has 4 more such places"));
}

TEST_F(Scc, GuessesTheRateFromTheHighestFrame) {
    QvFramerate drop29 = QvFramerate::f29p(), drop59 = QvFramerate::f59p();
    drop29.setDf(true);
    drop59.setDf(true);
    const struct {
        const char* lines;
        QvFramerate rate;
        bool guess;
    } rows[] = {
        {"", QvFramerate::f29p(), false},
        {"00:00:01:22 9420\n00:00:02:04 9420", QvFramerate::f23p(), true},
        {"00:00:01:23 9420", QvFramerate::f23p(), false},
        {"00:00:01:24 9420", QvFramerate::f29p(), false},
        {"00:00:01;03 9420", drop29, false},
        {"00:00:01:31 9420\n00:00:01;03 9420", drop59, false},
    };
    for (const auto& row : rows) {
        log.clear();
        ASSERT_EQ(read(row.lines, true), 0);
        EXPECT_EQ(rate, row.rate) << row.lines;
        EXPECT_EQ(log.contains(guessText, QvLogMask::warning), row.guess) << row.lines;
    }
    EXPECT_EQ(data.at(0).time.position(rate), 91);
    log.clear();
    const std::string name = folder.file("a.scc");
    const bool drop = true;
    QvFramerate fixed = QvFramerate::f25p(), ntsc = QvFramerate::f29p();
    ASSERT_EQ(data.readScc(Any(name.c_str()), 1, false, fixed, nullptr), 0);
    EXPECT_TRUE(fixed.is25p());
    EXPECT_EQ(data.at(0), QvCcBytePair(MediaTime(56, 25, MediaTime::defaultTimescale), 1, 0x94, 0x20, true));
    folder.write("a.scc", "Scenarist_SCC V1.0\n00:10:00:00 9420");
    ASSERT_EQ(data.readScc(Any(name.c_str()), 0, false, ntsc, &drop), 0);
    EXPECT_EQ(data.at(0).time.position(ntsc), 17982) << "ten minutes of drop frame";
}

TEST_F(Scc, WrittenFilesReadBackEqualAtEveryRate) {
    const Any name = folder.file("w.scc").c_str();
    const QvFramerate drop29(30000 / 1001.0, 0, true), drop59(60000 / 1001.0, 0, true);
    for (const QvFramerate& at :
         {QvFramerate::f23p(), QvFramerate::f24p(), QvFramerate::f25p(), QvFramerate::f29p(), drop29,
          QvFramerate::f30p(), QvFramerate::f50p(), QvFramerate::f59p(), drop59, QvFramerate::f60p()}) {
        QvCcData list;
        for (int frame = 0; frame < 24 * 3600 * 20; frame += 1797)  // minutes and their drops at every second
            for (int i = 0; i < 1 + frame % 3; ++i)
                list.append(
                    QvCcBytePair(MediaTime(frame, at, MediaTime::defaultTimescale), 1, 0x10 + i, 0xFF, true));
        for (const bool semicolons : {false, at.df()}) {
            ASSERT_EQ(list.writeScc(name, at, {.dropFrameLines = semicolons}), 0);
            QvFramerate given = at;
            const bool drop = at.df();
            ASSERT_EQ(data.readScc(name, 1, false, given, &drop, semicolons), 0);
            EXPECT_TRUE(data == list) << at.desc(true, true).asString();
        }
    }
}

TEST_F(Scc, WritesARunOfEqualTimesAsOneLine) {
    const std::string name = folder.file("w.scc");
    const QvFramerate ntsc = QvFramerate::f29p();
    for (const int word : {0x9420, 0x01AE, 0x9402}) data.append(QvCcBytePair(0, word >> 8, word, true));
    data.append(QvCcBytePair(MediaTime(1.5), 0, 0x94, 0x2F, true));
    ASSERT_EQ(data.writeScc(Any(name.c_str()), ntsc), 0);
    EXPECT_EQ(TempFolder::read(name),
              "Scenarist_SCC V1.0\n\n00:00:00:00\t9420  1ae 94 2\n\n00:00:01:14\t942f\n\n\n");
    data.appendFillers(1001, 0, false, MediaTime(2.0));
    EXPECT_THROW(data.writeScc(Any(name.c_str()), ntsc), QvAssertFailure);
    EXPECT_EQ(TempFolder::read(name).substr(64), "\n\n\n");  // untouched
    ASSERT_EQ(data.writeScc(Any(name.c_str()), ntsc, {.complete = true}), 0);
    for (const std::string& refused : {folder.file("no/w.scc"), std::string("/dev/full")})
        EXPECT_LT(data.writeScc(Any(refused.c_str()), ntsc, {.complete = true}), 0);
}

}  // namespace
