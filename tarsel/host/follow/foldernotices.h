// Notices of the system that entries of a folder came or changed.
#pragma once

#include <set>
#include <string>

#include "tarsel/host/descriptor.h"

class FolderNotices {
  public:
    // Where the system has no notices left to give, there are none, and the folder has to be scanned.
    explicit FolderNotices(const std::string& folder);

    int descriptor() const { return queue_.get(); }  // readable when there is something to take; or -1
    // Adds the names that came or changed since the last time. False where some were lost.
    bool take(std::set<std::string>& names);
    // The folder itself was removed, renamed or unmounted.
    bool folderGone() const { return gone_; }

  private:
    Descriptor queue_;
    bool gone_ = false;
};
