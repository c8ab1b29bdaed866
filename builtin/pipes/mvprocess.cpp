#include "builtin/pipes/mvprocess.h"

#include <algorithm>
#include <cstring>

#include "builtin/creators.h"
#include "builtin/pipes/qvvideopipe.h"
#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/modules/params.h"
#include "core/engine/status.h"
#include "core/filter/qvprocessutil.h"
#include "core/job/jobdescription.h"
#include "core/media/qvbuffer.h"
#include "core/transcode/link/video/totalframes_p.h"

namespace {

constexpr auto stateOpen = static_cast<QvCodec::State>(3);

struct Described {};
constexpr QvParamRow<Described> rows[] = {
    {.name = "nrViews",
     .flags = qvParamByHand,
     .min = 1,
     .max = MVProcessPipe::maxViews,
     .help = "views of a frame",
     .type = Any::Int32},
    {.name = "jobDescription",
     .flags = qvParamByHand | qvParamWriteOnly,
     .help = "a VideoJobDescription, for the next open",
     .type = Any::Generic},
};
static_assert(qvParamTableOk<Described>(rows));

}  // namespace

MVProcessPipe::MVProcessPipe(const QvModule* module) : QvVProcessPipe(module) {
    chains_.push_back(std::make_unique<QvVf>());
}

MVProcessPipe::~MVProcessPipe() {
    if (getState() == stateOpen) MVProcessPipe::close();
}

int MVProcessPipe::setParam(const char* name, const Any& value) {
    if (std::strcmp(name, "nrViews") == 0) {
        int views = 0;
        if (!qvparam::convert(value, views) || views < 1 || views > maxViews)
            return setError(QvStatus::invalidParam, "'nrViews' takes 1 to %d", maxViews);
        if (getState() == stateOpen) return setError(QvStatus::illegalState, "'nrViews' is set before open");
        if (views != nrViews_) chains_.resize(1);
        nrViews_ = views;
        return QvStatus::ok;
    }
    if (std::strcmp(name, "jobDescription") == 0) {
        if (!value.isGeneric()) return QvStatus::invalidParam;
        job_ = static_cast<const VideoJobDescription*>(value.asGeneric(nullptr));
        return QvStatus::ok;
    }
    // Those of view 0 are reached through the pipe.
    if (std::strcmp(name, qvTotalFramesOfViews) == 0) {
        if (!value.isVector() || value.asVector().size() != 2) return QvStatus::invalidParam;
        const AnyVector& totals = value.asVector();
        for (std::size_t view = 1; view < chains_.size(); ++view)
            qvSetTotalFrames(*chains_[view], totals.at(0).toInt64(), totals.at(1).toInt64());
        return QvStatus::ok;
    }
    return QvVProcessPipe::setParam(name, value);
}

void MVProcessPipe::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "nrViews") == 0)
        value = nrViews_;
    else if (!qvGetParamRow<Described>(rows, Described{}, name, value))
        QvVProcessPipe::getParam(name, value);
}

int MVProcessPipe::init() {
    if (getState() == stateCreated)
        for (const auto& chain : chains_)
            if (const int result = chain->init(); result != QvStatus::ok) return result;
    return QvVProcessPipe::init();
}

// A filter can't be copied with all that it was given, but the job makes it once more.
int MVProcessPipe::makeChains() {
    while (static_cast<int>(chains_.size()) < nrViews_) {
        if (!job_) return setError(QvStatus::illegalState, "no job for the chains of further views");
        std::unique_ptr<QvVProcessPipe> chain(QvProcessUtil::createVideoPipeAux(*job_, nullptr, true));
        if (!chain || chain->nrFilters() != first().nrFilters())
            return setError(QvStatus::failed, "the job makes other filters than the pipe has");
        chains_.push_back(std::move(chain));
    }
    return QvStatus::ok;
}

int MVProcessPipe::open() {
    if (getState() == stateOpen) return QvStatus::ok;
    setError(QvStatus::ok);
    const int made = makeChains();
    job_ = nullptr;
    if (made != QvStatus::ok) return made;
    for (std::size_t view = 0; view < chains_.size(); ++view)
        if (const int result = chains_[view]->open(); result != QvStatus::ok) return noted(result, view);
    out_.clear();
    for (std::size_t view = 0; view < chains_.size(); ++view) out_.append(nullptr);
    setState(stateOpen);
    return QvStatus::ok;
}

int MVProcessPipe::close() {
    int result = QvStatus::ok;
    for (std::size_t view = 0; view < chains_.size(); ++view) result |= noted(chains_[view]->close(), view);
    setState(stateInitialised);
    return result;
}

// As of the chains: the first failure stays to be asked for.
int MVProcessPipe::noted(int result, std::size_t view) {
    const QvVProcessPipe& chain = *chains_[view];
    if (chain.errorCode() != QvStatus::ok && errorCode() == QvStatus::ok)
        setError(chain.errorCode(), "view %d: %s", static_cast<int>(view) + 1, chain.errorDesc());
    return result;
}

bool MVProcessPipe::hasViews(const QvFrame& frame) {
    const QvFrame* view = &frame;
    int given = 0;
    for (; view && given < nrViews_; view = view->nextView()) ++given;
    if (given < nrViews_) setError(QvStatus::failed, "a frame has %d views, not %d", given, nrViews_);
    return given == nrViews_;
}

int MVProcessPipe::write(QvFrame& frame) {
    if (!hasViews(frame)) return errorCode();
    int result = QvStatus::ok;
    QvFrame* view = &frame;
    for (std::size_t i = 0; i < chains_.size(); ++i) {
        // The link is read first: a filter may write into the frame that it gets.
        QvFrame* following = view->nextView();
        result |= noted(chains_[i]->write(*view), i);
        view = following;
    }
    return result;
}

int MVProcessPipe::ready() const {
    int count = first().ready();
    for (const auto& chain : chains_) count = std::min(count, chain->ready());
    return count;
}

QvFrame* MVProcessPipe::frame() {
    if (out_.size() != static_cast<int>(chains_.size())) return nullptr;
    for (std::size_t view = 0; view < chains_.size(); ++view) {
        QvFrame* frame = chains_[view]->frame();
        if (!frame) return nullptr;
        out_.set(static_cast<int>(view), frame);
    }
    QvFrame_linkViews(out_);
    return out_[0];
}

int MVProcessPipe::next() {
    int result = QvStatus::ok;
    for (std::size_t view = 0; view < chains_.size(); ++view) result |= noted(chains_[view]->next(), view);
    return result;
}

int MVProcessPipe::process(QvDecodePipe* decoder, int stream) {
    for (;;) {
        std::size_t starved = 0;
        for (std::size_t view = 0; view < chains_.size(); ++view) {
            const int result = chains_[view]->process(nullptr, 0);
            if (result == QvStatus::needsInput)
                ++starved;
            else if (result != QvStatus::ok)
                return noted(result, view);
        }
        if (starved == 0) return QvStatus::ok;
        // Equal chains make equal numbers of frames; to write on would lose one.
        if (starved != chains_.size())
            return setError(QvStatus::failed, "the chains of the views made different numbers of frames");
        if (!decoder) return QvStatus::needsInput;
        if (const int result = decoder->readFrame(stream); result != QvStatus::ok) return result;
        QvFrame* frame = decoder->getFramePtr(stream);
        if (!frame) return setError(QvStatus::failed, "the decoder gave no frame");
        if (!hasViews(*frame)) return errorCode();
        write(*frame);
    }
}

int MVProcessPipe::addFilter(QvVideoFilter* filter, int position) {
    if (chains_.size() > 1) {
        const std::unique_ptr<QvVideoFilter> owned(filter);
        return setError(QvStatus::illegalState, "the chains of the views are made");
    }
    return first().addFilter(filter, position);
}

int MVProcessPipe::removeFilter(int position) {
    int result = QvStatus::ok;
    for (const auto& chain : chains_) result |= chain->removeFilter(position);
    return result;
}

int MVProcessPipe::clear() {
    int result = QvStatus::ok;
    for (const auto& chain : chains_) result |= chain->clear();
    return result;
}

QvVideoFilter* MVProcessPipe::filter(int position) const { return first().filter(position); }
int MVProcessPipe::nrFilters() const { return first().nrFilters(); }
unsigned MVProcessPipe::framesIn() const { return first().framesIn(); }
unsigned MVProcessPipe::framesOut() const { return first().framesOut(); }
QvVideoFilter* MVProcessPipe::filter(const char* name, int index) const {
    return first().filter(name, index);
}

QvCodec* newMvprocess() { return new MVProcessPipe; }
