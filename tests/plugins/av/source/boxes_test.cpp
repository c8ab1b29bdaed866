#include "plugins/av/source/boxes.h"

#include <gtest/gtest.h>

#include "tests/plugins/av/watchedsource.h"

namespace {

std::string number(std::uint64_t value, int bytes) {
    std::string text;
    while (bytes-- > 0) text += bytes < 8 ? static_cast<char>(value >> 8 * bytes) : '\0';
    return text;
}

std::string box(const std::string& type, const std::string& data) {
    return number(data.size() + 8, 4) + type + data;
}

// A track of `samples` of one byte each, which last for `duration`.
std::string track(const std::string& kind, std::uint64_t samples, std::uint64_t duration) {
    const std::string table =
        box("stts", number(0, 4) + number(1, 4) + number(samples, 4) + number(duration, 4)) +
        box("stsz", number(0, 4) + number(1, 4) + number(samples, 4));
    return box("trak", box("mdia", box("hdlr", number(0, 8) + kind + number(0, 12)) +
                                       box("minf", box("stbl", table))));
}

TEST(BoxesOfFilms, tablesAskForPackets) {
    const std::string two = track("vide", 30'000'000, 512) + track("vide", 5, 512);
    std::string deep = two;
    for (int i = 0; i < 1000; ++i) deep = box("moov", deep);
    const struct {
        const char* name;
        std::string file;
        std::uint64_t expected;
    } cases[] = {
        {"two tracks", box("ftyp", "qt  ") + box("moov", two), 30'000'005},
        {"sound in chunks", box("moov", track("soun", 4096 * 1000, 1)), 4000},
        {"sound in frames", box("moov", track("soun", 4096, 1024)), 4096},
        {"pictures of one unit", box("moov", track("vide", 4096, 1)), 4096},
        {"long size", number(1, 4) + "moov" + number(two.size() + 16, 8) + two, 30'000'005},
        {"a size beyond the end", number(1, 4) + "moov" + number(UINT64_MAX, 8) + two, 30'000'005},
        {"to the end of the file", number(0, 4) + "moov" + two, 30'000'005},
        {"no size", number(3, 4) + "moov" + two, 0},
        {"deep", deep, 0},
        {"nothing", "", 0},
    };
    for (const auto& c : cases) {
        WatchedSource source(c.file);
        EXPECT_EQ(av::packetsOfTables(source), c.expected) << c.name;
    }
}

TEST(BoxesOfFilms, fragmentsAreNotOneTable) {
    const std::string table = box("moov", track("vide", 5, 512));
    const std::pair<std::string, bool> cases[] = {
        {table + box("mdat", "1234"), true},
        {box("mdat", "1234") + table, true},
        {table + number(0, 4) + "mdat1234", true},
        {table + number(99, 4) + "mdat1234", true},
        {table + box("moof", "") + box("mdat", "1234"), false},
        {box("sidx", "") + table, false},
        {box("mdat", "1234"), false},
    };
    for (const auto& [file, expected] : cases) {
        WatchedSource source(file);
        EXPECT_EQ(av::isOneTable(source), expected) << file;
    }
}

}  // namespace
