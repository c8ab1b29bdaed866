// Whether a film is all there: what its container announces, and what came.
#pragma once

#include <cstdint>

#include "plugins/av/source/fileextent.h"

struct AVFormatContext;
struct AVStream;

namespace av {

class PacketIndex;

class FilmLength {
  public:
    // `bytes` of the file. All outlive this.
    FilmLength(const AVFormatContext& container, const PacketIndex& index, long long bytes,
               const FileExtent& extent);

    // Something is missing: of the file, or of this stream.
    bool isCut(const AVStream& stream) const;
    // Pictures that are missing between others, where the file says that bytes are missing.
    long long lost(const AVStream& stream) const;
    // Frames or samples of the whole stream, at `rate` a second, of which `present` are there; 0 for unknown.
    // The first one is at `start` seconds on the clock of the container.
    long long announced(const AVStream& stream, double rate, long long present, double start) const;

  private:
    const AVFormatContext& container_;
    const PacketIndex& index_;
    long long bytes_;
    FileExtent extent_;
    bool cut_;  // the file

    bool is(const char* format) const;
    double seconds(const AVStream& stream) const;
    double taggedSeconds(const AVStream& stream) const;
    double present() const;
    bool endsEarly() const;
    long long missingPackets(const AVStream& stream) const;
    bool endsWithinPicture(const AVStream& stream) const;
    long long announcedSamples(const AVStream& stream) const;
};

}  // namespace av
