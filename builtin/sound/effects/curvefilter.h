// What the filters with curves share: eight parameters that are lists of points, one for each of the first
// eight channels, and a position in the stream.
//
// A list is a Vector of Dicts, each with "time" (seconds) and "volume" (Int32, percent). Samples are 32 bits
// wide. Channels after the eighth stay silent.
#pragma once

#include "builtin/sound/effects/levelcurve.h"
#include "builtin/sound/soundfilter.h"

class CurveFilter : public SoundFilter {
  public:
    static constexpr int curveChannels = 8;
    struct Settings {};  // the lists are set by hand
    using Rows = std::span<const QvParamRow<Settings>, curveChannels>;

    int init() override;
    int open() override;
    // A list with an entry that is no point is refused and changes nothing. An invalid value is an empty
    // list.
    int setParam(const char* name, const Any& value) override;
    // The lists, and "paramSet", which describes them.
    void getParam(const char* name, Any& value) const override;
    void store(AnyDict& dict) const override;
    int restore(const AnyDict& dict) override;

    using SoundFilter::getParam;

  protected:
    // `rows`: the parameters in the order of the channels.
    explicit CurveFilter(Rows rows);

    // False, with nothing changed, for a list that the filter can't use; `why` is the reason then.
    virtual bool setList(int channel, const AnyVector& list, const char*& why) = 0;
    virtual AnyVector list(int channel) const = 0;

    int maxChannels() const override { return curveChannels; }

    static bool readPoint(const Any& entry, LevelCurve::Point& point);
    static AnyDict describePoint(const LevelCurve::Point& point);

    // Room for the samples of `pcm` with `channels` channels, all silent. A status.
    int begin(const QvPcm& pcm, int channels, int*& room);
    void finish(const QvPcm& pcm);
    // Of the next sample to be written, from 0 at open.
    long long position() const { return position_; }
    double secondsAt(const QvPcm& pcm, int sample) const {
        return static_cast<double>(position_ + sample) / pcm.samplerate();
    }

  private:
    const Rows rows_;
    long long position_ = 0;
};
