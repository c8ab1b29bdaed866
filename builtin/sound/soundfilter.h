// What the sound filters share: one output buffer, to which each write adds and from whose head the reader
// takes, and parameters that are rows over typed settings.
//
// Between the first and the last stage of a chain a sample is a 32-bit integer in the range of 24 bits: full
// scale is 2^23, and the eight bits above it are headroom.
#pragma once

#include <span>

#include "core/engine/modules/params.h"
#include "core/filter/qvfilter.h"
#include "core/measure/qvgeometry.h"
#include "core/media/qvpcm.h"

// Lifecycle and hand-over. A filter goes created (1), init (2), open (3), close (2).
class SoundFilter : public QvAudioFilter {
  public:
    int open() override;
    int close() override;  // the output goes with its memory
    int samples() const override { return output_.samples(); }
    QvPcm* pcm() override { return &output_; }
    int erase(int n) override { return output_.erase(n); }
    // "_maxChannels": how many channels the filter works on, for those that leave others silent or refuse
    // them.
    void getParam(const char* name, Any& value) const override;

    using QvAudioFilter::getParam;

  protected:
    // `tag`: static text before the filter's line about missing memory, such as "adelay::writepcm".
    explicit SoundFilter(const char* tag) : tag_(tag) {}

    bool opened() const;
    // The assertions "Not inited" and "Not opened", the latter for samples of 4 bytes also "Only 32 bit
    // samples supported".
    void requireInited() const;
    void requireOpened() const;
    void requireWide(const QvPcm& pcm) const;
    // Adds `count` samples, whose contents are the caller's to fill, after those that wait in a buffer. The
    // first call gives it its format, which must stay. The place of the first one goes to `room`, null for
    // none. 0, -3 without memory or -1 for another format, with a text; the buffer keeps what it had then.
    int makeRoom(QvPcm& buffer, const QvPcmFormat& format, int count, unsigned char*& room);
    int makeRoom(const QvPcmFormat& format, int count, unsigned char*& room) {
        return makeRoom(output_, format, count, room);
    }
    // The same for as many values of 32 bits as `like` has samples, of `channels` channels at its rate.
    int makeWideRoom(const QvPcm& like, int channels, int32_t*& room);
    virtual int maxChannels() const { return 0; }  // 0: any number
    // Warns, once after each open, of channels that the filter leaves silent.
    void warnOfSilence(int channels);

    QvPcm output_;

  private:
    const char* tag_;
    bool warned_ = false;
};

// The same with parameters: `rows` is the constexpr table of the settings. What is stored is each filter's
// own.
template <class Settings>
class SoundFilterOf : public SoundFilter {
  public:
    using Rows = std::span<const QvParamRow<Settings>>;

    int init() override {
        settings_ = {};
        return SoundFilter::init();
    }
    // Asserts "Not inited" for a parameter of a row.
    int setParam(const char* name, const Any& value) override {
        if (getState() == stateCreated && qvFindParamRow<Settings>(rows_, name)) requireInited();
        if (const auto result = _setRow<Settings>(rows_, settings_, name, value)) return *result;
        return SoundFilter::setParam(name, value);
    }
    void getParam(const char* name, Any& value) const override {
        if (!qvGetParamRow<Settings>(rows_, settings_, name, value)) SoundFilter::getParam(name, value);
    }

    using SoundFilter::getParam;

  protected:
    SoundFilterOf(const char* tag, Rows rows) : SoundFilter(tag), rows_(rows) {}

    Settings settings_;
    const Rows rows_;
};
