// The video processing pipe (module "vprocess"): a row of filters through which frames are moved, from the
// end of the chain forward, so that at most one frame a group is under way.
//
// A filter that fails to write, apply or close does not stop the others. The first such failure since open is
// the pipe's errorCode and errorDesc, with the filter's name, until it is opened again.
//
// A group is a head, which is written to and produces frames, and the filters after it, which work in place
// on each frame that leaves the head.
#pragma once

#include <deque>
#include <memory>
#include <vector>

#include "core/filter/qvprocesspipe.h"
#include "core/media/qvbuffer.h"

class QvVf : public QvVProcessPipe {
  public:
    explicit QvVf(const QvModule* module = nullptr);
    QvVf(const QvVf&) = delete;
    QvVf& operator=(const QvVf&) = delete;
    ~QvVf() override;

    int init() override;
    // Opens the filters and forms the groups. After a failure the filters opened so far stay open until
    // close.
    int open() override;
    int close() override;

    int write(QvFrame& frame) override;
    int ready() const override;
    QvFrame* frame() override;
    int next() override;

    int addFilter(QvVideoFilter* filter, int position) override;
    int process(QvDecodePipe* decoder, int stream) override;
    int removeFilter(int position) override;
    int clear() override;
    QvVideoFilter* filter(int position) const override;
    int nrFilters() const override { return static_cast<int>(filters_.size()); }
    unsigned framesIn() const override { return framesIn_; }
    unsigned framesOut() const override { return framesOut_; }
    QvVideoFilter* filter(const char* name, int index) const override;

    using QvVProcessPipe::process;

  private:
    using Group = std::vector<QvVideoFilter*>;  // not owned; the head first

    bool validPosition(int position) const;
    void formGroups();
    void logGroups() const;
    int noted(int result, const QvVideoFilter& filter);
    int applyMembers(const Group& group);
    int give(const Group& group, QvFrame& frame);
    std::size_t lastReadyGroup() const;
    void handOver(std::size_t group);

    std::deque<std::unique_ptr<QvVideoFilter>> filters_;
    std::vector<Group> groups_;
    QvFrame held_;  // passes through while there is no filter; held while its number is not -1
    unsigned framesIn_ = 0;
    unsigned framesOut_ = 0;
};
