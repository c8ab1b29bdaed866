// Caption files, shown.
#include "tests/system/tool.h"

namespace {

class Captions : public Tool {};

TEST_F(Captions, LinesOfBothFieldsInTheOrderOfTime) {
    const std::string header = "Scenarist_SCC V1.0\r\n\r\n";
    folder.write("a.scc", header + "01:00:00;29\t9420 9420 94d0 c8e9 a180 942f\r\n\r\n01:00:10;02\t942c\r\n");
    folder.write("b.scc", header + "01:00:05;01\t1520 d5ee 19b7\r\n");
    const Outcome shown = works({"captions", "a.scc", "b.scc"});
    EXPECT_EQ(shown.err, "");
    EXPECT_EQ(shown.out,
              "01:00:00;29\t1\t9420 9420 94d0 c8e9 a180 942f\tHi!\n"
              "01:00:05;01\t2\t1520 d5ee 19b7\tUn♪\n"
              "01:00:10;02\t1\t942c\t\n");
    folder.write("guess.scc", header + "00:00:00:02 9420\n9900:0:0:0 9420");
    for (const char* command : {"captions", "info"})
        EXPECT_THAT(tarsel({command, "guess.scc"}).err, testing::HasSubstr("framerate guess"));
}

TEST_F(Captions, InOtherForms) {
    folder.write("a.scc",
                 "Scenarist_SCC V1.0\n\n00:00:01;00\t9420 9420 9470 9470 c8e9 2080 942f "
                 "942f\n\n00:00:03;00\t942c 942c\n");
    EXPECT_EQ(works({"captions", "a.scc", "--srt"}).out, "1\n00:00:01,201 --> 00:00:03,003\nHi\n\n");
    EXPECT_EQ(works({"captions", "a.scc", "--vtt"}).out, "WEBVTT\n\n00:00:01.201 --> 00:00:03.003\nHi\n\n");
    EXPECT_THAT(
        works({"captions", "a.scc", "--json"}).out,
        testing::AllOf(testing::HasSubstr("\"end_timecode\":\"00:00:03;00\",\"field\":1,\"text\":\"Hi\""),
                       testing::HasSubstr("\"row\":15")));

    // Text that becomes captions is the same text again, a frame sooner or later.
    folder.write("t.srt",
                 "1\n00:00:02,000 --> 00:00:04,000\nTom &amp; <i>Zo\xC3\xAB</i>\nsays \xE6\x97\xA5\n\n"
                 "2\n00:00:05,000 --> 00:00:06,000\nbye\n");
    const Outcome made = works({"captions", "t.srt", "--scc", "-o", "t.scc"});
    EXPECT_THAT(made.err, testing::HasSubstr("there are none for '\xE6\x97\xA5'"));
    EXPECT_EQ(contents("t.scc").substr(0, 20), "Scenarist_SCC V1.0\n\n");
    EXPECT_EQ(works({"captions", "t.scc", "--srt"}).out,
              "1\n00:00:02,002 --> 00:00:04,004\nTom & Zo\xC3\xAB\nsays ?\n\n"
              "2\n00:00:05,005 --> 00:00:06,006\nbye\n\n");
    EXPECT_THAT(works({"captions", "t.srt", "--scc", "--rate", "29.97"}).out,
                testing::HasSubstr("00:00:01:"));

    // The name says the form, too.
    works({"captions", "a.scc", "-o", "named.vtt"});
    EXPECT_EQ(contents("named.vtt"), works({"captions", "a.scc", "--vtt"}).out);
    fails(2, {"captions", "a.scc", "-o", "named.txt"}, {"'named.txt'", "--srt, --vtt, --scc or --json"});
    fails(2, {"captions", "t.srt"}, {"'t.srt'", "--srt, --vtt, --scc or --json"});

    // A rate counts, in the list as well; what the file says of drop frame holds.
    EXPECT_THAT(works({"captions", "a.scc", "--rate", "29.97"}).out,
                testing::HasSubstr("00:00:03;00\t1\t942c"));
    const Outcome pal = works({"captions", "a.scc", "--rate", "pal", "--json"});
    EXPECT_THAT(pal.out, testing::HasSubstr("\"end\":3.0,"));
    EXPECT_EQ(
        pal.err,
        "tarsel: warning: 'a.scc': the numbers of its frames suggest 29.97 a second, not 25; its times may "
        "be wrong\n");
    fails(2, {"captions", "a.scc", "--rate", "25df"}, {"'25df'", "drop frame"});

    fails(4, {"captions", "t.srt", "--scc", "-o", "t.scc"}, {"'t.scc'", "-y"});
    fails(2, {"captions", "t.srt", "--scc", "--srt"}, {"--scc", "--srt"});
    fails(2, {"captions", "a.scc", "t.scc", "--srt"}, {"'t.scc'"});
    fails(3, {"captions", "gone.srt", "--scc"}, {"'gone.srt'"});
    folder.write("dark.scc", "Scenarist_SCC V1.0\n\n00:00:03;00\t942c 942c\n");
    fails(3, {"captions", "dark.scc", "--srt"}, {"'dark.scc'"});
}

TEST_F(Captions, InfoTellsWhatATextFileHolds) {
    const std::string one = "1\n00:00:01,500 --> 00:00:02,000\nHi\n\n";
    const struct {
        const char* name;
        std::string bytes;
        int status;
        const char* line;
    } rows[] = {
        {"a.scc", "Scenarist_SCC V1.0\n\n00:00:10;00 9420\n00:01:00;02 942f", 0,
         "CEA-608, 29.97df, 1801 frames, 2 pairs, 0:00:10.010 to 0:01:00.060\n"},
        {"a.srt", one + "2\n01:00:00,000 --> 01:00:01,000\n\xC3\xA9\n", 0,
         "SubRip, UTF-8, 2 subtitles, 0:00:01.500 to 1:00:01.000\n"},
        {"c.srt", one + "2\nno times\n\nmore\n", 3,
         "SubRip, ASCII, 1 subtitle, 0:00:01.500 to 0:00:02.000\n"},
    };
    for (const auto& row : rows) {
        folder.write(row.name, row.bytes);
        const Outcome shown = tarsel({"info", row.name});
        EXPECT_EQ(shown.status, row.status) << shown.err;
        EXPECT_THAT(shown.out, testing::HasSubstr(row.line));
    }
    fails(3, {"info", "c.srt"}, {"c.srt", "the last 15 bytes of its text can't be read"});
}

TEST_F(Captions, WhatHasNoneOrHoldsNoneIsTold) {
    folder.write("text.srt", "1\n00:00:01,000 --> 00:00:02,000\nHi\n");
    const Outcome ran =
        works({"transcode", "testgen:size=64x64,duration=1f,audio=0", "text.srt", "-o", "a.yuv"});
    EXPECT_THAT(ran.err, testing::HasSubstr("nothing of 'text.srt' goes into the output"));
    folder.write("text.scc", "1\n00:00:01,000 --> 00:00:02,000\nHi\n");
    folder.write("none.scc", "Scenarist_SCC V1.0\n");
    for (const char* name : {"text.scc", "none.scc", "absent.scc"}) {
        fails(3, {"captions", name}, {name});
        fails(3, {"info", name}, {name});
    }
    fails(2, {"captions", "a.scc", "b.scc", "c.scc"}, {"captions --help"});
}

}  // namespace
