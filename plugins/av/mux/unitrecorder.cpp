#include "plugins/av/mux/unitrecorder.h"

#include <cstring>

#include "core/arch/qvassert.h"
#include "core/engine/status.h"
#include "plugins/av/mux/unitlog.h"
#include "plugins/av/mux/unitstream.h"

namespace av {

UnitRecorder::UnitRecorder() = default;

UnitRecorder::~UnitRecorder() { end(); }

void UnitRecorder::getParam(const char* name, Any& value) const {
    constexpr int most = 0xFFFF;
    if (std::strcmp(name, "maxStreams") == 0)
        value = AnyDict("vids", most, "auds", most, "subs", 0, "total", most);
    else
        BaseMuxer::getParam(name, value);
}

void UnitRecorder::store(AnyDict& state) const {
    state.clear();
    state.set("name", name());
}

int UnitRecorder::restore(const AnyDict& state) {
    return state.get("name") == name() ? QvStatus::ok : setError(QvStatus::failed, "restore - invalid name");
}

QvBufStream* UnitRecorder::addStream(int type, const AnyDict& params) {
    if (type != qvVideoStream && type != qvAudioStream) return nullptr;
    auto made = std::make_unique<UnitStream>(this);
    made->setParamDict(params);
    return keep(type, std::move(made));
}

template <class Do>
void UnitRecorder::forAll(Do&& what) {
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int nr = 0; nr < nrStreams(type); ++nr)
            what(static_cast<UnitStream&>(*stream(type, nr)), type, nr);
}

int UnitRecorder::open() {
    QV_ASSERT_MSG(anyEnabled(), "No enabled streams - use QvTranscoder::link()");
    QV_ASSERT_MSG(outStream(), "Output not set");
    log_ = std::make_unique<UnitLog>(*outStream());
    int result = QvStatus::ok;
    forAll([&](UnitStream& to, int type, int nr) {
        if (!to.enabled() || result != QvStatus::ok) return;
        to.setParam("outfilename", outStream()->getParam("outfilename"));
        result = to.begin(*log_, type, nr);
    });
    setState(qvStateOpen);
    if (result == QvStatus::ok) return result;
    end();
    return setError(result, "Failed to init bufstream object");
}

int UnitRecorder::close() {
    if (getState() != qvStateOpen) return QvStatus::ok;
    bool whole = true;
    forAll([&](UnitStream& from, int, int) { whole = from.finish() && whole; });
    const int result =
        whole && log_->finish() ? QvStatus::ok : setError(QvStatus::failed, "%s", log_->problem().c_str());
    end();
    return result;
}

int UnitRecorder::abort() {
    end();
    return QvStatus::ok;
}

void UnitRecorder::end() {
    forAll([](UnitStream& of, int, int) { of.destroy(1); });
    log_.reset();
    if (getState() == qvStateOpen) setState(stateInitialised);
}

}  // namespace av
