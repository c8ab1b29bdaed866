// Captions on the screen of a receiver, and captions made for one.
#include "core/caption/cc/cccues.h"

#include <gtest/gtest.h>

#include <bit>
#include <string>

#include "core/caption/cc/qvcc.h"
#include "core/measure/qvratio.h"

namespace {

const QvRatio kFrames(30000, 1001);

long long frameOf(const MediaTime& time) { return time.position(kFrames); }

// Lines of an SCC file: the frame, and words without parity.
struct Line {
    long long frame;
    std::vector<int> words;
};

QvCcData dataOf(const std::vector<Line>& lines, int type = 0) {
    QvCcData data;
    for (const auto& line : lines)
        for (const int word : line.words)
            data.append(QvCcBytePair(MediaTime(line.frame, kFrames, MediaTime::defaultTimescale), type,
                                     word >> 8, word & 0xFF, true));
    return data;
}

std::string shown(const std::vector<QvCcCue>& cues) {
    std::string all;
    for (const auto& cue : cues) {
        all += std::to_string(frameOf(cue.start)) + "-" + (cue.open ? "?" : std::to_string(frameOf(cue.end)));
        for (const auto& row : cue.rows)
            all += " " + std::to_string(row.row) + ":" + std::to_string(row.column) + ":" + row.markup;
        all += "\n";
    }
    return all;
}

TEST(CcCues, WhatStandsOnTheScreenAndWhen) {
    const struct {
        const char* what;
        std::vector<Line> lines;
        const char* expected;
    } rows[] = {
        {"pops on with its last code, each pair a frame later; codes come twice",
         {{100, {0x1420, 0x1420, 0x1470, 0x1470, 0x4869, 0x2100, 0x142F, 0x142F}}, {160, {0x142C, 0x142C}}},
         "106-160 15:0:Hi!\n"},
        {"one flips to the next, the last stays",
         {{10, {0x1420, 0x1460, 0x4100, 0x142F}}, {50, {0x142E, 0x1460, 0x4200, 0x142F}}},
         "13-53 15:0:A\n53-? 15:0:B\n"},
        {"two rows with indent and tab, italics, special and extended characters",
         {{0, {0x1420, 0x1372, 0x1722, 0x3C00, 0x1130, 0x146E, 0x4545, 0x1221, 0x142F}}, {30, {0x142C}}},
         "8-30 13:6:<® 15:0:<i>EÉ</i>\n"},
        {"a change of style takes a column",
         {{0, {0x1420, 0x1470, 0x6100, 0x112E, 0x6200, 0x1120, 0x6300, 0x142F}}, {30, {0x142C}}},
         "7-30 15:0:a <i>b</i> c\n"},
        {"rolls up: the line that rolls stays with the next",
         {{0, {0x1425, 0x142D, 0x1470, 0x4100}},
          {40, {0x142D, 0x4200}},
          {90, {0x142D, 0x4300}},
          {120, {0x142C}}},
         "1-40 15:0:A\n40-90 14:0:A 15:0:B\n90-120 14:0:B 15:0:C\n"},
        {"a line that lets wait for itself",
         {{0, {0x1426, 0x142D, 0x1470, 0x4100}}, {40, {0x142D}}, {90, {0x4200}}, {120, {0x142C}}},
         "1-40 15:0:A\n40-90 14:0:A\n90-120 14:0:A 15:0:B\n"},
        {"painted on, a row erased to its end, one back",
         {{0, {0x1429, 0x1470, 0x4142, 0x4344}}, {20, {0x1421}}, {60, {0x1470, 0x1722, 0x1424, 0x142C}}},
         "2-62 15:0:ABC\n62-63 15:0:AB\n"},
        {"the second channel and text mode are passed over",
         {{0, {0x1C20, 0x1C70, 0x4100, 0x1C2F, 0x142B, 0x4200, 0x142F}}},
         ""},
        {"nothing", {}, ""},
        {"codes in no mode, an erasure before anything, a row that overflows",
         {{0, {0x142D, 0x142C, 0x1424, 0x1421, 0x4141}},
          {9, {0x1420, 0x147E, 0x6162, 0x6364, 0x6566, 0x142F}}},
         "14-? 15:28:abcf\n"},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(shown(qvCcCues(dataOf(row.lines).pairs(), 0)), row.expected) << row.what;
        EXPECT_TRUE(qvCcCues(dataOf(row.lines).pairs(), 1).empty()) << row.what;
    }
    // Data services stand between the captions of field 2, whose codes are its own.
    EXPECT_EQ(shown(qvCcCues(
                  dataOf({{0, {0x1520, 0x1470, 0x4100, 0x0103, 0x5858, 0x0F00, 0x1520, 0x4200, 0x152F}}}, 1)
                      .pairs(),
                  1)),
              "8-? 15:0:AB\n");
}

QvCcCue cue(double start, double end, const std::vector<std::string>& rows) {
    QvCcCue made{MediaTime(start), MediaTime(end), {}, false};
    for (const auto& row : rows) made.rows.push_back({15, 0, row, row});
    return made;
}

TEST(CcEncode, ComesBackAsItWas) {
    QvCcLosses losses;
    const std::vector<QvCcCue> given = {
        cue(20, 22.5, {"Déjà vu ♪", "it’s “odd”: ½ of 100% – “all”"}),
        cue(2, 4, {"First"}),
        cue(4.02, 6, {"follows at once"}),
        cue(7, 9, {"comes while the one before is being taken off the screen again"}),
    };
    const QvCcData data = qvCcEncode(given, losses);
    EXPECT_EQ(losses.characters, "");
    EXPECT_EQ(losses.late, 0);
    for (const auto& pair : data.pairs()) {
        EXPECT_EQ(std::popcount(unsigned{pair.byte1}) % 2, 1);
        EXPECT_EQ(std::popcount(unsigned{pair.byte2}) % 2, 1);
    }
    EXPECT_TRUE(data.isSorted());
    EXPECT_EQ(shown(qvCcCues(data.pairs(), 0)),
              "60-120 15:13:First\n"
              "120-180 15:8:follows at once\n"
              "210-270 14:1:comes while the one before is 15:0:being taken off the screen again\n"
              "599-674 14:11:Déjà vu ♪ 15:1:it’s “odd”: ½ of 100% - “all”\n");
}

TEST(CcEncode, WhatCanNotBeShownIsReported) {
    QvCcLosses losses;
    qvCcEncode({cue(1, 2, {"日本語 日", "ok"})}, losses);
    EXPECT_EQ(losses.characters, "日本語");
    const std::string longWord(200, 'x');
    const auto cut = qvCcCues(qvCcEncode({cue(20, 22, {longWord})}, losses).pairs(), 0);
    EXPECT_EQ(losses.cut, 1);
    ASSERT_EQ(cut.size(), 1u);
    EXPECT_EQ(cut[0].rows.size(), 4u);
    EXPECT_EQ(cut[0].rows[0].text, std::string(32, 'x'));
    // More text than a pair a frame can carry: each comes as soon as it can, and the last still ends.
    std::vector<QvCcCue> fast;
    for (int i = 0; i < 10; ++i)
        fast.push_back(
            cue(i * 0.2, i * 0.2 + 0.2, {"ten words a second", "are too many" + std::to_string(i)}));
    const auto late = qvCcCues(qvCcEncode(fast, losses).pairs(), 0);
    EXPECT_EQ(late.size(), 10u);
    EXPECT_EQ(losses.late, 10);
    EXPECT_NEAR(losses.latest, late.back().start.seconds() - 1.8, 0.05);
    EXPECT_FALSE(late.back().open);
    EXPECT_EQ(losses.characters, "");
}

}  // namespace
