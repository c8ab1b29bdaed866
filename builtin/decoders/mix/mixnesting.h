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
    // Counts an input. False if there are too many.
    static bool addInput();

    // Why the last mix that was opened as an input failed, for the one that names it; empty if none did.
    static void noteFailure(const std::string& text);
    static std::string takeFailure();

  private:
    std::string fault_;
};
