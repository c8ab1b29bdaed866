// The contracts of a pipe: a row of filters that is a filter itself, so that it can stand wherever one can.
//
// Positions: 0 is the front. Any position outside 0 to count - 1 means the end when a filter is added, and no
// filter when one is asked for; removing at such a position asserts "unknown pos".
#pragma once

#include "core/filter/qvfilter.h"

class QvDecodePipe;

class QV_API QvVProcessPipe : public QvVideoFilter {
  public:
    using QvVideoFilter::QvVideoFilter;

    // A new pipe of the module `vprocess`, owned by the caller; null without such a module.
    static QvVProcessPipe* create();

    // Inserts the filter before the position and takes ownership of it. 0.
    virtual int addFilter(QvVideoFilter* filter, int position) = 0;
    // Moves frames until an output frame is ready (0). With a null decoder the result is -19 when the pipe
    // needs input; with one, frames of that video stream are read, and a status of the decoder other than 0
    // is returned unchanged.
    virtual int process(QvDecodePipe* decoder, int stream) = 0;
    virtual int removeFilter(int position) = 0;  // deletes the filter; 0
    virtual int clear() = 0;                     // deletes all filters; 0
    virtual QvVideoFilter* filter(int position) const = 0;
    virtual int nrFilters() const = 0;
    virtual unsigned framesIn() const = 0;   // frames written since open
    virtual unsigned framesOut() const = 0;  // hand-overs that made the end of the chain ready, since open
    // The index-th filter, from 0, of that name, or null.
    virtual QvVideoFilter* filter(const char* name, int index) const = 0;

    using QvCodec::process;
};

class QV_API QvAProcessPipe : public QvAudioFilter {
  public:
    using QvAudioFilter::QvAudioFilter;

    // A new pipe of the module `aprocess`, owned by the caller; null without such a module.
    static QvAProcessPipe* create();

    virtual int addFilter(QvAudioFilter* filter, int position) = 0;  // as for video
    // Brings the output buffer up to `samples` samples, reading that audio stream as needed. 0; -4 when they
    // are there but go beyond the end of the input (what it lacked is silence); a filter's error as it
    // stands.
    virtual int process(QvDecodePipe* decoder, int stream, int samples) = 0;
    virtual int removeFilter(int position) = 0;
    virtual int clear() = 0;
    virtual QvAudioFilter* filter(int position) const = 0;
    virtual int nrFilters() const = 0;
    virtual long long samplesIn() const = 0;
    virtual long long samplesOut() const = 0;
    virtual QvAudioFilter* filter(const char* name, int index) const = 0;

    using QvCodec::process;
};
