// The pipe of pictures of several views (module "mvprocess"): one chain of filters for each view.
//
// The filters that are added are those of view 0. With "nrViews" (Int32, 1 to 16) and "jobDescription" (a
// pointer to a VideoJobDescription, used in the next open only) the first open builds the chains of the other
// views anew for the same job. Each frame that is written has at least that many views; further ones are left
// out. Frames come out with their views linked, when every view is ready. What asks for a filter gets that of
// view 0; after open no filter can be added. A chain's failure is the pipe's, with the number of the view.
#pragma once

#include <memory>
#include <vector>

#include "core/filter/qvprocesspipe.h"
#include "core/value/ptrlist.h"

struct VideoJobDescription;

class MVProcessPipe : public QvVProcessPipe {
  public:
    static constexpr int maxViews = 16;

    explicit MVProcessPipe(const QvModule* module = nullptr);
    MVProcessPipe(const MVProcessPipe&) = delete;
    MVProcessPipe& operator=(const MVProcessPipe&) = delete;
    ~MVProcessPipe() override;

    using QvVProcessPipe::getParam;
    using QvVProcessPipe::process;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    int init() override;
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
    int nrFilters() const override;
    unsigned framesIn() const override;
    unsigned framesOut() const override;
    QvVideoFilter* filter(const char* name, int index) const override;

  private:
    using Chains = std::vector<std::unique_ptr<QvVProcessPipe>>;

    Chains chains_;  // of view 0, 1, ...; never empty
    int nrViews_ = 1;
    const VideoJobDescription* job_ = nullptr;
    TPtrList<QvFrame> out_;

    QvVProcessPipe& first() const { return *chains_.front(); }
    int makeChains();
    bool hasViews(const QvFrame& frame);
    int noted(int result, std::size_t view);
};
