// How loud a sound is when it reaches a filter of a chain. Internal to this folder.
#pragma once

#include <span>
#include <string>
#include <vector>

#include "core/decode/qvdecoder.h"
#include "core/value/anycontainer.h"

class QvAProcessPipe;

namespace qvchain {

// Samples of a decoder's stream, `to` not included. A source that is made of segments has one for each.
struct SoundRange {
    QvDecodePipe* decoder = nullptr;
    int stream = 0;
    long long from = 0;
    long long to = 0;
};

// Adds the levels of QvReportNeed::loudness to `levels`: those of the ranges, one after the other, each
// through a second chain of the filters 0 .. filter - 1 of `pipe`, set up as they are and with their
// `reports` (empty: none). The streams stand at their beginnings afterwards. False, with the reason, if that
// is not possible or `watch` ended it.
bool measureBefore(const QvAProcessPipe& pipe, int filter, std::span<const AnyDict> reports,
                   std::span<const SoundRange> ranges, const QvReadWatch& watch, AnyDict& levels,
                   std::string& why);

}  // namespace qvchain
