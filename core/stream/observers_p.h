// What the streams that have observers do with their lists.
#pragma once

#include "core/stream/qvbufstrm.h"

// 0, or -1 (logged) for one that is listed already.
int addObserver(TPtrList<QvAuxInfoObserver>& list, QvAuxInfoObserver* observer);
// 0, or -1 for one that is not listed.
int removeObserver(TPtrList<QvAuxInfoObserver>& list, QvAuxInfoObserver* observer);
// Each observer in order of registration; a null list has none. An observer may take itself off the list.
void notifyObservers(TPtrList<QvAuxInfoObserver>* list, unsigned offset, unsigned id, void* info,
                     unsigned size);
