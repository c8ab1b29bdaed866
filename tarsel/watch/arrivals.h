// The files of a folder that wait until nobody writes them any more. Plain logic: what is there and what the
// time is, the caller says.
#pragma once

#include <map>
#include <optional>
#include <string>

#include "tarsel/host/follow/filefacts.h"

class Arrivals {
  public:
    // A file is due when its length and time have not changed for `settle` milliseconds.
    explicit Arrivals(long long settle) : settle_(settle) {}

    // What a look at an entry found. An absent one is forgotten.
    void see(const std::string& name, const FileFacts& facts, long long now);
    // It is looked at again after `delay` milliseconds, whatever is seen before.
    void postpone(const std::string& name, long long now, long long delay);
    void forget(const std::string& name) { files_.erase(name); }

    // One that is due, the one that has waited longest first. It is to be looked at, and then postponed or
    // forgotten.
    std::optional<std::string> due(long long now) const;
    // When the next one is, or nothing.
    std::optional<long long> next() const;
    bool empty() const { return files_.empty(); }
    const FileFacts* facts(const std::string& name) const;

  private:
    struct Entry {
        FileFacts facts;
        long long due = 0;
        bool postponed = false;
    };
    long long settle_;
    std::map<std::string, Entry> files_;
};
