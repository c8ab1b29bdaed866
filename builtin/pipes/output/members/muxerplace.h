// The end of an output: the sink and the multiplexer that writes into it. Either can be exchanged; the file
// name and the settings of earlier multiplexers are kept for the new one.
#pragma once

#include <memory>

#include "builtin/pipes/output/members/muxertraits.h"
#include "builtin/pipes/output/members/programlist.h"
#include "builtin/pipes/output/members/savedsettings.h"
#include "core/encode/qvmuxer.h"
#include "core/encode/qvsink.h"

class PipeHost;
class QvPreset;

class MuxerPlace {
  public:
    explicit MuxerPlace(PipeHost& host) : host_(host) {}
    ~MuxerPlace();
    MuxerPlace(const MuxerPlace&) = delete;
    MuxerPlace& operator=(const MuxerPlace&) = delete;

    QvMuxer* muxer() const { return muxer_.get(); }  // null before the first preset
    QvSink* sink() const { return sink_.get(); }
    const Any& sinkName() const { return sinkName_; }
    // Of the present multiplexer; the defaults without one.
    const MuxerTraits& traits() const { return traits_; }
    ProgramList programs() const { return ProgramList(muxer_.get()); }
    bool hasPrograms() const;
    // How many streams of the type can still be added; a missing multiplexer is an assertion.
    int room(int type, int ofThis, int inAll) const;

    // A new multiplexer; null when there is no such module, or it is of another kind.
    static std::unique_ptr<QvMuxer> newMuxer(const char* module);
    // Exchanges the sink. The multiplexer writes into the new one. A failure changes nothing.
    int setSink(const char* module);
    // Detaches and deletes the multiplexer; its settings are not kept.
    void drop();
    // Takes the multiplexer, which is not attached yet.
    void put(std::unique_ptr<QvMuxer> muxer);
    // Lets the multiplexer write into the sink.
    void attach();

    // What the multiplexer hands on to the one that replaces it. Its whole settings are kept for its return.
    struct Handover {
        Any type;
        Any pal;
        Any dropFrame;
    };
    Handover handOver();
    // The settings that a multiplexer of this name had here, else those of a user's preset, which must be of
    // the same module (assertion).
    void restoreSettings(const QvPreset& preset);

    // Sink and multiplexer get the name, now and, if it is valid, again with repeatFilename().
    int setFilename(const Any& name);
    void repeatFilename();
    // The sink's answer, else the name that was set.
    Any filename() const;

    // As qvOfferParam does; 0 without a multiplexer.
    int offer(const char* name, const Any& value) const;

  private:
    int offerFilename();

    PipeHost& host_;
    // In this order: the multiplexer goes before the sink whose stream it holds.
    std::unique_ptr<QvSink> sink_;
    std::unique_ptr<QvMuxer> muxer_;
    MuxerTraits traits_;  // of muxer_, read once
    Any sinkName_ = "filesink";
    Any filename_;
    SavedSettings saved_;
};
