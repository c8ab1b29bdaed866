#include "builtin/pipes/output/members/muxerplace.h"

#include <new>

#include "builtin/pipes/output/members/pipehost.h"
#include "core/arch/qvassert.h"
#include "core/encode/muxerlimits_p.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/preset/qvpreset.h"

bool MuxerPlace::hasPrograms() const {
    return muxer_ && static_cast<const QvCodec&>(*muxer_).getParam("programsSupported").isTrue();
}

int MuxerPlace::room(int type, int ofThis, int inAll) const {
    return qvStreamRoom(muxer_.get(), type, ofThis, inAll);
}

std::unique_ptr<QvMuxer> MuxerPlace::newMuxer(const char* module) {
    std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(module));
    if (!codec || !codec->getInterface(QvModuleType::muxer)) return nullptr;
    return std::unique_ptr<QvMuxer>(static_cast<QvMuxer*>(codec.release()));
}

int MuxerPlace::setSink(const char* module) {
    QV_ASSERT(module && *module);
    std::unique_ptr<QvCodec> fresh(qv_registry()->newCodec(module));
    if (!fresh || !fresh->getInterface(QvModuleType::sink))
        return host_.fail(QvStatus::failed, "[EncodePipe2] setSink: Invalid module %s", module);
    if (muxer_) muxer_->detachOutStream();
    sink_.reset(static_cast<QvSink*>(fresh.release()));
    sinkName_ = module;
    if (filename_.isValid()) qvOfferParam(*sink_, "filename", filename_);
    attach();
    return QvStatus::ok;
}

// What could not be reset for want of memory goes with its sink.
MuxerPlace::~MuxerPlace() {
    try {
        drop();
    } catch (const std::bad_alloc&) {
    }
}

void MuxerPlace::drop() {
    if (muxer_) muxer_->detachOutStream();
    muxer_.reset();
    traits_ = {};
}

void MuxerPlace::put(std::unique_ptr<QvMuxer> muxer) {
    muxer_ = std::move(muxer);
    traits_ = MuxerTraits::of(muxer_.get());
}

void MuxerPlace::attach() {
    if (muxer_ && sink_) muxer_->attachOutStream(sink_->stream());
}

MuxerPlace::Handover MuxerPlace::handOver() {
    Handover carried;
    saved_.keep(*muxer_);
    muxer_->getParam("type", carried.type);
    muxer_->getParam("pal", carried.pal);
    muxer_->getParam("dropFrameTC", carried.dropFrame);
    return carried;
}

void MuxerPlace::restoreSettings(const QvPreset& preset) {
    if (const AnyDict* before = saved_.of(muxer_->name())) {
        muxer_->restore(*before);
        return;
    }
    if (!preset.isCustom()) return;
    const AnyDict stored = preset.muxerParams();
    if (stored.empty()) return;
    if (!(stored.get("name") == muxer_->name())) {
        host_.fail(QvStatus::failed, "_setMuxer - stored muxer parameters don't match current muxer '%s'?",
                   muxer_->name());
        QV_FAIL(host_.lastFailure());
    }
    muxer_->restore(stored);
}

int MuxerPlace::setFilename(const Any& name) {
    filename_ = name;
    return offerFilename();
}

void MuxerPlace::repeatFilename() {
    if (filename_.isValid()) offerFilename();
}

int MuxerPlace::offerFilename() {
    const int result = sink_ ? qvOfferParam(*sink_, "filename", filename_) : QvStatus::ok;
    return result | offer("filename", filename_);
}

Any MuxerPlace::filename() const {
    Any name;
    if (sink_) sink_->getParam("filename", name);
    return name.isValid() ? name : filename_;
}

int MuxerPlace::offer(const char* name, const Any& value) const {
    return muxer_ ? qvOfferParam(*muxer_, name, value) : QvStatus::ok;
}
