// The hidden folder in which a job writes, inside the folder that gets the results. It holds the files of the
// job, a file that names its owner and is locked as long as the owner runs, and at the end a manifest.
//
//     .tarsel-Xq3b0Z/owner           locked; first in, last out
//     .tarsel-Xq3b0Z/out#0.png ...   what the job writes
//     .tarsel-Xq3b0Z/old-0 ...       what stood under its names before
//     .tarsel-Xq3b0Z/moving-old-in   while files are moved: see manifest.h
//     .tarsel-Xq3b0Z/parts/          of a job that is made in parts: what they write
#pragma once

#include <string>
#include <string_view>

#include "tarsel/host/descriptor.h"

class WorkFolder {
  public:
    static constexpr std::string_view kPrefix = ".tarsel-";
    static constexpr const char* kOwner = "owner";
    static constexpr const char* kParts = "parts";

    struct Removed {
        size_t files = 0;  // of the job, and what it replaced
        long long bytes = 0;
    };

    // Makes a new one in `place`, owned by this process. 0 or an errno; after that it has none.
    int make(const std::string& place);
    // Takes one that is there; `owner` may be closed. Both folders are open.
    WorkFolder(Descriptor place, std::string name, Descriptor folder, Descriptor owner)
        : name_(std::move(name)),
          place_(std::move(place)),
          folder_(std::move(folder)),
          owner_(std::move(owner)) {}
    WorkFolder() = default;

    // Removes it with all that it holds, and unlocks it. The manifest goes first and the owner last, so that
    // an end in between leaves a folder of which the rest can be removed. Takes no memory. Nothing without
    // one.
    Removed remove();
    // Unlocks it and leaves it unchanged.
    void leave();

    explicit operator bool() const { return static_cast<bool>(folder_); }
    int handle() const { return folder_.get(); }
    int place() const { return place_.get(); }         // the folder around it
    const std::string& path() const { return path_; }  // of one that make has made

  private:
    bool lockNew();

    std::string name_, path_;
    Descriptor place_, folder_, owner_;
};
