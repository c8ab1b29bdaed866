#include "core/caption/subtitle/subtitlenormal_p.h"

#include <gmock/gmock.h>

#include "core/caption/subtitle/qvsubtitles.h"
#include "tests/support/checks.h"
#include "tests/support/temp_folder.h"

namespace {

struct Shown {
    long long start, end;  // ms
    std::string text;
    bool operator==(const Shown&) const = default;
};
void PrintTo(const Shown& shown, std::ostream* out) {
    *out << shown.start << "-" << shown.end << " \"" << shown.text << "\"";
}

struct Normal : testing::Test {
    std::vector<Shown> read(const std::string& name, const std::string& bytes, int encoding = 0) {
        file = QvSubtitles();
        file.readFile(folder.write(name, bytes).c_str(), QvFramerate(QvRatio(25, 1)), encoding, found);
        std::vector<Shown> all;
        for (int i = 0; i < file.nrSubtitles(); ++i) {
            const QvSubtitle& entry = *file.at(i);
            all.push_back({entry.start.ms(), entry.end.ms(), entry.text.asString("")});
        }
        return all;
    }

    TempFolder folder;
    QvSubtitles file;
    QvSubtitleFindings found;
};

TEST_F(Normal, ABreakAtTheEndOfALineDoesNotEndTheEntry) {
    EXPECT_EQ(read("b.srt",
                   "1\n00:00:01,000 --> 00:00:02,000\none<br>\ntwo\n\n"
                   "2\n00:00:03,000 --> 00:00:04,000\nlast\n"),
              (std::vector<Shown>{{1000, 2000, "one|two"}, {3000, 4000, "last"}}));
    EXPECT_EQ(found.lost, 0);
}

TEST_F(Normal, TimesAsPeopleWriteThem) {
    const struct {
        const char* line;
        long long start, end;
    } rows[] = {
        {"00:00:01,500 --> 00:00:02,000", 1500, 2000},
        {"0:00:01,5 --> 1:00:02", 1500, 3602000},
        {"100:00:01,000 --> 599:59:59,999", 360001000, 2159999999},
        {"99:59:59,999 --> 100:00:00,000", 359999999, 360000000},
        {"00:01.250-->00:02.500 align:start", 1250, 2500},
        {" 00:00:01.000 -> 00:00:02.000  X1:63 X2:223", 1000, 2000},
        {"00:00:01.40,00:00:02.5", 1400, 2500},
    };
    for (const auto& row : rows) {
        const Shown expected{row.start, row.end, "a|b"};
        for (const std::string end : {"\n", "\r\n", "\r", "\r\r\n"})
            EXPECT_THAT(read("x.srt", "7" + end + row.line + end + "a" + end + "b" + end + end),
                        testing::ElementsAre(expected))
                << row.line << end.size();
        EXPECT_EQ(found.lost, 0);
    }
}

TEST_F(Normal, NothingOfTheTextIsLost) {
    // An empty line within a text, an entry without a number or an empty line before it, entries out of
    // order.
    const std::string text =
        "2\n00:00:05,000 --> 00:00:06,000\nlater\n\n12 more\n1\n00:00:01,000 --> 00:00:02,000\nfirst\n"
        "00:00:03,000 --> 00:00:04,000\nwithout a number";
    EXPECT_THAT(read("x.srt", text),
                testing::ElementsAre(Shown{1000, 2000, "first"}, Shown{3000, 4000, "without a number"},
                                     Shown{5000, 6000, "later|12 more"}));
    EXPECT_EQ(found.lost, 0);
    const std::string damaged =
        "1\n00:00:01,000 --> 00:00:02,000\nfirst\n\n2\n00:0x:03,000 --> 00:00:04,000\nits text\n\n"
        "3\n700:00:00,000 --> 700:00:01,000\nfar\n\n4\n00:00:05,000 --> 00:00:06,000\na --> b\n";
    EXPECT_THAT(read("x.srt", damaged),
                testing::ElementsAre(Shown{1000, 2000, "first"}, Shown{5000, 6000, "a --> b"}));
    EXPECT_EQ(found.lost, 2);
}

TEST_F(Normal, MarkupIsThatOfTheRenderer) {
    const struct {
        const char *text, *normal;
    } rows[] = {
        {"<I>a</I> <B >b</ b><FONT COLOR=\"#FF0000\">c</Font>",
         "<i>a</i> <b>b</b><font color=\"#ff0000\">c</font>"},
        {"a &amp; b &lt;i&gt; &#65;&#x42; &nope; &", "a & b <\xE2\x81\xA0i> AB &nope; &"},
        {"&#0;&#xD800;&#99999999999;", "&#0;&#xD800;&#99999999999;"},
        {"one<br/>two<BR>three", "one|two|three"},
        {"1 <2 and <Bob> & <", "1 <2 and <Bob> & <"},
    };
    for (const auto& row : rows)
        EXPECT_THAT(read("x.srt", std::string("00:00:01,000 --> 00:00:02,000\n") + row.text),
                    testing::ElementsAre(Shown{1000, 2000, row.normal}));
}

TEST_F(Normal, MicroDvd) {
    EXPECT_THAT(read("x.sub", "{1}{1}50\n{100}{}open\n{50}{99}{y:i}one|two{c:$0000ff}\n{200}{}{Y:b}x|y"),
                testing::ElementsAre(Shown{1000, 1980, "<i>one</i>|two{c:$0000ff}"},
                                     Shown{2000, 3980, "open"}, Shown{4000, 6000, "<b>x</b>|<b>y</b>"}));
    EXPECT_TRUE(found.hasRate);
    for (const char* none : {"{1}{1}-23.976", "{10}{20}1000.0", "{1}{1}1e9", "{1}{1}nan"}) {
        EXPECT_EQ(read("x.sub", none).size(), 1u) << none;
        EXPECT_FALSE(found.hasRate) << none;
    }
    EXPECT_EQ(read("x.sub", "{10}{20}a\n{30{40}b\n{5}c\n").size(), 1u);
    EXPECT_EQ(found.lost, 2);
    EXPECT_EQ(read("x.sub", "1\n00:00:01,000 --> 00:00:02,000\n{\\an8}SubRip\n").size(), 1u);
    EXPECT_EQ(file.format(), QvSubtitles::SRT);
}

TEST_F(Normal, Encodings) {
    using Findings = QvSubtitleFindings;
    const std::string head = "1\n00:00:01,000 --> 00:00:02,000\n";
    const std::string utf8 =
        head + "\xD0\x9F\xD1\x80\xD0\xB8\xD0\xB2\xD0\xB5\xD1\x82\n";  // a Russian greeting
    const auto in16 = [&](bool big) {
        std::string bytes;
        for (const char16_t unit :
             u"1\n00:00:01,000 --> 00:00:02,000\n\u041F\u0440\u0438\u0432\u0435\u0442\n")
            if (unit)
                bytes +=
                    {static_cast<char>(big ? unit >> 8 : unit), static_cast<char>(big ? unit : unit >> 8)};
        return bytes;
    };
    const std::string sentence =  // of Russian, in windows-1251
        "\xCC\xFB \xF1\xE5\xE3\xEE\xE4\xED\xFF \xE8\xE4\xE5\xEC \xE2 \xEA\xE8\xED\xEE, \xE0 "
        "\xEF\xEE\xF2\xEE\xEC "
        "\xEF\xEE\xE5\xE4\xE5\xEC \xE4\xEE\xEC\xEE\xE9. \xDD\xF2\xEE \xE1\xFB\xEB\xEE \xEE\xF7\xE5\xED\xFC "
        "\xE8\xED\xF2\xE5\xF0\xE5\xF1\xED\xEE.\n";
    const struct {
        const char* what;
        std::string bytes;
        int encoding;
        Findings::Problem problem;
        const char* begins;  // the text that is read, "" for none
        bool guessed;
    } rows[] = {
        {"UTF-8", utf8, 0, Findings::none, "\xD0\x9F\xD1\x80", false},
        {"UTF-8 with a mark", "\xEF\xBB\xBF" + utf8, 1251, Findings::none, "\xD0\x9F\xD1\x80", false},
        {"UTF-16LE", in16(false), 0, Findings::none, "\xD0\x9F\xD1\x80", true},
        {"UTF-16BE", in16(true), 0, Findings::none, "\xD0\x9F\xD1\x80", true},
        {"UTF-16LE with a mark", "\xFF\xFE" + in16(false), 0, Findings::none, "\xD0\x9F\xD1\x80", false},
        {"UTF-16BE with a mark", "\xFE\xFF" + in16(true), 0, Findings::none, "\xD0\x9F\xD1\x80", false},
        {"a code page", head + sentence, 0, Findings::none, "\xD0\x9C\xD1\x8B", true},
        {"as it was said", head + sentence, 1251, Findings::none, "\xD0\x9C\xD1\x8B", false},
        {"not as it was said", head + sentence, 1, Findings::otherEncoding, "\xEF\xBF\xBD", false},
        {"bytes of nothing", head + "\x81\x8D\x8F\x90\x9D\xFF\xFE\n", 0, Findings::unknownEncoding, "", true},
        {"zeros inside", head + std::string("a\0b", 3), 0, Findings::noText, "", false},
        {"zeros at the end", head + std::string("a\0\0\0", 4), 0, Findings::none, "a", false},
        {"no subtitles", "Once upon a time\n", 0, Findings::noSubtitles, "", false},
        {"nothing", "", 0, Findings::noSubtitles, "", false},
    };
    for (const auto& row : rows) {
        const auto shown = read("x.srt", row.bytes, row.encoding);
        EXPECT_EQ(found.problem, row.problem) << row.what;
        EXPECT_EQ(found.guessed, row.guessed) << row.what;
        ASSERT_EQ(shown.size(), *row.begins ? 1u : 0u) << row.what;
        if (shown.empty()) continue;
        EXPECT_EQ(shown[0].text.rfind(row.begins, 0), 0u) << row.what << shown[0].text;
    }
    read("x.srt", head + sentence, 1);
    EXPECT_EQ(found.line, 3);
    EXPECT_THAT(found.encoding, testing::HasSubstr("1251"));
}

}  // namespace
