#include "builtin/pipes/qvvideopipe.h"

#include <string>

#include "builtin/creators.h"
#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/moduletraits_p.h"
#include "core/engine/status.h"

namespace {

constexpr auto stateOpen = static_cast<QvCodec::State>(3);
constexpr std::size_t noGroup = static_cast<std::size_t>(-1);

// A converter that repeats frames would let an in-place filter work on the same picture twice.
bool mayFollow(const QvVideoFilter& last, const QvVideoFilter& filter) {
    if (!filter.applySupported()) return false;
    return !qvModuleTraits(last).repeatsFrames || last.getParam("_safeToApplyAfter").isTrue();
}

}  // namespace

QvVf::QvVf(const QvModule* module) : QvVProcessPipe(module) {}

QvVf::~QvVf() {
    if (getState() == stateOpen) QvVf::close();
}

int QvVf::init() {
    if (getState() != stateCreated) return QvCodec::init();  // which refuses
    for (const auto& filter : filters_) {
        if (filter->getState() != stateCreated) continue;
        if (const int result = filter->init()) return result;
    }
    return QvCodec::init();
}

int QvVf::open() {
    if (getState() == stateOpen) return QvStatus::ok;
    for (const auto& filter : filters_) {
        if (const int result = filter->open()) {
            qv_dbg()->write("[video pipe] open error");
            const bool noMemory = filter->errorCode() == QvStatus::outOfMemory;
            return setError(noMemory ? QvStatus::outOfMemory : result, "%s: %s", filter->name(),
                            filter->errorDesc());
        }
    }
    formGroups();
    setState(stateOpen);
    setError(QvStatus::ok);
    framesIn_ = 0;
    framesOut_ = 0;
    held_.frameNr = -1;
    logGroups();
    return QvStatus::ok;
}

void QvVf::formGroups() {
    groups_.clear();
    for (const auto& filter : filters_) {
        if (groups_.empty() || !mayFollow(*groups_.back().back(), *filter)) groups_.emplace_back();
        groups_.back().push_back(filter.get());
    }
}

void QvVf::logGroups() const {
    std::string line = "VideoProcessingPipe: ";
    for (std::size_t i = 0; i < groups_.size(); ++i) {
        if (i > 0) line += "->";
        for (std::size_t j = 0; j < groups_[i].size(); ++j) {
            if (j > 0) line += ":";
            line += groups_[i][j]->name();
        }
    }
    qv_dbg()->write("%s", line.c_str());
}

int QvVf::close() {
    int result = QvStatus::ok;
    for (const auto& filter : filters_) result |= noted(filter->close(), *filter);
    held_.destroy();
    setState(stateInitialised);
    groups_.clear();
    return result;
}

// The first failure or warning is kept as the pipe's error; frames continue without what the filter should
// have done to them.
int QvVf::noted(int result, const QvVideoFilter& filter) {
    if (result != QvStatus::ok && result != QvStatus::warning && errorCode() == QvStatus::ok)
        setError(result, "%s: %s", filter.name(), *filter.errorDesc() ? filter.errorDesc() : "it failed");
    return result;
}

// The members after the head work on the frame that the head has ready.
int QvVf::applyMembers(const Group& group) {
    int result = QvStatus::ok;
    if (group.size() == 1 || group.front()->ready() <= 0) return result;
    QvFrame& frame = *group.front()->frame();
    for (std::size_t i = 1; i < group.size(); ++i) result |= noted(group[i]->apply(frame), *group[i]);
    return result;
}

int QvVf::give(const Group& group, QvFrame& frame) {
    // A head with an unread frame would lose it.
    if (group.front()->ready() > 0) qvAssertFail("builtin/qvvideopipe(362)", nullptr);
    const int result = noted(group.front()->write(frame), *group.front());
    return result | applyMembers(group);
}

int QvVf::write(QvFrame& frame) {
    if (filters_.empty()) {
        if (held_.copy(frame) != QvStatus::ok)
            return setError(QvStatus::outOfMemory, "no memory for a frame of %dx%d", frame.width(),
                            frame.height());
        ++framesIn_;
        return QvStatus::ok;
    }
    if (frame.four_cc() == 0) return QvStatus::ok;
    if (groups_.empty()) return setError(QvStatus::illegalState, "the pipe is not open");
    ++framesIn_;
    return give(groups_.front(), frame);
}

int QvVf::ready() const {
    if (filters_.empty()) return held_.frameNr != -1 ? 1 : 0;
    return groups_.empty() ? 0 : groups_.back().front()->ready();
}

QvFrame* QvVf::frame() {
    if (filters_.empty()) return &held_;
    return groups_.empty() ? nullptr : groups_.back().front()->frame();
}

int QvVf::next() {
    if (filters_.empty()) {
        held_.frameNr = -1;
        return QvStatus::ok;
    }
    if (groups_.empty()) return QvStatus::ok;
    const int result = groups_.back().front()->next();
    applyMembers(groups_.back());
    return result;
}

std::size_t QvVf::lastReadyGroup() const {
    for (std::size_t i = groups_.size(); i-- > 0;)
        if (groups_[i].front()->ready() > 0) return i;
    return noGroup;
}

// Moves the ready frame of a group into the next group.
void QvVf::handOver(std::size_t group) {
    auto* head = groups_[group].front();
    const int before = ready();
    if (give(groups_[group + 1], *head->frame()) != QvStatus::ok)
        qv_dbg()->error("filter returned an error in write");
    framesOut_ += static_cast<unsigned>(ready() - before);
    head->next();
    applyMembers(groups_[group]);
}

int QvVf::process(QvDecodePipe* decoder, int stream) {
    if (groups_.empty()) return QvStatus::failed;
    for (;;) {
        const std::size_t group = lastReadyGroup();
        if (group + 1 == groups_.size()) return QvStatus::ok;
        if (group != noGroup) {
            handOver(group);
            continue;
        }
        if (!decoder) return QvStatus::needsInput;
        if (const int result = decoder->readFrame(stream)) return result;
        auto* frame = decoder->getFramePtr(stream);
        if (!frame) return setError(QvStatus::failed, "the decoder gave no frame");
        write(*frame);
    }
}

bool QvVf::validPosition(int position) const { return position >= 0 && position < nrFilters(); }

int QvVf::addFilter(QvVideoFilter* filter, int position) {
    std::unique_ptr<QvVideoFilter> owned(filter);
    filters_.insert(validPosition(position) ? filters_.begin() + position : filters_.end(), std::move(owned));
    return QvStatus::ok;
}

int QvVf::removeFilter(int position) {
    QV_ASSERT_MSG(validPosition(position), "unknown pos");
    filters_.erase(filters_.begin() + position);
    if (getState() == stateOpen) formGroups();
    return QvStatus::ok;
}

int QvVf::clear() {
    groups_.clear();
    filters_.clear();
    return QvStatus::ok;
}

QvVideoFilter* QvVf::filter(int position) const {
    return validPosition(position) ? filters_[static_cast<std::size_t>(position)].get() : nullptr;
}

QvVideoFilter* QvVf::filter(const char* name, int index) const {
    for (const auto& filter : filters_)
        if (Any(filter->name()) == name && index-- == 0) return filter.get();
    return nullptr;
}

QvCodec* newVprocess() { return new QvVf; }
