// One audio stream of one segment: its samples from the in point on, converted to the output's format.
// Internal to this folder. Used like SegmentVideo.
#pragma once

#include <memory>
#include <string>

#include "core/decode/qvinputstream.h"
#include "core/job/jobdescription.h"
#include "core/transcode/batch/boundedsound_p.h"
#include "core/transcode/batch/segmentspan_p.h"

class QvAProcessPipe;
class QvPcm;

class SegmentAudio {
  public:
    explicit SegmentAudio(const QvIStream& input);
    ~SegmentAudio();

    const QvIStream& input() const { return input_; }
    SegmentSpan span(int outSamplerate) const;

    int prepare(const AudioJobDescription& output, const SegmentAudio* like, std::string& why);
    const SegmentSpan& span() const { return span_; }

    // `bounded`: the sound ends at the out point. Otherwise it is read on as long as samples are asked for.
    int start(bool bounded, std::string& why);
    // Appends up to n samples to `to`, which takes the format of the sound if it is empty. The stream has
    // ended when there were fewer. 0 or a failure.
    int read(int n, QvPcm& to, std::string& why);
    int stop(std::string& why);

    bool ended() const { return ended_; }
    // The source gave less than it said that it has, so there was silence too early.
    bool endedEarly() const { return sound_.endedEarly(); }
    void end() { ended_ = true; }
    long long samplesRead() const { return samplesRead_; }  // since start, silence included
    // Samples beyond full scale that the source has met since start.
    long long clipped() const;
    void count(int samples) { samplesRead_ += samples; }

  private:
    bool straight() const;
    int build(std::string& why);
    int openPipe(std::string& why);
    int append(const QvPcm& from, int n, QvPcm& to, std::string& why) const;
    void countClipping();

    QvIStream input_;
    AudioJobDescription job_;
    SegmentSpan span_;
    int samplerate_ = 0;  // of the input
    BoundedSound sound_;
    std::unique_ptr<QvAProcessPipe> pipe_;
    bool converts_ = false;
    bool started_ = false;
    bool measured_ = false;  // the filters have got levels of the whole segment; the pipe is kept for them
    MediaTime delay_;        // what is skipped at the start of the input
    bool ended_ = false;
    long long samplesRead_ = 0;
    long long first_ = 0, end_ = 0;  // of the source's samples, those that are taken
    bool counting_ = false;          // from the first read on: before it the source need not be open
    long long clipped_ = 0;          // when counting ended
};
