// The open decoders of a task.
#pragma once

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/ptrlist.h"

class QvDecodePipe;

// A decoder may stand in the list several times. The list owns its decoders only for deleteAll.
class QV_API QvDPipeList : public TPtrList<QvDecodePipe> {
  public:
    // First decoder after `after` (null: from the start) whose "filename" equals `name`, or null. Asserts
    // that each decoder answers text and that `after` is in the list.
    QvDecodePipe* findByFilename(const Any& name, const QvDecodePipe* after = nullptr) const;
    // Closes and deletes each decoder once and clears the list. Takes no memory.
    void deleteAll();
};
