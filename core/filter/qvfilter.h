// The contracts of video and audio filters: what stands between a decoder stream and an encoder stream.
//
// A filter goes: constructed, init (defaults), setParam, open, writes and reads, close; after close it can be
// opened again. It belongs to one link and is driven by that link's thread.
//
// Parameters that every filter has:
//   "_on"        int   1   the filter takes part; a chain builder skips a stored filter with 0
//   "_position"  int   0   order among the filters of its side; the first of a side has 1
//   "_front"     int   0   1: before the automatic converters, 0: after them
//   "info"       dict      read only: what store writes, without the three above
//
// A video filter that looks at the user data of frames answers 1 for "takesUserData": sources read them only
// if a filter or the encoder wants them.
#pragma once

#include "core/arch/api.h"
#include "core/engine/modules/qvcodec.h"
#include "core/value/anycontainer.h"

class QvFrame;
class QvPcm;

// Interface number 12.
class QV_API QvVideoFilter : public QvCodec {
  public:
    explicit QvVideoFilter(const QvModule* module = nullptr);

    int init() override;
    // Besides the common parameters, "_previewMode" and "_totalFrames" are accepted without effect.
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    int open() override = 0;
    int close() override = 0;
    void* getInterface(int kind) const override;
    // Adds "_on", "_position", "_front" and "name"; other keys of `dict` stay.
    void store(AnyDict& dict) const override;
    // Takes the three common keys where they are integers. -1, with a line in the debug log, unless "name" is
    // the filter's own.
    int restore(const AnyDict& dict) override;

    // Gives one input frame. The filter may keep no pointer to it beyond the call.
    virtual int write(QvFrame& frame) = 0;
    // Works on a frame in place; asserts unless applySupported.
    virtual int apply(QvFrame& frame);
    virtual bool applySupported() const { return false; }
    // How many output frames can be fetched now.
    virtual int ready() const = 0;
    // The current output frame, owned by the filter and valid until next or write.
    virtual QvFrame* frame() = 0;
    // Drops the current output frame and moves on to the next one, if any.
    virtual int next() = 0;

    using QvCodec::getParam;

  private:
    AnyDict common_;
};

// What an audio filter answers for "_needsReport": whether it is to get a Dict "_streamReport" before open,
// and which. With `loudness` the Dict also has the levels of the sound that reaches the filter, see
// QvProcessUtil::applyStreamReport.
namespace QvReportNeed {
constexpr int none = 0;
constexpr int peak = 1;
constexpr int loudness = 2;
}  // namespace QvReportNeed

// Interface number 13.
class QV_API QvAudioFilter : public QvCodec {
  public:
    explicit QvAudioFilter(const QvModule* module = nullptr);

    int init() override;
    // Besides the common parameters, "_previewMode", "_totalFrames" and "vf_base" are accepted without
    // effect.
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    int open() override = 0;
    int close() override = 0;
    void* getInterface(int kind) const override;
    void store(AnyDict& dict) const override;   // as QvVideoFilter::store
    int restore(const AnyDict& dict) override;  // as QvVideoFilter::restore

    // Gives all filled samples of `pcm`; the filter copies what it needs.
    virtual int write(QvPcm& pcm) = 0;
    // How many output samples lie ready, a sample being one value of every channel.
    virtual int samples() const = 0;
    // The output buffer, owned by the filter; its first samples() samples are the output.
    virtual QvPcm* pcm() = 0;
    // Drops the first n output samples.
    virtual int erase(int n) = 0;

    using QvCodec::getParam;

  private:
    AnyDict common_;
};
