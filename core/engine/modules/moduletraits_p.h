// What the engine has to know of a module beyond its contract, so that nothing branches on a module's name.
//
// Some modules have names that are fixed; a table gives their traits, whichever plug-in brings them. For any
// module an attribute of the trait's name, where it is set, wins over the table.
#pragma once

#include <string_view>

class QvCodec;
class QvModule;

enum class CodecFamily { none, aac, dolby, dv };

struct ModuleTraits {
    // "codecFamily" (String: "aac", "dolby", "dv"; any other text is none). Decides the order of the channels
    // of sound, and whose coded data another module of the family can take.
    CodecFamily family = CodecFamily::none;
    // "onlyScales" (Int32): a filter that changes the size and layout of a picture and nothing else.
    bool onlyScales = false;
    // "convertsFormat" (Int32): a filter of sound that changes its format and leaves the sound as it is.
    bool convertsFormat = false;
    // "ownStatistics" (Int32): an encoder that takes the name of a file for the statistics of its first pass,
    // and not a record to write them to.
    bool ownStatistics = false;
    // "watchDiscSpace" (Int32): a multiplexer whose run ends when the disc is full, checked at each progress
    // report.
    bool watchDiscSpace = false;

    bool operator==(const ModuleTraits&) const = default;
};

// `module` may be null for a codec without one; then the name alone decides.
ModuleTraits qvModuleTraits(std::string_view name, const QvModule* module);
ModuleTraits qvModuleTraits(const QvCodec& codec);
