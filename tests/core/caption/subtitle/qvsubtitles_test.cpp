#include "core/caption/subtitle/qvsubtitles.h"

#include "tests/support/checks.h"

namespace {

using namespace std::string_literals;

const QvFramerate pal{25.0};

struct Subtitles : testing::Test {
    int parse(const char* name, const std::string& bytes) {
        return subtitles.parseFile(folder.write(name, bytes).c_str(), pal);
    }
    // "start-end text" of each entry, times in milliseconds.
    std::string entries() const {
        std::string all;
        for (int i = 0; i < subtitles.nrSubtitles(); ++i) {
            const QvSubtitle& s = *subtitles.at(i);
            all += std::to_string(s.start.ms()) + "-" + std::to_string(s.end.ms()) + " " +
                   s.text.asString("?") + "\n";
        }
        return all;
    }

    TempFolder folder;
    QvSubtitles subtitles;
};

std::string utf16(const std::u16string& text, bool bigEndian) {
    std::string bytes;
    for (const char16_t c : text) {
        const char low = static_cast<char>(c & 255), high = static_cast<char>(c >> 8);
        bytes += bigEndian ? high : low;
        bytes += bigEndian ? low : high;
    }
    return bytes;
}

TEST_F(Subtitles, FilesOfEachFormat) {
    const struct {
        const char *what, *name;
        std::string bytes, expected;
        const char* format = "SubRip";
        int status = 0;
    } cases[] = {
        {"three lines", "a.srt", "1\n00:00:01,500 --> 00:00:02,000\na\nb\nc\n\n", "1500-2000 a|b|c\n"},
        {"carriage returns", "a.srt", "1\r\n01:02:03,004 --> 01:02:04,005\r\na\r\nb\r\n\r\n2\r\n",
         "3723004-3724005 a|b\n"},
        {"carriage returns only", "a.srt",
         "1\r00:00:01,000 --> 00:00:02,000\ra\rb\r\r00:00:03,000 --> 00:00:04,000\rc\r",
         "1000-2000 a|b\n3000-4000 c\n"},
        {"no text line", "a.srt", "1\n00:00:01,000 --> 00:00:02,000\n\n2\n00:00:03,000 --> 00:00:04,000\nb",
         "1000-2000 \n3000-4000 b\n"},
        {"short of digits, no numbers", "a.srt", "00:00:01 --> 00:00:02\na\n\n00:00:03,5-->00:00:04,5\nb\n",
         "1000-2000 a\n3005-4005 b\n"},
        {"times without an end", "a.srt", "1\n00:00:01,000\n00:00:03,000 --> 00:00:04,000\nb\n",
         "3000-4000 b\n"},
        {"great numbers", "a.srt",
         "99999999999999999999\n99:99:99,99999999999999999999 --> 00:00:01,000\na\n",
         std::to_string(((99 * 60 + 99) * 60 + 99) * 1000LL + 2147483647LL) + "-1000 a\n"},
        {"two lines", "a.SUB", "{10}{20}Line one|Line two\r\n{25}{50}{y:i}b",
         "400-800 Line one|Line two\n1000-2000 {y:i}b\n", "MicroDVD"},
        {"carriage return only", "a.SUB", "{10}{20}a\r{30}{40}b\r", "400-800 a\n1200-1600 b\n", "MicroDVD"},
        {"a brace is open", "a.SUB", "{10}{20}a\n{30", "400-800 a\n", "MicroDVD", -1},
        {"a long number", "a.SUB", "{10}{20}a\n{12345678901234567}{1}b\n", "400-800 a\n", "MicroDVD", -1},
        {"text between", "a.SUB", "{10}{20}a\nwords\n{30}{40}b", "400-800 a\n1200-1600 b\n", "MicroDVD"},
        {"SRT in disguise", "a.SUB", "1\n00:00:01,000 --> 00:00:02,000\na\n", "1000-2000 a\n"},
        {"times and commas", "a.SUB", "[x]\n00:00:01.000,00:00:02.000\na[br]b\n", "1000-2000 a|b\n",
         "SubViewer"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        EXPECT_EQ(parse(c.name, c.bytes), c.status);
        EXPECT_STREQ(subtitles.formatName(), c.format);
        EXPECT_EQ(subtitles.format() == QvSubtitles::SUB, c.format[0] == 'M');
        EXPECT_EQ(entries(), c.expected);
        EXPECT_TRUE(c.status != 0 || subtitles.unread() == 0);
    }
    const std::string rest = "\n3\n00:00:05,000 --> 00:00:06,000\nlost\n";
    EXPECT_EQ(parse("a.srt", "1\n00:00:01,000 --> 00:00:02,000\na\n\n7 dwarfs\n" + rest), 0);
    EXPECT_EQ(entries(), "1000-2000 a\n") << "a number without times ends the file";
    EXPECT_EQ(subtitles.unread(), static_cast<long long>(rest.size()));
    parse("a.sub", "{1}{2}a|b||\n{3}{4}c\n");
    EXPECT_EQ(subtitles.at(0)->rows, 4);
}

TEST_F(Subtitles, EncodingsAreToldByMarksAndBytes) {
    const std::u16string text = u"1\r\n00:00:01,000 --> 00:00:02,000\r\n\u00C4\u20AC\r\n";
    const std::string narrow = "1\n00:00:01,000 --> 00:00:02,000\n", umlauts = "\xC3\x84\xE2\x82\xAC";
    std::string wide = "\xFF\xFE\0\0"s;
    for (const char16_t c : text) wide += {static_cast<char>(c & 255), static_cast<char>(c >> 8), '\0', '\0'};
    const struct {
        std::string bytes;
        int encoding;
        const char* name;
        std::string expected;
    } cases[] = {
        {"\xEF\xBB\xBF" + narrow + umlauts, 1, "UTF-8", umlauts},
        {"\xFE\xFF" + utf16(text, true), 2, "UTF-16BE", umlauts},
        {"\xFF\xFE" + utf16(text, false), 3, "UTF-16LE", umlauts},
        {wide, 5, "UTF-32LE", umlauts},
        {narrow + umlauts, 0, "UTF-8", umlauts},
        {narrow + "\xC4", 0, "8-bit", "\xC4"},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(parse("a.srt", c.bytes), 0) << c.name;
        EXPECT_EQ(subtitles.encoding(), c.encoding) << c.name;
        EXPECT_STREQ(subtitles.encodingName(), c.name);
        EXPECT_EQ(entries(), "1000-2000 " + c.expected + "\n") << c.name;
    }
    // What grows beyond its file is cut, with a report.
    const std::u16string line = u"{1}{2}" + std::u16string(30, u'\u732B') + u"\n";
    EXPECT_EQ(parse("a.sub", "\xFF\xFE" + utf16(line + line, false)), 0);
    EXPECT_EQ(subtitles.unread(), 2 * (7 + 90) - (2 * 2 * 37 - 2));
    EXPECT_EQ(parse("a.sub", "\xFF\xFE" + utf16(u"{1}{2}\u732B\n", false)), 0);
    EXPECT_EQ(subtitles.unread(), 0);
}

TEST_F(Subtitles, WhatIsNoSubtitleFileIsRefused) {
    LogCapture log;
    EXPECT_EQ(parse("a.txt", "{1}{2}a\n"), -1);
    EXPECT_TRUE(log.contains("Error: Unsupported subtitle format txt", QvLogMask::error));
    EXPECT_EQ(parse("a.srt", "1\n00:00:01,000 --> 00:00:02,000\na\n\0b"s), -1) << "zeros are no text";
    EXPECT_EQ(parse("a.srt", "1\n00:00:01,000 --> 00:00:02,000\na\n\0\0"s), 0) << "padding";
    EXPECT_EQ(subtitles.nrSubtitles(), 1);
    EXPECT_EQ(subtitles.parseFile(folder.file("none.srt").c_str(), pal), -1);
    EXPECT_EQ(subtitles.nrSubtitles(), 0);
}

TEST_F(Subtitles, SavedFilesReadBack) {
    parse("a.srt", "1\n00:00:01,500 --> 00:00:02,040\na|b\n\n2\n10:20:30,400 --> 10:20:31,000\n\n");
    const std::string before = entries();
    const struct {
        const char* name;
        int format;
        const char* bytes;
    } files[] = {
        {"c.x", 3, ""},
        {"b.sub", 2, "{37}{51}a|b\r\n{930760}{930775}\r\n"},
        {"b.srt", 1,
         "1\r\n00:00:01,500 --> 00:00:02,040\r\na\r\nb\r\n\r\n"
         "2\r\n10:20:30,400 --> 10:20:31,000\r\n\r\n\r\n"},
    };
    for (const auto& file : files) {
        const auto format = static_cast<QvSubtitles::Format>(file.format);
        testing::internal::CaptureStdout();
        EXPECT_EQ(subtitles.saveToFile(folder.file(file.name).c_str(), format), 0);
        std::string echo = testing::internal::GetCapturedStdout(), bytes = file.bytes;
        EXPECT_EQ(TempFolder::read(folder.file(file.name)), bytes);
        std::erase(bytes, '\r');
        EXPECT_EQ(echo, bytes);
    }
    ASSERT_EQ(subtitles.parseFile(folder.file("b.srt").c_str(), pal), 0);
    EXPECT_EQ(entries(), before);
    EXPECT_EQ(subtitles.saveToFile(folder.file("no/b.srt").c_str(), QvSubtitles::SRT), -1);
    FullDisc platform(10);
    PlatformScope scope(platform);
    EXPECT_EQ(subtitles.saveToFile(folder.file("full.srt").c_str(), QvSubtitles::SRT), -1);
}

TEST_F(Subtitles, EveryEntryIsFoundFromEverywhere) {
    const auto at = [](int frame) { return MediaTime(frame, pal, MediaTime::defaultTimescale); };
    for (const int count : {0, 1, 2, 40, 1024}) {
        std::string text;
        for (int i = 0; i < count; ++i)
            text += "{" + std::to_string(10 * i) + "}{" + std::to_string(10 * i + 4) + "}x\n";
        parse("a.sub", text);
        EXPECT_EQ(subtitles.find(at(7)), nullptr) << count;
        // A stride that meets every entry, far from the one found last.
        for (int k = 0, i = 0; k < count; ++k, i = (i + 617) % count) {
            ASSERT_EQ(subtitles.find(at(10 * i + 4)), subtitles.at(i)) << "the last instant counts " << count;
            ASSERT_EQ(subtitles.find(at(10 * i + 7)), nullptr) << "between two";
            ASSERT_EQ(subtitles.find(at(10 * i)), subtitles.at(i)) << count;
        }
    }
    parse("a.sub", "{25}{50}a\n");
    for (const double fps : {24.0, 29.97}) {
        subtitles.changeFramerate(QvFramerate(fps));
        EXPECT_EQ(subtitles.at(0)->start, MediaTime(25, QvFramerate(fps), MediaTime::defaultTimescale));
        EXPECT_EQ(subtitles.at(0)->end, MediaTime(50, QvFramerate(fps), MediaTime::defaultTimescale));
    }
}

}  // namespace
