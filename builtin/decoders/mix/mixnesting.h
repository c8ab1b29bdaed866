// Keeps mixes of mixes finite: which metafiles are being opened on this thread, one inside the other, and how
// many inputs they have opened together.
#pragma once

#include <string>

#include "core/value/any.h"

class MixNesting {
  public:
    static constexpr int maxDepth = 8;     // metafiles inside one another
    static constexpr int maxInputs = 512;  // of the outermost one, with those of all that it names

    // For the time in which the inputs of a mix are opened. `file`: its metafile; invalid for none.
    explicit MixNesting(const Any& file);
    MixNesting(const MixNesting&) = delete;
    MixNesting& operator=(const MixNesting&) = delete;
    ~MixNesting();

    // Why this one can't be opened; empty if it can.
    const std::string& fault() const { return fault_; }
    // Counts an input of the mix that this thread is opening. False if there are too many.
    static bool addInput();

    // Says to the mix that names this one why it can't be opened.
    void failed(const std::string& text) const;
    // Why the last input of the mix that this thread is opening failed, where that is a mix; else empty.
    static std::string takeFailure();

  private:
    // A chain on the stacks of the calls. A container of the thread would take memory when the thread first
    // uses it, and where there is none the C library ends the process.
    static thread_local MixNesting* innermost_;

    MixNesting* const outer_ = innermost_;
    const Any file_;
    int inputs_ = 0;  // of the outermost one
    std::string fault_;
    std::string innerFailure_;
};
