// Captions as a file of another form.
#pragma once

#include <string>
#include <vector>

#include "tarsel/commands/outputoptions.h"
#include "tarsel/host/signals.h"

struct CaptionExport {
    std::vector<std::string> files;  // one subtitle file, or SCC files of field 1 and field 2
    bool srt = false, vtt = false, scc = false, json = false;
    std::string output;  // "": the standard output
    std::string rate;    // of timecodes; "": what the file suggests, or 29.97 drop frame
    OutputOptions outputs;

    bool wanted() const { return srt || vtt || scc || json; }
    // Throws Failure.
    void run(Signals& signals) const;

  private:
    std::string text() const;
    std::string only() const;
};
