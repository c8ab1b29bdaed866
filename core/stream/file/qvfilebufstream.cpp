#include "core/stream/file/qvfilebufstream.h"

#include "core/arch/qvassert.h"
#include "core/arch/undo_p.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/stream/file/filereader_p.h"
#include "core/stream/file/filewriter_p.h"
#include "core/stream/file/nullrecord_p.h"
#include "core/stream/file/rwfile_p.h"
#include "core/stream/file/seekpatch_p.h"
#include "core/stream/observers_p.h"
#include "core/stream/recordof_p.h"

namespace {

constexpr int defaultSize = 0x800000;

QvWideString wideName(const Any& name) { return qv_wide_name(qv_os_name(name)); }

void tellObservers(void* stream, unsigned offset, unsigned id, void* info, unsigned size) {
    notifyObservers(static_cast<QvFileBufStream*>(stream)->observers(), offset, id, info, size);
}

// The patch record opens the file again, so the file is closed first.
void finish(bufstream*& record, int abort) {
    if (!record) return;
    record->done(record, abort);
    record->free(record);
    record = nullptr;
}

}  // namespace

struct QvFileBufStream::Records {
    bufstream* file = nullptr;
    bufstream* patch = nullptr;
    bool writing = false;

    Records() = default;
    Records(const Records&) = delete;
    Records& operator=(const Records&) = delete;
    ~Records() { end(0); }
    void end(int abort) {
        finish(file, abort);
        finish(patch, abort);
    }
};

QvFileBufStream::QvFileBufStream(QvCodec* owner) : QvBufStream(owner) {}
QvFileBufStream::QvFileBufStream(const QvFileBufStream&) = default;
QvFileBufStream& QvFileBufStream::operator=(const QvFileBufStream&) = default;
QvFileBufStream::~QvFileBufStream() { QvFileBufStream::destroy(0); }

int QvFileBufStream::init(const AnyDict& newParams) {
    QvBufStream::init(newParams);
    records_ = std::make_shared<Records>();
    Undo closing([this] { records_.reset(); });
    const int size = int32Param("size", defaultSize);
    const bool writing = !params().get("infilename").isValid();
    const QvWideString name = wideName(params().get(writing ? "outfilename" : "infilename"));
    const int status = size < 0 ? QvStatus::failed : writing ? openOutput(name) : openInput(name);
    if (status != QvStatus::ok) return status;
    closing.dismiss();
    setInited(true);
    return QvStatus::ok;
}

int QvFileBufStream::openOutput(const QvWideString& name) {
    using Record = RecordOf<FileWriter>;
    const unsigned size = static_cast<unsigned>(params().get("size").asInt32());
    records_->writing = true;
    records_->file = Record::make(FileWriter::open(name, size, failure(), cancel()), BUFSTREAM_WRITER);
    if (!records_->file) {
        qv_dbg()->error("Can not open file %s", qv_narrow_name(name.data(), name.size()).c_str());
        return QvStatus::failed;
    }
    const bool patchable = !Record::of(records_->file)->isStream();
    records_->patch = seekPatchNew(records_->file, patchable, tellObservers, this, failure());
    // A file whose header could not be filled in would pass for a complete one.
    return records_->patch || name.size() >= longestPatchedName ? QvStatus::ok : QvStatus::outOfMemory;
}

int QvFileBufStream::openInput(const QvWideString& name) {
    const unsigned size = static_cast<unsigned>(params().get("size").asInt32());
    records_->file = RecordOf<FileReader>::make(FileReader::open(name, size, failure()), 0);
    return records_->file ? QvStatus::ok : QvStatus::failed;
}

void QvFileBufStream::destroy(int abort) {
    if (!inited()) return;
    if (records_) records_->end(abort);
    records_.reset();
    setInited(false);
}

int QvFileBufStream::writeOut() {
    if (!inited() || !records_->writing || !records_->file) return QvStatus::failed;
    FileWriter* writer = RecordOf<FileWriter>::of(records_->file);
    return writer && writer->writeOut() ? QvStatus::ok : QvStatus::failed;
}

void QvFileBufStream::flush() {
    if (bufstream* out = output()) {
        out->confirm(out, out->usable(out));
    } else if (bufstream* in = input()) {
        // Patches must not be overwritten by what is still in the buffer.
        writeOut();
        in->done(in, 0);
    }
}

bufstream* QvFileBufStream::input() {
    QV_ASSERT_MSG(inited(), "not inited");
    if (!records_->writing) return nullptr;
    return records_->patch ? records_->patch : records_->file;
}

bufstream* QvFileBufStream::output() {
    QV_ASSERT_MSG(inited(), "not inited");
    return records_->writing ? nullptr : records_->file;
}

int QvFileBufStream::registerObserver(QvAuxInfoObserver* observer) {
    return addObserver(observers_, observer);
}
int QvFileBufStream::unregisterObserver(QvAuxInfoObserver* observer) {
    return removeObserver(observers_, observer);
}
int QvFileBufStream::unregisterAllObservers() {
    observers_.clear();
    return QvStatus::ok;
}
TPtrList<QvAuxInfoObserver>* QvFileBufStream::observers() { return &observers_; }

// QvFileBufStreamRwWrite

QvFileBufStreamRwWrite::~QvFileBufStreamRwWrite() { QvFileBufStreamRwWrite::destroy(0); }

int QvFileBufStreamRwWrite::init(const AnyDict& newParams) {
    QvBufStream::init(newParams);
    records_ = std::make_shared<Records>();
    const int size = int32Param("size", defaultSize);
    const QvWideString name = wideName(params().get("outfilename"));
    Undo closing([this] { records_.reset(); });
    records_->writing = true;
    if (size >= 0) records_->file = rwFileNew(name, static_cast<unsigned>(size), failure());
    if (!records_->file) {
        qv_dbg()->error("Can not open file %s", qv_narrow_name(name.data(), name.size()).c_str());
        return QvStatus::failed;
    }
    closing.dismiss();
    setInited(true);
    return QvStatus::ok;
}

void QvFileBufStreamRwWrite::destroy(int abort) { QvFileBufStream::destroy(abort); }

void QvFileBufStreamRwWrite::flush() {
    if (bufstream* in = input()) in->done(in, 0);
}

bufstream* QvFileBufStreamRwWrite::input() {
    QV_ASSERT_MSG(inited(), "not inited");
    return records_->file;
}

bufstream* QvFileBufStreamRwWrite::output() {
    QV_ASSERT_MSG(inited(), "not inited");
    return nullptr;
}

// QvNullBufStream

struct QvNullBufStream::Record {
    bufstream* bs = nullptr;

    Record() = default;
    Record(const Record&) = delete;
    Record& operator=(const Record&) = delete;
    ~Record() { finish(bs, 0); }
};

QvNullBufStream::QvNullBufStream(QvCodec* owner) : QvBufStream(owner) {}
QvNullBufStream::QvNullBufStream(const QvNullBufStream&) = default;
QvNullBufStream& QvNullBufStream::operator=(const QvNullBufStream&) = default;
QvNullBufStream::~QvNullBufStream() { QvNullBufStream::destroy(0); }

int QvNullBufStream::init(const AnyDict& newParams) {
    QvBufStream::init(newParams);
    const int size = int32Param("size", defaultSize);
    record_ = std::make_shared<Record>();
    QV_ASSERT_MSG(size >= 0, "File open failed");
    record_->bs = nullRecordNew(static_cast<unsigned>(size), nullptr);
    QV_ASSERT_MEMORY(record_->bs, "File open failed");
    setInited(true);
    return QvStatus::ok;
}

void QvNullBufStream::destroy(int abort) {
    if (record_) finish(record_->bs, abort);
    record_.reset();
    setInited(false);
}

void QvNullBufStream::flush() {}
bufstream* QvNullBufStream::input() { return record_ ? record_->bs : nullptr; }
bufstream* QvNullBufStream::output() { return nullptr; }
