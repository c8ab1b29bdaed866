// The audio processing pipe (module "aprocess"): a row of filters and the output buffer that the link takes
// its samples from.
#pragma once

#include <deque>
#include <memory>
#include <vector>

#include "core/filter/qvprocesspipe.h"
#include "core/media/qvbuffer.h"

class QvAf : public QvAProcessPipe {
  public:
    explicit QvAf(const QvModule* module = nullptr);
    QvAf(const QvAf&) = delete;
    QvAf& operator=(const QvAf&) = delete;
    ~QvAf() override;

    int init() override;
    int open() override;
    int close() override;

    int write(QvPcm& pcm) override;
    int samples() const override { return outputInited_ ? output_.samples() : 0; }
    QvPcm* pcm() override { return &output_; }
    int erase(int n) override;

    int addFilter(QvAudioFilter* filter, int position) override;
    int process(QvDecodePipe* decoder, int stream, int samples) override;
    int removeFilter(int position) override;
    int clear() override;
    QvAudioFilter* filter(int position) const override;
    int nrFilters() const override { return static_cast<int>(filters_.size()); }
    long long samplesIn() const override { return samplesIn_; }
    long long samplesOut() const override { return samplesOut_; }
    QvAudioFilter* filter(const char* name, int index) const override;

    using QvAProcessPipe::process;

  private:
    struct Member {
        std::unique_ptr<QvAudioFilter> filter;
        bool isRateConverter = false;
        int wanted = 0;  // the last "splsToGet" that was set
    };

    bool validPosition(int position) const;
    std::size_t lastFilled() const;
    void askRateConverter(Member& member, int missing);
    int moveOn(std::size_t from, int missing);
    int takeOutput(QvPcm& pcm);
    int inputFor(int missing) const;
    int readInput(QvDecodePipe& decoder, int stream, int missing, bool& eof);
    int writeSilence(int missing);
    // Whether the first `taken` samples of the output go beyond the end of the input.
    bool isPadded(int taken) const;
    void noteFormat(const QvPcm& pcm);
    int give(QvPcm& pcm, int missing);

    std::deque<Member> filters_;
    double readRatio_ = 1.0;  // input samples for one output sample
    QvPcm output_;
    bool outputInited_ = false;
    QvPcmFormat inFormat_;  // as last seen; zeros before
    QvPcm silence_;         // of the input's format, for the end of the input
    long long samplesIn_ = 0;
    long long samplesRead_ = 0;  // of the input, without silence after it
    long long samplesOut_ = 0;
};
