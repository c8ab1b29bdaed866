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
    // "convertsFormat" (Int32): a filter of sound that changes its format and leaves the sound unchanged.
    bool convertsFormat = false;
    // "ownStatistics" (Int32): an encoder that takes the name of a file for the statistics of its first pass,
    // and not a record to write them to.
    bool ownStatistics = false;
    // "watchDiscSpace" (Int32): a multiplexer whose run ends when the disc is full, checked at each progress
    // report.
    bool watchDiscSpace = false;
    // "convertsRate" (Int32): a filter of sound that converts from its "inSamplerate" to its "outSamplerate".
    bool convertsRate = false;
    // "delays" (Int32): a filter of sound that delays by its "delay", in milliseconds. In a chain that is
    // built from a job a delay of 0 or less is no filter: that much of the input is skipped instead.
    bool delays = false;
    // "deinterlaces" (Int32): a filter that makes progressive pictures of interlaced ones.
    bool deinterlaces = false;
    // "repeatsFrames" (Int32): a filter that may hand out one picture several times, so that no filter may
    // change it in place, unless its "_safeToApplyAfter" is 1.
    bool repeatsFrames = false;
    // "uncompressed" (Int32): an encoder that writes samples or pixels unchanged.
    bool uncompressed = false;
    // "wholePictures" (Int32): an encoder each of whose blocks is a picture that can be a file by itself.
    bool wholePictures = false;
    // "matchesGop" (Int32): an encoder whose groups of pictures can be fitted to those of an MPEG source.
    bool matchesGop = false;

    bool operator==(const ModuleTraits&) const = default;
};

// `module` may be null for a codec without one; then the name alone decides.
ModuleTraits qvModuleTraits(std::string_view name, const QvModule* module);
ModuleTraits qvModuleTraits(const QvCodec& codec);
