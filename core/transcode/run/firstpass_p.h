// The first pass of a two-pass run: each video encoder that wants statistics encodes into nothing, through
// a private pipe, while a metadata file collects what it learns.
#pragma once

#include <memory>
#include <vector>

#include "core/transcode/run/runcontext_p.h"
#include "core/value/ptrlist.h"

class QvEncodePipe;
class TransLink;
class TransVLink;

class FirstPass {
  public:
    explicit FirstPass(const RunContext& run);
    FirstPass(const FirstPass&) = delete;
    FirstPass& operator=(const FirstPass&) = delete;
    ~FirstPass();

    // Fills the statistics and gives them to the encoders of the task; the inputs go back to where they were.
    // 0 also when no encoder wants two passes.
    int run();

  private:
    struct Link {
        std::unique_ptr<TransVLink> twin;  // into the private pipe
        TransLink* real;                   // the link that it stands for
    };

    int make(const TPtrList<TransLink>& wanted);
    int loop();
    int end();

    const RunContext& run_;
    std::unique_ptr<QvEncodePipe> pipe_;
    std::vector<Link> links_;
};
