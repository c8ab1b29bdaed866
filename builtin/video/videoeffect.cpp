#include "builtin/video/videoeffect.h"

#include "core/engine/log/qvlog.h"

namespace {

constexpr auto stateOpen = static_cast<QvCodec::State>(3);

}  // namespace

bool VideoEffect::opened() const { return getState() == stateOpen; }

bool VideoEffect::acceptsState(const AnyDict& dict) const {
    const Any& state = dict.get("state");
    const Any& owner = dict.get("name");
    if (owner == name() && (!state.isValid() || state.isDict())) return true;
    qv_dbg()->write("[%s] restore - invalid dict", tag_);
    if (owner != name()) qv_dbg()->write("Invalid state dict, module name is %s", owner.asString("n/a"));
    return false;
}

int VideoEffect::open() {
    ready_ = false;
    setState(stateOpen);
    return QvStatus::ok;
}

int VideoEffect::close() {
    ready_ = false;
    output_.destroy();
    setState(stateInitialised);
    return QvStatus::ok;
}

int VideoEffect::write(QvFrame& frame) {
    ready_ = false;
    if (!opened()) return setError(QvStatus::illegalState, "Not opened");
    if (!frame.inited()) return setError(QvStatus::invalidArgument, "an empty frame");
    const int result = fill(frame);
    ready_ = result == QvStatus::ok;
    return result;
}

int VideoEffect::next() {
    ready_ = false;
    return QvStatus::ok;
}
