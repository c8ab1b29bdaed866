// The first failure of a stream's input or output, kept until the work is done.
#pragma once

#include <cstdint>
#include <string>

#include "core/arch/api.h"
#include "core/arch/widename.h"

// Records of the C interface answer with a null block or a short count and can't say why; and what fails
// while a file is closed has no caller to answer to. Both leave their reason here. Belongs to the thread that
// drives the stream.
class QV_API QvIoFailure {
  public:
    // Keeps the first one: "what 'name': reason" with the system's text of `code`, an errno value (0 counts
    // as EIO). report() also makes it an error in qv_log(), unless the user asked for it
    // (ECANCELED); note() does not.
    void report(int code, const char* what, const QvWideString& name);
    void note(int code, const char* what, const QvWideString& name);
    // The same for a whole sentence, as the failure of the stream that this one writes through.
    void take(int code, const std::string& text);
    void clear();

    int code() const { return code_; }
    const std::string& text() const { return text_; }

    // Bytes that were written to files which are closed.
    void countTaken(std::uint64_t bytes) { taken_ += bytes; }
    std::uint64_t taken() const { return taken_; }

  private:
    bool keep(int code, const char* what, const QvWideString& name);

    int code_ = 0;
    std::string text_;
    std::uint64_t taken_ = 0;
};
