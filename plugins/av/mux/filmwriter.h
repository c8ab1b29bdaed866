// A container being written: streams, header, units by time, trailer.
#pragma once

#include <atomic>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "core/value/anycontainer.h"
#include "plugins/av/mux/muxtrack.h"
#include "plugins/av/mux/sinkbytes.h"
#include "plugins/av/source/optionlist.h"

class QvBufStream;

namespace av {

struct FilmJob {
    const Container* container = nullptr;
    const char* format = nullptr;  // the libraries' name
    std::string name;              // of the output, for messages
    std::string extension;
    bool seekable = true;   // the output takes corrections of what was written
    bool fastStart = true;  // the index goes to the front where it fits
    int frames = 0;         // of the film, as far as known; 0: not
    AnyDict meta;           // see setFilmWords
    std::string options;    // see parseMuxOptions
};

// Encoders may call from threads of their own. Every operation is false after a failure.
class FilmWriter {
  public:
    FilmWriter(QvBufStream& output, FilmJob job, std::vector<MuxTrack> tracks);
    ~FilmWriter();

    // The header is written when all tracks are ready; units that come before wait for it.
    template <class Head>
    bool head(std::size_t track, const Head& head) {
        const std::lock_guard lock(lock_);
        return !failed() && (tracks_[track].describe(head) || fail(tracks_[track].problem()));
    }
    bool unit(std::size_t track, PacketPtr unit);
    // The end of all streams: trailer and corrections.
    bool close();

    const MuxTrack& track(std::size_t number) const { return tracks_[number]; }
    // Raw sound may begin with the engine's header, which is no sound.
    bool hasSoundHeader() const { return job_.container->is(MuxTrait::soundHeader); }
    std::size_t tracks() const { return tracks_.size(); }
    long long written(std::size_t track) const { return written_[track]; }  // units
    bool fail(const std::string& problem);
    bool failed() const { return failed_; }
    // Of the first failure; the sink's own reason if it is one of the output.
    const std::string& problem() const { return problem_; }
    int outputError() const { return bytes_.error(); }  // of the system; 0 where the output took everything

  private:
    struct Free {
        void operator()(AVFormatContext* film) const { avformat_free_context(film); }
    };
    struct Waiting {
        std::size_t track;
        PacketPtr unit;
    };

    std::recursive_mutex lock_;
    FilmJob job_;
    SinkBytes bytes_;
    std::vector<MuxTrack> tracks_;
    std::vector<long long> written_;
    std::unique_ptr<AVFormatContext, Free> film_;
    std::vector<Waiting> waiting_;
    std::int64_t waitingBytes_ = 0;
    std::vector<PacketPtr> made_;
    bool begun_ = false;
    bool spaceKept_ = false;
    std::atomic<bool> failed_ = false;  // set after the problem, which does not change any more
    std::string problem_;

    bool beginIfReady();
    void chooseFormat();
    bool canJoin();
    bool losesFields() const;
    bool begin();
    bool addStream(MuxTrack& track);
    void setOptions(OptionList& options);
    long long indexBytes() const;
    double seconds() const;
    double startTime() const;
    bool putMade(std::size_t track);
    bool put(std::size_t track, AVPacket& unit);
    bool failWith(const char* what, int code);
};

}  // namespace av
