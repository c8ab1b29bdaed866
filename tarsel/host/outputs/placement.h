// How finished files get their names. One file is exchanged with what stood there; a set goes by a manifest,
// so that old and new files are never there together and a run that is ended in between can be finished.
#pragma once

#include <string_view>

#include "tarsel/host/outputs/manifest.h"

// What happened to a placement that failed.
struct PlaceResult {
    int error = 0;          // an errno; 0: all files have their names
    std::string_view name;  // of the file that it happened to, a part of the manifest; "" for none alone
    bool torn = false;      // what stood there before could not be put back: the work folder has it
};

// Puts one file of the work folder into `place`. What stood there gets its name in the work folder; without
// `overwrite` it is EEXIST. With `sync` the new name is on the disk before this returns; the data must be.
PlaceResult placeOne(int work, int place, const Manifest::Row& row, bool overwrite, bool sync);

// Puts a set in place.
class SetPlacement {
  public:
    // `set`: the old files with names for them in the work folder, and the new ones. It has to live longer.
    SetPlacement(int work, int place, const Manifest& set, bool sync);

    // Writes the manifest and brings all data to the disk. Nothing has moved.
    PlaceResult prepare();
    // Moves the files. After a failure the old ones stand again, unless it is torn. Takes no
    // memory.
    PlaceResult run();
    // After run: the old files stand again, and nothing is new. False if one could not be moved; then it is
    // torn. Takes no memory.
    bool takeBack();

  private:
    PlaceResult moveOldIn();
    PlaceResult moveNewOut();
    int enter(const char* from, const char* to);

    int work_, place_;
    const Manifest& set_;
    bool sync_;
    size_t in_ = 0, out_ = 0;  // rows that have been moved
};

// Finishes what a run has left. `work` holds `set` as kMovingNewOut (`complete`) or as kMovingOldIn; it may
// be called again after an end in between. `torn` when files could not be moved; `name` is the first of them.
PlaceResult finishSet(int work, int place, const Manifest& set, bool complete, bool sync);
