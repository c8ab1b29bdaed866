// Opens the inputs of decoders that are made of others (mixes of sounds, views, clips), and keeps such
// decoders finite: which of their files are being opened on this thread, one inside the other, and how many
// inputs they have opened together.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "core/value/any.h"

class QvDecodePipe;
struct QvFileOpenCb;

class InputNesting {
  public:
    static constexpr int maxDepth = 8;     // metafiles inside one another
    static constexpr int maxInputs = 512;  // of the outermost one, with those of all that it names

    // For the time in which the inputs of a decoder are opened. `file`: its metafile; invalid for none.
    explicit InputNesting(const Any& file);
    InputNesting(const InputNesting&) = delete;
    InputNesting& operator=(const InputNesting&) = delete;
    ~InputNesting();

    // Why this one can't be opened; empty if it can.
    const std::string& fault() const { return fault_; }

    // Why a decoder that is opened as an input failed, for the one that names it. Of several decoders that
    // try one file the first counts.
    static void noteFailure(const std::string& text);

    // Makes an open decoder and reports what fails to the callback; null if it can't.
    using Make = std::function<QvDecodePipe*(QvFileOpenCb* callback)>;
    // An open input, or null with the reason. An input whose own inputs can't be read is none, and so is a
    // pipe, which would be waited for. `file`: its name; invalid for what is no file.
    static std::unique_ptr<QvDecodePipe> open(const Any& file, const Make& make, std::string& reason);

  private:
    struct Opening {
        std::vector<Any> files;
        int inputs = 0;
        std::string failure;
    };
    // Of the outermost one of this thread; null while nothing is opened.
    static thread_local Opening* opening_;

    std::unique_ptr<Opening> own_;
    std::string fault_;
};
