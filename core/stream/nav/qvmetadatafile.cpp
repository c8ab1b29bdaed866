#include "core/stream/nav/qvmetadatafile.h"

#include <cstdint>

#include "core/arch/qvassert.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/stream/auxinfoid.h"
#include "core/stream/nav/metadatarecord_p.h"

struct QvMetadataFile::Holder {
    metadata_storage* record = nullptr;

    Holder() = default;
    Holder(const Holder&) = delete;
    Holder& operator=(const Holder&) = delete;
    ~Holder() { end(0); }
    void end(int abort) {
        if (!record) return;
        record->auxinfo(record, 0, QvAuxId::METADATA_DELETE_AT_END, nullptr, 0);
        record->done(record, abort);
        record->free(record);
        record = nullptr;
    }
};

QvMetadataFile::QvMetadataFile() = default;
QvMetadataFile::QvMetadataFile(const QvMetadataFile&) = default;
QvMetadataFile& QvMetadataFile::operator=(const QvMetadataFile&) = default;
QvMetadataFile::~QvMetadataFile() { destroy(0); }

int QvMetadataFile::init(const Any& name, bool dummy) {
    destroy(0);
    name_ = name;
    dummy_ = dummy;
    const std::string text = qv_os_name(name);
    if (dummy) {
        qv_dbg()->debug("new dummy metadata filename is %s", text.c_str());
        inited_ = true;
        return 0;
    }
    holder_ = std::make_shared<Holder>();
    holder_->record = metadataRecordNew(qv_wide_name(text), nullptr);
    qv_dbg()->debug("XXX new metadata object %x filename is %s",
                    static_cast<unsigned>(reinterpret_cast<uintptr_t>(holder_->record)), text.c_str());
    QV_ASSERT(holder_->record);
    inited_ = true;
    return 0;
}

void QvMetadataFile::destroy(int abort) {
    if (!inited_) return;
    if (holder_) holder_->end(abort);
    holder_.reset();
    inited_ = false;
}

metadata_storage* QvMetadataFile::metadata() const {
    if (!inited_) qv_dbg()->debug("metadata not inited!!!!!!!!!!!!!!!!!!");
    return holder_ ? holder_->record : nullptr;
}
