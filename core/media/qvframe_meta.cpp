// The metadata keys that a frame itself knows.
#include "core/media/qvframe.h"

namespace {

constexpr char timestampKey[] = "timestamp";
constexpr char matrixKey[] = "_yuvMatrix";
constexpr char userDataKey[] = "userData";
constexpr char subpicKey[] = "subpic";

}  // namespace

long long QvFrame::getTimestamp() const { return meta_.getInt64(timestampKey, -1); }

void QvFrame::setTimestamp(long long timestamp) { meta_.set(timestampKey, Any(timestamp)); }

QvYUVMatrix QvFrame::YUVMatrix() const {
    return static_cast<QvYUVMatrix>(meta_.getInt32(matrixKey, qvMatrixNotSet));
}

void QvFrame::setYUVMatrix(QvYUVMatrix matrix) { meta_.set(matrixKey, Any(static_cast<int>(matrix))); }

void QvFrame::copyMeta(const QvFrame& src, QvYUVMatrix matrix) {
    _copyMeta(src, matrixKey);
    setYUVMatrix(matrix);
}

QvUserData* QvFrame::userData() const {
    return static_cast<QvUserData*>(meta_.get(userDataKey).asGeneric(nullptr));
}

void QvFrame::setUserData(QvUserData* data) { meta_.set(userDataKey, Any(static_cast<const void*>(data))); }

void QvFrame::clearUserData() { meta_.remove(userDataKey); }

AnyDict* QvFrame::subpic() {
    Any& value = meta_.get(subpicKey);
    return value.isDict() ? &value.asDict() : nullptr;
}

const AnyDict* QvFrame::subpic() const {
    const Any& value = meta_.get(subpicKey);
    return value.isDict() ? &value.asDict() : nullptr;
}

void QvFrame::setSubpic(const AnyDict& subpic) { meta_.set(subpicKey, subpic); }

void QvFrame::clearSubpic() { meta_.remove(subpicKey); }
