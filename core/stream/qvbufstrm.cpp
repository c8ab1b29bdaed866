#include "core/stream/qvbufstrm.h"

#include "core/engine/status.h"
#include "core/engine/threads/qvthreads.h"
#include "core/stream/iofailure.h"

QvAuxInfoObserver::~QvAuxInfoObserver() = default;

QvBufStream::QvBufStream(QvCodec* owner)
    : lock_(std::make_shared<QVThreads::QvCriticalSection>()),
      owner_(owner),
      failure_(std::make_shared<QvIoFailure>()) {}

QvBufStream::QvBufStream(const QvBufStream&) = default;
QvBufStream& QvBufStream::operator=(const QvBufStream&) = default;
QvBufStream::~QvBufStream() = default;

int QvBufStream::init() { return init(params_); }

int QvBufStream::init(const AnyDict& newParams) {
    if (inited_) destroy(0);
    failure_->clear();
    if (&newParams != &params_) params_ = newParams;
    return QvStatus::ok;
}

void QvBufStream::destroy(int) {}
void QvBufStream::flush() {}

int QvBufStream::resize(int size, int chunk) {
    AnyDict resized(params_);
    resized.set("size", size);
    resized.set("chunk", chunk);
    return init(resized);
}

const Any& QvBufStream::getParam(const char* name) { return params_.get(name); }

int QvBufStream::setParam(const char* name, const Any& value) {
    params_.set(name, value);
    return QvStatus::ok;
}

int QvBufStream::setParamDict(const AnyDict& newParams) {
    const AnyDict copy(newParams);
    for (int i = 0; i < copy.size(); ++i) setParam(copy.getKey(i), copy.getVal(i));
    return QvStatus::ok;
}

int QvBufStream::registerObserver(QvAuxInfoObserver*) { return QvStatus::notSupported; }
int QvBufStream::unregisterObserver(QvAuxInfoObserver*) { return QvStatus::notSupported; }
int QvBufStream::unregisterAllObservers() { return QvStatus::notSupported; }
TPtrList<QvAuxInfoObserver>* QvBufStream::observers() { return nullptr; }

void QvBufStream::reset() {
    if (!inited_) return;
    destroy(0);
    init(params_);
}

int QvBufStream::size() const { return params_.get("size").asInt32(); }

void QvBufStream::lock() { lock_->enter(); }
void QvBufStream::unlock() { lock_->leave(); }

int QvBufStream::ioError() const { return failure_->code(); }
std::string QvBufStream::ioErrorText() const { return failure_->text(); }
unsigned long long QvBufStream::ioTaken() const { return failure_->taken(); }

int QvBufStream::int32Param(const char* name, int fallback) {
    const Any& stored = params_.get(name);
    if (stored.isInt32()) return stored.asInt32();
    params_.set(name, fallback);
    return fallback;
}
