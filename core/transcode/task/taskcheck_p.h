// What a task verifies before a run: that its links can work together and what they allow.
#pragma once

#include <string>
#include <utility>

#include "core/job/processparams.h"
#include "core/value/ptrlist.h"

class AnyDict;
class AnyVector;
class QvEncodePipe;
class TransLink;

struct TaskFault {
    int code = 0;  // a QvStatus; 0: none
    std::string text;
};

class TaskCheck {
  public:
    // `encoder` may be null.
    TaskCheck(QvEncodePipe* encoder, TPtrList<TransLink> links)
        : encoder_(encoder), links_(std::move(links)) {}

    // Nothing linked, a multiplexer that needs video, too few views.
    TaskFault streams() const;
    // 0, QvStatus::notLegal or QvStatus::warning, with a line for each fault. `common`: the parameters of the
    // task's sound.
    int legal(const ProcessParams& common, AnyVector& messages) const;
    // How many video links can be encoded in two passes; they are appended to `list` unless it is null.
    int multiPass(TPtrList<TransLink>* list) const;
    // How many links can pass their coded data through; `dict` (may be null) gets "vids", "auds", "subs".
    int smartRender(AnyDict* dict) const;

  private:
    TaskFault views() const;
    int dolbyPassthrough(const TransLink& link, int mode, const ProcessParams& common,
                         AnyVector& messages) const;

    QvEncodePipe* encoder_;
    TPtrList<TransLink> links_;
};
