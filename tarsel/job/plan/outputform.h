// What an output is: the format that its name or --format means, and how its files are named.
#pragma once

#include <optional>
#include <string>

#include "tarsel/job/plan/planoptions.h"
#include "tarsel/words/numberedname.h"

enum class OutputPlace {
    nowhere,
    files,
    stream,
    nullDevice,  // a stream that takes anything, even several streams, and keeps nothing
};

struct OutputForm {
    OutputKind kind = OutputKind::nothing;
    OutputPlace place = OutputPlace::nowhere;
    std::string name;   // for messages: as it was given, or what is in its place
    std::string pixel;  // pixel format that was asked for, or that the name says; empty for that of the input
    std::optional<NumberedName> numbered;
    bool splitChannels = false;  // a file for each channel

    EncoderOptions::Settings muxerSettings;  // of --muxer
    std::string muxerModule;                 // of OutputKind::module
    bool soundOnly = false;                  // of OutputKind::module: files of this name have no picture

    // All streams are in one file.
    bool isOneFile() const {
        return kind == OutputKind::avi || (kind == OutputKind::module && muxerModule != "rawmux");
    }
    bool isFiles() const { return place == OutputPlace::files; }
    // A pipe or a device: what was written can't be changed any more.
    bool isStream() const { return place == OutputPlace::stream; }
    bool takesOneStream() const { return isStream() && !isOneFile(); }
    bool writesNothing() const { return kind == OutputKind::nothing || place == OutputPlace::nullDevice; }
    // The engine's modules and the extension of its first file.
    const char* muxer() const;
    std::string extension(bool hasVideo) const;
};

// "ext" of --format, or of the output's name, and whether the tool writes it without a preset.
std::string formatName(const PlanOptions& options);
bool writesItself(const std::string& extension);

// The form of an output in `place`. Throws Failure for an unknown name or format, and for one that does not
// fit the place.
OutputForm outputForm(const PlanOptions& options, OutputPlace place);
