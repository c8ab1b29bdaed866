// Gathers, while a DVD-Video program is multiplexed, what its navigation packs can only state afterwards.
#pragma once

#include <cstdint>
#include <vector>

#include "core/arch/widename.h"

class QvIoFailure;

constexpr unsigned maxVobus =
    50400;  // video object units; further ones keep their packs as they were written
constexpr unsigned maxNavCells = 999;
constexpr unsigned maxNavAudioLists = 8;
constexpr unsigned maxNavSubpicLists = 32;

// One file of the output.
struct NavSegment {
    uint32_t first = 0;    // index of its first VOBU
    uint32_t count = 0;    // VOBUs in it
    uint32_t endTime = 0;  // 90 kHz
    QvWideString name;
};

struct NavData {
    // One entry for each VOBU.
    std::vector<uint32_t> sector;    // of its navigation pack, in units of 2,048 bytes
    std::vector<uint32_t> duration;  // 90 kHz
    std::vector<uint32_t> flags;     // bit 0: it has video
    // For each stream one entry for each VOBU. Audio: signed distance in sectors to the pack of the same
    // time. Sub-picture: sector of the pack in force.
    std::vector<std::vector<uint32_t>> audio;
    std::vector<std::vector<uint32_t>> subpic;
    std::vector<uint32_t> cellStarts;  // VOBU index at which each cell starts
    uint32_t limit = 0;                // last sector that an audio distance may lead to; 0 for none
    bool highlight = false;
};

class NavCollector {
  public:
    // Starts gathering for the file of this name; without the memory for it nothing is gathered.
    void begin(const QvWideString& name);
    void nextSegment(const QvWideString& name);
    // One item of side information; the result of auxinfo. Unknown identifiers and items outside gathering:
    // 0.
    unsigned take(unsigned offset, unsigned id, const void* info, unsigned size);
    // Corrects the files of all segments, unless that is to be skipped, and forgets what was gathered.
    void correctFiles(QvIoFailure& failure);

  private:
    using Lists = std::vector<std::vector<uint32_t>>;

    void addVobu(const void* info, unsigned size);
    static unsigned addList(Lists& lists, unsigned most);
    static void append(Lists& lists, const void* info, unsigned size);

    bool collecting_ = false;
    bool skip_ = false;
    NavData data_;
    std::vector<NavSegment> segments_;
};
