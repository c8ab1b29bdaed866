// Completes the navigation packs of a DVD-Video program that has been multiplexed.
#pragma once

#include <vector>

#include "core/stream/nav/navcollector_p.h"

// Rewrites, in each segment's file, the first sector of each VOBU: end times, the search table (distances in
// sectors to the VOBUs at fixed times before and after, within the same cell), and the synchronisation
// entries of audio and sub-pictures. A segment whose file fails is left where it failed, with a note in
// `failure`.
void correctNavigation(const NavData& data, const std::vector<NavSegment>& segments, QvIoFailure& failure);
