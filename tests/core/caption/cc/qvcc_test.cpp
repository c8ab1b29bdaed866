#include "core/caption/cc/qvcc.h"

#include "core/caption/cc/cctext.h"
#include "core/engine/status.h"
#include "tests/support/checks.h"

namespace {

// "fc9420" a pair, as in "fc9420 fc80 80".
std::string hex(const QvCcData& data) {
    std::string text;
    for (const auto& pair : data.pairs())
        text += Any::sprintf("%02x%02x%02x ", pair.header, pair.byte1, pair.byte2).asString();
    if (!text.empty()) text.pop_back();
    return text;
}

// Pairs of these types, one a tick from 0 on, numbered in byte 2.
QvCcData listOf(const std::vector<int>& types) {
    QvCcData data;
    for (const int type : types)
        data.append(QvCcBytePair(MediaTime(data.count()), type, 0x20, data.count(), true));
    return data;
}

TEST(QvCcData, ChangesKeepTheOrderOfTheRest) {
    QvCcData data = listOf({0, 0, 1, 2, 0, 1});
    data.remove(AnyVector(4, 1, 1, 77, -3), false);
    data.remove(9);
    EXPECT_EQ(hex(data), "fc2000 fd2002 fe2003 fd2005");
    data.clear();
    data.appendFillers(1, 0, true, MediaTime(5));
    data.appendFillers(1, 1, false, MediaTime(5));
    data.append(QvCcBytePair(MediaTime(6), 2, 0, 0, true));  // DTVCC zeros may be content
    data.appendFillers(1, 3, true, MediaTime(6));
    data.appendFillers(2, 0, true, MediaTime(7));
    EXPECT_EQ(hex(data), "fc8080 f90000 fe0000 ff0000 fc8080 fc8080");
    data.setTime(MediaTime(1), -5, 1);
    data.setTime(MediaTime(9), 3);
    data.shiftTimes(MediaTime(-3));
    EXPECT_EQ(data.minTime(), MediaTime(-2));
    EXPECT_EQ(data.maxTime(true), MediaTime(6));
}

TEST(QvCcData, StoredFormReadsBackOrIsRefusedWhole) {
    QvCcData data = listOf({0, 1, 2, 3}), back;
    data.setProcessCCDataFlag(false);
    AnyDict dict;
    data.store(dict);
    EXPECT_EQ(dict["name"], "cc_data");
    ASSERT_EQ(back.restore(dict), 0);
    AnyDict other = dict, broken = dict;
    other.set("name", "text");
    broken["data"].asVector().append(1);
    for (const AnyDict& bad : {AnyDict(), other, broken, AnyDict("name", "cc_data", "data", 3)})
        EXPECT_EQ(back.restore(bad), QvStatus::failed);
    EXPECT_EQ(back, data);
}

TEST(QvCcData, BuffersOfEachFormat) {
    const std::string body("\xC2\xFF\xFC\x94\x20\xFA\x00\x00", 8), country("\xB5\x00\x31", 3);
    const struct {
        int fmt;
        std::string bytes;
    } rows[] = {{0, body}, {3, "GA94\x03" + body + "\xFF"}, {5, country + "GA94\x03" + body + "\xFF"}};
    QvCcData data, back;
    data.append(QvCcBytePair(0, 0x94, 0x20, true));
    data.appendFillers(1, 2, false, MediaTime());
    const MediaTime t(42);
    std::string buffer(104, 'x');
    auto* bytes = reinterpret_cast<unsigned char*>(buffer.data());
    for (const auto& row : rows) {
        const int size = static_cast<int>(row.bytes.size());
        EXPECT_EQ(data.byteSize(row.fmt), size);
        buffer.assign(104, 'x');
        EXPECT_EQ(data.toBuffer(row.fmt, size - 1, bytes), QvStatus::illegalState);
        EXPECT_EQ(data.toBuffer(row.fmt, 104, bytes), size);
        EXPECT_EQ(buffer, row.bytes + std::string(buffer.size() - row.bytes.size(), 'x'));
        EXPECT_EQ(QvCcData::detectBufferFmt(size, bytes), row.fmt == 0 ? -1 : row.fmt);
        for (int cut = 0; cut < size - (row.fmt ? 1 : 0); ++cut)  // the last marker is not needed
            EXPECT_EQ(back.fromBuffer(row.fmt, cut, bytes, &t), QvStatus::illegalState)
                << row.fmt << " " << cut;
        ASSERT_EQ(back.fromBuffer(row.fmt, size, bytes, &t), 0);
        EXPECT_EQ(hex(back), "fc9420 fa0000");
        EXPECT_EQ(back.at(1).time, t);
    }
    data.appendFillers(29, 2, false, MediaTime());
    EXPECT_EQ(data.toBuffer(5, 104, bytes), 104);
    EXPECT_EQ(data.fromBuffer(5, 104, bytes, nullptr), 0);
    EXPECT_EQ(data.count(), 31);
    data.appendFillers(1, 2, false, MediaTime());
    EXPECT_EQ(data.toBuffer(5, 104, bytes), QvStatus::illegalState);
    EXPECT_EQ(data.fromBuffer(0, 96, bytes, nullptr), QvStatus::illegalState);
}

// The 608 slots of four frames, then the number of slots, for every rate.
TEST(QvCcProcessor, ScheduleOfEachRate) {
    using Rate = QvFramerate;
    const QvFramerate bottom59(QvRatio(30000, 1001), 2), bottom60(QvRatio(30, 1), 2);
    const struct {
        QvFramerate rate;
        const char* types;
        int slots;
    } rows[] = {
        {Rate::f29p(), "01 01 01 01 ", 20},   {Rate::f30p(), "01 01 01 01 ", 20},
        {Rate::f59i(), "01 01 01 01 ", 20},   {Rate::f60i(), "01 01 01 01 ", 20},
        {bottom59, "10 10 10 10 ", 20},       {bottom60, "10 10 10 10 ", 20},
        {Rate::f60p(), "0 1 0 1 ", 10},       {Rate::f59p(), "0 1 0 1 ", 10},
        {Rate::f23p(), "01 010 10 101 ", 25}, {Rate::f24p(), "01 010 10 101 ", 25},
        {Rate::f25p(), nullptr, 0},           {Rate::f50i(), nullptr, 0},
    };
    for (const auto& row : rows) {
        QvCcProcessor queue;
        QvCcData out;
        queue.start(true, true, row.rate, 0);
        if (!row.types) {
            EXPECT_THROW(queue.get(out, MediaTime()), QvAssertFailure);
            continue;
        }
        std::string types;
        for (int frame = 0; frame < 4; ++frame, types += ' ') {
            ASSERT_EQ(queue.get(out, MediaTime()), 0);
            EXPECT_EQ(out.count(), row.slots);
            for (const auto& pair : out.pairs())
                if (pair.is608()) types += static_cast<char>('0' + pair.type());
        }
        EXPECT_EQ(types, row.types) << row.rate.desc(true, true).asString();
    }
}

TEST(QvCcProcessor, DealsOutWhatIsDueAndFillsUp) {
    QvCcProcessor queue;
    QvCcData out;
    std::string packets;
    for (int i = 0; i < 18; ++i) packets += " fa0000";
    queue.start(true, false, QvFramerate::f30p(), QvCcProcessor::valid608_1);
    queue.get(out, MediaTime());
    EXPECT_EQ(hex(out), "fc8080 f90000" + packets);

    queue.append(listOf({0, 0, 1, 2, 3, 0}));
    queue.append(QvCcBytePair(MediaTime(6), 0, 1, 2, false));
    for (const char* leading : {"fc2000 fd2002", "fc2001 f90000", "fc8080 f90000"}) {
        queue.get(out, MediaTime(4));
        EXPECT_EQ(hex(out), leading + packets);
    }
    EXPECT_EQ(hex(queue), "fe2003 ff2004 fc2005 f80102");  // DTVCC stays, and what is not due
    queue.get(out, MediaTime(6));
    EXPECT_EQ(out.at(1).time, MediaTime(5));  // fillers carry the time before them
    queue.get(out, MediaTime(6));
    EXPECT_EQ(out.at(0), QvCcBytePair(MediaTime(6), 0, 0x80, 0x80, true));

    queue.start(false, true, QvFramerate::f30p(), 3);
    EXPECT_EQ(queue.count(), 0);
    queue.append(listOf(std::vector<int>(20, 2)));
    queue.append(QvCcBytePair(MediaTime(20), 0, 1, 2, true));
    queue.get(out, MediaTime(99));
    EXPECT_EQ(hex(out).substr(0, 27), "fc8080 fd8080 fe2000 fe2001");
    EXPECT_EQ(hex(queue), "fe2012 fe2013 fc0102");
}

// Every code of a set, the extended ones after the character that they replace.
std::vector<int> wordsOf(int set, int first, int last) {
    std::vector<int> words;
    for (int code = first; code <= last; code += set == 0 ? 2 : 1) {
        if (set == 0) words.push_back(code << 8 | (code + 1));
        if (set >= 0x12) words.push_back(0x7800);
        if (set != 0) words.insert(words.end(), 2, set << 8 | code);
    }
    return words;
}

TEST(QvCcText, ReadsAllCharacterSets) {
    const struct {
        int type;
        std::vector<int> words;
        const char* text;
    } rows[] = {
        {0, wordsOf(0, 0x20, 0x3F), "!\"#$%&’()á+,-./0123456789:;<=>?"},
        {0, wordsOf(0, 0x40, 0x5F), "@ABCDEFGHIJKLMNOPQRSTUVWXYZ[é]íó"},
        {0, wordsOf(0, 0x60, 0x7F), "úabcdefghijklmnopqrstuvwxyzç÷Ññ█"},
        {0, wordsOf(0x11, 0x30, 0x3F), "®°½¿™¢£♪à èâêîôû"},
        {0, wordsOf(0x1A, 0x20, 0x3F), "ÁÉÓÚÜü‘¡*'—©℠•“”ÀÂÇÈÊËëÎÏïÔÙùÛ«»"},
        {0, wordsOf(0x13, 0x20, 0x3F), "ÃãÍÌìÒòÕõ{}\\^_¦~ÄäÖöß¥¤│ÅåØø┌┐└┘"},
        {0, {0x9420, 0x9420, 0x9470, 0x9470, 0xC8E5, 0xECEC, 0xEF80, 0x942F}, "Hello"},
        {0, {0x9470, 0x6180, 0x94D0, 0x97A1, 0x6280}, "a|b"},                 // two rows, a tab
        {0, {0x91B0, 0x91B0, 0x91B0, 0x1137, 0x1939}, "®®♪"},                 // sent twice, meant once
        {0, {0x6162, 0x1421, 0x91AE, 0x6380, 0x1C2D, 0x6480}, "a c|d"},       // back, style, return
        {1, {0x0105, 0x4142, 0x0F15, 0x152C, 0x4344, 0x0107, 0x4546}, "CD"},  // services between
    };
    for (const auto& row : rows) {
        QvCcData data;
        for (const int word : row.words) {
            data.append(QvCcBytePair(row.type, word >> 8, word, true));
            data.append(QvCcBytePair(1 - row.type, 0x41, 0x42, true));
        }
        EXPECT_EQ(qvCcText(data.pairs(), row.type), row.text);
    }
}

}  // namespace
