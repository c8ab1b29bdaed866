#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/stream/observers_p.h"

int addObserver(TPtrList<QvAuxInfoObserver>& list, QvAuxInfoObserver* observer) {
    if (list.contains(observer)) {
        qv_log()->error("Observer already registered!!");
        return QvStatus::failed;
    }
    list.append(observer);
    return QvStatus::ok;
}

int removeObserver(TPtrList<QvAuxInfoObserver>& list, QvAuxInfoObserver* observer) {
    const int index = list.indexOf(observer);
    if (index < 0) return QvStatus::failed;
    list.remove(index);
    return QvStatus::ok;
}

void notifyObservers(TPtrList<QvAuxInfoObserver>* list, unsigned offset, unsigned id, void* info,
                     unsigned size) {
    if (!list) return;
    for (int i = 0; i < list->size();) {
        QvAuxInfoObserver* observer = list->at(i);
        observer->auxInfo(offset, id, info, size);
        if (i < list->size() && list->at(i) == observer) ++i;
    }
}
