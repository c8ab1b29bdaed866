// Captions as a file of another form.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/commands/outputoptions.h"
#include "tarsel/host/signals.h"

struct CaptionExport {
    std::vector<std::string> files;  // one subtitle file or film, or SCC files of field 1 and field 2
    bool srt = false, vtt = false, scc = false, json = false;
    std::string output;  // "": the standard output; its extension may say the form
    std::string stream;  // of the subtitles of a film: a number or a language; "": the first
    std::string rate;    // of timecodes; "": what the file suggests, or 29.97df
    OutputOptions outputs;

    // "srt", "vtt", "scc" or "json"; "" for the list of lines. Throws Failure, as the others do.
    std::string chosen() const;
    std::optional<QvFramerate> askedRate() const;
    void run(const std::string& form, Signals& signals) const;

  private:
    bool isOneFile() const;
    std::string text(const std::string& form) const;
};
