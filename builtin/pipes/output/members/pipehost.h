// What the parts of the encode pipe need of the pipe itself. A failure of theirs becomes the pipe's own code
// and text, which is logged at once.
#pragma once

#include "core/arch/api.h"

class Any;
class QvCodec;

class PipeHost {
  public:
    // Stores code and text (at most 1,023 characters) and returns `code`. Want of memory
    // loses the text and throws nothing.
    QV_PRINTF(3, 4) int fail(int code, const char* format, ...);
    // The failure of one of the pipe's members, with the member's code if it has one, and its text. Returns
    // `result`.
    int take(const QvCodec& member, int result);

    virtual const char* lastFailure() const = 0;   // the text
    virtual const void* pipe() const = 0;          // only its address, for the log
    virtual int setFilename(const Any& name) = 0;  // as QvEncodePipe::setFilename

  protected:
    ~PipeHost() = default;
    virtual void storeFailure(int code, const char* text) = 0;
};

// setParam on a member. A member that does not know the name is passed over, whether it returns or throws.
int qvOfferParam(QvCodec& member, const char* name, const Any& value);
