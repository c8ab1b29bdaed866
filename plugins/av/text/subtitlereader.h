// The text subtitles of one stream: when they are shown, from the index; what they say, when it is asked for.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "core/caption/subtitle/qvsubtitles.h"
#include "core/value/anycontainer.h"
#include "plugins/av/index/packetindex.h"

struct AVStream;

namespace av {

class SubtitleReader {
  public:
    // Those of SubRip, Advanced SubStation Alpha, WebVTT and QuickTime. Subtitles that are pictures are not.
    static bool isText(const AVStream& stream);
    // "SubRip" and so on.
    static const char* codecName(const AVStream& stream);

    // `zero` / `zeroBase` seconds: the film's time zero. `bytes` and `stream` outlive the call only.
    SubtitleReader(const MediaBytes& bytes, const std::string& format, const AVStream& stream,
                   std::shared_ptr<const PacketIndex> index, std::int64_t zero, std::int64_t zeroBase);

    int count() const { return count_; }
    MediaTime first() const { return first_; }  // starts of the first and the last; without any 0
    MediaTime last() const { return last_; }
    MediaTime end() const { return end_; }  // of the one that is shown longest

    // In the order of their starts, from the film's time zero on. The first call reads them, with a
    // demultiplexer of its own.
    QvSubtitles& subtitles();
    const std::string& failure() const { return failure_; }  // of reading; a part of a sentence
    int lost() const { return lost_; }                       // of those that were read: no valid text
    // Each a Dict of "start", "end" (MediaTime) and "text" (lines separated by "|").
    AnyVector entries();

  private:
    const MediaBytes& bytes_;
    std::string format_, failure_;
    int stream_;
    std::shared_ptr<const PacketIndex> index_;
    std::int64_t num_, den_;  // of the stream's time base
    std::int64_t origin_;     // ticks
    int count_ = 0, lost_ = 0;
    MediaTime first_, last_, end_;
    std::unique_ptr<QvSubtitles> read_;

    bool isEmpty(const IndexedPacket& packet) const;
    MediaTime time(std::int64_t pts) const;
    MediaTime endOf(std::size_t packet) const;
    bool readAll();
};

}  // namespace av
