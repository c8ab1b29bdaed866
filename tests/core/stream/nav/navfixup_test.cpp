// A small multiplexer writes DVD-Video programs: a navigation pack and some filler sectors for each video
// object unit.
#include <zlib.h>

#include "tests/core/stream/streamtools.h"

namespace {

using namespace QvAuxId;

constexpr size_t sectorBytes = 2048;
constexpr uint32_t halfSecond = 45'000;

struct Vobu {
    uint32_t sectors;   // its size, the navigation pack included
    uint32_t duration;  // 90 kHz
    bool video;
};

struct Program {
    std::vector<Vobu> vobus;
    std::vector<size_t> segmentStarts = {0};  // VOBU indices; each begins a file and counts sectors from 0
    std::vector<size_t> cells;                // VOBU indices
    std::vector<std::vector<int32_t>> audio;  // [stream][VOBU], signed sectors
    std::vector<std::vector<uint32_t>> subpics;
    uint32_t limit = 0;
    bool highlight = false;
    bool skip = false;
};

// Layout of a navigation pack: pack header 14 bytes, system header 24, then the presentation control packet
// (6 bytes of header, substream, 979 bytes of data) and the data search packet (the same, 1,017 bytes).
constexpr size_t pci = 14 + 24 + 6 + 1;
constexpr size_t dsi = pci + 979 + 6 + 1;
constexpr size_t dsiSearch = dsi + 0xEA;
constexpr size_t nextVideo = dsiSearch, previousVideo = dsiSearch + 0xA4;
constexpr size_t nextVobu = dsiSearch + 0x50;
constexpr size_t dsiSynch = dsi + 0x192;

class Pack {
  public:
    Pack(const std::string& file, uint32_t sector) : bytes_(file.substr(sector * sectorBytes, sectorBytes)) {}

    uint32_t u32(size_t at) const {
        uint32_t value = 0;
        for (size_t i = 0; i < 4; ++i) value = value << 8 | static_cast<unsigned char>(bytes_[at + i]);
        return value;
    }
    // Entry 0 is the nearest time, half a second.
    uint32_t forward(size_t entry) const { return u32(dsiSearch + 4 + 4 * (18 - entry)); }
    uint32_t backward(size_t entry) const { return u32(dsiSearch + 0x58 + 4 * entry); }
    uint32_t audio(size_t stream) const { return u32(dsiSynch + 2 * stream) >> 16; }
    uint32_t subpic(size_t stream) const { return u32(dsiSynch + 16 + 4 * stream); }

  private:
    std::string bytes_;
};

// Writes the program and returns the contents of its files.
Texts multiplex(const Program& program, Texts* before = nullptr) {
    TempFolder folder;
    QvFileBufStream stream;
    EXPECT_EQ(stream.init(AnyDict("outfilename", folder.file("VTS.VOB").c_str(), "size", 100'000)), 0);
    bufstream* in = stream.input();
    tell(in, NAV_COLLECT_BEGIN);
    if (program.skip) tell(in, NAV_COLLECT_SKIP);
    if (program.highlight) tell(in, NAV_HAS_HIGHLIGHT);
    in->auxinfo(in, program.limit, NAV_LAST_POSITION, nullptr, 0);
    for (size_t i = 0; i < program.audio.size(); ++i) tell(in, NAV_AUDIO_LIST_ADD);
    for (size_t i = 0; i < program.subpics.size(); ++i) tell(in, NAV_SUBPIC_LIST_ADD);

    Texts plain(1);
    uint32_t sector = 0;
    for (size_t i = 0; i < program.vobus.size(); ++i) {
        const Vobu& vobu = program.vobus[i];
        if (i && std::count(program.segmentStarts.begin(), program.segmentStarts.end(), i)) {
            tell(in, NAV_SEGMENT_END_TIME, static_cast<uint32_t>(plain.size() * 0x01020304));
            EXPECT_EQ(in->split(in), 0u);
            plain.emplace_back();
            sector = 0;
        }
        if (std::count(program.cells.begin(), program.cells.end(), i)) tell(in, NAV_CELL_START);
        const uint32_t info[3] = {sector, vobu.duration, vobu.video ? 1u : 0u};
        tell(in, NAV_VOBU_INFO, info);
        const auto append = [&](const auto& lists, unsigned id) {
            for (uint32_t list = 0; list < lists.size(); ++list) {
                if (i >= lists[list].size()) continue;
                const uint32_t entry[2] = {list, static_cast<uint32_t>(lists[list][i])};
                tell(in, id, entry);
            }
        };
        append(program.audio, NAV_AUDIO_LIST_APPEND);
        append(program.subpics, NAV_SUBPIC_LIST_APPEND);
        const std::string data = patternBytes(vobu.sectors * sectorBytes, static_cast<unsigned>(i + 1));
        copyIn(in, data);
        plain.back() += data;
        sector += vobu.sectors;
    }
    tell(in, NAV_SEGMENT_END_TIME, static_cast<uint32_t>(plain.size() * 0x01020304));
    stream.destroy(0);
    EXPECT_EQ(stream.ioError(), 0) << stream.ioErrorText();
    if (before) *before = plain;
    Texts files = {TempFolder::read(folder.file("VTS.VOB"))};
    for (size_t i = 1; i < plain.size(); ++i)
        files.push_back(TempFolder::read(folder.file("VTS00" + std::to_string(i) + ".VOB")));
    return files;
}

Program longProgram(size_t count) {
    Program program;
    for (size_t i = 0; i < count; ++i)
        program.vobus.push_back({static_cast<uint32_t>(2 + i % 3),
                                 static_cast<uint32_t>(36'000 + i * 977 % 30'000),
                                 i % 37 < 20 && i % 5 != 3});
    return program;
}

// Search stays within its cell, or its file where there are no cells. The digests are of files whose every
// field was compared with what a player finds that walks from unit to unit.
TEST(NavigationTables, SearchTablesToTheByte) {
    const struct {
        size_t units;
        std::vector<size_t> segments, cells;
        bool highlight;
        unsigned long crc;
    } rows[] = {{820, {0, 600, 601, 750}, {}, false, 1618048676},  // more than 240 s: every entry is reached
                {400, {0}, {0, 50, 51, 320}, true, 1167001265},
                {8, {0, 4}, {0, 2, 6}, false, 584604810}};
    Texts files;
    for (const auto& row : rows) {
        Program program = longProgram(row.units);
        program.segmentStarts = row.segments;
        program.cells = row.cells;
        program.highlight = row.highlight;
        files = multiplex(program);
        unsigned long crc = 0;
        for (const std::string& file : files) crc = crc32(crc, bytesOf(file), static_cast<uInt>(file.size()));
        EXPECT_EQ(crc, row.crc) << row.units;
    }
    EXPECT_EQ(Pack(files[0], 2).u32(nextVobu), 0x3FFFFFFF) << "the end of a cell";
    EXPECT_EQ(Pack(files[0], 9).u32(nextVobu), 0xBFFFFFF7) << "a cell continues in a file that counts from 0";
}

TEST(NavigationTables, GapsWithoutVideoAreSeenAtAFixedPoint) {
    Program program;
    for (int i = 0; i < 40; ++i) program.vobus.push_back({1, halfSecond, i < 2 || i == 30});
    const Texts files = multiplex(program);
    const Pack first(files[0], 0);
    EXPECT_EQ(first.forward(0), 0x80000000) << "reached by the unit itself";
    EXPECT_EQ(first.forward(1), 0x80000001);
    EXPECT_EQ(first.forward(2), 2u);
    EXPECT_EQ(first.forward(15), 19u | 0x40000000) << "10 s, with video on the way";
    EXPECT_EQ(first.forward(16), 0x7FFFFFFF) << "no 30 s, but video after the 10 s";
    EXPECT_EQ(first.forward(17), 0x3FFFFFFF) << "nothing after an entry that found nothing";
    EXPECT_EQ(first.u32(nextVideo), 0x80000001);
    const Pack gap(files[0], 10);
    EXPECT_EQ(gap.u32(nextVideo), 0xBFFFFFFF) << "only the successor is asked";
    EXPECT_EQ(gap.u32(previousVideo), 0x80000009) << "the nearest before it is searched";
    EXPECT_EQ(gap.backward(8), 0x80000009);
    EXPECT_EQ(gap.backward(15), 0x3FFFFFFF);
    const Pack late(files[0], 35);
    EXPECT_EQ(late.backward(15), 20u | 0x40000000);
}

TEST(NavigationTables, AudioFieldsAreSignAndMagnitude) {
    Program program;
    for (int i = 0; i < 8; ++i) program.vobus.push_back({10, halfSecond, true});
    program.audio = {{5, -5, 0, 32'767, 32'768, -32'768, 1, INT32_MIN}, {35}};
    program.limit = 35;
    const Texts files = multiplex(program);
    const auto field = [&](uint32_t vobu, size_t stream) { return Pack(files[0], vobu * 10).audio(stream); };
    const uint32_t expected[] = {5, 0x8005, 0x7FFF, 32'766, 0x7FFF, 0xFFFF, 0x7FFF, 0xFFFF};
    for (uint32_t i = 0; i < 8; ++i) EXPECT_EQ(field(i, 0), expected[i]) << i;
    EXPECT_EQ(field(0, 1), 35u) << "at the limit";
    EXPECT_EQ(field(1, 1), 0x7FFFu) << "a list that is too short has no entry";
}

TEST(NavigationTables, SubpicturesLeadBackToTheUnitBehindTheirs) {
    Program program;
    for (int i = 0; i < 5; ++i) program.vobus.push_back({10, halfSecond, true});
    program.subpics = {{0, 0, 10, 35, 12}, {7, 3}};
    const Texts files = multiplex(program);
    constexpr uint32_t none = 0x7FFFFFFF, previous = 0x80000000;
    const uint32_t expected[][2] = {{none, none},
                                    {previous, previous},
                                    {previous, none},  // the second list is short
                                    {none, none},
                                    {previous | (40 - 20), none}};
    for (uint32_t i = 0; i < 5; ++i)
        for (size_t stream = 0; stream < 2; ++stream)
            EXPECT_EQ(Pack(files[0], i * 10).subpic(stream), expected[i][stream]) << i << " of " << stream;
}

using NavigationFixup = FileStream;

TEST_F(NavigationFixup, SkippedOnWishAndBoundedInLength) {
    Program program = longProgram(20);
    program.skip = true;
    Texts before;
    EXPECT_TRUE(multiplex(program, &before) == before);

    bufstream* in = begin("a.vob", 100'000);
    EXPECT_EQ(tell(in, NAV_CELL_START), 0u) << "before gathering nothing is kept";
    tell(in, NAV_COLLECT_BEGIN);
    const std::string sector = patternBytes(sectorBytes);
    for (uint32_t i = 0; i < 50'402; ++i) {
        const uint32_t info[3] = {i, halfSecond, 1};
        tell(in, NAV_VOBU_INFO, info);
        tell(in, NAV_CELL_START);
        copyIn(in, sector);
    }
    stream.destroy(0);
    const std::string file = bytes("a.vob");
    EXPECT_NE(file.compare(50'399 * sectorBytes, sectorBytes, sector), 0);
    EXPECT_EQ(file.compare(50'400 * sectorBytes, sectorBytes, sector), 0) << "one too many stays as it was";
}

TEST_F(NavigationFixup, AFileThatIsShorterThanItsUnitsIsTold) {
    bufstream* in = begin("a.vob", 4096);
    tell(in, NAV_COLLECT_BEGIN);
    for (const uint32_t sector : {0u, 5u}) {
        const uint32_t info[3] = {sector, halfSecond, 1};
        tell(in, NAV_VOBU_INFO, info);
    }
    copyIn(in, patternBytes(sectorBytes));
    stream.destroy(0);
    EXPECT_NE(stream.ioError(), 0);
    EXPECT_EQ(bytes("a.vob").size(), sectorBytes);
}

}  // namespace
