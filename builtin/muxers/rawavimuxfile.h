// The container of an AVI file: RIFF segments, chunks and their indexes.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

class QvBufStream;

// One stream of the file, and what has been written of it.
struct AviTrack {
    // Set before open.
    bool video = false;
    unsigned handler = 0;  // FOURCC of "strh"
    unsigned rate = 0;     // units, pictures or samples, a second: rate / scale
    unsigned scale = 1;
    unsigned unitBytes = 0;  // of an audio sample of all channels; 0 for video
    int width = 0;
    int height = 0;
    int interlaced = 0;                 // as QvFramerate counts it
    std::vector<unsigned char> format;  // contents of "strf"

    // Kept by the file.
    struct IndexPlace {
        int64_t position;
        uint32_t bytes;
        uint32_t units;  // covered by it
    };
    std::vector<IndexPlace> index;
    int64_t units = 0;
    int64_t segmentUnits = 0;
    uint32_t largestChunk = 0;
};

// Writes front to back and notes corrections of what is written already, which the output takes on when it is
// closed (BUF_SEEK_INFO). A file is:
//
//     RIFF "AVI "   headers with room for the places of all indexes | movi: chunks, ix00 ix01 .. | idx1
//     RIFF "AVIX"   movi: chunks, ix00 ix01 ..                        (as often as needed)
//
// A segment ends before the chunk that would take it beyond the limit, unless that is its only one. Positions
// in the file are 64 bits; within a segment 32 bits.
class AviFile {
  public:
    struct Limits {
        int64_t segmentBytes = 1 << 30;
        int segments = 2048;  // each takes 16 bytes of the header for each stream
    };

    // All operations: false on failure, after which nothing more is written.
    bool open(QvBufStream& output, std::vector<AviTrack> tracks, const Limits& limits);
    // A chunk is begun with its length, put in any pieces, and ended. `units`: see AviTrack.
    bool beginChunk(size_t track, uint32_t bytes, int64_t units);
    bool put(const unsigned char* data, size_t bytes);
    bool endChunk();
    // Writes the last indexes and the headers as they have become.
    bool close();

    const AviTrack& track(size_t number) const { return tracks_[number]; }
    int errorCode() const { return errorCode_; }  // an errno value, 0 without a failure
    const char* problem() const { return problem_; }

  private:
    struct Entry {
        uint32_t track;
        uint32_t offset;  // of the chunk from the start of the segment
        uint32_t bytes;
    };

    bool fail(int code, const char* problem);
    bool putHead(const unsigned char* data, unsigned bytes);
    bool correct(int64_t position, const std::vector<unsigned char>& bytes);
    bool nextSegment();
    bool finishSegment();
    bool writeIndexes();
    bool writeOldIndex();
    int64_t indexBytes(size_t entries) const;
    std::vector<unsigned char> header() const;
    void putStream(class AviBytes& to, size_t number) const;
    static void putPictureShape(class AviBytes& to, const AviTrack& track);

    QvBufStream* output_ = nullptr;
    std::vector<AviTrack> tracks_;
    Limits limits_;
    int64_t position_ = 0;
    int64_t segmentStart_ = 0;
    int64_t moviStart_ = 0;  // of the four letters
    int segments_ = 0;
    uint32_t firstRiffBytes_ = 0;
    uint32_t firstMoviBytes_ = 4;
    int64_t firstUnits_ = 0;  // pictures of the first segment
    uint32_t chunkBytes_ = 0;
    std::vector<Entry> entries_;  // of this segment
    int errorCode_ = 0;
    const char* problem_ = "";
};
