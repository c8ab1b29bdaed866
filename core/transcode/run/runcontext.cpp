#include "core/transcode/run/runcontext_p.h"

#include "core/transcode/run/qvtranscoder.h"
#include "core/transcode/run/runcontrol_p.h"

namespace {

// Set while a callback runs, also when it throws.
struct CallbackScope {
    explicit CallbackScope(std::atomic<bool>& flag) : flag_(flag) { flag_ = true; }
    CallbackScope(const CallbackScope&) = delete;
    CallbackScope& operator=(const CallbackScope&) = delete;
    ~CallbackScope() { flag_ = false; }
    std::atomic<bool>& flag_;
};

}  // namespace

void RunContext::callProgress(double part) const {
    const CallbackScope inside(control.inCallback);
    transcoder.cbProgress(part);
}

void RunContext::callProcess() const {
    const CallbackScope inside(control.inCallback);
    if (transcoder.cbProcess() != 0) control.stopLoop();
}

bool RunContext::callMeasure(double part) const {
    transcoder.cbMeasure(part);
    return !control.stopping();
}

void RunContext::waitWhilePaused() const {
    control.waitWhilePaused([this](bool paused) { transcoder.cbPaused(paused); });
}
